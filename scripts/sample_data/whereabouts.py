# SPDX-License-Identifier: Apache-2.0
"""Where the owner was: a location history, the recordings of two programs, named places."""

import json
import math
from datetime import timedelta

from .common import (BEACH, CASTLE, CINEMA, DANUBE_HOTEL, ELBE_HOTEL, FAIR, FISH_HOUSE, GYM, HALL,
                     HARBOUR_MUSEUM, HOME, INN, LAKE, MARKET, OFFICE, PARK, POOL, SUMMIT, TAVERN,
                     THEATRE, VINEYARD, iso, local, utc)
from .tracks import gpx

# What the location history calls a place: name, address, type.
NAMES = {
    HOME: (None, "Birkenweg 4, 8010 Graz, Österreich", "TYPE_HOME"),
    OFFICE: (None, "Werkstraße 12, 8010 Graz, Österreich", "TYPE_WORK"),
    MARKET: ("Markthalle", "Marktgasse 1, 8020 Graz, Österreich", None),
    GYM: ("Kletterhalle Nord", "Am Damm 9, 8045 Graz, Österreich", None),
    TAVERN: ("Gasthaus Zur Linde", "Lindengasse 3, 8043 Graz, Österreich", None),
    POOL: ("Freibad Au", "Austraße 20, 8054 Graz, Österreich", None),
    CASTLE: ("Schloss Weiherhof", "Schlossallee 1, 8081 Weiherhof, Österreich", None),
    PARK: ("Märchenpark Rosental", "Rosental 5, 8344 Rosental, Österreich", None),
    THEATRE: ("Schauspiel am Ring", "Am Ring 2, 8010 Graz, Österreich", None),
    VINEYARD: ("Weingut Sonnleiten", "Sonnleiten 8, 8461 Sonnleiten, Österreich", None),
    CINEMA: ("Filmzentrum", "Kinogasse 7, 8010 Graz, Österreich", None),
    DANUBE_HOTEL: ("Hotel Donau", "Uferweg 3, 1020 Wien, Österreich", None),
    FAIR: ("Messehalle", "Messeplatz 1, 1020 Wien, Österreich", None),
}

# place, from, to on the owner's clocks, until the phone's own log begins on Friday, the 14th.
VISITS = [
    (HOME, "2024-05-19T21:00", "2024-05-20T09:50"),
    (HOME, "2024-05-20T11:10", "2024-05-21T07:35"),
    (OFFICE, "2024-05-21T08:05", "2024-05-21T16:40"),
    (MARKET, "2024-05-21T16:55", "2024-05-21T17:25"),
    (HOME, "2024-05-21T17:45", "2024-05-22T07:30"),
    (OFFICE, "2024-05-22T08:00", "2024-05-22T16:15"),
    (HOME, "2024-05-22T16:45", "2024-05-22T17:55"),
    (HOME, "2024-05-22T18:45", "2024-05-23T07:40"),
    (OFFICE, "2024-05-23T08:10", "2024-05-23T17:20"),
    (GYM, "2024-05-23T17:50", "2024-05-23T20:10"),
    (HOME, "2024-05-23T20:35", "2024-05-24T07:35"),
    (OFFICE, "2024-05-24T08:05", "2024-05-24T14:30"),
    (HOME, "2024-05-24T15:00", "2024-05-24T18:40"),
    (TAVERN, "2024-05-24T19:00", "2024-05-24T22:30"),
    (HOME, "2024-05-24T22:50", "2024-05-25T11:30"),
    (CASTLE, "2024-05-25T13:00", "2024-05-25T23:40"),
    (HOME, "2024-05-26T00:20", "2024-05-26T14:00"),
    (POOL, "2024-05-26T14:35", "2024-05-26T17:30"),
    (HOME, "2024-05-26T18:00", "2024-05-26T19:05"),
    (HOME, "2024-05-26T20:15", "2024-05-27T07:40"),

    (OFFICE, "2024-05-27T08:10", "2024-05-27T16:30"),
    (HOME, "2024-05-27T17:00", "2024-05-28T07:30"),
    (OFFICE, "2024-05-28T08:00", "2024-05-28T16:05"),
    (HOME, "2024-05-28T16:40", "2024-05-28T18:05"),
    (HOME, "2024-05-28T18:50", "2024-05-29T07:30"),
    (OFFICE, "2024-05-29T08:00", "2024-05-29T18:50"),
    (HOME, "2024-05-29T19:20", "2024-05-30T08:30"),
    (PARK, "2024-05-30T09:50", "2024-05-30T16:20"),
    (HOME, "2024-05-30T17:45", "2024-05-31T07:30"),
    (OFFICE, "2024-05-31T08:00", "2024-05-31T13:30"),
    (HOME, "2024-05-31T14:00", "2024-05-31T18:40"),
    (THEATRE, "2024-05-31T19:05", "2024-05-31T22:20"),
    (HOME, "2024-05-31T22:45", "2024-06-01T08:35"),
    (HOME, "2024-06-01T11:45", "2024-06-02T11:20"),
    (VINEYARD, "2024-06-02T12:20", "2024-06-02T15:40"),
    (HOME, "2024-06-02T16:40", "2024-06-02T19:10"),
    (HOME, "2024-06-02T20:10", "2024-06-03T07:35"),

    (OFFICE, "2024-06-03T08:05", "2024-06-03T16:50"),
    (HOME, "2024-06-03T17:20", "2024-06-04T07:30"),
    (OFFICE, "2024-06-04T08:00", "2024-06-04T16:20"),
    (HOME, "2024-06-04T16:50", "2024-06-04T18:05"),
    (HOME, "2024-06-04T19:00", "2024-06-05T07:30"),
    (OFFICE, "2024-06-05T08:00", "2024-06-05T15:30"),
    (MARKET, "2024-06-05T15:45", "2024-06-05T16:20"),
    (HOME, "2024-06-05T16:40", "2024-06-06T04:40"),

    (HOME, "2024-06-09T17:20", "2024-06-09T19:15"),
    (HOME, "2024-06-09T20:05", "2024-06-10T07:50"),
    (FAIR, "2024-06-10T11:40", "2024-06-10T17:45"),
    (DANUBE_HOTEL, "2024-06-10T18:10", "2024-06-11T08:40"),
    (FAIR, "2024-06-11T09:00", "2024-06-11T16:50"),
    (HOME, "2024-06-11T21:00", "2024-06-12T07:30"),
    (OFFICE, "2024-06-12T08:00", "2024-06-12T16:35"),
    (HOME, "2024-06-12T17:05", "2024-06-12T18:25"),
    (HOME, "2024-06-12T19:20", "2024-06-13T07:30"),
    (OFFICE, "2024-06-13T08:00", "2024-06-13T16:15"),
    (HOME, "2024-06-13T18:25", "2024-06-13T19:45"),
    (CINEMA, "2024-06-13T20:05", "2024-06-13T22:35"),
]


