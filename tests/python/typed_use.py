"""A program that only a type checker reads: what is wrong use is refused, and what is right is not."""

from pathlib import Path

import secpolicy

report = secpolicy.check(Path("/policy"), root="r", fresh=True)
lines: list[int | None] = [each.line for each in report.errors]
file: str = report.errors[0].file
why: secpolicy.Why = secpolicy.why("sshDom", "pass", "bind_port", 22, root=b"r")
level: secpolicy.Level = why.level
names: tuple[str, ...] = secpolicy.plan(keep=True).domains_created
removed: int = secpolicy.load(all_or_nothing=True).removed.rules
labels: tuple[secpolicy.LabelChange, ...] | None = secpolicy.diff("installed", "/policy").labels

secpolicy.check(root=3)  # type: ignore[arg-type]
secpolicy.load(keep="yes")  # type: ignore[arg-type]
why.allowed = True  # type: ignore[misc]
line: int = report.errors[0].line  # type: ignore[assignment]
wrong: str = secpolicy.diff("a", "b").same  # type: ignore[assignment]

try:
    secpolicy.load()
except secpolicy.LoadError as failure:
    ending: secpolicy.Ending = failure.ending
    place: tuple[str | None, int | None] = failure.file, failure.line
    first: str = failure.problems[0].message
