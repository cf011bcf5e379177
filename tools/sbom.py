#!/usr/bin/env python3
"""Writes the bill of materials of a package as an SPDX 2.3 document (JSON).

    sbom.py FOLDER FILE NAME VERSION [DEBIAN-PACKAGE...]

Lists every file under FOLDER with its digests, but FILE itself, which lies there too. Binaries load the system's C
library; of DEBIAN-PACKAGEs, installed here, code has been linked into them. The time is SOURCE_DATE_EPOCH and the source
SOURCE_COMMIT, so that equal packages have equal bills.
"""
import hashlib
import json
import os
import re
import subprocess
import sys
import uuid
from datetime import datetime, timezone
from pathlib import Path

LICENCE = "Apache-2.0"
DEVELOPERS = "Organization: qori developers"
# What the tool chains for Windows link in.
LICENCES = {"gcc": "GPL-3.0-or-later WITH GCC-exception-3.1", "mingw": "ZPL-2.1"}


def identifier(text):
    return "SPDXRef-" + re.sub(r"[^A-Za-z0-9.]+", "-", text)


def file_entry(folder, path):
    data = path.read_bytes()
    relative = path.relative_to(folder).as_posix()
    return {
        "SPDXID": identifier("File-" + relative), "fileName": "./" + relative,
        "checksums": [{"algorithm": name.upper(), "checksumValue": hashlib.new(name, data).hexdigest()}
                      for name in ("sha1", "sha256")],
        "licenseConcluded": LICENCE, "licenseInfoInFiles": ["NOASSERTION"], "copyrightText": "NOASSERTION",
    }


def package_entry(name, version, licence, supplier):
    return {"SPDXID": identifier("Package-" + name), "name": name, "versionInfo": version, "supplier": supplier,
            "downloadLocation": "NOASSERTION", "filesAnalyzed": False, "licenseConcluded": licence,
            "licenseDeclared": licence, "copyrightText": "NOASSERTION"}


def linked_package(name):
    version = subprocess.run(["dpkg-query", "-W", "-f", "${Version}", name], check=True, capture_output=True,
                             text=True).stdout
    return package_entry(name, version, LICENCES[name.split("-")[0]], "Organization: Debian")


def document(folder, file, name, version, linked):
    paths = sorted(p for p in folder.rglob("*") if p.is_file() and not p.is_symlink() and p != file)
    files = [file_entry(folder, path) for path in paths]
    # One digest for all files: that of their sorted digests.
    sums = "".join(sorted(entry["checksums"][0]["checksumValue"] for entry in files))
    product = package_entry(name, version, LICENCE, DEVELOPERS) | {
        "filesAnalyzed": True, "sourceInfo": f"commit {os.environ['SOURCE_COMMIT']}",
        "packageVerificationCode": {"packageVerificationCodeValue": hashlib.sha1(sums.encode()).hexdigest()},
        "licenseInfoFromFiles": ["NOASSERTION"], "hasFiles": [entry["SPDXID"] for entry in files]}
    others = [linked_package(package) for package in linked]
    related = [("SPDXRef-DOCUMENT", "DESCRIBES", product["SPDXID"])]
    related += [(product["SPDXID"], "STATIC_LINK", other["SPDXID"]) for other in others]
    created = datetime.fromtimestamp(int(os.environ["SOURCE_DATE_EPOCH"]), timezone.utc)
    return {
        "spdxVersion": "SPDX-2.3", "dataLicense": "CC0-1.0", "SPDXID": "SPDXRef-DOCUMENT", "name": f"{name}-{version}",
        "documentNamespace": "urn:uuid:" + str(uuid.uuid5(uuid.NAMESPACE_OID, json.dumps([product, others, files]))),
        "creationInfo": {"created": created.strftime("%Y-%m-%dT%H:%M:%SZ"), "creators": [DEVELOPERS, "Tool: sbom.py"]},
        "packages": [product, *others], "files": files,
        "relationships": [{"spdxElementId": a, "relationshipType": how, "relatedSpdxElement": b} for a, how, b in related],
    }


def write(folder, file, name, version, linked=()):
    file.write_text(json.dumps(document(folder, file, name, version, linked), indent=1) + "\n")


if __name__ == "__main__":
    if len(sys.argv) < 5:
        sys.exit(__doc__)
    write(Path(sys.argv[1]), Path(sys.argv[2]), sys.argv[3], sys.argv[4], sys.argv[5:])
