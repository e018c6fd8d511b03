// A layout for many nodes: those that have to do with each other come to lie near each other.

const LENGTH = 64;
const STRETCH = 2.4; // boxes are wider than high
const MOST_STEPS = 300;
const MOST_PAIRS = 1.5e7; // that are looked at, in all steps together
const GRAVITY = 0.4; // to the middle
const BOX_GAP = 16;
const GOLDEN_ANGLE = Math.PI * (3 - Math.sqrt(5));

function pushApart(nodes) {
  nodes.forEach((one, index) => {
    for (const other of nodes.slice(index + 1)) {
      const [x, y] = [one.x - other.x, one.y - other.y];
      const distance = Math.max(Math.hypot(x, y), 1);
      const force = LENGTH * LENGTH / (distance * distance);
      one.byX += x * force;
      one.byY += y * force;
      other.byX -= x * force;
      other.byY -= y * force;
    }
  });
}

function pullTogether(edges) {
  for (const { from, to } of edges) {
    const [x, y] = [to.x - from.x, to.y - from.y];
    const force = Math.hypot(x, y) / LENGTH;
    from.byX += x * force;
    from.byY += y * force;
    to.byX -= x * force;
    to.byY -= y * force;
  }
}

/** Moves each node as the forces want it, but not farther than `most`. */
function moveNodes(nodes, most) {
  for (const node of nodes) {
    node.byX -= node.x * GRAVITY;
    node.byY -= node.y * GRAVITY;
    const length = Math.max(Math.hypot(node.byX, node.byY), 1);
    node.x += node.byX / length * Math.min(length, most);
    node.y += node.byY / length * Math.min(length, most);
  }
}

/** How far two boxes are one upon the other, by the shorter way out. */
function overlap(one, other) {
  const x = (one.width + other.width) / 2 + BOX_GAP - Math.abs(one.x - other.x);
  const y = (one.height + other.height) / 2 + BOX_GAP - Math.abs(one.y - other.y);
  return x > 0 && y > 0 ? { x, y } : undefined;
}

/** Returns whether any two boxes had to be moved. */
function separateBoxes(nodes) {
  let isMoved = false;
  nodes.forEach((one, index) => {
    for (const other of nodes.slice(index + 1)) {
      const by = overlap(one, other);
      if (!by) continue;
      isMoved = true;
      const axis = by.x < by.y ? "x" : "y";
      const half = (one[axis] < other[axis] ? -1 : 1) * by[axis] / 2;
      one[axis] += half;
      other[axis] -= half;
    }
  });
  return isMoved;
}

/** Where the line to `other` leaves the box. */
function borderOf(node, other) {
  const [x, y] = [other.x - node.x, other.y - node.y];
  const part = Math.min(node.width / 2 / Math.abs(x || 1e-9), node.height / 2 / Math.abs(y || 1e-9));
  return [node.x + x * part, node.y + y * part];
}

/** As layOut() does, with straight lines. */
function layOutByForces(all, edges) {
  const linked = new Set(edges.flatMap(({ from, to }) => [from, to]));
  const nodes = all.filter((node) => linked.has(node));
  nodes.forEach((node, index) => {
    node.x = LENGTH * Math.sqrt(index) * Math.cos(index * GOLDEN_ANGLE);
    node.y = LENGTH * Math.sqrt(index) * Math.sin(index * GOLDEN_ANGLE);
  });
  const steps = Math.max(Math.min(MOST_STEPS, MOST_PAIRS / (nodes.length * nodes.length)), 10);
  for (let step = 0; step < steps; ++step) {
    for (const node of nodes) [node.byX, node.byY] = [0, 0];
    pushApart(nodes);
    pullTogether(edges);
    moveNodes(nodes, 2 * LENGTH * (1 - step / steps));
  }
  for (const node of nodes) node.x *= STRETCH;
  for (let step = 0; separateBoxes(nodes) && step < steps; ++step);
  for (const edge of edges) {
    edge.isTurned = false;
    edge.line = `M ${borderOf(edge.from, edge.to).join(" ")} L ${borderOf(edge.to, edge.from).join(" ")}`;
  }
  placeAlone(all.filter((node) => !linked.has(node)), boundsOf(nodes), BOX_GAP);
  return boundsOf(all);
}
