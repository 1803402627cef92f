#!/usr/bin/python3
"""What the library says on a machine whose local ports are all in use, and that it goes on when some are free again.

Usage: used-up-ports.py SIMULATOR CLIENT. Status 1 when something was not as it should be.
"""
import os
import socket
import subprocess
import sys

sys.path.insert(0, os.path.join(os.path.dirname(os.path.abspath(__file__)), "../../support"))
from netlab import enter  # noqa: E402

enter()
SIMULATOR, CLIENT = sys.argv[1:3]
SUCCESS, ALLOC, NOT_FOUND = "00000000", "BFFF003C", "BFFF0011"
findings = 0

# Few ports, and those of closed connections stay away for their whole minute.
for name, value in (("ip_local_port_range", "40000 40009"), ("tcp_tw_reuse", "0")):
    with open(f"/proc/sys/net/ipv4/{name}", "w", encoding="ascii") as setting:
        setting.write(value)
simulator = subprocess.Popen([SIMULATOR, "--listen", "127.0.0.1", "--socket", "5025", "--hislip", "4880"],
                             stdout=subprocess.PIPE, text=True)
while simulator.stdout.readline().strip() != "ready":
    pass
environment = dict(os.environ, XDG_CONFIG_HOME="/nonexistent", KYVISA_CONFIG="/nonexistent")
client = subprocess.Popen([CLIENT], stdin=subprocess.PIPE, stdout=subprocess.PIPE, text=True, env=environment)


def expect(resource, wanted):
    global findings
    client.stdin.write(f"exchange {resource}\n")
    client.stdin.flush()
    told = client.stdout.readline()
    good = told.startswith(f"open={wanted}")
    findings += not good
    print(f"  {resource}: {told.strip()}{'' if good else f'   <-- wrong, wanted {wanted}'}", flush=True)


def take_all(port):
    """Connections from every local port to this one."""
    taken = []
    try:
        while len(taken) < 20:
            taken.append(socket.create_connection(("127.0.0.1", port)))
    except OSError:
        pass
    return taken


print("ports enough")
expect("TCPIP::127.0.0.1::5025::SOCKET", SUCCESS)
expect("TCPIP::127.0.0.1::hislip0::INSTR", SUCCESS)
print("none left")
taken = take_all(5025) + take_all(4880)
expect("TCPIP::127.0.0.1::5025::SOCKET", ALLOC)
expect("TCPIP::127.0.0.1::hislip0::INSTR", ALLOC)
expect("TCPIP::localhost::5025::SOCKET", ALLOC)
print("somebody who is not there is not there all the same")
expect("TCPIP::127.0.0.1::5026::SOCKET", NOT_FOUND)
expect("TCPIP::10.9.9.9::5025::SOCKET", NOT_FOUND)
print("free again")
for connection in taken:
    connection.setsockopt(socket.SOL_SOCKET, socket.SO_LINGER, b"\1\0\0\0\0\0\0\0")  # at once, without the minute
    connection.close()
expect("TCPIP::127.0.0.1::5025::SOCKET", SUCCESS)
expect("TCPIP::127.0.0.1::hislip0::INSTR", SUCCESS)

client.stdin.close()
client.wait(60)
simulator.terminate()
simulator.wait(60)
sys.exit(1 if findings else 0)
