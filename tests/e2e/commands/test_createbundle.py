"""A bundle is what people keep when the server is gone: its layout, what its "Info.plist" says, and what is left out.

QELBundlePodcastGeneratorTest has the rules one by one; here other programs' eyes look at what the whole tool left on
the disk. Names are in test_bundle_names.py, what goes wrong around the tool in hardship/.
"""

import datetime
import os
import plistlib
import unittest

from bundle_support import BundleTestCase, contents, notices
from support import LOADING, NO_FEED


class InfoTest(BundleTestCase):
    def test_every_key_but_the_references_is_kept(self):
        described = {f"Podcast{key}": f"the {key}" for key in (
            "UUID", "Name", "Author", "Copyright", "Keywords", "Category", "Description")}
        episode = {"EpisodeUUID": "u", "EpisodeName": "", "EpisodeAuthor": "a",
                   "EpisodeDate": datetime.datetime(2020, 2, 29, 23, 59, 59), "EpisodeKeywords": "k",
                   "EpisodeDescription": "d\n", "EpisodeCategory": "c", "EpisodeAdvisoryLabel": "Clean",
                   "EpisodeOrder": 0, "EpisodeType": "audio/mpeg", "EpisodeFileSize": 2**63}
        self.assertWarns(self.create({
            **described, "PodcastAdvisoryLabel": "", "PodcastReference": "http://host/",
            "PodcastReferenceType": "remote", "PodcastPosterReference": self.media("cover.art.PNG", b"cover"),
            "AllowedEpisodeTypes": ["mp3"], "AllowedPosterTypes": ["jpg", "png"], "Unknown": 1,
            "Episodes": [{**episode, "EpisodeReference": self.media("one.mp3"), "Unknown": 1,
                          "EpisodePosterReference": self.media("face.jpg", b"face")}]}))
        self.assertEqual(plistlib.loads((self.bundle / "Info.plist").read_bytes(), fmt=plistlib.FMT_XML), {
            **described, "PodcastAdvisoryLabel": "", "PodcastPosterReference": "Posters/Podcast.PNG",
            "PodcastPosterReferenceType": "local",
            "Episodes": [{**episode, "EpisodeReference": "one.mp3", "EpisodeReferenceType": "local",
                          "EpisodePosterReference": "Posters/one.jpg", "EpisodePosterReferenceType": "local"}]})
        self.assertEqual(self.files(), {"one.mp3": b"media", "Posters/one.jpg": b"face",
                                        "Posters/Podcast.PNG": b"cover"})

    def test_without_any_fetched_episode_there_is_no_list(self):
        for episodes in ({}, {"Episodes": []}, {"Episodes": [{}]}):
            with self.subTest(episodes):
                self.assertEqual(self.create({"PodcastName": "Night Walks", **episodes}).status, 0)
                self.assertEqual(self.info(), {"PodcastName": "Night Walks"})
                self.assertEqual(set(contents(self.bundle)), {"Info.plist", "Posters"})

    def test_a_poster_type_without_location_is_dropped(self):
        self.create({"PodcastPosterReferenceType": "remote", "Episodes": [
            {"EpisodeReference": self.media("a.mp3"), "EpisodePosterReferenceType": "local"}]})
        self.assertEqual(self.info(), {"Episodes": [{"EpisodeReference": "a.mp3", "EpisodeReferenceType": "local"}]})

    def test_the_size_is_what_was_announced_last(self):
        web = self.server()
        sound, face = web.serve("/a.mp3", b"12345"), web.serve("/a.jpg", b"123")
        nothing, chunks = web.serve("/empty.mp3", b""), web.chunked("/chunks.mp3", [b"12345"])
        for name, media, poster, size in (
                ("of a download", sound, None, 5),
                ("of a file: URL", self.write("a.mp3", b"12345").as_uri(), None, 5),
                ("none, so that of the source stays", web.until_closed("/closed.mp3", b"12345"), None, 77),
                ("none, in chunks", chunks, None, 77),
                ("none, behind a redirect with a page", web.redirect("/moved.mp3", "/chunks.mp3"), None, 77),
                ("none, of a copy", self.media("a.mp3", b"12345"), None, 77),
                ("0, which is unknown", nothing, None, None),
                ("of a poster", sound, face, 3),
                ("of the poster of a copy", self.media("a.mp3"), face, 3),
                ("of a poster that breaks off", sound, web.truncated("/cut.jpg", b"123", missing=997), 1000),
                ("0, of a poster", sound, web.serve("/empty.jpg", b""), None),
                ("none, of a poster in chunks", sound, web.chunked("/chunks.jpg", [b"123"]), 5),
                ("none, of a copied poster", sound, self.media("a.jpg", b"123"), 5),
                ("none, of a page that says what is missing", sound, web.url("/missing.jpg"), 5)):
            with self.subTest(name):
                self.bundle = self.path(f"{name.replace(':', '')}.podcast")
                episode = {"EpisodeFileSize": 77, "EpisodeReference": media}
                self.assertEqual(self.create({
                    "PodcastPosterReference": face, "PodcastPosterReferenceType": "remote",
                    "Episodes": [{**episode, "EpisodePosterReference": poster} if poster else episode]}).status, 0)
                self.assertEqual(self.info()["Episodes"][0].get("EpisodeFileSize"), size)


