#!/usr/bin/python3
"""Holds what is written of the D-Bus interfaces against one another.

usage: interfaces.py page             docs/ipc.md names the members of com.quenta.zelkord.xml, with their arguments
       interfaces.py served ADDRESS   the daemon at ADDRESS, a bus, serves the members of the file, and no others

Prints a line for each difference and ends with status 1 when there is one.
"""

import pathlib
import re
import sys
import xml.etree.ElementTree

ROOT = pathlib.Path(__file__).resolve().parents[2]
FILE = ROOT / "corezelkor/dbus/com.quenta.zelkord.xml"
PAGE = ROOT / "docs/ipc.md"
PREFIX = "com.quenta.zelkord."
# Objects of the daemon's clients, which it calls.
CLIENTS = {PREFIX + "Client1"}


def members(document):
    """{(interface, member): "s argument, u argument -> x result"} of an introspection document."""
    found = {}
    for interface in xml.etree.ElementTree.fromstring(document).iter("interface"):
        if not interface.get("name").startswith(PREFIX):
            continue
        for member in interface:
            if member.tag not in ("method", "signal"):
                continue
            sides = {"in": [], "out": []}
            for argument in member.iter("arg"):
                sides[argument.get("direction", "in")].append(f"{argument.get('type')} {argument.get('name')}")
            found[interface.get("name"), member.get("name")] = " -> ".join(map(", ".join, sides.values()))
    return found


def page_members(text):
    """The same of the page: `Member(arguments) -> (results)` after the name of its interface. Without an arrow nothing is said
    of the results."""
    found, interface = {}, None
    mark = re.compile(
        r"`(?P<interface>com\.quenta\.zelkord\.[A-Z]\w*1)(?:\.(?P<own>[A-Z]\w+))?`?"
        r"|`(?P<member>[A-Z]\w+)\((?P<in>[^`]*?)\)(?: -> \((?P<out>[^`]*)\))?`"
    )
    for match in mark.finditer(text):
        if match["interface"]:
            interface = match["interface"]
        elif interface:
            found[interface, match["member"]] = f"{match['in']} -> {match['out'] or ''}"
    return found


def compare(wanted, got, what):
    problems = [f"{'.'.join(key)} is missing in {what}" for key in sorted(wanted.keys() - got.keys())]
    problems += [f"{'.'.join(key)} is only in {what}" for key in sorted(got.keys() - wanted.keys())]
    problems += [
        f"{'.'.join(key)} is {got[key]} in {what}, not {wanted[key]}"
        for key in sorted(wanted.keys() & got.keys())
        if wanted[key] != got[key]
    ]
    return problems


def served(address):
    """What the daemon says of itself: on the bus, and at the endpoint that it names to a client."""
    from gi.repository import Gio, GLib

    flags = Gio.DBusConnectionFlags.AUTHENTICATION_CLIENT
    bus = Gio.DBusConnection.new_for_address_sync(
        address, flags | Gio.DBusConnectionFlags.MESSAGE_BUS_CONNECTION, None, None)

    def call(connection, name, interface, member, arguments):
        return connection.call_sync(
            name, "/com/quenta/zelkord", interface, member, arguments, None, Gio.DBusCallFlags.NONE, 10000, None).unpack()

    introspectable = "org.freedesktop.DBus.Introspectable"
    text = call(bus, "com.quenta.zelkord", introspectable, "Introspect", None)[0]
    configuration = {"identifier": GLib.Variant("s", "lanthe"), "userAgent": GLib.Variant("s", "Test/1")}
    endpoint = call(bus, "com.quenta.zelkord", PREFIX + "Daemon1", "Configure",
                    GLib.Variant("(a{sv})", (configuration,)))[0]
    private = Gio.DBusConnection.new_for_address_sync(endpoint, flags, None, None)
    return members(text) | members(call(private, None, introspectable, "Introspect", None)[0])


def main():
    file = members(FILE.read_text(encoding="utf-8"))
    if sys.argv[1:2] == ["page"]:
        problems = compare(file, page_members(PAGE.read_text(encoding="utf-8")), PAGE.name)
    elif sys.argv[1:2] == ["served"] and len(sys.argv) == 3:
        own = {key: value for key, value in file.items() if key[0] not in CLIENTS}
        problems = compare(own, served(sys.argv[2]), "what the daemon serves")
    else:
        sys.exit(__doc__)
    print("\n".join(problems) if problems else f"{len(file)} members, all as written")
    sys.exit(1 if problems else 0)


main()
