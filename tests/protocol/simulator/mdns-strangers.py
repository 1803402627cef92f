#!/usr/bin/python3
"""Lets multicast DNS of other makers find the simulator in a network of its own, and prints versions and what was exchanged.

Two hosts, as network namespaces with a cable between them: "bench" with simulators, "desk" with python3-zeroconf and a client that sends
literal bytes.

Usage: mdns-strangers.py SIMULATOR. Status 1 when something went wrong.
"""
import os
import signal
import socket
import struct
import subprocess
import sys
import time

BENCH = "192.0.2.1"
DESK = "192.0.2.2"
GROUP = "224.0.0.251"
TYPES = ["_http", "_lxi", "_vxi-11", "_scpi-raw", "_hislip"]
NAME = "Oltrava KyVisaSimulator - 100001"

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


def ip(*words):
    subprocess.run(["ip", *words], check=True)


def simulate(namespace, *options):
    """Starts a simulator there; its service lines as a dictionary of the last words."""
    process = subprocess.Popen(["nsenter", f"--net=/proc/{namespace}/ns/net", SIMULATOR, *options],
                               stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True)
    running.append(process)
    lines = {}
    for line in process.stdout:
        if line == "ready\n":
            break
        lines[line.split(" ", 1)[0]] = line.strip().split(" ", 1)[1]
    else:
        sys.exit(f"a simulator did not start: {process.communicate()[1]}")
    return process, lines


def end(process):
    process.send_signal(signal.SIGTERM)
    errors = process.communicate(timeout=30)[1]
    running.remove(process)
    return process.returncode, errors


def wait_for(what, true):
    """Conditions on a network come about in their time; thirty seconds are more than they need."""
    for _ in range(300):
        if true():
            return
        time.sleep(0.1)
    findings.append(what)
    print(f"  {what}: waited in vain   <-- wrong")


def port_in(resource):
    return int(resource.rstrip("/").split("::")[-2 if "::" in resource else -1].replace(",", ":").split(":")[-1])


class Directory:
    """What zeroconf has found by now: (type, instance name) -> its details."""

    def __init__(self):
        self.found = {}
        self.gone = set()

    def add_service(self, browser, kind, name):
        info = browser.get_service_info(kind, name, 5000)
        key = (kind.split(".")[0], name.removesuffix("." + kind))
        self.found[key] = info

    def update_service(self, browser, kind, name):
        pass

    def remove_service(self, browser, kind, name):
        key = (kind.split(".")[0], name.removesuffix("." + kind))
        self.gone.add(key)


def literal_query(address, port_of_simulator):
    """A program that knows no multicast DNS asks from any port: RFC 6762, section 6.7."""
    print("literal bytes")
    client = socket.socket(socket.AF_INET, socket.SOCK_DGRAM)
    client.bind((DESK, 0))
    client.settimeout(10)
    client.setsockopt(socket.IPPROTO_IP, socket.IP_MULTICAST_IF, socket.inet_aton(DESK))
    query = bytes.fromhex("4b59 0000 0001 0000 0000 0000 07") + b"_hislip\x04_tcp\x05local\0" + bytes.fromhex("000c 0001")
    client.sendto(query, (GROUP, 5353))
    answer, sender = client.recvfrom(9000)
    expect("comes from", sender, (address, 5353))
    instance = NAME.encode()
    host = b"kyvisasimulator-100001"
    pointer = b"\xc0\x0c" + struct.pack(">HHIH", 12, 1, 10, len(instance) + 3) + bytes([len(instance)]) + instance + b"\xc0\x0c"
    head = bytes.fromhex("4b59 8400 0001 0001 0000 0003") + query[12:] + pointer
    expect("header, question and pointer", answer[: len(head)], head)
    service = b"\xc0\x30" + struct.pack(">HHIHHHH", 33, 1, 10, len(host) + 9, 0, 0, port_of_simulator) + bytes([len(host)]) + host
    expect("service", answer[len(head) : len(head) + len(service)], service)
    expect("ends with the address", answer[-14:], bytes.fromhex("0001 0001 0000000a 0004") + socket.inet_aton(address))
    client.close()


