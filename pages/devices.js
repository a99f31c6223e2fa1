// The table of a fleet's devices: filtered, sorted, a page of it at a time, however many there are.

const PAGE = 100;
const COLUMNS = [
  ["name", "Device", (value) => value], ["verdict", "Verdict", (value) => mark(value)],
  ["version", "Version", (value) => number(value)], ["accounts", "Accounts", (value) => number(value)],
  ["changed", "Changed", (value) => number(value)], ["lost", "Lost", (value) => number(value)],
  ["seconds", "Time", duration], ["memory", "Memory", size],
];

class DeviceTable {
  constructor(fleet, openDevice) {
    this.fleet = fleet;
    this.openDevice = openDevice;
    this.columns = fleet.devices;
    this.all = this.columns.name.map((_, index) => index);
    this.searched = this.all.map((index) => this._searchedText(index));
    this.order = { column: null, isDescending: false };
    this.page = 0;
  }

  _searchedText(index) {
    const { name, verdict, version, codes } = this.columns;
    return `${name[index]} ${verdict[index]} version ${version[index]} ${codes[index].map((code) => this.fleet.codes[code]).join(" ")}`
      .toLowerCase();
  }

  section() {
    const more = this.fleet.images - this.all.length;
    const made = section("devices", "Devices",
      more > 0 ? element("p", {}, `${number(this.all.length)} of ${number(this.fleet.images)}: all that lose something and that `
        + "could not be rehearsed as far as there is room, first some for each reason; the slowest and the strangest; and "
        + "others by chance.") : null,
      this._filters(), element("p", { "aria-live": "polite", class: "faint" }),
      element("div", { class: "scroll" }, element("table", {}, element("caption", {}, "Devices; a name opens what the run would do"),
        element("thead", {}), element("tbody", {}))),
      element("div", { class: "filters" }, this._turner("Previous", -1), this._turner("Next", 1)));
    [this.status, this.head, this.body] = ["[aria-live]", "thead", "tbody"].map((each) => made.querySelector(each));
    this.turners = made.querySelectorAll(".filters .button");
    this.node = made;
    this.show();
    return made;
  }

  _filters() {
    const option = (value, words) => element("option", { value }, words);
    const change = () => { this.page = 0; this.show(); };
    this.search = element("input", { type: "search", input: change, placeholder: "name, reason, version" });
    this.verdict = element("select", { change }, option("", "any"), Object.entries(VERDICTS)
      .filter(([verdict]) => this.fleet.verdicts[verdict]).map(([verdict, words]) => option(verdict, words)));
    this.code = element("select", { change }, option("", "any"), this.fleet.codes.map((code, index) => option(index, code)));
    return element("div", { class: "filters", role: "search" }, element("label", {}, "Search", this.search),
      element("label", {}, "Verdict", this.verdict), element("label", {}, "Reason", this.code));
  }

  _turner(words, by) {
    return element("button", { type: "button", class: "button", click: () => { this.page += by; this.show(); } }, words);
  }

  // A button that shows only the devices behind a reason or a cause; nothing where none of them is in the table.
  buttonFor(words, code) {
    return this.fleet.codes.includes(code) ? element("button", { type: "button", class: "link",
      click: () => this._showCode(code), "aria-label": `${words}: ${code}` }, words) : "";
  }

  _showCode(code) {
    this.search.value = this.verdict.value = "";
    this.code.value = this.fleet.codes.indexOf(code);
    this.page = 0;
    this.show();
    this.node.scrollIntoView();
    this.code.focus();
  }

  matching() {
    const words = this.search.value.toLowerCase().split(/\s+/).filter(Boolean);
    const code = this.code.value === "" ? null : Number(this.code.value);
    return this.all.filter((index) => (!this.verdict.value || this.columns.verdict[index] === this.verdict.value)
      && (code === null || this.columns.codes[index].includes(code))
      && words.every((word) => this.searched[index].includes(word)));
  }

  sorted(found) {
    const { column, isDescending } = this.order;
    if (!column) return found;
    const values = this.columns[column];
    const direction = isDescending ? -1 : 1;
    const compare = (one, other) => (one === other ? 0 : one === null ? 1 : other === null ? -1
      : direction * (typeof one === "string" ? one.localeCompare(other) : one - other));
    return [...found].sort((one, other) => compare(values[one], values[other]) || one - other);
  }

  show() {
    const found = this.sorted(this.matching());
    const pages = Math.max(1, Math.ceil(found.length / PAGE));
    this.page = Math.min(Math.max(this.page, 0), pages - 1);
    this.status.textContent = `${counted(found.length, "device")}, page ${this.page + 1} of ${number(pages)}`;
    this.turners[0].disabled = this.page === 0;
    this.turners[1].disabled = this.page === pages - 1;
    this.head.replaceChildren(this._heads());
    this.body.replaceChildren(...found.slice(this.page * PAGE, (this.page + 1) * PAGE).map((index) => this._row(index)));
  }

  _heads() {
    const { column, isDescending } = this.order;
    return element("tr", {}, COLUMNS.map(([key, title], place) => element("th",
      { scope: "col", class: place > 1 ? "number" : null, "aria-sort": key === column ? (isDescending ? "descending" : "ascending") : null },
      element("button", { type: "button", click: () => this._sortBy(key) }, title))));
  }

  _sortBy(key) {
    const isSame = this.order.column === key;
    this.order = { column: key, isDescending: isSame ? !this.order.isDescending : this.columns[key].some((value) => typeof value === "number") };
    this.page = 0;
    this.show();
    this.head.querySelectorAll("button")[COLUMNS.findIndex(([each]) => each === key)].focus();
  }

  _row(index) {
    const cell = ([key, , shown], place) => (place
      ? element("td", { class: place > 1 ? "number" : null }, shown(this.columns[key][index]))
      : element("th", { scope: "row" }, deviceButton(this.fleet, index, this.openDevice)));
    return element("tr", {}, COLUMNS.map(cell));
  }
}
