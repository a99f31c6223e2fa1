#!/usr/bin/env python3
"""Writes copies of sources in which every mutant stands behind a switch, and beside each the list of its mutants.

    mutants.py --build DIRECTORY --to DIRECTORY SOURCE...

What is changed: a comparison becomes its neighbour, `&&` becomes `||`, a condition its opposite, a number the next one, a
truth value the other one, a text or a named constant another text, and a statement that calls or assigns is left out.
What the compiler computes (constexpr) is left as it is, and so is what would not compile. A copy asks
`mutant_switch.h` which mutant is active; its list, COPY.json, has for each the number, line, function and change. Needs
python3-clang-16.
"""

import argparse
import json
import multiprocessing
import re
import subprocess
from pathlib import Path

import clang.cindex
from clang.cindex import CursorKind, TypeKind

TREE = Path(__file__).resolve().parent.parent.parent
OPPOSITES = {"==": "!=", "!=": "==", "<": "<=", "<=": "<", ">": ">=", ">=": ">", "&&": "||", "||": "&&"}
FUNCTIONS = {CursorKind.FUNCTION_DECL, CursorKind.CXX_METHOD, CursorKind.CONSTRUCTOR, CursorKind.DESTRUCTOR,
             CursorKind.FUNCTION_TEMPLATE, CursorKind.CONVERSION_FUNCTION}
CLASSES = {CursorKind.CLASS_DECL, CursorKind.STRUCT_DECL, CursorKind.CLASS_TEMPLATE}
BODIES = {CursorKind.COMPOUND_STMT, CursorKind.IF_STMT, CursorKind.WHILE_STMT, CursorKind.FOR_STMT,
          CursorKind.CXX_FOR_RANGE_STMT, CursorKind.CASE_STMT, CursorKind.DEFAULT_STMT}
SKIPPED = {CursorKind.STATIC_ASSERT, CursorKind.ENUM_DECL, CursorKind.TYPE_ALIAS_DECL, CursorKind.LINKAGE_SPEC}
TRUTH = "(static_cast<bool>({}))"
LONGEST = 110

clang.cindex.Config.set_library_file("libclang-16.so.1")


def has_known_kind(cursor):
    """Not what is younger than the bindings, such as a requirement, at which the compiler alone looks."""
    try:
        return cursor.kind is not None
    except ValueError:
        return False


class Point:
    """A place of the source: what it becomes under each of its mutants, and how the copy chooses."""

    def __init__(self, start, end, form="({})"):
        self.start, self.end, self.form = start, end, form
        self.mutants = []  # (replacement, what is said to be changed)


