# SPDX-License-Identifier: Apache-2.0
"""The owner's calendar: a vdir folder, an entry a file."""

import json


def vevent(uid, summary, start, end, *lines):
    kind = ";VALUE=DATE" if len(start) == 8 else ";TZID=Europe/Vienna"
    text = ["BEGIN:VCALENDAR", "VERSION:2.0", "PRODID:-//make-sample-data//EN", "BEGIN:VEVENT",
            f"UID:{uid}", "DTSTAMP:20240601T080000Z", f"SUMMARY:{summary}",
            f"DTSTART{kind}:{start}", f"DTEND{kind}:{end}", *lines, "END:VEVENT",
            "END:VCALENDAR", ""]
    return "\r\n".join(folded(line) for line in text)


def reservation(kind, reserved, **details):
    """What travel assistants write beside an entry: the booking's own schema.org data."""
    record = {"@context": "http://schema.org", "@type": kind, "reservationFor": reserved} | details
    text = json.dumps([record], ensure_ascii=False)
    escaped = text.replace("\\", "\\\\").replace(",", "\\,").replace(";", "\\;")
    return "X-RESERVATION:" + escaped


def flight(uid, origin, goal, number, start, end):
    def airport(code):
        return {"@type": "Airport", "iataCode": code}

    return vevent(uid, f"Flug ZZ {number} {origin} → {goal}", start, end,
                  reservation("FlightReservation", {
                      "@type": "Flight", "flightNumber": number,
                      "airline": {"@type": "Airline", "iataCode": "ZZ"},
                      "departureAirport": airport(origin), "arrivalAirport": airport(goal)}))


def folded(line):
    """RFC 5545, 3.1: no line of more than 75 bytes."""
    parts, part = [], ""
    for character in line:
        if len((part + character).encode()) > 74:
            parts.append(part)
            part = ""
        part += character
    return "\r\n ".join([*parts, part])


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
                             "20240614T233000", "LOCATION:Im Hof"),
        "kino": vevent("kino", "Kino: Der lange Sommer", "20240613T201500", "20240613T223000",
                       "LOCATION:Filmzentrum\\, Graz"),
        "besprechung": vevent("besprechung", "Teambesprechung", "20240603T090000",
                              "20240603T100000", "RRULE:FREQ=WEEKLY;BYDAY=WE"),
        "hochzeit": vevent("hochzeit", "Hochzeit von Lena und Paul", "20240525T133000",
                           "20240525T233000", "LOCATION:Schloss Weiherhof"),
        "linde": vevent("linde", "Abendessen mit Jakob", "20240524T190000", "20240524T223000",
                        "LOCATION:Gasthaus Zur Linde"),
        "schauspiel": vevent("schauspiel", "Karten für Der zerbrochne Krug", "20240531T193000",
                             "20240531T220000", "LOCATION:Schauspiel am Ring\\, Graz"),
        "frohnleiten": vevent("frohnleiten", "Zug von Graz nach Frohnleiten", "20240601T092800",
                              "20240601T095700", "DESCRIPTION:RE 4470\\, mit Rad"),
        "hochzeitstag": vevent("hochzeitstag", "Hochzeitstag", "20160602", "20160603",
                               "RRULE:FREQ=YEARLY", "CATEGORIES:Jahrestag"),
        "weingut": vevent("weingut", "Weingut Sonnleiten", "20240602T123000", "20240602T153000",
                          "LOCATION:Sonnleiten 8\\, 8461 Sonnleiten",
                          reservation("FoodEstablishmentReservation", {
                              "@type": "FoodEstablishment", "name": "Weingut Sonnleiten"},
                              partySize=2)),
        "kinderarzt": vevent("kinderarzt", "Kinderarzt", "20240603T153000", "20240603T160000"),
        "flug-hin": flight("flug-hin", "GRZ", "HAM", "412", "20240606T063000", "20240606T081500"),
        "flug-zurueck": flight("flug-zurueck", "HAM", "GRZ", "413", "20240609T143500",
                               "20240609T162000"),
        "elbufer": vevent("elbufer", "Hotel Elbufer", "20240606", "20240609",
                          "LOCATION:Elbufer 21\\, 20359 Hamburg\\, Deutschland",
                          reservation("LodgingReservation", {
                              "@type": "LodgingBusiness", "name": "Hotel Elbufer",
                              "address": {"@type": "PostalAddress",
                                          "addressLocality": "Hamburg"}},
                              checkinTime="2024-06-06T15:00:00+02:00",
                              checkoutTime="2024-06-09T11:00:00+02:00")),
    }
    for name, text in entries.items():
        (private / f"{name}.ics").write_text(text, newline="")
