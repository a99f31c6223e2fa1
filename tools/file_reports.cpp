// What a file, a snapshot or another device holds, for --file.

#include <nlohmann/json.hpp>

#include "commandline/table.h"
#include "commandline/text.h"
#include "tools/account_source.h"

namespace tools {
namespace {

using Json = nlohmann::ordered_json;
using Rows = std::vector<commandline::Row>;

constexpr int kSchema = 1;

Json orNull(const std::string& text) { return text.empty() ? Json(nullptr) : Json(text); }

Source examinedSource(Session& session, const Options& options) {
  session.beginLooking();
  return sourceNamed(*options.file, options);
}

std::string typeOf(const FoundAccount& account) { return textUnder(account.record, accountsettings::kAccountType); }
std::string classOf(const FoundAccount& account) { return textUnder(account.record, accountsettings::kAccountClass); }

Json jsonOf(const FoundAccount& account) {
  const auto names = namesOf(account.record);
  return {{"place", account.place()},        {"identifier", orNull(names.identifier)},
          {"type", orNull(typeOf(account))}, {"class", orNull(classOf(account))},
          {"name", orNull(names.name)},      {"user", orNull(names.user)},
          {"host", orNull(names.host)},      {"fault", orNull(account.fault)}};
}

Json jsonOf(const AccountFile& file) {
  const auto version = file.version();
  Json report{{"file", commandline::printable(file.path.string())},
              {"form", codeOf(file.form)},
              {"version", version ? Json(*version) : Json(nullptr)},
              {"accounts", Json::array()}};
  for (const FoundAccount& account : file.accounts) report["accounts"].push_back(jsonOf(account));
  return report;
}

std::string printed(const Json& report) { return report.dump(2) + "\n"; }

}  // namespace

Outcome listFile(Session& session, const Words&, const Options& options) {
  static const commandline::Row kHeading{{"PLACE", "IDENTIFIER", "TYPE", "CLASS", "NAME", "USER", "FAULT"},
                                         commandline::Emphasis::strong};
  const auto source = examinedSource(session, options);
  Json report{{"schema", kSchema}, {"files", Json::array()}};
  std::string text;
  for (const AccountFile& file : source.files) {
    report["files"].push_back(jsonOf(file));
    text += commandline::printable(file.path.string()) + ": " + std::string{nameOf(file.form)};
    const auto version = file.version();
    if (file.form == FileForm::settings) {
      text += version ? ", data version " + std::to_string(*version) : ", no data version";
    }
    text += file.accounts.empty() ? ", no accounts\n" : "\n";
    Rows rows{kHeading};
    for (const FoundAccount& account : file.accounts) {
      const auto names = namesOf(account.record);
      rows.push_back({account.place(), names.identifier, typeOf(account), classOf(account), names.name, names.user,
                      account.fault});
    }
    if (!file.accounts.empty()) text += commandline::table(rows, options.page());
  }
  return options.printsJson ? printed(report) : text;
}

Outcome showInFile(Session& session, const Words& arguments, const Options& options) {
  const auto source = examinedSource(session, options);
  const auto [file, account] = accountMeantBy(source, arguments[0]);
  if (options.printsJson) {
    Json report{{"schema", kSchema}, {"file", commandline::printable(file->path.string())}};
    report.update(jsonOf(*account));
    report["properties"] = tools::jsonOf(account->properties);
    return printed(report);
  }
  const auto page = options.page();
  Rows summary{{"File", file->path.string()}, {"Place", account->place()}};
  if (!account->fault.empty()) summary.push_back({"Fault", account->fault});
  Rows properties;
  for (const auto& [key, value] : account->properties) properties.push_back({"  " + key.string(), lineOf(value, key)});
  return commandline::table(summary, page) +
         commandline::emphasised("Properties", commandline::Emphasis::strong, page) + "\n" +
         commandline::table(properties, page);
}

Outcome verifyFiles(Session& session, const Words& arguments, const Options& options) {
  if (!arguments.empty()) throw Failure{ExitStatus::wrongUse, "--file says already what is to be verified"};
  const auto source = examinedSource(session, options);
  Json report{{"files", Json::array()}, {"findings", Json::array()}};
  std::string text;
  auto status = ExitStatus::done;
  for (const AccountFile& file : source.files) {
    const auto verified = verifySettings(session, {file.path.string()}, options);
    if (verified.status != ExitStatus::done) status = verified.status;
    text += verified.output;
    if (!options.printsJson) continue;
    const Json part = Json::parse(verified.output);
    for (auto& [key, list] : report.items()) list.insert(list.end(), part.at(key).begin(), part.at(key).end());
  }
  return {options.printsJson ? printed(report) : text, status};
}

}  // namespace tools
