"""Progress lines tell people that something happens, and must never get between a pipe and its data.

They stand on standard output, so they are printed only when the result goes elsewhere: to the path of
"-d", or into a bundle.
"""

import plistlib
import unittest

from support import LOADING, ToolTestCase, rss, without_publication_date


class ProgressTest(ToolTestCase):
    def setUp(self):
        super().setUp()
        self.source = self.reference({"PodcastName": "Night Walks"})

    def test_parsefeed_to_standard_output_is_silent(self):
        result = self.run_tool("parsefeed", self.source)
        self.assertSucceeds(result)
        self.assertTrue(result.stdout.startswith(b"<?xml"), result.stdout[:80])

    def test_createfeed_to_standard_output_is_silent(self):
        result = self.run_tool("createfeed", self.source)
        self.assertSucceeds(result)
        self.assertTrue(result.stdout.startswith(b"<?xml"), result.stdout[:80])

    def test_parsefeed_to_a_file_tells_that_it_loads(self):
        self.assertSucceeds(self.run_tool("parsefeed", self.source, "-d", "out"), LOADING)

    def test_createfeed_to_a_file_tells_that_it_loads(self):
        self.assertSucceeds(self.run_tool("createfeed", self.source, "-d", "out"), LOADING)

    def test_a_feed_loads_with_the_same_line(self):
        self.assertSucceeds(self.run_tool("parsefeed", self.feed(rss()), "-d", "out"), LOADING)

    def test_standard_input_loads_with_the_same_line(self):
        result = self.run_tool("parsefeed", "-i", "-d", "out", stdin=plistlib.dumps({}))
        self.assertSucceeds(result, LOADING)

    def test_the_line_comes_before_a_failed_load(self):
        result = self.run_tool("parsefeed", self.feed(b"<feed/>"), "-d", "out")
        self.assertFails(result, "Could not load source: The feed was neither RSS nor Atom", stdout=LOADING)

    def test_the_line_comes_before_an_unknown_format(self):
        result = self.run_tool("createfeed", self.source, "-f", "xml", "-d", "out")
        self.assertFails(result, '"xml" is not a recognized feed format.\n', stdout=LOADING)

    def test_nothing_is_told_before_the_source_is_known(self):
        self.assertFails(self.run_tool("parsefeed", "http://", "-d", "out"),
                         '"http://" is not a valid podcast source.\n')
        self.assertFails(self.run_tool("parsefeed", "missing.plist", "-d", "out"),
                         'Could not initialize podcast source with string "missing.plist".\n')

    def test_nothing_is_told_to_an_unknown_command(self):
        self.assertFails(self.run_tool("-d", "out", "publish"), "Command `publish' not recognized.\n")

    def test_createbundle_tells_that_it_loads_without_an_output_path(self):
        self.assertFails(self.run_tool("createbundle", self.feed(b"<feed/>")),
                         "Could not load source: The feed was neither RSS nor Atom", stdout=LOADING)

    def test_an_output_option_without_value_is_silent(self):
        result = self.run_tool("parsefeed", self.source, "-d")
        self.assertSucceeds(result)
        self.assertEqual(plistlib.loads(result.stdout), {"PodcastName": "Night Walks"})

    def test_naming_standard_output_puts_the_line_before_the_reference_file(self):
        plain = self.run_tool("parsefeed", self.source)
        self.assertSucceeds(self.run_tool("parsefeed", self.source, "-d", "/dev/stdout"), LOADING + plain.stdout)

    def test_naming_standard_output_puts_the_line_before_the_feed(self):
        plain = self.run_tool("createfeed", self.source)
        named = self.run_tool("createfeed", self.source, "-d", "/dev/stdout")
        self.assertSucceeds(named)
        self.assertEqual(without_publication_date(named.stdout), LOADING + without_publication_date(plain.stdout))

    def test_the_line_stays_first_when_standard_output_is_a_file(self):
        with open(self.path("log"), "wb") as log:
            self.assertEqual(self.run_tool("parsefeed", self.source, "-d", "/dev/stdout", stdout=log).status, 0)
        plain = self.run_tool("parsefeed", self.source)
        self.assertEqual(self.path("log").read_bytes(), LOADING + plain.stdout)

    def test_a_closed_standard_output_does_not_matter(self):
        result = self.run_tool("parsefeed", self.source, "-d", "out", closed=(1,))
        self.assertEqual((result.status, result.stderr), (0, b""))
        self.assertEqual(plistlib.loads(self.path("out").read_bytes()), {"PodcastName": "Night Walks"})

    def test_a_closed_standard_output_takes_no_line_into_another_file(self):
        before = self.source.read_bytes()
        self.assertEqual(self.run_tool("createfeed", self.source, "-d", "/dev/stdout", closed=(1,)).status, 0)
        self.assertEqual(self.source.read_bytes(), before)


if __name__ == "__main__":
    unittest.main()
