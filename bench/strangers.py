#!/usr/bin/python3
"""Measures VXI-11 queries of libkyvisa and of other makers' clients on one simulator, all on one core.

The simulator needs port 111, so this runs in a network of its own. Rounds of all clients take turns. Prints JSON: nanoseconds a
query of every round, by client.

Usage: strangers.py FOLDER_OF_THE_PROGRAMS [--repetitions N]
"""
import argparse
import json
import os
import pathlib
import re
import subprocess
import sys
import time

RESOURCE = "TCPIP::127.0.0.1::inst0::INSTR"
COUNT = 4000

parser = argparse.ArgumentParser()
parser.add_argument("programs", type=pathlib.Path)
parser.add_argument("--repetitions", type=int, default=9)
parser.add_argument("--inside", action="store_true")
options = parser.parse_args()

if not options.inside:
    command = ["unshare", "-n" if os.geteuid() == 0 else "-rn", sys.executable, *sys.argv, "--inside"]
    os.execvp(command[0], command)

os.sched_setaffinity(0, {0})
subprocess.run(["ip", "link", "set", "lo", "up"], check=True)


def ours():
    run = subprocess.run([options.programs / "bench-query", RESOURCE, str(COUNT)], capture_output=True, text=True, check=True, timeout=120)
    return float(run.stdout)


def lxi():
    run = subprocess.run(["lxi", "benchmark", "--address", "127.0.0.1", "--count", str(COUNT)], capture_output=True, text=True,
                         check=True, timeout=120)
    return 1e9 / float(re.search(r"Result: (\S+) requests/second", run.stdout)[1])


def pure_python():
    count = COUNT // 4
    begin = time.perf_counter()
    for _ in range(count):
        instrument.write("*IDN?")
        instrument.read()
    return (time.perf_counter() - begin) * 1e9 / count


simulator = subprocess.Popen([options.programs / "KyVisaSimulator", "--vxi11", "0", "--portmapper", "111"], stdout=subprocess.PIPE, text=True)
try:
    while simulator.stdout.readline().strip() not in ("ready", ""):
        pass
    import pyvisa

    instrument = pyvisa.ResourceManager("@py").open_resource(RESOURCE, timeout=10000)
    times = {"kyvisa": [], "lxi": [], "pyvisa-py": []}
    for _ in range(options.repetitions):
        times["kyvisa"].append(ours())
        times["lxi"].append(lxi())
        times["pyvisa-py"].append(pure_python())
    instrument.close()
    print(json.dumps(times))
finally:
    simulator.terminate()
    simulator.wait(60)
