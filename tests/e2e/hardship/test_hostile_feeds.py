"""Feeds that no maker of feeds would write: each is read or refused as its row says, with the cause and its place.

Entities are in test_hostile_entities.py, characters and encodings in test_hostile_characters.py.
"""

import codecs
import plistlib
import random
import unittest

from hostile_documents import declaration, doctype, feed, numbered
from hostile_feeds import (DECLARATION, INVALID, JUNK, MISPLACED_DECLARATION, NO_ELEMENT, READ, REFERENCE, UNCLOSED,
                           UNDEFINED, HostileFeedTestCase, title)
from support import NO_FEED, soaking


class SizeTest(HostileFeedTestCase):
    MILLION = 1_000_000
    MANY = MILLION if soaking() else 50_000
    LONG = 50_000_000
    QUITE_LONG = LONG if soaking() else 2_000_000

    def test_a_million(self):
        count = self.MILLION
        attributes = b"".join(b" a%d='%d'" % (number, number) for number in range(200_000))
        self.assertOutcomes(
            ("elements in elements", feed(b"<a>" * count + b"<title>t</title>" + b"</a>" * count), READ),
            ("names of elements", feed(numbered(b"<e#/>", 10 * count) + b"<title>t</title>"), READ),
            ("names of attributes", feed(numbered(b"<e a#=''/>", 15 * count) + b"<title>t</title>"), READ),
            ("attributes, a fifth of it", feed(b"<item><enclosure" + attributes + b" url='u'/></item>"),
             {"Episodes": [{"EpisodeReference": "u", "EpisodeReferenceType": "local"}]}),
            ("attributes, one of them twice", feed(b"<item><enclosure" + attributes + b" a7=''/></item>"),
             "duplicate attribute"))

    def test_many(self):
        count = self.MANY
        self.assertOutcomes(
            ("elements never closed", b"<rss>" + b"<a>" * count, NO_ELEMENT),
            ("elements closed by another", b"<rss>" + b"<a>" * count + b"</b>", "mismatched tag"),
            ("ends of elements", b"<rss>" + b"</a>" * count, "mismatched tag"),
            ("images in images", feed(b"<image>" * count + b"<url>u</url>" + b"</image>" * count),
             {"PodcastPosterReference": "u", "PodcastPosterReferenceType": "local"}),
            ("items in items", feed(b"<item>" * count + b"</item>" * count), {"Episodes": [{}] * count}),
            ("empty items", feed(b"<item/>" * count), {"Episodes": [{}] * count}),
            ("items of one guid", feed(b"<item><guid>g</guid><qel:uuid>u</qel:uuid></item>" * count),
             {"Episodes": [{"EpisodeUUID": "u"}] * count}),
            ("prefixes", feed(numbered(b"<p#:e/>", 12 * count) + b"<title>t</title>"), READ),
            ("namespaces", feed(numbered(b"<e xmlns:p#='u'/>", 22 * count) + b"<title>t</title>"), READ),
            ("namespaces of one element", feed(
                b"<e" + numbered(b" xmlns:p#='u'", 17 * count) + b"/><title>t</title>"), READ),
            ("comments", feed(b"<!---->" * count + b"<title>t</title>"), READ),
            ("instructions", feed(b"<?p?>" * count + b"<title>t</title>"), READ),
            ("CDATA sections", title(b"<![CDATA[t]]>" * count), {"PodcastName": "t" * count}),
            ("references", title(b"&#116;" * count), {"PodcastName": "t" * count}),
            ("titles", feed(b"<title>s</title>" * count + b"<title>t</title>"), READ))

    def test_long(self):
        text = b"t" * self.LONG
        self.assertOutcomes(
            ("a text", title(text), {"PodcastName": text.decode()}),
            ("a CDATA section", title(b"<![CDATA[" + text + b"]]>"), {"PodcastName": text.decode()}),
            ("an attribute", feed(b"<orvane:category text='" + text + b"'/>"), {"PodcastCategory": text.decode()}),
            ("a comment", feed(b"<!--" + text + b"--><title>t</title>"), READ),
            ("an instruction", feed(b"<?p " + text + b"?><title>t</title>"), READ),
            ("a name of an element", feed(b"<" + text + b"/><title>t</title>"), READ))

    def test_quite_long(self):
        text = b"t" * self.QUITE_LONG
        self.assertOutcomes(
            ("a name of an attribute", feed(b"<a " + text + b"=''/><title>t</title>"), READ),
            ("a target of an instruction", feed(b"<?" + text + b"?><title>t</title>"), READ),
            ("a name of an entity", title(b"&" + text + b";"), UNDEFINED),
            ("a value of an entity", title(b"t", doctype(b"<!ENTITY e '" + text + b"'>")), READ),
            ("a document type", title(b"t", b"<!DOCTYPE " + text + b">"), READ),
            ("a text without an end", b"<rss><title>" + text, NO_ELEMENT),
            ("a comment without an end", b"<rss><!--" + text, UNCLOSED),
            ("a CDATA section without an end", b"<rss><![CDATA[" + text, "unclosed CDATA section"),
            ("an attribute without an end", b"<rss><a b='" + text, UNCLOSED),
            ("a name of an encoding", declaration("k" * len(text)) + title(b"t"),
             'unknown encoding "' + "k" * 64 + r'\.\.\."'),
            ("white space in front", b" " * len(text) + title(b"t"), READ),
            ("white space behind", title(b"t") + b" " * len(text), READ))


