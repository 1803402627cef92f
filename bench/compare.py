#!/usr/bin/env python3
"""Runs the benchmarks, forms a figure for each row, and compares it with its target.

Both sides of a row are measured in the same run, by turns. Prints a table, writes a JSON file, and ends with status 1 when a row misses its
target or its rival is slower than it ought to be.

Usage: compare.py FOLDER_OF_THE_PROGRAMS [--json FILE] [--record PAGE] [--note TEXT] [--quick] [--only PART[,PART...]]
"""
import argparse
import json
import pathlib
import subprocess
import sys

sys.dont_write_bytecode = True
import figures
import report

PARTS = ("transport", "strangers", "log", "tests", "window", "start", "growth")
LONGEST = 300  # seconds that one program may take

parser = argparse.ArgumentParser()
parser.add_argument("programs", type=pathlib.Path)
parser.add_argument("--json", type=pathlib.Path)
parser.add_argument("--record", type=pathlib.Path, help="a page whose figures are replaced by those of this run")
parser.add_argument("--note", default="a shared two-core machine", help="what the page says about the machine")
parser.add_argument("--quick", action="store_true", help="short runs, for development")
parser.add_argument("--only", default=",".join(PARTS), help="parts of the run, of " + ", ".join(PARTS))
options = parser.parse_args()
rows = report.Rows()


class Failed(Exception):
    """A program that measured nothing."""


def measure(program, *arguments):
    """What one program measured: series and values."""
    script = pathlib.Path(__file__).with_name(program)
    command = [script, options.programs] if script.exists() else [options.programs / program]
    print(f"-- {program}", file=sys.stderr)
    try:
        run = subprocess.run([*command, *map(str, arguments)], capture_output=True, text=True, check=False, timeout=LONGEST)
    except subprocess.TimeoutExpired:
        raise Failed(f"{program} did not end within {LONGEST} s") from None
    if run.returncode != 0:
        raise Failed(f"{program} ended with status {run.returncode}: {run.stderr[-2000:]}")
    result = json.loads(run.stdout)
    return result["series"], result["values"]


def quick(few, many):
    return few if options.quick else many


def transport():
    series, _ = measure("bench-transport", "--rounds", quick(30, 200), "--block-rounds", quick(5, 15))
    rows.ping = figures.summary(series["ping"])
    for kind, name in (("socket", "raw socket"), ("hislip", "HiSLIP"), ("vxi11", "VXI-11")):
        rival = f"{kind}/bare"
        rows.at_least(f"*IDN? query, {name}, against a bare client", series, f"{kind}/kyvisa", rival, 0.85,
                      gate=figures.gate(kind, series[rival], series["ping"]))
    for direction in ("Write", "Read"):
        for kind in ("socket", "hislip"):
            rows.at_least(f"64 MiB block {direction.lower()}, {kind}, against a bare copy", series, f"block{direction}/{kind}",
                          f"block{direction}/bare", 0.8)


def strangers():
    series, _ = measure("strangers.py", "--rounds", quick(3, 15))
    for kind, name in (("socket", "raw socket"), ("vxi11", "VXI-11")):
        rows.at_least(f"*IDN? query, {name}, against lxi benchmark", series, f"{kind}/kyvisa", f"{kind}/lxi", 1.0)
    rows.at_least("*IDN? query, VXI-11, against PyVISA in pure Python", series, "vxi11/kyvisa", "vxi11/pyvisa-py", 3.0)
    # No client can be three times as fast on a raw socket: a bare one is 2.2 times as fast.
    rows.at_least("*IDN? query, raw socket, against PyVISA in pure Python", series, "socket/kyvisa", "socket/pyvisa-py", 1.5)


