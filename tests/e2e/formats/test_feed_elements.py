"""Feeds in the wild nest, repeat and misplace their elements; here is what each of them leads to in a reference file.

The reader is shallow on purpose: it goes by local names, keeps the latest text, and only tells items and
images from the rest. What follows from that is kept, because people's feeds have come to rely on it. FeedParserTest
has the rules; here is what they make together.
"""

import datetime
import unittest

from support import ToolTestCase, item

UUID = "01234567-89AB-CDEF-0123-456789ABCDEF"
OTHER_UUID = "FEDCBA98-7654-3210-FEDC-BA9876543210"

A = {"PodcastPosterReference": "a.png", "PodcastPosterReferenceType": "local"}
B = {"PodcastPosterReference": "b.png", "PodcastPosterReferenceType": "local"}


class ElementTestCase(ToolTestCase):
    def assertPodcasts(self, *rows):
        """Each row is the content of a channel and the reference dictionary that it becomes."""
        for content, expected in rows:
            with self.subTest(content):
                self.assertEqual(self.podcast_of(content), expected)

    def assertEpisodes(self, *rows):
        """Each row is the content of an item and the episode dictionary that it becomes."""
        episodes = self.podcast_of(*(item(content) for content, _ in rows))["Episodes"]
        for (content, expected), episode in zip(rows, episodes, strict=True):
            with self.subTest(content):
                self.assertEqual(episode, expected)


