// A layered layout: every node has a column, to the right of those that lead to it where they form no
// circle, and a place in it that keeps arrows short.

const BEND_HEIGHT = 10;
const SWEEPS = 12;
const TURNED_SHIFT = 8; // beside the arrow that leads the other way

/** The edges, of which those are turned around that would close a circle. */
function withoutCircles(nodes, edges) {
  const leaving = groupBy(edges, ({ from }) => from);
  const state = new Map();
  const turned = new Set();
  const visit = (root) => {
    const stack = [[root, 0]];
    state.set(root, "open");
    while (stack.length > 0) {
      const frame = stack.at(-1);
      const edge = leaving.get(frame[0])?.[frame[1]++];
      if (!edge) {
        state.set(frame[0], "done");
        stack.pop();
      } else if (state.get(edge.to) === "open") {
        turned.add(edge);
      } else if (!state.has(edge.to)) {
        state.set(edge.to, "open");
        stack.push([edge.to, 0]);
      }
    }
  };
  const entered = new Set(edges.map(({ to }) => to));
  const first = nodes.filter((node) => !entered.has(node));
  const rest = nodes.toSorted((one, other) => (leaving.get(other)?.length ?? 0) - (leaving.get(one)?.length ?? 0));
  for (const node of [...first, ...rest]) if (!state.has(node)) visit(node);
  return edges.map((edge) => (turned.has(edge)
    ? { edge, from: edge.to, to: edge.from } : { edge, from: edge.from, to: edge.to }));
}

/** The column of each node: behind all that lead to it. */
function columnsOf(nodes, arcs) {
  const column = new Map(nodes.map((node) => [node, 0]));
  const waiting = new Map(nodes.map((node) => [node, 0]));
  for (const { to } of arcs) waiting.set(to, waiting.get(to) + 1);
  const leaving = groupBy(arcs, ({ from }) => from);
  const ready = nodes.filter((node) => waiting.get(node) === 0);
  for (const node of ready) {
    for (const { to } of leaving.get(node) ?? []) {
      column.set(to, Math.max(column.get(to), column.get(node) + 1));
      waiting.set(to, waiting.get(to) - 1);
      if (waiting.get(to) === 0) ready.push(to);
    }
  }
  return column;
}

/** Lays arcs over several columns through a bend in each that they cross. Returns the links between neighbours. */
function bendArcs(arcs, column, layers) {
  const links = [];
  for (const arc of arcs) {
    arc.bends = [];
    let last = arc.from;
    for (let crossed = column.get(arc.from) + 1; crossed < column.get(arc.to); ++crossed) {
      const bend = { width: 0, height: BEND_HEIGHT };
      layers[crossed].push(bend);
      arc.bends.push(bend);
      links.push([last, bend]);
      last = bend;
    }
    links.push([last, arc.to]);
  }
  return links;
}

const middle = (numbers) => numbers.reduce((sum, number) => sum + number, 0) / numbers.length;

/** Sorts each layer by where the neighbours of its nodes are, forth and back. */
function sortLayers(layers, before, after) {
  const rank = new Map();
  const number = (layer) => layer.forEach((node, index) => rank.set(node, index / Math.max(layer.length - 1, 1)));
  layers.forEach(number);
  for (let sweep = 0; sweep < SWEEPS; ++sweep) {
    const isForth = sweep % 2 === 0;
    const neighbours = isForth ? before : after;
    for (const layer of isForth ? layers : layers.toReversed()) {
      const wanted = new Map(layer.map((node) =>
        [node, neighbours.has(node) ? middle(neighbours.get(node).map((other) => rank.get(other))) : rank.get(node)]));
      layer.sort((one, other) => wanted.get(one) - wanted.get(other));
      number(layer);
    }
  }
}

/** Places that are as near to the wanted ones as can be while each is the one before and its distance at least. */
function spread(wanted, distances) {
  const blocks = [];
  let offset = 0;
  wanted.forEach((place, index) => {
    offset += distances[index];
    blocks.push({ sum: place - offset, count: 1 });
    while (blocks.length > 1 && blocks.at(-2).sum / blocks.at(-2).count > blocks.at(-1).sum / blocks.at(-1).count) {
      const last = blocks.pop();
      blocks.at(-1).sum += last.sum;
      blocks.at(-1).count += last.count;
    }
  });
  const places = blocks.flatMap(({ sum, count }) => Array(count).fill(sum / count));
  offset = 0;
  return places.map((place, index) => place + (offset += distances[index]));
}

