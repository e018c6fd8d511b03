// Addresses, keys and colours.

const PAGES = {
  "": ["Domains", overviewPage],
  labels: ["Labels", labelsPage],
  files: ["Files", filesPage],
  transitions: ["Transitions", graphPage],
  ask: ["Ask", askPage],
  enforcement: [isCovered || data.policy === "installed" ? "Enforcement" : undefined, enforcementPage],
  ...(data.against && { changes: ["Changes", changesPage] }),
  graph: [undefined, graphPage],
  domain: [undefined, domainPage],
  label: [undefined, labelPage],
  file: [undefined, filePage],
  search: [undefined, searchPage],
};

// Which page of the list one is on.
const IS_OF = { domain: "", label: "labels", file: "files", graph: "transitions" };

const main = document.getElementById("main");
const query = document.getElementById("query");

const status = document.getElementById("status");
function announce(text) { status.textContent = text; }

let toShow = [];
/** Calls `action` when the page that is being made is in the document. */
function whenShown(action) { toShow.push(action); }

function decoded(word) {
  try {
    return decodeURIComponent(word);
  } catch {
    return word;
  }
}

const readAddress = () => location.hash.slice(1).split("/").map(decoded);

/** Where not all tabs have room, they scroll. */
function revealTab(link) {
  const row = link.closest("nav");
  const [tab, window] = [link.getBoundingClientRect(), row.getBoundingClientRect()];
  row.scrollLeft += tab.left + tab.width / 2 - (window.left + window.width / 2);
}

function show() {
  const [name, ...words] = readAddress();
  growing.clear();
  toShow = [];
  const make = PAGES[name]?.[1] ?? (() => nothingPage(`page ${name}`));
  const shown = make(...words);
  main.replaceChildren(shown);
  document.title = name === "" ? data.title : `${shown.querySelector("h1").textContent} – ${data.title}`;
  for (const link of document.querySelectorAll("#pages a")) {
    const isHere = link.hash.slice(1) === (IS_OF[name] ?? name);
    if (isHere) link.setAttribute("aria-current", "page");
    else link.removeAttribute("aria-current");
    if (isHere) revealTab(link);
  }
  if (name !== "search") query.value = "";
  toShow.forEach((action) => action());
}

window.addEventListener("hashchange", () => {
  show();
  if (document.activeElement === query) return;
  window.scrollTo(0, 0);
  main.querySelector("h1").focus({ preventScroll: true });
});

// ---- The search box

const PAUSE = 120;

let typed;
let before = "";

function searchNow() {
  clearTimeout(typed);
  const wanted = query.value.trim();
  const isSearch = readAddress()[0] === "search";
  if (!isSearch && wanted !== "") before = location.hash;
  const address = wanted === "" ? before || "#" : addressOf("search", wanted);
  if (!isSearch && wanted === "") return;
  // One entry of the history for a search, and not one for each letter.
  history[isSearch ? "replaceState" : "pushState"](null, "", address);
  const text = query.value;
  show();
  query.value = text;
}

query.addEventListener("input", () => {
  clearTimeout(typed);
  typed = setTimeout(searchNow, PAUSE);
});

document.getElementById("search").addEventListener("submit", (event) => {
  event.preventDefault();
  searchNow();
  main.querySelector("h1").focus();
});

document.addEventListener("keydown", (event) => {
  const isTyping = event.target.matches("input, select, textarea");
  if (event.key !== "/" || isTyping || event.ctrlKey || event.metaKey || event.altKey) return;
  event.preventDefault();
  query.focus();
  query.select();
});

document.getElementById("skip").addEventListener("click", (event) => {
  event.preventDefault();
  main.focus();
});

// ---- Colours

const theme = document.getElementById("theme");
const prefersDark = matchMedia("(prefers-color-scheme: dark)");

function setDark(isDark) {
  document.documentElement.dataset.theme = isDark ? "dark" : "light";
  theme.setAttribute("aria-pressed", String(isDark));
  theme.textContent = isDark ? "Light" : "Dark";
}

prefersDark.addEventListener("change", ({ matches }) => setDark(matches));
theme.addEventListener("click", () => setDark(document.documentElement.dataset.theme !== "dark"));
setDark(prefersDark.matches);

// ---- The frame

document.getElementById("home").textContent = data.title;
document.getElementById("footer").textContent = `Made of the policy '${data.policy}' by secpolicy ${data.version}. `
  + "Everything is in this file: nothing is loaded, and nothing is sent.";
document.getElementById("pages").append(...Object.entries(PAGES).filter(([, [title]]) => title).map(([name, [title]]) =>
  h("li", {}, h("a", { href: addressOf(name) }, title))));
show();
if (readAddress()[0] === "search") query.value = readAddress()[1] ?? "";
