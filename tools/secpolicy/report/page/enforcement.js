// The page of what a kernel can enforce.

const yesOrNo = (isSo) => (isSo ? "yes" : "no");

function kernelFacts() {
  const { landlock, seccomp, seccompNotify } = data.features;
  return h("p", { class: "lede" }, "What becomes of each rule on the kernel that this page was made on. ",
    `Landlock: ${landlock === 0 ? "no" : `version ${landlock}`}. `,
    `Filters of system calls: ${yesOrNo(seccomp)}; that ask a supervisor: ${yesOrNo(seccompNotify)}.`);
}

function tally() {
  const counts = [0, 0, 0];
  for (const fate of data.rules.fate) ++counts[fate];
  return h("ul", { class: "tally" }, counts.map((count, fate) =>
    h("li", {}, h("strong", {}, count.toLocaleString("en")), " ", fateMark(fate))));
}

const gapLines = () => domains.flatMap(({ name, gaps }) =>
  gaps.map((gap) => h("li", {}, domainLink(name), `: ${gap}`)));

function enforcementPage() {
  if (!isCovered) {
    return page("Enforcement", note(`What a kernel can enforce is not told here: ${data.whyNoCoverage}.`));
  }
  const gaps = gapLines();
  const inexact = numbersFrom(0, ruleCount).filter((rule) => fateOf(rule) !== 0)
    .sort((one, other) => fateOf(other) - fateOf(one));
  return page("Enforcement", kernelFacts(), tally(),
    note("Enforced: exactly as it is written. Narrowed: the domain may do less than the rule says. "
      + "Not enforceable: it could do more, or never what the rule is for."),
    gaps.length > 0 && section("What no rule is about and cannot be refused", h("ul", {}, gaps)),
    inexact.length > 0 && section("Rules that are not kept exactly",
      ruleTable("Rules that are not kept exactly", inexact, ["rule", "domain", "fate", "place"])));
}
