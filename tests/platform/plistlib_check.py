"""Reads every N.plist of a directory with plistlib and compares it with N.txt; then writes it as N.binary and N.xml."""

import datetime
import math
import pathlib
import plistlib
import struct
import sys

EPOCH = datetime.datetime(2001, 1, 1)


def bits(real):
    return "nan" if math.isnan(real) else struct.pack(">d", real).hex()


def dump(value):
    if isinstance(value, str):
        return "s:" + value.encode().hex()
    if isinstance(value, bool):
        return "b:1" if value else "b:0"
    if isinstance(value, int):
        return f"i:{value}"
    if isinstance(value, float):
        return "r:" + bits(value)
    if isinstance(value, datetime.datetime):
        return "d:" + bits((value - EPOCH) / datetime.timedelta(seconds=1))
    if isinstance(value, bytes):
        return "x:" + value.hex()
    if isinstance(value, plistlib.UID):
        return f"u:{value.data}"
    if isinstance(value, list):
        return "[" + "".join(dump(element) + "," for element in value) + "]"
    return "{" + "".join(key.encode().hex() + "=" + dump(element) + ";" for key, element in value.items()) + "}"


def check(file):
    value = plistlib.loads(file.read_bytes())
    expected = file.with_suffix(".txt").read_text()
    if dump(value) != expected:
        print(f"{file.name}: {dump(value)}\nexpected {expected}", file=sys.stderr)
        return False
    file.with_suffix(".binary").write_bytes(plistlib.dumps(value, fmt=plistlib.FMT_BINARY, sort_keys=False))
    try:
        file.with_suffix(".xml").write_bytes(plistlib.dumps(value, sort_keys=False))
    except (TypeError, ValueError):
        pass  # UIDs and control characters have no XML form
    return True


if __name__ == "__main__":
    results = [check(file) for file in sorted(pathlib.Path(sys.argv[1]).glob("*.plist"))]
    sys.exit(0 if results and all(results) else 1)
