// What of a drawing is shown, and how mouse, finger and keys change that.

const MARGIN = 24;
const GREATEST_SCALE = 1.15; // of what is shown as a whole
const STEP = 1.25;
const LEAST_HEIGHT = 240;

/** How high a window is that shows as much, but not lower than it can be used. */
const heightFor = ({ top, bottom }) => Math.max((bottom - top + 2 * MARGIN) * GREATEST_SCALE, LEAST_HEIGHT);

/** The part of the drawing's plane that is shown. */
class View {
  constructor(drawing, bounds) {
    this.drawing = drawing;
    this.bounds = bounds;
  }

  show(x, y, width, height) {
    Object.assign(this, { x, y, width, height });
    this.drawing.setAttribute("viewBox", `${x} ${y} ${width} ${height}`);
  }

  /** All of it, in the shape of the window, and not greater than it is. */
  fit() {
    const window = this.drawing.getBoundingClientRect();
    const { left, right, top, bottom } = this.bounds;
    const scale = Math.min(GREATEST_SCALE, window.width / (right - left + 2 * MARGIN),
      window.height / (bottom - top + 2 * MARGIN));
    const [width, height] = [window.width / scale, window.height / scale];
    this.show((left + right - width) / 2, (top + bottom - height) / 2, width, height);
  }

  /** `factor` times as much; what is at the point, given in parts of the window, stays there. */
  zoom(factor, atX = 0.5, atY = 0.5) {
    const [width, height] = [this.width * factor, this.height * factor];
    this.show(this.x + (this.width - width) * atX, this.y + (this.height - height) * atY, width, height);
  }

  /** By parts of the window. */
  move(byX, byY) {
    this.show(this.x + this.width * byX, this.y + this.height * byY, this.width, this.height);
  }

  reveal({ x, y }) {
    const isSeen = x > this.x && x < this.x + this.width && y > this.y && y < this.y + this.height;
    if (!isSeen) this.show(x - this.width / 2, y - this.height / 2, this.width, this.height);
  }
}

const KEYS = {
  "+": (view) => view.zoom(1 / STEP),
  "=": (view) => view.zoom(1 / STEP),
  "-": (view) => view.zoom(STEP),
  0: (view) => view.fit(),
  ArrowLeft: (view) => view.move(-0.1, 0),
  ArrowRight: (view) => view.move(0.1, 0),
  ArrowUp: (view) => view.move(0, -0.1),
  ArrowDown: (view) => view.move(0, 0.1),
};

function listenTo(drawing, view) {
  drawing.addEventListener("keydown", (event) => {
    if (!KEYS[event.key] || event.ctrlKey || event.metaKey || event.altKey) return;
    KEYS[event.key](view);
    event.preventDefault();
  });
  drawing.addEventListener("wheel", (event) => {
    const window = drawing.getBoundingClientRect();
    view.zoom(event.deltaY > 0 ? STEP : 1 / STEP,
      (event.clientX - window.left) / window.width, (event.clientY - window.top) / window.height);
    event.preventDefault();
  }, { passive: false });
  listenToDrags(drawing, view);
}

const DRAG_BEGINS = 4;

/** A press that moves drags the view; one that does not follows the link that it is on. */
function listenToDrags(drawing, view) {
  let from;
  let isDrag = false;
  drawing.addEventListener("pointerdown", (event) => {
    if (event.button !== 0) return;
    from = { x: event.clientX, y: event.clientY };
    isDrag = false;
  });
  drawing.addEventListener("pointermove", (event) => {
    if (!from) return;
    const [x, y] = [event.clientX - from.x, event.clientY - from.y];
    if (!isDrag && Math.hypot(x, y) < DRAG_BEGINS) return;
    if (!isDrag) drawing.setPointerCapture(event.pointerId);
    isDrag = true;
    const window = drawing.getBoundingClientRect();
    view.move(-x / window.width, -y / window.height);
    from = { x: event.clientX, y: event.clientY };
  });
  for (const end of ["pointerup", "pointercancel"]) drawing.addEventListener(end, () => { from = undefined; });
  drawing.addEventListener("click", (event) => isDrag && event.preventDefault(), { capture: true });
  drawing.addEventListener("dragstart", (event) => event.preventDefault());
}
