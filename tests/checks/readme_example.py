"""Writes the C example of the README to a file, for the build to compile and the tests to run."""
import re
import sys
from pathlib import Path

readme, target = map(Path, sys.argv[1:])
blocks = re.findall(r"```c\n(.*?)```", readme.read_text(), re.S)
programs = [b for b in blocks if "int main" in b]
if len(programs) != 1:
    sys.exit(f"{readme} has {len(programs)} C programs, not one")
target.write_text(programs[0])
