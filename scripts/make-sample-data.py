#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""Makes data/sample: the tracks, places, photos, messages and contacts of an invented week that
ends on Sunday, 2024-06-16.

Needs the exiv2 command line tool. The same call makes the same bytes.

    scripts/make-sample-data.py [FOLDER]     (default: data/sample beside this script's folder)

The owner lives in Graz (Europe/Vienna, UTC+2 that week):
  Wednesday  a run (TCX), with photos of the baby and the dog on the way
  Thursday   a bike ride (GPX without a type)
  Friday     a birthday party in the evening
  Friday to Sunday a phone's log of where the owner was (GPX): at home, at work, at the trailhead
             and in an inn on Saturday, in a concert hall on Saturday night, at a lake on Sunday;
             home, work, the inn and the hall are waypoints of the owner's
  Saturday   a hike (GPX), with photos
and what she listened to that week, as records of the now-playing stream (CSV);
and, in the weeks before and during that one, text messages and calls with Anna Beispiel (an Android
backup), mails with Jakob Muster (a Maildir), a newsletter, and an address book that knows both; a link in
one of the messages and in one of the mails, which the owner marked;
a calendar: two days in Vienna by train with a hotel, a film, a birthday party, and a weekly meeting
that is no suggestion;
and two files that cannot be read: a GPX file cut in the middle, a photo without a date.
"""

import csv
import math
import struct
import subprocess
import sys
import zlib
from datetime import datetime, timedelta
from pathlib import Path

LOCAL_OFFSET = timedelta(hours=2)
HOME = (47.0790, 15.4500)
SUMMIT = (47.2040, 15.4660)
OFFICE = (47.0585, 15.4590)
INN = (47.2065, 15.4672)
HALL = (47.0708, 15.4446)
LAKE = (46.6247, 14.1530)  # farther from home than the surroundings reach
METRES_PER_DEGREE = 111195.0


def utc(text):
    return datetime.fromisoformat(text)


def iso(time):
    return time.strftime("%Y-%m-%dT%H:%M:%SZ")


# Tracks


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


STAYS = [
    # place, from, to (UTC): what a phone writes, every quarter of an hour while it lies still
    (HOME, "2024-06-13T22:10:00", "2024-06-14T05:40:00"),
    (OFFICE, "2024-06-14T06:10:00", "2024-06-14T14:30:00"),
    (HOME, "2024-06-14T15:00:00", "2024-06-15T07:10:00"),
    (SUMMIT, "2024-06-15T07:40:00", "2024-06-15T08:00:00"),
    (INN, "2024-06-15T10:34:00", "2024-06-15T11:50:00"),
    (HOME, "2024-06-15T12:20:00", "2024-06-15T16:50:00"),
    (HALL, "2024-06-15T17:15:00", "2024-06-15T20:40:00"),
    (HOME, "2024-06-15T21:05:00", "2024-06-16T06:30:00"),
    (LAKE, "2024-06-16T08:20:00", "2024-06-16T14:00:00"),
    (HOME, "2024-06-16T15:50:00", "2024-06-16T17:50:00"),
]
PLACES = [("Zuhause", HOME), ("Arbeit", OFFICE), ("Gasthof Schöckl", INN), ("Konzerthaus", HALL)]


def phone_log():
    """Points of the stays, and a point a minute on the straight ways between them."""
    points = []
    for number, (place, start, end) in enumerate(STAYS):
        time = utc(start)
        while time <= utc(end):
            wander = 1e-4 * math.sin(len(points) * 1.7)
            points.append((time, place[0] + wander, place[1] - wander / 2, 400))
            time += timedelta(minutes=15)
        if number + 1 < len(STAYS) and STAYS[number + 1][0] != INN:  # the hike's own track
            there, arrival = STAYS[number + 1][0], utc(STAYS[number + 1][1])
            begin = utc(end)
            for minute in range(1, int((arrival - begin).total_seconds() // 60), 3):
                share = minute * 60 / (arrival - begin).total_seconds()
                points.append((begin + timedelta(minutes=minute),
                               place[0] + (there[0] - place[0]) * share,
                               place[1] + (there[1] - place[1]) * share, 400))
    return points


def waypoints(places):
    lines = [
        '<?xml version="1.0" encoding="UTF-8"?>',
        '<gpx version="1.1" creator="make-sample-data" xmlns="http://www.topografix.com/GPX/1/1">',
    ]
    for name, (latitude, longitude) in places:
        lines.append(f'  <wpt lat="{latitude:.6f}" lon="{longitude:.6f}"><name>{name}</name></wpt>')
    lines += ["</gpx>", ""]
    return "\n".join(lines)


def make_tracks(folder):
    folder.mkdir(parents=True, exist_ok=True)
    hike = walk(utc("2024-06-15T08:02:00"), utc("2024-06-15T10:31:00"), SUMMIT, 0.9, 60)
    run = walk(utc("2024-06-12T16:30:00"), utc("2024-06-12T17:15:00"), HOME, 2.8, 30)
    ride = walk(utc("2024-06-13T15:00:00"), utc("2024-06-13T16:20:00"), HOME, 6.0, 30)
    hike_file = gpx("Rundweg", "hiking", hike)
    (folder / "2024-06-15-hike.gpx").write_text(hike_file)
    (folder / "2024-06-12-run.tcx").write_text(tcx("Running", run))
    (folder / "2024-06-13-ride.gpx").write_text(gpx("Feierabendrunde", None, ride))
    (folder / "2024-06-14-broken.gpx").write_text(hike_file[:1200])
    (folder / "phone-2024-06-14-to-16.gpx").write_text(gpx("Handy", None, phone_log()))


# Images: a gradient of 64 x 48 pixels, of a colour of its own for each photo.


def png(seed):
    rows = b""
    for y in range(48):
        row = bytearray([0])
        for x in range(64):
            row += bytes(((seed * 37 + 4 * x) % 256, (seed * 91 + 5 * y) % 256, 128))
        rows += bytes(row)

    def chunk(kind, data):
        return (struct.pack(">I", len(data)) + kind + data
                + struct.pack(">I", zlib.crc32(kind + data)))

    header = struct.pack(">IIBBBBB", 64, 48, 8, 2, 0, 0, 0)
    return (b"\x89PNG\r\n\x1a\n" + chunk(b"IHDR", header)
            + chunk(b"IDAT", zlib.compress(rows, 9)) + chunk(b"IEND", b""))


class BitWriter:
    def __init__(self):
        self.bits = ""

    def write(self, value, length):
        if length:
            self.bits += format(value, f"0{length}b")

    def done(self):
        bits = self.bits + "1" * (-len(self.bits) % 8)
        data = bytes(int(bits[i:i + 8], 2) for i in range(0, len(bits), 8))
        return data.replace(b"\xff", b"\xff\x00")


def jpeg(seed):
    """A grey baseline JPEG (ITU-T T.81): one value for each 8 x 8 block makes a coarse gradient."""
    lengths = bytes([0, 2, 3, 1, 1, 1, 1, 1] + [0] * 8)  # categories 0 to 9, of 2 to 8 bits
    categories = bytes(range(10))
    codes = {}
    code = 0
    index = 0
    for bits, count in enumerate(lengths, start=1):
        for _ in range(count):
            codes[categories[index]] = (code, bits)
            code += 1
            index += 1
        code <<= 1

    def segment(marker, data):
        return bytes([0xFF, marker]) + struct.pack(">H", len(data) + 2) + data

    writer = BitWriter()
    last = 0
    for block in range(8 * 6):
        level = ((seed * 23 + 12 * (block % 8) + 14 * (block // 8)) % 200) - 100
        difference = level - last
        last = level
        category = abs(difference).bit_length()
        writer.write(*codes[category])
        value = difference if difference >= 0 else difference + (1 << category) - 1
        writer.write(value, category)
        writer.write(0, 1)  # end of block, the only code of the AC table
    return (b"\xff\xd8"
            + segment(0xE0, b"JFIF\0\x01\x01\0\0\x01\0\x01\0\0")
            + segment(0xDB, b"\0" + bytes([8] * 64))
            + segment(0xC0, struct.pack(">BHHBBBB", 8, 48, 64, 1, 1, 0x11, 0))
            + segment(0xC4, b"\x00" + lengths + categories)
            + segment(0xC4, b"\x10" + bytes([1] + [0] * 15) + b"\0")
            + segment(0xDA, b"\x01\x01\0\0\x3f\0")
            + writer.done() + b"\xff\xd9")


# Photos


def sexagesimal(degrees):
    minutes = (degrees % 1) * 60
    return f"{int(degrees)}/1 {int(minutes)}/1 {round(minutes % 1 * 6000)}/100"


def metadata(local, zone, place, keywords, hierarchy, person, event):
    """exiv2's commands for one photo. `zone` says what tells the offset: offset, gps or none."""
    commands = [
        f"set Exif.Photo.DateTimeOriginal Ascii {local.strftime('%Y:%m:%d %H:%M:%S')}",
        "set Exif.Image.Make Ascii Sample",
    ]
    if zone == "offset":
        commands.append("set Exif.Photo.OffsetTimeOriginal Ascii +02:00")
    if zone == "gps":
        fix = local - LOCAL_OFFSET - timedelta(seconds=4)
        commands += [
            f"set Exif.GPSInfo.GPSDateStamp Ascii {fix.strftime('%Y:%m:%d')}",
            f"set Exif.GPSInfo.GPSTimeStamp Rational {fix.hour}/1 {fix.minute}/1 {fix.second}/1",
        ]
    if place:
        commands += [
            "set Exif.GPSInfo.GPSLatitudeRef Ascii N",
            f"set Exif.GPSInfo.GPSLatitude Rational {sexagesimal(place[0])}",
            "set Exif.GPSInfo.GPSLongitudeRef Ascii E",
            f"set Exif.GPSInfo.GPSLongitude Rational {sexagesimal(place[1])}",
        ]
    commands += [f"set Xmp.dc.subject XmpBag {word}" for word in keywords]
    commands += [f"set Xmp.lr.hierarchicalSubject XmpBag {path}" for path in hierarchy]
    if person:
        region = "Xmp.mwg-rs.Regions/mwg-rs:RegionList[1]"
        commands += [
            "set Xmp.mwg-rs.Regions XmpText type=Struct",
            "set Xmp.mwg-rs.Regions/mwg-rs:RegionList XmpText type=Bag",
            f"set {region}/mwg-rs:Name XmpText {person}",
            f"set {region}/mwg-rs:Type XmpText Face",
        ]
    if event:
        commands.append(f"set Xmp.iptcExt.Event LangAlt {event}")
    return commands


PHOTOS = [
    # name, local time, zone, place, keywords, hierarchy, person, event
    ("hike-1.jpg", "2024-06-15 10:12:40", "offset", (47.2090, 15.4662), ["mountain", "hiking"], [],
     None, None),
    ("hike-2.jpg", "2024-06-15 10:41:05", "gps", (47.2230, 15.4661), ["Berge", "Natur"], [], None,
     None),
    ("hike-3.jpg", "2024-06-15 11:10:30", "offset", (47.2360, 15.4663), ["Gipfel"],
     ["Freizeit|Wandern"], "Anna Beispiel", None),
    ("hike-4.jpg", "2024-06-15 11:16:12", "gps", (47.2390, 15.4660), ["mountain", "nature"], [],
     "Jakob Muster", None),
    ("hike-5.jpg", "2024-06-15 11:52:00", "none", (47.2240, 15.4662), ["Wald", "Wanderung"], [],
     None, None),
    ("hike-6.jpg", "2024-06-15 12:24:48", "offset", (47.2070, 15.4661), ["nature", "hiking"], [],
     None, None),
    ("run-baby-1.jpg", "2024-06-12 18:40:10", "offset", (47.0800, 15.4502), ["baby"], [], None,
     None),
    ("run-dog.jpg", "2024-06-12 18:52:30", "gps", (47.0850, 15.4501), ["Hund", "pet"], [], None,
     None),
    ("run-baby-2.jpg", "2024-06-12 19:05:00", "none", (47.0820, 15.4500), ["baby", "pet"], [],
     None, None),
    ("party-1.jpg", "2024-06-14 19:31:00", "offset", HOME, ["birthday"], [], "Anna Beispiel",
     None),
    ("party-2.jpg", "2024-06-14 20:02:15", "offset", HOME, ["birthday", "party"], [], None, None),
    ("party-3.jpg", "2024-06-14 20:40:00", "offset", None, ["birthday"], [], None,
     "Sommerfest im Hof"),
    ("party-4.jpg", "2024-06-14 20:58:20", "offset", HOME, ["birthday"], ["Feste|Geburtstag"],
     None, None),
    ("party-5.png", "2024-06-14 21:15:30", "offset", HOME, ["birthday", "Feier"], [],
     "Jakob Muster", None),
    ("concert-1.jpg", "2024-06-15 20:12:00", "offset", HALL, ["concert"], [], None, None),
    ("concert-2.jpg", "2024-06-15 21:47:30", "offset", HALL, ["Konzert"], [], "Anna Beispiel",
     None),
]


def make_photos(folder):
    folder.mkdir(parents=True, exist_ok=True)
    for seed, (name, local, zone, place, keywords, hierarchy, person, event) in enumerate(PHOTOS):
        path = folder / name
        path.write_bytes(png(seed) if name.endswith(".png") else jpeg(seed))
        commands = metadata(utc(local), zone, place, keywords, hierarchy, person, event)
        arguments = [part for command in commands for part in ("-M", command)]
        subprocess.run(["exiv2", *arguments, str(path)], check=True)
    (folder / "undated.jpg").write_bytes(jpeg(14))


def make_places(folder):
    folder.mkdir(parents=True, exist_ok=True)
    (folder / "places.gpx").write_text(waypoints(PLACES))


# What was played


SONG = ("Morgenlauf", "Die Beispiele", "Im Takt", "Pop", "org.example.Music", 214)
OTHER = ("Nur einmal", "Die Beispiele", "Im Takt", "Pop", "org.example.Music", 187)
EPISODE = ("Wege am Grat", "Berggespräche", "", "Podcast", "org.gnome.Podcasts", 2710)

PLAYS = [
    # item, local start, seconds played, how it ended (2 paused, 3 stopped, 4 gave way)
    (SONG, "2024-06-12 18:31:00", 214, 4),
    (OTHER, "2024-06-12 18:34:34", 187, 4),
    (SONG, "2024-06-12 18:40:00", 214, 4),
    (SONG, "2024-06-12 18:43:34", 214, 4),
    (SONG, "2024-06-12 18:47:08", 120, 2),
    (EPISODE, "2024-06-13 21:05:00", 1500, 2),
    (EPISODE, "2024-06-13 21:40:00", 1210, 3),
]


def make_plays(folder):
    """A row for the start and one for the end of each play; columns as in the stream's file."""
    folder.mkdir(parents=True, exist_ok=True)
    reference = datetime(2001, 1, 1)
    with open(folder / "plays.csv", "w", newline="", encoding="utf-8") as file:
        writer = csv.writer(file, lineterminator="\n")
        writer.writerow(["timestamp", "state", "duration", "title", "album", "artist", "genre",
                         "bundleID"])
        for (title, artist, album, genre, player, length), start, seconds, end in PLAYS:
            begin = (utc(start) - LOCAL_OFFSET - reference).total_seconds()
            for timestamp, state in ((begin, 1), (begin + seconds, end)):
                writer.writerow([f"{timestamp:.0f}", state, length, title, album, artist, genre,
                                 player])


# People

ANNA = "+436605551234"
OWNER = "ich@example.org"
JAKOB = "jakob.muster@example.org"

CARDS = """BEGIN:VCARD
VERSION:3.0
UID:anna-beispiel
FN:Anna Beispiel
N:Beispiel;Anna;;;
TEL;TYPE=CELL:+43 660 555 12 34
EMAIL;TYPE=HOME:anna@example.org
BDAY:1991-06-14
END:VCARD
BEGIN:VCARD
VERSION:4.0
UID:urn:uuid:4fbe8971-0bc3-424c-9c26-36c3e1eff6b1
FN:Jakob Muster
TEL;VALUE=uri;TYPE="voice,cell":tel:+43-676-555-98-76
EMAIL:jakob.muster@example.org
GEO:geo:47.0707,15.4395
END:VCARD
BEGIN:VCARD
VERSION:2.1
N;CHARSET=UTF-8;ENCODING=QUOTED-PRINTABLE:Gr=C3=BCn;Gro=C3=9Fmutter
TEL;HOME:0316/55512
END:VCARD
"""

# local time, 1 received or 2 sent
TEXTS = [
    ("2024-05-24 18:02:11", 1), ("2024-05-24 18:05:40", 2), ("2024-05-31 09:12:00", 2),
    ("2024-05-31 09:30:27", 1), ("2024-06-05 20:14:02", 1), ("2024-06-05 20:15:33", 2),
    ("2024-06-09 12:40:18", 2), ("2024-06-09 12:58:51", 1), ("2024-06-12 21:03:09", 1),
    ("2024-06-12 21:10:44", 2), ("2024-06-14 07:58:30", 2), ("2024-06-14 08:20:05", 1),
    ("2024-06-15 07:31:00", 1), ("2024-06-15 07:33:26", 2), ("2024-06-15 19:47:12", 1),
    ("2024-06-15 19:52:39", 2),
]

# A link that Anna sent in her twelfth message, which the owner locked, and one in Jakob's tenth
# mail, which the owner flagged.
LINK_IN_TEXT = (12, "https://example.com/konzert?karten=2")
LINK_IN_MAIL = (10, "https://example.org/touren/rettenbachklamm", "Durch die Rettenbachklamm")

# local time, seconds, 1 incoming, 2 outgoing or 3 missed
CALLS = [("2024-06-08 17:20:00", 611, 2), ("2024-06-14 18:40:10", 0, 3),
         ("2024-06-14 18:42:00", 184, 2)]

# local time, whether it is from the owner, subject
MAILS = [
    ("2024-05-28 19:10:00", False, "Huettenabend"), ("2024-05-28 21:02:00", True, "Re: Huettenabend"),
    ("2024-06-03 08:15:00", False, "Tourenbericht"), ("2024-06-03 12:20:00", True, "Re: Tourenbericht"),
    ("2024-06-07 07:45:00", False, "Wetter"), ("2024-06-07 08:02:00", True, "Re: Wetter"),
    ("2024-06-10 20:05:00", True, "Samstag"), ("2024-06-10 20:41:00", False, "Re: Samstag"),
    ("2024-06-13 22:00:00", True, "Treffpunkt"), ("2024-06-13 22:17:00", False, "Re: Treffpunkt"),
]


def milliseconds(local):
    return int((utc(local) - LOCAL_OFFSET - datetime(1970, 1, 1)).total_seconds()) * 1000


def android_backup(root, entries):
    lines = ["<?xml version='1.0' encoding='UTF-8' standalone='yes' ?>",
             f'<{root} count="{len(entries)}">', *entries, f"</{root}>", ""]
    return "\n".join(lines)


def make_messages(folder):
    folder.mkdir(parents=True, exist_ok=True)
    def body(number):
        return f"Schau: {LINK_IN_TEXT[1]}" if number == LINK_IN_TEXT[0] else f"Nachricht {number}"

    texts = [
        f'  <sms protocol="0" address="{ANNA}" date="{milliseconds(local)}" type="{kind}"'
        f' subject="null" body="{body(number)}" read="1" status="-1"'
        + (' locked="1"' if number == LINK_IN_TEXT[0] else "")
        + ' contact_name="Anna Beispiel" />'
        for number, (local, kind) in enumerate(TEXTS, start=1)
    ]
    texts.append(f'  <sms protocol="0" address="Paketdienst" date="{milliseconds("2024-06-13 10:00:00")}"'
                 ' type="1" subject="null" body="Ihr Paket" contact_name="(Unknown)" />')
    (folder / "sms-20240616.xml").write_text(android_backup("smses", texts))
    calls = [
        f'  <call number="0660 555 12 34" duration="{seconds}" date="{milliseconds(local)}"'
        f' type="{kind}" presentation="1" contact_name="Anna Beispiel" />'
        for local, seconds, kind in CALLS
    ]
    (folder / "calls-20240616.xml").write_text(android_backup("calls", calls))
    make_mails(folder / "Maildir")


def make_mails(folder):
    for name in ("cur", ".Sent/cur"):
        (folder / name).mkdir(parents=True, exist_ok=True)
    for number, (local, is_sent, subject) in enumerate(MAILS, start=1):
        sender, recipient = (OWNER, JAKOB) if is_sent else (JAKOB, OWNER)
        time = utc(local).strftime("%a, %d %b %Y %H:%M:%S +0200")
        place = ".Sent/cur" if is_sent else "cur"
        flags, kind, text = "S", "", f"Text {number}."
        if number == LINK_IN_MAIL[0]:
            flags, kind = "FS", "Content-Type: text/html; charset=utf-8\n"
            text = f'<p>Morgen: <a href="{LINK_IN_MAIL[1]}">{LINK_IN_MAIL[2]}</a></p>'
        (folder / place / f"{number}.sample:2,{flags}").write_text(
            f"From: {sender}\nTo: {recipient}\nDate: {time}\nMessage-ID: <{number}@example.org>\n"
            f"Subject: {subject}\n{kind}\n{text}\n")
    (folder / "cur" / "99.sample:2,").write_text(
        "From: Bergwetter <news@example.com>\nTo: ich@example.org\n"
        "Date: Fri, 14 Jun 2024 06:00:00 +0000\nMessage-ID: <news-24@example.com>\n"
        "List-Unsubscribe: <mailto:leave@example.com>\nSubject: Das Wochenende\n\nSonnig.\n")


def make_contacts(folder):
    folder.mkdir(parents=True, exist_ok=True)
    (folder / "freunde.vcf").write_text(CARDS.replace("\n", "\r\n"), newline="")


# Calendar: a vdir folder, an entry a file.


def vevent(uid, summary, start, end, *lines):
    kind = ";VALUE=DATE" if len(start) == 8 else ";TZID=Europe/Vienna"
    text = ["BEGIN:VCALENDAR", "VERSION:2.0", "PRODID:-//make-sample-data//EN", "BEGIN:VEVENT",
            f"UID:{uid}", "DTSTAMP:20240601T080000Z", f"SUMMARY:{summary}",
            f"DTSTART{kind}:{start}", f"DTEND{kind}:{end}", *lines, "END:VEVENT", "END:VCALENDAR", ""]
    return "\r\n".join(text)


def make_calendar(folder):
    private = folder / "private"
    private.mkdir(parents=True, exist_ok=True)
    entries = {
        "zug-hin": vevent("zug-hin", "Zug von Graz nach Wien", "20240610T082500",
                          "20240610T110000", "DESCRIPTION:RJ 558\\, Wagen 24"),
        "hotel": vevent("hotel", "Hotel Donau", "20240610", "20240611",
                        "LOCATION:Uferweg 3\\, 1020 Wien\\, Oesterreich"),
        "zug-zurueck": vevent("zug-zurueck", "Zug von Wien nach Graz", "20240611T175800",
                              "20240611T203300", "DESCRIPTION:RJ 559"),
        "geburtstag": vevent("geburtstag", "Geburtstagsfeier bei Anna", "20240614T193000",
                             "20240614T233000", "LOCATION:Bei Anna"),
        "kino": vevent("kino", "Kino: Der lange Sommer", "20240613T201500", "20240613T223000",
                       "LOCATION:Filmzentrum\\, Graz"),
        "besprechung": vevent("besprechung", "Teambesprechung", "20240603T090000",
                              "20240603T100000", "RRULE:FREQ=WEEKLY;BYDAY=WE"),
    }
    for name, text in entries.items():
        (private / f"{name}.ics").write_text(text, newline="")


def main():
    beside = Path(__file__).resolve().parent.parent / "data" / "sample"
    folder = Path(sys.argv[1]) if len(sys.argv) > 1 else beside
    make_tracks(folder / "tracks")
    make_places(folder / "places")
    make_photos(folder / "photos")
    make_plays(folder / "media")
    make_messages(folder / "messages")
    make_contacts(folder / "contacts")
    make_calendar(folder / "calendars")


if __name__ == "__main__":
    main()
