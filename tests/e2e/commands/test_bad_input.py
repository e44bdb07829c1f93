"""Input made by accident: never a crash, and never a byte of what was there lost.

A refused feed names the line and the column of its fault. What enemies make is in test_hostile_feeds.py and
test_hostile_lists.py.
"""

import plistlib
import random
import re
import unittest

from support import LOADING, ToolTestCase


class IllFormedTest(ToolTestCase):
    # The document, and the line and the column (from 1) at which the fault begins.
    FAULTS = (
        ("a wrong end tag", b"<rss>\n <channel>\n  </rss>", 3, 3),
        ("a wrong end tag in the first line", b"<rss></channel>", 1, 6),
        ("an ampersand", b"<rss>\n<title>a & b</title></rss>", 2, 10),
        ("an undeclared entity", b"<rss>\n\n <title>&nbsp;</title></rss>", 3, 9),
        ("a character that XML cannot hold", b"<rss>\n<title>ab\x01</title></rss>", 2, 10),
        ("a reference that XML cannot hold", b"<rss><title>&#1;</title></rss>", 1, 13),
        ("an attribute without quotes", b"<rss>\r\n<a b=c/></rss>", 2, 6),
        ("an attribute twice", b"<rss>\n<a b='1' b='2'/></rss>", 2, 10),
        ("something behind the root", b"<rss/>\n\n<rss/>", 3, 1),
        ("text behind the root", b"<rss/>\nx", 2, 1),
        ("text alone", b"Night Walks", 1, 1),
        ("a nul", b"<rss>\n<title>\0</title></rss>", 2, 8),
    )

    def test_a_fault_is_told_with_its_line_and_column(self):
        for name, document, line, column in self.FAULTS:
            with self.subTest(name):
                result = self.run_tool("parsefeed", self.feed(document))
                self.assertLoadFails(result)
                place = re.search(r"line (\d+), column (\d+)", result.stderr.decode())
                self.assertIsNotNone(place, result.stderr)
                self.assertEqual(int(place[1]), line, result.stderr)
                self.assertLessEqual(abs(int(place[2]) - column), 2, result.stderr)

    def test_columns_count_characters_and_lines_any_line_end(self):
        for name, document, line in (("Unix", b"<rss>\n\n&\n</rss>", 3), ("DOS", b"<rss>\r\n\r\n&\r\n</rss>", 3),
                                     ("wide characters", "<rss>\n夜夜夜&</rss>".encode(), 2)):
            with self.subTest(name):
                result = self.run_tool("parsefeed", self.feed(document))
                self.assertLoadFails(result, rf".*line {line}, column \d+.*")

    def test_a_document_that_ends_too_early_is_told_at_its_end(self):
        for name, document in (("in text", b"<rss>\n<channel>\n<title>a"), ("in a tag", b"<rss>\n<channel>\n<ti"),
                               ("in an attribute", b"<rss>\n<channel>\n<a b='"),
                               ("in a comment", b"<rss>\n<channel>\n<!-- a"),
                               ("in CDATA", b"<rss>\n<channel>\n<![CDATA[a"),
                               ("in an entity", b"<rss>\n<channel>\na&am")):
            with self.subTest(name):
                self.assertLoadFails(self.run_tool("parsefeed", self.feed(document)), r".*line 3, column \d+.*")

    def test_white_space_before_the_declaration_is_counted(self):
        document = b"\n\n<?xml version='1.0'?>\n<rss>&</rss>"
        self.assertLoadFails(self.run_tool("parsefeed", self.feed(document)), r".*line 4, column \d+.*")

    def test_nothing_is_written_for_a_refused_feed(self):
        self.write("out", b"old")
        for command in ("parsefeed", "createfeed"):
            for content in (b"<rss><channel></rss>", b"<feed/>", b"", b"\0" * 100):
                with self.subTest(command, content=content[:20]):
                    self.assertLoadFails(self.run_tool(command, self.feed(content), "-d", "out"), stdout=LOADING)
                    self.assertEqual(self.path("out").read_bytes(), b"old")
                    self.assertLoadFails(self.run_tool(command, self.feed(content), "-d", "new"), stdout=LOADING)
                    self.assertFalse(self.path("new").exists())


class NoFeedTest(ToolTestCase):
    NEITHER = "Could not load source: The feed was neither RSS nor Atom"

    def test_an_atom_feed(self):
        document = (b"<?xml version='1.0'?><feed xmlns='http://www.w3.org/2005/Atom'><title>t</title>"
                    b"<entry><title>e</title></entry></feed>")
        self.assertFails(self.run_tool("createfeed", self.feed(document)), self.NEITHER)

    def test_a_well_formed_page(self):
        document = b"<!DOCTYPE html>\n<html><head><title>t</title></head><body><p>rss</p></body></html>"
        self.assertFails(self.run_tool("parsefeed", self.feed(document)), self.NEITHER)

    def test_a_page_that_is_no_xml(self):
        document = b"<!DOCTYPE html>\n<html><head>\n<meta charset=utf-8><title>t</title></head><body>a<br>b</body></html>"
        self.assertLoadFails(self.run_tool("parsefeed", self.feed(document)), r".*line 3, column \d+.*")

    def test_a_property_list(self):
        self.assertFails(self.run_tool("parsefeed", self.feed(plistlib.dumps({}))), self.NEITHER)

    def test_files_of_other_kinds(self):
        noise = random.Random(1).randbytes(10_000)
        for name, content in (("a picture", b"\x89PNG\r\n\x1a\n" + noise), ("sound", b"ID3\x03" + noise),
                              ("noise", noise),
                              ("an archive", b"PK\x03\x04" + noise), ("zeros", bytes(10_000)),
                              ("JSON", b'{"version": "1.1"}'),
                              ("a byte order mark", b"\xef\xbb\xbf"), ("half a byte order mark", b"\xff"),
                              ("a UTF-16 mark", b"\xff\xfe"), ("white space", b" \n\t ")):
            with self.subTest(name):
                self.assertLoadFails(self.run_tool("parsefeed", self.feed(content)))


if __name__ == "__main__":
    unittest.main()
