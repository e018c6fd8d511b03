#!/usr/bin/env python3
"""Makes policy trees by chance, good and bad ones, and holds what the verbs of secpolicy say of them
against each other and against the files and labels themselves:

  check      tells an error exactly when the load ends badly
  load       changes what load --plan said, labels of files included, and nothing when it is repeated;
             when it ends well, what is installed is what the files say
  display    written as policy files and booted elsewhere, is displayed again
  why        answers as a model of docs/queries.md that knows nothing of the command
  diff       finds no difference between what is installed and what was just saved
  rollback   puts back what was displayed when it was saved

usage: policy_trees.py [--trees N] [--seed S] [--jobs N] [--keep DIR] COMMAND

A tree that fails is told with the seed of its chain, and the seed makes the same chain again:
--seed SEED --trees N runs it alone up to that tree, --keep DIR leaves its root in DIR. With
SECPOLICY_LONG_TESTS=1 in the environment there are 3000 trees instead of 200.
"""

import argparse
import concurrent.futures
import io
import json
import os
import random
import shutil
import subprocess
import sys
import tarfile
import tempfile
import traceback

POLICY = "etc/zorvan/secpolicy"
NEEDED = ["globalVMDom", "ioFilterDom", "appDom", "daemonFrameworkDom"]
ATTRIBUTES = ["security.bpf.zorvan", "user.zorvan.security"]
TREES_IN_A_CHAIN = 10

OBJECTS = ["tool", "data", "spool", "Mixed.Case-1", "-a", "grant", "f\u00fcr", "o;x", "%s", "a" * 255]
ODD_OBJECTS = ["a" * 256, "b\x1b[1m", "c\tc", "\u202ed"]
DOMAINS = ["hostDom", "oneDom", "twoDom", "d\u00e9j\u00e0Dom", "-r", "x" * 63]
ODD_DOMAINS = ["y" * 64, "left~", "two words", ".hidden", "esc\x1bDom"]
CAPABILITIES = ["cap_chown", "cap_net_raw", "cap_sys_boot", "cap_kill"]
CHECKS = ["bind_port", "set_uid", "kill_signal", "clone_flags"]
ACCESSES = ["read", "write", "execute", "list", "remove", "truncate"]
TRANSITIONS = ["exec", "tardisk_exec", "enter"]
FILE_KINDS = ["regular", "directory", "symlink", "fifo", "char_device", "block_device"]
SOCKET_KINDS = ["stream", "dgram", "seqpacket"]
CALLS = ["read", "openat", "ptrace", "reboot", "mount"]
CALL_SETS = {"@start": ["read", "openat"], "@file": ["openat"], "@privileged": ["reboot"]}  # their members in CALLS
BUILT_IN = ["unlabeled", "tardiskDefault"]

DIRECTORIES = ["srv", "srv/b", "srv/b/deep", "srv/f\u00fcr", "opt", "opt/-x"]
FILES = ["srv/a", "srv/b/c", "srv/b/deep/d", "srv/f\u00fcr/e", "srv/b*", "opt/-x/f", "opt/g\x1b[1m"]
LINKS = {"srv/toB": "b", "opt/toA": "/srv/a", "opt/dangling": "/nowhere", "srv/loop": "loop"}
HARD_LINKS = {"opt/again": "srv/a"}
MISSING = ["/nope", "/srv/a/under", "/" + "n" * 256, "srv/a", "/srv/b//c", "/srv/"]

MALFORMED = ["-x y", "-a", "-a tool read", "-a tool read Grant", "-s read grant grant", "-s reed grant",
             "-a nothing read grant", "-c cap_none grant", "-d tool noDom exec grant", "-r", "-r /srv rr",
             "-r /srv rwz", "-r /srv r w", "-s\tread grant", "-p bind_port ten grant", "-p bind_port 9 1 grant",
             "-p bind_port 5000000000 grant", "grant", "\u202e-s read grant", "-s read grant\r", "-E tool appDom",
             "-p bind_port -1 grant", "-p clone_flags 1 2 grant", "-u tool tcp grant", "-f tool data door grant"]
