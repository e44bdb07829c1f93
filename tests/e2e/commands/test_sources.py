"""One string names the source; here is which string means a feed, a reference file, or nothing at all.

The rules are asymmetric on purpose: URL prefixes are case-sensitive while extensions are not, and a
text that begins like a URL is never looked for on disk.
"""

import os
import plistlib
import subprocess
import unittest

from support import ToolTestCase, checked, environment, rss, start, tool

PODCAST = {"PodcastName": "Night Walks"}
FEED = rss("<title>Night Walks</title>")


class SourceTest(ToolTestCase):
    def assertLoads(self, source, **options):
        self.assertEqual(self.parsefeed(source, **options), PODCAST)

    def assertInvalid(self, source, **options):
        self.assertFails(self.run_tool("parsefeed", source, **options), f'"{source}" is not a valid podcast source.\n')

    def assertNoSource(self, source, **options):
        self.assertFails(self.run_tool("parsefeed", source, **options),
                         f'Could not initialize podcast source with string "{source}".\n')


class FeedURLTest(SourceTest):
    def test_http(self):
        self.assertLoads(self.server().serve("/feed.xml", FEED))

    def test_pcast_is_fetched_over_http(self):
        server = self.server()
        server.serve("/feed.xml", FEED)
        self.assertLoads(server.url("/feed.xml", scheme="pcast"))
        self.assertEqual(server.hits("/feed.xml"), 1)

    def test_pcasts_is_fetched_over_https(self):
        server = self.server()
        server.serve("/feed.xml", FEED)
        self.assertLoadFails(self.run_tool("parsefeed", server.url("/feed.xml", scheme="pcasts")))
        self.assertEqual(server.hits("/feed.xml"), 0)

    def test_the_extension_of_a_url_does_not_matter(self):
        server = self.server()
        for path in ("/show.plist", "/show.podcast", "/show", "/"):
            with self.subTest(path):
                self.assertLoads(server.serve(path, FEED))

    def test_upper_case_schemes_are_local_paths(self):
        for source in ("HTTP://127.0.0.1/feed.xml", "Http://127.0.0.1/", "PCAST://127.0.0.1/", "FILE:///feed.xml",
                       "File:feed.xml"):
            with self.subTest(source):
                self.assertNoSource(source)

    def test_an_existing_file_may_have_a_name_like_an_upper_case_scheme(self):
        self.reference(PODCAST, name="HTTP.plist")
        self.assertLoads("HTTP.plist")

    def test_texts_that_begin_like_a_url_but_are_none(self):
        for source in ("http", "http:", "http://", "https://", "http:///feed.xml", "httpd", "pcast", "pcast:",
                       "pcast://",
                       "http://host/a b", "http://[::1/", "http://host:port/", "http://host/%zz", "http://host/<x>",
                       'http://host/"', "http://host/\n"):
            with self.subTest(source):
                self.assertInvalid(source)

    def test_a_file_whose_name_begins_like_a_url_is_not_looked_for(self):
        for name in ("http.plist", "https.plist", "pcast.plist", "httpd.plist", "podcast.plist"):
            self.reference(PODCAST, name=name)
        for name in ("http.plist", "https.plist", "pcast.plist", "httpd.plist"):
            with self.subTest(name):
                self.assertInvalid(name)
                self.assertLoads("./" + name)
        self.assertLoads("podcast.plist")

    def test_other_schemes_are_local_paths(self):
        for source in ("ftp://127.0.0.1/feed.xml", "feed://127.0.0.1/feed.xml", "data:,x", "//127.0.0.1/feed.xml",
                       " http://127.0.0.1/"):
            with self.subTest(source):
                self.assertNoSource(source)

    def test_texts_beyond_ascii_are_sent_percent_encoded(self):
        server = self.server()
        server.serve("/f%C3%BC%C3%9Fe/%F0%9F%9A%B6.xml", FEED)
        self.assertLoads(server.url("/füße/🚶.xml"))


