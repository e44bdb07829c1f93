"""A published feed in feed readers: each, on its own ways to a web server, sees the episodes that the show has.

The readers are other people's, in four languages; the programs in tests/readers write down what they see.
scripts/setup --checks installs them, and a test whose reader is missing is skipped.
"""

import calendar
import contextlib
import json
import plistlib
import shutil
import sqlite3
import subprocess
import sys
import unittest
import urllib.request
from pathlib import Path

from support import ToolTestCase, environment

ROOT = Path(__file__).resolve().parents[3]
READERS = ROOT / "tests" / "readers"
BUILT = ROOT / "build" / "readers"
MODULES = BUILT / "node_modules"  # scripts/setup has npm install them there
GO_LIBRARIES = "/usr/share/gocode"  # where the distribution has them

sys.path.append(str(ROOT / "bench"))
import media_server  # noqa: E402: it stands there


def interpreter():
    """A Python that has feedparser; distributions install it for their own one only."""
    for path in (sys.executable, "/usr/bin/python3"):
        if subprocess.run([path, "-c", "import feedparser"], capture_output=True, check=False).returncode == 0:
            return path
    return None


@unittest.skipUnless(media_server.program(), "nginx is not installed; scripts/setup --checks installs it")
class ReadersTest(ToolTestCase):
    def setUp(self):
        super().setUp()
        site = self.path("site")
        bundle = site / "lantern.podcast"
        site.mkdir()
        example = ROOT / "examples" / "show"
        self.assertEqual(self.run_tool("createbundle", "reference.plist", "-d", bundle, cwd=example).status, 0)
        served = contextlib.ExitStack()
        self.addCleanup(served.close)
        self.base = served.enter_context(media_server.serving(site))
        self.feed = self.base + "/feed.xml"
        self.assertSucceeds(self.run_tool(
            "--base", f"{self.base}/lantern.podcast", "--link", self.base, "--language", "en", "--self", self.feed,
            bundle, site / "feed.xml", program="qel-publish"))

        info = plistlib.loads((bundle / "Info.plist").read_bytes())
        self.poster = self.url_of(info["PodcastPosterReference"])
        self.episodes = [{
            "guid": episode["EpisodeUUID"],
            "date": calendar.timegm(episode["EpisodeDate"].timetuple()),
            "enclosure": self.url_of(episode["EpisodeReference"]),
            "length": (bundle / episode["EpisodeReference"]).stat().st_size,
            "type": "audio/wav",
            "poster": episode.get("EpisodePosterReference") and self.url_of(episode["EpisodePosterReference"]),
        } for episode in info["Episodes"]]
        self.assertEqual(len(self.episodes), 4)

    def url_of(self, path):
        return f"{self.base}/lantern.podcast/{path.replace(' ', '%20')}"

    def output_of(self, *command, **changes):
        finished = subprocess.run(command, env=environment({"HOME": str(self.directory), **changes}), timeout=300,
                                  cwd=self.directory, stdin=subprocess.DEVNULL, capture_output=True, check=False)
        self.assertEqual(finished.returncode, 0, finished.stderr)
        return finished.stdout

    def assertSees(self, *command, left_out=()):
        """The command sees everything but what its reader keeps no place for."""
        expected = [{key: value for key, value in episode.items() if key not in left_out} for episode in self.episodes]
        self.assertEqual(json.loads(self.output_of(*command)), {"poster": self.poster, "episodes": expected})

    def test_what_the_feed_names_is_there(self):
        for episode in self.episodes:
            with urllib.request.urlopen(episode["enclosure"], timeout=60) as answer:
                self.assertEqual(len(answer.read()), episode["length"])
        for poster in filter(None, [self.poster, *(episode["poster"] for episode in self.episodes)]):
            with urllib.request.urlopen(poster, timeout=60) as answer:
                self.assertTrue(answer.read().startswith(b"\x89PNG"))

    def test_feedparser(self):
        python = interpreter()
        if not python:
            self.skipTest("feedparser is not installed; scripts/setup --checks installs it")
        self.assertSees(python, "-B", READERS / "with_feedparser.py", self.feed)

    def test_gofeed(self):
        if not shutil.which("go") or not Path(GO_LIBRARIES, "src/github.com/mmcdole/gofeed").exists():
            self.skipTest("gofeed is not installed; scripts/setup --checks installs it")
        BUILT.mkdir(parents=True, exist_ok=True)
        program = BUILT / "with_gofeed"
        self.output_of("go", "build", "-o", program, READERS / "with_gofeed.go", GO111MODULE="off", GOFLAGS="",
                       GOPATH=GO_LIBRARIES, GOCACHE=str(BUILT / "go"))
        self.assertSees(program, self.feed)

    def require_module(self, name):
        if not shutil.which("node") or not (MODULES / name).exists():
            self.skipTest(f"{name} is not installed; scripts/setup --checks installs it, where there is npm")

    def test_feedsmith(self):
        self.require_module("feedsmith")
        # It knows the elements of certain namespaces only.
        self.assertSees("node", READERS / "with_feedsmith.cjs", MODULES, self.feed, left_out={"poster"})

    def test_rss_parser(self):
        self.require_module("rss-parser")
        self.assertSees("node", READERS / "with_rss-parser.cjs", MODULES, self.feed)

    def test_newsboat(self):
        if not shutil.which("newsboat"):
            self.skipTest("newsboat is not installed; scripts/setup --checks installs it")
        urls, cache, settings = self.write("urls", self.feed + "\n"), self.path("cache.db"), self.write("config", "")
        self.output_of("newsboat", "-C", settings, "-u", urls, "-c", cache, "-x", "reload")
        with contextlib.closing(sqlite3.connect(cache)) as database:
            # It keeps neither lengths nor posters.
            seen = database.execute("SELECT guid, pubDate, enclosure_url, enclosure_type FROM rss_item").fetchall()
        self.assertEqual(sorted(seen), sorted((episode["guid"], episode["date"], episode["enclosure"], episode["type"])
                                              for episode in self.episodes))


if __name__ == "__main__":
    unittest.main()
