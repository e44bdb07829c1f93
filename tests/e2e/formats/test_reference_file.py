"""Reference files are written by hand as well as by the tool, so reading has to cope with what hands do.

Whatever the tool writes it must read back to the very same bytes; whatever it cannot read it must refuse
without a crash.
"""

import datetime
import plistlib
import random
import unittest

from support import ToolTestCase

FULL = {
    "PodcastUUID": "5C1B2A3D-0000-4000-8000-000000000001", "PodcastName": "Night Walks", "PodcastAuthor": "Ann Other",
    "PodcastCopyright": "© 2007", "PodcastKeywords": "night, walk", "PodcastCategory": "Arts",
    "PodcastDescription": "Long walks & short nights <live>", "PodcastAdvisoryLabel": "Clean",
    "PodcastReference": "http://example.com/", "PodcastReferenceType": "remote",
    "PodcastPosterReference": "posters/p.png", "PodcastPosterReferenceType": "local",
    "Episodes": [
        {"EpisodeUUID": "5C1B2A3D-0000-4000-8000-000000000002", "EpisodeName": "One", "EpisodeAuthor": "Ann Other",
         "EpisodeDate": datetime.datetime(2007, 6, 5, 14, 30), "EpisodeKeywords": "k", "EpisodeDescription": "d",
         "EpisodeCategory": "c", "EpisodeAdvisoryLabel": "Explicit", "EpisodeOrder": 0, "EpisodeType": "audio/mpeg",
         "EpisodeFileSize": 2**40, "EpisodeReference": "http://example.com/1.mp3", "EpisodeReferenceType": "remote",
         "EpisodePosterReference": "e.png", "EpisodePosterReferenceType": "local"},
        {},
        {"EpisodeName": "🚶\u0301 שלום"},
    ],
}

HEAD = b"""<?xml version="1.0" encoding="UTF-8"?>
<!DOCTYPE plist PUBLIC "-//Apple//DTD PLIST 1.0//EN" "http://www.apple.com/DTDs/PropertyList-1.0.dtd">
"""


class StabilityTest(ToolTestCase):
    def test_written_files_read_back_to_the_same_bytes(self):
        for name, podcast in (("full", FULL), ("empty", {}), ("texts", {"PodcastName": " a\tb\nc\r\nd\re ",
                                                                       "PodcastAuthor": "", "PodcastCopyright": "\n"})):
            for fmt in (plistlib.FMT_XML, plistlib.FMT_BINARY):
                with self.subTest(name, fmt=fmt):
                    first = self.run_tool("parsefeed", self.reference(podcast, fmt=fmt))
                    self.assertSucceeds(first)
                    second = self.run_tool("parsefeed", self.write("written.plist", first.stdout))
                    self.assertSucceeds(second, first.stdout)
                    third = self.run_tool("parsefeed", "-i", stdin=second.stdout)
                    self.assertSucceeds(third, first.stdout)

    def test_equal_podcasts_give_equal_bytes(self):
        backwards = {key: FULL[key] for key in reversed(FULL)}
        first = self.run_tool("parsefeed", self.reference(FULL))
        second = self.run_tool("parsefeed", self.write("b.plist", plistlib.dumps(backwards, sort_keys=False)))
        self.assertEqual(first.stdout, second.stdout)

    def test_both_forms_give_equal_bytes(self):
        xml = self.run_tool("parsefeed", self.reference(FULL, fmt=plistlib.FMT_XML))
        binary = self.run_tool("parsefeed", self.reference(FULL, fmt=plistlib.FMT_BINARY))
        self.assertSucceeds(xml)
        self.assertEqual(xml.stdout, binary.stdout)

    def test_a_full_podcast_is_read_back_whole(self):
        self.assertEqual(self.parsefeed(self.reference(FULL)), FULL)


class BinaryFormTest(ToolTestCase):
    def read(self, podcast):
        return self.parsefeed(self.reference(podcast, fmt=plistlib.FMT_BINARY))

    def test_a_full_podcast(self):
        self.assertEqual(self.read(FULL), FULL)

    def test_texts_in_each_form(self):
        for text in ("", "a", "a" * 14, "a" * 15, "a" * 256, "a" * 70_000, "ü", "ü" * 15, "ü" * 70_000, "🚶",
                     "a\U0010ffffb"):
            with self.subTest(text[:20], length=len(text)):
                self.assertEqual(self.read({"PodcastName": text}), {"PodcastName": text})

    def test_numbers_of_each_size(self):
        for size in (1, 255, 256, 65535, 65536, 2**32 - 1, 2**32, 2**63 - 1, 2**63, 2**64 - 1):
            with self.subTest(size):
                self.assertEqual(self.read({"Episodes": [{"EpisodeFileSize": size}]}),
                                 {"Episodes": [{"EpisodeFileSize": size}]})

    def test_more_objects_than_one_byte_counts(self):
        episodes = [{"EpisodeName": f"Episode {number}", "EpisodeOrder": number} for number in range(70_000)]
        self.assertEqual(self.read({"Episodes": episodes}), {"Episodes": episodes})

    def test_a_fraction_of_a_second_is_dropped_towards_the_past(self):
        for given, expected in (
                (datetime.datetime(2007, 6, 5, 14, 30, 0, 750_000), datetime.datetime(2007, 6, 5, 14, 30, 0)),
                (datetime.datetime(1999, 12, 31, 23, 59, 59, 500_000), datetime.datetime(1999, 12, 31, 23, 59, 59))):
            with self.subTest(given):
                self.assertEqual(self.read({"Episodes": [{"EpisodeDate": given}]}),
                                 {"Episodes": [{"EpisodeDate": expected}]})


