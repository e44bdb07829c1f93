"""A feed's author names the files that appear on somebody else's disk; they must land in the bundle, whole.

Names are made from locations that nobody checked: with separators, dots, nothing at all, or bytes that no
file system takes. Whatever they hold, nothing outside the bundle is ever touched.
"""

import os
import shutil
import string
import unittest
from urllib.parse import quote

from bundle_support import BundleTestCase, contents

# Paths of URLs and what they become; None for what has no sane path.
URL_NAMES = [
    ("/one.mp3", "one.mp3"),
    ("/a/b/c/one.mp3", "one.mp3"),
    ("/one.MP3", "one.MP3"),
    ("/one", "one."),
    ("/one.", "one."),
    ("/one.two.mp3", "one.two.mp3"),
    ("/one..mp3", "one..mp3"),
    ("/one.mp3?id=7", "one.mp3"),
    ("/get.php?file=/x/other.mp3", "get.php"),
    ("/one.mp3#t=10", "one.mp3"),
    ("/one.mp3#/two.mp3", "one.mp3"),
    ("/one.mp3/", "one.mp3"),
    ("/one.mp3///", "one.mp3"),
    ("//one.mp3", "one.mp3"),
    ("/.mp3", ".mp3."),
    ("/.one.mp3", ".one.mp3"),
    ("/a%20b.mp3", "a b.mp3"),
    ("/a+b.mp3", "a+b.mp3"),
    ("/one%2Emp3", "one.mp3"),
    ("/100%25.mp3", "100%.mp3"),
    ("/%2541.mp3", "%41.mp3"),
    ("/f%C3%BC%C3%9Fe.mp3", "füße.mp3"),
    ("/füße.mp3", "füße.mp3"),
    ("/%F0%9F%9A%B6.mp3", "🚶.mp3"),
    ("/a:b.mp3", "ab.mp3"),
    ("/a:b:c::d.mp3", "abcd.mp3"),
    ("/a%3Ab.mp3", "ab.mp3"),
    ("/one.m:p3", "one.m:p3"),
    ("/a%2Fb.mp3", "a:b.mp3"),
    ("/a:b%2fc.mp3", "ab:c.mp3"),
    ("/x/..%2F..%2Fetc%2Fcron.d%2Fjob.sh", "..:..:etc:cron.d:job.sh"),
    ("/%2Fetc%2Fpasswd.mp3", ":etc:passwd.mp3"),
    ("/..one.mp3", "..one.mp3"),
    ("/-rf.mp3", "-rf.mp3"),
    ("/~.mp3", "~.mp3"),
    ("/$HOME;ls&'*'.mp3", "$HOME;ls&'*'.mp3"),
    ("/a%5Cb.mp3", "a\\b.mp3"),
    ("/%22%3C%3E%26.mp3", "\"<>&.mp3"),
    ("/" + "n" * 251 + ".mp3", "n" * 251 + ".mp3"),
    ("/" + "n" * 252 + ".mp3", None),
    ("/n." + "m" * 253, "n." + "m" * 253),
    ("/n." + "m" * 254, None),
    ("/" + "%C3%BC" * 125 + "n.mp3", "ü" * 125 + "n.mp3"),
    ("/" + "%C3%BC" * 126 + ".mp3", None),
    ("/" + "%3A" * 300 + "n.mp3", "n.mp3"),
    ("", None),
    ("/", None),
    ("///", None),
    ("/?file=one.mp3", None),
    ("?one.mp3", None),
    ("/x/%2E", None),
    ("/x/%2e%2e", None),
    ("/x/%2E%2E/", None),
    ("/:", None),
    ("/a%00b.mp3", None),
    ("/a.mp3%00", None),
    ("/a%0Ab.mp3", "a\nb.mp3"),
    ("/a%09b.mp3", "a\tb.mp3"),
    ("/a%01b.mp3", None),
    ("/a%1B%5B2Jb.mp3", None),
    ("/%FF.mp3", None),
    ("/%C3.mp3", None),
    ("/%ED%A0%80.mp3", None),
    ("/Info.plist", None),
    ("/In:fo.plist", None),
]