class FileURLTest(SourceTest):
    def setUp(self):
        super().setUp()
        self.write("feed.xml", FEED)
        self.root = str(self.directory)

    def test_three_slashes(self):
        self.assertLoads(f"file://{self.root}/feed.xml")

    def test_localhost(self):
        self.assertLoads(f"file://localhost{self.root}/feed.xml")

    def test_one_slash(self):
        self.assertLoads(f"file:{self.root}/feed.xml")

    def test_another_host_is_no_valid_source(self):
        self.assertInvalid(f"file://elsewhere.example{self.root}/feed.xml")

    def test_percent_encoded_characters(self):
        self.write("a b%ü.xml", FEED)
        self.assertLoads(f"file://{self.root}/a%20b%25%C3%BC.xml")

    def test_characters_beyond_ascii_as_they_are(self):
        self.write("fü🚶.xml", FEED)
        self.assertLoads(f"file://{self.root}/fü🚶.xml")

    def test_white_space_is_no_valid_source(self):
        self.write("a b.xml", FEED)
        self.assertInvalid(f"file://{self.root}/a b.xml")

    def test_query_and_fragment_are_no_part_of_the_path(self):
        self.assertLoads(f"file://{self.root}/feed.xml?format=rss")
        self.assertLoads(f"file://{self.root}/feed.xml#top")

    def test_a_file_url_is_always_a_feed(self):
        reference = self.reference(PODCAST)
        self.assertFails(self.run_tool("parsefeed", reference.as_uri()),
                         "Could not load source: The feed was neither RSS nor Atom")
        self.assertLoads(self.feed(FEED, name="feed.plist"))
        self.assertLoads(self.feed(FEED, name="feed.podcast"))

    def test_a_missing_file(self):
        self.assertLoadFails(self.run_tool("parsefeed", f"file://{self.root}/missing.xml"))

    def test_a_nul_in_the_path(self):
        result = self.run_tool("parsefeed", f"file://{self.root}/feed.xml%00.txt")
        self.assertEqual((result.status, result.stdout), (1, b""))


class LocalPathTest(SourceTest):
    def test_absolute_and_relative_paths(self):
        path = self.reference(PODCAST, name="podcast.plist")
        self.path("folder").mkdir()
        self.assertLoads(path)
        self.assertLoads("podcast.plist")
        self.assertLoads("./podcast.plist")
        self.assertLoads("folder/../podcast.plist")
        self.assertLoads("../podcast.plist", cwd=self.path("folder"))

    def test_the_extension_may_be_in_any_case(self):
        for name in ("a.PLIST", "b.Plist", "c.pLiSt"):
            with self.subTest(name):
                self.assertLoads(self.reference(PODCAST, name=name))

    def test_only_the_last_extension_counts(self):
        self.assertLoads(self.reference(PODCAST, name="show.xml.plist"))
        self.assertNoSource(str(self.reference(PODCAST, name="show.plist.xml")))

    def test_other_extensions_are_no_source(self):
        for name in ("a.xml", "a.rss", "a.txt", "a.plists", "a.plist~", "a.", "plist", "aplist"):
            with self.subTest(name):
                self.reference(PODCAST, name=name)
                self.assertNoSource(name)

    def test_a_leading_dot_alone_starts_no_extension(self):
        self.reference(PODCAST, name=".plist")
        self.assertNoSource(".plist")

    def test_a_dot_in_a_folder_starts_no_extension(self):
        self.path("shows.plist").mkdir()
        self.reference(PODCAST, name="shows.plist/night")
        self.assertNoSource("shows.plist/night")

    def test_an_empty_text_is_valid_but_no_source(self):
        self.assertNoSource("")

    def test_a_symbolic_link_is_followed(self):
        self.reference(PODCAST, name="target.data")
        self.path("link.plist").symlink_to("target.data")
        self.assertLoads("link.plist")

    def test_a_tilde_is_not_expanded(self):
        self.reference(PODCAST, name="home.plist")
        self.assertNoSource("~/home.plist", env={"HOME": str(self.directory)})

    def test_names_with_spaces_percent_signs_and_beyond_ascii(self):
        for name in ("a b.plist", "100%25.plist", "füße 🚶.plist", "line\nbreak.plist"):
            with self.subTest(name):
                self.reference(PODCAST, name=name)
                self.assertLoads(name)

    def test_a_name_that_is_no_utf_8(self):
        self.write("x.plist", plistlib.dumps(PODCAST)).rename(os.fsdecode(bytes(self.directory) + b"/\xff.plist"))
        self.assertLoads(b"\xff.plist")

    def test_a_file_and_its_output_may_be_the_same(self):
        path = self.reference({**PODCAST, "PodcastUnknown": "x" * 100_000})
        self.assertEqual(self.run_tool("parsefeed", path, "-d", path).status, 0)
        self.assertEqual(plistlib.loads(path.read_bytes()), PODCAST)


