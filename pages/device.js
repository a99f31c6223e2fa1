// One device: what a run did, or would do, to each account.

const FACTS = {
  "loaded": "read", "copied-aside": "copied aside", "added": "added", "converted": "converted", "changed": "changed",
  "moved": "moved", "folded": "folded", "lost": "lost", "repeated": "repeated", "kept": "kept as it is",
  "saved": "saved", "save-failed": "not saved", "file-removed": "removed", "source-removed": "removed",
  "file-not-removed": "not removed",
};
const GOING = new Set(["lost", "folded", "save-failed"]);
const nameOf = (account) => account.name || account.identifier || "(without a name)";
const calledOf = (account) => `${account.type || "account"} “${nameOf(account)}”`;
const DATA_CLASS = "com.vorlix.Dataclass.";
const shortOf = (text) => (text.startsWith(DATA_CLASS) ? text.slice(DATA_CLASS.length) : text);

// A value beside its other self: of a list of names, what the other one has as well is faint.
function shownValue(value, other) {
  if (value === undefined) return element("span", { class: "faint" }, "nothing");
  if (value === "<hidden>") return element("span", { class: "hidden" }, "hidden");
  if (typeof value === "string") return `“${value}”`;
  if (!Array.isArray(value) || !value.every((each) => typeof each === "string")) return JSON.stringify(value);
  const isShared = (each) => Array.isArray(other) && other.includes(each);
  return value.length ? value.map((each) => element("span", { class: `chip${isShared(each) ? " faint" : ""}`, title: each }, shortOf(each)))
    : "an empty list";
}

const verdictOf = ({ result }) => (result.success ? result.verdict : "failed");

// The page of one device; `console` is what the run said there, where it is known.
function deviceView(explanation, console = [], level = 2) {
  const verdict = verdictOf(explanation);
  return element("div", {},
    element("p", { class: `verdict mark ${tone(verdict)}` }, sentenceOf(verdict, explanation)),
    aboutRun(explanation),
    explanation.rehearsal ? element("p", {}, "This was a rehearsal: nothing on the device was changed.") : null,
    explanation.result.cause ? element("p", { class: "gone" }, sentence(explanation.result.cause)) : null,
    explanation.complete === false ? element("p", { class: "gone" }, "Memory ran out; something is missing here.") : null,
    countTiles(explanation), lossesOf(explanation, level), new AccountList(explanation, level).section(),
    stagesOf(explanation, level), consoleOf(console, level));
}

function sentenceOf(verdict, { rehearsal, result }) {
  const lost = (result.lost || []).length;
  const will = rehearsal ? "would be" : lost === 1 ? "was" : "were";
  return {
    "kept": rehearsal ? "Nothing would be lost." : "Nothing was lost.", "lost": `${counted(lost, "account")} ${will} lost.`,
    "not saved": `The accounts ${rehearsal ? "would not be" : "were not"} saved.`,
    "failed": rehearsal ? "The migration would fail." : "The migration failed.",
  }[verdict] || verdict;
}

// What was run, where and when, as far as the explanation says so.
function aboutRun({ host, root, time, result }) {
  const { storedVersion, version } = result;
  const versions = version === undefined ? "" : storedVersion === undefined || storedVersion === version
    ? `data version ${version}` : `data version ${storedVersion} → ${version}`;
  const told = [root, versions, time ? time.replace("T", " ").replace("Z", " UTC") : "", host ? `migration-host ${host}` : ""];
  return element("p", { class: "faint about" }, told.filter(Boolean).map((each) => element("span", {}, each)));
}

// What was dropped is counted among the losses.
function countTiles({ result }) {
  const { dropped: _, ...counts } = result.counts || {};
  return tiles([
    ...(typeof result.accounts === "number" ? [[result.accounts, "accounts afterwards"]] : []),
    ...Object.entries(counts).filter(([, count]) => count).map(([name, count]) => [count, name, `is-${name}`]),
  ]);
}

const heading = (level, text) => element(`h${level + 1}`, {}, text);

const titleOf = (stage) => stage.title || stage.words || stage.stage;

function stagesOf(explanation, level) {
  const stages = explanation.stages.map((stage) => element("details", {},
    element("summary", {}, element("strong", {}, titleOf(stage)),
      titleOf(stage) === stage.stage ? "" : element("span", { class: "faint" }, ` ${stage.stage}`),
      element("span", { class: "faint" }, ` ${counted(stage.facts.length, "fact")}`)),
    element("ul", { class: "plain" }, stage.facts.map((fact) => factOf(fact)))));
  return element("div", {}, heading(level, "Step by step"), stages);
}

// `isNamed`: whether the account is said, which it need not be among its own.
function factOf(fact, isNamed = true) {
  const isPlain = fact.fact === "changed" && !isNamed;
  return element("li", {},
    isPlain ? "" : element("span", { class: GOING.has(fact.fact) ? "gone" : "faint" }, FACTS[fact.fact] || fact.fact),
    fact.account && isNamed ? [" ", element("strong", {}, calledOf(fact.account))] : "",
    typeof fact.accounts === "number" ? ` ${counted(fact.accounts, "account")} of data version ${fact.version}` : "",
    [fact.into || []].flat().map((other) => ` into ${calledOf(other)}`),
    fact.file ? [" ", element("code", {}, fact.file)] : "",
    fact.from ? ` from ${fact.from}` : "",
    fact.reason || fact.cause ? `: ${fact.reason || fact.cause}` : "", fact.detail ? `: ${fact.detail}` : "",
    fact.code ? [" ", element("code", { class: "faint" }, fact.code)] : "",
    fact.changes ? element("ul", { class: "plain" }, fact.changes.map(changeOf)) : "");
}

function changeOf({ key, renamedFrom, from, to }) {
  return element("li", { class: "change" }, element("code", {}, key),
    renamedFrom ? element("span", { class: "faint" }, ` (was ${renamedFrom})`) : "", " ",
    element("span", { class: "gone" }, shownValue(from, to)), " → ", element("span", { class: "new" }, shownValue(to, from)));
}

function consoleOf(lines, level) {
  if (!lines.length) return null;
  return element("div", {}, heading(level, "What it said"),
    element("ul", { class: "plain" }, lines.map((line) => element("li", {}, element("code", {}, line)))));
}
