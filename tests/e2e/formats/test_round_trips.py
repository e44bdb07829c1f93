"""Podcasts are moved between feeds and reference files again and again; nothing that both can hold may get lost.

A reference file goes through createfeed and parsefeed, and what comes back is compared with what went in.
"""

import datetime
import plistlib
import unittest

from support import ToolTestCase

# Whatever the unit tests of the writers try alone: all at once, nothing and a space.
TEXTS = ("", " ", "".join((
    "  \t a \n ",
    "one\ntwo\n\nthree",
    "one\rtwo\r\nthree\r",
    "\tone\t\ttwo\t",
    "<b>Tom & 'Jerry'</b> \"quoted\" ]]> <![CDATA[x]]> <!-- c --> &amp;amp; &#13;",
    "Füße, Œuvre, naïve, \u00e9 e\u0301 a\u0308\u0323 \u1e69",
    "🚶🏽‍♀️ 👨‍👩‍👧 🇩🇪",
    "שלום \u202eabc\u202c مرحبا",
    "夜の散歩 밤 산책 夜间散步",
    "\u00a0a\u2003b\u2028c\u2029d\u0085e\ufefff",
    "\ud7ff\ue000\ufffd\U00010000\U0010ffff\x7f\x80\x9f",
    "%@ %s %n %d %% 100% \n ",
)))

# What a feed can carry of a podcast and of an episode, apart from dates and numbers.
PODCAST_TEXT_KEYS = ("PodcastUUID", "PodcastName", "PodcastAuthor", "PodcastCopyright", "PodcastKeywords",
                     "PodcastCategory", "PodcastDescription")
EPISODE_TEXT_KEYS = ("EpisodeUUID", "EpisodeName", "EpisodeAuthor", "EpisodeKeywords", "EpisodeDescription",
                     "EpisodeCategory", "EpisodeType")


class RoundTripTestCase(ToolTestCase):
    def through_feed(self, podcast, **options):
        """The podcast after it has been written as a feed and read again."""
        source = self.reference(podcast, fmt=plistlib.FMT_BINARY)
        result = self.run_tool("createfeed", source, **options)
        self.assertSucceeds(result)
        return self.parsefeed(self.feed(result.stdout), **options)

    def episode_through_feed(self, episode, **options):
        return self.through_feed({"Episodes": [episode]}, **options)["Episodes"][0]


