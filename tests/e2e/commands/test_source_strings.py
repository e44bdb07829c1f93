"""One string names the source, and each kind is found from the shell as people type it.

QELSourceResolutionTest and URLTest have the tables of which string means a feed, a reference file, a bundle or
nothing at all; here is one of each kind, with the server or the file that it must lead to.
"""

import os
import plistlib
import unittest

from support import NO_FEED, ToolTestCase, rss

PODCAST = {"PodcastName": "Night Walks"}
FEED = rss("<title>Night Walks</title>")


class SourceTest(ToolTestCase):
    def assertLoads(self, source, **options):
        self.assertEqual(self.parsefeed(source, **options), PODCAST)


class URLTest(SourceTest):
    def test_pcast_is_fetched_over_http(self):
        server = self.server()
        server.serve("/show.plist", FEED)  # an extension does not matter
        self.assertLoads(server.url("/show.plist", scheme="pcast"))
        self.assertEqual(server.hits("/show.plist"), 1)

    def test_pcasts_is_fetched_over_https(self):
        server = self.server()
        server.serve("/feed.xml", FEED)
        self.assertLoadFails(self.run_tool("parsefeed", server.url("/feed.xml", scheme="pcasts")))
        self.assertEqual(server.hits("/feed.xml"), 0)

    def test_a_file_url(self):
        self.write("a b%ü🚶.xml", FEED)
        self.assertLoads(f"file://localhost{self.directory}/a%20b%25%C3%BC🚶.xml?format=rss#top")

    def test_a_file_url_is_always_a_feed(self):
        self.assertFails(self.run_tool("parsefeed", self.reference(PODCAST).as_uri()), NO_FEED)

    def test_upper_case_and_other_schemes_are_local_paths(self):
        for source in ("HTTP://127.0.0.1/feed.xml", "FILE:///feed.xml", "ftp://127.0.0.1/feed.xml", "//127.0.0.1/feed"):
            with self.subTest(source):
                self.assertNoSource(source)
        self.reference(PODCAST, name="HTTP.plist")
        self.assertLoads("HTTP.plist")

    def test_a_file_whose_name_begins_like_a_url_is_not_looked_for(self):
        for name in ("http.plist", "httpd.plist", "pcast.plist"):
            with self.subTest(name):
                self.reference(PODCAST, name=name)
                self.assertInvalidSource(name)
                self.assertLoads("./" + name)
        self.reference(PODCAST, name="podcast.plist")
        self.assertLoads("podcast.plist")


class PathTest(SourceTest):
    def test_a_relative_path_belongs_to_the_working_directory(self):
        self.reference(PODCAST, name="podcast.plist")
        self.path("folder").mkdir()
        self.assertLoads("../podcast.plist", cwd=self.path("folder"))

    def test_the_extension_decides(self):
        self.assertLoads(self.reference(PODCAST, name="show.xml.PLIST"))
        self.assertNoSource(str(self.reference(PODCAST, name="show.plist.xml")))
        self.assertNoSource(str(self.reference(PODCAST, name=".plist")))

    def test_a_tilde_is_not_expanded(self):
        self.reference(PODCAST, name="home.plist")
        self.assertNoSource("~/home.plist", env={"HOME": str(self.directory)})

    def test_names_of_odd_characters(self):
        for name in ("100%25 füße 🚶\nbreak.plist", os.fsdecode(b"\xff.plist")):
            with self.subTest(name):
                self.reference(PODCAST, name="x.plist").rename(self.path(name))
                self.assertLoads(os.fsencode(name))


class StandardInputTest(SourceTest):
    def test_a_reference_file_in_each_form(self):
        for fmt in (plistlib.FMT_XML, plistlib.FMT_BINARY):
            with self.subTest(fmt):
                self.assertLoads("-i", stdin=plistlib.dumps(PODCAST, fmt=fmt))

    def test_the_given_source_is_neither_looked_for_nor_fetched(self):
        server = self.server()
        for source in (server.serve("/feed.xml", FEED), "missing.plist", "", "file:///missing.xml"):
            with self.subTest(source):
                result = self.run_tool("parsefeed", source, "-i", stdin=plistlib.dumps(PODCAST))
                self.assertSucceeds(result)
                self.assertEqual(plistlib.loads(result.stdout), PODCAST)
        self.assertEqual(server.requests, [])

    def test_the_given_source_is_validated_all_the_same(self):
        self.assertFails(self.run_tool("parsefeed", "http://", "-i", stdin=plistlib.dumps(PODCAST)),
                         '"http://" is not a valid podcast source.\n')

    def test_a_closed_standard_input(self):
        self.assertFails(self.run_tool("parsefeed", "-i", stdin=None, closed=(0,)),
                         '"(null)" is not a valid podcast source.\n')


if __name__ == "__main__":
    unittest.main()
