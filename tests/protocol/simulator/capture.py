#!/usr/bin/env python3
"""Records a HiSLIP conversation with the simulator and lets an independent dissector read it.

In a network namespace of its own, so that nobody else's traffic is seen. Usage: capture.py SIMULATOR FOLDER.
"""
import os
import pathlib
import socket
import struct
import subprocess
import sys
import time

SIMULATOR, FOLDER = sys.argv[1], pathlib.Path(sys.argv[2])
PORT = 4880  # the dissector goes by it; free, as the namespace is ours

if os.environ.get("INSIDE_NAMESPACE") != "yes":
    # Root needs no user namespace, which a system may forbid.
    inside = ["unshare", "-n" if os.geteuid() == 0 else "-rn", sys.executable, *sys.argv]
    sys.exit(subprocess.run(inside, env={**os.environ, "INSIDE_NAMESPACE": "yes"}).returncode)


def message(kind, control=0, parameter=0, payload=b""):
    return b"HS" + struct.pack(">BBIQ", kind, control, parameter, len(payload)) + payload


def receive(channel):
    header = channel.recv(16, socket.MSG_WAITALL)
    length = struct.unpack(">Q", header[8:])[0]
    return header[2], header[3], struct.unpack(">I", header[4:8])[0], channel.recv(length, socket.MSG_WAITALL) if length else b""


def converse():
    sync = socket.create_connection(("127.0.0.1", PORT), timeout=30)
    sync.sendall(message(0, 0, 0x01005A5A, b"hislip0"))
    session = receive(sync)[2] & 0xFFFF
    asynchronous = socket.create_connection(("127.0.0.1", PORT), timeout=30)
    asynchronous.sendall(message(17, 0, session))
    receive(asynchronous)
    for request in (
        message(15, 0, 0, struct.pack(">Q", 64)),  # maximum message size: small, so that answers need several
        message(4, 1, 1000),  # lock
        message(24),  # lock information
        message(4, 0, 0xFFFFFEFE),  # release
        message(10, 3, 0xFFFFFEFE),  # remote
        message(21, 0, 0xFFFFFEFE),  # status
    ):
        asynchronous.sendall(request)
        receive(asynchronous)
    sync.sendall(message(7, 0, 0xFFFFFF00, b"*ESE 1;*SRE 32;*OPC;:SYST:ERR?;ERR?;ERR?;ERR?;ERR?\n"))
    while receive(sync)[0] != 7:
        pass
    receive(asynchronous)  # service request
    sync.sendall(message(7, 1, 0xFFFFFF02, b"*IDN?\n") + message(7, 0, 0xFFFFFF04, b"*ESE?\n"))
    receive(sync)  # interrupted
    receive(asynchronous)
    receive(sync)
    sync.sendall(message(12, 1, 0xFFFFFF06))  # trigger
    asynchronous.sendall(message(19))  # device clear
    receive(asynchronous)
    sync.sendall(message(8))
    receive(sync)
    sync.sendall(message(39))  # reserved: error
    receive(sync)
    sync.sendall(message(17))  # out of order: fatal error
    receive(sync)
    receive(asynchronous)


subprocess.run(["ip", "link", "set", "lo", "up"], check=True)
FOLDER.mkdir(parents=True, exist_ok=True)
recording = FOLDER / "hislip.pcapng"
simulator = subprocess.Popen([SIMULATOR, "--listen", "127.0.0.1", "--hislip", str(PORT)], stdout=subprocess.PIPE, text=True)
recorder = subprocess.Popen(["tshark", "-i", "lo", "-w", str(recording), "-f", f"tcp port {PORT}"], stderr=subprocess.PIPE, text=True)
try:
    while simulator.stdout.readline() != "ready\n":
        pass
    for line in recorder.stderr:
        if "Capture started" in line:
            break
    converse()
    # The recorder writes in batches: the recording is complete when it holds the close of the last connection.
    for _ in range(300):
        size = recording.stat().st_size
        time.sleep(0.1)
        if size > 0 and recording.stat().st_size == size:
            shown = subprocess.run(["tshark", "-r", str(recording), "-Y", "hislip.messagetype == 2"], capture_output=True, text=True).stdout
            if len(shown.splitlines()) >= 2:
                break
finally:
    simulator.terminate()
    recorder.terminate()
    simulator.wait()
    recorder.wait()

shown = subprocess.run(
    ["tshark", "-r", str(recording), "-Y", "hislip", "-T", "fields", "-e", "hislip.messagetype", "-E", "occurrence=a", "-E", "aggregator=,"],
    capture_output=True, text=True, check=True,
).stdout
seen = {int(kind, 0) for kind in shown.replace("\n", ",").split(",") if kind}
wanted = set(range(26)) | {39}
malformed = subprocess.run(["tshark", "-r", str(recording), "-Y", "_ws.malformed || hislip.wrongprologue || hislip.msgnotnull"], capture_output=True, text=True, check=True).stdout
print(subprocess.run(["tshark", "--version"], capture_output=True, text=True, check=True).stdout.splitlines()[0])
print("message types seen:", sorted(seen))
print("malformed packets:", malformed or "none")
sys.exit(0 if seen == wanted and not malformed else 1)
