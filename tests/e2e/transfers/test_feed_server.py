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

    def test_a_body_is_served_and_counted(self):
        url = self.server.serve("/feed.xml", b"hello")
        self.assertEqual(fetch(url), b"hello")
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

    def test_a_chain_of_redirects_has_its_length(self):
        self.server.serve("/end", b"end")
        self.assertEqual(fetch(self.server.redirect_chain("/hop", 4, "/end")), b"end")
        self.assertEqual(len(self.server.requests), 5)

    def test_a_redirect_may_lack_its_location(self):
        with self.assertRaises(urllib.error.HTTPError) as failure:
            fetch(self.server.redirect("/lost", None))
        self.assertEqual(failure.exception.code, 302)
        self.assertNotIn("Location", failure.exception.headers)
        failure.exception.close()

    def test_a_compressed_body_may_be_cut(self):
        self.assertEqual(gzip.decompress(fetch(self.server.compressed("/whole", b"text"))), b"text")
        with self.assertRaises(EOFError):
            gzip.decompress(fetch(self.server.compressed("/cut", b"text", cut=5)))

    def test_chunks_arrive_as_one_body(self):
        self.assertEqual(fetch(self.server.chunked("/chunks", [b"one ", b"two"])), b"one two")

    def test_unfinished_chunks_are_noticed(self):
        with self.assertRaises(http.client.IncompleteRead):
            fetch(self.server.chunked("/chunks", [b"one ", b"two"], finished=False))

    def test_a_truncated_body_is_noticed(self):
        with self.assertRaises(http.client.IncompleteRead):
            fetch(self.server.truncated("/short", b"text", missing=3))

    def test_a_body_may_end_with_the_connection(self):
        self.assertEqual(fetch(self.server.until_closed("/closed", b"text")), b"text")

    def test_a_dripping_body_takes_its_time(self):
        started = time.monotonic()
        self.assertEqual(fetch(self.server.dripping("/drip", b"abcd", pause=0.05)), b"abcd")
        self.assertGreater(time.monotonic() - started, 0.2)

    def test_a_reset_is_a_reset(self):
        with self.assertRaises(ConnectionResetError):
            try:
                fetch(self.server.reset("/reset"))
            except urllib.error.URLError as error:
                raise error.reason

    def test_an_empty_reply_is_empty(self):
        with self.assertRaises(http.client.RemoteDisconnected):
            fetch(self.server.empty_reply("/empty"))


if __name__ == "__main__":
    unittest.main()
