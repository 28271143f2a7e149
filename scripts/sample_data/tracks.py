# SPDX-License-Identifier: Apache-2.0
"""Workouts: GPX, TCX and FIT."""

import math
import struct
from datetime import datetime, timedelta

from .common import FROHNLEITEN, HOME, SUMMIT, iso, local, utc

METRES_PER_DEGREE = 111195.0


def walk(start, end, begin, metres_per_second, every):
    """(time, latitude, longitude, elevation) from start to end, on a winding way north and back."""
    total = (end - start).total_seconds()
    points = []
    seconds = 0
    while seconds <= total:
        there = min(seconds, total - seconds) * metres_per_second
        latitude = begin[0] + there / METRES_PER_DEGREE
        longitude = begin[1] + 0.0004 * math.sin(there / 150.0)
        elevation = 400 + there * 0.12
        points.append((start + timedelta(seconds=seconds), latitude, longitude, elevation))
        seconds += every
    return points


def way(start, end, begin, goal, every):
    """The same from one place to another."""
    total = (end - start).total_seconds()
    points = []
    for seconds in range(0, int(total) + 1, every):
        share = seconds / total
        bend = 0.004 * math.sin(share * 19)
        points.append((start + timedelta(seconds=seconds),
                       begin[0] + (goal[0] - begin[0]) * share + bend * share * (1 - share),
                       begin[1] + (goal[1] - begin[1]) * share + bend, 480 - 130 * share))
    return points


def gpx(name, kind, points):
    lines = [
        '<?xml version="1.0" encoding="UTF-8"?>',
        '<gpx version="1.1" creator="make-sample-data" xmlns="http://www.topografix.com/GPX/1/1">',
        "  <trk>",
        f"    <name>{name}</name>",
    ]
    if kind:
        lines.append(f"    <type>{kind}</type>")
    lines.append("    <trkseg>")
    for time, latitude, longitude, elevation in points:
        lines.append(
            f'      <trkpt lat="{latitude:.6f}" lon="{longitude:.6f}"><ele>{elevation:.0f}</ele>'
            f"<time>{iso(time)}</time></trkpt>"
        )
    lines += ["    </trkseg>", "  </trk>", "</gpx>", ""]
    return "\n".join(lines)


def tcx(sport, points):
    start = points[0][0]
    seconds = (points[-1][0] - start).total_seconds()
    lines = [
        '<?xml version="1.0" encoding="UTF-8"?>',
        '<TrainingCenterDatabase xmlns="http://www.garmin.com/xmlschemas/'
        'TrainingCenterDatabase/v2">',
        f'  <Activities><Activity Sport="{sport}">',
        f"    <Id>{iso(start)}</Id>",
        f'    <Lap StartTime="{iso(start)}">',
        f"      <TotalTimeSeconds>{seconds:.0f}</TotalTimeSeconds>",
        "      <Intensity>Active</Intensity><TriggerMethod>Manual</TriggerMethod>",
        "      <Track>",
    ]
    for time, latitude, longitude, _ in points:
        lines.append(
            f"        <Trackpoint><Time>{iso(time)}</Time><Position>"
            f"<LatitudeDegrees>{latitude:.6f}</LatitudeDegrees>"
            f"<LongitudeDegrees>{longitude:.6f}</LongitudeDegrees></Position></Trackpoint>"
        )
    lines += ["      </Track>", "    </Lap>", "  </Activity></Activities>",
              "</TrainingCenterDatabase>", ""]
    return "\n".join(lines)


# FIT: developer.garmin.com/fit/protocol. A field is (number, base type, struct's code).

ENUM, UINT8, UINT16, SINT32, UINT32 = 0x00, 0x02, 0x84, 0x85, 0x86
CODES = {ENUM: "B", UINT8: "B", UINT16: "H", SINT32: "i", UINT32: "I"}
FILE_ID, SESSION, RECORD, ACTIVITY = 0, 18, 20, 34
TIMESTAMP = 253
FIT_EPOCH = datetime(1989, 12, 31)


def checksum(data):
    table = [0x0000, 0xCC01, 0xD801, 0x1400, 0xF001, 0x3C00, 0x2800, 0xE401, 0xA001, 0x6C00,
             0x7800, 0xB401, 0x5000, 0x9C01, 0x8801, 0x4400]
    total = 0
    for byte in data:
        for half in (byte & 0xF, byte >> 4):
            total = (total >> 4) ^ table[total & 0xF] ^ table[half]
    return struct.pack("<H", total)


