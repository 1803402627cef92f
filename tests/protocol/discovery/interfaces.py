#!/usr/bin/python3
"""How viFindRsrc uses a machine's network interfaces: all of them, and all at once.

Usage: interfaces.py CASE SIMULATOR FIND_PROGRAM. Status 1 when something was not as it should be.
"""
import os
import subprocess
import sys
import tempfile
import time

sys.path.insert(0, os.path.join(os.path.dirname(os.path.abspath(__file__)), "../../support"))
from netlab import Host, Switch, enter, ip  # noqa: E402

enter()
CASE, SIMULATOR, FIND = sys.argv[1:4]
MDNS, VXI11, BOTH = 4, 2, 6
findings = []


def expect(what, got, wanted):
    good = got == wanted
    print(f"  {what}: {got!r}{'' if good else f'   <-- wrong, wanted {wanted!r}'}")
    if not good:
        findings.append(what)


def find(methods, milliseconds):
    """The names in their order, the lines of the trace that tell of the search, and the seconds that it took."""
    with tempfile.NamedTemporaryFile("w", suffix=".ini") as settings:
        settings.write("[KYVISA]\nDebug = 1\n")
        settings.flush()
        begin = time.monotonic()
        result = subprocess.run([FIND, "TCPIP?*", str(methods), str(milliseconds)], capture_output=True, text=True,
                                timeout=120, env=dict(os.environ, KYVISA_CONFIG=settings.name))
        seconds = time.monotonic() - begin
    names = [line for line in result.stdout.splitlines() if not line.startswith(" ")]
    told = [line for line in result.stderr.splitlines() if line.startswith("search")]
    return names, told, seconds


def instrument(switch):
    host = Host(switch)
    host.start_simulator(SIMULATOR, "--listen", host.address, "--vxi11", "0", "--mdns")
    return f"TCPIP0::{host.address}::inst0::INSTR"


def at_once():
    """One time for all interfaces and methods, and one entry for a host that answered twice."""
    switches = [Switch(number) for number in (1, 2, 3)]
    span = 6
    names, _, seconds = find(BOTH, span * 1000)
    expect("found where nobody is", names, [])
    expect("took its time once", span - 0.5 < seconds < 2 * span - 0.5, True)
    wanted = [instrument(switch) for switch in switches]
    names, _, seconds = find(BOTH, span * 1000)
    expect("found on three interfaces by two methods", names, wanted)
    expect("took its time once", seconds < 2 * span - 0.5, True)


def every_interface():
    """The second interface counts as much as the first, one that is down is left out, and the trace tells."""
    Switch(1)
    second = Switch(2)
    third = Switch(3)
    ip("link", "set", third.name, "down")
    wanted = [instrument(second)]
    for methods, name in ((VXI11, "VXI-11"), (MDNS, "mDNS")):
        names, told, _ = find(methods, 4000)
        expect(f"found on the second interface by {name}", names, wanted)
        expect("told", told, [f"search by {name} on 127.0.0.1, 10.1.0.1, 10.2.0.1: 1 host answered, 1 resource"])
    ip("link", "set", second.name, "down")
    names, told, _ = find(BOTH, 500)
    expect("found behind an interface that is down", names, [])
    expect("told", told, ["search by VXI-11 and mDNS on 127.0.0.1, 10.1.0.1: 0 hosts answered, 0 resources"])
    ip("link", "set", "switch1", "down")
    ip("link", "set", "lo", "down")
    names, told, _ = find(BOTH, 500)
    expect("found without a network", names, [])
    expect("told", told, ["search by VXI-11 and mDNS: no network interface is up"])


{"asks-all-interfaces-at-once": at_once, "asks-every-interface-and-tells": every_interface}[CASE]()
sys.exit(1 if findings else 0)
