"""A feed's author names the files that appear on somebody else's disk; they must land in the bundle, whole.

Names are made from locations that nobody checked: with separators, dots, nothing at all, or bytes that no
file system takes. Whatever they hold, nothing outside the bundle is ever touched. What ordinary locations become
is in QELBundleNamesTest, QELNameLedgerTest and the tables of docs/bundle.md, which test_documentation.py runs.
"""

import os
import shutil
import string
import unittest
from urllib.parse import quote

from bundle_support import BundleTestCase, contents

# Paths of URLs and what they become; None for what has no sane path.
URL_NAMES = [
    ("/one.mp3///", "one.mp3"),
    ("/.one.mp3", ".one.mp3"),
    ("/..one.mp3", "..one.mp3"),
    ("/%2541.mp3", "%41.mp3"),
    ("/one.m:p3", "one.m:p3"),
    ("/a:b%2fc.mp3", "ab:c.mp3"),
    ("/x/..%2F..%2Fetc%2Fcron.d%2Fjob.sh", "..:..:etc:cron.d:job.sh"),
    ("/%2Fetc%2Fpasswd.mp3", ":etc:passwd.mp3"),
    ("/-rf.mp3", "-rf.mp3"),
    ("/$HOME;ls&'*'.mp3", "$HOME;ls&'*'.mp3"),
    ("/a%5Cb.mp3", "a\\b.mp3"),
    ("/%22%3C%3E%26.mp3", "\"<>&.mp3"),
    ("/" + "n" * 251 + ".mp3", "n" * 251 + ".mp3"),
    ("/" + "n" * 252 + ".mp3", None),
    ("/n." + "m" * 253, "n." + "m" * 253),
    ("/n." + "m" * 254, None),
    ("/" + "n" * 254, "n" * 254 + "."),
    ("/" + "n" * 255, None),
    ("/" + "%C3%BC" * 125 + "n.mp3", "ü" * 125 + "n.mp3"),
    ("/" + "%C3%BC" * 126 + ".mp3", None),
    ("/" + "%3A" * 300 + "n.mp3", "n.mp3"),
    ("", None),
    ("///", None),
    ("?one.mp3", None),
    ("/x/%2E", None),
    ("/x/%2e%2e/", None),
    ("/:", None),
    ("/a.mp3%00", None),
    ("/a%0Ab.mp3", "a\nb.mp3"),
    ("/a%09b.mp3", "a\tb.mp3"),
    ("/a%01b.mp3", None),
    ("/a%1B%5B2Jb.mp3", None),
    ("/%FF.mp3", None),
    ("/%C3.mp3", None),
    ("/%ED%A0%80.mp3", None),
    ("/In:fo.plist", None),
]

PATH_NAMES = [
    ("folder/../one.mp3", "one.mp3"),
    ("folder//two.mp3", "two.mp3"),
    ("pcast:one.mp3", "pcastone.mp3"),
    ("a?b#c.mp3", "a?b#c.mp3"),
    ("line\nbreak🚶.mp3", "line\nbreak🚶.mp3"),
    (".hidden", ".hidden."),
    ("dot.", "dot."),
    ("Posters", "Posters."),
]

UNNAMED_PATHS = ("", "/", "//", ".", "..", "folder/..", "folder/.", ":", "n" * 300)


