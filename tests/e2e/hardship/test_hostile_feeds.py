"""Feeds that no maker of feeds would write: each is read or refused as its row says, with the cause and its place.

What such documents cost is for test_cost.py; here each has a limit of memory and of time that only a run out of
hand exceeds.
"""

import codecs
import unittest

from hostile_documents import FileWatch, chain_of_entities, declaration, doctype, feed, laughs, numbered
from support import ToolTestCase, soaking

MEMORY = 2 << 30
TIMEOUT = 120

READ = {"PodcastName": "t"}

# What is wrong; the place follows.
AMPLIFIED = r"limit on input amplification factor \(from DTD and entities\) breached"
INVALID = r"not well-formed \(invalid token\)"
DECLARATION = "XML declaration not well-formed"
MISPLACED_DECLARATION = "XML or text declaration not at start of entity"
JUNK = "junk after document element"
NO_ELEMENT = "no element found"
REFERENCE = "reference to invalid character number"
RECURSIVE = "recursive entity reference"
UNDEFINED = "undefined entity"
UNCLOSED = "unclosed token"


class HostileFeedTest(ToolTestCase):
    def convert(self, document):
        return self.run_tool("parsefeed", self.feed(document), timeout=TIMEOUT, memory_limit=MEMORY)

    def assertOutcome(self, document, expected):
        """The reference dictionary that the document becomes, or the pattern of what is wrong with it."""
        if isinstance(expected, str):
            self.assertLoadFails(self.convert(document), expected + r" at line 1, column \d+")
        else:
            outcome = self.parsefeed(self.feed(document), timeout=TIMEOUT, memory_limit=MEMORY)
            self.assertTrue(outcome == expected, f"{outcome!r:.1000}")  # too large, some of them, for a difference

    def assertOutcomes(self, *rows):
        for name, document, expected in rows:
            with self.subTest(name):
                self.assertOutcome(document, expected)


def title(content, prolog=b""):
    """A small feed whose title has the content."""
    return prolog + b"<rss><title>" + content + b"</title></rss>"


