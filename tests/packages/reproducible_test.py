"""The packages built once more, under another path, user, time, zone, locale, umask and order of files: the same, bit by bit."""

import os
import random
import shutil
import subprocess
import tempfile
import unittest
from pathlib import Path

from packages_case import PACKAGES, SOURCES, run

NOT_SOURCES = ("build", ".git")
SOMEBODY = "12345"
LATER = "+400 days"
# In memory, a directory lists its entries in the order in which they were made.
WORK_PLACE = "/dev/shm" if os.access("/dev/shm", os.W_OK) else "/var/tmp"


def copy_in_another_order(target):
    files = [path for path in SOURCES.rglob("*") if path.relative_to(SOURCES).parts[0] not in NOT_SOURCES]
    random.Random(1).shuffle(files)
    for path in files:
        place = target / path.relative_to(SOURCES)
        if path.is_dir() and not path.is_symlink():
            place.mkdir(parents=True, exist_ok=True)
        else:
            place.parent.mkdir(parents=True, exist_ok=True)
            shutil.copyfile(path, place, follow_symlinks=False)
            if not path.is_symlink():
                place.chmod(path.stat().st_mode & 0o700)


def packages_in(directory):
    return {path.name: path for path in directory.iterdir() if path.suffix in (".deb", ".ddeb", ".json")}


def difference(one, other, scratch):
    """Which members differ, for whoever has to find out why."""
    if one.suffix == ".json":
        return ""
    for name, package in {"one": one, "other": other}.items():
        run("dpkg-deb", "--raw-extract", package, scratch / name)
    differing = subprocess.run(
        ["diff", "--recursive", "--brief", scratch / "one", scratch / "other"], capture_output=True, text=True, check=False)
    for name in ("one", "other"):
        shutil.rmtree(scratch / name)
    return differing.stdout


@unittest.skipIf(os.getuid() != 0, "only root can build as another user")
class Packages(unittest.TestCase):
    maxDiff = None

    def setUp(self):
        scratch = tempfile.TemporaryDirectory(dir=WORK_PLACE, prefix="another place ")
        self.addCleanup(scratch.cleanup)
        self.scratch = Path(scratch.name)

    def build_elsewhere(self):
        tree = self.scratch / "a longer name for the sources"
        copy_in_another_order(tree)
        for path in [self.scratch, tree, *tree.rglob("*")]:
            os.chown(path, int(SOMEBODY), int(SOMEBODY), follow_symlinks=False)
        run("setpriv", f"--reuid={SOMEBODY}", f"--regid={SOMEBODY}", "--clear-groups", "sh", "-e", "-c",
            'umask 077; exec faketime "$0" cmake --workflow --preset package', LATER, cwd=tree,
            env={"PATH": "/usr/bin:/bin:/usr/sbin:/sbin", "LC_ALL": "C", "TZ": "Pacific/Kiritimati", "CCACHE_DISABLE": "1",
                 "HOME": str(self.scratch)})
        return packages_in(tree / "build" / "package" / "packages")

    def test_are_the_same_wherever_whenever_and_by_whomever_they_are_built(self):
        elsewhere, here = self.build_elsewhere(), packages_in(PACKAGES)
        self.assertEqual(sorted(here), sorted(elsewhere))
        self.assertGreaterEqual(len(here), 11)
        differing = [name for name in here if here[name].read_bytes() != elsewhere[name].read_bytes()]
        self.assertEqual([], [f"{name}: {difference(here[name], elsewhere[name], self.scratch)}" for name in differing])


if __name__ == "__main__":
    unittest.main()
