#!/usr/bin/env python3
"""described.py COMMAND MANUAL ROOT: checks that the manual page, --help and the completions agree on the
verbs of COMMAND, their options, in one order, and their arguments, and that something is offered for every value whose
words are known. ROOT was booted and has a saved state."""

import re
import subprocess
import sys

command, manual, root = sys.argv[1:]
problems = []

# Values whose words are nobody's to know: numbers, letters, any text; and new names.
FREE = {"N", "NUMBER", "PERMISSIONS", "PID", "SERVICE", "TEXT", "TIME", "VALUE"}
NAMES = {"new domain", "domain create"}
GLOBAL = {"help", "version", "root", "verbose", "color", "no-pager"}


def output_of(*words):
    return subprocess.run([command, *words], capture_output=True, text=True, check=False).stdout


class Usage:
    """What stands behind a verb: options with the name of their value, and arguments."""

    def __init__(self):
        self.options = {}
        self.arguments = []

    def text(self):
        options = " ".join(name + (f" {value}" if value else "") for name, value in self.options.items())
        return f"{options or '(no options)'}; {' '.join(self.arguments) or '(no arguments)'}"


def usage_of_help(verb):
    usage = Usage()
    text = output_of(*verb.split(), "--help")
    line = re.search(r"^Usage: secpolicy " + verb + r"(?: \[OPTIONS\])?(.*)$", text, re.MULTILINE)
    usage.arguments = ["[PROGRAM...]" if word == "PROGRAM..." else word for word in line.group(1).split()]
    for short, long, value in re.findall(r"^  (?:-(\w),)?--([\w-]+)(?: ([A-Z]+\b))?", text, re.MULTILINE):
        if long not in GLOBAL:
            usage.options["--" + long] = value
            aliases["-" + short] = "--" + long
    return usage


def usage_of_macros(text):
    """Of a line of the manual page: Op Fl Fl format Ar FORMAT, Oo Fl R Oc Ar PATH ..."""
    usage = Usage()
    # Of several forms of an argument, the first.
    text = re.sub(r" \| [A-Z]+\b", "", text)
    text, dashes, command = text.partition("Fl - ")
    for long, short, value in re.findall(r"Fl (?:Fl ([\w-]+)|(\w))(?: Ar ([A-Z]+))?", text):
        usage.options["--" + long if long else aliases["-" + short]] = value
    usage.options.pop("--root", None)
    usage.options.pop("--verbose", None)
    text = re.sub(r"Fl (?:Fl [\w-]+|\w)(?: Ar [A-Z]+)?", "", text)
    is_optional = False
    for token in re.findall(r"O[opc]\b|[A-Z_]+\b(?: \.\.\.)?", text):
        if token in ("Oo", "Op", "Oc"):
            is_optional = token != "Oc"
        else:
            name = token.replace(" ", "")
            usage.arguments.append(f"[{name}]" if is_optional else name)
    # What stands behind -- may be left out in some uses, which the manual page need not show.
    if dashes:
        usage.arguments.append(f"[{command.split()[-2]}...]")
    return usage


def verbs_of(listed):
    """The verbs and their kinds, as those tell that are offered."""
    found = []
    for verb in listed:
        kinds = [] if verb in ("help", "") else words_at(verb, "")
        is_group = " SUBCOMMAND" in output_of(verb, "--help")
        found += [f"{verb} {kind}" for kind in kinds] if is_group else [verb]
    return found


def words_at(*words):
    answer = output_of("__complete", *" ".join(words[:-1]).split(), words[-1]).splitlines()
    return [line.split("\t")[0] for line in answer[1:]]


def usages_of_manual():
    with open(manual) as page:
        text = page.read().replace("\\\n", "")
    entries, synopses = {}, {}
    for line in re.findall(r"^\.It Cm (.*)$", text.partition("The verbs are:")[2].partition(".Sh")[0], re.MULTILINE):
        verb = re.match(r"[a-z-]+( [a-z-]+)*", line).group()
        entries[verb] = usage_of_macros(line[len(verb):])
    synopsis = re.search(r"^\.Sh SYNOPSIS\n(.*?)^\.Sh", text, re.MULTILINE | re.DOTALL).group(1)
    for entry in synopsis.split(".Nm\n")[1:]:
        verb = re.search(r"^\.Cm (.*)$", entry, re.MULTILINE).group(1)
        lines = [line[1:] for line in entry.splitlines() if not line.startswith(".Cm")]
        synopses[verb] = usage_of_macros(" Oc ".join(lines))
    return {"entry": entries, "synopsis": synopses}


aliases = {"-v": "--verbose"}
listed = re.findall(r"^  ([a-z-]+) ", output_of("--help").partition("Write a policy:")[2].partition("For example")[0],
                    re.MULTILINE)
offered = [word for word in words_at("") if word != "help"]
if sorted(listed) != sorted(offered) or len(listed) < 24:
    problems.append(f"--help has the verbs {listed}, completion offers {offered}")

verbs = verbs_of(listed)
helps = {verb: usage_of_help(verb) for verb in verbs}
for place, usages in usages_of_manual().items():
    for verb in sorted(set(helps) ^ set(usages)):
        problems.append(f"{verb}: only {'--help has it' if verb in helps else f'the {place} in the manual page is there'}")
    for verb in sorted(set(helps) & set(usages)):
        if usages[verb].text() != helps[verb].text():
            problems.append(f"{verb}: the {place} in the manual page has: {usages[verb].text()}\n"
                            f"{' ' * len(verb)}  --help has: {helps[verb].text()}")

for verb, usage in helps.items():
    names = {name for name in words_at(verb, "--") if name[2:] not in GLOBAL}
    if names != set(usage.options):
        problems.append(f"{verb}: completion offers {sorted(names)}, --help has {sorted(usage.options)}")
    places = [(f"{verb} {name}", value) for name, value in usage.options.items() if value]
    before = verb
    for argument in usage.arguments:
        name = argument.strip("[].")
        if name == argument.strip("[]") or argument == usage.arguments[0]:
            places.append((before, name))
        before += " x"
    for words, value in places:
        answer = output_of("__complete", "--root", root, *words.split(), "").splitlines()
        is_offered = len(answer) > 1 and not answer[1].startswith("--")
        is_free = value in FREE or (value == "NAME" and verb in NAMES)
        if is_offered == is_free:
            problems.append(f"{words}: for {value}, completion offers {'something' if is_offered else 'nothing'}")

print("\n".join(problems) or f"{len(verbs)} verbs and kinds agree")
sys.exit(1 if problems else 0)
