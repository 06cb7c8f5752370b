#!/usr/bin/env python3
"""Prints one table of the rows that benchmarks tell, of one or several runs.

usage: table.py [--loaded LOAD] < ROWS

  --loaded   marks the table: the machine was not quiet, LOAD was its load average

A row is a line of fields with tabs between them: name, figure, unit, ours, target, then whose floor it is, the floor's
figure and the ratio, and the same of a second program; "-" for what there is not. Rows of the same name and figure are
those of several runs: the table shows, and judges, their medians, with the least and the greatest in brackets.
"""

import argparse
import re
import statistics
import sys

# What the floors' names in the rows stand for; others say it themselves.
FLOORS = {
    "echo": "one loop around plain sd-bus that hands each call to a worker thread and, woken by it, sends the reply",
    "broker": "a minimal broker: one thread, one epoll loop, a plain sd-bus door, one libcurl multi handle; no cache, no"
    " records",
    "bare client": "one libcurl handle on a multi loop that sends the same request to the service; no door",
    "50 handles": "as many libcurl handles on one multi loop that get the same images; no door",
}

# The figure that has a column beside the other figures of its name, in the row of the first of them.
WAKE_UPS = "wake-ups"


class Figure:
    """All runs' rows of one name and figure."""

    def __init__(self, fields):
        self.name, self.figure, self.unit, _, self.target, self.floor_name, _, _, self.second_name, _, _ = fields
        self.ours, self.floor, self.ratio, self.second, self.second_ratio = [], [], [], [], []

    def add(self, fields):
        columns = ((3, self.ours), (6, self.floor), (7, self.ratio), (9, self.second), (10, self.second_ratio))
        for place, values in columns:
            if fields[place] != "-":
                values.append(float(fields[place]))

    def title(self):
        figure = "" if self.figure == "-" else " " + self.figure
        return f"{self.name}{figure}, {self.unit}"

    def verdict(self):
        """Of the medians against the target."""
        ours = statistics.median(self.ours)
        if self.figure == WAKE_UPS:
            ours = round(ours, 1)  # the process's own timers are counted too, now and then
        if match := re.fullmatch(r"<= floor \+ (.+)", self.target):
            good = ours - statistics.median(self.floor) <= float(match[1])
        elif match := re.fullmatch(r"<= (.+) x", self.target):
            good = statistics.median(self.ratio) <= float(match[1])
        elif match := re.fullmatch(r"<= (.+)", self.target):
            good = ours <= float(match[1])
        else:
            return "-"
        return "ok" if good else "over"


def number(value):
    return f"{value:.0f}" if abs(value) >= 1000 else f"{value:.4g}"


def ratio(value):
    return f"{value:.2f}"


def spread(values, show=number):
    """The median, and of several runs the extremes."""
    if not values:
        return "-"
    median = show(statistics.median(values))
    return median if len(values) == 1 else f"{median} ({show(min(values))} to {show(max(values))})"


def read(lines):
    figures = {}
    for line in lines:
        fields = line.rstrip("\n").split("\t")
        figures.setdefault((fields[0], fields[1]), Figure(fields)).add(fields)
    return figures


def second_cell(figure):
    return f"{spread(figure.second)}, {spread(figure.second_ratio, ratio)} x" if figure.second else "-"


def wake_ups_cell(figure):
    if figure is None:
        return "-"
    judged = f", {figure.target}: {figure.verdict()}" if figure.target != "-" else ""
    return f"{spread(figure.ours, ratio)} / {spread(figure.floor, ratio)}{judged}"


def cells(figures):
    """The table's lines."""
    seconds = {figure.second_name for figure in figures.values()} - {"-"}
    yield ("name", "ours", "floor", "ratio", "target", "verdict", ", ".join(sorted(seconds)),
           "wake-ups a call, ours / floor", "the floor is")
    shown = set()
    for (name, kind), figure in figures.items():
        if kind == WAKE_UPS:
            continue
        wake_ups = None if name in shown else figures.get((name, WAKE_UPS))
        shown.add(name)
        yield (figure.title(), spread(figure.ours), spread(figure.floor), spread(figure.ratio, ratio), figure.target,
               figure.verdict(), second_cell(figure), wake_ups_cell(wake_ups), figure.floor_name)


def print_table(lines):
    """Without the columns that say nothing."""
    kept = [column for column in range(len(lines[0])) if any(line[column] != "-" for line in lines[1:])]
    lines = [[line[column] for column in kept] for line in lines]
    widths = [max(map(len, column)) for column in zip(*lines)]
    for line in lines:
        print("  ".join(cell.ljust(width) for cell, width in zip(line, widths)).rstrip())


def main():
    options = argparse.ArgumentParser(usage="table.py [--loaded LOAD] < ROWS")
    options.add_argument("--loaded")
    load = options.parse_args().loaded
    figures = read(sys.stdin)
    runs = max((len(figure.ours) for figure in figures.values()), default=0)
    mark = f"LOADED: the load average was {load} at the start, so these figures tell little" if load else ""
    for note in (mark, f"medians of {runs} runs (least to greatest)" if runs > 1 else ""):
        if note:
            print(note)
    print_table(list(cells(figures)))
    print()
    names = {name for figure in figures.values() for name in (figure.floor_name, figure.second_name)}
    for name, text in FLOORS.items():
        if name in names:
            print(f"{name}: {text}")
    if mark:
        print(mark)


main()
