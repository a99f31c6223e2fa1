#pragma once

#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "host/verdict.h"
#include "platform/linux/files/descriptor.h"
#include "platform/platform.h"
#include "platform/status.h"
#include "records/fact.h"

namespace host {

// The events of one run, one JSON object a line, in the order in which they are told. Each event is appended with one
// write and nothing is kept back, so a run that dies leaves the events up to its end. Text that is no UTF-8 is shown
// with replacement characters. An event that cannot be written is lost and the run goes on; `outcome` tells of it.
class Trace {
 public:
  // Appends to the file, which is made where there is none; mode 0600. What somebody else may have put there is
  // refused.
  [[nodiscard]] static platform::Result<std::shared_ptr<Trace>> open(const std::filesystem::path& path);

  Trace(const Trace&) = delete;
  Trace& operator=(const Trace&) = delete;
  ~Trace() = default;

  // What is about to be run: its number among the runs that are in the file, the host's version, the system's root, the
  // options in force, and the time, as in 2026-03-07T10:15:00Z.
  void start(std::string_view version, const std::string& root, const std::vector<std::string>& options,
             const std::string& time) noexcept;
  void console(std::string_view message) noexcept;
  void log(std::string_view subsystem, std::string_view category, const std::function<std::string()>& message) noexcept;
  void preferencesChanged(std::string_view domain, std::string_view key) noexcept;
  void cloudTabs(bool enabled) noexcept;
  // What the run did in a stage; `outerStage`, of which that is a part, may be empty.
  void fact(std::string_view stage, std::string_view outerStage, const records::Fact& fact) noexcept;
  void result(std::string_view dataClass, bool success, const Verdict& verdict) noexcept;

  // Success where every event so far was written; else why the first of the others was not.
  [[nodiscard]] const platform::Status& outcome() const { return _outcome; }

 private:
  explicit Trace(platform::Descriptor file);
  template <typename MakeEvent>
  void append(const MakeEvent& makeEvent) noexcept;

  platform::Descriptor _file;
  std::uint64_t _run;
  platform::Status _outcome;
};

// Puts the trace in front of the platform's two logs and two notices: each event is traced, then passed on.
void traceServices(platform::Platform& platform, const std::shared_ptr<Trace>& trace);

}  // namespace host
