"""Whatever stands where a file is to be read: only regular files ever are, and anything else is refused at once."""

import os
import plistlib
import shutil
import socket
import subprocess
import tempfile
import unittest

from special_files import (MEDIA, MEMORY, PODCAST, SpecialFileTestCase, below_a_file, directory, fifo, link,
                           link_to_file, loop, nothing, read_only, regular, unix_socket, unreachable, unreadable)
from support import checked, environment, is_sanitized, rss, soaking, tool, unprivileged

# What is read: the kind, and the cause for a feed (None: it is read). Where no cause is told, there is the message or
# the warning of its place.

NOT_REGULAR = "Not a regular file"
INPUTS = (
    ("a file", regular, None),
    ("a link to a file", link_to_file, None),
    ("a file that may only be read", read_only, None),
    ("a directory", directory, "Is a directory"),
    ("a FIFO without writer", fifo, NOT_REGULAR),
    ("a socket", unix_socket, NOT_REGULAR),
    ("/dev/zero", link("/dev/zero"), NOT_REGULAR),
    ("/dev/full", link("/dev/full"), NOT_REGULAR),
    ("/dev/null", link("/dev/null"), NOT_REGULAR),
    ("/dev/tty", link("/dev/tty"), NOT_REGULAR),
    ("/dev/stdin", link("/dev/stdin"), NOT_REGULAR),
    ("nothing", nothing, "No such file or directory"),
    ("a dangling link", link("nowhere"), "No such file or directory"),
    ("a loop of links", loop, "Too many levels of symbolic links"),
    ("a file that may not be read", unreadable, "Permission denied"),
    ("a file in a directory that may not be entered", unreachable, "Permission denied"),
    ("a path through a file", below_a_file, "Not a directory"),
)


