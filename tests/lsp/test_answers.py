"""Hunts answers that are not those of the policy: completion, hover, places, names, fixes and columns."""

import subprocess

import pytest
from client import Client, RequestFailed, span

ALL_KINDS = """\
# A domain with every kind of rule.
-a webContent read grant
-c cap_net_bind_service grant
-d webProgram webDom exec grant
-f webContent webProgram regular revoke
-p bind_port 8000 8099 grant
-r /usr/share rw
-s @file grant
-s accept4 grant
-u webContent stream grant
"""


def labels(answer):
    return [item["label"] for item in answer["items"]] if answer else []


def offered(client, path, line):
    """What is offered at the end of the only line of a file."""
    if path in client.texts:
        client.change(path, line)
    else:
        client.open(path, line)
    return labels(client.at("completion", path, 0, len(line)))


def apply(text, edits):
    """The text after edits of a document without odd line ends or characters."""
    lines = text.split("\n")
    for edit in sorted(edits, key=lambda each: list(each["range"]["start"].values()), reverse=True):
        start, end = edit["range"]["start"], edit["range"]["end"]
        head, tail = lines[start["line"]][:start["character"]], lines[end["line"]][end["character"]:]
        lines[start["line"]:end["line"] + 1] = (head + edit["newText"] + tail).split("\n")
    return "\n".join(lines)


def text_of(policy, path):
    return (policy / path).read_bytes().decode()


def test_offers_words_by_their_place(client, web, policy):
    assert offered(client, web, "") == ["-a", "-c", "-d", "-f", "-p", "-r", "-s", "-u"]
    assert "webContent" in offered(client, web, "-a web")
    assert offered(client, web, "-a webContent ") == ["execute", "list", "read", "remove", "truncate", "write"]
    assert offered(client, web, "-a webContent read gr") == ["grant", "revoke"]
    assert offered(client, web, "-a webContent read grant ") == []
    assert "cap_chown" in offered(client, web, "-c ")
    assert offered(client, web, "-d webProgram ")[:3] == ["appDom", "daemonFrameworkDom", "globalVMDom"]
    assert offered(client, web, "-d webProgram webDom ") == ["enter", "exec", "tardisk_exec"]
    assert "webContent" in offered(client, web, "-f webContent ")
    assert "bind_port" in offered(client, web, "-p ")
    assert offered(client, web, "-p bind_port ") == []
    assert offered(client, web, "-p bind_port 80 ") == ["grant", "revoke"]
    assert offered(client, web, "-p bind_port 80 90 ") == ["grant", "revoke"]
    assert offered(client, web, "-r /usr/sh") == ["/usr/shadow", "/usr/share"]
    assert offered(client, web, "-r u") == ["/"]
    assert "rw" in offered(client, web, "-r /usr ")
    assert {"@start", "accept4"} <= set(offered(client, web, "-s "))
    assert offered(client, web, "-u webContent ") == ["dgram", "seqpacket", "stream"]
    assert offered(client, web, "-s read # -s ") == offered(client, web, "-z ") == []
    assert "/usr/share/*" in offered(client, policy / "fileLabels/base", "/usr/share/")
    assert "webContent" in offered(client, policy / "fileLabels/base", "/usr ")
    assert offered(client, policy / "objects/base", "we") == []
    assert offered(client, policy / "tardisks/new", "") == ["-E"]
    assert "appDom" in offered(client, policy / "tardisks/new", "-E webContent ")


def test_an_offered_word_replaces_the_one_that_was_begun(client, web):
    client.open(web, "-s accept4 grant\n-a web read")
    item = next(item for item in client.at("completion", web, 1, 5)["items"] if item["label"] == "webContent")
    assert item["textEdit"] == {"range": span(1, 3, 5), "newText": "webContent"}
    sets = {item["label"]: item.get("detail") for item in client.at("completion", web, 0, 3)["items"]}
    assert sets["accept4"] == "system call"
    assert sets["@start"] not in ("system call", "")


def test_tells_kinds_of_words_by_the_numbers_of_the_protocol(client, web, policy):
    client.open(web, "")

    def kind_of(line, word):
        client.change(web, line)
        items = client.at("completion", web, 0, len(line))["items"]
        return next(item["kind"] for item in items if item["label"] == word)

    function, module, keyword, folder, member, constant = 3, 9, 14, 19, 20, 21
    assert kind_of("", "-a") == keyword
    assert kind_of("-a ", "webContent") == constant
    assert kind_of("-a webContent ", "read") == member
    assert kind_of("-d webProgram ", "webDom") == module
    assert kind_of("-s ", "accept4") == function
    assert kind_of("-r /usr/", "/usr/share") == folder


