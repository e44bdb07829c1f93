"""qel-check finds what people get wrong in reference files, says where, and agrees with the tool.

It never finds fault with what the tool itself wrote of a sound source, and always with what the tool refuses.
"""

import datetime
import plistlib
import re
import subprocess
import unittest
from pathlib import Path

from hostile_documents import array_object, binary_list
from support import ToolTestCase, element, environment, item, rss, tool

ROOT = Path(__file__).resolve().parents[3]

NO_UUID = ('note: this episode has no "EpisodeUUID", so the URL of its media becomes its guid, and readers show it again '
           "when that changes: add one")
MEDIA = "<key>EpisodeReference</key><string>a.mp3</string>"


def plist(*lines):
    """A property list with each part on a line of its own; the first part is on the second line."""
    return "\n".join(['<plist version="1.0">', *lines, "</plist>"]) + "\n"


def podcast(*lines):
    """A reference file whose first part is on the third line."""
    return plist("<dict>", *lines, "</dict>")


def episode(*lines):
    """A reference file with one episode, whose first part is on the fourth line."""
    return podcast("<key>Episodes</key><array><dict>", *lines, "</dict></array>")


def text(key, value):
    return f"<key>{key}</key><string>{value}</string>"


# Each file, and the one fault that it has.
REFUSED = [
    ("", '1:1: error: no element found; the file is empty or cut off: take it from where it came once more'),
    (plist("<dict>", "<key>PodcastName</key><string>Wind & Weather</string>", "</dict>"),
     '3:37: error: not well-formed (invalid token); "&" and "<" in a text are written &amp; and &lt;'),
    (podcast(text("PodcastName", "a&nbsp;b")),
     '3:32: error: undefined entity; write the character itself; XML knows only &amp; &lt; &gt; &quot; &apos;'),
    (podcast("<key>PodcastName</key><string>x"),
     '4:3: error: mismatched tag; each <x> ends with its </x>, the one opened last before the others'),
    ("\n\n" + podcast("<key>PodcastName</key><string>x"),
     '6:3: error: mismatched tag; each <x> ends with its </x>, the one opened last before the others'),
    ("<dict/>",
     '1:1: error: a document whose root element is not "plist"; put <plist version="1.0"> before it and '
     '</plist> behind it'),
    (plist(), "2:1: error: a property list without a value; put a <dict> with the podcast's keys into it"),
    (plist("<dict/>", "<dict/>"),
     '3:1: error: a second value in a property list; remove it, or put it into the first one'),
    (plist("<array/>"),
     '2:1: error: the value of a reference file must be a dictionary, not an array: put it into <dict>'),
    (plist("<string>x</string>"),
     '2:1: error: the value of a reference file must be a dictionary, not a text: put it into <dict>'),
    (podcast("<key>PodcastName</key><text>x</text>"),
     '3:23: error: an unexpected element "text"; values are string, integer, date, array and dict; a "<" of a '
     'text is written &lt;'),
    (podcast("<key>PodcastName</key>", "x", "<string/>"),
     '4:1: error: text outside of a value that holds text; put it into <string> and </string>'),
    (podcast("<key>PodcastDescription</key><string>two", "<b>walks</b></string>"),
     '4:1: error: an unexpected element "b"; values are string, integer, date, array and dict; a "<" of a text '
     'is written &lt;'),
    (podcast("<key>PodcastName</key>"),
     '4:1: error: a key without a value in a dictionary; write the value behind it, or remove the key before this'),
    (podcast("<key>PodcastName</key>", text("PodcastUUID", "x")),
     '4:1: error: a key without a value in a dictionary; write the value behind it, or remove the key before this'),
    (podcast("<string>x</string>"),
     '3:1: error: a value without a key in a dictionary; write <key>, its name and </key> before it'),
    (podcast("<key>Episodes</key><array>", text("EpisodeName", "x"), "</array>"),
     '4:1: error: a key outside of a dictionary; put <dict> before it, and </dict> behind its value'),
    (episode(MEDIA, "<key>EpisodeOrder</key><integer>first</integer>"),
     '5:24: error: an integer that is none or out of range; write digits alone, such as 12044'),
    (episode(MEDIA, "<key>EpisodeOrder</key><integer>18446744073709551616</integer>"),
     '5:24: error: an integer that is none or out of range; write digits alone, such as 12044'),
    (episode(MEDIA, "<key>EpisodeDate</key><date>2026-04-04 04:30</date>"),
     '5:23: error: a date that is none or out of range; write it in UTC and like 2026-04-04T04:30:00Z'),
    (episode(MEDIA, "<key>EpisodeDate</key><date>2026-02-29T00:00:00Z</date>"),
     '5:23: error: a date that is none or out of range; write it in UTC and like 2026-04-04T04:30:00Z'),
    (podcast("<key>x</key><real>1,5</real>"), '3:13: error: a real that is none or out of range; write it like 1.5'),
    (podcast("<key>x</key><data>a</data>"),
     '3:13: error: data that is not in base64; remove it: a reference file has no data'),
    (podcast("<key>x</key>", "<array>" * 512, "</array>" * 512),
     '4:3578: error: arrays and dictionaries nested deeper than 512 levels; a reference file has three levels'),
    ('<?xml version="1.0" encoding="none"?>' + podcast(),
     '1:31: error: unknown encoding "none"; save the file as UTF-8, and say so in its first line'),
]
TAKEN_OTHERWISE = [
    (podcast(text("PodcastNmae", "x")),
     '3:1: warning: "PodcastNmae" is no key of a podcast, and is ignored; is it meant to be "PodcastName"?'),
    (podcast("<key>PodcastDate</key><date>2026-04-04T04:30:00Z</date>"),
     '3:1: warning: "PodcastDate" is no key of a podcast, and is ignored: correct it or leave it out'),
    (podcast(text("Zzz", "x")),
     '3:1: warning: "Zzz" is no key of a podcast, and is ignored: correct it or leave it out'),
    (podcast(text("EpisodeName", "x")),
     '3:1: warning: "EpisodeName" is a key of an episode, and is ignored in a podcast: move it there'),
    (episode(MEDIA, text("PodcastName", "x")),
     '5:1: warning: "PodcastName" is a key of a podcast, and is ignored in an episode: move it there'),
    (podcast(text("PodcastName", "x"), text("PodcastName", "y")),
     '4:1: warning: the key "PodcastName" stands here for a second time, and only the last one counts: remove one'),
    (podcast("<key>PodcastName</key><integer>7</integer>"),
     '3:1: warning: "PodcastName" must be a text, not an integer: write it in <string>'),
    (podcast("<key>Episodes</key><dict/>"),
     '3:1: warning: "Episodes" must be an array, not a dictionary: write it in <array>'),
    (podcast("<key>Episodes</key><array>", "<string>x</string>", "</array>"),
     '4:1: warning: an episode must be a dictionary, not a text: put it into <dict>'),
    (episode(MEDIA, text("EpisodeDate", "2026-04-04T04:30:00Z")),
     '5:1: warning: "EpisodeDate" must be a date, not a text: write it in <date>'),
    (episode(MEDIA, text("EpisodeFileSize", "12044")),
     '5:1: warning: "EpisodeFileSize" must be an integer, not a text: write it in <integer>'),
    (episode(MEDIA, "<key>EpisodeOrder</key><true/>"),
     '5:1: warning: "EpisodeOrder" must be an integer, not a truth value: write it in <integer>'),
    (episode(MEDIA, "<key>EpisodeOrder</key><real>1.5</real>"),
     '5:1: warning: "EpisodeOrder" must be an integer, not a number with a fraction: write it in <integer>'),
    (episode(MEDIA, "<key>EpisodeOrder</key><integer>-1</integer>"),
     '5:24: warning: a negative "EpisodeOrder" counts as missing: write 0 or more, or leave it out'),
    (episode(MEDIA, "<key>EpisodeFileSize</key><integer>-0x1</integer>"),
     '5:27: warning: a negative "EpisodeFileSize" counts as missing: write 0 or more, or leave it out'),
    (episode(MEDIA, text("EpisodeType", "mp3")), '5:23: warning: "mp3" is no MIME type: write one such as audio/mpeg'),
    (podcast(text("PodcastAdvisoryLabel", "No")),
     '3:32: warning: the advisory label "No" is in no feed: write "Explicit" or "Clean", or leave it out'),
    (episode(MEDIA, text("EpisodeAdvisoryLabel", "Adult")),
     '5:32: warning: the advisory label "Adult" is in no feed: write "Explicit" or "Clean", or leave it out'),
    (podcast("<key>AllowedPosterTypes</key><array><string>png</string>", "<integer>1</integer></array>"),
     '4:1: warning: a file type must be a text, not an integer: write it in <string>'),
    (podcast("<key>AllowedEpisodeTypes</key><array>", "<string>MP3</string></array>"),
     '4:1: warning: "MP3" allows nothing: write it in lower case'),
    (podcast("<key>AllowedEpisodeTypes</key><array>", "<string>.mp3</string></array>"),
     '4:1: warning: ".mp3" allows nothing: leave its dot out'),
    (podcast("<key>AllowedEpisodeTypes</key><array>", "<string>audio/mpeg</string></array>"),
     '4:1: warning: "audio/mpeg" allows nothing: an extension counts, such as "mp3"'),
    # Locations and their types
    (episode(text("EpisodeName", "x")),
     '3:27: warning: this episode has no "EpisodeReference", and so no media: add their path or URL'),
    (episode(text("EpisodeReference", "")),
     '4:28: warning: "EpisodeReference" is empty: write a path or a URL, or leave it out'),
    (episode(MEDIA, text("EpisodePosterReferenceType", "local")),
     '5:38: warning: "EpisodePosterReferenceType" stands here without "EpisodePosterReference": add that, or '
     'leave this out'),
    (episode(MEDIA, text("EpisodeReferenceType", "Local")),
     '5:32: warning: "EpisodeReferenceType" must be "local" or "remote", not "Local": write one, or leave it out'),
    (episode(MEDIA, text("EpisodeReferenceType", "remote")),
     '4:28: warning: "a.mp3" is a path, but its type is "remote", so it is taken for a URL: write "local"'),
    (episode(text("EpisodeReference", "https://example.org/a.mp3"), text("EpisodeReferenceType", "local")),
     '4:28: warning: "https://example.org/a.mp3" is a URL, but its type is "local", so it is taken for a path: '
     'write "remote"'),
    (episode(text("EpisodeReference", "httpd.mp3")),
     '4:28: warning: "httpd.mp3" begins like a URL and is taken for one: give it the "EpisodeReferenceType" "local"'),
    (episode(text("EpisodeReference", "pcast://example.org/a.mp3")),
     '4:28: warning: "pcast://example.org/a.mp3" is taken for a path: only http:, https: and file: URLs are fetched'),
    (episode(text("EpisodeReference", "~/a.mp3")),
     '4:28: warning: "~/a.mp3" does not begin in a home directory, since "~" is a name: write the whole path'),
    (episode(text("EpisodeReference", "ftp://example.org/a.mp3"), text("EpisodeReferenceType", "remote")),
     '4:28: error: "ftp://example.org/a.mp3" is no URL that qel can fetch: only http:, https: and file: URLs '
     'are fetched'),
    (podcast(text("PodcastPosterReference", "https://example.org/a.png")),
     '3:34: warning: "https://example.org/a.png" is a URL, but has no "PodcastPosterReferenceType" of '
     '"remote", so it is taken for a path: add that'),
    (podcast(text("PodcastPosterReference", "a.png"), text("PodcastPosterReferenceType", "remote")),
     '3:34: warning: "a.png" is a path, but its type is "remote", so it is taken for a URL: write "local"'),
]

