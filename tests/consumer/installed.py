"""Tries an installed Python package, with NumPy or without: installed.py [FOLDER]

The libraries have to come from FOLDER, or from beside the package.
"""
import sys
from importlib.metadata import version
from pathlib import Path

import qori

folder = Path(sys.argv[1]) if len(sys.argv) > 1 else Path(qori.__file__).parent
maps = Path("/proc/self/maps").read_text()
loaded = {Path(line.split()[-1]) for line in maps.splitlines() if "/libqor" in line}
if sorted(p.parent for p in loaded) != 2 * [folder.resolve()]:
    sys.exit(f"the libraries come from {sorted(map(str, loaded))}, not from {folder}")
if version("qori") != qori.__version__:
    sys.exit(f"the package says that it is {version('qori')}, the library {qori.__version__}")

picture = qori.empty((480, 640, 3))
qori.fill(picture, (40, 90, 200))
qori.add(picture, (30, 30, 100), out=picture)
small = qori.ResizePlan((480, 640), (240, 320), "lanczos3")(picture)
if tuple(small.shape) != (240, 320, 3) or tuple(map(round, qori.mean(small))) != (70, 120, 255):
    sys.exit(f"shape {small.shape}, means {qori.mean(small)}")
