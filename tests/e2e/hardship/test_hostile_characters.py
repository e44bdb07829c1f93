"""Characters that XML has not, and bytes that are not what the document says they are, or no text at all.

Each is read or refused as its row says, with the cause and its place.
"""

import codecs
import unittest

from hostile_documents import declaration, doctype, feed
from hostile_feeds import (DECLARATION, INVALID, NO_ELEMENT, REFERENCE, UNDEFINED, HostileFeedTestCase, title)


class CharacterTest(HostileFeedTestCase):
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


class EncodingTest(HostileFeedTestCase):
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


if __name__ == "__main__":
    unittest.main()
