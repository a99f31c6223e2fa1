"""The unit that runs the migration at boot: accepted by systemd, confined, and with enough rights for the work."""

import fcntl
import os
import re
import shutil
import subprocess
import unittest
from pathlib import Path

from device import CURRENT_VERSION, SETTINGS, lines, plain_environment
from device_case import HOST, DeviceTest
from failed_saves_test import without_capabilities

BUILD_TREE = Path(os.environ["BUILD_TREE"])
UNIT = "lib/systemd/system/migration-host.service"
# In tenths, as systemd-analyze wants it; 0 is best. What is left is what the work needs: changing owners, and root.
WORST_EXPOSURE = 13
# Those that the loader of programs knows; with LD_TRACE_LOADED_OBJECTS it lists libraries in place of a run.
VARIABLES_OF_LOADER = {
    "LD_ASSUME_KERNEL", "LD_AUDIT", "LD_BIND_NOT", "LD_BIND_NOW", "LD_DEBUG", "LD_DEBUG_OUTPUT", "LD_DYNAMIC_WEAK", "LD_HWCAP_MASK",
    "LD_LIBRARY_PATH", "LD_ORIGIN_PATH", "LD_POINTER_GUARD", "LD_PREFER_MAP_32BIT_EXEC", "LD_PRELOAD", "LD_PROFILE",
    "LD_PROFILE_OUTPUT", "LD_SHOW_AUXV", "LD_TRACE_LOADED_OBJECTS", "LD_TRACE_PRELINKING", "LD_USE_LOAD_BIAS", "LD_VERBOSE",
    "LD_WARN",
}
ALL_CAPABILITIES = range(41)
NEEDED_CAPABILITIES = {"CAP_CHOWN": 0, "CAP_DAC_OVERRIDE": 1, "CAP_FOWNER": 3}


def run(*command, expected=0):
    ended = subprocess.run(
        [str(part) for part in command],
        env=plain_environment(), stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.STDOUT,
        check=False,
    )
    if ended.returncode != expected:
        raise AssertionError(f"{command} ended with {ended.returncode}:\n{ended.stdout.decode(errors='replace')}")
    return lines(ended.stdout)


