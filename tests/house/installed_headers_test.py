"""That a client of the installed libraries can link whatever their headers declare."""

import json
import os
import subprocess
import tempfile
import unittest
from pathlib import Path

NAMESPACES = ("platform", "accountsettings")


def output_of(*command):
    return subprocess.run([str(part) for part in command], check=True, capture_output=True, text=True).stdout


def documents_in(text):
    """The declarations that the compiler dumped, one after the other."""
    decoder, position = json.JSONDecoder(), 0
    while (position := text.find("{", position)) >= 0:
        document, position = decoder.raw_decode(text, position)
        yield document


def functions_in(declaration, access="public"):
    """The functions that a client may call and that are defined elsewhere than in the header."""
    kind, inner = declaration.get("kind"), declaration.get("inner", [])
    if kind in ("FunctionDecl", "CXXMethodDecl", "CXXConstructorDecl", "CXXDestructorDecl", "CXXConversionDecl"):
        isDefinedHere = any(part.get("kind") == "CompoundStmt" for part in inner) or declaration.get("inline")
        if not (isDefinedHere or declaration.get("pure") or declaration.get("isImplicit")
                or declaration.get("explicitlyDefaulted") or declaration.get("explicitlyDeleted")):
            yield declaration["name"], declaration["mangledName"]
    elif kind == "CXXRecordDecl":
        access = "public" if declaration.get("tagUsed") == "struct" else "private"
        for part in inner:
            if part.get("kind") == "AccessSpecDecl":
                access = part["access"]
            elif access != "private":
                yield from functions_in(part)
    elif kind == "NamespaceDecl":
        for part in inner:
            yield from functions_in(part)


class InstalledHeaders(unittest.TestCase):
    maxDiff = None
    build_tree = Path(os.environ["BUILD_TREE"])
    library_directory = os.environ.get("LIBRARY_DIRECTORY", "lib")

    @classmethod
    def setUpClass(cls):
        installed = tempfile.TemporaryDirectory()
        cls.addClassCleanup(installed.cleanup)
        output_of("cmake", "--install", cls.build_tree, "--component", "development", "--prefix", installed.name)
        cls.includes = next(Path(installed.name).rglob("platform/platform.h")).parent.parent
        cls.client = Path(installed.name) / "client.cpp"
        headers = sorted(path.relative_to(cls.includes) for path in cls.includes.rglob("*.h"))
        cls.client.write_text("".join(f'#include "{header}"\n' for header in headers), encoding="utf-8")
        libraries = [cls.build_tree / cls.library_directory / f"lib{name}.so"
                     for name in ("accountplatform", "accountsettings")]
        cls.exported = {line.split()[-1].split("@")[0] for path in libraries
                        for line in output_of("nm", "-D", "--defined-only", path).splitlines()}

    def declared_in(self, namespace):
        dumped = output_of(
            "clang++-16", "-std=c++20", "-fsyntax-only", f"-I{self.includes}", "-Xclang", "-ast-dump=json",
            "-Xclang", f"-ast-dump-filter={namespace}::", self.client,
        )
        return {mangled: name for document in documents_in(dumped) for name, mangled in functions_in(document)}

    def test_declare_nothing_that_a_client_cannot_link(self):
        for namespace in NAMESPACES:
            declared = self.declared_in(namespace)
            self.assertGreater(len(declared), 20)
            self.assertEqual([], sorted(name for mangled, name in declared.items() if mangled not in self.exported))


if __name__ == "__main__":
    unittest.main()