# URLs that qel cannot fetch, each with what is said of it.
BAD_URLS = [
    ("https://example.org/a b.mp3", '" " is written %20'),
    ("https://example.org/a|b.mp3", '"|" is written %7C'),
    ("https://example.org/a\tb.mp3", "it holds a control character"),
    ("https://example.org/100%.mp3", '"%" is written %25'),
    ("https://example.org/[1].mp3", '"[" is written %5B'),
    ("https://example.org/a.mp3#x#y", 'a second "#" is written %23'),
    ("https:///a.mp3", "it has no host"),
    ("http:a.mp3", "it has no host"),
    ("https://example.org:http/a.mp3", '"http" is no port'),
    ("https://example.org:65536/a.mp3", '"65536" is no port'),
    ("file://media/a.mp3", 'a file: URL begins with file:///, and "media" is taken for a host'),
    ("file:a.mp3", "the path of a file: URL begins with a /"),
]
GOOD_URLS = [
    "https://example.org/a%20b.mp3?x=1,2&y#z",
    "HTTPS://user@example.org:8443/a;b/c.mp3",
    "http://[::1]:80/a.mp3",
    "https://example.org",
    "https://example.org:/über.mp3",
    "file:///a.mp3",
    "file:/a.mp3",
    "file://LOCALHOST/a.mp3",
]


