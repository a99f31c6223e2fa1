"""What the tests of the kit for step authors share: a scratch copy of the source tree."""

import functools
import os
import shutil
import subprocess
import tempfile
import unittest
from pathlib import Path

SOURCES = Path(os.environ["SOURCE_TREE"])


@functools.cache
def source_files():
    """What is under version control, without what a build leaves."""
    listed = subprocess.run(
        ["git", "-c", f"safe.directory={SOURCES}", "ls-files", "-z", "--cached", "--others", "--exclude-standard"],
        cwd=SOURCES, stdout=subprocess.PIPE, check=False,
    )
    if listed.returncode != 0:
        raise unittest.SkipTest("the source tree is not under version control here")
    return [name for name in listed.stdout.decode().split("\0") if name and (SOURCES / name).is_file()]


class KitTest(unittest.TestCase):
    maxDiff = None
    PARTS = ("",)  # of the source tree, by the beginnings of their paths

    def setUp(self):
        scratch = tempfile.TemporaryDirectory()
        self.addCleanup(scratch.cleanup)
        self.tree = Path(scratch.name).resolve() / "tree"
        for name in filter(lambda name: name.startswith(self.PARTS), source_files()):
            copy = self.tree / name
            copy.parent.mkdir(parents=True, exist_ok=True)
            shutil.copy2(SOURCES / name, copy)

    def new_step(self, *arguments):
        return subprocess.run(
            [self.tree / "tools/new-step", *arguments], capture_output=True, text=True, check=False
        )

    def read(self, name):
        return (self.tree / name).read_text(encoding="utf-8")

    def contents(self):
        return {path.relative_to(self.tree): path.read_bytes() for path in self.tree.rglob("*") if path.is_file()}
