#!/usr/bin/env python3
"""Holds what `secpolicy lsp` tells while files are edited against what `secpolicy check` finds in the same
files when they are saved: problems, places and hints, of policy trees and edits by chance.

usage: same_as_check.py [--trees N] [--seed S] COMMAND

A tree that fails is told with its seed."""

import argparse
import json
import os
import pathlib
import random
import shutil
import subprocess
import sys
import tempfile

SOURCE = pathlib.Path(__file__).resolve().parent.parent.parent
sys.path.insert(0, str(SOURCE / "tests/generated"))
import policy_trees  # noqa: E402
from client import Client  # noqa: E402

EDITS = 12
ODD_LINES = ["-a tol read grant", "-s read grant  # \U0001f600 \U0001f600", "\U0001f600-s read grant", "-s read grant\r",
             "-s\tread\U0001f600 grant", "-s re\0ad grant", "-a hostDom read grant", "-d tool plugin-part exec grant",
             "-d tool plugin-part exec revoke", "-d tool oneDm exec grant", "-s read grant" + " " * 1100 + "x", "",
             "\U0001f600 tool", "tol", "spool", "other", "/srv/a data", "/srv/* dta", "-E tool appDom"]


def units(text):
    """How many units of UTF-16 it takes."""
    return len(text.encode("utf-16-le")) // 2


def place(text, offset):
    """The place in a text as editors count: a carriage return ends a line, too."""
    before = text[:offset]
    if before.endswith("\r") and text[offset:offset + 1] == "\n":
        before = before[:-1]
    before = before.replace("\r\n", "\n").replace("\r", "\n")
    return {"line": before.count("\n"), "character": units(before.rpartition("\n")[2])}


def expected(text, problem):
    begin = end = 0
    if "line" in problem:
        start = sum(len(line) + 1 for line in text.split("\n")[:problem["line"] - 1])
        # What the check shows of a long line ends earlier.
        stop = start + len(text.split("\n")[problem["line"] - 1])
        begin = min(start + problem["column"] - 1, stop)
        end = min(begin + problem["length"], stop)
    hint = "\n" + problem["hint"] if "hint" in problem else ""
    return {"range": {"start": place(text, begin), "end": place(text, end)},
            "severity": 1 if problem["severity"] == "error" else 2, "code": problem["code"],
            "source": "secpolicy", "message": problem["message"] + hint}


class Edited:
    """A policy that is edited in a server, and saved elsewhere as it is."""

    def __init__(self, command, root, policy, chance, *options):
        self.command, self.root, self.policy, self.chance = command, root, policy, chance
        self.options = options
        self.client = Client(root, *options)
        self.client.start()

    def files(self):
        found = []
        for directory, _, names in os.walk(self.policy):
            found += [pathlib.Path(directory) / name for name in names]
        return sorted(path for path in found if not path.is_symlink())

    def edit(self):
        path = self.chance.choice(self.files())
        client = self.client
        if path not in client.texts:
            client.open(path)
        text = client.texts[path]
        lines = text.split("\n")
        at = self.chance.randrange(len(lines))
        lines[at:at + self.chance.randint(0, 1)] = [self.some_line()]
        self.apply(path, "\n".join(lines))

    def some_line(self):
        chance = self.chance
        if chance.random() < 0.4:
            return chance.choice(ODD_LINES)
        lines = chance.choice(self.files()).read_bytes().decode().split("\n")
        return chance.choice(lines)

    def apply(self, path, new):
        """As the whole text, or by what differs."""
        client = self.client
        old = client.texts[path]
        if self.chance.random() < 0.3:
            client.change(path, new)
        else:
            begin = len(os.path.commonprefix([old, new]))
            end = len(os.path.commonprefix([old[begin:][::-1], new[begin:][::-1]]))
            old_end, new_end = len(old) - end, len(new) - end
            # Editors change whole characters and whole line ends.
            while begin > 0 and old[begin - 1] == "\r":
                begin -= 1
            while end > 0 and old[old_end:old_end + 1] == "\n":
                old_end, new_end, end = old_end + 1, new_end + 1, end - 1
            span = {"start": place(old, begin), "end": place(old, old_end)}
            client.change(path, (span, new[begin:new_end]))
        client.texts[path] = new
        # The file is as it will be when it is saved; the server looks at its own text.
        path.write_bytes(new.encode())

    def compare(self):
        self.client.sync()
        told = {path: found["diagnostics"] for path, found in self.client.problems.items() if found["diagnostics"]}
        inside = "/" + str(self.policy.relative_to(self.root))
        words = [self.command, "--root", str(self.root), "check", *self.options, "--format", "json", inside]
        report = json.loads(subprocess.run(words, capture_output=True, check=False).stdout)
        found = {}
        for problem in report["problems"]:
            path = pathlib.Path(problem["file"])
            text = path.read_bytes().decode(errors="replace") if path.is_file() else ""
            found.setdefault(str(path), []).append(expected(text, problem))
        for problems in [*told.values(), *found.values()]:
            problems.sort(key=lambda each: json.dumps(each, sort_keys=True))
        if told != found:
            for path in sorted(set(told) | set(found)):
                mine, theirs = told.get(path, []), found.get(path, [])
                for each in [each for each in mine if each not in theirs]:
                    print(f"only lsp:   {path}: {each}")
                for each in [each for each in theirs if each not in mine]:
                    print(f"only check: {path}: {each}")
            raise AssertionError("lsp and check find other problems")


def run_edits(edited):
    with edited.client as client:
        for number in range(EDITS):
            edited.edit()
            if number % 3 == 2:
                edited.edit()
            edited.compare()
        path = edited.chance.choice(list(client.texts))
        client.close(path)
        edited.compare()
        assert client.stop() == 0, "the server ends badly"
        assert not client.shown, client.shown


def run_tree(command, seed):
    chance = random.Random(seed)
    with tempfile.TemporaryDirectory() as directory:
        root = pathlib.Path(directory) / "r"
        root.mkdir()
        host = policy_trees.Host(command, str(root))
        host.make()
        tree = policy_trees.Tree(chance, chance.random() < 0.3)
        host.write(tree)
        run_edits(Edited(command, root, root / policy_trees.POLICY, chance, "--fresh"))


def run_installed(command, seed):
    """Of a host with an installed policy, whose files can be labelled."""
    with tempfile.TemporaryDirectory() as directory:
        root = pathlib.Path(directory) / "r"
        subprocess.run([SOURCE / "scripts/pack-example", root], check=True)
        subprocess.run([command, "--root", root, "boot"], check=True, capture_output=True)
        shutil.copytree(root / policy_trees.POLICY, root / "new")
        run_edits(Edited(command, root, root / "new", random.Random(seed)))


def main():
    arguments = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    arguments.add_argument("--trees", type=int, default=3000 if os.environ.get("SECPOLICY_LONG_TESTS") else 15)
    arguments.add_argument("--seed", type=int, default=1)
    arguments.add_argument("command")
    given = arguments.parse_args()
    os.environ["SECPOLICY"] = given.command
    for seed in range(given.seed, given.seed + given.trees):
        try:
            run_tree(given.command, seed)
            if seed % 5 == 0:
                run_installed(given.command, seed)
        except Exception:
            print(f"seed {seed}:", file=sys.stderr)
            raise
    print(f"{given.trees} trees: the same problems")


if __name__ == "__main__":
    main()
