"""What the tests of the packages share: where they are, and how commands are run on them."""

import os
import subprocess
from pathlib import Path

SOURCES = Path(os.environ["SOURCE_TREE"])
PACKAGES = SOURCES / "build" / "package" / "packages"
# The same sources under an earlier version.
EARLIER_PACKAGES = SOURCES / "build" / "earlier" / "packages"
NAMES = [
    "account-settings-doc", "accountctl", "libaccountsettings-dev", "libaccountsettings-doc", "libaccountsettings1",
    "migration-host", "migration-rehearse",
    "python3-account-settings",
]


def package_files():
    """The newest packages by name."""
    return {name: max(PACKAGES.glob(f"{name}_*.deb"), key=os.path.getmtime) for name in NAMES}


def debug_symbols_of(name):
    return max(PACKAGES.glob(f"{name}-dbgsym_*.ddeb"), key=os.path.getmtime)


def run(*command, **more):
    ended = subprocess.run(
        [str(part) for part in command],
        stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True, check=False, **more,
    )
    if ended.returncode != 0:
        raise AssertionError(f"{command} ended with {ended.returncode}:\n{ended.stdout}")
    return ended.stdout
