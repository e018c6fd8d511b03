"""The example host with domains of chance besides, its report, and one browser for all tests."""

import json
import os
import pathlib
import random
import subprocess
import sys

import pytest

sys.path.insert(0, os.path.dirname(__file__))
from browser import Browser  # noqa: E402

SOURCE = pathlib.Path(__file__).resolve().parents[2]

OBJECTS = ["hostConfig", "sshKey", "vmDisk", "sshProgram", "hostProgram"]
ACCESSES = ["read", "write", "execute", "list", "remove", "truncate"]
PATHS = ["/", "/etc", "/etc/ssh", "/etc/ssh/host_key", "/usr/", "/usr/sbin", "/var/lib/vms/demo", "/var/lib/vms",
         "/opt"]
FILE_KINDS = ["regular", "symlink", "char_device"]
CALLS = ["@file", "@start", "@process", "openat", "read", "ptrace", "mount"]
NUMBERS = ["0", "0x50", "80", "443", "1023", "1024", "65535", "18446744073709551615"]
FLAGS = ["0x10000000", "0x20000000", "0x00020000", "0x60000000"]


class Host:
    """A root with a policy, and what the command says of it."""

    def __init__(self, root):
        self.root = root
        self.policy = root / "etc/zorvan/secpolicy"

    def run(self, *words):
        return subprocess.run([os.environ["SECPOLICY"], "--root", str(self.root), *words],
                              capture_output=True, text=True, check=False)

    def json(self, *words):
        return json.loads(self.run(*words, "--format", "json").stdout)

    def report(self, file, *words):
        done = self.run("report", *words, "-o", "-")
        assert done.returncode == 0, done.stderr
        file.write_text(done.stdout)
        return file


def rules_of_chance(chance, domains):
    """A rule about each thing at most once."""
    verdict = lambda: chance.choice(["grant", "grant", "revoke"])  # noqa: E731
    rules = {}
    for _ in range(12):
        rules["-a", chance.choice(OBJECTS), chance.choice(ACCESSES)] = verdict()
        rules["-f", chance.choice(OBJECTS), chance.choice(OBJECTS), chance.choice(FILE_KINDS)] = verdict()
    for path in chance.sample(PATHS, 5):
        rules["-r", path] = chance.choice(["r", "rw", "rx", "rwx", "x", ""])
    for call in chance.sample(CALLS, 4):
        rules["-s", call] = verdict()
    for _ in range(3):
        rules["-d", chance.choice(OBJECTS), chance.choice(domains), chance.choice(["exec", "enter"])] = verdict()
        rules["-u", chance.choice(OBJECTS), chance.choice(["stream", "dgram"])] = verdict()
        rules["-c", chance.choice(["cap_chown", "cap_kill", "cap_net_raw"])] = verdict()
    # Ranges that do not overlap, as a domain with two verdicts about a value is refused.
    granted = verdict()
    rules["-p", "bind_port", "80", "443"] = granted
    rules["-p", "bind_port", "0x400", "65535"] = verdict()
    rules["-p", "set_uid", "18446744073709551615"] = verdict()
    rules["-p", "clone_flags", "0x10000000"] = verdict()
    rules["-p", "clone_flags", "0x20020000"] = verdict()
    return [" ".join([*words, verdict]).strip() for words, verdict in rules.items()]


@pytest.fixture(scope="session")
def host(tmp_path_factory):
    root = tmp_path_factory.mktemp("host")
    subprocess.run([SOURCE / "scripts/pack-example", root], check=True)
    made = Host(root)
    chance = random.Random(14)
    domains = ["hostDom", "sshDom", "chance0", "chance1", "chance2"]
    for number in range(3):
        text = "".join(f"{rule}\n" for rule in rules_of_chance(chance, domains))
        (made.policy / f"domains/chance{number}").write_text(text)
    (made.policy / "domains/plainDom").write_text("-s read grant\n")
    booted = made.run("boot")
    assert booted.returncode == 0, booted.stderr
    for domain, level in {"chance1": "permissive", "chance2": "disabled"}.items():
        assert made.run("settings", "enforcement", domain, level).returncode == 0
    assert made.run("restore").returncode == 0
    return made


@pytest.fixture(scope="session")
def report(host, tmp_path_factory):
    return host.report(tmp_path_factory.mktemp("report") / "policy.html")


@pytest.fixture(scope="session")
def browser():
    with Browser() as started:
        yield started


@pytest.fixture
def page(browser, report):
    """The report, opened anew; a message on its console, or a request of it, fails the test."""
    browser.resize(1280, 900)
    browser.console.clear()
    browser.requests.clear()
    browser.open(report)
    yield browser
    assert browser.console == []
    assert [url for url in browser.requests if not url.startswith(("file:", "about:"))] == []