def fit(sport, sub_sport, start, seconds, points):
    """A recording as a watch writes it; without points one made indoors."""
    body = b""

    def define(kind, message, fields):
        nonlocal body
        body += struct.pack("<BBBHB", 0x40 | kind, 0, 0, message, len(fields))
        for number, base in fields:
            body += struct.pack("<BBB", number, struct.calcsize(CODES[base]), base)
        code = "<B" + "".join(CODES[base] for _, base in fields)

        def data(*values):
            nonlocal body
            body += struct.pack(code, kind, *values)
        return data

    def stamp(time):
        return int((time - FIT_EPOCH).total_seconds())

    end = stamp(start) + seconds
    define(0, FILE_ID, [(0, ENUM), (1, UINT16), (4, UINT32)])(4, 255, stamp(start))
    record = define(1, RECORD, [(TIMESTAMP, UINT32), (0, SINT32), (1, SINT32)])
    for time, latitude, longitude, _ in points:
        record(stamp(time), round(latitude / 180 * 2**31), round(longitude / 180 * 2**31))
    define(2, SESSION, [(TIMESTAMP, UINT32), (2, UINT32), (7, UINT32), (5, ENUM), (6, ENUM)])(
        end, stamp(start), seconds * 1000, sport, sub_sport)
    define(3, ACTIVITY, [(TIMESTAMP, UINT32), (5, UINT32), (1, UINT16)])(end, end + 7200, 1)
    header = struct.pack("<BBHI4s", 14, 0x20, 2132, len(body), b".FIT")
    whole = header + checksum(header) + body
    return whole + checksum(whole)


CYCLING, SWIMMING, CLIMBING = 2, 5, 31
LAP_SWIMMING, INDOOR_CLIMBING = 17, 68


def make_tracks(folder):
    folder.mkdir(parents=True, exist_ok=True)

    def write(name, text):
        (folder / name).write_text(text)

    river = walk(local("2024-05-20T10:00:00"), local("2024-05-20T11:05:00"), HOME, 5.5, 30)
    (folder / "2024-05-20-10-00-00.fit").write_bytes(fit(CYCLING, 0, river[0][0], 3900, river))
    (folder / "2024-05-23-18-05-00.fit").write_bytes(
        fit(CLIMBING, INDOOR_CLIMBING, local("2024-05-23T18:05:00"), 4500, []))
    (folder / "2024-05-26-15-05-00.fit").write_bytes(
        fit(SWIMMING, LAP_SWIMMING, local("2024-05-26T15:05:00"), 2280, []))
    for start, end in (("2024-05-22T18:00:00", "2024-05-22T18:42:00"),
                       ("2024-05-28T18:10:00", "2024-05-28T18:46:00")):
        run = walk(local(start), local(end), HOME, 2.7, 30)
        write(f"{start[:10]}-run.tcx", tcx("Running", run))
    write("2024-06-01-mur.gpx", gpx("An der Mur nach Graz", "cycling",
                                    way(local("2024-06-01T10:15:00"), local("2024-06-01T11:40:00"),
                                        FROHNLEITEN, HOME, 60)))
    write("2024-06-04-run.gpx", gpx("Laufen", "running",
                                    walk(local("2024-06-04T18:10:00"), local("2024-06-04T18:55:00"),
                                         HOME, 2.9, 60)))

    hike = walk(utc("2024-06-15T08:02:00"), utc("2024-06-15T10:31:00"), SUMMIT, 0.9, 60)
    run = walk(utc("2024-06-12T16:30:00"), utc("2024-06-12T17:15:00"), HOME, 2.8, 30)
    ride = walk(utc("2024-06-13T15:00:00"), utc("2024-06-13T16:20:00"), HOME, 6.0, 30)
    hike_file = gpx("Rundweg", "hiking", hike)
    write("2024-06-15-hike.gpx", hike_file)
    write("2024-06-12-run.tcx", tcx("Running", run))
    write("2024-06-13-ride.gpx", gpx("Feierabendrunde", None, ride))
    write("2024-06-14-broken.gpx", hike_file[:1200])
