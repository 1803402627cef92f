#!/usr/bin/env python3
"""Everything that tells a version, or the names that the library exports, tells the same.

Usage: versions.py ROOT SIMULATOR LIBRARY PKG_CONFIG_FILE. Status 1 and one line a difference.
"""
import pathlib
import re
import subprocess
import sys
import xml.etree.ElementTree as xml

ROOT = pathlib.Path(sys.argv[1])
SIMULATOR, LIBRARY, PKG_CONFIG_FILE = sys.argv[2:]


def first(pattern, path):
    found = re.search(pattern, pathlib.Path(path).read_text(encoding="utf-8"), re.M)
    assert found, f"{path}: nothing like {pattern}"
    return found[1]


version = first(r"^project\(KyVisaTester VERSION ([\d.]+)", ROOT / "CMakeLists.txt")
told = {
    "packaging/debian/changelog": first(r"^kyvisatester \(([\d.]+)-\d+\)", ROOT / "packaging/debian/changelog"),
    "the metainfo file": xml.parse(ROOT / "packaging/desktop/example.oltrava.KyVisaTester.metainfo.xml").find("releases/release").get("version"),
    "KyVisaSimulator --version": subprocess.run([SIMULATOR, "--version"], capture_output=True, text=True, check=True).stdout.split()[-1],
    "kyvisa.pc": first(r"^Version: (\S+)$", PKG_CONFIG_FILE),
    "tester/app/main.cpp": ".".join(re.search(r"arg\((\d+)\)\.arg\((\d+)\)\.arg\((\d+)\)", (ROOT / "tester/app/main.cpp").read_text()).groups()),
}
findings = [f"{where}: {other}, not {version}" for where, other in told.items() if other != version]

exported = {line.split()[2] for line in
            subprocess.run(["nm", "-D", "--defined-only", LIBRARY], capture_output=True, text=True, check=True).stdout.splitlines()}
symbols = set(re.findall(r"^ (\w+)@Base", (ROOT / "packaging/debian/symbols").read_text(), re.M))
findings += [f"packaging/debian/symbols: {name} is missing" for name in sorted(exported - symbols)]
findings += [f"packaging/debian/symbols: {name} is too much" for name in sorted(symbols - exported)]

print("\n".join(findings) if findings else f"version {version} everywhere, {len(symbols)} symbols")
sys.exit(1 if findings else 0)
