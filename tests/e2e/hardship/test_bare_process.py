"""The tool is started with less than programs are used to: a small stack, no standard streams and no /dev/null."""

import os
import resource
import shutil
import subprocess
import unittest

from bundle_support import BundleTestCase
from support import element, environment, item, rss, tool

SMALL_STACK = 128 << 10


def with_a_small_stack():
    resource.setrlimit(resource.RLIMIT_STACK, (SMALL_STACK, SMALL_STACK))


class SmallStackTest(BundleTestCase):
    def run_small(self, *arguments):
        result = self.run_tool(*arguments, preexec_fn=with_a_small_stack)
        self.assertEqual((result.status, result.stderr), (0, b""))
        return result

    def setUp(self):
        super().setUp()
        web = self.server()
        web_host = web.serve("/a.mp3", b"media" * 100_000).replace("127.0.0.1", "localhost")
        self.feed = web.serve("/feed", rss(
            element("title", "Show"),
            *(item(element("title", f"E{number}"), element("enclosure", url=url),
                   element("pubDate", "Mon, 06 Jan 2020 10:00:00 EST"))
              for number, url in enumerate((web_host, self.write("b.mp3", b"local").as_uri())))))

    def test_conversions(self):
        for command in ("parsefeed", "createfeed"):
            self.assertIn(b"E1", self.run_small(command, self.feed).stdout)

    def test_bundles(self):
        self.assertWarns(self.run_small("createbundle", self.feed, "-d", self.bundle))
        self.assertEqual(self.files(), {"a.mp3": b"media" * 100_000, "b.mp3": b"local"})

    def test_copies(self):
        source = self.reference({"Episodes": [{"EpisodeReference": self.media("a.mp3", b"media" * 100_000)}]})
        self.assertWarns(self.run_small("createbundle", source, "-d", self.bundle))
        self.assertEqual(self.files(), {"a.mp3": b"media" * 100_000})


class NoStreamsTest(BundleTestCase):
    """Without /dev/null nothing can stand for a stream that is closed, and a file of the bundle must not."""

    def run_without_devices(self, closing):
        if os.geteuid() != 0 or not shutil.which("unshare"):
            self.skipTest("root is needed to take /dev away")
        source = self.reference({"Episodes": [{"EpisodeReference": self.media("a.mp3", b"media")}]})
        command = f'mount -t tmpfs none /dev || exit 77; "$@" {closing}'
        run = subprocess.run(["unshare", "-m", "sh", "-c", command, "sh", tool(), "createbundle", source, "-d", self.bundle],
                             env=environment(), stdin=subprocess.DEVNULL, capture_output=True, check=False, timeout=60)
        if run.returncode == 77 or b"unshare" in run.stderr:
            self.skipTest(run.stderr.decode())
        return run

    def test_a_stream_that_is_closed(self):
        for closing, message in (("<&- >&- 2>&-", b""), ("2>&-", b""),
                                 ("<&-", b"A standard stream is closed, and /dev/null cannot be opened.\n"),
                                 (">&-", b"A standard stream is closed, and /dev/null cannot be opened.\n")):
            with self.subTest(closing):
                run = self.run_without_devices(closing)
                self.assertEqual((run.returncode, run.stdout, run.stderr), (1, b"", message))
                self.assertFalse(self.bundle.exists())

    def test_streams_that_are_open(self):
        self.assertEqual(self.run_without_devices("").returncode, 0)
        self.assertEqual(self.files(), {"a.mp3": b"media"})


if __name__ == "__main__":
    unittest.main()
