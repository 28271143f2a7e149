#!/usr/bin/python3
# SPDX-License-Identifier: Apache-2.0
"""A media player for tests, by the public MPRIS D-Bus interface, told what to do line by line:

own NAME            takes the name org.mpris.MediaPlayer2.NAME
drop NAME           gives it up
entry TEXT          is an application with this desktop entry; before the first `own`
say JSON            has these properties, and says so
keep JSON           has these properties, and says nothing
hint NAME           says that this property changed, without its value
seek MICROSECONDS   says that it jumped
flood COUNT         says that often that its volume changed

In JSON, "o:..." is an object path, "i:..." a number of 64 bits, "d:..." one with a fraction and
"x:..." a text of so many letters.
"""

import json

import dbus
import dbus.service
from dbus.mainloop.glib import DBusGMainLoop
from gi.repository import GLib

ROOT = "org.mpris.MediaPlayer2"
PLAYER = "org.mpris.MediaPlayer2.Player"
PROPERTIES = "org.freedesktop.DBus.Properties"


def value(given):
    if isinstance(given, dict):
        entries = {key: value(entry) for key, entry in given.items()}
        return dbus.Dictionary(entries, signature="sv", variant_level=1)
    if isinstance(given, list):
        return dbus.Array(given, signature="s", variant_level=1)
    if isinstance(given, str) and given.startswith("o:"):
        return dbus.ObjectPath(given[2:], variant_level=1)
    if isinstance(given, str) and given.startswith("i:"):
        return dbus.Int64(int(given[2:]), variant_level=1)
    if isinstance(given, str) and given.startswith("d:"):
        return dbus.Double(float(given[2:]), variant_level=1)
    if isinstance(given, str) and given.startswith("x:"):
        return "x" * int(given[2:])
    return given


class Player(dbus.service.Object):
    def __init__(self, bus):
        super().__init__(bus, "/org/mpris/MediaPlayer2")
        self.entry = None
        self.state = {}

    @dbus.service.method(PROPERTIES, in_signature="ss", out_signature="v")
    def Get(self, interface, name):
        if interface == ROOT and name == "DesktopEntry" and self.entry:
            return self.entry
        raise dbus.DBusException("no such property", name=PROPERTIES + ".Error")

    @dbus.service.method(PROPERTIES, in_signature="s", out_signature="a{sv}")
    def GetAll(self, interface):
        return self.state if interface == PLAYER else {}

    @dbus.service.signal(PROPERTIES, signature="sa{sv}as")
    def PropertiesChanged(self, interface, changed, invalidated):
        pass

    @dbus.service.signal(PLAYER, signature="x")
    def Seeked(self, position):
        pass


def act(bus, player, names, line):
    command, _, argument = line.strip().partition(" ")
    if command == "own":
        names[argument] = dbus.service.BusName(f"{ROOT}.{argument}", bus)
    elif command == "drop":
        bus.release_name(f"{ROOT}.{argument}")
    elif command == "entry":
        player.entry = argument
    elif command in ("say", "keep"):
        changed = {key: value(entry) for key, entry in json.loads(argument).items()}
        player.state.update(changed)
        if command == "say":
            player.PropertiesChanged(PLAYER, changed, [])
    elif command == "hint":
        player.PropertiesChanged(PLAYER, {}, [argument])
    elif command == "seek":
        player.Seeked(int(argument))
    elif command == "flood":
        for _ in range(int(argument)):
            player.PropertiesChanged(PLAYER, {"Volume": 0.5}, [])
    else:
        raise ValueError(line)


def read_line(stream):
    line = b""
    while not line.endswith(b"\n"):
        byte = stream.read(1)
        if not byte:
            return ""
        line += byte
    return line.decode()


def main():
    bus = dbus.SessionBus(mainloop=DBusGMainLoop())
    player = Player(bus)
    names = {}
    loop = GLib.MainLoop()
    # Unbuffered: a line that waits in a buffer wakes nobody.
    stream = open(0, "rb", buffering=0)

    def on_input(_descriptor, _condition):
        line = read_line(stream)
        if line:
            act(bus, player, names, line)
        else:
            loop.quit()
        return bool(line)

    GLib.io_add_watch(0, GLib.IO_IN | GLib.IO_HUP, on_input)
    loop.run()


if __name__ == "__main__":
    main()
