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

    def assertNoSource(self, source, **options):
        self.assertFails(self.run_tool("parsefeed", source, **options),
                         f'Could not initialize podcast source with string "{source}".\n')


class ResolutionTest(BundleSourceTestCase):
    def test_the_extension_may_be_in_any_case(self):
        for name in ("a.podcast", "b.PODCAST", "c.PodCast"):
            with self.subTest(name):
                path = self.make({"PodcastName": "Night Walks"}, name)
                self.assertEqual(self.parsefeed(path), {"PodcastName": "Night Walks", "PodcastReference": path,
                                                        "PodcastReferenceType": "local"})

    def test_a_directory_with_another_extension(self):
        self.assertNoSource(self.make(name="show.bundle"))
        self.assertNoSource(self.make(name="podcast"))

    def test_a_plain_file(self):
        self.write("show.podcast", plistlib.dumps({}))
        self.assertNoSource("show.podcast")

    def test_a_directory_without_reference_file(self):
        self.bundle.mkdir()
        self.assertNoSource("show.podcast")
        self.reference({}, name="show.podcast/info.PLIST")
        self.assertNoSource("show.podcast")

    def test_a_missing_directory(self):
        self.assertNoSource("show.podcast")

    def test_a_reference_file_that_is_none(self):
        self.bundle.mkdir()
        whole = plistlib.dumps({"PodcastName": "Night Walks"})
        for name, content in (("nothing", b""), ("text", b"PodcastName"), ("a list", plistlib.dumps([1])),
                              ("cut", whole[:-9]), ("a feed", rss()), ("zeros", bytes(100))):
            with self.subTest(name):
                self.write("show.podcast/Info.plist", content)
                self.assertNoSource("show.podcast")

    def test_a_binary_reference_file(self):
        path = self.make({"PodcastName": "Night Walks"}, fmt=plistlib.FMT_BINARY)
        self.assertEqual(self.parsefeed(path)["PodcastName"], "Night Walks")

    def test_a_link_to_a_bundle(self):
        self.make({"PodcastName": "Night Walks"}, "real.podcast")
        self.bundle.symlink_to("real.podcast")
        self.assertEqual(self.parsefeed("show.podcast")["PodcastName"], "Night Walks")

    def test_the_reference_file_itself_is_rebased_by_nobody(self):
        self.make({"Episodes": [{"EpisodeReference": "a.mp3"}]})
        self.assertEqual(self.parsefeed("show.podcast/Info.plist"),
                         {"Episodes": [{"EpisodeReference": "a.mp3", "EpisodeReferenceType": "local"}]})


class LocationTest(BundleSourceTestCase):
    """The podcast's location is the bundle's absolute, standardised path."""

    def assertLocated(self, source, expected, **options):
        self.assertEqual(self.parsefeed(source, **options),
                         {"PodcastReference": str(expected), "PodcastReferenceType": "local"})

    def test_a_relative_path(self):
        self.make(name="shows/a.podcast")
        self.assertLocated("shows/a.podcast", self.path("shows/a.podcast"))
        self.assertLocated("a.podcast", self.path("shows/a.podcast"), cwd=self.path("shows"))

    def test_components_that_lead_nowhere(self):
        self.make(name="shows/a.podcast")
        for source in ("./shows/a.podcast", "shows/./a.podcast", "shows//a.podcast", "shows/../shows/a.podcast",
                       "shows/a.podcast/", "shows/a.podcast//", f"{self.directory}//shows/./a.podcast/",
                       f"{self.directory}/shows/../shows/a.podcast", f"/..{self.directory}/shows/a.podcast"):
            with self.subTest(source):
                self.assertLocated(source, self.path("shows/a.podcast"))

    def test_a_path_above_the_working_directory(self):
        self.make(name="a.podcast")
        self.path("one/two").mkdir(parents=True)
        self.assertLocated("../../a.podcast", self.path("a.podcast"), cwd=self.path("one/two"))

    def test_a_tilde_that_is_a_directory_here(self):
        self.make(name="~/a.podcast")
        self.assertLocated("~/a.podcast", self.path("~/a.podcast"), env={"HOME": "/nowhere"})

    def test_what_the_reference_file_says_is_not_used(self):
        self.make({"PodcastReference": "http://host/", "PodcastReferenceType": "remote"})
        self.assertLocated("show.podcast", self.bundle)

    def test_names_with_spaces_and_beyond_ascii(self):
        self.make(name="füße 🚶 100%.podcast")
        self.assertLocated("füße 🚶 100%.podcast", self.path("füße 🚶 100%.podcast"))


