#!/usr/bin/env python3
"""Shows Doxygen a header as the house's readers read it: a comment above declarations is about each of them, down to the
next empty line or comment, and one behind a declaration is about that. What begins with a declaration that is marked as
internal is left out, down to the next empty line.

    reference/filter.py HEADER
"""

import re
import sys
from pathlib import Path

SHARED = ("///@{", "///@}")
LEFT_OUT = ("/// @cond", "/// @endcond")


def with_marks(line):
    """The line with its comment, if it has one, as Doxygen knows comments; one that only parts sections is left out."""
    if re.match(r"\s*/\* --- .* --- \*/$", line):
        return ""
    line = re.sub(r"^(\s*)//(?!/)", r"\1///", line)
    line = re.sub(r"^(\s*)/\*(?!\*)", r"\1/**", line)
    line = re.sub(r"(\S.*?\s)//(?![/<])", r"\1///<", line)
    return re.sub(r"(\S.*?\s)/\*(?!\*)(?=.*\*/)", r"\1/**<", line)


def is_comment(line):
    return re.match(r"\s*(//|/\*|\*)", line) is not None


def runs_in(lines):
    """The lines in runs: a comment with what follows it, or whatever stands between empty lines and comments."""
    run = []
    for line in lines:
        begins = not line.strip() or (is_comment(line) and run and not is_comment(run[-1]))
        if begins and run:
            yield run
            run = []
        run.append(line)
    yield run


def declares_several(run):
    code = [re.sub(r"\s*//.*", "", line) for line in run if not is_comment(line)]
    text = "\n".join(code)
    if not is_comment(run[0]) or text.count("{") != text.count("}") or re.search(r"^ *(public|private|protected):", text, re.M):
        return False
    return sum(line.endswith((";", "}")) for line in code) > 1


def brackets_for(run):
    if any(line.endswith("// internal") for line in run):
        return LEFT_OUT
    return SHARED if declares_several(run) else None


def shown(text):
    for run in runs_in(text.splitlines()):
        marked = [with_marks(line) for line in run]
        brackets = brackets_for(run)
        yield from [brackets[0], *marked, brackets[1]] if brackets else marked


if __name__ == "__main__":
    print("/// @file\n")  # without it, nothing that stands in no class or namespace would be shown
    print("\n".join(shown(Path(sys.argv[1]).read_text(encoding="utf-8"))))
