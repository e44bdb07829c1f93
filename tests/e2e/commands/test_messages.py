"""Every message of the tool, word for word, as scripts and people know them.

A failure is exit status 1, its one message on standard error and nothing on standard output. Messages
that only a fault of the tool itself could bring about are not here.
"""

import os
import plistlib
import unittest

from support import ToolTestCase, rss


class MessageTest(ToolTestCase):
    def test_unknown_command(self):
        self.assertFails(self.run_tool("publish", "podcast.plist"), "Command `publish' not recognized.\n")

    def test_invalid_source(self):
        self.assertFails(self.run_tool("parsefeed", "http://"), '"http://" is not a valid podcast source.\n')

    def test_invalid_source_is_shown_as_it_was_given(self):
        self.assertFails(self.run_tool("parsefeed", "pcast://"), '"pcast://" is not a valid podcast source.\n')

    def test_missing_source_is_shown_as_null(self):
        self.assertFails(self.run_tool("parsefeed"), '"(null)" is not a valid podcast source.\n')

    def test_unreadable_standard_input_without_a_source_is_shown_as_null(self):
        self.assertFails(self.run_tool("parsefeed", "-i", stdin=b"no property list"),
                         '"(null)" is not a valid podcast source.\n')

    def test_source_that_does_not_exist(self):
        self.assertFails(self.run_tool("parsefeed", "missing.plist"),
                         'Could not initialize podcast source with string "missing.plist".\n')

    def test_unreadable_standard_input_with_a_source(self):
        self.assertFails(self.run_tool("parsefeed", "-i", "ignored.plist", stdin=b"no property list"),
                         'Could not initialize podcast source with string "ignored.plist".\n')

    def test_standard_input_that_holds_no_dictionary(self):
        self.assertFails(self.run_tool("parsefeed", "-i", stdin=plistlib.dumps(["a"])),
                         'Could not initialize podcast source with string "(null)".\n')

    def test_source_text_beyond_ascii(self):
        self.assertFails(self.run_tool("parsefeed", "Fußgänger 🚶.plist"),
                         'Could not initialize podcast source with string "Fußgänger 🚶.plist".\n')

    def test_atom_feed(self):
        url = self.feed(b'<feed xmlns="http://www.w3.org/2005/Atom"><title>t</title></feed>')
        self.assertFails(self.run_tool("parsefeed", url), "Could not load source: The feed was neither RSS nor Atom")

    def test_load_message_has_no_line_break(self):
        result = self.run_tool("parsefeed", self.feed(b"<rss><channel></rss>"))
        self.assertEqual(result.status, 1)
        self.assertTrue(result.stderr.startswith(b"Could not load source: "), result.stderr)
        self.assertNotIn(b"\n", result.stderr)

    def test_load_message_tells_the_system_s_reason(self):
        result = self.run_tool("parsefeed", self.path("missing.xml").as_uri())
        self.assertLoadFails(result, f".*{os.strerror(2)}.*")

    def test_load_message_is_the_same_for_every_command(self):
        url = self.feed(b"<html/>")
        for command in ("parsefeed", "createfeed"):
            with self.subTest(command):
                self.assertFails(self.run_tool(command, url),
                                 "Could not load source: The feed was neither RSS nor Atom")

    def test_empty_feed(self):
        self.assertFails(self.run_tool("parsefeed", self.feed(b"")),
                         "Could not load source: Could not load or read the specified feed URL")

    def test_unknown_format(self):
        self.assertFails(self.run_tool("createfeed", self.feed(rss()), "-f", "xml"),
                         '"xml" is not a recognized feed format.\n')

    def test_unknown_format_is_shown_in_lower_case(self):
        self.assertFails(self.run_tool("createfeed", self.feed(rss()), "-f", "RSS2"),
                         '"rss2" is not a recognized feed format.\n')

    def test_empty_format(self):
        self.assertFails(self.run_tool("createfeed", self.feed(rss()), "-f", ""),
                         '"" is not a recognized feed format.\n')

    def test_no_command(self):
        self.assertFails(self.run_tool("-i", stdin=plistlib.dumps({})), "No recognizable command was provided.\n")

    def test_a_message_that_nobody_can_read_changes_nothing(self):
        for arguments in (("publish",), ("parsefeed",), ("parsefeed", "missing.plist")):
            with self.subTest(arguments):
                result = self.run_tool(*arguments, closed=(2,))
                self.assertEqual(result.status, 1)


if __name__ == "__main__":
    unittest.main()
