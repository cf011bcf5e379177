"""The shared library defines exactly the registry's names and needs nothing but the C library and the companion."""
import re
import subprocess
import sys
from pathlib import Path

library, list_file = sys.argv[1:]
expected = Path(list_file).read_text().split()
names = sorted(line.split()[-1].split("@")[0] for line in subprocess.run(
    ["nm", "-D", "--defined-only", library], check=True, capture_output=True, text=True).stdout.splitlines())
if names != expected:
    sys.exit(f"missing {sorted(set(expected) - set(names))[:5]}, extra {sorted(set(names) - set(expected))[:5]}")
needed = re.findall(r"\(NEEDED\).*\[(.*)\]", subprocess.run(
    ["readelf", "-d", library], check=True, capture_output=True, text=True).stdout)
if "libqorcore.so.8" not in needed or set(needed) - {"libqorcore.so.8", "libc.so.6", "libm.so.6"}:
    sys.exit(f"needs {needed}")
print(f"{len(names)} exports, needs {', '.join(needed)}")
