"""Runs of qel-keep that are ended at any moment, and runs beside them."""

import os
import random
import signal
import subprocess
import time
import unittest

from bundle_support import Gate, eventually
from keep_support import KeepTestCase
from support import element, soaking

BODY = bytes(range(256)) * 2048  # half a MiB
KILLS = 200 if soaking() else 25


class InterruptedTest(KeepTestCase):
    def assertListedIsWhole(self, bodies):
        """Whatever is listed is there, and is all of it."""
        if not (self.bundle / "Info.plist").exists():
            return
        for entry in self.info().get("Episodes", []):
            content = (self.bundle / entry["EpisodeReference"]).read_bytes()
            self.assertEqual((entry["EpisodeName"], content == bodies[entry["EpisodeName"]]),
                             (entry["EpisodeName"], True))
            self.assertEqual(entry["EpisodeFileSize"], len(content))

    def resumable(self, path, body, pause):
        """Serves the body slowly, with a tag, from where it is asked for."""
        def answer(exchange):
            asked = exchange.request.headers.get("range")
            start = int(asked.removeprefix("bytes=").removesuffix("-")) if asked else 0
            headers = [("Content-Length", str(len(body) - start)), ("ETag", f'"{path}"')]
            if asked:
                headers.append(("Content-Range", f"bytes {start}-{len(body) - 1}/{len(body)}"))
            exchange.head(206 if asked else 200, headers)
            for begin in range(start, len(body), 65536):
                exchange.send(body[begin:begin + 65536])
                time.sleep(pause)
        return self.web.route(path, answer)

    def test_a_kill_at_any_moment_loses_only_what_was_on_its_way(self):
        seed = int(os.environ.get("QEL_SEED", random.randrange(2 ** 32)))
        chance = random.Random(seed)
        bodies = {f"Episode {number}": BODY + bytes([number]) for number in range(12)}
        items = [self.episode(number, url=self.resumable(f"/{number}.mp3", bodies[f"Episode {number}"], 0.004))
                 for number in range(12)]
        self.publish(*items)
        kept = []
        with self.subTest(seed=seed):
            for _ in range(KILLS):
                process = self.start_keep()
                time.sleep(chance.uniform(0, 0.15))
                process.kill()
                process.communicate()
                self.assertListedIsWhole(bodies)
                now = self.listed() if (self.bundle / "Info.plist").exists() else []
                self.assertEqual([name for name in kept if name not in now], [])
                kept = now
                if len(kept) == len(bodies):  # they have all come: begin anew
                    for name in self.bundle.glob("*.mp3"):
                        name.unlink()
                    (self.bundle / "Info.plist").unlink()
                    kept = []
            result = self.keep()
            self.assertEqual((result.status, result.stderr), (0, b""))
            self.assertEqual(self.listed(), list(bodies))
            self.assertListedIsWhole(bodies)
            self.assertNothingHidden()
            self.assertEqual(sorted(self.listed("EpisodeReference")), sorted(f"{number}.mp3" for number in range(12)))
            self.assertEqual(len(list(self.bundle.glob("*.mp3"))), len(bodies))

    def test_another_episode_of_one_url_does_not_get_what_a_killed_run_left(self):
        latest = self.web.serve("/latest.mp3", b"media 1")
        gate = Gate()
        self.addCleanup(gate.open)
        slow = self.web.route("/slow.mp3", lambda exchange: gate.wait())
        self.publish(self.episode(1, url=latest), self.episode(9, url=slow))
        process = self.start_keep()
        eventually(lambda: list(self.bundle.glob("latest.mp3")))
        process.kill()
        process.communicate()
        self.web.serve("/latest.mp3", b"media 2")
        self.publish(self.episode(2, url=latest))
        self.assertKept(self.keep(), "1 new, 0 known, 0 failed")
        self.media(2)
        self.assertEqual(self.web.hits("/latest.mp3"), 2)

    def test_nor_does_one_of_the_same_title_and_another_uuid(self):
        latest = self.web.serve("/latest.mp3", b"media 1")
        gate = Gate()
        self.addCleanup(gate.open)
        slow = self.web.route("/slow.mp3", lambda exchange: gate.wait())
        self.publish(self.episode(1, element("qel:uuid", "one"), title="News", url=latest), self.episode(9, url=slow))
        process = self.start_keep()
        eventually(lambda: list(self.bundle.glob("latest.mp3")))
        process.kill()
        process.communicate()
        self.web.serve("/latest.mp3", b"media 2")
        self.publish(self.episode(2, element("qel:uuid", "two"), title="News", url=latest))
        self.assertKept(self.keep(), "1 new, 0 known, 0 failed")
        self.assertEqual((self.bundle / self.listed("EpisodeReference")[0]).read_bytes(), b"media 2")

    def test_a_signal_ends_a_run_in_order(self):
        for number in (signal.SIGINT, signal.SIGTERM, signal.SIGHUP):
            with self.subTest(number.name):
                self.bundle = self.path(f"{number.name}.podcast")
                slow = self.resumable("/slow.mp3", BODY, 0.3)
                self.publish(self.episode(1), self.episode(2, url=slow))
                process = self.start_keep()
                eventually(lambda: list(self.bundle.glob("1.mp3")) and list(self.bundle.glob(".qel-keep-*.note")))
                time.sleep(0.5)
                process.send_signal(number)
                output, errors = process.communicate(timeout=60)
                self.assertEqual((process.returncode, output.splitlines()[-1], errors),
                                 (-number, b"1 new, 0 known, 0 failed",
                                  b"qel-keep: interrupted; the next run goes on\n"))
                self.media(1)
                self.resumable("/slow.mp3", BODY, 0)
                self.assertKept(self.keep(), "1 new, 1 known, 0 failed")
                self.assertRegex(self.web.requests[-1].headers["range"], r"\Abytes=[1-9]\d*-\Z")
                self.assertEqual((self.bundle / "slow.mp3").read_bytes(), BODY)
                self.assertNothingHidden()

    def test_what_is_whole_is_listed_before_the_end(self):
        gate = Gate()
        self.addCleanup(gate.open)
        url = self.web.route("/2.mp3", lambda exchange: (gate.wait(), exchange.reply(200, b"media 2")))
        self.publish(self.episode(1), self.episode(2, url=url))
        process = self.start_keep()
        gate.reached()
        self.assertEqual((self.listed(), self.info()["PodcastOrigin"]), ([], self.feed_url))
        self.assertIsNotNone(self.createfeed(self.bundle).find("channel"))
        eventually(self.listed)
        self.assertEqual(self.listed(), ["Episode 1"])
        gate.open()
        process.communicate()
        self.assertEqual(self.listed(), ["Episode 1", "Episode 2"])

    def test_a_second_run_says_so_at_once(self):
        gate = Gate()
        self.addCleanup(gate.open)
        self.publish(self.episode(1, url=self.web.route("/1.mp3", lambda exchange: (
            gate.wait(), exchange.reply(200, b"media 1")))))
        process = self.start_keep()
        gate.reached()
        asked = len(self.web.requests)
        self.assertRefused(self.keep(), f"{self.bundle}: Another run is filling it")
        self.assertEqual(len(self.web.requests), asked)
        self.assertKept(self.keep("--dry-run"), "1 to fetch, 0 known")
        gate.open()
        output, _ = process.communicate()
        self.assertEqual(output.splitlines()[-1], b"1 new, 0 known, 0 failed")
        self.media(1)

    def test_the_tool_waits_for_its_turn(self):
        gate = Gate()
        self.addCleanup(gate.open)
        self.publish(self.episode(1, url=self.web.route("/1.mp3", lambda exchange: (
            gate.wait(), exchange.reply(200, b"media 1")))))
        process = self.start_keep()
        gate.reached()
        tool = subprocess.Popen([os.environ["QEL"], "createbundle", self.reference({"PodcastName": "Other"}), "-d",
                                 self.bundle], stdout=subprocess.PIPE, stderr=subprocess.PIPE)
        time.sleep(0.3)
        self.assertIsNone(tool.poll())
        gate.open()
        output, _ = process.communicate()
        self.assertEqual(output.splitlines()[-1], b"1 new, 0 known, 0 failed")
        tool.communicate()
        self.assertEqual(self.info(), {"PodcastName": "Other"})
        # The file is there still, and is not lost: nobody lists it, so that it is fetched beside it.
        self.web.serve("/1.mp3", b"media 1")
        self.assertKept(self.keep(), "1 new, 0 known, 0 failed")
        self.assertEqual(self.listed("EpisodeReference"), ["1-2.mp3"])


if __name__ == "__main__":
    unittest.main()