function placeRows(layers, before, after, gap) {
  const distancesOf = (layer) => layer.map((node, index) =>
    (index === 0 ? 0 : (node.height + layer[index - 1].height) / 2 + gap));
  for (const layer of layers) {
    let y = 0;
    distancesOf(layer).forEach((distance, index) => { layer[index].y = y += distance; });
    const center = y / 2;
    for (const node of layer) node.y -= center;
  }
  for (let sweep = 0; sweep < SWEEPS; ++sweep) {
    for (const layer of sweep % 2 === 0 ? layers : layers.toReversed()) {
      const wanted = layer.map((node) => {
        const others = [...(before.get(node) ?? []), ...(after.get(node) ?? [])];
        return others.length > 0 ? middle(others.map(({ y }) => y)) : node.y;
      });
      spread(wanted, distancesOf(layer)).forEach((y, index) => { layer[index].y = y; });
    }
  }
}

function placeColumns(layers, gap) {
  let x = 0;
  for (const layer of layers) {
    const width = Math.max(...layer.map((node) => node.width));
    for (const node of layer) node.x = x + width / 2;
    x += width + gap;
  }
}

/** A grid of those that nothing leads to or from, below the rest. */
function placeAlone(nodes, bounds, gap) {
  if (nodes.length === 0) return;
  const width = Math.max(...nodes.map((node) => node.width)) + gap;
  const height = nodes[0].height + gap;
  const columns = Math.max(Math.floor((bounds.right - bounds.left) / width), Math.ceil(Math.sqrt(nodes.length / 3)), 1);
  nodes.forEach((node, index) => {
    node.x = bounds.left + (index % columns) * width + node.width / 2;
    node.y = bounds.bottom + 1.5 * height + Math.floor(index / columns) * height;
  });
}

function boundsOf(nodes) {
  if (nodes.length === 0) return { left: 0, right: 0, top: 0, bottom: 0 };
  return {
    left: Math.min(...nodes.map(({ x, width }) => x - width / 2)),
    right: Math.max(...nodes.map(({ x, width }) => x + width / 2)),
    top: Math.min(...nodes.map(({ y, height }) => y - height / 2)),
    bottom: Math.max(...nodes.map(({ y, height }) => y + height / 2)),
  };
}

/** A line that leaves to the right, passes the bends and arrives from the left, `shift` below the middle. */
function lineThrough({ from, to, bends }, shift) {
  const points = [[from.x + from.width / 2, from.y + shift], ...bends.map(({ x, y }) => [x, y]),
    [to.x - to.width / 2, to.y + shift]];
  return points.slice(1).reduce((line, [x, y], index) => {
    const [fromX, fromY] = points[index];
    const half = (x - fromX) / 2;
    return `${line} C ${fromX + half} ${fromY} ${x - half} ${y} ${x} ${y}`;
  }, `M ${points[0].join(" ")}`);
}

/** Gives each node `x` and `y`, its middle, and each edge `line`, and `isTurned` where that runs from its end to its
 *  beginning. Nodes have a `width` and a `height`; edges lead `from` one node `to` another; `gaps` are those between
 *  columns and rows. Returns the bounds of it all. */
function layOut(nodes, edges, gaps) {
  const linked = new Set(edges.flatMap(({ from, to }) => [from, to]));
  const inLayers = nodes.filter((node) => linked.has(node));
  const arcs = withoutCircles(inLayers, edges);
  const column = columnsOf(inLayers, arcs);
  const layers = [];
  for (const node of inLayers) (layers[column.get(node)] ??= []).push(node);
  const links = bendArcs(arcs, column, layers);
  const before = groupBy(links, ([, to]) => to);
  const after = groupBy(links, ([from]) => from);
  for (const [node, all] of before) before.set(node, all.map(([from]) => from));
  for (const [node, all] of after) after.set(node, all.map(([, to]) => to));
  sortLayers(layers, before, after);
  placeRows(layers, before, after, gaps.row);
  placeColumns(layers, gaps.column);
  placeAlone(nodes.filter((node) => !linked.has(node)), boundsOf(inLayers), gaps.row);
  for (const arc of arcs) {
    arc.edge.isTurned = arc.from !== arc.edge.from;
    arc.edge.line = lineThrough(arc, arc.edge.isTurned ? TURNED_SHIFT : 0);
  }
  return boundsOf([...nodes, ...arcs.flatMap(({ bends }) => bends)]);
}
