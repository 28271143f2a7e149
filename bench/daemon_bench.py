#!/usr/bin/python3
# SPDX-License-Identifier: Apache-2.0
"""Starts the daemon on a private bus: the time until its name is there, and what it holds and does
at rest after a collection over 10,000 events."""
import os
import plistlib
import subprocess
import sys
import tempfile
import time
from datetime import datetime
from pathlib import Path

BIN = Path(__file__).resolve().parent
NAME = "com.brindle.keepsakesd"
EVENTS = 10000
REST_SECONDS = 30
NOW = "2024-06-16T20:00:00Z"


def write_tracks(folder):
    folder.mkdir()
    with open(folder / "many.gpx", "w", encoding="utf-8") as out:
        out.write('<gpx version="1.1" xmlns="http://www.topografix.com/GPX/1/1">')
        for number in range(EVENTS):
            begin = 1718000000 - 60 * number
            out.write("<trk><type>running</type><trkseg>")
            for point in range(3):
                stamp = time.strftime("%Y-%m-%dT%H:%M:%SZ", time.gmtime(begin + 10 * point))
                out.write(f'<trkpt lat="48.{point}" lon="16.3"><time>{stamp}</time></trkpt>')
            out.write("</trkseg></trk>")
        out.write("</gpx>")


def remember_activities(state):
    """As though all had just run: their timers are armed, and none is due while we measure."""
    folder = Path(state) / "keepsakesd"
    folder.mkdir(parents=True)
    ran = datetime.strptime(NOW, "%Y-%m-%dT%H:%M:%SZ")
    with open(folder / "activities.plist", "wb") as out:
        plistlib.dump({f"{NAME}.event{activity}": ran
                       for activity in ("Collection", "Compute", "Purge")}, out)


def owned(bus):
    import dbus
    return bus.name_has_owner(NAME)


def ctl(*arguments):
    return subprocess.run([BIN / "keepsakesctl", *arguments], check=True, capture_output=True,
                          text=True).stdout


def status_of(pid, key):
    for line in Path(f"/proc/{pid}/status").read_text(encoding="ascii").splitlines():
        if line.startswith(key + ":"):
            return int(line.split()[1])
    return 0


def switches(pid):
    total = 0
    for task in Path(f"/proc/{pid}/task").iterdir():
        for line in (task / "status").read_text(encoding="ascii").splitlines():
            if "voluntary_ctxt_switches" in line:
                total += int(line.split()[1])
    return total


def start(config):
    return subprocess.Popen([BIN / "keepsakesd", "--config", config, "--log-level", "error",
                             "--now", NOW])


def time_to_name(bus, config):
    best = 1e9
    for _ in range(5):
        begin = time.monotonic()
        daemon = start(config)
        while not owned(bus):
            time.sleep(0.001)
        best = min(best, time.monotonic() - begin)
        daemon.terminate()
        daemon.wait()
    return best * 1000


def main():
    if "KEEPSAKES_PRIVATE_BUS" not in os.environ:
        os.environ["KEEPSAKES_PRIVATE_BUS"] = "1"
        os.execvp("dbus-run-session", ["dbus-run-session", "--", sys.executable, __file__])
    import dbus
    bus = dbus.SessionBus()
    with tempfile.TemporaryDirectory(prefix="keepsakes-bench-") as home:
        for name in ("CACHE", "CONFIG", "STATE"):
            os.environ[f"XDG_{name}_HOME"] = f"{home}/{name.lower()}"
        remember_activities(os.environ["XDG_STATE_HOME"])
        tracks = Path(home) / "tracks"
        write_tracks(tracks)
        config = Path(home) / "config.toml"
        config.write_text(f'[device_data]\ntracks = ["{tracks}"]\nphotos = []\n', encoding="utf-8")
        took = time_to_name(bus, config)
        print(f"start to name on the bus|{took:.1f} ms|100 ms|{took / 100:.2f}|1")

        ctl("defaults", "write", NAME, "EventManagerEventCollectionStartDate",
            "2020-01-01T00:00:00Z")
        daemon = start(config)
        while not owned(bus):
            time.sleep(0.01)
        ctl("collect")
        time.sleep(REST_SECONDS + 10)
        before = switches(daemon.pid)
        time.sleep(REST_SECONDS)
        woken = switches(daemon.pid) - before
        resident = status_of(daemon.pid, "VmRSS") / 1024
        limit = 20
        print(f"resident at rest after collecting {EVENTS:,} events|{resident:.1f} MiB|{limit} MiB|"
              f"{resident / limit:.2f}|1")
        print(f"wake-ups in {REST_SECONDS} s at rest|{woken}|0|{woken}|0")
        daemon.terminate()
        daemon.wait()


main()
