# SPDX-License-Identifier: Apache-2.0
# What the scripts share; sourced by them from the project's top folder.

# The builds that may run at once: one for each processor, fewer where memory is short (a file needs
# up to about 1 GiB to compile).
parallel_jobs() {
    local processors memory
    processors=$(nproc)
    memory=$(awk '/^MemAvailable:/ { print int($2 / 1048576) }' /proc/meminfo 2>/dev/null) ||
        memory=$processors
    [ "$memory" -ge 1 ] || memory=1
    echo $((memory < processors ? memory : processors))
}

# build PRESET [CMAKE BUILD ARGUMENT...]: configures and builds, showing how far it is; what the tools
# say only on failure.
build() {
    local preset=$1 log=build/$1/build.log
    shift
    mkdir -p "build/$preset"
    if ! cmake --preset "$preset" >"$log" 2>&1 </dev/null; then
        cat "$log" >&2
        return 1
    fi
    if ! cmake --build --preset "$preset" -j "$(parallel_jobs)" "$@" 2>&1 </dev/null | tee "$log" |
        show_steps "built $preset" '^\[[0-9]+\/[0-9]+\]'; then
        grep -vE '^\[[0-9]+/[0-9]+\] (Building|Linking)' "$log" >&2
        return 1
    fi
}

# run_tests PRESET [CTEST ARGUMENT...]: what the tests say only of those that fail; ctest's closing
# line in any case. No test at all is a failure.
run_tests() {
    local preset=$1 log=build/$1/test.log
    shift
    if ! ctest --preset "$preset" --no-tests=error -j "$(parallel_jobs)" "$@" 2>&1 </dev/null |
        tee "$log" | show_steps "tested $preset" '^ *[0-9]+\/[0-9]+ Test'; then
        grep -vE 'Passed +[0-9.]+ sec|^ +Start +[0-9]+:' "$log" >&2
        return 1
    fi
    grep -E 'tests passed' "$log"
}

# show_steps LABEL PATTERN: of the lines on its input, shows the counts ("[12/340]", "12/340") that
# begin those matching the pattern: on a terminal in place, elsewhere every fiftieth, so that a log
# tells a slow run from a stuck one.
show_steps() {
    local terminal=0
    if [ -t 1 ]; then terminal=1; fi
    awk -v label="$1" -v pattern="$2" -v terminal="$terminal" '
        $0 !~ pattern { next }
        terminal { printf "\r%s %s ", label, $1; fflush(); next }
        ++steps % 50 == 0 { print label, $1; fflush() }
        END { if (terminal) printf "\r\033[K" }'
}
