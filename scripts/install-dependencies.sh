#!/usr/bin/env bash
# SPDX-License-Identifier: Apache-2.0
# Installs from Debian 12 what the project needs and this machine does not have yet.
#   scripts/install-dependencies.sh [build] [test] [lint] [package]   (all when none is named)
# Says nothing when nothing is missing. Needs root, or sudo.
set -euo pipefail

declare -A packages=(
    [build]="ccache cmake g++ git libcli11-dev libexiv2-dev libexpat1-dev libfmt-dev libical-dev libicu-dev libpugixml-dev
             libseccomp-dev libspdlog-dev libsqlite3-dev libsqlitecpp-dev libsystemd-dev
             libtomlplusplus-dev libxml2-dev nettle-dev ninja-build nlohmann-json3-dev pkg-config tzdata"
    [test]="bash-completion binutils dbus dbus-daemon dbus-user-session libglib2.0-bin libgmock-dev libgtest-dev python3
            python3-dbus python3-dbusmock python3-gi python3-seccomp sqlite3 systemd"
    [lint]="clang-19 clang-format-14 clang-tidy-19 libclang-rt-19-dev"
    [package]="build-essential debhelper dpkg-dev lintian"
)

groups=("$@")
[ ${#groups[@]} -gt 0 ] || groups=(build test lint package)
wanted=()
for group in "${groups[@]}"; do
    [ -n "${packages[$group]:-}" ] || { echo "unknown group: $group (build, test, lint, package)" >&2; exit 2; }
    read -r -d '' -a more <<<"${packages[$group]}" || true
    wanted+=("${more[@]}")
done

missing=()
for package in "${wanted[@]}"; do
    status=$(dpkg-query -W -f '${db:Status-Status}' "$package" 2>/dev/null || true)
    [ "$status" = installed ] || missing+=("$package")
done
[ ${#missing[@]} -gt 0 ] || exit 0

as_root=()
if [ "$(id -u)" -ne 0 ]; then
    command -v sudo >/dev/null || {
        echo "these packages are missing, and there is no sudo to install them with: ${missing[*]}" >&2
        exit 1
    }
    as_root=(sudo)
fi

echo "installing ${#missing[@]} packages: ${missing[*]}"
log=$(mktemp)
trap 'rm -f "$log"' EXIT
apt() {
    "${as_root[@]}" env DEBIAN_FRONTEND=noninteractive apt-get -q -y \
        -o Acquire::Retries=3 -o DPkg::Lock::Timeout=300 "$@" >>"$log" 2>&1 </dev/null
}
# Lists may be old or absent: fetched when the packages cannot be installed with what is there.
if ! apt install --no-install-recommends "${missing[@]}"; then
    : >"$log"
    { apt update && apt install --no-install-recommends "${missing[@]}"; } || {
        cat "$log" >&2
        echo "the packages could not be installed" >&2
        exit 1
    }
fi
