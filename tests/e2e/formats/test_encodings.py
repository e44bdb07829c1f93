"""Feeds and property lists come in the encodings of their makers; what comes out is always UTF-8."""

import codecs
import unittest

from support import ToolTestCase, item, rss_text

# Label in the document, Python's codec, and a text that the encoding can hold.
ENCODINGS = (
    ("UTF-8", "utf-8", "Füße 夜 🚶"),
    ("utf-8", "utf-8", "Füße 夜 🚶"),
    ("US-ASCII", "ascii", "Night Walks"),
    ("ISO-8859-1", "latin-1", "Füße, naïve ×÷ÿ"),
    ("iso-8859-1", "latin-1", "Füße"),
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
)

UTF_16 = (("UTF-16 little-endian", codecs.BOM_UTF16_LE, "utf-16-le"),
          ("UTF-16 big-endian", codecs.BOM_UTF16_BE, "utf-16-be"))
TEXT = "Füße 夜 🚶"


def feed_text(text):
    return rss_text(f"<title>{text}</title><orvane:category text='{text}'/>", item(f"<title>{text}</title>"))


def list_text(text):
    return f"<plist version='1.0'><dict><key>PodcastName</key><string>{text}</string></dict></plist>"


def declaration(label):
    return f"<?xml version='1.0' encoding='{label}'?>\n"


class EncodingTest(ToolTestCase):
    def assertFeed(self, content, text):
        self.assertEqual(self.parsefeed(self.feed(content)),
                         {"PodcastName": text, "PodcastCategory": text, "Episodes": [{"EpisodeName": text}]})

    def assertList(self, content, text):
        self.assertEqual(self.parsefeed(self.write("list.plist", content)), {"PodcastName": text})

    def test_feeds_in_declared_encodings(self):
        for label, codec, text in ENCODINGS:
            with self.subTest(label):
                self.assertFeed((declaration(label) + feed_text(text)).encode(codec), text)

    def test_property_lists_in_declared_encodings(self):
        for label, codec, text in ENCODINGS:
            with self.subTest(label):
                self.assertList((declaration(label) + list_text(text)).encode(codec), text)

    def test_feeds_in_utf_16(self):
        for name, mark, codec in UTF_16:
            for head in ("", "<?xml version='1.0'?>", declaration("UTF-16"), declaration("utf-16")):
                with self.subTest(name, head=head):
                    self.assertFeed(mark + (head + feed_text(TEXT)).encode(codec), TEXT)

    def test_property_lists_in_utf_16(self):
        for name, mark, codec in UTF_16:
            with self.subTest(name):
                self.assertList(mark + (declaration("UTF-16") + list_text(TEXT)).encode(codec), TEXT)

    def test_utf_8_needs_no_declaration(self):
        self.assertFeed(feed_text(TEXT).encode(), TEXT)
        self.assertFeed(codecs.BOM_UTF8 + feed_text(TEXT).encode(), TEXT)
        self.assertFeed(codecs.BOM_UTF8 + (declaration("UTF-8") + feed_text(TEXT)).encode(), TEXT)

    def test_white_space_may_come_before_the_declaration(self):
        self.assertFeed((" \n" + declaration("KOI8-R") + feed_text("Ночь")).encode("koi8-r"), "Ночь")

    def test_iso_8859_1_is_read_as_windows_1252(self):
        for label in ("ISO-8859-1", "iso-8859-1"):
            with self.subTest(label):
                self.assertFeed((declaration(label) + feed_text("“5 €” – x")).encode("cp1252"), "“5 €” – x")

    def test_references_mean_characters_of_unicode_in_every_encoding(self):
        self.assertFeed((declaration("KOI8-R") + feed_text("&#228;&#x591C;")).encode("koi8-r"), "ä夜")

    def test_an_unknown_encoding_is_no_feed(self):
        for label in ("X-UNKNOWN", "klingon", "-"):
            with self.subTest(label):
                result = self.run_tool("parsefeed", self.feed((declaration(label) + feed_text("a")).encode()))
                self.assertLoadFails(result)

    def test_utf_8_that_is_none_is_refused_with_its_place(self):
        for name, damage in (("a lone byte", b"\xff"), ("a cut sequence", b"\xc3"), ("an overlong form", b"\xc0\xaf"),
                             ("a surrogate", b"\xed\xa0\x80"), ("beyond Unicode", b"\xf4\x90\x80\x80")):
            with self.subTest(name):
                content = b"<rss>\n<channel>\n<title>a" + damage + b"</title></channel></rss>"
                self.assertLoadFails(self.run_tool("parsefeed", self.feed(content)), r".*line 3, column \d+.*")

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
            end = content.index(b"</title>")
            for length in range(end - 4, end + 1):
                with self.subTest(label, length=length):
                    self.assertLoadFails(self.run_tool("parsefeed", self.feed(content[:length])))


if __name__ == "__main__":
    unittest.main()
