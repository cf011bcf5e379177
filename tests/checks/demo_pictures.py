"""Runs the demo on pictures that many panels are too small for, and on files that are no pictures: a sheet or a reason."""
import re
import struct
import subprocess
import sys
import tempfile
from pathlib import Path

demo, typeface = sys.argv[1:]
folder = Path(tempfile.mkdtemp())


def run(picture, sheet):
    return subprocess.run([demo, picture, sheet, typeface], capture_output=True, text=True)


for width, height in ((1, 1), (2, 3), (24, 24), (64, 64), (72, 73), (40, 4000), (4000, 7), (301, 200)):
    picture, sheet = folder / "picture.ppm", folder / "sheet.png"
    pixels = bytes((x * 5 + y * 3 + 40 * c) % 256 for y in range(height) for x in range(width) for c in range(3))
    picture.write_bytes(b"P6 %d %d 255\n" % (width, height) + pixels)
    sheet.unlink(missing_ok=True)
    done = run(picture, sheet)
    name = f"{width} x {height}"
    if done.returncode != 0 or done.stderr:
        sys.exit(f"{name}: status {done.returncode}, {done.stderr.strip()}")
    data = sheet.read_bytes()
    if data[:8] != b"\x89PNG\r\n\x1a\n" or struct.unpack(">I", data[16:20])[0] < 1000:
        sys.exit(f"{name}: the sheet is no PNG")
    panels = re.findall(r"^ *\d+/(\d+) .*(Mpix/s|left out: wants (\d+) x (\d+) pixels)", done.stdout, re.M)
    if not panels or len(panels) != int(panels[0][0]):
        sys.exit(f"{name}: a panel says nothing:\n{done.stdout}")
    for _, _, least_width, least_height in panels:
        if least_width and width >= int(least_width) and height >= int(least_height):
            sys.exit(f"{name}: a panel is left out that {least_width} x {least_height} pixels are enough for")

(folder / "text.png").write_text("no picture")
for picture, sheet in (("text.png", "sheet.png"), ("missing.png", "sheet.png"), ("picture.ppm", "missing/sheet.png")):
    done = run(folder / picture, folder / sheet)
    if done.returncode != 1 or "demo: cannot" not in done.stderr:
        sys.exit(f"{picture} to {sheet}: status {done.returncode}, {done.stderr!r}")
