// The way of one account through the steps, as a picture.

const SIGNS = { "added": "+", "converted": "+", "changed": "~", "moved": "→", "folded": "⤵", "lost": "×",
  "repeated": "=", "kept": "!" };
const SPACING = 30;
const HEIGHT = 26;
const placeOf = (station) => SPACING * (station.place + 1);
const trackWidth = (stations) => SPACING * (stations.length + 1);

function track(journey, stations) {
  const first = journey.stops.length && journey.isNew ? placeOf(journey.stops[0].station) : 4;
  const last = journey.stops.length && journey.isEnded ? placeOf(journey.stops.at(-1).station) : trackWidth(stations) - 4;
  const words = journey.stops.map(({ station, facts }) => `${station.label}: ${factWords(facts)}`).join("; ");
  return drawn("svg", { class: "track", role: "img", "aria-label": words || "no step touched it", width: trackWidth(stations),
    height: HEIGHT, viewBox: `0 0 ${trackWidth(stations)} ${HEIGHT}` },
  drawn("line", { class: "rail", x1: first, x2: last, y1: HEIGHT / 2, y2: HEIGHT / 2 }),
  journey.isEnded ? null : drawn("path", { class: "arrow", d: `M${last - 5} ${HEIGHT / 2 - 5}l5 5-5 5` }),
  journey.stops.map(stopMark));
}

const factWords = (facts) => [...new Set(facts.map(({ fact }) => FACTS[fact] || fact))].join(", ");

// What weighs most stands in the picture, everything in its title.
function stopMark({ station, facts }) {
  const weightiest = [...facts].sort((one, other) => weightOf(one) - weightOf(other))[0];
  return drawn("g", { class: `stop is-${weightiest.fact}`, transform: `translate(${placeOf(station)} ${HEIGHT / 2})` },
    drawn("title", {}, `${station.title}: ${factWords(facts)}`), drawn("circle", { r: 9 }),
    drawn("text", { y: 4, "text-anchor": "middle" }, SIGNS[weightiest.fact] || "·"));
}

const weightOf = ({ fact }) => BY_WEIGHT.indexOf(OUTCOME_OF[fact] || "kept");

// The names of the stations, above the tracks; the tracks say them, too.
function stationHeads(stations) {
  const width = trackWidth(stations) + 60;
  return drawn("svg", { class: "stations", "aria-hidden": true, width, height: 84, viewBox: `0 0 ${width} 84` },
    stations.map((station) => drawn("text", { transform: `translate(${placeOf(station) + 2} 80) rotate(-48)` }, station.label)));
}

const MEANINGS = { "added": "came", "changed": "changed", "moved": "moved", "folded": "folded into another", "lost": "lost",
  "repeated": "stands there once more", "kept": "could not be repaired" };

// What the signs in these journeys mean.
function legend(journeys) {
  const told = new Set(journeys.flatMap(({ stops }) => stops.flatMap(({ facts }) => facts.map(({ fact }) => fact))));
  if (told.has("converted")) told.add("added");
  const used = Object.entries(MEANINGS).filter(([fact]) => told.has(fact));
  return element("ul", { class: "legend", "aria-hidden": true }, used.map(([fact, words]) => element("li", {},
    drawn("svg", { width: 20, height: 20, viewBox: "-10 -10 20 20" }, drawn("g", { class: `stop is-${fact}` },
      drawn("circle", { r: 9 }), drawn("text", { y: 4, "text-anchor": "middle" }, SIGNS[fact]))), words)));
}
