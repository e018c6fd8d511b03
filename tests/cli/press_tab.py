#!/usr/bin/env python3
"""press_tab.py SHELL COMPLETIONS COMMAND_DIR LINE...: types each line and a tab into an interactive SHELL on
a terminal of its own, and prints what stands on the command line then. The directory COMPLETIONS has the
completion files; the command is found in COMMAND_DIR."""

import os
import pty
import shutil
import sys
import tempfile

from terminal_output import pieces

shell, completions, command_dir, *lines = sys.argv[1:]

# ^X t tells what stands on the line.
STARTS = {
    "bash": f"""
        source {completions}/secpolicy.bash
        tell() {{ printf '%s\\n' "$READLINE_LINE" >>"$TOLD"; }}
        bind -x '"\\C-xt": tell'
        bind 'set bell-style none'
        PS1='ready> '
    """,
    "zsh": f"""
        fpath=({completions} $fpath)
        autoload -U compinit
        compinit -u -D
        unsetopt AUTO_LIST AUTO_MENU BEEP
        tell() {{ print -r -- "$BUFFER" >>$TOLD }}
        zle -N tell
        bindkey -e
        bindkey '^Xt' tell
        PS1='ready> '
    """,
}


def start(home):
    file = os.path.join(home, ".zshrc" if shell == "zsh" else "bashrc")
    with open(file, "w") as rc:
        rc.write(STARTS[shell])
    os.environ.update(TERM="dumb", TOLD=home + "/told", ZDOTDIR=home, INPUTRC="/dev/null",
                      PATH=command_dir + ":" + os.environ["PATH"])
    arguments = {"bash": ["bash", "--noprofile", "--rcfile", file, "-i"], "zsh": ["zsh", "-d", "-i"]}[shell]
    child, terminal = pty.fork()
    if child == 0:
        os.execvp(arguments[0], arguments)
    return child, terminal


def read_until(terminal, mark):
    shown = b""
    for piece in pieces(terminal):
        shown += piece
        if mark is not None and mark in shown:
            return


home = tempfile.mkdtemp()
child, terminal = start(home)
read_until(terminal, b"ready> ")
for line in lines:
    os.write(terminal, line.encode() + b"\t\x18t\x15")
os.write(terminal, b"exit\r")
read_until(terminal, None)
os.waitpid(child, 0)
with open(home + "/told") as told:
    sys.stdout.write(told.read())
shutil.rmtree(home)
