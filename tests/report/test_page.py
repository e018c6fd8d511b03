# The page of a report, as one reads it: everything that it has to say is there, found, linked and named.
import json
import random
import re
import subprocess

import pytest
from conftest import ACCESSES, FILE_KINDS, FLAGS, NUMBERS, OBJECTS, PATHS
from large_policy import write


def rows(page, selector="main tbody tr"):
    cells = "[...row.cells].map((cell) => cell.innerText.trim())"
    return page.run(f"[...document.querySelectorAll('{selector}')].map((row) => {cells})")


# ---- What there is


def test_overview_lists_all_domains(page, host):
    installed = host.json("display")["domains"]
    told = [[each["name"], each["level"], str(len(each["rules"]))] for each in installed]
    assert [row[:3] for row in rows(page)] == told
    assert page.run("document.title") == "Installed policy"


def place_of(rule):
    return f"{rule['file']}:{rule['line']}" if rule.get("file") else "no policy file"


def test_domain_pages_have_every_rule_with_its_place(page, host):
    for domain in host.json("display")["domains"]:
        page.go("domain", domain["name"])
        shown = page.run("""[...document.querySelectorAll('section[id^=kind-] tbody tr')].map((row) =>
            [row.cells[0].innerText.trim(), row.cells[1].innerText])""")
        assert shown == [[rule["text"].strip(), place_of(rule)] for rule in domain["rules"]]


def test_domain_page_says_what_becomes_of_each_rule(page, host):
    names = {"enforced": "enforced", "narrowed": "narrowed", "notExpressible": "not enforceable"}
    page.go("domain", "sshDom")
    shown = page.run("""[...document.querySelectorAll('section[id^=kind-] tbody tr')].map((row) =>
        [row.cells[0].innerText.trim(), ...row.cells[2].innerText.split('\\n')])""")
    told = host.json("features", "--for", "sshDom")["rules"]
    assert shown == [[rule["rule"], names[rule["fate"]], *([rule["how"]] if "how" in rule else [])] for rule in told]


def test_domain_page_says_who_enters_and_where_it_goes(page, host):
    page.go("domain", "sshDom")
    into = sorted({each["domain"] for each in host.json("who-can", "enter", "sshDom")["domains"] if each["granted"]})
    sections = page.run("""[...document.querySelectorAll('main section')].slice(0, 2).map((section) =>
        [...section.querySelectorAll('tbody th')].map((cell) => cell.innerText))""")
    assert sorted(set(sections[0])) == into
    assert sections[1] == ["hostDom"]


def test_label_page_has_its_files_and_rules(page, host):
    page.go("label", "sshKey")
    found = host.json("rules", "--label", "sshKey")["rules"]
    assert f"Rules that speak of it ({len(found)})" in page.text()
    assert "/etc/ssh/host_key" in page.text()
    heads = page.texts("main section:first-of-type thead th")
    answers = next(row for row in rows(page, "main section:first-of-type tbody tr") if row[0] == "sshDom")
    assert {head: answer for head, answer in zip(heads, answers, strict=True) if answer != "–"} == {
        "Domain": "sshDom", "read": "may", "write": "refused"}


def test_enforcement_counts_all_rules(page, host):
    page.go("enforcement")
    domains = [domain["name"] for domain in host.json("display")["domains"]]
    fates = [rule["fate"] for domain in domains for rule in host.json("features", "--for", domain)["rules"]]
    shown = [int(text.split()[0]) for text in page.texts(".tally li")]
    assert shown == [fates.count(fate) for fate in ("enforced", "narrowed", "notExpressible")]


def test_directory_tells_places_and_no_enforcement(browser, host, tmp_path):
    browser.open(host.report(tmp_path / "directory.html", "/etc/zorvan/secpolicy"), "#domain/plugin-cache")
    assert "/etc/zorvan/secpolicy/domains/plugins/cache:10" in browser.text()
    browser.go("domain", "bootDom")
    assert "/etc/zorvan/secpolicy/early/domains/bootDom:" in browser.text()
    assert "Enforcement" not in browser.texts("#pages a")
    browser.go("enforcement")
    assert "it is told of the installed policy alone" in browser.text()


# ---- Search and links


