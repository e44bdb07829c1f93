"""In which order a bundle's files get to the disk and to their names, by the calls of a run.

What a power cut leaves is tried by test_power_cuts.py, where that can be done.
"""

import os
import plistlib
import unittest

from fault_support import ITEMS, NAMES, ORIGINALS, FaultTestCase, show


class OrderTest(FaultTestCase):
    def calls(self, locate, first=True):
        """The kinds and places of a run's calls, hidden files under the names that they get."""
        self.originals()
        if not first:
            self.earlier_bundle()
        (self.root / "show.plist").write_bytes(plistlib.dumps(show(locate)))
        run = self.serve_runs("createbundle", "show.plist", "-d", self.in_bundle(".")).run()
        self.assertOrderly(run)
        self.assertBundle(run)
        # A hidden file gets its name before the next is made.
        names, hidden = {}, None
        for call in run.calls:
            if call.kind == "create":
                hidden = call.path
            elif call.kind == "rename":
                names[hidden] = call.path
        return [(call.kind, os.path.relpath(names.get(call.path, call.path), self.in_bundle("."))) for call in run.calls]

    def assertOrder(self, calls, *expected):
        places = [calls.index(call) for call in expected]
        self.assertEqual(places, sorted(places), [calls[place] for place in places])

    def assertReferenceFileIsLast(self, calls):
        for name in ITEMS[:-1]:
            self.assertOrder(calls, ("rename", NAMES[name]), ("syncfs", "."), ("rename", "Info.plist"), ("fsync", "."))
        last_write = len(calls) - 1 - calls[::-1].index(("write", "Info.plist"))
        self.assertLess(last_write, calls.index(("syncfs", ".")))
        self.assertEqual([kind for kind, _ in calls].count("syncfs"), 1)

    def test_copies(self):
        calls = self.calls(lambda name: f"media/{name}")
        self.assertReferenceFileIsLast(calls)
        for name in ORIGINALS:
            self.assertOrder(calls, ("create", NAMES[name]), ("fsync", NAMES[name]), ("rename", NAMES[name]))

    def url(self, name):
        return (self.root / "media" / name).as_uri()

    def test_downloads(self):
        calls = self.calls(self.url)
        self.assertReferenceFileIsLast(calls)
        for name in ORIGINALS:
            self.assertNotIn(("fsync", NAMES[name]), calls)

    def test_downloads_over_an_earlier_bundle(self):
        calls = self.calls(self.url, first=False)
        self.assertReferenceFileIsLast(calls)
        for name in ORIGINALS:
            self.assertOrder(calls, ("create", NAMES[name]), ("fsync", NAMES[name]), ("rename", NAMES[name]))


if __name__ == "__main__":
    unittest.main()
