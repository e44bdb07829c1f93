"""Whatever stands at the path of parsefeed's or createfeed's output: it is written, or left as it was.

Nothing is waited for but the reader of a FIFO.
"""

import os
import plistlib
import signal
import subprocess
import time
import unittest

from bundle_support import contents
from special_files import (PODCAST, SpecialFileTestCase, below_a_file, directory, link, link_to_file, loop, nothing,
                           read_only, regular, unix_socket, unreachable)
from support import LOADING, rss, start, without_publication_date

# What is written by parsefeed and createfeed: the kind, and whether the result is there afterwards (behind a link
# where it is one). The tool does not notice, by its rules, when it is not; but it never harms anything else.

OUTPUTS = (
    ("nothing", nothing, True),
    ("a file", regular, True),
    ("a link to a file", link_to_file, True),
    ("a dangling link", link("target"), True),
    ("a directory", directory, False),
    ("a socket", unix_socket, False),
    ("/dev/full", link("/dev/full"), False),
    ("/dev/null", link("/dev/null"), False),
    ("a loop of links", loop, False),
    ("a file that may only be read", read_only, False),
    ("a file in a directory that may not be entered", unreachable, False),
    ("a path through a file", below_a_file, False),
    ("a path through a directory that is not there", lambda path, content: path.parent.rmdir(), False),
)


class OutputTest(SpecialFileTestCase):
    def setUp(self):
        super().setUp()
        self.source = self.reference(PODCAST)

    def snapshot(self):
        """What is at the place, with the rights that it takes to look."""
        if not self.place.is_dir():
            return self.place.exists()
        mode = self.place.stat().st_mode
        self.place.chmod(0o755)
        found = contents(self.place)
        self.place.chmod(mode & 0o777)
        return found

    def assertOutputs(self, command, expected, comparable=lambda content: content):
        for name, kind, is_written in OUTPUTS:
            with self.subTest(name):
                path = self.make(kind, "out", b"x" * 100_000)
                before = self.snapshot()
                self.assertSucceeds(self.run_tool(command, self.source, "-d", path), LOADING)
                if is_written:
                    self.assertEqual(comparable(path.read_bytes()), comparable(expected))
                else:
                    self.assertEqual(self.snapshot(), before)

    def test_of_parsefeed(self):
        self.assertOutputs("parsefeed", self.run_tool("parsefeed", self.source).stdout)

    def test_of_createfeed(self):
        self.assertOutputs("createfeed", self.run_tool("createfeed", self.source).stdout, without_publication_date)

    def waiting(self):
        """A run whose output is a FIFO that nobody reads yet."""
        os.mkfifo(self.path("fifo"))
        process = start("parsefeed", self.source, "-d", self.path("fifo"), stdout=subprocess.DEVNULL,
                        preexec_fn=lambda: signal.signal(signal.SIGINT, signal.SIG_DFL))
        self.addCleanup(lambda: (process.kill(), process.wait()))
        time.sleep(0.3)
        self.assertIsNone(process.poll())
        return process

    def test_a_fifo_is_written_once_its_reader_comes(self):
        process = self.waiting()
        self.assertEqual(plistlib.loads(self.path("fifo").read_bytes()), PODCAST)
        self.assertEqual(process.wait(timeout=30), 0)

    def test_a_fifo_whose_reader_leaves_early(self):
        """Before, amid and behind a feed that a FIFO holds whole, and one that it does not hold."""
        os.mkfifo(self.path("fifo"))
        for length in (10, 1_000_000):
            source = self.reference({"PodcastDescription": "x" * length})
            for command in ("parsefeed", "createfeed"):
                for taken in (0, 1, 200):
                    with self.subTest(command, length=length, taken=taken):
                        process = start(command, source, "-d", self.path("fifo"), stdout=subprocess.PIPE,
                                        stderr=subprocess.PIPE)
                        self.addCleanup(process.kill)
                        with open(self.path("fifo"), "rb", buffering=0) as reader:
                            reader.read(taken)
                        self.assertEqual(process.communicate(timeout=30), (LOADING, b""))
                        self.assertEqual(process.returncode, 0)
                        self.rows += 1

    def test_a_fifo_takes_a_feed_and_its_line_break(self):
        os.mkfifo(self.path("fifo"))
        expected = without_publication_date(self.run_tool("createfeed", self.source).stdout)
        for turn in range(20):
            with self.subTest(turn):
                process = start("createfeed", self.source, "-d", self.path("fifo"), stdout=subprocess.DEVNULL)
                self.addCleanup(process.kill)
                self.assertEqual(without_publication_date(self.path("fifo").read_bytes()), expected)
                self.assertEqual(process.wait(timeout=30), 0)

    def test_a_fifo_without_reader_is_waited_for_until_a_signal(self):
        process = self.waiting()
        process.send_signal(signal.SIGINT)
        self.assertEqual(process.wait(timeout=30), -signal.SIGINT)

    def test_the_source_itself(self):
        """Each source, and what a second run of the command reads there afterwards."""
        feed = rss("<title>Night Walks</title>")
        bundle = self.path("own.podcast")
        bundle.mkdir()
        for command, source, output, content in (
                ("parsefeed", "own.plist", "own.plist", plistlib.dumps(PODCAST)),
                ("parsefeed", self.path("feed.xml").as_uri(), "feed.xml", feed),
                ("parsefeed", "own.podcast", "own.podcast/Info.plist", plistlib.dumps(PODCAST)),
                ("createfeed", "own.plist", "own.plist", plistlib.dumps(PODCAST)),
                ("createfeed", self.path("feed.xml").as_uri(), "feed.xml", feed),
                ("createfeed", "own.podcast", "own.podcast/Info.plist", plistlib.dumps(PODCAST))):
            with self.subTest(command, source=source):
                self.write(output, content)
                expected = self.run_tool(command, source)
                self.assertSucceeds(expected)
                self.assertSucceeds(self.run_tool(command, source, "-d", output), LOADING)
                self.assertEqual(without_publication_date(self.path(output).read_bytes()),
                                 without_publication_date(expected.stdout))
                self.rows += 1


if __name__ == "__main__":
    unittest.main()
