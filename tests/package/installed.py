#!/usr/bin/env python3
"""Installs what was built below a folder that stands for the root, and tries it from there.

  installed.py install BUILD STAGE          installs afresh
  installed.py files STAGE PREFIX LIST      exactly the files of LIST are there
  installed.py tester STAGE PREFIX          the window opens on the installed library, with its icon, and closes
  installed.py session STAGE PREFIX         with mouse and keys, the window connects to the installed simulator and asks it
  installed.py pkg-config STAGE PREFIX SOURCES
                                            every installed example compiles, and SOURCES' query.c asks the installed simulator
  installed.py cmake STAGE PREFIX SOURCES   the same through find_package(KyVisa)
"""
import contextlib
import os
import pathlib
import re
import shutil
import subprocess
import sys
import tempfile
import time

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parents[1] / "support"))
from virtual_display import VirtualDisplay  # noqa: E402

PATIENCE = 120  # seconds, for a machine with other work
WARNINGS = ["-std=c99", "-Wall", "-Wextra", "-Werror"]
case, *arguments = sys.argv[1:]
# Nothing of the build folder, and nothing of the user.
CLEAN = {name: value for name, value in os.environ.items()
         if not name.startswith(("XDG_", "KYVISA_", "PKG_CONFIG", "CMAKE_")) and name not in ("LD_LIBRARY_PATH", "QT_QPA_PLATFORM", "DESTDIR")}


def wait_for(what, condition):
    end = time.monotonic() + PATIENCE
    while not (value := condition()):
        assert time.monotonic() < end, f"{what}: not in time"
        time.sleep(0.02)
    return value


def run(*command, **environment):
    done = subprocess.run([str(part) for part in command], env=CLEAN | environment, capture_output=True, text=True, timeout=PATIENCE)
    assert done.returncode == 0, f"{command}: {done.returncode}\n{done.stdout}{done.stderr}"
    return done.stdout


def library_folder(root):
    return next(root.rglob("libkyvisa.so")).parent


@contextlib.contextmanager
def simulator(root, *options):
    """The installed simulator; gives the resource string of its HiSLIP, and the file of what it says."""
    with tempfile.NamedTemporaryFile("w") as said:
        with subprocess.Popen([root / "bin/KyVisaSimulator", "--hislip", "0", *options], env=CLEAN, stdout=said) as process:
            try:
                said = pathlib.Path(said.name)
                lines = wait_for("the simulator", lambda: (text := said.read_text()) and "ready" in text.split("\n") and text.split("\n"))
                yield lines[0].split()[-1], said
                process.terminate()
                assert process.wait(PATIENCE) == 0
            finally:
                process.kill()


def install(build, stage):
    shutil.rmtree(stage, ignore_errors=True)
    run("cmake", "--install", build, DESTDIR=str(pathlib.Path(stage).resolve()))


def files(root, listed):
    wanted = {line for line in pathlib.Path(listed).read_text().split("\n") if line and not line.startswith("#")}
    there = {str(path.relative_to(root)) for path in root.rglob("*") if not path.is_dir()}
    # Lines of the list that end in a star stand for one file or more.
    patterns = {line for line in wanted if line.endswith("*")}
    missing = (wanted - there - patterns) | {p for p in patterns if not any(name.startswith(p[:-1]) for name in there)}
    unknown = {name for name in there - wanted if not any(name.startswith(p[:-1]) for p in patterns)}
    assert not missing and not unknown, f"missing: {sorted(missing)}\nnot in the list: {sorted(unknown)}"
    assert wanted - patterns


@contextlib.contextmanager
def open_window(root, home):
    """The installed tester's window on a display of its own; closed at the end, with status 0."""
    os.makedirs(f"{home}/Documents", exist_ok=True)
    with VirtualDisplay() as display:
        environment = CLEAN | {"HOME": home, "DISPLAY": display.name, "QT_QPA_PLATFORM": "xcb", "XDG_RUNTIME_DIR": home, "LC_ALL": "C.UTF-8"}
        program = subprocess.Popen([root / "bin/KyVisaTester"], env=environment)
        try:
            # Whose library it is stands in the title.
            window = wait_for("the window", lambda: display.window("KyVisaTester 5.8.6 Visa from Oltrava (5.8.6)"))
            yield display, program.pid, window
            display.close(window)
            assert program.wait(PATIENCE) == 0
        finally:
            program.kill()
            program.wait()


