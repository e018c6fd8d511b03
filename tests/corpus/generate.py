#!/usr/bin/env python3
"""Writes the accept/reject corpus: policy inputs with what has to come of them.

The expectations come from a model of the policy format in this file, written from the rules in
docs/policy-format.md and not from the library, so that a fault would have to be made twice.

  tests/corpus/generate.py            writes the .jsonl files beside it
  tests/corpus/generate.py --check    exits with 1 when they are not what it would write

Each line of a .jsonl file is one case. A character in it stands for the byte of the same number.
In an error, {file} stands for the path of the input and {refusal} for the host's own text for the
word and keyword type in "refused".
"""

import itertools
import json
import pathlib
import sys

HERE = pathlib.Path(__file__).parent

# ---- The words of the host that the corpus is for. Kept in words.json for the test.

DOMAIN = "corpusDom"
LABELS = ["unlabeled", "tardiskDefault", "tool", "data", "spool", "Mixed.Case-1"]
DOMAINS = ["hostDom", "appDom", "daemonFrameworkDom", DOMAIN, "otherDom"]
LAUNCH_DOMAINS = ["hostDom", "daemonFrameworkDom"]
TARDISK = "tool.tgz"

LABEL, CAPABILITY, PARAM_CHECK, OBJECT_ACCESS, DOM_TRANS, FILE_CREATION, SOCKET, SYSCALL = range(1, 9)
KEYWORDS = {
    CAPABILITY: """cap_chown cap_dac_override cap_dac_read_search cap_fowner cap_fsetid cap_kill
        cap_setgid cap_setuid cap_setpcap cap_net_bind_service cap_net_admin cap_net_raw
        cap_ipc_lock cap_sys_module cap_sys_rawio cap_sys_chroot cap_sys_ptrace cap_sys_admin
        cap_sys_boot""".split(),
    PARAM_CHECK: """socket_family socket_type bind_port connect_port ioctl_request prctl_option
        clone_flags kill_signal set_uid set_gid""".split(),
    OBJECT_ACCESS: "read write execute list remove truncate".split(),
    DOM_TRANS: "exec tardisk_exec enter".split(),
    FILE_CREATION: "regular directory symlink fifo char_device block_device".split(),
    SOCKET: "stream dgram seqpacket".split(),
    SYSCALL: """read write openat close execve clone3 fork mmap mprotect ptrace socket bind
        connect accept4 setxattr io_uring_setup reboot kexec_load""".split(),
}

# ---- The model: what the format says.


def read_line(line):
    """The words of a line: what precedes the first "#", split at spaces."""
    return [word for word in line.split("#")[0].split(" ") if word]


def read_file(text):
    """The words of each line that has any, by line number. Too long a line is the last one."""
    lines = {}
    for number, line in enumerate(text.split("\n"), start=1):
        words = read_line(line[:1023].split("\0")[0])
        if words:
            lines[number] = words
        if len(line) > 1023:
            break
    return lines


class Refused(Exception):
    """A line that cannot be accepted. `refused` is the word that the host itself refuses."""

    def __init__(self, message, refused=None):
        super().__init__(message)
        self.message = message
        self.refused = refused


def check_word(kind, word):
    known = LABELS + DOMAINS if kind == LABEL else KEYWORDS[kind]
    if word not in known:
        raise Refused("{refusal}", [kind, word])


def check_grant(word):
    if word not in ("grant", "revoke"):
        raise Refused("invalid keyword " + word)


# The words of each kind of rule line in order, the grant word left out.
SHAPES = {
    "-a": [LABEL, OBJECT_ACCESS],
    "-c": [CAPABILITY],
    "-d": [LABEL, None, DOM_TRANS],  # None: the target domain
    "-f": [LABEL, LABEL, FILE_CREATION],
    "-s": [SYSCALL],
    "-u": [LABEL, SOCKET],
}
ODD_SIZE = "incorrect number of arguments for this rule type"


