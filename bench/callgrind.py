"""Instructions that a program takes outside one library, counted by callgrind."""

import re
import subprocess
import tempfile
from pathlib import Path

_NAME = re.compile(r"\((\d+)\)(?: (.*))?$")


class _Names:
    """Callgrind writes a name once and then its number."""

    def __init__(self):
        self._known = {}

    def resolve(self, text):
        number, name = _NAME.match(text).groups()
        if name is not None:
            self._known[number] = name
        return self._known[number]


def instructions(profile, library):
    """The instructions of a profile: all of them, and those spent in calls from elsewhere into the library."""
    objects = _Names()
    total = inside = 0
    here = callee = ""
    is_call = False
    for line in profile.read_text().splitlines():
        if line.startswith("ob="):
            here = objects.resolve(line[3:])
        elif line.startswith("cob="):
            callee = objects.resolve(line[4:])
        elif line.startswith("fn="):
            callee = here
        elif line.startswith("calls="):
            is_call = True
        elif line[:1].isdigit() or line[:1] in "+-*":
            cost = int(line.split()[1]) if len(line.split()) > 1 else 0
            if not is_call:
                total += cost
            elif library in callee and library not in here:
                inside += cost
            if is_call:
                is_call, callee = False, here
    return total, inside


def of_pieces(program, names, populations, library):
    """For each named piece, or every one, its instructions outside the library on each population."""
    chosen = [option for name in names for option in ("--piece", name)]
    listed = subprocess.run([program, *chosen], check=True, capture_output=True, text=True).stdout.splitlines()
    parts = outside(
        library, [program, *chosen, *populations], "--toggle-collect=measuredPiece", "--dump-after=measuredPiece"
    )[1:]
    if len(parts) != len(listed) * len(populations):
        raise RuntimeError(f"{len(parts)} parts were counted, not {len(populations)} for each of {len(listed)} pieces")
    return {name: parts[index * len(populations) :][: len(populations)] for index, name in enumerate(listed)}


def outside(library, command, *options):
    """Runs the command under callgrind; answers the instructions outside the library, by part where it dumps several."""
    with tempfile.TemporaryDirectory() as directory:
        out = Path(directory) / "profile"
        subprocess.run(
            ["valgrind", "--tool=callgrind", f"--callgrind-out-file={out}", *options, *map(str, command)],
            check=True, capture_output=True,
        )
        parts = sorted(Path(directory).iterdir(), key=lambda part: (len(part.name), part.name))
        counts = [instructions(part, library) for part in parts]
    return [total - inside for total, inside in counts]
