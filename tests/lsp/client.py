"""A client of `secpolicy lsp`, as small as a test needs one."""

import contextlib
import json
import os
import subprocess
import urllib.parse


def uri_of(path):
    return "file://" + urllib.parse.quote(str(path))


def path_of(uri):
    return urllib.parse.unquote(uri.removeprefix("file://"))


class RequestFailed(Exception):
    """The server answers with an error."""

    def __init__(self, error):
        super().__init__(error["message"])
        self.code = error["code"]


class Client:
    """Speaks with a server that it starts; what the server tells by itself is kept until asked for."""

    def __init__(self, root, *options, command=None):
        command = [str(command or os.environ["SECPOLICY"]), "--root", str(root), "lsp", *options]
        self.process = subprocess.Popen(command, stdin=subprocess.PIPE, stdout=subprocess.PIPE)
        self.number = 0
        self.version = 0
        self.texts = {}
        self.problems = {}
        self.shown = []

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self.process.kill()
        self.process.wait()
        self.process.stdin.close()
        self.process.stdout.close()

    def send_bytes(self, content):
        self.process.stdin.write(b"Content-Length: %d\r\n\r\n%s" % (len(content), content))
        self.process.stdin.flush()

    def send(self, **message):
        self.send_bytes(json.dumps({"jsonrpc": "2.0", **message}).encode())

    def receive(self):
        """The next message; None when the server has ended."""
        length = None
        while (line := self.process.stdout.readline()) not in (b"\r\n", b""):
            if line.lower().startswith(b"content-length:"):
                length = int(line.split(b":")[1])
        if length is None:
            return None
        message = json.loads(self.process.stdout.read(length))
        if message.get("method") == "textDocument/publishDiagnostics":
            self.problems[path_of(message["params"]["uri"])] = message["params"]
        elif message.get("method") == "window/showMessage":
            self.shown.append(message["params"]["message"])
        return message

    def notify(self, method, **params):
        self.send(method=method, params=params)

    def request(self, method, **params):
        self.number += 1
        self.send(id=self.number, method=method, params=params)
        while (message := self.receive()) is not None:
            if message.get("id") == self.number and "method" not in message:
                if "error" in message:
                    raise RequestFailed(message["error"])
                return message["result"]
        raise EOFError(method)

    def start(self, **capabilities):
        result = self.request("initialize", processId=None, rootUri=None, capabilities=capabilities)
        self.notify("initialized")
        return result

    def stop(self):
        """Ends the server as an editor does, and returns its exit status."""
        self.request("shutdown")
        self.notify("exit")
        return self.process.wait(timeout=20)

    def sync(self):
        """Waits until all that was sent is done and told, which is before a request is answered."""
        with contextlib.suppress(RequestFailed):
            self.request("secpolicy/nothing")

    # ---- Documents

    def open(self, path, text=None):
        self.version += 1
        if text is None:
            text = path.read_bytes().decode()
        self.texts[path] = text
        self.notify("textDocument/didOpen", textDocument={
            "uri": uri_of(path), "languageId": "secpolicy", "version": self.version, "text": text})

    def change(self, path, *changes):
        """A change is the new text, or the range that is replaced and what by."""
        self.version += 1
        content = [{"text": each} if isinstance(each, str) else {"range": each[0], "text": each[1]} for each in changes]
        self.notify("textDocument/didChange", textDocument={"uri": uri_of(path), "version": self.version},
                    contentChanges=content)

    def close(self, path):
        self.notify("textDocument/didClose", textDocument={"uri": uri_of(path)})

    def at(self, method, path, line, character, **more):
        return self.request("textDocument/" + method, textDocument={"uri": uri_of(path)},
                            position={"line": line, "character": character}, **more)

    def about(self, method, path, **more):
        return self.request("textDocument/" + method, textDocument={"uri": uri_of(path)}, **more)

    def problems_of(self, path):
        self.sync()
        return self.problems.get(str(path), {"diagnostics": []})["diagnostics"]


def span(line, begin, end, last_line=None):
    return {"start": {"line": line, "character": begin},
            "end": {"line": line if last_line is None else last_line, "character": end}}