class Finder:
    """Collects the points of one parsed source."""

    def __init__(self, path, text):
        self.path, self.text = str(path), text
        self.points = {}  # by extent and form
        self.operators = set()
        self.equalities = set()  # whose mutant is already their opposite

    def found(self):
        return [point for extent, point in self.points.items() if extent not in self.equalities]

    def source(self, start, end):
        return self.text[start:end].decode()

    def extent(self, cursor):
        return cursor.extent.start.offset, cursor.extent.end.offset

    def add(self, start, end, function, replacement, said=None, form="({})"):
        point = self.points.setdefault((start, end, form), Point(start, end, form))
        old = shortened(self.source(start, end)) if said is None else said[0]
        new = shortened(replacement) if said is None else said[1]
        point.mutants.append((replacement, {"function": function, "old": old, "new": new, "offset": start}))

    def visit(self, cursor, function="", parent=None):
        start, end = self.extent(cursor)
        if not has_known_kind(cursor) or cursor.kind in SKIPPED or self.is_constant(cursor):
            return
        if cursor.kind in FUNCTIONS or cursor.kind in CLASSES:
            scope = cursor.semantic_parent
            function = f"{scope.spelling}::{cursor.spelling}" if scope.kind in CLASSES else cursor.spelling
        if function:
            self.look_at(cursor, start, end, function, parent)
        for child in cursor.get_children():
            self.visit(child, function, cursor)

    def is_constant(self, cursor):
        if cursor.kind not in FUNCTIONS | {CursorKind.VAR_DECL}:
            return False
        declaration = re.split(r"[{=]", self.source(*self.extent(cursor)))[0]
        return re.search(r"\b(constexpr|consteval)\b", declaration) is not None

    def look_at(self, cursor, start, end, function, parent):
        kind = cursor.kind
        if kind.is_expression() or kind == CursorKind.BINARY_OPERATOR:
            self.operator(cursor, start, end, function)
        if kind == CursorKind.INTEGER_LITERAL:
            word = self.source(start, end)
            if word.isdigit():
                self.add(start, end, function, str(int(word) + 1))
        elif kind == CursorKind.CXX_BOOL_LITERAL_EXPR:
            self.add(start, end, function, "false" if self.source(start, end) == "true" else "true")
        elif kind == CursorKind.STRING_LITERAL:
            self.add(start, end, function, '"mutant"' if self.source(start, end) == '""' else '""')
        elif kind == CursorKind.DECL_REF_EXPR:
            self.constant(cursor, start, end, function)
        elif kind in (CursorKind.IF_STMT, CursorKind.WHILE_STMT, CursorKind.FOR_STMT):
            self.condition(cursor, start, function)
        elif kind == CursorKind.CONDITIONAL_OPERATOR:
            self.negate(*self.extent(next(cursor.get_children())), function)
        elif kind == CursorKind.RETURN_STMT:
            self.returned(cursor, function)
        if parent is not None and parent.kind in BODIES and kind.is_expression() | (kind == CursorKind.BINARY_OPERATOR):
            self.statement(cursor, parent, start, end, function)

    def operator(self, cursor, start, end, function):
        parts = [self.extent(child) for child in cursor.get_children()]
        parts = [part for part in parts if part[0] < part[1] and self.source(*part) not in OPPOSITES]
        if len(parts) != 2 or parts[0][0] != start or parts[1][1] != end:
            return
        (_, left), (right, _) = parts
        word = self.source(left, right).strip() if left <= right else ""
        if word not in OPPOSITES or left in self.operators:
            return
        self.operators.add(left)
        changed = OPPOSITES[word]
        if word in ("==", "!="):
            self.equalities.add((start, end, TRUTH))
        self.add(start, end, function, f"{self.source(start, left)} {changed} {self.source(right, end)}")

    def constant(self, cursor, start, end, function):
        meant = cursor.referenced
        if meant is None or meant.kind != CursorKind.VAR_DECL or not re.fullmatch(r"k[A-Z]\w*", cursor.spelling):
            return
        kind = meant.type.get_canonical()
        if kind.spelling == "const platform::StringConstant":
            said = (cursor.spelling, '"mutant"')
            self.add(start, end, function, '::platform::StringConstant{"mutant"}', said)
        elif kind.kind in (TypeKind.INT, TypeKind.UINT, TypeKind.LONG, TypeKind.ULONG):
            self.add(start, end, function, f"{self.source(start, end)} + 1")

    def condition(self, cursor, start, function):
        head = re.match(rb"(if|while|for)\s*(\(|constexpr)", self.text[start:])
        if head is None or head[2] == b"constexpr":
            return
        first = start + head.end()
        parts = top_level_parts(self.source(first, self.closing(first)))
        if cursor.kind == CursorKind.FOR_STMT:
            wanted = 1
        else:
            wanted = len(parts) - 1
        begin = first + sum(len(part.encode()) + 1 for part in parts[:wanted])
        part = parts[wanted]
        begin += len(part) - len(part.lstrip())
        end = begin + len(part.strip().encode())
        declared = [child for child in cursor.get_children()
                    if child.kind == CursorKind.VAR_DECL and begin <= child.location.offset < end]
        if not declared:
            if part.strip():
                self.negate(begin, end, function)
        elif cursor.kind == CursorKind.IF_STMT and wanted == 0:
            name = declared[0].spelling
            said = (shortened(self.source(begin, end)), f"!{name}")
            self.add(end, end, function, f"!{name}", said, f"; ({{}} static_cast<bool>({name}))")

    def closing(self, position):
        depth = 1
        while depth:
            character = self.text[position:position + 1]
            if character in (b'"', b"'"):
                position += re.match(rb"\"(?:\\.|[^\"\\])*\"|'(?:\\.|[^'\\])*'", self.text[position:]).end() - 1
            depth += {b"(": 1, b")": -1}.get(character, 0)
            position += 1
        return position - 1

    def negate(self, start, end, function):
        self.add(start, end, function, f"!({self.source(start, end)})", form=TRUTH)

    def returned(self, cursor, function):
        values = list(cursor.get_children())
        if not values or values[0].type.get_canonical().kind != TypeKind.BOOL:
            return
        if values[0].kind != CursorKind.CXX_BOOL_LITERAL_EXPR:
            self.negate(*self.extent(values[0]), function)

    def statement(self, cursor, parent, start, end, function):
        children = list(parent.get_children())
        if parent.kind != CursorKind.COMPOUND_STMT and self.extent(children[0]) == (start, end):
            return  # a condition
        if parent.kind == CursorKind.FOR_STMT and self.extent(children[-1]) != (start, end):
            return
        stop = re.match(rb"\s*;", self.text[end:])
        if stop is None or cursor.kind in (CursorKind.CXX_THROW_EXPR,):
            return
        said = (shortened(self.source(start, end)), "(left out)")
        self.add(start, end + stop.end(), function, None, said, "{{ if (!{}) {} }}")


