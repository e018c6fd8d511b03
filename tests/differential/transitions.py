#!/usr/bin/env python3
"""Holds what the rules say of transitions between domains against where programs end up.

usage: transitions.py COMMAND PROBE WELL [--user ID] [--first SEED] [--roots COUNT] [--domains COUNT] [--example PACK]
                      [--published]

Makes small roots with programs, labels and domains by chance, boots each, and starts every program by
"secpolicy exec" from outside, and from within each domain by its broker. The program has to have just
the rights that it has when it is run in the domain that the -d rules lead to from there, or not to start;
and a plain execve from within a domain has to refuse what leads elsewhere. With --example the domains and
labels are those of the example host, which PACK writes into a directory, and its programs are probes. With
--published an ordinary user starts them by the plans that root has made, where the root is a machine's. A root that fails is told with its
seed."""

import json
import os
import shutil
import subprocess

from small_roots import Failure, SmallRoot, main, parser_for

LABELS = ["one", "two", "three", "four"]
PROGRAMS = [f"p/{name}" for name in ("a", "b", "in/c", "in/d", "bare")]
SETS = ["@start", "@file", "@io", "@process", "@signal", "@clock"]
SENDING = "-s sendmsg grant"
MACHINE = """
mount --rbind "$0" "$0"
for place in proc usr; do mount --rbind "/$place" "$0/$place"; done
mount --bind "$1" "$0/programs"
cd "$0"
pivot_root . .
umount -l .
shift
exec /usr/bin/setpriv --reuid 65534 --regid 65534 --clear-groups /programs/secpolicy "$@" """
LEVELS = ["enforcing"] * 6 + ["permissive", "disabled"]


def most(chance, rules, likely):
    return [rule for rule in rules if chance.random() < likely]


def some_domain(chance, name, others):
    """Rules by which the domain reads its own mark, and may lead to others."""
    rules = [f"-s {word} grant" for word in SETS] + [f"-r /marks/{name} r", "-r /probe rx", "-r /ask rx"]
    rules += most(chance, [SENDING], 0.9)
    rules += most(chance, [f"-r /{program} rx" for program in PROGRAMS], 0.6)
    rules += most(chance, [f"-a {label} read grant" for label in LABELS], 0.7)
    rules += most(chance, [f"-a {label} execute {chance.choice(['grant', 'grant', 'revoke'])}" for label in LABELS], 0.2)
    for label in most(chance, LABELS * 2, 0.6):
        kind = chance.choice(["exec"] * 8 + ["enter", "tardisk_exec"])
        verdict = chance.choice(["grant"] * 4 + ["revoke"])
        rules.append(f"-d {label} {chance.choice(others + [name])} {kind} {verdict}")
    return rules


class Root(SmallRoot):
    """A root of which `reads` are the files by which domains are told apart, and `programs` what is started."""

    def __init__(self, options, path):
        super().__init__(options, path)
        self.reads = []
        self.programs = []
        self.domains = []
        self.rights = {}

    def start(self, *words):
        if not self.options.published or words[0] not in ("run", "exec"):
            return super().start(*words)
        # To give rules up is root's.
        words = [word for word in words if word != "--best-effort"]
        programs = os.path.dirname(self.options.command)
        return subprocess.run(["unshare", "--mount", "sh", "-ec", MACHINE, self.path, programs, *words],
                              capture_output=True, text=True, timeout=60, check=False)

    def lay_machine(self):
        for directory in ("proc", "usr", "tmp", "programs"):
            os.makedirs(self.at(directory))
        os.chmod(self.at("tmp"), 0o1777)
        for link in ("lib", "lib64"):
            os.symlink("usr/" + link, self.at(link))

    def lay_by_chance(self, chance):
        names = [f"test{number}Dom" for number in range(self.options.domains)]
        if self.options.published:
            self.lay_machine()
        for directory in ("p/in", "marks"):
            os.makedirs(self.at(directory))
        for program in ("probe", *PROGRAMS):
            shutil.copy(self.options.probe, self.at(program))
        shutil.copy(self.options.launcher, self.at("ask"))
        for name in names:
            with open(self.at("marks", name), "x", encoding="utf-8"):
                pass
        domains = {name: some_domain(chance, name, ["hostDom", *names]) for name in names}
        domains["hostDom"] = some_domain(chance, "hostDom", names)
        self.lay_policy(LABELS, domains, [f"/{program} {chance.choice(LABELS)}" for program in PROGRAMS[:3]] +
                        [f"/p/in {chance.choice(LABELS)}"])
        self.call("boot")
        for name in ["hostDom", *names]:
            self.call("settings", "enforcement", name, chance.choice(LEVELS))
        self.call("restore")
        self.programs = ["/" + program for program in PROGRAMS]
        self.reads = ["/marks/" + name for name in names]
        self.take_domains()

    def lay_example(self, example):
        shutil.copytree(example, self.path, symlinks=True, dirs_exist_ok=True)
        self.call("boot")
        for top in ("opt", "usr", "etc", "var"):
            for directory, _, files in os.walk(self.at(top)):
                paths = [os.path.join(directory, file) for file in files]
                self.take_files([path for path in paths if not os.path.islink(path)])
        self.take_domains()

    def take_files(self, paths):
        for path in paths:
            if "secpolicy" in path[len(self.path):]:
                continue
            if os.access(path, os.X_OK):
                with open(self.options.probe, "rb") as probe, open(path, "wb") as program:
                    shutil.copyfileobj(probe, program)
                self.programs.append(path[len(self.path):])
            self.reads.append(path[len(self.path):])

    def take_domains(self):
        told = json.loads(self.call("display", "--format", "json"))
        self.domains = {domain["name"]: domain for domain in told["domains"]}

    def level(self, domain):
        return self.domains[domain]["level"]

    def keeps_to(self, domain):
        """Whether it is entered although nobody gives anything up for it."""
        if self.level(domain) != "enforcing":
            return True
        fates = json.loads(self.start("features", "--for", domain, "--format", "json").stdout)["rules"]
        return all(rule["fate"] != "notExpressible" for rule in fates)

    def ways(self, domain, label):
        """The domains that the label leads to, in the order of the rules."""
        rules = [rule for rule in self.domains[domain]["rules"] if rule["keyword"] == "-d" and rule["grant"]]
        return [rule["words"][1] for rule in rules
                if rule["words"][0] == label and rule["words"][2] == "exec" and rule["words"][1] != domain]

    def probing(self, program):
        words = [program]
        for file in self.reads:
            words += [","] * (len(words) > 1) + ["read", file]
        return words

    def outcome(self, done):
        """What the program could read, and the domain that it was said to be in where nothing is refused."""
        results = done.stdout.split()
        if done.returncode == 0 and len(results) == len(self.reads):
            told = sorted({line.split()[2] for line in done.stderr.splitlines() if " would be refused: read " in line})
            return results, told
        # Where a domain may not do what the probe does, that has to be so both ways.
        return done.returncode, []

    def outcome_in(self, domain, program):
        if (domain, program) not in self.rights:
            done = self.start("run", domain, "--best-effort", "--", *self.probing(program))
            self.rights[domain, program] = self.outcome(done)
        return self.rights[domain, program]


