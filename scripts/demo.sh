#!/usr/bin/env bash
# SPDX-License-Identifier: Apache-2.0
# Shows the daemon at work: collects, bundles and prints what it would suggest.
#   scripts/demo.sh                 the sample owner's month, May and June 2024, week by week
#   scripts/demo.sh FOLDER...       your own recordings, at the end of the last week they hold
# Nothing of yours is changed: the daemon runs on a message bus of its own and keeps its database in
# a temporary folder that is removed at the end. Folders given are only read.
set -euo pipefail

stage=start
if [ "${1:-}" = --inside-bus ]; then
    stage=inside
    shift
fi

caller=$PWD
cd "$(dirname "$0")/.."
. scripts/common.sh
bin=$PWD/build/release/bin

# toml_strings PATH...: the paths as the inside of a TOML array.
toml_strings() {
    local path separator=
    for path in "$@"; do
        path=${path//\\/\\\\}
        path=${path//\"/\\\"}
        # The configuration expands $NAME; nothing here means that.
        case $path in *'$'*) echo "a folder's name must not hold a \$: $path" >&2; return 1 ;; esac
        printf '%s"%s"' "$separator" "$path"
        separator=', '
    done
}

# newest_record INDEX: the end of the newest workout, photo occasion, visit, message, call or
# suggested calendar entry, in seconds since 2001. Calendars know the future, which is left out, and
# birthdays come every year: what recurs counts where there is nothing else.
newest_record() {
    local suggested="SELECT max(end) FROM calendarEvents WHERE category IS NOT NULL
                     AND end <= strftime('%s', 'now') - 978307200"
    sqlite3 -readonly "$1" "SELECT coalesce(max(moment), ($suggested))
                            FROM (SELECT max(end) AS moment FROM workouts
                            UNION ALL SELECT max(end) FROM occasions
                            UNION ALL SELECT max(end) FROM visits WHERE place IS NOT NULL
                            UNION ALL SELECT max(end) FROM interactions
                            UNION ALL $suggested AND NOT recurs)"
}

# records_by_week INDEX: "2024, week 24: 5 2 12 1" for the eight newest weeks with records.
records_by_week() {
    sqlite3 -readonly "$1" "
        SELECT strftime('  %Y, week %W: ', end + 978307200, 'unixepoch', 'localtime')
               || sum(kind = 1) || ' ' || sum(kind = 2) || ' ' || sum(kind = 3) || ' '
               || sum(kind = 4)
        FROM (SELECT end, 1 AS kind FROM workouts UNION ALL SELECT end, 2 FROM occasions
              UNION ALL SELECT end, 3 FROM visits WHERE place IS NOT NULL
              UNION ALL SELECT end, 4 FROM calendarEvents WHERE category IS NOT NULL AND NOT recurs
                            AND end <= strftime('%s', 'now') - 978307200)
        GROUP BY strftime('%Y %W', end + 978307200, 'unixepoch', 'localtime')
        ORDER BY max(end) DESC LIMIT 8"
}

if [ "$stage" = start ]; then
    scripts/install-dependencies.sh build test
    build release --target keepsakesd keepsakesctl keepsakes-indexer

    folders=()
    for folder in "$@"; do
        [[ $folder = /* ]] || folder=$caller/$folder
        [ -d "$folder" ] || { echo "not a folder: $folder" >&2; exit 2; }
        folders+=("$(realpath "$folder")")
    done

    home=$(mktemp -d --tmpdir keepsakes-demo.XXXXXX)
    trap 'rm -rf "$home"' EXIT
    export HOME=$home XDG_CACHE_HOME=$home/cache XDG_CONFIG_HOME=$home/config
    export XDG_STATE_HOME=$home/state XDG_DATA_HOME=$home/data XDG_RUNTIME_DIR=$home/run
    mkdir -m 700 "$XDG_RUNTIME_DIR"

    if [ ${#folders[@]} -eq 0 ]; then
        tracks=("$PWD/data/sample/tracks")
        photos=("$PWD/data/sample/photos")
        places=("$PWD/data/sample/places")
        messages=("$PWD/data/sample/messages")
        contacts=("$PWD/data/sample/contacts")
        calendars=("$PWD/data/sample/calendars")
        export TZ=Europe/Vienna
        chats=("+43 664 555 00 77")  # Tom's: all links in it count
        # Visits are kept for seven days from when they were found: the ten minutes more each week make
        # sure that those of the week before are purged.
        evenings=(2024-05-26T19:30:00+02:00 2024-06-02T19:40:00+02:00 2024-06-09T19:50:00+02:00
            2024-06-16T20:00:00+02:00)
    else
        tracks=("${folders[@]}")
        photos=("${folders[@]}")
        places=()
        messages=("${folders[@]}")
        contacts=("${folders[@]}")
        calendars=("${folders[@]}")
        chats=()
        echo "reading ${folders[*]}"
        "$bin/keepsakes-indexer" --index "$home/look.sqlite" --tracks "${tracks[@]}" \
            --photos "${photos[@]}" --messages "${messages[@]}" \
            --contacts "${contacts[@]}" --calendars "${calendars[@]}" --human
        newest=$(newest_record "$home/look.sqlite")
        if [ -z "$newest" ]; then
            echo "There is no workout, photo occasion, visit, message or suggested calendar entry in" \
                 "these folders, so there is nothing to suggest. The lines above say which files were passed over and why."
            exit 1
        fi
        echo
        echo "By week, the newest first (workouts, photo occasions, visits, suggested entries):"
        records_by_week "$home/look.sqlite"
        # Midnight after the Sunday that ends the week of the newest record.
        unix=$((${newest%.*} + 978307200))
        weekday=$(date -d "@$unix" +%u)
        evenings=("$(date -d "$(date -d "@$unix" +%F) + $((8 - weekday)) days" +%FT%T%:z)")
    fi

    # Assigned first: a failure inside the text below would go unnoticed.
    track_folders=$(toml_strings "${tracks[@]}")
    photo_folders=$(toml_strings "${photos[@]}")
    place_folders=$(toml_strings ${places[@]+"${places[@]}"})
    message_folders=$(toml_strings "${messages[@]}")
    contact_folders=$(toml_strings "${contacts[@]}")
    calendar_folders=$(toml_strings "${calendars[@]}")
    chat_names=$(toml_strings ${chats[@]+"${chats[@]}"})
    mkdir -p "$XDG_CONFIG_HOME/keepsakesd"
    cat >"$XDG_CONFIG_HOME/keepsakesd/config.toml" <<EOF
[device_data]
tracks    = [$track_folders]
photos    = [$photo_folders]
calendars = [$calendar_folders]
messages  = [$message_folders]
contacts  = [$contact_folders]
places    = [$place_folders]
media     = false           # no player is on this bus
[links]
chats     = [$chat_names]
[activities]                # nothing runs but what this script asks for
collection = "0"
compute    = "0"
purge      = "0"
EOF
    of=sample
    if [ "$#" -gt 0 ]; then of=yours; fi
    status=0
    dbus-run-session -- "$0" --inside-bus "$of" "${evenings[@]}" || status=$?
    exit "$status"
fi

# From here on: inside the private bus.
of=$1
shift
log=$HOME/daemon.log
ctl=$bin/keepsakesctl

fail() {
    echo "$1" >&2
    cat "$log" >&2
    kill -TERM "$daemon" 2>/dev/null || true
    wait "$daemon" 2>/dev/null || true
    exit 1
}
start_daemon() {
    "$bin/keepsakesd" --config "$XDG_CONFIG_HOME/keepsakesd/config.toml" --now "$1" 2>>"$log" &
    daemon=$!
    local attempt
    for ((attempt = 0; ; ++attempt)); do
        "$ctl" status >/dev/null 2>&1 && break
        kill -0 "$daemon" 2>/dev/null || fail "the daemon did not start:"
        [ "$attempt" -lt 100 ] || fail "the daemon did not answer within 10 seconds:"
        sleep 0.1
    done
}
stop() {
    kill -TERM "$daemon" 2>/dev/null || true
    wait "$daemon" || { echo "the daemon did not end in order:" >&2; cat "$log" >&2; return 1; }
}
step() {
    echo
    echo "\$ keepsakesctl $*"
    "$ctl" "$@" || fail "keepsakesctl $* failed with status $?; the daemon's log:"
}
count() { "$ctl" "$1" --json | python3 -c 'import json, sys; print(len(json.load(sys.stdin)))'; }

# collect_and_bundle NOW: the week before.
collect_and_bundle() {
    "$ctl" defaults write com.brindle.keepsakesd EventManagerEventCollectionStartDate \
        "$(date -d "$1 - 7 days" +%FT%T%:z)"
    step collect
    sed -n 's/.*: \(collected, .*\)/\1/p' "$log" | tail -n 1
    step bundle
}

# put_plays NOW: a demonstration cannot listen to players for days; what was played until then is put
# where the daemon would have written it.
put_plays() {
    sqlite3 -bail "$XDG_CACHE_HOME/com.brindle.keepsakesd/mediaStream.sqlite" \
        '.import --csv data/sample/media/plays.csv sample' \
        "INSERT INTO records(timestamp, state, duration, title, album, artist, genre, bundleID)
         SELECT timestamp, state, duration, title, nullif(album, ''), nullif(artist, ''), genre,
                bundleID
         FROM sample
         WHERE CAST(timestamp AS REAL) <= $(date -d "$1" +%s) - 978307200
           AND CAST(timestamp AS REAL) > (SELECT coalesce(max(timestamp), 0) FROM records)" \
        'DROP TABLE sample' || fail "the sample's plays could not be put in place:"
}

"$ctl" defaults write com.brindle.Sharelane LinkshelfEnabled true

if [ "$of" = yours ]; then
    now=$1
    start_daemon "$now"
    echo "It is $now for the daemon, which looks back a week."
    collect_and_bundle "$now"
    step events
    step bundles
    step status
    events=$(count events)
    bundles=$(count bundles)
    stop || exit 1
    cat <<EOF

In that week: events: $events, bundles: $bundles.
Why not more: this run looks at the week before $now only (all weeks stand above);
files that cannot be read, or that carry no time, are passed over (status names them above);
a bundle needs events that overlap in time, such as photos taken during a recorded walk.
EOF
    [ "$events" -gt 0 ]
    exit
fi

cat <<EOF
The sample owner's month, as keepsakesd sees it at the end of each week. The files of the whole month
lie there from the start. What was played was not heard: it is taken from data/sample/media/plays.csv.
EOF
week=0
for now in "$@"; do
    week=$((week + 1))
    monday=$(date -d "$now - 6 days" +%F)
    sunday=$(date -d "$now" +%F)
    start_daemon "$now"
    put_plays "$now"
    echo
    echo "==== Week $week: for the daemon it is Sunday, $sunday, $(date -d "$now" +%H:%M) ===="
    collect_and_bundle "$now"
    if [ "$week" -gt 1 ]; then step purge; fi
    step events --since "$monday" --until "$sunday"
    step bundles --since "$monday" --until "$sunday" --filtered --brief
    if [ "$week" -lt "$#" ]; then stop || exit 1; fi
done
echo
echo "==== The last day beside the four weeks before ===="
echo "Visits are kept for a week, so that of work there are the days of this week."
step trends --now "$now"
step status
events=$(count events)
stop || exit 1
[ "$events" -gt 0 ]
