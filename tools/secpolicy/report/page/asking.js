// Questions: whether a domain may do something, who may, and which rules say so.

const EVERYBODY = "*";
const LABEL_MARK = "label:";

/** The words of a question that is in an address, and the label that was chosen for its file, if one was. */
function readQuestion(words) {
  const last = words.at(-1);
  return last?.startsWith(LABEL_MARK)
    ? { words: words.slice(0, -1), label: last.slice(LABEL_MARK.length) } : { words, label: undefined };
}

const directoryOf = (path) => path.slice(0, Math.max(path.lastIndexOf("/"), 1));

/** A path without slashes at its end. */
const trimmed = (path) => path.replace(/(?<=.)\/+$/, "");

/** The label that the policy gives a file, or the directory that one is to be made in. */
function labelFor(question, path) {
  const labelled = question.words.length === 1 ? path : directoryOf(path);
  return labelLineOf(labelled)?.label ?? "";
}

const NUMBER = /^(\d+|0x[\da-f]+)$/i;
const GREATEST = "0xffffffffffffffff";

/** Why this cannot be asked; nothing for what can. */
function whyNot(question, words) {
  if (words.length !== question.words.length || words.includes("")) return "Fill in what is asked for.";
  for (const [index, noun] of question.words.entries()) {
    const word = words[index];
    if (noun === "path" && !word.startsWith("/")) return `${word} is no path: it begins with a slash.`;
    if (noun === "number" && !NUMBER.test(word)) return `${word} is not a number.`;
    const isTooLarge = noun === "number" && BigInt(word) > BigInt(GREATEST);
    if (isTooLarge) return `${word} is too large: numbers go up to ${GREATEST}.`;
    const known = wordsFor(noun);
    if (known && !known.includes(word)) return `There is no ${noun} ${word}.`;
  }
  return undefined;
}

/** The words that there are for a noun; nothing where any will do. */
function wordsFor(noun) {
  if (noun === "object") return labels;
  if (noun === "domain") return domains.map(({ name }) => name);
  return data.words[noun];
}

// ---- Answers

function missingLine({ rules, isOpen, missing = [] }) {
  if (rules.length > 0 || isOpen || missing.length === 0) return [];
  return [h("li", {}, "No rule speaks of it. ",
    missing.length > 1 ? "One of these would grant it: " : "This would grant it: ",
    missing.map((rule, index) => [index > 0 && " or ", h("code", {}, rule)]))];
}

const openText = (name, check) => `No rule of ${name} grants a value of ${check}, so all pass that none revokes.`;

const reasonLines = ({ name, level, refuses }, answer, words) => [
  ...answer.rules.map((rule) => h("li", {}, ruleLine(rule), " ", placeLine(rule))),
  ...(answer.isOpen ? [h("li", {}, openText(name, words[0]))] : []),
  ...(refuses ? [] : [h("li", {}, `It is ${level}, so nothing is refused to it.`)]),
  ...missingLine(answer),
];

function answerBlock(domain, question, words, label) {
  const answer = ask(domain, question, words, label);
  const text = `${domain.name} ${answer.isAllowed ? "may" : "may not"} ${question.action} ${words.join(" ")}`;
  announce(`${answer.isAllowed ? "Yes" : "No"}: ${text}`);
  return h("section", { class: `answer ${answer.isAllowed ? "good" : "bad"}` },
    h("h2", {}, answer.isAllowed ? "Yes" : "No", ": ", text), h("ul", {}, reasonLines(domain, answer, words)));
}

function whoCanBlock(question, words, label) {
  const answers = domains.map((domain) => ({ domain, answer: ask(domain, question, words, label) }));
  const allowed = answers.filter(({ answer }) => answer.isAllowed);
  const text = `${countOf(allowed.length, "domain")} may ${question.action} ${words.join(" ")}`;
  announce(text);
  const rows = [...allowed, ...answers.filter(({ answer }) => !answer.isAllowed && answer.rules.length > 0)];
  return h("section", { class: "answer" }, h("h2", {}, text),
    rows.length > 0 && table(text, ["Domain", "Answer", "Why"], rows, ({ domain, answer }) => [
      domainLink(domain.name), mayMark(answer.isAllowed),
      h("ul", { class: "reasons" }, reasonLines(domain, answer, words))]));
}

