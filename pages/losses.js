// What is lost, and the commands that bring it back.

const MOST_LOSSES = 100;
const SETTINGS_IN_HOME = "/Library/Preferences/com.vorlix.accountsettings.plist";

function lossesOf(explanation, level) {
  const lost = explanation.result.lost || [];
  if (!lost.length) return null;
  return element("div", { class: "losses" }, heading(level, "What is lost, and the way back"),
    element("ul", { class: "cards" }, lost.slice(0, MOST_LOSSES).map((each) => lossCard(each, explanation, level))),
    lost.length > MOST_LOSSES
      ? element("p", { class: "faint" }, `and ${number(lost.length - MOST_LOSSES)} more, in the list of accounts`) : null,
    wayBackForAll(explanation));
}

function lossCard(loss, explanation, level) {
  return element("li", {}, heading(level + 1, lostOf(loss)),
    element("p", {}, sentence(loss.reason + (loss.detail ? `: ${loss.detail}` : "")), " ", element("code", { class: "faint" }, loss.code)),
    loss.where ? element("p", {}, explanation.rehearsal ? "Its data would still be in " : "Its data are still in ", element("code", {}, loss.where)) : null,
    recovery(loss, explanation));
}

const sentence = (text) => `${text[0].toUpperCase()}${text.slice(1)}.`;

// An account, or a file of them.
const lostOf = (loss) => ("type" in loss ? calledOf(loss) : loss.file || "The settings file");

const commandBox = (command) => element("pre", { class: "command", tabindex: 0 }, element("code", {}, command));

// What a record lacks that is left out, and has to be told for it to come back.
const REPAIRS = { "dropped-no-type": "Type=Mail", "dropped-unknown-type": "Type=Mail", "dropped-no-class": "Class=IMAPAccount",
  "dropped-unknown-class": "Class=IMAPAccount", "refused-description": "Class=IMAPAccount" };

// The copy of the settings file, or a snapshot, is where an account can be had from; a rehearsal took nothing away. What
// is not written as it is read makes no command.
function recovery(loss, explanation) {
  const account = loss.identifier || loss.name;
  if (explanation.rehearsal || !loss.where || !account || /\p{C}/u.test(account)) return null;
  const repair = REPAIRS[loss.code];
  const words = ["accountctl", ...devicePlace(explanation), "recover", loss.where, account, ...(repair ? ["--set", repair] : [])];
  return element("div", {}, commandBox(words.map(quoted).join(" ")),
    repair ? element("p", { class: "faint" }, `Or another ${repair.split("=")[0].toLowerCase()}, where that is not the account's.`) : null);
}

function wayBackForAll(explanation) {
  if (explanation.rehearsal) {
    return element("p", {}, "Nothing is gone yet. A run with ", element("code", {}, "--snapshots DIR"),
      " keeps what it takes to go back, and with ", element("code", {}, "--strict"), " says so by its exit status.");
  }
  const snapshot = (explanation.result.lost.find(({ where }) => where && !where.endsWith(".plist")) || {}).where;
  if (!snapshot) return null;
  const [, directory, id] = /^(.*)\/([^/]*)$/.exec(snapshot);
  return element("div", {}, element("p", {}, "The whole device goes back to before the run with"),
    commandBox(["migration-host", ...devicePlace(explanation), "--snapshots", directory, "--restore", id].map(quoted).join(" ")));
}

// The options by which the programs find the device of the run.
function devicePlace(explanation) {
  const saved = explanation.stages.flatMap(({ facts }) => facts).find(({ fact }) => fact === "saved" || fact === "save-failed");
  const home = saved && saved.file.endsWith(SETTINGS_IN_HOME) ? saved.file.slice(0, -SETTINGS_IN_HOME.length) : "";
  const root = explanation.root || "/";
  const isUsual = root !== "/" && home === `${root.replace(/\/+$/, "")}/var/mobile`;
  return [...(root === "/" ? [] : ["--root", root]), ...(home && !isUsual ? ["--home", home] : [])];
}

// As the shell takes it for one word, whatever is in it.
const quoted = (word) => (/^[\w@%+=:,./-]+$/.test(word) ? word : `'${word.replaceAll("'", "'\\''")}'`);
