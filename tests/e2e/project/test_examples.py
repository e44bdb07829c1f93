"""The example show is what it says: sizes are true, files exist, both forms describe one podcast."""

import os
import plistlib
import subprocess
import unittest
import wave
import xml.etree.ElementTree as ElementTree
from pathlib import Path
from urllib.parse import unquote

SHOW = Path(__file__).resolve().parents[3] / "examples" / "show"
# Where the feed says that the folder examples/ is served.
SITE = "http://127.0.0.1:8000/show/"
NAMESPACES = {
    "dc": "http://purl.org/dc/elements/1.1/",
    "orvane": "https://orvane.example/ns/podcast-1.0",
    "qel": "https://qel.example/ns/1.0",
}


def local_path(url):
    """The path below the show's folder that the feed's URL names."""
    if not url.startswith(SITE):
        raise AssertionError(f"{url} does not begin with {SITE}")
    return unquote(url[len(SITE) :])


class ExamplesTest(unittest.TestCase):
    def setUp(self):
        self.items = ElementTree.parse(SHOW / "feed.xml").findall("channel/item")
        self.reference = plistlib.loads((SHOW / "reference.plist").read_bytes())
        self.assertEqual(len(self.items), 4)
        self.assertEqual(len(self.reference["Episodes"]), 4)

    def test_enclosures_name_real_sounds_of_the_stated_size(self):
        for item in self.items:
            enclosure = item.find("enclosure")
            with self.subTest(enclosure.get("url")):
                path = SHOW / local_path(enclosure.get("url"))
                self.assertEqual(int(enclosure.get("length")), path.stat().st_size)
                with wave.open(str(path)) as sound:
                    self.assertGreater(sound.getnframes() / sound.getframerate(), 1)

    def test_feed_and_reference_file_name_the_same_files(self):
        for item, episode in zip(self.items, self.reference["Episodes"]):
            with self.subTest(episode["EpisodeName"]):
                enclosure = item.find("enclosure")
                self.assertEqual(episode["EpisodeReference"], local_path(enclosure.get("url")))
                self.assertEqual(episode["EpisodeFileSize"], int(enclosure.get("length")))
                poster = item.find("orvane:image", NAMESPACES)
                self.assertEqual(
                    episode.get("EpisodePosterReference"),
                    None if poster is None else local_path(poster.get("href")),
                )

    def test_posters_exist(self):
        posters = [self.reference["PodcastPosterReference"]]
        posters += [
            episode["EpisodePosterReference"]
            for episode in self.reference["Episodes"]
            if "EpisodePosterReference" in episode
        ]
        self.assertEqual(len(posters), 4)
        for poster in posters:
            with self.subTest(poster):
                self.assertEqual((SHOW / poster).read_bytes()[:8], b"\x89PNG\r\n\x1a\n")

    def test_the_tool_reads_the_same_podcast_from_both(self):
        run = subprocess.run(
            [os.environ["QEL"], "parsefeed", (SHOW / "feed.xml").as_uri()],
            capture_output=True,
            timeout=60,
        )
        self.assertEqual((run.returncode, run.stderr), (0, b""))
        expected = dict(self.reference)
        # What a feed does not tell, or tells in its own way.
        for key in ("PodcastReference", "PodcastReferenceType"):
            del expected[key]
        for key in ("AllowedPosterTypes", "AllowedEpisodeTypes"):
            del expected[key]
        from_feed = plistlib.loads(run.stdout)
        for podcast in (expected, from_feed):
            podcast.pop("PodcastPosterReference")
            podcast.pop("PodcastPosterReferenceType")
            for episode in podcast["Episodes"]:
                for key in ("EpisodeReference", "EpisodePosterReference"):
                    episode.pop(key, None)
                    episode.pop(key + "Type", None)
        self.assertEqual(from_feed, expected)


if __name__ == "__main__":
    unittest.main()