// ---- The form

const field = (name, id, control) => h("p", { class: "field" }, h("label", { for: id }, name), control);

const choice = (id, options, chosen) => h("select", { id }, options.map(([value, text]) =>
  h("option", { value, selected: value === chosen }, text)));

const FIELD_NAMES = { path: "Path", number: "Number", object: "Label", domain: "Into the domain" };
const nameOfField = (noun) => FIELD_NAMES[noun] ?? capitalized(noun);

const MANY_WORDS = 5000;

function wordField(noun, index, word) {
  const id = `word-${index}`;
  const known = wordsFor(noun) ?? (noun === "path" ? paths.slice(0, MANY_WORDS) : []);
  const control = h("input", { id, list: `${id}-words`, value: word, autocomplete: "off", spellcheck: "false" });
  const words = h("datalist", { id: `${id}-words` }, known.map((value) => h("option", { value })));
  return [field(nameOfField(noun), id, control), words];
}

function labelField(question, label) {
  const options = [["*", "as the policy gives it"], ["", "none"], ...labels.map((each) => [each, each])];
  const name = question.words.length === 1 ? "Label of the file" : "Label of its directory";
  return field(name, "label", choice("label", options, label ?? "*"));
}

const ABOUT_ANSWERS = "The answers are those of 'secpolicy why' and 'who-can' for this policy. What label a file "
  + "carries on a host is not known here: it is taken to be the one that the policy gives it, and another can be "
  + "chosen.";

function askPage(who = EVERYBODY, action = "read", ...rest) {
  const question = questionByAction.get(action);
  const domain = domainByName.get(who);
  if (!question) return nothingPage(`question ${action}`);
  if (!domain && who !== EVERYBODY) return nothingPage(`domain ${who}`);
  const { words, label } = readQuestion(rest);
  const goTo = () => { location.hash = addressOf("ask", ...readForm(form)); };
  const form = h("form", { class: "ask", onsubmit: (event) => { event.preventDefault(); goTo(); } },
    field("Who", "who", choice("who", [[EVERYBODY, "Any domain"], ...domains.map(({ name }) => [name, name])], who)),
    field("May", "action", choice("action", data.questions.map((each) => [each.action, each.action]), action)),
    question.words.map((noun, index) => wordField(noun, index, words[index] ?? "")),
    question.files && labelField(question, label),
    h("p", { class: "field" }, h("button", { type: "submit" }, "Ask")));
  form.querySelector("#action").addEventListener("change", (event) => {
    location.hash = addressOf("ask", form.querySelector("#who").value, event.target.value);
  });
  return page("Who may do what, and why", form,
    words.length === 0 ? note(ABOUT_ANSWERS) : answerPart(domain, question, words, label));
}

const readForm = (form) => {
  const value = (id) => form.querySelector(`#${id}`)?.value;
  const words = [0, 1, 2].map((index) => value(`word-${index}`)).filter((word) => word !== undefined);
  const label = value("label");
  return [value("who"), value("action"), ...words.map((word) => word.trim()),
    ...(label === undefined || label === "*" ? [] : [LABEL_MARK + label])];
};

function answerPart(domain, question, given, label) {
  const problem = whyNot(question, given);
  if (problem) {
    announce(problem);
    return h("p", { class: "notice" }, problem);
  }
  const words = question.files ? [trimmed(given[0]), ...given.slice(1)] : given;
  const ofFile = question.files ? label ?? labelFor(question, words[0]) : "";
  return [
    question.files && note(question.words.length === 1 ? "Label: " : "Label of the directory: ",
      ofFile === "" ? "none" : labelLink(ofFile), "."),
    domain ? answerBlock(domain, question, words, ofFile) : whoCanBlock(question, words, ofFile),
  ];
}