class ReferenceFileTestCase(ToolTestCase):
    def check(self, *arguments, **options):
        return self.run_tool(*arguments, program="qel-check", **options)

    def findings(self, content, *options):
        """What is found in the bytes of a reference file, without the name of it."""
        result = self.check(*options, "-", stdin=content)
        self.assertEqual(result.stderr, b"")
        lines = result.stdout.decode().splitlines()
        self.assertEqual(result.status, 1 if any(" note: " not in line for line in lines) else 0)
        return [line.removeprefix("-:").removeprefix(" ") for line in lines]


class FindingsTest(ReferenceFileTestCase):
    def test_what_the_tool_refuses_is_an_error(self):
        for content, finding in REFUSED:
            with self.subTest(finding):
                self.assertEqual(self.run_tool("parsefeed", "-i", stdin=content.encode()).status, 1)
                self.assertEqual(self.findings(content.encode()), [finding])

    def test_what_the_tool_takes_otherwise_is_found(self):
        for content, finding in TAKEN_OTHERWISE:
            with self.subTest(finding):
                self.assertSucceeds(self.run_tool("createfeed", "-i", stdin=content.encode()))
                self.assertEqual(self.findings(content.encode()), [finding])

    def test_urls_are_judged_as_the_tool_does(self):
        for url, fault in BAD_URLS:
            with self.subTest(url):
                self.assertFails(self.run_tool("parsefeed", url), f'"{url}" is not a valid podcast source.\n')
                content = plistlib.dumps({"Episodes": [{"EpisodeReference": url}]})
                (printed,) = self.findings(content)
                self.assertRegex(printed, "^9:4: error: ")
                self.assertTrue(printed.endswith(f" is no URL that qel can fetch: {fault}"), printed)
        for url in GOOD_URLS:
            with self.subTest(url):
                # A source begins in lower case.
                source = re.sub("^[A-Z]+", lambda scheme: scheme[0].lower(), url)
                self.assertNotIn(b"is not a valid podcast source", self.run_tool(
                    "createfeed", source, env={"all_proxy": "http://127.0.0.1:1"}).stderr)
                self.assertEqual(self.findings(plistlib.dumps({"Episodes": [{"EpisodeReference": url}]})), [])

    def test_findings_come_in_the_order_of_their_lines(self):
        content = podcast(text("PodcastAdvisoryLabel", "No"), text("Zzz", "x"), "<key>Episodes</key><array>",
                          "<dict/>", "<string/></array>", "<key>PodcastName</key><date>2026-04-04T04:30:00Z</date>")
        self.assertEqual([finding.split(":")[0] for finding in self.findings(content.encode())],
                         ["3", "4", "6", "7", "8"])

    def test_a_finding_in_many_places_is_told_in_three(self):
        content = plistlib.dumps({f"Zzz{number}": "x" for number in range(5)})
        told = [f'{line}:2: warning: "Zzz{number}" is no key of a podcast, and is ignored: correct it or leave it out'
                for number, line in enumerate((5, 7, 9, 11, 13))]
        self.assertEqual(self.findings(content), told[:2] + [f"{told[2]} (and 2 more like this; --all shows them)"])
        self.assertEqual(self.findings(content, "--all"), told)

    def test_a_long_text_is_shortened(self):
        (finding,) = self.findings(episode(MEDIA, text("EpisodeType", "x\n" * 100)).encode())
        self.assertEqual(finding, f'5:23: warning: "{"x " * 29}x..." is no MIME type: write one such as audio/mpeg')

    def test_keys_of_the_binary_form_are_named(self):
        content = {"Zzz": 1, "AllowedPosterTypes": ["png", "GIF"],
                   "Episodes": [{"EpisodeReference": "a.mp3"}, {"EpisodeReference": "b.mp3", "EpisodeOrder": "1"}]}
        self.assertEqual(self.findings(plistlib.dumps(content, fmt=plistlib.FMT_BINARY)), [
            'warning: Zzz: "Zzz" is no key of a podcast, and is ignored: correct it or leave it out',
            'warning: AllowedPosterTypes[2]: "GIF" allows nothing: write it in lower case',
            'warning: Episodes[2].EpisodeOrder: "EpisodeOrder" must be an integer, not a text: write it in <integer>'])

    def test_the_object_of_a_binary_list_is_named(self):
        self.assertEqual(self.findings(binary_list([array_object([7])])), [
            "error: object 7: an object that does not exist; take the file from where it came once more"])

    def test_what_is_known_and_not_read_by_the_tool(self):
        self.assertEqual(self.findings(plistlib.dumps({
            "PodcastOrigin": "x", "PodcastPosterOrigin": "x",
            "Episodes": [{"EpisodeReference": "a.mp3", "EpisodeOrigin": "x", "EpisodePosterOrigin": "x"}]})), [])

    def test_several_files_are_told_apart(self):
        good, bad = self.write("good.plist", podcast()), self.write("bad.plist", podcast(text("Zzz", "x")))
        self.assertEqual(self.check(good), (0, b"", b""))
        found = f'{bad}:3:1: warning: "Zzz" is no key of a podcast, and is ignored: correct it or leave it out\n'
        self.assertEqual(self.check(bad, good), (1, found.encode(), b""))
        missing = self.path("missing.plist")
        self.assertEqual(self.check(bad, missing, good), (
            2, found.encode(), f"qel-check: {missing}: No such file or directory\n".encode()))

    def test_wrong_use(self):
        for arguments, message in (((), "PATH is missing"), (("-x", "file"), "unrecognized option '-x'"),
                                   (("--directory", "x", "file"), "'x' is no value of option '--directory'")):
            with self.subTest(arguments):
                self.assertEqual(self.check(*arguments), (
                    2, b"", f"qel-check: {message}; see 'qel-check --help'\n".encode()))

    def test_a_terminal_is_not_spoken_to(self):
        content = self.write("x.plist", podcast(text("Z\u009b31m", "x")).encode())
        output = subprocess.run(["script", "-qec", f"{tool('qel-check')} {content}", "/dev/null"],
                                stdin=subprocess.DEVNULL, capture_output=True, env=environment(), timeout=60,
                                check=False)
        self.assertIn('"Z\ufffd31m" is no key'.encode(), output.stdout)
        self.assertIn("Z\u009b31m".encode(), self.check(content).stdout)