class StructureTest(HostileFeedTestCase):
    def test_beginnings(self):
        self.assertOutcomes(
            ("text", b"x" + title(b"t"), INVALID), ("a NUL", b"\0" + title(b"t"), INVALID),
            ("a CDATA section", b"<![CDATA[]]>" + title(b"t"), "syntax error"),
            ("an end tag", b"</rss>" + title(b"t"), INVALID),
            ("half a byte order mark", b"\xef\xbb" + title(b"t"), INVALID),
            ("two byte order marks", codecs.BOM_UTF8 * 2 + title(b"t"), READ),
            ("two declarations", declaration("UTF-8") * 2 + title(b"t"), MISPLACED_DECLARATION),
            ("a declaration behind a comment", b"<!-- -->" + declaration("UTF-8") + title(b"t"), MISPLACED_DECLARATION),
            ("a declaration in capitals", b"<?XML version='1.0'?>" + title(b"t"), INVALID),
            *((head.decode(), head + title(b"t"), DECLARATION) for head in (
                b"<?xml?>", b"<?xml encoding='UTF-8'?>", b"<?xml encoding='UTF-8' version='1.0'?>",
                b"<?xml version='1.0' encoding='UTF-8' encoding='KOI8-R'?>", b"<?xml version='1.0' standalone='maybe'?>",
                b"<?xml version='1.0' a='b'?>", b"<?xml version=1.0?>")),
            *((head.decode(), head + title(b"t"), READ) for head in (
                b"<?xml version='1.1'?>", b"<?xml version='2.0'?>", b"<?xml version='1.0' standalone='yes'?>",
                b"<?xml version='1.0' encoding='UTF-8' standalone='no' ?>")),
            ("a reference of XML 1.1", title(b"&#1;", b"<?xml version='1.1'?>"), REFERENCE),
            ("a line end of XML 1.1", title("\x85".encode(), b"<?xml version='1.1'?>"), {"PodcastName": "\x85"}))

    def test_ends(self):
        self.assertOutcomes(
            ("another root", title(b"t") * 2, JUNK), ("text", title(b"t") + b"x", JUNK),
            ("a CDATA section", title(b"t") + b"<![CDATA[]]>", JUNK),
            ("a document type", title(b"t") + b"<!DOCTYPE a>", JUNK), ("a reference", title(b"t") + b"&lt;", INVALID),
            ("an end tag", title(b"t") + b"</rss>", INVALID), ("a NUL", title(b"t") + b"\0", INVALID),
            ("an end of file", title(b"t") + b"\x1a", INVALID),
            ("a byte order mark", title(b"t") + codecs.BOM_UTF8, INVALID),
            ("a comment", title(b"t") + b"<!-- -->", READ), ("an instruction", title(b"t") + b"<?p?>", READ),
            ("white space", title(b"t") + b" \r\n\t", READ))

    def test_nothing(self):
        self.assertOutcomes(
            *((mark.hex(), mark, NO_ELEMENT) for mark in (
                codecs.BOM_UTF8, codecs.BOM_UTF16_LE, codecs.BOM_UTF16_BE, codecs.BOM_UTF32_LE, codecs.BOM_UTF32_BE)),
            ("white space", b" \t ", NO_ELEMENT), ("a declaration", b"<?xml version='1.0'?>", NO_ELEMENT),
            ("a document type", b"<!DOCTYPE rss>", NO_ELEMENT), ("a comment", b"<!-- -->", NO_ELEMENT),
            ("the beginning of a tag", b"<", UNCLOSED), ("a NUL", b"\0", INVALID), ("NULs", bytes(10_000), INVALID))

    def test_files_of_other_kinds(self):
        noise = random.Random(1).randbytes(10_000)
        for name, content in (("a picture", b"\x89PNG\r\n\x1a\n" + noise), ("sound", b"ID3\x03" + noise),
                              ("noise", noise), ("an archive", b"PK\x03\x04" + noise),
                              ("JSON", b'{"version": "1.1"}'), ("half a byte order mark", b"\xff"),
                              ("a page that is no XML", b"<!DOCTYPE html><html><head><meta></head>a<br>b</html>")):
            with self.subTest(name):
                self.assertLoadFails(self.convert(content))
        for name, content in (("a page", b"<!DOCTYPE html><html><head><title>t</title></head><body/></html>"),
                              ("a property list", plistlib.dumps({}))):
            with self.subTest(name):
                self.assertFails(self.convert(content), NO_FEED)


