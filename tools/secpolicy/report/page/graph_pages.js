// The pages with graphs.

const MANY_DOMAINS = 100;

const WAY_COLUMNS = {
  From: ({ from }) => domainLink(from.name),
  Into: ({ to }) => domainLink(to.name),
  By: ({ rule }) => [labelLink(wordOf(rule, 0)), `, ${wordOf(rule, 2)}`],
  "Written in": ({ rule }) => placeLine(rule),
};

const waysTable = (ways, columns = Object.keys(WAY_COLUMNS)) => table("Transitions", columns,
  ways.flatMap(({ from, to, rules }) => rules.map((rule) => ({ from, to, rule }))),
  (way) => columns.map((column) => WAY_COLUMNS[column](way)), "even");

const legend = () => note("A box is a domain: ", h("span", { class: "swatch permissive" }, "dashed"),
  " when it is permissive, ", h("span", { class: "swatch disabled" }, "dotted"),
  " when it is disabled. An arrow is a transition that is granted.");

const ALL_BY_CLUSTER = [addressOf("transitions"), "By clusters"];
const ALL_DOMAINS = [addressOf("transitions", "all"), `All ${countOf(domains.length, "domain")}`];
const leadTo = ([address, text]) => h("a", { href: address }, text);

function graphPage(what = "", name = "") {
  if (what === "domain") return aroundPage(name);
  if (what === "cluster") return insidePage(name);
  const isMany = domains.length >= MANY_DOMAINS;
  const isByCluster = isMany && what !== "all";
  const graph = isByCluster ? clusterGraph() : wholeGraph();
  const boxes = `${countOf(graph.nodes.length, "box", "boxes")} for clusters of domains that have much to do with `
    + "each other. ";
  return page("Transitions",
    isMany && h("p", {}, isByCluster ? [boxes, leadTo(ALL_DOMAINS)] : leadTo(ALL_BY_CLUSTER)),
    drawGraph(graph, `${countOf(domains.length, "domain")} and ${countOf(transitions.length, "transition")}`),
    legend(),
    section("In words", transitions.length > 0 ? waysTable(transitions) : note("There are no transitions.")));
}

function aroundPage(name) {
  const domain = domainByName.get(name);
  if (!domain) return nothingPage(`domain ${name}`);
  return page(["Transitions of ", domainLink(name)],
    drawGraph(aroundGraph(domain), `Transitions of ${name}`), legend(),
    h("p", {}, leadTo([addressOf("transitions"), "All transitions"])));
}

function insidePage(name) {
  const graph = insideGraph(name);
  if (!graph) return nothingPage(`cluster of ${name}`);
  const { title, members } = clusters().find((cluster) => cluster.name === name);
  const isInside = new Set(members);
  return page(`Cluster: ${title}`, h("p", {}, leadTo([addressOf("transitions"), "All clusters"])),
    drawGraph(graph, title), legend(),
    section("In words", waysTable(transitions.filter(({ from, to }) => isInside.has(from) || isInside.has(to)))));
}
