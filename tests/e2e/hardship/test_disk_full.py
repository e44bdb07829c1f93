"""A disk fills up: what did not fit is told about and never half there.

The limit on the size of a file stands for the full disk: every write beyond it fails, as it does there. This shows on
every system what test_faults_of_bundles.py shows for each single call.
"""

import resource
import signal
import unittest

from bundle_support import BundleTestCase, contents, notices
from support import counting_from_start

LIMIT = 8192
LARGE = b"0123456789abcdef" * 1024
SMALL = b"small"


def limited():
    """For the tool, before it starts: no file may become larger than the limit."""
    resource.setrlimit(resource.RLIMIT_FSIZE, (LIMIT, LIMIT))
    signal.signal(signal.SIGXFSZ, signal.SIG_DFL)  # Python ignores the signal for it


class FullDiskTest(BundleTestCase):
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


if __name__ == "__main__":
    unittest.main()
