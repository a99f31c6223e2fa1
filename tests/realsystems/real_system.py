"""A minimal Debian 12 system in a directory of the tests' own, with real systemd, journal and bus when it is started.

What all of them have is made once, by debootstrap from where this machine's own apt gets its packages, and kept in the build
tree. Nothing is ever mounted in a system but by systemd-nspawn, in a mount namespace of its own.
"""

import hashlib
import json
import os
import re
import shutil
import subprocess
import tempfile
import uuid
from pathlib import Path

from packages_case import run

CACHE = Path(os.environ["BUILD_TREE"]) / "real-systems"
SUITE = "bookworm"
BASE = ["systemd", "systemd-sysv", "dbus", "util-linux"]
PROGRAMS = ("debootstrap", "systemd-nspawn", "dpkg-deb", "journalctl")
# What a start in a directory needs of the machine: its units are not registered, and it has no network.
NSPAWN = ["systemd-nspawn", "--quiet", "--keep-unit", "--register=no", "--private-network", "--console=pipe"]
INSIDE = {"PATH": "/usr/sbin:/usr/bin:/sbin:/bin", "LC_ALL": "C.UTF-8", "DEBIAN_FRONTEND": "noninteractive"}
WORK_PLACE = "/var/tmp"  # no file system in memory: two systems and their packages are in it


def why_not():
    if os.getuid() != 0:
        return "only root can make and start a system"
    missing = [program for program in PROGRAMS if shutil.which(program) is None]
    if missing:
        return f"needs {', '.join(missing)}"
    return None if mirror() else "apt knows no place that has Debian 12"


def mirror():
    """Where this machine's apt gets the main part of the release."""
    listed = run("apt-get", "indextargets", "--format", "$(ORIGIN) $(CODENAME) $(COMPONENT) $(REPO_URI)", "Identifier: Packages")
    return next((line.split()[3] for line in listed.splitlines() if line.split()[:3] == ["Debian", SUITE, "main"]), None)


def needs_of(package_files):
    """The names of the packages that these need and do not bring."""
    own = {run("dpkg-deb", "--field", file, "Package").strip() for file in package_files}
    depends = ", ".join(run("dpkg-deb", "--field", file, "Depends").strip() for file in package_files)
    return sorted({re.split(r"[ (:|]", each.strip())[0] for each in depends.split(",") if each.strip()} - own)


def kept_base(packages):
    """An archive of a system that has these packages; made where there is none yet."""
    CACHE.mkdir(exist_ok=True)
    archive = CACHE / f"{SUITE}-{hashlib.sha256(' '.join(packages).encode()).hexdigest()[:16]}.tar"
    if not archive.exists():
        with tempfile.TemporaryDirectory(dir=WORK_PLACE) as scratch:
            root = Path(scratch) / "root"
            run("debootstrap", "--variant=minbase", f"--include={','.join(packages)}", SUITE, root, mirror())
            run("tar", "--create", "--file", f"{archive}.new", "--numeric-owner", "--xattrs", "--acls", "--directory", root, ".")
        os.rename(f"{archive}.new", archive)
    return archive


class RealSystem:
    """A system below a new directory, which goes with it."""

    def __init__(self, package_files):
        self.scratch = Path(tempfile.mkdtemp(prefix="real-system-", dir=WORK_PLACE)).resolve()
        self.root = self.scratch / "root"
        self.root.mkdir()
        archive = kept_base(sorted({*BASE, *needs_of(package_files)}))
        run("tar", "--extract", "--file", archive, "--numeric-owner", "--xattrs", "--acls", "--directory", self.root)
        (self.root / "etc/machine-id").write_text(f"{uuid.uuid4().hex}\n")  # no first start, at which systemd asks and presets
        (self.root / "var/log/journal").mkdir(exist_ok=True)

    def remove(self):
        mounts = Path("/proc/self/mountinfo").read_text(encoding="utf-8")
        if f" {self.scratch}" in mounts:
            raise AssertionError("nothing is removed below a mount")
        shutil.rmtree(self.scratch)

    def path(self, path):
        return self.root / path.lstrip("/")

    def write(self, path, text, mode=0o644):
        self.path(path).parent.mkdir(parents=True, exist_ok=True)
        self.path(path).write_text(text)
        self.path(path).chmod(mode)

    def bring(self, package_files):
        """Puts package files where those inside find them."""
        directory = self.path("/srv/packages")
        shutil.rmtree(directory, ignore_errors=True)
        directory.mkdir(parents=True)
        for file in package_files:
            shutil.copy(file, directory)

    def inside_without_proc(self, *command):
        """In nothing but the directory, as in a system that is being built."""
        return run("chroot", self.root, *command, env=INSIDE)

    def add_service(self, name, text):
        """One that every start starts."""
        self.write(f"/etc/systemd/system/{name}.service", text)
        wants = self.path("/etc/systemd/system/multi-user.target.wants")
        wants.mkdir(exist_ok=True)
        (wants / f"{name}.service").symlink_to(f"../{name}.service")

    def start(self, timeout=120):
        """Starts the system, and waits until something in it has switched it off."""
        with open(self.scratch / "console", "ab") as console:
            subprocess.run([*NSPAWN, "--directory", str(self.root), "--boot"], stdin=subprocess.DEVNULL, stdout=console,
                           stderr=console, timeout=timeout, check=True)

    def starts(self):
        """The journal of each start, oldest first, as one dictionary for each entry."""
        text = run("journalctl", "--directory", self.path("/var/log/journal"), "--output=json", "--all", "--no-pager", "--quiet")
        by_start = {}
        for line in text.splitlines():
            entry = json.loads(line)
            by_start.setdefault(entry["_BOOT_ID"], []).append(entry)
        return list(by_start.values())
