#!/usr/bin/env python3
"""Starts the program in a virtual display on the stand-in for the VISA library, closes its window as a window manager does, and
looks at what is left: the exit status, the settings and the session's values, under the names that the program gives itself.

  program-closes.py PROGRAM FOLDER          the library answers: status 0
  program-closes.py PROGRAM FOLDER NAME     the library holds the operation NAME for ever: status 55, after four seconds
"""
import ctypes
import os
import pathlib
import subprocess
import sys
import tempfile
import time

PROGRAM, FOLDER = sys.argv[1:3]
BLOCKED = sys.argv[3] if len(sys.argv) > 3 else None
DEADLINE = time.monotonic() + 60
CLIENT_MESSAGE = 33


class ClientMessage(ctypes.Structure):
    _fields_ = [("type", ctypes.c_int), ("serial", ctypes.c_ulong), ("send_event", ctypes.c_int), ("display", ctypes.c_void_p),
                ("window", ctypes.c_ulong), ("message_type", ctypes.c_ulong), ("format", ctypes.c_int),
                ("data", ctypes.c_long * 5), ("room", ctypes.c_long * 24)]


class Display:
    def __init__(self, name):
        self.x11 = ctypes.CDLL("libX11.so.6")
        self.x11.XOpenDisplay.restype = ctypes.c_void_p
        for call in ("XDefaultRootWindow", "XInternAtom"):
            getattr(self.x11, call).restype = ctypes.c_ulong
        # A window that ends while it is looked at is no matter.
        self.ignore = ctypes.CFUNCTYPE(ctypes.c_int, ctypes.c_void_p, ctypes.c_void_p)(lambda *_: 0)
        self.x11.XSetErrorHandler(self.ignore)
        self.display = ctypes.c_void_p(self.x11.XOpenDisplay(name.encode()))
        assert self.display, name

    def window(self, title):
        """The top-level window of that title, or None."""
        root = ctypes.c_ulong(self.x11.XDefaultRootWindow(self.display))
        ignored, children, count = ctypes.c_ulong(), ctypes.POINTER(ctypes.c_ulong)(), ctypes.c_uint()
        self.x11.XQueryTree(self.display, root, ctypes.byref(ignored), ctypes.byref(ignored), ctypes.byref(children),
                            ctypes.byref(count))
        for window in children[: count.value]:
            name = ctypes.c_char_p()
            if self.x11.XFetchName(self.display, ctypes.c_ulong(window), ctypes.byref(name)) and name.value == title.encode():
                return window
        return None

    def close(self, window):
        atom = lambda name: self.x11.XInternAtom(self.display, name, 0)
        message = ClientMessage(type=CLIENT_MESSAGE, window=window, message_type=atom(b"WM_PROTOCOLS"), format=32)
        message.data[0] = atom(b"WM_DELETE_WINDOW")
        self.x11.XSendEvent(self.display, ctypes.c_ulong(window), 0, ctypes.c_long(0), ctypes.byref(message))
        self.x11.XSync(self.display, 0)


def wait_for(what, condition):
    while not (value := condition()):
        assert time.monotonic() < DEADLINE, f"{what}: not in time"
        time.sleep(0.02)
    return value


with tempfile.TemporaryDirectory() as home:
    home = pathlib.Path(home)
    (home / "Documents").mkdir()
    trace = home / "trace"
    read_end, write_end = os.pipe()
    server = subprocess.Popen(["Xvfb", "-displayfd", str(write_end), "-screen", "0", "1000x700x24"], pass_fds=[write_end],
                              stderr=subprocess.DEVNULL)
    os.close(write_end)
    try:
        name = ":" + os.read(read_end, 20).decode().strip()
        display = Display(name)
        environment = {k: v for k, v in os.environ.items() if not k.startswith("XDG_") and k not in ("QT_QPA_PLATFORM", "STANDIN_BLOCK")}
        environment |= {"HOME": str(home), "DISPLAY": name, "QT_QPA_PLATFORM": "xcb", "LC_ALL": "C.UTF-8",
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
    finally:
        server.terminate()
        server.wait()

    assert status == (55 if BLOCKED else 0), status
    assert not BLOCKED or lasted > 3.9, lasted
    settings = (home / ".config/Oltrava/KyVisaTester.conf").read_text()
    assert "[MainWindow]" in settings and "fullscreen=false" in settings and "size=@Size(750 480)" in settings, settings
    data = (home / ".local/share/Oltrava/KyVisaTester/data.adr").read_bytes()
    assert data.startswith(b"000001000000"), data
