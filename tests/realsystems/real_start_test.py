"""A real start of a minimal Debian 12 with the packages installed: systemd, the journal and the bus are the real ones.

Debian leaves systemd's own service out that marks an update as done, so the system here has one of these tests', ordered as
systemd's is. Whatever a start shows is read from outside, once it is over.
"""

import os
import plistlib
import unittest
from pathlib import Path

from device import CURRENT_VERSION, LEGACY_EXCHANGE, LEGACY_MAIL, SETTINGS, SETTINGS_COPY
from packages_case import EARLIER_PACKAGES, package_files, run
from real_system import RealSystem, why_not

UNIT = "migration-host.service"
NAMES = ("libaccountsettings1", "migration-host", "accountctl")
STAMP_OF_UPDATE = "/var/.updated"

# As systemd orders its own: not before the unit that it requires has ended well.
UPDATE_DONE = f"""[Unit]
DefaultDependencies=no
Before=sysinit.target
ConditionNeedsUpdate=/var
[Service]
Type=oneshot
ExecStart=/usr/bin/touch --reference=/usr {STAMP_OF_UPDATE}
"""
# An ordinary service that uses accounts, as the user whose they are.
USES_ACCOUNTS = """[Service]
Type=oneshot
User=mobile
ExecStart=/usr/bin/accountctl --home /var/mobile list
"""
# Ends each start: it does what the test has put there, tells how the migration went, and switches the system off.
LAST = f"""[Unit]
After=multi-user.target dbus.service uses-accounts.service
[Service]
Type=oneshot
ExecStart=-/bin/sh /srv/work
ExecStart=/bin/sh -c 'systemctl show --no-pager {UNIT} > /srv/shown; systemctl list-units --failed --plain --no-legend > /srv/failed; journalctl --sync; systemctl --no-block poweroff'
"""
# Kills the host in the middle of its run, which the copy of the settings shows to have begun, and looks at it before.
KILLS = f"""[Unit]
DefaultDependencies=no
After=systemd-tmpfiles-setup.service
Before=sysinit.target
[Service]
Type=exec
ExecStart=/bin/sh /srv/kill
"""
KILL = f"""until [ -e /{SETTINGS_COPY} ]; do :; done
read process < /sys/fs/cgroup/systemd/system.slice/{UNIT}/cgroup.procs || read process < /sys/fs/cgroup/system.slice/{UNIT}/cgroup.procs
cat /proc/$process/status > /srv/status
cat /proc/$process/mountinfo > /srv/mounts
systemctl kill --signal=KILL {UNIT}
"""
# Puts old accounts there when the bus runs, and listens to what everybody may hear.
LISTEN_WHILE_IT_RUNS = f"""dbus-monitor --system "interface='com.vorlix.Notices1'" > /srv/notices &
until [ -s /srv/notices ]; do sleep 0.1; done
mv /srv/settings /{SETTINGS}
mv /srv/mail /{LEGACY_MAIL}
mv /srv/exchange /{LEGACY_EXCHANGE}
systemctl restart {UNIT}
until grep -q PreferencesChanged /srv/notices || [ $((tries += 1)) -gt 100 ]; do sleep 0.1; done
"""


def marked(name, **keys):
    return {**keys, "Marker": name}


