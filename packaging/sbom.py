"""Writes the bill of materials of the Debian packages that a build made, as SPDX 2.3.

    sbom.py BUILD-TREE OUTPUT PACKAGE...

What a package is made of is taken from what was built: the libraries that its programs ask for, the headers of other
projects that were compiled into them, and what the package depends on. The time is that of SOURCE_DATE_EPOCH.
"""

import hashlib
import json
import os
import re
import subprocess
import sys
import tempfile
from datetime import datetime, timezone
from pathlib import Path
from typing import NamedTuple

SUPPLIER = "Organization: Vorlix (account-settings@vorlix.com)"
LICENSE, COPYRIGHT = "Apache-2.0", "2026 The account-settings developers"
UNSAID = "NOASSERTION"
# As Debian's copyright files call them, and as SPDX does.
LICENSES = {
    "Apache-2.0": "Apache-2.0", "BSD-2-clause": "BSD-2-Clause", "BSD-3-clause": "BSD-3-Clause", "Expat": "MIT", "MIT": "MIT",
    "BSL-1.0": "BSL-1.0", "GPL-2": "GPL-2.0-only", "GPL-2+": "GPL-2.0-or-later", "GPL-3+": "GPL-3.0-or-later",
    "LGPL-2.1": "LGPL-2.1-only", "LGPL-2.1+": "LGPL-2.1-or-later", "LGPL-2+": "LGPL-2.0-or-later",
    "LGPL-3+": "LGPL-3.0-or-later", "Zlib": "Zlib", "zlib": "Zlib", "CC0-1.0": "CC0-1.0",
}


def output_of(*command, **more):
    return subprocess.run([str(word) for word in command], check=True, capture_output=True, text=True, **more).stdout


class DebianPackage(NamedTuple):
    """One that is installed where this was built."""

    name: str
    version: str
    architecture: str
    source: str

    @classmethod
    def installed(cls, name):
        wanted = "${binary:Package}\t${Version}\t${Architecture}\t${source:Package}\n"
        line = output_of("dpkg-query", "--show", "--showformat", wanted, name).splitlines()[0]
        full_name, *rest = line.split("\t")
        return cls(full_name.partition(":")[0], *rest)

    def license(self):
        """What its copyright file says of most files, where it says so in a way that programs read."""
        file = Path("/usr/share/doc") / self.name / "copyright"
        text = file.read_text(encoding="utf-8", errors="replace") if file.is_file() else ""
        said = re.search(r"^Files:\s*\*$(?:.|\n)*?^License:\s*(\S+)$", text, re.MULTILINE)
        return LICENSES.get(said[1], UNSAID) if said else UNSAID

    def described(self):
        return {
            "SPDXID": f"SPDXRef-Debian-{spdx_word(self.name)}",
            "name": self.name,
            "versionInfo": self.version,
            "supplier": "Organization: Debian",
            "downloadLocation": UNSAID,
            "filesAnalyzed": False,
            "licenseConcluded": UNSAID,
            "licenseDeclared": self.license(),
            "licenseComments": "Declared: what the copyright file says of most files of the source package.",
            "copyrightText": UNSAID,
            "sourceInfo": f"Debian source package {self.source}",
            "externalRefs": [purl("debian", self.name, self.version, self.architecture)],
        }


def spdx_word(text):
    return re.sub(r"[^A-Za-z0-9.-]", "-", text)


def purl(vendor, name, version, architecture):
    locator = f"pkg:deb/{vendor}/{name.replace('+', '%2B')}@{version.replace('+', '%2B')}?arch={architecture}"
    return {"referenceCategory": "PACKAGE-MANAGER", "referenceType": "purl", "referenceLocator": locator}


def checksum(algorithm, content):
    return {"algorithm": algorithm, "checksumValue": hashlib.new(algorithm.lower(), content).hexdigest()}


