#!/usr/bin/env python3
"""Turns Google Benchmark's JSON into rows for table.py.

usage: google_rows.py < JSON

A benchmark that has a floor is shown against it; floors have no line of their own.
"""

import json
import sys

# What is measured -> what the same work costs at least; a missing counter means the time of one iteration.
FLOORS = {
    "SyncOnIdleSerialQueue": "LockFloor",
    "SharedSync": "LockFloor",
    "AsyncToIdleSerialQueue": "HandOverFloor",
    "URLSessionRequest": "BareCurlRequest",
    "BM_CurrentUserGUID": "BM_IdleSync",
    "BM_InMemoryBag": "BM_IdleSync",
    "BM_CurrentBag": "BM_IdleSync",
    "BM_BuildSearchRequest": "BM_CopySearchRequest",
    "BM_SearchRequest": "BM_CopyRequestFloor",
    "BM_RecordToFile": "BM_WritevLoop",
    "BM_ReadFullContainer": "BM_ParseMessages",
    "BM_EncodeFeedback": "BM_SerializeFeedbackFloor",
}

# What a figure is to be at most, in times of its floor.
RATIOS = {
    "BM_EncodeFeedback": 1.5,
}

# What a figure is to be at most, in microseconds.
LIMITS = {
    "BM_CacheHitOfOneLetter": 5,
    "BM_CacheHitOfTheCommonestLetter": 5,
    "BM_CacheHitAmongAllEntries": 5,
    "BM_RecordFromEightThreads": 5,
    "BM_ScanContainers/1000": 50_000,
}


def microseconds(row):
    scale = {"ns": 1e-3, "us": 1.0, "ms": 1e3, "s": 1e6}[row["time_unit"]]
    return row.get("p50_us", row["real_time"] * scale)


def main():
    rows = [row for row in json.load(sys.stdin)["benchmarks"] if "error_occurred" not in row]
    by_base = {}
    for row in rows:
        by_base.setdefault(row["name"].split("/")[0], microseconds(row))
        by_base.setdefault(row["name"], microseconds(row))
    for row in rows:
        base = row["name"].split("/")[0]
        if base in FLOORS.values():
            continue
        # A floor with the same argument, if it has one.
        floor_name = FLOORS.get(base)
        same = f"{floor_name}{row['name'][len(base):]}"
        ours, floor = microseconds(row), by_base.get(same, by_base.get(floor_name))
        beside = (floor_name, f"{floor:.6g}", f"{ours / floor:.6g}") if floor else ("-", "-", "-")
        limit = LIMITS.get(row["name"], LIMITS.get(base))
        target = f"<= {limit}" if limit else "-"
        if floor and base in RATIOS:
            target = f"<= {RATIOS[base]} x"
        print(row["name"], "-", "us", f"{ours:.6g}", target, *beside, "-", "-", "-", sep="\t")


main()
