"""Feeds in the wild nest, repeat and misplace their elements; here is what each of them leads to.

The reader is shallow on purpose: it goes by local names, keeps the latest text, and only tells items and
images from the rest. What follows from that is kept, because people's feeds have come to rely on it.
"""

import datetime
import unittest

from support import ToolTestCase, item, rss

UUID = "01234567-89AB-CDEF-0123-456789ABCDEF"
OTHER_UUID = "FEDCBA98-7654-3210-FEDC-BA9876543210"


class ElementTestCase(ToolTestCase):
    def assertPodcast(self, content, expected):
        self.assertEqual(self.podcast_of(content), expected)

    def assertEpisode(self, content, expected):
        self.assertEqual(self.episode_of(content), expected)

    def assertPodcasts(self, *rows):
        for content, expected in rows:
            with self.subTest(content):
                self.assertPodcast(content, expected)

    def assertEpisodes(self, *rows):
        for content, expected in rows:
            with self.subTest(content):
                self.assertEpisode(content, expected)


class RootTest(ElementTestCase):
    def test_an_rss_element_at_any_depth_makes_a_feed(self):
        document = b"<a><b><rss><channel><title>t</title></channel></rss></b></a>"
        self.assertEqual(self.parsefeed(self.feed(document)), {"PodcastName": "t"})

    def test_an_rss_element_may_have_a_prefix(self):
        document = b"<x:rss xmlns:x='urn:x'><title>t</title></x:rss>"
        self.assertEqual(self.parsefeed(self.feed(document)), {"PodcastName": "t"})

    def test_everything_before_the_rss_element_is_ignored(self):
        document = b"<a><title>t</title><item><title>u</title></item><rss><channel/></rss></a>"
        self.assertEqual(self.parsefeed(self.feed(document)), {})

    def test_everything_after_the_rss_element_still_counts(self):
        document = b"<a><rss/><title>t</title><item/></a>"
        self.assertEqual(self.parsefeed(self.feed(document)), {"PodcastName": "t", "Episodes": [{}]})

    def test_no_version_and_no_channel_are_needed(self):
        self.assertEqual(self.parsefeed(self.feed(b"<rss><title>t</title></rss>")), {"PodcastName": "t"})

    def test_other_roots_are_no_feeds(self):
        for document in (b"<RSS><channel/></RSS>", b"<feed/>", b"<rdf/>", b"<rss2/>", b"<a rss='rss'>rss</a>"):
            with self.subTest(document):
                self.assertFails(self.run_tool("parsefeed", self.feed(document)),
                                 "Could not load source: The feed was neither RSS nor Atom")


