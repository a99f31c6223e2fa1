#include <filesystem>
#include <nlohmann/json.hpp>
#include <optional>

#include "commandline/text.h"
#include "platform/platform.h"
#include "tools/commands.h"
#include "tools/findings.h"

namespace tools {
namespace {

using accountsettings::Array;
using accountsettings::Dictionary;
using accountsettings::Text;
using commandline::printable;
using platform::Path;
using Json = nlohmann::ordered_json;

struct Examined {
  Path path;
  bool exists = true;
  std::size_t accounts = 0;
  Findings findings;
};

const Array& recordsIn(const Dictionary& file) {
  static const Array none;
  const Array* const accounts = file.array(accountsettings::kPlistAccountsKey);
  return accounts == nullptr ? none : *accounts;
}

void append(Findings& findings, Findings more) {
  findings.insert(findings.end(), std::make_move_iterator(more.begin()), std::make_move_iterator(more.end()));
}

Finding unreadable(const Path& path, const platform::Status& reading) {
  if (reading.cause() == platform::Cause::other) {
    const auto kind = platform::current().files->kindOf(path);
    if (kind.isOk() && kind.value() != platform::FileKind::file) {
      return {"unreadable", "", "", "there is something else than a file", "a migration cannot save"};
    }
    throw Failure{ExitStatus::failed, "the file cannot be opened: " + path.string() + ": " + reading.reason()};
  }
  const bool isPlanted = reading.cause() == platform::Cause::unsafe;
  return {"unreadable", "", "",
          isPlanted ? "somebody else may have put it there: " + reading.reason() : reading.reason(),
          "a migration takes it for an empty one and saves a file without accounts in its place"};
}

Examined examine(const Path& path) {
  const auto file =
      platform::current().propertyLists->readDictionary(AccountsManager::fullPathToAccountSettingsPlist());
  if (file.cause() == platform::Cause::missing) return {path, false, 0, {}};
  if (!file.isOk()) return {path, true, 0, {unreadable(path, file.status())}};
  const Dictionary& root = file.value();
  Examined examined{path, true, recordsIn(root).size(), findingsOfRoot(root)};
  append(examined.findings, findingsOfVersion(root));
  append(examined.findings, findingsOfRecords(recordsIn(root)));
  return examined;
}

std::string counted(std::size_t count, const std::string& what) {
  return (count == 0 ? "no" : std::to_string(count)) + " " + what + (count == 1 ? "" : "s");
}

std::string headOf(const Finding& finding) {
  const auto identifier = finding.identifier.empty() ? "" : " (" + finding.identifier + ")";
  return finding.place.empty() ? "" : finding.place + identifier + ": ";
}

std::string reportFor(const Examined& examined) {
  std::string report = printable(examined.path.string()) + ": ";
  if (!examined.exists) return report + "there is no settings file\n";
  report += counted(examined.accounts, "account") + ", " + counted(examined.findings.size(), "finding") + "\n";
  for (const Finding& each : examined.findings) {
    report += printable(headOf(each) + each.what) + "\n    " + printable(each.migration) + "\n";
  }
  return report;
}

Json jsonOf(const Finding& finding) {
  const auto orNull = [](const std::string& text) { return text.empty() ? Json(nullptr) : Json(text); };
  return {{"kind", finding.kind},
          {"place", orNull(finding.place)},
          {"identifier", orNull(finding.identifier)},
          {"what", finding.what},
          {"migration", finding.migration}};
}

std::string jsonFor(const Examined& examined) {
  Json report{{"file", examined.exists ? Json(Text{examined.path.string()}.string()) : Json(nullptr)},
              {"accounts", examined.accounts},
              {"findings", Json::array()}};
  for (const Finding& each : examined.findings) report["findings"].push_back(jsonOf(each));
  return report.dump(2) + "\n";
}

}  // namespace

Outcome verifySettings(Session& session, const Words& arguments, const Options& options) {
  const bool isNamed = !arguments.empty();
  if (isNamed && arguments[0].empty()) throw Failure{ExitStatus::wrongUse, "the file to verify has no name"};
  const auto named = isNamed ? std::optional{std::filesystem::absolute(arguments[0])} : std::nullopt;
  session.beginExamination(named);
  const auto examined = examine(named.value_or(AccountsManager::fullPathToAccountSettingsPlist()));
  if (isNamed && !examined.exists) throw Failure{ExitStatus::failed, "there is no file " + named->string()};
  const auto status = examined.findings.empty() ? ExitStatus::done : ExitStatus::findings;
  return {options.printsJson ? jsonFor(examined) : reportFor(examined), status};
}

}  // namespace tools