def check_rule(keyword, words):
    if keyword == "-r":
        if len(words) not in (1, 2):
            raise Refused(ODD_SIZE)
    elif keyword == "-p":
        if len(words) not in (3, 4):
            raise Refused(ODD_SIZE)
        check_grant(words[-1])
        check_word(PARAM_CHECK, words[0])
    elif keyword in SHAPES:
        shape = SHAPES[keyword]
        if len(words) != len(shape) + 1:
            raise Refused(ODD_SIZE)
        for kind, word in zip(shape, words):
            if kind is None and word not in DOMAINS:
                raise Refused("Failed to fetch domain id for: " + word)
        check_grant(words[-1])
        for kind, word in zip(shape, words):
            if kind is not None:
                check_word(kind, word)
    else:
        raise Refused(f"invalid policy rule type ({keyword})")


def with_refusal(case, prefix, refused):
    case["error"] = prefix + refused.message
    if refused.refused:
        case["refused"] = refused.refused
    return case


def expect_domain(text):
    case = {"rules": []}
    for number, words in read_file(text).items():
        try:
            check_rule(words[0], words[1:])
        except Refused as refused:
            prefix = f"Error in parsing policy for domain: {DOMAIN}: {number} : "
            return with_refusal(case, prefix, refused)
        case["rules"].append([number] + words)
    return case


def expect_objects(text):
    case = {"names": []}
    for number, words in read_file(text).items():
        if len(words) != 1:
            case["error"] = f"{{file}}:{number} : cannot define more than one object per line"
            return case
        case["names"] += words
    return case


def expect_file_labels(text):
    case = {"labels": []}
    for number, words in read_file(text).items():
        place = f"{{file}}:{number} : "
        if len(words) != 2:
            case["error"] = place + "incorrect no of parameters"
            return case
        path, label = words
        try:
            check_word(LABEL, label)
        except Refused as refused:
            return with_refusal(case, "", refused)
        if "/*" in path[:-1]:
            case["error"] = place + "Unrecognized format for file/dir specification"
            return case
        tree = path.endswith("/*")
        case["labels"].append([number, path[:-2] if tree else path, label, tree])
    return case


def expect_tardisk(text):
    case = {}
    exception = None
    for number, words in read_file(text).items():
        place = f"Error in parsing policy for domain: {{file}}: {number} : "
        if words[0] != "-E":
            case["error"] = place + f"invalid tardisk policy rule type ({words[0]})"
        elif exception:
            case["error"] = "Only one rule of this type is allowed"
        elif len(words) != 3:
            case["error"] = place + ODD_SIZE
        elif words[2] not in DOMAINS:
            case["error"] = place + "Failed to fetch domain id for " + words[2]
        if "error" in case:
            break
        exception = (number, words[1], words[2])
    return {**case, **expect_tardisk_set(exception)}


def expect_tardisk_set(exception):
    """What installing does: the image's label, and a transition from every launch domain."""
    if not exception:
        return {}
    number, label, target = exception
    image = "/tardisks/" + TARDISK
    if label not in LABELS:
        return {"setError": f"{{file}}:{number} : Tardisk: {image} : "
                            f"Invalid label ({label}) for file {image}"}
    launching = [] if label == "unlabeled" else [d for d in LAUNCH_DOMAINS if d != target]
    return {"label": label, "transitions": [[number, d, label, target] for d in launching]}


def expect_permissions(letters):
    if len(letters) > 3:
        return {"error": "Please enter the permissions from [rwx]."}
    names = {"r": "Read", "w": "Write", "x": "Exec"}
    for index, letter in enumerate(letters):
        if letter not in names:
            return {"error": "Unknown access privilege specified."}
        if letter in letters[:index]:
            return {"error": names[letter] + " access already specified."}
    return {"mask": sum({"r": 1, "w": 2, "x": 16}[letter] for letter in letters)}


# ---- The inputs.