class ExternalEntityTest(HostileFeedTest):
    """Nothing is fetched and no file is opened, whichever way XML has to ask for it."""

    def setUp(self):
        super().setUp()
        self.secret = self.write("secret.txt", b"SECRET")
        self.dtd = self.write("secret.dtd", b"<!ENTITY e 'SECRET'>")
        self.watch = FileWatch(self.secret, self.dtd)
        self.addCleanup(self.watch.close)
        self.web = self.server()
        self.web.serve("/secret.txt", b"SECRET")
        self.web.serve("/secret.dtd", b"<!ENTITY e 'SECRET'>")

    def addresses(self, name):
        path = self.path(name)
        return (path.as_uri(), str(path), name, self.web.url("/" + name), self.web.url("/" + name)[len("http:"):],
                f"php://filter/resource={path}", f"jar:{path.as_uri()}!/x")

    def assertKept(self, document, expected):
        result = self.convert(document.encode())
        self.assertNotIn(b"SECRET", result.stdout + result.stderr)
        self.assertEqual(self.web.requests, [])
        self.assertEqual(self.watch.openings(), [])
        self.assertOutcome(document.encode(), expected)

    def test_the_watch_sees_who_opens_a_file(self):
        self.secret.read_bytes()
        self.assertEqual(self.watch.openings(), ["secret.txt"])
        self.assertEqual(self.watch.openings(), [])

    def test_general_entities(self):
        for address in self.addresses("secret.txt"):
            for kind in (f'SYSTEM "{address}"', f'PUBLIC "-//a//b" "{address}"'):
                head = f"<!DOCTYPE rss [<!ENTITY e {kind}>]>"
                for body, expected in (
                        ("<rss><title>&e;</title></rss>", {"PodcastName": ""}),
                        ("<rss>&e;<title>t</title></rss>", READ),
                        ("<rss><a b='&e;'/></rss>", "reference to external entity in attribute")):
                    with self.subTest(kind, body=body):
                        self.assertKept(head + body, expected)

    def test_entities_that_are_no_text(self):
        for address in self.addresses("secret.txt"):
            with self.subTest(address):
                self.assertKept(f'<!DOCTYPE rss [<!NOTATION n SYSTEM "{address}"><!ENTITY e SYSTEM "{address}" NDATA n>'
                                "<!ATTLIST rss a ENTITY 'e'>]><rss><title>t</title></rss>", READ)
                self.assertKept(f'<!DOCTYPE rss [<!NOTATION n SYSTEM "{address}"><!ENTITY e SYSTEM "{address}" NDATA n>'
                                "]><rss><title>&e;</title></rss>", "reference to binary entity")

    def test_external_subsets(self):
        for address in self.addresses("secret.dtd"):
            for kind in (f'SYSTEM "{address}"', f'PUBLIC "-//a//b" "{address}"'):
                with self.subTest(kind):
                    self.assertKept(f"<!DOCTYPE rss {kind}><rss><title>t&e;</title></rss>", READ)
                    self.assertKept(f"<?xml version='1.0' standalone='yes'?><!DOCTYPE rss {kind}>"
                                    "<rss><title>t&e;</title></rss>", UNDEFINED)

    def test_parameter_entities(self):
        for address in self.addresses("secret.dtd"):
            for declarations in (
                    f'<!ENTITY % p SYSTEM "{address}"> %p;',
                    f'<!ENTITY % p PUBLIC "-//a//b" "{address}"> %p;',
                    f"<!ENTITY % q '<!ENTITY &#37; p SYSTEM \"{address}\"> &#37;p;'> %q;",
                    f"<!ENTITY % file SYSTEM \"{address}\"><!ENTITY % q "
                    f"'<!ENTITY &#37; send SYSTEM \"{self.web.url('/secret.txt')}?%file;\">'> %q; %send;"):
                with self.subTest(declarations):
                    result = self.convert(f"<!DOCTYPE rss [{declarations}]><rss><title>t&e;</title></rss>".encode())
                    self.assertNotIn(b"SECRET", result.stdout + result.stderr)
                    self.assertEqual(self.web.requests, [])
                    self.assertEqual(self.watch.openings(), [])
                    self.assertIn(result.status, (0, 1))

    def test_what_other_readers_follow(self):
        for address in self.addresses("secret.txt"):
            for document in (
                    f'<?xml-stylesheet type="text/xsl" href="{address}"?><rss><title>t</title></rss>',
                    f'<rss xmlns:xi="http://www.w3.org/2001/XInclude"><title>t</title><xi:include href="{address}" '
                    'parse="text"/></rss>',
                    '<rss xmlns:xsi="http://www.w3.org/2001/XMLSchema-instance" '
                    f'xsi:schemaLocation="a {address}"><title>t</title></rss>',
                    f'<rss xml:base="{address}"><title>t</title></rss>',
                    f'<rss><title>t</title><atom:link rel="next" href="{address}"/></rss>'):
                with self.subTest(document):
                    self.assertKept(document, READ)


