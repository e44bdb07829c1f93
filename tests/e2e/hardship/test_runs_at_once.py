"""Runs into one bundle at once: no file is a mixture of theirs, and what is left is complete."""

import shutil
import subprocess
import unittest

from bundle_support import BundleTestCase, digests
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

    def assertOneOfEach(self, shows):
        """Each file is that of one of the shows."""
        found = self.files()
        self.assertEqual(found.keys(), shows[0][0].keys())
        for path, content in found.items():
            self.assertIn(content, [files[path] for files, _ in shows], path)
        self.assertIn(self.info()["PodcastName"], [show["PodcastName"] for _, show in shows])

    def test_downloads(self):
        web = self.server()
        shows = [self.show(f"show{number}", lambda path, content: web.serve(f"/{path}", content))
                 for number in range(self.RUNS)]
        for _ in range(self.ROUNDS):
            shutil.rmtree(self.bundle, ignore_errors=True)
            self.run_at_once([show for _, show in shows])
            self.assertOneOfEach(shows)
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
            self.assertOneOfEach(shows)
            self.assertLessEqual(set(self.references()), set(shows[0][0]))
        print(f"copies: {self.ROUNDS} times {self.RUNS} runs into one directory", flush=True)

    def test_one_show(self):
        web = self.server()
        files, show = self.show("show", lambda path, content: web.serve(f"/{path}", content))
        for _ in range(self.ROUNDS):
            self.run_at_once([show] * self.RUNS)
            self.assertEqual(digests(self.files()), digests(files))
            self.assertEqual(self.references(), list(files))


if __name__ == "__main__":
    unittest.main()