GOOD = {
    "-a": ["tool", "read", "grant"],
    "-c": ["cap_kill", "grant"],
    "-d": ["tool", "appDom", "exec", "grant"],
    "-f": ["tool", "data", "regular", "grant"],
    "-p": ["bind_port", "80", "grant"],
    "-r": ["/bin/ls", "rx"],
    "-s": ["openat", "grant"],
    "-u": ["spool", "stream", "grant"],
}
BAD_GRANTS = ["Grant", "GRANT", "Revoke", "allow", "deny", "grants", "gran", "granted", "revok",
              "1", "true", "grant\t", "\tgrant", "grant\r", "revoke\r", "grant,", "-s", "\xe4"]
BAD_TYPES = ["-x", "s", "-S", "-A", "-e", "-E", "--s", "-", "-sa", "-s:", "grant", "\t-s", "-s\t",
             "s-", "-ss", "\xad", "-\xe4", "-r\r", "*", "-1"]


def line(keyword, words=None):
    return " ".join([keyword] + (GOOD[keyword] if words is None else words))


def every_word():
    """Each word of each table, granted and revoked."""
    for word, grant in itertools.product(KEYWORDS[SYSCALL], ("grant", "revoke")):
        yield f"{word} {grant}", line("-s", [word, grant])
    for word, grant in itertools.product(KEYWORDS[CAPABILITY], ("grant", "revoke")):
        yield f"{word} {grant}", line("-c", [word, grant])
    for label, kind, grant in itertools.product(LABELS, KEYWORDS[OBJECT_ACCESS], ("grant", "revoke")):
        yield f"object {label} {kind} {grant}", line("-a", [label, kind, grant])
    for label, kind, grant in itertools.product(LABELS, KEYWORDS[SOCKET], ("grant", "revoke")):
        yield f"socket {label} {kind} {grant}", line("-u", [label, kind, grant])
    for target, kind, grant in itertools.product(DOMAINS, KEYWORDS[DOM_TRANS], ("grant", "revoke")):
        yield f"transition {target} {kind} {grant}", line("-d", ["tool", target, kind, grant])
    for label, second in itertools.product(LABELS, LABELS):
        yield f"creation {label} {second}", line("-f", [label, second, "regular", "grant"])
    for kind, grant in itertools.product(KEYWORDS[FILE_CREATION], ("grant", "revoke")):
        yield f"creation {kind} {grant}", line("-f", ["spool", "data", kind, grant])
    numbers = [["80"], ["0"], ["0x50"], ["80", "90"], ["90", "80"], ["-1"], ["eighty"]]
    for check, params in itertools.product(KEYWORDS[PARAM_CHECK], numbers):
        yield f"{check} {' '.join(params)}", line("-p", [check] + params + ["grant"])
    for domain in DOMAINS:
        yield f"domain {domain} as label", line("-a", [domain, "read", "grant"])
        yield f"domain {domain} as second label", line("-f", ["tool", domain, "fifo", "grant"])


def word_counts():
    """Each kind with none to seven words behind its keyword, the grant word last."""
    for keyword, good in GOOD.items():
        filler = good[:-1] if keyword != "-r" else good
        for count in range(8):
            last = good[-1:] if count else []
            words = (filler + ["more"] * 7)[:max(count - 1, 0)] + last
            yield f"{keyword} with {count} words", line(keyword, words)


def bad_grants():
    for keyword, word in itertools.product([k for k in GOOD if k != "-r"], BAD_GRANTS):
        yield f"{keyword} with grant word {word!r}", line(keyword, GOOD[keyword][:-1] + [word])
    for keyword in GOOD:
        yield f"{keyword} with the grant word first", line(keyword, GOOD[keyword][::-1])


def near_misses(word):
    return [word.upper(), word[:-1], word + "s", word + "\t", "\t" + word, word + "\r",
            word[0] + "\0" + word[1:], "no_such_word", "\xff" + word]


def bad_words():
    """Each word of each kind, a little wrong."""
    for keyword, good in GOOD.items():
        for index in range(len(good) - 1):
            for number, word in enumerate(near_misses(good[index])):
                words = good[:index] + [word] + good[index + 1:]
                yield f"{keyword} word {index + 1} near miss {number}", line(keyword, words)


