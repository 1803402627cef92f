#!/usr/bin/env python3
"""Asks bash what the completion of a program offers, and compares it with what the program, or its manual page, says.

  completion.py simulator PROGRAM COMPLETION MANUAL PROFILES    options as --help has them, faults as the manual, profiles as the folder
  completion.py tester COMPLETION MANUAL QT_OPTIONS             options as the manual has them, each taken by Qt: QT_OPTIONS prints what it leaves
"""
import os
import pathlib
import re
import subprocess
import sys

which, *arguments = sys.argv[1:]

ASK = r"""
source "$1"; shift
name=$1
COMP_WORDS=("$@"); COMP_CWORD=$(($# - 1))
"_$name"
printf '%s\n' "${COMPREPLY[@]}"
"""


def offered(completion, *words):
    """What is offered when the last of the words, which begin with the program's name, is to be completed."""
    answer = subprocess.run(["bash", "--norc", "-c", ASK, "bash", completion, *words], capture_output=True, text=True, check=True)
    return answer.stdout.split()


def same(what, offers, said):
    assert said, f"{what}: nothing to compare with"
    assert len(offers) == len(set(offers)), f"{what}: offered twice: {offers}"
    assert set(offers) == set(said), f"{what}: only offered {sorted(set(offers) - set(said))}, only said {sorted(set(said) - set(offers))}"


def manual(path):
    return pathlib.Path(path).read_text(encoding="utf-8").replace("\\-", "-")


if which == "simulator":
    program, completion, page, profiles = arguments
    text = subprocess.run([program, "--help"], capture_output=True, text=True, check=True).stdout
    options = re.findall(r"^ +(--[a-z0-9-]+)", text, re.M)
    same("options", offered(completion, "KyVisaSimulator", "--"), options)
    same("options behind one with a value", offered(completion, "KyVisaSimulator", "--hislip", "0", ""), options)
    assert offered(completion, "KyVisaSimulator", "--hislip-o") == ["--hislip-overlap"]
    # Behind an option with a value the options are not offered.
    for option in re.findall(r"^ +(--[a-z0-9-]+) [A-Z]", text, re.M):
        offers = offered(completion, "KyVisaSimulator", option, "")
        assert not set(offers) & set(options), f"{option} offers {offers}"
    same("profiles", [name for name in offered(completion, "KyVisaSimulator", "--profile", "") if not pathlib.Path(name).exists()],
         [path.stem for path in pathlib.Path(profiles).glob("*.json")])

    faults = manual(page).split(".SH FAULTS")[1].split("A fault strikes each time")[0]
    # The bold words of the list, every other one.
    protocols = re.search(r"^\.BR (hislip .*)$", faults, re.M)[1]
    protocols = [*re.sub(r'"[^"]*"', " ", protocols).replace(",", " ").split(), "any"]
    kinds = re.findall(r"^\.TP\n\.BI? ?R? ?([a-z-]+=?)", faults, re.M)
    same("protocols", [name.removesuffix(":") for name in offered(completion, "KyVisaSimulator", "--fault", "")], protocols)
    for words in (["vxi11", ":"], ["hislip", ":", ""]):
        same(f"kinds behind {words}", offered(completion, "KyVisaSimulator", "--fault", *words), kinds)
    # What is offered is what the program takes: on "any", with the least value where one is needed.
    for kind in kinds:
        spec = f"any:{kind}0" if kind.endswith("=") else f"any:{kind}"
        run = subprocess.run([program, "--fault", spec, "--fault", "nonsense"], capture_output=True, text=True, check=False)
        assert run.returncode == 2 and spec not in run.stderr and "nonsense" in run.stderr, run
    assert offered(completion, "KyVisaSimulator", "--fault", "hislip", ":", "drop") == ["drop-reply"]
    same("conditions", offered(completion, "KyVisaSimulator", "--fault", "hislip", ":", "cut", ":"), ["p=", "nth=", "every=", "on=all"])
    assert offered(completion, "KyVisaSimulator", "--fault", "hislip", ":", "cut", ":", "n") == ["nth="]
    same("options behind a fault", offered(completion, "KyVisaSimulator", "--fault", "hislip", ":", "cut", ""), options)
elif which == "tester":
    completion, page, qt_options = arguments
    section = manual(page).split(".SH OPTIONS")[1].split(".SH")[0]
    described = re.findall(r"^\.TP\n\.BI? (-[a-z]+)( \" [A-Zx+]+\")?", section, re.M)
    same("options", offered(completion, "KyVisaTester", ""), [option for option, _ in described])
    for option, value in described:
        words = [option, "1"] if value else [option]
        if option == "-platform":
            words = [option, "offscreen"]
        left = subprocess.run([qt_options, *words, "-unknown"], env={**os.environ, "QT_QPA_PLATFORM": "offscreen"}, capture_output=True,
                              text=True, check=True).stdout.split()
        assert left == ["-unknown"], (words, left)
    assert "Fusion" in offered(completion, "KyVisaTester", "-style", "")
else:
    sys.exit(f"unknown case {which}")