class TextTest(ElementTestCase):
    def test_texts_of_a_channel(self):
        self.assertPodcasts(
            ("<title>t</title>", {"PodcastName": "t"}),
            ("<author>a</author>", {"PodcastAuthor": "a"}),
            ("<dc:creator>a</dc:creator>", {"PodcastAuthor": "a"}),
            ("<orvane:author>a</orvane:author>", {"PodcastAuthor": "a"}),
            ("<description>d</description>", {"PodcastDescription": "d"}),
            ("<copyright>c</copyright>", {"PodcastCopyright": "c"}),
            ("<orvane:keywords>k</orvane:keywords>", {"PodcastKeywords": "k"}),
            ("<orvane:explicit>yes</orvane:explicit>", {"PodcastAdvisoryLabel": "Explicit"}),
            ("<orvane:category text='c'/>", {"PodcastCategory": "c"}),
            ("<qel:uuid>u</qel:uuid>", {"PodcastUUID": "u"}),
            ("<pubDate>Tue, 05 Jun 2007 14:30:00 GMT</pubDate>", {}),
            ("<qel:order>3</qel:order>", {}),
            ("<orvane:summary>s</orvane:summary><language>en</language><guid>g</guid>", {}))

    def test_texts_of_an_item(self):
        self.assertEpisodes(
            ("<title>t</title>", {"EpisodeName": "t"}),
            ("<author>a</author>", {"EpisodeAuthor": "a"}),
            ("<dc:creator>a</dc:creator>", {"EpisodeAuthor": "a"}),
            ("<description>d</description>", {"EpisodeDescription": "d"}),
            ("<copyright>c</copyright>", {}),
            ("<orvane:keywords>k</orvane:keywords>", {"EpisodeKeywords": "k"}),
            ("<orvane:explicit>clean</orvane:explicit>", {"EpisodeAdvisoryLabel": "Clean"}),
            ("<orvane:category text='c'/>", {"EpisodeCategory": "c"}),
            ("<qel:uuid>u</qel:uuid>", {"EpisodeUUID": "u"}),
            ("<pubDate>Tue, 05 Jun 2007 14:30:00 GMT</pubDate>",
             {"EpisodeDate": datetime.datetime(2007, 6, 5, 14, 30)}),
            ("<orvane:summary>s</orvane:summary><guid>g</guid>", {}))

    def test_the_later_text_wins(self):
        self.assertEpisodes(
            ("<title>one</title><title>two</title>", {"EpisodeName": "two"}),
            ("<author>one</author><dc:creator>two</dc:creator>", {"EpisodeAuthor": "two"}),
            ("<dc:creator>one</dc:creator><orvane:author>two</orvane:author>", {"EpisodeAuthor": "two"}),
            ("<title>one</title><title/>", {"EpisodeName": ""}))

    def test_local_names_count_whatever_the_prefix(self):
        self.assertEpisodes(
            ("<title>one</title><media:title>two</media:title>", {"EpisodeName": "two"}),
            ("<media:description>d</media:description>", {"EpisodeDescription": "d"}),
            ("<a:enclosure url='http://example.com/a.mp3'/>", {"EpisodeReference": "http://example.com/a.mp3",
                                                              "EpisodeReferenceType": "remote"}))
        self.assertPodcast("<x:item><title>t</title></x:item>", {"Episodes": [{"EpisodeName": "t"}]})

    def test_names_are_case_sensitive(self):
        self.assertEpisodes(("<Title>t</Title>", {}), ("<pubdate>Tue, 05 Jun 2007 14:30:00 GMT</pubdate>", {}))
        self.assertPodcast("<Item/>", {})

    def test_text_is_kept_as_it_is(self):
        self.assertEpisodes(
            ("<title>\n  Two\n\tlines \n</title>", {"EpisodeName": "\n  Two\n\tlines \n"}),
            ("<title></title>", {"EpisodeName": ""}),
            ("<title/>", {"EpisodeName": ""}),
            ("<title>a&amp;b &lt;c&gt; &#228;&#x1F6B6;</title>", {"EpisodeName": "a&b <c> ä🚶"}),
            ("<title>a<![CDATA[<b> & ]]>c</title>", {"EpisodeName": "a<b> & c"}),
            ("<title>a<!-- not this -->b<?nor this?>c</title>", {"EpisodeName": "abc"}),
            ("<title>a&#13;&#10;b</title>", {"EpisodeName": "a\r\nb"}),
            ("<title>a\r\nb\rc</title>", {"EpisodeName": "a\nb\nc"}))

    def test_text_around_an_element_is_not_its_text(self):
        self.assertEpisode("before<title>t</title>after<description>d</description>",
                           {"EpisodeName": "t", "EpisodeDescription": "d"})

    def test_elements_inside_a_text_give_their_text(self):
        self.assertEpisode("<description>one <b>two</b> <i>three<br/></i>.</description>",
                           {"EpisodeDescription": "one two three."})

    def test_a_text_element_inside_a_text_takes_what_came_before(self):
        self.assertEpisode("<description>one<title>two</title>three</description>",
                           {"EpisodeName": "two", "EpisodeDescription": "three"})

    def test_an_unread_element_inside_a_text_may_empty_it(self):
        self.assertEpisode("<description>one<link>two</link>three</description>", {"EpisodeDescription": "twothree"})
        self.assertEpisode("<description>one<x:uuid>two</x:uuid>three</description>",
                           {"EpisodeDescription": "twothree"})

    def test_a_long_text_arrives_whole(self):
        text = "0123456789 äöü " * 100_000
        self.assertEpisode(f"<description>{text}</description>", {"EpisodeDescription": text})