def mixed_up_words():
    """Words of the wrong table."""
    samples = {1: "tool", 2: "cap_kill", 3: "bind_port", 4: "list", 5: "enter", 6: "fifo",
               7: "dgram", 8: "reboot", 9: "otherDom", 10: "grant"}
    for keyword, good in GOOD.items():
        for index, (_, sample) in itertools.product(range(len(good) - 1), samples.items()):
            words = good[:index] + [sample] + good[index + 1:]
            yield f"{keyword} word {index + 1} is {sample}", line(keyword, words)


def several_mistakes():
    """Every combination of wrong words: which one is told?"""
    for keyword, good in GOOD.items():
        for wrong in itertools.product((False, True), repeat=len(good)):
            if sum(wrong) < 2:
                continue
            words = [f"wrong{i}" if bad else good[i] for i, bad in enumerate(wrong)]
            places = "".join(str(i + 1) for i, bad in enumerate(wrong) if bad)
            yield f"{keyword} wrong in {places}", line(keyword, words)
        yield f"{keyword} wrong and too long", line(keyword, ["wrong"] * (len(good) + 2))
        yield f"{keyword} wrong and too short", line(keyword, ["wrong"] * (len(good) - 2))


def bad_types():
    for word in BAD_TYPES:
        yield f"type {word!r} alone", word
        yield f"type {word!r} with good words", word + " openat grant"
        yield f"type {word!r} behind a rule", line("-s") + "\n" + word + " x\n" + line("-c")


def files():
    """Files of several lines."""
    for first, second in itertools.product(GOOD, GOOD):
        yield f"{first} then {second}", line(first) + "\n" + line(second) + "\n"
        yield f"{first} then bad {second}", line(first) + "\n" + second + "\n" + line(first) + "\n"
    for bad in range(1, 11):
        rules = [line(keyword) for keyword in itertools.islice(itertools.cycle(GOOD), 10)]
        rules[bad - 1] = "-c cap_kill Grant"
        yield f"bad line {bad} of ten", "\n".join(rules) + "\n"
        yield f"bad line {bad} between blank lines", "\n\n# more\n".join(rules) + "\n"
    every = [line(keyword) for keyword in GOOD]
    yield "all kinds", "\n".join(every) + "\n"
    yield "all kinds backwards", "\n".join(every[::-1]) + "\n"
    yield "all kinds without last line feed", "\n".join(every)
    for keyword, good in GOOD.items():
        yield f"{keyword} twice", f"{line(keyword)}\n{line(keyword)}\n"
        if keyword != "-r":
            revoked = line(keyword, good[:-1] + ["revoke"])
            yield f"{keyword} granted and revoked", f"{line(keyword)}\n{revoked}\n"
            yield f"{keyword} revoked and granted", f"{revoked}\n{line(keyword)}\n"
    yield "nothing", ""
    yield "only comments", "# a\n  # b\n#\n"
    yield "only blanks", "\n \n  \n"
    yield "a hundred rules", "\n".join(f"-r /path/{number} r" for number in range(100)) + "\n"