class PublishingTest(ReferenceFileTestCase):
    def test_what_readers_need_and_the_file_lacks(self):
        content = podcast("<key>Episodes</key><array><dict>", MEDIA, "</dict>",
                          f"<dict>{text('EpisodeReference', 'https://a.example/b.mp3')}</dict></array>")
        self.assertEqual(self.findings(content.encode()), [])
        self.assertEqual(self.findings(content.encode(), "--for-publishing"), [
            '2:1: warning: the show has no title: add "PodcastName"',
            '2:1: warning: the show has no description: add "PodcastDescription"',
            '2:1: warning: the show has no home page, which readers show as its link: add "PodcastReference", or give '
            "it to qel-publish by --link",
            '2:1: warning: the show has no poster: add "PodcastPosterReference"',
            "2:1: note: a reference file has no language: give it to qel-publish by --language",
            '3:27: warning: this episode has no title: add "EpisodeName"',
            '3:27: warning: this episode has no date, by which readers sort: add "EpisodeDate"',
            f"3:27: {NO_UUID}",
            '4:28: note: "a.mp3" is a path: qel-publish makes it a URL with --base',
            '6:1: warning: this episode has no title: add "EpisodeName"',
            '6:1: warning: this episode has no date, by which readers sort: add "EpisodeDate"',
            f"6:1: {NO_UUID}",
            "6:1: warning: the size of this episode's media is not known: add \"EpisodeFileSize\", in bytes"])

    def test_the_example_lacks_nothing(self):
        show = ROOT / "examples" / "show"
        result = self.check("--for-publishing", show / "reference.plist")
        self.assertEqual((result.status, result.stderr), (0, b""))
        self.assertNotIn(b"warning", result.stdout)


