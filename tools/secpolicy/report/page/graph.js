// The graph of transitions as a drawing: boxes that are links, and arrows.

const MOST_LABELLED = 24;
const MOST_IN_LAYERS = 60;
const FEW = 12;
const LONGEST_SHAPE = 3;
const GAPS = { column: 90, row: 14 };
const WIDE_GAPS = { column: 190, row: 30 }; // with texts on the arrows

function loopAbove({ x, y, height }) {
  const top = y - height / 2;
  return `M ${x + 12} ${top} C ${x + 40} ${top - 34} ${x - 40} ${top - 34} ${x - 12} ${top}`;
}

/** By what an arrow is passed, in a few words. */
function textOf({ from, to, ways }) {
  if (from === to) return "";
  return ways.length > 1 ? `${ways[0]} …` : ways[0];
}

function drawEdge(edge) {
  const isLoop = edge.from === edge.to;
  const head = edge.isTurned && !isLoop ? "marker-start" : "marker-end";
  const d = isLoop ? loopAbove(edge.from) : edge.line;
  edge.path = svg("path", { d, class: "edge", [head]: "url(#arrow)" });
  edge.element = svg("g", { class: "arrow", "aria-hidden": "true" }, edge.path,
    svg("title", {}, [`${edge.from.title} → ${edge.to.title}`, ...edge.ways].join("\n")));
  edge.text = textOf(edge);
  return edge.element;
}

// ---- The texts of arrows, which only lines have places for that are shown

const TEXT_PARTS = [0.5, 0.42, 0.58, 0.34, 0.66, 0.26, 0.74]; // of the way along the arrow, the best first
const TEXT_HEIGHT = 13;
const POINTS = 60;

const pointOn = ({ path }, part) => path.getPointAtLength(path.getTotalLength() * part);
const pointsOf = (edge) => numbersFrom(0, POINTS + 1).map((index) => pointOn(edge, index / POINTS));

/** The place of the text at a part of the way: `x` and `y` are its middle. */
function textBox(edge, part) {
  const { x, y } = pointOn(edge, part);
  return { x, y: edge.isTurned ? y + 9 : y - 9, width: textWidth(edge.text), height: TEXT_HEIGHT };
}

const meet = (one, other) => Math.abs(one.x - other.x) < (one.width + (other.width ?? 0)) / 2
  && Math.abs(one.y - other.y) < (one.height + (other.height ?? 0)) / 2;

/** The texts of arrows, each where it covers least of other arrows. One that would lie on a box or on another text is
 *  left out: who points at the arrow is told it. */
function drawTexts({ nodes, edges }) {
  const points = new Map(edges.map((edge) => [edge, pointsOf(edge)]));
  const taken = [...nodes];
  return edges.filter(({ text }) => text !== "").flatMap((edge) => {
    const others = edges.filter((other) => other !== edge).flatMap((other) => points.get(other));
    const covered = (box) => others.filter((point) => meet(box, point)).length;
    const free = TEXT_PARTS.map((part) => textBox(edge, part))
      .filter((box) => !taken.some((thing) => meet(box, thing)));
    if (free.length === 0) return [];
    const box = free.reduce((best, each) => (covered(each) < covered(best) ? each : best));
    taken.push(box);
    return [svg("text", { x: box.x, y: box.y + 4, class: "way" }, edge.text)];
  });
}

function drawNode(node) {
  const { x, y, width, height } = node;
  node.element = svg("a", { href: node.address, class: `node ${node.look}`, "aria-label": node.about },
    svg("rect", { x: x - width / 2, y: y - height / 2, width, height, rx: 6 }),
    svg("text", { x, y, "aria-hidden": "true" }, node.title),
    svg("title", {}, node.about));
  return node.element;
}

/** Who points at a node sees its arrows: those that come in, and those that go out. Without a node, all are alike. */
function highlight({ nodes, edges }, node) {
  const near = new Set([node]);
  for (const { from, to, element } of edges) {
    const isOfNode = from === node || to === node;
    if (isOfNode) near.add(from).add(to);
    element.classList.toggle("out", from === node);
    element.classList.toggle("in", to === node && from !== node);
    element.classList.toggle("faded", node !== undefined && !isOfNode);
  }
  for (const other of nodes) other.element.classList.toggle("faded", node !== undefined && !near.has(other));
}

const arrowHead = () => svg("defs", {}, svg("marker", {
  id: "arrow", viewBox: "0 0 8 8", refX: 7, refY: 4, markerWidth: 8, markerHeight: 8,
  markerUnits: "userSpaceOnUse", orient: "auto-start-reverse",
}, svg("path", { d: "M 0 0.5 L 8 4 L 0 7.5 Z", class: "head" })));

const button = (text, name, onclick) => h("button", { type: "button", "aria-label": name, title: name, onclick }, text);

/** In layers, unless these would come out as a mass or a long row, of which little can be read. */
function place({ nodes, edges }, gaps) {
  const drawn = edges.filter(({ from, to }) => from !== to);
  if (nodes.length > MOST_IN_LAYERS) return layOutByForces(nodes, drawn);
  const bounds = layOut(nodes, drawn, gaps);
  const isRow = nodes.length > FEW && bounds.right - bounds.left > LONGEST_SHAPE * (bounds.bottom - bounds.top);
  return isRow ? layOutByForces(nodes, drawn) : bounds;
}

function listenToNode(graph, node, view) {
  const listen = (event, action) => node.element.addEventListener(event, action);
  listen("pointerenter", () => highlight(graph, node));
  listen("pointerleave", () => highlight(graph, undefined));
  listen("blur", () => highlight(graph, undefined));
  listen("focus", () => {
    highlight(graph, node);
    view.reveal(node);
  });
}

const tools = (view) => h("div", { class: "tools", role: "toolbar", "aria-label": "View of the graph" },
  button("+", "Zoom in", () => view.zoom(1 / STEP)),
  button("−", "Zoom out", () => view.zoom(STEP)),
  button("All", "Show all of the graph", () => view.fit()));

/** The drawing of a graph, with what moves it. It is laid out now, and shown as a whole once it is in the page. */
function drawGraph(graph, name) {
  const isLabelled = graph.edges.length <= MOST_LABELLED;
  const bounds = place(graph, isLabelled ? WIDE_GAPS : GAPS);
  const texts = svg("g", { "aria-hidden": "true" });
  const drawing = svg("svg", {
    class: "graph", role: "group", tabindex: 0,
    "aria-label": `${name}. Arrow keys move it, plus and minus zoom, zero shows all.`,
  }, arrowHead(), svg("g", {}, graph.edges.map(drawEdge)), texts, svg("g", {}, graph.nodes.map(drawNode)));
  drawing.style.height = `min(70vh, 46rem, ${heightFor(bounds)}px)`;
  const view = new View(drawing, bounds);
  for (const node of graph.nodes) listenToNode(graph, node, view);
  listenTo(drawing, view);
  whenShown(() => {
    view.fit();
    if (isLabelled) texts.append(...drawTexts(graph));
  });
  return h("div", { class: "drawing" }, drawing, tools(view));
}
