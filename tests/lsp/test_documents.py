"""Hunts texts that the server takes for others than the editor has."""

import os
import subprocess

import pytest
from client import Client, RequestFailed, span


def messages(problems):
    return sorted((each["code"], each["range"]["start"]["line"], each["range"]["start"]["character"],
                   each["range"]["end"]["character"]) for each in problems)


def test_tells_the_problems_of_the_whole_policy(client, web, policy):
    client.open(web)
    found = client.problems_of(web)
    assert [each["code"] for each in found] == ["unknown-word"]
    assert found[0] == {"range": span(3, 3, 13), "severity": 1, "code": "unknown-word", "source": "secpolicy",
                        "message": "unknown label 'webContnet'\ndid you mean 'webContent'?"}
    assert client.problems[str(web)]["version"] == client.version
    other = policy / "domains/hostDom"
    client.open(other)
    client.change(other, (span(1, 0, 99), ""))
    assert "unreachable-domain" in [each["code"] for each in client.problems_of(web)]


def test_takes_edits_as_editors_count(client, web):
    smile = "\U0001f600"
    client.open(web, f"# {smile}{smile}\r\n-s read grant\r\n-s rea {smile}")
    assert messages(client.problems_of(web)) == [
        ("cannot-start", 0, 0, 0), ("carriage-return", 1, 13, 13), ("grant-word", 1, 8, 13), ("grant-word", 2, 7, 9)]
    # Within a line, over an end of line, at the end of the text, and behind it.
    client.change(web, (span(0, 2, 4), "\u00fc"), (span(1, 13, 0, 2), "\n"), (span(2, 7, 9), "grant"),
                  (span(9, 9, 9), "\n-s @start grant"))
    found = client.problems_of(web)
    assert messages(found) == [("unknown-word", 2, 3, 6)]
    client.change(web, (span(2, 3, 6), "read"))
    assert messages(client.problems_of(web)) == [("duplicate-rule", 2, 0, 13)]


def test_takes_whole_texts(client, web):
    client.open(web, "")
    assert client.problems_of(web) == []
    client.change(web, "-x", "-s read grant\n-s @start grant\n")
    assert client.problems_of(web) == []


def test_what_is_not_saved_counts_for_other_files(client, web, policy):
    objects = policy / "objects/base"
    client.open(web)
    client.open(objects)
    client.change(objects, (span(0, 0, 0), "webContnet\n"))
    assert client.problems_of(web) == []
    client.close(objects)
    assert [each["code"] for each in client.problems_of(web)] == ["unknown-word"]


def test_a_new_file_is_part_of_the_policy_before_it_is_saved(client, web, policy):
    client.open(web)
    client.change(web, (span(3, 0, 99), "-d webProgram newDom exec grant"))
    assert [each["code"] for each in client.problems_of(web)] == ["unknown-domain"]
    client.open(policy / "domains/newDom", "-s @start grant\n")
    assert client.problems_of(web) == []
    assert client.problems_of(policy / "domains/newDom") == []
    client.close(policy / "domains/newDom")
    assert [each["code"] for each in client.problems_of(web)] == ["unknown-domain"]


def test_looks_again_when_a_file_is_saved(client, web, root):
    client.open(web)
    client.change(web, (span(3, 0, 99), "-r /usr/new r"))
    assert [each["code"] for each in client.problems_of(web)] == ["missing-path"]
    (root / "usr/new").touch()
    client.notify("textDocument/didSave", textDocument={"uri": web.as_uri()})
    assert client.problems_of(web) == []


def test_asks_to_be_told_of_files_that_others_change(root, web, policy):
    with Client(root, "--fresh") as client:
        client.start(workspace={"didChangeWatchedFiles": {"dynamicRegistration": True}})
        request = client.receive()
        assert request["method"] == "client/registerCapability"
        assert request["params"]["registrations"] == [{
            "id": "files", "method": "workspace/didChangeWatchedFiles",
            "registerOptions": {"watchers": [{"globPattern": "**/{objects,domains,fileLabels,tardisks}/**"}]}}]
        client.send(id=request["id"], result=None)
        client.open(web)
        assert [each["code"] for each in client.problems_of(web)] == ["unknown-word"]
        (policy / "objects/more").write_text("webContnet\n")
        client.notify("workspace/didChangeWatchedFiles", changes=[])
        assert client.problems_of(web) == []


def test_knows_the_root_by_a_link(tmp_path, root, web):
    (tmp_path / "link").symlink_to(root)
    with Client(tmp_path / "link", "--fresh") as client:
        client.start()
        client.open(web)
        assert client.problems_of(web) != [], "by the path without the link"
        linked = tmp_path / "link" / web.relative_to(root)
        client.close(web)
        client.open(linked)
        client.change(linked, "-x")
        assert [each["code"] for each in client.problems_of(linked)] == ["cannot-start", "rule-type"]


def test_tells_of_a_file_outside_the_root(client, tmp_path):
    client.open(tmp_path / "file", "-x")
    client.sync()
    assert client.shown == [f"secpolicy: {(tmp_path / 'file').as_uri()} is not below the root that this server is for"]


def test_tells_once_why_nothing_can_be_checked(root, web):
    state = root / "run/secpolicy/host.db"
    state.parent.mkdir(parents=True)
    state.write_text("no database")
    with Client(root) as client:
        client.start()
        client.open(web)
        client.sync()
        client.change(web, "-x")
        assert client.problems_of(web) == []
        assert len(client.shown) == 1, client.shown
        with pytest.raises(RequestFailed) as failure:
            client.at("hover", web, 0, 0)
        assert failure.value.code == -32603
        state.unlink()
        assert [each["code"] for each in client.problems_of(web)] == ["cannot-start", "rule-type"]
        assert client.stop() == 0


def test_leaves_files_of_no_policy_alone(client, root, policy):
    for path in [root / "usr/bin/env", policy / "README.md", policy / "domains/sub/file"]:
        client.open(path, "-x")
        assert client.problems_of(path) == []
        assert client.at("completion", path, 0, 0) is None
        assert client.about("formatting", path, options={}) is None


def test_serves_one_policy_after_the_other(client, root, policy, web):
    subprocess.run(["cp", "-r", policy, root / "other"], check=True)
    other = root / "other/domains/webDom"
    client.open(web)
    client.open(other)
    client.change(other, "-s raed grant")
    assert [each["code"] for each in client.problems_of(other)] == ["cannot-start", "unknown-word"]
    client.change(web, "-s read")
    assert "argument-count" in [each["code"] for each in client.problems_of(web)]


def test_options_choose_as_those_of_check(root, web):
    with Client(root, "--fresh", "--disable", "missing-path") as client:
        client.start()
        client.open(web, "-r /none r\n-s @start grant\n")
        assert client.problems_of(web) == []
    end = subprocess.run([os.environ["SECPOLICY"], "lsp", "--disable", "rule-type"], capture_output=True, check=False,
                         timeout=20)
    assert end.returncode == 2
