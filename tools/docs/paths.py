"""Places that the tools of the documentation share."""
import os
import sys
from pathlib import Path

ROOT = Path(__file__).resolve().parents[2]
sys.path.insert(0, str(ROOT / "tools"))
BUILD = ROOT / "build" / "linux"
LIBRARY = Path(os.environ.get("QORI_DOCS_LIBRARY", BUILD / "bin" / "libqorik5.so"))
PACKAGE = Path(os.environ.get("QORI_DOCS_PACKAGE", BUILD / "python"))
DEMO = BUILD / "bin" / "demo"
PHOTOGRAPH = ROOT / "build" / "photograph" / "photograph.jpg"
TYPEFACE = Path("/usr/share/fonts/truetype/dejavu/DejaVuSans.ttf")