class FieldTest(RoundTripTestCase):
    def test_every_field_that_a_feed_can_carry(self):
        podcast = {
            "PodcastUUID": "u", "PodcastName": "n", "PodcastAuthor": "a", "PodcastCopyright": "©",
            "PodcastKeywords": "k, l",
            "PodcastCategory": "Arts", "PodcastDescription": "d", "PodcastAdvisoryLabel": "Clean",
            "PodcastPosterReference": "http://example.com/p.png", "PodcastPosterReferenceType": "remote",
            "Episodes": [
                {"EpisodeUUID": f"u{number}", "EpisodeName": f"n{number}", "EpisodeAuthor": "a",
                 "EpisodeDate": datetime.datetime(2007, 6, 5, 14, 30, number), "EpisodeKeywords": "k",
                 "EpisodeDescription": "d", "EpisodeCategory": "c", "EpisodeAdvisoryLabel": "Explicit",
                 "EpisodeOrder": number, "EpisodeType": "audio/mpeg", "EpisodeFileSize": 1234 + number,
                 "EpisodeReference": f"http://example.com/{number}.mp3", "EpisodeReferenceType": "remote",
                 "EpisodePosterReference": f"http://example.com/{number}.png", "EpisodePosterReferenceType": "remote"}
                for number in range(3)]}
        self.assertEqual(self.through_feed(podcast), podcast)

    def test_a_feed_that_is_rewritten_stays_the_same(self):
        source = self.reference({"PodcastName": "n", "PodcastPosterReference": "p.png", "Episodes": [
            {"EpisodeName": "one", "EpisodeReference": "/a b.mp3", "EpisodeOrder": 1, "EpisodeUUID": "u"}]})
        first = self.run_tool("createfeed", source)
        second = self.run_tool("createfeed", self.feed(first.stdout))
        self.assertEqual(self.parsefeed(self.feed(first.stdout)), self.parsefeed(self.feed(second.stdout)))

    def test_what_a_feed_cannot_carry_is_lost(self):
        podcast = {"PodcastReference": "http://example.com/", "PodcastReferenceType": "remote",
                   "PodcastAdvisoryLabel": "Adults only", "PodcastPosterReferenceType": "remote",
                   "Episodes": [{"EpisodeReferenceType": "remote", "EpisodeType": "audio/mpeg", "EpisodeFileSize": 5,
                                 "EpisodeAdvisoryLabel": "no"}]}
        self.assertEqual(self.through_feed(podcast), {"Episodes": [{}]})

    def test_local_media_come_back_as_file_urls(self):
        episode = {"EpisodeReference": "/media/a b.mp3", "EpisodeReferenceType": "local",
                   "EpisodePosterReference": "/media/ü.png", "EpisodePosterReferenceType": "local"}
        self.assertEqual(self.episode_through_feed(episode), {
            "EpisodeReference": "file:///media/a%20b.mp3", "EpisodeReferenceType": "remote",
            "EpisodePosterReference": "file:///media/%C3%BC.png", "EpisodePosterReferenceType": "remote"})

    def test_relative_media_stay_relative(self):
        episode = {"EpisodeReference": "a b.mp3", "EpisodeReferenceType": "local"}
        self.assertEqual(self.episode_through_feed(episode), episode)

    def test_the_label_yes_comes_back_as_explicit(self):
        self.assertEqual(self.episode_through_feed({"EpisodeAdvisoryLabel": "YES"}),
                         {"EpisodeAdvisoryLabel": "Explicit"})

    def test_large_numbers(self):
        episode = {"EpisodeUUID": "u", "EpisodeOrder": 2**63 - 1, "EpisodeReference": "a",
                   "EpisodeReferenceType": "local",
                   "EpisodeFileSize": 2**63 - 1}
        self.assertEqual(self.episode_through_feed(episode), episode)

    def test_dates_come_back_in_every_time_zone(self):
        dates = [datetime.datetime(2007, 6, 5, 14, 30), datetime.datetime(2007, 12, 5, 4, 5, 6),
                 datetime.datetime(1969, 7, 20, 20),
                 datetime.datetime(2030, 1, 1)]
        podcast = {"Episodes": [{"EpisodeDate": date} for date in dates]}
        for zone in ("UTC", "America/Los_Angeles", "Asia/Kolkata", "Europe/London", "Australia/Lord_Howe"):
            with self.subTest(zone):
                self.assertEqual(self.through_feed(podcast, env={"TZ": zone}), podcast)

    def test_an_order_right_behind_a_summary_begins_with_its_text(self):
        self.assertEqual(self.episode_through_feed({"EpisodeDescription": "d", "EpisodeOrder": 5}),
                         {"EpisodeDescription": "d", "EpisodeOrder": 0})
        self.assertEqual(self.episode_through_feed({"EpisodeDescription": "12 moons", "EpisodeOrder": 5}),
                         {"EpisodeDescription": "12 moons", "EpisodeOrder": 12})


class TextTest(RoundTripTestCase):
    def test_any_text_comes_back_in_every_field(self):
        for text in TEXTS:
            with self.subTest(text):
                podcast = {**dict.fromkeys(PODCAST_TEXT_KEYS, text), "Episodes": [
                    {**dict.fromkeys(EPISODE_TEXT_KEYS, text), "EpisodeReference": "x" + text,
                     "EpisodeReferenceType": "local",
                     "EpisodePosterReference": "x" + text, "EpisodePosterReferenceType": "local"}]}
                podcast |= {"PodcastPosterReference": "x" + text, "PodcastPosterReferenceType": "local"}
                self.assertEqual(self.through_feed(podcast), podcast)

    def test_characters_that_xml_cannot_hold_are_dropped(self):
        forbidden = "".join(map(chr, [*range(9), 11, 12, *range(14, 32), 0xfffe, 0xffff]))
        podcast = {"PodcastName": f"a{forbidden}b", "PodcastCategory": "\x1f", "PodcastAuthor": "a\r\x0b\n\x0cb"}
        kept = {"PodcastName": "ab", "PodcastCategory": "", "PodcastAuthor": "a\r\nb"}
        self.assertEqual(self.parsefeed(self.reference(podcast, fmt=plistlib.FMT_BINARY)), kept)
        self.assertEqual(self.through_feed(podcast), kept)

    def test_20_megabytes_in_one_text(self):
        piece = "0123456789abcde\n<&>\r\t\"']]>夜の散歩"
        text = piece * (20_000_000 // len(piece.encode()))
        podcast = {"PodcastName": "n", "Episodes": [{"EpisodeDescription": text}]}
        self.assertTrue(self.through_feed(podcast) == podcast, "the text differs")

    def test_10_thousand_episodes(self):
        podcast = {"Episodes": [{"EpisodeName": f"Episode {number}", "EpisodeUUID": f"u{number}",
                                 "EpisodeOrder": number}
                                for number in range(10_000)]}
        self.assertTrue(self.through_feed(podcast) == podcast, "the episodes differ")


if __name__ == "__main__":
    unittest.main()
