"""What cannot be done is an exception of the documented kind, with file and line, and is done to nobody."""

import ctypes
import errno
import os
import shutil
import traceback

import pytest
import secpolicy
from conftest import POLICY, run

CALLS = (
    secpolicy.check, secpolicy.plan, secpolicy.load, lambda **root: secpolicy.why("sshDom", "read", "/", **root),
    lambda **root: secpolicy.who_can("read", "/", **root), lambda **root: secpolicy.diff("installed", "/x", **root))


@pytest.mark.parametrize("call", CALLS)
def test_missing_root(call, tmp_path):
    for root, number in ((tmp_path / "none", errno.ENOENT), (os.devnull, errno.ENOTDIR)):
        with pytest.raises(secpolicy.RootError, match=f"^cannot enter the root {root}: ") as raised:
            call(root=root)
        assert raised.value.errno == number and raised.value.file is None


@pytest.mark.parametrize("call", CALLS[3:])
def test_host_that_was_not_booted(call, packed):
    with pytest.raises(secpolicy.NotInstalledError, match="^nothing is installed below this root"):
        call(root=packed)
    assert not (packed / "run/secpolicy").exists()


def test_missing_directory(booted):
    for call in (secpolicy.check, secpolicy.plan, secpolicy.load):
        with pytest.raises(secpolicy.MissingPolicyError, match="^there is no (policy at|directory) /nowhere"):
            call("/nowhere", root=booted)
    with pytest.raises(secpolicy.MissingPolicyError, match="^there is no saved state 'nope', and no such directory"):
        secpolicy.diff("installed", "nope", root=booted)


def test_words_that_nobody_knows(booted):
    for words, message in (
            (("sshDmo", "read", "/"), "there is no domain 'sshDmo'; did you mean 'sshDom'?"),
            (("sshDom", "eat", "/"), "there is no question 'eat'"),
            (("sshDom", "read"), "write: read PATH"),
            (("sshDom", "read", "etc"), "'etc' is no path from the root on: it begins with a slash"),
            (("", "read", "/"), "there is no domain ''")):
        with pytest.raises(secpolicy.QuestionError) as raised:
            secpolicy.why(*words, root=booted)
        assert str(raised.value).startswith(message)


def test_bytes_that_are_no_text(booted, tmp_path):
    with pytest.raises(secpolicy.QuestionError, match="^there is no domain 'ssh\N{REPLACEMENT CHARACTER}'"):
        secpolicy.why("ssh\udcff", "read", "/", root=booted)
    with pytest.raises(secpolicy.RootError, match="^cannot enter the root .*\N{REPLACEMENT CHARACTER}: "):
        secpolicy.check(root=os.fsencode(tmp_path) + b"/\xff")
    assert not secpolicy.why("sshDom", "read", b"/\xff", root=booted)
    for call in (lambda: secpolicy.check("a\0b"), lambda: secpolicy.check(root="a\0b"),
                 lambda: secpolicy.why("sshDom", "read", "/\0"), lambda: secpolicy.why("\ud800", "read", "/")):
        with pytest.raises(ValueError):
            call()


def test_file_of_bytes_that_are_no_text(host):
    """A policy file may hold anything, in its text and in its name."""
    (host / POLICY / "domains/sshDom").write_bytes(b"-a \xff\xfe read grant\n\0\n")
    (host / os.fsdecode(b"etc/zorvan/secpolicy/objects/\xff")).write_bytes(b"a b\n")
    found = {(each.line, each.code) for each in secpolicy.check(root=host).errors}
    assert {(1, "unknown-word"), (1, "argument-count")} <= found
    with pytest.raises(secpolicy.LoadError) as raised:
        secpolicy.load(root=host)
    assert raised.value.file == f"{host}/{POLICY}/objects/\N{REPLACEMENT CHARACTER}" and raised.value.line == 1


