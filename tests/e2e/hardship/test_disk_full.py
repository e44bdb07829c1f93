"""A disk fills up: what did not fit is told about and never half there.

The limit on the size of a file stands for the full disk: every write beyond it fails, as it does there.
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


class FullDiskTest(BundleTestCase):
    def create(self, podcast, *arguments, **options):
        return super().create(podcast, *arguments, env=counting_from_start(), preexec_fn=limited, **options)

    def assertSkips(self, location):
        """The run leaves out the episode, and nothing of it; those around it are there."""
        self.assertWarns(self.create_episodes(self.media("before.mp3", SMALL),
                                              {"EpisodeName": "Large", "EpisodeReference": location},
                                              self.server().serve("/after.mp3", SMALL)),
                         'Could not save or download episode "Large"')
        self.assertEqual(contents(self.bundle).keys(), {"Info.plist", "Posters", "before.mp3", "after.mp3"})
        self.assertEqual(self.references(), ["before.mp3", "after.mp3"])

    def test_a_download_that_does_not_fit(self):
        self.assertSkips(self.server().serve("/large.mp3", LARGE))

    def test_a_download_of_unknown_length_that_does_not_fit(self):
        self.assertSkips(self.server().chunked("/large.mp3", [LARGE[:5000], LARGE[5000:]]))

    def test_a_file_url_that_does_not_fit(self):
        self.assertSkips(self.write("large.mp3", LARGE).as_uri())

    def test_a_copy_that_does_not_fit(self):
        self.assertSkips(self.media("large.mp3", LARGE))

    def test_one_byte_too_much(self):
        self.assertSkips(self.media("large.mp3", LARGE[:LIMIT + 1]))
        self.bundle.rename(self.path("first.podcast"))
        self.assertSkips(self.server().serve("/large.mp3", LARGE[:LIMIT + 1]))

    def test_what_just_fits(self):
        content = LARGE[:LIMIT]
        self.assertWarns(self.create_episodes(self.media("a.mp3", content), self.server().serve("/b.mp3", content)))
        self.assertEqual(self.files(), {"a.mp3": content, "b.mp3": content})

    def test_the_file_of_an_earlier_run_stays(self):
        self.bundle.mkdir()
        (self.bundle / "large.mp3").write_bytes(b"earlier")
        self.assertWarns(self.create_episodes(self.server().serve("/large.mp3", LARGE)),
                         'Could not save or download episode "(null)"')
        self.assertEqual(self.files(), {"large.mp3": b"earlier"})

    def test_posters_that_do_not_fit(self):
        web = self.server()
        self.assertWarns(self.create({"PodcastName": "Show", "PodcastPosterReference": web.serve("/c.jpg", LARGE),
                                      "PodcastPosterReferenceType": "remote",
                                      "Episodes": [{"EpisodeName": "One",
                                                    "EpisodeReference": web.serve("/a.mp3", SMALL),
                                                    "EpisodePosterReference": self.media("a.jpg", LARGE)}]}),
                         'Could not save or download poster image for podcast "Show"',
                         'Could not save or download poster image for episode "One"')
        self.assertEqual(contents(self.bundle).keys(), {"Info.plist", "Posters", "a.mp3"})
        self.assertNotIn("EpisodePosterReference", self.info()["Episodes"][0])

    def assertReferenceFileDoesNotFit(self, description):
        self.assertFails(self.create({"PodcastDescription": description,
                                      "Episodes": [{"EpisodeReference": self.server().serve("/a.mp3", SMALL)}]}),
                         "Could not generate bundle: Could not write Info.plist file\n",
                         stdout=notices("Fetching 1 episodes", "Fetching episode 1...",
                                        'Downloading episode entitled "(null)" (0 bytes)...') +
                         b"  -- 5 / 5 (100.0%)\n[N] Fetched episode 1\n")

    def test_a_reference_file_that_does_not_fit(self):
        for length in (LIMIT - 100, LIMIT, LIMIT * 50):
            with self.subTest(length):
                self.assertReferenceFileDoesNotFit("x" * length)
                self.assertEqual(contents(self.bundle), {"Posters": None, "a.mp3": SMALL})

    def test_the_reference_file_of_an_earlier_run_stays(self):
        self.assertRuns(self.create({"PodcastName": "Earlier"}), "Fetching 0 episodes")
        before = (self.bundle / "Info.plist").read_bytes()
        self.assertReferenceFileDoesNotFit("x" * LIMIT)
        self.assertEqual(contents(self.bundle), {"Info.plist": before, "Posters": None, "a.mp3": SMALL})

    def test_a_signal_for_the_limit_does_not_end_the_run_either(self):
        def prepare():
            limited()
            signal.signal(signal.SIGXFSZ, signal.SIG_DFL)  # Python ignores it
        source = self.reference({"Episodes": [{"EpisodeReference": self.media("a.mp3", LARGE)}]})
        self.assertWarns(super().create(source, env=counting_from_start(), preexec_fn=prepare),
                         'Could not save or download episode "(null)"')


if __name__ == "__main__":
    unittest.main()
