"""A bundle reads back as the show that it was made from, wherever it has been moved to meanwhile.

Media and the podcast's poster are found inside the bundle; an episode's poster deliberately stays as its
"Info.plist" names it, relative to the directory in which the tool runs.
"""

import plistlib
import unittest
from pathlib import Path
from urllib.parse import unquote, urlsplit

from bundle_support import BundleTestCase, contents
from support import ORVANE, element, item, rss


class BundleSourceTestCase(BundleTestCase):
    def make(self, podcast=None, name="show.podcast", fmt=plistlib.FMT_XML):
        """A bundle of nothing but the reference file. Its path as a text."""
        self.path(name).mkdir(parents=True)
        self.reference(podcast, name=f"{name}/Info.plist", fmt=fmt)
        return str(self.path(name))


class LoadingTest(BundleSourceTestCase):
    def test_a_bundle_of_any_path(self):
        """The podcast's location is the bundle's absolute, standardised path."""
        for name, source, cwd in (("füße 🚶 100%.PodCast", "füße 🚶 100%.PodCast", "."),
                                  ("shows/a.podcast", "shows/../shows//./a.podcast//", "."),
                                  ("b.podcast", "../b.podcast", "shows"), ("~/a.podcast", "~/a.podcast", ".")):
            with self.subTest(source):
                self.make({"PodcastName": "n", "PodcastReference": "http://host/", "PodcastReferenceType": "remote"},
                          name, fmt=plistlib.FMT_BINARY)
                self.assertEqual(self.parsefeed(source, cwd=self.path(cwd), env={"HOME": "/nowhere"}),
                                 {"PodcastName": "n", "PodcastReference": str(self.path(name)),
                                  "PodcastReferenceType": "local"})

    def test_what_is_no_bundle(self):
        self.assertNoSource("show.podcast")
        self.assertNoSource(self.make(name="show.bundle"))
        self.bundle.mkdir()
        self.assertNoSource("show.podcast")
        for content in (b"", b"PodcastName", plistlib.dumps([1]), plistlib.dumps({})[:-9]):
            with self.subTest(content):
                self.write("show.podcast/Info.plist", content)
                self.assertNoSource("show.podcast")

    def test_locations_are_in_the_bundle_but_for_posters_of_episodes(self):
        poster = {"EpisodePosterReference": "Posters/1.jpg", "EpisodePosterReferenceType": "local"}
        untouched = {"EpisodeName": "Two", "EpisodeReferenceType": "remote"}
        show = {f"Podcast{key}": f"the {key}" for key in (
            "UUID", "Name", "Author", "Copyright", "Keywords", "Category", "Description", "AdvisoryLabel")}
        bundle = self.make({**show, "PodcastPosterReference": "http://host/p.jpg",
                            "PodcastPosterReferenceType": "remote",
                            "Episodes": [{"EpisodeReference": "../a b%20.mp3", "EpisodeReferenceType": "remote",
                                          **poster}, untouched]})
        self.assertEqual(self.parsefeed(bundle), {
            **show, "PodcastReference": bundle, "PodcastReferenceType": "local",
            "PodcastPosterReference": f"{bundle}/http:/host/p.jpg", "PodcastPosterReferenceType": "local",
            "Episodes": [{"EpisodeReference": f"{bundle}/../a b%20.mp3", "EpisodeReferenceType": "local", **poster},
                         untouched]})

    def test_an_empty_location_is_one(self):
        bundle = self.make({"PodcastPosterReference": "", "Episodes": [{"EpisodeReference": ""}]})
        self.assertEqual(self.parsefeed(bundle), {
            "PodcastReference": bundle, "PodcastReferenceType": "local",
            "PodcastPosterReference": bundle, "PodcastPosterReferenceType": "local",
            "Episodes": [{"EpisodeReference": bundle, "EpisodeReferenceType": "local"}]})

    def test_a_poster_type_without_poster_is_dropped(self):
        bundle = self.make({"PodcastPosterReferenceType": "remote"})
        self.assertEqual(self.parsefeed(bundle), {"PodcastReference": bundle, "PodcastReferenceType": "local"})

    def test_the_reference_file_itself_is_rebased_by_nobody(self):
        self.make({"Episodes": [{"EpisodeReference": "a.mp3"}]})
        self.assertEqual(self.parsefeed("show.podcast/Info.plist"),
                         {"Episodes": [{"EpisodeReference": "a.mp3", "EpisodeReferenceType": "local"}]})

    def test_allowed_types_hold_for_a_bundle_made_of_it(self):
        self.make({"PodcastName": "Show", "AllowedEpisodeTypes": ["mp3"], "AllowedPosterTypes": ["png"],
                   "PodcastPosterReference": "Posters/p.jpg",
                   "Episodes": [{"EpisodeName": "One", "EpisodeReference": "a.ogg"}]})
        self.assertWarns(self.run_tool("createbundle", "show.podcast", "-d", "copy.podcast"),
                         'Unsupported poster image type "jpg" for podcast "Show"',
                         'Invalid file type "ogg" for episode "One"')


