"""What the calls of this package return. Nothing in it can be changed; equal values are equal."""

from __future__ import annotations

import enum
from dataclasses import dataclass


class Severity(enum.Enum):
    """How bad a finding is."""

    ERROR = "error"
    """Keeps a load from ending well."""
    WARNING = "warning"
    """A load accepts it, although it can hardly be meant."""


class Level(enum.Enum):
    """Whether a domain's rules are enforced."""

    ENFORCING = "enforcing"
    PERMISSIVE = "permissive"
    DISABLED = "disabled"


class Ending(enum.Enum):
    """How a load ends."""

    DONE = "done"
    FAILED = "failed"
    """With errors."""
    STOPPED = "stopped"
    """A domain that every host needs is missing."""


class Against(enum.Enum):
    """What a policy was checked against."""

    INSTALLED = "installed"
    BOOT = "boot"
    """As after a boot: with `fresh`, and where nothing is installed or this user may not read it."""


@dataclass(frozen=True, slots=True)
class Problem:
    """What a load or a comparison finds wrong with a policy file."""

    file: str
    line: int | None
    """None where it is the file as a whole."""
    message: str

    def __str__(self) -> str:
        return f"{_place(self.file, self.line)}: {self.message}"


@dataclass(frozen=True, slots=True)
class Finding:
    """A problem that a check has found. Lines and columns count from 1, and columns and lengths
    characters; they are None where it is about the file as a whole."""

    file: str
    line: int | None
    column: int | None
    length: int | None
    source: str | None
    """The line itself."""
    severity: Severity
    code: str
    """Its stable name, which docs/diagnostics.md explains."""
    message: str
    hint: str | None
    """What to do, if that is known."""

    def __str__(self) -> str:
        place = _place(self.file, self.line)
        return f"{place}: {self.severity.value}: {self.message} [{self.code}]"


@dataclass(frozen=True, slots=True)
class Report:
    """What a check has found."""

    against: Against
    findings: tuple[Finding, ...]
    """Errors before warnings."""

    @property
    def errors(self) -> tuple[Finding, ...]:
        return tuple(each for each in self.findings if each.severity is Severity.ERROR)

    @property
    def warnings(self) -> tuple[Finding, ...]:
        return tuple(each for each in self.findings if each.severity is Severity.WARNING)


@dataclass(frozen=True, slots=True)
class DomainRule:
    """A rule of a domain, as text."""

    domain: str
    rule: str


@dataclass(frozen=True, slots=True)
class RuleChange:
    """A rule that becomes another."""

    domain: str
    before: str
    after: str


@dataclass(frozen=True, slots=True)
class LabelChange:
    """A file label that differs. None is where there is no such line; a label that is gone is told
    by its number, as `#17`."""

    path: str
    before: str | None
    after: str | None


@dataclass(frozen=True, slots=True)
class Plan:
    """What a load would change."""

    directory: str
    ending: Ending
    errors: tuple[str, ...]
    """The messages that the load would report."""
    changes_nothing: bool
    """True when it would change nothing; what only stays is no change."""
    domains_created: tuple[str, ...]
    domains_removed: tuple[str, ...]
    domains_staying: tuple[str, ...]
    """Those that no file defines any more and that stay."""
    objects_added: tuple[str, ...]
    objects_removed: tuple[str, ...]
    rules_added: tuple[DomainRule, ...]
    rules_removed: tuple[DomainRule, ...]
    rules_changed: tuple[RuleChange, ...]
    rules_staying: tuple[DomainRule, ...]
    """Those that the load found in no file and that stay; behind an error it finds nothing."""
    labels: tuple[LabelChange, ...]
    """The files that would get another label."""


@dataclass(frozen=True, slots=True)
class Remainder:
    """What earlier loads have installed and no file has any more."""

    domains: tuple[str, ...]
    rules: int


@dataclass(frozen=True, slots=True)
class Load:
    """A load that ended well: how much is installed now, and what became of the rest."""

    directory: str
    domains: int
    rules: int
    objects: int
    removed: Remainder
    staying: Remainder
    """What was to be kept, and domains that processes run in."""
    messages: tuple[str, ...]
    """All that the command would have written to standard error, line by line."""


@dataclass(frozen=True, slots=True)
class Rule:
    """A rule, and where it was written."""

    text: str
    """Like the line of a policy that makes it: `-a sshKey read grant`."""
    keyword: str
    words: tuple[str, ...]
    grant: bool | None
    """None for a `-r` rule, which grants the permissions that it has."""
    file: str | None
    """None when no policy file brought it."""
    line: int | None
    instead: str | None
    """Of one that refuses, the rule that would grant."""


@dataclass(frozen=True, slots=True)
class FileFacts:
    """What is known of a file, or of the directory that one is to be made in."""

    exists: bool
    paths: tuple[str, ...]
    """As it was asked and, where that is another path, as it resolves."""
    label: str | None
    label_inherited: bool
    """True when that is the label of a directory above."""
    label_file: str | None
    """Where the label was written; None when no policy file gave it."""
    label_line: int | None


@dataclass(frozen=True, slots=True)
class Question:
    """What was asked."""

    action: str
    words: tuple[str, ...]
    file: FileFacts | None
    """Of a question about a file, that file."""
    directory: FileFacts | None
    """Of one about making a file, where it would be."""


@dataclass(frozen=True, slots=True)
class Answer:
    """Whether a domain may do what was asked, and why. It is true when the domain may."""

    domain: str
    level: Level
    allowed: bool
    granted: bool
    """The answer by the rules alone; other than `allowed` only for a domain that is not enforcing."""
    open: bool
    """No rule decided: the domain is granted no value of the check, so all pass that none revokes."""
    rules: tuple[Rule, ...]
    """Those that decided."""
    missing: tuple[str, ...]
    """Where no rule speaks: the rules of which each would grant."""
    policy_file: str
    """Where the domain's rules are written."""

    def __bool__(self) -> bool:
        return self.allowed


@dataclass(frozen=True, slots=True)
class Why(Answer):
    """An answer and its question."""

    question: Question


@dataclass(frozen=True, slots=True)
class WhoCan:
    """The domains that may do what was asked."""

    question: Question
    domains: tuple[Answer, ...]


@dataclass(frozen=True, slots=True)
class DomainDifference:
    """How a domain differs; a level is None where there is no such domain."""

    name: str
    level_before: Level | None
    level_after: Level | None
    rules_removed: tuple[str, ...]
    rules_added: tuple[str, ...]
    rules_changed: tuple[RuleChange, ...]


@dataclass(frozen=True, slots=True)
class Difference:
    """How two policies differ."""

    before: str
    after: str
    same: bool
    domains: tuple[DomainDifference, ...]
    objects_removed: tuple[str, ...]
    objects_added: tuple[str, ...]
    labels: tuple[LabelChange, ...] | None
    """None unless two directories are compared: a state keeps no such lines."""


def _place(file: str, line: int | None) -> str:
    return file if line is None else f"{file}:{line}"
