"""Hosts of media redirect, lie, stall and break; an episode is stored whole or left out, and the run goes on.

Each fault is met by the same show: a good episode before and after it, and a file of an earlier run under
the name of the broken one, which must survive. What servers can do wrong in one answer is in lies.py.
"""

import os
import unittest

from bundle_support import BundleTestCase, contents
from support import element, item, rss

EARLIER = b"the file of an earlier run"
BODY = b"0123456789" * 1000


class TransferTestCase(BundleTestCase):
    def setUp(self):
        super().setUp()
        self.web = self.server()
        self.web.serve("/before.mp3", b"before")
        self.web.serve("/after.mp3", b"after")

    def fetch(self, url, **options):
        """The result for the show with the episode at the URL, whose file name is broken.mp3."""
        self.bundle.mkdir(exist_ok=True)
        (self.bundle / "broken.mp3").write_bytes(EARLIER)
        return self.create({"Episodes": [
            {"EpisodeName": name, "EpisodeReference": location} for name, location in (
                ("Before", self.web.url("/before.mp3")), ("Broken", url), ("After", self.web.url("/after.mp3")))]},
            **options)

    def assertSkips(self, url, **options):
        self.assertRuns(self.fetch(url, **options), "Fetching 3 episodes",
                        "Fetching episode 1...", 'Downloading episode entitled "Before" (0 bytes)...',
                        "Fetched episode 1",
                        "Fetching episode 2...", 'Downloading episode entitled "Broken" (0 bytes)...',
                        'W Could not save or download episode "Broken"', "Skipping episode 2",
                        "Fetching episode 3...", 'Downloading episode entitled "After" (0 bytes)...',
                        "Fetched episode 3")
        found = contents(self.bundle)
        del found["Info.plist"]
        self.assertEqual(found, {"Posters": None, "before.mp3": b"before", "broken.mp3": EARLIER,
                                 "after.mp3": b"after"})
        self.assertEqual(self.references(), ["before.mp3", "after.mp3"])

    def assertStores(self, url, content=BODY, **options):
        self.assertWarns(self.fetch(url, **options))
        self.assertEqual(self.files(), {"before.mp3": b"before", "broken.mp3": content, "after.mp3": b"after"})
        self.assertEqual(self.references(), ["before.mp3", "broken.mp3", "after.mp3"])


class StatusTest(TransferTestCase):
    def test_a_long_page_of_a_failure_is_not_read_to_its_end(self):
        gate = self.gate()

        def answer(exchange):
            exchange.head(404, [("Content-Length", str(1 << 40))])
            exchange.send(bytes(1 << 20))
            gate.wait()
        self.assertSkips(self.web.route("/broken.mp3", answer), timeout=30)


class BrokenAnswerTest(TransferTestCase):
    def test_a_scheme_that_is_not_supported(self):
        self.assertRuns(self.fetch("httpx://127.0.0.1/broken.mp3"), "Fetching 3 episodes",
                        "Fetching episode 1...", 'Downloading episode entitled "Before" (0 bytes)...',
                        "Fetched episode 1", "Fetching episode 2...",
                        'Downloading episode entitled "Broken" (0 bytes)...',
                        'W Could not save or download episode "Broken"', "Skipping episode 2",
                        "Fetching episode 3...", 'Downloading episode entitled "After" (0 bytes)...',
                        "Fetched episode 3")

    def test_a_missing_file_url(self):
        self.assertSkips(self.path("missing/broken.mp3").as_uri())


class GoodAnswerTest(TransferTestCase):
    def test_bytes_of_every_value(self):
        everything = bytes(range(256)) * 5000
        self.assertStores(self.web.serve("/broken.mp3", everything), everything)

    def test_a_connection_that_was_closed_meanwhile(self):
        def answer(exchange):
            exchange.reply(200, BODY)
            exchange.close()  # without having said so
        self.assertStores(self.web.route("/broken.mp3", answer))

    def test_a_file_url(self):
        self.assertStores(self.write("broken.mp3", BODY).as_uri())

    def test_an_empty_file_url(self):
        self.assertStores(self.write("broken.mp3", b"").as_uri(), b"")

    def test_schemes_in_capitals(self):
        self.assertStores(self.web.serve("/broken.mp3", BODY).replace("http", "HTTP"))
        self.assertStores(self.write("broken.mp3", BODY).as_uri().replace("file", "File"))

    def test_media_are_never_held_in_memory(self):
        length = 200 << 20
        path = self.write("broken.mp3", b"")
        os.truncate(path, length)
        self.assertWarns(self.fetch(path.as_uri(), memory_limit=150 << 20))
        self.assertEqual((self.bundle / "broken.mp3").stat().st_size, length)

    def test_a_percent_encoded_url_is_asked_for_as_it_is(self):
        self.web.serve("/x%2Fy%20z/%C3%BC?a=%26&b", BODY)
        self.assertWarns(self.create_episodes(self.web.url("/x%2Fy%20z/%C3%BC?a=%26&b")))
        self.assertEqual(self.files(), {"ü.": BODY})