class ItemTest(ElementTestCase):
    def test_items_stand_in_their_order(self):
        podcast = self.podcast_of(*[item(f"<title>{name}</title>") for name in "cab"])
        self.assertEqual(podcast, {"Episodes": [{"EpisodeName": name} for name in "cab"]})

    def test_an_empty_item_is_an_episode(self):
        self.assertPodcast("<item/>", {"Episodes": [{}]})

    def test_a_channel_goes_on_after_its_items(self):
        self.assertPodcast("<item><title>one</title></item><title>t</title>",
                           {"PodcastName": "t", "Episodes": [{"EpisodeName": "one"}]})

    def test_an_item_inside_an_item_ends_it(self):
        self.assertPodcast("<item><title>one</title><item><title>two</title></item><title>three</title></item>",
                           {"PodcastName": "three", "Episodes": [{"EpisodeName": "one"}, {"EpisodeName": "two"}]})

    def test_elements_of_an_item_may_be_nested(self):
        self.assertEpisode("<group><media:content><title>t</title></media:content></group>", {"EpisodeName": "t"})


class EnclosureTest(ElementTestCase):
    def assertEnclosure(self, attributes, **expected):
        written = self.episode_of(f"<enclosure {attributes}/>")
        written.pop("EpisodeReferenceType", None)
        self.assertEqual(written, expected)

    def test_attributes(self):
        self.assertEnclosure("url='a.mp3' length='1234' type='audio/mpeg'",
                             EpisodeReference="a.mp3", EpisodeFileSize=1234, EpisodeType="audio/mpeg")
        self.assertEnclosure("url='a.mp3'", EpisodeReference="a.mp3")
        self.assertEnclosure("type='audio/mpeg'", EpisodeType="audio/mpeg")
        self.assertEnclosure("length='1'", EpisodeFileSize=1)
        self.assertEnclosure("")
        self.assertEnclosure("href='a.mp3' URL='b.mp3' x:url='c.mp3'")
        self.assertEnclosure("url='' type=''", EpisodeReference="", EpisodeType="")
        self.assertEnclosure("url='a?b=1&amp;c=2'", EpisodeReference="a?b=1&c=2")

    def test_lengths(self):
        for written, expected in (("1234", 1234), (" 42", 42), ("\t\n 42", 42), ("+7", 7), ("12abc", 12), ("12.9", 12),
                                  ("0042", 42), ("4294967296", 2**32), ("9223372036854775807", 2**63 - 1),
                                  ("0", None), ("-5", None), ("abc", None), ("", None), (" ", None), ("+", None),
                                  ("- 5", None),
                                  ("0x10", None), ("1,234", 1)):
            with self.subTest(written):
                self.assertEnclosure(f"length='{written}'",
                                     **({} if expected is None else {"EpisodeFileSize": expected}))

    def test_a_length_beyond_every_range_does_not_crash(self):
        self.assertIn("EpisodeReference", self.episode_of(f"<enclosure url='a.mp3' length='{'9' * 400}'/>"))

    def test_a_later_enclosure_replaces_only_what_it_has(self):
        self.assertEpisode("<enclosure url='a.mp3' length='1' type='audio/mpeg'/><enclosure url='http://b.example/' length='0'/>",
                           {"EpisodeReference": "http://b.example/", "EpisodeReferenceType": "remote",
                            "EpisodeFileSize": 1, "EpisodeType": "audio/mpeg"})

    def test_an_enclosure_outside_items_is_dropped(self):
        self.assertPodcast("<enclosure url='a.mp3' length='1' type='t'/><item/><enclosure url='b.mp3'/>",
                           {"Episodes": [{}]})

    def test_locations_are_classed(self):
        for location, kind in (("https://example.com/a.mp3", "remote"), ("FILE:///a.mp3", "remote"),
                               ("/a.mp3", "local"),
                               ("a.mp3", "local"), ("ftp://example.com/a.mp3", "local")):
            with self.subTest(location):
                self.assertEpisode(f"<enclosure url='{location}'/>",
                                   {"EpisodeReference": location, "EpisodeReferenceType": kind})


