#!/usr/bin/env python3
"""Holds what "secpolicy why" says against what the kernel does.

usage: domains.py COMMAND PROBE WELL [--user ID] [--first SEED] [--roots COUNT] [--domains COUNT] [--tries COUNT]

Makes small roots with files, labels and domains by chance, boots each, and tries operations of every
kind in every domain by "secpolicy run --best-effort": what `why` refuses has to fail, unless the rule
that refuses is told not to be expressible on this kernel; what it grants has to work, unless one of the
rules behind the answer is told to be narrowed. A root that fails is told with its seed."""

import errno
import json
import os
import re
import shutil
import stat

from small_roots import Failure, SmallRoot, main, parser_for

LABELS = ["one", "two", "three"]
DIRECTORIES = ["t", "t/a", "t/a/b", "t/a/b/c", "t/d", "t/d/e"]
# With so many more a directory is not taken apart.
CROWD = [f"x{number}" for number in range(65)]
FILES = [f"{directory}/f{number}" for directory in DIRECTORIES for number in range(2)]
FILE_KINDS = ["regular", "directory", "symlink", "fifo", "char_device"]
SOCKET_KINDS = {"stream": 1, "dgram": 2, "seqpacket": 5}
ACCESSES = ["read", "write", "execute", "list", "remove", "truncate"]
# Calls that fail otherwise than by a refusal when their arguments mean nothing.
CALLS = ["close", "dup", "dup2", "epoll_ctl", "fchdir", "fcntl", "fdatasync", "flock", "fstat", "fsync",
         "ftruncate", "getcwd", "getpgid", "getpriority", "getrusage", "getsockname", "lseek", "listen",
         "munmap", "newfstatat", "pipe2", "read", "readv", "sched_getaffinity", "shutdown", "sysinfo",
         "timer_settime", "times", "uname", "wait4", "write", "accept4", "getpeername", "statx", "capget"]
SETS = ["@file", "@io", "@network", "@process", "@signal", "@clock", "@memory", "@identity", "@attributes"]
CAPABILITIES = {"cap_chown": 0, "cap_dac_override": 1, "cap_kill": 5, "cap_setuid": 7, "cap_net_raw": 13,
                "cap_sys_chroot": 18, "cap_mknod": 27}
CHECKS = {
    "socket_family": ["1", "2", "10", "16"], "socket_type": ["1", "2", "5"],
    "bind_port": ["4321", "6514", "8080"], "connect_port": ["4321", "6514", "8080"],
    "ioctl_request": ["0x5401", "0x5413", "0x541b", "0x5421"], "prctl_option": ["3", "21", "23", "27", "39"],
    "clone_flags": ["0", "0x200", "0x400", "0x600", "0x8000"], "kill_signal": ["0", "17", "23", "28"],
    "set_uid": ["0", "7", "1000"], "set_gid": ["0", "7", "1000"],
}
# What a probe needs in any domain.
BASE = ["-r /probe rx", "-s @start grant", "-s clone grant", "-s wait4 grant", "-s fork grant"]
NEVER_REVOKED = ["@file", "@io", "@process", "@memory", "@signal", "write", "wait4", "newfstatat", "munmap"]
# How the library of C forks.
FORK = ["pass", "clone_flags", "0x1200011"]
REFUSALS = {errno.EPERM, errno.EACCES, errno.ENOSYS}


def grant(chance):
    return chance.choice(["grant", "grant", "grant", "revoke"])


def some_rule(chance):
    kind = chance.choice("rrraaafucppsss")
    path = "/" + chance.choice(DIRECTORIES + FILES + ["t/new", "t/a/new", "probe"])
    if kind == "r":
        return ("-r " + path + " " + chance.choice(["", "r", "rw", "rx", "rwx", "w", "rw", "x"])).rstrip()
    if kind == "a":
        return f"-a {chance.choice(LABELS)} {chance.choice(ACCESSES)} {grant(chance)}"
    if kind == "f":
        return f"-f {chance.choice(LABELS)} {chance.choice(LABELS)} {chance.choice(FILE_KINDS)} {grant(chance)}"
    if kind == "u":
        return f"-u {chance.choice(LABELS)} {chance.choice(list(SOCKET_KINDS))} {grant(chance)}"
    if kind == "c":
        return f"-c {chance.choice(list(CAPABILITIES))} {grant(chance)}"
    if kind == "s":
        word = chance.choice(CALLS + SETS * 2)
        return f"-s {word} {'grant' if word in NEVER_REVOKED else grant(chance)}"
    check = chance.choice(list(CHECKS))
    return f"-p {check} {chance.choice(CHECKS[check])} {grant(chance)}"


