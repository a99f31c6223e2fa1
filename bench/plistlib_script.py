"""What a script would take that merely loads and dumps the settings file. Usage: FILE LOADS DUMPS"""

import json
import plistlib
import sys
import time
from pathlib import Path

path, loads, dumps = Path(sys.argv[1]), int(sys.argv[2]), int(sys.argv[3])
start, processor_start = time.monotonic(), time.process_time()
for _ in range(loads):
    values = plistlib.loads(path.read_bytes())
for _ in range(dumps):
    temporary = path.with_suffix(".new")
    temporary.write_bytes(plistlib.dumps(values, fmt=plistlib.FMT_BINARY, sort_keys=False))
    temporary.rename(path)
print(json.dumps({"seconds": time.monotonic() - start, "processorSeconds": time.process_time() - processor_start}))