HARMLESS = ["", "   ", "# a comment", "-s read grant # why", "  -s   read   grant  ", "-s openat revoke"]


class Failure(Exception):
    pass


def expect(is_so, what):
    if not is_so:
        raise Failure(what)


# ---- Trees


def grant(chance):
    return chance.choice(["grant", "grant", "grant", "revoke"])


def number(chance):
    return chance.choice(["0", "7", "22", "0x50", "1024", "65535", "4294967296"])


def some_path(chance):
    there = ["/" + path for path in DIRECTORIES + FILES + list(LINKS)] + ["/"]
    return chance.choice(there * 2 + MISSING)


class Tree:
    """The files of a policy, by path below the policy directory."""

    def __init__(self, chance, is_good):
        self.chance = chance
        self.is_good = is_good
        self.badness = 0 if is_good else chance.choice([0.01, 0.05, 0.15])
        self.files = {}
        self.names = chance.sample(OBJECTS, chance.randint(2, len(OBJECTS)))
        if not is_good and chance.random() < 0.1:
            self.names.append(chance.choice(ODD_OBJECTS))
        self.domains = chance.sample(DOMAINS, chance.randint(1, len(DOMAINS)))
        if chance.random() < 0.1:
            self.domains.append(chance.choice(ODD_DOMAINS if not is_good else ODD_DOMAINS[1:]))
        needed = list(NEEDED)
        if not is_good and chance.random() < 0.1:
            needed.remove(chance.choice(needed))
        self.all_domains = self.domains + needed
        self.add_objects()
        for name in self.all_domains:
            self.add("domains/" + name, self.rules(chance.choice([0, 1, 5, 20])))
        if chance.random() < 0.3:
            self.add("domains/plugins/part", self.rules(3))
        if chance.random() < 0.3:
            # The domains of the full policy are not there yet.
            self.add("early/domains/" + chance.choice(self.all_domains),
                     [rule for rule in self.rules(4) if not rule.startswith("-d")])
        for name in ["l1", "l2"][: chance.randint(0, 2)] or ["none"]:
            self.add("fileLabels/" + name, [self.label_line() for _ in range(chance.choice([0, 1, 4]))])
        # What tardisks brought is written over in its place; what they did not bring comes from none.
        if chance.random() < 0.1:
            self.add("tardisks/part", [f"-E {self.label()} {chance.choice(needed)}"])
        if chance.random() < self.badness:
            self.add("tardisks/" + chance.choice(["late", "inner/"]), ["-E unlabeled appDom"])

    def add(self, path, lines):
        chance = self.chance
        lines = list(lines)
        for _ in range(chance.choice([0, 0, 1, 2]) if path.startswith("domains") else 0):
            lines.insert(chance.randint(0, len(lines)), chance.choice(HARMLESS))
        if chance.random() < self.badness:
            lines.insert(chance.randint(0, len(lines)), self.malformed(path))
        text = "\n".join(lines) + chance.choice(["\n", "\n", "\n", "", "\n\n"])
        self.files[path] = text.encode()

    def malformed(self, path):
        chance = self.chance
        if chance.random() < 0.1:
            return "-s read grant" + " " * 1100 + "x"
        if path.startswith("objects"):
            return chance.choice(["two words", "\ufeffmark", "tab\tbed", "#", "x" * 300])
        if path.startswith("fileLabels"):
            return chance.choice(["/srv", "/srv tool data", "/srv/*x tool", "/srv nothing", "/srv hostDom"])
        if path.startswith("tardisks"):
            return chance.choice(["-E tool", "-F tool appDom", "-E nothing appDom", "-E data noDom", "-E data appDom"])
        return chance.choice(MALFORMED)

    def add_objects(self):
        half = len(self.names) // 2
        self.add("objects/one", self.names[:half])
        self.add("objects/two", self.names[half:])

    def label(self):
        return self.chance.choice(self.names + BUILT_IN)

    def rule(self):
        chance = self.chance
        kind = chance.choice("acdfprrsu")
        if kind == "a":
            words = [self.label(), chance.choice(ACCESSES)]
        elif kind == "c":
            words = [chance.choice(CAPABILITIES)]
        elif kind == "d":
            words = [self.label(), chance.choice([name for name in self.all_domains if " " not in name]),
                     chance.choice(TRANSITIONS)]
        elif kind == "f":
            words = [self.label(), self.label(), chance.choice(FILE_KINDS)]
        elif kind == "p":
            low, high = sorted([number(chance), number(chance)], key=lambda text: int(text, 0))
            words = [chance.choice(CHECKS), low]
            if words[0] != "clone_flags" and chance.random() < 0.5:
                words.append(high)
            # What contradicts itself is a mistake; good policies grant.
            return " ".join(["-p"] + words + ["grant" if self.is_good else grant(chance)])
        elif kind == "r":
            letters = "".join(chance.sample("rwx", chance.randint(0, 3)))
            return ("-r " + some_path(chance).replace("\x1b[1m", "") + " " + letters).rstrip()
        elif kind == "s":
            words = [chance.choice(CALLS + list(CALL_SETS))]
        else:
            words = [self.label(), chance.choice(SOCKET_KINDS)]
        return " ".join(["-" + kind] + words + [grant(chance)])

    def rules(self, count):
        return [self.rule() for _ in range(count)]

    def label_line(self):
        chance = self.chance
        if self.is_good or chance.random() < 0.9:
            path = "/" + chance.choice(DIRECTORIES + FILES + ["srv/toB", "opt/toA", "opt/again"])
            is_tree = path[1:] in DIRECTORIES + ["srv/toB"] and chance.random() < 0.5
            return path + ("/*" if is_tree else "") + " " + self.label()
        return chance.choice(MISSING + ["/srv/a/*", "/opt/dangling", "/nope/*"]) + " " + self.label()


