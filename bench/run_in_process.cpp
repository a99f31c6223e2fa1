// A whole run, without the start of a process. Usage: bench-run ROOT [sync|count]
#include <cstdio>
#include <string_view>

#include "bench/device.h"
#include "bench/measurement.h"
#include "bench/sync_meter.h"
#include "migrator/accounts_data_migrator.h"

namespace {

int countOnly(const std::filesystem::path& root) {
  platform::Platform services = bench::servicesOf(root);
  const auto counts = bench::countFileUse(services);
  platform::setCurrent(std::move(services));
  const bool success = migrator::AccountsDataMigrator{}.performMigration();
  std::printf(R"({"reads": %d, "saves": %d, "changes": %d})"
              "\n",
              counts->reads, counts->saves, counts->changes);
  return success ? 0 : 1;
}

int measure(const std::filesystem::path& root) {
  const bench::Measurement measurement;
  platform::setCurrent(bench::servicesOf(root));
  const bool success = migrator::AccountsDataMigrator{}.performMigration();
  measurement.print();
  return success ? 0 : 1;
}

}  // namespace

int main(int count, char** arguments) {
  if (count < 2) return 2;
  const std::string_view mode = count > 2 ? arguments[2] : "";
  bench::setSyncing(mode == "sync");
  return mode == "count" ? countOnly(arguments[1]) : measure(arguments[1]);
}
