#!/usr/bin/env python3
"""Checks that docs/libkyvisa.md and the manual pages know the environment variables and the configuration keys that the library reads, no
others, and that the C examples of the former compile.

Usage: manual.py [ROOT]. Status 1 and one line a finding.
"""
import pathlib
import re
import subprocess
import sys
import tempfile

ROOT = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else pathlib.Path(__file__).resolve().parents[2])
manual = (ROOT / "docs" / "libkyvisa.md").read_text(encoding="utf-8")
code = "\n".join(path.read_text(encoding="utf-8") for path in sorted((ROOT / "kyvisa").rglob("*.cpp")))
reader = (ROOT / "kyvisa" / "core" / "Configuration.cpp").read_text(encoding="utf-8")
findings = []


def table(heading):
    """The cells of the rows below a heading of the manual."""
    part = re.search(rf"^## {heading}\n(.*?)(?=^## |\Z)", manual, re.M | re.S)[1]
    return [[cell.strip() for cell in line.strip("|").split("|")] for line in part.splitlines() if line.startswith("| `")]


def compare(what, read, told):
    findings.extend(f"{what} {name}: read by the library, not in the manual" for name in sorted(read - told))
    findings.extend(f"{what} {name}: in the manual, not read by the library" for name in sorted(told - read))
    if not read:
        findings.append(f"{what}: none found in the code")


# Variables: through getenv, or through the helper of that file.
variables = set(re.findall(r'\b(?:secure_)?getenv\("(\w+)"\)', code)) | set(re.findall(r'\benvironment\("(\w+)"\)', reader))
unnamed = re.findall(r"\b(?:secure_)?getenv\((?!\"|name\))[^)]*\)", code)
findings += [f"{call}: which variable?" for call in unnamed]
compare("variable", variables, {row[0].strip("`") for row in table("Environment variables")})

# Sections and keys.
rows = table("Configuration file")
lists = re.search(r"ListSections = \{(.*?)\}", reader, re.S)[1]
sections = set(re.findall(r'equalIgnoringCase\(section, "([\w-]+)"\)', reader)) | set(re.findall(r'"([\w-]+)"', lists))
compare("section", sections, {row[0].strip("`") for row in rows})
keys = set(re.findall(r'equalIgnoringCase\(key, "(\w+)"\)', reader)) | {f"{key}0" for key in re.findall(r'numberedKey\(key, "(\w+)"\)', reader)}
compare("key", keys, {re.match(r"`(\w+)`", row[1])[1] for row in rows})

# The manual pages tell the same.
page = "\n".join((ROOT / "docs" / "man" / name).read_text(encoding="utf-8") for name in ("kyvisa.ini.5", "libkyvisa.3")).replace("\\-", "-")
environment = " ".join(re.findall(r"^\.SH ENVIRONMENT\n(.*?)(?=^\.SH )", page, re.M | re.S))
compare("manual pages: variable", variables,
        set(re.findall(r"\b[A-Z][A-Z_]+[A-Z]\b", " ".join(re.findall(r"^\.BR? ([A-Z].*)$", environment.replace(".TP", ""), re.M)))))
described = page.split(".SH SECTIONS")[1].split(".SH EXAMPLES")[0]
compare("manual pages: section", sections, set(re.findall(r"\[([\w-]+)\]", " ".join(re.findall(r"^\.SS (.*)$", described, re.M)))))
compare("manual pages: key", keys, set(re.findall(r"^\.TP\n\.BR? (\w+)", described, re.M)))

# Each piece of C in a function of its own.
pieces = re.findall(r"^```c\n(.*?)^```", manual, re.M | re.S)
with tempfile.TemporaryDirectory() as folder:
    source = pathlib.Path(folder, "manual.c")
    source.write_text("#include <visa.h>\n#include <stdio.h>\n" + "".join(
        f"void piece_{number}({'void' if 'viOpenDefaultRM' in piece else 'ViSession manager, ViSession vi'})\n{{\n{piece}}}\n"
        for number, piece in enumerate(pieces)), encoding="utf-8")
    done = subprocess.run(["cc", "-std=c99", "-pedantic", "-Wall", "-Werror", "-Wno-unused", "-fsyntax-only", f"-I{ROOT}/kyvisa/include", str(source)],
                          capture_output=True, text=True)
    if done.returncode != 0:
        findings.append(done.stderr)

print("\n".join(findings) if findings else f"{len(variables)} variables, {len(sections)} sections, {len(keys)} keys, {len(pieces)} pieces of C")
sys.exit(1 if findings else 0)
