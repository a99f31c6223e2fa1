// A fleet: what a release would do to many devices.

const CAUSES = {};  // filled from the document: why images could not be rehearsed, by code

function fleetView(fleet, openDevice) {
  Object.assign(CAUSES, fleet.causes);
  const devices = new DeviceTable(fleet, openDevice);
  return [
    element("h1", {}, `Rehearsal of release ${fleet.release}`),
    element("p", { class: "verdict" }, fleetSentence(fleet)),
    tiles(Object.keys(VERDICTS).filter((verdict) => fleet.verdicts[verdict])
      .map((verdict) => [fleet.verdicts[verdict], VERDICTS[verdict], tone(verdict)])),
    versionSection(fleet), lossSection(fleet, devices), causeSection(fleet, devices), stepSection(fleet),
    distributionSection(fleet), notableSection(fleet, openDevice), devices.section(),
    element("p", { class: "faint" }, `Made on ${fleet.made} from ${fleet.results}.`),
  ];
}

function fleetSentence(fleet) {
  const total = fleet.images;
  const { kept = 0, unrehearsed = 0 } = fleet.verdicts;
  const losing = total - kept - unrehearsed;
  const parts = [losing ? `${counted(losing, "device")} of ${number(total)} would lose something.`
    : `Of ${counted(total, "device")}, none would lose anything.`];
  if (unrehearsed) parts.push(`${number(unrehearsed)} could not be rehearsed.`);
  return parts.join(" ");
}

function versionSection(fleet) {
  const rows = fleet.versions.map(({ version, verdicts }) => {
    const total = Object.values(verdicts).reduce((sum, count) => sum + count, 0);
    return [version === null ? "no settings file" : `version ${version}`, number(total),
      number(total - (verdicts.kept || 0)), shareBar(verdicts, total)];
  });
  return section("versions", "Verdicts by stored version",
    table("Devices that were rehearsed", ["Stored data version", "Devices", "With losses", "Share"], rows));
}

function shareBar(verdicts, total) {
  let begin = 0;
  const bars = Object.keys(VERDICTS).filter((verdict) => verdicts[verdict]).map((verdict) => {
    const width = 300 * verdicts[verdict] / total;
    begin += width;
    return drawn("rect", { class: `bar ${tone(verdict)}`, x: begin - width, y: 2, width, height: 14 },
      drawn("title", {}, `${VERDICTS[verdict]}: ${number(verdicts[verdict])}`));
  });
  const words = Object.entries(verdicts).map(([verdict, count]) => `${VERDICTS[verdict]} ${number(count)}`).join(", ");
  return drawn("svg", { viewBox: "0 0 300 18", role: "img", "aria-label": words, style: "max-width:19rem" }, bars);
}

function lossSection(fleet, devices) {
  if (!fleet.losses.length) return section("losses", "Losses by reason", element("p", {}, "Nothing is lost."));
  return section("losses", "Losses by reason", table("Accounts that would be lost, and the devices behind each reason",
    ["Reason", "Accounts", "Devices", ""], fleet.losses.map(({ code, accounts, devices: behind }) => [
      element("code", {}, code), number(accounts), number(behind), devices.buttonFor("Show the devices", code),
    ])));
}

function causeSection(fleet, devices) {
  if (!fleet.unrehearsed.length) return null;
  return section("causes", "What could not be rehearsed", table("Images by cause", ["Cause", "Images", "", ""],
    fleet.unrehearsed.map(({ cause, images }) => [element("code", {}, cause), number(images), CAUSES[cause] || "",
      devices.buttonFor("Show the images", cause)])));
}

function stepSection(fleet) {
  const rows = fleet.steps.map(({ stage, action, code, devices, accounts }) => [
    element("code", {}, stage), FACTS[action] || action, code ? element("code", {}, code) : "", number(devices),
    number(accounts)]);
  return section("steps", "What each step touched",
    table("Facts of all runs, by stage", ["Stage", "What", "Reason", "Devices", "Times"], rows));
}

function distributionSection(fleet) {
  return section("distributions", "Time and size", element("div", { class: "columns" },
    histogram("Time of a rehearsal", fleet.distributions.seconds, duration),
    histogram("Memory of a rehearsal", fleet.distributions.memory, size),
    histogram("Accounts after the run", fleet.distributions.accounts, number)));
}

// Bars over bins, each of which is [its beginning, its end, how many].
function histogram(title, bins, shown) {
  const words = bins.map(([from, to, count]) => `${shown(from)} to ${shown(to)}: ${number(count)}`).join("; ");
  const most = Math.max(1, ...bins.map(([, , count]) => count));
  const width = 360 / Math.max(1, bins.length);
  const bars = bins.map(([from, to, count], index) => drawn("rect",
    { class: "bar", x: index * width + 1, y: 120 - 110 * count / most, width: Math.max(1, width - 2), height: 110 * count / most },
    drawn("title", {}, `${shown(from)} to ${shown(to)}: ${number(count)}`)));
  const labels = bins.length ? [drawn("text", { x: 0, y: 136 }, shown(bins[0][0])),
    drawn("text", { x: 360, y: 136, "text-anchor": "end" }, shown(bins.at(-1)[1]))] : [];
  return element("figure", {}, element("figcaption", {}, title),
    drawn("svg", { viewBox: "0 0 360 140", role: "img", "aria-label": `${title}. ${words || "nothing"}` },
      bars, drawn("line", { x1: 0, y1: 120.5, x2: 360, y2: 120.5, stroke: "currentColor", "stroke-opacity": .3 }), labels));
}

function notableSection(fleet, openDevice) {
  const list = (title, rows, shown) => element("div", {}, element("h3", {}, title), table("", ["Device", ""],
    rows.map(([index, value]) => [deviceButton(fleet, index, openDevice), shown(value)])));
  return section("notable", "The slowest and the strangest", element("div", { class: "columns" },
    list("Slowest", fleet.slowest, duration),
    list("Strangest: what happened to them is rare", fleet.strangest, (score) => score.toFixed(1))));
}

const deviceButton = (fleet, index, openDevice) => element("button",
  { type: "button", class: "link", click: () => openDevice(index) }, fleet.devices.name[index]);