def log():
    series, values = measure("bench-log", "--rounds", quick(10, 60))

    def above(what, ours, limit, text, rival):
        rows.at_most(what, figures.difference(series[ours], series["bareCall"]), limit, "ns", figures.summary(series[ours]),
                     figures.summary(series[rival]), text)

    above("logged call above the bare call, both sinks on", "loggedCall/bothSinks", 2000, "<= 2000", "bareCall")
    limit = figures.percentile(figures.samples(series["twoClockReadings"]), 50) + 20
    above("logged call above the bare call, logging off", "loggedCall/off", limit, f"<= {limit:.0f} (two clock readings + 20)", "twoClockReadings")
    rows.at_least("one line into both sinks, against spdlog asynchronous", series, "oneLine", "spdlogLine", 1.0, strictly=True)
    rows.at_most("allocations a line", values["allocationsOfALine"], 0, "")


def tests():
    series, _ = measure("bench-figures", "--rounds", quick(5, 25))
    for direction in ("write", "read"):
        for kind, name in (("socket", "raw socket"), ("hislip", "HiSLIP"), ("vxi11", "VXI-11")):
            ours, rival = (f"{direction}/{kind}/{side}" for side in ("test", "bare"))
            off = 100 * abs(1 - figures.rate_ratio(series[ours], series[rival]))
            rows.at_most(f"performance test: block {direction}, {name}, off from a bare program", off, 10, "%", figures.summary(series[ours]),
                         figures.summary(series[rival]))


def window():
    _, values = measure("bench-window", "--seconds", quick(3, 10))
    for kind, what in (("log", "20,000 lines a second straight into the log"), ("test", "a test's calls at full speed"),
                       ("pipeline", "the window's requests at full speed")):
        rows.below(f"live view: share of the window's thread, {what}", 100 * values[f"{kind}/share"], 25, "%",
                   lines_a_second=values[f"{kind}/linesASecond"])
    wanted = 0.95 * 20000
    rows.add("live view: lines a second that came into the log", values["log/linesASecond"], "1/s", f">= {wanted:.0f}",
             values["log/linesASecond"] >= wanted)


def start():
    series, values = measure("programs.py", "--rounds", quick(5, 20))
    ratio = 1 / figures.rate_ratio(series["start/tester"], series["start/empty"])
    rows.at_most("start to the first painted window, against an empty Qt Widgets program", ratio, 2.0, "x",
                 figures.summary(series["start/tester"]), figures.summary(series["start/empty"]), text="<= 2")
    rows.below("memory of the idle tester above the empty program", values["memory/tester"] - values["memory/empty"], 40, "MiB",
               tester=values["memory/tester"], empty=values["memory/empty"])


def growth():
    series, _ = measure("bench-growth", *(["--quick"] if options.quick else []))
    for what, title, unit in (("lines", "log lines into both sinks, until they stand in the file", "lines"),
                              ("sessions", "one query on each of many open sessions", "sessions"),
                              ("opens", "opening and closing many sessions", "sessions"),
                              ("blockWrite", "block written over HiSLIP", "bytes"), ("blockRead", "block read over HiSLIP", "bytes"),
                              ("resources", "resources found and fetched one by one", "resources")):
        # The least of each size: what else the machine does adds to a cost, and adds more to long ones.
        points = [(int(name.split("/")[1]), min(figures.samples(batches))) for name, batches in series.items() if name.split("/")[0] == what]
        rows.growth(title, sorted(points), unit)


failures = []
for part in options.only.split(","):
    if part not in PARTS:
        parser.error(f"no such part: {part}")
    try:
        globals()[part]()
    except Failed as failure:  # the other parts have something to say all the same
        failures.append(f"{part}: {failure}")

machine = report.machine(options.note)
print(f"{machine}\n")
print(rows.table())
print(rows.growth_table(), end="")
if hasattr(rows, "ping"):
    print(f"a plain round trip on the same core: {report.percentiles(rows.ping)}")
if options.json:
    options.json.write_text(rows.json(machine), encoding="utf-8")
if options.record and not failures:
    page = options.record.read_text(encoding="utf-8")
    options.record.write_text(report.replaced(page, rows.markdown(machine)), encoding="utf-8")
for failure in failures:
    print(f"NOT MEASURED: {failure}", file=sys.stderr)
sys.exit(0 if rows.all_met() and not failures else 1)