# ---- A root and what is seen of it


class Host:
    def __init__(self, command, root):
        self.command = command
        self.root = root
        self.early = {}  # the early policy that was booted, which stays

    def path(self, path):
        return os.path.join(self.root, path)

    def make(self):
        for directory in DIRECTORIES + ["run", "tardisks", "tmp"]:
            os.makedirs(self.path(directory))
        for file in FILES:
            open(self.path(file), "w").close()
        for link, target in LINKS.items():
            os.symlink(target, self.path(link))
        for link, target in HARD_LINKS.items():
            os.link(self.path(target), self.path(link))

    def pack(self, name, files):
        with tarfile.open(self.path("tardisks/" + name), "w") as archive:
            for path, text in files.items():
                entry = tarfile.TarInfo(path)
                entry.size = len(text)
                archive.addfile(entry, io.BytesIO(text))

    def write(self, tree):
        """Replaces the policy, but for what tardisks brought."""
        for part in ["objects", "domains", "fileLabels", "early", "tardisks/inner"]:
            shutil.rmtree(self.path(POLICY + "/" + part), ignore_errors=True)
        for part in ["objects", "domains", "fileLabels"]:
            os.makedirs(self.path(POLICY + "/" + part))
        late = self.path(POLICY + "/tardisks/late")
        if os.path.exists(late):
            os.unlink(late)
        for path, text in tree.files.items():
            if path.startswith("tardisks/part") and not os.path.exists(self.path(POLICY + "/" + path)):
                continue
            os.makedirs(os.path.dirname(self.path(POLICY + "/" + path)), exist_ok=True)
            if not path.endswith("/"):
                with open(self.path(POLICY + "/" + path), "wb") as file:
                    file.write(text)

    def run(self, *words):
        """The exit status, and what went to standard output and to standard error."""
        end = subprocess.run([self.command, "--root", self.root, *words], stdin=subprocess.DEVNULL,
                             capture_output=True, timeout=60)
        expect(0 <= end.returncode <= 3, f"{words} ended with {end.returncode}: {end.stderr}")
        for output in [end.stdout, end.stderr]:
            expect(b"Sanitizer" not in output, f"{words}: {output}")
        return end.returncode, end.stdout, end.stderr

    def ask(self, *words):
        """The exit status and the document of a verb that writes one."""
        status, output, errors = self.run(words[0], "--format", "json", *words[1:])
        try:
            return status, json.loads(output)
        except ValueError as failure:
            raise Failure(f"{words}: no document: {failure}: {output[:300]} {errors[:300]}") from failure

    def display(self):
        status, shown = self.ask("display")
        expect(status == 0, "display ends with " + str(status))
        return shown

    def labels(self):
        """Of every file, by its inode: the number that it carries, which may be none, and the one that it
        has, which is else that of its directory."""
        labels = {}
        above = {}
        for directory, _, files in os.walk(self.root):
            for path in [directory] + [os.path.join(directory, name) for name in files]:
                if os.path.islink(path):
                    continue
                own = own_label(path)
                has = own if own is not None else above.get(os.path.dirname(path))
                labels[os.stat(path).st_ino] = (own, has)
                if path == directory:
                    above[directory] = has
        return labels

    def renew(self, path):
        """As an editor saves a file: the new one carries no label."""
        with open(self.path("tmp/new"), "w", encoding="utf-8"):
            pass
        os.replace(self.path("tmp/new"), self.path(path))