class InstalledUnit(DeviceTest):
    def setUp(self):
        super().setUp()
        self.prefix = self.scratch / "prefix"
        run("cmake", "--install", BUILD_TREE, "--prefix", self.prefix, "--component", "host")
        self.unit = self.prefix / UNIT

    def settings(self, name):
        return [line.partition("=")[2] for line in self.unit.read_text().splitlines() if line.startswith(name + "=")]

    def test_starts_the_installed_host_with_options_that_it_has(self):
        program, *options = self.settings("ExecStart")[0].split()
        self.assertEqual(str(self.prefix / "bin" / "migration-host"), program)
        known = "\n".join(run(HOST, "--help"))
        for option in options:
            if option.startswith("--"):
                self.assertIn(f" {option} ", known)

    def test_is_found_by_a_start_and_by_the_end_of_an_update(self):
        for link in ("sysinit.target.wants", "systemd-update-done.service.requires"):
            linked = self.unit.parent / link / self.unit.name
            self.assertEqual(self.unit, linked.resolve())

    def test_runs_once_in_three_starts_whatever_marks_updates(self):
        self.assertEqual([], [line for line in self.unit.read_text().splitlines() if line.startswith("Condition")])
        _, *options = self.settings("ExecStart")[0].split()
        device = self.example("first-generation")
        snapshots = self.scratch / "snapshots"
        places = {"/var/mobile": device.path("var/mobile"), "/var/lib/account-settings/snapshots": snapshots}
        runs = [device.migrate(HOST, *(places.get(each, each) for each in options)) for _ in range(3)]
        self.assertEqual([0, 0, 0], [each.status for each in runs])
        self.assertEqual([True, False, False], ["result" in str(each.events) for each in runs])
        self.assertEqual(1, len(list(snapshots.glob("0*"))))

    def test_keeps_passwords_out_of_core_files_and_the_environment_out_of_the_host(self):
        self.assertEqual(["0"], self.settings("LimitCORE"))
        unset = " ".join(self.settings("UnsetEnvironment")).split()
        self.assertLessEqual({"TMPDIR", "DBUS_SYSTEM_BUS_ADDRESS", *VARIABLES_OF_LOADER}, set(unset))

    def test_is_bounded_in_what_it_takes(self):
        self.assertEqual(["90s"], self.settings("TimeoutStartSec"))
        for name in ("MemoryMax", "TasksMax"):
            self.assertEqual(1, len(self.settings(name)), name)

    def test_is_accepted_by_systemd(self):
        self.assertEqual([], run("systemd-analyze", "verify", "--man=no", self.unit))

    def test_is_confined(self):
        run("systemd-analyze", "security", "--offline=true", f"--threshold={WORST_EXPOSURE}", "--no-pager", self.unit)

    def test_leaves_the_host_the_rights_that_it_needs(self):
        self.assertEqual(" ".join(NEEDED_CAPABILITIES), self.settings("CapabilityBoundingSet")[0])
        if os.getuid() != 0:
            self.skipTest("only root has rights to give away")
        device = self.example("first-generation")
        device.set_mobile(4711, 4712)
        for path in [device.root, *device.root.rglob("*")]:
            os.lchown(path, 4711, 4712)
        dropped = set(ALL_CAPABILITIES) - set(NEEDED_CAPABILITIES.values())
        snapshots = self.scratch / "snapshots"
        for _ in range(2):
            run = device.migrate(HOST, "--snapshots", snapshots, prepare=without_capabilities(*dropped))
            self.assertEqual((0, []), (run.status, [line for line in run.errors if "snapshot" in line]))
        status = device.path(SETTINGS).stat()
        self.assertEqual((4711, 4712), (status.st_uid, status.st_gid))
        self.assertEqual(CURRENT_VERSION, device.read_plist(SETTINGS)["Version"])

    @unittest.skipIf(os.getuid() != 0, "only root mounts /proc")
    def test_lets_the_host_see_for_whom_it_waits(self):
        device = self.example("first-generation")
        lock = device.path("tmp/AccountMigrationInProgress")
        lock.parent.mkdir(mode=0o1777)
        limits = {"hidepid": self.settings("ProtectProc"), "subset": self.settings("ProcSubset")}
        options = ",".join(f"{name}={value}" for name, values in limits.items() for value in values)
        mounted = ("unshare", "--mount", "sh", "-c", f'mount -t proc -o {options} proc /proc && exec "$0" "$@"')
        if subprocess.run([*mounted, "true"], check=False).returncode != 0:
            self.skipTest("mounting /proc is not allowed here")
        with open(lock, "xb") as held:
            fcntl.flock(held, fcntl.LOCK_EX)
            said = run(*mounted, HOST, "--root", device.root, "--lock-timeout", "0", expected=8)
        self.assertIn(f"wait any longer for process {os.getpid()} ", " ".join(said))

    def allowed_calls(self):
        """The system calls that the unit's filters leave, in their order: a list that is added, or taken away."""
        allowed = set()
        for line in self.settings("SystemCallFilter"):
            named = set().union(*(calls_of(name) for name in line.lstrip("~").split()))
            allowed = allowed - named if line.startswith("~") else allowed | named
        return allowed

    @unittest.skipUnless(shutil.which("strace"), "needs strace")
    @unittest.skipIf(os.environ["SANITIZE"], "a sanitizer makes calls of its own")
    def test_allows_the_host_the_system_calls_that_it_makes(self):
        device = self.example("legacy-files")
        log = self.scratch / "calls"
        run("strace", "-f", "-qq", "-o", log, HOST, "--root", device.root, "--snapshots", self.scratch / "snapshots")
        called = set(re.findall(r"^\d+ +(\w+)\(", log.read_text(), re.MULTILINE))
        self.assertTrue(called & {"fchown", "fchownat"}, called)
        self.assertEqual(set(), called - self.allowed_calls())


def calls_of(name):
    """The system calls of a group, and of the groups in it."""
    if not name.startswith("@"):
        return {name}
    listed = run("systemd-analyze", "syscall-filter", "--no-pager", name)[1:]
    names = [line.strip() for line in listed if line.strip() and not line.strip().startswith("#")]
    return set().union(*map(calls_of, names))


class Fragments(DeviceTest):
    """The user, the directories and the locks, made in a root of the test's own."""

    def setUp(self):
        super().setUp()
        self.root = self.scratch / "root"
        (self.root / "etc").mkdir(parents=True)
        run("cmake", "--install", BUILD_TREE, "--prefix", self.root / "usr", "--component", "host")

    def test_make_the_mobile_user_its_directories_and_locks_that_nobody_else_holds(self):
        if os.getuid() != 0:
            self.skipTest("only root gives directories to another user")
        run("systemd-sysusers", f"--root={self.root}", "account-settings.conf")
        run("systemd-tmpfiles", f"--root={self.root}", "--create", "account-settings.conf")
        entry = next(line for line in (self.root / "etc/passwd").read_text().splitlines() if line.startswith("mobile:"))
        _, _, user, group, _, home, _ = entry.split(":")
        self.assertEqual("/var/mobile", home)
        for directory, mode in {
            "Library/Preferences": 0o755, "Library/Mail": 0o700, "Library/Logs/CrashReporter": 0o755, "tmp": 0o700,
        }.items():
            status = (self.root / "var/mobile" / directory).stat()
            self.assertEqual((int(user), int(group), mode), (status.st_uid, status.st_gid, status.st_mode & 0o7777))
        for lock in ("AccountMigrationInProgress", "AccountSettingsChange", "AccountSettingsNext"):
            status = (self.root / "tmp" / lock).stat()
            self.assertEqual((0, int(group), 0o100640), (status.st_uid, status.st_gid, status.st_mode), lock)


if __name__ == "__main__":
    unittest.main()
