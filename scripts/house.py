#!/usr/bin/env python3
"""Measures the house: how long functions and files are, and which file-local functions only one place uses.

    scripts/house.py [--list] [FOLDER...]

Without folders it measures everything that is shipped, folder by folder and together. A file-local function is one in
an unnamed namespace; it is used at one place where its name stands once in its file beside its definition and its
declarations. With --list it names those functions and the files below 25 lines. Needs universal-ctags.
"""

import argparse
import json
import re
import statistics
import subprocess
import sys
from collections import Counter, namedtuple
from pathlib import Path

TREE = Path(__file__).resolve().parent.parent
NOT_SHIPPED = {"bench", "examples", "fuzz", "tests"}
SMALL = 25

Function = namedtuple("Function", "path name lines is_local uses")
Source = namedtuple("Source", "path lines functions")

# Comments, then literals, raw ones first; what stands in them is no use of anything.
NO_CODE = re.compile(
    r'//[^\n]*|/\*.*?\*/|R"(?P<end>[^(]*)\(.*?\)(?P=end)"|"(?:\\.|[^"\\\n])*"|(?<![0-9a-fA-F])\'(?:\\.|[^\'\\\n])+\'', re.DOTALL
)


def shipped_folders():
    names = {path.split("/")[0] for path in tracked("*.h", "*.cpp") if "/" in path}
    return sorted(names - NOT_SHIPPED)


def tracked(*patterns):
    listing = subprocess.run(
        ["git", "-C", TREE, "ls-files", "--cached", "--others", "--exclude-standard", "--", *patterns],
        check=True, capture_output=True, text=True,
    ).stdout
    return [path for path in listing.splitlines() if (TREE / path).is_file()]


def tags_of(paths):
    command = ["ctags", "--output-format=json", "--languages=C++", "--langmap=C++:.h.cpp", "--kinds-C++=fp",
               "--fields=+neS", "-I", "ACCOUNT_EXPORT", "-L", "-"]
    output = subprocess.run(command, cwd=TREE, input="\n".join(paths), check=True, capture_output=True, text=True).stdout
    return [json.loads(line) for line in output.splitlines()]


def is_free_and_local(tag):
    return "__anon" in tag.get("scope", "") and tag.get("scopeKind") == "namespace"


def measured(paths):
    tags_by_path = {path: [] for path in paths}
    for tag in tags_of(paths):
        tags_by_path[tag["path"]].append(tag)
    return [measured_source(path, tags) for path, tags in tags_by_path.items()]


def measured_source(path, tags):
    text = (TREE / path).read_text(encoding="utf-8")
    words = Counter(re.findall(r"\w+", NO_CODE.sub(" ", text)))
    named = [tag for tag in tags if not tag["name"].startswith("__anon")]
    standing = Counter(tag["name"] for tag in named)
    definitions = [tag for tag in named if tag["kind"] == "function"]
    functions = [
        Function(path, tag["name"], tag.get("end", tag["line"]) - tag["line"] + 1, is_free_and_local(tag),
                 words[tag["name"]] - standing[tag["name"]])
        for tag in definitions
    ]
    return Source(path, text.count("\n"), functions)


def percent(part, whole):
    return f"{part} ({100 * part / whole:.0f} %)" if whole else "0"


def row_for(name, sources):
    functions = [function for source in sources for function in source.functions]
    lengths = sorted(function.lines for function in functions) or [0]
    local = [function for function in functions if function.is_local]
    return [
        name, len(sources), sum(source.lines for source in sources),
        percent(len(small_files(sources)), len(sources)), len(functions), f"{statistics.median(lengths):g}",
        lengths[(len(lengths) * 9) // 10], lengths[-1], len(local), percent(len(used_once(sources)), len(local)),
    ]


def small_files(sources):
    return [source for source in sources if source.lines < SMALL]


def used_once(sources):
    return [function for source in sources for function in source.functions if function.is_local and function.uses == 1]


def print_table(rows):
    heading = ["folder", "files", "lines", f"files < {SMALL}", "functions", "median", "p90", "max", "local", "used once"]
    widths = [max(len(str(cell)) for cell in column) for column in zip(heading, *rows)]
    for row in [heading, *rows]:
        print("  ".join(str(cell).ljust(width) for cell, width in zip(row, widths)).rstrip())


def print_list(sources):
    print()
    for source in small_files(sources):
        print(f"{source.path}: {source.lines} lines")
    for function in used_once(sources):
        print(f"{function.path}: {function.name} is used once")


def main():
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    parser.add_argument("--list", action="store_true", help="name the small files and the functions that are used once")
    parser.add_argument("folders", nargs="*", metavar="FOLDER")
    arguments = parser.parse_args()
    folders = arguments.folders or shipped_folders()
    by_folder = {folder: measured(tracked(f"{folder}/*.h", f"{folder}/*.cpp")) for folder in folders}
    everything = [source for sources in by_folder.values() for source in sources]
    if not everything:
        sys.exit("house.py: no sources in " + ", ".join(folders))
    print_table([row_for(*each) for each in by_folder.items()] + [row_for("together", everything)])
    if arguments.list:
        print_list(everything)


if __name__ == "__main__":
    main()
