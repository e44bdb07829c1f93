"""Property lists that nobody's writer would make, in both forms: each is read or refused as its row says.

A refused list has one message whatever its fault, and one whose root is no dictionary another; the unit tests of
the readers hold the description of each fault.
"""

import itertools
import plistlib
import struct
import unittest

from hostile_documents import (FileWatch, array_object, ascii_object, binary_laughs, binary_list, binary_podcast,
                               chain_of_entities, counted, dictionary_object, doctype, episodes, laughs, numbered,
                               overlapping_texts, podcast)
from support import ToolTestCase, soaking

MEMORY = 1 << 30
TIMEOUT = 120

NAME = b"<key>PodcastName</key><string>n</string>"
READ = {"PodcastName": "n"}
REFUSED = '"(null)" is not a valid podcast source.\n'
NO_DICTIONARY = 'Could not initialize podcast source with string "(null)".\n'


class HostileListTest(ToolTestCase):
    def convert(self, document):
        return self.run_tool("parsefeed", "-i", stdin=document, timeout=TIMEOUT, memory_limit=MEMORY)

    def assertOutcome(self, document, expected):
        """The reference dictionary that the list becomes, or the message."""
        result = self.convert(document)
        if isinstance(expected, str):
            self.assertFails(result, expected)
        else:
            self.assertSucceeds(result)
            outcome = plistlib.loads(result.stdout)
            self.assertTrue(outcome == expected, f"{outcome!r:.1000}")  # too large, some of them, for a difference

    def assertOutcomes(self, *rows):
        for name, document, expected in rows:
            with self.subTest(name):
                self.assertOutcome(document, expected)

    def assertSane(self, result):
        """Refused, or read and written as a list that reads back."""
        if result.status == 0:
            self.assertSucceeds(result)
            self.assertSucceeds(self.convert(result.stdout), result.stdout)
        else:
            self.assertIn(result.stderr.decode(), (REFUSED, NO_DICTIONARY))
            self.assertFails(result, result.stderr)


