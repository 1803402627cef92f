#!/usr/bin/python3
"""What viFindRsrc finds on two networks with simulated instruments, odd hosts and silence.

Usage: discovery.py SIMULATOR FIND_PROGRAM LOCALES. LOCALES is a folder with de_DE.UTF-8. Status 1 when something was not as it should be.
"""
import os
import subprocess
import sys
import time

sys.path.insert(0, os.path.join(os.path.dirname(os.path.abspath(__file__)), "../../support"))
from netlab import Host, Switch, enter  # noqa: E402

enter()
ZEROCONF = subprocess.run(["/usr/bin/python3", "-c", "import zeroconf; print(zeroconf.__version__)"], check=True,
                          capture_output=True, text=True).stdout.strip()
SIMULATOR, FIND, LOCALES = sys.argv[1:4]
MDNS, VXI11, BOTH, NONE = 4, 2, 6, 0
findings = []


def expect(what, got, wanted):
    good = got == wanted
    print(f"  {what}: {got!r}{'' if good else f'   <-- wrong, wanted {wanted!r}'}")
    if not good:
        findings.append(what)


def find(expression="TCPIP?*", methods=BOTH, milliseconds=3000, **more_environment):
    """Resources in their order with their texts, and the seconds that it took."""
    environment = dict(os.environ, XDG_CONFIG_HOME="/nonexistent", KYVISA_CONFIG="/nonexistent", **more_environment)
    begin = time.monotonic()
    result = subprocess.run([FIND, expression, str(methods), str(milliseconds)], capture_output=True, text=True,
                            timeout=60, env=environment)
    seconds = time.monotonic() - begin
    found = {}
    for line in result.stdout.splitlines():
        if line.startswith(" "):
            key, text = line.strip().split(": ", 1)
            found[resource][key] = text
        else:
            resource = line
            found[resource] = {}
    return found, seconds


def datagrams_sent():
    """UDP datagrams that this namespace has sent so far."""
    with open("/proc/self/net/snmp", encoding="ascii") as counters:
        names, values = [line.split() for line in counters if line.startswith("Udp:")]
    return int(values[names.index("OutDatagrams")])


def odd_host(switch, script, before=""):
    """A host on which a few lines of Python answer at the portmapper's port. @param before what it does first"""
    host = Host(switch)
    host.start(sys.executable, "-c", "import socket, struct\n"
               "s = socket.socket(socket.AF_INET, socket.SOCK_DGRAM)\n"
               "s.setsockopt(socket.SOL_SOCKET, socket.SO_BROADCAST, 1)\n"
               "s.bind(('', 111))\n" + before +
               "print('ready', flush=True)\n"
               "while True:\n"
               "    call, peer = s.recvfrom(9000)\n"
               "    xid = call[:4]\n"
               "    reply = xid + struct.pack('>IIIII', 1, 0, 0, 0, 0)\n" + script, stdout=subprocess.PIPE).stdout.readline()
    return host


print("nobody there")
first, second = Switch(1), Switch(2)
found, seconds = find(milliseconds=500)
expect("found", found, {})
expect("ended in its time", 0.4 < seconds < 5, True)

print("methods switched off")
before = datagrams_sent()
found, seconds = find(methods=NONE)
expect("found", found, {})
expect("at once", seconds < 1, True)
expect("datagrams sent", datagrams_sent() - before, 0)

print("two networks with two instruments each, by VXI-11")
hosts = [Host(first), Host(first), Host(second), Host(second)]
for host in hosts:
    host.start_simulator(SIMULATOR, "--listen", host.address, "--vxi11", "0", "--hislip", "4880", "--http", "80", "--mdns")
found, _ = find(methods=VXI11)
wanted = [f"TCPIP0::{host.address}::inst0::INSTR" for host in hosts]
expect("found by VXI-11, in the order of the addresses", [name for name in found if "inst0" in name], wanted)
expect("texts of the document", found.get(wanted[0], {}).get("manufacturer"), "Oltrava")
english, _ = find(methods=VXI11)
german, _ = find(methods=VXI11, LOCPATH=LOCALES, LC_ALL="de_DE.UTF-8")
expect("found by a program that speaks German", german, english)
everything = [name for host in hosts for name in (f"TCPIP0::{host.address}::hislip0::INSTR", f"TCPIP0::{host.address}::inst0::INSTR")]
found, _ = find(methods=MDNS)
expect("found by mDNS, from the simulators' own announcements", list(found), everything)
expect("texts of the announcement", found.get(everything[0], {}).get("model"), "KyVisaSimulator")
expect("an expression", list(find("TCPIP?*::10.1.0.2::inst0::INSTR", VXI11)[0]), wanted[:1])