class MediaNameTest(BundleTestCase):
    def test_names_of_urls(self):
        web = self.server()
        for path, name in URL_NAMES:
            with self.subTest(path):
                shutil.rmtree(self.bundle, ignore_errors=True)
                web.serve(quote(path.partition("#")[0], safe=string.punctuation), b"media")
                result = self.create_episodes({"EpisodeName": "One", "EpisodeReference": web.url(path)})
                if name is None:
                    self.assertRuns(result, "Fetching 1 episodes", "Fetching episode 1...",
                                    'W Could not generate sane path for episode "One"', "Skipping episode 1")
                    self.assertEqual(self.files(), {})
                else:
                    self.assertWarns(result)
                    self.assertEqual(self.references(), [name])
                    self.assertEqual(self.files(), {name: b"media"})
                self.assertEqual(set(os.listdir(self.directory)), {"reference.plist", "show.podcast"})

    def test_the_end_of_a_redirect_names_nothing(self):
        web = self.server()
        web.serve("/cdn/93f2.bin", b"media")
        self.assertWarns(self.create_episodes(web.redirect("/one.mp3", "/cdn/93f2.bin")))
        self.assertEqual(self.files(), {"one.mp3": b"media"})

    def test_a_content_disposition_names_nothing(self):
        web = self.server()
        web.serve("/one.mp3", b"media", headers=[("Content-Disposition", 'attachment; filename="../two.mp3"')])
        self.assertWarns(self.create_episodes(web.url("/one.mp3")))
        self.assertEqual(self.files(), {"one.mp3": b"media"})

    def test_names_of_paths(self):
        self.path("folder").mkdir()
        for location, name in PATH_NAMES:
            with self.subTest(location):
                shutil.rmtree(self.bundle, ignore_errors=True)
                self.write(location, b"media")
                self.assertWarns(self.create_episodes(location))
                self.assertEqual(self.references(), [name])
                self.assertEqual(self.files(), {name: b"media"})

    def test_paths_without_a_name(self):
        for location in UNNAMED_PATHS:
            with self.subTest(location):
                self.assertWarns(self.create_episodes({"EpisodeName": "One", "EpisodeReference": location}),
                                 'Could not generate sane path for episode "One"')
                self.assertEqual(self.files(), {})

    def test_a_suffix_may_make_a_name_too_long(self):
        location = self.media("n" * 250 + ".mp3")
        self.assertWarns(self.create_episodes(location, location, location),
                         *['Could not generate sane path for episode "(null)"'] * 2)
        self.assertEqual(self.references(), ["n" * 250 + ".mp3"])

    def test_an_episode_without_a_sane_path_keeps_its_name(self):
        for unnamed, named, name in ((self.media("Info.plist"), "Info.mp3", "Info-2.mp3"), ("/", ":::.mp3", "-2.mp3"),
                                     ("http://127.0.0.1", "::.mp3", "-2.mp3")):
            with self.subTest(unnamed):
                shutil.rmtree(self.bundle, ignore_errors=True)
                self.assertWarns(self.create_episodes(unnamed, self.media(named)),
                                 'Could not generate sane path for episode "(null)"')
                self.assertEqual(self.references(), [name])


class PosterNameTest(BundleTestCase):
    """A poster has the name of its episode and its own extension."""

    def test_extensions(self):
        web = self.server()
        for location, name in ((self.media("face.art.JPEG"), "one.JPEG"), (self.media("face"), "one."),
                               (web.serve("/face.png?size=3.0", b"media"), "one.png"),
                               (web.serve("/", b"media"), "one."),
                               (web.serve("/face.jpg%2F..%2F..%2F..%2Fescaped.gif", b"media"), "one.gif")):
            with self.subTest(location):
                self.assertPoster({"EpisodePosterReference": location}, name)

    def test_the_stored_type_tells_a_path_from_a_url(self):
        self.write("file:face.jpg?size=3.png", b"media")
        self.assertPoster({"EpisodePosterReference": "file:face.jpg?size=3.png", "EpisodePosterReferenceType": "local"},
                          "one.png")

    def assertPoster(self, poster, name):
        """The poster of an episode gets the name."""
        shutil.rmtree(self.bundle, ignore_errors=True)
        self.assertWarns(self.create_episodes({"EpisodeReference": self.media("one.mp3"), **poster}))
        self.assertEqual(self.info()["Episodes"][0]["EpisodePosterReference"], f"Posters/{name}")
        self.assertEqual(self.files(), {"one.mp3": b"media", f"Posters/{name}": b"media"})

    def test_extensions_that_no_file_can_have(self):
        web = self.server()
        for extension in ("x" * 252, "j%00pg", "j%01pg", "j%FFpg"):
            with self.subTest(extension):
                url = web.serve(f"/face.{extension}", b"poster")
                self.assertWarns(self.create({"PodcastName": "Show", "PodcastPosterReference": url,
                                              "PodcastPosterReferenceType": "remote"}),
                                 'Could not generate sane path for poster image for podcast "Show"')
                self.assertEqual(self.files(), {})

    def test_a_copy_never_takes_the_place_of_the_podcasts_poster(self):
        self.assertWarns(self.create({"PodcastPosterReference": self.media("cover.jpg", b"cover"),
                                      "Episodes": [{"EpisodeReference": self.media("Podcast.mp3"),
                                                    "EpisodePosterReference": self.media("face.jpg", b"face")}]}),
                         'Could not save or download poster image for episode "(null)"')
        self.assertEqual(self.files(), {"Podcast.mp3": b"media", "Posters/Podcast.jpg": b"cover"})


