// Answers to questions. Each was made with the page; what is done here is to find it.

/** What rules decide: whether it is granted, and by which of them. */
const answerOf = (domain, [granted, rules]) => ({
  granted: granted === 1, rules: rules.map((rule) => domain.first + rule),
});

/** The rules of a domain by kind and words, found when they are first asked for. */
function ruleIndexOf(domain) {
  domain.index ??= new Map(rulesOf(domain).map((rule) =>
    [`${data.rules.kind[rule]}\0${wordsOf(rule).join("\0")}`, rule]));
  return domain.index;
}

const findRule = (domain, kind, words) => ruleIndexOf(domain).get(`${kind}\0${words.join("\0")}`);

/** The rule of the longest path that leads to `path`. */
function findPathRule(domain, path) {
  const ruleAt = (leading) => findRule(domain, KIND["-r"], [leading]);
  let rule = ruleAt(path);
  for (let slash = path.lastIndexOf("/"); rule === undefined && slash >= 0;
    slash = slash === 0 ? -1 : path.lastIndexOf("/", slash - 1)) {
    rule = ruleAt(path.slice(0, slash + 1)) ?? ruleAt(path.slice(0, slash));
  }
  return rule;
}

// By domain and name of a list: its answers, by what is asked for.
function tableOf(domain, name, entriesOf) {
  domain.tables ??= {};
  domain.tables[name] ??= new Map(domain[name].flatMap(entriesOf));
  return domain.tables[name];
}

const answerByName = (domain, name, key) => tableOf(domain, name, ([asked, granted, rules]) =>
  [[textAt(asked), answerOf(domain, [granted, rules])]]).get(key);

const answerOfCall = (domain, call) => tableOf(domain, "calls", ([calls, granted, rules]) => {
  const answer = answerOf(domain, [granted, rules]);
  return calls.map((each) => [textAt(each), answer]);
}).get(call);

const answerOfCreation = (domain, label, what) => tableOf(domain, "creations", ([directory, kind, granted, rules]) =>
  [[`${textAt(directory)}\0${textAt(kind)}`, answerOf(domain, [granted, rules])]]).get(`${label}\0${what}`);

/** What a rule says that answers its question alone. */
function answerOfRule(domain, kind, words) {
  const rule = findRule(domain, kind, words);
  return rule === undefined ? undefined : { granted: data.rules.answer[rule] === 1, rules: [rule] };
}

/** What is said of an access to what has a label; transitions have a say in who may execute it. */
function answerOfAccess(domain, label, access) {
  const byTransition = access === "execute" ? answerByName(domain, "executions", label) : undefined;
  return byTransition ?? answerOfRule(domain, KIND["-a"], [label, access]);
}

const MAKES_BIT = 6;

function answerOfPath(domain, question, path) {
  const rule = findPathRule(domain, path);
  if (rule === undefined) return undefined;
  const bit = question.kind === KIND["-r"] ? question.access : MAKES_BIT;
  return { granted: (data.rules.answer[rule] >> bit & 1) === 1, rules: [rule] };
}

function answerOfLabel(domain, question, label, what, word) {
  if (label === "") return undefined;
  if (question.kind === KIND["-f"]) return answerOfCreation(domain, label, what);
  if (question.kind === KIND["-u"]) return answerOfRule(domain, KIND["-u"], [label, what]);
  return answerOfAccess(domain, label, word);
}

// Of what says nothing, grants and refuses, in the order of the tables.
const sayOf = (answer) => (answer === undefined ? 0 : answer.granted ? 1 : 2);

const fill = (rule, words, label) =>
  rule.replace(/\{(\d|label)\}/g, (_, name) => (name === "label" ? label : words[Number(name)]));

/** About a file, from what is said of its path and of its label. */
function answerAboutFile(domain, question, words, label) {
  const [path, what = ""] = words;
  const form = question.files.find((each) => each.what === what);
  const ofPath = answerOfPath(domain, question, path);
  const ofLabel = answerOfLabel(domain, question, label, what, form.word);
  const [granted, byPath, byLabel] = form.settled[sayOf(ofPath) * 3 + sayOf(ofLabel)];
  const rules = [...(byPath ? ofPath.rules : []), ...(byLabel ? ofLabel.rules : [])];
  const isKnownLabel = label !== "" && !data.builtInLabels.includes(label);
  const missing = rules.length > 0 ? [] : isKnownLabel ? form.missingWithLabel : form.missing;
  return { granted: granted === 1, rules, missing: missing.map((rule) => fill(rule, words, label)) };
}

const unspoken = () => ({ granted: data.passesUnspoken, isOpen: true, rules: [] });

function answerInRanges(domain, ranges, number) {
  const [, , granted, isOpen, rules] =
    ranges.find(([first, last]) => BigInt(first) <= number && number <= BigInt(last));
  return { ...answerOf(domain, [granted, rules]), isOpen: isOpen === 1 };
}

/** The answers for the bits of a mask; for none of them, that for none. */
function answersOfBits(domain, ranges, mask) {
  const bits = ranges.map(([bit]) => BigInt(bit)).filter((bit) => (bit & mask) !== 0n);
  return (bits.length > 0 ? bits : [0n]).map((bit) => answerInRanges(domain, ranges, bit));
}

/** About a number; of a mask, each of its bits has to be granted. */
function answerAboutNumber(domain, [check, word]) {
  const number = BigInt(word);
  const ranges = domain.checks.find(([name]) => textAt(name) === check)?.[1];
  if (!ranges) return unspoken();
  if (check !== data.maskCheck) return answerInRanges(domain, ranges, number);
  const bits = answersOfBits(domain, ranges, number);
  const granted = bits.every((bit) => bit.granted);
  const deciding = bits.filter((bit) => bit.granted === granted).flatMap((bit) => bit.rules);
  return { granted, isOpen: bits.every((bit) => bit.isOpen), rules: [...new Set(deciding)] };
}

function answerAboutWords(domain, question, words) {
  if (question.kind === KIND["-s"]) return answerOfCall(domain, words[0]);
  if (question.kind === KIND["-d"]) return answerByName(domain, "entries", words[0]);
  return answerOfRule(domain, question.kind, words);
}

/** Whether the domain may do what is asked, and which rules say so. */
function ask(domain, question, words, label) {
  const answer = answerTo(domain, question, words, label);
  return { ...answer, isAllowed: answer.granted || !domain.refuses };
}

function answerTo(domain, question, words, label) {
  if (question.files) return answerAboutFile(domain, question, words, label);
  if (question.kind === KIND["-p"]) return { missing: [], ...answerAboutNumber(domain, words) };
  const missing = question.missing.map((rule) => fill(rule, words, ""));
  return { granted: false, rules: [], missing, ...answerAboutWords(domain, question, words) };
}

const questionByAction = new Map(data.questions.map((question) => [question.action, question]));