PATH_NAMES = [
    ("one.mp3", "one.mp3"),
    ("./one.mp3", "one.mp3"),
    ("folder/../one.mp3", "one.mp3"),
    ("folder/two.mp3", "two.mp3"),
    ("folder//two.mp3", "two.mp3"),
    ("a:b.mp3", "ab.mp3"),
    ("a%20b.mp3", "a%20b.mp3"),
    ("a b.mp3", "a b.mp3"),
    ("a?b#c.mp3", "a?b#c.mp3"),
    ("none", "none."),
    (".hidden", ".hidden."),
    ("dot.", "dot."),
    ("two.dots.MP3", "two.dots.MP3"),
    ("füße🚶.mp3", "füße🚶.mp3"),
    ("line\nbreak.mp3", "line\nbreak.mp3"),
    ("Posters", "Posters."),
    ("pcast:one.mp3", "pcastone.mp3"),
]


PRINTABLE = string.punctuation


class URLNameTest(BundleTestCase):
    def test_names(self):
        web = self.server()
        for path, name in URL_NAMES:
            with self.subTest(path):
                shutil.rmtree(self.bundle, ignore_errors=True)
                web.serve(quote(path.partition("#")[0], safe=PRINTABLE), b"media")
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

    def test_file_urls(self):
        self.write("a:b c.mp3", b"media")
        self.assertWarns(self.create_episodes(f"file://{self.directory}/a:b%20c.mp3"))
        self.assertEqual(self.files(), {"ab c.mp3": b"media"})


class PathNameTest(BundleTestCase):
    def test_names(self):
        self.path("folder").mkdir()
        for location, name in PATH_NAMES:
            with self.subTest(location):
                shutil.rmtree(self.bundle, ignore_errors=True)
                self.write(location, b"media")
                self.assertWarns(self.create_episodes(location))
                self.assertEqual(self.references(), [name])
                self.assertEqual(self.files(), {name: b"media"})

    def test_no_names(self):
        for location in ("", "/", "//", ".", "..", "folder/..", "folder/.", ":", "n" * 300):
            with self.subTest(location):
                self.assertWarns(self.create_episodes({"EpisodeName": "One", "EpisodeReference": location}),
                                 'Could not generate sane path for episode "One"')
                self.assertEqual(self.files(), {})

    def test_a_suffix_may_make_a_name_too_long(self):
        location = self.media("n" * 250 + ".mp3")
        self.assertWarns(self.create_episodes(location, location, location),
                         *['Could not generate sane path for episode "(null)"'] * 2)
        self.assertEqual(self.references(), ["n" * 250 + ".mp3"])

    def test_a_name_whose_dot_and_extension_just_fit(self):
        location = self.media("n" * 254)
        self.assertWarns(self.create_episodes(location))
        self.assertEqual(self.references(), ["n" * 254 + "."])

    def test_a_name_that_its_final_dot_makes_too_long(self):
        location = self.media("n" * 255)
        self.assertWarns(self.create_episodes(location), 'Could not generate sane path for episode "(null)"')


class LedgerTest(BundleTestCase):
    """Repeated names are numbered, extensions or not."""

    def names(self, *locations):
        self.assertEqual(self.create_episodes(*(self.media(location) for location in locations)).status, 0)
        return self.references()

    def test_the_same_name_is_numbered_from_two(self):
        self.assertEqual(self.names("1/a.mp3", "2/a.mp3", "3/a.mp3"), ["a.mp3", "a-2.mp3", "a-3.mp3"])

    def test_extensions_play_no_part(self):
        self.assertEqual(self.names("show.mp3", "show.MP3", "show.aac"), ["show.mp3", "show-2.MP3", "show-3.aac"])

    def test_letter_case_tells_names_apart(self):
        self.assertEqual(self.names("a.mp3", "A.mp3"), ["a.mp3", "A.mp3"])

    def test_a_number_that_is_taken_is_passed_over(self):
        self.assertEqual(self.names("a-2.mp3", "1/a.mp3", "2/a.mp3", "3/a.mp3"),
                         ["a-2.mp3", "a.mp3", "a-3.mp3", "a-4.mp3"])

    def test_a_numbered_name_is_taken_itself(self):
        self.assertEqual(self.names("1/a.mp3", "2/a.mp3", "a-2.mp3"), ["a.mp3", "a-2.mp3", "a-2-2.mp3"])

    def test_names_that_become_equal(self):
        self.assertEqual(self.names("ab.mp3", "a:b.mp3", ":ab.mp3"), ["ab.mp3", "ab-2.mp3", "ab-3.mp3"])

    def test_each_file_holds_its_own_episode(self):
        self.create_episodes(self.media("1/a.mp3", b"first"), self.media("2/a.mp3", b"second"))
        self.assertEqual(self.files(), {"a.mp3": b"first", "a-2.mp3": b"second"})

    def test_a_failed_episode_keeps_its_name(self):
        self.assertWarns(self.create_episodes(str(self.path("a.mp3")), self.media("a.mp3")),
                         'Could not save or download episode "(null)"')
        self.assertEqual(self.references(), ["a-2.mp3"])

    def test_an_episode_without_a_sane_path_keeps_its_name_too(self):
        self.assertWarns(self.create_episodes(self.media("Info.plist"), self.media("Info.mp3")),
                         'Could not generate sane path for episode "(null)"')
        self.assertEqual(self.references(), ["Info-2.mp3"])

    def test_empty_names_stay_without_a_sane_path(self):
        self.assertWarns(self.create_episodes("/", "/", "http://127.0.0.1/"),
                         *['Could not generate sane path for episode "(null)"'] * 3)
        self.assertEqual(self.files(), {})


