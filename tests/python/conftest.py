"""What the tests of the package share: the command to compare it with, and roots to work below."""

import json
import os
import pathlib
import shutil
import subprocess

import pytest

SOURCE = pathlib.Path(__file__).resolve().parents[2]
COMMAND = os.environ["SECPOLICY"]
POLICY = "etc/zorvan/secpolicy"


def run(root, *words):
    """Runs the command."""
    return subprocess.run([COMMAND, "--root", root, *words], capture_output=True, text=True, check=False)


def document(root, *words):
    """What the verb writes for programs."""
    return json.loads(run(root, *words, "--format", "json").stdout)


@pytest.fixture(scope="session")
def packed(tmp_path_factory):
    root = tmp_path_factory.mktemp("packed") / "root"
    subprocess.run([SOURCE / "scripts/pack-example", root], check=True)
    return root


def boot(packed_root, root):
    shutil.copytree(packed_root, root, symlinks=True)
    assert run(root, "boot").returncode == 0
    return root


@pytest.fixture(scope="session")
def booted(packed, tmp_path_factory):
    """The example host, which no test changes."""
    return boot(packed, tmp_path_factory.mktemp("booted") / "root")


@pytest.fixture
def host(packed, tmp_path):
    """An example host for one test."""
    return boot(packed, tmp_path / "root")


@pytest.fixture
def broken(host):
    """One with a mistake in the third line of a domain's file."""
    (host / POLICY / "domains/sshDom").write_text("# a comment\n-r /etc/ssh r\n-a sshKye read grant\n")
    return host