def shortened(text):
    text = " ".join(re.sub(r"//[^\n]*", "", text).split())
    return text if len(text) <= LONGEST else text[:LONGEST - 3] + "..."


def top_level_parts(text):
    """What stands between the semicolons of a statement's head."""
    parts, depth, begin = [], 0, 0
    for position, character in enumerate(text):
        depth += {"(": 1, "{": 1, ")": -1, "}": -1}.get(character, 0)
        if character == ";" and depth == 0:
            parts.append(text[begin:position])
            begin = position + 1
    return parts + [text[begin:]]


class Copy:
    """The text of the copy, with the mutants that are not among those refused."""

    def __init__(self, path, text, points, refused):
        self.path, self.text, self.refused = path, text, refused
        self.switch = re.sub(r"\W", "_", str(path)) + "_mutant"
        self.points = sorted(points, key=lambda point: (point.start, -point.end, not point.form.startswith("{{")))
        self.numbers = {}
        for point in self.points:
            for place in range(len(point.mutants)):
                self.numbers[id(point), place] = len(self.numbers) + 1

    def write(self):
        body = self.between(0, len(self.text), list(self.points))
        head = body[:[match.end() for match in re.finditer(r"^#(include|pragma once).*\n", body, re.MULTILINE)][-1]]
        switch = (f'#include "tests/mutation/mutant_switch.h"\n'
                  f"[[maybe_unused]] inline bool {self.switch}(int number) {{\n"
                  f'  static auto& source = *new mutation::MutatedSource{{"{self.path}"}};\n'
                  f"  return source.isActive(number);\n}}\n"
                  f'#line {head.count(chr(10)) + 1} "{TREE / self.path}"\n')
        return head + switch + body[len(head):]

    def between(self, start, end, points):
        """The source from start to end, with these points, which all lie within, in their order."""
        parts = []
        while points:
            point = points.pop(0)
            inner = []
            while points and points[0].start < point.end:
                inner.append(points.pop(0))
            parts += [self.text[start:point.start].decode(), self.chosen(point, inner)]
            start = point.end
        return "".join(parts) + self.text[start:end].decode()

    def chosen(self, point, inner):
        plain = self.between(point.start, point.end, inner)
        mutants = [(self.numbers[id(point), place], mutant[0]) for place, mutant in enumerate(point.mutants)]
        mutants = [(number, new) for number, new in mutants if number not in self.refused]
        if not mutants:
            return plain
        if point.form.startswith("{{"):
            return point.form.format(f"{self.switch}({mutants[0][0]})", plain)
        choice = "".join(f"{self.switch}({number}) ? ({new}) : " for number, new in mutants)
        kept = TRUTH if point.form == TRUTH else "({})"
        return point.form.format(choice + (kept.format(plain) if point.start < point.end else ""))

    def mutants(self):
        seen = {}
        for point in self.points:
            for place, (_, said) in enumerate(point.mutants):
                number = self.numbers[id(point), place]
                if number in self.refused:
                    continue
                key = (said["function"], said["old"], said["new"])
                seen[key] = seen.get(key, 0) + 1
                line = self.text[:said["offset"]].count(b"\n") + 1
                yield {"number": number, "line": line, "function": key[0], "old": key[1], "new": key[2],
                       "place": seen[key]}

    def innermost(self, text, offset):
        """The number of the mutant in whose choice the offset of the copy's text lies."""
        found = None
        for match in re.finditer(re.escape(self.switch) + r"\((\d+)\)", text):
            begin = max(text.rfind("(", 0, match.start()), text.rfind("{", 0, match.start()))
            if begin <= offset <= end_of_group(text, begin) and (found is None or begin >= found[0]):
                found = (begin, int(match[1]))
        return None if found is None else found[1]


