"""The committed headers are what the registry says."""
import subprocess
import sys
import tempfile
from pathlib import Path

root = Path(sys.argv[1])
with tempfile.TemporaryDirectory() as folder:
    fresh = Path(folder) / "qori.h"
    subprocess.run([sys.executable, root / "tools" / "apigen.py", "header", fresh], check=True)
    for made in (fresh, fresh.with_suffix(".hpp")):
        if made.read_text() != (root / "include" / made.name).read_text():
            sys.exit(f"include/{made.name} is out of date: build the target `header`")
