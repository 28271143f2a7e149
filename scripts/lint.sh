#!/usr/bin/env bash
# SPDX-License-Identifier: Apache-2.0
# Checks the format of every source file and runs clang-tidy over src/.
#   scripts/lint.sh [FOLDER...]      e.g. scripts/lint.sh src/core   (clang-tidy there only)
set -euo pipefail
cd "$(dirname "$0")/.."
. scripts/common.sh

scripts/install-dependencies.sh build lint

mapfile -t sources < <(git ls-files -- '*.cpp' '*.h')
clang-format-14 --dry-run -Werror "${sources[@]}"
echo "format: ${#sources[@]} files are right"

for script in scripts/*.sh .ci/run; do bash -n "$script"; done

mkdir -p build/lint
log=build/lint/tidy.log
# As the linter's own compiler would be called, each file for itself.
if ! cmake --preset dev --fresh -B build/lint -DCMAKE_CXX_COMPILER=clang++-19 -DCMAKE_CXX_FLAGS=-O1 \
    -DCMAKE_UNITY_BUILD=OFF -DKEEPSAKES_TESTS=OFF >"$log" 2>&1 </dev/null; then
    cat "$log" >&2
    exit 1
fi
folders=("$@")
[ ${#folders[@]} -gt 0 ] || folders=(src)
patterns=()
for folder in "${folders[@]}"; do patterns+=("^$PWD/${folder%/}/.*\.cpp$"); done
if ! run-clang-tidy-19 -quiet -p build/lint -j 2 "${patterns[@]}" >"$log" 2>&1 </dev/null; then
    grep -E '(error|warning|note):|^ +[0-9]* \|' "$log" >&2 || cat "$log" >&2
    echo "clang-tidy found faults; all of it is in $log" >&2
    exit 1
fi
checked=$(grep -cE 'clang-tidy-19.* -p' "$log" || true)
[ "$checked" -gt 0 ] || { echo "clang-tidy checked no file of ${folders[*]}" >&2; exit 1; }
echo "clang-tidy: $checked files are right"
