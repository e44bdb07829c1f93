"""createfeed writes the podcast as an RSS 2.0 document that any reader of XML understands.

QELFeedPodcastGeneratorTest has the tables of labels, orders and locations; here Python's XML modules read which
elements stand in the document, and in which order.
"""

import datetime
import email.utils
import unittest
import xml.dom.minidom

from support import DC, LOADING, ORVANE, QEL_NAMESPACE, ToolTestCase, rss, tags

PODCAST = {"PodcastUUID": "u", "PodcastName": "n", "PodcastAuthor": "a", "PodcastCopyright": "©",
           "PodcastKeywords": "k", "PodcastCategory": "c", "PodcastDescription": "d",
           "PodcastAdvisoryLabel": "Explicit", "PodcastReference": "/a b/ü", "PodcastReferenceType": "local",
           "PodcastPosterReference": "http://example.com/p.png", "PodcastPosterReferenceType": "remote"}
EPISODE = {"EpisodeUUID": "u", "EpisodeName": "n", "EpisodeAuthor": "a",
           "EpisodeDate": datetime.datetime(2007, 6, 5, 14, 30), "EpisodeKeywords": "k", "EpisodeDescription": "d",
           "EpisodeCategory": "c", "EpisodeAdvisoryLabel": "Clean", "EpisodeOrder": 3, "EpisodeType": "audio/mpeg",
           "EpisodeFileSize": 1234, "EpisodeReference": "/media/no#1 [ü].mp3", "EpisodeReferenceType": "local",
           "EpisodePosterReference": "e.png", "EpisodePosterReferenceType": "local"}

# An episode of one value, and the elements that it makes.
SINGLE_VALUES = (
    ({"EpisodeName": "x"}, ["title"]),
    ({"EpisodeAuthor": "x"}, ["dc:creator", "orvane:author"]),
    ({"EpisodeDate": datetime.datetime(2007, 6, 5)}, ["pubDate"]),
    ({"EpisodeKeywords": "x"}, ["orvane:keywords"]),
    ({"EpisodeCategory": "x"}, ["orvane:category"]),
    ({"EpisodeDescription": "x"}, ["description", "orvane:summary"]),
    ({"EpisodeAdvisoryLabel": "x"}, []),
    ({"EpisodeAdvisoryLabel": "yes"}, ["orvane:explicit"]),
    ({"EpisodeUUID": "x"}, ["qel:uuid"]),
    ({"EpisodeOrder": 0}, ["qel:order"]),
    ({"EpisodeType": "x"}, []),
    ({"EpisodeFileSize": 1}, []),
    ({"EpisodeReference": "x"}, ["enclosure"]),
    ({"EpisodeReference": "x", "EpisodeReferenceType": "elsewhere"}, []),
    ({"EpisodeReferenceType": "local"}, []),
    ({"EpisodePosterReference": "x"}, ["orvane:image"]),
    ({"EpisodePosterReferenceType": "local"}, []),
)


class DocumentTest(ToolTestCase):
    def test_an_empty_podcast_is_an_empty_channel_with_its_date(self):
        root = self.createfeed(self.reference({}))
        self.assertEqual((root.tag, root.attrib), ("rss", {"version": "2.0"}))
        self.assertEqual([child.tag for child in root], ["channel"])
        self.assertEqual(tags(root[0]), ["pubDate"])

    def test_it_is_indented_xml_1_0_in_utf_8_with_its_namespaces_in_order(self):
        self.assertRegex(self.run_tool("createfeed", self.reference({"PodcastName": "Füße"})).stdout.decode(),
                         r'\A<\?xml version="1\.0" encoding="UTF-8"\?>\n<rss version="2\.0" '
                         r'xmlns:dc="http://purl\.org/dc/elements/1\.1/" '
                         r'xmlns:orvane="https://orvane\.example/ns/podcast-1\.0" '
                         r'xmlns:qel="https://qel\.example/ns/1\.0">\n +<channel>\n +<title>Füße</title>\n')

    def test_elements_have_the_documented_prefixes(self):
        result = self.run_tool("createfeed", self.reference({**PODCAST, "Episodes": [EPISODE]}))
        document = xml.dom.minidom.parseString(result.stdout)
        self.assertEqual({node.nodeName for node in document.getElementsByTagName("*")},
                         {"rss", "channel", "item", "title", "dc:creator", "orvane:author", "pubDate", "copyright",
                          "orvane:keywords", "orvane:category", "description", "orvane:summary", "orvane:explicit",
                          "qel:uuid", "qel:order", "image", "url", "orvane:image", "link", "enclosure"})

    def test_texts_and_attributes_are_escaped_and_never_cdata(self):
        text = "<b>Tom & \"Jerry's\"</b> ]]> &amp;"
        result = self.run_tool("createfeed", self.reference({"PodcastDescription": text, "PodcastCategory": text}))
        self.assertNotIn(b"<![CDATA[", result.stdout)
        document = xml.dom.minidom.parseString(result.stdout)
        self.assertEqual(document.getElementsByTagName("description")[0].firstChild.data, text)
        self.assertEqual(document.getElementsByTagName("orvane:category")[0].getAttribute("text"), text)


