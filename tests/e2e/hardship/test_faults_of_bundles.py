"""Calls of the system fail, one after another, while a bundle is filled; tables tell what follows.

As in test_faults_of_conversions.py: whichever call fails, there is no crash, nothing is left open, no file has its
final name before it is whole, files that were there are as they were, and hidden files are gone unless their
removal is what failed.
"""

import itertools
import os
import plistlib
import unittest

from bundle_support import contents
from fault_support import (COVER, FACE, INFO, ITEMS, LEFTOVER, NAMES, NO_INFO, ORIGINALS, Tally, show, show_feed)
from fault_sweep import REFERENCE, STREAMS, Sweep, table
from support import LOADING, soaking

TALLY = Tally("Runs with a failing call of the system")


def tearDownModule():
    TALLY.show()


# A directory that cannot be looked at is made, and one that exists is accepted then. One that may not be read is
# opened all the same, and not listed. Leftovers of earlier runs are removed where that can be done. A "Posters" that
# is not known to lie inside is not used. What cannot be locked is filled without a lock,
# and what is not known to be at its path is opened again.
DIRECTORIES = """
    stat                                    parent       done
    mkdir                                   parent       Could not generate bundle: Could not create bundle: {error}\\n
    stat                                    bundle       done
    mkdir                                   bundle       Could not generate bundle: Could not create bundle: {error}\\n
    opendir                                 bundle       Could not generate bundle: Could not create bundle: {error}\\n
    fstat                                   bundle#1     done
    flock                                   bundle       done
    fstat                                   bundle#2     done
    fstat                                   bundle#3     leftovers may stay
    dup fcntl getdents close                bundle       leftovers may stay
    lseek                                   bundle       done
    lstat reopen flock unlink close         leftover     leftovers may stay
    fstat                                   bundle#4     posters lost
    fstat                                   bundle#5     posters lost
    opendir mkdir                           Posters      posters lost
    fstat                                   Posters#1    posters lost
    opendir fstat                           above        posters lost
    close                                   above        done
    fstat                                   Posters#2    done
    flock                                   Posters      done
    fstat                                   Posters#3    leftovers may stay
    dup fcntl getdents close                Posters      leftovers may stay
    lseek                                   Posters      done
    fstat                                   Posters#4    done
    fstat                                   bundle#6     done
    syncfs                                  bundle       reference file lost
    fsync                                   bundle       known too late
"""

# An original, the hidden file that is made of it, and its final name. Copying inside of the kernel is only tried, and
# so is giving a copy what its original has. What replaces a file, and a copy, is told to the disk.
FETCHING = """
    stat                                    original     done
    open fstat read                         original     item lost
    close                                   original     done
    lstat                                   final        done
    create                                  hidden       item lost
    copy_file_range fchmod utimens          hidden       done
    write fsync                             hidden       item lost
    close                                   hidden       item lost
    rename                                  final        item lost
"""


class BundleFaultTest(Sweep):
    """createbundle, of which most of a run's calls are about what it makes."""

    tally = TALLY
    every_error = soaking()

    def setUp(self):
        super().setUp()
        self.originals()
        self.roles = {"sub": "parent", self.in_bundle("."): "bundle", self.in_bundle("Posters"): "Posters",
                      self.in_bundle("Posters") + "/..": "above", "show.plist": "source"}
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
        if call.kind == "opendir" and run.faults[0].error == "EACCES" and call.path != self.in_bundle("Posters") + "/..":
            return self.assertBundle(run, leftovers=self.leftovers())
        if told == "posters lost":
            exist = self.in_bundle("Posters") in contents(self.root)
            return self.assertBundle(run, {COVER, FACE}, self.leftovers(), posters=exist)
        if told == "reference file lost":
            return self.assertBundle(run, {INFO})
        if told == "known too late":
            self.assertEqual((run.status, run.stderr.decode()), (1, NO_INFO), run)
            return self.assertBundle(run._replace(status=0, stderr=b"", stdout=run.stdout + b"[N] Done!\n"))
        if told == "unsaid":
            return self.assertBundle(run._replace(stdout=self.whole.stdout))
        progress = LOADING if self.is_late(told) else b""
        self.assertEqual((run.status, run.stderr.decode(), run.stdout), (1, self.message(told, run), progress), run)
        # What was made on the way to the failure stays: directories, and nothing in them.
        added = contents(self.root).items() - self.before.items()
        return self.assertLessEqual(added, {("sub", None), (self.in_bundle("."), None)}, run)

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
                path = run.faults[0].call.path if run.faults else ""
                if path.startswith(("<", "-")) and not path.startswith("<std"):
                    self.assertTransferred(run)
                else:
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
                self.tally.add("other failures of a bundle")
                self.assertOrderly(run)
                self.assertBundle(run, {name})

    def test_an_output_that_takes_no_progress_lines(self):
        server = self.prepare(self.in_root)
        self.restore()
        run = server.run(stdout="/dev/full")
        self.assertOrderly(run)
        self.assertBundle(run._replace(stdout=self.whole.stdout))

    def test_a_file_system_without_exclusive_renaming(self):
        # A link under the final name serves instead; what it leaves under the hidden name is removed, else it stays.
        # Without links, an empty file that is made under the final name is replaced, or removed.
        server = self.prepare(self.in_root)
        for refusal, (number, name) in itertools.product(("EINVAL", "ENOSYS"), enumerate(ITEMS[:-1], 1)):
            for then, lost in (("", ()), (",link@1=EEXIST", {name}), (",link@1=EPERM", ()),
                               (f",link@1=EPERM,create@{number + 1}=EEXIST", {name}),
                               (f",link@1=EPERM,rename@{number + 1}=EIO", {name})):
                with self.subTest(name, refusal=refusal, then=then):
                    self.restore()
                    run = server.run(f"rename@{number}={refusal}{then}")
                    self.tally.add("other failures of a bundle")
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
        for plan in ("create@1=EEXIST", "create@3=EEXIST", "create@/2=EEXIST", "flock@1=ENOLCK,flock@3=EAGAIN",
                     "flock@1=ENOLCK,flock@2=ENOLCK,flock@/2=EAGAIN"):
            with self.subTest(plan):
                self.restore()
                run = server.run(plan)
                self.tally.add("other failures of a bundle")
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
        opened = "open@{number}+=EMFILE,create@{number}+=EMFILE,dup@{number}+=EMFILE,opendir@{number}+=EMFILE"
        self.earlier_bundle()
        server = self.prepare(self.as_url)
        for plan in (full, created, opened):
            for run in self.runs(server, "failures that last", plan):
                with self.subTest(str(run)):
                    if run.faults and run.faults[0].call.path == self.source:
                        self.assertNothingHappened(
                            run, f'Could not initialize podcast source with string "{self.source}".\n')
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


if __name__ == "__main__":
    unittest.main()
