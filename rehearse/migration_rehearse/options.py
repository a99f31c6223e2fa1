"""The command line of migration-rehearse."""

import argparse
import os
import sys
from pathlib import Path

from migration_rehearse.host import Limits
from migration_rehearse.unpacking import Bounds

COMMANDS = ("merge", "report", "compare", "anonymise")
RESULTS = "rehearsals.sqlite"
WORKERS_A_CORE = 2  # while one waits for a disk, for its archive or for its host, another has the core
STATUSES = """\
Exit status: 0 nothing is lost, 1 accounts are lost, not saved or not migrated, 2 wrong use, 3 some images could not be
rehearsed (whatever came of the others), 4 the result file could not be written: what is in it is whole, and the same
command goes on from there; 5 the host, the scheduler or the temporary directory cannot be used, 130 interrupted."""
DESCRIPTION = """\
Rehearses a release of the account migration over many device images, none of which is changed.

  migration-rehearse [OPTION]... IMAGE...    rehearse images: directories, and archives in tar or zip
  migration-rehearse merge FILE FILE...      add the results of the others to the first file
  migration-rehearse report FILE             make a page of the results
  migration-rehearse compare OLD NEW         tell which devices end differently under another release
  migration-rehearse anonymise IMAGE         make an archive for sharing, without personal data
"""
UNITS = {"": 1, "k": 1 << 10, "m": 1 << 20, "g": 1 << 30, "t": 1 << 40}


def wrong(text, what):
    return argparse.ArgumentTypeError(f"{text} is no {what}")


def size(text):
    """A number of bytes, with K, M, G or T after it."""
    unit = text[-1:].lower()
    number, factor = (text[:-1], UNITS[unit]) if unit in UNITS and unit else (text, 1)
    if not number.isdigit():
        raise wrong(text, "size; examples are 512M and 2G")
    return int(number) * factor


def as_size(number):
    """What `size` reads as this number."""
    unit, factor = max((each for each in UNITS.items() if number % each[1] == 0), key=lambda each: each[1])
    return f"{number // factor}{unit.upper()}"


def shard(text):
    number, slash, shards = text.partition("/")
    if not slash or not number.isdigit() or not shards.isdigit() or not 1 <= int(number) <= int(shards):
        raise wrong(text, "shard; examples are 1/8 and 8/8")
    return int(number), int(shards)


def positive(text):
    if not text.isdigit() or int(text) < 1:
        raise wrong(text, "number from 1")
    return int(text)


def seconds(text):
    try:
        number = float(text)
    except ValueError:
        number = -1
    if not 0 <= number < 1e9:
        raise wrong(text, "number of seconds")
    return number


class Parser(argparse.ArgumentParser):
    """One that abbreviates nothing and says wrong use in one line."""

    def __init__(self, **more):
        super().__init__(allow_abbrev=False, add_help=False, formatter_class=argparse.RawDescriptionHelpFormatter, **more)

    def error(self, message):
        self.exit(2, f"{self.prog}: {message} (see --help)\n")


def parser(command, version, description, **more):
    prog = "migration-rehearse" + (f" {command}" if command else "")
    made = Parser(prog=prog, description=description, **more)
    made.add_argument("--help", "-h", action="help", help="print this text")
    made.add_argument("--version", action="version", version=f"migration-rehearse {version}", help="print the version")
    return made


def installed_host():
    """The host that stands beside this program, else the one on the path."""
    beside = Path(sys.argv[0]).resolve().parent / "migration-host"
    return str(beside) if os.access(beside, os.X_OK) else "migration-host"


def add_host_options(made):
    made.add_argument("--host", metavar="PROGRAM", default=installed_host(), help="the migration-host that rehearses")
    made.add_argument("--plugin", metavar="FILE", default="", help="the plug-in, in place of the installed one")
    made.add_argument("--resources", metavar="DIR", default="", help="its resources, in place of the installed ones")


def run_parser(version):
    made = parser("", version, DESCRIPTION, epilog=STATUSES)
    made.add_argument("images", metavar="IMAGE", nargs="*", help="a device's file tree, or an archive of one")
    made.add_argument("--list", metavar="FILE", action="append", default=[],
                      help="images, one path a line; - is standard input")
    made.add_argument("--null", action="store_true", help="paths in lists end with a zero byte, not with the line")
    made.add_argument("--results", metavar="FILE", default=RESULTS, help=f"the result file (default: {RESULTS})")
    made.add_argument("--again", action="store_true", help="try those again that could not be rehearsed before")
    add_host_options(made)
    where = made.add_argument_group("where it is done")
    where.add_argument("--workers", metavar="N", type=positive, default=WORKERS_A_CORE * len(os.sched_getaffinity(0)),
                       help="processes of this machine (default: two for each core)")
    where.add_argument("--scheduler", metavar="ADDRESS", help="the workers of this Dask scheduler instead")
    where.add_argument("--shard", metavar="N/M", type=shard, default=(1, 1),
                       help="only the Nth of M parts of the images, the same in every call")
    add_limits(made)
    return made


def add_limits(made):
    limits, bounds = Limits(), Bounds()
    group = made.add_argument_group("limits, for each image")
    for name, metavar, reader, default, of_what in (
            ("--timeout", "SECONDS", seconds, limits.seconds, "of one rehearsal (default: {}; 0: none)"),
            ("--memory", "SIZE", size, limits.memory, "of one rehearsal (default: {}; 0: none)"),
            ("--max-output", "SIZE", size, limits.output, "of one explanation (default: {}; 0: none)"),
            ("--max-entries", "N", positive, bounds.entries, "of an archive (default: {})"),
            ("--max-size", "SIZE", size, bounds.size, "of an archive, unpacked (default: {})"),
            ("--max-ratio", "N", positive, bounds.ratio, "of an archive's size unpacked to its own (default: {})")):
        told = of_what.format(as_size(default) if reader is size else default)
        group.add_argument(name, metavar=metavar, type=reader, default=default, help=told)


def limits_of(options):
    return Limits(options.timeout, options.memory, options.max_output)


def bounds_of(options):
    return Bounds(options.max_entries, options.max_size, options.max_ratio)
