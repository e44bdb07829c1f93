"""What qel-keep shows on a terminal."""

import os
import pty
import re
import subprocess
import time
import unittest

from bundle_support import Gate, eventually
from keep_support import KeepTestCase
from support import environment


class TerminalTest(KeepTestCase):
    def on_terminal(self, during=lambda: None, **variables):
        """All that a run shows on a terminal; `during` is called while it runs."""
        terminal, end = pty.openpty()
        process = subprocess.Popen(self.command(self.feed_url, self.bundle), stdin=subprocess.DEVNULL, stdout=end,
                                   stderr=end, env=environment({"TERM": "xterm", **variables}))
        os.close(end)
        during()
        shown = b""
        while True:
            try:
                piece = os.read(terminal, 65536)
            except OSError:  # closed at the other end
                break
            if not piece:
                break
            shown += piece
        os.close(terminal)
        process.wait()
        return shown.decode()

    def test_each_running_transfer_has_a_line(self):
        gate = Gate()

        def answer(exchange):
            exchange.head(200, [("Content-Length", "1000")])
            exchange.send(b"x" * 500)
            gate.wait()
            exchange.send(b"x" * 500)
        self.publish(*(self.episode(number, url=self.web.route(f"/{number}.mp3", answer)) for number in range(2)))

        def during():
            eventually(lambda: self.web.hits("/0.mp3") and self.web.hits("/1.mp3"))
            time.sleep(0.7)
            gate.open()
        shown = self.on_terminal(during)
        both = re.search(r'"Episode 0" +\[##########-{10}\] +50% +[\d.]+ k?B/s +\d+:\d\d\r\n'
                         r'"Episode 1" +\[##########-{10}\] +50% .*\r\n0 of 2 files +\r\n', shown)
        self.assertTrue(both, shown)
        self.assertIn("\x1b[3F\x1b[J", shown)
        self.assertTrue(shown.endswith("2 new, 0 known, 0 failed\r\n"), shown)

    def test_titles_do_not_steer_the_terminal(self):
        self.publish(self.episode(1, title="A\u009b2JB"), self.episode(2, title="C\u0085D", url=self.web.url("/none")))
        shown = self.on_terminal()
        self.assertIn('fetched "A\ufffd2JB": 1.mp3 (7 B)\r\n', shown)
        self.assertIn('qel-keep: "C\ufffdD": ', shown)
        self.assertNotRegex(shown, "[\x80-\x9f]")

    def test_a_dumb_terminal_gets_plain_lines(self):
        self.publish(self.episode(1))
        self.assertEqual(self.on_terminal(TERM="dumb"),
                         'fetched "Episode 1": 1.mp3 (7 B)\r\n1 new, 0 known, 0 failed\r\n')


if __name__ == "__main__":
    unittest.main()
