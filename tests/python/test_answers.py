"""What the calls return is what the command writes for programs, whole and in order."""

import shutil

import secpolicy
from conftest import POLICY, document, run


def values(items, *members):
    """The members of each item of a document."""
    return [tuple(item.get(member) for member in members) for item in items]


def test_version(broken):
    assert run(broken, "--version").stdout == f"secpolicy {secpolicy.__version__}\n"


def test_check(broken):
    report = secpolicy.check(root=broken)
    written = document(broken, "check")
    assert report.against.value == written["against"] == "installed"
    assert len(report.errors) == written["errors"] == 1
    assert len(report.warnings) == written["warnings"]
    assert [(each.file, each.line, each.column, each.length, each.source, each.severity.value, each.code,
             each.message, each.hint) for each in report.findings] == values(
        written["problems"], "file", "line", "column", "length", "source", "severity", "code", "message", "hint")
    assert str(report.errors[0]) == f"{broken}/{POLICY}/domains/sshDom:3: error: unknown label 'sshKye' [unknown-word]"


def test_check_fresh_and_one_file(broken):
    assert secpolicy.check(root=broken, fresh=True).against is secpolicy.Against.BOOT
    assert secpolicy.check("/" + POLICY + "/domains/appDom", root=broken).errors == ()


def test_plan(host):
    """Every kind of change, and nothing is changed."""
    policy = host / POLICY
    with (policy / "objects/base").open("a") as objects:
        objects.write("newObject\n")
    with (policy / "domains/sshDom").open("a") as rules:
        rules.write("-c cap_sys_boot grant\n")
    (policy / "domains/newDom").write_text("-c cap_chown grant\n")
    with (policy / "fileLabels/base").open("a") as labels:
        labels.write("/etc/hostname newObject\n")
    (host / "etc/hostname").write_text("a\n")
    written = document(host, "load", "--plan")
    plan = secpolicy.plan(root=host)
    assert plan == secpolicy.plan(root=host)
    assert (plan.directory, plan.ending.value, list(plan.errors), plan.changes_nothing) == (
        written["directory"], written["ending"], written["errors"], written["changesNothing"])
    assert list(plan.domains_created) == written["domains"]["create"] == ["newDom"]
    assert list(plan.domains_removed) == written["domains"]["remove"]
    assert list(plan.domains_staying) == written["domains"]["stay"]
    assert list(plan.objects_added) == written["objects"]["add"] == ["newObject"]
    assert list(plan.objects_removed) == written["objects"]["remove"]
    rules = written["rules"]
    for ours, theirs in ((plan.rules_added, "add"), (plan.rules_removed, "remove"), (plan.rules_staying, "stay")):
        assert [(each.domain, each.rule) for each in ours] == values(rules[theirs], "domain", "rule")
    assert secpolicy.DomainRule("sshDom", "-c cap_sys_boot grant") in plan.rules_added
    assert [(each.domain, each.before, each.after) for each in plan.rules_changed] == values(
        rules["change"], "domain", "before", "after")
    assert [(each.path, each.before, each.after) for each in plan.labels] == values(
        written["labels"], "path", "before", "after") != []


def test_plan_of_a_bad_policy(broken):
    plan = secpolicy.plan(root=broken)
    assert plan.ending is secpolicy.Ending.FAILED
    assert list(plan.errors) == document(broken, "load", "--plan")["errors"] != []


def test_load(host):
    extra = host / POLICY / "domains/extraDom"
    extra.write_text("-c cap_chown grant\n")
    secpolicy.load(root=host)
    extra.unlink()
    with (host / POLICY / "domains/sshDom").open("a") as rules:
        rules.write("-c cap_sys_boot grant\n")
    load = secpolicy.load(root=host, keep=True)
    assert load.staying.domains == ("extraDom",) and load.removed == secpolicy.Remainder((), 0)
    assert load.directory == "/" + POLICY
    status = document(host, "status")
    assert (load.domains, load.rules, load.objects) == (status["domains"], status["rules"], status["objects"])
    assert status["latestLoad"]["verb"] == "load" and status["latestLoad"]["ending"] == "done"
    assert load.messages[-1].startswith(f"secpolicy: load: done ({load.domains} domains, {load.rules} rules")
    assert secpolicy.why("sshDom", "use", "cap_sys_boot", root=host)
    assert secpolicy.load(root=host).removed.domains == ("extraDom",)


