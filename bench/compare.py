#!/usr/bin/env python3
"""Runs the benchmarks, forms a ratio for each row, and compares it with its target.

Both sides of a row are measured in the same run, repetitions of all benchmarks interleaved at random; a row's figure is formed
from the medians. Prints a table, writes bench.json, and ends with status 1 when a row misses its target.

Usage: compare.py FOLDER_OF_THE_PROGRAMS [--repetitions N] [--json FILE]
"""
import argparse
import json
import pathlib
import statistics
import subprocess
import sys

parser = argparse.ArgumentParser()
parser.add_argument("programs", type=pathlib.Path)
parser.add_argument("--repetitions", type=int, default=9)
parser.add_argument("--json", type=pathlib.Path)
options = parser.parse_args()


def measure(program):
    """Nanoseconds of every repetition, and the counters, by benchmark."""
    run = subprocess.run(
        [options.programs / program, "--benchmark_format=json", f"--benchmark_repetitions={options.repetitions}",
         "--benchmark_enable_random_interleaving=true", "--benchmark_min_time=0.3"],
        capture_output=True, text=True, check=False)
    if run.returncode != 0:
        sys.exit(f"{program} ended with status {run.returncode}: {run.stderr[-2000:]}")
    unit = {"ns": 1, "us": 1e3, "ms": 1e6, "s": 1e9}
    times, counters = {}, {}
    for entry in json.loads(run.stdout)["benchmarks"]:
        if entry["run_type"] != "iteration":
            continue
        if entry.get("error_occurred"):
            sys.exit(f"{program}: {entry['name']}: {entry['error_message']}")
        name = entry["name"].split("/real_time")[0].split("/manual_time")[0].split("/iterations")[0]
        times.setdefault(name, []).append(entry["real_time"] * unit[entry["time_unit"]])
        counters.setdefault(name, []).append(entry.get("allocations", 0))
    return times, counters


def median(values):
    return statistics.median(values)


rows = []


def row(what, ours, rival, figure, target, good, unit=""):
    rows.append({"row": what, "ours_ns": ours, "rival_ns": rival, "figure": figure, "unit": unit, "target": target, "met": good})


def at_least(what, times, ours, rival, target):
    """Rate of ours over rate of the rival."""
    ratio = median(times[rival]) / median(times[ours])
    row(what, times[ours], times[rival], ratio, f">= {target}", ratio >= target)


times, _ = measure("bench-transport")
at_least("*IDN? query, raw socket, against a bare client", times, "kyvisaQuery/socket", "bareSocketQuery", 0.85)
at_least("*IDN? query, HiSLIP, against a bare client", times, "kyvisaQuery/hislip", "bareHislipQuery", 0.85)
at_least("*IDN? query, VXI-11, against a bare client", times, "kyvisaQuery/vxi11", "bareVxi11Query", 0.85)
for direction in ("Write", "Read"):
    for protocol in ("socket", "hislip"):
        at_least(f"64 MiB block {direction.lower()}, {protocol}, against a bare copy", times,
                 f"kyvisaBlock{direction}/{protocol}", f"bareBlock{direction}", 0.8)

strangers = subprocess.run([pathlib.Path(__file__).with_name("strangers.py"), options.programs, "--repetitions", str(options.repetitions)],
                           capture_output=True, text=True, check=False)
if strangers.returncode != 0:
    sys.exit(f"strangers.py ended with status {strangers.returncode}: {strangers.stderr[-2000:]}")
times = json.loads(strangers.stdout)
at_least("*IDN? query, VXI-11, against lxi benchmark", times, "kyvisa", "lxi", 1.0)
at_least("*IDN? query, VXI-11, against PyVISA in pure Python", times, "kyvisa", "pyvisa-py", 3.0)

if (options.programs / "bench-log").exists():
    times, counters = measure("bench-log")
    above = median(times["loggedCall/bothSinks"]) - median(times["bareCall"])
    row("logged call above the bare call, both sinks on", times["loggedCall/bothSinks"], times["bareCall"], above, "<= 2000 ns",
        above <= 2000, "ns")
    above = median(times["loggedCall/off"]) - median(times["bareCall"])
    limit = median(times["twoClockReadings"]) + 20
    row("logged call above the bare call, logging off", times["loggedCall/off"], times["twoClockReadings"], above,
        f"<= {limit:.0f} ns (two clock readings + 20)", above <= limit, "ns")
    at_least("one line into both sinks, against spdlog asynchronous", times, "oneLine", "spdlogLine", 1.0)
    allocated = max(counters["oneLine"])
    row("allocations a line", times["oneLine"], times["spdlogLine"], allocated, "0", allocated == 0)


def readable(nanoseconds):
    for limit, factor, unit in ((1e3, 1, "ns"), (1e6, 1e3, "us"), (1e9, 1e6, "ms")):
        if nanoseconds < limit:
            return f"{nanoseconds / factor:.1f} {unit}"
    return f"{nanoseconds / 1e9:.2f} s"


def spread(values):
    ordered = sorted(values)
    return f"{readable(median(ordered))} ({readable(ordered[0])} .. {readable(ordered[-1])})"


print(f"{'row':58} {'ours, median (min .. max)':36} {'rival, median (min .. max)':36} {'figure':>10}  target")
for r in rows:
    mark = "ok" if r["met"] else "MISSED"
    print(f"{r['row']:58} {spread(r['ours_ns']):36} {spread(r['rival_ns']):36} {r['figure']:>7.2f} {r['unit']:2}  {r['target']}  {mark}")
if options.json:
    options.json.write_text(json.dumps({"repetitions": options.repetitions, "rows": rows}, indent=1) + "\n")
sys.exit(0 if all(r["met"] for r in rows) else 1)
