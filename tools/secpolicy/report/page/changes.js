// The page of how the policy differs from another one.

const DIFFERENCE = { "-": ["removed", "Removed: "], "+": ["added", "Added: "] };

function differenceList(lines) {
  const list = h("ul", { class: "difference" });
  const more = grow(list, lines, ([sign, text, place]) => {
    const [look, name] = DIFFERENCE[sign];
    return h("li", { class: look }, h("span", { "aria-hidden": "true" }, `${sign} `),
      h("span", { class: "hidden" }, name), h("code", {}, text), place && [" ", place]);
  });
  return [list, more];
}

/** The lines of what was and what is, where there is anything on that side; the latter has a place. */
const linesOf = (before, after, place) =>
  [...(before ? [["-", before]] : []), ...(after ? [["+", after, place]] : [])];

const levelText = (level) => level && `level ${level}`;

function domainDifference({ name, level, rules }) {
  const domain = domainByName.get(name);
  const ruleOf = new Map(domain && rulesOf(domain).map((rule) => [ruleText(rule), rule]));
  const placeIn = (text) => ruleOf.has(text) && placeLine(ruleOf.get(text));
  return [
    ...(level.before === level.after ? [] : linesOf(levelText(level.before), levelText(level.after))),
    ...rules.removed.map((rule) => ["-", rule]),
    ...rules.changed.flatMap(({ before, after }) => linesOf(before, after, placeIn(after))),
    ...rules.added.map((rule) => ["+", rule, placeIn(rule)]),
  ];
}

function whichSide({ level }) {
  if (level.before && level.after) return "";
  return ` (only in ${level.before ? data.against.before : data.against.after})`;
}

const domainTitle = (domain) =>
  [domainByName.has(domain.name) ? domainLink(domain.name) : domain.name, whichSide(domain)];

function changesPage() {
  const { before, after, same, domains: changed, objects: { removed, added }, labels: files } = data.against;
  const objectLines = [...removed.map((name) => ["-", name]), ...added.map((name) => ["+", name])];
  const lineOf = new Map(labelLines.map((line) => [treeText(line), line]));
  const fileLines = (files ?? []).flatMap(({ path, before: old, after: label }) =>
    linesOf(old && `${path} ${old}`, label && `${path} ${label}`, lineOf.has(path) && fileLine(lineOf.get(path))));
  return page("Changes",
    h("p", { class: "lede" }, "How ", h("code", {}, after), " differs from ", h("code", {}, before),
      same ? ": not at all." : "."),
    !files && note("File labels are left out: two policy directories have them, and a state does not."),
    changed.map((domain) => section(domainTitle(domain), differenceList(domainDifference(domain)))),
    objectLines.length > 0 && section("Objects", differenceList(objectLines)),
    fileLines.length > 0 && section("File labels", differenceList(fileLines)));
}
