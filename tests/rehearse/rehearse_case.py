"""What the tests of migration-rehearse share: a fleet of small devices, the program, and what it left in its results."""

import json
import os
import subprocess
import tarfile
import zlib
from pathlib import Path

from device import CURRENT_VERSION, LEGACY_MAIL, SETTINGS, Device
from device_case import HOST, DeviceTest

from migration_rehearse import host, rehearsal, unpacking
from migration_rehearse.results import Results

REHEARSE = Path(os.environ["REHEARSE"])
KEPT = {"Type": "LDAP", "Class": "LDAPAccount", "Identifier": "KEPT"}
UNFIXABLE = {"Type": "Mail", "Class": "Unheard of", "Identifier": "UNFIXABLE"}


class RehearseTest(DeviceTest):
    def setUp(self):
        super().setUp()
        self.file = self.scratch / "results.sqlite"

    def image(self, name, accounts=(KEPT,), version=CURRENT_VERSION, mobile=None):
        """A device in a directory of its own."""
        device = Device(self.scratch / name)
        device.set_mobile(*(mobile or (os.getuid(), os.getgid())))
        device.write_plist(SETTINGS, {"Version": version, "Accounts": list(accounts)})
        return device.root

    def legacy_image(self, name):
        root = self.image(name)
        Device(root).write_plist(LEGACY_MAIL, {"MailAccounts": [{"AccountType": "IMAPAccount", "uniqueId": "M"}]})
        return root

    def damaged(self, name):
        """What is called an archive, and is none."""
        (self.scratch / name).write_bytes(b"nothing of the kind" * 100)
        return self.scratch / name

    def fleet(self, count):
        """Devices that all differ, every third of which loses an account."""
        return [self.image(f"device-{number}", [{**KEPT, "Identifier": f"K{number}"}, *([UNFIXABLE] * (number % 3 == 0))],
                           version=number % (CURRENT_VERSION + 1)) for number in range(count)]

    def mixed_fleet(self, count):
        """The same, a fifth of them archives, and what cannot be rehearsed: a damaged archive, nothing, no device."""
        images = [root if number % 5 else self.packed(root) for number, root in enumerate(self.fleet(count))]
        (self.scratch / "empty").mkdir()
        return [*images, self.damaged("damaged"), self.scratch / "missing", self.scratch / "empty"]

    def packed(self, root):
        archive = self.scratch / f"{root.name}.tar.gz"
        with tarfile.open(archive, "w:gz") as writer:
            writer.add(root, ".")
        return archive

    def rehearse(self, *arguments, status=0, results=None, text=None, **more):
        """Runs the program, which must end with this status; answers what it printed."""
        ended = subprocess.run(
            [REHEARSE, "--results", results or self.file, *map(str, arguments)],
            input=text, stdin=None if text is not None else subprocess.DEVNULL,
            capture_output=True, text=True, timeout=200, check=False, **more,
        )
        self.assertEqual(status, ended.returncode, ended.stdout + ended.stderr)
        return ended.stdout + ended.stderr

    def command(self, *arguments, status=0, **more):
        """Runs a command of the program that is no rehearsal."""
        ended = subprocess.run([REHEARSE, *map(str, arguments)], stdin=subprocess.DEVNULL, capture_output=True,
                               text=True, timeout=200, check=False, **more)
        self.assertEqual(status, ended.returncode, ended.stdout + ended.stderr)
        return ended.stdout + ended.stderr

    def rows(self, query, results=None):
        with Results(results or self.file, read_only=True) as opened:
            return list(opened.rows(query))

    def verdicts(self, results=None):
        """Of each image, by the name of its file: the verdict and the cause."""
        rows = self.rows("SELECT path, verdict, cause FROM images JOIN rehearsals USING (content)", results)
        return {Path(path).name: (verdict, cause) for path, verdict, cause in rows}

    def told(self, results=None):
        """Everything that is the same whoever did it, and when."""
        return sorted(self.rows(
            "SELECT path, verdict, cause, detail, status, stored_version, accounts, changed, added, converted, folded,"
            " dropped, lost, fingerprint, (SELECT group_concat(stage || action || code || count, ' ') FROM"
            " (SELECT * FROM facts JOIN kinds ON kinds.id = kind WHERE rehearsal = rehearsals.id ORDER BY stage, action,"
            " code)) FROM images JOIN rehearsals USING (content)", results))

    def document(self, path):
        """The console and the explanation of an image."""
        query = ("SELECT document FROM images JOIN rehearsals USING (content) JOIN explanations USING (fingerprint)"
                 f" WHERE path = '{path}'")
        return json.loads(zlib.decompress(self.rows(query)[0][0]))

    def plugin(self):
        (plugin,) = HOST.parent.parent.glob("lib*/**/accounts-migrator.so")
        return plugin

    def host_alone(self, first="true"):
        """Options for the real host as one that does not serve, and that does this first for each image."""
        program = self.scratch / "host-alone"
        program.write_text(f'#!/bin/sh\n[ "$1" = --serve-rehearsals ] && exit 2\n[ "$1" = --version ] || {first}\n'
                           f'exec {HOST} "$@"\n')
        program.chmod(0o755)
        resources = HOST.parent.parent / os.environ["DATA_DIRECTORY"] / "account-settings"
        return ["--host", program, "--plugin", self.plugin(), "--resources", resources]

    def rehearsed(self, path, **bounds):
        """One image, rehearsed in this process."""
        (identified,) = rehearsal.identify([rehearsal.Image(str(path))])
        if identified.fault:
            return rehearsal.unrehearsed(*identified.fault)
        program = host.Host(str(HOST))
        return rehearsal.rehearse(rehearsal.Task(
            identified.path, identified.kind, identified.content, program, program.digest(), host.Limits(),
            unpacking.Bounds(**bounds), identified.identifiers))
