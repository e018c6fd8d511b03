"""What a call leaves of the process that makes it: its output, signals, descriptors, memory and threads."""

import os
import resource
import signal
import sqlite3
import subprocess
import sys
import textwrap
import threading
import time

import pytest
import secpolicy
from conftest import POLICY

CALLS = 1000 if os.environ.get("SECPOLICY_LONG_TESTS") else 60


def ask(root):
    return secpolicy.why("sshDom", "read", "/etc/ssh", root=root)


def test_writes_nothing(broken, capfd):
    secpolicy.check(root=broken)
    secpolicy.plan(root=broken)
    with pytest.raises(secpolicy.LoadError):
        secpolicy.load(root=broken)
    assert capfd.readouterr() == ("", "")


def test_many_calls_take_no_more(booted):
    """No descriptors, no processes, no memory: not of calls that fail either."""
    def calls(count):
        for _ in range(count):
            ask(booted)
            with pytest.raises(secpolicy.RootError):
                secpolicy.check(root=booted / "none")

    def use():
        with open("/proc/self/statm", encoding="ascii") as pages:
            return sorted(os.listdir("/proc/self/fd")), int(pages.read().split()[1])

    calls(20)
    descriptors, pages = use()
    calls(CALLS)
    descriptors_then, pages_then = use()
    assert descriptors_then == descriptors
    assert pages_then - pages < 512 * 1024 // resource.getpagesize()
    with pytest.raises(ChildProcessError):
        os.waitpid(-1, os.WNOHANG)


def test_two_roots_in_threads(host, booted):
    """Each thread has the answers of its own root, while others use the database engine for themselves."""
    with (host / POLICY / "domains/sshDom").open("a") as rules:
        rules.write("-c cap_sys_boot grant\n")
    secpolicy.load(root=host)
    asked = []
    is_over = threading.Event()

    def ask_often(root, wanted):
        for _ in range(CALLS // 4):
            asked.append(secpolicy.why("sshDom", "use", "cap_sys_boot", root=root).allowed is wanted)

    def use_engine():
        while not is_over.is_set():
            with sqlite3.connect(":memory:") as database:
                database.execute("CREATE TABLE numbers (number)")
                database.executemany("INSERT INTO numbers VALUES (?)", [(1,)] * 50)

    engine = [threading.Thread(target=use_engine) for _ in range(2)]
    threads = [threading.Thread(target=ask_often, args=each) for each in ((host, True), (booted, False)) * 2]
    for thread in engine + threads:
        thread.start()
    for thread in threads:
        thread.join(60)
    is_over.set()
    assert asked == [True] * (4 * (CALLS // 4))


def test_others_go_on_meanwhile(booted):
    """The interpreter is free while the work is done."""
    is_over = threading.Event()

    def plan():
        for _ in range(5):
            secpolicy.plan(root=booted)
        is_over.set()

    thread = threading.Thread(target=plan)
    thread.start()
    turns = 0
    while not is_over.wait(0.001):
        turns += 1
    thread.join()
    assert turns > 10


class Interrupted(Exception):
    pass


@pytest.fixture
def waiting(host):
    """A host of which a load waits, for its state is locked."""
    lock = sqlite3.connect(host / "run/secpolicy/host.db", isolation_level=None)
    lock.execute("BEGIN IMMEDIATE")
    yield host
    lock.close()


def test_interrupt_ends_the_call(waiting):
    """By the handler of the interpreter, which stays as it was; nothing is left running."""
    def handler(_number, _frame):
        raise Interrupted

    before = signal.signal(signal.SIGINT, handler)
    mask = signal.pthread_sigmask(signal.SIG_BLOCK, [])
    try:
        threading.Timer(0.3, os.kill, (os.getpid(), signal.SIGINT)).start()
        begun = time.monotonic()
        with pytest.raises(Interrupted):
            secpolicy.load(root=waiting)
        assert time.monotonic() - begun < 5
        assert signal.getsignal(signal.SIGINT) is handler
        assert signal.pthread_sigmask(signal.SIG_BLOCK, []) == mask
    finally:
        signal.signal(signal.SIGINT, before)
    with pytest.raises(ChildProcessError):
        os.waitpid(-1, os.WNOHANG)


def test_interrupt_ends_the_call_of_who_is_not_to_be_asked(waiting):
    program = """
        import os, secpolicy, signal, sys, threading
        signal.signal(signal.SIGTERM, signal.SIG_IGN)
        threading.Timer(0.3, os.kill, (os.getpid(), signal.SIGINT)).start()
        try:
            secpolicy.load(root=sys.argv[1])
        except KeyboardInterrupt:
            print("interrupted")
        """
    ended = python(program, waiting, timeout=10)
    assert (ended.stdout, ended.returncode) == ("interrupted\n", 0)


def test_handler_that_goes_on(booted):
    """A call goes on when the handler says nothing."""
    seen = []
    before = signal.signal(signal.SIGALRM, lambda *_: seen.append(1))
    try:
        signal.setitimer(signal.ITIMER_REAL, 0.005, 0.005)
        for _ in range(5):
            assert secpolicy.plan(root=booted).changes_nothing
    finally:
        signal.setitimer(signal.ITIMER_REAL, 0)
        signal.signal(signal.SIGALRM, before)
    assert seen


def python(program, *words, **options):
    return subprocess.run([sys.executable, "-c", textwrap.dedent(program), *words], capture_output=True, text=True,
                          check=False, **options)


def test_keys_of_a_terminal_reach_the_interpreter(waiting):
    """The whole group of processes gets the signal."""
    program = """
        import os, secpolicy, signal, sys, threading
        threading.Timer(0.3, os.killpg, (0, signal.SIGINT)).start()
        try:
            secpolicy.load(root=sys.argv[1])
        except KeyboardInterrupt:
            print("interrupted")
        """
    ended = python(program, waiting, start_new_session=True)
    assert (ended.stdout, ended.stderr, ended.returncode) == ("interrupted\n", "", 0)


def test_program_that_takes_no_children(booted):
    """With SIGCHLD ignored, the system forgets how a child has ended."""
    program = """
        import secpolicy, signal, sys
        signal.signal(signal.SIGCHLD, signal.SIG_IGN)
        print(secpolicy.why("sshDom", "read", "/etc/ssh", root=sys.argv[1]).allowed)
        """
    assert python(program, booted).stdout == "True\n"


def test_program_without_standard_descriptors(booted):
    program = """
        import os, secpolicy, sys
        for descriptor in range(3):
            os.close(descriptor)
        plan = secpolicy.plan(root=sys.argv[1])
        os._exit(0 if plan.changes_nothing and not os.path.exists("/proc/self/fd/2") else 1)
        """
    assert python(program, booted).returncode == 0


def kill_children():
    for task in os.listdir("/proc/self/task"):
        with open(f"/proc/self/task/{task}/children", encoding="ascii") as children:
            for child in children.read().split():
                os.kill(int(child), signal.SIGKILL)


def test_work_that_is_killed(waiting):
    """It takes nothing along, and is told."""
    threading.Timer(0.3, kill_children).start()
    with pytest.raises(secpolicy.HostError, match="ended without an answer: Killed$"):
        secpolicy.load(root=waiting)


def test_work_that_cannot_be_begun():
    program = """
        import resource, secpolicy
        resource.setrlimit(resource.RLIMIT_NOFILE, (3, 3))
        try:
            secpolicy.check()
        except secpolicy.HostError as failure:
            print(failure)
        """
    assert python(program).stdout == "cannot make a file in memory: Too many open files\n"
