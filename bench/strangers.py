#!/usr/bin/python3
"""Measures queries of libkyvisa and of other makers' clients on one simulator, all on one core.

VXI-11 clients insist on portmapper 111, so this runs in a network of its own. Rounds of all clients take turns. Prints JSON like
the other benchmark programs: nanoseconds a query, one sample a round.

Usage: strangers.py FOLDER_OF_THE_PROGRAMS [--rounds N]
"""
import argparse
import json
import os
import pathlib
import re
import subprocess
import sys
import time

COUNT = 1500

parser = argparse.ArgumentParser()
parser.add_argument("programs", type=pathlib.Path)
parser.add_argument("--rounds", type=int, default=15)
parser.add_argument("--inside", action="store_true")
options = parser.parse_args()

if not options.inside:
    command = ["unshare", "-n" if os.geteuid() == 0 else "-rn", sys.executable, *sys.argv, "--inside"]
    os.execvp(command[0], command)

os.sched_setaffinity(0, {0})
subprocess.run(["ip", "link", "set", "lo", "up"], check=True)


def ours(resource):
    run = subprocess.run([options.programs / "bench-query", resource, str(COUNT)], capture_output=True, text=True, check=True, timeout=120)
    return float(run.stdout)


def lxi(*more):
    run = subprocess.run(["lxi", "benchmark", "--address", "127.0.0.1", "--count", str(COUNT), *more], capture_output=True, text=True,
                         check=True, timeout=120)
    return 1e9 / float(re.search(r"Result: (\S+) requests/second", run.stdout)[1])


def pure_python(instrument):
    count = COUNT // 3
    begin = time.perf_counter()
    for _ in range(count):
        instrument.write("*IDN?")
        instrument.read()
    return (time.perf_counter() - begin) * 1e9 / count


simulator = subprocess.Popen([options.programs / "KyVisaSimulator", "--vxi11", "0", "--portmapper", "111", "--socket", "0"],
                             stdout=subprocess.PIPE, text=True)
try:
    resources = {}
    while (line := simulator.stdout.readline().strip()) not in ("ready", ""):
        resources[line.split()[0]] = line.split()[-1]
    import pyvisa

    manager = pyvisa.ResourceManager("@py")
    termination = {"read_termination": "\n", "write_termination": "\n", "timeout": 10000}
    by_vxi11 = manager.open_resource(resources["vxi11"], timeout=10000)
    by_socket = manager.open_resource(resources["socket"], **termination)
    port = re.search(r"::(\d+)::SOCKET", resources["socket"])[1]
    clients = {
        "vxi11/kyvisa": lambda: ours(resources["vxi11"]),
        "vxi11/lxi": lxi,
        "vxi11/pyvisa-py": lambda: pure_python(by_vxi11),
        "socket/kyvisa": lambda: ours(resources["socket"]),
        "socket/lxi": lambda: lxi("--raw", "--port", port),
        "socket/pyvisa-py": lambda: pure_python(by_socket),
    }
    series = {name: [] for name in clients}
    for _ in range(options.rounds):
        for name, query in clients.items():
            series[name].append([query()])
    by_vxi11.close()
    by_socket.close()
    print(json.dumps({"series": series, "values": {}}))
finally:
    simulator.terminate()
    simulator.wait(60)