def owners_of(patterns):
    """{path: name of the Debian package that has it}"""
    found = subprocess.run(["dpkg-query", "--search", *patterns], check=False, capture_output=True, text=True).stdout
    lines = [line.rpartition(": ") for line in found.splitlines() if not line.startswith("diversion by")]
    return {path: names.split(",")[0] for names, _, path in lines}


class Build:
    """What the build's own records tell."""

    def __init__(self, tree):
        self.tree = tree
        self.headers = {}
        for line in output_of("ninja", "-C", tree, "-t", "deps").splitlines():
            if line and not line.startswith(" "):
                headers = self.headers.setdefault(line.partition(":")[0], [])
            elif line:
                headers.append(line.strip())

    def target_of(self, binary):
        found = sorted(path.relative_to(self.tree) for path in self.tree.rglob(binary.name) if not path.is_symlink())
        return next((path for path in found if path.parts[0] in ("bin", "lib")), None)

    def objects_of(self, target):
        """The object files that were linked into it, also by way of archives."""
        inputs = re.search(r"^  input:.*\n((?:    .*\n)*)", output_of("ninja", "-C", self.tree, "-t", "query", target), re.M)
        for line in inputs[1].splitlines() if inputs else ():
            name = line.strip().lstrip("| ")
            if name.endswith(".o"):
                yield name
            elif name.endswith(".a"):
                yield from self.objects_of(name)

    def headers_in(self, binary):
        target = self.target_of(binary)
        names = {header for each in self.objects_of(target) for header in self.headers.get(each, ())} if target else set()
        paths = {os.path.normpath(self.tree / name) for name in names}
        return {path for path in paths if path.startswith("/usr/")}


class OwnPackage:
    """One of the packages that were built, unpacked."""

    def __init__(self, file, place):
        self.file = file
        self.name, self.version, self.architecture, depends = (
            output_of("dpkg-deb", "--field", file, field).strip() for field in ("Package", "Version", "Architecture", "Depends"))
        output_of("dpkg-deb", "--extract", file, place)
        self.files = sorted(path for path in place.rglob("*") if path.is_file() and not path.is_symlink())
        self.names = {path: f"./{path.relative_to(place)}" for path in self.files}
        self.binaries = [path for path in self.files if path.read_bytes()[:4] == b"\x7fELF"]
        self.depends = [re.split(r"[ (:|]", each.strip())[0] for each in depends.split(",") if each.strip()]
        self.id = f"SPDXRef-Package-{spdx_word(self.name)}"

    def needed(self):
        """The names of the libraries that the programs in it ask for."""
        tables = [output_of("readelf", "--dynamic", "--wide", path) for path in self.binaries]
        return {name for table in tables for name in re.findall(r"\(NEEDED\).*\[(.*)\]", table)}

    def described(self):
        sums = sorted(hashlib.sha1(path.read_bytes()).hexdigest() for path in self.files)
        return {
            "SPDXID": self.id,
            "name": self.name,
            "versionInfo": self.version,
            "packageFileName": self.file.name,
            "supplier": SUPPLIER,
            "downloadLocation": UNSAID,
            "filesAnalyzed": True,
            "packageVerificationCode": {"packageVerificationCodeValue": hashlib.sha1("".join(sums).encode()).hexdigest()},
            "licenseConcluded": LICENSE,
            "licenseDeclared": LICENSE,
            "licenseInfoFromFiles": [LICENSE],
            "copyrightText": COPYRIGHT,
            "checksums": [checksum("SHA256", self.file.read_bytes())],
            "externalRefs": [purl("vorlix", self.name, self.version, self.architecture)],
        }

    def described_files(self):
        for path in self.files:
            mark = hashlib.sha256(f"{self.name} {self.names[path]}".encode()).hexdigest()[:16]
            content = path.read_bytes()
            yield {
                "SPDXID": f"SPDXRef-File-{mark}",
                "fileName": self.names[path],
                "checksums": [checksum("SHA1", content), checksum("SHA256", content)],
                "licenseConcluded": LICENSE,
                "licenseInfoInFiles": [LICENSE],
                "copyrightText": COPYRIGHT,
            }


