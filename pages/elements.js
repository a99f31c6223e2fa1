// Elements of the page. Whatever comes from the document is put in as text, never as markup.

const SVG = "http://www.w3.org/2000/svg";
const VERDICTS = {
  "kept": "nothing lost", "lost": "accounts lost", "not saved": "not saved", "failed": "failed",
  "refused": "refused", "unrehearsed": "not rehearsed",
};

// An element with attributes and children: texts, elements, or nothing. A function is a listener.
function element(tag, attributes = {}, ...children) {
  return fill(document.createElement(tag), attributes, children);
}

function drawn(tag, attributes = {}, ...children) {
  return fill(document.createElementNS(SVG, tag), attributes, children);
}

function fill(made, attributes, children) {
  for (const [name, value] of Object.entries(attributes)) {
    if (typeof value === "function") made.addEventListener(name, value);
    else if (value !== null && value !== undefined && value !== false) made.setAttribute(name, value === true ? "" : value);
  }
  made.append(...children.flat(Infinity).filter((child) => child !== null && child !== undefined && child !== ""));
  return made;
}

const number = (value) => (value === null || value === undefined ? "–" : value.toLocaleString("en"));
const counted = (count, one, many = one + "s") => `${number(count)} ${count === 1 ? one : many}`;

function duration(seconds) {
  if (seconds === null || seconds === undefined) return "–";
  return seconds < 1 ? `${Math.round(seconds * 1000)} ms` : `${seconds.toFixed(seconds < 10 ? 1 : 0)} s`;
}

function size(bytes) {
  if (!bytes) return "–";
  const units = ["B", "KiB", "MiB", "GiB"];
  const step = Math.min(units.length - 1, Math.floor(Math.log2(bytes) / 10));
  return `${(bytes / 1024 ** step).toFixed(step && bytes / 1024 ** step < 10 ? 1 : 0)} ${units[step]}`;
}

const tone = (verdict) => `tone-${verdict.replace(" ", "-")}`;
const mark = (verdict) => element("span", { class: `mark ${tone(verdict)}` }, VERDICTS[verdict] || verdict);
const isNumeric = (cell) => typeof cell === "string" && /^[–\d]/.test(cell) && !/[a-z]{4}/i.test(cell);

// A table; what looks like a number stands to the right. The first cell of a row is its head.
function table(caption, heads, rows) {
  const cellsOf = (row) => row.map((cell, index) => element(
    index ? "td" : "th", { scope: index ? null : "row", class: isNumeric(cell) ? "number" : null }, cell));
  const numeric = (index) => index && rows.length && isNumeric(rows[0][index]);
  return element("div", { class: "scroll" }, element("table", {},
    element("caption", {}, caption),
    element("thead", {}, element("tr", {}, heads.map((head, index) =>
      element("th", { scope: "col", class: numeric(index) ? "number" : null }, head)))),
    element("tbody", {}, rows.map((row) => element("tr", {}, cellsOf(row))))));
}

const section = (id, title, ...children) => element("section", { "aria-labelledby": id },
  element("h2", { id }, title), ...children);

const tiles = (each) => element("ul", { class: "tiles" }, each.map(([count, words, colour]) =>
  element("li", { class: colour || null }, element("strong", {}, number(count)), words)));
