"""The bill of materials of a release: what the linker took becomes packages with licences, in the form of SPDX 2.3."""

import hashlib
import json
import re
import shutil
import subprocess
import sys
import unittest
from pathlib import Path

from support import ToolTestCase, environment

SCRIPT = Path(__file__).resolve().parents[3] / "packaging/release/bill-of-materials"
IDENTIFIER = re.compile(r"SPDXRef-[A-Za-z0-9.-]+")
MOMENT = "2019-10-05T12:00:00Z"


def archive(name):
    """A static library of this system."""
    return next(Path("/usr/lib").glob(f"*/{name}"), None)


@unittest.skipUnless(shutil.which("dpkg-query"), "licences are looked up as Debian keeps them")
@unittest.skipUnless(archive("libz.a") and archive("libexpat.a"), "there are no static libraries")
class BillOfMaterialsTest(ToolTestCase):
    def made(self, *linked):
        """The status and the messages of a bill about these files."""
        loaded = "".join(f"LOAD {path}\n" for path in (*linked, "CMakeFiles/qel.dir/main.cpp.o", "/tmp/gone.ltrans0.o"))
        self.write("qel.map", f"Memory map\n\n{loaded}")
        self.write("qel", "the tool")
        (self.directory / "bill").mkdir()
        finished = subprocess.run([sys.executable, SCRIPT, "qel.map", "qel", "1.2.3", "bill"], cwd=self.directory,
                                  env=environment({"SOURCE_DATE_EPOCH": "1570276800"}), capture_output=True, text=True,
                                  timeout=60, check=False)
        return finished.returncode, finished.stderr

    def test_what_is_linked_in_is_there_with_its_licence(self):
        self.assertEqual(self.made(archive("libz.a"), archive("libexpat.a")), (0, ""))
        bill = json.loads(self.path("bill/qel.spdx.json").read_text(encoding="utf-8"))
        self.assertEqual((bill["spdxVersion"], bill["dataLicense"], bill["SPDXID"], bill["name"]),
                         ("SPDX-2.3", "CC0-1.0", "SPDXRef-DOCUMENT", "qel-1.2.3"))
        self.assertRegex(bill["documentNamespace"], r"^urn:uuid:[0-9a-f-]{36}$")
        self.assertEqual(bill["creationInfo"]["created"], MOMENT)
        packages = {package["SPDXID"]: package for package in bill["packages"]}
        self.assertEqual([(package["name"], package["licenseDeclared"]) for package in packages.values()],
                         [("qel", "NONE"), ("expat", "MIT"), ("zlib", "Zlib"), ("libcurl", "curl")])
        self.assertEqual(len(packages), len(bill["packages"]))
        for identifier, package in packages.items():
            self.assertTrue(IDENTIFIER.fullmatch(identifier))
            self.assertEqual((package["downloadLocation"], package["filesAnalyzed"]), ("NOASSERTION", False))
        self.assertEqual(packages["SPDXRef-qel"]["checksums"],
                         [{"algorithm": "SHA256", "checksumValue": hashlib.sha256(b"the tool").hexdigest()}])
        (reference,) = packages["SPDXRef-zlib"]["externalRefs"]
        self.assertRegex(reference["referenceLocator"], r"^pkg:deb/debian/zlib@[^+]+\?arch=source$")
        self.assertEqual([tuple(relationship.values()) for relationship in bill["relationships"]],
                         [("SPDXRef-DOCUMENT", "DESCRIBES", "SPDXRef-qel"),
                          ("SPDXRef-qel", "STATIC_LINK", "SPDXRef-expat"),
                          ("SPDXRef-qel", "STATIC_LINK", "SPDXRef-zlib"),
                          ("SPDXRef-qel", "DEPENDS_ON", "SPDXRef-libcurl")])
        self.assertLessEqual({"expat", "zlib"}, {path.name for path in self.path("bill/licences").iterdir()})

    @unittest.skipUnless(archive("libcurl.a"), "there is no such library")
    def test_a_library_whose_licence_is_unknown_is_refused(self):
        self.assertEqual(self.made(archive("libcurl.a")),
                         (1, "bill-of-materials: curl is linked in, and its licence is not known here\n"))


if __name__ == "__main__":
    unittest.main()
