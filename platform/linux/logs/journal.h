#pragma once

#include <filesystem>
#include <string>
#include <vector>

#include "platform/export.h"

namespace platform {

constexpr const char* kJournalSocket = "/run/systemd/journal/socket";

// Hands a record to the journal that listens at the socket, in the journal's own protocol: "NAME=value" each, and the
// program's name as SYSLOG_IDENTIFIER beside them. A record of any size arrives: what no datagram carries goes as a
// sealed file in memory. Where nobody listens, it is lost; that is never an error.
ACCOUNT_EXPORT void sendToJournal(const std::filesystem::path& socket, const std::vector<std::string>& fields);

}  // namespace platform
