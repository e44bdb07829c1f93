"""Reference files are written by hand, by other programs and by the tool, in both forms of a property list.

Python's own module writes them here. Whatever the tool writes it must read back to the very same bytes. The unit
tests of the property lists have the tables of values and faults, test_hostile_lists.py what nobody's writer would make.
"""

import datetime
import plistlib
import unittest

from support import ToolTestCase

FORMS = (plistlib.FMT_XML, plistlib.FMT_BINARY)

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


class ReadingTest(ToolTestCase):
    def assertReads(self, podcast, expected, **options):
        """Both forms of the dictionary are read as the expected one."""
        for fmt in FORMS:
            with self.subTest(fmt=fmt):
                self.assertTrue(self.parsefeed(self.reference(podcast, fmt=fmt), **options) == expected)

    def test_texts_and_numbers_of_every_length(self):
        texts = ("", "a", "a" * 14, "a" * 15, "a" * 256, "a" * 70_000, "ü", "ü" * 15, "ü" * 70_000, "🚶", "a\U0010ffffb")
        sizes = (1, 255, 256, 65535, 65536, 2**32 - 1, 2**32, 2**63 - 1, 2**63, 2**64 - 1)
        episodes = [*({"EpisodeName": text} for text in texts), *({"EpisodeFileSize": size} for size in sizes),
                    *({"EpisodeUUID": f"u{number}", "EpisodeOrder": number} for number in range(300))]
        self.assertReads({"Episodes": episodes}, {"Episodes": episodes})

    def test_dates_pass_whatever_the_time_zone(self):
        episodes = [{"EpisodeDate": date} for date in (
            datetime.datetime(1, 1, 1), datetime.datetime(1582, 10, 10), datetime.datetime(1969, 12, 31, 23, 59, 59),
            datetime.datetime(2000, 2, 29, 1, 2, 3), datetime.datetime(2007, 3, 11, 2, 30),
            datetime.datetime(9999, 12, 31, 23, 59, 59))]
        for zone in ("UTC", "America/Los_Angeles", "Pacific/Apia"):
            self.assertReads({"Episodes": episodes}, {"Episodes": episodes}, env={"TZ": zone})

    def test_a_fraction_of_a_second_is_dropped_towards_the_past(self):
        source = self.reference({"Episodes": [{"EpisodeDate": datetime.datetime(1999, 12, 31, 23, 59, 59, 750_000)}]},
                                fmt=plistlib.FMT_BINARY)
        self.assertEqual(self.parsefeed(source)["Episodes"],
                         [{"EpisodeDate": datetime.datetime(1999, 12, 31, 23, 59, 59)}])

    def test_values_of_unexpected_kinds(self):
        """Each is converted or counts as absent, and never harms its neighbours."""
        now = datetime.datetime(2007, 6, 5)
        self.assertReads(
            {"PodcastName": -7, "PodcastAuthor": True, "PodcastCopyright": b"x", "PodcastKeywords": now,
             "PodcastCategory": ["a"], "PodcastDescription": 1.5, "PodcastUUID": "u", "AllowedPosterTypes": "png",
             "AllowedEpisodeTypes": [1, {}, [], "mp3"], "Episodes": [
                 {"EpisodeName": {}, "EpisodeAuthor": "a", "EpisodeReference": 42, "EpisodeReferenceType": []},
                 {"EpisodeOrder": " \n\t7x", "EpisodeFileSize": "123 bytes", "EpisodeDate": "2007-06-05T14:30:00Z"},
                 {"EpisodeOrder": "- 5", "EpisodeFileSize": -5, "EpisodeDate": 0}, {"EpisodeOrder": b"1"},
                 {"EpisodeOrder": 3.9, "EpisodeFileSize": True}, "text", 1, []]},
            {"PodcastName": "-7", "PodcastDescription": "1.5", "PodcastUUID": "u", "Episodes": [
                {"EpisodeAuthor": "a", "EpisodeReference": "42", "EpisodeReferenceType": "local"},
                {"EpisodeOrder": 7, "EpisodeFileSize": 123}, {"EpisodeOrder": 0}, {}, {"EpisodeOrder": 3}, {}, {}, {}]})
        for value in ("text", 1, {"EpisodeName": "n"}):
            self.assertReads({"Episodes": value}, {})

    def test_what_hands_write(self):
        content = ("\ufeff\r\n <?xml version='1.0'?><?edit this?><!DOCTYPE plist [<!ENTITY walk 'Walks'>]>\r\n"
                   "<plist><!-- a --><dict>\r\n\t<key>PodcastName</key><!-- b --><string> &#78;ight <!-- c -->"
                   "<![CDATA[&]]> &walk;\r\n</string><key>PodcastAuthor</key><string/>"
                   "<key>Episodes</key><array/></dict></plist>\r\n")
        self.assertEqual(self.parsefeed(self.write("hand.plist", content)),
                         {"PodcastName": " Night & Walks\n", "PodcastAuthor": ""})


if __name__ == "__main__":
    unittest.main()