class RedirectTest(TransferTestCase):
    def test_locations_of_every_form(self):
        self.web.serve("/media/1?key=a%2Fb", BODY)
        for location in (self.web.url("/media/1?key=a%2Fb"), f"//127.0.0.1:{self.web.port}/media/1?key=a%2Fb",
                         "media/1?key=a%2Fb", "./x/../media/1?key=a%2Fb", "/media/1?key=a%2Fb#part"):
            with self.subTest(location):
                self.assertStores(self.web.redirect("/broken.mp3", location))

    def test_to_another_host(self):
        other = self.server()
        self.assertStores(self.web.redirect("/broken.mp3", other.serve("/media/1", BODY)))

    def test_one_more_is_too_many(self):
        self.web.serve("/media/1", BODY)
        self.web.redirect_chain("/hop", 20, "/media/1")
        self.assertSkips(self.web.redirect("/broken.mp3", "/hop/0"))
        self.assertEqual(self.web.hits("/media/1"), 0)

    def test_a_loop(self):
        self.assertSkips(self.web.redirect("/broken.mp3", "/broken.mp3"))
        self.assertEqual(self.web.hits("/broken.mp3"), 21)


class RequestTest(TransferTestCase):
    def show(self):
        """A feed with posters and media, one of them missing and one redirected."""
        self.web.serve("/cover.jpg", b"cover")
        self.web.serve("/one.jpg", b"face")
        self.web.serve("/feed", rss(
            element("orvane:image", href=self.web.url("/cover.jpg")),
            item(element("enclosure", url=self.web.url("/before.mp3")),
                 element("orvane:image", href=self.web.url("/one.jpg"))),
            item(element("enclosure", url=self.web.url("/missing.mp3"))),
            item(element("enclosure", url=self.web.redirect("/moved.mp3", "/media/1"))),
            item(element("enclosure", url=self.web.chunked("/chunks.mp3", [b"a", b"b"]))),
            item(element("enclosure", url=self.web.serve("/empty.mp3", b""))),
            item(element("enclosure", url=self.web.url("/after.mp3")))))
        self.web.serve("/media/1", BODY)
        return self.web.url("/feed")

    def test_one_connection_serves_a_whole_run(self):
        self.assertWarns(self.create(self.show()), 'Could not save or download episode "(null)"')
        self.assertEqual([request.path for request in self.web.requests],
                         ["/feed", "/cover.jpg", "/before.mp3", "/one.jpg", "/missing.mp3", "/moved.mp3", "/media/1",
                          "/chunks.mp3", "/empty.mp3", "/after.mp3"])
        self.assertEqual(self.web.connections, 1)

    def test_a_broken_connection_is_made_anew_and_nothing_is_retried(self):
        self.assertSkips(self.web.truncated("/broken.mp3", b"abc", missing=1))
        self.assertEqual([request.path for request in self.web.requests],
                         ["/before.mp3", "/broken.mp3", "/after.mp3"])
        self.assertEqual(self.web.connections, 2)

    def test_header_fields(self):
        self.assertEqual(self.create(self.show()).status, 0)
        for request in self.web.requests[1:]:
            with self.subTest(request.path):
                self.assertEqual((request.method, request.version), ("GET", "HTTP/1.1"))
                self.assertEqual(set(request.headers), {"host", "user-agent", "accept"})
                self.assertEqual(request.headers["host"], f"127.0.0.1:{self.web.port}")
                self.assertEqual(request.headers["accept"], "*/*")
                self.assertRegex(request.headers["user-agent"], r"\Aqel/\d+\.\d+\.\d+\Z")

    def test_neither_cookies_nor_passwords_are_sent(self):
        self.write(".netrc", "machine 127.0.0.1 login me password secret\n").chmod(0o600)
        self.web.serve("/before.mp3", b"before", headers=[("Set-Cookie", "a=b; Path=/")])
        self.web.serve("/broken.mp3", b"", status=401, headers=[("WWW-Authenticate", "Basic realm=x")])
        self.assertSkips(self.web.url("/broken.mp3"), env={"HOME": str(self.directory)})
        for request in self.web.requests:
            self.assertEqual(set(request.headers), {"host", "user-agent", "accept"})

    def test_the_fragment_is_not_sent(self):
        self.web.serve("/broken.mp3?a=b", BODY)
        self.assertStores(self.web.url("/broken.mp3?a=b#t=10"))


if __name__ == "__main__":
    unittest.main()
