"""Runs are interrupted at any moment, also by signals that nobody can catch. What has a final name stays whole.

A killed run may leave hidden files, which the next run removes.
"""

import itertools
import os
import random
import re
import shutil
import signal
import subprocess
import time
import unittest

from bundle_support import contents, digests, eventually, hidden
from interruption import ENDING_SIGNALS, InterruptionTestCase, expect_signals
from support import soaking, start


class RandomMomentTest(InterruptionTestCase):
    """Signals that end the tool, the one that it ignores and the one that nobody can handle, anywhere in a run."""

    SIGNALS = (*ENDING_SIGNALS, signal.SIGPIPE, signal.SIGKILL)
    TURNS = 40 if soaking() else 3  # for each signal
    MOST_TURNS = 40
    OLD = b"the output of an earlier run"

    def assertInterruptible(self, arguments, prepare, judge):
        """Runs the tool once, and then again and again with a signal. `prepare` is called before each run and `judge`,
        with the number of the signal that ended it or None, behind it. `judge` tells whether it found the work half
        done, which some signal must have brought about: as many as that takes are sent."""
        prepare()
        began = time.monotonic()
        self.assertEqual(self.run_tool(*arguments).status, 0)
        duration = time.monotonic() - began
        judge(None)
        seed = random.SystemRandom().randrange(1 << 32)
        moments = random.Random(seed)
        sent = ended = amid = 0
        for turn in itertools.count():
            if turn >= self.TURNS and (amid or turn >= self.MOST_TURNS):
                break
            for number in self.SIGNALS:
                with self.subTest(seed=seed, turn=turn, signal=number):
                    prepare()
                    process = start(*arguments, stdout=subprocess.DEVNULL, cwd=self.directory,
                                    preexec_fn=expect_signals)
                    time.sleep(moments.uniform(0, duration))
                    process.send_signal(number)
                    process.wait(timeout=60)
                    self.assertIn(process.returncode, (0, -number))
                    sent += 1
                    ended += process.returncode != 0
                    amid += judge(number if process.returncode else None)
        print(f"{self._testMethodName}, {arguments[0]} of {os.path.basename(arguments[1])}: "
              f"{sent} signals, of which {ended} ended it, {amid} amid its work", flush=True)
        self.assertGreater(amid, 0, "no signal met the run at its work")

    def assertFileIsWritten(self, command, source):
        expected = self.run_tool(command, source).stdout
        date = re.search(rb"<pubDate>[^<]*</pubDate>", expected)  # of the generation, and as long as any other

        def undated(content):
            first, last = date.span() if date else (0, 0)
            return content[:first] + b"?" * len(content[first:last]) + content[last:]

        def prepare():
            self.write("out", self.OLD)
            self.listing = sorted(path.name for path in self.directory.iterdir())

        def judge(number):
            content = self.path("out").read_bytes()
            if number is None:
                self.assertEqual(undated(content), undated(expected))
            elif content != self.OLD:  # it is written in place, so it may be cut, but it is never anything else
                self.assertNotEqual(number, signal.SIGPIPE)
                self.assertTrue(undated(expected).startswith(undated(content)))
            self.assertEqual(sorted(path.name for path in self.directory.iterdir()), self.listing)
            # What is written takes a moment, what comes before it takes longer.
            return number is not None and number != signal.SIGPIPE

        self.assertInterruptible((command, source, "-d", "out"), prepare, judge)

    def test_writing_a_file(self):
        text = "Night & Walks 🚶 " * 100
        podcast = {"PodcastName": "Show", "Episodes": [{"EpisodeName": f"{number} {text}"} for number in range(1500)]}
        source = self.reference(podcast)
        feed = self.run_tool("createfeed", source).stdout
        for command, kind in (("parsefeed", str(source)), ("parsefeed", self.server().serve("/feed", feed)),
                              ("createfeed", str(source)), ("createfeed", self.feed(feed))):
            self.assertFileIsWritten(command, kind)

    def assertBundleIsFilled(self, show, files, earlier):
        """The run fills a bundle, in which the earlier files stand, with all of the files, in their order. After the
        signal those up to some file are new and whole, the others are as they were, and the next run completes them."""
        source = self.reference(show, name="show.plist")

        def prepare():
            shutil.rmtree(self.bundle, ignore_errors=True)
            self.bundle.mkdir()
            for path, content in earlier.items():
                (self.bundle / path).write_bytes(content)

        def judge(number):
            found = self.files()
            left = [path for path in found if os.path.basename(path).startswith(".")]
            if number != signal.SIGKILL:
                self.assertEqual(left, [])
            done = sum(found.get(path) == content for path, content in files.items())
            expected = {**earlier, **dict(itertools.islice(files.items(), done))}
            self.assertEqual(digests({path: found[path] for path in found.keys() - left}), digests(expected))
            if number is None or (self.bundle / "Info.plist").exists():
                self.assertEqual(done, len(files))
            if number == signal.SIGPIPE:
                self.assertEqual(found.keys(), earlier.keys())
            if number is None or (self.bundle / "Info.plist").exists():
                self.assertEqual(self.references(), list(files))
            if number in (signal.SIGKILL, signal.SIGTERM):
                self.assertEqual(self.create(source).status, 0)
                self.assertEqual(digests(self.files()), digests(files))
                if earlier:  # a copy never takes the place of what is there
                    self.assertEqual(self.references(), list(files))
            return 0 < done < len(files)

        self.assertInterruptible(("createbundle", source, "-d", self.bundle), prepare, judge)

    def media_files(self):
        return {f"{number}.mp3": random.Random(number).randbytes(200_000) for number in range(10)}

    def test_filling_a_bundle_with_downloads(self):
        web = self.server()
        files = self.media_files()
        self.assertBundleIsFilled({"Episodes": [
            {"EpisodeReference": web.dripping(f"/{name}", content, pause=0.003, piece=40_000)}
            for name, content in files.items()]}, files,
            earlier={name: f"another {name}".encode() * 20_000 for name in list(files)[:8]})

    def test_filling_a_bundle_with_copies(self):
        files = self.media_files()
        self.assertBundleIsFilled({"Episodes": [{"EpisodeReference": self.media(name, content)}
                                                for name, content in files.items()]}, files, earlier={})