class RealStart(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        reason = why_not()
        if reason:
            raise unittest.SkipTest(reason)

    def setUp(self):
        self.files = [package_files()[name] for name in NAMES]

    def system(self, files=None):
        """One with the packages, installed as into an image: by chroot, without /proc."""
        system = RealSystem(self.files)
        self.addCleanup(system.remove)
        system.bring(files or self.files)
        system.inside_without_proc("sh", "-c", "dpkg --install /srv/packages/*.deb")
        system.write("/lib/systemd/system/systemd-update-done.service", UPDATE_DONE)
        wants = system.path("/lib/systemd/system/sysinit.target.wants/systemd-update-done.service")
        wants.symlink_to("../systemd-update-done.service")
        system.add_service("uses-accounts", USES_ACCOUNTS)
        system.add_service("last", LAST)
        system.write("/srv/work", "")
        return system

    def mobile(self, system):
        passwd = system.path("/etc/passwd").read_text().splitlines()
        return tuple(map(int, next(line for line in passwd if line.startswith("mobile:")).split(":")[2:4]))

    def write_plist(self, system, path, value):
        place = system.path(path)
        missing = [each for each in place.parents if not each.exists()]
        place.parent.mkdir(parents=True, exist_ok=True)
        place.write_bytes(plistlib.dumps(value, fmt=plistlib.FMT_BINARY))
        place.chmod(0o600)
        for each in [*missing, place]:
            os.chown(each, *self.mobile(system))

    def put_old_accounts(self, system, count=3):
        ldap = [marked(f"L{number}", Type="LDAP", Class="LDAPAccount", Identifier=f"L{number}") for number in range(count)]
        self.write_plist(system, SETTINGS, {"Version": 0, "Accounts": ldap})
        mail = [marked("M", AccountType="IMAPAccount", AccountName="Home", uniqueId="M")]
        self.write_plist(system, LEGACY_MAIL, {"MailAccounts": mail, "DeliveryAccounts": []})
        exchange = marked("E", DAAccountConfigurationClass="ASAccount", DAAccountConfigurationAccountID="E")
        self.write_plist(system, LEGACY_EXCHANGE, {"DAAccountsKey": [exchange]})

    def settings(self, system):
        return plistlib.loads(system.path(SETTINGS).read_bytes())

    def started(self, system):
        """Starts it as after an update. What the unit came to, by property, and the journal's entries of the start."""
        os.utime(system.path("/usr"))
        system.start()
        shown = dict(line.split("=", 1) for line in system.path("/srv/shown").read_text().splitlines() if "=" in line)
        return shown, system.starts()[-1]

    def is_update_done(self, system):
        stamp = system.path(STAMP_OF_UPDATE)
        return stamp.exists() and stamp.stat().st_mtime_ns >= system.path("/usr").stat().st_mtime_ns

    def assert_migrated(self, system, count=3):
        saved = self.settings(system)
        markers = sorted(marker for marker in map(lambda each: each.get("Marker"), saved["Accounts"]) if marker)
        self.assertEqual(CURRENT_VERSION, saved["Version"])
        self.assertEqual(sorted(["M", "E", *(f"L{number}" for number in range(count))]), markers)
        self.assertFalse(system.path(LEGACY_MAIL).exists() or system.path(LEGACY_EXCHANGE).exists())
        status = system.path(SETTINGS).stat()
        self.assertEqual((*self.mobile(system), 0o600), (status.st_uid, status.st_gid, status.st_mode & 0o7777))

    def messages(self, entries, unit=UNIT):
        return [entry["MESSAGE"] for entry in entries if entry.get("_SYSTEMD_UNIT") == unit]

    def state(self, system):
        """All of the device and of the snapshots, to the nanosecond."""
        roots = (system.path("/var/mobile"), system.path("/var/lib/account-settings"))
        paths = [path for root in roots for path in [root, *sorted(root.rglob("*"))]]
        return {path: (path.lstat().st_ino, path.lstat().st_mtime_ns, path.lstat().st_mode, path.lstat().st_uid) for path in paths}

    def test_migrates_before_anything_uses_accounts_and_once(self):
        system = self.system()
        self.put_old_accounts(system)
        shown, entries = self.started(system)
        self.assertEqual(("success", "0"), (shown["Result"], shown["ExecMainStatus"]), self.messages(entries))
        self.assert_migrated(system)
        self.assertTrue(self.is_update_done(system))
        self.assertEqual("", system.path("/srv/failed").read_text())
        listed = self.messages(entries, "uses-accounts.service")
        self.assertLessEqual({"L0", "L1", "L2", "M", "E"}, {line.split()[0] for line in listed})
        self.assert_order(entries)
        self.assert_fields(entries)
        before = self.state(system)
        shown, entries = self.started(system)
        self.assertEqual(("success", "0"), (shown["Result"], shown["ExecMainStatus"]))
        self.assertEqual([], self.messages(entries))
        self.assertEqual(before, self.state(system))

    def assert_order(self, entries):
        """By systemd's own account: the migration has ended before the target that everything ordinary waits for."""
        ended = {}
        for entry in entries:
            if entry.get("JOB_RESULT") == "done":
                ended.setdefault(entry["UNIT"], int(entry["__MONOTONIC_TIMESTAMP"]))
        order = [UNIT, "systemd-update-done.service", "sysinit.target", "uses-accounts.service"]
        self.assertEqual(order, sorted(order, key=ended.__getitem__))
        self.assertLess(ended["systemd-tmpfiles-setup.service"], ended[UNIT])

    def assert_fields(self, entries):
        """What docs/INTEGRATION.md says of the log's lines."""
        of_host = [entry for entry in entries if entry.get("_SYSTEMD_UNIT") == UNIT]
        of_library = [entry for entry in of_host if entry.get("SUBSYSTEM") == "com.vorlix.accountsettings"]
        self.assertTrue(of_library)
        self.assertEqual({"log"}, {entry["CATEGORY"] for entry in of_library})
        told = [entry for entry in of_host if entry["_TRANSPORT"] == "stdout"]
        self.assertIn("Migrating accounts", " ".join(entry["MESSAGE"] for entry in told))
        self.assertEqual({"migration-host"}, {entry["SYSLOG_IDENTIFIER"] for entry in told})

    def test_tries_again_at_the_next_start_what_failed(self):
        system = self.system()
        self.put_old_accounts(system)
        settings = system.path(SETTINGS)
        kept = settings.with_name("kept")
        settings.rename(kept)
        settings.symlink_to("/etc/shadow")  # which is not the mobile user's to read
        os.lchown(settings, *self.mobile(system))
        shown, entries = self.started(system)
        self.assertEqual(("exit-code", "8"), (shown["Result"], shown["ExecMainStatus"]), self.messages(entries))
        self.assertFalse(self.is_update_done(system))
        self.assertIn(UNIT, system.path("/srv/failed").read_text())
        kept.rename(settings)
        shown, entries = self.started(system)
        self.assertEqual(("success", "0"), (shown["Result"], shown["ExecMainStatus"]), self.messages(entries))
        self.assertTrue(self.is_update_done(system))
        self.assert_migrated(system)

    def test_recovers_at_the_next_start_from_a_kill_and_is_sandboxed(self):
        system = self.system()
        many = 5000
        self.put_old_accounts(system, many)
        before = {path: system.path(path).read_bytes() for path in (SETTINGS, LEGACY_MAIL, LEGACY_EXCHANGE)}
        system.write("/lib/systemd/system/kills.service", KILLS)
        wants = system.path("/lib/systemd/system/sysinit.target.wants/kills.service")
        wants.symlink_to("../kills.service")
        system.write("/srv/kill", KILL)
        shown, entries = self.started(system)
        self.assertEqual("signal", shown["Result"], self.messages(entries))
        self.assertFalse(self.is_update_done(system))
        self.assertEqual(before[SETTINGS], system.path(SETTINGS).read_bytes())
        self.assert_sandboxed(system)
        wants.unlink()
        shown, entries = self.started(system)
        self.assertEqual(("success", "0"), (shown["Result"], shown["ExecMainStatus"]), self.messages(entries))
        self.assertIn("A run died; the device goes back to snapshot", " ".join(self.messages(entries)))
        self.assert_migrated(system, many)

    def assert_sandboxed(self, system):
        """As the kernel had it of the running host: no new rights, three capabilities, a filter of calls, little to write."""
        status = dict(line.split(":\t", 1) for line in system.path("/srv/status").read_text().splitlines() if ":\t" in line)
        self.assertEqual(("migration-host", "1", "2"), (status["Name"], status["NoNewPrivs"], status["Seccomp"]))
        self.assertEqual(0b1011, int(status["CapBnd"], 16))
        mounts = [line.split() for line in system.path("/srv/mounts").read_text().splitlines()]
        options = {words[4]: words[5].split(",")[0] for words in mounts}
        self.assertEqual("ro", options["/"])
        self.assertEqual(["rw"] * 3, [options[place] for place in ("/var/mobile", "/tmp", "/var/lib/account-settings")])

    def test_tells_the_bus_what_running_programs_should_notice(self):
        system = self.system()
        self.started(system)
        self.put_old_accounts(system)
        system.write("/srv/work", LISTEN_WHILE_IT_RUNS)
        # Beside the start's own run, which finds nothing yet.
        system.path(SETTINGS).rename(system.path("/srv/settings"))
        system.path(LEGACY_MAIL).rename(system.path("/srv/mail"))
        system.path(LEGACY_EXCHANGE).rename(system.path("/srv/exchange"))
        self.started(system)
        self.assert_migrated(system)
        notices = " ".join(system.path("/srv/notices").read_text().split())
        self.assertIn("path=/com/vorlix/Notices; interface=com.vorlix.Notices1; member=PreferencesChanged "
                      'string "com.vorlix.mobilemail" string "MailAccounts"', notices)

    def test_runs_again_after_an_upgrade_of_the_packages(self):
        earlier = [next(EARLIER_PACKAGES.glob(f"{name}_*.deb")) for name in NAMES]
        system = self.system(earlier)
        self.put_old_accounts(system)
        shown, _ = self.started(system)
        self.assertEqual("0", shown["ExecMainStatus"])
        self.assert_migrated(system)
        kept = system.path(SETTINGS).read_bytes()
        stamp = system.path("/var/lib/account-settings/snapshots/stamp").read_bytes()
        system.bring(self.files)
        system.write("/srv/work", "dpkg --install /srv/packages/*.deb > /srv/installed 2>&1; echo $? > /srv/status-of-dpkg\n")
        self.started(system)
        self.assertEqual("0", system.path("/srv/status-of-dpkg").read_text().strip(), system.path("/srv/installed").read_text())
        version = run("dpkg-deb", "--field", self.files[1], "Version").strip()
        shown = system.inside_without_proc("dpkg-query", "--show", "--showformat", "${Version}", "migration-host")
        self.assertEqual(version, shown.strip())
        self.assertEqual("", system.inside_without_proc("dpkg", "--verify", *NAMES).strip())
        system.write("/srv/work", "")
        shown, entries = self.started(system)
        self.assertEqual(("success", "0"), (shown["Result"], shown["ExecMainStatus"]), self.messages(entries))
        self.assertEqual(kept, system.path(SETTINGS).read_bytes())
        self.assertNotEqual(stamp, system.path("/var/lib/account-settings/snapshots/stamp").read_bytes())

    def test_of_a_purged_package_finds_nothing_but_the_device(self):
        system = RealSystem(self.files)
        self.addCleanup(system.remove)
        system.add_service("last", LAST)
        system.write("/srv/work", "")
        system.bring(self.files)
        system.start()
        before = everything(system.root)
        system.inside_without_proc("sh", "-c", "dpkg --install /srv/packages/*.deb")
        self.put_old_accounts(system)
        self.started(system)
        self.assert_migrated(system)
        system.write("/srv/work", f"dpkg --purge {' '.join(NAMES)} > /srv/purged 2>&1; echo $? > /srv/status-of-dpkg\n")
        shown, entries = self.started(system)
        self.assertEqual("0", system.path("/srv/status-of-dpkg").read_text().strip(), system.path("/srv/purged").read_text())
        self.assertEqual("not-found", shown["LoadState"])
        self.assert_migrated(system)
        left = [path for path in everything(system.root) - before if not path.startswith(("var/mobile", *OF_EVERY_START))]
        self.assertEqual([], sorted(left))
        system.write("/srv/work", "")
        self.started(system)
        self.assertEqual("", system.path("/srv/failed").read_text())


# What a first start and dpkg leave, whatever is installed.
OF_EVERY_START = ("var/log", "var/lib/systemd", "var/lib/dpkg", "var/lib/private", "var/cache", "var/tmp", "srv", "etc/machine-id",
                  "etc/ld.so.cache", "etc/passwd-", "etc/group-", "etc/shadow-", "etc/gshadow-", "etc/.pwd.lock", "run", "tmp", "dev",
                  "root", "etc/.updated", "var/.updated")


def everything(root):
    return {str(Path(directory, name).relative_to(root)) for directory, names, files in os.walk(root) for name in [*names, *files]}


if __name__ == "__main__":
    unittest.main()
