#include <algorithm>
#include <filesystem>
#include <iterator>
#include <nlohmann/json.hpp>
#include <optional>

#include "commandline/program.h"
#include "commandline/table.h"
#include "commandline/text.h"
#include "platform/platform.h"
#include "tools/commands.h"
#include "tools/findings.h"
#include "tools/remedies.h"

namespace tools {
namespace {

using accountsettings::Array;
using accountsettings::Dictionary;
using accountsettings::Text;
using commandline::printable;
using platform::Path;
using platform::Status;
using Json = nlohmann::ordered_json;

struct ExaminedFile {
  Path path;
  std::string_view form;                // "settings", "exchange", "mail" or "other", for scripts
  std::optional<std::size_t> accounts;  // none where no accounts are looked for, or nothing stands there
  Findings findings;
  bool isThere = true;
};

// What was looked at, and the files that could not be opened, each with the reason.
struct Examination {
  std::vector<ExaminedFile> files;
  std::vector<std::string> unopened;
};

const Array& recordsIn(const Dictionary& file) {
  static const Array kNone;
  const Array* const accounts = file.array(accountsettings::kPlistAccountsKey);
  return accounts == nullptr ? kNone : *accounts;
}

void append(Findings& findings, Findings more) {
  findings.insert(findings.end(), std::make_move_iterator(more.begin()), std::make_move_iterator(more.end()));
}

constexpr std::string_view formOf(LegacyForm form) { return form == LegacyForm::mail ? "mail" : "exchange"; }

// Notes that the file could not be read, where something stands there and nothing has told of it yet.
void noteUnread(const Status& reading, Part part, ExaminedFile& file, Examination& examination) {
  if (reading.isOk() || reading.cause() == platform::Cause::missing) return;
  const auto isNoFile = [](const Finding& each) { return each.kind == "no-file"; };
  if (reading.cause() != platform::Cause::other) {
    file.findings.push_back(unreadable(reading, part));
  } else if (std::ranges::none_of(file.findings, isNoFile)) {
    examination.unopened.push_back("the file cannot be opened: " + file.path.string() + ": " + reading.reason());
  }
}

void examineSettings(const Path& path, Examination& examination) {
  const auto settings = AccountsManager::fullPathToAccountSettingsPlist();
  ExaminedFile file{path, "settings", {}, {}};
  if (path == settings) file.findings = findingsOfStanding(path, Part::settings);
  const auto read = platform::current().propertyLists->readDictionary(settings);
  file.isThere = read.cause() != platform::Cause::missing;
  noteUnread(read.status(), Part::settings, file, examination);
  if (read.isOk()) {
    file.accounts = recordsIn(read.value()).size();
    append(file.findings, findingsOfRoot(read.value()));
    append(file.findings, findingsOfVersion(read.value()));
    append(file.findings, findingsOfRecords(recordsIn(read.value())));
    for (const LegacyForm form : {LegacyForm::exchange, LegacyForm::mail}) {
      if (path != settings || !platform::current().files->kindOf(pathOf(form)).isOk()) continue;
      const auto legacy = platform::current().propertyLists->readDictionary(pathOf(form));
      append(file.findings, findingsOfReplacement(form, legacy.valueOr({}), read.value()));
    }
  }
  examination.files.push_back(std::move(file));
}

void examineLegacy(LegacyForm form, Examination& examination) {
  ExaminedFile file{pathOf(form), formOf(form), {}, findingsOfStanding(pathOf(form), Part::legacy)};
  const auto read = platform::current().propertyLists->readDictionary(file.path);
  if (read.cause() == platform::Cause::missing && file.findings.empty()) return;
  noteUnread(read.status(), Part::legacy, file, examination);
  if (read.isOk()) {
    file.accounts = countOfDescriptions(form, read.value());
    append(file.findings, findingsOfConversion(form, read.value()));
    append(file.findings, findingsOfDescriptions(form, read.value()));
  }
  examination.files.push_back(std::move(file));
}

// A file of the first releases by its keys, wherever it lies; any other as a settings file.
void examineNamed(const Path& path, Examination& examination) {
  const auto read =
      platform::current().propertyLists->readDictionary(AccountsManager::fullPathToAccountSettingsPlist());
  if (read.cause() == platform::Cause::missing) throw Failure{ExitStatus::failed, "there is no file " + path.string()};
  const auto form = read.isOk() ? legacyFormOf(read.value()) : std::nullopt;
  if (form) {
    examination.files.push_back(
        {path, formOf(*form), countOfDescriptions(*form, read.value()), findingsOfDescriptions(*form, read.value())});
  } else {
    examineSettings(path, examination);
  }
}

// --- The report ---

std::string counted(std::size_t count, const std::string& what) {
  return (count == 0 ? "no" : std::to_string(count)) + " " + what + (count == 1 ? "" : "s");
}

std::string headOf(const ExaminedFile& file) {
  std::string head = file.path.string() + ": ";
  if (!file.isThere) {
    head += "there is no settings file";
    return head + (file.findings.empty() ? "" : ", " + counted(file.findings.size(), "finding"));
  }
  const std::string which = file.form == "settings" ? ", " : " of the first releases, ";
  if (file.accounts) head += counted(*file.accounts, "account") + which;
  return head + counted(file.findings.size(), "finding");
}

std::string headOf(const Finding& finding) {
  const auto identifier = finding.identifier.empty() ? "" : " (" + finding.identifier + ")";
  return finding.place.empty() ? "" : finding.place + identifier + ": ";
}

// A paragraph that goes on below itself where the page is too narrow.
std::string paragraph(const std::string& text, std::size_t indentation, const commandline::Page& page) {
  const std::string shown = printable(text);
  if (!page.columns) return std::string(indentation, ' ') + shown + "\n";
  std::string lines;
  for (const std::string& line :
       commandline::wrapped(shown, *page.columns - std::min(indentation, *page.columns - 1))) {
    lines += std::string(indentation, ' ') + line + "\n";
  }
  return lines;
}

std::string reportFor(const Examination& examination, const Options& options) {
  constexpr std::size_t kIndentation = 4;
  const auto page = options.page();
  std::string report;
  for (const ExaminedFile& file : examination.files) {
    report += commandline::emphasised(printable(headOf(file)), commandline::Emphasis::strong, page) + "\n";
    for (const Finding& each : file.findings) {
      const auto [advice, command] = remedyFor(each, file.path, options);
      report += paragraph(headOf(each) + each.what, 0, page) + paragraph(each.migration, kIndentation, page);
      report += paragraph(advice + (command.empty() ? "" : ":"), kIndentation, page);
      if (!command.empty()) report += std::string(2 * kIndentation, ' ') + printable(command) + "\n";
    }
  }
  return report;
}

Json orNull(const std::string& text) { return text.empty() ? Json(nullptr) : Json(text); }

std::string jsonFor(const Examination& examination, const Options& options) {
  Json report{{"files", Json::array()}, {"findings", Json::array()}};
  for (const ExaminedFile& file : examination.files) {
    const std::string path = Text{file.path.string()}.string();
    report["files"].push_back(
        {{"file", path}, {"form", file.form}, {"accounts", file.accounts ? Json(*file.accounts) : Json(nullptr)}});
    for (const Finding& each : file.findings) {
      const auto [advice, command] = remedyFor(each, file.path, options);
      report["findings"].push_back({{"kind", each.kind},
                                    {"file", path},
                                    {"place", orNull(each.place)},
                                    {"identifier", orNull(each.identifier)},
                                    {"what", each.what},
                                    {"migration", each.migration},
                                    {"advice", advice},
                                    {"command", orNull(command)}});
    }
  }
  return report.dump(2) + "\n";
}

}  // namespace

Outcome verifySettings(Session& session, const Words& arguments, const Options& options) {
  const bool isNamed = !arguments.empty();
  if (isNamed && arguments[0].empty()) throw Failure{ExitStatus::wrongUse, "the file to verify has no name"};
  const auto named = isNamed ? std::optional{std::filesystem::absolute(arguments[0])} : std::nullopt;
  session.beginExamination(named);
  Examination examination;
  if (named) {
    examineNamed(*named, examination);
  } else {
    examineSettings(AccountsManager::fullPathToAccountSettingsPlist(), examination);
    for (const LegacyForm form : {LegacyForm::exchange, LegacyForm::mail}) examineLegacy(form, examination);
    for (Leftover& each : leftoversOnDevice()) {
      examination.files.push_back({std::move(each.path), "other", {}, {std::move(each.finding)}});
    }
  }
  for (const std::string& each : examination.unopened) commandline::say("accountctl", each);
  const bool isClean = std::ranges::all_of(examination.files, [](const auto& file) { return file.findings.empty(); });
  const auto status = isClean ? ExitStatus::done : ExitStatus::findings;
  return {options.printsJson ? jsonFor(examination, options) : reportFor(examination, options),
          examination.unopened.empty() ? status : ExitStatus::failed};
}

}  // namespace tools