def own_label(path):
    for name in ATTRIBUTES:
        try:
            return int.from_bytes(os.getxattr(path, name), sys.byteorder)
        except OSError:
            continue
    return None


def rules_of(shown):
    return {(domain["name"], rule["text"]) for domain in shown["domains"] for rule in domain["rules"]}


def domains_of(shown):
    return {domain["name"] for domain in shown["domains"]}


def objects_of(shown):
    return {entry["name"] for entry in shown["objects"]}


def label_names(shown):
    return {entry["id"]: entry["name"] for entry in shown["objects"]}


# ---- A model of how rules decide (docs/queries.md)


def covers(rule_path, path):
    return rule_path in (path, "/") or path.startswith(rule_path.rstrip("/") + "/")


PERMISSIONS = {"read": "r", "write": "w", "exec": "x", "list": "r", "remove": "w", "truncate": "w"}


def path_votes(domain, letter, path):
    around = [rule for rule in domain["rules"] if rule["keyword"] == "-r" and covers(rule["words"][0], path)]
    if not around:
        return []
    nearest = max(around, key=lambda rule: len(rule["words"][0].encode()))
    return [letter in nearest["words"][1]]


def creation_votes(host, shown, domain, path, kind, keyword):
    path = path.rstrip("/") or "/"
    directory = os.path.dirname(path)
    real = resolve(host, directory)
    votes = path_votes(domain, "w", (real or directory).rstrip("/") + "/" + os.path.basename(path))
    if kind.endswith("_device"):
        votes = [vote for vote in votes if not vote]
    if not real:
        return votes
    label = label_of(host, shown, real)
    by_label = [rule["grant"] for rule in domain["rules"]
                if rule["keyword"] == keyword and rule["words"][0] == label and rule["words"][-1] == kind]
    return votes + ([any(by_label)] if by_label else [])


def label_of(host, shown, real):
    return label_names(shown).get(host.labels()[os.stat(host.path(real[1:])).st_ino][1])


def file_votes(host, shown, domain, action, path):
    path = path.rstrip("/") or "/"
    real = resolve(host, path)
    votes = path_votes(domain, PERMISSIONS[action], real or path)
    if not real:
        return votes
    label = label_of(host, shown, real)
    kind = "execute" if action == "exec" else action
    for rule in domain["rules"]:
        if rule["keyword"] == "-a" and rule["words"] == [label, kind]:
            votes.append(rule["grant"])
        is_way_in = rule["keyword"] == "-d" and rule["words"][0] == label and rule["words"][2] == "exec"
        if action == "exec" and is_way_in and rule["grant"]:
            votes.append(True)
    return votes


