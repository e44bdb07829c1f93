"""Calls of the system fail, one after another, and every failure has the consequence that a table tells.

In each scenario call 1, 2, 3, ... of a run fails until a run comes through without a failure: the disk is
full, the device breaks, something is forbidden or there are too many open files. A table says for each kind
of call and each file what the run then says and does. Whatever it is, there is no crash, nothing is left
open, no file has its final name before it is whole, files that were there are as they were, and hidden
files are gone unless their removal is what failed.

By default each call fails with one of the errors, in turn; a long run tries them all.
"""

import errno
import fnmatch
import itertools
import os
import plistlib
import unittest

from bundle_support import contents
from fault_support import (COVER, ERRORS, FACE, INFO, ITEMS, LEFTOVER, NAMES, NO_INFO, ORIGINALS, FaultTestCase,
                           Tally, show, show_feed)
from support import LOADING, soaking, without_publication_date

TALLY = Tally("Runs with a failing call of the system")



def tearDownModule():
    TALLY.show()


def table(*parts):
    """Rows of a table in text: kinds of calls, the file that they concern, the consequence, with at least
    two spaces between them. "#2" behind a file means the second call of the kind for it."""
    rows = []
    for line in "\n".join(parts).splitlines():
        cells = [cell.strip() for cell in line.split("  ") if cell.strip()]
        if cells:
            kinds, subjects, consequence = cells
            rows.append((kinds.split(), subjects, consequence))
    return rows


# What is not told apart: the C library's care for the standard streams. What is lost of the progress lines or
# of an output is lost without a word, as everywhere.
STREAMS = """
    ioctl          <std*>            done
    write          <stdout>          unsaid
"""

FEED = """
    stat                  source     done
    open fstat read       source     Could not load source: {error}
    fadvise close         source     done
"""

REFERENCE = """
    stat                  source#1   Could not initialize podcast source with string "{source}".\\n
    stat                  source#2   done
    open fstat read       source     Could not initialize podcast source with string "{source}".\\n
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

# A directory that cannot be looked at is made, and one that exists is accepted then. Leftovers of earlier runs
# are removed where that can be done. "Posters" may be a way out of the bundle as long as that is not known.
DIRECTORIES = """
    stat                                    parent       done
    mkdir                                   parent       Could not generate bundle: Could not create bundle: {error}\\n
    stat                                    bundle       done
    mkdir                                   bundle       Could not generate bundle: Could not create bundle: {error}\\n
    opendir fstat fcntl getdents close      bundle       leftovers may stay
    lstat reopen flock unlink close         leftover     leftovers may stay
    stat                                    Posters      done
    mkdir                                   Posters      without posters
    opendir fstat fcntl getdents close      Posters      leftovers may stay
    lstat                                   Posters#1    without posters
    lstat                                   Posters#2    no path for the cover
    lstat                                   Posters#3    no path for the face
"""

# An original, the hidden file that is made of it, and its final name. A hidden file that is not surely ours is
# left for another one; copying inside of the kernel is only tried.
FETCHING = """
    stat                                    original     done
    open fstat read                         original     item lost
    close                                   original     done
    lstat                                   final        done
    create                                  hidden       item lost
    flock fstat lstat                       hidden       done
    copy_file_range                         hidden       done
    write dup                               hidden       item lost
    close                                   hidden#1     item lost
    close                                   hidden#2     done
    rename                                  final        item lost
