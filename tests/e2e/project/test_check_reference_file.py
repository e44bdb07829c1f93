"""The check of reference files finds what people get wrong, says where, and agrees with the tool.

It never finds fault with what the tool itself wrote of a sound source, and always with what the tool refuses.
"""

import plistlib
import re
import runpy
import subprocess
import sys
import unittest
from pathlib import Path

from support import ToolTestCase, element, item, rss

ROOT = Path(__file__).resolve().parents[3]
CHECK = ROOT / "scripts" / "check-reference-file"

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
    ("", "1: malformed XML: no element found"),
    (plist("<dict>", "<key>PodcastName</key><string>Wind & Weather</string>", "</dict>"),
     '3: malformed XML: not well-formed (invalid token); "&" and "<" in a text are written &amp; and &lt;'),
    (podcast(text("PodcastName", "a&nbsp;b")), "3: malformed XML: undefined entity"),
    (podcast("<key>PodcastName</key><string>x"), "4: malformed XML: mismatched tag"),
    ("\n\n" + podcast("<key>PodcastName</key><string>x"), "6: malformed XML: mismatched tag"),
    ("<dict/>", '1: the root element must be "plist", not "dict"'),
    (plist(), "1: there is no value in the property list"),
    (plist("<dict/>", "<dict/>"), "3: a property list holds one value, and this is a second one"),
    (plist("<array/>"), "2: the value of a reference file must be a dictionary, not an array"),
    (plist("<string>x</string>"), "2: the value of a reference file must be a dictionary, not a text"),
    (podcast("<key>PodcastName</key><text>x</text>"), '3: "text" is no element of a property list'),
    (podcast("<key>PodcastName</key>", "x", "<string/>"),
     '4: the text "x" stands in no value; texts belong into "string"'),
    (podcast("<key>PodcastDescription</key><string>two", "<b>walks</b></string>"),
     '4: the element "b" stands inside of a value; write its "<" as &lt; or put the text into <![CDATA[...]]>'),
    (podcast("<key>PodcastName</key>"), '3: the key "PodcastName" has no value'),
    (podcast("<key>PodcastName</key>", text("PodcastUUID", "x")), '3: the key "PodcastName" has no value'),
    (podcast("<string>x</string>"), "3: a value in a dictionary needs a key before it"),
    (podcast("<key>Episodes</key><array>", text("EpisodeName", "x"), "</array>"),
     '4: the key "EpisodeName" stands in an array and not in a dictionary'),
    (episode(MEDIA, "<key>EpisodeOrder</key><integer>first</integer>"), '5: "first" is no integer'),
    (episode(MEDIA, "<key>EpisodeOrder</key><integer>18446744073709551616</integer>"),
     '5: "18446744073709551616" has more than 64 bits'),
    (episode(MEDIA, "<key>EpisodeDate</key><date>2026-04-04 04:30</date>"),
     '5: "2026-04-04 04:30" is no date; write it in UTC and like 2026-04-04T04:30:00Z'),
    (episode(MEDIA, "<key>EpisodeDate</key><date>2026-02-29T00:00:00Z</date>"),
     '5: "2026-02-29T00:00:00Z" is no date; write it in UTC and like 2026-04-04T04:30:00Z'),
    (podcast("<key>x</key><real>1,5</real>"), '3: "1,5" is no number'),
    (podcast("<key>x</key><data>a</data>"), "3: the data are not in Base64"),
    (podcast("<key>x</key>", "<array>" * 512, "</array>" * 512),
     "4: arrays and dictionaries are nested deeper than 512 levels"),
    ('<?xml version="1.0" encoding="none"?>' + podcast(), "1: the encoding is not understood: unknown encoding: none"),
]
TAKEN_OTHERWISE = [
    (podcast(text("PodcastNmae", "x")),
     '3: "PodcastNmae" is no key of a podcast, and is ignored; is it meant to be "PodcastName"?'),
    (podcast(text("Zzz", "x")), '3: "Zzz" is no key of a podcast, and is ignored'),
    (podcast(text("EpisodeName", "x")), '3: "EpisodeName" is a key of an episode, and is ignored in a podcast'),
    (episode(MEDIA, text("PodcastName", "x")), '5: "PodcastName" is a key of a podcast, and is ignored in an episode'),
    (podcast(text("PodcastName", "x"), text("PodcastName", "y")),
     '4: the key "PodcastName" stands here for a second time; only the last one counts'),
    (podcast("<key>PodcastName</key><integer>7</integer>"), '3: "PodcastName" must be a text, not an integer'),
    (podcast("<key>Episodes</key><dict/>"), '3: "Episodes" must be an array, not a dictionary'),
    (podcast("<key>Episodes</key><array>", "<string>x</string>", "</array>"),
     "4: an episode must be a dictionary, not a text"),
    (episode(MEDIA, text("EpisodeDate", "2026-04-04T04:30:00Z")), '5: "EpisodeDate" must be a date, not a text'),
    (episode(MEDIA, text("EpisodeFileSize", "12044")), '5: "EpisodeFileSize" must be an integer, not a text'),
    (episode(MEDIA, "<key>EpisodeOrder</key><true/>"), '5: "EpisodeOrder" must be an integer, not a truth value'),
    (episode(MEDIA, "<key>EpisodeOrder</key><real>1.5</real>"),
     '5: "EpisodeOrder" must be an integer, not a number with a fraction'),
    (episode(MEDIA, "<key>EpisodeOrder</key><integer>-1</integer>"), '5: a negative "EpisodeOrder" is no order'),
    (episode(MEDIA, "<key>EpisodeFileSize</key><integer>-0x1</integer>"), '5: a negative "EpisodeFileSize" is no size'),
    (episode(MEDIA, text("EpisodeType", "mp3")), '5: "mp3" is no MIME type, such as "audio/mpeg"'),
    (podcast(text("PodcastAdvisoryLabel", "No")),
     '3: the advisory label "No" is in no feed: write "Explicit" or "Clean", or leave it out'),
    (episode(MEDIA, text("EpisodeAdvisoryLabel", "Adult")),
     '5: the advisory label "Adult" is in no feed: write "Explicit" or "Clean", or leave it out'),
    (podcast("<key>AllowedPosterTypes</key><array><string>png</string>", "<integer>1</integer></array>"),
     "4: a file type must be a text, not an integer"),
    (podcast("<key>AllowedEpisodeTypes</key><array>", "<string>MP3</string></array>"),
     '4: "MP3" allows nothing: write it in lower case'),
    (podcast("<key>AllowedEpisodeTypes</key><array>", "<string>.mp3</string></array>"),
     '4: ".mp3" allows nothing: leave its dot out'),
    (podcast("<key>AllowedEpisodeTypes</key><array>", "<string>audio/mpeg</string></array>"),
     '4: "audio/mpeg" allows nothing: an extension counts, such as "mp3"'),
    # Locations and their types
    (episode(text("EpisodeName", "x")), '3: this episode has no "EpisodeReference", and so no media'),
    (episode(text("EpisodeReference", "")), '4: "EpisodeReference" is empty'),
    (episode(MEDIA, text("EpisodePosterReferenceType", "local")),
     '5: "EpisodePosterReferenceType" stands here without "EpisodePosterReference"'),
    (episode(MEDIA, text("EpisodeReferenceType", "Local")),
     '5: "EpisodeReferenceType" must be "local" or "remote", not "Local"'),
    (episode(MEDIA, text("EpisodeReferenceType", "remote")),
     '4: "a.mp3" is a path, but its type is "remote", so it is taken for a URL'),
    (episode(text("EpisodeReference", "https://example.org/a.mp3"), text("EpisodeReferenceType", "local")),
     '4: "https://example.org/a.mp3" is a URL, but its type is "local", so it is taken for a path'),
    (episode(text("EpisodeReference", "httpd.mp3")),
     '4: "httpd.mp3" begins like a URL and is taken for one: give it the "EpisodeReferenceType" "local"'),
    (episode(text("EpisodeReference", "pcast://example.org/a.mp3")),
     '4: "pcast://example.org/a.mp3" is taken for a path: only http:, https: and file: URLs are fetched'),
    (episode(text("EpisodeReference", "~/a.mp3")),
     '4: "~/a.mp3" does not begin in a home directory: "~" is a name like any other here'),
    (episode(text("EpisodeReference", "ftp://example.org/a.mp3"), text("EpisodeReferenceType", "remote")),
     '4: "ftp://example.org/a.mp3" is no URL that qel can fetch: only http:, https: and file: URLs are fetched'),
    (podcast(text("PodcastPosterReference", "https://example.org/a.png")),
     '3: "https://example.org/a.png" is a URL, but has no "PodcastPosterReferenceType" of "remote", so it is taken '
     "for a path"),
    (podcast(text("PodcastPosterReference", "a.png"), text("PodcastPosterReferenceType", "remote")),
     '3: "a.png" is a path, but its type is "remote", so it is taken for a URL'),
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


# The script's own functions; starting it anew for each row takes far longer than the check.
CHECKER = runpy.run_path(str(CHECK))


def check(*arguments, stdin=b""):
    """The exit status of the script and what it prints on its two streams."""
    finished = subprocess.run([sys.executable, "-B", CHECK, *arguments], input=stdin, capture_output=True, timeout=60,
                              check=False)
    return finished.returncode, finished.stdout.decode(), finished.stderr.decode()


def faults(content):
    """The faults of the bytes of a reference file, as LINE: FAULT."""
    return [f"{line}: {fault}" for line, fault in CHECKER["faults"](content)]


class FaultTest(ToolTestCase):
    def test_what_the_tool_refuses_is_a_fault(self):
        for content, fault in REFUSED:
            with self.subTest(fault):
                self.assertEqual(self.run_tool("parsefeed", "-i", stdin=content.encode()).status, 1)
                self.assertEqual(faults(content.encode()), [fault])

    def test_what_the_tool_takes_otherwise_is_a_fault(self):
        for content, fault in TAKEN_OTHERWISE:
            with self.subTest(fault):
                self.assertSucceeds(self.run_tool("createfeed", "-i", stdin=content.encode()))
                self.assertEqual(faults(content.encode()), [fault])

    def test_urls_are_judged_as_the_tool_does(self):
        for url, fault in BAD_URLS:
            with self.subTest(url):
                self.assertFails(self.run_tool("parsefeed", url), f'"{url}" is not a valid podcast source.\n')
                content = plistlib.dumps({"Episodes": [{"EpisodeReference": url}]})
                (printed,) = faults(content)
                self.assertTrue(printed.endswith(f" is no URL that qel can fetch: {fault}"), printed)
        for url in GOOD_URLS:
            with self.subTest(url):
                # A source begins in lower case.
                source = re.sub("^[A-Z]+", lambda scheme: scheme[0].lower(), url)
                self.assertNotIn(b"is not a valid podcast source", self.run_tool(
                    "createfeed", source, env={"all_proxy": "http://127.0.0.1:1"}).stderr)
                self.assertEqual(faults(plistlib.dumps({"Episodes": [{"EpisodeReference": url}]})), [])

    def test_faults_come_in_the_order_of_their_lines(self):
        content = podcast(text("PodcastAdvisoryLabel", "No"), text("Zzz", "x"), "<key>Episodes</key><array>",
                          "<dict/>", "<string/></array>", "<key>PodcastName</key><date>2026-04-04T04:30:00Z</date>")
        self.assertEqual([fault.split(":")[0] for fault in faults(content.encode())], ["3", "4", "6", "7", "8"])

    def test_a_long_text_is_shortened(self):
        (fault,) = faults(episode(MEDIA, text("EpisodeType", "x\n" * 100)).encode())
        self.assertEqual(fault, f'5: "{("x " * 30)}..." is no MIME type, such as "audio/mpeg"')

    def test_the_binary_form_is_told_to_be_one(self):
        self.assertEqual(faults(plistlib.dumps({}, fmt=plistlib.FMT_BINARY)),
                         ['1: this is the binary form: check the XML form, which "qel parsefeed" writes'])

    def test_several_files_are_told_apart(self):
        good, bad = self.write("good.plist", podcast()), self.write("bad.plist", podcast(text("Zzz", "x")))
        missing = self.path("missing.plist")
        self.assertEqual(check(good), (0, "", ""))
        self.assertEqual(check("-", stdin=b""), (1, "-:1: malformed XML: no element found\n", ""))
        self.assertEqual(check(bad, good, missing), (1, (
            f'{bad}:3: "Zzz" is no key of a podcast, and is ignored\n{missing}: No such file or directory\n'), ""))

    def test_wrong_use(self):
        for arguments in ((), ("--help",), ("-x", "file")):
            with self.subTest(arguments):
                self.assertEqual(check(*arguments), (2, "", "usage: check-reference-file FILE...\n"))


class OwnOutputTest(ToolTestCase):
    """What the tool writes of a sound source has no faults."""

    def assertFaultless(self, content):
        self.assertEqual(faults(content), [])

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
        (fault,) = faults(result.stdout)
        self.assertTrue(fault.endswith('this episode has no "EpisodeReference", and so no media'), fault)

    def test_the_keys_are_those_of_the_manual(self):
        manual = (ROOT / "docs" / "reference-file.md").read_text(encoding="utf-8")
        documented = re.findall(r"^\| `(\w+)` \| (text|date|integer|array)", manual, re.MULTILINE)
        self.assertEqual(len(documented), 30)
        known = {**CHECKER["PODCAST_KEYS"], **CHECKER["EPISODE_KEYS"]}
        self.assertEqual({key: kind.replace("string", "text") for key, kind in known.items()}, dict(documented))


if __name__ == "__main__":
    unittest.main()
