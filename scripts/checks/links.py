#!/usr/bin/env python3
"""Checks that every relative link in the documents leads to a file of the repository.

Usage: links.py [ROOT]. Status 1 and one line a link that leads nowhere.
"""
import pathlib
import re
import subprocess
import sys

ROOT = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else pathlib.Path(__file__).resolve().parents[2])
LINK = re.compile(r"!?\[[^\]]*\]\(([^)\s]+)\)")

documents = subprocess.run(["git", "-C", ROOT, "ls-files", "--cached", "--others", "--exclude-standard", "*.md"], capture_output=True,
                           text=True, check=True).stdout.split()
findings, count = [], 0
for name in documents:
    path = ROOT / name
    for number, line in enumerate(path.read_text(encoding="utf-8").splitlines(), 1):
        for target in LINK.findall(line):
            if re.match(r"[a-z]+:|#", target):
                continue
            count += 1
            if not (path.parent / target.split("#")[0]).exists():
                findings.append(f"{name}:{number}: {target}")
print("\n".join(findings) if findings else f"{count} links in {len(documents)} documents, each leads somewhere")
sys.exit(1 if findings or not count else 0)
