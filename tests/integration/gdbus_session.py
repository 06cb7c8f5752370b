#!/usr/bin/python3
"""One whole session through the bus, with nothing but GLib's D-Bus client: configure, ask for the bag, search."""

import json
import sys

from gi.repository import Gio, GLib

bus = Gio.bus_get_sync(Gio.BusType.SESSION)


def call(method, arguments, reply_type):
    return bus.call_sync(
        "com.quenta.zelkord", "/com/quenta/zelkord", "com.quenta.zelkord.Daemon1", method, arguments,
        GLib.VariantType(reply_type), Gio.DBusCallFlags.NONE, 5000, None).unpack()


def text(value):
    return GLib.Variant("s", value)


configuration = {"identifier": text("lanthe"), "userAgent": text("Session/1")}
(endpoint,) = call("Configure", GLib.Variant("(a{sv})", (configuration,)), "(s)")
bag, error = call("Bag", None, "(a{sv}a{sv})")
request = {"queryId": GLib.Variant("x", 1), "queryString": text(sys.argv[1])}
query_id, reply, search_error = call("Request", GLib.Variant("(sa{sv})", ("search", request)), "(xa{sv}a{sv})")

print("endpoint", endpoint.split("=")[0])
print("bag", bag.get("version"), error)
print("query", query_id, search_error)
for result_set in json.loads(bytes(reply["data"])):
    print(" ", result_set["query"])
