"""Runs into one bundle at once take turns: what is left is the bundle of one of them."""

import shutil
import subprocess
import unittest
from pathlib import Path

from bundle_support import BundleTestCase, contents, digests, eventually, hidden, notices
from support import soaking, start


class RunsAtOnceTest(BundleTestCase):
    ROUNDS = 40 if soaking() else 5
    RUNS = 3
    EPISODES = 12

    def show(self, name, serve):
        """A show whose files have the names of every other show's, and contents of their own."""
        files = {f"{number}.mp3": f"{name} {number} ".encode() * 5000 for number in range(self.EPISODES)}
        return files, {"PodcastName": name, "Episodes": [
            {"EpisodeName": str(number), "EpisodeReference": serve(f"{name}/{number}.mp3", content)}
            for number, content in enumerate(files.values())]}

    def run_at_once(self, shows):
        sources = [self.reference(show, name=f"{number}.plist") for number, show in enumerate(shows)]
        processes = [start("createbundle", source, "-d", self.bundle, stdout=subprocess.DEVNULL, stderr=subprocess.PIPE)
                     for source in sources]
        for process in processes:
            _, stderr = process.communicate(timeout=120)
            self.assertEqual((process.returncode, stderr), (0, b""))

    def assertOfOneShow(self, shows):
        """All files are those of one of the shows. Its name."""
        found = self.files()
        whole = [show["PodcastName"] for files, show in shows if digests(files) == digests(found)]
        self.assertEqual(len(whole), 1, digests(found))
        return whole[0]

    def test_downloads(self):
        web = self.server()
        shows = [self.show(f"show{number}", lambda path, content: web.serve(f"/{path}", content))
                 for number in range(self.RUNS)]
        for _ in range(self.ROUNDS):
            shutil.rmtree(self.bundle, ignore_errors=True)
            self.run_at_once([show for _, show in shows])
            self.assertEqual(self.info()["PodcastName"], self.assertOfOneShow(shows))
            self.assertEqual(len(self.references()), self.EPISODES)
        print(f"downloads: {self.ROUNDS} times {self.RUNS} runs into one directory", flush=True)

    def local(self, path, content):
        self.path("media").joinpath(path).parent.mkdir(parents=True, exist_ok=True)
        return self.media(path, content)

    def test_copies(self):
        shows = [self.show(f"show{number}", self.local) for number in range(self.RUNS)]
        for _ in range(self.ROUNDS):
            shutil.rmtree(self.bundle, ignore_errors=True)
            self.run_at_once([show for _, show in shows])
            # The run that came last found every name taken.
            self.assertOfOneShow(shows)
            self.assertEqual(self.references(), [])
        print(f"copies: {self.ROUNDS} times {self.RUNS} runs into one directory", flush=True)

    def test_one_show(self):
        web = self.server()
        files, show = self.show("show", lambda path, content: web.serve(f"/{path}", content))
        for _ in range(self.ROUNDS):
            self.run_at_once([show] * self.RUNS)
            self.assertEqual(digests(self.files()), digests(files))
            self.assertEqual(self.references(), list(files))

    def held(self, directory=None):
        """A run that fetches an episode, and the gate behind which it goes on."""
        gate = self.gate()

        def answer(exchange):
            exchange.head(200, [("Content-Length", "10")])
            exchange.send(b"first")
            gate.wait()
            exchange.send(b"later")
        source = self.reference({"PodcastName": "First",
                                 "Episodes": [{"EpisodeReference": self.server().route("/one.mp3", answer)}]})
        process = start("createbundle", source, "-d", directory or self.bundle, stdout=subprocess.PIPE,
                        stderr=subprocess.PIPE)
        self.addCleanup(process.communicate)
        self.addCleanup(process.kill)
        gate.reached()
        eventually(lambda: hidden(self.bundle))
        return process, gate

    def second(self, directory=None):
        source = self.reference({"PodcastName": "Second", "Episodes": [{"EpisodeReference": self.media("two.mp3")}]},
                                name="two.plist")
        process = start("createbundle", source, "-d", directory or self.bundle, stdout=subprocess.PIPE,
                        stderr=subprocess.PIPE)
        self.addCleanup(process.communicate)
        self.addCleanup(process.kill)
        return process

    def assertWaits(self, process):
        """It waits for a lock, and has made nothing."""
        eventually(lambda: any("->" in line.split() and str(process.pid) in line.split()
                               for line in Path("/proc/locks").read_text().splitlines()))
        self.assertIsNone(process.poll())
        self.assertEqual(set(contents(self.bundle)) - set(hidden(self.bundle)), {"Posters"})

    def finish(self, process, output=None):
        stdout, stderr = process.communicate(timeout=60)
        self.assertEqual((process.returncode, stderr), (0, b""))
        if output is not None:
            self.assertEqual(stdout, output)

    def test_a_run_waits_without_a_word_until_the_other_ends(self):
        self.path("link").symlink_to(self.bundle)
        for directory in (self.bundle, self.path("link"), self.path(".") / "show.podcast"):
            with self.subTest(directory):
                shutil.rmtree(self.bundle, ignore_errors=True)
                first, gate = self.held()
                second = self.second(directory)
                self.assertWaits(second)
                gate.open()
                self.finish(first)
                self.finish(second, notices("Fetching 1 episodes", "Fetching episode 1...", "Fetched episode 1", "Done!"))
                self.assertEqual(self.files(), {"one.mp3": b"firstlater", "two.mp3": b"media"})
                self.assertEqual(self.info()["PodcastName"], "Second")

    def test_a_run_that_is_killed_lets_the_other_go_on(self):
        first, _ = self.held()
        second = self.second()
        self.assertWaits(second)
        first.kill()
        self.finish(second)
        self.assertEqual(contents(self.bundle).keys(), {"Posters", "two.mp3", "Info.plist"})

    def test_where_everyone_may_make_files_nobody_waits(self):
        self.bundle.mkdir()
        self.bundle.chmod(0o1777)
        first, gate = self.held()
        self.finish(self.second())
        self.assertEqual(len(hidden(self.bundle)), 1, "the hidden file of a living run")
        gate.open()
        self.finish(first)
        self.assertEqual(self.files(), {"one.mp3": b"firstlater", "two.mp3": b"media"})

    def test_what_a_killed_run_left_where_everyone_may_make_files_is_removed(self):
        self.bundle.mkdir()
        self.bundle.chmod(0o1777)
        first, _ = self.held()
        first.kill()
        first.wait()
        self.finish(self.second())
        self.assertEqual(hidden(self.bundle), [])


if __name__ == "__main__":
    unittest.main()
