"""Input made by accident or by an enemy: never a crash, never a hang, never a byte of what was there lost.

A refused feed names the line and the column of its fault; nothing outside the document is ever loaded; no
document takes more memory or time than its size warrants.
"""

import plistlib
import random
import re
import struct
import unittest

from support import LOADING, ToolTestCase, item, rss

MEMORY = 1 << 30


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

    def test_a_feed_cut_anywhere_is_refused(self):
        document = rss("<title>Night Walks</title>", item("<title>One</title><enclosure url='a.mp3' length='1'/>"))
        for length in range(0, document.rindex(b">"), 13):
            with self.subTest(length):
                result = self.run_tool("parsefeed", self.feed(document[:length]))
                self.assertLoadFails(result)

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


class EntityTest(ToolTestCase):
    def setUp(self):
        super().setUp()
        self.secret = self.write("secret.txt", b"SECRET")
        self.web = self.server()
        self.web.serve("/secret.txt", b"SECRET")
        self.web.serve("/secret.dtd", b"<!ENTITY x 'SECRET'>")

    def external_documents(self, root):
        """Documents that ask for the secret by each way that XML has, `root` holding the reference."""
        for address in (self.secret.as_uri(), "secret.txt", self.web.url("/secret.txt")):
            yield f'<!DOCTYPE a [<!ENTITY x SYSTEM "{address}">]>{root}'
            yield f'<!DOCTYPE a [<!ENTITY x PUBLIC "p" "{address}">]>{root}'
        for address in (self.secret.as_uri(), self.web.url("/secret.dtd")):
            yield f'<!DOCTYPE a SYSTEM "{address}">{root}'
            yield f'<!DOCTYPE a [<!ENTITY % p SYSTEM "{address}"> %p;]>{root}'

    def assertKept(self, result):
        self.assertIn(result.status, (0, 1))
        self.assertNotIn(b"SECRET", result.stdout + result.stderr)
        self.assertEqual(self.web.requests, [])

    def test_a_feed_loads_nothing_from_outside(self):
        for document in self.external_documents("<rss><channel><title>&x;</title></channel></rss>"):
            with self.subTest(document):
                self.assertKept(self.run_tool("parsefeed", self.feed(document)))

    def test_a_property_list_loads_nothing_from_outside(self):
        root = "<plist><dict><key>PodcastName</key><string>&x;</string></dict></plist>"
        for document in self.external_documents(root):
            with self.subTest(document):
                self.assertKept(self.run_tool("parsefeed", "-i", stdin=document.encode()))

    def test_a_document_type_elsewhere_does_no_harm(self):
        document = f'<!DOCTYPE rss SYSTEM "{self.web.url("/secret.dtd")}"><rss><title>t</title></rss>'
        self.assertEqual(self.parsefeed(self.feed(document.encode())), {"PodcastName": "t"})
        self.assertEqual(self.web.requests, [])

    def bombs(self, head, tail):
        levels = "".join(f"<!ENTITY e{level} \"{f'&e{level - 1};' * 10}\">" for level in range(1, 12))
        yield "exponential", f'<!DOCTYPE a [<!ENTITY e0 "0123456789">{levels}]>{head}&e11;{tail}'
        yield "quadratic", f'<!DOCTYPE a [<!ENTITY e "{"x" * 200_000}">]>{head}{"&e;" * 100_000}{tail}'
        yield "recursive", f'<!DOCTYPE a [<!ENTITY e "&f;"><!ENTITY f "&e;">]>{head}&e;{tail}'
        yield "in an attribute", f'<!DOCTYPE a [<!ENTITY e0 "0123456789">{levels}]>{head}<a b="&e11;"/>{tail}'
        parameters = "".join(f"<!ENTITY % p{level} '{f'&#37;p{level - 1};' * 10}'>" for level in range(1, 12))
        yield "of parameters", f"<!DOCTYPE a [<!ENTITY % p0 '<!-- x -->'>{parameters} %p11;]>{head}{tail}"

    def test_entity_bombs_in_a_feed(self):
        for name, document in self.bombs("<rss><title>", "</title></rss>"):
            with self.subTest(name):
                result = self.run_tool("parsefeed", self.feed(document), timeout=60, memory_limit=MEMORY)
                self.assertIn(result.status, (0, 1))
                self.assertLess(len(result.stdout), 10_000_000)

    def test_entity_bombs_in_a_property_list(self):
        for name, document in self.bombs("<plist><dict><key>PodcastName</key><string>", "</string></dict></plist>"):
            with self.subTest(name):
                result = self.run_tool("parsefeed", "-i", stdin=document.encode(), timeout=60, memory_limit=MEMORY)
                self.assertIn(result.status, (0, 1))
                self.assertLess(len(result.stdout), 10_000_000)


