#!/usr/bin/env python3
"""Checks that the tree is the architecture.

  - no two files include each other in a loop
  - wire/ depends on nothing, kyvisa/ and simulator/ on wire/ and never on each other, tester/ on the VISA headers alone
  - system calls that wait, transfer or read the clock stand in kyvisa/os/ and nowhere else of the library
  - headers stay below 300 lines, sources below 800
  - every folder of code has a README.md

Usage: layout.py [ROOT]. Status 1 and one line a finding when something is wrong.
"""
import pathlib
import re
import sys

ROOT = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else pathlib.Path(__file__).resolve().parents[2])
CODE = ["wire", "kyvisa", "simulator", "tester"]
ALSO = ["tests", "bench"]

# First path component of an include -> allowed in files below these folders.
MAY_INCLUDE = {
    "wire": {"wire"},
    "kyvisa": {"kyvisa", "wire"},
    "simulator": {"simulator", "wire"},
    "tester": {"tester"},
}
TESTER_MODULES = {"app", "pipeline", "visa", "log", "panels", "finder", "instrtests", "config"}
PUBLIC_HEADERS = {"visa.h", "visatype.h"}
TOO_LONG = {".h": 300, ".cpp": 800}
LENGTH_EXEMPT = {"kyvisa/include/visa.h"}

SYSTEM_CALLS = re.compile(
    r"(?<![\w.>])::(poll|ppoll|select|recv|recvmsg|recvfrom|send|sendmsg|sendto|writev|readv|read|write|connect|accept4?|socket|"
    r"getaddrinfo|open|close|eventfd|clock_gettime|ioctl|tcsetattr|tcgetattr)\s*\(|"
    r"\b(steady_clock|system_clock)::now"
)
INCLUDE = re.compile(r'^\s*#\s*include\s*[<"]([^>"]+)[>"]', re.M)

findings = []


def files():
    for top in CODE + ALSO:
        for path in sorted((ROOT / top).rglob("*")):
            if path.suffix in (".h", ".cpp", ".c") and "CMakeFiles" not in path.parts:
                yield path


def resolve(path, name):
    """The project's file that an include names, or None for a system header."""
    for base in (path.parent, ROOT, ROOT / "tester", ROOT / "kyvisa" / "include", ROOT / "tests"):
        candidate = base / name
        if candidate.is_file() and ROOT in candidate.resolve().parents:
            return candidate.resolve()
    return None


graph = {}
for path in files():
    text = path.read_text(encoding="utf-8")
    where = path.relative_to(ROOT)
    top = where.parts[0]
    graph[path.resolve()] = []
    for name in INCLUDE.findall(text):
        target = resolve(path, name)
        if target is None:
            continue
        graph[path.resolve()].append(target)
        target_where = target.relative_to(ROOT)
        if top in MAY_INCLUDE and target_where.parts[0] not in MAY_INCLUDE[top]:
            public = target_where.name in PUBLIC_HEADERS
            if not (public and top in ("tester", "kyvisa")):
                findings.append(f"{where}: {top}/ must not include {target_where}")
    if top == "kyvisa" and where.parts[1] != "os":
        for number, line in enumerate(text.splitlines(), 1):
            code = line.split("//")[0]
            if SYSTEM_CALLS.search(code):
                findings.append(f"{where}:{number}: system call outside kyvisa/os/: {line.strip()}")
    length = text.count("\n")
    if top in CODE and str(where) not in LENGTH_EXEMPT and length > TOO_LONG.get(path.suffix, 10**9):
        findings.append(f"{where}: {length} lines, split it by meaning")

# Loops, by depth-first search; each is reported once, at the file that closes it.
state = {}


def visit(node, trail):
    state[node] = "open"
    for target in graph.get(node, []):
        if state.get(target) == "open":
            loop = [*trail[trail.index(target):], target] if target in trail else [node, target]
            findings.append("include loop: " + " -> ".join(str(p.relative_to(ROOT)) for p in loop))
        elif target not in state:
            visit(target, [*trail, target])
    state[node] = "done"


for start in graph:
    if start not in state:
        visit(start, [start])

for top in CODE:
    folders = {p.parent for p in files() if p.relative_to(ROOT).parts[0] == top and p.parent.name != "include"}
    for folder in sorted(folders):
        if not (folder / "README.md").is_file():
            findings.append(f"{folder.relative_to(ROOT)}/: no README.md")

print("\n".join(findings) if findings else f"{len(graph)} files, nothing wrong")
sys.exit(1 if findings else 0)
