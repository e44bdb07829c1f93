"""parsefeed writes the podcast as a reference file: exactly the keys that have a value, nothing else.

Which value becomes what is in the unit tests of the model and of the property lists; here Python's own module
reads what the whole tool makes of each kind of source.
"""

import datetime
import plistlib
import unittest

from support import ToolTestCase, item

PODCAST = {key: f"value of {key}" for key in (
    "PodcastUUID", "PodcastName", "PodcastAuthor", "PodcastCopyright", "PodcastKeywords", "PodcastCategory",
    "PodcastDescription", "PodcastAdvisoryLabel", "PodcastReference", "PodcastReferenceType",
    "PodcastPosterReference", "PodcastPosterReferenceType")}
EPISODE = {"EpisodeUUID": "u", "EpisodeName": "n", "EpisodeAuthor": "a",
           "EpisodeDate": datetime.datetime(2007, 6, 5, 14, 30), "EpisodeKeywords": "k", "EpisodeDescription": "d",
           "EpisodeCategory": "c", "EpisodeAdvisoryLabel": "Clean", "EpisodeOrder": 0, "EpisodeType": "audio/mpeg",
           "EpisodeFileSize": 2**64 - 1, "EpisodeReference": "a.mp3", "EpisodeReferenceType": "remote",
           "EpisodePosterReference": "http://example.com/p.png", "EpisodePosterReferenceType": ""}


class ReferenceFileTest(ToolTestCase):
    def test_every_key_is_written_under_its_own_name(self):
        podcast = {**PODCAST, "Episodes": [EPISODE]}
        self.assertEqual(self.parsefeed(self.reference(podcast)), podcast)

    def test_empty_texts_are_values(self):
        podcast = {**dict.fromkeys(PODCAST, ""), "Episodes": [{"EpisodeName": "", "EpisodeReference": ""}]}
        self.assertEqual(self.parsefeed(self.reference(podcast)), podcast)

    def test_other_keys_are_not_written(self):
        podcast = {"AllowedPosterTypes": ["png"], "AllowedEpisodeTypes": ["mp3"], "podcastname": "m", "Podcast": {},
                   "": "e", "Episode": [], "Episodes": []}
        self.assertEqual(self.parsefeed(self.reference(podcast)), {})

    def test_what_is_missing_of_an_episode(self):
        """Orders and sizes that are none, and types that are derived; those of the podcast never are."""
        locations = {"EpisodeReference": "HTTP://example.com/a.mp3", "EpisodePosterReference": "p.png"}
        podcast = {"PodcastReference": "http://example.com/", "PodcastPosterReference": "/poster.png"}
        written = self.parsefeed(self.reference({**podcast, "Episodes": [
            {"EpisodeName": "c", **locations}, {"EpisodeOrder": -1, "EpisodeFileSize": 0}, {"EpisodeName": "a"}]}))
        self.assertEqual(written, {**podcast, "Episodes": [
            {"EpisodeName": "c", **locations, "EpisodeReferenceType": "remote", "EpisodePosterReferenceType": "local"},
            {}, {"EpisodeName": "a"}]})

    def test_the_output_is_an_xml_property_list_of_sorted_keys(self):
        result = self.run_tool("parsefeed", self.reference({**PODCAST, "Episodes": [EPISODE]}, fmt=plistlib.FMT_BINARY))
        self.assertSucceeds(result)
        self.assertRegex(result.stdout, rb'\A<\?xml version="1\.0" encoding="UTF-8"\?>\n<!DOCTYPE plist ')
        written = plistlib.loads(result.stdout, fmt=plistlib.FMT_XML)
        self.assertEqual(list(written), sorted(written))
        self.assertEqual(list(written["Episodes"][0]), sorted(EPISODE))


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

    def test_a_feed_has_neither_a_location_nor_a_date_of_its_own(self):
        podcast = self.podcast_of("<link>http://example.com/</link><url>http://example.com/</url>"
                                  "<enclosure url='http://example.com/a.mp3'/><qel:order>3</qel:order>"
                                  "<pubDate>Tue, 05 Jun 2007 14:30:00 GMT</pubDate>")
        self.assertEqual(podcast, {})

    def test_an_empty_poster_has_no_type(self):
        self.assertEqual(self.podcast_of("<orvane:image href=''/>"), {"PodcastPosterReference": ""})


if __name__ == "__main__":
    unittest.main()