class KillTest(InterruptionTestCase):
    """A kill at any moment leaves whole files, and hidden ones that the next run clears away. What is served changes
    from round to round, so that an old file that is written over shows."""

    EPISODES = 20
    ROUNDS = 80 if soaking() else 10
    KILLS = 3  # in a round, before the run that may finish

    def setUp(self):
        super().setUp()
        self.web = self.server()

    def edition(self, number):
        """The files of an edition of the show, which is served from now on, and a reference file for it."""
        made = random.Random(number)
        files = {"Posters/Podcast.png": made.randbytes(made.randrange(9000))}
        episodes = []
        for episode in range(self.EPISODES):
            media = made.randbytes(made.randrange(20_000 + 20_000 * (episode % 5)))
            poster = made.randbytes(made.randrange(3000))
            name = f"{episode}.mp3"
            if episode % 4 == 3:
                url = self.write(name, media).as_uri()
            elif episode % 4 == 1:
                url = self.web.dripping(f"/{name}", media, pause=0.003, piece=len(media) // 4 + 1)
            elif episode % 4 == 2:
                url = self.web.chunked(f"/{name}", [piece for piece in (media[:5000], media[5000:]) if piece])
            else:
                url = self.web.serve(f"/{name}", media)
            episodes.append({"EpisodeName": str(episode), "EpisodeReference": url,
                             "EpisodePosterReference": self.web.serve(f"/{episode}.jpg", poster)})
            files[name] = media
            files[f"Posters/{episode}.jpg"] = poster
        return files, self.reference({
            "PodcastName": f"Edition {number}",
            "PodcastPosterReference": self.web.serve("/cover.png", files["Posters/Podcast.png"]),
            "PodcastPosterReferenceType": "remote", "Episodes": episodes})

    def assertWhole(self, editions):
        """Every file under a final name is that of an edition, to the last byte, and so is Info.plist; where that is of
        the newest edition, all files are. Whether some are, and others not."""
        found = self.files() if self.bundle.exists() else {}
        found = {path: content for path, content in found.items() if not os.path.basename(path).startswith(".")}
        newest = editions[-1]
        for path, content in found.items():
            self.assertTrue(any(content == files[path] for files, _ in editions), f"{path} is not whole")
        new = [path for path, content in found.items() if content == newest[0][path]]
        if (self.bundle / "Info.plist").exists():
            title = self.assertComplete(self.info())
            self.assertIn(title, [title for _, title in editions])
            if title == newest[1]:
                self.assertEqual(len(new), len(newest[0]))
        return 0 < len(new) < len(newest[0])

    def assertComplete(self, info):
        self.assertEqual([episode["EpisodeReference"] for episode in info["Episodes"]],
                         [f"{number}.mp3" for number in range(self.EPISODES)])
        self.assertEqual([episode["EpisodePosterReference"] for episode in info["Episodes"]],
                         [f"Posters/{number}.jpg" for number in range(self.EPISODES)])
        return info["PodcastName"]

    def test_kills_at_random_moments(self):
        files, source = self.edition(0)
        began = time.monotonic()
        self.assertWarns(self.create(source))
        duration = time.monotonic() - began
        seed = random.SystemRandom().randrange(1 << 32)
        moments = random.Random(seed)
        left_behind = killed = amid = 0
        for round_number in range(1, self.ROUNDS + 1):
            editions = [(files, f"Edition {round_number - 1}")]
            if round_number % 3 == 0:  # sometimes nothing is there yet
                for path in self.files():
                    (self.bundle / path).unlink()
                (self.bundle / "Info.plist").unlink()
                editions.clear()
            files, source = self.edition(round_number)
            editions.append((files, f"Edition {round_number}"))
            for _ in range(self.KILLS):
                process = self.begin(source, stdout=subprocess.DEVNULL)
                time.sleep(moments.uniform(0, duration))
                process.kill()
                process.communicate(timeout=60)
                with self.subTest(seed=seed, round=round_number):
                    self.assertIn(process.returncode, (0, -signal.SIGKILL))
                    amid += self.assertWhole(editions)
                killed += process.returncode != 0
                left_behind += len(hidden(self.bundle))
            with self.subTest(seed=seed, round=round_number, moment="after"):
                self.assertWarns(self.create(source))
                self.assertEqual(digests(self.files()), digests(files))
                self.assertEqual(self.assertComplete(self.info()), f"Edition {round_number}")
                self.assertEqual(contents(self.bundle).keys(), {"Info.plist", "Posters", *files})
        print(f"{self.ROUNDS * self.KILLS} kills, of which {killed} met a run, {amid} a bundle half made, and "
              f"{left_behind} a file half written; {self.ROUNDS} runs to the end", flush=True)
        self.assertGreater(left_behind, 0, "no kill met a file half written")
        self.assertGreater(amid, 0, "no kill met a bundle half made")

    def test_hidden_files_of_a_killed_run_are_cleared_away(self):
        for number in (signal.SIGKILL, signal.SIGABRT, signal.SIGSEGV):
            with self.subTest(number):
                url, gate = self.held(self.server(), f"/{number}.mp3", b"half of it")
                process = self.begin({"Episodes": [{"EpisodeReference": url}]})
                gate.reached()
                eventually(lambda: hidden(self.bundle))
                process.send_signal(number)
                process.communicate(timeout=60)
                name, = hidden(self.bundle)
                for folder in ("Posters", ".."):
                    (self.bundle / folder / name).write_bytes(b"half of it")
                (self.bundle / ".qel-notes.part").write_bytes(b"mine")
                self.assertRuns(self.create({}), "Fetching 0 episodes")
                self.assertEqual(contents(self.bundle).keys(), {"Info.plist", "Posters", ".qel-notes.part"})
                self.assertTrue(self.path(name).exists())
                (self.bundle / ".qel-notes.part").unlink()


if __name__ == "__main__":
    unittest.main()
