#!/bin/bash
# Prints which lines and branches of the product the tests execute: builds the preset `coverage` and runs its tests.
#   scripts/coverage.sh            every folder, file by file
#   scripts/coverage.sh FOLDER...  these folders; what is not executed is listed, line by line
set -euo pipefail

repository=$(cd -- "$(dirname -- "${BASH_SOURCE[0]}")/.." && pwd)
cd -- "$repository"
tree=build/coverage

cmake --preset coverage --log-level=WARNING -DACCOUNTS_TESTS=ON
cmake --build --preset coverage
find "$tree" -name '*.gcda' -delete
ctest --preset coverage --parallel "$(nproc)" --no-label-summary --label-exclude '^(full|install)$' < /dev/null

folders=("$@")
if ((${#folders[@]} == 0)); then folders=(accountsettings migrator platform host tools modules); fi
filters=()
for folder in "${folders[@]}"; do filters+=(--filter "$folder/"); done

# What the compiler adds for exceptions is no branch of the source.
gcovr --root . --object-directory "$tree" --gcov-ignore-parse-errors "${filters[@]}" \
  --exclude-throw-branches --exclude-unreachable-branches --print-summary
gcovr --root . --object-directory "$tree" --gcov-ignore-parse-errors "${filters[@]}" \
  --exclude-throw-branches --exclude-unreachable-branches --branches
