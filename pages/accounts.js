// The list of one device's accounts: filtered, each with what it was, its way through the steps, and what it is.

class AccountList {
  constructor(explanation, level) {
    const { journeys, stations } = journeysOf(explanation);
    this.stations = stations;
    this.level = level;
    this.rows = journeys.map((journey) => ({ journey, text: journey.searchedText(), node: this._row(journey) }));
    this.isWhole = Boolean(explanation.accounts) || !(explanation.result.counts || {}).kept;
    this.untold = (explanation.result.counts || {}).kept || 0;
  }

  section() {
    if (!this.rows.length) return element("p", {}, "No account was changed.");
    const made = element("div", { class: "accounts" }, heading(this.level, "Accounts"),
      this._filters(), element("p", { "aria-live": "polite", class: "faint" }),
      this.stations.length ? element("div", { class: "heads" }, legend(this.rows.map(({ journey }) => journey)), stationHeads(this.stations)) : null,
      element("ul", { class: "list", role: "list" }, this.rows.map(({ node }) => node)),
      this.isWhole ? null : element("p", { class: "faint" }, `${counted(this.untold, "account")} stayed as before.`));
    made.style.setProperty("--track", `${trackWidth(this.stations)}px`);
    this.status = made.querySelector("[aria-live]");
    this.show();
    return made;
  }

  _filters() {
    const change = () => this.show();
    const present = BY_WEIGHT.filter((outcome) => this.rows.some(({ journey }) => journey.outcome === outcome));
    const count = (outcome) => this.rows.filter(({ journey }) => journey.outcome === outcome).length;
    this.search = element("input", { type: "search", input: change, placeholder: "name, type, key, reason" });
    this.outcome = element("select", { change }, element("option", { value: "" }, "everything"),
      present.map((outcome) => element("option", { value: outcome }, `${OUTCOMES[outcome]} (${number(count(outcome))})`)));
    return element("div", { class: "filters", role: "search" }, element("label", {}, "Search", this.search),
      element("label", {}, "What happened", this.outcome));
  }

  show() {
    const words = this.search.value.toLowerCase().split(/\s+/).filter(Boolean);
    let shown = 0;
    for (const { journey, text, node } of this.rows) {
      node.hidden = Boolean(this.outcome.value && journey.outcome !== this.outcome.value)
        || !words.every((word) => text.includes(word));
      shown += node.hidden ? 0 : 1;
    }
    const all = this.rows.length;
    this.status.textContent = shown === all ? counted(all, "account") : `${number(shown)} of ${counted(all, "account")}`;
  }

  _row(journey) {
    const { account, outcome, stops } = journey;
    const told = [
      element("strong", { class: "who" }, nameOf(account)),
      element("span", { class: "before" }, beforeOf(journey)),
      track(journey, this.stations),
      element("span", { class: `after is-${outcome}` }, afterOf(journey), element("span", { class: "outcome" }, OUTCOMES[outcome]))];
    return element("li", {}, stops.length
      ? element("details", {}, element("summary", {}, told), stopsOf(journey))
      : element("div", { class: "summary" }, told));
  }
}

const typeOf = (type) => type || "no type";

function beforeOf({ before, isNew }) {
  if (isNew && !before) return element("span", { class: "skip" }, "was not there");
  return [typeOf(before), element("span", { class: "skip" }, " before,")];
}

function afterOf({ account, outcome, into, isEnded }) {
  if (outcome === "folded") return `in ${into.map(calledOf).join(" and ")}`;
  if (isEnded) return element("span", { class: "skip" }, "gone, ");
  return [typeOf(account.type), outcome === "moved" && into.length ? ` in ${into.map(calledOf)}` : ""];
}

function stopsOf(journey) {
  const { identifier } = journey.account;
  return element("div", { class: "stops" },
    identifier ? element("p", { class: "faint" }, "Identifier ", element("code", {}, identifier)) : null,
    element("ol", {}, journey.stops.map(({ station, facts }) => element("li", {}, element("strong", {}, station.title),
      element("ul", { class: "plain" }, facts.map((fact) => factOf(fact, false)))))));
}
