#!/usr/bin/env python3
"""Checks that what the documents name is there.

Usage: links.py [ROOT [SIMULATOR]]. Status 1 and one line a finding.

- A relative link or picture leads to a file of the repository, and its part behind # to a heading.
- A path in backticks whose first folder exists, seen from the document, from the folder above it or from the root, leads somewhere; so does a
  pair of files by its name without ending. What a build makes or a run appends to (build/, docs/records/) need not be there yet.
- An option in backticks, or behind the name of a program, belongs to one: --help of SIMULATOR, when it is given, or the text of a script in scripts/.
"""
import functools
import pathlib
import re
import subprocess
import sys

ROOT = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else pathlib.Path(__file__).resolve().parents[2])
SIMULATOR = sys.argv[2] if len(sys.argv) > 2 else None
LINK = re.compile(r"!?\[[^\]]*\]\(([^)\s]+)\)")
SPAN = re.compile(r"`([^`]+)`")
PATH = re.compile(r"[\w.-]+(/[\w.-]+)+/?|[\w-]+/")
OPTION = re.compile(r"(?<![\w-])--[a-z][a-z0-9-]*")
MADE = ("build/", "docs/records/")


def listed(pattern):
    return subprocess.run(["git", "-C", ROOT, "ls-files", "--cached", "--others", "--exclude-standard", pattern], capture_output=True, text=True,
                          check=True).stdout.split()


@functools.cache
def anchors(path):
    """The headings of a document, as links name them: small letters, blanks as hyphens, punctuation left out."""
    headings = re.findall(r"^#+ (.*)$", re.sub(r"```.*?```", "", path.read_text(encoding="utf-8"), flags=re.S), re.M)
    return {re.sub(r"[^\w -]", "", heading.lower()).replace(" ", "-") for heading in headings}


def link_leads(document, target):
    file, _, heading = target.partition("#")
    path = document.parent / file if file else document
    return path.exists() and (not heading or path.suffix != ".md" or heading in anchors(path))


def path_leads(document, text):
    if text.startswith(".."):  # beside a program, not in the repository
        return True
    bases = [base for base in (ROOT, document.parent, document.parent.parent) if (base / text.split("/")[0]).is_dir()]
    if not bases or text.startswith(MADE) or "NAME" in text:
        return True
    return any((base / text).exists() or list((base / text).parent.glob(pathlib.Path(text).name + ".*")) for base in bases)


def options_of_scripts():
    texts = [(ROOT / name).read_text(encoding="utf-8") for name in listed("scripts/*")]
    return set(OPTION.findall("\n".join(texts)))


told = set(OPTION.findall(subprocess.run([SIMULATOR, "--help"], capture_output=True, text=True, check=True).stdout)) if SIMULATOR else set()
scripts = options_of_scripts()
documents = listed("*.md")
findings, links, paths, options = [], 0, 0, 0
for name in documents:
    document = ROOT / name
    for number, line in enumerate(document.read_text(encoding="utf-8").splitlines(), 1):
        where = f"{name}:{number}"
        for target in LINK.findall(line):
            if not re.match(r"[a-z]+:", target):
                links += 1
                if not link_leads(document, target):
                    findings.append(f"{where}: {target} leads nowhere")
        spans = SPAN.findall(line)
        for text in spans:
            if PATH.fullmatch(text):
                paths += 1
                if not path_leads(document, text):
                    findings.append(f"{where}: there is no {text}")
        for command in spans + [line] * line.startswith("    "):
            command = command.split(" #")[0].strip()
            words = command.split()
            program = words[0] if words else ""
            if program.endswith("KyVisaSimulator") or program.startswith("--"):
                known = told | (scripts if program.startswith("--") else set())
                wanted = OPTION.findall(command) if SIMULATOR else []
            elif program.startswith("scripts/") and (ROOT / program).is_file():
                known = set(OPTION.findall((ROOT / program).read_text(encoding="utf-8")))
                wanted = OPTION.findall(command)
            else:
                continue
            options += len(wanted)
            findings += [f"{where}: {program} has no option {option}" for option in wanted if option not in known]
print("\n".join(findings) if findings else
      f"{links} links, {paths} paths and {options} options in {len(documents)} documents, each leads somewhere")
sys.exit(1 if findings or not links or not paths else 0)
