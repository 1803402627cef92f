#!/usr/bin/python3
"""Lets programs of other makers talk VXI-11 and over a raw socket to the simulator, lets one read the packets, and prints their versions and what was said.

The simulator runs with its default services, portmapper 111 included, in a network of its own.

Usage: vxi11-strangers.py SIMULATOR [FOLDER_OF_UNPACKED_PACKAGES]. Status 1 when something went wrong.
"""
import os
import re
import shutil
import signal
import subprocess
import sys
import tempfile

IDENTIFICATION = "Oltrava,KyVisaSimulator,100001,5.8.6"
RESOURCE = "TCPIP::127.0.0.1::inst0::INSTR"
SOCKET = "TCPIP::127.0.0.1::5025::SOCKET"

if "--inside" not in sys.argv:
    inside = ["unshare", "-n" if os.geteuid() == 0 else "-rn", sys.executable, *sys.argv, "--inside"]
    os.execvp(inside[0], inside)

SIMULATOR = sys.argv[1]
UNPACKED = sys.argv[2] if sys.argv[2] != "--inside" else "/"
subprocess.run(["ip", "link", "set", "lo", "up"], check=True)
findings = []


def expect(what, got, wanted):
    good = wanted(got) if callable(wanted) else got == wanted
    print(f"  {what}: {got!r}{'' if good else '   <-- wrong'}")
    if not good:
        findings.append(what)


def stranger(name):
    """A program's path, wherever its package put it."""
    folders = os.environ["PATH"] + ":/usr/sbin:" + os.path.join(UNPACKED, "usr/bin") + ":" + os.path.join(UNPACKED, "usr/sbin")
    path = shutil.which(name, path=folders)
    if path is None:
        print(f"{name} is missing, see scripts/packages.txt")
        sys.exit(1)
    return path


def run(*command):
    result = subprocess.run(command, capture_output=True, text=True, timeout=60)
    return result.stdout + result.stderr


def pure_python_visa():
    import pyvisa
    import pyvisa_py

    print(f"PyVISA {pyvisa.__version__} with PyVISA-py {pyvisa_py.__version__}")
    instrument = pyvisa.ResourceManager("@py").open_resource(RESOURCE, timeout=10000)
    expect("*IDN?", instrument.query("*IDN?"), IDENTIFICATION + "\n")
    instrument.write("*IDN?")
    expect("status byte with an answer", instrument.read_stb(), 16)
    expect("the answer", instrument.read(), IDENTIFICATION + "\n")
    expect("status byte without", instrument.read_stb(), 0)

    content = bytes(range(256)) * 4096 * 3
    instrument.write_raw(b"MMEM:DATA 'f',#73145728" + content + b"\n")
    expect("3 MiB block, there and back", instrument.query_binary_values("MMEM:DATA? 'f'", "B", container=bytes) == content, True)

    instrument.timeout = 200
    try:
        expect("read without a query", instrument.read(), "a time-out")
    except pyvisa.VisaIOError as error:
        expect("read without a query", error.error_code, pyvisa.constants.VI_ERROR_TMO)
    instrument.timeout = 10000
    expect("and its error", instrument.query("SYST:ERR?"), '-420,"Query UNTERMINATED"\n')

    other = pyvisa.ResourceManager("@py").open_resource(RESOURCE, timeout=200)
    instrument.lock_excl()
    try:
        expect("write past a lock", other.write("*CLS"), "refused")
    except pyvisa.VisaIOError as error:
        expect("write past a lock", error.error_code, lambda code: code < 0)
    instrument.unlock()
    expect("write after it", other.query("*OPC?"), "1\n")
    other.close()
    instrument.assert_trigger()
    instrument.clear()
    expect("after a clear", instrument.query("*CLS;*OPC?"), "1\n")
    instrument.close()

    print("the same over a raw socket")
    raw = pyvisa.ResourceManager("@py").open_resource(SOCKET, timeout=10000, read_termination="\n", write_termination="\n")
    expect("*IDN?", raw.query("*IDN?"), IDENTIFICATION)
    expect("the 3 MiB block of before", raw.query_binary_values("MMEM:DATA? 'f'", "B", container=bytes) == content, True)
    raw.write_raw(b"MMEM:DATA 'g',#73145728" + content[::-1] + b"\n")
    expect("another one, there and back", raw.query_binary_values("MMEM:DATA? 'g'", "B", container=bytes) == content[::-1], True)
    raw.timeout = 200
    try:
        expect("read without a query", raw.read(), "a time-out")
    except pyvisa.VisaIOError as error:
        expect("read without a query", error.error_code, pyvisa.constants.VI_ERROR_TMO)
    raw.timeout = 10000
    expect("and no error, since nobody sees it", raw.query("SYST:ERR?"), '0,"No error"')
    raw.close()


