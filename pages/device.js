// One device: what a run did, or would do, to each account.

const FACTS = {
  "loaded": "read", "copied-aside": "copied aside", "added": "added", "converted": "converted", "changed": "changed",
  "moved": "moved", "folded": "folded", "lost": "lost", "repeated": "repeated", "kept": "kept as it is",
  "saved": "saved", "save-failed": "not saved", "file-removed": "removed", "source-removed": "removed",
  "file-not-removed": "not removed",
};
const GOING = new Set(["lost", "folded", "save-failed"]);
const SIGNS = { "added": "+", "converted": "+", "changed": "~", "moved": "→", "folded": "⤵", "lost": "×",
  "repeated": "=", "kept": "!" };

const nameOf = (account) => account.name || account.identifier || "(without a name)";
const calledOf = (account) => `${account.type || "no type"} “${nameOf(account)}”`;
const shownValue = (value) => (typeof value === "string" ? `“${value}”` : JSON.stringify(value));

const verdictOf = ({ result }) => (result.success ? result.verdict : "failed");

// The page of one device; `console` is what the run said there, where it is known.
function deviceView(explanation, console = [], level = 2) {
  const verdict = verdictOf(explanation);
  return element("div", {},
    element("p", { class: `verdict mark ${tone(verdict)}` }, sentenceOf(verdict, explanation.rehearsal)),
    explanation.rehearsal ? element("p", { class: "faint" }, "This was a rehearsal: nothing on the device was changed.") : null,
    explanation.complete === false ? element("p", { class: "gone" }, "Memory ran out; something is missing here.") : null,
    countTiles(explanation), lossesOf(explanation, level), pathsOf(explanation, level),
    stagesOf(explanation, level), consoleOf(console, level));
}

function sentenceOf(verdict, isRehearsal) {
  const will = isRehearsal ? "would be" : "were";
  return {
    "kept": "Nothing is lost.", "lost": `Accounts ${will} lost.`, "not saved": `The accounts ${will} not saved.`,
    "failed": "The migration failed.",
  }[verdict] || verdict;
}

function countTiles(explanation) {
  const result = explanation.result;
  const counts = Object.entries(result.counts || {}).filter(([, count]) => count);
  const stored = result.storedVersion;
  return tiles([
    ...(stored === undefined ? [] : [[stored, "stored data version"]]),
    ...(typeof result.accounts === "number" ? [[result.accounts, "accounts afterwards"]] : []),
    ...counts.map(([name, count]) => [count, name, name === "lost" || name === "dropped" ? "lost" : null]),
  ]);
}

const heading = (level, text) => element(`h${level + 1}`, {}, text);

function lossesOf(explanation, level) {
  const lost = explanation.result.lost || [];
  if (!lost.length) return null;
  return element("div", {}, heading(level, "What is lost"), element("ul", { class: "plain" }, lost.map((each) =>
    element("li", {}, element("strong", { class: "gone" }, lostOf(each)), " ", element("code", {}, each.code),
      ` ${each.reason}`, each.detail ? `: ${each.detail}` : "",
      each.where ? [element("br"), "its data are still in ", element("code", {}, each.where)] : ""))));
}

// An account, or a file of them.
const lostOf = (loss) => ("type" in loss ? calledOf(loss) : loss.file || "The settings file");

// Which stage touched which account, as a picture that is also a table.
function pathsOf(explanation, level) {
  const stages = explanation.stages.filter((stage) => stage.facts.some((fact) => fact.account));
  const accounts = new Map();
  for (const stage of stages) {
    for (const fact of stage.facts.filter((each) => each.account)) {
      const key = fact.account.identifier || calledOf(fact.account);
      if (!accounts.has(key)) accounts.set(key, { name: fact.account, touched: new Map() });
      const touched = accounts.get(key).touched;
      touched.set(stage, [...(touched.get(stage) || []), fact.fact]);
    }
  }
  if (!accounts.size) return element("p", {}, "No account was changed.");
  return element("div", {}, heading(level, "Accounts and the steps that touched them"),
    pathTable([...accounts.values()].slice(0, MOST_PATHS), stages),
    accounts.size > MOST_PATHS ? element("p", { class: "faint" }, `and ${number(accounts.size - MOST_PATHS)} more`) : null);
}

const MOST_PATHS = 500;

function pathTable(accounts, stages) {
  return element("div", { class: "scroll" }, element("table", { class: "path" },
    element("caption", {}, "+ came, ~ changed, → moved, ⤵ folded into another, × lost"),
    element("thead", {}, element("tr", {}, element("th", { scope: "col" }, "Account"),
      stages.map((stage) => element("th", { scope: "col" }, titleOf(stage))))),
    element("tbody", {}, accounts.map(({ name, touched }) => element("tr", {},
      element("th", { scope: "row" }, calledOf(name)), stages.map((stage) => pathCell(touched.get(stage))))))));
}

function pathCell(kinds) {
  if (!kinds) return element("td", {}, "");
  const words = kinds.map((kind) => FACTS[kind] || kind).join(", ");
  return element("td", { class: kinds.some((kind) => GOING.has(kind)) ? "gone" : null, title: words },
    element("span", { "aria-hidden": true }, kinds.map((kind) => SIGNS[kind] || "·").join("")),
    element("span", { class: "skip" }, words));
}

const titleOf = (stage) => stage.title || stage.words || stage.stage;

function stagesOf(explanation, level) {
  const stages = explanation.stages.map((stage) => element("details", {},
    element("summary", {}, element("strong", {}, titleOf(stage)),
      titleOf(stage) === stage.stage ? "" : element("span", { class: "faint" }, ` ${stage.stage}`),
      element("span", { class: "faint" }, ` ${counted(stage.facts.length, "fact")}`)),
    element("ul", { class: "plain" }, stage.facts.map(factOf))));
  return element("div", {}, heading(level, "Step by step"), stages);
}

function factOf(fact) {
  return element("li", {},
    element("span", { class: GOING.has(fact.fact) ? "gone" : "faint" }, `${FACTS[fact.fact] || fact.fact} `),
    fact.account ? element("strong", {}, calledOf(fact.account)) : "",
    typeof fact.accounts === "number" ? `${counted(fact.accounts, "account")} of data version ${fact.version}` : "",
    [fact.into || []].flat().map((other) => ` into ${calledOf(other)}`),
    fact.file ? [" ", element("code", {}, fact.file)] : "",
    fact.from ? ` from ${fact.from}` : "",
    fact.reason || fact.cause ? `: ${fact.reason || fact.cause}` : "", fact.detail ? `: ${fact.detail}` : "",
    fact.code ? [" ", element("code", { class: "faint" }, fact.code)] : "",
    fact.changes ? element("ul", { class: "plain" }, fact.changes.map(changeOf)) : "");
}

function changeOf(change) {
  return element("li", {}, element("code", {}, change.key),
    change.renamedFrom ? element("span", { class: "faint" }, ` (was ${change.renamedFrom})`) : "",
    "from" in change ? element("span", { class: "gone" }, ` ${shownValue(change.from)}`) : "",
    " → ", "to" in change ? element("span", { class: "new" }, shownValue(change.to)) : "gone");
}

function consoleOf(lines, level) {
  if (!lines.length) return null;
  return element("div", {}, heading(level, "What it said"),
    element("ul", { class: "plain" }, lines.map((line) => element("li", {}, element("code", {}, line)))));
}