class DamageTest(HostileFeedTestCase):
    # Every construct that the parser has a state for.
    WHOLE = ("<?xml version='1.0' encoding=\"UTF-8\"?><!DOCTYPE rss [<!ENTITY e 'é'>]><!--c--><?p d?>\r\n"
             "<rss v='1'><title>&e;&lt;&#x41;夜<![CDATA[<b>]]></title><item><enclosure url='u' length=\"9\"/></item></rss>"
             ).encode()
    OUTCOME = {"PodcastName": "é<A夜<b>", "Episodes": [
        {"EpisodeReference": "u", "EpisodeReferenceType": "local", "EpisodeFileSize": 9}]}

    def test_the_whole_is_read(self):
        self.assertOutcome(self.WHOLE, self.OUTCOME)

    def test_a_feed_cut_at_every_byte(self):
        """Refused with the place where it ends, but for the first few bytes, which may be of another encoding."""
        for length in range(1, len(self.WHOLE), 1 if soaking() else 3):
            with self.subTest(length):
                self.assertLoadFails(self.convert(self.WHOLE[:length]), r".+ at line \d+, column \d+")

    def test_a_feed_with_every_byte_replaced(self):
        """Each is read, or refused with a place; what is read is written as XML that reads back."""
        for position in range(0, len(self.WHOLE), 1 if soaking() else 29):
            for byte in b"\0\1\t\n \"&'/<>=]?!-%;\x7f\x80\xc0\xe5\xfe\xff" if soaking() else b"\0<&\xff":
                with self.subTest(position, byte=byte):
                    damaged = self.WHOLE[:position] + bytes([byte]) + self.WHOLE[position + 1:]
                    self.assertSane(self.convert(damaged))

    def test_a_feed_with_bytes_put_in(self):
        for position in range(0, len(self.WHOLE), 1 if soaking() else 41):
            for put in (b"\0", b"<", b"&e;", b"]]>", b"<!--", b"\xff", b"<?xml version='1.0'?>", b"'"):
                with self.subTest(position, put=put):
                    self.assertSane(self.convert(self.WHOLE[:position] + put + self.WHOLE[position:]))

    def assertSane(self, result):
        if result.status == 0:
            self.assertSucceeds(result)
            again = self.run_tool("parsefeed", "-i", stdin=result.stdout)
            self.assertSucceeds(again, result.stdout)
        elif result.stderr.decode() != NO_FEED:
            self.assertLoadFails(result, r".+ at line \d+, column \d+")


if __name__ == "__main__":
    unittest.main()
