"""While a bundle is filled its directories are moved away and others, or links, are put in their place: what is written
stays in the directories that were there, and nothing else is touched. What has been there keeps its permissions."""

import os
import shutil
import stat
import subprocess
import unittest

from bundle_support import BundleTestCase, contents
from support import start


class MovedDirectoryTest(BundleTestCase):
    def setUp(self):
        super().setUp()
        self.elsewhere = self.path("elsewhere")
        self.elsewhere.mkdir()
        for name in ("one.mp3", "one.jpg", "two.mp3", "Podcast.jpg", "Info.plist"):
            (self.elsewhere / name).write_bytes(b"of somebody else")
        self.before = contents(self.elsewhere)

    def filled_while(self, act, when):
        """A bundle is filled by downloads and copies, and the action done while the answer of that name is awaited."""
        web = self.server()
        gate = self.gate()

        def answer(exchange):
            gate.wait()
            exchange.reply(200, b"new")
        urls = {name: web.serve(f"/{name}", b"new") for name in ("Podcast.jpg", "one.mp3", "one.jpg")}
        urls[when] = web.route(f"/{when}", answer)
        source = self.reference({
            "PodcastName": "Show", "PodcastPosterReference": urls["Podcast.jpg"], "PodcastPosterReferenceType": "remote",
            "Episodes": [{"EpisodeReference": urls["one.mp3"], "EpisodePosterReference": urls["one.jpg"]},
                         {"EpisodeReference": self.media("two.mp3", b"new"),
                          "EpisodePosterReference": self.media("two.jpg", b"new")}]})
        process = start("createbundle", source, "-d", self.bundle, stdout=subprocess.PIPE, stderr=subprocess.PIPE)
        self.addCleanup(process.communicate)
        self.addCleanup(process.kill)
        gate.reached()
        act()
        gate.open()
        stdout, stderr = process.communicate(timeout=60)
        self.assertEqual((process.returncode, stderr), (0, b""))
        self.assertNotIn(b"[W]", stdout)
        self.assertEqual(contents(self.elsewhere), self.before)

    MEDIA = {"one.mp3": b"new", "two.mp3": b"new"}
    POSTERS = {"Podcast.jpg": b"new", "one.jpg": b"new", "two.jpg": b"new"}

    def test_posters_become_a_link(self):
        for when in ("Podcast.jpg", "one.mp3", "one.jpg"):
            with self.subTest(when):
                def act():
                    (self.bundle / "Posters").rename(self.path("moved"))
                    (self.bundle / "Posters").symlink_to(self.elsewhere)
                self.filled_while(act, when)
                self.assertEqual(contents(self.path("moved")), self.POSTERS)
                self.assertEqual(self.info()["Episodes"][0]["EpisodePosterReference"], "Posters/one.jpg")
                shutil.rmtree(self.bundle)
                shutil.rmtree(self.path("moved"))

    def test_the_bundle_becomes_a_link(self):
        for when in ("Podcast.jpg", "one.mp3", "one.jpg"):
            with self.subTest(when):
                def act():
                    self.bundle.rename(self.path("moved"))
                    self.bundle.symlink_to(self.elsewhere)
                self.filled_while(act, when)
                self.assertEqual(self.files(self.path("moved")),
                                 {**self.MEDIA, **{f"Posters/{name}": b"new" for name in self.POSTERS}})
                self.assertEqual(self.info(self.path("moved"))["PodcastName"], "Show")
                self.bundle.unlink()
                shutil.rmtree(self.path("moved"))

    def test_a_directory_above_becomes_a_link(self):
        self.bundle = self.path("above") / "show.podcast"
        (self.elsewhere / "show.podcast").mkdir()
        self.before = contents(self.elsewhere)

        def act():
            self.path("above").rename(self.path("moved"))
            self.path("above").symlink_to(self.elsewhere)
        self.filled_while(act, "one.mp3")
        self.assertEqual(self.info(self.path("moved") / "show.podcast")["PodcastName"], "Show")

    def test_links_that_take_a_files_place_meanwhile(self):
        def act():
            (self.bundle / "one.mp3").symlink_to(self.elsewhere / "one.mp3")
            (self.bundle / "Info.plist").symlink_to(self.elsewhere / "Info.plist")
            (self.bundle / "Posters" / "one.jpg").symlink_to(self.elsewhere / "one.jpg")
        self.filled_while(act, "one.mp3")
        self.assertFalse(any(content for content in contents(self.bundle).values() if isinstance(content, str)))

    def test_posters_that_are_a_link_to_inside(self):
        for target in ("art", "deep/art", ".", "../show.podcast/art", str(self.bundle / "art")):
            with self.subTest(target):
                (self.bundle / target).mkdir(parents=True, exist_ok=True)
                (self.bundle / "Posters").symlink_to(target)
                self.filled_while(lambda: None, "one.mp3")
                self.assertEqual({name: (self.bundle / "Posters" / name).read_bytes() for name in self.POSTERS},
                                 self.POSTERS)
                shutil.rmtree(self.bundle)


class AttributesTest(BundleTestCase):
    def test_permissions_and_times_are_kept(self):
        for mode in (0o600, 0o640, 0o444, 0o755):
            with self.subTest(oct(mode)):
                original = self.path("media") / "a.mp3"
                self.media("a.mp3")
                original.chmod(mode)
                os.utime(original, ns=(1, 1234567890123456789))
                for location in (str(original), original.as_uri()):
                    shutil.rmtree(self.bundle, ignore_errors=True)
                    self.assertWarns(self.create({"Episodes": [
                        {"EpisodeReference": location, "EpisodeReferenceType": "remote" if ":" in location else "local"}]}))
                    status = (self.bundle / "a.mp3").stat()
                    self.assertEqual((stat.S_IMODE(status.st_mode), status.st_mtime_ns), (mode, 1234567890123456789))
                original.unlink()

    def test_a_rewritten_reference_file_keeps_its_permissions(self):
        self.assertWarns(self.create_episodes())
        for mode in (0o600, 0o664, 0o444):
            (self.bundle / "Info.plist").chmod(mode)
            self.assertWarns(self.create_episodes())
            self.assertEqual(stat.S_IMODE((self.bundle / "Info.plist").stat().st_mode), mode)


if __name__ == "__main__":
    unittest.main()