def shapes(good, other):
    """Ways to write the line `good` in a file in which `other` follows."""
    words = good.split(" ")
    yield "plain", f"{good}\n{other}\n"
    yield "no line feed at all", good
    yield "leading spaces", f"   {good}\n{other}\n"
    yield "trailing spaces", f"{good}   \n{other}\n"
    yield "repeated spaces", "  ".join(words) + f"\n{other}\n"
    yield "comment behind", f"{good} # why\n{other}\n"
    yield "comment joined", f"{good}# why\n{other}\n"
    yield "comment within the last word", f"{good[:-1]}#{good[-1]}\n{other}\n"
    yield "comment in front", f"# {good}\n{other}\n"
    yield "comment after spaces", f"   #{good}\n{other}\n"
    yield "comment with a comment", f"{good} # a # b\n{other}\n"
    yield "tabs for spaces", "\t".join(words) + f"\n{other}\n"
    yield "tab in front", f"\t{good}\n{other}\n"
    yield "tab behind", f"{good}\t\n{other}\n"
    yield "tab line", f"\t\n{good}\n"
    yield "carriage returns", f"{good}\r\n{other}\r\n"
    yield "carriage return behind a space", f"{good} \r\n{other}\n"
    yield "carriage return alone", f"{good}\r{other}\n"
    yield "carriage return in a comment", f"{good} #\r\n{other}\n"
    yield "vertical tab", f"{good}\v\n{other}\n"
    yield "form feed line", f"\f\n{good}\n"
    yield "no-break space", good.replace(" ", "\xa0") + f"\n{other}\n"
    yield "byte order mark", f"\xef\xbb\xbf{good}\n{other}\n"
    yield "backslash at the end", f"{good} \\\n{other}\n"
    yield "backslash before the line feed", f"{good}\\\n{other}\n"
    yield "quotes", f'"{good}"\n{other}\n'
    yield "quoted word", " ".join(words[:-1] + [f'"{words[-1]}"']) + f"\n{other}\n"
    yield "NUL behind", f"{good}\0 rest\n{other}\n"
    yield "NUL in front", f"\0{good}\n{other}\n"
    yield "NUL within a word", f"{good[:-1]}\0{good[-1]}\n{other}\n"
    yield "NUL behind a space", f"{good} \0x\n{other}\n"
    yield "NUL in a comment", f"{good} # a\0b\n{other}\n"
    yield "blank lines before", f"\n\n\n{good}\n{other}\n"
    yield "two on one line", f"{good} {other}\n{other}\n"
    yield "semicolon between", f"{good};{other}\n"
    yield "upper case", f"{good.upper()}\n{other}\n"
    yield "empty line at the end", f"{good}\n{other}\n\n"
    for length in (1022, 1023, 1024, 1025, 2047):
        yield f"padded to {length}", f"{good.ljust(length)}\n{other}\n"
        yield f"pushed to {length}", f"{good.rjust(length)}\n{other}\n"
        yield f"commented to {length}", f"{(good + ' ').ljust(length, '#')}\n{other}\n"
        yield f"last word of {length}", f"{good.ljust(length, 'y')}\n{other}\n"
        yield f"last line of {length}", f"{other}\n{good.rjust(length)}"
    yield "long line behind a NUL", f"{good}\0{'z' * 1100}\n{other}\n"
    yield "long second line", f"{good}\n{' ' * 1100}{other}\n{other}\n"


def domain_inputs():
    yield from every_word()
    yield from word_counts()
    yield from bad_grants()
    yield from bad_words()
    yield from mixed_up_words()
    yield from several_mistakes()
    yield from bad_types()
    yield from files()
    for keyword in GOOD:
        other = "-d" if keyword == "-s" else "-s"
        for name, text in shapes(line(keyword), line(other)):
            yield f"{keyword} written: {name}", text
    for path in ("/", "//", "relative", "..", "/a/../b", "/a/*", "-r", "grant", "/\xe4", "/a\tb", "*", "~"):
        yield f"path {path!r}", f"-r {path} r\n"
        yield f"path {path!r} without letters", f"-r {path}\n"
    for letters in ("rwx", "rr", "rwxr", "R", "-", "grant", "0777"):
        yield f"letters {letters} are looked at later", f"-r /a {letters}\n"


