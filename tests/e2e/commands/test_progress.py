"""Progress lines tell people that something happens, and must never get between a pipe and its data.

They stand on standard output, so they are printed only when the result goes elsewhere: to the path of
"-d", or into a bundle (test_bundle_progress.py).
"""

import plistlib
import unittest

from support import LOADING, NO_FEED, ToolTestCase, rss, without_publication_date


class ProgressTest(ToolTestCase):
    def setUp(self):
        super().setUp()
        self.source = self.reference({"PodcastName": "Night Walks"})

    def test_standard_output_holds_the_result_alone(self):
        for command in ("parsefeed", "createfeed"):
            with self.subTest(command):
                result = self.run_tool(command, self.source)
                self.assertSucceeds(result)
                self.assertTrue(result.stdout.startswith(b"<?xml"), result.stdout[:80])

    def test_every_source_loads_with_the_same_line(self):
        for command in ("parsefeed", "createfeed"):
            for source, stdin in ((self.source, b""), (self.feed(rss()), b""), ("-i", plistlib.dumps({}))):
                with self.subTest(command, source=source):
                    self.assertSucceeds(self.run_tool(command, source, "-d", "out", stdin=stdin), LOADING)

    def test_the_line_comes_before_a_failure(self):
        self.assertFails(self.run_tool("parsefeed", self.feed(b"<feed/>"), "-d", "out"), NO_FEED, stdout=LOADING)
        self.assertFails(self.run_tool("createbundle", self.feed(b"<feed/>")), NO_FEED, stdout=LOADING)
        self.assertFails(self.run_tool("createfeed", self.source, "-f", "xml", "-d", "out"),
                         '"xml" is not a recognized feed format.\n', stdout=LOADING)

    def test_nothing_is_told_before_the_source_is_known(self):
        self.assertFails(self.run_tool("parsefeed", "http://", "-d", "out"),
                         '"http://" is not a valid podcast source.\n')
        self.assertFails(self.run_tool("createbundle", "missing.plist"),
                         'Could not initialize podcast source with string "missing.plist".\n')
        self.assertFails(self.run_tool("-d", "out", "publish"), "Command `publish' not recognized.\n")

    def test_naming_standard_output_puts_the_line_before_the_result(self):
        for command in ("parsefeed", "createfeed"):
            expected = LOADING + without_publication_date(self.run_tool(command, self.source).stdout)
            with self.subTest(command, output="a pipe"):
                result = self.run_tool(command, self.source, "-d", "/dev/stdout")
                self.assertSucceeds(result)
                self.assertEqual(without_publication_date(result.stdout), expected)
            with self.subTest(command, output="a file"):
                with open(self.path("log"), "wb") as log:
                    result = self.run_tool(command, self.source, "-d", "/dev/stdout", stdout=log)
                self.assertEqual(result.status, 0)
                self.assertEqual(without_publication_date(self.path("log").read_bytes()), expected)

    def test_a_closed_standard_output_takes_no_line_into_another_file(self):
        before = self.source.read_bytes()
        for output in ("out", "/dev/stdout"):
            with self.subTest(output):
                result = self.run_tool("parsefeed", self.source, "-d", output, closed=(1,))
                self.assertEqual((result.status, result.stderr), (0, b""))
                self.assertEqual(self.source.read_bytes(), before)
        self.assertEqual(plistlib.loads(self.path("out").read_bytes()), {"PodcastName": "Night Walks"})


if __name__ == "__main__":
    unittest.main()
