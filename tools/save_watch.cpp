#include "tools/save_watch.h"

#include <string_view>

namespace tools {
namespace {

constexpr std::string_view kSaveMethod = "-[AccountsManager saveAllAccounts]";
constexpr std::string_view kFailure = "Failed to save accounts to filesystem.";
constexpr std::string_view kSerialization = "Failed to serialize account settings data: ";
constexpr std::string_view kAttributes = "Could not set attributes on the temporary account settings plist. ";

// Messages are written as METHOD (LINE) "MESSAGE".
std::string quotedPart(const std::string& line) {
  const auto begin = line.find('"');
  const auto end = line.rfind('"');
  return begin == end ? std::string{} : line.substr(begin + 1, end - begin - 1);
}

}  // namespace

void SaveWatch::write(const platform::LogRecord& record) {
  if (record.method == kSaveMethod) hear(quotedPart(record.text()));
  if (_log->hasReaders()) _log->write(record);
}

void SaveWatch::hear(const std::string& message) {
  if (message == kFailure) _hasFailed = true;
  if (message.starts_with(kSerialization) || message.starts_with(kAttributes)) _cause = message;
}

}  // namespace tools