def narrower_part(chance):
    above, part = chance.choice([("t", "t/a"), ("t", "t/d"), ("t/a", "t/a/b"), ("t/a", "t/a/b/c"), ("t/d", "t/d/e")])
    return [f"-r /{above} {chance.choice(['rx', 'rwx'])}", f"-r /{part} {chance.choice(['', 'r', 'rw'])}".rstrip()]


def some_domain(chance):
    rules = list(BASE)
    rules += [f"-s {word} grant" for word in SETS if chance.random() < 0.6]
    rules += [some_rule(chance) for _ in range(chance.randint(2, 14))]
    if chance.random() < 0.4:
        rules += narrower_part(chance)
    kept, subjects = [], set()
    for rule in rules:
        words = rule.split()
        # Contradicting checks keep a domain out.
        subject = tuple(words[:2] if words[0] == "-r" else words[:-1])
        if subject not in subjects:
            kept.append(rule)
        subjects.add(subject)
    return kept


class Root(SmallRoot):
    def __init__(self, options, chance, path):
        super().__init__(options, path)
        self.lay_files([directory for directory in DIRECTORIES if chance.random() < 0.6])
        self.domains = {f"test{number}Dom": some_domain(chance) for number in range(options.domains)}
        self.lay_policy(LABELS, self.domains,
                        [f"/{place}{'/*' if place in DIRECTORIES and chance.random() < 0.7 else ''} "
                         f"{chance.choice(LABELS)}" for place in chance.sample(DIRECTORIES + FILES, 6)])
        self.call("boot")

    def lay_files(self, crowded):
        for directory in DIRECTORIES:
            os.makedirs(self.at(directory), exist_ok=True)
        for directory in crowded:
            for name in CROWD:
                open(self.at(directory, name), "x", encoding="utf-8").close()
        if os.geteuid() == 0:
            os.makedirs(self.at("dev"))
            os.mknod(self.at("dev/null"), 0o666 | stat.S_IFCHR, os.makedev(1, 3))
        for file in FILES:
            shutil.copy(self.options.well, self.at(file))
        shutil.copy(self.options.probe, self.at("probe"))

    def renew(self, made):
        """Puts the files back, in place where it can, so that they keep their labels."""
        for path in made:
            there = self.at(path[1:])
            if os.path.isdir(there) and not os.path.islink(there):
                os.rmdir(there)
            elif os.path.lexists(there):
                os.remove(there)
        for file in FILES:
            with open(self.options.well, "rb") as well, open(self.at(file), "r+b") as copy:
                copy.write(well.read())


# ---- Tries: what the probe does, and what `why` has to say yes to


def some_try(chance, taken, is_root):
    action = chance.choice(["read", "write", "list", "truncate", "empty", "exec", "make", "make", "make-socket", "call", "call",
                            "use", "pass", "pass"])
    if action == "empty":
        path = "/" + chance.choice(FILES)
        return [action, path], [["read", path], ["truncate", path], ["call", "openat"]]
    if action in ("read", "write", "truncate", "exec"):
        path = "/" + chance.choice(FILES)
        call = {"read": "openat", "write": "openat", "truncate": "truncate", "exec": "execve"}[action]
        return [action, path], [[action, path], ["call", call]] + [FORK] * (action == "exec")
    if action == "list":
        path = "/" + chance.choice(DIRECTORIES)
        return [action, path], [["list", path], ["call", "openat"]]
    if action in ("make", "make-socket"):
        path = "/" + chance.choice(DIRECTORIES) + "/" + chance.choice(["new", f"n{len(taken)}"])
        if path in taken:
            return None
        taken.add(path)
        if action == "make-socket":
            kind = chance.choice(list(SOCKET_KINDS))
            return [action, path, kind], [[action, path, kind], ["call", "socket"], ["call", "bind"],
                                          ["pass", "socket_family", "1"],
                                          ["pass", "socket_type", str(SOCKET_KINDS[kind])]]
        kind = chance.choice(FILE_KINDS if is_root else FILE_KINDS[:-1])
        call = {"directory": "mkdirat", "symlink": "symlinkat"}.get(kind, "mknodat")
        needed = [[action, path, kind], ["call", call]]
        return [action, path, kind], needed + ([["use", "cap_mknod"]] if kind == "char_device" else [])
    if action == "call":
        call = chance.choice(CALLS)
        return [action, call], [["call", call]]
    if action == "use":
        capability = chance.choice(list(CAPABILITIES))
        return [action, str(CAPABILITIES[capability])], [["use", capability], ["call", "capget"]]
    check = chance.choice(list(CHECKS))
    number = chance.choice(CHECKS[check])
    socket = [["call", "socket"], ["pass", "socket_family", "2"], ["pass", "socket_type", "1"]]
    needed = {
        "socket_family": [["call", "socket"], ["pass", "socket_type", "2"]],
        "socket_type": [["call", "socket"], ["pass", "socket_family", "1"]],
        "bind_port": socket + [["call", "bind"]], "connect_port": socket + [["call", "connect"]],
        "ioctl_request": [["call", "ioctl"]], "prctl_option": [["call", "prctl"]],
        "clone_flags": [["call", "clone"]], "kill_signal": [["call", "kill"]],
        "set_uid": [["call", "setuid"], FORK] + ([["use", "cap_setuid"]] if number != "0" else []),
        "set_gid": [["call", "setgid"], FORK] + ([["use", "cap_setgid"]] if number != "0" else []),
    }[check]
    if not is_root and check in ("set_uid", "set_gid"):
        return None
    return ["pass", check, number], [["pass", check, number]] + needed


