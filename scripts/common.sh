# SPDX-License-Identifier: Apache-2.0
# What the scripts share; sourced by them from the project's top folder.

# The builds that may run at once: one for each processor, fewer where memory is short (a file needs
# up to about 1 GiB to compile).
parallel_jobs() {
    local processors memory
    processors=$(nproc)
    memory=$(awk '/^MemAvailable:/ { print int($2 / 1048576) }' /proc/meminfo)
    [ "$memory" -ge 1 ] || memory=1
    echo $((memory < processors ? memory : processors))
}

# build PRESET: configures and builds, showing how far it is; what the tools say only on failure.
build() {
    local preset=$1 log
    mkdir -p "build/$preset"
    log=build/$preset/build.log
    cmake --preset "$preset" >"$log" 2>&1 </dev/null || {
        cat "$log" >&2
        return 1
    }
    if [ -t 1 ]; then
        cmake --build --preset "$preset" -j "$(parallel_jobs)" 2>&1 </dev/null | tee "$log" |
            awk -v preset="$preset" '/^\[[0-9]+\/[0-9]+\]/ { printf "\rbuilding %s %s ", preset, $1; fflush() }
                                     END { printf "\r\033[K" }'
    else
        # Every tenth step, so that a log kept by a machine tells a slow build from a stuck one.
        cmake --build --preset "$preset" -j "$(parallel_jobs)" 2>&1 </dev/null | tee "$log" |
            awk -v preset="$preset" '/^\[[0-9]+\/[0-9]+\]/ { if (++steps % 10 == 0) { print "building", preset, $1; fflush() } }'
    fi
    if [ "${PIPESTATUS[0]}" -ne 0 ]; then
        grep -vE '^\[[0-9]+/[0-9]+\] (Building|Linking)' "$log" >&2
        return 1
    fi
}

# run_tests PRESET [CTEST ARGUMENT...]: what the tests say only of those that fail; ctest's closing
# line in any case. No test at all is a failure.
run_tests() {
    local preset=$1 log status=0
    shift
    log=build/$preset/test.log
    ctest --preset "$preset" --no-tests=error -j "$(parallel_jobs)" "$@" </dev/null 2>&1 | tee "$log" |
        awk '/^ *[0-9]+\/[0-9]+ Test/ { split($1, at, "/"); if (at[1] % 50 == 0) { print "tested", $1; fflush() } }' ||
        true
    status=${PIPESTATUS[0]}
    if [ "$status" -ne 0 ]; then
        grep -vE 'Passed +[0-9.]+ sec$|^ +Start +[0-9]+:' "$log" >&2
    else
        grep -E 'tests passed' "$log"
    fi
    return "$status"
}
