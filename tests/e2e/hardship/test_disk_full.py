"""A disk fills up: what did not fit is told about and never half there.

On every system the limit on the size of a file stands for the full disk: every write beyond it fails, as it does there.
Root tries it on a small disk as well. test_faults_of_bundles.py shows the same for each single call.
"""

import os
import resource
import signal
import subprocess
import unittest

from bundle_support import BundleTestCase, contents, notices
from support import LOADING, counting_from_start, without_publication_date

LIMIT = 8192
LARGE = b"0123456789abcdef" * 1024
SMALL = b"small"


def limited():
    """For the tool, before it starts: no file may become larger than the limit."""
    resource.setrlimit(resource.RLIMIT_FSIZE, (LIMIT, LIMIT))
    signal.signal(signal.SIGXFSZ, signal.SIG_DFL)  # Python ignores the signal for it


class LimitTest(BundleTestCase):
    def create(self, podcast, *arguments, **options):
        return super().create(podcast, *arguments, env=counting_from_start(), preexec_fn=limited, **options)

    def test_media_and_posters_that_do_not_fit(self):
        web = self.server()
        locations = (self.media("copy.mp3", LARGE), web.serve("/known.mp3", LARGE), self.write("u.mp3", LARGE).as_uri(),
                     web.chunked("/unknown.mp3", [LARGE[:5000], LARGE[5000:]]))
        self.bundle.mkdir()
        (self.bundle / "known.mp3").write_bytes(b"earlier")
        self.assertWarns(self.create({
            "PodcastName": "Show", "PodcastPosterReference": web.serve("/c.jpg", LARGE),
            "PodcastPosterReferenceType": "remote",
            "Episodes": [*({"EpisodeName": "Large", "EpisodeReference": location} for location in locations),
                         {"EpisodeName": "Small", "EpisodeReference": web.serve("/after.mp3", LARGE[:LIMIT]),
                          "EpisodePosterReference": self.media("a.jpg", LARGE)}]}),
            'Could not save or download poster image for podcast "Show"',
            *['Could not save or download episode "Large"'] * len(locations),
            'Could not save or download poster image for episode "Small"')
        self.assertEqual(self.files(), {"known.mp3": b"earlier", "after.mp3": LARGE[:LIMIT]})
        self.assertEqual(self.info(), {"PodcastName": "Show", "Episodes": [
            {"EpisodeName": "Small", "EpisodeFileSize": LIMIT, "EpisodeReference": "after.mp3",
             "EpisodeReferenceType": "local"}]})

    def test_a_reference_file_that_does_not_fit(self):
        web = self.server()
        for length, earlier in ((LIMIT - 100, {}), (LIMIT * 50, {}), (LIMIT, {"Info.plist": b"earlier"})):
            with self.subTest(length, earlier=earlier):
                self.bundle.mkdir(exist_ok=True)
                for name, content in earlier.items():
                    (self.bundle / name).write_bytes(content)
                self.assertFails(self.create({"PodcastDescription": "x" * length,
                                              "Episodes": [{"EpisodeReference": web.serve("/a.mp3", SMALL)}]}),
                                 "Could not generate bundle: Could not write Info.plist file\n",
                                 stdout=notices("Fetching 1 episodes", "Fetching episode 1...",
                                                'Downloading episode entitled "(null)" (0 bytes)...') +
                                 b"  -- 5 / 5 (100.0%)\n[N] Fetched episode 1\n")
                self.assertEqual(contents(self.bundle), {"Posters": None, "a.mp3": SMALL, **earlier})


