"""The bill of materials that comes with the packages: as SPDX 2.3 has it, and true of the packages beside it."""

import hashlib
import json
import re
import tempfile
import unittest
from pathlib import Path

from packages_case import PACKAGES, package_files, run

ID = re.compile(r"SPDXRef-[A-Za-z0-9.-]+")
RELATIONSHIPS = {"DESCRIBES", "CONTAINS", "DYNAMIC_LINK", "STATIC_LINK", "DEPENDS_ON"}  # of those that there are
LICENSES = {
    "Apache-2.0", "BSD-2-Clause", "BSD-3-Clause", "MIT", "BSL-1.0", "GPL-2.0-only", "GPL-2.0-or-later", "GPL-3.0-or-later",
    "LGPL-2.0-or-later", "LGPL-2.1-only", "LGPL-2.1-or-later", "LGPL-3.0-or-later", "Zlib", "CC0-1.0", "NOASSERTION",
}
SHA1, SHA256 = 40, 64
HEADERS_ONLY = {"libcli11-dev", "libutfcpp-dev", "libxxhash-dev", "nlohmann-json3-dev"}
LIBRARIES = {"libc6", "libicu72", "libmd0", "libplist3", "libstdc++6", "libutf8proc2", "zlib1g"}


class BillOfMaterials(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        files = list(PACKAGES.glob("*.spdx.json"))
        assert len(files) == 1, files
        cls.document = json.loads(files[0].read_text(encoding="utf-8"))
        cls.packages = {package["name"]: package for package in cls.document["packages"]}
        cls.files = {file["SPDXID"]: file for file in cls.document["files"]}

    def related(self, kind, one=None):
        return {
            each["relatedSpdxElement"] for each in self.document["relationships"]
            if each["relationshipType"] == kind and one in (None, each["spdxElementId"])
        }

    def names_of(self, identifiers):
        return {package["name"] for package in self.document["packages"] if package["SPDXID"] in identifiers}

    def test_says_what_a_document_must_say(self):
        document = self.document
        self.assertEqual(("SPDX-2.3", "CC0-1.0", "SPDXRef-DOCUMENT"), tuple(document[key] for key in ("spdxVersion", "dataLicense", "SPDXID")))
        self.assertTrue(document["name"])
        self.assertRegex(document["documentNamespace"], r"^https://[^#\s]+$")
        self.assertRegex(document["creationInfo"]["created"], r"^\d{4}-\d\d-\d\dT\d\d:\d\d:\d\dZ$")
        for creator in document["creationInfo"]["creators"]:
            self.assertRegex(creator, r"^(Person|Organization|Tool): .+")

    def test_says_what_each_package_must_say(self):
        for package in self.document["packages"]:
            with self.subTest(package=package["name"]):
                self.assertRegex(package["SPDXID"], ID)
                self.assertTrue(package["name"] and package["versionInfo"])
                self.assertEqual("NOASSERTION", package["downloadLocation"])
                self.assertRegex(package["supplier"], r"^Organization: .+")
                self.assertLessEqual({package["licenseConcluded"], package["licenseDeclared"]}, LICENSES)
                self.assertTrue(package["copyrightText"])
                self.assertIs(bool, type(package["filesAnalyzed"]))
                self.assertEqual(package["filesAnalyzed"], "packageVerificationCode" in package)
                for reference in package["externalRefs"]:
                    self.assertEqual(("PACKAGE-MANAGER", "purl"), (reference["referenceCategory"], reference["referenceType"]))
                    self.assertRegex(reference["referenceLocator"], r"^pkg:deb/[a-z]+/[a-z0-9.%B+-]+@[^+\s]+\?arch=(amd64|arm64|all)$")

    def test_says_what_each_file_must_say(self):
        for file in self.document["files"]:
            self.assertRegex(file["fileName"], r"^\./")
            sums = {each["algorithm"]: len(each["checksumValue"]) for each in file["checksums"]}
            self.assertEqual({"SHA1": SHA1, "SHA256": SHA256}, sums)
            self.assertEqual(("Apache-2.0", ["Apache-2.0"]), (file["licenseConcluded"], file["licenseInfoInFiles"]))
            self.assertTrue(file["copyrightText"])

    def test_names_everything_once_and_relates_only_what_it_names(self):
        named = [each["SPDXID"] for each in (self.document, *self.document["packages"], *self.document["files"])]
        self.assertEqual(len(named), len(set(named)))
        for relationship in self.document["relationships"]:
            self.assertLessEqual({relationship["spdxElementId"], relationship["relatedSpdxElement"]}, set(named))
            self.assertIn(relationship["relationshipType"], RELATIONSHIPS)

    def test_describes_the_packages_beside_it_file_by_file(self):
        self.assertEqual(set(package_files()), self.names_of(self.related("DESCRIBES")))
        for name, deb in package_files().items():
            with self.subTest(package=name), tempfile.TemporaryDirectory() as scratch:
                package = self.packages[name]
                self.assertEqual([hashlib.sha256(deb.read_bytes()).hexdigest()], [each["checksumValue"] for each in package["checksums"]])
                run("dpkg-deb", "--extract", deb, scratch)
                standing = {f"./{path.relative_to(scratch)}": hashlib.sha1(path.read_bytes()).hexdigest()
                            for path in Path(scratch).rglob("*") if path.is_file() and not path.is_symlink()}
                contained = [self.files[each] for each in self.related("CONTAINS", package["SPDXID"])]
                self.assertEqual(standing, {file["fileName"]: file["checksums"][0]["checksumValue"] for file in contained})
                code = hashlib.sha1("".join(sorted(standing.values())).encode()).hexdigest()
                self.assertEqual(code, package["packageVerificationCode"]["packageVerificationCodeValue"])

    def test_names_the_libraries_that_are_linked_and_the_headers_that_are_compiled_in(self):
        self.assertLessEqual(LIBRARIES, self.names_of(self.related("DYNAMIC_LINK")))
        self.assertLessEqual(HEADERS_ONLY, self.names_of(self.related("STATIC_LINK")))
        self.assertEqual(set(), self.related("DYNAMIC_LINK") & self.related("STATIC_LINK"))

    def test_names_what_every_package_depends_on(self):
        for name, deb in package_files().items():
            depends = run("dpkg-deb", "--field", deb, "Depends").strip().split(", ")
            needed = {re.split(r"[ (:|]", each)[0] for each in depends if each}
            related = {kind: self.related(kind, self.packages[name]["SPDXID"]) for kind in RELATIONSHIPS}
            self.assertLessEqual(needed, self.names_of(set().union(*related.values())), name)

    def test_has_the_version_that_is_installed(self):
        version = run("dpkg-query", "--show", "--showformat", "${Version}", "libplist3").strip()
        self.assertEqual(version, self.packages["libplist3"]["versionInfo"])


if __name__ == "__main__":
    unittest.main()
