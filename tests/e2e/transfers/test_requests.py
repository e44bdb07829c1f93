"""What the tool asks servers for, and with which words: one request for each thing, and nothing about its user.

ResourceReaderTest and DownloadTest have single transfers, lies.py every answer that is wrong; here is what takes
several requests of a whole run.
"""

import gzip
import os
import time
import unittest
from base64 import b64encode

from bundle_support import BundleTestCase
from support import element, item, rss

PODCAST = {"PodcastName": "Night Walks"}
FEED = rss("<title>Night Walks</title>")
NETRC = "machine 127.0.0.1 login me password secret\n"


class RequestTestCase(BundleTestCase):
    def setUp(self):
        super().setUp()
        self.web = self.server()
        self.web.serve("/feed.xml", FEED)
        self.write(".netrc", NETRC).chmod(0o600)
        self.env = {"HOME": str(self.directory)}

    def assertFetches(self, url, **options):
        self.assertEqual(self.parsefeed(url, **options), PODCAST)

    def assertRequests(self, accepted, *paths):
        """Exactly these were asked for, each in the accepted coding and without fields that nobody needs."""
        self.assertEqual([(request.method, request.path, request.version) for request in self.web.requests],
                         [("GET", path, "HTTP/1.1") for path in paths])
        for request in self.web.requests:
            with self.subTest(request.path):
                self.assertEqual(set(request.headers), {"host", "user-agent", "accept", "accept-encoding"})
                self.assertEqual(request.headers["host"], f"127.0.0.1:{self.web.port}")
                self.assertEqual(request.headers["accept"], "*/*")
                self.assertRegex(request.headers["user-agent"], r"\Aqel/\d+\.\d+\.\d+\Z")
                self.assertEqual(request.headers["accept-encoding"], accepted)


class FeedTest(RequestTestCase):
    def test_a_feed_and_its_redirects(self):
        self.assertFetches(self.web.redirect("/old", "/feed.xml"), env=self.env)
        self.assertRequests("gzip", "/old", "/feed.xml")

    def test_urls_are_sent_as_they_are(self):
        for asked, sent in (("/a%20b%2Fc/%7Euser?format=rss&page=1#top", "/a%20b%2Fc/%7Euser?format=rss&page=1"),
                            ("/füße", "/f%C3%BC%C3%9Fe"), ("", "/")):
            with self.subTest(asked):
                self.web.serve(sent, FEED)
                self.assertFetches(self.web.url(asked))

    def test_a_host_name_is_looked_up(self):
        self.assertFetches(f"http://localhost:{self.web.port}/feed.xml")

    def test_a_proxy_of_the_environment_is_asked(self):
        self.web.serve("http://feeds.example/feed.xml", FEED)
        self.assertFetches("http://feeds.example/feed.xml", env={"http_proxy": self.web.url("")})

    def test_a_host_of_any_letters_is_followed_in_a_redirect(self):
        self.web.serve("http://xn--bcher-kva.example/feed.xml", FEED)
        for location in ("http://bücher.example/feed.xml", "http://b%C3%BCcher.example/feed.xml"):
            with self.subTest(location):
                self.web.raw("http://old.example/", "HTTP/1.1 301 Moved\r\nContent-Length: 0\r\n"
                             f"Location: {location}\r\n\r\n".encode())
                for locale in ("C", "C.UTF-8"):
                    self.assertFetches("http://old.example/", env={"http_proxy": self.web.url(""), "LC_ALL": locale})

    def test_a_feed_that_tells_no_encoding_is_in_that_of_its_content_type(self):
        title = "Прогулки"
        body = f"<rss><channel><title>{title}</title></channel></rss>".encode("koi8-r")
        for content_type in ("text/xml; charset=KOI8-R", 'application/rss+xml;a=b; Charset="koi8-r"'):
            with self.subTest(content_type):
                url = self.web.serve("/koi8", body, headers=[("Content-Type", content_type)])
                self.assertEqual(self.parsefeed(url), {"PodcastName": title})
        for content_type in ("text/xml", "text/xml; charset=utf-8", "text/xml; charset=unheard-of"):
            with self.subTest(content_type):
                url = self.web.serve("/koi8", body, headers=[("Content-Type", content_type)])
                self.assertLoadFails(self.run_tool("parsefeed", url),
                                     r"not well-formed \(invalid token\) at line 1, column 22")

    def test_redirects_of_every_form(self):
        self.web.serve("/a/feed.xml", FEED)
        self.web.serve("/a/b?q=1", FEED)
        for location in ("feed.xml", "/feed.xml", "../feed.xml", f"//127.0.0.1:{self.web.port}/feed.xml", "b?q=1",
                         "feed.xml#top", self.server().serve("/new.xml", FEED)):
            with self.subTest(location):
                self.assertFetches(self.web.redirect("/a/old", location))

    def test_a_failed_fetch_is_not_repeated(self):
        self.assertLoadFails(self.run_tool("parsefeed", self.web.serve("/x", FEED, 503)), "HTTP status 503")
        self.assertEqual(self.web.hits("/x"), 1)

    def test_a_compressed_body_in_chunks(self):
        packed = gzip.compress(FEED)
        chunks = [packed[start:start + 5] for start in range(0, len(packed), 5)]
        self.assertFetches(self.web.chunked("/packed", chunks, headers=[("Content-Encoding", "gzip")]))


    def test_a_password_in_the_url_is_sent_to_its_host_alone(self):
        other = self.server()
        moved = other.serve("/feed.xml", FEED)

        def answer(exchange):
            if exchange.request.headers.get("authorization") != "Basic " + b64encode(b"mara:p@ss").decode():
                exchange.reply(401, b"", [("WWW-Authenticate", "Basic realm=x")])
            else:
                exchange.reply(302, b"", [("Location", moved)])
        private = self.web.route("/private.xml", answer)
        self.assertFetches(private.replace("http://", "http://mara:p%40ss@"))
        self.assertNotIn("authorization", other.requests[-1].headers)
        self.assertLoadFails(self.run_tool("parsefeed", private, env=self.env), "HTTP status 401")


