#!/usr/bin/env bash
# SPDX-License-Identifier: Apache-2.0
# Installs what is missing, builds the debug version and runs every test.
#   scripts/test.sh [CTEST ARGUMENT...]      e.g. scripts/test.sh -R '^core'
set -euo pipefail
cd "$(dirname "$0")/.."
. scripts/common.sh

scripts/install-dependencies.sh build test
build dev
run_tests dev "$@"
