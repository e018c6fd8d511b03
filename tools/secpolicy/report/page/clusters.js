// Clusters of domains that have more to do with each other than with the rest: communities of greatest
// modularity, by the method of Louvain.

const MOST_PASSES = 20;

/** The community of each node of an undirected graph; `links` are [one, other, weight]. */
function communitiesOf(count, links) {
  const neighbours = Array.from({ length: count }, () => new Map());
  const degree = Array(count).fill(0);
  let total = 0;
  for (const [one, other, weight] of links) {
    degree[one] += weight;
    degree[other] += weight;
    total += 2 * weight;
    if (one === other) continue;
    neighbours[one].set(other, (neighbours[one].get(other) ?? 0) + weight);
    neighbours[other].set(one, (neighbours[other].get(one) ?? 0) + weight);
  }
  const community = numbersFrom(0, count);
  const sum = [...degree];

  const bestFor = (node) => {
    const shared = new Map([[community[node], 0]]);
    for (const [other, weight] of neighbours[node]) {
      shared.set(community[other], (shared.get(community[other]) ?? 0) + weight);
    }
    const gain = (each) => shared.get(each) - degree[node] * sum[each] / total;
    return [...shared.keys()].reduce((best, each) => (gain(each) > gain(best) + 1e-9 ? each : best));
  };

  let isMoved = true;
  for (let pass = 0; isMoved && pass < MOST_PASSES; ++pass) {
    isMoved = false;
    for (let node = 0; node < count; ++node) {
      const old = community[node];
      sum[old] -= degree[node];
      community[node] = bestFor(node);
      sum[community[node]] += degree[node];
      isMoved ||= community[node] !== old;
    }
  }
  return community;
}

/** The same, of communities again as long as there come to be fewer. */
function findCommunities(count, links) {
  const community = communitiesOf(count, links);
  const names = [...new Set(community)];
  if (names.length === count) return community;
  const number = new Map(names.map((name, index) => [name, index]));
  const outer = findCommunities(names.length,
    links.map(([one, other, weight]) => [number.get(community[one]), number.get(community[other]), weight]));
  return community.map((each) => outer[number.get(each)]);
}

/** The clusters of all domains: `members`, and the `name` of the one with most transitions. */
function findClusters() {
  const place = new Map(domains.map((domain, index) => [domain, index]));
  const links = transitions.filter(({ from, to }) => from !== to)
    .map(({ from, to }) => [place.get(from), place.get(to), 1]);
  const community = findCommunities(domains.length, links);
  const degreeOf = (domain) => (transitionsFrom.get(domain)?.length ?? 0) + (transitionsInto.get(domain)?.length ?? 0);
  const groups = groupBy(domains, (domain) => (degreeOf(domain) === 0 ? "alone" : community[place.get(domain)]));
  return [...groups].map(([key, members]) => {
    const lead = members.reduce((most, domain) => (degreeOf(domain) > degreeOf(most) ? domain : most));
    const title = key === "alone" ? `${members.length} without transitions`
      : members.length === 1 ? lead.name : `${lead.name} and ${members.length - 1} more`;
    return { name: lead.name, title, members };
  });
}

let foundClusters;
const clusters = () => (foundClusters ??= findClusters());