def relation(one, kind, other):
    return {"spdxElementId": one, "relationshipType": kind, "relatedSpdxElement": other}


class Materials:
    """What the packages are made of, and how: {(package, kind, name of a Debian package)}"""

    def __init__(self, build, packages):
        self.own = {package.name: package.id for package in packages}
        self.relations, self.debian = set(), {}
        self.multiarch = output_of("dpkg-architecture", "--query", "DEB_HOST_MULTIARCH").strip()
        libraries = {path.name: package for package in packages for path in package.binaries}
        for package in packages:
            self.add_linked(package, libraries)
        linked = {each.source for each in self.debian.values()}
        for package in packages:
            self.add_compiled_in(package, build, linked)
            self.add_depended_on(package)

    def debian_id(self, name):
        if name not in self.debian:
            self.debian[name] = DebianPackage.installed(name)
        return self.debian[name].described()["SPDXID"]

    def add(self, package, kind, other):
        if other != package.id and not any((package.id, known, other) in self.relations for known in ("DYNAMIC_LINK", "STATIC_LINK")):
            self.relations.add((package.id, kind, other))

    def add_linked(self, package, libraries):
        of_system = []
        for name in sorted(package.needed()):
            holder = next((libraries[file] for file in libraries if file == name or file.startswith(name + ".")), None)
            self.add(package, "DYNAMIC_LINK", holder.id) if holder else of_system.append(f"*/{self.multiarch}/{name}")
        for owner in sorted(set(owners_of(of_system).values())) if of_system else ():
            self.add(package, "DYNAMIC_LINK", self.debian_id(owner.partition(":")[0]))

    def add_compiled_in(self, package, build, linked):
        headers = sorted(set().union(*(build.headers_in(path) for path in package.binaries), set()))
        for owner in sorted(set(owners_of(headers).values())) if headers else ():
            name = owner.partition(":")[0]
            if DebianPackage.installed(name).source not in linked:
                self.add(package, "STATIC_LINK", self.debian_id(name))

    def add_depended_on(self, package):
        for name in package.depends:
            self.add(package, "DEPENDS_ON", self.own[name] if name in self.own else self.debian_id(name))


def document_of(build_tree, packages):
    materials = Materials(Build(build_tree), packages)
    described = [package.described() for package in packages]
    files = {package.id: list(package.described_files()) for package in packages}
    mark = hashlib.sha256("".join(each["checksums"][0]["checksumValue"] for each in described).encode()).hexdigest()
    time = datetime.fromtimestamp(int(os.environ["SOURCE_DATE_EPOCH"]), timezone.utc)
    relations = [
        *(relation("SPDXRef-DOCUMENT", "DESCRIBES", package.id) for package in packages),
        *(relation(package.id, "CONTAINS", file["SPDXID"]) for package in packages for file in files[package.id]),
        *(relation(*each) for each in sorted(materials.relations)),
    ]
    return {
        "spdxVersion": "SPDX-2.3",
        "dataLicense": "CC0-1.0",
        "SPDXID": "SPDXRef-DOCUMENT",
        "name": f"account-settings-{packages[0].version}",
        "documentNamespace": f"https://vorlix.com/spdx/account-settings-{packages[0].version}-{mark}",
        "creationInfo": {"created": time.strftime("%Y-%m-%dT%H:%M:%SZ"), "creators": [SUPPLIER, "Tool: sbom.py"]},
        "packages": [*described, *(each.described() for _, each in sorted(materials.debian.items()))],
        "files": [file for package in packages for file in files[package.id]],
        "relationships": relations,
    }


def main(build_tree, output, *files):
    with tempfile.TemporaryDirectory() as scratch:
        packages = [OwnPackage(Path(file), Path(scratch) / Path(file).name) for file in sorted(files)]
        document = document_of(Path(build_tree).resolve(), packages)
    Path(output).write_text(json.dumps(document, indent=2, ensure_ascii=False) + "\n", encoding="utf-8")


if __name__ == "__main__":
    main(*sys.argv[1:])
