#!/usr/bin/env python3
"""Plants one fault at a time in a copy of the sources and expects the named test to go red.

    plant_faults.py [--only TEXT]      run from anywhere; builds natively under build/faults

A fault that no test notices means that the tests look away. tests/faults.toml lists the faults, some for each family:
a constant, a tail, a check, an order.
"""
import argparse
import filecmp
import shutil
import subprocess
import sys
import tomllib
from pathlib import Path

ROOT = Path(__file__).resolve().parent.parent
WORK = ROOT / "build" / "faults"


def run(*command, timeout=None):
    return subprocess.run(command, cwd=WORK / "tree", capture_output=True, text=True, timeout=timeout)


def refresh():
    """Files that differ are written anew, so that nothing built from a fault of a run that was stopped survives."""
    listed = subprocess.run(["git", "ls-files", "-z", "--cached", "--others", "--exclude-standard"], cwd=ROOT,
                            capture_output=True, text=True, check=True).stdout.split("\0")
    files = {Path(name) for name in listed if (ROOT / name).is_file()}
    tree = WORK / "tree"
    for old in [path for path in tree.rglob("*") if path.is_file()]:
        if old.relative_to(tree) not in files:
            old.unlink()
    for name in files:
        new, copy = ROOT / name, tree / name
        if not (copy.is_file() and filecmp.cmp(new, copy, shallow=False)):
            copy.parent.mkdir(parents=True, exist_ok=True)
            shutil.copyfile(new, copy)


def build(test):
    target = "qori_python" if test.endswith(".py") else test
    return run("cmake", "--build", str(WORK / "build"), "--target", target, "-j", "2")


def command(test):
    """A test program, or pytest with a file of the Python package."""
    folder = WORK / "build"
    if not test.endswith(".py"):
        return [str(folder / "tests" / "bin" / test), "--gtest_brief=1"]
    cache = (folder / "CMakeCache.txt").read_text()
    python = next(line.partition("=")[2] for line in cache.splitlines() if line.startswith("QORI_PYTHON:"))
    environment = f"PYTHONPATH={folder / 'python'}"
    return ["env", environment, python, "-m", "pytest", "-q", "-x", "-p", "no:cacheprovider", test]


def passes(test):
    try:
        return run(*command(test), timeout=1800).returncode == 0
    except subprocess.TimeoutExpired:
        return False   # a loop that does not end


def noticed(fault):
    """Whether the fault's test fails. A fault that does not build is an error of the list."""
    path = WORK / "tree" / fault["file"]
    text = path.read_text()
    if text.count(fault["find"]) != 1:
        sys.exit(f"{fault['file']}: `{fault['find']}` stands there {text.count(fault['find'])} times, not once")
    path.write_text(text.replace(fault["find"], fault["replace"]))
    try:
        built = build(fault["test"])
        if built.returncode:
            sys.exit(f"the fault does not build: {fault}\n{built.stdout[-2000:]}")
        return not passes(fault["test"])
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
    faults.sort(key=lambda fault: fault["file"])   # what a file is built into is rebuilt once more at most
    refresh()
    # Faults of logic show without much optimisation, which takes most of a build's time.
    configure = run("cmake", "-S", ".", "-B", str(WORK / "build"), "-G", "Ninja", "-DCMAKE_BUILD_TYPE=Release",
                    "-DCMAKE_CXX_FLAGS_RELEASE=-O1 -DNDEBUG", "-DQORI_BUILD_EXAMPLES=OFF",
                    "-DQORI_BUILD_PYTHON=ON")
    if configure.returncode:
        sys.exit(configure.stderr)
    for test in sorted({fault["test"] for fault in faults}):
        if build(test).returncode or not passes(test):
            sys.exit(f"{test} does not pass without a fault")
    missed = []
    for number, fault in enumerate(faults, 1):
        if noticed(fault):
            print(f"{number} of {len(faults)}: {fault['file']}: noticed", flush=True)
        else:
            missed.append(fault)
            print(f"NOT NOTICED by {fault['test']}: {fault['file']}: {fault['find']} -> {fault['replace']}", flush=True)
    print(f"{len(faults) - len(missed)} of {len(faults)} faults noticed")
    return 1 if missed else 0


if __name__ == "__main__":
    sys.exit(main())