def test_search_by_keys(page, host):
    page.press("/")
    assert page.run("document.activeElement.id") == "query"
    page.type("sshk")
    page.wait_for("location.hash === '#search/sshk'")
    count = len(host.json("rules", "--label", "sshKey")["rules"])
    assert page.texts("main h2") == ["Labels (1)", f"Rules ({count})"]
    assert page.wait_for("document.querySelector('#status').textContent").endswith("results for sshk")
    page.press("Enter")
    assert page.run("document.activeElement.tagName") == "H1"


def test_search_that_is_cleared_leads_back(page):
    page.go("domain", "sshDom")
    page.press("/")
    page.wait_for("document.activeElement === query")
    page.type("vm")
    page.wait_for("document.querySelector('h1').innerText === 'Search: vm'")
    page.run("query.value = ''; query.dispatchEvent(new Event('input'))")
    page.wait_for("document.querySelector('h1').innerText === 'sshDom'")
    assert page.run("location.hash") == "#domain/sshDom"


@pytest.mark.parametrize("word, heading", [
    ("monitorDom", "Domains (1)"), ("/etc/ssh/host_key", "Files (1)"), ("-c cap_sys_chroot", "Rules (1)")])
def test_search_finds(page, word, heading):
    page.go("search", word)
    assert heading in page.texts("main h2")
    assert word in page.text()


def test_search_says_when_nothing_is_found(page):
    page.go("search", "no such thing")
    assert page.text() == "Search: no such thing\n\n0 results."


def test_search_without_a_word_asks_for_one(page):
    page.go("search")
    assert page.text() == "Search\n\nType a part of a name, a path or a rule."
    page.go("search", "")
    assert page.text("h1") == "Search"


def test_links_lead_on_and_back(page):
    page.click("main tbody a[href='#domain/sshDom']")
    page.wait_for("document.querySelector('h1').innerText === 'sshDom'")
    assert page.run("document.activeElement.innerText") == "sshDom"
    assert page.run("document.title") == "sshDom – Installed policy"
    page.click("main a[href='#label/sshKey']")
    page.wait_for("document.querySelector('h1').innerText === 'sshKey'")
    page.run("history.back()")
    page.wait_for("document.querySelector('h1').innerText === 'sshDom'")


def test_every_link_leads_somewhere(page):
    seen = set()
    waiting = ["#"]
    while waiting and len(seen) < 250:
        address = waiting.pop()
        if address in seen:
            continue
        seen.add(address)
        heading, links = page.run(f"""(() => {{
            const [name, ...words] = {json.dumps(address)}.slice(1).split("/").map(decodeURIComponent);
            const made = PAGES[name][1](...words);
            const links = [...made.querySelectorAll("a")].map((link) => link.getAttribute("href"));
            return [made.querySelector("h1").textContent, links];
        }})()""")
        assert heading != "Not in this policy", address
        waiting += links
    assert len(seen) > 60


def test_unknown_addresses_are_told(page):
    for words in (["domain", "none"], ["label", "none"], ["nothing"], ["ask", "none"],
                  ["transitions", "cluster", "none"], ["domain"], ["label"], ["file"], ["file", "none"]):
        page.go(*words)
        assert page.text("h1") == "Not in this policy"


# ---- The graph


def arrows_of(page, look="arrow"):
    """Both ends of each arrow: the first line of what is told of it."""
    first_line = "title.textContent.split('\\n')[0]"
    return page.run(f"[...document.querySelectorAll('.{look} title')].map((title) => {first_line})")


def view_box(page):
    return [float(number) for number in page.run("document.querySelector('svg.graph').getAttribute('viewBox')").split()]


def test_graph_is_that_of_the_command(page, host):
    page.go("transitions")
    dot = host.run("graph").stdout
    edges = set(re.findall(r'^  "([^"]+)" -> "([^"]+)"', dot, re.MULTILINE))
    assert {tuple(ends.split(" → ")) for ends in arrows_of(page)} == edges
    assert page.run("document.querySelectorAll('.node').length") == len(host.json("display")["domains"])


def test_graph_zooms_and_moves(page):
    page.go("transitions")
    whole = view_box(page)
    page.run("document.querySelector('svg.graph').focus()")
    page.press("+")
    near = view_box(page)
    assert near[2] < whole[2] and near[3] < whole[3]
    page.press("ArrowRight")
    assert view_box(page)[0] > near[0]
    page.press("0")
    assert view_box(page) == whole
    x, y = page.middle("svg.graph")
    page.mouse("mouseWheel", x, y, deltaX=0, deltaY=-120)
    page.wait_for(f"document.querySelector('svg.graph').viewBox.baseVal.width < {whole[2]}")
    page.click("button[aria-label='Show all of the graph']")
    assert view_box(page) == whole
    page.click("button[aria-label='Zoom in']")
    assert view_box(page)[2] < whole[2]