def object_inputs():
    yield "one name", "tool\n"
    yield "three names", "a\nb\nc\n"
    yield "two names on line two", "a\nb c\nd\n"
    yield "two names on the last line", "a\nb\nc d"
    yield "the same name twice", "a\na\n"
    yield "built-in names", "unlabeled\ntardiskDefault\n"
    yield "nothing", ""
    yield "only comments", "# a\n#b c\n"
    for name in ("x", "-", "-s", "grant", "1", "*", "/a", "a/b", "a.b", "Tool", "\xe4", "a\tb", "a\\b",
                 "n" * 200, "n" * 1023, "n" * 1024, "'a'", "%s", "a;b", "{}", "a=b"):
        yield f"name {name[:20]!r} of {len(name)}", f"{name}\nafter\n"
        yield f"name {name[:20]!r} of {len(name)} and a second", f"{name} more\nafter\n"
    for count in range(2, 8):
        yield f"{count} names on a line", " ".join("abcdefgh"[:count]) + "\n"
    for bad in range(1, 6):
        names = ["a", "b", "c", "d", "e"]
        names[bad - 1] += " more"
        yield f"bad line {bad} of five", "\n".join(names) + "\n"
        yield f"bad line {bad} between comments", "\n# x\n\n".join(names) + "\n"
    for name, text in shapes("toolLabel", "other"):
        yield f"written: {name}", text


def file_label_inputs():
    paths = ["/bin/ls", "/", "//", "/a/", "/a/b/c", "relative", "./a", "../a", "/a/../b", ".",
             "/*", "/a/*", "/a/b/*", "//*", "/a//*", "/a/*/", "/a/*b", "/*/a", "/*/*", "/a/*/b/*",
             "/a/*/*", "/**", "/a/**", "/*.so", "/a/*.so", "*", "**", "a*", "/a*", "/a*/*", "a/*",
             "*/*", "./*", "/a\\*", "/a?", "/a[b]", "/\xe4/*", "/a\tb", "/a/*\t", "/a/*\r",
             "/" + "p" * 500, "/" + "p" * 500 + "/*"]
    for path in paths:
        yield f"path {path[:20]!r} of {len(path)}", f"{path} tool\n/after data\n"
    for label in LABELS + DOMAINS:
        yield f"label {label}", f"/a {label}\n/b/* {label}\n"
    for label in ("noLabel", "Tool", "tool\t", "tool\r", "tool,", "cap_kill", "read", "1", "2", "\xe4"):
        yield f"unknown label {label!r}", f"/a tool\n/b {label}\n/c tool\n"
        yield f"unknown label {label!r} and bad path", f"/a/*/b {label}\n"
        yield f"unknown label {label!r} and a third word", f"/a/*/b {label} more\n"
    for count in range(1, 7):
        words = ["/a", "tool", "data", "x", "y", "z"][:count]
        yield f"{count} words", "/first tool\n" + " ".join(words) + "\n/last data\n"
    for bad in range(1, 11):
        lines = [f"/path/{number} tool" for number in range(10)]
        for name, wrong in (("count", "/x"), ("path", "/x/*/y tool"), ("label", "/x noLabel")):
            changed = lines[:bad - 1] + [wrong] + lines[bad:]
            yield f"bad {name} in line {bad} of ten", "\n".join(changed) + "\n"
    yield "the same file twice", "/a tool\n/a data\n"
    yield "a tree and a file in it", "/a/* tool\n/a/b data\n"
    yield "the words exchanged", "tool /a\n"
    yield "nothing", ""
    yield "only comments", "# /a tool\n"
    for name, text in shapes("/opt/tool/* tool", "/a data"):
        yield f"written: {name}", text


def tardisk_inputs():
    for label, domain in itertools.product(LABELS, DOMAINS):
        yield f"{label} into {domain}", f"-E {label} {domain}\n"
    for domain in ("noDom", "hostdom", "appDom\t", "appDom\r", "tool", "0", "grant", "\xe4"):
        yield f"unknown domain {domain!r}", f"-E tool {domain}\n"
    for label in ("noLabel", "Unlabeled", "tool\t", "appDom", "2", "\xe4", "cap_kill"):
        yield f"unknown label {label!r}", f"-E {label} otherDom\n"
        yield f"unknown label {label!r} and domain", f"-E {label} noDom\n"
    for count in range(7):
        yield f"{count} words", " ".join(["-E"] + ["tool", "appDom", "x", "y", "z", "w"][:count]) + "\n"
    for word in ("-X", "E", "-e", "--E", "-E:", "-", "-s", "-EE", "grant", "\t-E", "-E\t", "\xe4"):
        yield f"type {word!r}", f"{word} tool appDom\n"
        yield f"type {word!r} behind a rule", f"-E tool appDom\n{word} tool appDom\n"
    seconds = {"same": "-E tool appDom", "other": "-E data otherDom", "short": "-E", "long": "-E a b c",
               "unknown domain": "-E tool noDom"}
    for name, second in seconds.items():
        yield f"second rule: {name}", f"-E tool appDom\n{second}\n"
        yield f"second rule after lines: {name}", f"# x\n-E unlabeled appDom\n\n\n{second}\n"
    yield "nothing", ""
    yield "only comments", "# -E tool appDom\n"
    for name, text in shapes("-E tool otherDom", "# nothing more"):
        yield f"written: {name}", text


