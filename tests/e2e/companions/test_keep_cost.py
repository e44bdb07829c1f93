"""What keeping a show costs: the time of many small files, and time and memory where nothing is new."""

import os
import plistlib
import subprocess
import time
import unittest

from keep_support import KeepTestCase, day
from support import element, environment, is_sanitized, item


class CostTest(KeepTestCase):
    def timed(self, *arguments):
        """The seconds and the peak of memory (bytes) of a run that does well."""
        start = time.monotonic()
        process = subprocess.Popen(self.command(*arguments), stdin=subprocess.DEVNULL, stdout=subprocess.DEVNULL,
                                   env=environment())
        _, status, usage = os.wait4(process.pid, 0)
        process.returncode = os.waitstatus_to_exitcode(status)
        self.assertEqual(process.returncode, 0)
        return time.monotonic() - start, usage.ru_maxrss * 1024

    def test_files_come_as_fast_as_the_wire(self):
        body = os.urandom(100_000)

        def answer(exchange):
            time.sleep(0.1)
            exchange.reply(200, body)
        self.publish(*(self.episode(number, url=self.web.route(f"/{number}.mp3", answer)) for number in range(200)))
        seconds, _ = self.timed(self.feed_url, self.bundle)
        self.assertEqual(len(self.listed()), 200)
        self.assertLess(seconds, 6 if not is_sanitized() else 12)

    def test_known_episodes_cost_little(self):
        count = 20_000
        url = self.web.url("/media/")
        self.publish(*(item(element("title", f"Episode {number}"), element("pubDate", day(number)),
                            element("description", "About this episode. " * 10),
                            element("enclosure", url=f"{url}{number}.mp3", length="1", type="audio/mpeg"))
                       for number in range(count)))
        self.bundle.mkdir()
        entries = []
        for number in range(count):
            (self.bundle / f"{number}.mp3").write_bytes(b"x")
            entries.append({"EpisodeName": f"Episode {number}", "EpisodeOrigin": f"{url}{number}.mp3",
                            "EpisodeReference": f"{number}.mp3", "EpisodeReferenceType": "local"})
        (self.bundle / "Info.plist").write_bytes(plistlib.dumps({"Episodes": entries}))
        self.timed(self.feed_url, self.bundle)  # takes over what the source says
        before = (self.bundle / "Info.plist").stat().st_mtime_ns
        seconds, memory = self.timed(self.feed_url, self.bundle)
        self.assertEqual((self.bundle / "Info.plist").stat().st_mtime_ns, before)
        self.assertEqual(len(self.listed()), count)
        if not is_sanitized():
            self.assertLess(seconds, 2)
            self.assertLess(memory, 200_000_000)

    def test_memory_does_not_grow_with_media(self):
        piece = os.urandom(1 << 20)
        sizes = {}
        for count in (1, 64):
            def answer(exchange, count=count):
                exchange.head(200, [("Content-Length", str(count << 20))])
                for _ in range(count):
                    exchange.send(piece)
            self.bundle = self.path(f"{count}.podcast")
            self.publish(self.episode(1, url=self.web.route("/1.mp3", answer)))
            _, sizes[count] = self.timed(self.feed_url, self.bundle)
        self.assertLess(sizes[64] - sizes[1], 4_000_000)


if __name__ == "__main__":
    unittest.main()
