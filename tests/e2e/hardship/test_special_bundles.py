"""Whatever stands where a bundle's directory or one of its files is to come: nothing else is written or lost.

Other bundles, the source among them, and whatever links lead to stay as they were.
"""

import plistlib
import shutil
import unittest

from bundle_support import contents
from special_files import (MEDIA, MINE, SpecialFileTestCase, below_a_file, directory, fifo, link, link_to_directory,
                           link_to_file, locked, loop, nothing, read_only, regular, unix_socket)

# The directory of a bundle: the kind, and the message (None: the bundle is there).

UNWRITTEN = "Could not generate bundle: Could not write Info.plist file\n"


def not_created(cause):
    return f"Could not generate bundle: Could not create bundle: {cause}\n"


def without_entry(path, content):
    path.parent.chmod(0)


def below_a_locked_directory(path, content):
    path.parent.chmod(0o555)


DIRECTORIES = (
    ("nothing", nothing, None),
    ("a directory", directory, None),
    ("a link to a directory", link_to_directory, None),
    ("a file", regular, not_created("File exists")),
    ("a FIFO", fifo, not_created("File exists")),
    ("a socket", unix_socket, not_created("File exists")),
    ("/dev/zero", link("/dev/zero"), not_created("File exists")),
    ("/dev/full", link("/dev/full"), not_created("File exists")),
    ("a dangling link", link("nowhere"), not_created("File exists")),
    ("a loop of links", loop, not_created("File exists")),
    ("a path through a file", below_a_file, not_created("Not a directory")),
    ("a directory that may not be written", locked, UNWRITTEN),
    ("a path through a directory that may not be written", below_a_locked_directory, not_created("Permission denied")),
    ("a path through a directory that may not be entered", without_entry, not_created("Permission denied")),
)

# What stands in a bundle under the name of a file to come: whether a download takes its place, or Info.plist. A copy
# never does.
TAKEN = (
    ("a file", regular, True),
    ("a file that may only be read", read_only, True),
    ("a link to a file", link_to_file, True),
    ("a dangling link", link("nowhere"), True),
    ("a loop of links", loop, True),
    ("/dev/full", link("/dev/full"), True),
    ("a FIFO", fifo, True),
    ("a socket", unix_socket, True),
    ("a link to a directory", link_to_directory, True),
    ("a directory", directory, False),
)


