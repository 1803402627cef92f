#!/usr/bin/python3
"""The example programs do what their comments say, against the simulator.

Usage: examples.py SIMULATOR LIBRARY FOLDER_OF_THE_SOURCES EXAMPLE...
"""
import os
import pathlib
import re
import subprocess
import sys

simulator, library, sources, *programs = sys.argv[1:]
programs = {pathlib.Path(program).name.replace("example-", ""): program for program in programs}
os.environ["KYVISA_CONFIG"] = "/dev/null"


def start(*options):
    process = subprocess.Popen([simulator, *options], stdout=subprocess.PIPE, text=True)
    resources = {}
    for line in process.stdout:
        if line == "ready\n":
            return process, resources
        resources[line.split()[0]] = line.split()[-1]
    raise RuntimeError("the simulator did not become ready")


def run(*command, status=0):
    done = subprocess.run(command, capture_output=True, text=True, timeout=120)
    if done.returncode != status:
        raise AssertionError(f"{command}: status {done.returncode}\n{done.stdout}{done.stderr}")
    return done.stdout if status == 0 else done.stderr


def expect(pattern, text):
    if not re.fullmatch(pattern, text):
        raise AssertionError(f"{text!r} does not match {pattern!r}")


process, resources = start("--hislip", "0", "--socket", "0", "--vxi11", "0", "--portmapper", "0", "--profile", "oscilloscope")
os.environ["KYVISA_PORTMAPPER_PORT"] = resources["portmapper"]
try:
    for service in ("hislip", "socket", "vxi11"):
        expect(r"Oltrava,WS-2104,\S+\n", run(programs["query"], resources[service]))
        expect(r"7\n", run(programs["query"], resources[service], "*ESE 7;*ESE?"))
    if library != "-":
        for service in ("hislip", "socket"):
            expect(r"Oltrava,WS-2104,\S+\n", run("/usr/bin/python3", f"{sources}/query.py", library, resources[service]))
    expect(r".*: .+\n", run(programs["query"], "no such resource", status=1))
    for service in ("hislip", "vxi11"):
        # Ten divisions of a millisecond, and a sine of one volt at the input.
        record = run(programs["block"], resources[service])
        expect(r"5000 points, 2e-06 s apart, from -(0\.9|1\.[01])\S* V to (0\.9|1\.[01])\S* V\n", record)
    expect(r".+\n", run(programs["find"], "USB?*", "0", status=1))
finally:
    process.terminate()
    process.wait(60)

process, resources = start("--hislip", "0", "--socket", "0", "--vxi11", "0", "--portmapper", "0")
os.environ["KYVISA_PORTMAPPER_PORT"] = resources["portmapper"]
try:
    for service in ("hislip", "vxi11"):
        expect(r"status byte 0x6[04], event status 1\n", run(programs["service_request"], resources[service]))
    expect(r".*: .+\n", run(programs["service_request"], resources["socket"], status=1))
finally:
    process.terminate()
    process.wait(60)
print("the examples do what they say")