class EntityBombTest(HostileFeedTest):
    def test_entities_of_many_entities(self):
        parameters = b"".join(b"<!ENTITY %% p%d '%s'>" % (level, b"&#37;p%d;" % (level - 1) * 10)
                              for level in range(1, 12))
        self.assertOutcomes(
            ("in a text", title(b"&e11;", doctype(laughs(11))), AMPLIFIED),
            ("in an attribute", feed(b"<a b='&e11;'/>", doctype(laughs(11))), AMPLIFIED),
            ("in an attribute by default", feed(b"<a/>", doctype(laughs(11) + b"<!ATTLIST a b CDATA '&e11;'>")),
             AMPLIFIED),
            ("of parameters, which are not resolved", title(
                b"t", doctype(b"<!ENTITY % p0 '<!-- x -->'>" + parameters + b"%p11;")), READ),
            ("of elements", feed(b"&e11;", doctype(laughs(11).replace(b"0123456789", b"<item/>"))), AMPLIFIED),
            ("of nothing", feed(b"&e11;", doctype(laughs(11).replace(b"0123456789", b""))), AMPLIFIED),
            ("of one each", title(b"&e40;", doctype(laughs(40, ways=1))), {"PodcastName": "0123456789"}),
            ("never referred to", title(b"t", doctype(laughs(11))), READ))

    def test_long_entities(self):
        long = b"x" * 200_000
        self.assertOutcomes(
            ("in a text", title(b"&e;" * 100_000, doctype(b"<!ENTITY e '" + long + b"'>")), AMPLIFIED),
            ("in attributes", feed(b"<a b='&e;'/>" * 10_000, doctype(b"<!ENTITY e '" + long + b"'>")), AMPLIFIED),
            ("of elements", feed(b"&e;" * 100_000, doctype(b"<!ENTITY e '" + b"<item/>" * 10_000 + b"'>")), AMPLIFIED),
            ("as a default", feed(b"<item><enclosure/></item>" * 10_000, doctype(
                b"<!ATTLIST enclosure url CDATA '" + long + b"'>")), AMPLIFIED),
            ("a megabyte of a short one", title(b"&e;" * 10_000, doctype(b"<!ENTITY e '" + b"t" * 100 + b"'>")),
             {"PodcastName": "t" * 1_000_000}))

    def test_entities_in_entities(self):
        deep = chain_of_entities(2_500_000)
        last = b"&e%d;" % (deep.count(b"<!ENTITY") - 2)
        too_many = "too many entities made of entities"
        self.assertOutcomes(
            ("in a text", title(last, doctype(deep)), too_many),
            ("in an attribute", feed(b"<a b='" + last + b"'/>", doctype(deep)), too_many),
            ("in an attribute by default", feed(b"<a/>", doctype(deep + b"<!ATTLIST a b CDATA '" + last + b"'>")),
             too_many),
            ("in themselves", title(b"&e;", doctype(b"<!ENTITY e 'x&e;'>")), RECURSIVE),
            ("in each other", title(b"&e;", doctype(b"<!ENTITY e '&f;'><!ENTITY f '&e;'>")), RECURSIVE),
            ("in each other, in an attribute", feed(
                b"<a b='&e;'/>", doctype(b"<!ENTITY e '&f;'><!ENTITY f '&e;'>")), RECURSIVE),
            ("in themselves, of parameters, which are not resolved", title(
                b"t", doctype(b"<!ENTITY % p '&#37;p;'> %p;")), READ))

    def test_declarations(self):
        many = 100_000
        self.assertOutcomes(
            ("many entities", title(b"&e99999;", doctype(numbered(b"<!ENTITY e# 't'>", 22 * many))), READ),
            ("the same entity", title(b"&e;", doctype(b"<!ENTITY e 't'>" + b"<!ENTITY e 'u'>" * many)), READ),
            ("many elements", title(b"t", doctype(numbered(b"<!ELEMENT e# ANY>", 22 * many))), READ),
            ("groups in groups", title(b"t", doctype(b"<!ELEMENT e " + b"(" * many + b"f" + b")" * many + b">")), READ),
            ("many attributes of one element", title(b"t", doctype(numbered(b"<!ATTLIST a b# CDATA ''>", 30 * many))),
             "too many declared attributes"),
            ("many attributes in one declaration", title(b"t", doctype(
                b"<!ATTLIST a " + numbered(b"b# CDATA #IMPLIED ".replace(b"#I", b"\0I"), 30 * many).replace(b"\0", b"#")
                + b">")), "too many declared attributes"),
            ("an entity that opens an element", feed(b"&e;</a>", doctype(b"<!ENTITY e '<a>'>")),
             "asynchronous entity"),
            ("an entity that is no XML", feed(b"&e;", doctype(b"<!ENTITY e '&#60;'>")), UNCLOSED),
            ("a document type in the root", b"<rss><!DOCTYPE rss></rss>", INVALID),
            ("a document type without an end", b"<!DOCTYPE rss [<!ENTITY e 't'>", NO_ELEMENT),
            ("conditional sections", title(b"t", doctype(b"<![INCLUDE[<!ENTITY e 't'>]]>")), "syntax error"))


class SizeTest(HostileFeedTest):
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


