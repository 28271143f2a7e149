#!/usr/bin/env bash
# SPDX-License-Identifier: Apache-2.0
# Builds with a sanitizer and runs every test under it.
#   scripts/sanitize.sh [asan|tsan] [CTEST ARGUMENT...]     (asan when none is named)
# asan: memory errors, leaks and undefined behaviour. tsan: data races and lock order.
set -euo pipefail
cd "$(dirname "$0")/.."
. scripts/common.sh

preset=${1:-asan}
shift || true
case $preset in
    asan)
        export ASAN_OPTIONS=detect_stack_use_after_return=1:strict_string_checks=1:check_initialization_order=1:abort_on_error=0
        export UBSAN_OPTIONS=print_stacktrace=1:halt_on_error=1
        ;;
    tsan)
        export TSAN_OPTIONS=halt_on_error=1:second_deadlock_stack=1:suppressions=$PWD/cmake/tsan.supp
        ;;
    *)
        echo "usage: scripts/sanitize.sh [asan|tsan] [CTEST ARGUMENT...]" >&2
        exit 2
        ;;
esac

scripts/install-dependencies.sh build test lint
build "$preset"
# Everything takes several times as long here.
run_tests "$preset" --timeout 300 "$@"
