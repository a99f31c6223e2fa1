#pragma once

#include <filesystem>
#include <memory>
#include <string>

#include "host/explanation.h"
#include "host/snapshots/file_state.h"
#include "host/snapshots/forwarding_files.h"
#include "platform/data_class_migrator.h"
#include "platform/file_keeper.h"

namespace host {

// The settings among the files that a run may change; empty where the plug-in tells of none.
[[nodiscard]] platform::Path settingsIn(const platform::MigrationFootprint& footprint);

// Moves what no run can read out of the place of a file with accounts, whatever it is: `PATH.unreadable-1`, and so on.
// Says so, and tells it as a loss. In a rehearsal it only goes.
[[nodiscard]] platform::Status putAside(const snapshots::Storage& storage, const platform::MigrationFile& file,
                                        const std::string& why, bool isRehearsal);

// The device's files as the plug-in gets them where no snapshot is taken: before a run takes away accounts that stand
// nowhere else, the file that has them is kept under a name of which no run makes use again. The settings are copied
// beside the copy that the run makes of them, owner, permissions and time included; a legacy file stays in its
// directory, under another name. The name ends in why, and a number: `.unreadable-1`, `.newer-1`, `.interrupted-1`,
// `.unconverted-1`, `.unsaved-1`. Of one file and reason kMaxKept are kept, the first ones; a further one goes as the
// rules require, with a line. What cannot be kept does not go: the call fails.
class KeepingFiles final : public snapshots::ForwardingFiles {
 public:
  static constexpr int kMaxKept = 9;

  // `explanation` is the run's, as far as it is told; it outlives this object.
  KeepingFiles(std::shared_ptr<platform::FileSystem> files, std::shared_ptr<platform::FileKeeper> keeper,
               platform::MigrationFootprint footprint, const Explanation& explanation);

  // Keeps the settings file where it has a newer version or cannot be read, ahead of a run.
  platform::Status keepUnusableSettings();
  // Keeps the copy aside that a run made before it was killed, ahead of the run that would put its own in that place.
  platform::Status keepCopyOfKilledRun();

  platform::Status remove(const platform::Path& path) override;
  platform::Status rename(const platform::Path& from, const platform::Path& to) override;

 private:
  using Path = platform::Path;

  // In a few words why the settings are of no use to the run; empty where they are.
  [[nodiscard]] std::string_view whyUnusable();
  [[nodiscard]] std::string_view whyToldUnusable() const;
  [[nodiscard]] platform::Status keepSettings(std::string_view why);
  [[nodiscard]] platform::Result<Path> keptAs(std::string_view why, const platform::FileCopy& settings);

  std::shared_ptr<platform::FileKeeper> _keeper;
  platform::MigrationFootprint _footprint;
  Path _settings;  // empty where the plug-in tells of none
  const Explanation& _explanation;
  bool _areSettingsKept = false;
};

}  // namespace host