def resolve(host, path):
    """The real path below the root; nothing where there is no file."""
    parts = path.strip("/").split("/")
    real = []
    links = 0
    while parts:
        part = parts.pop(0)
        if part in ("", "."):
            continue
        if part == "..":
            real = real[:-1]
            continue
        there = host.path("/".join(real + [part]))
        if os.path.islink(there):
            links += 1
            if links > 40:
                return None
            target = os.readlink(there)
            if target.startswith("/"):
                real = []
            parts = target.split("/") + parts
        elif not os.path.lexists(there) or (parts and not os.path.isdir(there)):
            return None
        else:
            real.append(part)
    return "/" + "/".join(real)


def model(host, shown, domain, question):
    action, words = question[0], list(question[1:])
    keyword = {"call": "-s", "use": "-c", "access": "-a", "create": "-f", "create-socket": "-u"}.get(action)
    rules = domain["rules"]
    if action in PERMISSIONS:
        votes = file_votes(host, shown, domain, action, words[0])
    elif action in ("make", "make-socket"):
        votes = creation_votes(host, shown, domain, *words, {"make": "-f", "make-socket": "-u"}[action])
    elif action == "call":
        votes = [rule["grant"] for rule in rules
                 if rule["keyword"] == "-s" and words[0] in CALL_SETS.get(rule["words"][0], rule["words"])]
    elif action == "enter":
        votes = [rule["grant"] for rule in rules if rule["keyword"] == "-d" and rule["words"][1] == words[0]]
        return any(votes)
    elif action == "pass":
        asked = int(words[1], 0)
        ranges = [(rule, [int(word, 0) for word in rule["words"][1:]]) for rule in rules
                  if rule["keyword"] == "-p" and rule["words"][0] == words[0]]
        if words[0] == "clone_flags":
            asked &= ~0xff
            bad = any(ends[0] & asked for rule, ends in ranges if not rule["grant"])
            union = 0
            for rule, ends in ranges:
                union |= ends[0] if rule["grant"] else 0
            return not bad and (not any(rule["grant"] for rule, _ in ranges) or not asked & ~union)
        votes = [rule["grant"] for rule, ends in ranges if ends[0] <= asked <= ends[-1]]
        if not votes:
            return not any(rule["grant"] for rule, _ in ranges)
    else:
        votes = [rule["grant"] for rule in rules if rule["keyword"] == keyword and rule["words"] == words]
    return bool(votes) and all(votes)


def some_question(chance, shown):
    objects = sorted(objects_of(shown))
    action = chance.choice(["read", "write", "exec", "list", "remove", "truncate", "make", "make-socket"] * 2 +
                           ["call", "use", "access", "enter", "create", "create-socket", "pass"])
    path = chance.choice(["/" + path for path in DIRECTORIES + FILES + list(LINKS)] +
                         ["/srv/new", "/nope", "/", "/srv/"])
    if action in PERMISSIONS:
        return action, path
    if action in ("make", "make-socket"):
        return action, path, chance.choice(FILE_KINDS if action == "make" else SOCKET_KINDS)
    words = {
        "call": [CALLS], "use": [CAPABILITIES], "access": [objects, ACCESSES],
        "enter": [sorted(domains_of(shown))], "create": [objects, objects, FILE_KINDS],
        "create-socket": [objects, SOCKET_KINDS], "pass": [CHECKS, ["0", "7", "22", "80", "1000", "65535"]],
    }[action]
    return (action, *[chance.choice(each) for each in words])


# ---- What has to hold


