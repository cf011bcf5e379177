#!/usr/bin/env python3
"""Puts into a Debian package's folder what every package has: change log, licence, bill of materials.

    debian_documents.py FOLDER PACKAGE VERSION RELEASE MAINTAINER

FOLDER holds the files as they will be installed, usr/ and so on. The time is SOURCE_DATE_EPOCH.
"""
import gzip
import os
import re
import subprocess
import sys
import textwrap
from datetime import datetime, timezone
from pathlib import Path

ROOT = Path(__file__).resolve().parent.parent
sys.path.insert(0, str(ROOT / "tools"))
import sbom  # noqa: E402

COPYRIGHT = """qori: image-processing primitives

Copyright: 2026 the qori developers
License: Apache-2.0

On Debian systems the text of this licence is in /usr/share/common-licenses/Apache-2.0.
"""


def changes(version):
    """The entries of CHANGELOG.md for a version, each a line."""
    text = (ROOT / "CHANGELOG.md").read_text()
    section = re.search(rf"^## {re.escape(version)}\b.*?\n(.*?)(?=^## |\Z)", text, re.MULTILINE | re.DOTALL)
    if section is None:
        sys.exit(f"debian_documents: CHANGELOG.md says nothing of {version}")
    entries, line = [], ""
    for line in section[1].splitlines():
        if line.startswith("- "):
            entries.append(line[2:])
        elif line.startswith("  ") and entries:
            entries[-1] += " " + line.strip()
    return entries


def change_log(version, release, maintainer):
    date = datetime.fromtimestamp(int(os.environ["SOURCE_DATE_EPOCH"]), timezone.utc)
    lines = [f"qori ({version}-{release}) unstable; urgency=medium", ""]
    for entry in changes(version):
        lines += textwrap.wrap(entry, 78, initial_indent="  * ", subsequent_indent="    ")
    return "\n".join(lines + ["", f" -- {maintainer}  {date:%a, %d %b %Y %H:%M:%S +0000}", ""])


def main(folder, package, version, release, maintainer):
    documents = Path(folder) / "usr" / "share" / "doc" / package
    documents.mkdir(parents=True, exist_ok=True)
    log = gzip.compress(change_log(version, release, maintainer).encode(), 9, mtime=0)
    (documents / "changelog.Debian.gz").write_bytes(log)
    (documents / "copyright").write_text(COPYRIGHT)
    # Packages of two architectures share this folder, and what they say of their libraries differs.
    machine = ""
    if (Path(folder) / "usr" / "lib").exists():
        machine = "_" + subprocess.run(["dpkg", "--print-architecture"], check=True, capture_output=True,
                                       text=True).stdout.strip()
    sbom.write(Path(folder), documents / f"{package}{machine}.spdx.json", package, f"{version}-{release}")
    for path in [documents, *documents.iterdir()]:
        path.chmod(0o755 if path.is_dir() else 0o644)


if __name__ == "__main__":
    if len(sys.argv) != 6:
        sys.exit(__doc__)
    main(*sys.argv[1:])
