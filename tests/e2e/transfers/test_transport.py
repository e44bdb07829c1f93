"""Feeds are fetched from servers that redirect, compress, dawdle, lie and break; each has one right outcome.

A fetch succeeds with status 200 and a whole body, and in no other way; nothing half-fetched is ever used.
What servers can do wrong in one answer is in lies.py; here are requests, and what takes several answers.
"""

import gzip
import unittest

from support import ToolTestCase, rss

PODCAST = {"PodcastName": "Night Walks"}
FEED = rss("<title>Night Walks</title>")


class TransportTestCase(ToolTestCase):
    def setUp(self):
        super().setUp()
        self.web = self.server()
        self.web.serve("/feed.xml", FEED)

    def assertFetches(self, url, **options):
        self.assertEqual(self.parsefeed(url, **options), PODCAST)

    def assertFetchFails(self, url, pattern=r".+", **options):
        self.assertLoadFails(self.run_tool("parsefeed", url, **options), pattern)


class RequestTest(TransportTestCase):
    def test_one_get_request_fetches_the_feed(self):
        self.assertFetches(self.web.url("/feed.xml"))
        self.assertEqual([(request.method, request.path, request.version) for request in self.web.requests],
                         [("GET", "/feed.xml", "HTTP/1.1")])

    def test_header_fields(self):
        self.assertFetches(self.web.url("/feed.xml"))
        headers = self.web.requests[0].headers
        self.assertRegex(headers["user-agent"], r"\Aqel/\d+\.\d+\.\d+\Z")
        self.assertEqual(headers["accept"], "*/*")
        self.assertEqual(headers["host"], f"127.0.0.1:{self.web.port}")
        self.assertIn("gzip", [coding.strip() for coding in headers["accept-encoding"].split(",")])

    def test_nothing_about_the_user_is_sent(self):
        self.write(".netrc", "machine 127.0.0.1 login me password secret\n").chmod(0o600)
        self.assertFetches(self.web.url("/feed.xml"), env={"HOME": str(self.directory)})
        headers = self.web.requests[0].headers
        self.assertEqual(set(headers), {"user-agent", "accept", "host", "accept-encoding"})

    def test_no_cookie_comes_back(self):
        url = self.web.redirect("/old", "/feed.xml", headers=[("Set-Cookie", "a=b; Path=/")])
        self.assertFetches(url)
        self.assertNotIn("cookie", self.web.requests[1].headers)

    def test_the_query_is_sent_and_the_fragment_is_not(self):
        self.web.serve("/feed.xml?format=rss&page=1", FEED)
        self.assertFetches(self.web.url("/feed.xml?format=rss&page=1#top"))

    def test_percent_encoded_characters_are_sent_as_they_are(self):
        self.web.serve("/a%20b%2Fc/%7Euser", FEED)
        self.assertFetches(self.web.url("/a%20b%2Fc/%7Euser"))

    def test_a_url_without_path_asks_for_the_root(self):
        self.web.serve("/", FEED)
        self.assertFetches(f"http://127.0.0.1:{self.web.port}")

    def test_a_host_name_is_looked_up(self):
        self.assertFetches(f"http://localhost:{self.web.port}/feed.xml")

    def test_a_proxy_of_the_environment_is_asked(self):
        self.web.serve("http://feeds.example/feed.xml", FEED)
        self.assertFetches("http://feeds.example/feed.xml", env={"http_proxy": self.web.url("")})


class RedirectTest(TransportTestCase):
    def test_relative_locations(self):
        self.web.serve("/a/feed.xml", FEED)
        self.web.serve("/a/b?q=1", FEED)
        for location in ("feed.xml", "/feed.xml", "../feed.xml", f"//127.0.0.1:{self.web.port}/feed.xml", "b?q=1",
                         "feed.xml#top"):
            with self.subTest(location):
                self.assertFetches(self.web.redirect("/a/old", location))

    def test_a_redirect_to_another_server(self):
        other = self.server()
        self.assertFetches(self.web.redirect("/old", other.serve("/new.xml", FEED)))
        self.assertEqual(other.hits("/new.xml"), 1)

    def test_20_redirects_are_followed(self):
        self.assertFetches(self.web.redirect_chain("/hop", 20, "/feed.xml"))
        self.assertEqual(len(self.web.requests), 21)

    def test_21_redirects_are_too_many(self):
        self.assertFetchFails(self.web.redirect_chain("/hop", 21, "/feed.xml"))
        self.assertEqual(self.web.hits("/feed.xml"), 0)

    def test_a_loop_ends(self):
        self.assertFetchFails(self.web.redirect("/loop", "/loop"), timeout=30)
        self.assertLessEqual(len(self.web.requests), 21)

    def test_the_connection_is_kept_through_a_chain(self):
        self.assertFetches(self.web.redirect_chain("/hop", 5, "/feed.xml"))
        self.assertEqual(self.web.connections, 1)


class StatusTest(TransportTestCase):
    def test_a_failed_fetch_is_not_repeated(self):
        self.assertFetchFails(self.web.serve("/x", FEED, 503))
        self.assertEqual(self.web.hits("/x"), 1)


class BodyTest(TransportTestCase):
    def test_a_compressed_body_in_chunks(self):
        packed = gzip.compress(FEED)
        chunks = [packed[start:start + 5] for start in range(0, len(packed), 5)]
        self.assertFetches(self.web.chunked("/packed", chunks, headers=[("Content-Encoding", "gzip")]))

    def test_a_compressed_feed_much_larger_than_its_packing(self):
        description = "d" * 20_000_000
        url = self.web.compressed("/large", rss("<title>Night Walks</title>", f"<x>{description}</x>"))
        self.assertFetches(url)

    def test_a_large_body(self):
        items = "".join(f"<item><title>Episode {number}</title></item>" for number in range(100_000))
        podcast = self.parsefeed(self.web.serve("/large.xml", rss(items)))
        self.assertEqual(len(podcast["Episodes"]), 100_000)
        self.assertEqual(podcast["Episodes"][-1], {"EpisodeName": "Episode 99999"})

    def test_the_content_type_does_not_matter(self):
        for kind in ("text/html", "application/octet-stream", "image/png", "text/xml; charset=utf-16", ""):
            with self.subTest(kind):
                self.assertFetches(self.web.serve("/typed", FEED, headers=[("Content-Type", kind)]))

    def test_a_page_instead_of_a_feed(self):
        url = self.web.serve("/page", b"<!DOCTYPE html><html><head><title>t</title></head><body/></html>")
        self.assertFails(self.run_tool("parsefeed", url), "Could not load source: The feed was neither RSS nor Atom")


class BrokenConnectionTest(TransportTestCase):
    def test_a_failed_fetch_writes_nothing(self):
        self.write("out", b"old")
        for url in (self.web.url("/none"), self.web.truncated("/short", FEED, 5), self.web.reset("/reset")):
            result = self.run_tool("createfeed", url, "-d", "out")
            self.assertLoadFails(result, stdout=b"[N] Loading/interpreting source...\n")
            self.assertEqual(self.path("out").read_bytes(), b"old")
        self.assertEqual([path.name for path in self.directory.iterdir()], ["out"])


if __name__ == "__main__":
    unittest.main()