def check(what, root, expected, program, done, tally):
    """`expected` is the domain that the program has to be in, None where nothing may start."""
    found = root.outcome(done)
    if expected is None:
        if done.returncode != 126 or done.stdout:
            raise Failure(f"{what} {program}: {found}, and it has to be refused: {done.stderr}")
        tally["refused"] += 1
        return
    wanted = root.outcome_in(expected, program)
    if found != wanted:
        raise Failure(f"{what} {program}: {found}, and in {expected} it is {wanted}: {done.stderr}")
    tally["started" if isinstance(found[0], list) else "not for the domain"] += 1


def by_broker(root, domain, label):
    """Where a program of the label ends up that is asked for from within."""
    if SENDING not in [rule["text"] for rule in root.domains[domain]["rules"]]:
        return None
    target = (root.ways(domain, label) + [None])[0]
    return target if target and root.keeps_to(target) else None


def check_program(root, program, may_ask, tally):
    told = root.tell("who-can", "exec", program)
    label = told["question"]["file"].get("label", "")
    allowed = {domain["domain"] for domain in told["domains"]}
    ways = root.ways("hostDom", label)
    expected = (ways + ["hostDom"])[0] if "hostDom" in allowed else None
    done = root.start("exec", "--best-effort", "--", *root.probing(program))
    check("from outside", root, expected, program, done, tally)
    for domain in may_ask:
        expected = by_broker(root, domain, label) if domain in allowed else None
        done = root.start("run", domain, "--best-effort", "--", "/ask", "--ask", "--", *root.probing(program))
        check(f"from {domain}", root, expected, program, done, tally)


def check_execve(root, domain, tally):
    """What leads elsewhere is not executed by the way."""
    words = ["/probe"]
    labels = {program: root.tell("why", domain, "exec", program)["question"]["file"].get("label", "")
              for program in root.programs}
    leading = [program for program in root.programs if root.ways(domain, labels[program])]
    for program in leading:
        words += [","] * (len(words) > 1) + ["exec", program]
    if not leading:
        return
    done = root.start("run", domain, "--best-effort", "--", *words)
    results = done.stdout.split()
    if len(results) != len(leading) or "0" in results:
        raise Failure(f"in {domain} execve of {leading} ends with {results}: {done.stderr}")
    tally["execve refused"] += len(leading)


def check_root(chance, options, path, tally):
    root = Root(options, path)
    if options.example:
        root.lay_example(options.example)
        asking = []
    else:
        root.lay_by_chance(chance)
        asking = [name for name in root.domains if name.startswith("test") and root.level(name) == "enforcing"]
        if options.published:
            asking = [name for name in asking if root.keeps_to(name)]
    for program in root.programs:
        check_program(root, program, asking, tally)
    for domain in asking:
        check_execve(root, domain, tally)


if __name__ == "__main__":
    parser = parser_for(__doc__)
    parser.add_argument("--published", action="store_true")
    main(parser, check_root, {"started": 0, "refused": 0, "not for the domain": 0, "execve refused": 0})