class Oracle:
    """What `why` says of one domain, each question asked once."""

    def __init__(self, root, domain):
        self.root = root
        self.domain = domain
        self.answers = {}
        told = json.loads(root.start("features", "--for", domain, "--format", "json").stdout)
        self.masks = len(re.findall("^(hidden by a mount|mounted so that nothing is executed): ",
                                    root.start("run", domain, "--explain").stdout, re.MULTILINE))
        self.told = {rule["rule"] for rule in told["rules"] if rule["fate"] != "enforced"}
        self.surrendered = {rule["rule"] for rule in told["rules"] if rule["fate"] == "notExpressible"}

    def answer(self, question):
        key = tuple(question)
        if key not in self.answers:
            self.answers[key] = self.root.tell("why", self.domain, *question)
        return self.answers[key]

    def grants(self, questions):
        return all(self.answer(question)["allowed"] for question in questions)

    def is_told(self, questions):
        return any(rule in self.told for rule in self.rules_behind(questions))

    def is_surrendered(self, questions):
        refused = [question for question in questions if not self.answer(question)["allowed"]]
        return all(any(rule in self.surrendered for rule in self.rules_behind([question])) for question in refused)

    def rules_behind(self, questions):
        return [rule["text"] for question in questions for rule in self.answer(question)["rules"]]


def try_in(root, domain, tries):
    words = []
    for probe, _ in tries:
        words += [","] * bool(words) + probe
    done = root.start("run", domain, "--best-effort", "--", "/probe", *words)
    results = [int(line) for line in done.stdout.split()]
    if len(results) != len(tries):
        raise Failure(f"run {domain} ended with {done.returncode} after {len(results)} of {len(tries)}: {done.stderr}")
    return results


def check_domain(root, domain, chance, count, tally):
    is_root = os.geteuid() == 0
    taken = set()
    tries = [one for one in (some_try(chance, taken, is_root) for _ in range(count)) if one]
    oracle = Oracle(root, domain)
    tally["masks"] += oracle.masks
    wanted = [oracle.grants(questions) for _, questions in tries]
    results = try_in(root, domain, tries)
    for (probe, questions), is_granted, result in zip(tries, wanted, results):
        works = result not in REFUSALS
        # A file that is hidden is none that can be truncated.
        works = works and (probe[0], result) != ("truncate", errno.EINVAL)
        tally["pairs"] += 1
        if works and not is_granted and oracle.is_surrendered(questions):
            tally["surrendered"] += 1
        elif works and not is_granted:
            raise Failure(f"{domain}: {probe} works, and why refuses it")
        elif works:
            tally["granted"] += 1
        elif is_granted and oracle.is_told(questions):
            tally["narrowed"] += 1
        elif is_granted:
            raise Failure(f"{domain}: {probe} fails with {errno.errorcode.get(result, result)}, why grants it and no "
                          "rule is told to be narrowed")
        else:
            tally["refused"] += 1
    root.renew([probe[1] for probe, _ in tries if probe[0].startswith("make")])


def check_root(chance, options, path, tally):
    root = Root(options, chance, path)
    for domain in root.domains:
        check_domain(root, domain, chance, options.tries, tally)


if __name__ == "__main__":
    all_options = parser_for(__doc__)
    all_options.add_argument("--tries", type=int, default=52)
    main(all_options, check_root, {"pairs": 0, "granted": 0, "narrowed": 0, "surrendered": 0, "refused": 0, "masks": 0})
