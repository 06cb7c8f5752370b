#!/usr/bin/env python3
"""Checks that includes follow the links: a folder includes only from folders whose library it links, and a room of a
library only from the rooms that are declared for it. No library or room leads back to itself.

usage: check_includes.py LAYERS FILE...

All headers are reachable from the root of the repository, and a header needs no link, so the linker alone would not
notice an include that goes upward. LAYERS is what the build writes: one line a library, room or main file, with its
path, its name, what it links, and what its tests link besides, separated by tabs. A room's name is its library's, a
slash and its folder.
"""

import os
import re
import sys

INCLUDE = re.compile(r'^\s*#\s*include\s+["<]([^">]+)[">]')
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


def is_room(name):
    return "/" in name


def may_include(user, links):
    """A room, from those rooms alone that are declared for it, and from what its library links."""
    if not is_room(user):
        return reachable(user, links)
    declared = {name for name in links[user] if is_room(name)}
    return {user} | declared | set().union(*(reachable(name, links) for name in links[user] if not is_room(name)))


def circles(links):
    """The names that lead back to themselves."""
    return [name for name in links if any(name in reachable(used, links) for used in links[name])]


def owner(file, names):
    """The library, room or main file to which a file belongs: the entry with the longest matching path."""
    places = [place for place in names if file == place or file.startswith(place + "/")]
    return max(places, key=len) if places else None


def stands_outside(file, place, names):
    """Whether the file is in a folder of a library with rooms, and that folder is none of them."""
    has_rooms = any(other.startswith(names[place] + "/") for other in names.values())
    return has_rooms and "/" in file[len(place) + 1 :]


def problems(file, names, links):
    place = owner(file, names)
    if place is None:
        return
    if stands_outside(file, place, names):
        yield f"{file}: stands in no room of {names[place]}"
        return
    user = names[place]
    allowed = reachable(user + "_tests", links) if OF_TESTS.search(file) else may_include(user, links)
    with open(file, encoding="utf-8") as lines:
        for number, line in enumerate(lines, 1):
            match = INCLUDE.match(line)
            used = match and owner(match[1], names)
            if match and not used and os.path.exists(os.path.join(os.path.dirname(file), match[1])):
                yield f"{file}:{number}: {match[1]} is not named from the root of the repository"
            if used and names[used] not in allowed:
                yield f"{file}:{number}: {user} does not link {names[used]}, of which this includes {match[1]}"


def main():
    names, links = read_layers(sys.argv[1])
    found = [f"{name} links itself, by way of {', '.join(links[name])}" for name in circles(links)]
    for file in sys.argv[2:]:
        found += problems(file, names, links)
    for problem in found:
        print(problem)
    sys.exit(1 if found else 0)


main()