def test_tells_when_more_may_be_offered(client, web):
    client.open(web, "-r /usr/")
    assert client.at("completion", web, 0, 8)["isIncomplete"] is True
    client.change(web, "-s ")
    assert client.at("completion", web, 0, 3)["isIncomplete"] is False


@pytest.mark.parametrize("line, sentence", [
    (1, "`webDom` may `read` what carries the label `webContent`."),
    (2, "`webDom` holds the capability `cap_net_bind_service`."),
    (3, "By `exec` of something with the label `webProgram`, `webDom` goes over into the domain `webDom`."),
    (4, "In a directory with the label `webContent`, `webDom` may not create files of the kind `regular` with the label "
        "`webProgram`."),
    (5, "`webDom` passes the check `bind_port` with every number from `8000` to `8099`."),
    (6, "`webDom` may read and write `/usr/share` and what is beneath it."),
    (8, "`webDom` may make the system call `accept4`."),
    (9, "`webDom` may create sockets of the kind `stream` with the label `webContent`.")])
def test_explains_rules(client, web, line, sentence):
    client.open(web, ALL_KINDS)
    assert client.at("hover", web, line, 1)["contents"]["value"] == sentence + "\n"


def test_explains_words_and_who_else_has_them(client, web, policy):
    client.open(web, ALL_KINDS)
    value = client.at("hover", web, 1, 5)["contents"]["value"]
    assert "`webContent`: an object of `objects/base:2`: what it shows to everyone\n\nAlso in 3 other lines:" in value
    assert "- `domains/webDom:5`: `-f webContent webProgram regular revoke`\n" in value
    assert "- `fileLabels/base:1`: `/usr/share/* webContent`\n" in value
    assert "`webDom`: a domain, defined by `domains/webDom` (9 rules)" in client.at("hover", web, 3, 16)["contents"]["value"]
    assert "`openat`" in client.at("hover", web, 7, 5)["contents"]["value"]
    assert "`accept4`: a system call of `@network`" in client.at("hover", web, 8, 5)["contents"]["value"]
    assert client.at("hover", web, 0, 5) is None
    client.change(web, "-a unlabeled read grant\n-a nothing read grant\n-d webProgram noDom exec grant\n")
    assert "`unlabeled`: a label that is built in\n" in client.at("hover", web, 0, 5)["contents"]["value"]
    assert "`nothing`: a label that no file declares\n" in client.at("hover", web, 1, 5)["contents"]["value"]
    assert "`noDom`: a domain that no file defines\n" in client.at("hover", web, 2, 16)["contents"]["value"]
    client.change(web, "-a webContent read grant\n-f webContent webContent regular grant\n")
    assert "Also in 2 other lines:\n\n- `domains/webDom:2`: `-f webContent webContent regular grant`\n- `fileLabels" \
        in client.at("hover", web, 0, 5)["contents"]["value"]
    labels_file = policy / "fileLabels/base"
    client.open(labels_file)
    assert client.at("hover", labels_file, 0, 1)["contents"]["value"].startswith(
        "`/usr/share` and everything beneath it carry the label `webContent`.")


def test_explains_a_domain_with_all_its_files(client, web, policy):
    (policy / "domains/plugins").mkdir(exist_ok=True)
    (policy / "domains/plugins/part").write_text("-s read grant\n-s write grant\n")
    (policy / "domains/plugin-part").write_text("-s read grant\n")
    client.open(web, "-d webProgram plugin-part exec grant\n")
    assert "`plugin-part`: a domain, defined by `domains/plugin-part` (1 rule), `domains/plugins/part` (2 rules)" \
        in client.at("hover", web, 0, 16)["contents"]["value"]


