#!/usr/bin/env python3
"""Runs a program on another VISA library than the one it was linked with, through LD_LIBRARY_PATH.

  exchanged-library.py works PROGRAM FOLDER     the program talks to the library in FOLDER
  exchanged-library.py lacks NAME PROGRAM FOLDER
                                                it does not start, and says that NAME is missing
  exchanged-library.py blocks NAME PROGRAM FOLDER
                                                the library holds the operation NAME for ever, and the program waits in it
"""
import os
import pathlib
import subprocess
import sys
import tempfile
import time

case, *arguments = sys.argv[1:]
name = arguments.pop(0) if case != "works" else None
program, folder = arguments


def environment(**more):
    return {**os.environ, "LD_LIBRARY_PATH": folder, **more}


def traced(path):
    return path.read_text().split() if path.exists() else []


with tempfile.TemporaryDirectory() as temporary:
    trace = pathlib.Path(temporary) / "trace"
    if case == "works":
        run = subprocess.run([program], env=environment(STANDIN_TRACE=str(trace)), capture_output=True, text=True, timeout=30)
        assert run.returncode == 0, run
        assert run.stdout == "Oltrava,Stand-in,1,1.0\n", run
        assert traced(trace) == ["viOpenDefaultRM", "viOpen", "viWrite", "viRead", "viClose", "viClose", "viClose"], traced(trace)
    elif case == "lacks":
        run = subprocess.run([program], env=environment(STANDIN_TRACE=str(trace)), capture_output=True, text=True, timeout=30)
        assert run.returncode != 0, run
        assert f"undefined symbol: {name}" in run.stderr, run
        assert traced(trace) == [], traced(trace)
    elif case == "blocks":
        with subprocess.Popen([program], env=environment(STANDIN_TRACE=str(trace), STANDIN_BLOCK=name)) as process:
            deadline = time.monotonic() + 30
            while name not in traced(trace) and process.poll() is None and time.monotonic() < deadline:
                time.sleep(0.01)
            reached = name in traced(trace)
            time.sleep(0.1)  # time enough for a program that does not wait
            ended = process.poll()
            process.kill()
        assert reached and ended is None, (traced(trace), ended)
    else:
        sys.exit(f"unknown case {case}")
