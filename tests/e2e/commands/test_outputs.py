"""parsefeed and createfeed write into whatever a shell connects them with; who reads it gets the whole result.

What stands at the path of "-d" is in test_special_outputs.py. The tool does not notice when its output cannot be
written, but a run that fails leaves the output as it was.
"""

import os
import socket
import subprocess
import unittest

from support import LOADING, ToolTestCase, checked, start, without_publication_date

COMMANDS = ("parsefeed", "createfeed")


class OutputTestCase(ToolTestCase):
    def setUp(self):
        super().setUp()
        self.source = self.reference({"PodcastName": "Night Walks", "Episodes": [{"EpisodeName": "One"}]})

    def output(self, command="createfeed"):
        """What the command writes into a pipe, without the moment of generation."""
        result = self.run_tool(command, self.source)
        self.assertSucceeds(result)
        return without_publication_date(result.stdout)


class OutputTest(OutputTestCase):
    def test_only_a_feed_ends_with_an_added_line_break(self):
        self.assertTrue(self.output("createfeed").endswith(b"\n</rss>\n\n"))
        self.assertTrue(self.output("parsefeed").endswith(b"\n</plist>\n"))

    def test_a_file_holds_what_standard_output_would(self):
        for command in COMMANDS:
            with self.subTest(command):
                self.assertSucceeds(self.run_tool(command, self.source, "-d", "out"), LOADING)
                self.assertEqual(without_publication_date(self.path("out").read_bytes()), self.output(command))
                self.assertEqual(set(os.listdir(self.directory)), {"reference.plist", "out"})

    def test_the_shell_s_append_appends(self):
        self.write("log", b"before\n")
        for _ in range(2):
            with open(self.path("log"), "ab") as log:
                self.assertEqual(self.run_tool("createfeed", self.source, stdout=log).status, 0)
        before, *appended = self.path("log").read_bytes().split(b"<?xml")
        self.assertEqual((before, [without_publication_date(b"<?xml" + each) for each in appended]),
                         (b"before\n", [self.output(), self.output()]))

    def test_standard_output_that_is_a_file_is_written_where_it_stands(self):
        with open(self.path("log"), "wb") as log:
            log.write(b"before\n")
            log.flush()
            self.assertEqual(self.run_tool("createfeed", self.source, stdout=log).status, 0)
            log.write(b"after\n")
        self.assertEqual(without_publication_date(self.path("log").read_bytes()),
                         b"before\n" + self.output() + b"after\n")

    def test_a_socket_receives_the_feed(self):
        ours, theirs = socket.socketpair()
        with ours, theirs:
            process = start("createfeed", self.source, stdout=theirs, stderr=subprocess.PIPE)
            theirs.close()
            with ours.makefile("rb") as stream:
                received = stream.read()
            _, stderr = process.communicate(timeout=30)
        self.assertEqual(checked((), process.returncode, b"", stderr), (0, b"", b""))
        self.assertEqual(without_publication_date(received), self.output())

    def fifo_reader(self):
        """A process that reads the FIFO to its first end."""
        reader = subprocess.Popen(["cat", self.path("fifo")], stdout=subprocess.PIPE)
        self.addCleanup(lambda: (reader.kill(), reader.wait(), reader.stdout.close()))
        return reader

    def test_a_fifo_s_reader_may_leave_at_the_first_end(self):
        os.mkfifo(self.path("fifo"))
        expected = self.output()
        processors = os.sched_getaffinity(0)
        self.addCleanup(os.sched_setaffinity, 0, processors)
        os.sched_setaffinity(0, {min(processors)})
        for turn in range(10):  # on one processor a reader that wakes up reads before a nice tool goes on
            with self.subTest(turn):
                reader = self.fifo_reader()
                result = self.run_tool("createfeed", self.source, "-d", "fifo", timeout=10, prefix=("nice", "-n", "19"))
                self.assertSucceeds(result, LOADING)
                self.assertEqual(without_publication_date(reader.communicate(timeout=10)[0]), expected)


class UnwrittenTest(OutputTestCase):
    """An output that takes nothing is not noticed."""

    def test_a_closed_pipe(self):
        for command in COMMANDS:
            with self.subTest(command):
                read_end, write_end = os.pipe()
                os.close(read_end)
                with open(write_end, "wb") as stdout:
                    result = self.run_tool(command, self.source, stdout=stdout)
                self.assertEqual((result.status, result.stderr), (0, b""))

    def test_a_reader_that_leaves_early(self):
        source = self.reference({"PodcastDescription": "d" * 3_000_000})
        process = start("createfeed", source, stdout=subprocess.PIPE, stderr=subprocess.PIPE)
        process.stdout.read(10)
        process.stdout.close()
        stderr = process.stderr.read()
        process.stderr.close()
        self.assertEqual(checked((), process.wait(timeout=60), b"", stderr), (0, b"", b""))

    def test_a_full_device(self):
        with open("/dev/full", "wb") as full:
            self.assertEqual(self.run_tool("createfeed", self.source, stdout=full).status, 0)

    def test_no_standard_output_at_all(self):
        before = self.source.read_bytes()
        self.assertEqual(self.run_tool("createfeed", self.source, closed=(0, 1)).status, 0)
        self.assertEqual(self.source.read_bytes(), before)

    def test_an_empty_path(self):
        for command in COMMANDS:
            with self.subTest(command):
                self.assertSucceeds(self.run_tool(command, self.source, "-d", ""), LOADING)


class FailedRunTest(OutputTestCase):
    def test_it_leaves_the_output_alone(self):
        web = self.server()
        self.write("out", b"old")
        for arguments in (("parsefeed", self.feed(b"<feed/>")), ("createfeed", self.feed(b"<rss><channel></rss>")),
                          ("createfeed", web.truncated("/short", b"<rss/>", 5)),
                          ("createfeed", self.source, "-f", "opml")):
            for output, content in (("out", b"old"), ("new", None)):
                with self.subTest(arguments, output=output):
                    result = self.run_tool(*arguments, "-d", output)
                    self.assertEqual((result.status, result.stdout), (1, LOADING))
                    path = self.path(output)
                    self.assertEqual(path.read_bytes() if path.exists() else None, content)


if __name__ == "__main__":
    unittest.main()
