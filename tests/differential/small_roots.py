"""Small roots with policies by chance, on which what the command says is held against the kernel."""

import argparse
import json
import os
import random
import shutil
import subprocess
import sys
import tempfile

POLICY = "etc/zorvan/secpolicy"
NEEDED = ["globalVMDom", "ioFilterDom", "appDom", "daemonFrameworkDom", "hostDom"]


class Failure(Exception):
    pass


class SmallRoot:
    """A root below `path`, and the command there."""

    def __init__(self, options, path):
        self.options = options
        self.path = path

    def lay_policy(self, labels, domains, file_labels):
        for directory in ("objects", "domains/plugins", "fileLabels", "early/domains"):
            os.makedirs(self.at(POLICY, directory))
        os.makedirs(self.at("tardisks"))
        self.write("objects/all", labels)
        for name in NEEDED:
            self.write("domains/" + name, ["-s @start grant"] if name == "hostDom" else [])
        for name, rules in domains.items():
            self.write("domains/" + name, rules)
        self.write("fileLabels/all", file_labels)

    def at(self, *parts):
        return os.path.join(self.path, *parts)

    def write(self, file, lines):
        with open(self.at(POLICY, file), "w", encoding="utf-8") as policy:
            policy.write("".join(line + "\n" for line in lines))

    def start(self, *words):
        command = [self.options.command, "--root", self.path, *words]
        # Below a root that is no mount point, root cannot keep masks from the rest of the system.
        if os.geteuid() == 0 and words[0] in ("run", "exec", "features"):
            command = ["unshare", "--mount", "sh", "-c", 'mount --bind "$0" "$0" && exec "$@"', self.path, *command]
        return subprocess.run(command, capture_output=True, text=True, timeout=60, check=False)

    def call(self, *words):
        done = self.start(*words)
        if done.returncode != 0:
            raise Failure(f"{words} ended with {done.returncode}: {done.stderr}")
        return done.stdout

    def tell(self, *words):
        """What a question is answered, be that yes or no."""
        done = self.start(*words, "--format", "json")
        if done.returncode not in (0, 1):
            raise Failure(f"{words} ended with {done.returncode}: {done.stderr}")
        return json.loads(done.stdout)


def check_roots(check_root, options, tally):
    failures = 0
    for seed in range(options.first, options.first + options.roots):
        try:
            with tempfile.TemporaryDirectory(prefix="secpolicy-domains-") as path:
                os.chmod(path, 0o755)
                check_root(random.Random(seed), options, path, tally)
        except Failure as failure:
            failures += 1
            print(f"seed {seed}: {failure}", file=sys.stderr)
    print(", ".join(f"{count} {what}" for what, count in tally.items()))
    return 1 if failures else 0


def check_as(user, check_root, options, tally):
    child = os.fork()
    if child == 0:
        os.setgroups([])
        os.setgid(user)
        os.setuid(user)
        result = check_roots(check_root, options, tally)
        sys.stdout.flush()
        os._exit(result)
    return os.waitstatus_to_exitcode(os.waitpid(child, 0)[1])


def copy_programs(options, programs):
    """So that an ordinary user reaches them, who need not reach the directory that all was built in."""
    built = os.path.dirname(os.path.dirname(options.command))
    shutil.copytree(os.path.join(built, "lib"), os.path.join(programs, "lib"), symlinks=True)
    binaries = os.path.join(programs, "bin")
    os.mkdir(binaries)
    for name in ("command", "launcher", "probe", "well"):
        setattr(options, name, shutil.copy(getattr(options, name), binaries))
    if options.example:
        example = os.path.join(programs, "example")
        subprocess.run([options.example, example], check=True)
        options.example = example


def version_of_landlock(options):
    told = subprocess.run([options.command, "features", "--format", "json"], capture_output=True, check=True)
    return json.loads(told.stdout)["features"]["landlock"]


def parser_for(description):
    parser = argparse.ArgumentParser(description=description, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("command")
    parser.add_argument("probe")
    parser.add_argument("well")
    parser.add_argument("--user", type=int, help="who tries, when root starts this")
    parser.add_argument("--first", type=int, default=1)
    parser.add_argument("--roots", type=int, default=25)
    parser.add_argument("--domains", type=int, default=8)
    parser.add_argument("--example", help="the program that writes the example host into a directory")
    return parser


def main(parser, check_root, tally):
    """Calls `check_root` with a seed's chance, the options, an empty directory and the tally, which it counts in."""
    options = parser.parse_args()
    options.launcher = os.path.join(os.path.dirname(options.command), "secpolicy-run")
    if version_of_landlock(options) < 3:
        print("skipped: this kernel's Landlock cannot refuse what a domain may not do")
        sys.exit(77)
    if os.geteuid() != 0 and (options.user is not None or getattr(options, "published", False)):
        print("skipped: only root can become another user")
        sys.exit(77)
    with tempfile.TemporaryDirectory(prefix="secpolicy-programs-") as programs:
        os.chmod(programs, 0o755)
        copy_programs(options, programs)
        if options.user is None:
            sys.exit(check_roots(check_root, options, tally))
        sys.exit(check_as(options.user, check_root, options, tally))
