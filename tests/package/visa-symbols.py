#!/usr/bin/env python3
"""Checks which operations of the VISA C interface a binary needs or offers.

  visa-symbols.py needs-all FILE...    each needs exactly the operations below: the logged session, and the program
  visa-symbols.py needs-none FILE...   needs none: every other library of the tester
  visa-symbols.py offers-all FILE...   exports exactly these: the stand-in
  visa-symbols.py offers-all-but NAME FILE...

Status 1 and one line a difference when something is wrong. Another maker's library can take the place of libkyvisa only as
long as the program asks for no more than these.
"""
import re
import subprocess
import sys

OPERATIONS = set("""
    viOpenDefaultRM viOpen viClose viFindRsrc viFindNext viRead viWrite viVPrintf viVScanf viVQueryf
    viReadSTB viAssertTrigger viClear viSetAttribute viGetAttribute viLock viUnlock
    viEnableEvent viDisableEvent viDiscardEvents viWaitOnEvent viInstallHandler viUninstallHandler
    viGpibControlREN viGpibControlATN viGpibSendIFC viGpibCommand viGpibPassControl viIn32
""".split())
assert len(OPERATIONS) == 29


def operations(path, offered):
    command = ["nm", "--format=posix"]
    if not path.endswith(".a"):
        command.append("--dynamic")
    command.append("--defined-only" if offered else "--undefined-only")
    listing = subprocess.run([*command, path], capture_output=True, text=True, check=True).stdout
    # A dynamic symbol can carry a version: viOpen@VERS.
    names = {line.split()[0].split("@")[0] for line in listing.splitlines() if line.strip() and not line.endswith(":")}
    return {name for name in names if re.fullmatch(r"vi[A-Z]\w*", name)}


mode, *files = sys.argv[1:]
wanted = set() if mode == "needs-none" else set(OPERATIONS)
if mode == "offers-all-but":
    wanted.remove(files.pop(0))
if not files:
    sys.exit("no file to look at")
findings = []
for path in files:
    found = operations(path, mode.startswith("offers"))
    findings += [f"{path}: {name} is missing" for name in sorted(wanted - found)]
    findings += [f"{path}: {name} is too much" for name in sorted(found - wanted)]
print("\n".join(findings) if findings else f"{len(files)} files, nothing wrong")
sys.exit(1 if findings else 0)