class SizeTest(ToolTestCase):
    """Documents of unusual shape take time and memory in proportion to their size."""

    def assertHandled(self, *arguments, **options):
        result = self.run_tool(*arguments, timeout=60, memory_limit=MEMORY, **options)
        self.assertIn(result.status, (0, 1))
        return result

    def test_feeds_of_unusual_shape(self):
        many = 300_000
        for name, content in (
                ("deep elements", b"<rss>" + b"<a>" * many + b"</a>" * many + b"</rss>"),
                ("deep elements never closed", b"<rss>" + b"<a>" * many),
                ("deep items", b"<rss>" + b"<item>" * 50_000 + b"</item>" * 50_000 + b"</rss>"),
                ("a long name", b"<rss><" + b"a" * 5_000_000 + b"/></rss>"),
                ("a long attribute", b"<rss><a b='" + b"c" * 5_000_000 + b"'/></rss>"),
                ("many attributes", b"<rss><a " + b" ".join(b"a%d='%d'" % (n, n) for n in range(50_000)) + b"/></rss>"),
                ("many prefixes", b"<rss>" + b"".join(b"<p%d:a/>" % n for n in range(50_000)) + b"</rss>"),
                ("many references", b"<rss><title>" + b"&amp;" * 1_000_000 + b"</title></rss>"),
                ("many comments", b"<rss>" + b"<!---->" * many + b"</rss>"),
                ("a long comment", b"<rss><!--" + b"c" * 10_000_000 + b"--></rss>"),
                ("much white space", b" " * 10_000_000 + b"<rss/>"),
                ("many links", b"<rss>" + b"<link>document/uuid/collection/uuid/</link>" * 50_000 + b"</rss>"),
                ("a long text without an end", b"<rss><title>" + b"t" * 10_000_000)):
            with self.subTest(name):
                self.assertHandled("parsefeed", self.feed(content))

    def test_text_that_no_element_empties_does_not_grow_with_every_element(self):
        content = b"<rss>" + b"<a>text that nobody reads</a><qel:order>1</qel:order>" * 100_000 + b"</rss>"
        self.assertHandled("parsefeed", self.feed(content))

    def test_nesting_of_property_lists(self):
        def nested(depth, opening, closing):
            return (b"<plist><dict><key>a</key>" + opening * depth + b"<string/>" + closing * depth
                    + b"<key>PodcastName</key><string>n</string></dict></plist>")

        for opening, closing in ((b"<array>", b"</array>"), (b"<dict><key>a</key>", b"</dict>")):
            with self.subTest(opening):
                fine = self.assertHandled("parsefeed", "-i", stdin=nested(500, opening, closing))
                self.assertEqual(plistlib.loads(fine.stdout), {"PodcastName": "n"})
                for depth in (520, 100_000):
                    self.assertFails(self.assertHandled("parsefeed", "-i", stdin=nested(depth, opening, closing)),
                                     '"(null)" is not a valid podcast source.\n')

    def test_property_lists_of_unusual_shape(self):
        for name, content in (
                ("deep elements never closed", b"<plist>" + b"<dict><key>a</key>" * 200_000),
                ("a long number",
                 b"<plist><dict><key>a</key><integer>" + b"1" * 5_000_000 + b"</integer></dict></plist>"),
                ("a long date", b"<plist><dict><key>a</key><date>" + b"1" * 5_000_000 + b"</date></dict></plist>"),
                ("long data", b"<plist><dict><key>a</key><data>" + b"QUJD" * 1_000_000 + b"</data></dict></plist>"),
                ("data that are none", b"<plist><dict><key>a</key><data>?*=</data></dict></plist>"),
                ("the same key",
                 b"<plist><dict>" + b"<key>PodcastName</key><string>n</string>" * 100_000 + b"</dict></plist>"),
                ("many keys", b"<plist><dict>" + b"".join(b"<key>%d</key><true/>" % n for n in range(100_000))
                 + b"</dict></plist>")):
            with self.subTest(name):
                self.assertHandled("parsefeed", "-i", stdin=content)