class BundleDirectoryTest(SpecialFileTestCase):
    def setUp(self):
        super().setUp()
        web = self.server()
        self.copied = {"PodcastName": "Show", "Episodes": [
            {"EpisodeName": "One", "EpisodeReference": self.media("a.mp3", MEDIA),
             "EpisodePosterReference": self.media("a.jpg", MEDIA)}]}
        self.downloaded = {"PodcastName": "Show", "Episodes": [
            {"EpisodeName": "One", "EpisodeReference": web.serve("/a.mp3", MEDIA),
             "EpisodePosterReference": web.serve("/a.jpg", MEDIA)}]}
        self.complete = {"a.mp3": MEDIA, "Posters/a.jpg": MEDIA}

    def test_the_directory(self):
        for name, kind, message in DIRECTORIES:
            with self.subTest(name):
                path = self.make(kind, "show.podcast", MINE)
                result = self.run_tool("createbundle", self.reference(self.downloaded), "-d", path)
                if message is None:
                    self.assertWarns(result)
                    self.assertEqual(self.files(path.resolve()), self.complete)
                else:
                    self.assertEqual((result.status, result.stderr.decode()), (1, message))
                    self.place.chmod(0o755)
                    if self.place.is_dir():
                        self.assertLessEqual(set(contents(self.place)), {"show.podcast", "loop"})

    def outside(self):
        """What is in the place beside the bundle's own files."""
        return {path: content for path, content in contents(self.place).items()
                if path in ("loop", "nowhere") or path.startswith("target")}

    def test_under_the_name_of_a_download(self):
        for name, kind, is_replaced in TAKEN:
            with self.subTest(name):
                path = self.make(kind, "a.mp3", MINE)
                before = self.outside()
                result = self.run_tool("createbundle", self.reference(self.downloaded), "-d", self.place)
                self.assertWarns(result, *(() if is_replaced else ('Could not save or download episode "One"',)))
                self.assertEqual(path.is_dir(), not is_replaced)
                if is_replaced:
                    self.assertFalse(path.is_symlink())
                    self.assertEqual(path.read_bytes(), MEDIA)
                self.assertEqual(self.outside(), before)

    def test_under_the_name_of_a_copy(self):
        for name, kind, _ in TAKEN:
            with self.subTest(name):
                path = self.make(kind, "a.mp3", MINE)
                before, status = self.outside(), path.lstat()
                result = self.run_tool("createbundle", self.reference(self.copied), "-d", self.place)
                self.assertWarns(result, 'Could not save or download episode "One"')
                self.assertEqual((path.lstat().st_ino, path.lstat().st_size), (status.st_ino, status.st_size))
                self.assertEqual(self.outside(), before)

    def test_under_the_name_of_the_reference_file(self):
        for name, kind, is_replaced in TAKEN:
            with self.subTest(name):
                path = self.make(kind, "Info.plist", MINE)
                before = self.outside()
                result = self.run_tool("createbundle", self.reference(self.downloaded), "-d", self.place)
                if is_replaced:
                    self.assertWarns(result)
                    self.assertFalse(path.is_symlink())
                    self.assertEqual(plistlib.loads(path.read_bytes())["PodcastName"], "Show")
                else:
                    self.assertEqual((result.status, result.stderr.decode()), (1, UNWRITTEN))
                self.assertEqual(self.outside(), before)

    def test_under_the_name_of_the_posters(self):
        for name, kind, warning in (
                ("a file", regular, "save or download"), ("a FIFO", fifo, "save or download"),
                ("a socket", unix_socket, "save or download"),
                ("a directory that may not be written", locked, "save or download"),
                ("a link to a directory outside", link(".."), "generate sane path for"),
                ("a dangling link", link("nowhere"), "generate sane path for"),
                ("a loop of links", loop, "generate sane path for"),
                ("/dev/zero", link("/dev/zero"), "generate sane path for")):
            for show in (self.copied, self.downloaded):
                with self.subTest(name, show=show):
                    self.make(kind, "Posters", MINE)
                    before = self.outside()
                    result = self.run_tool("createbundle", self.reference(show), "-d", self.place)
                    self.assertWarns(result, f'Could not {warning} poster image for episode "One"')
                    self.assertEqual((self.place / "a.mp3").read_bytes(), MEDIA)
                    self.assertEqual(self.outside(), before)

    def test_a_bundle_made_into_its_own_source(self):
        """No file in it is lost, by whatever name it is called; but its media cannot be copied onto themselves."""
        for source, output in (("show.podcast", "show.podcast"), ("show.podcast", "./x/../show.podcast/"),
                               ("show.podcast", "link"), ("link.podcast", "show.podcast"),
                               ("show.podcast/Info.plist", "show.podcast")):
            with self.subTest(source, output=output):
                for path in ("show.podcast", "x"):
                    shutil.rmtree(self.path(path), ignore_errors=True)
                for name in ("link", "link.podcast"):
                    self.path(name).unlink(missing_ok=True)
                    self.path(name).symlink_to("show.podcast")
                self.path("x").mkdir()
                self.assertWarns(self.create(self.copied))
                before = self.files()
                result = self.run_tool("createbundle", source, "-d", output)
                self.assertWarns(result, 'Could not save or download episode "One"')
                self.assertEqual(self.files(), before)
                self.assertEqual(self.info(), {"PodcastName": "Show"})
                self.rows += 1

    def test_a_bundle_made_inside_of_its_own_source(self):
        self.assertWarns(self.create(self.copied))
        inner = self.bundle / "inner.podcast"
        self.assertWarns(self.run_tool("createbundle", "show.podcast", "-d", inner),
                         'Could not save or download poster image for episode "One"')
        self.assertEqual(self.files(inner), {"a.mp3": MEDIA})
        self.assertEqual({path: content for path, content in self.files().items() if "inner" not in path},
                         self.complete)


if __name__ == "__main__":
    unittest.main()