class PosterNameTest(BundleTestCase):
    def poster(self, location, media="one.mp3"):
        """The reference of the only episode's poster."""
        self.assertEqual(self.create_episodes({"EpisodeReference": self.media(media),
                                               "EpisodePosterReference": location}).status, 0)
        return self.info()["Episodes"][0].get("EpisodePosterReference")

    def test_a_poster_is_named_after_its_episode(self):
        self.assertEqual(self.poster(self.media("face.jpg", b"poster")), "Posters/one.jpg")
        self.assertEqual(self.files(), {"one.mp3": b"media", "Posters/one.jpg": b"poster"})

    def test_a_poster_keeps_its_own_extension(self):
        self.assertEqual(self.poster(self.media("face.art.JPEG")), "Posters/one.JPEG")

    def test_a_poster_without_extension(self):
        self.assertEqual(self.poster(self.media("face")), "Posters/one.")

    def test_the_extension_of_a_url_comes_from_its_path(self):
        self.assertEqual(self.poster(self.server().serve("/face.png?size=3.0", b"poster")), "Posters/one.png")

    def test_a_url_without_a_name(self):
        self.assertEqual(self.poster(self.server().serve("/", b"poster")), "Posters/one.")

    def test_a_poster_is_numbered_with_its_episode(self):
        poster = self.media("face.jpg")
        self.create_episodes(*({"EpisodeReference": self.media(f"{folder}/a.mp3"), "EpisodePosterReference": poster}
                               for folder in "12"))
        self.assertEqual([episode["EpisodePosterReference"] for episode in self.info()["Episodes"]],
                         ["Posters/a.jpg", "Posters/a-2.jpg"])

    def test_an_extension_too_long_for_a_name(self):
        long = self.server().serve("/face." + "x" * 252, b"poster")
        self.assertWarns(self.create_episodes({"EpisodeName": "One", "EpisodeReference": self.media("one.mp3"),
                                               "EpisodePosterReference": long}),
                         'Could not generate sane path for poster image for episode "One"')
        self.assertEqual(set(self.files()), {"one.mp3"})

    def test_an_extension_with_bytes_that_no_text_holds(self):
        for escape in ("%00", "%01", "%FF"):
            with self.subTest(escape):
                url = self.server().serve(f"/face.j{escape}pg", b"poster")
                self.assertWarns(self.create({"PodcastName": "Show", "PodcastPosterReference": url,
                                              "PodcastPosterReferenceType": "remote"}),
                                 'Could not generate sane path for poster image for podcast "Show"')
                self.assertEqual(self.files(), {})

    def test_a_separator_in_an_extension_leads_nowhere(self):
        url = self.server().serve("/face.jpg%2F..%2F..%2F..%2Fescaped.jpg", b"poster")
        self.assertEqual(self.poster(url), "Posters/one.jpg")
        self.assertEqual(set(self.files()), {"one.mp3", "Posters/one.jpg"})

    def test_an_episode_named_podcast_takes_the_podcasts_poster(self):
        web = self.server()
        self.assertWarns(self.create({"PodcastPosterReference": web.serve("/cover.jpg", b"cover"),
                                      "PodcastPosterReferenceType": "remote",
                                      "Episodes": [{"EpisodeReference": self.media("Podcast.mp3"),
                                                    "EpisodePosterReference": web.serve("/face.jpg", b"face")}]}))
        self.assertEqual(self.files(), {"Podcast.mp3": b"media", "Posters/Podcast.jpg": b"face"})
        self.assertEqual(self.info()["PodcastPosterReference"], "Posters/Podcast.jpg")

    def test_a_copied_poster_does_not_take_it(self):
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