def check_why(host, chance, shown):
    for _ in range(3):
        domain = chance.choice(shown["domains"])
        question = some_question(chance, shown)
        status, answer = host.ask("why", "--", domain["name"], *question)
        wanted = model(host, shown, domain, question)
        expect(answer["granted"] == wanted, f"why {domain['name']!r} {question}: not {answer['granted']}")
        is_yes = wanted or domain["level"] != "enforcing"
        expect((status == 0) == is_yes == answer["allowed"], f"why ends with {status}")


def check_plan(plan, before, after):
    rules = plan["rules"]
    removed = {(entry["domain"], entry["rule"]) for entry in rules["remove"]}
    removed |= {(entry["domain"], entry["before"]) for entry in rules["change"]}
    added = {(entry["domain"], entry["rule"]) for entry in rules["add"]}
    added |= {(entry["domain"], entry["after"]) for entry in rules["change"]}
    was, is_now = rules_of(before), rules_of(after)
    expect(added == is_now - was, f"the plan added {added ^ (is_now - was)} wrongly")
    expect(removed == was - is_now, f"the plan removed {removed ^ (was - is_now)} wrongly")
    created = set(plan["domains"]["create"])
    expect(created == domains_of(after) - domains_of(before), f"the plan created {created}")
    gone = set(plan["domains"].get("remove", []))
    expect(gone == domains_of(before) - domains_of(after), f"the plan removed the domains {gone}")
    expect(set(plan["objects"]["add"]) == objects_of(after) - objects_of(before), "the plan's new objects")
    expect(set(plan["objects"]["remove"]) == objects_of(before) - objects_of(after), "the plan's old objects")


def check_planned_labels(host, plan, before, after, shown):
    planned = {}
    for entry in plan["labels"]:
        planned[os.stat(host.path(resolve(host, entry["path"])[1:])).st_ino] = entry["after"]
    names = label_names(shown)
    # What carries none follows its directory, and is no change of its own.
    changed = {inode: names.get(own) for inode, (own, _) in after.items()
               if own is not None and inode in before and before[inode][1] != own}
    wrong = {inode for inode in changed | planned if changed.get(inode) != planned.get(inode)}
    expect(not wrong, f"the plan's labels: planned {[planned.get(i) for i in wrong]}, "
                      f"found {[changed.get(i) for i in wrong]}")


def key_of(keyword, words):
    """What a rule is about; and of a range, however it is written."""
    if keyword == "-r":
        return keyword, words[0]
    if keyword == "-p":
        ends = [int(word, 0) for word in words[1:]]
        return keyword, words[0], ends[0], ends[-1]
    return (keyword, *words)


LONGEST_LINE = 1023  # bytes that a load reads of one


def written_rules(host, text):
    """What the lines of a domain's file say in the end: of several about one thing the last. An overlong
    line is cut, and ends the file."""
    rules = {}
    lines = text.split(b"\n")
    overlong = next((number for number, line in enumerate(lines) if len(line) > LONGEST_LINE), len(lines))
    for line in [line[:LONGEST_LINE].decode(errors="replace") for line in lines[:overlong + 1]]:
        words = line.split("#")[0].split(" ")
        words = [word for word in words if word]
        if not words:
            continue
        if words[0] == "-r":
            letters = "".join(sorted(words[2])) if len(words) > 2 else ""
            real = resolve(host, words[1])
            for path in [words[1]] + ([real] if real else []):
                rules[key_of("-r", [path])] = letters
        else:
            rules[key_of(words[0], words[1:-1])] = words[-1] == "grant"
    return rules


def shown_rules(domain):
    return {key_of(rule["keyword"], rule["words"]):
            rule["grant"] if "grant" in rule else "".join(sorted(rule["words"][1]))
            for rule in domain["rules"]}


