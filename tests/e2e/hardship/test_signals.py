"""Runs are interrupted at each of their stages: by people, by shutdowns and by readers that go away.

A signal that asks the tool to end leaves nothing behind but finished files.
"""

import os
import signal
import unittest

from bundle_support import contents, eventually, hidden
from interruption import ENDING_SIGNALS, InterruptionTestCase


class EndingSignalTest(InterruptionTestCase):
    def test_in_the_middle_of_an_episode(self):
        for number in ENDING_SIGNALS:
            with self.subTest(number):
                web = self.server()
                url, gate = self.held(web, "/two.mp3", b"half of it")
                process = self.begin({"Episodes": [{"EpisodeReference": web.serve("/one.mp3", b"whole")},
                                                   {"EpisodeReference": url}]})
                gate.reached()
                eventually(lambda: hidden(self.bundle))
                self.assertEndsBy(process, number)
                self.assertEqual(contents(self.bundle), {"Posters": None, "one.mp3": b"whole"})

    def test_before_the_answer_to_a_request(self):
        gate = self.gate()
        url = self.server().route("/one.mp3", lambda exchange: gate.wait())
        process = self.begin({"Episodes": [{"EpisodeReference": url}]})
        gate.reached()
        self.assertEndsBy(process, signal.SIGINT)
        self.assertEqual(contents(self.bundle), {"Posters": None})

    def test_in_the_middle_of_a_poster(self):
        web = self.server()
        poster = web.url("/face.jpg")
        for show, files in (({"PodcastPosterReference": poster, "PodcastPosterReferenceType": "remote"}, {}),
                            ({"Episodes": [{"EpisodeReference": web.serve("/one.mp3", b"whole"),
                                            "EpisodePosterReference": poster}]}, {"one.mp3": b"whole"})):
            with self.subTest(show):
                _, gate = self.held(web, "/face.jpg", b"half of it")
                process = self.begin(show)
                gate.reached()
                eventually(lambda: hidden(self.bundle))
                self.assertEndsBy(process, signal.SIGTERM)
                self.assertEqual(contents(self.bundle), {"Posters": None, **files})

    def test_while_the_feed_is_fetched(self):
        url, gate = self.held(self.server(), "/feed", b"<rss>")
        process = self.begin(url)
        gate.reached()
        self.assertEndsBy(process, signal.SIGTERM)
        self.assertFalse(self.bundle.exists())

    def test_files_of_an_earlier_run_stay_as_they_were(self):
        web = self.server()
        show = {"PodcastName": "Show", "Episodes": [{"EpisodeReference": web.serve("/one.mp3", b"earlier")}]}
        self.assertWarns(self.create(show))
        before = contents(self.bundle)
        _, gate = self.held(web, "/one.mp3", b"later")
        process = self.begin(show)
        gate.reached()
        eventually(lambda: hidden(self.bundle))
        self.assertEndsBy(process, signal.SIGINT)
        self.assertEqual(contents(self.bundle), before)

    def test_a_second_signal_at_once(self):
        url, gate = self.held(self.server(), "/one.mp3", b"half of it")
        process = self.begin({"Episodes": [{"EpisodeReference": url}]})
        gate.reached()
        eventually(lambda: hidden(self.bundle))
        process.send_signal(signal.SIGINT)
        process.send_signal(signal.SIGTERM)
        process.communicate(timeout=60)
        self.assertIn(process.returncode, (-signal.SIGINT, -signal.SIGTERM))
        self.assertEqual(hidden(self.bundle), [])

    def test_an_ignored_signal_stays_ignored(self):
        gate = self.gate()

        def answer(exchange):
            gate.wait()
            exchange.reply(200, b"whole")
        url = self.server().route("/one.mp3", answer)
        process = self.begin({"Episodes": [{"EpisodeReference": url}]},
                             preexec_fn=lambda: signal.signal(signal.SIGHUP, signal.SIG_IGN))
        gate.reached()
        process.send_signal(signal.SIGHUP)
        gate.open()
        process.communicate(timeout=60)
        self.assertEqual(process.returncode, 0)
        self.assertEqual(self.files(), {"one.mp3": b"whole"})

    def test_a_stopped_run_goes_on(self):
        url, gate = self.held(self.server(), "/one.mp3", b"first", b"later")
        process = self.begin({"Episodes": [{"EpisodeReference": url}]})
        gate.reached()
        process.send_signal(signal.SIGSTOP)
        gate.open()
        process.send_signal(signal.SIGCONT)
        process.communicate(timeout=60)
        self.assertEqual(process.returncode, 0)
        self.assertEqual(self.files(), {"one.mp3": b"firstlater"})


class LostReaderTest(InterruptionTestCase):
    """Nobody has to read the progress lines to the end."""

    def test_a_reader_that_goes_away(self):
        web = self.server()
        gate = self.gate()

        def answer(exchange):
            gate.wait()
            exchange.reply(200, b"whole")
        reader, writer = os.pipe()
        process = self.begin({"Episodes": [{"EpisodeReference": web.route("/one.mp3", answer)},
                                           *({"EpisodeReference": web.serve(f"/{number}.mp3", b"x" * 1000)}
                                             for number in range(50))]}, stdout=writer)
        os.close(writer)
        gate.reached()
        os.close(reader)
        gate.open()
        _, stderr = process.communicate(timeout=60)
        self.assertEqual((process.returncode, stderr), (0, b""))
        self.assertEqual(len(self.references()), 51)

    def test_closed_standard_streams(self):
        for closed in ((1,), (0, 1), (0, 1, 2)):
            with self.subTest(closed):
                source = self.reference({"Episodes": [{"EpisodeReference": self.server().serve("/a.mp3", b"media")}]})
                result = self.run_tool("createbundle", source, "-d", self.bundle, closed=closed)
                self.assertEqual(result.status, 0)
                self.assertEqual(self.files(), {"a.mp3": b"media"})
                self.assertEqual(self.references(), ["a.mp3"])


if __name__ == "__main__":
    unittest.main()