class CharacterTest(HostileFeedTest):
    def test_characters(self):
        self.assertOutcomes(
            *((f"U+{character:04X}", title(chr(character).encode()), INVALID)
              for character in (0, 1, 8, 0xb, 0xc, 0xe, 0x1b, 0x1f, 0xfffe, 0xffff)),
            *((f"U+{character:04X}", title(chr(character).encode()), {"PodcastName": chr(character)})
              for character in (9, 0xa, 0x7f, 0x80, 0x85, 0x9f, 0x2028, 0xfdd0, 0xfeff, 0x1ffff, 0x10ffff)),
            ("a NUL in an attribute", feed(b"<item><enclosure url='a\0b'/></item>"), INVALID),
            ("a NUL in a comment", feed(b"<!-- \0 -->"), INVALID),
            ("a NUL in a CDATA section", title(b"<![CDATA[\0]]>"), INVALID),
            ("a NUL in an instruction", feed(b"<?p \0?>"), INVALID),
            ("a NUL in a name", feed(b"<a\0b/>"), INVALID),
            ("a NUL in an entity", title(b"t", doctype(b"<!ENTITY e 'a\0b'>")), INVALID))

    def test_references(self):
        self.assertOutcomes(
            *((reference[:30], title(b"&%s;" % reference.encode()), REFERENCE) for reference in (
                "#0", "#x0", "#1", "#8", "#xB", "#x1F", "#xD800", "#xDBFF", "#xDFFF", "#xFFFE", "#xFFFF", "#x110000",
                "#1114112", "#4294967361", "#x100000041", "#18446744073709551681", "#" + "9" * 10_000,
                "#x" + "f" * 10_000)),
            *((reference, title(b"&%s;" % reference.encode()), INVALID) for reference in (
                "", "#", "#x", "#X41", "#-1", "#+65", "# 65", "#65 ", "#x 41", "#6_5", "#xG", " lt", "#x41h")),
            *((reference, title(b"&%s;" % reference.encode()), UNDEFINED) for reference in ("nbsp", "AMP", "hellip")),
            *((reference[:30], title(b"&%s;" % reference.encode()), {"PodcastName": character})
              for reference, character in (("#9", "\t"), ("#xD", "\r"), ("#127", "\x7f"), ("#128", "\x80"),
                                           ("#x10FFFF", "\U0010ffff"), ("#" + "0" * 10_000 + "65", "A"))),
            ("without an end", title(b"&amp"), INVALID),
            ("to the half of a pair", title(b"&#xD83D;&#xDE00;"), REFERENCE),
            ("in an entity", title(b"t", doctype(b"<!ENTITY e '&#0;'>")), REFERENCE),
            ("in an attribute", feed(b"<a b='&#0;'/>"), REFERENCE))


