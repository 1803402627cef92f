#!/usr/bin/python3
"""Lets the simulator register with a real rpcbind, and prints its version and what was said.

Both run in a network of their own, with a /run of their own.

Usage: rpcbind.py SIMULATOR [FOLDER_OF_UNPACKED_PACKAGES]. Status 1 when something went wrong, 77 when a user without privileges
cannot start rpcbind, which wants to be another user than root.
"""
import os
import shutil
import signal
import subprocess
import sys
import time

RESOURCE = "TCPIP::127.0.0.1::inst0::INSTR"
IDENTIFICATION = "Oltrava,KyVisaSimulator,100001,5.8.6"

if "--inside" not in sys.argv:
    user = [] if os.geteuid() == 0 else ["-r"]
    # In a changed root, which is no mount point, there is nothing to keep private: whoever made it has done so.
    alone = [] if subprocess.run(["unshare", *user, "-m", "true"], stderr=subprocess.DEVNULL).returncode == 0 else ["--propagation", "unchanged"]
    inside = ["unshare", *user, "-n", "-m", *alone, sys.executable, *sys.argv, "--inside",
              *(["--privileged"] if os.geteuid() == 0 else [])]
    os.execvp(inside[0], inside)

SIMULATOR = sys.argv[1]
UNPACKED = sys.argv[2] if sys.argv[2] != "--inside" else "/"
subprocess.run(["ip", "link", "set", "lo", "up"], check=True)
subprocess.run(["mount", "-t", "tmpfs", "tmpfs", "/run"], check=True)
# Its package makes the user that it wants to be. Where it is only unpacked, this network's programs see one.
with open("/etc/passwd", encoding="utf-8") as users:
    known = users.read()
if "\n_rpc:" not in known:
    with open("/run/passwd", "w", encoding="utf-8") as more:
        more.write(known + "_rpc:x:65533:65534::/run/rpcbind:/usr/sbin/nologin\n")
    subprocess.run(["mount", "--bind", "/run/passwd", "/etc/passwd"], check=True)
findings = []


def expect(what, got, wanted):
    good = wanted(got) if callable(wanted) else got == wanted
    print(f"  {what}: {got!r}{'' if good else '   <-- wrong'}")
    if not good:
        findings.append(what)


def stranger(name):
    """A program's path, wherever its package put it."""
    folders = os.environ["PATH"] + ":/usr/sbin:/sbin:" + ":".join(os.path.join(UNPACKED, sub) for sub in ("usr/bin", "usr/sbin", "sbin"))
    path = shutil.which(name, path=folders)
    if path is None:
        print(f"{name} is missing, see scripts/packages.txt")
        sys.exit(1)
    return path


RPCINFO = stranger("rpcinfo")


def programs():
    """What the portmapper maps, beside itself."""
    table = subprocess.run([RPCINFO, "-p", "127.0.0.1"], capture_output=True, text=True, timeout=60)
    rows = [line.split()[:4] for line in table.stdout.splitlines()[1:]]
    return None if table.returncode != 0 else sorted(tuple(row) for row in rows if row[0] != "100000")


class Simulator:
    def __init__(self):
        self.process = subprocess.Popen([SIMULATOR, "--vxi11", "0"], stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True)
        self.said = []
        while not self.said or self.said[-1] not in ("ready", ""):
            self.said.append(self.process.stdout.readline().strip())

    def end(self, how=signal.SIGTERM):
        self.process.send_signal(how)
        _, notes = self.process.communicate(timeout=60)
        return self.process.returncode, notes


os.makedirs("/run/rpcbind", exist_ok=True)
rpcbind = subprocess.Popen([stranger("rpcbind"), "-f"])
try:
    for _ in range(600):
        if programs() is not None:
            break
        if rpcbind.poll() is not None and "--privileged" not in sys.argv:
            print("rpcbind does not start without privileges")
            sys.exit(77)
        if rpcbind.poll() is not None:
            print(f"rpcbind has ended with status {rpcbind.returncode}")
            sys.exit(1)
        time.sleep(0.1)
    version = subprocess.run(["dpkg-query", "-W", "-f", "${Version}", "rpcbind"], capture_output=True, text=True).stdout
    print(f"rpcbind {version if version[:1].isdigit() else '(unpacked)'}")
    expect("before", programs(), [])

    first = Simulator()
    expect("services", first.said, [f"vxi11 {RESOURCE}", "ready"])
    rows = programs()
    expect("programs", [row[:3] for row in rows], [("395183", "1", "tcp"), ("395184", "1", "tcp")])
    for number in ("395183", "395184"):
        said = subprocess.run([RPCINFO, "-t", "127.0.0.1", number, "1"], capture_output=True, text=True, timeout=60).stdout
        expect(f"call of {number}", said.strip(), f"program {number} version 1 ready and waiting")
    lxi = subprocess.run([stranger("lxi"), "scpi", "--address", "127.0.0.1", "*IDN?"], capture_output=True, text=True, timeout=60)
    expect("lxi finds it by rpcbind", lxi.stdout.strip(), IDENTIFICATION)

    second = Simulator()
    status, notes = second.end()
    expect("note of a second one", notes, lambda text: text.count("\n") == 1 and
           "port 111: Address already in use, and the portmapper there does not register VXI-11" in text)
    expect("its status", status, 0)
    expect("the first one stays", programs(), rows)

    status, notes = first.end()
    expect("note of the first one", notes,
           "KyVisaSimulator: portmapper: VXI-11 is registered with the one that has port 111 already\n")
    expect("its status", status, 0)
    expect("after it", programs(), [])

    killed = Simulator()
    killed.end(signal.SIGKILL)
    left = programs()
    expect("a killed one leaves its entries", [row[:3] for row in left], [("395183", "1", "tcp"), ("395184", "1", "tcp")])
    next_one = Simulator()
    expect("and the next one takes their place", [row[:3] for row in programs()], [row[:3] for row in left])
    lxi = subprocess.run([stranger("lxi"), "scpi", "--address", "127.0.0.1", "*IDN?"], capture_output=True, text=True, timeout=60)
    expect("lxi finds that one", lxi.stdout.strip(), IDENTIFICATION)
    expect("its status", next_one.end()[0], 0)
    expect("in the end", programs(), [])
finally:
    rpcbind.terminate()
    rpcbind.wait(60)
print(f"{len(findings)} findings")
sys.exit(1 if findings else 0)
