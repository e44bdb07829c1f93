"""Standard output that takes nothing is a failure of the companions; a reader that had enough is none."""

import os
import unittest
from pathlib import Path

from support import ToolTestCase

SHOW = Path(__file__).resolve().parents[3] / "examples" / "show"
PROGRAMS = "qel-keep", "qel-check", "qel-publish"


class OutputTest(ToolTestCase):
    def setUp(self):
        super().setUp()
        self.bundle = self.path("lantern.podcast")
        self.keep = (SHOW / "reference.plist", self.bundle)
        self.assertEqual(self.run_tool(*self.keep, program="qel-keep", cwd=SHOW).status, 0)

    def runs(self):
        """Words that end with 0 and print something, but for a feed that is on standard output itself."""
        yield from ((program, (word,)) for program in PROGRAMS for word in ("--help", "--version"))
        yield "qel-keep", self.keep
        yield "qel-keep", ("--dry-run", *self.keep)
        yield "qel-check", (SHOW / "feed.xml",)

    def test_a_full_disk(self):
        for program, words in self.runs():
            with self.subTest(program, words=words), open("/dev/full", "wb") as full:
                result = self.run_tool(*words, program=program, cwd=SHOW, stdout=full)
                self.assertEqual((result.status, result.stderr.decode()), (
                    1, f"{program}: cannot write to standard output: No space left on device\n"))

    def test_the_worse_status_stays(self):
        with open("/dev/full", "wb") as full:
            result = self.run_tool(SHOW / "feed.xml", "missing.plist", program="qel-check", stdout=full)
        self.assertEqual((result.status, result.stderr.decode()), (
            2, "qel-check: missing.plist: No such file or directory\n"
               "qel-check: cannot write to standard output: No space left on device\n"))

    def test_a_reader_that_had_enough(self):
        for program, words in self.runs():
            with self.subTest(program, words=words):
                reader, writer = os.pipe()
                os.close(reader)
                with open(writer, "wb") as output:
                    result = self.run_tool(*words, program=program, cwd=SHOW, stdout=output)
                self.assertEqual((result.status, result.stderr), (0, b""))


if __name__ == "__main__":
    unittest.main()
