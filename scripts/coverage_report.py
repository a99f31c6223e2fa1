#!/usr/bin/env python3
"""Reports what the programs of a build tree with counters (preset `coverage`) executed of the product's sources.

    scripts/coverage_report.py TREE [FOLDER...]

Each file's lines and branches; for FOLDERs also every condition that was never true or never false. A branch is one of
the two ends of a condition, so those that the compiler adds for exceptions are none.
"""

import json
import os
import subprocess
import sys
from collections import defaultdict
from pathlib import Path

FOLDERS = ("accountsettings", "migrator", "platform", "host", "tools", "modules")


def has_counters(path):
    sections = subprocess.run(["readelf", "--section-headers", "--wide", path], capture_output=True, text=True).stdout
    return "__llvm_covmap" in sections


def measured(tree):
    """What llvm-cov says of each source, by its path."""
    profile = tree / "profiles" / "all.profdata"
    subprocess.run(["llvm-profdata-16", "merge", "-sparse", *tree.glob("profiles/*.profraw"), "-o", profile], check=True)
    programs = [path for path in tree.glob("**/*") if path.is_file() and not path.is_symlink() and os.access(path, os.X_OK)]
    objects = [word for path in programs if has_counters(path) for word in ("-object", path)]
    said = subprocess.run(["llvm-cov-16", "export", f"-instr-profile={profile}", *objects[1:]], check=True,
                          stdout=subprocess.PIPE).stdout
    return {os.path.realpath(each["filename"]): each for each in json.loads(said)["data"][0]["files"]}


def unreached_ends(source, branches):
    """Each condition of which one end was never reached, in any instance of its template."""
    ends = defaultdict(lambda: [0, 0])
    for line, column, _, end, true, false, *_ in branches:
        ends[line, column, end][0] += true
        ends[line, column, end][1] += false
    text = source.read_text().splitlines()
    for (line, column, end), counts in sorted(ends.items()):
        for answer, count in zip(("true", "false"), counts):
            if count == 0:
                yield f"{line}: never {answer}: {text[line - 1][column - 1:end - 1]}"


def row(name, lines, branches):
    share = " ".join(f"{covered:6} of {count:6} ({covered / max(1, count):7.2%})" for covered, count in (lines, branches))
    return f"{name:60} {share}"


def main():
    tree = Path(sys.argv[1]).absolute()
    root = Path(__file__).resolve().parent.parent
    print(f"{'':60} {'lines':>28} {'branches':>28}")
    files = measured(tree)
    for folder in sys.argv[2:] or FOLDERS:
        of_folder = {path: each for path, each in sorted(files.items()) if path.startswith(f"{root}/{folder}/")}
        sums = {kind: [sum(each["summary"][kind][count] for each in of_folder.values()) for count in ("covered", "count")]
                for kind in ("lines", "branches")}
        for path, each in of_folder.items():
            of_file = [[each["summary"][kind][count] for count in ("covered", "count")] for kind in ("lines", "branches")]
            print(row(os.path.relpath(path, root), *of_file))
            for end in unreached_ends(Path(path), each["branches"]) if len(sys.argv) > 2 else ():
                print(f"  {end}")
        print(row(f"{folder}, all", sums["lines"], sums["branches"]))


if __name__ == "__main__":
    main()