class DateTest(ToolTestCase):
    def test_dates_pass_whatever_the_time_zone(self):
        episodes = [{"EpisodeDate": date} for date in (
            datetime.datetime(1, 1, 1), datetime.datetime(1500, 3, 1, 12), datetime.datetime(1582, 10, 10),
            datetime.datetime(1900, 1, 1), datetime.datetime(1969, 12, 31, 23, 59, 59), datetime.datetime(1970, 1, 1),
            datetime.datetime(2000, 2, 29, 1, 2, 3), datetime.datetime(2001, 1, 1),
            datetime.datetime(2007, 3, 11, 2, 30),
            datetime.datetime(2038, 1, 19, 3, 14, 8), datetime.datetime(9999, 12, 31, 23, 59, 59))]
        for zone in ("UTC", "America/Los_Angeles", "Asia/Kolkata", "Pacific/Apia"):
            for fmt in (plistlib.FMT_XML, plistlib.FMT_BINARY):
                with self.subTest(zone, fmt=fmt):
                    source = self.reference({"Episodes": episodes}, fmt=fmt)
                    self.assertEqual(self.parsefeed(source, env={"TZ": zone}), {"Episodes": episodes})


class ValueTypeTest(ToolTestCase):
    """A value of an unexpected kind is converted or counts as absent, and never harms its neighbours."""

    VALUES_IN_TEXT = (
        (42, "42"), (-7, "-7"), (2**64 - 1, "18446744073709551615"), (0, "0"), (True, None), (False, None),
        (b"bytes", None), (datetime.datetime(2007, 6, 5), None), ([], None), (["a"], None), ({}, None),
        ({"a": "b"}, None))

    def test_values_where_a_podcast_has_text(self):
        for fmt in (plistlib.FMT_XML, plistlib.FMT_BINARY):
            for value, expected in self.VALUES_IN_TEXT:
                with self.subTest(value, fmt=fmt):
                    written = self.parsefeed(self.reference({"PodcastName": value, "PodcastAuthor": "a"}, fmt=fmt))
                    self.assertEqual(written, {"PodcastAuthor": "a", **({} if expected is None else
                                                                        {"PodcastName": expected})})

    def test_values_where_an_episode_has_text(self):
        for value, expected in self.VALUES_IN_TEXT:
            with self.subTest(value):
                written = self.parsefeed(self.reference({"Episodes": [{"EpisodeName": value, "EpisodeAuthor": "a"}]}))
                self.assertEqual(written["Episodes"], [{"EpisodeAuthor": "a", **({} if expected is None else
                                                                                 {"EpisodeName": expected})}])

    def test_a_fractional_number_where_text_is_expected(self):
        written = self.parsefeed(self.reference({"PodcastName": 1.5}))
        self.assertEqual(float(written["PodcastName"]), 1.5)

    def test_a_location_that_is_a_number_is_classed_by_its_text(self):
        written = self.parsefeed(self.reference({"Episodes": [{"EpisodeReference": 42}]}))
        self.assertEqual(written["Episodes"], [{"EpisodeReference": "42", "EpisodeReferenceType": "local"}])

    def test_a_reference_type_that_counts_as_absent_is_derived(self):
        written = self.parsefeed(self.reference({"Episodes": [{"EpisodeReference": "a", "EpisodeReferenceType": []}]}))
        self.assertEqual(written["Episodes"], [{"EpisodeReference": "a", "EpisodeReferenceType": "local"}])

    def test_values_where_an_order_is_expected(self):
        for value, expected in (("12", 12), ("12abc", 12), (" \n\t7", 7), ("+5", 5), ("-5", None), ("abc", 0), ("", 0),
                                ("- 5", 0), (3.9, 3), (True, None), (False, None), (b"1", None), ([1], None),
                                ({"a": 1}, None), (datetime.datetime(2007, 6, 5), None)):
            with self.subTest(value):
                written = self.parsefeed(self.reference({"Episodes": [{"EpisodeOrder": value}]}))
                self.assertEqual(written["Episodes"], [{} if expected is None else {"EpisodeOrder": expected}])

    def test_values_where_a_size_is_expected(self):
        for value, expected in (("123", 123), ("123 bytes", 123), (" 9", 9), ("many", None), ("", None), (-5, None),
                                ("-5", None), (3.9, 3), (True, None), (b"1", None), ([1], None)):
            with self.subTest(value):
                written = self.parsefeed(self.reference({"Episodes": [{"EpisodeFileSize": value}]}))
                self.assertEqual(written["Episodes"], [{} if expected is None else {"EpisodeFileSize": expected}])

    def test_values_where_a_date_is_expected(self):
        for value in ("2007-06-05T14:30:00Z", 0, 1.5, True, b"", [], {}):
            with self.subTest(value):
                written = self.parsefeed(self.reference({"Episodes": [{"EpisodeDate": value}]}))
                self.assertEqual(written["Episodes"], [{}])

    def test_numbers_beyond_every_range_do_not_crash(self):
        for written in (b"9223372036854775808", b"18446744073709551616", b"-9223372036854775809", b"9" * 400):
            for key in (b"EpisodeOrder", b"EpisodeFileSize", b"EpisodeName"):
                for kind in (b"integer", b"real", b"string"):
                    with self.subTest(written[:30], key=key, kind=kind):
                        source = self.write("big.plist",
                                            HEAD + b"<plist version='1.0'><dict><key>Episodes</key><array><dict>"
                                            b"<key>%s</key><%s>%s</%s></dict></array></dict></plist>"
                                            % (key, kind, written, kind))
                        self.assertIn(self.run_tool("parsefeed", source).status, (0, 1))

    def test_episodes_that_are_no_list_count_as_absent(self):
        for value in ("text", 1, True, {"EpisodeName": "n"}, b"x"):
            with self.subTest(value):
                self.assertEqual(self.parsefeed(self.reference({"Episodes": value})), {})

    def test_an_episode_that_is_no_dictionary_is_empty(self):
        self.assertEqual(self.parsefeed(self.reference({"Episodes": ["text", 1, {"EpisodeName": "n"}, [], True]})),
                         {"Episodes": [{}, {}, {"EpisodeName": "n"}, {}, {}]})

    def test_allowed_types_of_every_kind_are_harmless(self):
        for value in ("png", 1, [1, {}, "png"], {}, [[]]):
            with self.subTest(value):
                self.assertEqual(self.parsefeed(self.reference({"AllowedPosterTypes": value,
                                                                "AllowedEpisodeTypes": value})), {})


