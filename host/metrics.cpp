#include "host/metrics.h"

#include <unistd.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <cstdio>
#include <utility>

#include "host/snapshots/file_state.h"
#include "platform/linux/files/file_services.h"

namespace host {
namespace {

constexpr std::string_view kPrefix = "account_migration";
constexpr std::uint32_t kReadableByAll = 0644;

std::string numberOf(double value) {
  std::array<char, 64> text{};
  const int length = std::snprintf(text.data(), text.size(), "%.6f", value);
  return {text.data(), static_cast<std::size_t>(std::max(length, 0))};
}

std::string escaped(std::string_view value) {
  std::string text;
  for (const char character : value) {
    if (character == '\\' || character == '"') text += '\\';
    text += character == '\n' ? std::string{"\\n"} : std::string{character};
  }
  return text;
}

// The lines of one metric family, its name without the prefix of all; empty for the prefix alone.
class Family {
 public:
  Family(std::string_view name, std::string_view type, std::string_view help, std::string_view unit = {})
      : _name{std::string{kPrefix} + (name.empty() ? "" : "_") + std::string{name}} {
    _text = "# TYPE " + _name + " " + std::string{type} + "\n";
    if (!unit.empty()) _text += "# UNIT " + _name + " " + std::string{unit} + "\n";
    _text += "# HELP " + _name + " " + std::string{help} + "\n";
  }

  using Label = std::pair<std::string_view, std::string_view>;

  Family& add(std::initializer_list<Label> labels, std::string_view value, std::string_view suffix = {}) {
    std::string text;
    for (const auto& [label, is] : labels) {
      text += (text.empty() ? "" : ",") + std::string{label} + "=\"" + escaped(is) + "\"";
    }
    _text += _name + std::string{suffix} + (text.empty() ? "" : "{" + text + "}") + " " + std::string{value} + "\n";
    return *this;
  }
  Family& add(std::initializer_list<Label> labels, std::size_t value) { return add(labels, std::to_string(value)); }

  [[nodiscard]] const std::string& name() const { return _name; }
  [[nodiscard]] const std::string& text() const { return _text; }

 private:
  std::string _name;
  std::string _text;
};

}  // namespace

std::string metricsOf(const Explanation& explanation, const Verdict& verdict, const ExplainedRun& run, double endTime) {
  Family about{"", "info", "The run of migration-host that this is about."};
  about.add({{"version", run.version}, {"root", run.root}, {"rehearsal", run.isRehearsal ? "true" : "false"}}, "1",
            "_info");
  Family verdicts{"verdict", "stateset", "What the run came to."};
  for (const auto kind : {Verdict::Kind::kept, Verdict::Kind::lost, Verdict::Kind::notSaved}) {
    verdicts.add({{verdicts.name(), nameOf(kind)}}, kind == verdict.kind ? 1 : 0);
  }
  Family success{"success", "gauge", "1 where the plug-in answered true."};
  success.add({}, run.success ? 1 : 0);
  Family accounts{"accounts", "gauge", "How many accounts went which way."};
  for (const auto& [way, count] : countsOf(explanation, verdict).named()) accounts.add({{"went", way}}, count);
  // Also those of which there are none, so that whoever watches sees the first one come.
  Family losses{"losses", "gauge", "What was lost, by the code of the loss."};
  for (const records::LossMeaning& meaning : records::kLossMeanings) {
    const auto count = std::ranges::count(verdict.lost, meaning.code, &records::Lost::code);
    losses.add({{"code", meaning.name}}, static_cast<std::size_t>(count));
  }
  Family duration{"duration_seconds", "gauge", "How long the run took.", "seconds"};
  duration.add({}, numberOf(run.seconds));
  Family end{"end_time_seconds", "gauge", "When the run ended, since the epoch.", "seconds"};
  end.add({}, numberOf(endTime));
  return about.text() + verdicts.text() + success.text() + accounts.text() + losses.text() + duration.text() +
         end.text() + "# EOF\n";
}

platform::Status writeMetrics(const std::filesystem::path& file, const std::string& text,
                              const platform::BaseDirectories& directories) {
  const auto now = std::chrono::system_clock::now().time_since_epoch();
  platform::FileAttributes attributes;
  attributes.owner = ::geteuid();
  attributes.group = ::getegid();
  attributes.permissions = kReadableByAll;
  attributes.modifiedSeconds = std::chrono::duration_cast<std::chrono::seconds>(now).count();
  return platform::makeFileKeeper(directories)->restore(file, snapshots::bytesOf(text), attributes);
}

}  // namespace host
