#!/usr/bin/env bash
# SPDX-License-Identifier: Apache-2.0
# Builds the optimised version and runs every benchmark. Each measures its limit beside its figure
# and prints lines "name|figure|limit figure|ratio|allowed ratio"; this shows them as one table and
# fails when a ratio is beyond what is allowed.
#   scripts/bench.sh [NAME...]       e.g. scripts/bench.sh store
set -euo pipefail
cd "$(dirname "$0")/.."
. scripts/common.sh

scripts/install-dependencies.sh build
build release

names=("$@")
programs=()
if [ ${#names[@]} -gt 0 ]; then
    for name in "${names[@]}"; do programs+=("build/release/bin/${name%_bench}_bench"); done
else
    shopt -s nullglob
    programs=(build/release/bin/*_bench)
fi
[ ${#programs[@]} -gt 0 ] || { echo "there are no benchmarks in build/release/bin" >&2; exit 1; }

failed=0
lines=
for program in "${programs[@]}"; do
    [ -x "$program" ] || { echo "no such benchmark: $program" >&2; exit 2; }
    # Assigned first, so that the lines of one that fails are shown as well.
    status=0
    output=$("$program" </dev/null) || status=$?
    lines+=$output$'\n'
    [ "$status" -eq 0 ] || { echo "$program failed with status $status" >&2; failed=1; }
done

printf '%s' "$lines" | awk -F'|' '
    BEGIN { printf "%-64s %16s %16s %8s %8s\n", "what", "measured", "limit", "ratio", "allowed" }
    NF == 0 { next }
    NF != 5 { print "not a benchmark line: " $0; bad = 1; next }
    # A row without an allowed ratio ("-") is shown for information.
    { over = ($5 != "-" && $4 + 0 > $5 + 0)
      if (over) bad = 1
      printf "%-64s %16s %16s %8s %8s%s\n", $1, $2, $3, $4, $5, over ? "  too slow" : "" }
    END { exit bad }' || failed=1
exit "$failed"
