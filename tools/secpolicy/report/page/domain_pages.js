// The pages of domains.

/** The worst of what becomes of the rules of a domain. */
function fatesLine(domain) {
  const counts = countFates(domain);
  const worst = counts.findLastIndex((count) => count > 0);
  const text = worst <= 0 ? "all" : `${counts[worst]} ${FATES[worst]}`;
  return h("span", { class: `mark ${FATE_CLASSES[Math.max(worst, 0)]}` }, text);
}

const MOST_LINKS = 6;

function linksOf(names) {
  if (names.length === 0) return nobody();
  const shown = names.slice(0, MOST_LINKS).map((name, index) => [index > 0 && ", ", domainLink(name)]);
  return [shown, names.length > MOST_LINKS && ` and ${names.length - MOST_LINKS} more`];
}

function overviewPage() {
  const columns = ["Domain", "Level", "Rules", "Entered from", "Leads to", ...(isCovered ? ["Enforced"] : [])];
  return page(data.title,
    h("p", { class: "lede" }, `${countOf(domains.length, "domain")}, ${countOf(ruleCount, "rule")}, `
      + `${countOf(objects.length, "object")} and ${countOf(labelLines.length, "label of files", "labels of files")}.`),
    table("Domains", columns, domains, (domain) => [
      domainLink(domain.name), levelMark(domain.level), domain.count.toLocaleString("en"),
      linksOf((transitionsInto.get(domain) ?? []).map(({ from }) => from.name)),
      linksOf((transitionsFrom.get(domain) ?? []).map(({ to }) => to.name)),
      ...(isCovered ? [fatesLine(domain)] : [])]));
}

// ---- A domain

const domainFacts = (domain) => h("p", { class: "lede" }, levelMark(domain.level),
  ` Number ${domain.id}, ${countOf(domain.count, "rule")}`,
  domain.atRunTime && ", made at run time", domain.gone && ", defined by no file", ". ",
  h("a", { href: addressOf("ask", domain.name) }, "Ask what it may do"), " · ",
  h("a", { href: addressOf("transitions", "domain", domain.name) }, "See its transitions"));

function kindSections(domain) {
  const byKind = groupBy(rulesOf(domain), (rule) => data.rules.kind[rule]);
  return [...byKind].map(([kind, rules]) => {
    const form = data.kinds[kind];
    const title = `${capitalized(form.name)} (${rules.length.toLocaleString("en")})`;
    return h("section", { id: `kind-${form.keyword.slice(1)}` }, h("h2", {}, title), note(h("code", {}, form.usage)),
      ruleTable(`${form.name} of ${domain.name}`, rules, ["rule", "place", "fate"]));
  });
}

function waysOf(domain) {
  const into = transitionsInto.get(domain) ?? [];
  const from = transitionsFrom.get(domain) ?? [];
  return [
    section("Who enters it",
      into.length > 0 ? waysTable(into, ["From", "By", "Written in"]) : note("No domain that this policy has.")),
    section("Where it goes",
      from.length > 0 ? waysTable(from, ["Into", "By", "Written in"]) : note("Nowhere: its programs stay in it.")),
  ];
}

function domainPage(name = "") {
  const domain = domainByName.get(name);
  if (!domain) return nothingPage(`domain ${name}`);
  const gaps = isCovered ? domain.gaps : [];
  return page(name, domainFacts(domain), waysOf(domain),
    gaps.length > 0 && section("What cannot be refused", h("ul", {}, gaps.map((gap) => h("li", {}, gap)))),
    kindSections(domain));
}
