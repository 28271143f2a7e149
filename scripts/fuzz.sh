#!/usr/bin/env bash
# SPDX-License-Identifier: Apache-2.0
# Builds the fuzz targets and lets each look for inputs that break it.
#   scripts/fuzz.sh [SECONDS [NAME...]]      e.g. scripts/fuzz.sh 600 CalendarReader   (10 each, all)
# What it learned stays in build/fuzz/corpus, so that the next run goes on from there; an input that
# breaks a target is kept in build/fuzz/found.
set -euo pipefail
cd "$(dirname "$0")/.."
. scripts/common.sh

seconds=${1:-10}
shift || true
[[ $seconds =~ ^[1-9][0-9]*$ ]] || { echo "usage: scripts/fuzz.sh [SECONDS [NAME...]]" >&2; exit 2; }

scripts/install-dependencies.sh build lint
build fuzz

programs=()
for name in "$@"; do programs+=("build/fuzz/bin/${name%Fuzz}Fuzz"); done
[ ${#programs[@]} -gt 0 ] || programs=(build/fuzz/bin/*Fuzz)

failed=0
for program in "${programs[@]}"; do
    [ -x "$program" ] || { echo "no such fuzz target: $program" >&2; exit 2; }
    name=$(basename "$program")
    corpus=build/fuzz/corpus/$name
    log=build/fuzz/$name.log
    mkdir -p "$corpus" build/fuzz/found
    if "$program" "$corpus" -artifact_prefix="build/fuzz/found/$name-" \
        -len_control=0 -max_total_time="$seconds" -timeout=10 -rss_limit_mb=1024 >"$log" 2>&1 </dev/null; then
        runs=$(sed -n 's/^Done \([0-9]*\) runs.*/\1/p' "$log")
        [ -n "$runs" ] || { echo "$name did not run; see $log" >&2; failed=1; continue; }
        echo "$name: nothing found in $runs runs"
    else
        echo "$name: a fault; the input is in build/fuzz/found, the log in $log" >&2
        grep -E 'property broken|ERROR:|SUMMARY:|Test unit written' "$log" >&2 || tail -n 20 "$log" >&2
        failed=1
    fi
done
exit "$failed"
