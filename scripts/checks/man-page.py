#!/usr/bin/env python3
"""Checks that a program's --help and its man page name the same options.

Usage: man-page.py PROGRAM MAN_PAGE. Status 1 and one line a difference when they do not.
"""
import pathlib
import re
import subprocess
import sys

PROGRAM, PAGE = sys.argv[1:]

OPTION = re.compile(r"(?<![\w-])--[a-z0-9][a-z0-9-]*")
told = set(OPTION.findall(subprocess.run([PROGRAM, "--help"], capture_output=True, text=True, check=True).stdout))
page = pathlib.Path(PAGE).read_text(encoding="utf-8").replace("\\-", "-")
described = set(OPTION.findall(" ".join(re.findall(r"^\.TP\n\.B[IR]? (.*)$", page, re.M))))

findings = [f"{option}: not in {PAGE}" for option in sorted(told - described)]
findings += [f"{option}: not in --help" for option in sorted(described - told)]
if not told:
    findings.append("--help names no option")
print("\n".join(findings) if findings else f"{len(told)} options, each in both")
sys.exit(1 if findings else 0)