class RebasingTest(BundleSourceTestCase):
    def loaded(self, podcast):
        """What the bundle of the dictionary loads as, without its own location."""
        loaded = self.parsefeed(self.make(podcast))
        self.assertEqual((loaded.pop("PodcastReference"), loaded.pop("PodcastReferenceType")),
                         (str(self.bundle), "local"))
        return loaded

    def test_media_are_in_the_bundle_whatever_their_type_was(self):
        for index, kind in enumerate(({}, {"EpisodeReferenceType": "local"}, {"EpisodeReferenceType": "remote"},
                                      {"EpisodeReferenceType": "other"})):
            with self.subTest(kind):
                bundle = self.make({"Episodes": [{"EpisodeReference": "a.mp3", **kind}]}, f"{index}.podcast")
                self.assertEqual(self.parsefeed(bundle)["Episodes"],
                                 [{"EpisodeReference": f"{bundle}/a.mp3", "EpisodeReferenceType": "local"}])

    def test_references_of_every_kind_are_joined(self):
        table = [("a.mp3", "/a.mp3"), ("/media/a.mp3", "/media/a.mp3"), ("one/two.mp3", "/one/two.mp3"),
                 ("http://host/a.mp3", "/http:/host/a.mp3"), ("../a.mp3", "/../a.mp3"), ("./a.mp3", "/./a.mp3"),
                 ("~/a.mp3", "/~/a.mp3"), ("a b%20.mp3", "/a b%20.mp3")]
        loaded = self.loaded({"Episodes": [{"EpisodeReference": reference} for reference, _ in table]})
        for (reference, end), episode in zip(table, loaded["Episodes"], strict=True):
            with self.subTest(reference):
                self.assertEqual(episode, {"EpisodeReference": f"{self.bundle}{end}", "EpisodeReferenceType": "local"})

    def test_an_episode_without_reference_stays(self):
        episodes = [{"EpisodeName": "One"}, {"EpisodeName": "Two", "EpisodeReferenceType": "remote"}]
        self.assertEqual(self.loaded({"Episodes": episodes}), {"Episodes": episodes})

    def test_the_podcasts_poster_is_in_the_bundle(self):
        self.assertEqual(self.loaded({"PodcastPosterReference": "Posters/p.jpg"}),
                         {"PodcastPosterReference": f"{self.bundle}/Posters/p.jpg",
                          "PodcastPosterReferenceType": "local"})

    def test_a_stored_url_of_the_poster_is_joined_too(self):
        self.assertEqual(self.loaded({"PodcastPosterReference": "http://host/p.jpg",
                                      "PodcastPosterReferenceType": "remote"}),
                         {"PodcastPosterReference": f"{self.bundle}/http:/host/p.jpg",
                          "PodcastPosterReferenceType": "local"})

    def test_a_poster_type_without_poster_is_dropped(self):
        self.assertEqual(self.loaded({"PodcastPosterReferenceType": "remote"}), {})

    def test_posters_of_episodes_stay_as_they_are(self):
        posters = [{"EpisodePosterReference": "Posters/1.jpg", "EpisodePosterReferenceType": "local"},
                   {"EpisodePosterReference": "http://host/1.jpg", "EpisodePosterReferenceType": "remote"},
                   {"EpisodePosterReference": "Posters/1.jpg", "EpisodePosterReferenceType": "other"}]
        self.assertEqual(self.loaded({"Episodes": posters}), {"Episodes": posters})

    def test_every_other_field_is_kept(self):
        show = {f"Podcast{key}": f"the {key}" for key in (
            "UUID", "Name", "Author", "Copyright", "Keywords", "Category", "Description", "AdvisoryLabel")}
        self.assertEqual(self.loaded(show), show)

    def test_without_episodes_there_is_no_list(self):
        self.assertEqual(self.loaded({"Episodes": []}), {})

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
        self.assertWarns(self.run_tool("createbundle", "elsewhere/moved.podcast", "-d", self.bundle),
                         'Could not save or download poster image for episode "One"')
        self.assertEqual(self.files(), {path: content for path, content in self.made.items()
                                        if content is not None and path not in ("Info.plist", "Posters/a b#ü%.jpg")})

    def test_into_itself_nothing_is_lost(self):
        before = self.files()
        self.assertWarns(self.run_tool("createbundle", "show.podcast", "-d", "show.podcast"),
                         'Could not save or download poster image for podcast "Night & Walks"',
                         'Could not save or download episode "One"', 'Could not save or download episode "Two"')
        self.assertEqual(self.files(), before)
        self.assertEqual(self.info(), {"PodcastName": "Night & Walks", "PodcastUUID": "u"})

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