def end_of_group(text, begin):
    depth = 0
    for match in re.finditer(r"\"(?:\\.|[^\"\\\n])*\"|'(?:\\.|[^'\\\n])'|[(){}]", text[begin:]):
        depth += {"(": 1, "{": 1, ")": -1, "}": -1}.get(match[0], 0)
        if depth == 0:
            return begin + match.start()
    return len(text)


def arguments_of(build):
    """What makes any source of the folders compile."""
    commands = json.loads((build / "compile_commands.json").read_text())
    own = [each["command"] for each in commands if Path(each["file"]).parent.parent == TREE]
    includes = {word for command in own for word in command.split() if word.startswith("-I")}
    return ["-xc++", "-std=c++20", "-w", "-Wno-narrowing", "-ferror-limit=0", f"-I{TREE}", *sorted(includes)]


def read_ahead(sources, arguments, directory):
    """The arguments with what the sources include from elsewhere, read once for all of them."""
    pattern = re.compile(r"#include (?:<.*>|\"(?:platform|records)/.*\")")
    lines = {line for source in sources for line in (TREE / source).read_text().splitlines() if pattern.fullmatch(line)}
    header = directory / "ahead.h"
    header.write_text("\n".join(sorted(lines)) + "\n")
    compiled = directory / "ahead.pch"
    subprocess.run(["clang++-16", "-xc++-header", *arguments[1:], header, "-o", compiled], check=True)
    return [*arguments, "-include-pch", str(compiled)]


def fail_on(diagnostics, path):
    errors = [each for each in diagnostics if each.severity >= clang.cindex.Diagnostic.Error]
    if errors:
        raise RuntimeError(f"{path}: {errors[0]}")


def parsed(path, text, arguments):
    return clang.cindex.Index.create().parse(str(path), arguments, [(str(path), text)])


def places_of(diagnostic, path):
    for each in [diagnostic, *diagnostic.children]:
        if each.location.file is not None and each.location.file.name == str(path):
            yield each.location.offset


def copy_of(path, arguments):
    """The copy of a source without those mutants that do not compile, and its text."""
    source = TREE / path
    text = source.read_bytes()
    unit = parsed(source, text.decode(), arguments)
    fail_on(unit.diagnostics, path)
    finder = Finder(source, text)
    for cursor in unit.cursor.get_children():
        if cursor.location.file is not None and cursor.location.file.name == str(source):
            finder.visit(cursor)
    refused = set()
    while True:
        copy = Copy(path, text, finder.found(), refused)
        written = copy.write()
        diagnostics = parsed(source, written, arguments).diagnostics
        errors = [each for each in diagnostics if each.severity >= clang.cindex.Diagnostic.Error]
        bad = {copy.innermost(written, place) for error in errors for place in places_of(error, source)} - {None}
        if not bad:
            fail_on(errors, path)
            return copy, written
        refused |= bad


def write_copy(path, directory, arguments):
    copy, written = copy_of(path, arguments)
    place = directory / path
    if not place.exists() or place.read_text() != written:
        place.write_text(written)
    Path(f"{place}.json").write_text(json.dumps(list(copy.mutants()), indent=1) + "\n")


def is_current(copy, source):
    listing = Path(f"{copy}.json")
    newest = max(source.stat().st_mtime, Path(__file__).stat().st_mtime)
    return copy.exists() and listing.exists() and listing.stat().st_mtime > newest


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("--build", type=Path, required=True, help="the build tree, with compile_commands.json")
    parser.add_argument("--to", type=Path, required=True, help="where the copies go")
    parser.add_argument("--jobs", type=int, help="as many at once")
    parser.add_argument("sources", type=Path, nargs="+", metavar="SOURCE", help="relative to the tree")
    options = parser.parse_args()
    for source in options.sources:
        (options.to / source).parent.mkdir(parents=True, exist_ok=True)
    changed = [source for source in options.sources if not is_current(options.to / source, TREE / source)]
    if not changed:
        return
    arguments = read_ahead(changed, arguments_of(options.build), options.to)
    with multiprocessing.get_context("spawn").Pool(options.jobs) as pool:
        pool.starmap(write_copy, [(source, options.to, arguments) for source in changed], chunksize=1)


if __name__ == "__main__":
    main()
