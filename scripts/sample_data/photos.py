# SPDX-License-Identifier: Apache-2.0
"""Photos with the metadata of cameras and photo managers. Needs exiv2's command line tool."""

import subprocess
from datetime import timedelta

from .common import (BEACH, CASTLE, HALL, HARBOUR_MUSEUM, HOME, LOCAL_OFFSET, PARK, VINEYARD, utc)
from .images import jpeg, png


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
    ("cat.jpg", "2024-05-22 20:05:10", "offset", HOME, ["Katze"], [], None, None),
    ("wedding-1.jpg", "2024-05-25 14:02:20", "offset", CASTLE, ["Hochzeit"], [], "Lena Vorlage",
     "Hochzeit von Lena und Paul"),
    ("wedding-2.jpg", "2024-05-25 14:41:00", "gps", CASTLE, ["wedding", "bride"], [],
     "Lena Vorlage", None),
    ("wedding-3.jpg", "2024-05-25 15:20:45", "offset", CASTLE, ["wedding"], [], "Anna Beispiel",
     None),
    ("wedding-4.png", "2024-05-25 16:12:30", "offset", CASTLE, ["Fest"], ["Feste|Hochzeit"],
     "Tom Vorlage", None),
    ("baby-1.jpg", "2024-05-27 18:22:00", "offset", HOME, ["baby"], [], "Mia", None),
    ("baby-2.jpg", "2024-05-27 18:31:12", "gps", HOME, ["Baby"], [], "Mia", None),
    ("park-1.jpg", "2024-05-30 10:25:00", "offset", PARK, ["Freizeitpark"], [], "Mia", None),
    ("park-2.jpg", "2024-05-30 11:18:40", "offset", PARK, ["Freizeitpark", "roller coaster"], [],
     None, None),
    ("park-3.jpg", "2024-05-30 12:05:05", "gps", PARK, [], ["Orte|Freizeitpark"], "Tom Vorlage",
     None),
    ("mur.jpg", "2024-06-01 11:02:20", "gps", (47.1650, 15.3950), ["Fluss", "Natur"], [], None,
     None),
    ("anniversary-1.jpg", "2024-06-02 13:10:00", "offset", VINEYARD, ["Hochzeitstag"], [],
     "Tom Vorlage", None),
    ("anniversary-2.jpg", "2024-06-02 14:05:30", "offset", VINEYARD, ["anniversary"],
     ["Feste|Hochzeitstag"], None, None),
    ("hamburg-1.jpg", "2024-06-07 10:48:00", "offset", HARBOUR_MUSEUM, ["Museum", "Reise"], [],
     None, None),
    ("hamburg-2.jpg", "2024-06-07 11:37:20", "gps", HARBOUR_MUSEUM, ["museum"], [], "Tom Vorlage",
     None),
    ("hamburg-3.jpg", "2024-06-08 11:32:00", "offset", BEACH, ["Strand", "Städtereise"], [], None,
     None),
    ("hamburg-4.jpg", "2024-06-08 12:21:15", "offset", BEACH, ["beach", "Reise"], [], "Mia", None),
    ("hamburg-5.jpg", "2024-06-08 13:15:50", "gps", BEACH, ["Strand", "Reise"], [], "Tom Vorlage",
     None),
    ("hamburg-6.jpg", "2024-06-08 14:09:00", "offset", BEACH, ["Strandtag", "Reise"], [], None,
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
