#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""Makes data/sample: files of every kind from an invented month, Monday 2024-05-20 to Sunday
2024-06-16, each such as a device or program writes it.

Needs the exiv2 command line tool. The same call makes the same bytes.

    scripts/make-sample-data.py [FOLDER]     (default: data/sample beside this script's folder)

The owner lives in Graz (Europe/Vienna, UTC+2 that month) with Tom Vorlage and a small child:
  first week   a ride along the river (FIT), a run (TCX), the climbing hall and the pool (FIT,
               without positions); dinner with Jakob Muster; on Saturday the wedding of Lena and Paul
  second week  a run, photos of the baby; Corpus Christi in an amusement park; the theatre; a train
               to Frohnleiten and the bicycle back (GPX); an eighth wedding day, in a vineyard
  third week   a run (GPX); by plane to Hamburg, with a hotel, a museum and the beach
  fourth week  two days in Vienna by train, a run with photos of the baby and the dog (TCX), a bike
               ride (GPX without a type), a film, a birthday party, a hike with photos (GPX), a
               concert, a lake

Where she was tell a location history by the month (JSON), the recording of another program in
Hamburg (OwnTracks), and in the last days the phone's own log (GPX); home, work, an inn and the hall
of the concert are waypoints of her own. Beside that what she listened to, as records of the
now-playing stream (CSV); text messages and calls with Anna Beispiel and with Tom (an Android
backup), mails with Jakob (a Maildir), a newsletter, and an address book that knows them; links in
the messages and in a mail, two of which she marked; a calendar with reservations, occasions and
entries that are no suggestions; and two files that cannot be read: a GPX file cut in the middle, a
photo without a date.
"""

import sys
from pathlib import Path

from sample_data.calendars import make_calendar
from sample_data.media import make_plays
from sample_data.people import make_contacts, make_messages
from sample_data.photos import make_photos
from sample_data.tracks import make_tracks
from sample_data.whereabouts import make_whereabouts


def main():
    beside = Path(__file__).resolve().parent.parent / "data" / "sample"
    folder = Path(sys.argv[1]) if len(sys.argv) > 1 else beside
    make_tracks(folder / "tracks")
    make_whereabouts(folder / "tracks", folder / "places")
    make_photos(folder / "photos")
    make_plays(folder / "media")
    make_messages(folder / "messages")
    make_contacts(folder / "contacts")
    make_calendar(folder / "calendars")


if __name__ == "__main__":
    main()
