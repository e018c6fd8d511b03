#!/usr/bin/env python3
"""on_terminal.py SCREEN COLUMNSxROWS KEYS COMMAND...: runs the command with its outputs on a terminal of this
size, 0x0 for one that does not tell, types KEYS as soon as something is shown, and writes what is shown to the
file SCREEN. Ends as the command does."""

import fcntl
import os
import pty
import struct
import sys
import termios

from terminal_output import pieces

screen, size, keys, *command = sys.argv[1:]
columns, rows = map(int, size.split("x"))

child, terminal = pty.fork()
if child == 0:
    fcntl.ioctl(0, termios.TIOCSWINSZ, struct.pack("HHHH", rows, columns, 0, 0))
    os.execvp(command[0], command)

shown = b""
for piece in pieces(terminal):
    if not shown:
        os.write(terminal, keys.encode())
    shown += piece
status = os.waitpid(child, 0)[1]
# The terminal itself makes a carriage return of every line end.
with open(screen, "wb") as file:
    file.write(shown.replace(b"\r\n", b"\n"))
sys.exit(os.waitstatus_to_exitcode(status))
