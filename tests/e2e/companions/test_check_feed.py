"""qel-check tells what the tool takes of a feed, what surprises in it, and what readers will miss."""

import unittest
from pathlib import Path

from support import ToolTestCase, element, item, rss

ROOT = Path(__file__).resolve().parents[3]
DATE = "Sat, 04 Apr 2026 04:30:00 GMT"
RIGHT = f"write it like {DATE}"

# Dates, and what is said of them; of the first ones nothing.
GOOD_DATES = [DATE, "4 Apr 26 04:30 +0200", "sat, 04 april 2026 04:30:60 -05:30", "04 Apr 2026 04:30 z",
              "04 Apr 2026 04:30 pdt"]
NO_DATES = ["", "2026-04-04", "Sat,  04 Apr 2026 04:30:00 GMT", "04 Apr 2026 0430 GMT", "04 Apr 2026 04:30 +1"]
OTHER_DATES = [
    ("Sa, 04 Avril 2026 04:30:00 GMT", "2026-01-04T04:30:00Z", "the month is not known"),
    ("04 Ja 2026 04:30:00 GMT", "2026-01-04T04:30:00Z", "the month is not known"),
    ("04 Sept 2026 04:30:00 GMT", "2026-09-04T04:30:00Z", "the month is not written as in RFC 822"),
    ("32 May 2026 04:30:00 GMT", "2026-06-01T04:30:00Z", "the day is none"),
    ("Tue, 31 Feb 2026 10:00:00 GMT", "2026-03-03T10:00:00Z", "the month has no such day"),
    ("Mon, 04 Apr 2026 10:00:00 GMT", "2026-04-04T10:00:00Z", "that day is a Saturday"),
    ("04 Apr 2026x 04:30:00 GMT", "2026-04-04T04:30:00Z", "the year is none"),
    ("04 Apr 2026 24:30:00 GMT", "2026-04-05T00:30:00Z", "the time is none"),
    ("04 Apr 2026 04:30:00:00 GMT", "2026-04-04T04:30:00Z", "the time is none"),
    ("04 Apr 2026 04:30:00 UTC", "2026-04-04T04:30:00Z", "the time zone is not known"),
    ("04 Apr 2026 04:30:00 J", "2026-04-04T04:30:00Z", "the time zone is not known"),
    ("04 Apr 2026 04:30:00 +020", "2026-04-04T02:30:00Z", "the time zone is not known"),
]

# Of these nothing is missing.
ITEM = element("guid", "g"), element("title", "t"), element("pubDate", DATE)
CHANNEL = (element("title", "t"), element("description", "d"), element("link", "https://a.example/"),
           element("language", "en"), "<image><url>https://a.example/p.png</url></image>")


class FeedTestCase(ToolTestCase):
    def findings(self, document, *options):
        """What is found in a feed, without its name and the numbers at the end."""
        result = self.run_tool("--all", *options, "-", stdin=document, program="qel-check")
        self.assertEqual(result.stderr, b"")
        lines = [line.removeprefix("-:") for line in result.stdout.decode().splitlines()]
        self.assertEqual(result.status, 1 if any(" note: " not in line for line in lines) else 0)
        return [line for line in lines if not line.startswith(" note: ")]

    def said(self, *parts, options=()):
        """The findings of a feed of one item, or of its channel, without their places."""
        return [line.partition(" ")[2] for line in self.findings(rss(*parts), *options)]


