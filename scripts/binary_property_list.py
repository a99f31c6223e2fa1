"""Writes a property list again in its binary form, in the same order. Usage: binary_property_list.py FROM TO"""

import plistlib
import sys
from pathlib import Path

if __name__ == "__main__":
    source, target = map(Path, sys.argv[1:])
    target.write_bytes(plistlib.dumps(plistlib.loads(source.read_bytes()), fmt=plistlib.FMT_BINARY, sort_keys=False))