def main():
    import zeroconf

    print("zeroconf", zeroconf.__version__)
    # The desk is this namespace, the bench one of a process that does nothing else.
    bench = subprocess.Popen(["unshare", "-n", "sleep", "600"])
    running.append(bench)
    wait_for("a second namespace",
             lambda: os.readlink(f"/proc/{bench.pid}/ns/net") != os.readlink("/proc/self/ns/net"))
    ip("link", "set", "lo", "up")
    ip("link", "add", "desk", "type", "veth", "peer", "name", "bench", "netns", str(bench.pid))
    on_bench = ["nsenter", f"--net=/proc/{bench.pid}/ns/net", "ip"]
    for words in (["addr", "add", BENCH + "/24", "dev", "bench"], ["link", "set", "bench", "up"], ["link", "set", "lo", "up"]):
        subprocess.run([*on_bench, *words], check=True)
    ip("addr", "add", DESK + "/24", "dev", "desk")
    ip("link", "set", "desk", "up")

    print("one simulator")
    services = ["--hislip", "0", "--socket", "0", "--vxi11", "0", "--portmapper", "0", "--http", "0", "--mdns"]
    first, lines = simulate(bench.pid, "--listen", BENCH, *services)
    expect("its line", lines["mdns"], NAME)
    ports = {"_http": port_in(lines["http"]), "_lxi": port_in(lines["http"]), "_scpi-raw": port_in(lines["socket"]),
             "_hislip": port_in(lines["hislip"]), "_vxi-11": int(lines["portmapper"].split()[-1])}

    network = zeroconf.Zeroconf(interfaces=[DESK])
    directory = Directory()
    zeroconf.ServiceBrowser(network, [f"{kind}._tcp.local." for kind in TYPES], directory)
    wait_for("all services", lambda: all(directory.found.get((kind, NAME)) for kind in TYPES))
    for kind in TYPES:
        info = directory.found.get((kind, NAME))
        if info is None:
            continue
        expect(f"{kind} at", (info.parsed_addresses(), info.port, info.server),
               ([BENCH], ports[kind], "kyvisasimulator-100001.local."))
        expect(f"{kind} says", list(info.properties.items()),
               [(b"txtvers", b"1"), (b"Manufacturer", b"Oltrava"), (b"Model", b"KyVisaSimulator"),
                (b"SerialNumber", b"100001"), (b"FirmwareVersion", b"5.8.6")])
    expect("service types", zeroconf.ZeroconfServiceTypes.find(zc=network, timeout=3),
           tuple(sorted(f"{kind}._tcp.local." for kind in TYPES)))
    literal_query(BENCH, ports["_hislip"])

    print("two simulators on one host")
    second, lines = simulate(bench.pid, "--listen", BENCH, "--socket", "0", "--mdns")
    wait_for("the second one's name", lambda: directory.found.get(("_scpi-raw", NAME + " (2)")))
    info = directory.found.get(("_scpi-raw", NAME + " (2)"))
    if info:
        expect("the second one at", (info.parsed_addresses(), info.port, info.server),
               ([BENCH], port_in(lines["socket"]), "kyvisasimulator-100001-2.local."))
    third, lines = simulate(os.getpid(), "--listen", DESK, "--socket", "0", "--mdns")
    expect("its line names what it will ask for", lines["mdns"], NAME)
    wait_for("a third one on the other host", lambda: directory.found.get(("_scpi-raw", NAME + " (3)")))

    print("the end")
    status, errors = end(third)
    expect("the third one's status and words", (status, [line for line in errors.splitlines() if "mdns" in line]),
           (0, [f"KyVisaSimulator: mdns: the name is taken, trying {NAME} ({n})" for n in (2, 3)]))
    expect("the first one's status", end(first)[0], 0)
    wait_for("its goodbyes", lambda: {(kind, NAME) for kind in TYPES} <= directory.gone)
    expect("the second one is still there", ("_scpi-raw", NAME + " (2)") in directory.gone, False)
    expect("the second one's status", end(second)[0], 0)
    network.close()

    print("loopback")
    fourth, lines = simulate(os.getpid(), "--socket", "0", "--mdns")
    network = zeroconf.Zeroconf(interfaces=["127.0.0.1"])
    directory = Directory()
    zeroconf.ServiceBrowser(network, "_scpi-raw._tcp.local.", directory)
    wait_for("the service on loopback", lambda: directory.found.get(("_scpi-raw", NAME)))
    network.close()
    expect("its status and words", end(fourth), (0, ""))


try:
    main()
finally:
    for process in running:
        process.kill()
        process.wait()
print("all as expected" if not findings else f"wrong: {', '.join(findings)}")
sys.exit(1 if findings else 0)
