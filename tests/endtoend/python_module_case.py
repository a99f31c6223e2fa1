"""What the tests of the Python module share: the module on the built library, and a device of two accounts."""

import os
import subprocess
import sys
import traceback
from pathlib import Path
from textwrap import dedent

SANITIZE = os.environ["SANITIZE"]
SOURCES = Path(os.environ["SOURCE_TREE"])
MODULES = SOURCES / "bindings/python"
LIBRARY = Path(os.environ["BUILD_TREE"]) / os.environ["LIBRARY_DIRECTORY"]
if os.environ.get("LD_LIBRARY_PATH") != str(LIBRARY):  # which the dynamic linker reads as a program starts
    os.environ["LD_LIBRARY_PATH"] = str(LIBRARY)
    os.execv(sys.executable, [sys.executable, "-B", *sys.argv])
if SANITIZE:
    sys.exit(77)  # the sanitizer's run time stands in the program, and Python has none
sys.path.insert(0, str(MODULES))

from account_settings import AccountSettings, AccountSettingsError  # noqa: E402
from accountctl_case import CLOUD, HOME_MAIL  # noqa: E402
from device import CURRENT_VERSION, SETTINGS  # noqa: E402
from device_case import DeviceTest  # noqa: E402


class PythonModule(DeviceTest):
    def setUp(self):
        super().setUp()
        self.tree = self.device(Version=CURRENT_VERSION, Accounts=[HOME_MAIL, CLOUD])

    def settings(self, **options):
        return AccountSettings(self.tree.root, time_limit=0.1, **options)

    def assert_fails(self, code, function):
        with self.assertRaises(AccountSettingsError) as caught:
            function()
        self.assertEqual(code, caught.exception.code)
        self.assertRegex(str(caught.exception), "^[^ ].*[^.]$")

    def assert_passes_in_child(self, function):
        """In a process of its own, which may become another one than this."""
        child = os.fork()
        if child == 0:
            try:
                function()
                os._exit(0)
            except BaseException:
                traceback.print_exc()
                os._exit(1)
        self.assertEqual(0, os.waitstatus_to_exitcode(os.waitpid(child, 0)[1]))

    def run_program(self, text):
        """What a program of its own prints that ends by itself, since what is dropped wrongly ends the whole process."""
        program = [sys.executable, "-B", "-c", dedent(text), self.tree.root]
        environment = {**os.environ, "PYTHONPATH": str(MODULES)}
        run = subprocess.run(program, env=environment, capture_output=True, text=True, timeout=100, check=False)
        self.assertEqual((0, ""), (run.returncode, run.stderr))
        return run.stdout

    def accounts(self):
        return self.tree.read_plist(SETTINGS)["Accounts"]
