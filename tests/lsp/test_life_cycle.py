"""Hunts a server that ends badly, never, or for a message that is none."""

import copy
import os
import random
import signal
import subprocess
import time

import pytest
from client import Client, RequestFailed, span


@pytest.fixture
def new_client(root):
    with Client(root, "--fresh") as client:
        yield client


def refused(client, method, code, **params):
    with pytest.raises(RequestFailed) as failure:
        client.request(method, **params)
    assert failure.value.code == code
    return str(failure.value)


def end_of(root, content):
    """How the server ends that is given these bytes and nothing more."""
    end = subprocess.run([os.environ["SECPOLICY"], "--root", root, "lsp"], input=content, capture_output=True,
                         timeout=20, check=False)
    return end.returncode, end.stderr.decode()


def test_serves_only_between_initialize_and_shutdown(new_client, web):
    client = new_client
    hover = {"textDocument": {"uri": "file:///x"}, "position": {"line": 0, "character": 0}}
    assert refused(client, "textDocument/hover", -32002, **hover) == "the server is not initialized"
    client.open(web)
    capabilities = client.start()["capabilities"]
    assert capabilities["positionEncoding"] == "utf-16"
    assert client.problems == {}, "what is sent before it is initialized is not looked at"
    assert refused(client, "initialize", -32600) == "the server is initialized already"
    client.request("shutdown")
    assert refused(client, "textDocument/hover", -32600, **hover) == "the server is shut down"
    client.notify("exit")
    assert client.process.wait(timeout=20) == 0


def test_an_exit_without_shutdown_is_a_failure(new_client):
    new_client.start()
    new_client.notify("exit")
    assert new_client.process.wait(timeout=20) == 1


def test_ends_when_the_editor_is_gone(new_client, root):
    new_client.start()
    new_client.process.stdin.close()
    assert new_client.process.wait(timeout=20) == 1
    assert end_of(root, b"") == (1, "")


def test_ends_when_nobody_reads(new_client, web):
    new_client.start()
    new_client.process.stdout.close()
    new_client.open(web)
    assert new_client.process.wait(timeout=20) == 1


def test_leaves_nothing_behind_when_it_is_told_to_end(root, web, new_client):
    (root / "tmp").mkdir()
    new_client.start()
    new_client.open(web)
    new_client.sync()
    assert list((root / "tmp").iterdir()), "there is a scratch state"
    new_client.process.send_signal(signal.SIGTERM)
    assert new_client.process.wait(timeout=20) == 1
    assert not list((root / "tmp").iterdir())


def test_refuses_what_it_does_not_know(client):
    assert refused(client, "workspace/executeCommand", -32601) == "there is no method workspace/executeCommand"
    assert refused(client, "$/nothing", -32601) == "there is no method $/nothing"
    client.notify("$/cancelRequest", id=1)
    client.notify("workspace/didChangeConfiguration", settings={})
    client.send(id=7, result=None)
    client.send(id="text", method="secpolicy/nothing")
    assert client.receive()["id"] == "text"


def test_goes_on_after_a_message_that_is_none(client):
    for content, code in [(b"{", -32700), (b"[" * 1000, -32700), (b"\xff", -32700), (b"7", -32600), (b"{}", -32600),
                          (b"[]", -32600), (b'{"id": 3, "method": 4}', -32600)]:
        client.send_bytes(content)
        answer = client.receive()
        assert answer["error"]["code"] == code, content
    assert answer["id"] == 3


def test_refuses_parameters_that_are_none(client, web):
    uri = {"uri": web.as_uri()}
    for method, params, why in [
            ("hover", {}, "there is no text 'uri'"),
            ("hover", {"textDocument": {"uri": "file:///elsewhere"}}, "file:///elsewhere is no file below the root"),
            ("hover", {"textDocument": uri}, "there is no number 'line'"),
            ("hover", {"textDocument": uri, "position": {"line": -1, "character": 0}}, "there is no number 'line'"),
            ("codeAction", {"textDocument": uri}, "there is no number 'line'")]:
        assert refused(client, "textDocument/" + method, -32602, **params) == why


@pytest.mark.parametrize("content, why", [
    (b"GET / HTTP/1.1\r\n\r\n", "a line of a message's header has no colon: GET / HTTP/1.1"),
    (b"Content-Type: x\r\n\r\n{}", "the header of a message has no Content-Length"),
    (b"Content-Length: 99999999999\r\n\r\n", "a message is too long: 99999999999 bytes"),
    (b"Content-Length: two\r\n\r\n{}", "the length of a message is no number: two"),
    (b"x" * 5000, "the header of a message does not end"),
    (b"Content-Length: 3\r\n\r\n{}", "the last message is not complete")])
def test_ends_where_no_message_begins(root, content, why):
    assert end_of(root, content) == (1, f"secpolicy: lsp: {why}\n")


def test_tells_of_many_edits_only_the_last(client, web):
    client.open(web)
    client.sync()
    for number in range(50):
        client.change(web, f"-s rea{number} grant\n")
    started = time.monotonic()
    assert [each["message"].split("\n")[0] for each in client.problems_of(web)][-1] == "unknown system call 'rea49'"
    assert time.monotonic() - started < 20


def places(value, path=()):
    """Every place in a document, as the names and numbers that lead to it."""
    if path:
        yield path
    items = value.items() if isinstance(value, dict) else enumerate(value) if isinstance(value, list) else []
    for key, inner in items:
        yield from places(inner, (*path, key))


def test_survives_messages_by_chance(client, web):
    """Messages that are good but for one place, where something else stands or nothing."""
    chance = random.Random(5)
    document = {"textDocument": {"uri": web.as_uri(), "version": 3}}
    here = {**document, "position": {"line": 2, "character": 5}}
    change = {"range": span(1, 2, 3), "text": "-a \r\n\U0001f600"}
    messages = [
        ("textDocument/didOpen", {"textDocument": {"uri": web.as_uri(), "version": 1, "text": web.read_text()}}),
        ("textDocument/didChange", {**document, "contentChanges": [change, {"text": web.read_text()}, change]}),
        ("textDocument/didSave", document), ("textDocument/didClose", document), ("initialize", {"capabilities": {}}),
        ("textDocument/completion", here), ("textDocument/hover", here), ("textDocument/definition", here),
        ("textDocument/references", {**here, "context": {"includeDeclaration": True}}),
        ("textDocument/rename", {**here, "newName": "new"}), ("textDocument/prepareRename", here),
        ("textDocument/codeAction", {**document, "range": span(0, 0, 9, 9), "context": {}}),
        ("textDocument/formatting", {**document, "options": {}}), ("textDocument/documentSymbol", document),
        ("textDocument/rangeFormatting", {**document, "range": span(0, 0, 9, 9), "options": {}})]
    odd = [None, True, -1, 2**40, 2**70, 1.5, "", "file:///", "file:///%00/%ff", "\0", [], {}, [[]], "a" * 3000]
    for number in range(400):
        method, params = chance.choice(messages)
        message = {"jsonrpc": "2.0", "id": number, "method": method, "params": copy.deepcopy(params)}
        if method.startswith("textDocument/did"):
            del message["id"]
        *path, last = chance.choice(list(places(message)))
        holder = message
        for key in path:
            holder = holder[key]
        if chance.random() < 0.2:
            del holder[last]
        else:
            holder[last] = chance.choice(odd)
        client.send(**message)
        # Answers are read before they fill what lies between.
        if number % 10 == 9:
            client.sync()
    client.close(web)
    client.open(web)
    assert [each["code"] for each in client.problems_of(web)] == ["unknown-word"]
