#!/usr/bin/env python3
"""What check_includes.py refuses, on a small tree of its own: two libraries, of which the upper one has rooms."""

import os
import subprocess
import sys
import tempfile
import unittest

CHECKER = os.path.join(os.path.dirname(os.path.abspath(__file__)), "check_includes.py")

LAYERS = [
    ("base", "base", "", ""),
    ("host", "host", "base host/files host/net host/web", "testing"),
    ("host/files", "host/files", "base", "host_tests"),
    ("host/net", "host/net", "base host/files", "host_tests"),
    ("host/web", "host/web", "base host/net", "host_tests"),
    ("testing", "testing", "base", ""),
]


def quoted(name):
    return name if name.startswith("<") else f'"{name}"'


class CheckIncludesTest(unittest.TestCase):
    def refusals(self, files, layers=LAYERS):
        """What is printed for these files, path to what they include; none when all is well."""
        with tempfile.TemporaryDirectory() as root:
            for path, included in files.items():
                os.makedirs(os.path.join(root, os.path.dirname(path)), exist_ok=True)
                with open(os.path.join(root, path), "w", encoding="utf-8") as file:
                    file.write("#include <vector>\n" + "".join(f"#include {quoted(other)}\n" for other in included))
            with open(os.path.join(root, "layers.txt"), "w", encoding="utf-8") as file:
                file.writelines("\t".join(layer) + "\n" for layer in layers)
            command = [sys.executable, CHECKER, "layers.txt", *files]
            done = subprocess.run(command, cwd=root, capture_output=True, text=True, check=False)
            self.assertEqual(done.stderr, "")
            self.assertEqual(done.returncode, 1 if done.stdout else 0)
            return done.stdout.splitlines()

    def test_what_is_declared_may_be_included(self):
        self.assertEqual(
            self.refusals(
                {
                    "host/net/Socket.cpp": ["host/net/Socket.h", "host/files/File.h", "base/Text.h"],
                    "host/Host.cpp": ["host/net/Socket.h", "host/files/File.h"],
                    "host/files/FileTest.cpp": ["host/net/Socket.h", "testing/Fake.h"],
                    "elsewhere/Main.cpp": ["host/net/Socket.h"],
                }
            ),
            [],
        )

    def test_a_wall_is_not_crossed(self):
        cases = {
            ("host/files/File.cpp", "host/net/Socket.h"): "host/files does not link host/net",
            ("host/files/File.cpp", "host/Host.h"): "host/files does not link host,",
            ("host/net/Socket.h", "testing/Fake.h"): "host/net does not link testing",
            ("host/web/Page.h", "host/files/File.h"): "host/web does not link host/files",
            ("base/Text.cpp", "host/files/File.h"): "base does not link host/files",
        }
        for (file, included), reason in cases.items():
            with self.subTest(file=file, included=included):
                found = self.refusals({file: ["base/Text.h", included]})
                self.assertEqual(len(found), 1)
                self.assertIn(f"{file}:3: {reason}", found[0])

    def test_no_way_of_writing_it_goes_through_a_wall(self):
        for included in ("../net/Socket.h", "Other.h"):
            with self.subTest(included=included):
                found = self.refusals({"host/net/Socket.h": [], "host/files/Other.h": [], "host/files/File.cpp": [included]})
                self.assertEqual(found, [f"host/files/File.cpp:2: {included} is not named from the root of the repository"])
        found = self.refusals({"host/files/File.cpp": ["<host/net/Socket.h>"]})
        self.assertEqual(len(found), 1)

    def test_every_folder_below_is_a_room(self):
        found = self.refusals({"host/other/Thing.cpp": [], "host/Host.cpp": []})
        self.assertEqual(found, ["host/other/Thing.cpp: stands in no room of host"])

    def test_rooms_stand_in_no_circle(self):
        layers = [*LAYERS[:2], ("host/files", "host/files", "base host/net", "host_tests"), *LAYERS[3:]]
        found = self.refusals({}, layers)
        self.assertEqual([line.split()[0] for line in found], ["host/files", "host/net"])


unittest.main()
