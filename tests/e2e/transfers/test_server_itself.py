"""The tests of transfers trust a server that misbehaves on purpose; here it is shown to do so.

Python's own client asks, so this file says nothing about the tool and holds for any build of it.
"""

import gzip
import http.client
import time
import unittest
import urllib.error
import urllib.request

from feed_server import FeedServer


def fetch(url):
    opener = urllib.request.build_opener(urllib.request.ProxyHandler({}))
    with opener.open(url, timeout=20) as response:
        return response.read()


class FeedServerTest(unittest.TestCase):
    def setUp(self):
        self.server = FeedServer()
        self.addCleanup(self.server.stop)

    def test_good_answers_are_whole(self):
        for url, body in ((self.server.serve("/feed.xml", b"text"), b"text"),
                          (self.server.redirect("/old", "/feed.xml"), b"text"),
                          (self.server.chunked("/chunks", [b"one ", b"two"]), b"one two"),
                          (self.server.until_closed("/closed", b"text"), b"text"),
                          (self.server.raw("/raw", b"HTTP/1.0 200 OK\r\n\r\ntext"), b"text")):
            with self.subTest(url):
                self.assertEqual(fetch(url), body)
        self.assertEqual(gzip.decompress(fetch(self.server.compressed("/packed", b"text"))), b"text")

    def test_requests_are_counted_and_kept(self):
        fetch(self.server.serve("/feed.xml", b"hello"))
        self.assertEqual(self.server.hits("/feed.xml"), 1)
        self.assertEqual(self.server.requests[0].headers["host"], f"127.0.0.1:{self.server.port}")

    def test_an_unknown_path_is_not_found(self):
        with self.assertRaises(urllib.error.HTTPError) as failure:
            fetch(self.server.url("/none"))
        self.assertEqual(failure.exception.code, 404)
        failure.exception.close()

    def test_a_connection_is_kept(self):
        self.server.serve("/a", b"a")
        client = http.client.HTTPConnection("127.0.0.1", self.server.port, timeout=20)
        self.addCleanup(client.close)
        for _ in range(3):
            client.request("GET", "/a")
            self.assertEqual(client.getresponse().read(), b"a")
        self.assertEqual(self.server.connections, 1)
        self.assertEqual(len({request.connection for request in self.server.requests}), 1)

    def test_broken_answers_are_broken(self):
        def reset(exchange):
            exchange.send(b"")
            exchange.reset()
        for url, fault in ((self.server.truncated("/short", b"text", missing=3), http.client.IncompleteRead),
                           (self.server.raw("/empty", b""), http.client.RemoteDisconnected),
                           (self.server.route("/reset", reset), ConnectionResetError)):
            with self.subTest(url), self.assertRaises(fault):
                try:
                    fetch(url)
                except urllib.error.URLError as error:
                    raise error.reason

    def test_a_dripping_body_takes_its_time(self):
        started = time.monotonic()
        self.assertEqual(fetch(self.server.dripping("/drip", b"abcd", pause=0.05)), b"abcd")
        self.assertGreater(time.monotonic() - started, 0.2)


if __name__ == "__main__":
    unittest.main()
