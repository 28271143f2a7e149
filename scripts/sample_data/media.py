# SPDX-License-Identifier: Apache-2.0
"""What was played: the records of the now-playing stream, as CSV."""

import csv
from datetime import datetime

from .common import LOCAL_OFFSET, utc

SONG = ("Morgenlauf", "Die Beispiele", "Im Takt", "Pop", "org.example.Music", 214)
OTHER = ("Nur einmal", "Die Beispiele", "Im Takt", "Pop", "org.example.Music", 187)
WALTZ = ("Walzer für zwei", "Hofkapelle Muster", "Tanzboden", "Folk", "org.example.Music", 241)
LULLABY = ("Schlaf kleiner Bär", "Tante Vorlage", "Gute Nacht", "Children's", "org.example.Music",
           158)
EPISODE = ("Wege am Grat", "Berggespräche", "", "Podcast", "org.gnome.Podcasts", 2710)
EARLIER = ("Über die Baumgrenze", "Berggespräche", "", "Podcast", "org.gnome.Podcasts", 2535)
HUT = ("Eine Nacht auf der Hütte", "Berggespräche", "", "Podcast", "org.gnome.Podcasts", 2890)
SERIES = [(f"Die Schleuse: Folge {number}", "", "", "Krimi", "tv.kodi.Kodi", 2640)
          for number in range(1, 5)]

PLAYS = [
    # item, local start, seconds played, how it ended (2 paused, 3 stopped, 4 gave way)
    (EARLIER, "2024-05-21 21:10:00", 2400, 3),
    (WALTZ, "2024-05-24 16:02:00", 241, 4),
    (WALTZ, "2024-05-24 16:06:01", 241, 4),
    (OTHER, "2024-05-24 16:10:02", 187, 2),
    (WALTZ, "2024-05-26 18:30:00", 241, 2),
    (LULLABY, "2024-05-27 19:40:00", 158, 4),
    (LULLABY, "2024-05-27 19:42:38", 158, 3),
    (LULLABY, "2024-05-28 19:45:00", 158, 4),
    (LULLABY, "2024-05-28 19:47:38", 150, 3),
    (SERIES[0], "2024-05-28 20:30:00", 2640, 3),
    (LULLABY, "2024-05-29 19:50:00", 158, 3),
    (SERIES[1], "2024-06-01 20:30:00", 2640, 3),
    (SERIES[2], "2024-06-03 20:40:00", 2610, 3),
    (HUT, "2024-06-06 05:30:00", 1800, 2),
    (HUT, "2024-06-09 15:00:00", 1090, 3),
    (SERIES[3], "2024-06-11 21:20:00", 2640, 3),
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
