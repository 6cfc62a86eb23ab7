"""Checks that each wheel or sdist named carries the licence: the repository's LICENSE file, byte
for byte, where its kind of archive keeps it, and metadata that names MIT and that file.

    python3 tools/check_licence.py dist/logicalline-*.whl dist/logicalline-*.tar.gz
"""

import os
import sys
import tarfile
import zipfile

ROOT = os.path.dirname(os.path.dirname(os.path.abspath(__file__)))
EXPECTED_METADATA = ("License-Expression: MIT", "License-File: LICENSE")


def members(path):
    """Returns {name: bytes} of the archive's regular files."""
    if path.endswith(".whl"):
        with zipfile.ZipFile(path) as archive:
            return {name: archive.read(name) for name in archive.namelist()}
    with tarfile.open(path) as archive:
        return {member.name: archive.extractfile(member).read()
                for member in archive.getmembers() if member.isfile()}


def problems(path, licence):
    files = members(path)
    if path.endswith(".whl"):
        licences = [name for name in files if name.endswith(".dist-info/licenses/LICENSE")]
        metadata = [name for name in files if name.endswith(".dist-info/METADATA")]
    else:
        licences = [name for name in files if name.count("/") == 1 and name.endswith("/LICENSE")]
        metadata = [name for name in files if name.count("/") == 1 and name.endswith("/PKG-INFO")]
    if len(licences) != 1 or files[licences[0]] != licence:
        yield f"no LICENSE identical to the repository's (found: {licences or 'none'})"
    if len(metadata) != 1:
        yield f"not one metadata file (found: {metadata or 'none'})"
        return
    headers = files[metadata[0]].decode().split("\n\n")[0].splitlines()
    for line in EXPECTED_METADATA:
        if line not in headers:
            yield f"{metadata[0]} lacks {line!r}"


def main(paths):
    with open(os.path.join(ROOT, "LICENSE"), "rb") as handle:
        licence = handle.read()
    failed = False
    for path in paths:
        found = list(problems(path, licence))
        for problem in found:
            print(f"{path}: {problem}", file=sys.stderr)
        if not found:
            print(f"{path}: carries LICENSE (MIT)")
        failed = failed or bool(found)
    return 1 if failed or not paths else 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
