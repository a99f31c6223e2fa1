#!/bin/bash
# Prints which lines and branches of the product the unit and reliability tests execute: builds the preset `coverage` and
# runs them. A branch is one of the two ends of a condition of the source; what the compiler adds for exceptions is none.
#   scripts/coverage.sh            every folder, file by file
#   scripts/coverage.sh FOLDER...  these folders; each end of a condition that is never reached is listed
set -euo pipefail

repository=$(cd -- "$(dirname -- "${BASH_SOURCE[0]}")/.." && pwd)
cd -- "$repository"
tree=build/coverage

cmake --preset coverage --log-level=WARNING -DACCOUNTS_TESTS=ON
cmake --build --preset coverage
rm -f -- "$tree"/profiles/*
# The tests that try programs from the outside are named in small letters.
ctest --preset coverage --parallel "$(nproc)" --no-label-summary --label-exclude '^(full|install)$' --tests-regex '^[A-Z]' \
  < /dev/null

python3 scripts/coverage_report.py "$tree" "$@"