class MediaTest(RequestTestCase):
    def test_neither_cookies_nor_passwords_are_sent(self):
        self.web.serve("/one.mp3", b"one", headers=[("Set-Cookie", "a=b; Path=/")])
        self.web.serve("/two.mp3", b"", status=401, headers=[("WWW-Authenticate", "Basic realm=x")])
        self.web.serve("/x%2Fy%20z/%C3%BC?a=%26&b", b"three")
        result = self.create_episodes(*map(self.web.url, ("/one.mp3", "/two.mp3", "/x%2Fy%20z/%C3%BC?a=%26&b#part")),
                                      env=self.env)
        self.assertWarns(result, 'Could not save or download episode "(null)"')
        self.assertRequests("identity", "/one.mp3", "/two.mp3", "/x%2Fy%20z/%C3%BC?a=%26&b")
        self.assertEqual(self.files(), {"one.mp3": b"one", "ü.": b"three"})

    def test_a_broken_connection_is_made_anew_and_nothing_is_retried(self):
        self.assertWarns(self.create_episodes(self.web.serve("/one.mp3", b"one"),
                                              self.web.truncated("/two.mp3", b"abc", missing=1),
                                              self.web.serve("/three.mp3", b"three")),
                         'Could not save or download episode "(null)"')
        self.assertRequests("identity", "/one.mp3", "/two.mp3", "/three.mp3")
        self.assertEqual(self.web.connections, 2)

    def test_a_server_may_be_silent_as_long_as_it_likes(self):
        def answer(body):
            def send(exchange):
                exchange.head(200, [("Content-Length", str(len(body)))])
                exchange.send(body[:1])
                time.sleep(3)
                exchange.send(body[1:])
            return send
        media = self.web.route("/one.mp3", answer(b"one"))
        feed = self.web.route("/slow.xml", answer(rss(item(element("enclosure", url=media)))))
        self.assertWarns(self.create(feed))
        self.assertEqual(self.files(), {"one.mp3": b"one"})

    def test_bytes_of_every_value_under_schemes_in_capitals(self):
        everything = bytes(range(256)) * 5000
        self.assertWarns(self.create_episodes(
            self.web.serve("/one.mp3", everything).replace("http", "HTTP"),
            self.write("two.mp3", everything).as_uri().replace("file", "File")))
        self.assertEqual(self.files(), {"one.mp3": everything, "two.mp3": everything})

    def test_media_are_never_held_in_memory(self):
        length = 200 << 20
        path = self.write("one.mp3", b"")
        os.truncate(path, length)
        self.assertWarns(self.create_episodes(path.as_uri(), memory_limit=150 << 20))
        self.assertEqual((self.bundle / "one.mp3").stat().st_size, length)


if __name__ == "__main__":
    unittest.main()