class LeftOutTest(BundleTestCase):
    def test_every_warning_and_what_follows_it(self):
        web = self.server()
        sound = self.media("good.mp3")
        episodes = [{"EpisodeName": "Lost"},
                    {"EpisodeName": "Bad", "EpisodeReference": "http://host/a b.mp3"},
                    {"EpisodeName": "Odd", "EpisodeReference": web.serve("/a.OGG?type=.mp3", b"media")},
                    {"EpisodeName": "Gone", "EpisodeReference": "/nowhere/a.mp3"},
                    {"EpisodeName": "One", "EpisodeReference": sound, "EpisodePosterReference": "http:///a.png"},
                    {"EpisodeName": "Two", "EpisodeReference": sound, "EpisodePosterReference": self.media("a.Gif")},
                    {"EpisodeName": "Three", "EpisodeReference": sound, "EpisodePosterReference": "/nowhere/a.png"},
                    {"EpisodeName": "Four", "EpisodeReference": sound, "EpisodePosterReference": self.media("a.PNG")}]
        show = {"PodcastName": "Show", "PodcastPosterReference": self.media("c.JPG"), "AllowedPosterTypes": ["png"],
                "AllowedEpisodeTypes": ["mp3"], "Episodes": episodes}
        self.assertRuns(self.create(show), 'W Unsupported poster image type "JPG" for podcast "Show"',
                        "Fetching 8 episodes", "Fetching episode 1...",
                        'W Found an episode ("Lost") without a specified location', "Skipping episode 1",
                        "Fetching episode 2...", 'W Could not generate sane path for episode "Bad"',
                        "Skipping episode 2", "Fetching episode 3...", 'W Invalid file type "OGG" for episode "Odd"',
                        "Skipping episode 3", "Fetching episode 4...",
                        'W Could not save or download episode "Gone"', "Skipping episode 4", "Fetching episode 5...",
                        'W Could not generate sane path for poster image for episode "One"', "Fetched episode 5",
                        "Fetching episode 6...", 'W Unsupported poster image type "Gif" for episode "Two"',
                        "Fetched episode 6", "Fetching episode 7...",
                        'W Could not save or download poster image for episode "Three"', "Fetched episode 7",
                        "Fetching episode 8...", "Fetched episode 8")
        names = ["good.mp3", "good-2.mp3", "good-3.mp3", "good-4.mp3"]
        entries = [{"EpisodeName": title, "EpisodeReference": name, "EpisodeReferenceType": "local"}
                   for title, name in zip(("One", "Two", "Three", "Four"), names)]
        entries[-1] |= {"EpisodePosterReference": "Posters/good-4.PNG", "EpisodePosterReferenceType": "local"}
        self.assertEqual(self.info(), {"PodcastName": "Show", "Episodes": entries})
        self.assertEqual(set(self.files()), {*names, "Posters/good-4.PNG"})
        self.assertEqual(web.requests, [])

    def test_a_type_is_looked_at_before_a_path(self):
        """Names that no file can have, of types that are not allowed."""
        long = "x" * 255
        show = {"PodcastName": "Show", "PodcastPosterReference": f"/c.{long}", "AllowedPosterTypes": ["png"],
                "AllowedEpisodeTypes": ["mp3"],
                "Episodes": [{"EpisodeName": "Nameless", "EpisodeReference": "http://h/"},
                             {"EpisodeName": "One", "EpisodeReference": self.media("a.mp3"),
                              "EpisodePosterReference": f"/a.{long}"}]}
        self.assertWarns(self.create(show), f'Unsupported poster image type "{long}" for podcast "Show"',
                         'Invalid file type "" for episode "Nameless"',
                         f'Unsupported poster image type "{long}" for episode "One"')

    def test_an_empty_poster_location_is_one(self):
        self.assertWarns(self.create({"PodcastName": "Show", "PodcastPosterReference": "", "Episodes": [
            {"EpisodeName": "One", "EpisodeReference": self.media("a.mp3"), "EpisodePosterReference": ""}]}),
            'Could not save or download poster image for podcast "Show"',
            'Could not save or download poster image for episode "One"')

    def test_posters_of_the_podcast(self):
        for location, kind, failure in (("http://[/c.jpg", "remote", "generate sane path for"),
                                        ("/nowhere/c.jpg", "local", "save or download"),
                                        (self.server().serve("/c.jpg", b"cover"), None, "save or download")):
            with self.subTest(location):
                show = {"PodcastName": "Show", "PodcastPosterReference": location}
                self.assertWarns(self.create({**show, "PodcastPosterReferenceType": kind} if kind else show),
                                 f'Could not {failure} poster image for podcast "Show"')
                self.assertEqual(self.info(), {"PodcastName": "Show"})

    def test_allowed_types(self):
        """Lists, an extension and whether they allow it."""
        for allowed, extension, is_allowed in ((["mp3", "m4a"], ".M4A", True), (["MP3"], ".MP3", False),
                                               ([], ".mp3", False), ([""], "", True), (["mp3"], "", False)):
            with self.subTest(allowed, extension=extension):
                self.bundle = self.path(f"{allowed}{extension}.podcast")
                result = self.create({
                    "AllowedEpisodeTypes": allowed, "AllowedPosterTypes": allowed,
                    "PodcastPosterReference": self.media("cover" + extension),
                    "Episodes": [{"EpisodeReference": self.media("a" + extension)}]})
                if is_allowed:
                    self.assertWarns(result)
                else:
                    self.assertWarns(result, f'Unsupported poster image type "{extension[1:]}" for podcast "(null)"',
                                     f'Invalid file type "{extension[1:]}" for episode "(null)"')
                    self.assertEqual(self.files(), {})


