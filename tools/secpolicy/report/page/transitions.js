// What graphs there are of transitions: of all domains, of clusters, of what is in one, and of one domain.

const NODE_HEIGHT = 32;
const NODE_PADDING = 14;

const measure = document.createElement("canvas").getContext("2d");

function measureText(text, size) {
  measure.font = `${size}px system-ui, sans-serif`;
  return Math.ceil(measure.measureText(text).width);
}

const widthOf = (text) => measureText(text, 14) + 2 * NODE_PADDING;
const textWidth = (text) => measureText(text, 10.5);

/** A node: `title` is what stands in its box, `address` where it leads, `about` what is read of it. */
const nodeOf = (title, address, about, look) =>
  ({ title, address, about, look, width: widthOf(title), height: NODE_HEIGHT });

const sizeOf = (group) => group?.length ?? 0;

const describeDomain = (domain) => `${domain.name}, ${domain.level}, `
  + `entered from ${sizeOf(transitionsInto.get(domain))}, leads to ${sizeOf(transitionsFrom.get(domain))}`;

const domainNode = (domain, look = "") =>
  nodeOf(domain.name, addressOf("domain", domain.name), describeDomain(domain), `${domain.level} ${look}`);

const clusterNode = ({ name, title, members }, look = "") => nodeOf(title, addressOf("transitions", "cluster", name),
  `${countOf(members.length, "domain")}, the cluster of ${name}`, `cluster ${look}`);

/** A cluster with a single domain is that domain. */
const nodeOfCluster = (cluster, look) =>
  (cluster.members.length === 1 ? domainNode(cluster.members[0], look) : clusterNode(cluster, look));

const isCluster = ({ look }) => look.startsWith("cluster");
const isOutside = ({ look }) => look.endsWith("outside");

const describeWay = (rules) => rules.map((rule) => `${wordOf(rule, 0)}, ${wordOf(rule, 2)}`);

/** Arrows between the nodes that `nodeOfDomain` has for both ends, one for all ways from one to the other. */
function edgesBetween(nodeOfDomain) {
  const drawn = transitions.map((transition) =>
    ({ ...transition, ends: [nodeOfDomain.get(transition.from), nodeOfDomain.get(transition.to)] }))
    .filter(({ from, to, ends: [one, other] }) => one && other && (one !== other || from === to));
  const byBegin = groupBy(drawn, ({ ends }) => ends[0]);
  return [...byBegin].flatMap(([begin, leaving]) => [...groupBy(leaving, ({ ends }) => ends[1])].map(([end, all]) => ({
    from: begin,
    to: end,
    count: all.length,
    ways: all.flatMap(({ from, to, rules }) =>
      (isCluster(begin) || isCluster(end) ? [`${from.name} to ${to.name}`] : describeWay(rules))),
  })));
}

/** The graph of the nodes that domains have. */
const graphOf = (nodeOfDomain) =>
  ({ nodes: [...new Set(nodeOfDomain.values())], edges: edgesBetween(nodeOfDomain) });

const wholeGraph = () => graphOf(new Map(domains.map((domain) => [domain, domainNode(domain)])));

const nodesOfCluster = (cluster, node) => cluster.members.map((domain) => [domain, node]);

const clusterGraph = () =>
  graphOf(new Map(clusters().flatMap((cluster) => nodesOfCluster(cluster, nodeOfCluster(cluster)))));

/** The domains of one cluster, and of the others those that they have to do with. */
function insideGraph(name) {
  const inside = clusters().find((cluster) => cluster.name === name);
  if (!inside) return undefined;
  const isInside = new Set(inside.members);
  const touched = new Set(transitions.filter(({ from, to }) => isInside.has(from) !== isInside.has(to))
    .map(({ from, to }) => (isInside.has(from) ? to : from)));
  const around = clusters().filter((cluster) =>
    cluster !== inside && cluster.members.some((domain) => touched.has(domain)));
  const graph = graphOf(new Map([
    ...inside.members.map((domain) => [domain, domainNode(domain)]),
    ...around.flatMap((cluster) => nodesOfCluster(cluster, nodeOfCluster(cluster, "outside"))),
  ]));
  return { ...graph, edges: graph.edges.filter(({ from, to }) => !isOutside(from) || !isOutside(to)) };
}

/** A domain with those that it is entered from and leads to. */
function aroundGraph(domain) {
  const near = new Set([domain, ...(transitionsInto.get(domain) ?? []).map(({ from }) => from),
    ...(transitionsFrom.get(domain) ?? []).map(({ to }) => to)]);
  const graph = graphOf(new Map([...near].map((each) => [each, domainNode(each, each === domain ? "chosen" : "")])));
  const isChosen = ({ title }) => title === domain.name;
  return { ...graph, edges: graph.edges.filter(({ from, to }) => isChosen(from) || isChosen(to)) };
}
