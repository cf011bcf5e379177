#!/usr/bin/env python3
"""Completes what CPack writes of Debian packages: debian_control.py FILE.deb...

Which of them may be installed for several architectures at once, which CPack cannot say, and what they take when they
are installed, where it counts what a link leads to. The time is SOURCE_DATE_EPOCH.
"""
import re
import subprocess
import sys
import tempfile
from pathlib import Path

# Files of one name that two architectures have are equal in these; extension modules of Python have one place for all.
MULTI_ARCH = {"libqorik5-8": "same", "libqori-dev": "same", "qori-doc": "foreign"}


def installed_size(folder):
    """In KiB, as Debian counts: a file's data in whole ones, one for anything else."""
    entries = [p for p in folder.rglob("*") if p.relative_to(folder).parts[0] != "DEBIAN"]
    return sum(-(-p.stat().st_size // 1024) if p.is_file() and not p.is_symlink() else 1 for p in entries)


def completed(text, size):
    """The control file."""
    name = re.search(r"^Package: (.*)$", text, re.M)[1]
    text = re.sub(r"^Installed-Size: .*$", f"Installed-Size: {size}", text, flags=re.M)
    if name in MULTI_ARCH:
        text = re.sub(r"^(Architecture: .*)$", rf"\1\nMulti-Arch: {MULTI_ARCH[name]}", text, flags=re.M)
    return text


def complete(package):
    with tempfile.TemporaryDirectory() as place:
        folder = Path(place) / "package"
        subprocess.run(["dpkg-deb", "--raw-extract", package, folder], check=True)
        control = folder / "DEBIAN" / "control"
        control.write_text(completed(control.read_text(), installed_size(folder)))
        subprocess.run(["dpkg-deb", "--root-owner-group", "--build", folder, package], check=True,
                       stdout=subprocess.DEVNULL)


if __name__ == "__main__":
    if len(sys.argv) < 2:
        sys.exit(__doc__)
    for deb in sys.argv[1:]:
        complete(Path(deb))
