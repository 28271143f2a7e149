#!/usr/bin/env bash
# SPDX-License-Identifier: Apache-2.0
# Builds the Debian package, checks it with lintian and prints its path below build/package.
#   scripts/package.sh [--lintian]       --lintian shows its warnings, too
set -euo pipefail
cd "$(dirname "$0")/.."
. scripts/common.sh

warnings=0
case ${1:-} in
    '') ;;
    --lintian) warnings=1 ;;
    *) echo "usage: scripts/package.sh [--lintian]" >&2; exit 2 ;;
esac

scripts/install-dependencies.sh build package

version=$(dpkg-parsechangelog -S Version)
grep -q "^project(keepsakesd VERSION ${version%%-*} " CMakeLists.txt || {
    echo "debian/changelog has version $version and CMakeLists.txt another" >&2
    exit 1
}

build release --target keepsakesd keepsakesctl keepsakes-indexer
export DEB_RULES_REQUIRES_ROOT=no
folder=$PWD/build/package
log=$folder/package.log
mkdir -p "$folder"
rm -f "$folder"/*.deb
if ! { dpkg-checkbuilddeps && debian/rules clean &&
       PACKAGE_FOLDER=$folder debian/rules binary; } >"$log" 2>&1 </dev/null; then
    cat "$log" >&2
    exit 1
fi
debian/rules clean >>"$log" 2>&1

package=$folder/keepsakesd_${version}_$(dpkg --print-architecture).deb
remarks=$(lintian --fail-on error "$package" 2>&1) || { printf '%s\n' "$remarks" >&2; exit 1; }
if [ "$warnings" -eq 1 ] && [ -n "$remarks" ]; then printf '%s\n' "$remarks"; fi
printf '%s\n' "$package"
