"""Which file belongs to which component, and so to which package: as reviewed, and each to one only."""

import fnmatch
import os
import re
import subprocess
import unittest
from pathlib import Path

from device_case import DeviceTest

BUILD_TREE = Path(os.environ["BUILD_TREE"])
LIBRARY_DIRECTORY = os.environ["LIBRARY_DIRECTORY"]
CONTENTS = Path(__file__).parent / "contents"


class Contents(DeviceTest):
    def installed(self, *component):
        prefix = self.scratch / "-".join(["prefix", *component])
        subprocess.run(
            ["cmake", "--install", BUILD_TREE, "--prefix", prefix, *component], check=True, stdout=subprocess.DEVNULL
        )
        return {str(path.relative_to(prefix)) for path in prefix.rglob("*") if path.is_symlink() or path.is_file()}

    def test_of_each_component_are_those_that_were_reviewed(self):
        for reviewed in CONTENTS.iterdir():
            with self.subTest(component=reviewed.name):
                patterns = reviewed.read_text().replace("LIB/", LIBRARY_DIRECTORY + "/").split()
                files = self.installed("--component", reviewed.name)
                unexpected = [file for file in files if not any(fnmatch.fnmatch(file, each) for each in patterns)]
                missing = [each for each in patterns if not fnmatch.filter(files, each)]
                self.assertEqual(([], []), (unexpected, missing))

    def test_of_the_documents_have_links_that_lead_somewhere(self):
        self.installed("--component", "documents")
        documents = list((self.scratch / "prefix---component-documents").rglob("*.md"))
        self.assertGreater(len(documents), 15)
        for document in documents:
            text = re.sub(r"^```.*?^```$", "", document.read_text(encoding="utf-8"), flags=re.M | re.S)
            for target in re.findall(r"\]\((?!https?:)([^)#]+)", text):
                self.assertTrue((document.parent / target).exists(), f"{document.name}: {target}")

    def test_of_all_components_are_everything_and_nothing_twice(self):
        parts = [self.installed("--component", reviewed.name) for reviewed in CONTENTS.iterdir()]
        self.assertEqual(sorted(self.installed()), sorted(file for part in parts for file in part))


if __name__ == "__main__":
    unittest.main()
