"""Names that feeds would give to files, and what they become."""

import os
import unittest

from bundle_support import contents
from keep_support import KeepTestCase
from support import element


class NamesTest(KeepTestCase):
    def name_of(self, path):
        self.bundle = self.path(f"{len(os.listdir(self.directory))}.podcast")
        self.publish(self.episode(1, url=self.web.serve(path, b"media 1")))
        self.assertKept(self.keep(), "1 new, 0 known, 0 failed")
        self.media(1)
        self.assertEqual(sorted(contents(self.bundle)), sorted(["Info.plist", "Posters", *self.listed("EpisodeReference")]))
        return self.listed("EpisodeReference")[0]

    def test_hostile_names_are_names_like_others(self):
        for path, name in [
                ("/Info.plist", "Info-2.plist"),
                ("/info.PLIST", "info-2.PLIST"),
                ("/Posters", "Posters-2"),
                ("/..%2F..%2Fetc%2Fpasswd.mp3", "passwd.mp3"),
                ("/%2E%2E", "episode"),
                ("/", "episode"),
                ("/CON.mp3", "_CON.mp3"),
                ("/a:b%5C.mp3", "ab_.mp3"),
                ("/.qel-0123456789abcdef.part", "qel-0123456789abcdef.part"),
                ("/%0A%1B%5B2J.mp3", "__[2J.mp3"),
                ("/" + "a" * 300 + ".mp3", "a" * 251 + ".mp3"),
                ("/play?id=1", "play"),
                ("/one.mp3?x=/two.ogg", "one.mp3")]:
            with self.subTest(path):
                self.assertEqual(self.name_of(path), name)

    def test_names_that_differ_in_case_are_not_free(self):
        urls = [self.web.serve(f"/{name}", f"media {number}".encode())
                for number, name in enumerate(["Show.mp3", "SHOW.MP3", "show-2.mp3", "stra%C3%9Fe.mp3", "STRASSE.mp3"])]
        self.publish(*(self.episode(number, url=url) for number, url in enumerate(urls)))
        self.assertKept(self.keep(), "5 new, 0 known, 0 failed")
        self.media(0, 1, 2, 3, 4)
        self.assertEqual(self.listed("EpisodeReference"),
                         ["Show.mp3", "SHOW-2.MP3", "show-2-2.mp3", "straße.mp3", "STRASSE-2.mp3"])

    def test_posters_that_lead_out_are_not_written(self):
        elsewhere = self.path("elsewhere")
        elsewhere.mkdir()
        self.bundle.mkdir()
        (self.bundle / "Posters").symlink_to(elsewhere)
        poster = self.web.serve("/poster.png", b"poster")
        self.publish(self.episode(1, element("orvane:image", href=poster)))
        self.assertKept(self.keep(), "1 new, 0 known, 1 failed", 1,
                        f'qel-keep: poster of "Episode 1": {poster}: There is no place for it\n')
        self.assertEqual(list(elsewhere.iterdir()), [])
        self.media(1)


if __name__ == "__main__":
    unittest.main()