def check_is_what_files_say(host, tree, shown):
    """After a load that ended well nothing is installed but what files and tardisks bring."""
    files = {path: text for path, text in tree.files.items() if path.startswith("domains/")}
    wanted = {path.split("/")[-1] if path.count("/") == 1 else "plugin-" + path.split("/")[-1]: text
              for path, text in files.items()}
    for domain in shown["domains"]:
        name = domain["name"]
        early = written_rules(host, host.early.get(name, b""))
        says = written_rules(host, wanted.get(name, b""))
        has = shown_rules(domain)
        is_brought = lambda key: key[0] == "-d" and key[-1] == "tardisk_exec"
        wrong = {key for key in has if key not in says and key not in early and not is_brought(key)}
        wrong |= {key for key in says if has.get(key) != says[key] and key not in early and not is_brought(key)}
        expect(not wrong, f"installed in {name!r} but not written, or written but not installed: {wrong}")
    gone = set(wanted) - domains_of(shown)
    more = domains_of(shown) - set(wanted) - set(host.early) - {"hostDom"}
    expect(not gone and not more, f"domains that are missing: {gone}, and too many: {more}")


def check_saved(host, shown):
    status, _, errors = host.run("save", "now")
    expect(status == 0, f"save ends with {status}: {errors}")
    status, difference = host.ask("diff", "now", "installed")
    expect(status == 0 and difference["same"], "what was just saved differs from what is installed")
    os.unlink(host.path("var/lib/secpolicy/saved/now.db"))
    expect(rules_of(host.display()) == rules_of(shown), "a save changes what is displayed")


def overlap(rules):
    """Whether earlier loads left rules together that no policy may have."""
    seen = []
    for rule in rules:
        if rule["keyword"] != "-p":
            continue
        ends = [int(word, 0) for word in rule["words"][1:]]
        for name, low, high, is_granted in seen:
            if name == rule["words"][0] and is_granted != rule["grant"] and low <= ends[-1] and ends[0] <= high:
                return True
        seen.append((rule["words"][0], ends[0], ends[-1], rule["grant"]))
    return False


def check_reload(host, shown, scratch):
    if any(overlap(domain["rules"]) for domain in shown["domains"]):
        return
    other = Host(host.command, tempfile.mkdtemp(dir=scratch))
    os.makedirs(other.path("run"))
    os.makedirs(other.path("tardisks"))
    for part in ["objects", "fileLabels", "domains"]:
        os.makedirs(other.path(POLICY + "/" + part))
    with open(other.path(POLICY + "/objects/all"), "w", encoding="utf-8") as file:
        file.writelines(name + "\n" for name in objects_of(shown) - set(BUILT_IN))
    for domain in shown["domains"]:
        with open(other.path(POLICY + "/domains/" + domain["name"]), "w", encoding="utf-8") as file:
            file.writelines(rule["text"] + "\n" for rule in domain["rules"])
    status, _, errors = other.run("boot")
    expect(status == 0 or not set(NEEDED) <= domains_of(shown), f"what is displayed cannot be loaded: {errors}")
    again = other.display()
    wanted = rules_of(shown) | {rule for rule in rules_of(again) if rule[1].startswith("-r ")
                                and (rule[0], rule[1]) in rules_of(shown)}
    expect(rules_of(again) == wanted, f"displayed again: {rules_of(again) ^ rules_of(shown)}")
    expect(objects_of(again) == objects_of(shown), "other objects are displayed again")
    shutil.rmtree(other.root)


def check_rollback(host, before, after):
    status, _, errors = host.run("rollback", "before")
    expect(status == 0, f"rollback ends with {status}: {errors}")
    back = host.display()
    for what in [rules_of, domains_of, objects_of]:
        expect(what(back) == what(before), f"rolled back: {what(back) ^ what(before)}")
    expect([domain["name"] for domain in back["domains"]] == [domain["name"] for domain in before["domains"]],
           "rolled back, the domains have other places")
    host.run("load")
    expect(rules_of(host.display()) == rules_of(after), "a load after a rollback installs something else")


def errors_of(report):
    """The errors of what a load reads; the early policy is not."""
    return [problem for problem in report["problems"]
            if problem["severity"] == "error" and f"/{POLICY}/early/" not in problem["file"]]


