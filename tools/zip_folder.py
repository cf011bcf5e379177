#!/usr/bin/env python3
"""Packs a folder into a zip file that depends on nothing but names, modes and bytes: zip_folder.py FOLDER FILE.zip

Entries are sorted and begin with the folder's own name; their time is SOURCE_DATE_EPOCH; symbolic links stay links.
"""
import os
import stat
import sys
import time
import zipfile
from pathlib import Path


def pack(folder, target):
    when = time.gmtime(int(os.environ["SOURCE_DATE_EPOCH"]))[:6]
    with zipfile.ZipFile(target, "w", zipfile.ZIP_DEFLATED, compresslevel=9) as archive:
        for path in sorted(folder.rglob("*")):
            if path.is_dir():
                continue
            entry = zipfile.ZipInfo(path.relative_to(folder.parent).as_posix(), when)
            entry.create_system = 3     # the modes below are those of Unix
            entry.compress_type = zipfile.ZIP_DEFLATED
            if path.is_symlink():
                entry.external_attr = (stat.S_IFLNK | 0o777) << 16
                archive.writestr(entry, os.readlink(path))
            else:
                mode = 0o755 if path.stat().st_mode & stat.S_IXUSR else 0o644
                entry.external_attr = (stat.S_IFREG | mode) << 16
                archive.writestr(entry, path.read_bytes())


if __name__ == "__main__":
    if len(sys.argv) != 3:
        sys.exit(__doc__)
    pack(Path(sys.argv[1]), Path(sys.argv[2]))
