"""A host's security policy: checked, planned, installed, asked and compared.

Each call works below a root directory, `root`; without one, on the machine itself. It does what the
verb of `secpolicy` with its name does, returns what that verb would print as values, and raises an
exception of the class `Error` where that would fail. Nothing is written to standard output or error.

The work is done in a process of its own, so that calls on different roots may run at the same time,
in as many threads as wanted. An interrupt ends it: what was installed before is left, or all that is
new; files that a load has labelled meanwhile keep their labels.
"""

from __future__ import annotations

import json as _json
import os as _os

from . import _native, _reading
from ._errors import (
    Error, HostError, LoadError, MissingPolicyError, NotInstalledError, PolicyError, QuestionError, RootError,
    failure as _failure)
from ._values import (
    Against, Answer, Difference, DomainDifference, DomainRule, Ending, FileFacts, Finding, LabelChange, Level, Load,
    Plan, Problem, Question, Remainder, Report, Rule, RuleChange, Severity, WhoCan, Why)

__all__ = [
    "Against", "Answer", "Difference", "DomainDifference", "DomainRule", "Ending", "Error", "FileFacts", "Finding",
    "HostError", "LabelChange", "Level", "Load", "LoadError", "MissingPolicyError", "NotInstalledError", "Plan",
    "PolicyError", "Problem", "Question", "QuestionError", "Remainder", "Report", "RootError", "Rule", "RuleChange",
    "Severity", "WhoCan", "Why", "check", "diff", "load", "plan", "who_can", "why"]

__version__ = _native.version

Path = str | bytes | _os.PathLike[str] | _os.PathLike[bytes]

POLICY = "/etc/zorvan/secpolicy"
"""The policy directory of a host, as seen from its root."""


def check(path: Path = POLICY, *, root: Path | None = None, fresh: bool = False) -> Report:
    """Finds every problem of a policy, and changes nothing.

    `path` is a policy directory, or a file in one: then only the problems of that file are told.
    With `fresh`, the policy is checked as after a boot, whatever is installed.
    """
    reply = _native.check(_root(root), _bytes(path), fresh)
    return _reading.read_report(_answer(reply))


def plan(directory: Path = POLICY, *, root: Path | None = None, keep: bool = False) -> Plan:
    """Tells what a load of the directory would change, and changes nothing.

    A policy with errors has a plan too, and its `ending` is not `Ending.DONE`. With `keep`, the load
    would remove nothing.
    """
    reply = _native.plan(_root(root), _bytes(directory), keep)
    return _reading.read_plan(_answer(reply))


def load(directory: Path = POLICY, *, root: Path | None = None, keep: bool = False,
         all_or_nothing: bool = False) -> Load:
    """Installs the full policy, and labels the files.

    What earlier loads have installed and no file has any more is removed, unless `keep` is true. With
    `all_or_nothing`, any error leaves rules, objects and file labels as they were. Raises LoadError
    when it does not end well.
    """
    reply = _native.load(_root(root), _bytes(directory), keep, all_or_nothing)
    return _reading.read_load(_answer(reply), _lines(reply[2]))


def why(domain: str, action: str, *words: Path | int, root: Path | None = None) -> Why:
    """Tells whether a domain may do something, and which rules say so.

    The action and its words are those of `secpolicy why`: `why("sshDom", "read", "/etc/ssh")`,
    `why("appDom", "pass", "bind_port", 80)`.
    """
    reply = _native.why(_root(root), _bytes(domain), _words(action, words))
    return _reading.read_why(_answer(reply))


def who_can(action: str, *words: Path | int, root: Path | None = None) -> WhoCan:
    """Tells which domains may do something; the question is as for `why`."""
    reply = _native.who_can(_root(root), _words(action, words))
    return _reading.read_who_can(_answer(reply))


def diff(before: Path, after: Path, *, root: Path | None = None) -> Difference:
    """Compares two policies.

    Each is a policy directory, which has a slash in its name, `"installed"`, or the name of a saved
    state. Raises PolicyError when a directory has errors.
    """
    reply = _native.diff(_root(root), _bytes(before), _bytes(after))
    return _reading.read_difference(_answer(reply))


def _answer(reply: tuple[str, str, bytes]) -> _reading.Json:
    kind, document, messages = reply
    json: _reading.Json = _json.loads(document)
    if kind != "answer":
        raise _failure(kind, json, _lines(messages))
    return json


def _lines(messages: bytes) -> tuple[str, ...]:
    return tuple(messages.decode(errors="replace").splitlines())


def _root(root: Path | None) -> bytes | None:
    return None if root is None else _bytes(root)


def _words(action: str, words: tuple[Path | int, ...]) -> list[bytes]:
    return [_bytes(str(word) if isinstance(word, int) else word) for word in (action, *words)]


def _bytes(word: Path) -> bytes:
    encoded = _os.fsencode(word)
    if b"\0" in encoded:
        raise ValueError("embedded null byte")
    return encoded


# Where they are used from, and known by.
for _name in __all__:
    globals()[_name].__module__ = __name__
