// The accounts of one device, each followed through the run by the identifiers that it had.

const OUTCOMES = {
  "lost": "lost", "folded": "folded into another", "kept-as-is": "could not be repaired", "moved": "moved",
  "converted": "converted", "added": "new", "changed": "changed", "kept": "as before",
};
const OUTCOME_OF = { "lost": "lost", "folded": "folded", "kept": "kept-as-is", "moved": "moved", "converted": "converted",
  "added": "added", "changed": "changed" };
const BY_WEIGHT = Object.keys(OUTCOMES);

class Journey {
  constructor(account) {
    this.account = account;  // as it is called in the end
    this.stops = [];         // each a station and what happened there
    this.outcome = "kept";
    this.before = account.type;
    this.into = [];
  }

  // Takes up a fact; the outcome is the weightiest thing that happened.
  stop(station, fact) {
    const last = this.stops.at(-1);
    if (!last) this.before = typeBefore(fact);
    if (last && last.station === station) last.facts.push(fact);
    else this.stops.push({ station, facts: [fact] });
    this.account = fact.account;
    if (fact.into) this.into = fact.into;
    this.weigh(OUTCOME_OF[fact.fact] || "kept");
  }

  weigh(outcome) {
    if (BY_WEIGHT.indexOf(outcome) < BY_WEIGHT.indexOf(this.outcome)) this.outcome = outcome;
  }

  get isEnded() { return this.outcome === "lost" || this.outcome === "folded"; }
  // It was not there when the run began.
  get isNew() { return this.stops.length > 0 && ["added", "converted"].includes(this.stops[0].facts[0].fact); }

  searchedText() {
    const told = this.stops.flatMap(({ facts }) => facts.map((fact) => [FACTS[fact.fact], fact.code, fact.reason, fact.detail,
      (fact.changes || []).map(({ key }) => key)]));
    return [calledOf(this.account), this.account.identifier, this.before, OUTCOMES[this.outcome], told]
      .flat(Infinity).filter(Boolean).join(" ").toLowerCase();
  }
}

function typeBefore(fact) {
  if (fact.fact === "added") return "";
  if (fact.fact === "converted" && !fact.replaces) return fact.from;
  const change = (fact.changes || []).find(({ key }) => key === "Type");
  return change && typeof change.from === "string" ? change.from : fact.account.type;
}

// The journeys of an explanation, the weightiest outcome first, and the stations that any of them stops at.
function journeysOf(explanation) {
  const present = new Map();
  const journeys = [];
  const stations = new Map();
  const lost = new Set((explanation.result.lost || []).map(keyOfLoss));
  const of = (account) => {
    const key = account.identifier || calledOf(account);
    if (!present.has(key)) {
      present.set(key, new Journey(account));
      journeys.push(present.get(key));
    }
    return present.get(key);
  };
  for (const [stage, fact] of factsAboutAccounts(explanation)) {
    const former = (fact.changes || []).find(({ key, from }) => key === "Identifier" && typeof from === "string");
    if (former && present.has(former.from)) present.set(fact.account.identifier, present.get(former.from));
    const journey = of(fact.account);
    journey.stop(stationFor(stage, stations), fact);
    if (journey.isEnded) present.delete(fact.account.identifier || calledOf(fact.account));
    // Where the save failed, what was left out still stands in the file.
    if (fact.fact === "lost" && !lost.has(keyOfLoss({ ...fact, ...fact.account }))) journey.outcome = "kept-as-is";
  }
  for (const account of explanation.accounts || []) of(account).account = account;
  for (const loss of explanation.result.lost || []) if (present.has(loss.identifier)) present.get(loss.identifier).weigh("lost");
  return { journeys: journeys.sort((one, other) => BY_WEIGHT.indexOf(one.outcome) - BY_WEIGHT.indexOf(other.outcome)),
    stations: [...stations.values()] };
}

const keyOfLoss = ({ code, type, name, identifier }) => [code, type, name, identifier].join("\n");

function* factsAboutAccounts(explanation) {
  for (const stage of explanation.stages) for (const fact of stage.facts) if (fact.account) yield [stage, fact];
}

// A save within a step is a part of that step.
function stationFor(stage, stations) {
  const key = stage.stage === "save" && stage.within ? stage.within : stage.stage;
  if (!stations.has(key)) stations.set(key, { place: stations.size, label: labelOf(stage), title: titleOf(stage) });
  return stations.get(key);
}

function labelOf(stage) {
  const [, version] = /^version \d+ to (\d+):/.exec(stage.words || "") || [];
  return version ? `version ${version}` : stage.stage === "save" && stage.within ? stage.within : stage.stage;
}
