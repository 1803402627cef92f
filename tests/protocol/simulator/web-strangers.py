#!/usr/bin/python3
"""Lets programs of other makers look at the simulator's pages and discover it, and prints their versions and what they saw.

Two hosts, as network namespaces with a cable between them: "bench" with the simulator on all its default ports, "desk" with curl, w3m, xmllint,
Python's own JSON and XML, and lxi.

Usage: web-strangers.py SIMULATOR. Status 1 when something went wrong.
"""
import json
import os
import re
import signal
import socket
import subprocess
import sys
import xml.etree.ElementTree

BENCH = "192.0.2.1"
DESK = "192.0.2.2"
PAGE = f"http://{BENCH}:8080/"
XMLNS = "{http://www.lxistandard.org/InstrumentIdentification/1.0}"

if "--inside" not in sys.argv:
    inside = ["unshare", "-n" if os.geteuid() == 0 else "-rn", sys.executable, *sys.argv, "--inside"]
    os.execvp(inside[0], inside)

SIMULATOR = sys.argv[1]
findings = []
running = []


def expect(what, got, wanted):
    good = wanted(got) if callable(wanted) else got == wanted
    print(f"  {what}: {got!r}{'' if good else '   <-- wrong'}")
    if not good:
        findings.append(what)


def run(*command, **more):
    result = subprocess.run(command, capture_output=True, text=True, timeout=60, **more)
    return result.stdout + result.stderr


def network():
    bench = subprocess.Popen(["unshare", "-n", "sh", "-c", "echo; exec sleep 600"], stdout=subprocess.PIPE)
    running.append(bench)
    bench.stdout.readline()  # from here on its namespace is another
    there = ["nsenter", f"--net=/proc/{bench.pid}/ns/net"]
    for words in ("link set lo up", f"link add desk type veth peer name bench netns {bench.pid}",
                  f"addr add {DESK}/24 broadcast + dev desk", "link set desk up"):
        subprocess.run(["ip", *words.split()], check=True)
    for words in (f"addr add {BENCH}/24 broadcast + dev bench", "link set bench up", "link set lo up"):
        subprocess.run([*there, "ip", *words.split()], check=True)
    return there


def browsers():
    print(run("curl", "--version").splitlines()[0])
    expect("a page by curl", run("curl", "-sS", "-o", "/dev/null", "-w", "%{http_code} %{content_type}", PAGE),
           "200 text/html; charset=utf-8")
    expect("two requests on one connection", run("curl", "-sS", "-o", "/dev/null", "-o", "/dev/null", "-w", "%{num_connects} ",
                                                 PAGE, PAGE + "state.json"), "1 0 ")
    expect("a head", run("curl", "-sS", "-I", PAGE).splitlines()[0], "HTTP/1.1 200 OK")
    large = run("curl", "-sS", "-o", "/dev/null", "-w", "%{http_code}", "--data-binary", "@-", PAGE, input="x" * 100_000)
    expect("a body that is too large", large, "413")

    print(run("w3m", "-version").splitlines()[0])
    seen = run("w3m", "-dump", "-cols", "132", PAGE)
    print("\n".join("    " + line for line in seen.splitlines()))
    for text in ("KyVisaSimulator", "Oltrava · serial number 100001 · firmware", f"TCPIP::{BENCH}::hislip0,4880::INSTR",
                 f"TCPIP::{BENCH}::5025::SOCKET", f"TCPIP::{BENCH}::inst0::INSTR", "12.5 V", "command error power on", "1 waiting",
                 "notes.txt", '-> SOUR1:VOLT 12.5;:MMEM:DATA "notes.txt",#15<5 bytes>;:FOO;*OPC?\\n', "<- 1\\n"):
        expect("shows", text in seen and text, text)


def documents():
    state = json.loads(run("curl", "-sS", PAGE + "state.json"))
    expect("JSON: voltage", state["channels"][0]["voltage"], 12.5)
    expect("JSON: files", state["files"], [{"name": "notes.txt", "size": 5}])

    print(run("xmllint", "--version").splitlines()[0])
    document = run("curl", "-sS", PAGE + "lxi/identification")
    expect("well-formed for xmllint", run("xmllint", "--noout", "-", input=document), "")
    root = xml.etree.ElementTree.fromstring(document)
    expect("root", root.tag, XMLNS + "LXIDevice")
    expect("fields", [root.find(XMLNS + name).text for name in ("Manufacturer", "Model", "SerialNumber")],
           ["Oltrava", "KyVisaSimulator", "100001"])
    expect("addresses", sorted(e.text for e in root.iter(XMLNS + "InstrumentAddressString")),
           sorted([f"TCPIP::{BENCH}::hislip0,4880::INSTR", f"TCPIP::{BENCH}::5025::SOCKET", f"TCPIP::{BENCH}::inst0::INSTR"]))
    expect("home page", root.find(XMLNS + "HomepageURL").text, PAGE)


def main():
    there = network()
    simulator = subprocess.Popen([*there, SIMULATOR, "--listen", BENCH, "--http", "8080"], stdout=subprocess.PIPE,
                                 stderr=subprocess.PIPE, text=True)
    running.append(simulator)
    for line in simulator.stdout:
        if line == "ready\n":
            break
    with socket.create_connection((BENCH, 5025), 30) as client:
        client.sendall(b'SOUR1:VOLT 12.5;:MMEM:DATA "notes.txt",#15hello;:FOO;*OPC?\n')
        expect("the instrument", client.recv(100), b"1\n")
        browsers()
        documents()
    simulator.send_signal(signal.SIGTERM)
    expect("the simulator's status", simulator.wait(30), 0)
    running.remove(simulator)

    # A broadcast does not reach a socket that is bound to one address.
    simulator = subprocess.Popen([*there, SIMULATOR, "--listen", "0.0.0.0"], stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True)
    running.append(simulator)
    for line in simulator.stdout:
        if line == "ready\n":
            break
    print(run("lxi", "--version").strip())
    found = run("lxi", "discover", "--timeout", "3")
    expect("lxi discovers by broadcast", found,
           lambda text: re.search(rf'Found "Oltrava,KyVisaSimulator,100001,[0-9.]+" on address {re.escape(BENCH)}', text))
    simulator.send_signal(signal.SIGTERM)
    expect("the simulator's status", simulator.wait(30), 0)
    running.remove(simulator)


try:
    main()
finally:
    for process in running:
        process.kill()
        process.wait()
print("all as expected" if not findings else f"wrong: {', '.join(findings)}")
sys.exit(1 if findings else 0)
