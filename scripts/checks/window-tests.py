#!/usr/bin/env python3
"""Checks that the window tests do what a person can: find widgets by object name, and use mouse and keys.

In tests/gui/ a test may create the main window and read what a widget shows. It may not include a panel's header, nor call what
changes a widget or sends a request behind the window's back.

Usage: window-tests.py [ROOT]. Status 1 and one line a finding when something is wrong.
"""
import pathlib
import re
import sys

ROOT = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else pathlib.Path(__file__).resolve().parents[2])

INCLUDE = re.compile(r'^\s*#\s*include\s*"((?:panels|pipeline|finder|instrtests|config|log|visa)/[^"]+|app/(?!MainWindow\.h)[^"]+)"')
# Members of widgets and panels that act: a person has a mouse and a keyboard instead.
ACTS = re.compile(
    r"(?:->|\.)\s*(?:click|animateClick|toggle|trigger|setChecked|setCheckState|setText|setPlainText|setValue|setCurrentIndex|"
    r"setCurrentText|setEditText|selectAll|insert|insertItem|addItem|clearEditText|copy|paste|sendFunctionCall|sendVisaFunctionCall|"
    r"getCommand|getParameter|setName|setStatus|visaFunctionCallFinished|newVisaCallStarted|setVisible|setEnabled|setFocus|"
    r"stepUp|stepDown|stepBy|selectRow|setCurrentCell|setRangeSelected|reject)\s*\(|"
    r"(?<!peer)(?:->|\.)\s*accept\s*\("  # a scripted peer accepts connections
)
INVOKE = re.compile(r"QMetaObject::invokeMethod|qobject_cast<\s*(?:BasicTab|ResourceFrame|ScipiLineEdit|LogTextDisplay|SessionInstanceTab)")
ALLOWED = re.compile(r"//\s*acts as the system:")

findings = []
tests = sorted(p for p in (ROOT / "tests" / "gui").rglob("*") if p.suffix in (".cpp", ".h"))
for path in tests:
    for number, line in enumerate(path.read_text(encoding="utf-8").splitlines(), 1):
        if INCLUDE.match(line):
            findings.append(f"{path.relative_to(ROOT)}:{number}: includes what lies behind the window: {line.strip()}")
            continue
        code = line.split("//")[0]
        if (ACTS.search(code) or INVOKE.search(code)) and not ALLOWED.search(line):
            findings.append(f"{path.relative_to(ROOT)}:{number}: acts on a widget without mouse or key: {line.strip()}")

print("\n".join(findings) if findings else f"{len(tests)} files of window tests, mouse and keys only")
sys.exit(1 if findings else 0)