class ContentTest(ToolTestCase):
    def test_a_channel(self):
        channel = self.channel_of({**PODCAST, "Episodes": [{"EpisodeName": "c"}, {"EpisodeName": "a"}]})
        self.assertEqual(tags(channel), [
            "title", "dc:creator", "orvane:author", "pubDate", "copyright", "orvane:keywords", "orvane:category",
            "description", "orvane:summary", "orvane:explicit", "qel:uuid", "image", "orvane:image", "link", "item",
            "item"])
        texts = {name: channel.findtext(name) for name in
                 ("title", DC + "creator", ORVANE + "author", "copyright", ORVANE + "keywords", "description",
                  ORVANE + "summary", ORVANE + "explicit", QEL_NAMESPACE + "uuid", "link")}
        self.assertEqual(texts, {
            "title": "n", DC + "creator": "a", ORVANE + "author": "a", "copyright": "©", ORVANE + "keywords": "k",
            "description": "d", ORVANE + "summary": "d", ORVANE + "explicit": "yes", QEL_NAMESPACE + "uuid": "u",
            "link": "/a b/ü"})
        category = channel.find(ORVANE + "category")
        self.assertEqual((category.attrib, category.text, list(category)), ({"text": "c"}, None, []))
        self.assertEqual([(child.tag, child.text) for child in channel.find("image")],
                         [("url", "http://example.com/p.png"), ("title", "n")])
        self.assertEqual(channel.find(ORVANE + "image").attrib, {"href": "http://example.com/p.png"})
        self.assertEqual([item.findtext("title") for item in channel.findall("item")], ["c", "a"])

    def test_the_date_of_a_channel_is_the_moment_of_generation(self):
        before = datetime.datetime.now(datetime.timezone.utc).replace(microsecond=0)
        channel = self.channel_of({})
        after = datetime.datetime.now(datetime.timezone.utc)
        written = email.utils.parsedate_to_datetime(channel.findtext("pubDate"))
        self.assertTrue(before <= written <= after, (before, written, after))

    def test_an_item(self):
        item = self.item_of(EPISODE)
        self.assertEqual(tags(item), [
            "title", "dc:creator", "orvane:author", "pubDate", "orvane:keywords", "orvane:category", "description",
            "orvane:summary", "orvane:explicit", "qel:uuid", "qel:order", "orvane:image", "enclosure"])
        texts = {name: item.findtext(name) for name in
                 ("title", DC + "creator", ORVANE + "author", "pubDate", ORVANE + "keywords", "description",
                  ORVANE + "summary", ORVANE + "explicit", QEL_NAMESPACE + "uuid", QEL_NAMESPACE + "order")}
        self.assertEqual(texts, {
            "title": "n", DC + "creator": "a", ORVANE + "author": "a", "pubDate": "Tue, 05 Jun 2007 14:30:00 GMT",
            ORVANE + "keywords": "k", "description": "d", ORVANE + "summary": "d", ORVANE + "explicit": "clean",
            QEL_NAMESPACE + "uuid": "u", QEL_NAMESPACE + "order": "3"})
        self.assertEqual(item.find(ORVANE + "category").attrib, {"text": "c"})
        self.assertEqual(item.find(ORVANE + "image").attrib, {"href": "e.png"})
        self.assertEqual(list(item.find("enclosure").attrib.items()), [
            ("url", "file:///media/no%231%20%5B%C3%BC%5D.mp3"), ("type", "audio/mpeg"), ("length", "1234")])

    def test_each_value_of_an_item_makes_its_own_elements(self):
        items = self.channel_of({"Episodes": [episode for episode, _ in SINGLE_VALUES]}).findall("item")
        for (episode, expected), item in zip(SINGLE_VALUES, items, strict=True):
            with self.subTest(episode):
                self.assertEqual(tags(item), expected)

    def test_each_value_of_a_channel_makes_its_own_elements(self):
        for key, expected in (("PodcastCopyright", ["copyright"]), ("PodcastReference", ["link"]),
                              ("PodcastReferenceType", []), ("PodcastPosterReference", ["image", "orvane:image"]),
                              ("PodcastPosterReferenceType", [])):
            with self.subTest(key):
                self.assertEqual(tags(self.channel_of({key: "x"})), ["pubDate", *expected])

    def test_a_feed_becomes_a_feed(self):
        url = self.feed(rss("<title>Night Walks</title><item><title>One</title></item>"))
        channel = self.createfeed(url).find("channel")
        self.assertEqual((tags(channel), channel.findtext("item/title")), (["title", "pubDate", "item"], "One"))


class AtomTest(ToolTestCase):
    def test_atom_is_a_declaration_without_elements(self):
        source = self.reference({**PODCAST, "Episodes": [EPISODE]})
        result = self.run_tool("createfeed", source, "-f", "atom")
        self.assertSucceeds(result, b'<?xml version="1.0" encoding="UTF-8"?>\n\n')
        self.assertSucceeds(self.run_tool("createfeed", source, "-f", "atom", "-d", "out.xml"), LOADING)
        self.assertEqual(self.path("out.xml").read_bytes(), result.stdout)


if __name__ == "__main__":
    unittest.main()
