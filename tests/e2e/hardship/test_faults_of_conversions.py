"""Calls of the system fail, one after another, while a podcast is read and written; a table tells what follows.

In each scenario call 1, 2, 3, ... of a run fails until a run comes through without a failure: the disk is full,
the device breaks, something is forbidden or there are too many open files. Whatever it is, there is no crash,
nothing is left open, and files that were there are as they were.

By default each call fails with one of the errors, in turn; a long run tries them all.
"""

import os
import plistlib
import unittest

from bundle_support import contents
from fault_support import INFO, Tally, show, show_feed
from fault_sweep import REFERENCE, STREAMS, Sweep, table
from support import LOADING, soaking, without_publication_date

TALLY = Tally("Runs with a failing call of the system")


def tearDownModule():
    TALLY.show()


FEED = """
    stat                  source     done
    open fstat read       source     Could not load source: {error}
    fadvise close         source     done
"""

# The bundle exists and its Info.plist is a reference file, before that is read.
BUNDLE = """
    stat                  bundle     Could not initialize podcast source with string "{source}".\\n
    stat                  source#1   Could not initialize podcast source with string "{source}".\\n
    stat                  source#2   done
    open fstat read       source     Could not initialize podcast source with string "{source}".\\n
    fadvise close         source     done
    getcwd                -          Could not load source: {error}
"""

# A failed read ends the input; all had been read by the second.
INPUT = """
    read                  <stdin>#1  "(null)" is not a valid podcast source.\\n
    read                  <stdin>#2  done
"""

# Failures to write an output are not told. A reference file is one piece; a feed's line break is apart.
REFERENCE_OUTPUT = """
    create                output     earlier output
    write                 output     empty output
    close                 output     done
"""
FEED_OUTPUT = """
    create                output#1   earlier output and a line break
    write                 output#1   a line break
    create write          output#2   output without line break
    close                 output     done
"""


class ConversionTest(Sweep):
    """parsefeed and createfeed: from each kind of source, to standard output and to a file."""

    tally = TALLY
    every_error = soaking()

    def setUp(self):
        super().setUp()
        self.output = None
        self.roles = {}

    def subject(self, run, call):
        return self.roles.get(call.path, call.path)

    def sweep(self, scenario, command, source, rows, roles, stdin=os.devnull, output=None):
        self.source, self.roles = source, dict(roles)
        arguments = [command, source] if source != "-i" else [command, "-i"]
        if output:
            (self.root / output).write_bytes(b"earlier")
            self.roles[output] = "output"
            arguments += ["-d", output]
        server = self.serve_runs(*arguments)
        whole = server.run(stdin=stdin)
        self.assertOrderly(whole)
        self.assertEqual(whole.status, 0, whole)
        result = (self.root / output).read_bytes() if output else whole.stdout
        rows = table(STREAMS, rows)
        for run in self.runs(server, scenario, stdin=stdin):
            with self.subTest(str(run)):
                told = self.consequence(rows, run, self.subject(run, run.faults[0].call)) if run.faults else "done"
                self.judge(run, told, result, LOADING if output else b"", output)

    def judge(self, run, told, result, progress, output):
        cut = without_publication_date
        outputs = {"earlier output": b"earlier", "empty output": b"", "a line break": b"\n",
                   "earlier output and a line break": b"earlier\n", "output without line break": result[:-1],
                   "done": result, "unsaid": result}
        if told not in outputs:
            return self.assertNothingHappened(run, self.message(told, run), progress if self.is_late(told) else b"")
        self.assertEqual((run.status, run.stderr), (0, b""), run)
        if output:
            found = contents(self.root)
            self.assertEqual(cut(found.pop(output)), cut(outputs[told]), run)
            self.assertEqual(found, {path: content for path, content in self.before.items() if path != output}, run)
            if told != "unsaid":
                self.assertEqual(run.stdout, progress, run)
        else:
            self.assertEqual(contents(self.root), self.before, run)
            if told == "unsaid":
                # What was asked to be written at once is missing; what was not is there.
                self.assertIn(cut(run.stdout), (b"", b"\n", cut(result[:-1])), run)
            else:
                self.assertEqual(cut(run.stdout), cut(result), run)
        return None

    def feed_url(self):
        (self.root / "feed.xml").write_bytes(show_feed(lambda name: f"media/{name}"))
        return (self.root / "feed.xml").as_uri()

    def reference_file(self):
        (self.root / "show.plist").write_bytes(plistlib.dumps(show(lambda name: f"media/{name}")))
        return "show.plist"

    def bundle_source(self):
        self.bundle.mkdir(parents=True)
        (self.bundle / INFO).write_bytes(plistlib.dumps(show(lambda name: name)))
        return os.path.relpath(self.bundle, self.root)

    def test_a_feed_to_standard_output(self):
        self.sweep("feed to a reference file", "parsefeed", self.feed_url(), FEED, {"feed.xml": "source"})

    def test_a_reference_file_to_a_file(self):
        self.sweep("reference file to a reference file", "parsefeed", self.reference_file(),
                   REFERENCE + REFERENCE_OUTPUT, {"show.plist": "source"}, output="out.plist")

    def test_a_reference_file_to_a_feed_in_a_file(self):
        self.sweep("reference file to a feed", "createfeed", self.reference_file(), REFERENCE + FEED_OUTPUT,
                   {"show.plist": "source"}, output="out.xml")

    def test_a_feed_to_a_feed_on_standard_output(self):
        self.sweep("feed to a feed", "createfeed", self.feed_url(), FEED, {"feed.xml": "source"})

    def test_a_bundle(self):
        source = self.bundle_source()
        self.sweep("bundle to a reference file", "parsefeed", source, BUNDLE,
                   {source: "bundle", f"{source}/{INFO}": "source"})

    def test_standard_input(self):
        path = self.root / self.reference_file()
        self.sweep("standard input to a reference file", "parsefeed", "-i", INPUT, {}, stdin=path)


if __name__ == "__main__":
    unittest.main()
