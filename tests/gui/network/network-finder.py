#!/usr/bin/python3
"""The window's finder in networks of its own: an empty one, then two with instruments.

Usage: network-finder.py SIMULATOR FIND_PROGRAM WINDOW_TEST. Status 1 when the window test failed in one of them.
"""
import os
import subprocess
import sys

sys.path.insert(0, os.path.join(os.path.dirname(os.path.abspath(__file__)), "../../support"))
from netlab import Host, Switch, enter  # noqa: E402

enter()
SIMULATOR, FIND, WINDOW_TEST = sys.argv[1:4]
ENVIRONMENT = dict(os.environ, KYVISA_CONFIG="/nonexistent", QT_QPA_PLATFORM="offscreen")


def passed(tests):
    """Whether these cases of the window test ran, and passed."""
    test = subprocess.run(["timeout", "100", WINDOW_TEST, f"--gtest_filter={tests}"], env=ENVIRONMENT, stdout=subprocess.PIPE,
                          text=True, check=False)
    print(test.stdout)
    return test.returncode == 0 and "[  PASSED  ]" in test.stdout and "[  PASSED  ] 0 " not in test.stdout


def await_announcements(hosts):
    """An instrument looks for a while whether its names are free before it announces them."""
    for _ in range(20):
        found = subprocess.run([FIND, "TCPIP?*", "4", "1500"], capture_output=True, text=True, timeout=60, env=ENVIRONMENT,
                               check=False).stdout
        if all(f"::{host.address}::" in found for host in hosts):
            return
    raise RuntimeError("the instruments were not announced")


first, second = Switch(1), Switch(2)
good = passed("EmptyNetwork.*")

hosts = [Host(first), Host(first), Host(second), Host(second)]
everything = ["--vxi11", "0", "--hislip", "4880", "--socket", "5025", "--http", "80", "--mdns"]
for host, options in zip(hosts, [everything, ["--hislip", "4880", "--mdns"], everything, ["--vxi11", "0"]]):
    host.start_simulator(SIMULATOR, "--listen", host.address, *options)
await_announcements(hosts[:3])
good = passed("TwoNetworks.*") and good

sys.exit(0 if good else 1)