def check_answer(answer, written):
    assert (answer.domain, answer.level.value, answer.allowed, answer.granted, answer.open, list(answer.missing),
            answer.policy_file) == (
        written["domain"], written["level"], written["allowed"], written["granted"], written.get("open", False),
        written["missing"], written["policyFile"])
    assert [(each.text, each.keyword, list(each.words), each.grant, each.file, each.line, each.instead)
            for each in answer.rules] == values(
        written["rules"], "text", "keyword", "words", "grant", "file", "line", "instead")
    assert bool(answer) is answer.allowed


def check_question(question, written):
    assert (question.action, list(question.words)) == (written["action"], written["words"])
    for ours, theirs in ((question.file, written.get("file")), (question.directory, written.get("directory"))):
        assert (ours is None) == (theirs is None)
        if ours is not None:
            assert (ours.exists, list(ours.paths), ours.label, ours.label_inherited, ours.label_file,
                    ours.label_line) == (
                theirs["exists"], theirs["paths"], theirs["label"], theirs.get("labelInherited", False),
                theirs.get("labelFile"), theirs.get("labelLine"))


def test_why(booted):
    for domain, *words in (
            ("sshDom", "read", "/etc/ssh/host_key"), ("sshDom", "write", "/etc/ssh/host_key"),
            ("sshDom", "read", "/nowhere"), ("appDom", "make", "/etc/new", "regular"), ("sshDom", "call", "ptrace"),
            ("sshDom", "pass", "bind_port", 22), ("hostDom", "enter", "sshDom")):
        why = secpolicy.why(domain, *words, root=booted)
        written = document(booted, "why", domain, *map(str, words))
        check_answer(why, written)
        check_question(why.question, written["question"])


def test_why_of_a_number(booted):
    domain = next(each for each in document(booted, "display")["domains"] if each["name"] == "sshDom")
    assert secpolicy.why(str(domain["id"]), "read", "/etc/ssh/host_key", root=booted).domain == "sshDom"


def test_who_can(booted):
    who_can = secpolicy.who_can("read", booted.parent.parent / "nowhere", root=booted)
    assert who_can.question.file is not None and not who_can.question.file.exists
    who_can = secpolicy.who_can("use", "cap_net_bind_service", root=booted)
    written = document(booted, "who-can", "use", "cap_net_bind_service")
    check_question(who_can.question, written["question"])
    assert len(who_can.domains) == len(written["domains"]) > 0
    for ours, theirs in zip(who_can.domains, written["domains"]):
        check_answer(ours, theirs)


def test_diff(host):
    assert secpolicy.diff("installed", secpolicy.POLICY, root=host).same
    run(host, "save", "before")
    policy = host / POLICY
    shutil.copytree(policy, host / "old")
    (policy / "domains/newDom").write_text("-c cap_chown grant\n")
    with (policy / "fileLabels/base").open("a") as labels:
        labels.write("/etc/hostname sshKey\n")
    ssh = policy / "domains/sshDom"
    ssh.write_text(ssh.read_text().replace("-a sshKey     write   revoke", "-a sshKey write grant")
                   + "-c cap_sys_boot grant\n")
    check_difference(host, "installed", secpolicy.POLICY)
    check_difference(host, "/old", secpolicy.POLICY)
    run(host, "load")
    check_difference(host, "before", "installed")


def check_difference(host, before, after):
    difference = secpolicy.diff(before, after, root=host)
    written = document(host, "diff", before, after)
    assert not difference.same
    assert (difference.before, difference.after, difference.same) == (
        written["before"], written["after"], written["same"])
    assert list(difference.objects_removed) == written["objects"]["removed"]
    assert list(difference.objects_added) == written["objects"]["added"]
    assert (difference.labels is None) == (written["labels"] is None)
    if difference.labels is not None:
        assert [(each.path, each.before, each.after) for each in difference.labels] == values(
            written["labels"], "path", "before", "after")
    assert len(difference.domains) == len(written["domains"])
    for ours, theirs in zip(difference.domains, written["domains"]):
        level = (ours.level_before and ours.level_before.value, ours.level_after and ours.level_after.value)
        rules = theirs["rules"]
        assert (ours.name, *level) == (theirs["name"], theirs["level"]["before"], theirs["level"]["after"])
        assert (list(ours.rules_removed), list(ours.rules_added)) == (rules["removed"], rules["added"])
        assert [(each.domain, each.before, each.after) for each in ours.rules_changed] == [
            (ours.name, *change) for change in values(rules["changed"], "before", "after")]