def test_finds_where_names_are_declared_and_used(client, web, policy):
    client.open(web)
    declared = {"uri": (policy / "objects/base").as_uri(), "range": span(0, 0, 10)}
    assert client.at("definition", web, 2, 13) == [declared]
    host = policy / "domains/hostDom"
    used = [{"uri": host.as_uri(), "range": span(1, 3, 13)}, {"uri": web.as_uri(), "range": span(2, 3, 13)},
            {"uri": (policy / "fileLabels/base").as_uri(), "range": span(1, 14, 24)}]
    assert client.at("references", web, 2, 3, context={"includeDeclaration": False}) == used
    assert client.at("references", web, 2, 3, context={"includeDeclaration": True}) == [declared, *used]
    file = {"uri": web.as_uri(), "range": span(0, 0, 0)}
    client.open(host)
    assert client.at("definition", host, 1, 15) == [file]
    assert client.at("references", host, 1, 15, context={"includeDeclaration": True})[0] == file
    assert client.at("definition", web, 0, 3) is None


def test_renames_a_label_everywhere(client, web, policy):
    client.open(web)
    assert client.at("prepareRename", web, 2, 5) == {"range": span(2, 3, 13), "placeholder": "webProgram"}
    changes = client.at("rename", web, 2, 5, newName="webd")["documentChanges"]
    assert [each["textDocument"]["version"] for each in changes] == [None, client.version, None, None]
    for each in changes:
        path = web.parent.parent / each["textDocument"]["uri"].rpartition("secpolicy/")[2]
        path.write_text(apply(path.read_bytes().decode(), each["edits"]))
    everything = "".join(file.read_text() for file in policy.rglob("*") if file.is_file())
    assert everything.count("webd ") + everything.count("webd\n") == 4
    assert "webProgram" not in everything


@pytest.mark.parametrize("abilities, form", [
    ({}, "changes"), ({"documentChanges": True}, "documentChanges"), ({"resourceOperations": ["rename"]}, "documentChanges")])
def test_edits_in_the_form_that_the_editor_takes(root, web, abilities, form):
    with Client(root, "--fresh") as client:
        client.start(workspace={"workspaceEdit": abilities})
        client.open(web)
        edit = client.at("rename", web, 2, 5, newName="webd")
        assert list(edit) == [form]
        own = {"range": span(2, 3, 13), "newText": "webd"}
        if form == "changes":
            assert edit["changes"][web.as_uri()] == [own]
        else:
            assert [own] in [each["edits"] for each in edit["documentChanges"]]


def test_the_edits_of_a_closed_file_are_of_no_version(client, web, policy):
    host = policy / "domains/hostDom"
    client.open(web)
    client.close(web)
    client.open(host)
    changes = client.at("rename", host, 1, 5, newName="webd")["documentChanges"]
    versions = {each["textDocument"]["uri"]: each["textDocument"]["version"] for each in changes}
    assert versions[web.as_uri()] is None
    assert versions[host.as_uri()] == client.version


def test_renames_a_domain_with_its_file(client, policy, web):
    host = policy / "domains/hostDom"
    client.open(host)
    client.open(web, "-a webDom read grant\n-s @start grant\n")
    changes = client.at("rename", host, 1, 16, newName="wwwDom")["documentChanges"]
    edited = {each["textDocument"]["uri"]: each["edits"] for each in changes[:-1]}
    assert edited == {host.as_uri(): [{"range": span(1, 14, 20), "newText": "wwwDom"}],
                      web.as_uri(): [{"range": span(0, 3, 9), "newText": "wwwDom"}]}
    assert changes[-1] == {"kind": "rename", "oldUri": web.as_uri(), "newUri": (web.parent / "wwwDom").as_uri()}
    # Asking changed nothing.
    assert "unreachable-domain" not in [each["code"] for each in client.problems_of(web)]


@pytest.mark.parametrize("name, why", [
    ("", "'' is no word of a policy file"),
    ("two words", "'two words' is no word of a policy file"),
    ("a#b", "'a#b' is no word of a policy file"),
    ("webContent", "there is a label 'webContent' already"),
    ("unlabeled", "there is a label 'unlabeled' already"),
    ("webDom", "there is a domain 'webDom' already"),
    ("x" * 256, None)])
def test_refuses_names_that_labels_cannot_have(client, web, name, why):
    client.open(web)
    with pytest.raises(RequestFailed) as failure:
        client.at("rename", web, 2, 5, newName=name)
    assert why is None or str(failure.value) == why


