"""parsefeed writes the podcast as a reference file: exactly the keys that have a value, nothing else."""

import datetime
import os
import plistlib
import subprocess
import unittest

from support import LOADING, ToolTestCase, item


class PodcastKeysTest(ToolTestCase):
    TEXT_KEYS = ("PodcastUUID", "PodcastName", "PodcastAuthor", "PodcastCopyright", "PodcastKeywords",
                 "PodcastCategory", "PodcastDescription", "PodcastAdvisoryLabel", "PodcastReference",
                 "PodcastReferenceType", "PodcastPosterReference", "PodcastPosterReferenceType")

    def test_every_podcast_key_is_written_under_its_own_name(self):
        podcast = {key: f"value of {key}" for key in self.TEXT_KEYS}
        self.assertEqual(self.parsefeed(self.reference(podcast)), podcast)

    def test_each_podcast_key_stands_alone(self):
        for key in self.TEXT_KEYS:
            with self.subTest(key):
                self.assertEqual(self.parsefeed(self.reference({key: "x"})), {key: "x"})

    def test_an_empty_text_is_a_value(self):
        podcast = dict.fromkeys(self.TEXT_KEYS, "")
        self.assertEqual(self.parsefeed(self.reference(podcast)), podcast)

    def test_an_empty_podcast_is_an_empty_dictionary(self):
        self.assertEqual(self.parsefeed(self.reference({})), {})

    def test_reference_types_of_the_podcast_are_never_derived(self):
        podcast = {"PodcastReference": "http://example.com/", "PodcastPosterReference": "/poster.png"}
        self.assertEqual(self.parsefeed(self.reference(podcast)), podcast)

    def test_reference_types_are_written_as_they_stand(self):
        podcast = {"PodcastReferenceType": "Remote", "PodcastPosterReferenceType": "nowhere"}
        self.assertEqual(self.parsefeed(self.reference(podcast)), podcast)

    def test_locations_keep_their_form(self):
        for location in ("../a b/./c.png", "file:///a%20b", "HTTP://Example.COM/%7e", "~/x", "a//b/"):
            with self.subTest(location):
                podcast = {"PodcastReference": location, "PodcastPosterReference": location}
                self.assertEqual(self.parsefeed(self.reference(podcast)), podcast)

    def test_allowed_types_are_not_written(self):
        podcast = {"PodcastName": "n", "AllowedPosterTypes": ["png"], "AllowedEpisodeTypes": ["mp3"]}
        self.assertEqual(self.parsefeed(self.reference(podcast)), {"PodcastName": "n"})

    def test_unknown_keys_are_not_written(self):
        podcast = {"PodcastName": "n", "podcastname": "m", "Podcast": {"a": [1]}, "": "e", "Episode": []}
        self.assertEqual(self.parsefeed(self.reference(podcast)), {"PodcastName": "n"})


