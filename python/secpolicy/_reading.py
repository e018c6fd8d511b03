"""Makes the values out of the documents that docs/json.md describes."""

from __future__ import annotations

from typing import Any

from ._values import (
    Against, Answer, Difference, DomainDifference, DomainRule, Ending, FileFacts, Finding, LabelChange, Level, Load,
    Plan, Problem, Question, Remainder, Report, Rule, RuleChange, Severity, WhoCan, Why)

Json = dict[str, Any]


def read_report(json: Json) -> Report:
    return Report(Against(json["against"]), tuple(map(_finding, json["problems"])))


def _finding(json: Json) -> Finding:
    return Finding(
        file=json["file"], line=json.get("line"), column=json.get("column"), length=json.get("length"),
        source=json.get("source"), severity=Severity(json["severity"]), code=json["code"],
        message=json["message"], hint=json.get("hint"))


def read_plan(json: Json) -> Plan:
    domains, objects, rules = json["domains"], json["objects"], json["rules"]
    return Plan(
        directory=json["directory"], ending=Ending(json["ending"]), errors=tuple(json["errors"]),
        changes_nothing=json["changesNothing"],
        domains_created=tuple(domains["create"]), domains_removed=tuple(domains["remove"]),
        domains_staying=tuple(domains["stay"]),
        objects_added=tuple(objects["add"]), objects_removed=tuple(objects["remove"]),
        rules_added=_domain_rules(rules["add"]), rules_removed=_domain_rules(rules["remove"]),
        rules_changed=tuple(RuleChange(**change) for change in rules["change"]),
        rules_staying=_domain_rules(rules["stay"]), labels=_labels(json["labels"]))


def _domain_rules(rules: list[Json]) -> tuple[DomainRule, ...]:
    return tuple(DomainRule(**rule) for rule in rules)


def _labels(labels: list[Json]) -> tuple[LabelChange, ...]:
    return tuple(LabelChange(**label) for label in labels)


def read_load(json: Json, messages: tuple[str, ...]) -> Load:
    return Load(
        directory=json["directory"], domains=json["domains"], rules=json["rules"], objects=json["objects"],
        removed=_remainder(json["removed"]), staying=_remainder(json["stay"]), messages=messages)


def _remainder(json: Json) -> Remainder:
    return Remainder(tuple(json["domains"]), json["rules"])


def read_why(json: Json) -> Why:
    return Why(**_answer(json), question=_question(json["question"]))


def read_who_can(json: Json) -> WhoCan:
    return WhoCan(_question(json["question"]), tuple(Answer(**_answer(each)) for each in json["domains"]))


def _answer(json: Json) -> Json:
    return {
        "domain": json["domain"], "level": Level(json["level"]), "allowed": json["allowed"],
        "granted": json["granted"], "open": json.get("open", False),
        "rules": tuple(map(_rule, json["rules"])), "missing": tuple(json["missing"]),
        "policy_file": json["policyFile"]}


def _rule(json: Json) -> Rule:
    return Rule(
        text=json["text"], keyword=json["keyword"], words=tuple(json["words"]), grant=json.get("grant"),
        file=json.get("file"), line=json.get("line"), instead=json.get("instead"))


def _question(json: Json) -> Question:
    return Question(json["action"], tuple(json["words"]), _file(json.get("file")), _file(json.get("directory")))


def _file(json: Json | None) -> FileFacts | None:
    if json is None:
        return None
    return FileFacts(
        exists=json["exists"], paths=tuple(json["paths"]), label=json["label"],
        label_inherited=json.get("labelInherited", False), label_file=json.get("labelFile"),
        label_line=json.get("labelLine"))


def read_difference(json: Json) -> Difference:
    labels = json["labels"]
    return Difference(
        before=json["before"], after=json["after"], same=json["same"],
        domains=tuple(map(_domain_difference, json["domains"])),
        objects_removed=tuple(json["objects"]["removed"]), objects_added=tuple(json["objects"]["added"]),
        labels=None if labels is None else _labels(labels))


def _domain_difference(json: Json) -> DomainDifference:
    name, level, rules = json["name"], json["level"], json["rules"]
    return DomainDifference(
        name=name, level_before=_level(level["before"]), level_after=_level(level["after"]),
        rules_removed=tuple(rules["removed"]), rules_added=tuple(rules["added"]),
        rules_changed=tuple(RuleChange(name, **change) for change in rules["changed"]))


def _level(name: str | None) -> Level | None:
    return None if name is None else Level(name)


def read_problems(json: Json) -> tuple[Problem, ...]:
    return tuple(Problem(each["file"], each.get("line"), each["message"]) for each in json["problems"])
