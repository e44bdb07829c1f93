"""The options of qel-keep, and wrong use of it."""

import unittest

from keep_support import KeepTestCase
from support import NO_FEED, element


class OptionsTest(KeepTestCase):
    def test_wrong_use_is_told_with_a_hint(self):
        self.publish(self.episode(1))
        for arguments, message in [
                ([], "BUNDLE is missing"),
                (["a", "b", "c.podcast"], "there are too many words"),
                ([self.feed_url, "show"], "the name of BUNDLE, 'show', does not end in .podcast"),
                (["new.podcast"], "SOURCE is missing, and 'new.podcast' remembers none"),
                (["--jobs", "0", "a.podcast"], "'0' is no value of option '--jobs'"),
                (["--latest", "x", "a.podcast"], "'x' is no value of option '--latest'"),
                (["--stall", "-1", "a.podcast"], "'-1' is no value of option '--stall'"),
                (["--since", "31.5.", "a.podcast"], "'31.5.' is no value of option '--since'"),
                (["--directory", "x", "a.podcast"], "'x' is no value of option '--directory'"),
                (["--since"], "option '--since' requires a value"),
                (["-x"], "unrecognized option '-x'")]:
            with self.subTest(message):
                self.assertRefused(self.run_keep(*arguments), f"{message}; see 'qel-keep --help'")
        self.assertEqual(list(self.directory.glob("*.podcast")), [])

    def test_help_and_version(self):
        result = self.run_keep("--help")
        self.assertEqual((result.status, result.stderr), (0, b""))
        self.assertTrue(result.stdout.startswith(b"Usage: qel-keep [OPTION]... [SOURCE] BUNDLE\n"))
        self.assertLess(max(map(len, result.stdout.splitlines())), 80)
        self.assertRegex(self.run_keep("--version").stdout, rb"\Aqel-keep \d+\.\d+\.\d+\n\Z")

    def test_a_source_that_cannot_be_loaded_makes_nothing(self):
        self.web.serve("/page.html", b"<html/>")
        nothing = "it is no feed, and no reference file or bundle that can be read"
        for source, cause in [(self.web.url("/none.xml"), "HTTP status 404"),
                              (self.web.url("/page.html"), NO_FEED.partition(": ")[2]),
                              ("none.plist", nothing),
                              (self.write("feed.xml", b"<rss/>"), "it is no reference file or bundle; "
                               "a feed on the disk is named by a file:/// URL"),
                              ("HTTP://a.example/", "a URL begins with http:, https: or file:, in lower case"),
                              ("FTP://a.example/", "a URL begins with http:, https: or file:, in lower case"),
                              ("http://a b/", '" " is written %20'), ("pcast://a b/x", '" " is written %20'),
                              ("pcast:///x", "it has no host"),
                              (f"file://{self.directory}/my feed.xml", '" " is written %20')]:
            with self.subTest(source):
                self.assertRefused(self.keep(source=source), f"{source}: {cause}")
                self.assertFalse(self.bundle.exists())

    def test_a_bundle_that_cannot_be_read_is_left_alone(self):
        self.bundle.mkdir()
        (self.bundle / "Info.plist").write_bytes(b"<plist>")
        result = self.keep()
        self.assertEqual((result.status, result.stdout), (2, b""))
        self.assertTrue(result.stderr.startswith(f"qel-keep: {self.bundle}: Info.plist: ".encode()), result.stderr)
        self.assertEqual((self.bundle / "Info.plist").read_bytes(), b"<plist>")

    def test_a_bundle_that_cannot_be_written_is_told_before_anything_is_fetched(self):
        self.publish(self.episode(1))
        self.assertRefused(self.run_keep(self.feed_url, self.path("limited.podcast"), blocks=0),
                           "could not write Info.plist: File too large")
        self.assertEqual([request.path for request in self.web.requests], ["/feed.xml"])

    def test_a_file_is_no_bundle(self):
        self.bundle.write_bytes(b"")
        self.assertRefused(self.keep(), f"{self.bundle}: File exists")

    def test_a_bundle_is_not_its_own_source(self):
        self.publish(self.episode(1))
        self.keep()
        before = self.info()
        for source in (self.bundle, self.bundle / "Info.plist"):
            self.assertRefused(self.keep(source=source), "SOURCE and BUNDLE are the same; see 'qel-keep --help'")
        self.assertEqual(self.info(), before)

    def test_a_patience_without_end_is_one(self):
        self.publish(self.episode(1))
        self.assertKept(self.keep("--stall", "99999999999"), "1 new, 0 known, 0 failed")

    def test_a_rehearsal_makes_nothing(self):
        poster = self.web.serve("/1.png", b"poster")
        self.publish(self.episode(2), self.episode(1, element("orvane:image", href=poster)))
        result = self.keep("--dry-run")
        self.assertKept(result, "3 to fetch, 0 known")
        self.assertEqual(result.stdout.decode(),
                         f'would fetch "Episode 2" from {self.web.url("/2.mp3")}\n'
                         f'would fetch "Episode 1" from {self.web.url("/1.mp3")}\n'
                         f'would fetch poster of "Episode 1" from {poster}\n'
                         "3 to fetch, 0 known\n")
        self.assertFalse(self.bundle.exists())
        self.assertEqual([request.path for request in self.web.requests], ["/feed.xml"])
        self.keep()
        self.publish(self.episode(3), self.episode(2, title="Renamed"), self.episode(5, url="/etc/passwd"))
        before = (self.bundle / "Info.plist").read_bytes()
        result = self.keep("-n", source=None)
        self.assertKept(result, "1 to fetch, 1 known")
        self.assertIn('would not fetch "Episode 5" from /etc/passwd: A feed of the network names a local file, '
                      "see --allow-local\n", result.stdout.decode())
        self.assertEqual((self.bundle / "Info.plist").read_bytes(), before)

    def test_a_rehearsal_has_the_posters_alone_of_episodes_that_come(self):
        alone, shared = (element("orvane:image", href=self.web.serve(f"/{name}.png", b"poster"))
                         for name in ("alone", "shared"))
        self.publish(self.episode(1, alone, url="/etc/passwd"), self.episode(2, shared, url="ftp://a.example/2.mp3"))
        self.assertKept(self.keep("-n"), "0 to fetch, 0 known")
        self.publish(self.episode(1, alone, url="/etc/passwd"), self.episode(2, shared, url="ftp://a.example/2.mp3"),
                     self.episode(3, shared))
        result = self.keep("-n")
        self.assertKept(result, "2 to fetch, 0 known")
        self.assertIn(f'would fetch poster of "Episode 3" from {self.web.url("/shared.png")}\n', result.stdout.decode())
        result = self.keep()
        self.assertKept(result, "1 new, 0 known, 2 failed", 1, result.stderr.decode())
        self.assertIn('fetched poster of "Episode 3": 3.png (6 B)\n', result.stdout.decode())
        self.assertEqual(self.listed("EpisodePosterReference"), ["Posters/3.png"])

    def test_a_title_of_two_lines_is_told_in_one(self):
        self.publish(self.episode(1, title="One\nTwo"))
        for options, line in [(["-n"], f'would fetch "One\ufffdTwo" from {self.web.url("/1.mp3")}'),
                              ([], 'fetched "One\ufffdTwo": 1.mp3 (7 B)')]:
            self.assertEqual(self.keep(*options).stdout.decode().splitlines()[:-1], [line])

    def test_quiet_prints_failures_alone(self):
        self.publish(self.episode(1), self.episode(2, url=self.web.url("/none")))
        result = self.keep("--quiet")
        self.assertEqual((result.status, result.stdout), (1, b""))
        self.assertEqual(result.stderr.decode(),
                         f'qel-keep: "Episode 2": {self.web.url("/none")}: HTTP status 404\n')

    def test_the_latest_go_by_date(self):
        self.publish(self.episode(1), self.episode(3), self.episode(2))
        self.assertKept(self.keep("--latest", "2"), "2 new, 0 known, 0 failed")
        self.media(3, 2)
        self.publish(self.episode(4), self.episode(1), self.episode(3), self.episode(2))
        self.assertKept(self.keep("--latest=1"), "1 new, 2 known, 0 failed")
        self.media(4, 3, 2)

    def test_since_a_date(self):
        self.publish(self.episode(1), self.episode(3), self.episode(2))
        self.assertKept(self.keep("--since", "2024-01-04T00:00:00Z"), "1 new, 0 known, 0 failed")
        self.media(3)
        self.assertKept(self.keep("--since", "2024-01-03"), "1 new, 1 known, 0 failed")
        self.media(3, 2)

    def test_elements_of_another_directory(self):
        poster = self.web.serve("/1.png", b"poster")
        feed = ('<rss version="2.0" xmlns:pods="https://pods.example/ns"><channel>'
                f'<pods:image href="{poster}"/></channel></rss>')
        self.web.serve("/feed.xml", feed.encode())
        self.keep()
        self.assertNotIn("PodcastPosterReference", self.info())
        self.keep("--directory", "pods=https://pods.example/ns")
        self.assertEqual(self.info()["PodcastPosterReference"], "Posters/Podcast.png")


if __name__ == "__main__":
    unittest.main()