class TakenTest(FeedTestCase):
    def test_the_numbers(self):
        result = self.run_tool(ROOT / "examples/show/feed.xml", program="qel-check")
        self.assertEqual((result.status, result.stderr), (0, b""))
        self.assertEqual([line.partition(": ")[2] for line in result.stdout.decode().splitlines()], [
            "note: qel takes 4 episodes: 4 with media, 4 with the size of them, 4 with a date, 4 with a uuid, 3 with a "
            "poster",
            'note: taken: 6 "title", 5 "dc:creator", 5 "description", 5 "orvane:explicit", 5 "orvane:keywords", '
            '5 "pubDate", 4 "enclosure", 4 "orvane:category", 4 "orvane:image", 4 "qel:order", 3 "qel:uuid", 2 "link", '
            "and 3 others",
            'note: not taken: 1 "guid", 1 "orvane:category"'])

    def test_a_title_of_an_image_renames_the_show(self):
        feed = rss(element("title", "Show"), "\n<image>", element("title", "Other"), "</image>")
        self.assertEqual(self.findings(feed), [
            '3:8: warning: the title "Other" of the image renames the show, which is "Show": give both the same one'])
        self.assertEqual(self.said(element("title", "Show"), "<image>", element("title", " Show "), "</image>"), [])

    def test_elements_that_replace_others(self):
        def replaced(kind, name, key, owner):
            return (f'{kind}: "{name}" makes the {key} of the {owner} "new", which was "old": the last one counts, '
                    "whatever its prefix; leave one of them out")
        for name, key, kind in (("media:description", "description", "warning"), ("orvane:title", "title", "warning"),
                                ("dc:creator", "author", "note"), ("media:keywords", "keywords", "note")):
            with self.subTest(name):
                parts = element(key, "old"), element(name, "new")
                self.assertEqual(self.said(item(*parts)), [replaced(kind, name, key, "episode")])
                self.assertEqual(self.said(*parts), [replaced(kind, name, key, "show")])
                self.assertEqual(self.said(item(element(key, "old"), element(name, "\nold "))), [])
        self.assertEqual(self.said(item(element("enclosure", url="old"), element("enclosure", url="new"))),
                         [replaced("warning", "enclosure", "url", "episode")])

    def test_dates(self):
        for date in GOOD_DATES:
            with self.subTest(date):
                self.assertEqual(self.said(item(element("pubDate", date))), [])
        for date in NO_DATES:
            with self.subTest(date):
                shown = " ".join(date.split())
                self.assertEqual(self.said(item(element("pubDate", date))), [
                    f'warning: "{shown}" is no date, and the episode has none: {RIGHT}'])
        for date, taken, fault in OTHER_DATES:
            with self.subTest(date):
                self.assertEqual(self.said(item(element("pubDate", date))), [
                    f'warning: "{date}" is taken for {taken}, but {fault}: {RIGHT}'])

    def test_repeated_identifiers(self):
        items = [item(element("qel:uuid", "u"), element("orvane:duration", "9"), element("guid", "g"))] * 2
        self.assertEqual(self.said(*items), [
            'warning: the uuid "u" is that of an episode before: others take both for one; give each its own',
            'warning: the guid "g" is that of an episode before: readers show one of the two; give each its own'])

    def test_an_empty_uuid_is_none(self):
        result = self.run_tool("-", stdin=rss(item("<qel:uuid/>"), item(element("qel:uuid", "u"))), program="qel-check")
        self.assertIn(b" 0 with a date, 1 with a uuid, ", result.stdout)

    def test_labels(self):
        for label in ("yes", "CLEAN", "no", "False", ""):
            self.assertEqual(self.said(element("orvane:explicit", label)), [])
        self.assertEqual(self.said(element("orvane:explicit", "true")), [
            'note: "true" is not taken as an advisory label: qel knows "yes" and "clean"'])

    def test_the_prefix_of_another_directory(self):
        parts = '<acme:image href="a.png"/>', item('<acme:category text="Arts"/><acme:image/>')
        note = ('note: "acme:%s" is not taken: the option --directory acme=URI, with the URI that xmlns:acme declares, '
                "reads it here and in qel-keep")
        self.assertEqual(self.said(*parts), [note % "image", note % "category"])
        self.assertEqual(self.said(*parts, options=["--directory", "acme=https://acme.example/"]), [])
        ours = self.said('<orvane:image href="a.png"/>', options=["--directory=acme=https://acme.example/"])
        self.assertEqual(ours, [note.replace("acme", "orvane") % "image"])


class RefusedTest(FeedTestCase):
    def test_what_is_no_feed(self):
        for document, finding in [
                (b"<rss>\n<channel></rss>", "2:12: error: mismatched tag; each <x> ends with its </x>, the one opened "
                 "last before the others"),
                (b"<feed/>", "1:1: error: The feed was neither RSS nor Atom; give the address of the podcast's RSS "
                 'feed (the first element here is "feed")'),
                (b"\0\1\2", "1:1: error: this is no feed, no reference file and no bundle"),
                (b"sound", "1:1: error: syntax error; give a feed, a reference file or a bundle"),
                (b"", "1:1: error: no element found; the file is empty or cut off: take it from where it came once "
                 "more")]:
            with self.subTest(document):
                self.assertEqual(self.findings(document), [finding])

    def test_much_of_everything(self):
        # Within the time and the memory of a feed of that size that nothing is wrong with.
        many = 100_000
        for content in ("<a/>" * many + "<guid>x</guid>" * many, "<link>" * many + "</link>" * many,
                        "<pubDate>x</pubDate>" * many, "<title>" * many + "x" + "</title>" * many,
                        "<x>text</x>" * many, "".join(f"<x{number}/>" for number in range(many))):
            with self.subTest(content[:20]):
                result = self.run_tool("-", stdin=rss(item(content)), program="qel-check", timeout=20,
                                       memory_limit=1 << 29)
                self.assertIn(result.status, (0, 1))
                self.assertLess(len(result.stdout), 4000)


