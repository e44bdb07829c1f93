"""qel-check looks into bundles: what they list, what lies in them, and how it is named."""

import datetime
import os
import plistlib
import unittest
from pathlib import Path

from support import ToolTestCase

SHOW = Path(__file__).resolve().parents[3] / "examples" / "show"

# What a file begins with, a name that it must not have, and what it is called.
KINDS = [
    (b"ID3\x04", "a.ogg", "an MP3 file"),
    (b"\xff\xfb\x90\x64", "a.m4a", "an MPEG audio file"),
    (b"\xff\xf1\x50\x80", "a.mp3", "an AAC file"),
    (b"\0\0\0\x20ftypM4A ", "a.mp3", "an MP4 file"),
    (b"OggS\0", "a.mp3", "an Ogg file"),
    (b"fLaC\0", "a.mp3", "a FLAC file"),
    (b"RIFF\0\0\0\0WAVE", "a.mp3", "a WAVE file"),
    (b"FORM\0\0\0\0AIFF", "a.mp3", "an AIFF file"),
    (b"\x1aE\xdf\xa3", "a.mp4", "a Matroska file"),
    (b"\xff\xd8\xff\xe0", "a.mp3", "a JPEG picture"),
    (b"\x89PNG\r\n", "a.jpg", "a PNG picture"),
    (b"GIF89a", "a.png", "a GIF picture"),
    (b"RIFF\0\0\0\0WEBP", "a.png", "a WebP picture"),
    (b"%PDF-1.7", "a.mp3", "a PDF document"),
    (b"PK\x03\x04", "a.mp3", "a ZIP archive"),
]
GOOD = [(b"ID3\x04", "a.MP3"), (b"\xff\xfb\x90", "a.mp3"), (b"\0\0\0\x20ftyp", "a.m4b"), (b"OggS", "a.opus"),
        (b"OggS", "a.unknown"), (b"anything", "a.mp3"), (b"\xff\xd8\xff", "a.jpeg"), (b"<html>", "a.html"),
        (b"\xff", "a.mp3"), (b"\xff\xff", "a.mp3")]
PAGES = [b"<!DOCTYPE html>", b"\xef\xbb\xbf \r\n<html lang='en'>", b"<HEAD>", b"<body>"]


