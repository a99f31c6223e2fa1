#include "tests/run_sequence/scripted_version_steps.h"

namespace tests {

ScriptedVersionSteps& versionSteps() {
  static ScriptedVersionSteps steps;
  return steps;
}

}  // namespace tests

namespace migrator {

bool AccountsDataMigrator::_migrateNewAccountsInfo(AccountsManager& store) {
  tests::ScriptedVersionSteps& steps = tests::versionSteps();
  ++steps.runs;
  if (steps.work) steps.work(store);
  return steps.answer;
}

}  // namespace migrator
