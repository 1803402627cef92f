#!/usr/bin/env python3
"""Checks that every page in docs/decisions/ names a test that exists, and that those which docs/operations.md names do.

A page carries one or more lines `Test: NAME`, with NAME as ctest lists it. A table row of operations.md ends with `NAME` or nothing, where
NAME may leave out what stands around the slashes of a parameterised test. Usage: decisions.py BUILD_FOLDER [ROOT].
"""
import pathlib
import re
import subprocess
import sys

BUILD = sys.argv[1]
ROOT = pathlib.Path(sys.argv[2] if len(sys.argv) > 2 else pathlib.Path(__file__).resolve().parents[2])

listing = subprocess.run(["ctest", "--test-dir", BUILD, "-N"], capture_output=True, text=True, check=True).stdout
tests = set(re.findall(r"Test\s+#\d+: (\S+)", listing))

findings = []
pages = sorted(p for p in (ROOT / "docs" / "decisions").glob("*.md") if p.name != "README.md")
for page in pages:
    named = re.findall(r"^Test: +`?([^`\s]+)`?", page.read_text(encoding="utf-8"), re.M)
    if not named:
        findings.append(f"{page.name}: names no test")
    findings += [f"{page.name}: there is no test {name}" for name in named if name not in tests]

parts = {part for test in tests for part in test.split("/")}
rows = re.findall(r"^\| `vi.*\| +(?:`(\S+)` )?\|$", (ROOT / "docs" / "operations.md").read_text(encoding="utf-8"), re.M)
findings += [f"operations.md: there is no test {name}" for name in rows if name and name not in tests | parts]
if not rows:
    findings.append("operations.md: no rows")

print("\n".join(findings) if findings else f"{len(pages)} decisions, each with its test")
sys.exit(1 if findings else 0)
