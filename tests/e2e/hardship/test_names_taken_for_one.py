"""A file system takes names that differ in the case of letters for one: no file of a run replaces another of it.

An ext4 with case folding, which root can mount, is such a file system; other systems have theirs.
"""

import shutil
import subprocess
import unittest

from bundle_support import BundleTestCase
from mounted import Image


class FoldingTest(BundleTestCase):
    def setUp(self):
        super().setUp()
        image = Image(self.path("image"), self.path("mounted"), "-O", "casefold", "-E", "encoding=utf8")
        self.addCleanup(image.unmount)
        self.bundle = image.point / "show.podcast"
        self.empty()

    def empty(self):
        shutil.rmtree(self.bundle, ignore_errors=True)
        self.bundle.mkdir()
        made = subprocess.run(["chattr", "+F", self.bundle], stderr=subprocess.PIPE, check=False)
        if made.returncode != 0:
            self.skipTest(made.stderr.decode().strip())

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


if __name__ == "__main__":
    unittest.main()