class InsideTest(BundleTestCase):
    """Nothing outside the bundle changes, whatever lies in the bundle already."""

    def setUp(self):
        super().setUp()
        self.bundle.mkdir()
        self.write("outside", b"untouched")
        self.path("folder").mkdir()
        self.url = self.server().serve("/a.mp3", b"media")

    def assertOutsideUntouched(self):
        found = {path: content for path, content in contents(self.directory).items()
                 if not path.startswith("show.podcast/")}
        del found["reference.plist"]
        self.assertEqual(found, {"outside": b"untouched", "folder": None, "show.podcast": None})

    def test_a_download_replaces_a_link(self):
        for target in (self.path("outside"), self.path("new"), self.path("folder")):
            with self.subTest(target.name):
                link = self.bundle / "a.mp3"
                link.unlink(missing_ok=True)
                link.symlink_to(target)
                self.assertWarns(self.create_episodes(self.url))
                self.assertEqual(self.files(), {"a.mp3": b"media"})
                self.assertOutsideUntouched()

    def test_a_copy_refuses_a_link(self):
        for target in ("../outside", "../new", "../folder"):
            with self.subTest(target):
                link = self.bundle / "outside."
                link.unlink(missing_ok=True)
                link.symlink_to(target)
                self.assertWarns(self.create_episodes("outside"), 'Could not save or download episode "(null)"')
                self.assertEqual(self.files(), {"outside.": f"-> {target}"})
                self.assertOutsideUntouched()

    def test_the_reference_file_replaces_a_link(self):
        (self.bundle / "Info.plist").symlink_to("../outside")
        self.assertWarns(self.create({"PodcastName": "Show"}))
        self.assertFalse((self.bundle / "Info.plist").is_symlink())
        self.assertOutsideUntouched()

    def test_posters_that_lead_out_stay_empty(self):
        (self.bundle / "Posters").symlink_to("../folder")
        self.assertWarns(self.create_episodes({"EpisodeName": "One", "EpisodeReference": self.url,
                                               "EpisodePosterReference": self.server().serve("/a.jpg", b"poster")}),
                         'Could not generate sane path for poster image for episode "One"')
        self.assertEqual(self.references(), ["a.mp3"])
        self.assertOutsideUntouched()

    def test_posters_that_lead_to_nowhere_are_not_created(self):
        (self.bundle / "Posters").symlink_to("../new")
        self.assertEqual(self.create({"PodcastPosterReference": self.url,
                                      "PodcastPosterReferenceType": "remote"}).status, 0)
        self.assertEqual(self.info(), {})
        self.assertOutsideUntouched()

    def test_a_hard_link_is_not_written_through(self):
        os.link(self.path("outside"), self.bundle / "a.mp3")
        self.assertWarns(self.create_episodes(self.url))
        self.assertEqual(self.files(), {"a.mp3": b"media"})
        self.assertOutsideUntouched()

    def test_an_attackers_feed(self):
        web = self.server()
        names = ["..", "../outside", "..%2Foutside", "%2E%2E%2Foutside", "....//outside", "%2E%2E", ".", "%2e%2e%2f",
                 quote("/" + str(self.path("outside")).lstrip("/"), safe=""), "%00", "outside%00.mp3", "..%5Coutside"]
        for path in ["/outside", "/", "/.../outside"]:
            web.serve(path, b"evil")
        episodes = [web.url(f"/x/{name}") for name in names]
        for request in episodes:
            web.serve(request.removeprefix(web.url("")), b"evil")
        self.assertEqual(self.create_episodes(*episodes, "../outside", "/etc/..", "folder/../..", "..").status, 0)
        self.assertOutsideUntouched()
        for reference in self.references():
            self.assertNotIn("/", reference)
            self.assertTrue((self.bundle / reference).is_file())


if __name__ == "__main__":
    unittest.main()