class XMLTest(HostileListTest):
    def test_structure(self):
        self.assertOutcomes(
            *((str(content), content, REFUSED) for content in (
                b"<plist/>", b"<plist></plist>", b"<plist> </plist>", b"<dict/>", b"<array/>", b"<plist>text</plist>",
                b"<plist><dict/><dict/></plist>", b"<plist><dict/></plist><plist/>", b"<plist><plist><dict/></plist></plist>",
                b"<plist><key>k</key></plist>",
                b"<x:plist><dict/></x:plist>", b"<PLIST><dict/></PLIST>", b"<plist><x:dict/></plist>",
                b"<plist><Dict/></plist>", b"<plist><dict>", b"<plist><dict></plist>", b"<plist><dict/>")),
            *((str(content), b"<plist>" + content + b"</plist>", NO_DICTIONARY) for content in (
                b"<array/>", b"<string>s</string>", b"<true/>", b"<date>2007-06-05T14:30:00Z</date>")),
            *((str(content), podcast(content), REFUSED) for content in (
                b"<key>k</key>", b"<string>s</string>", b"<key>k</key><key>l</key>", b"<key>k</key><key>l</key><true/>",
                b"<key>k</key><true/><false/>", b"<key>k</key><null/>", b"<key>k</key><item/>", b"<key>k</key><dict>",
                b"<key><string>k</string></key><true/>", b"<key>k<b/></key><true/>", b"<integer>1</integer><true/>",
                b"<true/><true/>", b"<array/><true/>", b"<key>k</key><string><string/></string>",
                b"<key>k</key><string>a<dict/></string>", b"<key>k</key><true>yes</true>", b"<key>k</key>text<true/>",
                b"text", b"<key>k</key><array>text</array>", b"<key>k</key><array><key>l</key></array>",
                b"<key>k</key><array><key>l</key><true/></array>", b"<key>k</key><plist/>", b"<key>k</key></array>",
                b"<key>k</key><integer><integer>1</integer></integer>", b"<key>k</key><date/>",
                b"<key>k</key><string>&nbsp;</string>", b"<key>k</key><string>&#0;</string>", b"<key>k</key><string>\0</string>",
                b"<key>k</key><string>\xff</string>", b"<key>k</key><string>\xed\xa0\x80</string>")),
            *((str(content), podcast(content + NAME), READ) for content in (
                b"", b"<!-- -->", b"<?p?>", b"<key/><true/>", b"<key></key><dict/>", b"<key>k</key><true></true>",
                b"<key>k</key><true> \n</true>", b"<key>Episodes</key><string/>", b"<key>Episodes</key><dict/>",
                b"<key>k</key><string a='b'/>", b"<key>PodcastName</key><integer>1</integer>")))

    def test_scalars(self):
        def scalar(kind, content):
            return podcast(b"<key>k</key><%s>%s</%s>" % (kind, content, kind) + NAME)

        refused = (
            (b"integer", (b"", b" ", b"-", b"x", b"1.0", b"1e3", b"0x", b"0xg", b"1 2", b"--1", b"+-1", b"1_000",
                          b"18446744073709551616", b"-9223372036854775809", b"0x10000000000000000", b"9" * 1000,
                          "１".encode())),
            (b"real", (b"", b"x", b"1,5", b"1e999", b"-1e999", b"1e-9999999x", b"0x1p3", b"1.5.5", b"nanx", b"++1",
                       b"9" * 400, b"0." + b"0" * 100_000 + b"1")),
            (b"date", (b"", b"today", b"2007-06-05", b"2007-06-05T14:30:00", b"2007-06-05T14:30:00+01:00",
                       b"2007-13-05T14:30:00Z", b"2007-02-29T00:00:00Z", b"2007-06-05T24:00:00Z", b"2007-06-05T23:59:61Z",
                       b"292278995-01-01T00:00:00Z", b"-292275056-01-01T00:00:00Z", b"9" * 1000 + b"-01-01T00:00:00Z")),
            (b"data", (b"A", b"AA", b"AAA", b"?*=", b"AA==AA==", b"=", b"====", b"A===", b"AA=A", b"\xc3\xa4", b"AA\xc2\xa0==")))
        read = (
            (b"integer", (b"18446744073709551615", b"-9223372036854775808", b" 7\n", b"0xFFFFFFFFFFFFFFFF",
                          b"0" * 100_000 + b"7")),
            (b"real", (b"nan", b"inf", b"-infinity", b"1e308", b"4.9e-324", b"0." + b"1" * 100_000)),
            (b"date", (b"0001-01-01T00:00:00Z", b"9999-12-31T23:59:59Z", b"292278994-08-17T07:12:55Z",
                       b"-292275055-05-16T16:47:05Z", b"2007Z", b"2016-12-31T23:59:60Z", b"2007-06-05T14:30:00.125Z")),
            (b"data", (b"", b" \n", b"A A\n=\t=", b"//8=")))
        self.assertOutcomes(
            *((f"{kind.decode()} {content[:30]!r}", scalar(kind, content), REFUSED)
              for kind, contents in refused for content in contents),
            *((f"{kind.decode()} {content[:30]!r}", scalar(kind, content), READ)
              for kind, contents in read for content in contents))

    def test_dates_at_the_ends_of_time(self):
        for date in (b"-292275055-05-16T16:47:05Z", b"-0001-12-31T23:59:59Z", b"0000-02-29T00:00:00Z",
                     b"10000-01-01T00:00:00Z", b"292278994-08-17T07:12:55Z"):
            with self.subTest(date):
                result = self.convert(episodes(b"<dict><key>EpisodeDate</key><date>%s</date></dict>" % date))
                self.assertSucceeds(result)
                self.assertIn(b"<date>" + date + b"</date>", result.stdout)
                self.assertSucceeds(self.run_tool("createfeed", "-i", stdin=result.stdout))

    def test_duplicate_keys(self):
        self.assertOutcomes(
            ("two", podcast(b"<key>PodcastName</key><string>a</string>" + NAME), READ),
            ("of different kinds", podcast(b"<key>PodcastName</key><array/>" + NAME), READ),
            ("many", podcast(b"<key>PodcastName</key><string>a</string>" * 100_000 + NAME), READ))

    def test_sizes(self):
        many = 1_000_000 if soaking() else 100_000
        long = 50_000_000 if soaking() else 5_000_000
        text = b"t" * long

        def nested(depth, opening, closing):
            return podcast(b"<key>k</key>" + opening * depth + b"<true/>" + closing * depth + NAME)

        entry = b"<dict><key>k</key>", b"</dict>"
        self.assertOutcomes(
            ("lists in lists, just", nested(511, b"<array>", b"</array>"), READ),
            ("lists in lists, a few", nested(512, b"<array>", b"</array>"), REFUSED),
            ("lists in lists, a million", nested(1_000_000, b"<array>", b"</array>"), REFUSED),
            ("lists in lists, never closed", podcast(b"<key>k</key>" + b"<array>" * many), REFUSED),
            ("dictionaries in dictionaries, just", nested(511, *entry), READ),
            ("dictionaries in dictionaries, many", nested(many, *entry), REFUSED),
            ("distinct keys", podcast(numbered(b"<key>#</key><true/>", 25 * many) + NAME), READ),
            ("episodes of nothing", episodes(b"<dict/>" * many), {"Episodes": [{}] * many}),
            ("episodes that are none", episodes(b"<true/>" * many), {"Episodes": [{}] * many}),
            ("a long string", podcast(b"<key>PodcastName</key><string>" + text + b"</string>"),
             {"PodcastName": text.decode()}),
            ("a long key", podcast(b"<key>" + text + b"</key><true/>" + NAME), READ),
            ("long data", podcast(b"<key>k</key><data>" + b"QUJD" * (long // 4) + b"</data>" + NAME), READ),
            ("long data that is cut", podcast(b"<key>k</key><data>" + b"QUJD" * (long // 4) + b"QQ</data>" + NAME), REFUSED),
            ("a long integer", podcast(b"<key>k</key><integer>" + b"1" * long + b"</integer>"), REFUSED),
            ("a long date", podcast(b"<key>k</key><date>" + b"1" * long + b"</date>"), REFUSED),
            ("a long name of an element", podcast(b"<key>k</key><" + text + b"/>"), REFUSED))

    def test_entities(self):
        secret = self.write("secret.txt", b"SECRET")
        watch = FileWatch(secret)
        self.addCleanup(watch.close)
        web = self.server()
        web.serve("/secret.txt", b"SECRET")
        string = b"<key>PodcastName</key><string>%s</string>"
        for address in (secret.as_uri(), str(secret), web.url("/secret.txt")):
            external = f"SYSTEM '{address}'".encode()
            self.assertOutcomes(
                ("an external entity", doctype(b"<!ENTITY e " + external + b">") + podcast(string % b"a&e;b"),
                 {"PodcastName": "ab"}),
                ("an external subset", b"<!DOCTYPE plist " + external + b">" + podcast(string % b"a&e;b"),
                 {"PodcastName": "ab"}),
                ("a parameter entity", doctype(b"<!ENTITY % p " + external + b"> %p;") + podcast(string % b"a&e;b"),
                 {"PodcastName": "ab"}))
        self.assertEqual(watch.openings(), [])
        self.assertEqual(web.requests, [])
        self.assertOutcomes(
            ("a value", doctype(b"<!ENTITY e '<true/>'>") + podcast(b"<key>k</key>&e;" + NAME), READ),
            ("half a value", doctype(b"<!ENTITY e '<dict>'>") + podcast(b"<key>k</key>&e;</dict>"), REFUSED),
            ("exponential", doctype(laughs(11)) + podcast(string % b"&e11;"), REFUSED),
            ("exponential, of values", doctype(laughs(11).replace(b"0123456789", b"<true/>")) + episodes(b"&e11;"), REFUSED),
            ("quadratic", doctype(b"<!ENTITY e '" + b"x" * 200_000 + b"'>") + podcast(string % (b"&e;" * 50_000)), REFUSED),
            ("entities in entities", doctype(chain_of_entities(2_500_000)) + podcast(string % b"&e99998;"), REFUSED))

    def test_encodings(self):
        document = podcast(b"<key>PodcastName</key><string>n</string>").decode()
        self.assertOutcomes(
            ("UTF-16", document.encode("utf-16"), READ), ("UTF-32", document.encode("utf-32"), READ),
            ("UTF-16 without a mark", document.encode("utf-16-be"), READ),
            ("UTF-16 cut within a unit", document.encode("utf-16")[:-1], REFUSED),
            ("EBCDIC", document.encode("cp037"), REFUSED),
            ("an unknown one", b"<?xml version='1.0' encoding='klingon'?>" + document.encode(), REFUSED))


class BinaryTest(HostileListTest):
    """Binary lists say where their parts are, and may lie about every one of them."""

    EPISODE = array_object([3]), dictionary_object({4: 5})

    def podcast(self, value):
        return binary_podcast(b"PodcastName", value)

    def test_values(self):
        self.assertOutcomes(
            *((name, self.podcast(value), {"PodcastName": text}) for name, value, text in (
                ("a text", b"\x51n", "n"), ("no text", b"\x50", ""), ("a text of one, counted", b"\x5f\x10\x01n", "n"),
                ("wide", b"\x62\xd8\x3d\xde\x00", "😀"), ("UTF-8", b"\x72\xc3\xa4", "ä"),
                ("a lone surrogate", b"\x63\x00a\xd8\x00\x00b", "a\ufffdb"), ("at the end", b"\x62\x00a\xd8\x00", "a\ufffd"),
                ("a pair in the wrong order", b"\x62\xdc\x00\xd8\x00", "\ufffd\ufffd"),
                ("ASCII that is none", b"\x53a\xffb", "a\ufffdb"), ("UTF-8 that is none", b"\x73a\xc3b", "a\ufffdb"),
                ("UTF-8 of a surrogate", b"\x73\xed\xa0\x80", "\ufffd\ufffd\ufffd"),
                ("characters that XML has not", b"\x54\x00\x01a\x0b", "a"), ("U+FFFE", b"\x62\xff\xfe\x00a", "a"),
                ("an integer of 16 bytes", b"\x14" + bytes(15) + b"\x05", "5"),
                ("the largest", b"\x14" + bytes(8) + b"\xff" * 8, "18446744073709551615"),
                ("a negative one", b"\x13" + b"\xff" * 8, "-1"), ("a real", b"\x23" + struct.pack(">d", 0.5), "0.5"),
                ("a real that is none", b"\x23" + struct.pack(">d", float("nan")), "nan"),
                ("an endless one", b"\x23" + struct.pack(">d", float("-inf")), "-inf"))),
            *((name, self.podcast(value), {}) for name, value in (
                ("true", b"\x09"), ("a date", b"\x33" + bytes(8)), ("data", b"\x41\0"), ("a list", b"\xa0"),
                ("a set", b"\xc1\x01"), ("an ordered set", b"\xb1\x01"), ("a dictionary", b"\xd0"))),
            *((name, self.podcast(value), REFUSED) for name, value in (
                ("null", b"\x00"), ("a URL", b"\x0c\x51u"), ("a UUID", b"\x0e" + bytes(16)), ("filling", b"\x0f"),
                ("a UID", b"\x80\x01"), ("a UID of 16 bytes", b"\x8f" + bytes(16)), ("an unknown kind", b"\x91"),
                ("the last marker", b"\xff"), ("an integer of 32 bytes", b"\x15" + bytes(32)),
                ("an integer of 2^15 bytes", b"\x1f" + bytes(100)), ("an integer beyond 64 bits", b"\x14" + b"\1" * 16),
                ("a real of two bytes", b"\x21\0\0"), ("a date of four bytes", b"\x32" + bytes(4)),
                *((f"a date of {value}", b"\x33" + struct.pack(">d", value))
                  for value in (float("nan"), float("inf"), float("-inf"), 1e300, -1e300, 1e16, -1e16)))))

    def test_numbers_and_dates_of_episodes(self):
        def episode(key, value):
            return binary_podcast(b"Episodes", *self.EPISODE, ascii_object(key), value)

        def real(value):
            return b"\x23" + struct.pack(">d", value)

        largest = 2**63 - 1
        self.assertOutcomes(*(
            (f"{key} {value!r}", episode(key.encode(), value), {"Episodes": [{} if expected is None else {key: expected}]})
            for key, value, expected in (
                ("EpisodeOrder", b"\x14" + bytes(8) + b"\xff" * 8, largest), ("EpisodeOrder", real(1e300), largest),
                ("EpisodeOrder", real(float("inf")), largest), ("EpisodeOrder", real(float("nan")), None),
                ("EpisodeOrder", real(-1e300), None), ("EpisodeFileSize", real(1e300), 2**64 - 1),
                ("EpisodeFileSize", real(float("inf")), 2**64 - 1), ("EpisodeFileSize", real(float("nan")), None),
                ("EpisodeFileSize", real(-1.0), None), ("EpisodeFileSize", b"\x13" + b"\xff" * 8, None),
                ("EpisodeName", real(1e300), "1e+300"))))
        for seconds, written in ((9.2e15, b"291538395-"), (-9.2e15, b"-291534394-"), (-0.0, b"2001-01-01T00:00:00Z"),
                                 (-63113904001, b"0000-12-31T23:59:59Z"), (2.524e11, b"9999-")):
            with self.subTest(seconds):
                document = episode(b"EpisodeDate", b"\x33" + struct.pack(">d", seconds))
                result = self.convert(document)
                self.assertSucceeds(result)
                self.assertIn(b"<date>" + written, result.stdout)
                self.assertSucceeds(self.run_tool("createfeed", "-i", stdin=document))

    def test_counts(self):
        lies = (b"\x13\x80" + bytes(7), b"\x13\x7f" + b"\xff" * 7, b"\x13" + b"\xff" * 8, b"\x13\x40" + bytes(7),
                b"\x13\x20" + bytes(6) + b"\x01", b"\x12\xff\xff\xff\xff", b"\x11\xff\xff", b"\x10\xff",
                b"\x14" + bytes(15) + b"\x01", b"\x51a", b"\x23" + bytes(8), b"\x09", b"")
        self.assertOutcomes(*(
            (f"{kind:x} {lie!r}", self.podcast(bytes([kind << 4 | 15]) + lie), REFUSED)
            for kind in (0x4, 0x5, 0x6, 0x7, 0xa, 0xc, 0xd) for lie in lies))

    def test_references(self):
        name, text = ascii_object(b"PodcastName"), b"\x51n"
        self.assertOutcomes(
            ("a list in itself", binary_podcast(b"k", array_object([2])), REFUSED),
            ("the root in itself", binary_list([dictionary_object({1: 0}), name]), REFUSED),
            ("a dictionary as its own key", binary_list([dictionary_object({0: 1}), name]), REFUSED),
            ("two lists in each other", binary_podcast(b"k", array_object([3]), array_object([2])), REFUSED),
            ("a long circle", binary_podcast(b"k", *(array_object([number], 2) for number in range(3, 300)),
                                             array_object([2], 2), reference_size=2), REFUSED),
            ("nowhere", binary_list([dictionary_object({1: 3}), name, text]), REFUSED),
            ("far away", binary_list([dictionary_object({1: 255}), name, text]), REFUSED),
            ("a key from nowhere", binary_list([dictionary_object({3: 2}), name, text]), REFUSED),
            *((f"a key that is {kind}", binary_list([dictionary_object({1: 2}), key, text]), REFUSED) for kind, key in (
                ("a number", b"\x10\x05"), ("true", b"\x09"), ("data", b"\x41k"), ("a date", b"\x33" + bytes(8)),
                ("a list", b"\xa0"), ("a dictionary", b"\xd0"), ("null", b"\x00"), ("a UID", b"\x80\x01"))),
            ("one key twice", binary_list([b"\xd2\x01\x01\x02\x03", name, b"\x51m", text]), READ),
            ("equal keys", binary_list([b"\xd2\x01\x02\x03\x04", name, name, b"\x51m", text]), READ),
            ("a key as its value", binary_list([dictionary_object({1: 1}), name]), {"PodcastName": "PodcastName"}))

    def test_trailers(self):
        objects = [dictionary_object({1: 2}), ascii_object(b"PodcastName"), b"\x51n"]
        whole = binary_list(objects)
        self.assertOutcome(whole, READ)
        huge = (2**61, 2**62, 2**63, 2**63 + 1, 2**64 - 1)
        self.assertOutcomes(
            *((str(options), binary_list(objects, **options), REFUSED) for options in (
                *({field: value} for field in ("top", "count", "table") for value in huge),
                {"top": 3}, {"count": 0}, {"count": 1000}, {"table": 0}, {"table": 7}, {"table": 10_000},
                {"table": len(whole) - 32}, *({field: size} for field in ("offset_size", "reference_size")
                                              for size in (0, 9, 16, 255)))),
            ("another root", binary_list(objects, top=1), NO_DICTIONARY),
            ("fewer objects", binary_list(objects, count=2), REFUSED),
            *((f"offsets of {size}", binary_list(objects, offset_size=size), READ) for size in range(1, 9)),
            *((f"references of {size}", binary_podcast(b"PodcastName", b"\x51n", reference_size=size)
               .replace(b"\xd1\x01\x02", b"\xd1" + (1).to_bytes(size, "big") + (2).to_bytes(size, "big")), READ)
              for size in range(1, 9)),
            ("no trailer", whole[:-32], REFUSED), ("a trailer alone", b"bplist00" + whole[-32:], REFUSED),
            ("another version", whole.replace(b"bplist00", b"bplist15"), REFUSED),
            ("behind a byte order mark", b"\xef\xbb\xbf" + whole, REFUSED),
            ("something behind it", whole + b"\n", REFUSED))

    def test_offsets(self):
        def with_offset(number, offset):
            whole = bytearray(binary_list([dictionary_object({1: 2}), ascii_object(b"PodcastName"), b"\x51n"]))
            table = len(whole) - 32 - 6
            whole[table + 2 * number:table + 2 * number + 2] = offset.to_bytes(2, "big")
            return bytes(whole)

        self.assertOutcomes(
            *((f"{number} at {offset}", with_offset(number, offset), REFUSED)
              for number in range(3) for offset in (0, 7, 8 + 3 + 12 + 2, 0x7fff, 0xffff)),
            ("two objects in one place", with_offset(2, 11), {"PodcastName": "PodcastName"}),
            ("the value in the place of the root", with_offset(2, 8), REFUSED),
            ("the value inside of the name, whose P is an empty text", with_offset(2, 12), {"PodcastName": ""}))

    def test_sharing(self):
        wide = {"offset_size": 4, "reference_size": 4}
        shared = self.EPISODE[1], ascii_object(b"EpisodeName")
        self.assertOutcomes(
            ("one episode, some times", binary_podcast(b"Episodes", array_object([3] * 200), *shared, b"\x51n"),
             {"Episodes": [{"EpisodeName": "n"}] * 200}),
            ("one episode, a million times", binary_podcast(
                b"Episodes", array_object(b"\3" * 1_000_000), *shared, b"\x51n"), REFUSED),
            ("one long name, often", binary_podcast(
                b"Episodes", array_object(b"\3" * 20_000), *shared, ascii_object(b"n" * 20_000), offset_size=4), REFUSED),
            ("one long name under as long keys", binary_podcast(
                b"k", array_object(b"\3" * 10_000), dictionary_object({4: 4}), ascii_object(b"k" * 20_000),
                offset_size=4), REFUSED),
            ("long data, often", binary_podcast(
                b"k", array_object(b"\3" * 10_000), counted(0x4, 20_000) + bytes(20_000), offset_size=4), REFUSED),
            *((f"lists of two lists, {levels} deep", binary_laughs(levels), REFUSED) for levels in (30, 64, 500)),
            ("lists of two lists, deeper than lists may be", binary_laughs(600), REFUSED),
            ("dictionaries of two dictionaries", binary_podcast(b"k", *(
                b"\xd2" + struct.pack(">4I", 62, 63, number, number) for number in range(3, 62)), b"\xd0", b"\x51a", b"\x51b",
                **wide), REFUSED),
            ("overlapping texts", overlapping_texts(1_000_000), REFUSED),
            ("lists in lists, just", binary_podcast(b"PodcastName", *(
                array_object([number], 4) for number in range(3, 3 + 511)), b"\x09", **wide), {}),
            ("lists in lists, a few", binary_podcast(b"PodcastName", *(
                array_object([number], 4) for number in range(3, 3 + 512)), b"\x09", **wide), REFUSED),
            ("lists in lists, a million", binary_podcast(b"PodcastName", *(
                array_object([number], 4) for number in range(3, 3 + 1_000_000)), b"\x09", **wide), REFUSED))


class DamageTest(HostileListTest):
    XML = (b'<?xml version="1.0"?><!DOCTYPE plist [<!ENTITY e "x">]><plist version="1.0"><dict><!-- c -->'
           b"<key>PodcastName</key><string>&e;<![CDATA[<]]>&#65;</string><key>Episodes</key><array><dict>"
           b"<key>EpisodeOrder</key><integer>1</integer><key>EpisodeDate</key><date>2007-06-05T14:30:00Z</date>"
           b"<key>d</key><data>AAH/</data><key>r</key><real>1.5</real><key>t</key><true/></dict></array></dict></plist>")
    BINARY = plistlib.dumps({"PodcastName": "ä", "Episodes": [{"EpisodeOrder": 1, "d": b"\0", "r": 1.5, "t": True}]},
                            fmt=plistlib.FMT_BINARY)

    def test_the_whole_is_read(self):
        for whole in (self.XML, self.BINARY):
            self.assertSucceeds(self.convert(whole))

    def test_lists_cut_at_every_byte(self):
        for whole in (self.XML, self.BINARY):
            for length in range(0, len(whole), 1 if soaking() else 5):
                with self.subTest(whole[:6], length=length):
                    self.assertOutcome(whole[:length], REFUSED)

    def test_lists_with_every_byte_replaced(self):
        for whole, some in ((self.XML, b"\0<&\xff"), (self.BINARY, b"\0\x7f\x80\xff")):
            every = range(256) if whole is self.BINARY else b"\0\1\t\n \"&'/<>=]?!-%;0\x7f\x80\xc0\xfe\xff"
            positions = range(0, len(whole), 1 if soaking() else 23)
            for position, byte in itertools.product(positions, every if soaking() else some):
                with self.subTest(whole[:6], position=position, byte=byte):
                    self.assertSane(self.convert(whole[:position] + bytes([byte]) + whole[position + 1:]))

    def test_every_marker_of_an_object(self):
        for marker in range(0, 256, 1 if soaking() else 7):
            for filling in (b"", b"\xff" * 40):
                with self.subTest(marker, filling=filling[:1]):
                    self.assertSane(self.convert(binary_podcast(b"PodcastName", bytes([marker]) + filling)))


if __name__ == "__main__":
    unittest.main()