class EpisodesTest(ToolTestCase):
    FULL = {"EpisodeUUID": "u", "EpisodeName": "n", "EpisodeAuthor": "a",
            "EpisodeDate": datetime.datetime(2007, 6, 5, 14, 30), "EpisodeKeywords": "k", "EpisodeDescription": "d",
            "EpisodeCategory": "c", "EpisodeAdvisoryLabel": "Clean", "EpisodeOrder": 3, "EpisodeType": "audio/mpeg",
            "EpisodeFileSize": 1234, "EpisodeReference": "a.mp3", "EpisodeReferenceType": "remote",
            "EpisodePosterReference": "http://example.com/p.png", "EpisodePosterReferenceType": "local"}

    def episodes(self, *episodes):
        return self.parsefeed(self.reference({"Episodes": list(episodes)})).get("Episodes")

    def test_every_episode_key_is_written_under_its_own_name(self):
        self.assertEqual(self.episodes(self.FULL), [self.FULL])

    def test_no_episodes_means_no_key(self):
        self.assertEqual(self.parsefeed(self.reference({"Episodes": []})), {})

    def test_episodes_keep_their_order(self):
        names = [{"EpisodeName": name, "EpisodeOrder": order}
                 for name, order in (("c", 9), ("a", 1), ("b", 5), ("a", 1))]
        self.assertEqual(self.episodes(*names), names)

    def test_an_episode_without_anything_stays_an_episode(self):
        self.assertEqual(self.episodes({}, {"EpisodeName": "n"}, {}), [{}, {"EpisodeName": "n"}, {}])

    def test_episodes_need_no_podcast_name(self):
        self.assertEqual(self.parsefeed(self.reference({"Episodes": [{"EpisodeName": "n"}]})),
                         {"Episodes": [{"EpisodeName": "n"}]})

    def test_an_empty_text_is_a_value(self):
        episode = {"EpisodeName": "", "EpisodeUUID": "", "EpisodeAuthor": "", "EpisodeKeywords": "",
                   "EpisodeDescription": "", "EpisodeCategory": "", "EpisodeAdvisoryLabel": "", "EpisodeType": ""}
        self.assertEqual(self.episodes(episode), [episode])

    def test_order_zero_is_an_order(self):
        self.assertEqual(self.episodes({"EpisodeOrder": 0}), [{"EpisodeOrder": 0}])

    def test_a_negative_order_is_none(self):
        self.assertEqual(self.episodes({"EpisodeOrder": -1}, {"EpisodeOrder": -5}, {"EpisodeOrder": -2**63}),
                         [{}, {}, {}])

    def test_the_largest_order(self):
        self.assertEqual(self.episodes({"EpisodeOrder": 2**63 - 1}), [{"EpisodeOrder": 2**63 - 1}])

    def test_size_zero_is_unknown(self):
        self.assertEqual(self.episodes({"EpisodeFileSize": 0}), [{}])

    def test_sizes_beyond_32_and_63_bits(self):
        for size in (1, 2**31, 2**32, 2**63 - 1, 2**63, 2**64 - 1):
            with self.subTest(size):
                self.assertEqual(self.episodes({"EpisodeFileSize": size}), [{"EpisodeFileSize": size}])

    def test_missing_reference_types_are_derived(self):
        for location, kind in (("http://example.com/a.mp3", "remote"), ("https://example.com/a.mp3", "remote"),
                               ("HTTP://EXAMPLE.COM/", "remote"), ("Https://example.com", "remote"),
                               ("httpd.conf", "remote"), ("file:///a.mp3", "remote"), ("FILE:/a.mp3", "remote"),
                               ("File:a", "remote"), ("/media/a.mp3", "local"), ("a.mp3", "local"),
                               ("pcast://example.com/", "local"), ("ftp://example.com/", "local"), ("file", "local"),
                               (" http://example.com", "local")):
            with self.subTest(location):
                self.assertEqual(self.episodes({"EpisodeReference": location, "EpisodePosterReference": location}),
                                 [{"EpisodeReference": location, "EpisodeReferenceType": kind,
                                   "EpisodePosterReference": location, "EpisodePosterReferenceType": kind}])

    def test_an_empty_location_has_no_type(self):
        episode = {"EpisodeReference": "", "EpisodePosterReference": ""}
        self.assertEqual(self.episodes(episode), [episode])

    def test_a_given_reference_type_wins(self):
        episode = {"EpisodeReference": "/a.mp3", "EpisodeReferenceType": "remote",
                   "EpisodePosterReference": "http://example.com/p.png", "EpisodePosterReferenceType": ""}
        self.assertEqual(self.episodes(episode), [episode])

    def test_a_reference_type_needs_no_location(self):
        episode = {"EpisodeReferenceType": "local", "EpisodePosterReferenceType": "remote"}
        self.assertEqual(self.episodes(episode), [episode])

    def test_a_content_type_is_never_guessed(self):
        self.assertEqual(self.episodes({"EpisodeReference": "a.mp3"}),
                         [{"EpisodeReference": "a.mp3", "EpisodeReferenceType": "local"}])


