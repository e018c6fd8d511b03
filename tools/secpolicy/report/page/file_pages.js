// The pages of files.

const FILE_QUESTIONS = data.questions.filter((question) => question.files && question.words.length === 1);

const fileAnswerMark = (domain, question, path, { isAllowed }) => h("a", {
  class: `mark ${isAllowed ? "good" : "bad"}`, href: addressOf("ask", domain.name, question.action, path),
}, isAllowed ? "may" : "no");

/** What each domain may do with a file, without those that no rule speaks for. */
function fileMatrix(path, label) {
  const rows = domains
    .map((domain) => [domain, FILE_QUESTIONS.map((question) => ask(domain, question, [path], label))])
    .filter(([, answers]) => answers.some(({ rules, isAllowed }) => rules.length > 0 || isAllowed));
  if (rows.length === 0) return note("No domain may do anything with it.");
  const columns = ["Domain", ...FILE_QUESTIONS.map(({ action }) => action)];
  return table(`Who may do what with ${path}`, columns, rows, ([domain, answers]) => [domainLink(domain.name),
    ...answers.map((answer, index) => fileAnswerMark(domain, FILE_QUESTIONS[index], path, answer))]);
}

const covers = (rulePath, path) => rulePath === path || rulePath === "/"
  || (path.startsWith(rulePath) && (rulePath.endsWith("/") || path[rulePath.length] === "/"));

const isAbout = (rule, path) => data.rules.kind[rule] === KIND["-r"] && covers(wordOf(rule, 0), path);

function filePage(path = "") {
  if (!path.startsWith("/")) return nothingPage(`file ${path}`);
  const line = labelLineOf(path);
  const rules = numbersFrom(0, ruleCount).filter((rule) => isAbout(rule, path));
  const below = paths.filter((each) => each !== path && covers(path, each));
  const label = line
    ? ["Label ", labelLink(line.label), ", by ", fileLine(line), "."] : "No line of the policy labels it.";
  return page(breakable(path), h("p", { class: "lede" }, label),
    section("Who may do what", fileMatrix(path, line?.label ?? "")),
    section(`Rules about it and the directories above (${rules.length.toLocaleString("en")})`, rules.length === 0
      ? note("None.") : ruleTable(`Rules about ${path}`, rules, ["rule", "domain", "place", "fate"])),
    below.length > 0 && section("Below it", nameList(below, pathLink)));
}

const filesPage = () => page("Files",
  h("p", { class: "lede" }, "Every path that a rule or a line of the file labels speaks of."),
  table("Files", ["Path", "Label", "Uses in rules"], paths, (path) => {
    const line = labelLineOf(path);
    return [pathLink(path), line ? labelLink(line.label) : nobody(), countUses(path)];
  }));
