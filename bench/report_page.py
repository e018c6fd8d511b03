#!/usr/bin/env python3
"""Measures how soon the page of a large policy can be used, in Chromium, beside a page with the same data that
only reads it.

    SECPOLICY=build/release/bin/secpolicy bench/report_page.py [DOMAINS RULES]
"""

import os
import pathlib
import re
import statistics
import subprocess
import sys
import tempfile
import time

SOURCE = pathlib.Path(__file__).resolve().parent.parent
sys.path.insert(0, str(SOURCE / "tests" / "report"))
sys.dont_write_bytecode = True
from browser import Browser  # noqa: E402
from large_policy import write  # noqa: E402

ROUNDS = 7
YARDSTICK = """<!DOCTYPE html><meta charset="utf-8"><body><script type="application/json" id="data">{data}</script>
<script>document.body.append(Object.keys(JSON.parse(document.getElementById("data").textContent)).length)</script>"""


def seconds_until(browser, file, address, is_ready):
    begin = time.monotonic()
    browser.open(file, address)
    browser.wait_for(is_ready)
    return time.monotonic() - begin


def main():
    domains, rules = (int(word) for word in sys.argv[1:] or (300, 334))
    with tempfile.TemporaryDirectory() as root, Browser() as browser:
        (pathlib.Path(root) / "run").mkdir()
        write(f"{root}/large", domains, rules)
        begin = os.times()
        page = subprocess.run([os.environ["SECPOLICY"], "--root", root, "report", "/large", "-o", "-"],
                              check=True, capture_output=True).stdout
        end = os.times()
        made = end.children_user + end.children_system - begin.children_user - begin.children_system
        report, yardstick = pathlib.Path(root, "report.html"), pathlib.Path(root, "yardstick.html")
        report.write_bytes(page)
        data = re.search(rb'id="data">(.*?)</script>', page, re.DOTALL).group(1)
        yardstick.write_bytes(YARDSTICK.encode().replace(b"{data}", data))
        opened, read = [], []
        for _ in range(ROUNDS):
            is_shown = "document.querySelector('#kind-r tr') !== null"
            opened.append(seconds_until(browser, report, "#domain/a0Dom", is_shown))
            read.append(seconds_until(browser, yardstick, "", "document.body.innerText !== ''"))
        print(f"{domains * rules} rules: {len(page) / 1e6:.1f} MB, made in {made:.2f} s of processor time; "
              f"a domain is shown after {statistics.median(opened):.2f} s, "
              f"{statistics.median(opened) / statistics.median(read):.1f} times as long as the data takes to be read")


if __name__ == "__main__":
    main()
