"""Feeds and property lists come in the encodings of their makers; what comes out is always UTF-8.

Python's own codecs write the documents. XMLParserTest and TextEncodingTest have the rules of how an encoding is
found, test_hostile_characters.py what is labelled wrongly or is no text at all.
"""

import codecs
import unittest

from support import ToolTestCase, item, rss_text

# Label in the document, Python's codec, and a text that the encoding can hold.
ENCODINGS = (
    ("UTF-8", "utf-8", "Füße 夜 🚶"),
    ("US-ASCII", "ascii", "Night Walks"),
    ("iso-8859-1", "latin-1", "Füße, naïve ×÷ÿ"),
    ("ISO-8859-1", "cp1252", "“5 €” – x"),  # as everybody reads it
    ("ISO-8859-2", "iso8859-2", "Zażółć gęślą jaźń"),
    ("ISO-8859-5", "iso8859-5", "Ночные прогулки"),
    ("ISO-8859-15", "iso8859-15", "Œuvre à 5 €"),
    ("windows-1250", "cp1250", "Příliš žluťoučký kůň"),
    ("windows-1251", "cp1251", "Ночные прогулки"),
    ("windows-1252", "cp1252", "“Füße” – 5 €…"),
    ("Shift_JIS", "shift_jis", "夜の散歩 ｱｲｳ ソ表"),
    ("EUC-JP", "euc_jp", "夜の散歩"),
    ("ISO-2022-JP", "iso2022_jp", "夜の散歩 ABC"),
    ("EUC-KR", "euc_kr", "밤 산책"),
    ("GB2312", "gb2312", "夜间散步"),
    ("GBK", "gbk", "夜間散步 镕"),
    ("GB18030", "gb18030", "夜间散步 🚶"),
    ("Big5", "big5", "夜間散步 功"),
    ("KOI8-R", "koi8-r", "Ночные прогулки"),
    ("UTF-16", "utf-16", "Füße 夜 🚶"),
)


def feed_text(text):
    return rss_text(f"<title>{text}</title><orvane:category text='{text}'/>", item(f"<title>{text}</title>"))


def declaration(label):
    return f"<?xml version='1.0' encoding='{label}'?>\n"


class EncodingTest(ToolTestCase):
    def assertFeed(self, content, text):
        self.assertEqual(self.parsefeed(self.feed(content)),
                         {"PodcastName": text, "PodcastCategory": text, "Episodes": [{"EpisodeName": text}]})

    def test_feeds_in_declared_encodings(self):
        for label, codec, text in ENCODINGS:
            with self.subTest(label):
                self.assertFeed((declaration(label) + feed_text(text)).encode(codec), text)

    def test_a_property_list_in_a_declared_encoding(self):
        content = "<plist><dict><key>PodcastName</key><string>Ночь</string></dict></plist>"
        self.assertEqual(self.parsefeed(self.write("list.plist", (declaration("KOI8-R") + content).encode("koi8-r"))),
                         {"PodcastName": "Ночь"})

    def test_marks_and_white_space_in_front(self):
        text = "Füße 夜 🚶"
        declared = declaration("UTF-8").encode()
        for head in (codecs.BOM_UTF8, codecs.BOM_UTF8 + declared, b" \n" + declared):
            with self.subTest(head):
                self.assertFeed(head + feed_text(text).encode(), text)
        self.assertFeed(codecs.BOM_UTF16_BE + feed_text(text).encode("utf-16-be"), text)

    def test_references_mean_characters_of_unicode_in_every_encoding(self):
        self.assertFeed((declaration("KOI8-R") + feed_text("&#228;&#x591C;")).encode("koi8-r"), "ä夜")

    def test_bytes_that_an_encoding_does_not_have_never_crash(self):
        for label, codec, text in ENCODINGS:
            whole = (declaration(label) + feed_text(text)).encode(codec)
            for damage in (b"\xff", b"\x80", b"\x81\x39", b"\x1b$", b"\xfe\xff\xfe"):
                with self.subTest(label, damage=damage):
                    content = whole.replace(b"</title>", damage + b"</title>", 1)
                    self.assertIn(self.run_tool("parsefeed", self.feed(content)).status, (0, 1))

    def test_a_document_cut_in_the_middle_of_a_character_never_crashes(self):
        for label, codec, text in ENCODINGS:
            content = (declaration(label) + feed_text(text)).encode(codec)
            end = content.index("</title>".encode("ascii" if codec != "utf-16" else "utf-16-le"))
            for length in range(end - 4, end + 1):
                with self.subTest(label, length=length):
                    self.assertLoadFails(self.run_tool("parsefeed", self.feed(content[:length])))


if __name__ == "__main__":
    unittest.main()
