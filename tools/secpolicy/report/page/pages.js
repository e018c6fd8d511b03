// What pages are made of.

/** A page with its heading. */
const page = (heading, ...content) => h("article", {}, h("h1", { tabindex: -1 }, heading), content);

const nothingPage = (what) => page("Not in this policy", note(`There is no ${what}.`));

const fileLine = ({ file, line }) => h("span", { class: "place" }, breakable(`${file}:${line}`));

const nobody = () => h("span", { class: "quiet" }, "–");

function nameList(items, link) {
  const list = h("ul", { class: "names" });
  const more = grow(list, items, (item) => h("li", {}, link(item)));
  return [list, more];
}