class OutputPathTest(BundleTestCase):
    def create_at(self, path, **options):
        self.assertEqual(self.run_tool("createbundle", self.reference({"PodcastName": "Night Walks"}), "-d", path,
                                       **options).status, 0)

    def test_the_path_is_taken_as_given_whatever_its_extension(self):
        for path in ("plain", "show.PODCAST", "show.txt", "trailing/", "füße 🚶", ".hidden", "~"):
            with self.subTest(path):
                before = set(os.listdir(self.directory)) | {"reference.plist"}
                self.create_at(path, env={"HOME": "/nowhere"})
                self.assertEqual(set(os.listdir(self.directory)) - before, {path.rstrip("/")})
                self.assertEqual(set(os.listdir(self.path(path))), {"Info.plist", "Posters"})

    def test_missing_parents_are_created(self):
        self.create_at("one/two/three/show.podcast")
        self.assertEqual(self.info(self.path("one/two/three/show.podcast")), {"PodcastName": "Night Walks"})

    def test_relative_paths_belong_to_the_working_directory(self):
        self.path("one").mkdir()
        self.path("one/~").mkdir()
        self.write("one/~/a.mp3", b"here")
        self.create_at(".", cwd=self.path("one"))
        self.assertEqual(set(os.listdir(self.path("one"))), {"Info.plist", "Posters", "~"})
        for location in ("~/a.mp3", "../one/~/a.mp3"):
            with self.subTest(location):
                source = self.reference({"Episodes": [{"EpisodeReference": location}]})
                result = self.run_tool("createbundle", source, "-d", f"../{location.count('/')}",
                                       cwd=self.path("one"), env={"HOME": "/nowhere"})
                self.assertWarns(result)
                self.assertEqual(self.files(self.path(str(location.count("/")))), {"a.mp3": b"here"})

    def test_a_path_that_is_no_utf_8(self):
        self.create_at(b"\xff\xfe")
        self.assertEqual(set(os.listdir(bytes(self.directory) + b"/\xff\xfe")), {b"Info.plist", b"Posters"})

    def test_without_a_path_the_temporary_directory_itself_is_filled(self):
        for arguments in ((), ("-d",)):
            with self.subTest(arguments):
                temporary = self.path(f"temporary{len(arguments)}")
                temporary.mkdir()
                (temporary / "other").write_bytes(b"mine")
                result = self.run_tool("createbundle", self.reference({"PodcastName": "Night Walks"}), *arguments,
                                       env={"TMPDIR": str(temporary)})
                self.assertSucceeds(result, notices("Fetching 0 episodes", "Done!"))
                self.assertEqual(set(contents(temporary)), {"Info.plist", "Posters", "other"})

    def test_paths_that_no_directory_can_have(self):
        for path, reason in (("", "No such file or directory"), ("n" * 256, "File name too long")):
            with self.subTest(path):
                self.assertFails(self.run_tool("createbundle", self.reference({}), "-d", path),
                                 f"Could not generate bundle: Could not create bundle: {reason}\n", stdout=LOADING)