def e7(place):
    return {"latitudeE7": round(place[0] * 1e7), "longitudeE7": round(place[1] * 1e7)}


def segments(visits):
    """Stays and the ways between them, as the account's export lists them."""
    objects = []
    for number, (place, start, end) in enumerate(visits):
        name, address, kind = NAMES[place]
        location = e7(place) | {"address": address, "locationConfidence": 92}
        if name:
            location["name"] = name
        if kind:
            location["semanticType"] = kind
        objects.append({"placeVisit": {
            "location": location,
            "duration": {"startTimestamp": iso(local(start)), "endTimestamp": iso(local(end))},
            "placeConfidence": "HIGH_CONFIDENCE", "visitConfidence": 89 + number % 8}})
        following = visits[number + 1] if number + 1 < len(visits) else None
        if following and following[0] != place:
            objects.append({"activitySegment": {
                "startLocation": e7(place), "endLocation": e7(following[0]),
                "duration": {"startTimestamp": iso(local(end)),
                             "endTimestamp": iso(local(following[1]))},
                "activityType": "IN_PASSENGER_VEHICLE", "confidence": "MEDIUM"}})
    return {"timelineObjects": objects}


def make_history(folder):
    for month, name in (("2024-05", "2024_MAY"), ("2024-06", "2024_JUNE")):
        visits = [visit for visit in VISITS if visit[2].startswith(month)]
        (folder / f"{name}.json").write_text(
            json.dumps(segments(visits), ensure_ascii=False, separators=(",", ":")) + "\n")


# In Hamburg another program recorded, every twenty minutes, and knew the owner's own places there.
HAMBURG = [
    (ELBE_HOTEL, "2024-06-06T10:20", "2024-06-06T18:00"),
    (FISH_HOUSE, "2024-06-06T18:20", "2024-06-06T21:00"),
    (ELBE_HOTEL, "2024-06-06T21:20", "2024-06-07T09:40"),
    (HARBOUR_MUSEUM, "2024-06-07T10:20", "2024-06-07T15:10"),
    (ELBE_HOTEL, "2024-06-07T16:00", "2024-06-08T10:20"),
    (BEACH, "2024-06-08T11:10", "2024-06-08T16:30"),
    (ELBE_HOTEL, "2024-06-08T17:40", "2024-06-09T11:40"),
]
HAMBURG_PLACES = [("Hotel Elbufer", ELBE_HOTEL), ("Fischhaus", FISH_HOUSE),
                  ("Hafenmuseum", HARBOUR_MUSEUM), ("Elbstrand", BEACH)]


def make_recorder(folder):
    lines = []

    def add(kind, time, message):
        stamp = int((time - utc("1970-01-01")).total_seconds())
        text = json.dumps({"_type": kind, "tst": stamp} | message, separators=(",", ":"))
        lines.append(f"{iso(time)}\t{'*' if kind == 'location' else kind:<18}\t{text}")

    for name, (latitude, longitude) in HAMBURG_PLACES:
        add("waypoint", local("2024-06-06T10:15"),
            {"desc": name, "lat": latitude, "lon": longitude, "rad": 80})
    for place, start, end in HAMBURG:
        time = local(start)
        while time <= local(end):
            wander = 1e-4 * math.sin(len(lines) * 1.7)
            add("location", time, {"lat": round(place[0] + wander, 5),
                                   "lon": round(place[1] - wander / 2, 5), "acc": 12, "t": "u"})
            time += timedelta(minutes=20)
    (folder / "2024-06.rec").write_text("\n".join(lines) + "\n")


# The week's end, as a phone logs it: every quarter of an hour while it lies still.
STAYS = [
    # place, from, to (UTC)
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


def make_whereabouts(tracks, places):
    tracks.mkdir(parents=True, exist_ok=True)
    places.mkdir(parents=True, exist_ok=True)
    make_history(tracks)
    make_recorder(tracks)
    (tracks / "phone-2024-06-14-to-16.gpx").write_text(gpx("Handy", None, phone_log()))
    (places / "places.gpx").write_text(waypoints(PLACES))