"""


class Sweep(FaultTestCase):
    """Makes the calls of a scenario fail one by one."""

    def errors(self, number):
        return ERRORS if soaking() else (ERRORS[number % len(ERRORS)],)

    def runs(self, server, scenario, plan="any@{number}={error}", start=1, **options):
        """The runs in which call 1, 2, 3, ... of the plan's first kind fails, until there is none to fail;
        then the run in which none failed. The root directory is as before for each."""
        kind = plan.partition("@")[0]
        for number in itertools.count(start):
            for error in self.errors(number):
                self.restore()
                run = server.run(plan.format(number=number, error=error), **options)
                self.assertOrderly(run)
                if run.faults:
                    TALLY.add(scenario)
                yield run
            if not any(kind in ("any", fault.call.kind) for fault in run.faults):
                return

    def consequence(self, rows, run, subject):
        """The consequence that the table's one row for the run's fault tells."""
        fault = run.faults[0]
        number = sum(call.kind == fault.call.kind and self.subject(run, call) == subject
                     for call in run.calls[:run.calls.index(fault.call) + 1])
        found = {consequence for kinds, pattern, consequence in rows if fault.call.kind in kinds
                 and fnmatch.fnmatchcase(subject if "#" not in pattern else f"{subject}#{number}", pattern)}
        self.assertEqual(len(found), 1, f"the table has no row, or more than one, for call {number} of {subject}: {run}")
        return found.pop()

    def subject(self, run, call):
        """What a call concerns, in the words of the tables."""
        raise NotImplementedError

    def message(self, text, run):
        error = os.strerror(getattr(errno, run.faults[0].error))
        return text.replace("\\n", "\n").format(error=error, source=self.source)

    @staticmethod
    def is_late(text):
        """Whether a message comes after the notice that the source is loaded."""
        return text.startswith(("Could not load", "Could not generate"))


class ConversionTest(Sweep):
    """parsefeed and createfeed: from each kind of source, to standard output and to a file."""

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
                told = "done" if not run.faults else self.consequence(rows, run, self.subject(run, run.faults[0].call))
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
        self.sweep("reference file to a reference file", "parsefeed", self.reference_file(), REFERENCE + REFERENCE_OUTPUT,
                   {"show.plist": "source"}, output="out.plist")

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


class BundleFaultTest(Sweep):
    """createbundle, of which most of a run's calls are about what it makes."""

    def setUp(self):
        super().setUp()
        self.originals()
        self.roles = {"sub": "parent", self.in_bundle("."): "bundle", self.in_bundle("Posters"): "Posters",
                      "show.plist": "source"}
        self.source = "show.plist"

    def reference_file(self, locate):
        (self.root / self.source).write_bytes(plistlib.dumps(show(locate)))

    def item_of(self, run, call):
        """The item that the call is about."""
        name = os.path.basename(call.path)
        if call.path.startswith("media/"):
            return name
        if name.startswith(".qel-"):
            made = dict.fromkeys(known.path for known in run.calls if known.kind == "create")
            return ITEMS[list(made).index(call.path)]
        return next(item for item, final in NAMES.items() if self.in_bundle(final) == call.path)

    def subject(self, run, call):
        if call.path in self.roles:
            return self.roles[call.path]
        name = os.path.basename(call.path)
        if name == LEFTOVER:
            return "leftover"
        if name.startswith(".qel-"):
            # Calls are counted apart for each hidden file.
            return "hidden" if call == run.faults[0].call or call.path == run.faults[0].call.path else "another"
        if call.path.startswith("media/"):
            return "original" if call.path == run.faults[0].call.path else "another"
        return "final" if not name.startswith("<") and name != "-" else call.path

    def judge(self, run, rows):
        """Checks a run against the table's row for its fault."""
        if not run.faults:
            return self.assertBundle(run)
        call = run.faults[0].call
        told = self.consequence(rows, run, self.subject(run, call))
        if told == "done":
            return self.assertBundle(run)
        if told == "item lost":
            return self.assertBundle(run, {self.item_of(run, call)})
        if told == "leftovers may stay":
            return self.assertBundle(run, leftovers=self.leftovers())
        if told == "without posters":
            exist = self.in_bundle("Posters") in self.before
            return self.assertBundle(run, () if exist else {COVER, FACE}, self.leftovers(), posters=exist)
        if told.startswith("no path for the "):
            lost, subject = (COVER, 'podcast "Show"') if told.endswith("cover") else (FACE, 'episode "One"')
            return self.assertBundle(run, {lost}, warnings={
                lost: f"Could not generate sane path for poster image for {subject}"})
        if told == "unsaid":
            return self.assertBundle(run._replace(stdout=self.whole.stdout))
        progress = LOADING if self.is_late(told) else b""
        self.assertEqual((run.status, run.stderr.decode(), run.stdout), (1, self.message(told, run), progress), run)
        # What was made on the way to the failure stays: directories, and nothing in them.
        added = contents(self.root).items() - self.before.items()
        return self.assertLessEqual(added, {("sub", None)}, run)

    def prepare(self, locate, source=None):
        """A server of runs for a source, the show's reference file by default; a run without faults is judged."""
        if source is None:
            self.reference_file(locate)
        else:
            self.source = source
        server = self.serve_runs("createbundle", self.source, "-d", self.in_bundle("."))
        self.whole = server.run()
        self.assertOrderly(self.whole)
        self.assertBundle(self.whole)
        return server

    def sweep(self, scenario, server, rows, **options):
        rows = table(STREAMS, REFERENCE, *rows)
        for run in self.runs(server, scenario, **options):
            with self.subTest(str(run)):
                self.judge(run, rows)

    def in_root(self, name):
        return f"media/{name}"

    def as_url(self, name):
        return (self.root / "media" / name).as_uri()

    def test_local_files_to_a_new_bundle(self):
        self.sweep("local files to a new bundle", self.prepare(self.in_root), (DIRECTORIES, FETCHING))

    def test_file_urls_to_the_bundle_of_an_earlier_run(self):
        self.earlier_bundle()
        self.sweep("file URLs to an earlier bundle", self.prepare(self.as_url), (DIRECTORIES, FETCHING))

    def test_a_server_to_the_bundle_of_an_earlier_run(self):
        # How often a connection is asked depends on the moment; a failure may end the transfer, or be of no weight.
        self.earlier_bundle()
        web = self.server()
        locations = {name: web.serve(f"/{name}", content) for name, content in ORIGINALS.items()}
        server = self.prepare(None, web.serve("/feed", show_feed(locations.get)))
        rows = table(STREAMS, DIRECTORIES, FETCHING)
        for run in self.runs(server, "a server to an earlier bundle"):
            with self.subTest(str(run)):
                if run.faults and not (run.faults[0].call.path.startswith("<s") and run.faults[0].call.path != "<socket>"):
                    if run.faults[0].call.path[0] in "<-":
                        self.assertTransferred(run)
                        continue
                self.judge(run, rows)

    def assertTransferred(self, run):
        """The feed could not be read, or a consistent bundle was made of it."""
        if run.status and run.stderr != NO_INFO.encode():
            self.assertRegex(run.stderr.decode(), r"\ACould not load source: [^\n]+\Z", run)
            self.assertEqual(run.stdout, LOADING, run)
            self.assertEqual(contents(self.root), self.before, run)
        else:
            self.assertConsistentBundle(run)

    def test_random_bytes_for_a_hidden_name(self):
        # The first are those of a library's hash table.
        server = self.prepare(self.in_root)
        for number, name in enumerate(ITEMS, 2):
            with self.subTest(name):
                self.restore()
                run = server.run(f"getrandom@{number}=EIO")
                TALLY.add("other failures of a bundle")
                self.assertOrderly(run)
                self.assertBundle(run, {name})

    def test_an_output_that_takes_no_progress_lines(self):
        server = self.prepare(self.in_root)
        self.restore()
        run = server.run(stdout="/dev/full")
        self.assertOrderly(run)
        self.assertBundle(run._replace(stdout=self.whole.stdout))

    def test_a_file_system_without_exclusive_renaming(self):
        # A link under the final name serves instead. What it leaves under the hidden name is removed, else it stays.
        server = self.prepare(self.in_root)
        for refusal, (number, name) in itertools.product(("EINVAL", "ENOSYS"), enumerate(ITEMS[:-1], 1)):
            for then, lost in (("", ()), (",link@1=EIO", {name}), (",link@1=EEXIST", {name})):
                with self.subTest(name, refusal=refusal, then=then):
                    self.restore()
                    run = server.run(f"rename@{number}={refusal}{then}")
                    TALLY.add("other failures of a bundle")
                    self.assertOrderly(run)
                    self.assertBundle(run, lost)
            self.restore()
            run = server.run(f"rename@{number}={refusal},unlink@1=EIO")
            self.assertOrderly(run)
            self.assertEqual([call.kind for call in run.calls].count("unlink"), 1, run)
            stayed = [path for path in contents(self.root) if os.path.basename(path).startswith(".qel-")]
            self.assertEqual(len(stayed), 1, run)
            os.unlink(self.root / stayed[0])
            self.assertBundle(run)

    def test_hidden_names_that_are_taken(self):
        server = self.prepare(self.in_root)
        for plan in ("create@1=EEXIST", "create@3=EEXIST", "flock@2=EAGAIN", "create@/2=EEXIST", "flock@/2=EAGAIN"):
            with self.subTest(plan):
                self.restore()
                run = server.run(plan)
                TALLY.add("other failures of a bundle")
                self.assertOrderly(run)
                self.assertBundle(run)

    def test_a_removal_that_fails_as_well(self):
        # The one way for a hidden file to stay; the next run removes it.
        self.earlier_bundle()
        server = self.prepare(self.as_url)
        for run in self.runs(server, "two failures of a bundle", "write@{number}={error},unlink@3+=EACCES"):
            with self.subTest(str(run)):
                stayed = [path for path in contents(self.root)
                          if os.path.basename(path).startswith(".qel-") and path not in self.before]
                self.assertEqual(len(stayed), sum(fault.call.kind == "unlink" for fault in run.faults), run)
                for path in stayed:
                    (self.root / path).unlink()
                if run.faults and run.faults[0].call.path != "<stdout>":
                    self.assertConsistentBundle(run)

    def test_the_next_run_removes_what_stayed(self):
        self.earlier_bundle()
        server = self.prepare(self.as_url)
        self.restore()
        self.assertOrderly(server.run("write@1=ENOSPC,unlink@3+=EACCES"))
        self.assertEqual(len([path for path in contents(self.root) if ".qel-" in path]), 1)
        run = server.run()
        self.assertOrderly(run)
        self.assertBundle(run)

    def test_a_disk_that_is_full_from_now_on(self):
        full = "write@{number}+=ENOSPC,copy_file_range@{number}+=ENOSPC"
        created = "create@{number}+=ENOSPC,copy_file_range@1+=EXDEV"
        opened = "open@{number}+=EMFILE,create@{number}+=EMFILE,dup@{number}+=EMFILE,opendir@1+=EMFILE"
        self.earlier_bundle()
        server = self.prepare(self.as_url)
        for plan in (full, created, opened):
            for run in self.runs(server, "failures that last", plan):
                with self.subTest(str(run)):
                    if run.faults and run.faults[0].call.path == self.source:
                        self.assertNothingHappened(run, f'Could not initialize podcast source with string "{self.source}".\n')
                    elif not any(fault.call.path == "<stdout>" for fault in run.faults):
                        self.assertConsistentBundle(run, self.leftovers())

    def test_posters_that_lead_out_of_the_bundle_do_so_under_faults(self):
        # Nothing may be written there, nor removed, even if it cannot be told that "Posters" is a link.
        elsewhere = self.path("elsewhere")
        elsewhere.mkdir()
        (elsewhere / LEFTOVER).write_bytes(b"of somebody else")
        self.bundle.mkdir(parents=True)
        (self.bundle / "Posters").symlink_to(elsewhere)
        self.reference_file(self.in_root)
        server = self.serve_runs("createbundle", self.source, "-d", self.in_bundle("."))
        before = contents(elsewhere)
        for run in self.runs(server, "posters that are a link"):
            with self.subTest(str(run)):
                self.assertEqual(contents(elsewhere), before, run)


