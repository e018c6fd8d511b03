#!/usr/bin/env python3
"""large_policy.py DIR DOMAINS RULES: writes a policy into the directory DIR: so many domains in groups that
enter each other, with so many rules each."""

import pathlib
import random
import sys

GROUP = 12
CALLS = ["read", "write", "openat", "close", "mmap", "futex", "clone", "ptrace", "mount", "socket"]
OBJECTS = [f"object{number}" for number in range(40)]
ACCESSES = ["read", "write", "execute", "list", "remove", "truncate"]


def rules_of(number, names, count, chance):
    group = number - number % GROUP
    targets = {names[chance.randrange(group, min(group + GROUP, len(names)))] for _ in range(2)}
    targets |= {names[chance.randrange(len(names))]} if chance.random() < 0.1 else set()
    yield from (f"-d object{number % 40} {target} exec grant" for target in sorted(targets - {names[number]}))
    yield from (f"-s {call} grant" for call in chance.sample(CALLS, 4))
    for name in chance.sample(OBJECTS, 8):
        yield f"-a {name} {chance.choice(ACCESSES)} {chance.choice(['grant', 'grant', 'revoke'])}"
    yield from (f"-r /srv/{number}/{place // 50}/file{place} {chance.choice(['r', 'rw', 'rx', ''])}".rstrip()
                for place in range(count - 14))


def write(directory, domains, rules):
    chance = random.Random(1)
    root = pathlib.Path(directory)
    for folder in ("objects", "domains", "fileLabels"):
        (root / folder).mkdir(parents=True)
    (root / "objects" / "all").write_text("".join(f"{name}\n" for name in OBJECTS))
    labels = "".join(f"/srv/{number}/* object{number % 40}\n" for number in range(domains))
    (root / "fileLabels" / "all").write_text(labels)
    # Each a beginning of its own, as names of people's programs have.
    names = [f"{'abcdefghijklmnopqrstuvwxyz'[number % 26]}{number}Dom" for number in range(domains)]
    for number, name in enumerate(names):
        text = "".join(f"{rule}\n" for rule in rules_of(number, names, rules, chance))
        (root / "domains" / name).write_text(text)


if __name__ == "__main__":
    write(sys.argv[1], int(sys.argv[2]), int(sys.argv[3]))
