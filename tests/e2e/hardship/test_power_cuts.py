"""The power is cut at random moments while a bundle is filled, and after: what Info.plist lists is whole, and once the
run has said that it is done, everything is there.

Images of a file system that take nothing any more from one moment on stand for the cut. They need root.
"""

import plistlib
import random
import subprocess
import time
import unittest

from bundle_support import BundleTestCase
from mounted import Image
from support import soaking, start

EPISODES = 12


class PowerCutTest(BundleTestCase):
    MOMENTS = 67 if soaking() else 6

    def setUp(self):
        super().setUp()
        self.image = Image(self.path("image"), self.path("mounted"))
        self.addCleanup(self.image.unmount)
        self.bundle = self.image.point / "show.podcast"
        self.image.unmount()
        self.empty = self.image.path.read_bytes()

    def show(self, generation, is_remote):
        """A show whose files have the names of every generation's, and contents of their own; its reference file."""
        sizes = random.Random(generation)
        contents, entries = {}, []
        for number in range(EPISODES):
            for folder, name in (("", f"{number}.mp3"), ("Posters/", f"{number}.jpg")):
                content = f"{generation} {number} ".encode() * sizes.randrange(10, 40_000)
                path = self.media(f"{generation}/{name}", content)
                contents[folder + name] = content
                (self.path("media") / f"{generation}/{name}").write_bytes(content)
                location = (self.path("media") / f"{generation}/{name}").as_uri() if is_remote else path
                if folder:
                    entries[-1]["EpisodePosterReference"] = location
                else:
                    entries.append({"EpisodeReference": location})
        return contents, self.reference({"PodcastName": generation, "Episodes": entries}, name=f"{generation}.plist")

    def assertWhole(self, shows, is_done):
        """What Info.plist lists is that of one of the shows, whole; if the run was done, of the last."""
        path = self.bundle / "Info.plist"
        if not path.exists():
            self.assertFalse(is_done, "the run was done")
            return
        info = plistlib.loads(path.read_bytes())
        if is_done:
            self.assertEqual(info["PodcastName"], shows[-1][0])
        self.assertEqual(len(info["Episodes"]), EPISODES)
        for entry in info["Episodes"]:
            for name in (entry["EpisodeReference"], entry["EpisodePosterReference"]):
                content = (self.bundle / name).read_bytes()
                whole = [contents[name] for _, contents in (shows[-1:] if is_done else shows)]
                self.assertTrue(content in whole, f"{name} is not whole: {len(content)} bytes, "
                                f"not {' or '.join(str(len(other)) for other in whole)}")

    def cut_at_random_moments(self, is_remote, has_earlier):
        names = ["earlier", "new"] if has_earlier else ["new"]
        shows, sources = [], []
        for name in names:
            contents, source = self.show(name, is_remote)
            shows.append((name, contents))
            sources.append(source)
        if has_earlier:
            self.image.mount()
            self.assertWarns(self.create(sources[0]))
            self.image.unmount()
            self.empty = self.image.path.read_bytes()
        seed = random.SystemRandom().randrange(1 << 32)
        moments = random.Random(seed)
        duration, met, done = 0.1, 0, 0
        for number in range(self.MOMENTS):
            self.image.path.write_bytes(self.empty)
            self.image.mount()
            began = time.monotonic()
            process = start("createbundle", sources[-1], "-d", self.bundle, stdout=subprocess.PIPE,
                            stderr=subprocess.PIPE)
            if number == 0:
                process.wait(timeout=60)
                duration = time.monotonic() - began
            time.sleep(moments.uniform(0, 1.3 * duration) if number else 0)
            is_done = process.poll() == 0
            self.image.cut()
            process.communicate(timeout=60)
            self.image.unmount()
            self.image.mount()
            with self.subTest(seed=seed, number=number, is_done=is_done):
                self.assertWhole(shows, is_done)
            met += (self.bundle / "Posters").exists() and not is_done
            done += is_done
            self.image.unmount()
        kind = f"{'downloads' if is_remote else 'copies'}{' over an earlier bundle' if has_earlier else ''}"
        print(f"{kind}: {self.MOMENTS} power cuts, of which {met} met a bundle being filled and {done} came later",
              flush=True)
        self.assertGreater(done, 0)

    def test_copies(self):
        self.cut_at_random_moments(is_remote=False, has_earlier=False)

    def test_downloads(self):
        self.cut_at_random_moments(is_remote=True, has_earlier=False)

    def test_downloads_over_an_earlier_bundle(self):
        self.cut_at_random_moments(is_remote=True, has_earlier=True)


if __name__ == "__main__":
    unittest.main()
