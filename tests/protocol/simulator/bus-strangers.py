#!/usr/bin/python3
"""Lets programs of other makers talk to the simulator's gateway and serial port, and prints their versions and what was said.

The simulator runs in a network of its own, where port 111 is free.

Usage: bus-strangers.py SIMULATOR. Status 1 when something went wrong.
"""
import os
import subprocess
import sys

MAKE = "Oltrava,KyVisaSimulator"

if "--inside" not in sys.argv:
    inside = ["unshare", "-n" if os.geteuid() == 0 else "-rn", sys.executable, *sys.argv, "--inside"]
    os.execvp(inside[0], inside)

SIMULATOR = sys.argv[1]
subprocess.run(["ip", "link", "set", "lo", "up"], check=True)
findings = []


def expect(what, got, wanted):
    good = wanted(got) if callable(wanted) else got == wanted
    print(f"  {what}: {got!r}{'' if good else '   <-- wrong'}")
    if not good:
        findings.append(what)


def identification(serial):
    return lambda got: got.startswith(f"{MAKE},{serial},") and got.endswith("\n")


def gateway():
    import pyvisa
    import pyvisa_py

    print(f"PyVISA {pyvisa.__version__} with PyVISA-py {pyvisa_py.__version__}: the gateway")
    manager = pyvisa.ResourceManager("@py")
    first, second, third = (manager.open_resource(f"TCPIP::127.0.0.1::{name}::INSTR", timeout=10000)
                            for name in ("gpib0,5", "gpib0,7", "gpib0,9,1"))
    expect("*IDN? of gpib0,5", first.query("*IDN?"), identification(100001))
    expect("*IDN? of gpib0,7", second.query("*IDN?"), identification(100002))
    expect("*IDN? of gpib0,9,1", third.query("*IDN?"), identification(100003))
    second.write("*SRE 16;*IDN?")
    expect("status byte of gpib0,7", second.read_stb(), 0x50)
    expect("and of gpib0,5", first.read_stb(), 0)
    expect("the answer", second.read(), identification(100002))
    second.write("TRIG:SOUR BUS;:INIT")
    second.assert_trigger()
    expect("after a trigger", second.query("*OPC?"), "1\n")
    second.write("*IDN?")
    second.clear()
    expect("after a clear", second.read_stb(), 0)
    content = bytes(range(256)) * 4096
    third.write_raw(b"MMEM:DATA 'f',#71048576" + content + b"\n")
    expect("1 MiB block, there and back", third.query_binary_values("MMEM:DATA? 'f'", "B", container=bytes) == content, True)
    nobody = manager.open_resource("TCPIP::127.0.0.1::gpib0,8::INSTR", timeout=200)
    try:
        expect("nobody at gpib0,8", nobody.query("*IDN?"), "a time-out")
    except pyvisa.VisaIOError as error:
        expect("nobody at gpib0,8", error.error_code, pyvisa.constants.VI_ERROR_TMO)
    for session in (first, second, third, nobody):
        session.close()


def serial_port(resource):
    import pyvisa

    print("PyVISA: the serial port")
    for attempt in range(3):
        port = pyvisa.ResourceManager("@py").open_resource(resource, timeout=10000, read_termination="\n", write_termination="\n")
        expect(f"*IDN?, opened {attempt + 1} times", port.query("*IDN?"), lambda got: got.startswith(f"{MAKE},100001,"))
        port.close()


def bare_serial_port(name):
    import serial

    print(f"pySerial {serial.VERSION}")
    with serial.Serial(name, 115200, timeout=10) as port:
        port.write(b"*IDN?\n")
        expect("*IDN?", port.readline().decode(), identification(100001))
        content = bytes(range(256)) * 64
        port.write(b"MMEM:DATA 'g',#516384" + content + b"\nMMEM:DATA? 'g'\n")
        expect("block, there and back", port.read(7 + len(content) + 1) == b"#516384" + content + b"\n", True)
    with serial.Serial(name, 9600, timeout=10, xonxoff=True) as port:
        port.write(b"*OPC?\n")
        expect("before XOFF", port.read(2), b"1\n")
        port.write(b"\x13*OPC?\n")
        port.timeout = 0.3
        expect("after XOFF", port.read(2), b"")
        port.timeout = 10
        port.write(b"\x11")
        expect("after XON", port.read(2), b"1\n")


simulator = subprocess.Popen([SIMULATOR, "--gpib", "--serial"], stdout=subprocess.PIPE, text=True)
try:
    said = []
    while not said or said[-1] not in ("ready", ""):
        said.append(simulator.stdout.readline().strip())
    print("KyVisaSimulator")
    resource = said[3].split()[-1] if len(said) > 3 else ""
    expect("services", said, ["vxi11 TCPIP::127.0.0.1::inst0::INSTR", "gpib TCPIP::127.0.0.1::gpib0,5::INSTR",
                              "portmapper 127.0.0.1 111", f"serial {resource}", "ready"])
    gateway()
    serial_port(resource)
    bare_serial_port(resource[len("ASRL"):-len("::INSTR")])
finally:
    simulator.terminate()
    expect("exit status of the simulator", simulator.wait(60), 0)
print(f"{len(findings)} findings")
sys.exit(1 if findings else 0)
