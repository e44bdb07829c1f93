"""What keeping a show costs: transfers at once for many small files, and memory."""

import os
import plistlib
import subprocess
import threading
import time
import unittest

from keep_support import KeepTestCase, day
from support import element, environment, is_sanitized, item


class CostTest(KeepTestCase):
    def peak(self, *arguments):
        """The peak of memory (bytes) of a run that does well."""
        process = subprocess.Popen(self.command(*arguments), stdin=subprocess.DEVNULL, stdout=subprocess.DEVNULL,
                                   env=environment())
        _, status, usage = os.wait4(process.pid, 0)
        process.returncode = os.waitstatus_to_exitcode(status)
        self.assertEqual(process.returncode, 0)
        return usage.ru_maxrss * 1024

    def test_as_many_files_come_at_once_as_there_are_jobs(self):
        body = os.urandom(100_000)
        lock = threading.Lock()
        running = [0]

        def answer(exchange):
            with lock:
                running.append(running[-1] + 1)
            time.sleep(0.1)
            with lock:
                running.append(running[-1] - 1)
            exchange.reply(200, body)
        self.publish(*(self.episode(number, url=self.web.route(f"/{number}.mp3", answer)) for number in range(50)))
        self.peak(self.feed_url, self.bundle)
        self.assertEqual(len(self.listed()), 50)
        self.assertEqual(max(running), 4)

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
        self.peak(self.feed_url, self.bundle)  # takes over what the source says
        before = (self.bundle / "Info.plist").stat().st_mtime_ns
        memory = self.peak(self.feed_url, self.bundle)
        self.assertEqual((self.bundle / "Info.plist").stat().st_mtime_ns, before)
        self.assertEqual(len(self.listed()), count)
        if not is_sanitized():
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
            sizes[count] = self.peak(self.feed_url, self.bundle)
        self.assertLess(sizes[64] - sizes[1], 4_000_000)


if __name__ == "__main__":
    unittest.main()