class StandardInputTest(SourceTest):
    def test_a_reference_file_in_each_form(self):
        for fmt in (plistlib.FMT_XML, plistlib.FMT_BINARY):
            with self.subTest(fmt):
                result = self.run_tool("parsefeed", "-i", stdin=plistlib.dumps(PODCAST, fmt=fmt))
                self.assertSucceeds(result)
                self.assertEqual(plistlib.loads(result.stdout), PODCAST)

    def test_the_given_source_is_ignored(self):
        self.reference({"PodcastName": "Other"}, name="other.plist")
        for source in ("other.plist", "missing.plist", "", "file:///missing.xml"):
            with self.subTest(source):
                result = self.run_tool("parsefeed", source, "-i", stdin=plistlib.dumps(PODCAST))
                self.assertSucceeds(result)
                self.assertEqual(plistlib.loads(result.stdout), PODCAST)

    def test_the_given_source_is_not_fetched(self):
        server = self.server()
        url = server.serve("/feed.xml", FEED)
        self.assertSucceeds(self.run_tool("parsefeed", url, "-i", stdin=plistlib.dumps(PODCAST)))
        self.assertEqual(server.requests, [])

    def test_the_given_source_is_validated_all_the_same(self):
        self.assertInvalid_with_input("http://", plistlib.dumps(PODCAST))

    def assertInvalid_with_input(self, source, stdin):
        self.assertFails(self.run_tool("parsefeed", source, "-i", stdin=stdin),
                         f'"{source}" is not a valid podcast source.\n')

    def test_what_is_no_property_list(self):
        for name, stdin in (("nothing", b""), ("white space", b" \n"), ("a feed", FEED), ("text", b"PodcastName"),
                            ("zeros", bytes(1000)), ("a cut list", plistlib.dumps(PODCAST)[:-12])):
            with self.subTest(name):
                self.assertFails(self.run_tool("parsefeed", "-i", stdin=stdin),
                                 '"(null)" is not a valid podcast source.\n')
                self.assertFails(self.run_tool("parsefeed", "-i", "x.plist", stdin=stdin),
                                 'Could not initialize podcast source with string "x.plist".\n')

    def test_a_list_without_dictionary_is_valid_but_no_source(self):
        for value in ([], ["a"], "text", 7, True):
            with self.subTest(value):
                self.assertFails(self.run_tool("parsefeed", "-i", stdin=plistlib.dumps(value)),
                                 'Could not initialize podcast source with string "(null)".\n')

    def test_a_closed_standard_input(self):
        self.assertFails(self.run_tool("parsefeed", "-i", stdin=None, closed=(0,)),
                         '"(null)" is not a valid podcast source.\n')

    def test_input_that_comes_in_pieces(self):
        content = plistlib.dumps(PODCAST)
        with start("parsefeed", "-i", stdin=subprocess.PIPE, stdout=subprocess.PIPE) as process:
            for byte in content:
                process.stdin.write(bytes([byte]))
                process.stdin.flush()
            stdout, _ = process.communicate(timeout=60)
        self.assertEqual(checked((), process.returncode).status, 0)
        self.assertEqual(plistlib.loads(stdout), PODCAST)

    def test_input_larger_than_any_pipe(self):
        podcast = {"PodcastName": "n" * 3_000_000}
        result = self.run_tool("parsefeed", "-i", stdin=plistlib.dumps(podcast))
        self.assertSucceeds(result)
        self.assertEqual(plistlib.loads(result.stdout), podcast)

    def test_input_from_a_file(self):
        with open(self.reference(PODCAST), "rb") as source:
            finished = subprocess.run([tool(), "parsefeed", "-i"], stdin=source, env=environment(), timeout=60,
                                      capture_output=True, check=True)
        self.assertEqual(plistlib.loads(finished.stdout), PODCAST)


if __name__ == "__main__":
    unittest.main()
