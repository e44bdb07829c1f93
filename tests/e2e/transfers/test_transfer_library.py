"""The library for http and https is loaded when a URL first asks for it, and nothing else waits for it or needs it."""

import os
import unittest
from pathlib import Path

from bare_root import BareRootTestCase
from support import ToolTestCase, is_emulated, rss

FILE = "libcurl.so.4"


def other_library():
    """Some shared library that has none of the functions."""
    with open("/proc/self/maps", encoding="utf-8") as maps:
        return next(Path(line.split()[-1]) for line in maps if "/libc.so" in line)


class TransferLibraryTest(ToolTestCase):
    """The loader finds a file of the test's own where it looks for the library first."""

    def setUp(self):
        super().setUp()
        self.web = self.server()
        self.web.serve("/feed.xml", rss("<title>Night Walks</title>"))
        self.env = {"LD_LIBRARY_PATH": str(self.directory)}

    def test_local_files_need_no_library(self):
        self.write(FILE, "no library")
        reference = self.reference({"PodcastName": "Night Walks"})
        feed = self.feed(rss("<title>Night Walks</title>"))
        for source in (reference, feed):
            with self.subTest(source):
                self.assertEqual(self.parsefeed(source, env=self.env), {"PodcastName": "Night Walks"})

    def test_a_file_that_is_no_library(self):
        self.write(FILE, "no library")
        result = self.run_tool("parsefeed", self.web.url("/feed.xml"), env=self.env)
        self.assertLoadFails(result, rf"{self.path(FILE)}: [^;]+")

    def test_a_library_without_the_functions(self):
        if is_emulated():
            self.skipTest("the libraries of this process are none of the tool's processor")
        os.symlink(other_library(), self.path(FILE))
        result = self.run_tool("parsefeed", self.web.url("/feed.xml"), env=self.env)
        self.assertLoadFails(result, r".*undefined symbol: curl_global_init_mem")

    def test_remote_media_are_skipped_without_the_library(self):
        self.write(FILE, "no library")
        self.web.serve("/a.mp3", b"sound")
        source = self.reference({"Episodes": [{"EpisodeName": "A", "EpisodeReference": self.web.url("/a.mp3")}]})
        result = self.run_tool("createbundle", source, "-d", self.path("a.podcast"), env=self.env)
        self.assertSucceeds(result)
        self.assertIn(b'[W] Could not save or download episode "A"\n', result.stdout)
        self.assertEqual(self.web.requests, [])


class MissingLibraryTest(BareRootTestCase):
    def test_the_packages_that_bring_it_are_named(self):
        result = self.in_root("parsefeed", "http://127.0.0.1:9/feed.xml")
        self.assertFails(result, (
            f"Could not load source: {FILE}: cannot open shared object file: No such file or directory; "
            "http and https need it: install the package libcurl4 (Debian, Ubuntu) or libcurl (Fedora)"))


if __name__ == "__main__":
    unittest.main()
