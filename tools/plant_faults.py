#!/usr/bin/env python3
"""Plants one fault at a time in a copy of the sources and expects the named test to go red.

    plant_faults.py [--only TEXT]      run from anywhere; builds natively under build/faults

A fault that no test notices means that the tests look away. tests/faults.toml lists the faults, some for each family:
a constant, a tail, a check, an order.
"""
import argparse
import shutil
import subprocess
import sys
import tomllib
from pathlib import Path

ROOT = Path(__file__).resolve().parent.parent
WORK = ROOT / "build" / "faults"
PARTS = ["api", "bench", "cmake", "core", "examples", "include", "src", "tests", "tools", "CMakeLists.txt",
         "CMakePresets.json"]


def run(*command):
    return subprocess.run(command, cwd=WORK / "tree", capture_output=True, text=True)


def refresh(part):
    source, target = ROOT / part, WORK / "tree" / part
    if source.is_dir():
        shutil.copytree(source, target, dirs_exist_ok=True)
    else:
        shutil.copy2(source, target)


def noticed(fault):
    """Whether the fault's test fails. A fault that does not build is an error of the list."""
    path = WORK / "tree" / fault["file"]
    text = path.read_text()
    if text.count(fault["find"]) != 1:
        sys.exit(f"{fault['file']}: `{fault['find']}` stands there {text.count(fault['find'])} times, not once")
    path.write_text(text.replace(fault["find"], fault["replace"]))
    try:
        build = run("cmake", "--build", str(WORK / "build"), "--target", fault["test"], "-j", "2")
        if build.returncode:
            sys.exit(f"the fault does not build: {fault}\n{build.stdout[-2000:]}")
        return run(str(WORK / "build" / "tests" / "bin" / fault["test"]), "--gtest_brief=1").returncode != 0
    finally:
        path.write_text(text)


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("--only", default="", help="only faults whose file or test contains this")
    only = parser.parse_args().only
    faults = tomllib.loads((ROOT / "tests" / "faults.toml").read_text())["fault"]
    faults = [f for f in faults if only in f["file"] or only in f["test"]]
    if not faults:
        sys.exit("no such fault")
    (WORK / "tree").mkdir(parents=True, exist_ok=True)
    for part in PARTS:
        refresh(part)
    configure = run("cmake", "-S", ".", "-B", str(WORK / "build"), "-G", "Ninja", "-DCMAKE_BUILD_TYPE=Release",
                    "-DQORI_BUILD_EXAMPLES=OFF")
    if configure.returncode:
        sys.exit(configure.stderr)
    missed = [f for f in faults if not noticed(f)]
    for fault in missed:
        print(f"NOT NOTICED by {fault['test']}: {fault['file']}: {fault['find']} -> {fault['replace']}")
    print(f"{len(faults) - len(missed)} of {len(faults)} faults noticed")
    return 1 if missed else 0


if __name__ == "__main__":
    sys.exit(main())
