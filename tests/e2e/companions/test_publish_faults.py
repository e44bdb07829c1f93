"""Calls of the system fail, one after another, while a feed is published: it is always the old one or the new one."""

import itertools
import plistlib
import unittest

from fault_support import ERRORS, FaultTestCase

OLD = b"the feed that was there"
EPOCH = {"SOURCE_DATE_EPOCH": "1700000000"}


class PublishFaultsTest(FaultTestCase):
    def test_every_call(self):
        (self.root / "a.mp3").write_bytes(b"12345")
        (self.root / "show.plist").write_bytes(plistlib.dumps(
            {"PodcastName": "t", "Episodes": [{"EpisodeName": "e", "EpisodeReference": "a.mp3", "EpisodeUUID": "u"}]}))
        feed = self.root / "feed.xml"
        feed.write_bytes(OLD)
        server = self.serve_runs("--base", "https://a.example", "show.plist", "feed.xml", env=EPOCH,
                                 program="qel-publish")
        untroubled = server.run()
        self.assertEqual((untroubled.status, untroubled.leaks), (0, []))
        new = feed.read_bytes()
        self.assertIn(b'length="5"', new)

        # The feed and its name are on the disk, in this order.
        order = [call.kind for call in untroubled.calls
                 if call.kind in ("write", "fsync", "rename") and call.path != "<stderr>"]
        self.assertEqual([kind for kind, _ in itertools.groupby(order)], ["write", "fsync", "rename", "fsync"])

        number, statuses = 0, set()
        while True:
            number += 1
            self.restore()
            run = server.run(f"any@{number}={ERRORS[number % len(ERRORS)]}")
            if not run.faults:
                break
            with self.subTest(str(run)):
                statuses.add(run.status)
                self.assertTrue(run.ended)
                self.assertEqual(run.leaks, [])
                after = feed.read_bytes()
                if run.status == 0:
                    self.assertEqual(after, new)
                elif b"warning: the file cannot be read: " in run.stderr:
                    self.assertEqual((run.status, after), (1, new.replace(b' length="5"', b"")))
                else:
                    self.assertIn(run.status, (1, 2))
                    self.assertIn(b"qel-publish: ", run.stderr)
                    # The name itself may not have come to the disk.
                    self.assertIn(after, (OLD, new) if run.faults[0].call.kind == "fsync" else (OLD,))
        self.assertEqual(statuses, {0, 1, 2})
        self.assertGreater(number, 15)


if __name__ == "__main__":
    unittest.main()