def test_load_with_errors(broken):
    before = run(broken, "display").stdout
    with pytest.raises(secpolicy.LoadError) as raised:
        secpolicy.load(root=broken, all_or_nothing=True)
    failure = raised.value
    assert (failure.file, failure.line) == (f"{broken}/{POLICY}/domains/sshDom", 3)
    assert failure.ending is secpolicy.Ending.FAILED
    assert failure.problems == (secpolicy.Problem(failure.file, 3, failure.problems[0].message),)
    assert "sshKye" in failure.problems[0].message and str(failure.problems[0]) in str(failure)
    assert failure.errors[0].startswith("Error in parsing policy for domain: sshDom: 3 : ")
    assert failure.messages[-1].endswith("nothing was installed")
    assert run(broken, "display").stdout == before


def test_load_that_the_library_stops(host):
    """It ends the process that does it, and no other."""
    before = run(host, "display").stdout
    (host / POLICY / "domains/appDom").unlink()
    with pytest.raises(secpolicy.LoadError, match="^stopped: there is no domain appDom") as raised:
        secpolicy.load(root=host)
    assert raised.value.ending is secpolicy.Ending.STOPPED
    assert secpolicy.plan(root=host).ending is secpolicy.Ending.STOPPED
    assert run(host, "display").stdout == before


def test_diff_of_a_bad_policy(broken):
    shutil.copytree(broken / POLICY / "domains", broken / POLICY / "domains/plugins", dirs_exist_ok=True,
                    ignore=lambda _dir, names: set(names) - {"sshDom"})
    with pytest.raises(secpolicy.PolicyError, match="^the policy has errors, so it was not compared: ") as raised:
        secpolicy.diff("installed", secpolicy.POLICY, root=broken)
    failure = raised.value
    assert (failure.file, failure.line) == (f"{broken}/{POLICY}/domains/sshDom", 3)
    assert [each.file for each in failure.problems] == [
        f"{broken}/{POLICY}/domains/sshDom", f"{broken}/{POLICY}/domains/plugins/sshDom"]


def test_state_that_cannot_be_used(host):
    state = host / "run/secpolicy/host.db"
    state.write_bytes(b"no database at all" * 100)
    for call in (secpolicy.check, secpolicy.plan, *CALLS[3:]):
        with pytest.raises(secpolicy.HostError, match="/run/secpolicy/host.db"):
            call(root=host)
    with pytest.raises(secpolicy.LoadError, match="/run/secpolicy/host.db") as raised:
        secpolicy.load(root=host)
    assert raised.value.problems == () and raised.value.file is None
    state.unlink()
    state.mkdir()
    with pytest.raises(secpolicy.HostError):
        secpolicy.why("sshDom", "read", "/", root=host)


def as_ordinary_user(step):
    """Takes the step as another user, who has not started a program with more rights."""
    child = os.fork()
    if child == 0:
        os.setgroups([])
        os.setresgid(65534, 65534, 65534)
        os.setresuid(65534, 65534, 65534)
        prctl_set_dumpable = 4
        ctypes.CDLL(None).prctl(prctl_set_dumpable, 1)
        try:
            step()
        except BaseException:
            traceback.print_exc()
            os._exit(1)
        os._exit(0)
    assert os.waitpid(child, 0)[1] == 0


@pytest.mark.skipif(os.geteuid() != 0, reason="only root can become another user")
def test_state_of_another_user(host):
    """An ordinary user enters the root in a namespace of its own, and may not read root's state."""
    for directory in (host, *host.parents[:3]):
        directory.chmod(0o755)
    (host / "tmp").mkdir(exist_ok=True)
    (host / "tmp").chmod(0o1777)

    def ask():
        assert secpolicy.check(root=host).against is secpolicy.Against.BOOT
        for call in CALLS[3:]:
            with pytest.raises(secpolicy.HostError, match="host state /run/secpolicy/host.db") as raised:
                call(root=host)
            assert raised.value.errno in (errno.EACCES, errno.EIO)
    as_ordinary_user(ask)
