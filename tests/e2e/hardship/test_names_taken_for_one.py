"""A file system takes names that differ in the case of letters for one: no file of a run replaces another of it.

One in user space, like those of memory cards, is mounted, and an ext4 with case folding. Both take root, and the kernel
may know neither.
"""

import os
import shutil
import subprocess
import sys
import unittest

import folding_files
from bundle_support import BundleTestCase, contents, hidden
from interruption import InterruptionTestCase
from mounted import Image


def mount_in_user_space(test, point):
    """Mounts a new file system in user space until the test ends; skips the test where that cannot be done."""
    point.mkdir()
    if os.geteuid() != 0 or not os.path.exists("/dev/fuse"):
        raise unittest.SkipTest("root and /dev/fuse are needed")
    server = subprocess.Popen([sys.executable, "-B", folding_files.__file__, point], stdout=subprocess.PIPE,
                              stderr=subprocess.PIPE)
    test.addCleanup(server.communicate)
    if not server.stdout.readline():
        raise unittest.SkipTest(f"nothing can be mounted here: {server.stderr.read().decode().splitlines()[-1]}")
    test.addCleanup(subprocess.run, ["umount", point], check=True)


class FoldingTests:
    """What holds on each such file system; the bundle is in `place`."""

    def setUp(self):
        super().setUp()
        self.place = self.mounted()
        self.bundle = self.place / "show.podcast"

    def empty(self):
        shutil.rmtree(self.bundle, ignore_errors=True)

    def locations(self, *names):
        """Downloads and copies of files with these names and contents of their own."""
        web = self.server()
        return ([web.serve(f"/{number}/{name}", f"{number}".encode()) for number, name in enumerate(names)],
                [self.media(f"{number}/{name}", f"{number}".encode()) for number, name in enumerate(names)])

    def test_media(self):
        for locations in self.locations("show.mp3", "Show.mp3", "ONE.mp3", "one.mp3"):
            with self.subTest(locations[0]):
                self.empty()
                self.assertWarns(self.create({"Episodes": [{"EpisodeName": f"E{number}", "EpisodeReference": location}
                                                           for number, location in enumerate(locations)]}),
                                 'Could not save or download episode "E1"', 'Could not save or download episode "E3"')
                self.assertEqual(self.files(), {"show.mp3": b"0", "ONE.mp3": b"2"})
                self.assertEqual(self.references(), ["show.mp3", "ONE.mp3"])

    def test_a_medium_called_like_the_reference_file(self):
        for has_earlier in (False, True):
            for location in (urls[0] for urls in self.locations("info.plist")):
                with self.subTest(location, has_earlier=has_earlier):
                    self.empty()
                    if has_earlier:
                        self.assertWarns(self.create({"PodcastName": "Earlier"}))
                    self.assertWarns(self.create({"PodcastName": "Show", "Episodes": [
                        {"EpisodeName": "One", "EpisodeReference": location}]}),
                        'Could not save or download episode "One"')
                    self.assertEqual(self.info(), {"PodcastName": "Show"})
                    self.assertEqual(self.files(), {})

    def test_a_second_run_renews_what_it_downloads(self):
        (first, again), _ = self.locations("show.mp3", "Show.mp3")
        self.assertWarns(self.create_episodes(first))
        self.assertWarns(self.create_episodes(again))
        self.assertEqual(list(self.files().values()), [b"1"])

    def test_posters(self):
        urls, copies = self.locations("one.jpg", "ONE.JPG")
        for locations in (urls, copies):
            with self.subTest(locations[0]):
                self.empty()
                media = [self.media(name) for name in ("one.mp3", "ONE.mp3")]
                self.assertWarns(self.create({"Episodes": [
                    {"EpisodeName": name, "EpisodeReference": name, "EpisodePosterReference": poster}
                    for name, poster in zip(media, locations)]}),
                    f'Could not save or download episode "{media[1]}"')
                self.assertEqual(self.files()["Posters/one.jpg"], b"0")


class UserSpaceTest(FoldingTests, BundleTestCase):
    def mounted(self):
        mount_in_user_space(self, self.path("mounted"))
        return self.path("mounted")


class Ext4Test(FoldingTests, BundleTestCase):
    def mounted(self):
        image = Image(self.path("image"), self.path("mounted"), "-O", "casefold", "-E", "encoding=utf8")
        self.addCleanup(image.unmount)
        place = image.point / "folded"
        place.mkdir()
        made = subprocess.run(["chattr", "+F", place], stderr=subprocess.PIPE, check=False)
        if made.returncode != 0:
            self.skipTest(made.stderr.decode().strip())
        return place


class WithoutLinksTest(InterruptionTestCase):
    """The file system in user space has no links and no renaming that refuses an existing name, either."""

    def setUp(self):
        super().setUp()
        mount_in_user_space(self, self.path("mounted"))
        self.bundle = self.path("mounted") / "show.podcast"

    def test_copies_and_downloads(self):
        web = self.server()
        show = {"Episodes": [{"EpisodeName": "One", "EpisodeReference": self.media("one.mp3", b"one" * 50_000),
                              "EpisodePosterReference": self.media("one.jpg", b"face")},
                             {"EpisodeName": "Two", "EpisodeReference": web.serve("/two.mp3", b"two" * 50_000)}]}
        whole = {"one.mp3": b"one" * 50_000, "Posters/one.jpg": b"face", "two.mp3": b"two" * 50_000}
        self.assertWarns(self.create(show))
        self.assertEqual(self.files(), whole)
        self.assertEqual(self.references(), ["one.mp3", "two.mp3"])
        # A copy never takes the place of what is there.
        self.media("one.mp3", b"other")
        self.assertWarns(self.create(show), 'Could not save or download episode "One"')
        self.assertEqual(self.files(), whole)

    def test_a_run_is_interrupted(self):
        url, gate = self.held(self.server(), "/two.mp3", b"half of it")
        process = self.begin({"Episodes": [{"EpisodeReference": self.media("one.mp3")}, {"EpisodeReference": url}]})
        gate.reached()
        self.assertEndsBy(process, 15)
        self.assertEqual(contents(self.bundle), {"Posters": None, "one.mp3": b"media"})
        self.assertEqual(hidden(self.path("mounted")), [])


if __name__ == "__main__":
    unittest.main()