def binary_list(objects, top=0, offset_size=2, reference_size=1, count=None, table=None):
    """A binary property list of the raw objects, with a trailer that may say what it likes."""
    body = b"bplist00"
    offsets = []
    for content in objects:
        offsets.append(len(body))
        body += content
    start = len(body) if table is None else table
    for offset in offsets:
        body += (offset % 256**offset_size).to_bytes(offset_size, "big")
    return body + struct.pack(">5xBBBQQQ", 0, offset_size, reference_size, len(objects) if count is None else count,
                              top, start)


class BinaryListTest(ToolTestCase):
    """Binary property lists say where their parts are, and may lie about every one of them."""

    NAME = b"\x5bPodcastName"

    def assertRefused(self, content):
        result = self.run_tool("parsefeed", "-i", stdin=content, timeout=60, memory_limit=MEMORY)
        self.assertFails(result, '"(null)" is not a valid podcast source.\n')

    def assertHandled(self, content):
        result = self.run_tool("parsefeed", "-i", stdin=content, timeout=60, memory_limit=MEMORY)
        self.assertIn(result.status, (0, 1))
        return result

    def test_the_builder_makes_lists_that_can_be_read(self):
        content = binary_list([b"\xd1\x01\x02", self.NAME, b"\x51n"])
        self.assertEqual(plistlib.loads(content), {"PodcastName": "n"})
        self.assertEqual(plistlib.loads(self.assertHandled(content).stdout), {"PodcastName": "n"})

    def test_cycles_are_refused(self):
        for name, objects in (("a list in itself", [b"\xd1\x01\x02", self.NAME, b"\xa1\x02"]),
                              ("a dictionary in itself", [b"\xd1\x01\x00", self.NAME]),
                              ("two lists in each other", [b"\xd1\x01\x02", self.NAME, b"\xa1\x03", b"\xa1\x02"])):
            with self.subTest(name):
                self.assertRefused(binary_list(objects))

    def test_shared_lists_do_not_explode(self):
        for ways in (2, 10):
            depth = 100
            objects = [b"\xd1\x01\x02", b"\x58Episodes"]
            for level in range(depth):
                following = bytes([len(objects) + 1])
                objects.append(bytes([0xa0 + ways]) + following * ways)
            objects.append(b"\x51n")
            with self.subTest(ways):
                self.assertHandled(binary_list(objects))

    def test_deep_lists_are_refused(self):
        depth = 50_000
        objects = [b"\xd1\x00\x01\x00\x02", b"\x51a"]
        objects += [b"\xa1" + struct.pack(">H", len(objects) + level + 1) for level in range(depth)]
        objects.append(b"\x51n")
        self.assertRefused(binary_list(objects, offset_size=4, reference_size=2))

    def test_counts_larger_than_the_file_are_refused(self):
        for name, content in (
                ("text", b"\x5f\x13\x7f\xff\xff\xff\xff\xff\xff\xff"),
                ("wide text", b"\x6f\x13\x7f\xff\xff\xff\xff\xff\xff\xff"),
                ("wide text of half the range", b"\x6f\x13\x40" + bytes(6) + b"\x01"),
                ("data", b"\x4f\x13\xff\xff\xff\xff\xff\xff\xff\xff"),
                ("a list", b"\xaf\x13\x7f\xff\xff\xff\xff\xff\xff\xff"),
                ("a dictionary", b"\xdf\x13\x40" + bytes(7)), ("some more text", b"\x5f\x11\xff\xff"),
                ("a count that is no number", b"\x5f\x51a"), ("a count that is missing", b"\x5f")):
            with self.subTest(name):
                self.assertRefused(binary_list([b"\xd1\x01\x02", self.NAME, content]))

    def test_references_to_nowhere_are_refused(self):
        for reference in (3, 4, 0x7f, 0xff):
            with self.subTest(reference):
                self.assertRefused(binary_list([bytes([0xd1, 1, reference]), self.NAME, b"\x51n"]))
                self.assertRefused(binary_list([bytes([0xd1, reference, 2]), self.NAME, b"\x51n"]))

    def test_trailers_that_lie_are_refused(self):
        objects = [b"\xd1\x01\x02", self.NAME, b"\x51n"]
        huge = 2**64 - 1
        for options in ({"top": 3}, {"top": huge}, {"count": huge}, {"count": 2**61}, {"count": 1000}, {"count": 0},
                        {"table": huge}, {"table": 0}, {"table": 2**63}, {"table": 10_000}, {"offset_size": 0},
                        {"reference_size": 0}):
            with self.subTest(options):
                self.assertRefused(binary_list(objects, **options))

    def test_sizes_of_every_number_are_handled(self):
        objects = [b"\xd1\x01\x02", self.NAME, b"\x51n"]
        for size in (3, 5, 8, 9, 16, 255):
            with self.subTest(size):
                self.assertHandled(binary_list(objects, offset_size=size))
                self.assertHandled(binary_list(objects, reference_size=size))

    def test_objects_of_every_kind_are_handled(self):
        for kind in range(256):
            for filling in (b"", b"\xff" * 40):
                with self.subTest(kind, filling=filling[:1]):
                    self.assertHandled(binary_list([b"\xd1\x01\x02", self.NAME, bytes([kind]) + filling]))

    def test_a_key_that_is_no_text_is_refused(self):
        self.assertRefused(binary_list([b"\xd1\x01\x02", b"\x10\x05", b"\x51n"]))

    def test_texts_that_are_no_unicode_are_mended(self):
        for name, content, expected in (
                ("a lone surrogate", b"\x63\x00a\xd8\x00\x00b", "a\ufffdb"),
                ("surrogates in the wrong order", b"\x62\xdc\x00\xd8\x00", "\ufffd\ufffd"),
                ("a surrogate at the end", b"\x62\x00a\xd8\x00", "a\ufffd"),
                ("ASCII that is none", b"\x53a\xffb", "a\ufffdb")):
            with self.subTest(name):
                result = self.assertHandled(binary_list([b"\xd1\x01\x02", self.NAME, content]))
                self.assertEqual(plistlib.loads(result.stdout), {"PodcastName": expected})

    def test_dates_beyond_every_calendar_are_handled(self):
        for value in (float("nan"), float("inf"), float("-inf"), 1e300, -1e300, 1e18, -1e12, 1e12, -0.0):
            objects = [b"\xd1\x01\x02", b"\x58Episodes", b"\xa1\x03", b"\xd1\x04\x05", b"\x5bEpisodeDate",
                       b"\x33" + struct.pack(">d", value)]
            for command in ("parsefeed", "createfeed"):
                with self.subTest(value, command=command):
                    result = self.run_tool(command, "-i", stdin=binary_list(objects), timeout=60)
                    self.assertIn(result.status, (0, 1))

    def test_numbers_beyond_every_range_are_handled(self):
        for key in (b"\x5cEpisodeOrder", b"\x5f\x10\x0fEpisodeFileSize", b"\x5bEpisodeName"):
            for value in (float("nan"), float("inf"), -float("inf"), 1e300, -1e300):
                objects = [b"\xd1\x01\x02", b"\x58Episodes", b"\xa1\x03", b"\xd1\x04\x05", key,
                           b"\x23" + struct.pack(">d", value)]
                for command in ("parsefeed", "createfeed"):
                    with self.subTest(key=key, value=value, command=command):
                        result = self.run_tool(command, "-i", stdin=binary_list(objects), timeout=60)
                        self.assertIn(result.status, (0, 1))


if __name__ == "__main__":
    unittest.main()