def lxi_tools():
    lxi = stranger("lxi")
    print(run(lxi, "--version").strip())
    expect("scpi *IDN?", run(lxi, "scpi", "--address", "127.0.0.1", "*IDN?").strip(), IDENTIFICATION)
    expect("scpi that answers nothing", run(lxi, "scpi", "--address", "127.0.0.1", "*CLS"), "")
    raw = ("--address", "127.0.0.1", "--raw", "--port", "5025")
    expect("scpi *IDN? raw", run(lxi, "scpi", *raw, "*IDN?").strip(), IDENTIFICATION)
    for what, words in (("benchmark", ("--address", "127.0.0.1")), ("benchmark raw", raw)):
        rate = re.search(r"Result: (\S+) requests/second", run(lxi, "benchmark", *words, "--count", "500"))
        expect(what + ", requests a second", float(rate[1]) if rate else 0, lambda got: got > 0)
    expect("discover", run(lxi, "discover", "--timeout", "1"), lambda got: f'Found "{IDENTIFICATION}" on address 127.0.0.1' in got)


def rpcinfo():
    program = stranger("rpcinfo")
    version = run("dpkg-query", "-W", "-f", "${Version}", "rpcbind")
    print(f"rpcinfo of rpcbind {version if version[:1].isdigit() else '(unpacked)'}")
    table = run(program, "-p", "127.0.0.1")
    rows = sorted(tuple(line.split()[:3]) for line in table.splitlines()[1:])
    expect("programs", rows, [("100000", "2", "tcp"), ("100000", "2", "udp"), ("395183", "1", "tcp"), ("395184", "1", "tcp")])
    for number in ("395183", "395184"):
        expect(f"call of {number}", run(program, "-t", "127.0.0.1", number, "1").strip(),
               f"program {number} version 1 ready and waiting")
    expect("call of the portmapper by datagram", run(program, "-u", "127.0.0.1", "100000", "2").strip(),
           "program 100000 version 2 ready and waiting")


def second_simulator():
    print("a second simulator, while port 111 is in use")
    second = subprocess.Popen([SIMULATOR, "--vxi11", "0"], stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True)
    expect("first line", second.stdout.readline(), f"vxi11 {RESOURCE}\n")
    expect("second line", second.stdout.readline(), "ready\n")
    second.terminate()
    expect("its note", second.stderr.read(), lambda note: note.count("\n") == 1 and "port 111: Address already in use" in note)
    expect("its exit status", second.wait(60), 0)
    third = subprocess.run([SIMULATOR, "--vxi11", "0", "--portmapper", "111"], capture_output=True, text=True, timeout=60)
    expect("exit status when the portmapper is asked for", third.returncode, 1)
    expect("its message", third.stderr, "KyVisaSimulator: portmapper: cannot listen on 127.0.0.1 port 111: Address already in use\n")


class Recording:
    """What an independent dissector makes of the packets."""

    # Calls of these procedures must be seen; 10 to 23 are core, 3 is the portmapper's question for the port.
    FILTERS = {"create_link": "vxi11_core.procedure_v1 == 10", "device_write": "vxi11_core.procedure_v1 == 11",
               "device_read": "vxi11_core.procedure_v1 == 12", "device_readstb": "vxi11_core.procedure_v1 == 13",
               "device_clear": "vxi11_core.procedure_v1 == 15", "device_lock": "vxi11_core.procedure_v1 == 18",
               "destroy_link": "vxi11_core.procedure_v1 == 23", "portmapper": "portmap"}

    def __init__(self, folder):
        self.file = os.path.join(folder, "vxi11.pcapng")
        self.process = subprocess.Popen(["tshark", "-i", "lo", "-q", "-w", self.file], stderr=subprocess.PIPE, text=True)
        for line in self.process.stderr:
            if "Capture started" in line:
                break

    def shown(self, what):
        words = ["tshark", "-r", self.file, "-Y", what, "-T", "fields", "-e", "frame.number"]
        return subprocess.run(words, capture_output=True, text=True, check=True, timeout=60).stdout.split()

    def end(self):
        self.process.send_signal(signal.SIGINT)
        self.process.communicate(timeout=60)
        version = subprocess.run(["tshark", "--version"], capture_output=True, text=True, check=True).stdout
        print(version.splitlines()[0])
        for name, what in self.FILTERS.items():
            expect(f"packets of {name}", len(self.shown(what)), lambda count: count > 0)
        # A client's port that happens to be known for something else makes it read raw messages as that.
        expect("malformed packets", self.shown("rpc && _ws.malformed"), [])


simulator = subprocess.Popen([SIMULATOR], stdout=subprocess.PIPE, text=True)
try:
    said = []
    while not said or said[-1] not in ("ready", ""):
        said.append(simulator.stdout.readline().strip())
    print("KyVisaSimulator")
    expect("services", said, ["hislip TCPIP::127.0.0.1::hislip0,4880::INSTR", "socket TCPIP::127.0.0.1::5025::SOCKET",
                              "vxi11 " + RESOURCE, "portmapper 127.0.0.1 111", "ready"])
    with tempfile.TemporaryDirectory() as folder:
        recording = Recording(folder)
        pure_python_visa()
        lxi_tools()
        rpcinfo()
        recording.end()
    second_simulator()
finally:
    simulator.terminate()
    expect("exit status of the simulator", simulator.wait(60), 0)
print(f"{len(findings)} findings")
sys.exit(1 if findings else 0)
