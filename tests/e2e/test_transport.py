"""Feeds are fetched from servers that redirect, compress, dawdle, lie and break; each has one right outcome.

A fetch succeeds with status 200 and a whole body, and in no other way; nothing half-fetched is ever used.
"""

import gzip
import shutil
import socket
import ssl
import subprocess
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
    def test_every_kind_of_redirect_is_followed(self):
        for status in (301, 302, 303, 307, 308):
            with self.subTest(status):
                self.assertFetches(self.web.redirect(f"/{status}", self.web.url("/feed.xml"), status))

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

    def test_other_schemes_are_not_followed(self):
        secret = self.write("feed.xml", FEED).as_uri()
        for location in (secret, f"ftp://127.0.0.1:{self.web.port}/feed.xml",
                         f"gopher://127.0.0.1:{self.web.port}/feed.xml",
                         "data:text/xml,%3Crss/%3E", f"pcast://127.0.0.1:{self.web.port}/feed.xml"):
            with self.subTest(location):
                self.assertFetchFails(self.web.redirect("/away", location))
        self.assertEqual(self.web.hits("/feed.xml"), 0)

    def test_a_location_that_is_no_url(self):
        for location in ("http://", "http://[::1/", ""):
            with self.subTest(location):
                self.assertFetchFails(self.web.redirect("/away", location))

    def test_a_redirect_without_location_is_no_feed(self):
        for status in (301, 302, 307):
            with self.subTest(status):
                self.web.route("/lost", lambda exchange, status=status: exchange.reply(status, FEED))
                self.assertFetchFails(self.web.url("/lost"), f".*{status}.*")

    def test_a_redirect_to_a_missing_page(self):
        self.assertFetchFails(self.web.redirect("/old", "/none"), ".*404.*")


class StatusTest(TransportTestCase):
    def test_only_status_200_is_a_feed(self):
        for status in (201, 202, 203, 206, 226, 300, 400, 401, 403, 404, 410, 429, 500, 502, 503):
            with self.subTest(status):
                self.assertFetchFails(self.web.serve("/x", FEED, status), f".*{status}.*")

    def test_a_status_without_body(self):
        for status in (204, 304):
            with self.subTest(status):
                self.assertFetchFails(self.web.serve("/x", b"", status), f".*{status}.*")

    def test_a_failed_fetch_is_not_repeated(self):
        self.assertFetchFails(self.web.serve("/x", FEED, 503))
        self.assertEqual(self.web.hits("/x"), 1)

    def test_an_interim_response_is_passed_over(self):
        answer = b"HTTP/1.1 103 Early Hints\r\nLink: </x>\r\n\r\nHTTP/1.1 200 OK\r\nContent-Length: %d\r\n\r\n" % len(FEED)
        self.assertFetches(self.web.raw("/hints", answer + FEED))