class RoundTripTest(BundleSourceTestCase):
    """What a bundle holds is still there after a way through another form."""

    def setUp(self):
        super().setUp()
        self.assertWarns(self.create({
            "PodcastName": "Night & Walks", "PodcastUUID": "u", "PodcastPosterReference": self.media("c.png", b"cover"),
            "Episodes": [
                {"EpisodeName": "One", "EpisodeOrder": 1, "EpisodeType": "audio/mpeg", "EpisodeFileSize": 5,
                 "EpisodeReference": self.media("1/a b#ü%.mp3", b"first"),
                 "EpisodePosterReference": self.media("one.jpg", b"face")},
                {"EpisodeName": "Two", "EpisodeOrder": 2, "EpisodeFileSize": 6,
                 "EpisodeReference": self.media("2/a b#ü%.m4a", b"second")}]}))
        self.made = contents(self.bundle)
        self.assertEqual(set(self.made), {"Info.plist", "Posters", "a b#ü%.mp3", "a b#ü%-2.m4a", "Posters/Podcast.png",
                                          "Posters/a b#ü%.jpg"})

    def assertSameBundle(self, path):
        self.assertEqual(self.info(path), self.info())
        self.assertEqual(contents(path), self.made)

    def test_through_a_feed(self):
        self.assertEqual(self.run_tool("createfeed", "show.podcast", "-d", "feed.xml").status, 0)
        feed = self.path("feed.xml").as_uri()
        # Run in the bundle, where its episodes' posters are.
        self.assertWarns(self.run_tool("createbundle", feed, "-d", "../copy.podcast", cwd=self.bundle))
        self.assertSameBundle(self.path("copy.podcast"))

    def test_through_a_reference_file(self):
        self.assertEqual(self.run_tool("parsefeed", "show.podcast", "-d", "show.plist").status, 0)
        self.assertWarns(self.run_tool("createbundle", "../show.plist", "-d", "../copy.podcast", cwd=self.bundle))
        self.assertSameBundle(self.path("copy.podcast"))

    def test_straight_into_another_bundle(self):
        self.assertWarns(self.run_tool("createbundle", self.bundle, "-d", "../copy.podcast", cwd=self.bundle))
        self.assertSameBundle(self.path("copy.podcast"))

    def test_after_a_move(self):
        moved = self.path("elsewhere/moved.podcast")
        moved.parent.mkdir()
        self.bundle.rename(moved)
        media = [str(moved / name) for name in ("a b#ü%.mp3", "a b#ü%-2.m4a")]
        self.assertEqual([episode["EpisodeReference"] for episode in self.parsefeed(moved)["Episodes"]], media)
        self.assertEqual([unquote(urlsplit(enclosure.get("url")).path)
                          for enclosure in self.createfeed(moved).iter("enclosure")], media)
        self.assertWarns(self.run_tool("createbundle", "elsewhere/moved.podcast", "-d", self.bundle),
                         'Could not save or download poster image for episode "One"')
        self.assertEqual(self.files(), {path: content for path, content in self.made.items()
                                        if content is not None and path not in ("Info.plist", "Posters/a b#ü%.jpg")})

    def test_its_feed_names_the_files(self):
        channel = self.createfeed("show.podcast").find("channel")
        self.assertEqual(channel.findtext("link"), str(self.bundle))
        files = [channel.findtext("image/url"), channel.find(f"{ORVANE}image").get("href"),
                 *(enclosure.get("url") for enclosure in channel.iter("enclosure"))]
        contents_of_files = []
        for url in files:
            parts = urlsplit(url)
            self.assertEqual((parts.scheme, parts.netloc, parts.query, parts.fragment), ("file", "", "", ""))
            contents_of_files.append(Path(unquote(parts.path)).read_bytes())
        self.assertEqual(contents_of_files, [b"cover", b"cover", b"first", b"second"])
        self.assertEqual([image.get("href") for image in channel.findall(f"item/{ORVANE}image")],
                         ["Posters/a b#ü%.jpg"])


class FeedBundleFeedTest(BundleSourceTestCase):
    def test_a_feed_keeps_what_it_says_about_its_episodes(self):
        web = self.server()
        feed = rss(element("title", "Night Walks"), element("copyright", "Us"),
                   item(element("title", "One"), element("dc:creator", "Me"), element("description", "<b>Bold</b>"),
                        element("pubDate", "Tue, 05 Jun 2007 14:30:00 GMT"), element("orvane:explicit", "yes"),
                        element("enclosure", url=web.serve("/a.mp3", b"12345"), length="5", type="audio/mpeg")))
        self.assertWarns(self.create(web.serve("/feed", feed)))
        direct = self.parsefeed(web.url("/feed"))
        bundled = self.parsefeed("show.podcast")
        for podcast in (direct, bundled):
            for episode in podcast["Episodes"]:
                del episode["EpisodeReference"], episode["EpisodeReferenceType"]
        self.assertEqual((bundled.pop("PodcastReference"), bundled.pop("PodcastReferenceType")),
                         (str(self.bundle), "local"))
        self.assertEqual(bundled, direct)


if __name__ == "__main__":
    unittest.main()