def take_step(host, chance, tree, scratch):
    before = host.display()
    is_rolled_back = chance.random() < 0.3
    if is_rolled_back:
        host.run("save", "before")
    host.write(tree)
    if chance.random() < 0.3:
        host.renew(chance.choice(FILES))
    check_status, report = host.ask("check")
    plan_status, plan = host.ask("load", "--plan")
    labels_before = host.labels()
    load_status, _, messages = host.run("load")
    after = host.display()

    errors = errors_of(report)
    expect(bool(errors) == (load_status != 0),
           f"check: {[problem['message'] for problem in errors]}, load ends with {load_status}: {messages}")
    expect((check_status == 0) == (report["errors"] == 0), f"check ends with {check_status}")
    expect(plan_status == load_status, f"the plan ends with {plan_status}, the load with {load_status}")
    check_plan(plan, before, after)
    check_planned_labels(host, plan, labels_before, host.labels(), after)
    _, again = host.ask("load", "--plan")
    expect(again["changesNothing"], f"a load repeated: {json.dumps(again)[:2000]}")
    if load_status == 0:
        check_is_what_files_say(host, tree, after)
    check_why(host, chance, after)
    if chance.random() < 0.3:
        check_saved(host, after)
    if is_rolled_back:
        check_rollback(host, before, after)
        os.unlink(host.path("var/lib/secpolicy/saved/before.db"))
    if chance.random() < 0.3:
        check_reload(host, after, scratch)


def tardisk_policy(chance, tree):
    return f"-E {tree.label()} {chance.choice(NEEDED)}\n".encode()


def run_chain(command, seed, count, keep):
    """Boots a root with one policy, and loads others over it, one after the other."""
    chance = random.Random(seed)
    scratch = keep or tempfile.mkdtemp(prefix="policy-trees.")
    host = Host(command, tempfile.mkdtemp(dir=scratch))
    step = -1
    try:
        host.make()
        first = Tree(chance, True)
        host.write(first)
        host.early = {path.split("/")[-1]: text for path, text in first.files.items() if path.startswith("early/")}
        if chance.random() < 0.7:
            host.pack("part.tar", {POLICY + "/tardisks/part": tardisk_policy(chance, first)})
        if chance.random() < 0.3:
            host.pack("plain.tar", {"opt/brought": b"text"})
        status, _, errors = host.run("boot")
        expect(status == 0, f"boot ends with {status}: {errors}")
        for step in range(count):
            take_step(host, chance, Tree(chance, chance.random() < 0.5), scratch)
        return None
    except Failure as failure:
        return f"seed {seed}, tree {step + 1}: {failure}"
    except Exception:  # pylint: disable=broad-except
        return f"seed {seed}, tree {step + 1}: {traceback.format_exc()}"
    finally:
        if not keep:
            shutil.rmtree(scratch, ignore_errors=True)


def main():
    parser = argparse.ArgumentParser(usage=__doc__)
    parser.add_argument("command")
    is_long = os.environ.get("SECPOLICY_LONG_TESTS") == "1"
    parser.add_argument("--trees", type=int, default=3000 if is_long else 200)
    parser.add_argument("--seed", type=int, default=1)
    parser.add_argument("--jobs", type=int, default=os.cpu_count())
    parser.add_argument("--keep")
    options = parser.parse_args()
    command = os.path.abspath(options.command)
    counts = [min(TREES_IN_A_CHAIN, options.trees - done) for done in range(0, options.trees, TREES_IN_A_CHAIN)]
    with concurrent.futures.ThreadPoolExecutor(options.jobs) as pool:
        chains = [pool.submit(run_chain, command, options.seed + index, count, options.keep)
                  for index, count in enumerate(counts)]
        failures = [chain.result() for chain in chains if chain.result()]
    for failure in failures:
        print(failure)
    print(f"{options.trees} trees in {len(counts)} chains, {len(failures)} chains failed")
    return 1 if failures else 0


if __name__ == "__main__":
    sys.exit(main())