def test_graph_is_dragged_and_followed(page):
    page.go("transitions")
    whole = view_box(page)
    x, y = page.middle("a.node[href='#domain/sshDom']")
    page.mouse("mousePressed", x, y, button="left", buttons=1, clickCount=1)
    page.mouse("mouseMoved", x + 40, y + 30, button="left", buttons=1)
    page.mouse("mouseMoved", x + 80, y + 60, button="left", buttons=1)
    page.mouse("mouseReleased", x + 80, y + 60, button="left", clickCount=1)
    assert view_box(page)[0] < whole[0]
    assert page.run("location.hash") == "#transitions"
    page.click("a.node[href='#domain/sshDom']")
    page.wait_for("location.hash === '#domain/sshDom'")


def test_graph_tells_what_comes_in_and_goes_out_of_the_node_in_focus(page):
    page.go("transitions")
    page.run("document.querySelector(\"a.node[href='#domain/sshDom']\").focus()")
    assert "hostDom → sshDom" in arrows_of(page, "in")
    assert "sshDom → hostDom" in arrows_of(page, "out")
    page.press("Enter")
    page.wait_for("location.hash === '#domain/sshDom'")


# ---- Answers


QUESTION_OF_PAGE = """(({ who, action, words, label }) => {
    const question = questionByAction.get(action);
    const domain = domainByName.get(who);
    const chosen = question.files ? label ?? labelFor(question, trimmed(words[0])) : "";
    const answer = ask(domain, question, question.files ? [trimmed(words[0]), ...words.slice(1)] : words, chosen);
    const { isAllowed, granted, isOpen = false, rules, missing = [] } = answer;
    return [isAllowed, granted, isOpen, rules.map(ruleText).sort(), missing.sort()];
})"""


def questions(chance):
    files = [*PATHS, "/etc/ssh/none", "/etcx", "/usr/sbin/sshd", "/usr/sbin/none/deep", "/var/lib/vms/demo/disk",
             "/opt/monitor/", "/srv//x"]
    yield from ((action, path) for path in files for action in ["read", "write", "exec", "list", "remove", "truncate"])
    yield from (("make", path, kind) for path in files for kind in FILE_KINDS)
    yield from (("make-socket", path, "stream") for path in files)
    yield from (("access", label, access) for label in OBJECTS for access in ACCESSES)
    yield from (("create", label, other, kind) for label in OBJECTS for other in OBJECTS[:2] for kind in FILE_KINDS)
    yield from (("create-socket", label, kind) for label in OBJECTS for kind in ["stream", "dgram"])
    yield from (("call", call) for call in ["openat", "read", "ptrace", "mount", "execve", "clone", "reboot"])
    yield from (("use", name) for name in ["cap_chown", "cap_kill", "cap_net_raw", "cap_sys_boot"])
    yield from (("enter", name) for name in ["hostDom", "sshDom", "chance0", "chance1"])
    for _ in range(12):
        yield "pass", "bind_port", chance.choice([*NUMBERS, str(chance.randrange(1200))])
    yield from (("pass", "set_uid", number) for number in NUMBERS)
    yield from (("pass", "clone_flags", number) for number in [*FLAGS, "0", "17", "0x30020000", "0x10000011"])


def answer_of_command(told):
    return [told["allowed"], told["granted"], told.get("open", False), sorted(rule["text"] for rule in told["rules"])]


def missing_of(told):
    """What would be missing of any domain: what is told of a transition or of bits depends on others."""
    if told["question"]["action"] in ("enter", "pass"):
        return None
    return sorted(told["missing"])


