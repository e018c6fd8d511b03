"""Drives Chromium by its DevTools protocol, over a pair of pipes: messages in JSON, each ended by a zero."""

import base64
import fcntl
import json
import os
import pathlib
import shutil
import subprocess
import tempfile
import time

CHROMIUM = shutil.which("chromium")
OPTIONS = ["--headless=new", "--no-sandbox", "--disable-gpu", "--disable-dev-shm-usage", "--disable-extensions",
           "--disable-background-networking", "--no-first-run", "--hide-scrollbars", "--remote-debugging-pipe"]
TIMEOUT = 60  # seconds, on a slow machine


class PageError(Exception):
    """What was asked of a page failed in it."""


def high_pipe():
    """A pipe whose ends are not among the numbers that the browser wants its own at."""
    ends = os.pipe()
    high = [fcntl.fcntl(end, fcntl.F_DUPFD_CLOEXEC, 10) for end in ends]
    for end in ends:
        os.close(end)
    return high


class Browser:
    """One headless Chromium with one page. Keeps what pages wrote to their console, and what they asked for."""

    def __init__(self, width=1280, height=900):
        self.profile = tempfile.TemporaryDirectory(ignore_cleanup_errors=True)
        to_browser, self.output = high_pipe()
        self.input, from_browser = high_pipe()
        self.process = subprocess.Popen(
            ["/bin/bash", "-c", f'exec "$@" 3<&{to_browser} 4>&{from_browser}', "bash",
             CHROMIUM, *OPTIONS, f"--user-data-dir={self.profile.name}", f"--window-size={width},{height}",
             "about:blank"],
            pass_fds=(to_browser, from_browser), stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL,
            start_new_session=True)
        os.close(to_browser)
        os.close(from_browser)
        self.buffer = b""
        self.number = 0
        self.session = None
        self.console = []
        self.requests = []
        self.loads = 0
        target = next(each for each in self.send("Target.getTargets")["targetInfos"] if each["type"] == "page")
        self.session = self.send("Target.attachToTarget", targetId=target["targetId"], flatten=True)["sessionId"]
        for domain in ("Page", "Runtime", "Network", "Log", "Accessibility"):
            self.send(f"{domain}.enable")

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self.session = None
        try:
            self.send("Browser.close")
            self.process.wait(TIMEOUT)
        except (OSError, PageError, subprocess.TimeoutExpired):
            self.process.kill()
            self.process.wait()
        os.close(self.output)
        os.close(self.input)
        self.profile.cleanup()

    def _receive(self):
        while b"\0" not in self.buffer:
            read = os.read(self.input, 1 << 20)
            if not read:
                raise PageError("the browser has ended")
            self.buffer += read
        message, _, self.buffer = self.buffer.partition(b"\0")
        message = json.loads(message)
        self._note(message)
        return message

    def _note(self, message):
        method, values = message.get("method"), message.get("params", {})
        if method == "Runtime.consoleAPICalled" and values["type"] in ("error", "warning", "assert"):
            self.console.append(str(values["args"]))
        elif method == "Runtime.exceptionThrown":
            self.console.append(str(values["exceptionDetails"].get("exception", values["exceptionDetails"])))
        elif method == "Log.entryAdded":
            self.console.append(values["entry"]["text"])
        elif method == "Network.requestWillBeSent":
            self.requests.append(values["request"]["url"])
        elif method == "Page.loadEventFired":
            self.loads += 1

    def send(self, method, **values):
        self.number += 1
        message = {"id": self.number, "method": method, "params": values}
        if self.session:
            message["sessionId"] = self.session
        data = json.dumps(message).encode() + b"\0"
        while data:
            data = data[os.write(self.output, data):]
        while True:
            answer = self._receive()
            if answer.get("id") == self.number:
                break
        if "error" in answer:
            raise PageError(f"{method}: {answer['error']['message']}")
        return answer["result"]

    def open(self, path, address=""):
        """Loads the file anew, at this address of it; returns when it is loaded."""
        loads = self.loads
        self.send("Page.navigate", url="about:blank")
        while self.loads == loads:
            self._receive()
        loads = self.loads
        self.send("Page.navigate", url=pathlib.Path(path).resolve().as_uri() + address)
        while self.loads == loads:
            self._receive()

    def run(self, script):
        """What the script comes to, as values of JSON; a promise is waited for."""
        answer = self.send("Runtime.evaluate", expression=script, returnByValue=True, awaitPromise=True,
                           userGesture=True)
        if "exceptionDetails" in answer:
            raise PageError(f"{script}: {answer['exceptionDetails']['exception'].get('description')}")
        return answer["result"].get("value")

    def wait_for(self, script):
        """Runs the script until it comes to something true, which is returned."""
        end = time.monotonic() + TIMEOUT
        while time.monotonic() < end:
            if value := self.run(script):
                return value
            time.sleep(0.02)
        raise PageError(f"never true: {script}")

    def go(self, *words):
        """To a page within the report."""
        self.run(f"location.hash = addressOf(...{json.dumps(words)}); new Promise(requestAnimationFrame)")

    def text(self, selector="main"):
        return self.run(f"document.querySelector({json.dumps(selector)})?.innerText ?? ''")

    def texts(self, selector):
        return self.run(f"[...document.querySelectorAll({json.dumps(selector)})].map((each) => each.innerText.trim())")

    def type(self, text):
        for letter in text:
            self.send("Input.insertText", text=letter)

    def press(self, key, **values):
        text = {"Enter": "\r"}.get(key, key if len(key) == 1 else "")
        code = {"Enter": 13, "Tab": 9}.get(key, 0)
        self.send("Input.dispatchKeyEvent", type="keyDown", key=key, text=text, windowsVirtualKeyCode=code, **values)
        self.send("Input.dispatchKeyEvent", type="keyUp", key=key, windowsVirtualKeyCode=code, **values)

    def mouse(self, kind, x, y, **values):
        self.send("Input.dispatchMouseEvent", type=kind, x=x, y=y, **values)

    def middle(self, selector):
        """Where the middle of an element is, having scrolled there."""
        return self.run(f"""(() => {{
            const element = document.querySelector({json.dumps(selector)});
            element.scrollIntoView({{ block: "center" }});
            const {{ x, y, width, height }} = element.getBoundingClientRect();
            return [x + width / 2, y + height / 2];
        }})()""")

    def click(self, selector):
        x, y = self.middle(selector)
        self.mouse("mousePressed", x, y, button="left", clickCount=1)
        self.mouse("mouseReleased", x, y, button="left", clickCount=1)
        self.run("new Promise(requestAnimationFrame)")

    def resize(self, width, height, dark=False):
        self.send("Emulation.setDeviceMetricsOverride", width=width, height=height, deviceScaleFactor=1, mobile=False)
        scheme = {"name": "prefers-color-scheme", "value": "dark" if dark else "light"}
        self.send("Emulation.setEmulatedMedia", features=[scheme])

    def picture(self, path):
        self.run("new Promise((done) => requestAnimationFrame(() => requestAnimationFrame(done)))")
        pathlib.Path(path).write_bytes(base64.b64decode(self.send("Page.captureScreenshot", format="png")["data"]))
