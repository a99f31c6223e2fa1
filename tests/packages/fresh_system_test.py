"""The packages on a fresh Debian system in a directory: installed, used, and gone without a trace when purged.

The system lives in a new directory of the test's own. What it needs mounted is mounted in a mount namespace that ends
with each command, and the directory is removed only once nothing is mounted below it.
"""

import os
import shutil
import subprocess
import tempfile
import unittest
import urllib.error
import urllib.request
from pathlib import Path

from device import EXAMPLES, Device
from packages_case import NAMES, package_files, run

SUITE, MIRROR = "bookworm", "http://deb.debian.org/debian"
BUILD_TOOLS = "g++ cmake ninja-build pkg-config"
# What a system changes by itself, or keeps by custom, when a package comes and goes.
NOT_OF_THE_PACKAGES = (
    "proc", "run", "sys", "dev", "srv", "root", "var/cache", "var/log", "var/lib/dpkg", "var/lib/apt",
    "var/lib/systemd", "etc/ld.so.cache",
)
# The user of the device and what is his stay, and so does the register of users.
STAYS = ("var/mobile", "etc/passwd", "etc/group", "etc/shadow", "etc/gshadow", "etc/.pwd.lock")
IN_PRIVATE = ["unshare", "--mount", "--propagation", "private", "--"]


def why_not():
    if os.getuid() != 0:
        return "only root can make a system in a directory"
    for program in ("debootstrap", "unshare", "chroot"):
        if shutil.which(program) is None:
            return f"needs {program}"
    if subprocess.run([*IN_PRIVATE, "true"], check=False, capture_output=True).returncode != 0:
        return "a mount namespace is not to be had here"
    try:
        urllib.request.urlopen(f"{MIRROR}/dists/{SUITE}/Release", timeout=20).close()
    except (urllib.error.URLError, OSError) as failure:
        return f"{MIRROR} cannot be reached: {failure}"
    return None


def mounted_below(directory):
    with open("/proc/self/mountinfo", encoding="utf-8") as mounts:
        points = [Path(line.split()[4].encode().decode("unicode_escape")) for line in mounts]
    return [point for point in points if point == directory or directory in point.parents]


class FreshSystem(unittest.TestCase):
    def setUp(self):
        reason = why_not()
        if reason:
            self.skipTest(reason)
        self.root = Path(tempfile.mkdtemp(prefix="fresh-system-")).resolve()
        self.addCleanup(self.remove_system)
        run(*IN_PRIVATE, "debootstrap", "--variant=minbase", SUITE, self.root, MIRROR)

    def remove_system(self):
        mounted = mounted_below(self.root)
        self.assertEqual([], mounted, "nothing is removed below a mount")
        shutil.rmtree(self.root)

    def inside(self, script, *arguments):
        """Runs a script in the system, as its root."""
        enter = 'mount -t proc proc "$0/proc" && exec chroot "$0" /bin/sh -e -c "$@"'
        return run(
            *IN_PRIVATE, "/bin/sh", "-c", enter, self.root, script, "sh", *arguments,
            env={"PATH": "/usr/sbin:/usr/bin:/sbin:/bin", "DEBIAN_FRONTEND": "noninteractive", "LC_ALL": "C.UTF-8"},
        )

    def put_packages(self):
        directory = self.root / "srv/packages"
        directory.mkdir(parents=True)
        for file in package_files().values():
            shutil.copy(file, directory)

    def install_what_they_need(self):
        own = ("libaccountsettings1", "migration-host")
        needs = []
        for file in package_files().values():
            depends = run("dpkg-deb", "--field", file, "Depends").strip().split(", ")
            needs += [each for each in depends if not each.startswith(own)]
        self.inside(f"apt-get update && apt-get install --yes --no-install-recommends {BUILD_TOOLS}")
        self.inside('apt-get satisfy --yes --no-install-recommends "$1"', ", ".join(sorted(set(needs))))

    def standing(self):
        paths = set()
        for directory, names, files in os.walk(self.root):
            here = Path(directory).relative_to(self.root)
            names[:] = [name for name in names if str(here / name) not in NOT_OF_THE_PACKAGES]
            paths |= {str(here / name) for name in [*names, *files]}
        return {path for path in paths if path not in NOT_OF_THE_PACKAGES}

    def migrate_a_device(self):
        device = Device.like("first-generation", self.root / "srv/device")
        passwd = (self.root / "etc/passwd").read_text().splitlines()
        user, group = next(line for line in passwd if line.startswith("mobile:")).split(":")[2:4]
        device.set_mobile(user, group)
        self.inside("migration-host --root /srv/device --snapshots /srv/snapshots" if self.has_snapshots()
                    else "migration-host --root /srv/device")
        self.assertIn("no findings", self.inside("accountctl --root /srv/device verify"))
        self.assertIn("Hollis & Daughters", self.inside("accountctl --root /srv/device list"))

    def has_snapshots(self):
        return "--snapshots" in self.inside("migration-host --help")

    def build_the_example(self):
        shutil.copytree(EXAMPLES.parent / "list-accounts", self.root / "srv/list-accounts")
        self.inside(
            "cd /srv && cmake -G Ninja -S list-accounts -B with-cmake && cmake --build with-cmake"
            " && g++ list-accounts/main.cpp $(pkg-config --cflags --libs account-settings-client) -o with-pkg-config"
        )
        for program in ("/srv/with-cmake/list-accounts", "/srv/with-pkg-config"):
            self.assertIn("Hollis & Daughters", self.inside(f"{program} /srv/device"))

    def test_runs_the_packages_and_keeps_nothing_of_them(self):
        self.put_packages()
        self.install_what_they_need()
        before = self.standing()
        self.inside("dpkg --install /srv/packages/*.deb")
        self.assertTrue((self.root / "var/mobile/Library/Logs/CrashReporter").is_dir())
        self.assertEqual("", self.inside(f"dpkg --verify {' '.join(NAMES)}"))
        self.migrate_a_device()
        self.build_the_example()
        (self.root / "var/lib/account-settings").mkdir(exist_ok=True)
        self.inside(f"dpkg --remove {' '.join(NAMES)}")
        self.assertTrue((self.root / "var/lib/account-settings").is_dir())
        self.inside("dpkg --purge migration-host")
        self.inside(f"dpkg --purge {' '.join(NAMES)}")
        left = {path for path in self.standing() - before if not path.startswith(STAYS)}
        left -= {"tmp/AccountMigrationInProgress", "tmp/AccountSettingsChange", "tmp/AccountSettingsNext"}
        self.assertEqual((set(), set()), (left, before - self.standing()))


if __name__ == "__main__":
    unittest.main()