def test_answers_are_those_of_why(page, host):
    chance = random.Random(7)
    domains = [each["name"] for each in host.json("display")["domains"]]
    asked = [(chance.choice(domains[1:]), *question) for question in questions(chance)]
    for who, action, *words in chance.sample(asked, 130):
        told = host.json("why", who, action, *words)
        facts = told["question"].get("file") or told["question"].get("directory")
        label = (facts["label"] or "") if facts else None
        resolved = words if facts is None or action.startswith("make") else [facts["paths"][-1], *words[1:]]
        question = {"who": who, "action": action, "words": resolved, "label": label}
        allowed, granted, is_open, rules, missing = page.run(f"{QUESTION_OF_PAGE}({json.dumps(question)})")
        assert [allowed, granted, is_open, rules] == answer_of_command(told), question
        if rules == [] and missing_of(told) is not None:
            assert missing == missing_of(told), question


def test_labels_of_files_are_those_of_the_host(page, host):
    for path in ["/etc/ssh/host_key", "/etc/ssh", "/usr/sbin/sshd", "/var/lib/vms/demo/disk"]:
        told = host.json("why", "sshDom", "read", path)["question"]["file"]["label"]
        assert page.run(f"labelLineOf({json.dumps(path)})?.label") == told


def test_ask_by_the_form(page, host):
    page.go("ask")
    page.run("document.querySelector('#who').value = 'sshDom'")
    page.click("#word-0")
    page.type("/etc/ssh/host_key")
    page.press("Enter")
    page.wait_for("document.querySelector('.answer') !== null")
    assert page.text(".answer h2") == "Yes: sshDom may read /etc/ssh/host_key"
    assert page.texts(".answer li") == [
        "-r /etc/ssh r /etc/zorvan/secpolicy/domains/sshDom:33",
        "-a sshKey read grant /etc/zorvan/secpolicy/domains/sshDom:23"]
    assert page.text("#status") == "Yes: sshDom may read /etc/ssh/host_key"
    page.go("ask", "sshDom", "write", "/etc/ssh/host_key")
    assert page.text(".answer h2") == "No: sshDom may not write /etc/ssh/host_key"
    page.go("ask", "monitorDom", "read", "/var/lib/vms/demo/disk")
    assert page.texts(".answer li") == [
        "No rule speaks of it. One of these would grant it: -r /var/lib/vms/demo/disk r or -a vmDisk read grant"]


def test_ask_about_a_file_with_another_label(page):
    page.go("ask", "sshDom", "read", "/nowhere")
    assert page.text(".answer h2") == "No: sshDom may not read /nowhere"
    page.go("ask", "sshDom", "read", "/nowhere", "label:sshKey")
    assert page.text(".answer h2") == "Yes: sshDom may read /nowhere"
    assert page.run("document.querySelector('#label').value") == "sshKey"


@pytest.mark.parametrize("question", [
    ("write", "/etc/ssh/host_key"), ("use", "cap_net_bind_service"), ("call", "mount"), ("enter", "sshDom")])
def test_who_can_is_that_of_the_command(page, host, question):
    page.go("ask", "*", *question)
    told = [each["domain"] for each in host.json("who-can", *question)["domains"]]
    assert [row[0] for row in rows(page, ".answer tbody tr") if row[1] == "may"] == told


@pytest.mark.parametrize("words, problem", [
    (["*", "read", "etc"], "etc is no path: it begins with a slash."),
    (["*", "call", "reed"], "There is no system call reed."),
    (["*", "pass", "bind_port", "x"], "x is not a number."),
    (["sshDom", "pass", "bind_port", "99999999999999999999"],
     "99999999999999999999 is too large: numbers go up to 0xffffffffffffffff."),
    (["*", "read", ""], "Fill in what is asked for.")])
def test_what_cannot_be_asked_is_told(page, words, problem):
    page.go("ask", *words)
    assert page.text(".notice") == problem


# ---- Changes


def test_changes_are_those_of_diff(browser, host, tmp_path):
    edited = host.root / "edited"
    subprocess.run(["cp", "-r", host.policy, edited], check=True)
    domain = edited / "domains/sshDom"
    domain.write_text(re.sub(r"(-a sshKey +write +)revoke", r"\1grant", domain.read_text()) + "-s ptrace grant\n")
    (edited / "objects/more").write_text("moreData\n")
    told = host.json("diff", "/etc/zorvan/secpolicy", "/edited")
    browser.open(host.report(tmp_path / "changes.html", "/edited", "--against", "/etc/zorvan/secpolicy"), "#changes")
    changed, = told["domains"]
    assert [rule["before"] for rule in changed["rules"]["changed"]] == ["-a sshKey write revoke"]
    assert browser.texts("main h2") == ["sshDom", "Objects"]
    assert browser.run("[...document.querySelectorAll('.difference li')].map((line) => line.textContent)") == [
        "- Removed: -a sshKey write revoke", "+ Added: -a sshKey write grant /edited/domains/sshDom:24",
        "+ Added: -s ptrace grant /edited/domains/sshDom:34",
        "+ Added: moreData"]