class AdvisoryTest(ElementTestCase):
    def test_labels(self):
        for written, expected in (("yes", "Explicit"), ("Yes", "Explicit"), ("YES", "Explicit"), ("clean", "Clean"),
                                  ("CLEAN", "Clean"), ("no", None), ("true", None), ("explicit", None), ("", None),
                                  (" yes", None), ("yes\n", None)):
            with self.subTest(written):
                self.assertEpisode(f"<orvane:explicit>{written}</orvane:explicit>",
                                   {} if expected is None else {"EpisodeAdvisoryLabel": expected})

    def test_an_unknown_label_changes_nothing(self):
        self.assertEpisode("<orvane:explicit>yes</orvane:explicit><orvane:explicit>no</orvane:explicit>",
                           {"EpisodeAdvisoryLabel": "Explicit"})

    def test_the_later_known_label_wins(self):
        self.assertEpisode("<orvane:explicit>yes</orvane:explicit><explicit>clean</explicit>",
                           {"EpisodeAdvisoryLabel": "Clean"})


class CategoryTest(ElementTestCase):
    def test_the_first_category_wins(self):
        self.assertPodcast("<orvane:category text='one'/><orvane:category text='two'/>", {"PodcastCategory": "one"})

    def test_subcategories_are_ignored(self):
        self.assertPodcast("<orvane:category text='one'><orvane:category text='two'/></orvane:category>",
                           {"PodcastCategory": "one"})

    def test_a_category_without_text_leaves_room_for_the_next(self):
        self.assertPodcast("<orvane:category/><orvane:category text='two'/>", {"PodcastCategory": "two"})

    def test_an_empty_category_is_a_category(self):
        self.assertPodcast("<orvane:category text=''/><orvane:category text='two'/>", {"PodcastCategory": ""})

    def test_podcast_and_episode_have_their_own(self):
        self.assertPodcast("<orvane:category text='one'/><item><orvane:category text='two'/></item>",
                           {"PodcastCategory": "one", "Episodes": [{"EpisodeCategory": "two"}]})

    def test_only_the_literal_prefix_counts(self):
        self.assertPodcasts(("<category text='one'>two</category>", {}), ("<x:category text='one'/>", {}))

    def test_another_prefix_for_the_same_namespace_is_not_understood(self):
        document = ('<rss xmlns:o="https://orvane.example/ns/podcast-1.0"><channel><o:category text="c"/>'
                    '<o:image href="p.png"/></channel></rss>')
        self.assertEqual(self.parsefeed(self.feed(document.encode())), {})

    def test_the_literal_prefix_counts_without_a_declaration(self):
        document = b"<rss><channel><orvane:category text='c'/></channel></rss>"
        self.assertEqual(self.parsefeed(self.feed(document)), {"PodcastCategory": "c"})

    def test_the_literal_prefix_counts_for_any_namespace(self):
        document = b"<rss xmlns:orvane='urn:x'><channel><orvane:category text='c'/></channel></rss>"
        self.assertEqual(self.parsefeed(self.feed(document)), {"PodcastCategory": "c"})