class OwnOutputTest(ReferenceFileTestCase):
    """What the tool writes of a sound source has no faults."""

    def assertFaultless(self, content):
        self.assertEqual(self.findings(content), [])

    def test_examples(self):
        self.assertFaultless((ROOT / "examples" / "show" / "reference.plist").read_bytes())

    def test_reference_file_of_the_example_feed(self):
        result = self.run_tool("parsefeed", (ROOT / "examples" / "show" / "feed.xml").as_uri())
        self.assertSucceeds(result)
        self.assertFaultless(result.stdout)

    def test_reference_file_of_a_feed_with_everything(self):
        channel = [element(name, "x") for name in ("title", "author", "copyright", "orvane:keywords", "description")]
        everything = [
            element("title", "x & <y>\r\n\u2028"),
            element("author"),
            element("pubDate", "Sat, 04 Apr 2026 04:30:00 GMT"),
            element("orvane:keywords", "x"),
            element("description", "<b>x</b>"),
            element("orvane:explicit", "yes"),
            element("orvane:image", href="file:///posters/a.png"),
            element("orvane:category", text="x"),
            element("qel:uuid", "x"),
            element("qel:order", "0"),
            element("enclosure", url="https://example.org/a.mp3?x&y", type="audio/mpeg", length="9223372036854775807"),
        ]
        result = self.run_tool("parsefeed", self.feed(rss(*channel, item(*everything))))
        self.assertSucceeds(result)
        self.assertIn(b"9223372036854775807", result.stdout)
        self.assertFaultless(result.stdout)

    def test_reference_files_of_and_in_a_bundle(self):
        show = ROOT / "examples" / "show"
        bundle = self.path("show.podcast")
        self.assertSucceeds(self.run_tool("createbundle", "reference.plist", "-d", bundle, cwd=show))
        self.assertFaultless((bundle / "Info.plist").read_bytes())
        result = self.run_tool("parsefeed", bundle)
        self.assertSucceeds(result)
        self.assertFaultless(result.stdout)

    def test_a_feed_s_episode_without_media_is_still_a_fault(self):
        result = self.run_tool("parsefeed", self.feed(rss(item(element("title", "x")))))
        (fault,) = self.findings(result.stdout)
        self.assertIn('this episode has no "EpisodeReference", and so no media: add their path or URL', fault)

    def test_the_keys_are_those_of_the_manual(self):
        manual = (ROOT / "docs" / "reference-file.md").read_text(encoding="utf-8")
        documented = re.findall(r"^\| `(\w+)` \| (text|date|integer|array)", manual, re.MULTILINE)
        self.assertEqual(len(documented), 30)
        values = {"text": "clean", "date": datetime.datetime(2026, 4, 4), "integer": 1, "array": []}
        podcast_keys = {key: values[kind] for key, kind in documented if not re.match("Episode(?!s$)", key)}
        episode_keys = {key: values[kind] for key, kind in documented if key not in podcast_keys}
        content = plistlib.dumps({**podcast_keys, "Episodes": [episode_keys]})
        self.assertNotRegex("".join(self.findings(content)), "is no key|must be a[n ]")


if __name__ == "__main__":
    unittest.main()