class InputTest(SpecialFileTestCase):
    def assertRead(self, result):
        self.assertSucceeds(result)
        self.assertEqual(plistlib.loads(result.stdout)["PodcastName"], "Night Walks")

    def test_as_a_feed(self):
        for name, kind, cause in INPUTS:
            with self.subTest(name):
                path = self.make(kind, "feed.xml", rss("<title>Night Walks</title>"))
                result = self.run_tool("parsefeed", path.as_uri())
                if cause is None:
                    self.assertRead(result)
                else:
                    self.assertFails(result, f"Could not load source: {cause}")

    def assertSource(self, source, cause):
        if cause is None:
            self.assertRead(self.run_tool("parsefeed", source))
        else:
            self.assertNoSource(source)

    def test_as_a_reference_file(self):
        for name, kind, cause in INPUTS:
            with self.subTest(name):
                self.assertSource(self.make(kind, "show.plist", plistlib.dumps(PODCAST)), cause)

    def test_as_the_reference_file_of_a_bundle(self):
        for name, kind, cause in INPUTS:
            with self.subTest(name):
                path = self.make(kind, "Info.plist", plistlib.dumps(PODCAST))
                self.path("link.podcast").unlink(missing_ok=True)
                self.path("link.podcast").symlink_to(path.parent)
                self.assertSource("link.podcast", cause)

    def test_as_a_bundle(self):
        for name, kind, _ in INPUTS:
            with self.subTest(name):
                self.assertSource(self.make(kind, "show.podcast", b""), "no bundle")

    def test_as_media(self):
        for name, kind, cause in INPUTS:
            with self.subTest(name):
                path = self.make(kind, "a.mp3", MEDIA)
                for location in (str(path), path.as_uri()):
                    shutil.rmtree(self.bundle, ignore_errors=True)
                    result = self.create_episodes({"EpisodeName": "One", "EpisodeReference": location})
                    self.assertWarns(result, *(() if cause is None else ('Could not save or download episode "One"',)))
                    self.assertEqual(self.files(), {"a.mp3": MEDIA} if cause is None else {})

    def test_as_posters(self):
        media = self.media("one.mp3", MEDIA)
        for name, kind, cause in INPUTS:
            with self.subTest(name):
                path = self.make(kind, "a.jpg", MEDIA)
                for location, place in ((str(path), "local"), (path.as_uri(), "remote")):
                    shutil.rmtree(self.bundle, ignore_errors=True)
                    result = self.create({"PodcastName": "Show", "PodcastPosterReference": location,
                                          "PodcastPosterReferenceType": place, "Episodes": [
                        {"EpisodeName": "One", "EpisodeReference": media, "EpisodePosterReference": location}]})
                    self.assertWarns(result, *(() if cause is None else (
                        'Could not save or download poster image for podcast "Show"',
                        'Could not save or download poster image for episode "One"')))
                    posters = {"Posters/Podcast.jpg": MEDIA, "Posters/one.jpg": MEDIA} if cause is None else {}
                    self.assertEqual(self.files(), {"one.mp3": MEDIA, **posters})

    def test_what_the_kernel_makes_up_in_file_systems_of_their_own(self):
        point = self.path("binfmt_misc")
        point.mkdir()
        command = ["mount", "-t", "binfmt_misc", "none", point]
        if os.geteuid() != 0 or subprocess.run(command, check=False, capture_output=True).returncode != 0:
            self.skipTest("root and binfmt_misc are needed")
        self.addCleanup(subprocess.run, ["umount", "-l", point], check=True)
        status = point / "status"
        self.assertFails(self.run_tool("parsefeed", status.as_uri()), "Could not load source: Not a stored file")
        for location in (str(status), status.as_uri()):
            result = self.create_episodes({"EpisodeName": "One", "EpisodeReference": location})
            self.assertWarns(result, 'Could not save or download episode "One"')
            self.assertEqual(self.files(), {})

    def test_as_standard_input(self):
        """Standard input is read whatever it is, to its end, to an error or until the memory runs out."""
        whole = plistlib.dumps(PODCAST)
        reader, writer = socket.socketpair()
        writer.sendall(whole)
        writer.close()
        file = tempfile.TemporaryFile()
        file.write(whole)
        file.seek(0)
        unusable, exhausting = '"(null)" is not a valid podcast source.\n', "Out of memory.\n"
        inputs = [("a file", file.fileno(), None),
                  ("a socket", reader.fileno(), None),
                  ("a directory", os.open(self.directory, os.O_RDONLY), unusable),
                  ("/dev/null", os.open("/dev/null", os.O_RDONLY), unusable),
                  ("a file that may only be written", os.open(self.path("out"), os.O_WRONLY | os.O_CREAT), unusable)]
        if is_sanitized():
            print("without /dev/zero and /dev/full: sanitizers end a process whose memory runs out")
        else:
            inputs += [("/dev/zero", os.open("/dev/zero", os.O_RDONLY), exhausting),
                       ("/dev/full", os.open("/dev/full", os.O_RDONLY), exhausting)]
        limit = "unlimited" if is_sanitized() else MEMORY >> 10
        prefix = unprivileged(self.directory)
        for name, descriptor, failure in inputs:
            with self.subTest(name):
                finished = subprocess.run(
                    ["/bin/sh", "-c", f'ulimit -v {limit} && exec "$0" "$@"', *prefix, tool(), "parsefeed", "-i"],
                    stdin=descriptor, env=environment(), capture_output=True, timeout=60, check=False)
                result = checked((name,), finished.returncode, finished.stdout, finished.stderr)
                if failure is None:
                    self.assertRead(result)
                else:
                    self.assertFails(result, failure)
            self.rows += 1
        for _, descriptor, _ in inputs[2:]:
            os.close(descriptor)
        file.close()
        reader.close()

    @unittest.skipUnless(soaking(), "reads 2 GiB; QEL_SOAK=1 has time for it")
    def test_an_endless_standard_input_ends_at_the_limit(self):
        with open("/dev/zero", "rb") as zeros:
            finished = subprocess.run([tool(), "parsefeed", "-i"], stdin=zeros, env=environment(), capture_output=True,
                                      timeout=300, check=False)
        self.assertFails(checked((), finished.returncode, finished.stdout, finished.stderr),
                         '"(null)" is not a valid podcast source.\n')


if __name__ == "__main__":
    unittest.main()