# ---- Who uses it


CONTRASTS = """(() => {
    const canvas = document.createElement("canvas").getContext("2d", { willReadFrequently: true });
    const over = (colours) => {
        canvas.clearRect(0, 0, 1, 1);
        for (const colour of colours) { canvas.fillStyle = colour; canvas.fillRect(0, 0, 1, 1); }
        return canvas.getImageData(0, 0, 1, 1).data.slice(0, 3);
    };
    const light = (rgb) => [0.2126, 0.7152, 0.0722].reduce((sum, weight, index) => {
        const part = rgb[index] / 255;
        return sum + weight * (part <= 0.04045 ? part / 12.92 : ((part + 0.055) / 1.055) ** 2.4);
    }, 0);
    const faint = [];
    for (const element of document.querySelectorAll("body *")) {
        const hasText = [...element.childNodes].some((node) => node.nodeType === 3 && node.textContent.trim() !== "");
        if (!hasText || element.closest("svg, script, noscript, style, .hidden, .skip, datalist, option")) continue;
        const grounds = [];
        for (let each = element; each; each = each.parentElement) {
            grounds.unshift(getComputedStyle(each).backgroundColor);
        }
        const ground = light(over(grounds));
        const text = light(over([...grounds, getComputedStyle(element).color]));
        const ratio = (Math.max(ground, text) + 0.05) / (Math.min(ground, text) + 0.05);
        if (ratio < 4.5) faint.push([element.outerHTML.slice(0, 80), ratio]);
    }
    return faint;
})()"""

SOME_PAGES = [[""], ["domain", "sshDom"], ["label", "sshKey"], ["file", "/etc/ssh"], ["transitions"], ["enforcement"],
              ["ask", "sshDom", "read", "/etc/ssh"], ["ask", "*", "write", "/etc/ssh/host_key"], ["search", "ssh"]]


@pytest.mark.parametrize("dark", [False, True])
def test_texts_stand_out(page, dark):
    page.resize(1280, 900, dark=dark)
    page.wait_for(f"document.documentElement.dataset.theme === '{'dark' if dark else 'light'}'")
    for words in SOME_PAGES:
        page.go(*words)
        assert page.run(CONTRASTS) == [], words


def test_colours_are_switched(page):
    ground = page.run("getComputedStyle(document.body).backgroundColor")
    page.click("#theme")
    assert page.run("document.querySelector('#theme').getAttribute('aria-pressed')") == "true"
    assert page.run("getComputedStyle(document.body).backgroundColor") != ground


def test_small_screens_scroll_down_only(page):
    page.resize(400, 800)
    for words in SOME_PAGES:
        page.go(*words)
        assert page.run("document.documentElement.scrollWidth") <= 400, words


def test_small_screens_show_rows_as_cards(page):
    page.resize(360, 800)
    for words in SOME_PAGES:
        page.go(*words)
        assert page.run("[...document.querySelectorAll('.wide')].every((each) => each.scrollWidth <= 320)"), words
    page.go("")
    level = "document.querySelector('main tbody td')"
    assert page.run(f"getComputedStyle({level}, '::before').content") == '"Level "'
    assert {"table", "row", "rowheader"} <= {role for role, _ in nodes_of(page)}


def test_the_tab_of_the_page_is_in_sight(page):
    page.resize(360, 800)
    page.go("enforcement")
    tab = "document.querySelector('#pages [aria-current]').getBoundingClientRect()"
    left, right = page.run(f"(({{ left, right }}) => [left, right])({tab})")
    assert 0 <= left < right <= 360


def test_texts_of_the_graph_lie_on_nothing_else(page):
    page.go("transitions")
    apart = """(() => {
        const boxes = [...document.querySelectorAll(".way, .node rect")].map((each) => {
            const { x, y, width, height } = each.getBBox();
            return { left: x, right: x + width, top: y + 1, bottom: y + height - 1 };
        });
        const meet = (one, other) => one.left < other.right && other.left < one.right
            && one.top < other.bottom && other.top < one.bottom;
        return boxes.every((one) => boxes.every((other) => one === other || !meet(one, other)));
    })()"""
    assert page.run("document.querySelectorAll('.way').length") > 4
    assert page.run(apart)


