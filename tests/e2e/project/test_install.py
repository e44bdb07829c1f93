"""What "cmake --install" puts below a prefix: every file where its system looks for it, and in working order."""

import os
import re
import shutil
import subprocess
import unittest
from pathlib import Path

from support import ToolTestCase, checked, environment, tool

ROOT = Path(__file__).resolve().parents[3]
BUILD = Path(tool()).resolve().parent
DOCUMENTATION = "share/doc/qel/"
PROGRAMS = ["qel", "qel-keep", "qel-check", "qel-publish"]
INSTALLED = {
    DOCUMENTATION + "README.md": "packaging/installed-readme.md",
    DOCUMENTATION + "CHANGELOG.md": "CHANGELOG.md",
    DOCUMENTATION + "CONTRIBUTING.md": "CONTRIBUTING.md",
}


def files_below(directory):
    """The paths of all files below a directory, relative to it, without hidden ones and bytecode."""
    for path in directory.rglob("*"):
        relative = path.relative_to(directory)
        if path.is_file() and not any(part.startswith(".") or part == "__pycache__" for part in relative.parts):
            yield relative.as_posix()


def expected_files():
    """Every path below the prefix, with the source that it is a copy of, if it is one."""
    expected = dict(INSTALLED)
    for program in PROGRAMS:
        expected[f"bin/{program}"] = None  # made by the build
        expected[f"share/bash-completion/completions/{program}"] = f"packaging/completions/{program}.bash"
        expected[f"share/zsh/site-functions/_{program}"] = f"packaging/completions/_{program}"
        expected[f"share/fish/vendor_completions.d/{program}.fish"] = f"packaging/completions/{program}.fish"
    for file in files_below(ROOT / "docs"):
        if file.endswith(".1"):
            expected[f"share/man/man1/{file}"] = None  # with the version filled in
        else:
            expected[f"{DOCUMENTATION}docs/{file}"] = f"docs/{file}"
    for file in files_below(ROOT / "examples"):
        expected[f"{DOCUMENTATION}examples/{file}"] = f"examples/{file}"
    return expected


@unittest.skipUnless((BUILD / "cmake_install.cmake").exists(), "the tool does not stand in its build directory")
@unittest.skipUnless(shutil.which("cmake"), "cmake is not installed")
class InstallTest(ToolTestCase):
    def setUp(self):
        super().setUp()
        self.prefix = self.path("prefix")
        finished = subprocess.run(["cmake", "--install", str(BUILD), "--prefix", str(self.prefix)], timeout=120,
                                  stdout=subprocess.PIPE, stderr=subprocess.STDOUT, check=False)
        self.assertEqual(finished.returncode, 0, finished.stdout.decode())

    def test_every_file_is_where_it_is_looked_for(self):
        expected = expected_files()
        self.assertEqual(sorted(files_below(self.prefix)), sorted(expected))
        for installed, source in expected.items():
            with self.subTest(installed):
                copy = self.prefix / installed
                self.assertEqual(os.access(copy, os.X_OK), source is not None and os.access(ROOT / source, os.X_OK)
                                 or installed.startswith("bin/"))
                if source is not None:
                    self.assertEqual(copy.read_bytes(), (ROOT / source).read_bytes())

    def test_the_tool_runs_on_the_installed_example(self):
        reference = self.prefix / DOCUMENTATION / "examples/show/reference.plist"
        command = [str(self.prefix / "bin/qel"), "parsefeed", str(reference)]
        finished = subprocess.run(command, env=environment(), capture_output=True, timeout=60, check=False)
        self.assertSucceeds(checked(command, finished.returncode, finished.stdout, finished.stderr),
                            stdout=self.run_tool("parsefeed", reference).stdout)
        self.assertIn(b"The Lantern Garden", finished.stdout)

    def test_the_manual_names_the_version(self):
        (version,) = re.findall(r"^project\(qel VERSION ([0-9.]+)", (ROOT / "CMakeLists.txt").read_text(), re.MULTILINE)
        pages = list(self.prefix.glob("share/man/man1/*"))
        if not pages:
            self.skipTest("there is no manual page")
        for page in pages:
            text = page.read_text(encoding="utf-8")
            self.assertNotIn("@PROJECT", text)
            self.assertIn(version, text)

    def test_links_between_documents_hold(self):
        link = re.compile(r"\]\((?!https?:|#)([^)#]+)")
        count = 0
        for document in self.prefix.glob(DOCUMENTATION + "**/*.md"):
            for path in link.findall(document.read_text(encoding="utf-8")):
                with self.subTest(document=document.name, link=path):
                    self.assertTrue((document.parent / path).exists())
                    count += 1
        self.assertGreater(count, 0)


if __name__ == "__main__":
    unittest.main()