def tester(root):
    with tempfile.TemporaryDirectory() as home, open_window(root, home) as (display, pid, window):
        used = set(re.findall(r"\S*/libkyvisa\.so", pathlib.Path(f"/proc/{pid}/maps").read_text()))
        assert used == {str((library_folder(root) / "libkyvisa.so").resolve())}, used
        # The pictures reach the window manager some time after the window does.
        wait_for("the icon", lambda: sorted(display.icon_sizes(window)) == [32, 48, 64, 128])


def session(root):
    with tempfile.TemporaryDirectory() as home, simulator(root, "--log") as (resource, said):
        # The value of a run before: the resource.
        data = pathlib.Path(home, ".local/share/Oltrava/KyVisaTester/data.adr")
        data.parent.mkdir(parents=True)
        data.write_text(f"000001{len(resource):06}{resource}{0:06}{0:06}")
        with open_window(root, home) as (display, _, window):
            def until(text, *words):
                """Tries again until the instrument has seen it: a click or a key before the window is ready goes nowhere."""
                end = time.monotonic() + PATIENCE
                while text not in said.read_text():
                    assert time.monotonic() < end, f"{text}: not in {said.read_text()}"
                    run("xdotool", *words, DISPLAY=display.name)
                    pause = time.monotonic() + 2
                    while text not in said.read_text() and time.monotonic() < pause:
                        time.sleep(0.05)

            run("xdotool", "windowmove", window, 0, 0, "windowsize", window, 750, 480, "windowfocus", window, DISPLAY=display.name)
            until(" -- connected", "mousemove", 364, 90, "click", 1)
            run("xdotool", "mousemove", 490, 170, "click", 1, "key", "ctrl+a", "type", "*IDN?\\n", DISPLAY=display.name)
            until("-> *IDN?", "mousemove", 591, 200, "click", 1)
            wait_for("the answer", lambda: "<- Oltrava,KyVisaSimulator," in said.read_text())
        print("".join(line for line in said.read_text().splitlines(True) if "IDN?" in line or "<- " in line), end="")


def asks(root, program):
    with simulator(root, "--profile", "multimeter") as (resource, _):
        answer = run(program, resource, LD_LIBRARY_PATH=str(library_folder(root)))
        identification = pathlib.Path(root / "share/kyvisa/profiles/multimeter.json").read_text()
        model = re.search(r'"model"\s*:\s*"([^"]+)"', identification)[1]
        assert model in answer, (answer, model)


def with_pkg_config(root, sources):
    files_of_pkg_config = str(library_folder(root) / "pkgconfig")
    assert run("pkg-config", "--modversion", "kyvisa", PKG_CONFIG_PATH=files_of_pkg_config).strip() == "5.8.6"
    flags = run("pkg-config", "--cflags", "--libs", "kyvisa", PKG_CONFIG_PATH=files_of_pkg_config).split()
    examples = sorted((root / "share/doc/libkyvisa-dev/examples").glob("*.c"))
    assert examples
    with tempfile.TemporaryDirectory() as folder:
        for source in [*examples, pathlib.Path(sources) / "query.c"]:
            run("cc", *WARNINGS, source, "-o", f"{folder}/{source.stem}", *flags)
        asks(root, f"{folder}/query")


def with_cmake(root, sources):
    with tempfile.TemporaryDirectory() as folder:
        run("cmake", "-G", "Ninja", "-S", sources, "-B", folder, f"-DCMAKE_PREFIX_PATH={root}")
        run("cmake", "--build", folder)
        used = pathlib.Path(folder, "CMakeCache.txt").read_text()
        assert str(root) in re.search(r"^KyVisa_DIR:\w+=(.*)$", used, re.M)[1], used
        asks(root, f"{folder}/query")


if case == "install":
    install(*arguments)
else:
    stage, prefix, *rest = arguments
    place = pathlib.Path(stage).resolve() / prefix.lstrip("/")
    {"files": files, "tester": tester, "session": session, "pkg-config": with_pkg_config, "cmake": with_cmake}[case](place, *rest)
