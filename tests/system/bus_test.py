"""The notices on a bus with the installed policy: who may send them, who hears them, and that they are as described."""

import os
import pwd
import re
import shutil
import subprocess
import tempfile
import time
import unittest
from pathlib import Path
from xml.etree import ElementTree

from device import plain_environment
from device_case import HOST, DeviceTest

SOURCES = Path(os.environ["SOURCE_TREE"]) / "system"
INTERFACE = "com.vorlix.Notices1"
# Users that every Debian machine has: one in the place of mobile, which a machine that builds lacks, and a stranger.
MOBILE, STRANGER = "daemon", "nobody"
# As the system's own bus begins: signals are free, unless a policy says otherwise.
CONFIGURATION = """<busconfig><type>system</type><listen>unix:path={socket}</listen><auth>EXTERNAL</auth>
<policy context="default"><allow user="*"/><deny own="*"/><deny send_type="method_call"/>
<allow send_type="signal"/><allow send_requested_reply="true" send_type="method_return"/>
<allow receive_type="method_call"/><allow receive_type="method_return"/><allow receive_type="error"/>
<allow receive_type="signal"/><allow send_destination="org.freedesktop.DBus"/></policy>
<include>{policy}</include></busconfig>"""


def become(name):
    entry = pwd.getpwnam(name)

    def change():
        os.setgroups([])
        os.setgid(entry.pw_gid)
        os.setuid(entry.pw_uid)

    return change


class Bus:
    def __init__(self, directory):
        directory.chmod(0o755)
        policy = (SOURCES / f"{INTERFACE}.conf").read_text().replace('user="mobile"', f'user="{MOBILE}"')
        (directory / "policy.conf").write_text(policy)
        configuration = directory / "bus.conf"
        configuration.write_text(
            CONFIGURATION.format(socket=directory / "socket", policy=directory / "policy.conf")
        )
        self.environment = {**plain_environment(), "DBUS_SYSTEM_BUS_ADDRESS": f"unix:path={directory}/socket"}
        self.daemon = subprocess.Popen(
            ["dbus-daemon", f"--config-file={configuration}", "--nofork", "--nosyslog", "--print-address"],
            stdout=subprocess.PIPE,
        )
        self.daemon.stdout.readline()

    def listen(self, user):
        """A listener that is known to hear: it has heard a signal that anybody may send."""
        listener = Listener(self, user)
        while not listener.heard_until("Ready", 0.2):
            self.send("com.vorlix.Test", "Ready", STRANGER)
        return listener

    def send(self, interface, member, user, *arguments):
        subprocess.run(
            ["dbus-send", "--system", "/com/vorlix/Notices", f"{interface}.{member}", *arguments],
            env=self.environment, preexec_fn=become(user), check=True,
        )

    def stop(self):
        self.daemon.kill()
        self.daemon.wait()
        self.daemon.stdout.close()


class Listener:
    def __init__(self, bus, user):
        self.bus = bus
        self.output = tempfile.TemporaryFile()
        self.program = subprocess.Popen(
            ["dbus-monitor", "--system", "type='signal',path='/com/vorlix/Notices'"],
            env=bus.environment, preexec_fn=become(user), stdout=self.output, stderr=subprocess.DEVNULL,
        )

    def signals(self):
        """What was heard: the member and the types of its arguments, in order."""
        self.output.seek(0)
        heard = []
        for line in self.output.read().decode().splitlines():
            signal = re.search(rf"interface={INTERFACE}; member=(\w+)", line)
            if signal:
                heard.append((signal[1], []))
            elif re.match(r" +\w+ ", line) and heard:
                heard[-1][1].append(line.split()[0])
        return heard

    def heard_until(self, member, patience=10.0):
        end = time.monotonic() + patience
        while time.monotonic() < end:
            self.output.seek(0)
            if f"member={member}\n" in self.output.read().decode():
                return True
            time.sleep(0.02)
        return False

    def stop(self):
        self.program.kill()
        self.program.wait()
        self.output.close()


def described():
    """The signals of the introspection file, with the types of their arguments as a listener shows them."""
    node = ElementTree.parse(SOURCES / f"{INTERFACE}.xml").getroot()
    shown = {"s": "string", "b": "boolean"}
    return {
        signal.get("name"): [shown[argument.get("type")] for argument in signal.findall("arg")]
        for signal in node.find(f"interface[@name='{INTERFACE}']").findall("signal")
    }


@unittest.skipUnless(os.getuid() == 0, "only root can send and listen as others")
@unittest.skipUnless(shutil.which("dbus-daemon"), "needs dbus-daemon")
class Notices(DeviceTest):
    def setUp(self):
        super().setUp()
        self.bus = Bus(self.scratch)
        self.addCleanup(self.bus.stop)
        self.listener = self.bus.listen(STRANGER)
        self.addCleanup(self.listener.stop)

    def heard(self):
        """Everything that was sent before now."""
        self.bus.send("com.vorlix.Test", "Done", STRANGER)
        self.assertTrue(self.listener.heard_until("Done"))
        return self.listener.signals()

    def test_of_a_run_on_an_image_are_not_sent_to_this_machine(self):
        device = self.example("first-generation")
        run = device.migrate(HOST, "--shared-resources", device.path("var/mobile"), environment=self.bus.environment)
        self.assertEqual(0, run.status)
        self.assertLess({"preferences-changed", "cloud-tabs"}, {event["event"] for event in run.events})
        self.assertEqual([], self.heard())

    def test_may_be_sent_by_root_and_the_mobile_user_and_are_heard_as_they_are_described(self):
        for sender in ("root", MOBILE):
            self.bus.send(INTERFACE, "CloudTabs", sender, "boolean:true")
            self.bus.send(INTERFACE, "PreferencesChanged", sender, "string:domain", "string:key")
        sent = [(name, described()[name]) for name in ("CloudTabs", "PreferencesChanged")]
        self.assertEqual(sent * 2, self.heard())

    def test_may_be_sent_by_nobody_else(self):
        self.bus.send(INTERFACE, "CloudTabs", STRANGER, "boolean:true")
        self.assertEqual([], self.heard())


if __name__ == "__main__":
    unittest.main()
