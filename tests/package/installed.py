#!/usr/bin/env python3
"""Installs what was built below a folder that stands for the root, and tries it from there.

  installed.py install BUILD STAGE          installs afresh
  installed.py files STAGE PREFIX LIST      exactly the files of LIST are there
  installed.py tester STAGE PREFIX          the window opens on the installed library, with its icon, and closes
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

PATIENCE = 60  # seconds
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
    """The installed simulator; gives the resource string of its HiSLIP."""
    with subprocess.Popen([root / "bin/KyVisaSimulator", "--hislip", "0", *options], env=CLEAN, stdout=subprocess.PIPE, text=True) as process:
        try:
            lines = []
            while (line := process.stdout.readline().strip()) != "ready":
                assert line, lines
                lines.append(line)
            yield lines[0].split()[-1]
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


def tester(root):
    with tempfile.TemporaryDirectory() as home, VirtualDisplay() as display:
        os.mkdir(f"{home}/Documents")
        environment = CLEAN | {"HOME": home, "DISPLAY": display.name, "QT_QPA_PLATFORM": "xcb", "XDG_RUNTIME_DIR": home, "LC_ALL": "C.UTF-8"}
        program = subprocess.Popen([root / "bin/KyVisaTester"], env=environment)
        try:
            # Whose library it is stands in the title.
            window = wait_for("the window", lambda: display.window("KyVisaTester 5.8.6 Visa from Oltrava (5.8.6)"))
            used = set(re.findall(r"\S*/libkyvisa\.so", pathlib.Path(f"/proc/{program.pid}/maps").read_text()))
            assert used == {str(library_folder(root) / "libkyvisa.so")}, used
            assert sorted(display.icon_sizes(window)) == [32, 48, 64, 128], display.icon_sizes(window)
            display.close(window)
            assert program.wait(PATIENCE) == 0
        finally:
            program.kill()
            program.wait()


def asks(root, program):
    with simulator(root, "--profile", "multimeter") as resource:
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
    {"files": files, "tester": tester, "pkg-config": with_pkg_config, "cmake": with_cmake}[case](place, *rest)