class OutputTest(ToolTestCase):
    def test_the_output_is_an_xml_property_list(self):
        result = self.run_tool("parsefeed", self.reference({"PodcastName": "n"}, fmt=plistlib.FMT_BINARY))
        self.assertSucceeds(result)
        self.assertRegex(result.stdout, rb'\A<\?xml version="1\.0" encoding="UTF-8"\?>\n<!DOCTYPE plist ')
        self.assertIn(b'<plist version="1.0">', result.stdout)
        self.assertTrue(result.stdout.rstrip().endswith(b"</plist>"))

    def test_keys_are_sorted(self):
        podcast = {"PodcastUUID": "u", "PodcastName": "n", "PodcastAuthor": "a", "Episodes": [
            {"EpisodeUUID": "u", "EpisodeName": "n", "EpisodeAuthor": "a"}]}
        written = self.parsefeed(self.reference(podcast))
        self.assertEqual(list(written), sorted(podcast))
        self.assertEqual(list(written["Episodes"][0]), sorted(podcast["Episodes"][0]))

    def test_no_line_break_is_added(self):
        source = self.reference({"PodcastName": "n"})
        result = self.run_tool("parsefeed", source)
        self.assertFalse(result.stdout.endswith(b"\n\n"))

    def test_a_file_holds_what_standard_output_would(self):
        source = self.reference({"PodcastName": "n", "Episodes": [EpisodesTest.FULL]})
        self.assertSucceeds(self.run_tool("parsefeed", source, "-d", "out.plist"), LOADING)
        self.assertEqual(self.path("out.plist").read_bytes(), self.run_tool("parsefeed", source).stdout)

    def test_a_longer_file_is_replaced(self):
        self.write("out", b"x" * 100_000)
        self.assertSucceeds(self.run_tool("parsefeed", self.reference({"PodcastName": "n"}), "-d", "out"), LOADING)
        self.assertEqual(plistlib.loads(self.path("out").read_bytes()), {"PodcastName": "n"})

    def test_a_file_is_written_through_a_link(self):
        self.write("target", b"old")
        self.path("link").symlink_to("target")
        self.assertSucceeds(self.run_tool("parsefeed", self.reference(), "-d", "link"), LOADING)
        self.assertTrue(self.path("link").is_symlink())
        self.assertEqual(plistlib.loads(self.path("target").read_bytes()), {})

    def test_a_fifo_receives_the_file(self):
        os.mkfifo(self.path("fifo"))
        reader = subprocess.Popen(["cat", self.path("fifo")], stdout=subprocess.PIPE)
        self.addCleanup(lambda: (reader.kill(), reader.wait(), reader.stdout.close()))
        result = self.run_tool("parsefeed", self.reference({"PodcastName": "n"}), "-d", "fifo", timeout=30)
        self.assertSucceeds(result, LOADING)
        self.assertEqual(plistlib.loads(reader.communicate(timeout=30)[0]), {"PodcastName": "n"})

    def test_an_output_that_cannot_be_written_is_not_noticed(self):
        source = self.reference()
        self.path("folder").mkdir()
        for output in ("missing/out", "folder", "reference.plist/out", "/dev/full", ""):
            with self.subTest(output):
                self.assertSucceeds(self.run_tool("parsefeed", source, "-d", output), LOADING)

    def test_missing_folders_are_not_made(self):
        self.run_tool("parsefeed", self.reference(), "-d", "missing/out")
        self.assertFalse(self.path("missing").exists())

    def test_a_failed_run_leaves_the_output_alone(self):
        self.write("out", b"old")
        result = self.run_tool("parsefeed", self.feed(b"<feed/>"), "-d", "out")
        self.assertFails(result, "Could not load source: The feed was neither RSS nor Atom", stdout=LOADING)
        self.assertEqual(self.path("out").read_bytes(), b"old")

    def test_nothing_else_appears_in_the_directory(self):
        source = self.reference()
        self.run_tool("parsefeed", source, "-d", "out")
        self.assertEqual({path.name for path in self.directory.iterdir()}, {"reference.plist", "out"})


class FeedTest(ToolTestCase):
    def test_a_feed_becomes_a_reference_file(self):
        podcast = self.podcast_of("<title>Night Walks</title><orvane:image href='http://example.com/p.png'/>",
                                  item("<title>One</title><enclosure url='http://example.com/1.mp3' length='1234' "
                                       "type='audio/mpeg'/><pubDate>Tue, 05 Jun 2007 14:30:00 GMT</pubDate>"))
        self.assertEqual(podcast, {
            "PodcastName": "Night Walks",
            "PodcastPosterReference": "http://example.com/p.png",
            "PodcastPosterReferenceType": "remote",
            "Episodes": [{"EpisodeName": "One", "EpisodeReference": "http://example.com/1.mp3",
                          "EpisodeReferenceType": "remote", "EpisodeFileSize": 1234, "EpisodeType": "audio/mpeg",
                          "EpisodeDate": datetime.datetime(2007, 6, 5, 14, 30)}]})

    def test_a_feed_has_no_location_of_its_own(self):
        podcast = self.podcast_of("<link>http://example.com/</link><url>http://example.com/</url>"
                                  "<enclosure url='http://example.com/a.mp3'/>")
        self.assertEqual(podcast, {})

    def test_a_feed_without_items_has_no_episodes(self):
        self.assertEqual(self.podcast_of("<title>Night Walks</title>"), {"PodcastName": "Night Walks"})

    def test_a_poster_that_is_no_url_is_local(self):
        self.assertEqual(self.podcast_of("<orvane:image href='p.png'/>"),
                         {"PodcastPosterReference": "p.png", "PodcastPosterReferenceType": "local"})

    def test_an_empty_poster_has_no_type(self):
        self.assertEqual(self.podcast_of("<orvane:image href=''/>"), {"PodcastPosterReference": ""})


if __name__ == "__main__":
    unittest.main()
