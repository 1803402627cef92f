"""A virtual display for tests of whole programs, and what a window manager can see and do there."""
import ctypes
import os
import subprocess

CLIENT_MESSAGE = 33
ANY_PROPERTY_TYPE = 0


class ClientMessage(ctypes.Structure):
    _fields_ = [("type", ctypes.c_int), ("serial", ctypes.c_ulong), ("send_event", ctypes.c_int), ("display", ctypes.c_void_p),
                ("window", ctypes.c_ulong), ("message_type", ctypes.c_ulong), ("format", ctypes.c_int),
                ("data", ctypes.c_long * 5), ("room", ctypes.c_long * 24)]


class VirtualDisplay:
    """Xvfb on a free display, and a connection to it. Ends with the block that it is made for."""

    def __enter__(self):
        read_end, write_end = os.pipe()
        self.server = subprocess.Popen(["Xvfb", "-displayfd", str(write_end), "-screen", "0", "1000x700x24"],
                                       pass_fds=[write_end], stderr=subprocess.DEVNULL)
        os.close(write_end)
        try:
            self.name = ":" + os.read(read_end, 20).decode().strip()
            self._connect()
        except BaseException:
            self.__exit__()
            raise
        finally:
            os.close(read_end)
        return self

    def __exit__(self, *_):
        self.server.terminate()
        self.server.wait()

    def _connect(self):
        self.x11 = ctypes.CDLL("libX11.so.6")
        self.x11.XOpenDisplay.restype = ctypes.c_void_p
        for call in ("XDefaultRootWindow", "XInternAtom"):
            getattr(self.x11, call).restype = ctypes.c_ulong
        # A window that ends while it is looked at is no matter.
        self.ignore = ctypes.CFUNCTYPE(ctypes.c_int, ctypes.c_void_p, ctypes.c_void_p)(lambda *_: 0)
        self.x11.XSetErrorHandler(self.ignore)
        self.display = ctypes.c_void_p(self.x11.XOpenDisplay(self.name.encode()))
        assert self.display, self.name

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

    def icon_sizes(self, window):
        """Widths of the pictures that the window gives a window manager."""
        kind, form, count, left = ctypes.c_ulong(), ctypes.c_int(), ctypes.c_ulong(), ctypes.c_ulong()
        data = ctypes.POINTER(ctypes.c_ulong)()
        self.x11.XGetWindowProperty(self.display, ctypes.c_ulong(window), ctypes.c_ulong(self.x11.XInternAtom(self.display, b"_NET_WM_ICON", 0)),
                                    ctypes.c_long(0), ctypes.c_long(1 << 20), 0, ctypes.c_ulong(ANY_PROPERTY_TYPE), ctypes.byref(kind),
                                    ctypes.byref(form), ctypes.byref(count), ctypes.byref(left), ctypes.byref(data))
        sizes, at = [], 0
        while at + 1 < count.value:
            sizes.append(data[at])
            at += 2 + data[at] * data[at + 1]
        return sizes