class XMLFormTest(ToolTestCase):
    def read(self, content):
        return self.parsefeed(self.write("hand.plist", content))

    def test_what_hands_write(self):
        expected = {"PodcastName": "Night Walks"}
        body = b"<plist version='1.0'><dict><key>PodcastName</key><string>Night Walks</string></dict></plist>"
        for name, content in (
                ("without document type", b'<?xml version="1.0"?>' + body),
                ("without declaration", body),
                ("with a byte order mark", b"\xef\xbb\xbf" + HEAD + body),
                ("with white space first", b"\n  " + HEAD + body),
                ("without version", body.replace(b" version='1.0'", b"")),
                ("with comments", HEAD + body.replace(b"<dict>", b"<!-- a --><dict><!-- b -->").replace(
                    b"Night", b"Ni<!-- c -->ght")),
                ("with an instruction", HEAD + b"<?edit this?>" + body),
                ("with CDATA", body.replace(b"Night Walks", b"<![CDATA[Night]]> Walks")),
                ("with references", body.replace(b"Night", b"&#78;&#x69;ght")),
                ("with white space between", body.replace(b"><", b">\r\n\t <")),
                ("with DOS line ends", HEAD.replace(b"\n", b"\r\n") + body)):
            with self.subTest(name):
                self.assertEqual(self.read(content), expected)

    def test_white_space_in_texts_is_kept(self):
        for written, expected in ((b"  a  ", "  a  "), (b"\n\ta\n", "\n\ta\n"), (b"a\r\nb", "a\nb"),
                                  (b"a&#13;&#10;b", "a\r\nb")):
            with self.subTest(written):
                self.assertEqual(self.read(b"<plist><dict><key>PodcastName</key><string>%s</string></dict></plist>" % written),
                                 {"PodcastName": expected})

    def test_empty_elements(self):
        self.assertEqual(self.read(b"<plist><dict><key>PodcastName</key><string/><key>Episodes</key><array/></dict></plist>"),
                         {"PodcastName": ""})
        self.assertEqual(self.read(b"<plist><dict/></plist>"), {})

    def test_internal_entities_are_resolved(self):
        content = (b'<!DOCTYPE plist [<!ENTITY name "Night &#38;#38; Walks">]><plist><dict><key>PodcastName</key>'
                   b"<string>&name;</string></dict></plist>")
        self.assertEqual(self.read(content), {"PodcastName": "Night & Walks"})

    def test_the_document_type_is_not_fetched(self):
        server = self.server()
        url = server.serve("/list.dtd", b"<!ELEMENT plist ANY>")
        content = f'<!DOCTYPE plist SYSTEM "{url}"><plist><dict/></plist>'
        self.assertEqual(self.read(content), {})
        self.assertEqual(server.requests, [])


