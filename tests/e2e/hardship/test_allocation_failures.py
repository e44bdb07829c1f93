"""Memory runs out at every point of a run: the message says so, nothing crashes and nothing half-made stays.

Allocation 1, 2, 3, ... of a run is refused, whoever asks for it: the tool, the C++ library or one of the libraries
for XML, text, dates, compression and transfers; then that and all later ones. A run that succeeds all the same has
made what it makes with enough memory: no library's failure passes for an empty or a simpler result.

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

# What a run may say. Only the driver's own words are the same at every place: a parser adds where it was, a
# transfer which of its steps failed.
OUT_OF_MEMORY = r"Out of memory\.\n"
READING = r"Could not load source: (?:Out of memory|Cannot allocate memory|out of memory(?: at line \d+, column \d+)?)"
WRITING = r"Could not generate (?:bundle|feed|reference file): Out of memory\n"
# A reference file that cannot be read for want of memory is one that cannot be read.
INITIALISING = r'Could not initialize podcast source with string "[^"\n]+"\.\n'
STANDARD_INPUT = r'"\(null\)" is not a valid podcast source\.\n'
TRANSFERRING = r"Could not load source: [^\n]+"
NOT_WRITTEN = r"Could not generate bundle: Could not write Info\.plist file\n"

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

    def sweep(self, scenario, arguments, messages, judge, env=None, **options):
        """Refuses allocations of a scenario, one in each run, then all from one on; each run either fails with one
        of the messages or succeeds, and is then judged beside the run with enough memory."""
        pattern = "|".join((OUT_OF_MEMORY, *messages))
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
                self.assertOrderly(run)
                if run.status:
                    self.assertRegex(run.stderr.decode(), rf"\A(?:{pattern})\Z", run)
                judge(run, whole)

    def convert(self, scenario, arguments, *messages, **options):
        def judge(run, whole):
            self.assertEqual(contents(self.root), self.before, run)
            expected = without_publication_date(whole.stdout)
            self.assertEqual(without_publication_date(run.stdout), b"" if run.status else expected, run)

        self.sweep(scenario, arguments, (READING, WRITING, *messages), judge, **options)

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
        self.convert("feed from a server", ["parsefeed", url], TRANSFERRING)

    def test_a_reference_file(self):
        self.convert("reference file", ["parsefeed", self.reference_file(lambda name: name)], INITIALISING)

    def test_a_binary_reference_file_on_standard_input(self):
        path = self.root / self.reference_file(lambda name: name, plistlib.FMT_BINARY)
        self.convert("binary reference file", ["parsefeed", "-i"], STANDARD_INPUT, stdin=path)

    def test_a_bundle(self):
        self.bundle.mkdir(parents=True)
        (self.bundle / INFO).write_bytes(plistlib.dumps(show(lambda name: name)))
        self.convert("bundle", ["parsefeed", os.path.relpath(self.bundle, self.root)], INITIALISING)

    # Writing

    def test_a_feed_with_dates_of_the_locale(self):
        self.convert("feed to a feed", ["createfeed", self.feed_url("UTF-8")],
                     env={"TZ": "Europe/Berlin", "LC_ALL": "de_DE"})

    def judge_bundle(self, run, whole):
        """A whole bundle, one without what the run warns about, or what was made until the memory ran out."""
        if run.status == 0:
            self.assertConsistentBundle(run, self.leftovers())
            return
        lines = shown(run)
        self.assertLessEqual(len(lines), len(shown(whole)), run)
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
        self.sweep("local files to a bundle", ["createbundle", source, "-d", self.in_bundle(".")],
                   (READING, WRITING, INITIALISING, NOT_WRITTEN), self.judge_bundle)

    def test_file_urls_to_the_bundle_of_an_earlier_run(self):
        self.earlier_bundle()
        source = self.reference_file(lambda name: (self.root / "media" / name).as_uri())
        self.sweep("file URLs to a bundle", ["createbundle", source, "-d", self.in_bundle(".")],
                   (READING, WRITING, INITIALISING, NOT_WRITTEN), self.judge_bundle)

    def test_a_server_to_the_bundle_of_an_earlier_run(self):
        self.earlier_bundle()
        web = self.server()
        locations = {name: web.serve(f"/{name}", content) for name, content in ORIGINALS.items()}
        url = web.serve("/feed", show_feed(locations.get))
        self.sweep("server to a bundle", ["createbundle", url, "-d", self.in_bundle(".")],
                   (TRANSFERRING, WRITING, NOT_WRITTEN), self.judge_bundle)


if __name__ == "__main__":
    unittest.main()
