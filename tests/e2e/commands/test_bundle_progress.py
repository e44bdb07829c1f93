"""Every line that is said while a bundle is made, to the byte: people watch them and scripts read them.

A terminal gets the same bytes as a pipe. The byte counter is drawn over itself while a download runs.
"""

import os
import pty
import select
import subprocess
import termios
import unittest

from bundle_support import BundleTestCase
from support import LOADING, checked, start


class WholeRunTest(BundleTestCase):
    """Standard output to the last byte."""

    def test_a_local_show(self):
        show = {"PodcastName": "Night Walks", "PodcastPosterReference": self.media("cover.jpg"),
                "Episodes": [{"EpisodeName": "One", "EpisodeReference": self.media("one.mp3")},
                             {"EpisodeName": "Two", "EpisodeReference": self.media("two.mp3"),
                              "EpisodePosterReference": self.media("two.png")}]}
        self.assertSucceeds(self.create(show), LOADING + b"[N] Fetching 2 episodes\n"
                            b"[N] Fetching episode 1...\n[N] Fetched episode 1\n"
                            b"[N] Fetching episode 2...\n[N] Fetched episode 2\n[N] Done!\n")

    def remote_show(self):
        web = self.server()
        return {"PodcastName": "Night Walks", "PodcastPosterReference": web.serve("/cover.jpg", b"cover"),
                "PodcastPosterReferenceType": "remote",
                "Episodes": [{"EpisodeName": "One", "EpisodeReference": web.serve("/one.mp3", bytes(1000)),
                              "EpisodeFileSize": 7},
                             {"EpisodeName": "Two", "EpisodeReference": web.serve("/two.mp3", b"12"),
                              "EpisodePosterReference": web.serve("/two.png", b"poster")},
                             {"EpisodeName": "Three", "EpisodeReference": web.url("/missing.mp3")},
                             {"EpisodeName": "Four", "EpisodeReference": web.serve("/empty.mp3", b"")}]}

    REMOTE_OUTPUT = LOADING + (
        b'[N] Downloading poster for podcast entitled "Night Walks"...\n'
        b"[N] Fetching 4 episodes\n"
        b"[N] Fetching episode 1...\n"
        b'[N] Downloading episode entitled "One" (7 bytes)...\n'
        b"  -- 1000 / 1000 (100.0%)\n"
        b"[N] Fetched episode 1\n"
        b"[N] Fetching episode 2...\n"
        b'[N] Downloading episode entitled "Two" (0 bytes)...\n'
        b"  -- 2 / 2 (100.0%)\n"
        b'[N] Downloading poster for episode entitled "Two"...\n'
        b"[N] Fetched episode 2\n"
        b"[N] Fetching episode 3...\n"
        b'[N] Downloading episode entitled "Three" (0 bytes)...\n'
        b'[W] Could not save or download episode "Three"\n'
        b"[N] Skipping episode 3\n"
        b"[N] Fetching episode 4...\n"
        b'[N] Downloading episode entitled "Four" (0 bytes)...\n'
        b"[N] Fetched episode 4\n"
        b"[N] Done!\n")

    def test_a_remote_show(self):
        self.assertSucceeds(self.create(self.remote_show()), self.REMOTE_OUTPUT)

    def test_a_terminal_gets_the_same_bytes(self):
        source = self.reference(self.remote_show())
        terminal, side = pty.openpty()
        attributes = termios.tcgetattr(side)
        attributes[1] &= ~termios.OPOST  # or every line break would come with a carriage return
        termios.tcsetattr(side, termios.TCSANOW, attributes)
        with start("createbundle", source, "-d", self.bundle, stdout=side, stderr=subprocess.PIPE) as process:
            os.close(side)
            output = b""
            while True:
                try:
                    piece = os.read(terminal, 65536)
                except OSError:  # all of the tool's ends are closed
                    break
                if not piece:
                    break
                output += piece
            os.close(terminal)
            process.communicate(timeout=60)
        self.assertEqual(checked((), process.returncode).status, 0)
        self.assertEqual(output, self.REMOTE_OUTPUT)

    def test_titles(self):
        """Absent ones, and one that would be a format."""
        web = self.server()
        show = {"PodcastPosterReference": web.serve("/cover.jpg", b"cover"), "PodcastPosterReferenceType": "remote",
                "Episodes": [{"EpisodeReference": web.serve("/one.mp3", b""),
                              "EpisodePosterReference": web.serve("/one.jpg", b"")}, {},
                             {"EpisodeName": "100 %@ %lu %n", "EpisodeReference": web.url("/one.mp3")}]}
        self.assertRuns(self.create(show), 'Downloading poster for podcast entitled "(null)"...',
                        "Fetching 3 episodes", "Fetching episode 1...",
                        'Downloading episode entitled "(null)" (0 bytes)...',
                        'Downloading poster for episode entitled "(null)"...', "Fetched episode 1",
                        "Fetching episode 2...", 'W Found an episode ("(null)") without a specified location',
                        "Skipping episode 2", "Fetching episode 3...",
                        'Downloading episode entitled "100 %@ %lu %n" (0 bytes)...', "Fetched episode 3")


class CounterTest(BundleTestCase):
    HEAD = LOADING + (b"[N] Fetching 1 episodes\n[N] Fetching episode 1...\n"
                      b'[N] Downloading episode entitled "One" (0 bytes)...\n')

    def test_each_piece_is_shown_when_it_comes(self):
        pieces = ((b"a" * 512, self.HEAD + b"  -- 512 / 2048 (25.0%)"),
                  (b"b" * 500, b"\b" * 23 + b"  -- 1012 / 2048 (49.4%)"),
                  (b"c" * 1036, b"\b" * 24 + b"  -- 2048 / 2048 (100.0%)"))
        gates = [self.gate() for _ in pieces]

        def answer(exchange):
            exchange.head(200, [("Content-Length", "2048")])
            for gate, (piece, _) in zip(gates, pieces):
                gate.wait()
                exchange.send(piece)
        source = self.reference({"Episodes": [{"EpisodeReference": self.server().route("/one.mp3", answer),
                                               "EpisodeName": "One"}]})
        process = start("createbundle", source, "-d", self.bundle, bufsize=0, stdout=subprocess.PIPE,
                        stderr=subprocess.PIPE)
        self.addCleanup(process.communicate)
        self.addCleanup(process.kill)
        for gate, (_, expected) in zip(gates, pieces):
            gate.open()
            output = b""
            while len(output) < len(expected) and select.select([process.stdout], [], [], 20)[0]:
                piece = process.stdout.read(len(expected) - len(output))
                if not piece:
                    break
                output += piece
            self.assertEqual(output, expected)
        stdout, stderr = process.communicate(timeout=60)
        self.assertEqual((process.returncode, stdout, stderr), (0, b"\n[N] Fetched episode 1\n[N] Done!\n", b""))

    def test_a_broken_download_keeps_its_counter_on_the_screen(self):
        url = self.server().truncated("/one.mp3", b"12345", missing=5)
        self.assertSucceeds(self.create_episodes({"EpisodeReference": url, "EpisodeName": "One"}),
                            self.HEAD + b"  -- 5 / 10 (50.0%)\n"
                            b'[W] Could not save or download episode "One"\n[N] Skipping episode 1\n[N] Done!\n')


if __name__ == "__main__":
    unittest.main()
