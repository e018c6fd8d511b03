"""The exceptions of this package."""

from __future__ import annotations

from ._reading import Json, read_problems
from ._values import Ending, Problem


class Error(Exception):
    """Something could not be done; the text says why. Those below say more."""

    file: str | None = None
    """The policy file or directory that is to blame, if one is."""

    line: int | None = None
    """The line in it; None where it is the file as a whole."""


class RootError(Error):
    """The directory that was given as the root cannot be entered."""

    errno: int
    """What the system says, such as `errno.ENOENT`."""


class HostError(Error):
    """The host's state, or a file that the work needs, cannot be used: this user may not, it is
    damaged, or there is no room."""

    errno: int
    """The kind of failure, such as `errno.EACCES`."""


class MissingPolicyError(Error):
    """There is no such policy directory, policy file or saved state below the root."""


class NotInstalledError(MissingPolicyError):
    """Nothing is installed below the root: it was not booted."""


class QuestionError(Error):
    """A question has a word that nobody knows, a domain for one; the text may tell the nearest."""


class PolicyError(Error):
    """Policy files have errors. `file` and `line` are those of the first problem."""

    errors: tuple[str, ...]
    """The messages of all errors, as the command writes them."""

    problems: tuple[Problem, ...]
    """What is wrong where."""


class LoadError(PolicyError):
    """A load did not end well."""

    ending: Ending
    """`Ending.STOPPED` when a domain that every host needs is missing, and nothing was installed."""

    messages: tuple[str, ...]
    """All that the command would have written to standard error, line by line."""


def failure(kind: str, json: Json, messages: tuple[str, ...]) -> Error:
    """The exception for a reply of this kind."""
    if kind in ("policy", "load"):
        return _policy_failure(kind, json, messages)
    if kind in ("root", "host"):
        return _numbered_failure(kind, json)
    plain = {"missing": MissingPolicyError, "not-installed": NotInstalledError, "question": QuestionError}
    return plain.get(kind, Error)(json["message"])


def _numbered_failure(kind: str, json: Json) -> Error:
    made: RootError | HostError
    made = RootError(json["message"]) if kind == "root" else HostError(json["message"])
    made.errno = json["errno"]
    return made


def _policy_failure(kind: str, json: Json, messages: tuple[str, ...]) -> Error:
    problems = read_problems(json)
    text = f"{json['message']}: {problems[0]}" if problems else json["message"]
    made = LoadError(text) if kind == "load" else PolicyError(text)
    made.problems = problems
    made.errors = tuple(json["errors"])
    if problems:
        made.file, made.line = problems[0].file, problems[0].line
    if isinstance(made, LoadError):
        made.ending = Ending(json["ending"])
        made.messages = messages
    return made
