"""The catalogue of lies is told to the tool: each has its one outcome, in bounded memory, and harms nothing else."""

import ctypes
import os
import re
import shutil
import socket
import subprocess
import sys
import unittest

import certificates
import lies
from bundle_support import BundleTestCase
from feed_server import FeedServer
from support import is_emulated, is_sanitized

MEMORY = 300 << 20
EARLIER = b"the file of an earlier run"


class Servers:
    """Everything that tells a lie."""

    def __init__(self, test):
        self._test = test
        self._contexts = certificates.make(test.directory) if certificates.available() else {}
        self._tls = {}
        self.web = self._serve()
        self.web.redirect(lies.LOOP, lies.LOOP)
        for number in range(21):
            self.web.redirect(f"{lies.CHAIN}/{number}", f"{lies.CHAIN}/{number - 1}" if number > 1 else lies.GOOD)
        taken = socket.socket()
        test.addCleanup(taken.close)
        taken.bind(("127.0.0.1", 0))  # bound, yet not listening: nobody else can have the port
        self.unused_port = taken.getsockname()[1]

    def _serve(self):
        server = FeedServer()
        self._test.addCleanup(server.stop)
        for path in (lies.GOOD, "/lie", "/lie.mp3", "/lie.jpg"):
            server.serve(path, lies.BODY)
        return server

    def tls(self, certificate):
        if certificate not in self._tls:
            self._tls[certificate] = self._serve()
            self._tls[certificate].use_tls(self._contexts[certificate])
        return self._tls[certificate]

    def url(self, lie, path):
        """The URL at which the lie is told."""
        if isinstance(lie.reply, lies.At):
            return lie.reply.url(self, path)
        if isinstance(lie.reply, bytes):
            return self.web.raw(path, lie.reply, closes=lie.closes)
        return self.web.route(path, lie.reply)


def library_is_known():
    """Whether the transfer library is of the version whose messages the catalogue has word for word."""
    try:
        library = ctypes.CDLL("libcurl.so.4")
    except OSError:
        return False
    library.curl_version.restype = ctypes.c_char_p
    return library.curl_version().startswith(b"libcurl/7.88.")


class LieTest(BundleTestCase):
    def setUp(self):
        super().setUp()
        self.servers = Servers(self)
        self.told = 0

    def tearDown(self):
        print(f"{self.id().rpartition('.')[2]}: {self.told} lies, each as a feed, as media and as posters", flush=True)

    def assertOutcome(self, lie, **options):
        with self.subTest(lie.name):
            self.assertFeed(lie, **options)
            if lie.outcome is not lies.NOT_ASKED:
                self.assertFiles(lie, **options)
        self.told += 1

    def assertFeed(self, lie, **options):
        result = self.run_tool("parsefeed", self.servers.url(lie, "/lie"), **options)
        if lie.feed is lies.READ:
            self.assertSucceeds(result)
            self.assertIn(b"Night Walks", result.stdout)
        elif lie.feed is lies.OUT_OF_MEMORY:
            self.assertFails(result, lie.feed + "\n")
        else:
            exact = not isinstance(lie.feed, lies.LibraryCause) or library_is_known()
            pattern = re.escape(lie.feed).replace(r"\*", r"\d+") if exact else ".+"
            self.assertLoadFails(result, pattern)

    def assertFiles(self, lie, **options):
        """The show's other parts are whole, and what was there before survives what is left out."""
        shutil.rmtree(self.bundle, ignore_errors=True)
        names = ("lie.mp3", os.path.join("Posters", "Podcast.jpg"), os.path.join("Posters", "after.jpg"))
        for name in names:
            path = self.bundle / name
            path.parent.mkdir(parents=True, exist_ok=True)
            path.write_bytes(EARLIER)
        poster = self.servers.url(lie, "/lie.jpg")
        result = self.create({
            "PodcastName": "Show", "PodcastPosterReference": poster, "PodcastPosterReferenceType": "remote",
            "Episodes": [
                {"EpisodeName": "Lie", "EpisodeReference": self.servers.url(lie, "/lie.mp3")},
                {"EpisodeName": "After", "EpisodeReference": self.servers.web.serve("/after.mp3", b"after"),
                 "EpisodePosterReference": poster}]}, **options)
        left_out = lie.outcome is lies.LEFT_OUT
        self.assertWarns(result, *(('Could not save or download poster image for podcast "Show"',
                                    'Could not save or download episode "Lie"',
                                    'Could not save or download poster image for episode "After"') if left_out else ()))
        content = EARLIER if left_out else lie.outcome
        found = self.files()
        self.assertEqual(found.keys(), {"after.mp3", *names})
        self.assertEqual(found["after.mp3"], b"after")
        for name in names:
            self.assertTrue(found[name] == content, f"{name} holds {len(found[name])} bytes: {found[name][:60]!r}")
        self.assertEqual(self.references(), ["after.mp3"] if left_out else ["lie.mp3", "after.mp3"])

    def assertSection(self, section, **options):
        for lie in lies.LIES[section]:
            if lie.feed is lies.OUT_OF_MEMORY and (is_sanitized() or is_emulated()):
                print("not told, since sanitizers and emulators do not outlive a lack of memory:", lie.name)
                continue
            self.assertOutcome(lie, timeout=60, **options)

    def test_lengths(self):
        self.assertSection("Lengths", memory_limit=MEMORY)

    def test_chunks(self):
        self.assertSection("Chunks", memory_limit=MEMORY)

    def test_transfer_codings(self):
        self.assertSection("Transfer codings", memory_limit=MEMORY)

    def test_content_codings(self):
        self.assertSection("Content codings", memory_limit=MEMORY)

    def test_headers(self):
        self.assertSection("Headers", memory_limit=MEMORY)

    def test_statuses(self):
        self.assertSection("Statuses", memory_limit=MEMORY)

    def test_redirects(self):
        self.assertSection("Redirects", memory_limit=MEMORY)

    def test_connections(self):
        self.assertSection("Connections", memory_limit=MEMORY)

    def test_tls(self):
        if not certificates.available():
            self.skipTest("openssl is missing")
        self.assertSection("TLS", env={"SSL_CERT_FILE": str(self.directory / certificates.AUTHORITY)})


class TableTest(unittest.TestCase):
    def test_it_is_printed_with_a_row_for_each_lie(self):
        printed = subprocess.run([sys.executable, "-B", lies.__file__], check=True, capture_output=True).stdout.decode()
        told = [lie for section in lies.LIES.values() for lie in section]
        self.assertEqual(printed.count("\n"), 2 + len(lies.LIES) + len(told))
        for lie in told:
            self.assertIn(f"\n| {lie.name} | ", printed)

    def test_every_lie_has_a_name_of_its_own_in_its_section(self):
        for section, told in lies.LIES.items():
            self.assertEqual(len({lie.name for lie in told}), len(told), section)


if __name__ == "__main__":
    unittest.main()