CONTROLS = {"button", "link", "searchbox", "textbox", "combobox", "table", "region", "navigation", "group", "toolbar",
            "search"}


def nodes_of(page):
    """What a screen reader is told of: roles with names."""
    nodes = (node for node in page.send("Accessibility.getFullAXTree")["nodes"] if not node["ignored"])
    return [(node["role"]["value"], node.get("name", {}).get("value")) for node in nodes]


def test_all_that_is_used_has_a_name(page):
    found = set()
    for words in SOME_PAGES:
        page.go(*words)
        controls = [node for node in nodes_of(page) if node[0] in CONTROLS]
        found |= {role for role, _ in controls}
        # There is one search, which needs no name of its own.
        assert [role for role, name in controls if not name] == ["search"], words
    assert {"button", "link", "searchbox", "combobox", "table", "navigation"} <= found


def test_the_page_has_its_landmarks(page):
    roles = {role for role, _ in nodes_of(page)}
    assert {"banner", "main", "navigation", "search", "contentinfo", "columnheader", "rowheader", "status"} <= roles


def test_one_skips_to_the_content(page):
    page.press("Tab")
    assert page.run("document.activeElement.id") == "skip"
    page.press("Enter")
    assert page.run("document.activeElement.id") == "main"


# ---- What is odd, and what is much


def test_hostile_names_are_text(browser, host, tmp_path):
    odd = host.root / "odd"
    for folder in ("objects", "domains", "fileLabels"):
        (odd / folder).mkdir(parents=True)
    label = "</script><img/src=x/onerror=window.caught=1>"
    domain = "<svg onload=window.caught=1>"
    (odd / "objects/all").write_text(f"{label}\n{{{{title}}}}\n")
    path = "/srv/<!--<script>&amp;"
    (odd / "domains" / domain).write_text(f"-a {label} read grant\n-r {path} r\n-a {{{{title}}}} read grant\n")
    title = "</title><script>window.caught=1</script>&lt;"
    browser.console.clear()
    browser.open(host.report(tmp_path / "odd.html", "/odd", "--title", title))
    assert browser.run("document.title") == title
    for words in [[""], ["domain", domain], ["label", label], ["file", path], ["files"], ["labels"], ["transitions"],
                  ["search", "script"], ["ask", domain, "access", label, "read"], ["enforcement"]]:
        browser.go(*words)
        assert browser.text("h1") != "Not in this policy", words
        assert browser.run("document.querySelectorAll('img, svg[onload], main script, head script').length") == 0
    browser.go("domain", domain)
    assert browser.text("h1") == domain
    assert f"-a {label} read grant" in browser.texts("main code")
    assert f"-r {path} r" in browser.texts("main code")
    assert browser.run("window.caught ?? null") is None
    assert browser.console == []


def test_nothing_else_runs(page):
    page.run("document.body.append(h('script', {}, 'window.caught = 1'))")
    assert page.run("window.caught ?? null") is None
    assert "Content Security Policy" in page.console.pop()


def test_many_rules(browser, host, tmp_path):
    write(host.root / "large", 300, 334)
    browser.console.clear()
    browser.open(host.report(tmp_path / "large.html", "/large"), "#search/file77")
    assert "600 results" in browser.wait_for("document.querySelector('h1') && document.querySelector('main').innerText")
    browser.go("domain", "a130Dom")
    shown = "document.querySelectorAll('#kind-r tbody tr').length"
    assert browser.run(shown) == 100
    browser.run("document.querySelector('#kind-r .more').scrollIntoView()")
    browser.wait_for(f"{shown} > 100")
    browser.run("dispatchEvent(new Event('beforeprint'))")
    assert browser.run(shown) == 320
    browser.go("transitions")
    boxes = browser.run("document.querySelectorAll('.node').length")
    assert 5 < boxes < 60
    browser.click(".node.cluster")
    browser.wait_for("document.querySelector('h1').innerText.startsWith('Cluster: ')")
    browser.go("transitions", "all")
    assert browser.run("document.querySelectorAll('.node').length") == 301
    assert browser.console == []