class DamageTest(ToolTestCase):
    def assertRefused(self, content):
        path = self.write("bad.plist", content)
        self.assertFails(self.run_tool("parsefeed", path),
                         f'Could not initialize podcast source with string "{path}".\n')

    def test_what_is_no_reference_file(self):
        for name, content in (
                ("nothing", b""), ("white space", b"\n"), ("text", b"Night Walks"), ("zeros", bytes(100)),
                ("a feed", b"<rss><channel/></rss>"), ("an empty list", b"<plist/>"),
                ("a list without root", b"<plist></plist>"),
                ("an array", plistlib.dumps([])), ("a text", plistlib.dumps("text")), ("a number", plistlib.dumps(1)),
                ("a binary array", plistlib.dumps(["a"], fmt=plistlib.FMT_BINARY)),
                ("a binary text", plistlib.dumps("text", fmt=plistlib.FMT_BINARY)),
                ("a binary head", b"bplist00"), ("an unknown binary form", b"bplist15" + bytes(60)),
                ("a dict alone", b"<dict><key>PodcastName</key><string>n</string></dict>"),
                ("two roots", b"<plist><dict/></plist><plist><dict/></plist>"),
                ("a key without value", b"<plist><dict><key>PodcastName</key></dict></plist>"),
                ("a value without key", b"<plist><dict><string>n</string></dict></plist>"),
                ("an unknown element", b"<plist><dict><key>PodcastName</key><text>n</text></dict></plist>"),
                ("a number of letters", b"<plist><dict><key>PodcastName</key><integer>many</integer></dict></plist>"),
                ("a date of letters", b"<plist><dict><key>EpisodeDate</key><date>today</date></dict></plist>"),
                ("an undeclared entity", b"<plist><dict><key>a</key><string>&nbsp;</string></dict></plist>"),
                ("a wrong end", b"<plist><dict></plist></dict>"),
                ("bytes that are no text", b"<plist><dict><key>PodcastName</key><string>\xff</string></dict></plist>")):
            with self.subTest(name):
                self.assertRefused(content)

    def test_an_xml_list_cut_anywhere(self):
        content = self.run_tool("parsefeed", self.reference(FULL)).stdout
        end = content.rindex(b"</plist>") + len(b"</plist>") - 1
        for length in [*range(0, end, 37), end]:
            with self.subTest(length):
                self.assertRefused(content[:length])

    def test_a_binary_list_cut_anywhere(self):
        content = plistlib.dumps(FULL, fmt=plistlib.FMT_BINARY)
        for length in range(0, len(content), 11):
            with self.subTest(length):
                self.assertIn(self.run_tool("parsefeed", self.write("cut.plist", content[:length])).status, (0, 1))

    def test_damaged_bytes_never_crash_the_tool(self):
        chance = random.Random(20070605)
        for fmt in (plistlib.FMT_XML, plistlib.FMT_BINARY):
            whole = plistlib.dumps(FULL, fmt=fmt)
            for turn in range(150):
                damaged = bytearray(whole)
                for _ in range(chance.randint(1, 4)):
                    damaged[chance.randrange(len(damaged))] = chance.randrange(256)
                with self.subTest(fmt=fmt, turn=turn):
                    result = self.run_tool("parsefeed", "-i", stdin=bytes(damaged), timeout=30, memory_limit=2 << 30)
                    self.assertIn(result.status, (0, 1))
                    if result.status == 0:
                        self.assertIsInstance(plistlib.loads(result.stdout), dict)

    def test_damaged_ends_of_binary_lists_never_crash_the_tool(self):
        chance = random.Random(20070606)
        whole = plistlib.dumps({"PodcastName": "n", "Episodes": [{}]}, fmt=plistlib.FMT_BINARY)
        for turn in range(300):
            damaged = bytearray(whole)
            for _ in range(chance.randint(1, 3)):
                position = len(damaged) - 1 - chance.randrange(48)
                damaged[position] = chance.choice((0, 1, 2, 0x7f, 0x80, 0xff, chance.randrange(256)))
            with self.subTest(turn):
                result = self.run_tool("parsefeed", "-i", stdin=bytes(damaged), timeout=30, memory_limit=2 << 30)
                self.assertIn(result.status, (0, 1))


if __name__ == "__main__":
    unittest.main()