INTERRUPTIBLE = ("open", "create", "reopen", "flock", "read", "write", "copy_file_range", "poll")
PIECEWISE = ("read", "write", "copy_file_range", "send", "recv")


class HarmlessFaultTest(Sweep):
    """Calls that a signal interrupts, or that move a part of what they were asked to, change nothing."""

    def plans(self):
        """Every second, third, ... call interrupted; every one in small pieces; both. Not every second poll: the
        transfer library polls twice in each of its rounds, and would learn nothing for ever."""
        short = ",".join(f"{kind}@/1=short" for kind in PIECEWISE)
        interrupted = [",".join(f"{kind}@/{each}=EINTR" for kind in INTERRUPTIBLE if kind != "poll" or each % 2)
                       for each in (2, 3, 5)]
        return [*interrupted, short, f"{interrupted[1]},{short}"]

    def single_plans(self, whole):
        """One interrupted call, or one that moves a part, each."""
        for kind in dict.fromkeys(INTERRUPTIBLE + PIECEWISE):
            count = sum(call.kind == kind for call in whole.calls)
            for number in range(1, count + 1):
                if kind in INTERRUPTIBLE:
                    yield f"{kind}@{number}=EINTR"
                if kind in PIECEWISE:
                    yield f"{kind}@{number}=short"

    def check(self, scenario, server, judge, **options):
        whole = server.run(**options)
        judge(whole, whole)
        for plan in [*self.plans(), *self.single_plans(whole)]:
            with self.subTest(plan):
                self.restore()
                run = server.run(plan, **options)
                TALLY.add(scenario)
                self.assertOrderly(run)
                judge(run, whole)

    def same_output(self, run, whole):
        self.assertEqual((run.status, run.stderr), (0, b""), run)
        self.assertEqual(without_publication_date(run.stdout), without_publication_date(whole.stdout), run)

    def test_conversions(self):
        (self.root / "feed.xml").write_bytes(show_feed(lambda name: name))
        server = self.serve_runs("createfeed", (self.root / "feed.xml").as_uri())
        self.check("interrupted and partial calls of conversions", server, self.same_output)

    def test_standard_input(self):
        path = self.root / "show.plist"
        path.write_bytes(plistlib.dumps(show(lambda name: name)))
        server = self.serve_runs("parsefeed", "-i")
        self.check("interrupted and partial calls of conversions", server, self.same_output, stdin=path)

    def test_local_files_to_a_new_bundle(self):
        self.originals()
        (self.root / "show.plist").write_bytes(plistlib.dumps(show(lambda name: f"media/{name}")))
        server = self.serve_runs("createbundle", "show.plist", "-d", self.in_bundle("."))
        self.check("interrupted and partial calls of bundles", server, lambda run, whole: self.assertBundle(run))

    def test_a_server_to_the_bundle_of_an_earlier_run(self):
        self.earlier_bundle()
        web = self.server()
        locations = {name: web.serve(f"/{name}", content) for name, content in ORIGINALS.items()}
        server = self.serve_runs("createbundle", web.serve("/feed", show_feed(locations.get)), "-d", self.in_bundle("."))
        self.check("interrupted and partial calls of bundles", server, lambda run, whole: self.assertBundle(run))


if __name__ == "__main__":
    unittest.main()
