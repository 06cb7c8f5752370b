#!/usr/bin/python3
"""Kills a daemon while a client reports feedback, again and again: whatever it had answered is in the session's file, in
order, and a record that the kill cut in two is cut off by the next start. Arguments: the daemon, its log, its caches and
its socket."""

import os
import pathlib
import random
import signal
import subprocess
import sys
import time

from gi.repository import Gio, GLib

ZELKORD, LOG, CACHES, SOCKET = sys.argv[1:]
AGENT = b"Kill/1"
LEAST_KILLS, MOST_KILLS = 10, 120
random.seed(20261123)


def fail(text):
    sys.exit(f"FAILED: {text}")


def until(what, condition):
    for _ in range(3000):
        if condition():
            return
        time.sleep(0.01)
    fail(f"{what} did not happen within half a minute")


def varint(number):
    data = bytearray()
    while number > 127:
        data.append(number & 127 | 128)
        number >>= 7
    return bytes(data + bytes([number]))


def read_varint(data, at):
    number = shift = 0
    while True:
        byte = data[at]
        number |= (byte & 127) << shift
        at, shift = at + 1, shift + 7
        if byte < 128:
            return number, at


def query_id(record):
    at = 0
    while at < len(record):
        tag, at = read_varint(record, at)
        value, at = read_varint(record, at)
        if tag == 0x10:
            return value
        if tag & 7 == 2:
            at += value
    return 0


class Container:
    """A session's file: its whole records, and whether another one begins behind them."""

    def __init__(self, path):
        data, at, self.records = path.read_bytes(), 0, []
        while at + 8 <= len(data):
            length = int.from_bytes(data[at:at + 8], "little")
            if at + 8 + length > len(data):
                break
            self.records.append(data[at + 8:at + 8 + length])
            at += 8 + length
        self.is_torn = at < len(data)
        self.is_ours = len(self.records) > 1 and AGENT in self.records[1]

    def numbers(self):
        return [number for number in map(query_id, self.records[2:]) if number]


def containers():
    paths = [path for path in pathlib.Path(CACHES).glob("session.*") if path.stat().st_size]
    paths.sort(key=lambda path: int(path.suffix[1:]))
    return [Container(path) for path in paths]


class Daemon:
    def __init__(self):
        self.process = subprocess.Popen([ZELKORD, "--log-file", LOG, "--no-session-bus"])

    def connect(self):
        for _ in range(3000):
            try:
                return Gio.DBusConnection.new_for_address_sync(
                    "unix:path=" + SOCKET, Gio.DBusConnectionFlags.AUTHENTICATION_CLIENT, None, None)
            except GLib.Error:
                time.sleep(0.01)
        fail("the daemon did not answer within half a minute")

    def kill(self):
        self.process.send_signal(signal.SIGKILL)
        self.process.wait()


class Reporter:
    def __init__(self, daemon):
        self.bus, self.sent, self.answered = daemon.connect(), 0, set()
        configuration = {"identifier": GLib.Variant("s", "lanthe"), "userAgent": GLib.Variant("s", AGENT.decode())}
        self.bus.call_sync(None, "/com/quenta/zelkord", "com.quenta.zelkord.Daemon1", "Configure",
                           GLib.Variant("(a{sv})", (configuration,)), None, Gio.DBusCallFlags.NONE, 10000, None)

    def report(self, size):
        self.sent += 1
        message = b"\x12" + varint(size) + b"x" * size
        arguments = GLib.Variant.new_tuple(
            GLib.Variant("s", "event"), GLib.Variant("x", self.sent), GLib.Variant("s", "HVDidGoToSiteFeedback"),
            GLib.Variant.new_from_bytes(GLib.VariantType("ay"), GLib.Bytes.new(message), True))
        self.bus.call(None, "/com/quenta/zelkord", "com.quenta.zelkord.Daemon1", "ReportEvent", arguments, None,
                      Gio.DBusCallFlags.NONE, 10000, None, self.note, self.sent)

    def note(self, bus, result, number):
        try:
            bus.call_finish(result)
            self.answered.add(number)
        except GLib.Error as error:
            if "LimitsExceeded" in error.message:
                fail(error.message)

    def turn(self):
        while GLib.MainContext.default().iteration(False):
            pass


def report_and_kill():
    daemon = Daemon()
    reporter = Reporter(daemon)
    for _ in range(random.randrange(3, 30)):
        reporter.report(random.randrange(1, 5000))
    until("an answer", lambda: reporter.turn() or len(reporter.answered) == reporter.sent)
    path = max(pathlib.Path(CACHES).glob("session.*"), key=lambda path: path.stat().st_mtime_ns)
    old = os.stat(path).st_size
    for _ in range(4):
        reporter.report(200_000)
    end = time.monotonic() + 10
    while os.stat(path).st_size == old and time.monotonic() < end:  # the kill comes into the write
        pass
    daemon.kill()
    for _ in range(20):
        reporter.turn()
        time.sleep(0.005)
    return reporter


def check(reporter, when):
    numbers = [number for container in containers() if container.is_ours for number in container.numbers()]
    if numbers != list(range(1, len(numbers) + 1)):
        fail(f"{when}: records are out of order: {numbers}")
    lost = reporter.answered - set(numbers)
    if lost:
        fail(f"{when}: answered, but lost: {sorted(lost)} of {reporter.sent}")


def main():
    torn = answered = 0
    for kills in range(1, MOST_KILLS + 1):
        reporter = report_and_kill()
        cut = [container for container in containers() if container.is_torn]
        check(reporter, "after the kill")
        daemon = Daemon()
        daemon.connect()
        until("the repair", lambda: not any(container.is_torn for container in containers()))
        check(reporter, "after the next start")
        daemon.kill()
        torn, answered = torn + len(cut), answered + len(reporter.answered)
        for path in pathlib.Path(CACHES).glob("session.*"):
            path.unlink()
        if torn and kills >= LEAST_KILLS:
            break
    print(f"{answered} answered, {torn} records cut in {kills} kills")
    if torn == 0:
        fail("no kill cut a record")


main()