def lexical_inputs():
    for name, text in shapes("first second third", "other line"):
        yield name, text
    for number in range(256):
        if chr(number) not in "\n\0# ":
            yield f"byte {number}", f"a{chr(number)}b {chr(number)} c\n{chr(number)}\nd\n"
    yield "no bytes", ""
    yield "one line feed", "\n"
    yield "many line feeds", "\n" * 50 + "a"
    yield "one word", "a"
    yield "one space", " "
    yield "only NUL", "\0"
    yield "NUL and line feed", "\0\na\n"
    yield "many hundred words", "w " * 511 + "\nafter\n"
    yield "words to the last character", "w " * 511 + "w\nafter\n"
    yield "a word cut at the limit", "w " * 511 + "wx\nafter\n"
    for gap in range(1, 6):
        yield f"{gap} spaces between", f"a{' ' * gap}b{' ' * gap}c\n"
        yield f"{gap} comments", "#" * gap + " a\nb\n"


def permission_inputs():
    for length in range(4):
        for letters in map("".join, itertools.product("rwxRt-", repeat=length)):
            yield f"letters {letters}", letters
    for letters in ("rwxr", "rwxrwx", "none", "----", "0777", "rrrr", "rwxq", "\xe4\xe4\xe4\xe4"):
        yield f"letters {letters}", letters
    for letters in ("\t", "r\t", "r\r", "\xe4", "r,w", "r|w", "7", "*"):
        yield f"letters {letters!r}", letters


# ---- The files.


def cases(inputs, key, expect):
    names = set()
    for name, text in inputs:
        if name in names:
            raise ValueError(f"two cases are called {name!r}")
        names.add(name)
        yield {"case": name, key: text, **expect(text)}


def corpus():
    suites = {
        "lexical": cases(lexical_inputs(), "file", lambda text: {"lines": [
            [number] + words for number, words in read_file(text).items()]}),
        "domains": cases(domain_inputs(), "file", expect_domain),
        "objects": cases(object_inputs(), "file", expect_objects),
        "file_labels": cases(file_label_inputs(), "file", expect_file_labels),
        "tardisks": cases(tardisk_inputs(), "file", expect_tardisk),
        "permissions": cases(permission_inputs(), "letters", expect_permissions),
    }
    files = {f"{name}.jsonl": "".join(json.dumps(case) + "\n" for case in suite)
             for name, suite in suites.items()}
    words = {"domain": DOMAIN, "labels": LABELS, "domains": DOMAINS,
             "launchDomains": LAUNCH_DOMAINS, "tardisk": TARDISK,
             "keywords": {str(kind): table for kind, table in KEYWORDS.items()}}
    files["words.json"] = json.dumps(words, indent=1) + "\n"
    return files


def main():
    files = corpus()
    if sys.argv[1:] == ["--check"]:
        stale = [name for name, text in files.items() if (HERE / name).read_text() != text]
        if stale:
            sys.exit(f"not what tests/corpus/generate.py writes: {', '.join(stale)}")
        return
    for name, text in files.items():
        (HERE / name).write_text(text)
        print(f"{name}: {text.count(chr(10))} lines")


if __name__ == "__main__":
    main()
