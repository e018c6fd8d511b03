// Elements. Every text becomes a text node, so that nothing of a policy is read as markup.

const SVG = "http://www.w3.org/2000/svg";

function fillElement(element, attributes, children) {
  for (const [name, value] of Object.entries(attributes)) {
    if (name.startsWith("on")) element.addEventListener(name.slice(2), value);
    else if (value === true) element.setAttribute(name, "");
    else if (value !== undefined && value !== false) element.setAttribute(name, value);
  }
  element.append(...children.flat(Infinity).filter((child) => child !== undefined && child !== false));
  return element;
}

const h = (name, attributes = {}, ...children) =>
  fillElement(document.createElement(name), attributes, children);
const svg = (name, attributes = {}, ...children) =>
  fillElement(document.createElementNS(SVG, name), attributes, children);

const countOf = (count, noun, nouns = `${noun}s`) => `${count.toLocaleString("en")} ${count === 1 ? noun : nouns}`;

const capitalized = (text) => text[0].toUpperCase() + text.slice(1);

/** The address of a page: its name, and what it is about. */
const addressOf = (...words) => `#${words.map(encodeURIComponent).join("/")}`;

const joinBreakable = (parts) => parts.flatMap((part, index) => (index > 0 ? [h("wbr"), part] : part));

/** A path that lines may be broken in, between its parts. */
const breakable = (path) => joinBreakable(path.split(/(?<=\/)/));

/** A name, likewise between its words. */
const breakableName = (name) => joinBreakable(name.split(/(?<=[-_.])|(?<=[a-z])(?=[A-Z])/));

const domainLink = (name) => h("a", { href: addressOf("domain", name), class: "domain" }, breakableName(name));
const labelLink = (name) => h("a", { href: addressOf("label", name) }, breakableName(name));

const pathLink = (path) => h("a", { href: addressOf("file", path) }, breakable(path));

const LEVEL_CLASSES = { enforcing: "good", permissive: "warn", disabled: "bad" };
const levelMark = (level) => h("span", { class: `mark ${LEVEL_CLASSES[level]}` }, level);

const mayMark = (isAllowed) =>
  h("span", { class: `mark ${isAllowed ? "good" : "bad"}` }, isAllowed ? "may" : "refused");

const FATE_CLASSES = ["good", "warn", "bad"];
const fateMark = (fate) => h("span", { class: `mark ${FATE_CLASSES[fate]}` }, FATES[fate]);

const CHUNK = 100;

/** What shows the rest of each list of this page that is not shown yet. */
const growing = new Set();
window.addEventListener("beforeprint", () => growing.forEach((showRest) => showRest()));

/** Fills `list` with what `render` makes of the items: the first ones now, more as one comes near its end.
 *  Returns the button that shows more, if there are any. */
function grow(list, items, render) {
  let shown = 0;
  const more = h("button", { type: "button", class: "more", onclick: () => add(CHUNK) });
  const nearEnd = new IntersectionObserver(([entry]) => entry.isIntersecting && add(CHUNK), { rootMargin: "600px" });
  function add(count) {
    list.append(...items.slice(shown, shown + count).map(render));
    shown = Math.min(shown + count, items.length);
    more.textContent = `Show more (${(items.length - shown).toLocaleString("en")} left)`;
    nearEnd.disconnect();
    if (shown < items.length) return nearEnd.observe(more);
    more.remove();
    growing.delete(showRest);
  }
  const showRest = () => add(items.length);
  growing.add(showRest);
  add(CHUNK);
  return items.length > shown ? more : undefined;
}

/** A table that grows: `columns` are its heads, `rowOf` the cells of an item, the first of which heads its row. */
function table(caption, columns, items, rowOf, look = "") {
  const body = h("tbody");
  const whole = h("table", { class: look }, h("caption", { class: "hidden" }, caption),
    h("thead", {}, h("tr", {}, columns.map((column) => h("th", { scope: "col" }, column)))), body);
  const render = (item) => {
    const [head, ...cells] = rowOf(item);
    return h("tr", {}, h("th", { scope: "row" }, head),
      cells.map((cell, index) => h("td", { "data-column": columns[index + 1] }, cell)));
  };
  const more = grow(body, items, render);
  return h("div", { class: "wide", role: "region", "aria-label": caption, tabindex: "0" }, whole, more);
}

const section = (title, ...content) => h("section", {}, h("h2", {}, title), ...content);
const note = (...content) => h("p", { class: "note" }, ...content);

// ---- Rules

const WORD_LINKS = { object: labelLink, domain: domainLink, path: pathLink };

/** A rule as it is written, with links to what it speaks of. */
function ruleLine(rule) {
  const nouns = data.kinds[data.rules.kind[rule]].words;
  const words = wordsOf(rule).flatMap((word, index) => [" ", WORD_LINKS[nouns[index]]?.(word) ?? word]);
  const verdict = verdictOf(rule);
  return h("code", {}, keywordOf(rule), words, " ", h("span", { class: `verdict ${verdict}` }, verdict));
}

function placeLine(rule) {
  if (placeOf(rule) === "") return h("span", { class: "quiet" }, "no policy file");
  return h("span", { class: "place" }, breakable(placeOf(rule)), goneRules.has(rule) && " (not found in it by the latest load)");
}

const RULE_COLUMNS = {
  domain: ["Domain", (rule) => domainLink(domainOf(rule).name)],
  rule: ["Rule", ruleLine],
  place: ["Written in", placeLine],
  fate: ["On this kernel", (rule) =>
    [fateMark(fateOf(rule)), howOf(rule) !== "" && h("span", { class: "how" }, howOf(rule))]],
};

function ruleTable(caption, rules, names) {
  const columns = names.filter((name) => name !== "fate" || isCovered).map((name) => RULE_COLUMNS[name]);
  const titles = columns.map(([title]) => title);
  return table(caption, titles, rules, (rule) => columns.map(([, cell]) => cell(rule)), "even");
}