class SecondRunTest(BundleTestCase):
    """A bundle may be made again in the same place."""

    def test_downloads_are_replaced_and_all_else_stays(self):
        web = self.server()
        show = {"PodcastPosterReference": web.serve("/c.jpg", b"old cover"), "PodcastPosterReferenceType": "remote",
                "Episodes": [{"EpisodeReference": web.serve("/1/a.mp3", b"old media"),
                              "EpisodePosterReference": web.serve("/a.jpg", b"old poster")},
                             {"EpisodeReference": web.serve("/2/a.mp3", b"other media")},
                             {"EpisodeReference": self.media("copied.mp3")}]}
        self.assertWarns(self.create({**show, "PodcastName": "Old"}))
        web.serve("/c.jpg", b"new")
        web.serve("/1/a.mp3", b"new and longer media")
        web.serve("/a.jpg", b"newer")
        self.media("copied.mp3", b"new media")
        for name in ("notes.txt", ".hidden"):
            (self.bundle / name).write_bytes(b"mine")
        self.assertWarns(self.create(show), 'Could not save or download episode "(null)"')
        self.assertEqual(self.files(), {
            "a.mp3": b"new and longer media", "a-2.mp3": b"other media", "copied.mp3": b"media", "notes.txt": b"mine",
            ".hidden": b"mine", "Posters/Podcast.jpg": b"new", "Posters/a.jpg": b"newer"})
        self.assertEqual(self.references(), ["a.mp3", "a-2.mp3"])
        self.assertNotIn("PodcastName", self.info())

    def test_a_failed_load_touches_nothing(self):
        self.create({"PodcastName": "Old"})
        before = contents(self.bundle)
        self.assertFails(self.create(self.feed(b"<feed/>")), NO_FEED, stdout=LOADING)
        self.assertEqual(contents(self.bundle), before)


if __name__ == "__main__":
    unittest.main()
