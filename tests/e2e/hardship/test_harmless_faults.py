"""Calls of the system that a signal interrupts, or that move a part of what they were asked to, change nothing."""

import plistlib
import unittest

from fault_support import ORIGINALS, FaultTestCase, Tally, show, show_feed
from support import without_publication_date

TALLY = Tally("Runs with a failing call of the system")


def tearDownModule():
    TALLY.show()


INTERRUPTIBLE = ("open", "opendir", "create", "reopen", "flock", "read", "write", "copy_file_range", "fsync", "syncfs", "poll")
PIECEWISE = ("read", "write", "copy_file_range", "send", "recv")


class HarmlessFaultTest(FaultTestCase):
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
        url = web.serve("/feed", show_feed(locations.get))
        server = self.serve_runs("createbundle", url, "-d", self.in_bundle("."))
        self.check("interrupted and partial calls of bundles", server, lambda run, whole: self.assertBundle(run))


if __name__ == "__main__":
    unittest.main()
