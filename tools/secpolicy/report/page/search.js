// The search: what has the words of the query in it, in the order in which they stand there.

let lowerRules;

function findRules(wanted) {
  lowerRules ??= numbersFrom(0, ruleCount).map((rule) => ruleText(rule).toLowerCase());
  return lowerRules.flatMap((line, rule) => (line.includes(wanted) ? [rule] : []));
}

function search(query) {
  const wanted = query.trim().toLowerCase();
  const has = (name) => name.toLowerCase().includes(wanted);
  return {
    domains: domains.filter(({ name }) => has(name)),
    labels: labels.filter(has),
    paths: paths.filter(has),
    rules: findRules(wanted),
  };
}

function searchPage(query = "") {
  if (query.trim() === "") return page("Search", note("Type a part of a name, a path or a rule."));
  const found = search(query);
  const count = found.domains.length + found.labels.length + found.paths.length + found.rules.length;
  announce(`${countOf(count, "result")} for ${query}`);
  const group = (title, items, content) =>
    items.length > 0 && section(`${title} (${items.length.toLocaleString("en")})`, content(items));
  return page(`Search: ${query}`,
    note(countOf(count, "result"), "."),
    group("Domains", found.domains, (items) => nameList(items, ({ name }) => domainLink(name))),
    group("Labels", found.labels, (items) => nameList(items, labelLink)),
    group("Files", found.paths, (items) => nameList(items, pathLink)),
    group("Rules", found.rules, (items) => ruleTable("Rules found", items, ["rule", "domain", "place"])));
}
