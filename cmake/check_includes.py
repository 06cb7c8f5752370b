#!/usr/bin/env python3
"""Checks that includes follow the links: a folder includes only from folders whose library it links.

usage: check_includes.py LAYERS FILE...

All headers are reachable from the root of the repository, and a header needs no link, so the linker alone would not
notice an include that goes upward. LAYERS is what the build writes: one line a library or main file, with its path,
its name, what it links, and what its tests link besides, separated by tabs.
"""

import re
import sys

INCLUDE = re.compile(r'^\s*#\s*include\s+"([^"]+)"')
OF_TESTS = re.compile(r"Test(Support)?\.(cpp|h)$")


def read_layers(path):
    """The libraries' names by path, and the links by name."""
    names, links = {}, {}
    with open(path, encoding="utf-8") as lines:
        for line in lines:
            place, name, deps, test_deps = line.rstrip("\n").split("\t")
            names[place] = name
            links[name] = deps.split()
            links[name + "_tests"] = [name, *test_deps.split()]
    return names, links


def reachable(name, links):
    found, waiting = set(), [name]
    while waiting:
        current = waiting.pop()
        if current not in found:
            found.add(current)
            waiting += links.get(current, [])
    return found


def owner(file, names):
    """The library or main file to which a file belongs: the entry with the longest matching path."""
    places = [place for place in names if file == place or file.startswith(place + "/")]
    return names[max(places, key=len)] if places else None


def main():
    names, links = read_layers(sys.argv[1])
    failed = False
    for file in sys.argv[2:]:
        user = owner(file, names)
        if user is None:
            continue
        allowed = reachable(user + "_tests" if OF_TESTS.search(file) else user, links)
        with open(file, encoding="utf-8") as lines:
            for number, line in enumerate(lines, 1):
                match = INCLUDE.match(line)
                used = match and owner(match[1], names)
                if used and used not in allowed:
                    print(f"{file}:{number}: {user} does not link {used}, of which this includes {match[1]}")
                    failed = True
    sys.exit(1 if failed else 0)


main()