def announce(host, instance, services, text, server="box.local."):
    """Lets python3-zeroconf announce services of one instance on a host."""
    host.start("/usr/bin/python3", "-c", """
import ipaddress, signal, sys, zeroconf
host, instance, services, text, server = sys.argv[1], sys.argv[2], eval(sys.argv[3]), eval(sys.argv[4]), sys.argv[5]
z = zeroconf.Zeroconf(interfaces=[host])
for kind, port in services:
    z.register_service(zeroconf.ServiceInfo(f"{kind}._tcp.local.", f"{instance}.{kind}._tcp.local.",
        addresses=[ipaddress.ip_address(host).packed], port=port, properties=text, server=server))
print("ready", flush=True)
signal.pause()
""", host.address, instance, repr(services), repr(text), server, stdout=subprocess.PIPE).stdout.readline()


print(f"announced by python3-zeroconf {ZEROCONF}, found by mDNS")
announcing = Host(second)
announce(announcing, "Smith & Sons PSU - 42", [("_hislip", 4881), ("_scpi-raw", 5555), ("_lxi", 80), ("_http", 80)],
         {"txtvers": "1", "Manufacturer": "Smith & Sons", "Model": "PSU", "SerialNumber": "42", "FirmwareVersion": "1.0"})
elsewhere = Host(first)
announce(elsewhere, "Nobody knows", [("_scpi-raw", 5025), ("_vxi-11", 111)], {}, "other.local.")
found, _ = find(methods=MDNS)
at = announcing.address
expect("found by mDNS", [name for name in found if name not in everything], [f"TCPIP0::{elsewhere.address}::5025::SOCKET", f"TCPIP0::{at}::hislip0,4881::INSTR",
                                      f"TCPIP0::{at}::5555::SOCKET"])
expect("texts", found.get(f"TCPIP0::{at}::5555::SOCKET"),
       {"manufacturer": "Smith & Sons", "model": "PSU", "serial number": "42", "firmware": "1.0", "host": "box.local"})
found, _ = find(methods=BOTH)
expect("both methods, merged by host", [name for name in found if "::10.2." in name],
       [*everything[4:], f"TCPIP0::{at}::hislip0,4881::INSTR", f"TCPIP0::{at}::5555::SOCKET"])

print("a network that is not asked when none of its resources is wanted")
before = datagrams_sent()
_, seconds = find("ASRL?*INSTR")
expect("at once", seconds < 1, True)
expect("datagrams sent", datagrams_sent() - before, 0)

print("odd hosts beside them")
odd_host(first, "    s.sendto(reply + struct.pack('>I', 0), peer)\n")        # does not serve the program
odd_host(first, "    s.sendto(reply + struct.pack('>I', 4321), peer)\n")     # serves it where nobody listens
odd_host(first, "    s.sendto(reply + struct.pack('>I', 4321), peer)\n",    # takes the connection and never says a word
         before="t = socket.create_server(('', 4321))\n")
odd_host(first, "    s.sendto(reply + struct.pack('>I', 99999), peer)\n")    # no port
odd_host(second, "    [s.sendto((reply + struct.pack('>I', 4321))[:n], peer) for n in range(28)]\n")  # every truncation
odd_host(second, "    s.sendto(b'\\xff' * 4 + reply[4:] + struct.pack('>I', 4321), peer)\n")          # another's xid
odd_host(second, "    [s.sendto(bytes([n]) * 1400, peer) for n in range(32)]\n")                     # noise
found, seconds = find(methods=VXI11)
expect("found", [name for name in found if "inst0" in name], wanted)
expect("ended in its time", seconds < 10, True)

sys.exit(1 if findings else 0)
