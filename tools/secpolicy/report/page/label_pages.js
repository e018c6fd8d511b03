// The pages of labels.

const answerMark = (answer) => (answer === undefined ? nobody() : mayMark(answer.granted));

function labelMatrix(label, rules) {
  const accesses = data.words["kind of access"];
  const spoken = [...new Set(rules.map(domainOf))]
    .map((domain) => [domain, accesses.map((access) => answerOfAccess(domain, label, access))])
    .filter(([, answers]) => answers.some(Boolean));
  if (spoken.length === 0) return note("No rule of any domain grants or revokes an access to it.");
  const isUsed = accesses.map((_, index) => spoken.some(([, answers]) => answers[index]));
  const used = (all) => all.filter((_, index) => isUsed[index]);
  return table(`Who may do what with ${label}`, ["Domain", ...used(accesses)], spoken,
    ([domain, answers]) => [domainLink(domain.name), ...used(answers).map(answerMark)]);
}

const treeText = ({ path, isTree }) => (isTree ? `${path}/*` : path);

const fileTable = (label, lines) => table(`Files with ${label}`, ["Path", "Written in"], lines,
  (line) => [h("a", { href: addressOf("file", line.path) }, breakable(treeText(line))), fileLine(line)]);

const labelFacts = (name, object) => h("p", { class: "lede" },
  object ? `Object label, number ${object.id}. ` : "Label. ",
  domainByName.has(name) && ["There is a ", h("a", { href: addressOf("domain", name) }, "domain"), " of this name."]);

function labelPage(name = "") {
  if (!labels.includes(name)) return nothingPage(`label ${name}`);
  const rules = rulesWith(name);
  const files = labelLines.filter(({ label }) => label === name);
  return page(name, labelFacts(name, objects.find((object) => object.name === name)),
    section("Who may do what", note("By its rules. To a domain that is not enforcing, nothing is refused."),
      labelMatrix(name, rules)),
    section("Files that get it", files.length === 0 ? note("None.") : fileTable(name, files)),
    section(`Rules that speak of it (${rules.length.toLocaleString("en")})`, rules.length === 0 ? note("None.")
      : ruleTable(`Rules about ${name}`, rules, ["rule", "domain", "place", "fate"])));
}

function labelsPage() {
  const filesOf = groupBy(labelLines, ({ label }) => label);
  const numbers = new Map(objects.map(({ name, id }) => [name, id]));
  const columns = ["Label", "Of", "Number", "Lines that give it", "Uses in rules"];
  return page("Labels", table("Labels", columns, labels, (name) => [
    labelLink(name), numbers.has(name) ? "objects" : "a domain", numbers.get(name) ?? nobody(),
    filesOf.get(name)?.length ?? 0, countUses(name)]));
}
