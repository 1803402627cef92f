#!/usr/bin/env python3
"""Starts the program in a virtual display on the stand-in for the VISA library, closes its window as a window manager does, and
looks at what is left: the exit status, the settings and the session's values, under the names that the program gives itself.

  program-closes.py PROGRAM FOLDER          the library answers: status 0
  program-closes.py PROGRAM FOLDER NAME     the library holds the operation NAME for ever: status 55, after four seconds
"""
import os
import pathlib
import subprocess
import sys
import tempfile
import time

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parents[1] / "support"))
from virtual_display import VirtualDisplay  # noqa: E402

PROGRAM, FOLDER = sys.argv[1:3]
BLOCKED = sys.argv[3] if len(sys.argv) > 3 else None
DEADLINE = time.monotonic() + 60


def wait_for(what, condition):
    while not (value := condition()):
        assert time.monotonic() < DEADLINE, f"{what}: not in time"
        time.sleep(0.02)
    return value


with tempfile.TemporaryDirectory() as home:
    home = pathlib.Path(home)
    (home / "Documents").mkdir()
    trace = home / "trace"
    with VirtualDisplay() as display:
        environment = {k: v for k, v in os.environ.items() if not k.startswith("XDG_") and k not in ("QT_QPA_PLATFORM", "STANDIN_BLOCK")}
        environment |= {"HOME": str(home), "DISPLAY": display.name, "QT_QPA_PLATFORM": "xcb", "LC_ALL": "C.UTF-8",
                        "XDG_RUNTIME_DIR": str(home), "LD_LIBRARY_PATH": FOLDER, "STANDIN_TRACE": str(trace)}
        if BLOCKED:
            environment["STANDIN_BLOCK"] = BLOCKED
        program = subprocess.Popen([PROGRAM], env=environment)
        try:
            # The stand-in knows no attributes, so the title stays at name and version.
            window = wait_for("the window", lambda: display.window("KyVisaTester 5.8.6"))
            reached = BLOCKED or "viGetAttribute"
            wait_for(reached, lambda: trace.exists() and reached in trace.read_text().split())
            started = time.monotonic()
            display.close(window)
            status = program.wait(timeout=30)
            lasted = time.monotonic() - started
        finally:
            program.kill()
            program.wait()

    assert status == (55 if BLOCKED else 0), status
    assert not BLOCKED or lasted > 3.9, lasted
    settings = (home / ".config/Oltrava/KyVisaTester.conf").read_text()
    assert "[MainWindow]" in settings and "fullscreen=false" in settings and "size=@Size(750 480)" in settings, settings
    data = (home / ".local/share/Oltrava/KyVisaTester/data.adr").read_bytes()
    assert data.startswith(b"000001000000"), data
