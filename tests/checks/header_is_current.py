"""The committed header is what the registry says."""
import subprocess
import sys
import tempfile
from pathlib import Path

root = Path(sys.argv[1])
with tempfile.TemporaryDirectory() as folder:
    fresh = Path(folder) / "qori.h"
    subprocess.run([sys.executable, root / "tools" / "apigen.py", "header", fresh], check=True)
    if fresh.read_text() != (root / "include" / "qori.h").read_text():
        sys.exit("include/qori.h is out of date: build the target `header`")
