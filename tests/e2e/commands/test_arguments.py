"""Scripts call the tool with every order and spelling of arguments that once worked; here is what the whole tool
makes of them.

Which words and options are what is in QELArgumentsTest. The order in which faults are looked for decides which
message people see, and nothing that stands among the arguments ends the tool otherwise than with status 0 or 1.
"""

import plistlib
import subprocess
import unittest

from support import LOADING, NO_FEED, ToolTestCase, checked, rss, start

PODCAST = {"PodcastName": "Night Walks"}


class ArgumentTest(ToolTestCase):
    def setUp(self):
        super().setUp()
        self.reference(PODCAST, name="podcast.plist")

    def assertWritesReference(self, *arguments):
        """The arguments make the tool write the podcast's reference file on standard output."""
        result = self.run_tool(*arguments)
        self.assertSucceeds(result)
        self.assertEqual(plistlib.loads(result.stdout), PODCAST)


class ScanTest(ArgumentTest):
    def test_options_stand_anywhere_and_unknown_ones_are_ignored(self):
        self.assertSucceeds(self.run_tool("-x", "-directory", "out", "parsefeed", "--d", "podcast.plist", "-",
                                          "missing.plist"), LOADING)
        self.assertEqual(plistlib.loads(self.path("out").read_bytes()), PODCAST)

    def test_an_output_option_without_value_counts_as_not_given(self):
        self.assertWritesReference("parsefeed", "podcast.plist", "-d", "out", "-d")
        self.assertFalse(self.path("out").exists())

    def test_parsefeed_does_not_look_at_the_format(self):
        self.assertWritesReference("parsefeed", "podcast.plist", "-f", "xml")

    def test_formats_are_accepted_in_any_case(self):
        for name, is_rss in (("RSS", True), ("Atom", False)):
            with self.subTest(name):
                result = self.run_tool("createfeed", "podcast.plist", "-f", name)
                self.assertSucceeds(result)
                self.assertEqual(b"<rss " in result.stdout, is_rss)


class OrderOfChecksTest(ArgumentTest):
    def test_an_unknown_command_comes_before_everything_else(self):
        self.assertFails(self.run_tool("-i", "-f", "xml", "-d", "out", "publish", "http://", stdin=b"garbage"),
                         "Command `publish' not recognized.\n")

    def test_an_unknown_command_ends_the_run_without_reading_standard_input(self):
        self.assertEqual(self.status_with_open_input("-i", "publish"), 1)

    def test_standard_input_is_left_alone_without_its_option(self):
        self.assertEqual(self.status_with_open_input("parsefeed", "podcast.plist"), 0)
        self.assertEqual(self.status_with_open_input(), 1)

    def status_with_open_input(self, *arguments):
        """The exit status of a run whose standard input never ends."""
        with start(*arguments, cwd=self.directory, stdin=subprocess.PIPE, stdout=subprocess.DEVNULL,
                   stderr=subprocess.DEVNULL) as process:
            try:
                return checked(arguments, process.wait(timeout=30)).status
            finally:
                process.kill()

    def test_the_format_is_looked_at_after_the_source(self):
        self.assertFails(self.run_tool("createfeed", "http://", "-f", "xml"),
                         '"http://" is not a valid podcast source.\n')
        self.assertFails(self.run_tool("createfeed", "missing.plist", "-f", "xml"),
                         'Could not initialize podcast source with string "missing.plist".\n')
        self.assertFails(self.run_tool("createfeed", self.feed(b"<feed/>"), "-f", "xml"), NO_FEED)

    def test_the_format_is_looked_at_after_loading(self):
        server = self.server()
        url = server.serve("/feed.xml", rss("<title>Night Walks</title>"))
        self.assertFails(self.run_tool("createfeed", url, "-f", "xml"), '"xml" is not a recognized feed format.\n')
        self.assertEqual(server.hits("/feed.xml"), 1)

    def test_a_missing_command_is_noticed_after_loading(self):
        result = self.run_tool("-i", "-d", "out", stdin=plistlib.dumps(PODCAST))
        self.assertFails(result, "No recognizable command was provided.\n", stdout=LOADING)
        self.assertFalse(self.path("out").exists())
        self.assertFails(self.run_tool("-i", stdin=b"garbage"), '"(null)" is not a valid podcast source.\n')


class HostileArgumentTest(ArgumentTest):
    def test_arguments_that_are_no_text(self):
        for argument in (b"\xff\xfe", b"http://\xff/", b"file:///\xc3", b"-\xff", b"\xed\xa0\x80"):
            with self.subTest(argument):
                self.assertEqual(self.run_tool(argument).status, 1)
                self.assertEqual(self.run_tool(b"parsefeed", argument).status, 1)
                self.assertEqual(self.run_tool(b"createfeed", b"podcast.plist", b"-f", argument).status, 1)

    def test_an_argument_with_format_characters_is_shown_as_it_is(self):
        for argument in ("%s%s%n", "%@%@", "100%", "%", "\\n", "a\tb"):
            with self.subTest(argument):
                self.assertFails(self.run_tool(argument), f"Command `{argument}' not recognized.\n")
                self.assertNoSource(argument)

    def test_a_very_long_argument(self):
        argument = "a" * 100_000
        self.assertFails(self.run_tool(argument), f"Command `{argument}' not recognized.\n")
        self.assertNoSource(argument)

    def test_very_many_arguments(self):
        self.assertWritesReference("parsefeed", "podcast.plist", *["-x", "more"] * 10_000)


if __name__ == "__main__":
    unittest.main()