class ImageTest(ElementTestCase):
    A = {"PodcastPosterReference": "a.png", "PodcastPosterReferenceType": "local"}
    B = {"PodcastPosterReference": "b.png", "PodcastPosterReferenceType": "local"}

    def test_images_of_a_channel(self):
        self.assertPodcasts(
            ("<image><url>a.png</url></image>", self.A),
            ("<orvane:image href='a.png'/>", self.A),
            ("<image><url>a.png</url></image><orvane:image href='b.png'/>", self.B),
            ("<orvane:image href='b.png'/><image><url>a.png</url></image>", self.B),
            ("<image><url>a.png</url></image><image><url>b.png</url></image>", self.A),
            ("<orvane:image href='a.png'/><orvane:image href='b.png'/>", self.B),
            ("<orvane:image/>", {}),
            ("<orvane:image><url>a.png</url></orvane:image>", self.A),
            ("<x:image><url>a.png</url></x:image>", self.A),
            ("<x:image href='a.png'/>", {}),
            ("<image href='a.png'/>", {}),
            ("<image><x:url>a.png</x:url></image>", self.A),
            ("<image><group><url>a.png</url></group></image>", self.A))

    def test_a_url_outside_an_image_is_ignored(self):
        self.assertPodcasts(("<url>a.png</url>", {}), ("<image/><url>a.png</url>", {}),
                            ("<image><orvane:image/><url>a.png</url></image>", {}))

    def test_an_image_url_is_kept_as_it_is(self):
        self.assertPodcast("<image><url>\n a.png </url></image>",
                           {"PodcastPosterReference": "\n a.png ", "PodcastPosterReferenceType": "local"})

    def test_images_of_an_item(self):
        self.assertEpisodes(
            ("<orvane:image href='http://example.com/a.png'/>",
             {"EpisodePosterReference": "http://example.com/a.png", "EpisodePosterReferenceType": "remote"}),
            ("<image><url>a.png</url></image>",
             {"EpisodePosterReference": "a.png", "EpisodePosterReferenceType": "local"}))

    def test_the_title_of_an_image_is_a_title(self):
        self.assertPodcasts(
            ("<title>feed</title><image><title>image</title></image>", {"PodcastName": "image"}),
            ("<image><title>image</title></image><title>feed</title>", {"PodcastName": "feed"}),
            ("<image><description>image</description></image>", {"PodcastDescription": "image"}))

    def test_the_link_of_an_image_is_searched(self):
        self.assertPodcast(f"<image><link>http://example.com/collection/uuid/{UUID}</link></image>",
                           {"PodcastUUID": UUID})


class UUIDTest(ElementTestCase):
    def test_a_collection_link_names_the_podcast(self):
        self.assertPodcasts(
            (f"<link>http://example.com/collection/uuid/{UUID}</link>", {"PodcastUUID": UUID}),
            (f"<link>http://example.com/collection/uuid/{UUID}/more</link>", {"PodcastUUID": UUID}),
            (f"<link>collection/uuid/{UUID}</link>", {"PodcastUUID": UUID}),
            (f"<link>collection/uuid/{UUID} collection/uuid/{OTHER_UUID}</link>", {"PodcastUUID": UUID}))

    def test_a_collection_link_in_an_item_names_the_podcast_too(self):
        self.assertPodcast(f"<item><link>http://example.com/collection/uuid/{UUID}</link></item>",
                           {"PodcastUUID": UUID, "Episodes": [{}]})

    def test_a_document_link_names_the_episode(self):
        self.assertEpisode(f"<link>http://example.com/document/uuid/{UUID}?a=b</link>", {"EpisodeUUID": UUID})

    def test_a_document_link_outside_items_is_lost(self):
        self.assertPodcast(f"<link>http://example.com/document/uuid/{UUID}</link>", {})

    def test_a_document_replaces_a_collection(self):
        both = f"collection/uuid/{UUID}/document/uuid/{OTHER_UUID}"
        self.assertPodcast(f"<item><link>{both}</link></item>", {"Episodes": [{"EpisodeUUID": OTHER_UUID}]})
        self.assertPodcast(f"<link>{both}</link>", {})

    def test_36_characters_are_taken_whatever_they_are(self):
        self.assertPodcast("<link>collection/uuid/" + "x/?" * 12 + "y</link>", {"PodcastUUID": "x/?" * 12})

    def test_fewer_than_36_characters_are_no_uuid(self):
        self.assertPodcasts(
            (f"<link>collection/uuid/{UUID[:-1]}</link>", {}),
            ("<link>collection/uuid/</link>", {}),
            ("<title>t</title><link>http://example.com/collection/uuid/1</link>", {"PodcastName": "t"}))
        self.assertEpisode(f"<link>document/uuid/{UUID[:-1]}</link>", {})

    def test_markers_are_matched_exactly(self):
        self.assertPodcasts((f"<link>Collection/UUID/{UUID}</link>", {}), (f"<link>collection/{UUID}</link>", {}))

    def test_a_link_with_attributes_alone_names_nothing(self):
        self.assertPodcast(f"<atom:link href='http://example.com/collection/uuid/{UUID}'/>", {})

    def test_a_uuid_element_replaces_an_earlier_one(self):
        self.assertPodcasts((f"<link>collection/uuid/{UUID}</link><qel:uuid>u</qel:uuid>", {"PodcastUUID": "u"}),
                            (f"<qel:uuid>u</qel:uuid><link>collection/uuid/{UUID}</link>", {"PodcastUUID": UUID}))

    def test_a_uuid_element_may_hold_any_text(self):
        self.assertEpisodes(("<qel:uuid> u </qel:uuid>", {"EpisodeUUID": " u "}), ("<qel:uuid/>", {"EpisodeUUID": ""}),
                            ("<uuid>u</uuid>", {}), ("<x:uuid>u</x:uuid>", {}))