class EncodingTest(HostileFeedTest):
    """What the bytes are and what the document says they are do not agree, or are no text at all."""

    TEXT = "tä夜"

    def test_labels_that_are_wrong(self):
        def document(label, codec, text=self.TEXT, mark=b""):
            return mark + declaration(label).decode().encode(codec) + title(text.encode()).decode().encode(codec)

        read = {"PodcastName": self.TEXT}
        self.assertOutcomes(
            ("UTF-8 called UTF-16", document("UTF-16", "utf-8"), read),
            ("UTF-8 called UTF-32", document("UTF-32BE", "utf-8"), read),
            ("UTF-8 called UCS-2", document("ISO-10646-UCS-2", "utf-8"), read),
            ("UTF-8 called ISO-8859-1", document("ISO-8859-1", "utf-8", "ä"), {"PodcastName": "Ã¤"}),
            ("UTF-8 called US-ASCII", document("US-ASCII", "utf-8", "ä"), {"PodcastName": "Ã¤"}),
            ("UTF-8 with a mark called ISO-8859-1", document("ISO-8859-1", "utf-8", mark=codecs.BOM_UTF8), read),
            ("ISO-8859-1 called UTF-8", document("UTF-8", "latin-1", "ä"), INVALID),
            ("ISO-8859-1 with the mark of UTF-8", document("ISO-8859-1", "latin-1", "ä", codecs.BOM_UTF8), INVALID),
            ("ISO-8859-1 called nothing", title(b"\xe4"), INVALID),
            ("UTF-16 called UTF-8", document("UTF-8", "utf-16-le", mark=codecs.BOM_UTF16_LE), read),
            ("UTF-16 called the other order", document("UTF-16BE", "utf-16-le", mark=codecs.BOM_UTF16_LE), read),
            ("UTF-16 with the mark of the other order", document("UTF-16", "utf-16-le", mark=codecs.BOM_UTF16_BE),
             INVALID),
            ("UTF-16 without a mark", document("UTF-16", "utf-16-le"), read),
            ("UTF-16 of the other order without a mark", document("UTF-16", "utf-16-be"), read),
            ("UTF-32 without a mark", document("UTF-8", "utf-32-le"), read),
            ("UTF-32 of the other order", document("UTF-8", "utf-32-be", mark=codecs.BOM_UTF32_BE), read),
            ("ASCII with the mark of UTF-16", codecs.BOM_UTF16_LE + title(b"t"), INVALID),
            ("ASCII called EBCDIC", document("IBM037", "ascii", "t"), INVALID),
            ("ASCII called BOCU-1", document("BOCU-1", "ascii", "t"), INVALID),
            ("EBCDIC", document("IBM037", "cp037", "t"), INVALID),
            ("UTF-7", document("UTF-7", "ascii", "+WRw-"), {"PodcastName": "夜"}),
            ("UTF-7 with tags in it", declaration("UTF-7") + title(b"+ADwAaQB0AGUAbQAvAD4-"),
             {"PodcastName": "", "Episodes": [{}]}),
            ("UTF-7 called nothing", b"+ADw-rss+AD4-", INVALID),
            ("HZ", declaration("HZ-GB-2312") + title(b"~{VPND~}"), {"PodcastName": "中文"}),
            ("two encodings in one document", title(self.TEXT.encode() + b"\xe4"), INVALID),
            *((label[:20], document(label, "ascii", "t"), f'unknown encoding "{label}"')
              for label in ("UTF", "UTF-9", "UTF-EBCDIC", "klingon", "k" * 64)),
            *((label, declaration(label) + title(b"t"), DECLARATION)
              for label in ("", " UTF-8", "UTF-8 ", "8-UTF", "UTF-8;x", "UTF-8,version=1", "../../etc/passwd", "夜")),
            ("a NUL", declaration("UTF-8\0x") + title(b"t"), INVALID))

    def test_bytes_that_are_no_utf_8(self):
        self.assertOutcomes(*((name, title(damage), INVALID) for name, damage in (
            ("an overlong slash", b"\xc0\xaf"), ("an overlong NUL", b"\xc0\x80"), ("overlong, of three", b"\xe0\x80\xaf"),
            ("overlong, of four", b"\xf0\x80\x80\xaf"), ("a surrogate", b"\xed\xa0\x80"),
            ("a pair of surrogates", b"\xed\xa0\xbd\xed\xb8\x80"), ("beyond Unicode", b"\xf4\x90\x80\x80"),
            ("five bytes", b"\xf8\x88\x80\x80\x80"), ("six bytes", b"\xfc\x84\x80\x80\x80\x80"),
            ("a lone continuation", b"\x80"), ("FE", b"\xfe"), ("FF", b"\xff"), ("one byte of two", b"\xc3"),
            ("two bytes of three", b"\xe5\xa4"), ("three bytes of four", b"\xf0\x9f\x98"))),
            *((name, document, INVALID) for name, document in (
                ("in an attribute", b"<rss a='\xff'/>"), ("in a name", b"<rss\xff/>"), ("in a comment", b"<rss><!--\xff--></rss>"),
                ("in an instruction", b"<rss><?p \xff?></rss>"), ("in a CDATA section", b"<rss><![CDATA[\xff]]></rss>"))),
            ("at the end of the document", b"<rss><title>\xe5\xa4", "partial character"))

    def test_bytes_that_another_encoding_does_not_have(self):
        wide = title(b"\1").decode().encode("utf-16-le")
        replaced = {"PodcastName": "\ufffd"}
        self.assertOutcomes(
            ("a lone surrogate in UTF-16", codecs.BOM_UTF16_LE + wide.replace(b"\1\0", b"\0\xd8"), replaced),
            ("surrogates in the wrong order", codecs.BOM_UTF16_LE + wide.replace(b"\1\0", b"\0\xdc\0\xd8"),
             {"PodcastName": "\ufffd\ufffd"}),
            ("a NUL in UTF-16", codecs.BOM_UTF16_LE + wide.replace(b"\1\0", b"\0\0"), INVALID),
            ("half a unit of UTF-16", codecs.BOM_UTF16_LE + wide[:-1], INVALID),
            ("beyond Unicode in UTF-32", codecs.BOM_UTF32_LE + title(b"\1").decode().encode("utf-32-le").replace(
                b"\1\0\0\0", b"\0\0\x11\0"), replaced),
            ("half a character of Shift_JIS", declaration("Shift_JIS") + title(b"\x81"), replaced),
            ("half a character of GBK", declaration("GBK") + title(b"\x81"), replaced),
            ("half a character of Big5", declaration("Big5") + title(b"\xa4"), replaced),
            ("ISO-2022-JP that never returns", declaration("ISO-2022-JP") + title(b"\x1b$B"), NO_ELEMENT))


class StructureTest(HostileFeedTest):
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
        self.assertFails(self.convert(b""), "Could not load source: Could not load or read the specified feed URL")


class DamageTest(HostileFeedTest):
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
        elif result.stderr != b"Could not load source: The feed was neither RSS nor Atom":
            self.assertLoadFails(result, r".+ at line \d+, column \d+")


if __name__ == "__main__":
    unittest.main()