class PublishingTest(FeedTestCase):
    def test_what_readers_need_and_the_feed_lacks(self):
        feed = rss("\n", item(element("enclosure", url="a.mp3")), "\n", item("\n<guid/>"))
        self.assertEqual([line for line in self.findings(feed, "--for-publishing") if not line.startswith("2:")], [
            '3:1: warning: this episode has no "guid", by which readers know it again: qel-publish writes one',
            '3:1: warning: this episode has no "title": add one',
            '3:1: warning: this episode has no date, by which readers sort: add a "pubDate"',
            '3:1: warning: "a.mp3" is no URL that readers can fetch: qel-publish --base makes paths URLs',
            '3:1: warning: the enclosure has no "length": write the size of the file in bytes',
            '3:1: warning: the enclosure has no "type": write one such as audio/mpeg',
            '4:1: warning: this episode has no "guid", by which readers know it again: qel-publish writes one',
            '4:1: warning: this episode has no "title": add one',
            '4:1: warning: this episode has no date, by which readers sort: add a "pubDate"',
            '4:1: warning: this episode has no "enclosure" with a "url", and so no media: add one'])
        self.assertEqual(self.said(options=["--for-publishing"]), [
            'warning: the show has no "title": add one', 'warning: the show has no "description": add one',
            'warning: the show has no poster: add an "image"',
            'warning: the show has no "link" with the URL of its home page: add one, or give it to qel-publish by '
            "--link",
            'warning: the show has no "language": add one such as en, or give it to qel-publish by --language'])

    def test_what_the_enclosure_says(self):
        said = "warning: "
        for url, kind, finding in (
                ("http://a.example/b.mp3", "audio/mpeg", []),
                ("http://a.example/b.mp3", "", ['the enclosure has no "type": write one such as audio/mpeg']),
                ("http://a.example/b.mp3", "nonsense", ['"nonsense" is no MIME type: write one such as audio/mpeg']),
                ("", "audio/mpeg", ['"" is no URL that readers can fetch: qel-publish --base makes paths URLs']),
                ("http://a.example/b c.mp3", "audio/mpeg",
                 ['"http://a.example/b c.mp3" is no URL that readers can fetch: " " is written %20']),
                ("file:///b.mp3", "audio/mpeg",
                 ['"file:///b.mp3" is no URL that readers can fetch: qel-publish --base makes paths URLs'])):
            with self.subTest(url, kind=kind):
                enclosure = element("enclosure", url=url, type=kind, length="1")
                self.assertEqual(self.said(item(*ITEM, enclosure), *CHANNEL, options=["--for-publishing"]),
                                 [said + line for line in finding])

    def test_posters_have_urls(self):
        enclosure = element("enclosure", url="https://a.example/b.mp3", type="audio/mpeg", length="1")
        poster = element("orvane:image", href="p q.png")
        fault = 'warning: "%s" is no URL that readers can fetch: qel-publish --base makes paths URLs'
        self.assertEqual(self.said(item(*ITEM, enclosure, poster), *CHANNEL, options=["--for-publishing"]),
                         [fault % "p q.png"])
        channel = [part.replace("https://a.example/p.png", "rel.png") for part in CHANNEL]
        self.assertEqual(self.said(*channel, options=["--for-publishing"]), [fault % "rel.png"])
        self.assertEqual(self.said(*CHANNEL[:-1], element("orvane:image", href="rel.png"),
                                   options=["--for-publishing"]), [fault % "rel.png"])

    def test_what_qel_publish_writes_lacks_nothing(self):
        show = ROOT / "examples" / "show"
        feed = self.path("feed.xml")
        published = self.run_tool("--base", "https://a.example/", "--link", "https://a.example/", "--language", "en",
                                  "--self", "https://a.example/feed.xml", show / "reference.plist", feed,
                                  program="qel-publish")
        self.assertEqual(published, (0, b"", b""))
        self.assertEqual(self.findings(feed.read_bytes(), "--for-publishing"), [])


if __name__ == "__main__":
    unittest.main()
