"""Whom the tool trusts: the system's authorities, and those that the environment names."""

import os
import shutil
import subprocess
import unittest

import certificates
from support import ToolTestCase, rss

FEED = rss("<title>Night Walks</title>")
UNKNOWN = "SSL certificate problem: unable to get local issuer certificate"


@unittest.skipUnless(certificates.available(), "openssl is missing")
class AuthorityTest(ToolTestCase):
    def setUp(self):
        super().setUp()
        self.web = self.server()
        self.web.use_tls(certificates.make(self.directory)["good"])
        self.web.serve("/feed.xml", FEED)
        self.feed_url = self.web.url("/feed.xml", scheme="https")
        self.file = str(self.path(certificates.AUTHORITY))
        self.other = str(self.path("self-signed.pem"))
        folder = self.path("authorities")
        folder.mkdir()
        shutil.copy(self.file, folder)
        subprocess.run(["openssl", "rehash", folder], check=True)
        self.folder = str(folder)

    def assertTrusts(self, **env):
        self.assertEqual(self.parsefeed(self.feed_url, env=env), {"PodcastName": "Night Walks"})

    def assertRefuses(self, cause, **env):
        self.assertLoadFails(self.run_tool("parsefeed", self.feed_url, env=env), cause)
        self.assertEqual(self.web.requests, [])

    def test_nobody_else_is_trusted(self):
        self.assertRefuses(UNKNOWN)
        self.assertRefuses(UNKNOWN, CURL_CA_BUNDLE=self.other, SSL_CERT_FILE=self.file, SSL_CERT_DIR=self.folder)

    def test_each_variable_counts(self):
        self.assertTrusts(CURL_CA_BUNDLE=self.file)
        self.assertTrusts(SSL_CERT_FILE=self.file)
        self.assertTrusts(SSL_CERT_DIR=self.folder)
        self.assertTrusts(SSL_CERT_FILE=self.other, SSL_CERT_DIR=self.folder)

    def test_an_empty_one_does_not(self):
        self.assertTrusts(CURL_CA_BUNDLE="", SSL_CERT_FILE=self.file, SSL_CERT_DIR="")
        self.assertTrusts(CURL_CA_BUNDLE="", SSL_CERT_FILE="", SSL_CERT_DIR=self.folder)

    def test_a_file_that_is_not_there_is_named(self):
        self.assertRefuses(r"error setting certificate file: /none\.pem", SSL_CERT_FILE="/none.pem")

    def test_a_proxy_is_trusted_in_the_same_way(self):
        self.web.serve("http://feeds.example/feed.xml", FEED)
        self.feed_url = "http://feeds.example/feed.xml"
        proxy = self.web.url("", scheme="https")
        self.assertRefuses(UNKNOWN, http_proxy=proxy)
        self.assertTrusts(http_proxy=proxy, SSL_CERT_FILE=self.file)
        self.assertTrusts(http_proxy=proxy, SSL_CERT_DIR=self.folder)

    def test_the_keys_of_sessions_can_be_had(self):
        self.assertTrusts(SSL_CERT_FILE=self.file, SSLKEYLOGFILE=str(self.path("keys")))
        self.assertIn("SECRET", self.path("keys").read_text())

    def test_connections_are_kept(self):
        episodes = [{"EpisodeReference": self.web.serve(f"/{number}.mp3", b"media").replace("http", "https", 1)}
                    for number in range(5)]
        self.assertSucceeds(self.run_tool("createbundle", self.reference({"Episodes": episodes}), "-d",
                                          self.path("show.podcast"), env={"SSL_CERT_FILE": self.file}))
        self.assertEqual(len(os.listdir(self.path("show.podcast"))), 7)
        self.assertEqual(self.web.connections, 1)


if __name__ == "__main__":
    unittest.main()