class BodyTest(TransportTestCase):
    def test_a_compressed_body(self):
        self.assertFetches(self.web.compressed("/packed", FEED))

    def test_a_compressed_body_in_chunks(self):
        packed = gzip.compress(FEED)
        chunks = [packed[start:start + 5] for start in range(0, len(packed), 5)]
        self.assertFetches(self.web.chunked("/packed", chunks, headers=[("Content-Encoding", "gzip")]))

    def test_a_compressed_body_cut_short_is_no_feed(self):
        for cut in (1, 5, 8, 9, 12, 60):
            with self.subTest(cut):
                self.assertFetchFails(self.web.compressed("/cut", FEED, cut=cut))

    def test_a_compressed_body_with_a_wrong_sum_is_no_feed(self):
        packed = bytearray(gzip.compress(FEED))
        packed[-8] ^= 1
        self.assertFetchFails(self.web.serve("/sum", bytes(packed), headers=[("Content-Encoding", "gzip")]))

    def test_a_coding_that_was_not_asked_for_never_passes_unread(self):
        self.assertFetchFails(self.web.serve("/odd", gzip.compress(FEED), headers=[("Content-Encoding", "br")]))

    def test_a_body_that_is_not_compressed_as_it_says(self):
        self.assertFetchFails(self.web.serve("/lie", FEED, headers=[("Content-Encoding", "gzip")]))

    def test_a_compressed_feed_much_larger_than_its_packing(self):
        description = "d" * 20_000_000
        url = self.web.compressed("/large", rss("<title>Night Walks</title>", f"<x>{description}</x>"))
        self.assertFetches(url)

    def test_chunks(self):
        chunks = [FEED[start:start + 7] for start in range(0, len(FEED), 7)]
        self.assertFetches(self.web.chunked("/chunks", chunks))

    def test_unfinished_chunks_are_no_feed(self):
        self.assertFetchFails(self.web.chunked("/chunks", [FEED], finished=False))

    def test_broken_chunks_are_no_feed(self):
        head = b"HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n"
        for name, body in (("no number", b"zz\r\n" + FEED + b"\r\n0\r\n\r\n"),
                           ("too long", b"%x\r\n" % (len(FEED) + 9) + FEED),
                           ("too short", b"5\r\n" + FEED + b"\r\n0\r\n\r\n")):
            with self.subTest(name):
                self.assertFetchFails(self.web.raw("/broken", head + body))

    def test_a_body_shorter_than_announced_is_no_feed(self):
        for missing in (1, 100_000):
            with self.subTest(missing):
                self.assertFetchFails(self.web.truncated("/short", FEED, missing))

    def test_a_body_that_ends_with_the_connection(self):
        self.assertFetches(self.web.until_closed("/closed", FEED))

    def test_a_slow_body(self):
        self.assertFetches(self.web.dripping("/slow", FEED, pause=0.005))

    def test_an_empty_body(self):
        self.assertFails(self.run_tool("parsefeed", self.web.serve("/empty", b"")),
                         "Could not load source: Could not load or read the specified feed URL")

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
    def test_a_reset_before_the_answer(self):
        self.assertFetchFails(self.web.reset("/reset"))

    def test_a_reset_in_the_body(self):
        head = b"HTTP/1.1 200 OK\r\nContent-Length: %d\r\n\r\n" % (len(FEED) + 10)
        self.assertFetchFails(self.web.reset("/reset", head + FEED))

    def test_an_empty_reply(self):
        self.assertFetchFails(self.web.empty_reply("/empty"))

    def test_an_answer_that_is_no_http(self):
        for name, answer in (("text", b"hello\r\n"), ("a feed", FEED), ("a cut head", b"HTTP/1.1 200 OK\r\nContent-Le"),
                             ("an odd status", b"HTTP/1.1 abc\r\n\r\n"), ("zeros", bytes(1000)),
                             ("an endless line", b"HTTP/1.1 200 " + b"x" * 2_000_000)):
            with self.subTest(name):
                self.assertFetchFails(self.web.raw("/odd", answer))

    def test_endless_header_fields(self):
        answer = b"HTTP/1.1 200 OK\r\n" + b"X-Padding: padding\r\n" * 500_000 + b"\r\n"
        self.assertFetchFails(self.web.raw("/fields", answer))

    def test_nobody_listens(self):
        with socket.socket() as taken:
            taken.bind(("127.0.0.1", 0))  # bound, yet not listening: nobody else can have the port
            self.assertFetchFails(f"http://127.0.0.1:{taken.getsockname()[1]}/feed.xml")

    def test_plain_http_where_tls_is_expected(self):
        self.assertFetchFails(self.web.url("/feed.xml", scheme="https"))
        self.assertEqual(self.web.requests, [])

    @unittest.skipUnless(shutil.which("openssl"), "the certificate is made by openssl")
    def test_a_certificate_that_nobody_vouches_for(self):
        subprocess.run(["openssl", "req", "-x509", "-newkey", "rsa:2048", "-nodes", "-keyout", "key.pem", "-out",
                        "cert.pem",
                        "-days", "2", "-subj", "/CN=localhost", "-addext", "subjectAltName=DNS:localhost,IP:127.0.0.1"],
                       cwd=self.directory, check=True, capture_output=True)
        context = ssl.SSLContext(ssl.PROTOCOL_TLS_SERVER)
        context.load_cert_chain(self.path("cert.pem"), self.path("key.pem"))
        self.web.use_tls(context)
        self.assertFetchFails(self.web.url("/feed.xml", scheme="https"))
        self.assertEqual(self.web.requests, [])

    def test_a_failed_fetch_writes_nothing(self):
        self.write("out", b"old")
        for url in (self.web.url("/none"), self.web.truncated("/short", FEED, 5), self.web.reset("/reset")):
            result = self.run_tool("createfeed", url, "-d", "out")
            self.assertLoadFails(result, stdout=b"[N] Loading/interpreting source...\n")
            self.assertEqual(self.path("out").read_bytes(), b"old")
        self.assertEqual([path.name for path in self.directory.iterdir()], ["out"])


if __name__ == "__main__":
    unittest.main()
