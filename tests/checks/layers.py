"""Includes of src/ point downwards only, and intrinsics stay in the kernels, but those of the control register."""
import pathlib
import re
import sys

SRC = pathlib.Path(sys.argv[1]) / "src"
# From the ground up. A folder includes itself and what stands below it; subsystems do not include each other.
GROUND = ["image", "kernels", "frame"]


def level(folder):
    return GROUND.index(folder) if folder in GROUND else len(GROUND)


def upward(file, folder):
    for included in re.findall(r'^#include "([a-z]+)/', file.read_text(), re.M):
        if (SRC / included).is_dir() and included != folder and level(included) >= level(folder):
            yield f"{file.relative_to(SRC)} includes {included}/"


def intrinsics(file, folder):
    if folder != "kernels" and (found := re.search(r"\b_mm(?!_[gs]etcsr\b)\w+", file.read_text())):
        yield f"{file.relative_to(SRC)} uses {found[0]}"


files = [f for f in SRC.rglob("*") if f.suffix in (".h", ".cpp")]
assert len(files) > 100, "the sources are elsewhere"
faults = [fault for f in files for check in (upward, intrinsics) for fault in check(f, f.relative_to(SRC).parts[0])]
sys.exit("\n".join(faults) or 0)
