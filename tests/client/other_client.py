#!/usr/bin/python3
# SPDX-License-Identifier: Apache-2.0
"""A client that knows nothing of the daemon but its published bus interface."""

import sys

import dbus

NAME = "com.brindle.keepsakesd"
UUID = "0f8fad5b-d9cb-469f-a165-70867728950e"

daemon = dbus.SessionBus().get_object(NAME, "/com/brindle/keepsakesd")
conduit = dbus.Interface(daemon, "com.brindle.KSKeepsakesConduitProtocol")
properties = dbus.Interface(daemon, "org.freedesktop.DBus.Properties")
nothing = dbus.Dictionary({}, signature="sv")

event = {
    "eventIdentifier": UUID,
    "startDate": 700000000.5,
    "endDate": 700003600,
    "creationDate": 700003601.0,
    "provider": dbus.Byte(1),
    "category": 2,
    "workoutType": "läuft",
    "location": dbus.Struct((48.5, 11.25), signature="dd"),
    "itemAccountHandles": ["a", "b"],
    "scoredTopics": dbus.ByteArray(b'{"running": 0.5}'),
    "suggestedEvent": dbus.Dictionary({"n": 1}, signature="sv"),
}
conduit.StoreEvents([event], {"ProcessName": "other"})

options = {"limit": 10.0, "dateInterval": dbus.Struct((699999999.0, 700000001.0))}
(fetched,) = conduit.FetchEventsWithOptions(options, nothing)
assert fetched["eventIdentifier"] == UUID, fetched
assert fetched["startDate"] == 700000000.5 and fetched["endDate"] == 700003600.0
assert fetched["location"] == (48.5, 11.25)
assert fetched["itemAccountHandles"] == ["a", "b"]
assert bytes(fetched["scoredTopics"]) == b'{"running":0.5}', bytes(fetched["scoredTopics"])
assert type(fetched["provider"]) is dbus.UInt64 and fetched["category"] == 2
assert fetched["suggestedEvent"] == {"n": 1} and fetched["workoutType"] == "läuft"
assert "placeName" not in fetched

assert properties.Get("com.brindle.keepsakesd.Status", "EventCount") == 1
assert conduit.FetchPhotoAnalyticsMetrics(nothing) == {"photos": 12, "share": 0.25}
try:
    conduit.StoreEvents([dict(event, startDate="today")], nothing)
    sys.exit("a text was taken as a date")
except dbus.DBusException as error:
    assert error.get_dbus_name() == "org.freedesktop.DBus.Error.InvalidArgs", error
    assert "event 0: startDate" in error.get_dbus_message(), error