class BundleTest(ToolTestCase):
    def setUp(self):
        super().setUp()
        self.bundle = self.path("show.podcast")
        self.bundle.mkdir()

    def list(self, *references, **podcast):
        episodes = [reference if isinstance(reference, dict) else {"EpisodeReference": reference}
                    for reference in references]
        (self.bundle / "Info.plist").write_bytes(plistlib.dumps({**podcast, "Episodes": episodes}))

    def put(self, name, content=b"media"):
        path = self.bundle / name
        path.parent.mkdir(exist_ok=True)
        path.write_bytes(content)

    def findings(self, *options, status=None):
        """What is found, without the path of the bundle."""
        result = self.run_tool("--all", *options, self.bundle, program="qel-check")
        lines = result.stdout.decode().splitlines()
        self.assertEqual((result.status, result.stderr), (1 if lines and status is None else status or 0, b""))
        return [line.removeprefix(f"{self.bundle}/").removeprefix("Info.plist:") for line in lines]

    def test_what_the_tool_makes_is_sound(self):
        bundle = self.path("lantern.podcast")
        self.assertSucceeds(self.run_tool("createbundle", SHOW / "reference.plist", "-d", bundle, cwd=SHOW))
        self.assertEqual(self.run_tool(bundle, program="qel-check"), (0, b"", b""))
        self.assertEqual(self.run_tool(".", program="qel-check", cwd=bundle), (0, b"", b""))
        os.rename(bundle, self.path("lantern"))
        self.assertEqual(self.run_tool("lantern", program="qel-check"), (
            1, b"lantern: warning: qel takes a directory for a bundle when its name ends in .podcast: rename it\n",
            b""))

    def test_a_directory_that_is_none(self):
        (self.path("empty")).mkdir()
        self.assertEqual(self.run_tool("empty", program="qel-check"), (
            2, b"", b"qel-check: empty/Info.plist: No such file or directory\n"))

    def test_listed_files(self):
        self.put("empty.mp3", b"")
        self.put("twice.mp3")
        (self.bundle / "folder").mkdir()
        outside = self.write("outside.mp3", "media")
        (self.bundle / "link.mp3").symlink_to(outside)
        self.list("gone.mp3", "empty.mp3", "twice.mp3", "./twice.mp3", "folder", "../outside.mp3", "link.mp3",
                  "https://example.org/a.mp3", "a/..", PodcastPosterReference="Posters/gone.png")
        self.assertEqual(self.findings(), [
            '9:4: error: "gone.mp3" is listed and missing: put it back, or let qel-keep fetch it again',
            '13:4: error: "empty.mp3" is empty: remove it, and let qel-keep fetch it again',
            '21:4: warning: "./twice.mp3" is listed for a second time: each episode has its own file',
            '25:4: error: "folder" cannot be read: Is a directory',
            '29:4: error: "../outside.mp3" leads out of the bundle: move the file into it',
            '33:4: error: "link.mp3" leads out of the bundle by a link: put the file itself in its place',
            '37:4: warning: "https://example.org/a.mp3" is a URL, but all files of a bundle lie in it: qel-keep '
            "fetches them into one",
            '41:4: error: "a/.." names no file: write its name, or leave the key out',
            '45:2: error: "Posters/gone.png" is listed and missing: put it back, or let qel-keep fetch it again'])

    def test_a_size_that_is_not_that_of_the_file(self):
        self.put("a.mp3", b"12345")
        self.list({"EpisodeReference": "a.mp3", "EpisodeFileSize": 6})
        self.assertEqual(self.findings(status=0), [
            '9:4: note: "a.mp3" has 5 bytes, and not 6: feeds made of the bundle say the latter'])

    def test_kinds_that_their_names_deny(self):
        for content, name, kind in KINDS:
            with self.subTest(kind):
                self.put(name, content)
                self.list(name)
                self.assertEqual(self.findings(), [
                    f'9:4: warning: "{name}" is {kind} by its first bytes: rename it, here and in its directory'])
                os.remove(self.bundle / name)
        for content, name in GOOD:
            with self.subTest(name, content=content):
                self.put(name, content)
                self.list(name)
                self.assertEqual(self.findings(), [])
                os.remove(self.bundle / name)

    def test_pages_in_the_place_of_media(self):
        for page in PAGES:
            with self.subTest(page):
                self.put("a.unknown", page)
                self.list("a.unknown")
                self.assertEqual(self.findings(), [
                    '9:4: error: "a.unknown" is a page of HTML, which a server sent in its place: remove it, and fetch '
                    "it again"])

    def test_files_that_nobody_lists(self):
        left = (".qel-0123456789abcdef.part", ".qel-keep-0.note")
        for name in (*left, "a.mp3", "Posters/b.png", "Posters/c.png", ".DS_Store", ".git/config", "sub/d.mp3"):
            self.put(name)
        (self.bundle / "empty").mkdir()
        self.list({"EpisodeReference": "a.mp3", "EpisodePosterReference": "Posters/b.png"})
        self.assertEqual(sorted(self.findings()), sorted([
            ".DS_Store: warning: a hidden file, which is no part of the bundle: remove it",
            ".git: warning: a hidden file, which is no part of the bundle: remove it",
            *(f"{name}: warning: a run that did not end left this behind: remove it, or run qel-keep again"
              for name in left),
            "Posters/c.png: warning: nobody lists this file: remove it, or add it to Info.plist",
            "sub/d.mp3: warning: nobody lists this file: remove it, or add it to Info.plist"]))

    def test_names_that_other_file_systems_do_not_have(self):
        impossible = ["a:b.mp3", "a?.mp3", "a\x01.mp3", "con.mp3", "LPT1", "dot.", "blank "]
        possible = ["ü.mp3", "console.mp3", "com10", "a b.mp3"]
        for name in (*impossible, *possible):
            self.put(name)
        self.list(*impossible[:2], *impossible[3:], *possible)
        self.assertEqual(sorted(self.findings()), sorted(
            [f"{name}: warning: other file systems have no such name: rename it, here and in Info.plist"
             for name in impossible] +
            ["a\x01.mp3: warning: nobody lists this file: remove it, or add it to Info.plist"]))

    def test_names_that_clash(self):
        for name in ("É.mp3", "é.mp3"):
            self.put(name)
        self.list("é.mp3", "É.mp3")
        self.assertEqual(self.findings(), [
            'é.mp3: warning: its name differs from "É.mp3" in capitals alone, which other file systems take for one: '
            "rename it, here and in Info.plist"])
        for name in ("É.mp3", "é.mp3", "STRASSE.mp3", "straße.mp3"):
            self.put(name)
        self.list("é.mp3", "É.mp3", "STRASSE.mp3", "straße.mp3")
        self.assertEqual(len(self.findings()), 2)

    def test_an_episode_without_a_uuid_has_a_guid_that_changes(self):
        self.put("a.mp3")
        whole = {"EpisodeName": "e", "EpisodeDate": datetime.datetime(2026, 4, 4), "EpisodeReference": "a.mp3"}
        for episode, count in ((whole, 1), ({**whole, "EpisodeUUID": "u"}, 0)):
            self.list(episode)
            found = self.findings("--for-publishing", status=1)
            self.assertEqual(sum('note: this episode has no "EpisodeUUID"' in line for line in found), count)


if __name__ == "__main__":
    unittest.main()
