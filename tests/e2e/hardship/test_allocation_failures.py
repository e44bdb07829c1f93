"""Memory runs out at every point of a run: it ends with the one message for that, and nothing half-made stays.

Allocation 1, 2, 3, ... of a run is refused, whoever asks for it: the tool, the C++ library or one of the libraries
for XML, text, dates, compression and transfers; then that and all later ones. Only what asks the C library alone,
such as the loader of a library, may go on without: a run that succeeds has made what it makes with enough memory,
so that no refusal passes for an empty or a simpler result.

By default every allocation of the short scenarios is refused, and of the long ones (in which libraries set up
tables) a choice; a long run refuses every one.
"""

import os
import plistlib
import re
import unittest

from bundle_support import contents
from fault_support import (INFO, LEFTOVER, NAMES, ORIGINALS, FaultTestCase, Tally, show, show_feed, shown)
from support import soaking, without_publication_date

TALLY = Tally("Runs with a refused allocation")

OUT_OF_MEMORY = b"Out of memory.\n"
# What a run says that the C library told of its want of memory: where the working directory is asked for, and while
# the library for transfers is loaded.
ASKING_FOR_DIRECTORY = "Could not load source: Cannot allocate memory"
LOADING = r"Could not load source: \S*\blib\S+: cannot [^\n]+"

# What a library that is loaded with the transfer library says on its own, and nobody can keep it from saying.
FOREIGN = rb"\AError in GnuTLS initialization: [^\n]*\n"


def tearDownModule():
    TALLY.show()


def chosen(count):
    """The allocations to refuse, of so many."""
    if soaking() or count <= 400:
        return range(1, count + 1)
    return sorted({*range(1, count, 61), *range(count - 250, count + 1)})


class AllocationFailureTest(FaultTestCase):
    allocations = True

    def setUp(self):
        super().setUp()
        self.originals()

    def sweep(self, scenario, arguments, judge, otherwise="", env=None, **options):
        """Refuses allocations of a scenario, one in each run, then all from one on; each run ends at once, fails
        in the other way or succeeds, and is judged beside the run with enough memory."""
        server = self.serve_runs(*arguments, env=env)
        whole = server.run(**options)
        self.assertOrderly(whole)
        self.assertEqual(whole.status, 0, whole)
        numbers = chosen(whole.allocations)
        last = numbers if soaking() else numbers[::7]
        for plan in [*(f"malloc@{number}=ENOMEM" for number in numbers), *(f"malloc@{number}+=ENOMEM" for number in last)]:
            self.restore()
            run = server.run(plan, **options)
            run = run._replace(stderr=re.sub(FOREIGN, b"", run.stderr))
            TALLY.add(scenario)
            with self.subTest(plan, faults=str(run.faults[0]) if run.faults else ""):
                if run.stderr == OUT_OF_MEMORY:
                    self.assertEqual((run.status, run.ended), (1, False), run)
                else:
                    self.assertOrderly(run)
                    self.assertRegex(run.stderr.decode(), rf"\A(?:{otherwise})?\Z", run)
                judge(run, whole)

    def convert(self, scenario, arguments, **options):
        def judge(run, whole):
            self.assertEqual(contents(self.root), self.before, run)
            expected = without_publication_date(whole.stdout)
            self.assertEqual(without_publication_date(run.stdout), b"" if run.status else expected, run)

        self.sweep(scenario, arguments, judge, **options)

    def feed_url(self, encoding):
        (self.root / "feed.xml").write_bytes(show_feed(lambda name: f"media/{name}", encoding))
        return (self.root / "feed.xml").as_uri()

    def reference_file(self, locate, fmt=plistlib.FMT_XML):
        (self.root / "show.plist").write_bytes(plistlib.dumps(show(locate), fmt=fmt))
        return "show.plist"

    # Reading

    def test_a_feed(self):
        self.convert("feed", ["parsefeed", self.feed_url("UTF-8")], env={"TZ": "America/New_York"})

    def test_a_feed_in_another_encoding(self):
        self.convert("feed in ISO-8859-2", ["parsefeed", self.feed_url("ISO-8859-2")])

    def test_a_compressed_feed_from_a_server(self):
        url = self.server().compressed("/feed", show_feed(lambda name: f"media/{name}"))
        self.convert("feed from a server", ["parsefeed", url], otherwise=LOADING)

    def test_a_reference_file(self):
        self.convert("reference file", ["parsefeed", self.reference_file(lambda name: name)])

    def test_a_binary_reference_file_on_standard_input(self):
        path = self.root / self.reference_file(lambda name: name, plistlib.FMT_BINARY)
        self.convert("binary reference file", ["parsefeed", "-i"], stdin=path)

    def test_a_bundle(self):
        self.bundle.mkdir(parents=True)
        (self.bundle / INFO).write_bytes(plistlib.dumps(show(lambda name: name)))
        self.convert("bundle", ["parsefeed", os.path.relpath(self.bundle, self.root)],
                     otherwise=ASKING_FOR_DIRECTORY)

    # Writing

    def test_a_feed_with_dates_of_the_locale(self):
        self.convert("feed to a feed", ["createfeed", self.feed_url("UTF-8")],
                     env={"TZ": "Europe/Berlin", "LC_ALL": "de_DE"})

    def judge_bundle(self, run, whole):
        """A whole bundle, one without what the run warns about, or what was made until the memory ran out."""
        if run.status == 0:
            self.assertConsistentBundle(run, self.leftovers())
            return
        lines = shown(run._replace(stdout=run.stdout[:run.stdout.rfind(b"\n") + 1]))
        self.assertEqual(lines, shown(whole)[:len(lines)], run)
        finals = {self.in_bundle(name): ORIGINALS[key] for key, name in NAMES.items() if key != INFO}
        for path, content in contents(self.root).items():
            if path in finals:
                self.assertIn(content, (self.before.get(path), finals[path]), run)
            elif path not in ("sub", self.in_bundle("."), self.in_bundle("Posters")):
                self.assertEqual(content, self.before.get(path, "nothing"), f"{path}: {run}")
        missing = self.before.keys() - contents(self.root).keys()
        self.assertEqual({path for path in missing if os.path.basename(path) != LEFTOVER}, set(), run)

    def test_local_files_to_a_new_bundle(self):
        source = self.reference_file(lambda name: f"media/{name}")
        self.sweep("local files to a bundle", ["createbundle", source, "-d", self.in_bundle(".")], self.judge_bundle)

    def test_file_urls_to_the_bundle_of_an_earlier_run(self):
        self.earlier_bundle()
        source = self.reference_file(lambda name: (self.root / "media" / name).as_uri())
        self.sweep("file URLs to a bundle", ["createbundle", source, "-d", self.in_bundle(".")], self.judge_bundle)

    def test_a_server_to_the_bundle_of_an_earlier_run(self):
        self.earlier_bundle()
        web = self.server()
        locations = {name: web.serve(f"/{name}", content) for name, content in ORIGINALS.items()}
        url = web.serve("/feed", show_feed(locations.get))
        self.sweep("server to a bundle", ["createbundle", url, "-d", self.in_bundle(".")], self.judge_bundle,
                   LOADING)


if __name__ == "__main__":
    unittest.main()