class FullDiskTest(BundleTestCase):
    """A file system of its own, in memory, that is really full."""

    SIZE = 128 << 10

    def mount(self, *options):
        self.bundle.mkdir()
        command = ["mount", "-t", "tmpfs", "-o", ",".join((f"size={self.SIZE}", *options)), "tmpfs", self.bundle]
        if os.geteuid() != 0 or subprocess.run(command, check=False, capture_output=True).returncode != 0:
            self.skipTest("only root can mount a small disk")
        self.addCleanup(subprocess.run, ["umount", "-l", self.bundle], check=True)

    def room(self):
        """The bytes that still fit."""
        disk = os.statvfs(self.bundle)
        return disk.f_bavail * disk.f_frsize

    def show(self):
        """Downloads, copies and posters, each kind of which is tried before and after the disk is full."""
        web = self.server()
        half, most = b"h" * (self.SIZE // 2), b"m" * (self.SIZE * 3 // 4)
        return half, {"PodcastName": "Show", "Episodes": [
            {"EpisodeName": "fits", "EpisodeReference": web.serve("/fits.mp3", half)},
            {"EpisodeName": "known", "EpisodeReference": web.serve("/known.mp3", most)},
            {"EpisodeName": "unknown", "EpisodeReference": web.chunked("/unknown.mp3", [most[:9000], most[9000:]])},
            {"EpisodeName": "file", "EpisodeReference": self.write("file.mp3", most).as_uri()},
            {"EpisodeName": "copy", "EpisodeReference": self.media("copy.mp3", most)},
            {"EpisodeName": "poster", "EpisodeReference": web.serve("/small.mp3", SMALL),
             "EpisodePosterReference": self.media("large.jpg", most)}]}

    def test_what_does_not_fit_is_left_out(self):
        self.mount()
        half, show = self.show()
        self.assertWarns(self.create(show),
                         *(f'Could not save or download episode "{name}"' for name in ("known", "unknown", "file", "copy")),
                         'Could not save or download poster image for episode "poster"')
        self.assertEqual(self.files(), {"fits.mp3": half, "small.mp3": SMALL})
        self.assertEqual(self.references(), ["fits.mp3", "small.mp3"])

    def test_a_disk_that_is_full_already(self):
        self.mount()
        url = self.server().serve("/a.mp3", SMALL)
        (self.bundle / "Posters").mkdir()
        (self.bundle / "a.mp3").write_bytes(b"earlier")
        (self.bundle / "Info.plist").write_bytes(b"earlier")
        (self.bundle / "ballast").write_bytes(b"x" * self.room())
        self.assertEqual(self.room(), 0)
        result = self.create({"Episodes": [{"EpisodeReference": url}]})
        self.assertEqual((result.status, result.stderr),
                         (1, b"Could not generate bundle: Could not write Info.plist file\n"))
        self.assertIn(b'[W] Could not save or download episode "(null)"\n', result.stdout)
        (self.bundle / "ballast").unlink()
        self.assertEqual(contents(self.bundle), {"Posters": None, "a.mp3": b"earlier", "Info.plist": b"earlier"})
        self.assertWarns(self.create({"Episodes": [{"EpisodeReference": url}]}))
        self.assertEqual(self.files(), {"a.mp3": SMALL})

    def test_a_disk_that_takes_no_more_files(self):
        self.mount("nr_inodes=5")  # the root, the posters, two media and one more
        web = self.server()
        result = self.create({"Episodes": [{"EpisodeReference": web.serve(f"/{number}.mp3", SMALL)}
                                           for number in range(4)]})
        self.assertEqual((result.status, result.stderr),
                         (1, b"Could not generate bundle: Could not write Info.plist file\n"))
        self.assertEqual(contents(self.bundle), {"Posters": None, **{f"{number}.mp3": SMALL for number in range(3)}})

    def test_a_feed_and_a_reference_file(self):
        """They are written in place: what fits is there, and nobody is told."""
        self.mount()
        source = self.reference({"PodcastDescription": "x" * self.SIZE})
        for command in ("parsefeed", "createfeed"):
            with self.subTest(command):
                expected = without_publication_date(self.run_tool(command, source).stdout)
                self.assertSucceeds(self.run_tool(command, source, "-d", self.bundle / "out"), LOADING)
                content = (self.bundle / "out").read_bytes()
                self.assertEqual(len(content), self.SIZE)
                self.assertTrue(expected.startswith(without_publication_date(content)))


if __name__ == "__main__":
    unittest.main()
