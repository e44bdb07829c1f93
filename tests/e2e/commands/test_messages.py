"""The catalogue of the tool's messages, word for word, as scripts and people know them.

A failure is exit status 1, its one message on standard error and nothing on standard output. Messages
that only a fault of the tool itself could bring about are in QELDriverTest, those of bundles in test_createbundle.py.
"""

import plistlib
import unittest

from support import NO_FEED, ToolTestCase, rss

INVALID = '"{}" is not a valid podcast source.\n'
NO_SOURCE = 'Could not initialize podcast source with string "{}".\n'
UNKNOWN_FORMAT = '"{}" is not a recognized feed format.\n'
GARBAGE = b"no property list"

# The arguments, standard input, and the message.
MESSAGES = (
    (("publish", "podcast.plist"), b"", "Command `publish' not recognized.\n"),
    (("",), b"", "Command `' not recognized.\n"),
    (("parsefeed", "http://"), b"", INVALID.format("http://")),
    (("parsefeed", "pcast://"), b"", INVALID.format("pcast://")),  # as it was given
    ((), b"", INVALID.format("(null)")),
    (("createbundle",), b"", INVALID.format("(null)")),
    (("parsefeed", "-i"), GARBAGE, INVALID.format("(null)")),
    (("parsefeed", "-i", "ignored.plist"), GARBAGE, NO_SOURCE.format("ignored.plist")),
    (("parsefeed", "-i"), plistlib.dumps(["a"]), NO_SOURCE.format("(null)")),
    (("parsefeed", "missing.plist"), b"", NO_SOURCE.format("missing.plist")),
    (("parsefeed", ""), b"", NO_SOURCE.format("")),
    (("parsefeed", "Fußgänger 🚶.plist"), b"", NO_SOURCE.format("Fußgänger 🚶.plist")),
    (("-i",), plistlib.dumps({}), "No recognizable command was provided.\n"),
)


class MessageTest(ToolTestCase):
    def test_messages_about_arguments_and_standard_input(self):
        for arguments, stdin, message in MESSAGES:
            with self.subTest(arguments, stdin=stdin):
                self.assertFails(self.run_tool(*arguments, stdin=stdin), message)

    def test_a_feed_that_is_none(self):
        for document in (b'<feed xmlns="http://www.w3.org/2005/Atom"><title>t</title></feed>', b"<html/>"):
            for command in ("parsefeed", "createfeed"):
                with self.subTest(command, document=document):
                    self.assertFails(self.run_tool(command, self.feed(document)), NO_FEED)

    def test_a_malformed_feed_is_told_with_line_and_column(self):
        self.assertFails(self.run_tool("parsefeed", self.feed(b"<rss>\r\n<title>a & b</title></rss>")),
                         "Could not load source: not well-formed (invalid token) at line 2, column 11")

    def test_empty_feed(self):
        self.assertFails(self.run_tool("parsefeed", self.feed(b"")),
                         "Could not load source: Could not load or read the specified feed URL")

    def test_unknown_format(self):
        for given, shown in (("xml", "xml"), ("RSS2", "rss2"), ("", "")):
            with self.subTest(given):
                self.assertFails(self.run_tool("createfeed", self.feed(rss()), "-f", given),
                                 UNKNOWN_FORMAT.format(shown))

    def test_a_message_that_nobody_can_read_changes_nothing(self):
        for arguments in (("publish",), ("parsefeed",), ("parsefeed", "missing.plist")):
            with self.subTest(arguments):
                result = self.run_tool(*arguments, closed=(2,))
                self.assertEqual(result.status, 1)


if __name__ == "__main__":
    unittest.main()
