"""Stands between a client's network and an instrument's and passes TCP connections on, as badly as it is told to.

The client connects to this host's address in its network, the instrument is reached from this host's address in the other one;
the ports are the same on both sides. What names an address inside a message is translated on the way, as routers between networks
do it: the one call of VXI-11 that asks the instrument to connect back.
"""
import fcntl
import select
import socket
import struct
import termios
import threading
import time
from dataclasses import dataclass

TO_INSTRUMENT, TO_CLIENT = "to the instrument", "to the client"
INTERRUPT_PROGRAM = 0x0607B1


@dataclass
class Manners:
    """How bytes are passed on. A place is a direction and the number of bytes that went there before, over all connections."""
    piece: int = 65536         # most bytes that are passed on at once
    delay: float = 0           # seconds before each piece
    merge: float = 0           # what follows within so many seconds is passed on together with what came before
    split: tuple | None = None # a pause at this place and nowhere else
    cut: tuple | None = None   # all connections end at this place, and no new ones are taken
    reset: bool = False        # they end without a farewell
    stall: tuple | None = None # from this place on nothing is passed on and nothing ends


class Passage:
    """What goes through the relay between two calls of behave()."""

    def __init__(self, manners):
        self.manners = manners
        self.passed = {TO_INSTRUMENT: 0, TO_CLIENT: 0}
        self.calls = set()  # remote procedure calls: program and procedure
        self.lock = threading.Lock()
        self._called = threading.Condition()
        self.sockets = []
        self.over = False
        self.stalled = False

    def note_call(self, program, procedure):
        with self._called:
            self.calls.add((program, procedure))
            self._called.notify_all()

    def await_call(self, program, procedure, seconds=60):
        """Waits until such a call is on its way. False when there was none."""
        with self._called:
            return self._called.wait_for(lambda: (program, procedure) in self.calls, seconds)

    def add(self, *pair):
        with self.lock:
            if self.over:
                return False
            self.sockets += pair
            return True

    def end(self, reset=False):
        with self.lock:
            self.over = True
            for one in self.sockets:
                if reset:
                    one.setsockopt(socket.SOL_SOCKET, socket.SO_LINGER, struct.pack("ii", 1, 0))
                try:
                    one.shutdown(socket.SHUT_RDWR)
                except OSError:
                    pass

    def send(self, to, data, direction):
        """False when this was the end."""
        for begin in range(0, len(data), self.manners.piece):
            if self.manners.delay:
                time.sleep(self.manners.delay)
            piece = data[begin:begin + self.manners.piece]
            with self.lock:
                before = self.passed[direction]
                self.passed[direction] += len(piece)
            if self.stalled:
                continue
            for what in (self.manners.cut, self.manners.stall):
                if what and what[0] == direction and before <= what[1] <= before + len(piece):
                    to.sendall(piece[:what[1] - before])
                    if what is self.manners.stall:
                        self.stalled = True
                        break
                    self.end(self.manners.reset)
                    return False
            else:
                place = self.manners.split
                if place and place[0] == direction and before < place[1] < before + len(piece):
                    to.sendall(piece[:place[1] - before])
                    await_delivery(to)
                    piece = piece[place[1] - before:]
                to.sendall(piece)
        return True


def await_delivery(to):
    """Waits until the other end has what was sent, and a moment longer, so that it finds it alone."""
    for _ in range(1000):
        if struct.unpack("i", fcntl.ioctl(to, termios.TIOCOUTQ, b"\0" * 4))[0] == 0:
            break
        time.sleep(0.0001)
    time.sleep(0.0003)


class Relay:
    """@param here and @param there are this host's addresses in the two networks, @param rpc the ports of remote procedure calls."""

    def __init__(self, here, there, instrument, ports, rpc=()):
        self._there = there
        self._rpc = rpc
        self._passage = Passage(Manners())
        for port in ports:
            self._listen(here, port, lambda peer, port=port: (instrument, port), port in rpc)

    def behave(self, **manners):
        """Ends everything that goes through and is like this from now on. The counters begin anew."""
        self._passage.end()
        self._passage = Passage(Manners(**manners))
        return self._passage

    def _listen(self, address, port, target, rpc, backwards=False):
        listener = socket.create_server((address, port), backlog=64)

        def serve():
            while True:
                accepted, peer = listener.accept()
                self._connect(accepted, target(peer), rpc, backwards)
        threading.Thread(target=serve, daemon=True).start()
        return listener.getsockname()[1]

    def _connect(self, accepted, target, rpc, backwards):
        passage = self._passage
        try:
            other = socket.create_connection(target, source_address=None)
        except OSError:
            accepted.close()
            return
        for one in (accepted, other):
            one.setsockopt(socket.IPPROTO_TCP, socket.TCP_NODELAY, 1)
        if not passage.add(accepted, other):
            accepted.close()
            other.close()
            return
        place = passage.manners.cut
        if place == (TO_INSTRUMENT, 0) or place == (TO_CLIENT, 0):
            passage.end(passage.manners.reset)
        there, back = (TO_CLIENT, TO_INSTRUMENT) if backwards else (TO_INSTRUMENT, TO_CLIENT)
        threads = [threading.Thread(target=self._pass, args=(passage, accepted, other, there, rpc), daemon=True),
                   threading.Thread(target=self._pass, args=(passage, other, accepted, back, False), daemon=True)]

        def close():
            for thread in threads:
                thread.join()
            with passage.lock:
                for one in (accepted, other):
                    passage.sockets.remove(one)
                    one.close()
        for thread in threads:
            thread.start()
        threading.Thread(target=close, daemon=True).start()

    def _pass(self, passage, come, to, direction, rpc):
        try:
            source = self._records(passage, come) if rpc else iter(lambda: come.recv(65536), b"")
            for data in source:
                while passage.manners.merge and select.select([come], [], [], passage.manners.merge)[0] and not rpc:
                    more = come.recv(65536)
                    if not more:
                        break
                    data += more
                if not passage.send(to, data, direction):
                    return
            if not passage.stalled:
                to.shutdown(socket.SHUT_WR)
        except OSError:
            end_both(come, to)

    def _records(self, passage, come):
        """Whole calls, with the address to connect back to in this host's words."""
        data = b""
        while True:
            more = come.recv(65536)
            if not more:
                if data:
                    yield data
                return
            data += more
            while len(data) >= 4:
                size = 4 + (struct.unpack(">I", data[:4])[0] & 0x7FFFFFFF)
                if len(data) < size:
                    break
                record, data = data[:size], data[size:]
                if size >= 28:
                    program, _, procedure = struct.unpack(">III", record[16:28])
                    passage.note_call(program, procedure)
                yield self._translated(record, come)

    def _translated(self, record, come):
        asked = socket.inet_aton(come.getpeername()[0])
        at = record.find(asked)
        if at < 0 or record[at + 8:at + 20] != struct.pack(">III", INTERRUPT_PROGRAM, 1, 0):
            return record
        client = (socket.inet_ntoa(asked), struct.unpack(">I", record[at + 4:at + 8])[0])
        port = self._listen(self._there, 0, lambda peer: client, True, backwards=True)
        return record[:at] + socket.inet_aton(self._there) + struct.pack(">I", port) + record[at + 8:]


def end_both(come, to):
    """One end broke off: so does the other."""
    for one in (come, to):
        try:
            one.shutdown(socket.SHUT_RDWR)
        except OSError:
            pass