def test_refuses_names_that_domains_cannot_have(client, policy):
    host = policy / "domains/hostDom"
    client.open(host)
    for name, why in [("a/b", "'a/b' is no name of a file"), ("appDom", "there is a domain 'appDom' already"),
                      ("webProgram", "there is a label 'webProgram' already"), ("x" * 64, None)]:
        with pytest.raises(RequestFailed) as failure:
            client.at("rename", host, 1, 16, newName=name)
        assert why is None or str(failure.value) == why
    client.change(host, "-d webProgram appDom exec grant\n-a unlabeled read grant\n-s @start grant\n")
    for line, character, why in [(0, 16, "every host needs the domain 'appDom'"), (0, 1, None),
                                 (1, 5, "the label 'unlabeled' is built in"), (2, 5, None)]:
        with pytest.raises(RequestFailed) as failure:
            client.at("prepareRename", host, line, character)
        assert str(failure.value) == (why or "only labels and domains can be renamed")


def test_fixes_mend_what_they_are_for(client, web, policy):
    text = ("\ufeff# mark\n-a webContnet read grant\n-s\tread grant\n-c chown grant\n-s read grnt\n-s @start grant\n"
            "-s @start grant\n-p bind_port 80-90 grant\n-p bind_port 9 7 grant\n-a new read grant")
    client.open(web, text)
    for _ in range(12):
        found = client.problems_of(web)
        actions = client.about("codeAction", web, range=span(0, 0, 0, 99), context={"diagnostics": []})
        actions = [each for each in actions if "Declare" not in each["title"]]
        if not actions:
            break
        action = actions[0]
        assert action["kind"] == "quickfix"
        assert action["diagnostics"][0] in found
        change = action["edit"]["documentChanges"][0]
        assert change["textDocument"] == {"uri": web.as_uri(), "version": client.version}
        text = apply(text, change["edits"])
        client.change(web, text)
    assert text == ("# mark\n-a webContent read grant\n-s read grant\n-c cap_chown grant\n-s read grant\n-s @start grant\n"
                    "-p bind_port 80 90 grant\n-p bind_port 7 9 grant\n-a new read grant").replace(
                        "-s read grant\n-s @start", "-s @start")
    last = client.about("codeAction", web, range=span(text.count("\n"), 4, 4), context={"diagnostics": []})
    assert [each["title"] for each in last] == ["Declare the object 'new'"]
    edit = last[0]["edit"]["documentChanges"][0]
    assert edit["textDocument"]["uri"] == (policy / "objects/base").as_uri()
    assert apply("webProgram\nwebContent\n", edit["edits"]) == "webProgram\nwebContent\nnew\n"


def test_adds_what_every_program_needs(client, web):
    client.open(web, "-s read grant")
    actions = client.about("codeAction", web, range=span(0, 0, 0), context={"diagnostics": []})
    fix = next(each for each in actions if each["title"] == "Grant what every program needs to start")
    assert apply("-s read grant", fix["edit"]["documentChanges"][0]["edits"]) == "-s read grant\n-s @start grant\n"


def test_aligns_columns_and_nothing_else(client, web, root):
    text = "#  keep\n-a   webContent read grant #why\n\n\n-a webProgram execute   grant\r\n  -s read grant  \n-r /usr/share"
    client.open(web, text)
    edits = client.about("formatting", web, options={"tabSize": 4, "insertSpaces": True})
    assert all(edit["range"]["start"]["line"] == edit["range"]["end"]["line"] for edit in edits)
    formatted = apply(text.replace("\r", ""), edits)
    assert formatted == ("#  keep\n-a webContent read grant   #why\n\n\n-a webProgram execute grant\n-s read grant\n"
                         "-r /usr/share\n")
    client.change(web, formatted)
    assert client.about("formatting", web, options={}) == []
    client.change(web, text)
    ranged = client.about("rangeFormatting", web, range=span(5, 0, 3), options={})
    assert ranged == [{"range": span(5, 0, 17), "newText": "-s read grant"}]


def test_lists_the_lines(client, web, policy):
    client.open(web, "# x\n-s   read grant # y\n")
    assert client.about("documentSymbol", web) == [
        {"name": "-s read grant", "kind": 7, "range": span(1, 0, 15), "selectionRange": span(1, 0, 15)}]
    assert client.about("documentSymbol", policy / "objects/base")[1]["name"] == "webContent"


def test_changes_no_file(client, web, policy):
    before = subprocess.run(["tar", "-c", policy], capture_output=True, check=True).stdout
    client.open(web)
    client.at("rename", web, 2, 5, newName="webd")
    client.about("formatting", web, options={})
    client.notify("textDocument/didSave", textDocument={"uri": web.as_uri()})
    client.sync()
    assert subprocess.run(["tar", "-c", policy], capture_output=True, check=True).stdout == before