class ElementTest(ElementTestCase):
    def test_everything_behind_the_start_of_an_rss_element_counts(self):
        for document, expected in (
                (b"<a><title>s</title><item/><b><rss/></b><title>t</title><item/></a>",
                 {"PodcastName": "t", "Episodes": [{}]}),
                (b"<x:rss xmlns:x='urn:x'><title>t</title></x:rss>", {"PodcastName": "t"})):
            with self.subTest(document):
                self.assertEqual(self.parsefeed(self.feed(document)), expected)

    def test_texts(self):
        self.assertEpisodes(
            ("<title>t</title><dc:creator>a</dc:creator><description>d</description><copyright>c</copyright>"
             "<orvane:keywords>k</orvane:keywords><orvane:explicit>clean</orvane:explicit><qel:uuid>u</qel:uuid>"
             "<orvane:category text='c'/><orvane:summary>s</orvane:summary><guid>g</guid>"
             "<pubDate>Tue, 05 Jun 2007 14:30:00 GMT</pubDate>\n    <qel:order>5</qel:order>",
             {"EpisodeName": "t", "EpisodeAuthor": "a", "EpisodeDescription": "d", "EpisodeKeywords": "k",
              "EpisodeAdvisoryLabel": "Clean", "EpisodeUUID": "u", "EpisodeCategory": "c",
              "EpisodeDate": datetime.datetime(2007, 6, 5, 14, 30), "EpisodeOrder": 5}),
            ("<title>one</title><media:title>two</media:title>", {"EpisodeName": "two"}),
            ("<title>one</title><title/>", {"EpisodeName": ""}),
            ("<Title>t</Title><pubdate>Tue, 05 Jun 2007 14:30:00 GMT</pubdate>", {}),
            ("<group><media:content><title>t</title></media:content></group>", {"EpisodeName": "t"}),
            ("<title>\n  Two\n\tlines \n</title>", {"EpisodeName": "\n  Two\n\tlines \n"}),
            ("<title>a&amp;b<![CDATA[<b> & ]]><!-- not this --><?nor this?>&#228;&#x1F6B6;</title>",
             {"EpisodeName": "a&b<b> & ä🚶"}),
            ("before<title>t</title>after<description>d</description>",
             {"EpisodeName": "t", "EpisodeDescription": "d"}),
            ("<description>one <b>two</b> <i>three<br/></i>.</description>",
             {"EpisodeDescription": "one two three."}),
            ("<description>one<link>two</link>three</description>", {"EpisodeDescription": "twothree"}),
            ("<description>one<x:uuid>two</x:uuid>three</description>", {"EpisodeDescription": "twothree"}),
            ("<orvane:explicit>yes</orvane:explicit><explicit>clean</explicit>", {"EpisodeAdvisoryLabel": "Clean"}))

    def test_items(self):
        self.assertPodcasts(
            ("<Item/><x:item><title>t</title></x:item>", {"Episodes": [{"EpisodeName": "t"}]}),
            ("<item><title>one</title><item><title>two</title></item><title>three</title></item><item/>",
             {"PodcastName": "three", "Episodes": [{"EpisodeName": "one"}, {"EpisodeName": "two"}, {}]}))

    def test_enclosures(self):
        self.assertEpisodes(
            ("<a:enclosure url='a?b=1&amp;c=2' length=' 1234 ' type='audio/mpeg'/>",
             {"EpisodeReference": "a?b=1&c=2", "EpisodeReferenceType": "local", "EpisodeFileSize": 1234,
              "EpisodeType": "audio/mpeg"}),
            ("<enclosure href='a.mp3' URL='b.mp3' x:url='c.mp3'/>", {}),
            ("<enclosure url='' type=''/>", {"EpisodeReference": "", "EpisodeType": ""}),
            ("<enclosure length='12.9'/>", {"EpisodeFileSize": 12}),
            ("<enclosure length='0x10'/>", {}),
            (f"<enclosure length='{'9' * 400}'/>", {"EpisodeFileSize": 2**63 - 1}),
            ("<enclosure url='a.mp3' length='1' type='audio/mpeg'/><enclosure url='http://b.example/' length='0'/>",
             {"EpisodeReference": "http://b.example/", "EpisodeReferenceType": "remote", "EpisodeFileSize": 1,
              "EpisodeType": "audio/mpeg"}))

    def test_categories(self):
        self.assertPodcasts(
            ("<orvane:category/><orvane:category text='one'><orvane:category text='two'/></orvane:category>"
             "<item><orvane:category text='three'/></item>",
             {"PodcastCategory": "one", "Episodes": [{"EpisodeCategory": "three"}]}),
            ("<orvane:category text=''/><orvane:category text='two'/>", {"PodcastCategory": ""}))

    def test_only_literal_prefixes_count(self):
        self.assertPodcasts(("<category text='c'/><x:category text='c'/><x:image href='a.png'/>"
                             "<image href='a.png'/><uuid>u</uuid><x:uuid>u</x:uuid>"
                             "<item><order>3</order><x:order>3</x:order></item>", {"Episodes": [{}]}))
        document = (b'<rss xmlns:o="https://orvane.example/ns/podcast-1.0" xmlns:orvane="urn:x"><o:category text="no"/>'
                    b'<o:image href="p.png"/><orvane:category text="c"/><none:copyright>d</none:copyright></rss>')
        self.assertEqual(self.parsefeed(self.feed(document)), {"PodcastCategory": "c", "PodcastCopyright": "d"})

    def test_images(self):
        self.assertPodcasts(
            ("<orvane:image href='b.png'/><image><url>a.png</url></image>", B),
            ("<image><url>a.png</url></image><orvane:image href='b.png'/>", B),
            ("<image><url>a.png</url></image><image><url>b.png</url></image>", A),
            ("<orvane:image><url>a.png</url></orvane:image>", A),
            ("<x:image><group><x:url>a.png</x:url></group></x:image>", A),
            ("<image>\n  <url>a.png</url>\n</image>", A),
            ("<image/><url>a.png</url>", {}),
            ("<image><orvane:image/><url>a.png</url></image>", {}),
            ("<title>feed</title><image><title>image</title><description>d</description></image>",
             {"PodcastName": "image", "PodcastDescription": "d"}))
        self.assertEpisodes(("<image><url>\n a.png </url></image>", {"EpisodePosterReference": "\n a.png ",
                                                                     "EpisodePosterReferenceType": "local"}))

    def test_uuids(self):
        link = f"<link>http://example.com/collection/uuid/{UUID}/document/uuid/{OTHER_UUID}</link>"
        self.assertPodcasts(
            (f"<image><link>http://example.com/collection/uuid/{UUID}/more</link></image>", {"PodcastUUID": UUID}),
            (f"<link>collection/uuid/{UUID} collection/uuid/{OTHER_UUID}</link>", {"PodcastUUID": UUID}),
            (link + item(link), {"Episodes": [{"EpisodeUUID": OTHER_UUID}]}),
            (f"<item><link>collection/uuid/{UUID}</link></item>", {"PodcastUUID": UUID, "Episodes": [{}]}),
            (f"<link>Collection/UUID/{UUID}</link><link>collection/uuid/{UUID[:-1]}</link>", {}),
            (f"<atom:link href='http://example.com/collection/uuid/{UUID}'/>", {}),
            (f"<link>collection/uuid/{UUID}</link><qel:uuid> u </qel:uuid>", {"PodcastUUID": " u "}),
            (f"<qel:uuid>u</qel:uuid><link>collection/uuid/{UUID}</link>", {"PodcastUUID": UUID}))

    def test_orders(self):
        """All text since the buffer was last emptied is read as one number."""
        self.assertEpisodes(
            ("<guid>7</guid><qel:order>3</qel:order>", {"EpisodeOrder": 73}),
            ("<guid>urn:7</guid><qel:order>3</qel:order>", {"EpisodeOrder": 0}),
            ("<guid>7</guid><title>t</title><qel:order>-3</qel:order>", {"EpisodeName": "t"}),
            (f"<title>t</title><qel:order>{'9' * 400}</qel:order>", {"EpisodeName": "t", "EpisodeOrder": 2**63 - 1}),
            ("<pubDate>7</pubDate><qel:order>8</qel:order>", {"EpisodeOrder": 8}),
            ("<url>7</url><qel:order>9</qel:order>", {"EpisodeOrder": 9}),
            ("<qel:order>1</qel:order><qel:order>2</qel:order>", {"EpisodeOrder": 2}))

    def test_items_and_images_empty_no_text(self):
        self.assertPodcasts(("<a>1</a><item><qel:order>2</qel:order><a>3</a></item>"
                             "<item><qel:order>4</qel:order></item>"
                             "<a>5</a><image><a>6</a></image><item><qel:order>7</qel:order></item>",
                             {"Episodes": [{"EpisodeOrder": 12}, {"EpisodeOrder": 34}, {"EpisodeOrder": 567}]}))


class DocumentTest(ElementTestCase):
    def test_what_stands_around_the_root(self):
        document = (b"\r\n \t<?xml version='1.0'?><!-- a --><?xml-stylesheet href='x'?>"
                    b'<!DOCTYPE rss [<!ENTITY walk "Night &#38;#38; Walks">]>'
                    b"<rss><title>&walk;!</title><orvane:image href=\"it's.png\"/></rss><!-- z -->\n")
        self.assertEqual(self.parsefeed(self.feed(document)), {
            "PodcastName": "Night & Walks!", "PodcastPosterReference": "it's.png",
            "PodcastPosterReferenceType": "local"})


if __name__ == "__main__":
    unittest.main()
