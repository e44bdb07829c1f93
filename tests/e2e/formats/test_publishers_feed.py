"""A feed as publishers really write them: counted redirects, signed queries, one name for every file.

No single rule is the matter here but all of them at once, on the way into a bundle and out of it again.
"""

import datetime
import html
import random
import unittest

from bundle_support import BundleTestCase, contents, digests
from support import DC, ORVANE, rss

EPISODES = 40


class PublishersFeedTest(BundleTestCase):
    def setUp(self):
        super().setUp()
        self.web = self.server()
        self.media_by_name = {}
        self.posters_by_name = {}
        self.url = self.web.serve("/feed/podcast/?format=rss&v=2", rss(
            "\n  <title><![CDATA[Night & Walks]]></title>\n  <link>https://host.example/</link>\n",
            f'  <orvane:image href="{html.escape(self.web.serve("/img/cover.jpg?w=3000&h=3000", b"cover"))}"/>\n',
            "  <description>Walks &amp; talks&#8212;at&#x20;night</description>\n"
            "  <atom:link xmlns:atom='http://www.w3.org/2005/Atom' rel='self' href='https://host.example/feed'/>\n",
            *(self.item(number) for number in range(1, EPISODES + 1))))

    def item(self, number):
        """One item, with its media and poster on the server behind the publisher's counters."""
        media = random.Random(number).randbytes(500 + number)
        file = f"/cdn/{number:02x}f/audio.mp3?sig=a%2Bb%3D&expires={number}"
        if number % 5 == 0:
            self.web.chunked(file, [media[:100], media[100:]])
        else:
            self.web.serve(file, media)
        self.web.redirect(f"/stats/e/{number}/audio.mp3", file, 302, headers=[("Set-Cookie", "id=1; Path=/")])
        counted = self.web.redirect(f"/track/{number}/audio.mp3?source=feed&n={number}",
                                    self.web.url(f"/stats/e/{number}/audio.mp3"), 301)
        name = f"audio-{number}" if number > 1 else "audio"
        self.media_by_name[f"{name}.mp3"] = media
        length = f' length="{[0, len(media) + 1, -1][number % 3]}"' if number % 4 else ""
        parts = [f"\n    <title><![CDATA[#{number}: Cats & <Dogs>]]></title>",
                 f"    <guid isPermaLink='false'>{number}-guid</guid>",
                 f"    <pubDate>{datetime.datetime(2020, 1, 1) + datetime.timedelta(days=number):%a, %d %b %Y} "
                 "06:00:00 +0000</pubDate>",
                 f"    <dc:creator>Ann &amp; Bob {number}</dc:creator>",
                 "    <description><![CDATA[<p>One &amp; only</p>]]></description>",
                 f'    <enclosure url="{html.escape(counted)}"{length} type="audio/mpeg"/>\n']
        if number % 2:
            poster = random.Random(-number).randbytes(90)
            url = self.web.serve(f"/img/{number}/face.png?w=300&h=300", poster)
            parts.append(f'<orvane:image href="{html.escape(url)}"/>\n')
            self.posters_by_name[f"Posters/{name}.png"] = poster
        return f"  <item>{chr(10).join(parts)}  </item>\n"

    def test_it_is_bundled_completely(self):
        self.assertWarns(self.create(self.url))
        self.assertEqual(digests(self.files()),
                         digests({**self.media_by_name, **self.posters_by_name, "Posters/Podcast.jpg": b"cover"}))
        info = self.info()
        episodes = info.pop("Episodes")
        self.assertEqual(info, {"PodcastName": "Night & Walks", "PodcastDescription": "Walks & talks—at night",
                                "PodcastPosterReference": "Posters/Podcast.jpg", "PodcastPosterReferenceType": "local"})
        self.assertEqual([episode["EpisodeReference"] for episode in episodes], list(self.media_by_name))
        for number, episode in enumerate(episodes, 1):
            with self.subTest(number):
                self.assertEqual(episode["EpisodeName"], f"#{number}: Cats & <Dogs>")
                self.assertEqual(episode["EpisodeAuthor"], f"Ann & Bob {number}")
                self.assertEqual(episode["EpisodeDescription"], "<p>One &amp; only</p>")
                self.assertEqual(episode["EpisodeDate"],
                                 datetime.datetime(2020, 1, 1, 6) + datetime.timedelta(days=number))
                self.assertEqual(episode.get("EpisodeFileSize"), self.expected_size(number))

    @staticmethod
    def expected_size(number):
        """A poster's length stands last; then the media's, if it was announced; then the feed's."""
        if number % 2:
            return 90
        if number % 5:
            return 500 + number
        return 500 + number + 1 if number % 3 == 1 and number % 4 else None

    def test_it_takes_one_connection_and_no_second_request(self):
        self.assertWarns(self.create(self.url))
        paths = [request.path for request in self.web.requests]
        self.assertEqual(len(paths), len(set(paths)))
        self.assertEqual(len(paths), 2 + 3 * EPISODES + EPISODES // 2)
        self.assertEqual(self.web.connections, 1)

    def test_it_becomes_a_feed_again(self):
        self.assertWarns(self.create(self.url))
        channel = self.createfeed("show.podcast").find("channel")
        self.assertEqual(channel.findtext("title"), "Night & Walks")
        self.assertEqual(channel.findtext("description"), "Walks & talks—at night")
        items = channel.findall("item")
        self.assertEqual([item.findtext("title") for item in items],
                         [f"#{number}: Cats & <Dogs>" for number in range(1, EPISODES + 1)])
        self.assertEqual([item.findtext(f"{DC}creator") for item in items],
                         [f"Ann & Bob {number}" for number in range(1, EPISODES + 1)])
        self.assertEqual([item.find("enclosure").get("url") for item in items],
                         [f"{self.bundle.as_uri()}/{name}" for name in self.media_by_name])
        self.assertEqual({image.get("href") for image in channel.findall(f"item/{ORVANE}image")},
                         set(self.posters_by_name))

    def test_a_bundle_of_the_bundle_is_the_same(self):
        self.assertWarns(self.create(self.url))
        self.assertWarns(self.run_tool("createbundle", self.bundle, "-d", "../copy.podcast", cwd=self.bundle))
        self.assertEqual(digests(contents(self.path("copy.podcast"))), digests(contents(self.bundle)))


if __name__ == "__main__":
    unittest.main()
