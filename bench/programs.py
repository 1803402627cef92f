#!/usr/bin/env python3
"""Starts the tester and an empty Qt Widgets program by turns, all on one core: the time to the first painted window, and the memory that
each needs when nothing happens any more. Prints JSON like the other benchmark programs.

Usage: programs.py FOLDER_OF_THE_PROGRAMS [--rounds N]
"""
import argparse
import json
import os
import pathlib
import select
import statistics
import subprocess
import tempfile
import time

LONGEST = 30  # seconds until a window is painted
IDLE = 2  # seconds; what the start leaves to do is done by then

parser = argparse.ArgumentParser()
parser.add_argument("programs", type=pathlib.Path)
parser.add_argument("--rounds", type=int, default=20)
options = parser.parse_args()

os.sched_setaffinity(0, {0})
environment = {**os.environ, "QT_QPA_PLATFORM": os.environ.get("QT_QPA_PLATFORM", "offscreen"), "QT_QPA_GENERIC_PLUGINS": "firstpaint",
               "QT_PLUGIN_PATH": str(options.programs.parent / "bench-plugins")}


def started(program):
    """The program with its window painted, and the nanoseconds that it took."""
    reading, writing = os.pipe()
    begin = time.monotonic_ns()
    process = subprocess.Popen([program], env={**environment, "FIRST_PAINT_FD": str(writing)}, pass_fds=[writing])
    os.close(writing)
    with os.fdopen(reading) as pipe:
        painted = pipe.readline() if select.select([pipe], [], [], LONGEST)[0] else ""
    if not painted:
        ended(process)
        raise RuntimeError(f"{program} painted no window within {LONGEST} s")
    return process, int(painted) - begin


def ended(process):
    process.kill()
    process.wait(LONGEST)


def resident(process):
    """MiB of memory that the process has in use, shared pages included."""
    lines = pathlib.Path(f"/proc/{process.pid}/smaps_rollup").read_text(encoding="ascii").splitlines()
    return int(next(line.split()[1] for line in lines if line.startswith("Rss:"))) / 1024


with tempfile.TemporaryDirectory() as home:
    for variable in ("HOME", "XDG_CONFIG_HOME", "XDG_DATA_HOME", "XDG_CACHE_HOME", "XDG_RUNTIME_DIR"):
        environment[variable] = home
    programs = {"empty": options.programs / "bench-empty", "tester": options.programs / "KyVisaTester"}
    series = {f"start/{name}": [] for name in programs}
    values = {}
    for turn in range(options.rounds + 1):
        for name, program in programs.items():
            process, took = started(program)
            ended(process)
            if turn > 0:  # the first start reads the files
                series[f"start/{name}"].append([took])
    for name, program in programs.items():
        sizes = []
        for _ in range(3):
            process, _ = started(program)
            time.sleep(IDLE)
            sizes.append(resident(process))
            ended(process)
        values[f"memory/{name}"] = statistics.median(sizes)
    print(json.dumps({"series": series, "values": values}))