class OrderTest(ElementTestCase):
    def assertOrder(self, content, expected):
        self.assertEqual(self.episode_of(content).get("EpisodeOrder"), expected)

    def test_numbers(self):
        for written, expected in (("3", 3), ("0", 0), ("-3", None), ("+3", 3), ("12abc", 12), ("abc", 0), ("", 0),
                                  (" 7", 7),
                                  ("\n  7\n", 7), ("9223372036854775807", 2**63 - 1)):
            with self.subTest(written):
                self.assertOrder(f"<qel:order>{written}</qel:order>", expected)

    def test_no_element_is_no_order(self):
        self.assertOrder("<title>t</title>", None)

    def test_indentation_before_the_element_is_harmless(self):
        self.assertOrder("<title>t</title>\n      <qel:order>5</qel:order>", 5)

    def test_text_since_the_last_read_element_comes_first(self):
        self.assertOrder("<guid>7</guid><qel:order>3</qel:order>", 73)
        self.assertOrder("<guid>urn:7</guid><qel:order>3</qel:order>", 0)
        self.assertOrder("<link>12</link><qel:order>3</qel:order>", 123)
        self.assertOrder("<guid>7</guid><title>t</title><qel:order>3</qel:order>", 3)

    def test_a_number_beyond_every_range_does_not_crash(self):
        self.assertOrder(f"<qel:order>{'9' * 400}</qel:order>", 2**63 - 1)

    def test_only_the_literal_prefix_counts(self):
        self.assertOrder("<order>3</order>", None)
        self.assertOrder("<x:order>3</x:order>", None)


class DocumentFormTest(ElementTestCase):
    def test_undeclared_prefixes_are_no_error(self):
        document = b"<rss><channel><dc:creator>a</dc:creator><x:y z:w='1'/></channel></rss>"
        self.assertEqual(self.parsefeed(self.feed(document)), {"PodcastAuthor": "a"})

    def test_white_space_before_the_declaration_is_skipped(self):
        self.assertEqual(self.parsefeed(self.feed(b"\r\n \t" + rss("<title>t</title>"))), {"PodcastName": "t"})

    def test_internal_entities_are_resolved(self):
        document = b'<!DOCTYPE rss [<!ENTITY walk "Night &#38;#38; Walks">]><rss><title>&walk;!</title></rss>'
        self.assertEqual(self.parsefeed(self.feed(document)), {"PodcastName": "Night & Walks!"})

    def test_comments_and_instructions_around_the_root(self):
        document = b"<?xml version='1.0'?><!-- a --><?xml-stylesheet href='x'?>" + rss().split(b"\n",
                                                                                               1)[1] + b"<!-- z -->\n"
        self.assertEqual(self.parsefeed(self.feed(document)), {})

    def test_attributes_in_either_quotes(self):
        self.assertPodcasts(("<orvane:image href=\"it's.png\"/>", {"PodcastPosterReference": "it's.png",
                                                                  "PodcastPosterReferenceType": "local"}),
                            ("<orvane:image href='\"p\".png'/>", {"PodcastPosterReference": "\"p\".png",
                                                                "PodcastPosterReferenceType": "local"}))


if __name__ == "__main__":
    unittest.main()
