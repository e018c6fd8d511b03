"use strict";

// The policy that this page is about. Texts are kept once, and rules by column: a rule is a number.

const data = JSON.parse(document.getElementById("data").textContent);

const WORDS_OF_RULE = 3;

const ruleCount = data.rules.kind.length;
const textAt = (place) => data.strings[place];

/** Maps each key to all values that were found for it. */
function groupBy(values, keyOf) {
  const groups = new Map();
  for (const value of values) {
    const key = keyOf(value);
    const group = groups.get(key);
    if (group) group.push(value);
    else groups.set(key, [value]);
  }
  return groups;
}

function numbersFrom(first, count) {
  return Array.from({ length: count }, (_, index) => first + index);
}

const domains = [];
const domainOfRule = new Uint32Array(ruleCount);
for (const domain of data.domains) {
  const first = domains.length === 0 ? 0 : domains.at(-1).first + domains.at(-1).count;
  domainOfRule.fill(domains.length, first, first + domain.count);
  domains.push({ ...domain, name: textAt(domain.name), first });
}
const domainByName = new Map(domains.map((domain) => [domain.name, domain]));

const keywordOf = (rule) => data.kinds[data.rules.kind[rule]].keyword;
const domainOf = (rule) => domains[domainOfRule[rule]];
const fileOf = (rule) => textAt(data.rules.file[rule]);
const wordOf = (rule, index) => textAt(data.rules.words[rule * WORDS_OF_RULE + index]);
const verdictOf = (rule) => textAt(data.rules.verdict[rule]);
const rulesOf = (domain) => numbersFrom(domain.first, domain.count);
const goneRules = new Set(data.rules.gone);

const KIND = Object.fromEntries(data.kinds.map(({ keyword }, kind) => [keyword, kind]));

function wordsOf(rule) {
  const words = [];
  for (let index = 0; index < WORDS_OF_RULE; ++index) {
    const word = wordOf(rule, index);
    if (word !== "") words.push(word);
  }
  return words;
}

/** The rule as a line of a policy file. */
function ruleText(rule) {
  return [keywordOf(rule), ...wordsOf(rule), verdictOf(rule)].join(" ");
}

/** Where the rule is written: "FILE:LINE"; empty for one that no policy file brought. */
function placeOf(rule) {
  return fileOf(rule) === "" ? "" : `${fileOf(rule)}:${data.rules.line[rule]}`;
}

// ---- Labels of files

const labelLines = data.labels.map(([path, isTree, label, file, line], place) => ({
  path: textAt(path), isTree: isTree === 1, label: textAt(label), file: textAt(file), line, place,
}));
const lineOfPath = new Map(labelLines.filter((line) => !line.isTree).map((line) => [line.path, line]));
const lineOfTree = new Map(labelLines.filter((line) => line.isTree).map((line) => [line.path, line]));

/** The line that labels a file: of those for its path and for the trees around it, the last one. */
function labelLineOf(path) {
  const lines = [lineOfPath.get(path)];
  for (let tree = path; ; tree = tree.slice(0, Math.max(tree.lastIndexOf("/"), 0))) {
    lines.push(lineOfTree.get(tree));
    if (tree === "") break;
  }
  return lines.reduce((last, line) => (line && (!last || line.place > last.place) ? line : last), undefined);
}

// ---- What there is to find

const objects = data.objects.map(([name, id]) => ({ name: textAt(name), id }));

/** Every label: objects, and domains, whose names are labels, too. */
const labels = [...new Set([...objects.map(({ name }) => name), ...domains.map(({ name }) => name)])].sort();

/** Every path that a rule or a file label speaks of. */
const paths = [...new Set([
  ...numbersFrom(0, ruleCount).filter((rule) => data.rules.kind[rule] === KIND["-r"]).map((rule) => wordOf(rule, 0)),
  ...labelLines.map(({ path }) => path),
])].sort();

/** The granted transitions: from one domain into another, each with its rules. */
const transitions = [];
for (const domain of domains) {
  for (const [target, granted, rules] of domain.entries) {
    const to = domainByName.get(textAt(target));
    if (granted === 1 && to) transitions.push({ from: domain, to, rules: rules.map((rule) => domain.first + rule) });
  }
}
const transitionsFrom = groupBy(transitions, ({ from }) => from);
const transitionsInto = groupBy(transitions, ({ to }) => to);

/** In how many words of rules each text stands. */
const uses = new Uint32Array(data.strings.length);
for (const place of data.rules.words) ++uses[place];
const placeOfText = new Map(data.strings.map((each, place) => [each, place]));
const countUses = (word) => uses[placeOfText.get(word)] ?? 0;

/** The rules in which a word stands. */
function rulesWith(word) {
  const place = placeOfText.get(word);
  const found = [];
  data.rules.words.forEach((each, index) => {
    const rule = Math.floor(index / WORDS_OF_RULE);
    if (each === place && found.at(-1) !== rule) found.push(rule);
  });
  return found;
}

const isCovered = data.features !== null;
const FATES = ["enforced", "narrowed", "not enforceable"];
const fateOf = (rule) => data.rules.fate[rule];
const howOf = (rule) => textAt(data.rules.how[rule]);

/** How many rules of the domain have each fate. */
function countFates(domain) {
  const counts = [0, 0, 0];
  for (let rule = domain.first; rule < domain.first + domain.count; ++rule) ++counts[fateOf(rule)];
  return counts;
}
