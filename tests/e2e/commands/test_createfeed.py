"""createfeed writes the podcast as an RSS 2.0 document: which elements, under which condition, in which order.

The document is read back by Python's XML modules; its white space belongs to nobody.
"""

import datetime
import email.utils
import os
import socket
import subprocess
import unittest
import xml.dom.minidom

from support import (DC, LOADING, ORVANE, QEL_NAMESPACE, ToolTestCase, checked, environment, rss, start, tags, tool,
                     without_publication_date)

PODCAST = {"PodcastUUID": "u", "PodcastName": "n", "PodcastAuthor": "a", "PodcastCopyright": "©",
           "PodcastKeywords": "k",
           "PodcastCategory": "c", "PodcastDescription": "d", "PodcastAdvisoryLabel": "Explicit",
           "PodcastReference": "http://example.com/", "PodcastReferenceType": "remote",
           "PodcastPosterReference": "http://example.com/p.png", "PodcastPosterReferenceType": "remote"}
EPISODE = {"EpisodeUUID": "u", "EpisodeName": "n", "EpisodeAuthor": "a",
           "EpisodeDate": datetime.datetime(2007, 6, 5, 14, 30), "EpisodeKeywords": "k", "EpisodeDescription": "d",
           "EpisodeCategory": "c", "EpisodeAdvisoryLabel": "Clean", "EpisodeOrder": 3, "EpisodeType": "audio/mpeg",
           "EpisodeFileSize": 1234, "EpisodeReference": "http://example.com/a.mp3", "EpisodeReferenceType": "remote",
           "EpisodePosterReference": "http://example.com/e.png", "EpisodePosterReferenceType": "remote"}

# Where a location of each type leads, in a poster and in an enclosure alike; None is left out.
RESOLVED_LOCATIONS = (
    ("http://example.com/a b.mp3", "remote", "http://example.com/a b.mp3"),
    ("/media/a b.mp3", "remote", "/media/a b.mp3"),
    ("a.mp3", "remote", "a.mp3"),
    ("", "remote", ""),
    ("/media/a.mp3", "local", "file:///media/a.mp3"),
    ("/media/a b.mp3", "local", "file:///media/a%20b.mp3"),
    ("/media/100%.mp3", "local", "file:///media/100%25.mp3"),
    ("/media/what?.mp3", "local", "file:///media/what%3F.mp3"),
    ("/media/no#1.mp3", "local", "file:///media/no%231.mp3"),
    ("/media/füße.mp3", "local", "file:///media/f%C3%BC%C3%9Fe.mp3"),
    ("/media/<a>\"b\".mp3", "local", "file:///media/%3Ca%3E%22b%22.mp3"),
    ("/media/[1]{2}|^`\\.mp3", "local", "file:///media/%5B1%5D%7B2%7D%7C%5E%60%5C.mp3"),
    ("a.mp3", "local", "a.mp3"),
    ("a b/ü#?.mp3", "local", "a b/ü#?.mp3"),
    ("./a.mp3", "local", "./a.mp3"),
    ("", "local", ""),
    ("http://example.com/a.mp3", "Remote", None),
    ("/media/a.mp3", "LOCAL", None),
    ("/media/a.mp3", "elsewhere", None),
    ("/media/a.mp3", "", None),
)


class DocumentTest(ToolTestCase):
    def test_an_empty_podcast_is_an_empty_channel_with_its_date(self):
        root = self.createfeed(self.reference({}))
        self.assertEqual((root.tag, root.attrib), ("rss", {"version": "2.0"}))
        self.assertEqual([child.tag for child in root], ["channel"])
        self.assertEqual(tags(root[0]), ["pubDate"])

    def test_version_and_namespaces_are_declared_in_order(self):
        result = self.run_tool("createfeed", self.reference(PODCAST))
        document = xml.dom.minidom.parseString(result.stdout)
        attributes = document.documentElement.attributes
        self.assertEqual({attributes.item(i).name: attributes.item(i).value for i in range(attributes.length)}, {
            "version": "2.0", "xmlns:dc": "http://purl.org/dc/elements/1.1/",
            "xmlns:orvane": "https://orvane.example/ns/podcast-1.0", "xmlns:qel": "https://qel.example/ns/1.0"})
        self.assertRegex(result.stdout, rb"<rss [^>]*xmlns:dc=[^>]*xmlns:orvane=[^>]*xmlns:qel=")

    def test_the_document_is_xml_1_0_in_utf_8(self):
        result = self.run_tool("createfeed", self.reference({"PodcastName": "Füße"}))
        self.assertRegex(result.stdout, rb"\A<\?xml version=[\"']1\.0[\"'] encoding=[\"']UTF-8[\"']")
        self.assertIn("Füße".encode(), result.stdout)

    def test_elements_have_the_documented_prefixes(self):
        result = self.run_tool("createfeed", self.reference({**PODCAST, "Episodes": [EPISODE]}))
        document = xml.dom.minidom.parseString(result.stdout)
        names = {node.nodeName for node in document.getElementsByTagName("*")}
        self.assertEqual(names,
                         {"rss", "channel", "item", "title", "dc:creator", "orvane:author", "pubDate", "copyright",
                                 "orvane:keywords", "orvane:category", "description", "orvane:summary",
                                 "orvane:explicit", "qel:uuid", "qel:order", "image", "url", "orvane:image", "link",
                                 "enclosure"})

    def test_the_document_is_indented(self):
        result = self.run_tool("createfeed", self.reference(PODCAST))
        self.assertRegex(result.stdout, rb"\n[ \t]+<channel>\n[ \t]+<title>n</title>\n")

    def test_text_is_escaped_and_never_cdata(self):
        text = "<b>Tom & \"Jerry's\"</b> ]]> &amp;"
        result = self.run_tool("createfeed", self.reference({"PodcastDescription": text}))
        self.assertNotIn(b"<![CDATA[", result.stdout)
        document = xml.dom.minidom.parseString(result.stdout)
        self.assertEqual(document.getElementsByTagName("description")[0].firstChild.data, text)

    def test_attributes_are_escaped(self):
        category = "<Society & \"Culture's\">"
        channel = self.channel_of({"PodcastCategory": category})
        self.assertEqual(channel.find(ORVANE + "category").get("text"), category)


class ChannelTest(ToolTestCase):
    def test_children_stand_in_their_order_before_the_items(self):
        channel = self.channel_of({**PODCAST, "Episodes": [{}, {}]})
        self.assertEqual(tags(channel), [
            "title", "dc:creator", "orvane:author", "pubDate", "copyright", "orvane:keywords", "orvane:category",
            "description", "orvane:summary", "orvane:explicit", "qel:uuid", "image", "orvane:image", "link", "item",
            "item"])

    def test_children_hold_the_podcast_s_values(self):
        channel = self.channel_of(PODCAST)
        texts = {name: channel.findtext(name) for name in
                 ("title", DC + "creator", ORVANE + "author", "copyright", ORVANE + "keywords", "description",
                  ORVANE + "summary", QEL_NAMESPACE + "uuid", "link")}
        self.assertEqual(texts, {
            "title": "n", DC + "creator": "a", ORVANE + "author": "a", "copyright": "©", ORVANE + "keywords": "k",
            "description": "d", ORVANE + "summary": "d", QEL_NAMESPACE + "uuid": "u", "link": "http://example.com/"})

    def test_each_value_alone_makes_its_own_elements(self):
        for key, expected in (
                ("PodcastName", ["title", "pubDate"]),
                ("PodcastAuthor", ["dc:creator", "orvane:author", "pubDate"]),
                ("PodcastCopyright", ["pubDate", "copyright"]),
                ("PodcastKeywords", ["pubDate", "orvane:keywords"]),
                ("PodcastCategory", ["pubDate", "orvane:category"]),
                ("PodcastDescription", ["pubDate", "description", "orvane:summary"]),
                ("PodcastAdvisoryLabel", ["pubDate"]),
                ("PodcastUUID", ["pubDate", "qel:uuid"]),
                ("PodcastReference", ["pubDate", "link"]),
                ("PodcastReferenceType", ["pubDate"]),
                ("PodcastPosterReference", ["pubDate", "image", "orvane:image"]),
                ("PodcastPosterReferenceType", ["pubDate"])):
            with self.subTest(key):
                self.assertEqual(tags(self.channel_of({key: "x"})), expected)

    def test_empty_texts_are_written(self):
        channel = self.channel_of({"PodcastName": "", "PodcastCategory": "", "PodcastReference": ""})
        self.assertEqual(tags(channel), ["title", "pubDate", "orvane:category", "link"])
        self.assertEqual((channel.findtext("title"), channel.find(ORVANE + "category").attrib,
                          channel.findtext("link")),
                         ("", {"text": ""}, ""))

    def test_the_date_is_the_moment_of_generation(self):
        before = datetime.datetime.now(datetime.timezone.utc).replace(microsecond=0)
        channel = self.channel_of({})
        after = datetime.datetime.now(datetime.timezone.utc)
        written = email.utils.parsedate_to_datetime(channel.findtext("pubDate"))
        self.assertTrue(before <= written <= after, (before, written, after))

    def test_a_category_is_an_attribute_without_text(self):
        category = self.channel_of({"PodcastCategory": "Arts"}).find(ORVANE + "category")
        self.assertEqual((category.attrib, category.text, list(category)), ({"text": "Arts"}, None, []))

    def test_the_image_holds_url_and_title(self):
        image = self.channel_of(PODCAST).find("image")
        self.assertEqual([(child.tag, child.text) for child in image],
                         [("url", "http://example.com/p.png"), ("title", "n")])

    def test_the_image_of_an_untitled_podcast_holds_its_url_alone(self):
        image = self.channel_of({"PodcastPosterReference": "p.png"}).find("image")
        self.assertEqual([(child.tag, child.text) for child in image], [("url", "p.png")])

    def test_a_poster_is_resolved(self):
        for location, kind, expected in (*RESOLVED_LOCATIONS, ("/p.png", None, "/p.png"), ("p.png", None, "p.png"),
                                         ("http://example.com/p.png", None, "http://example.com/p.png")):
            with self.subTest(location=location, kind=kind):
                podcast = {"PodcastPosterReference": location}
                if kind is not None:
                    podcast["PodcastPosterReferenceType"] = kind
                channel = self.channel_of(podcast)
                if expected is None:
                    self.assertEqual(tags(channel), ["pubDate"])
                else:
                    self.assertEqual(channel.findtext("image/url"), expected)
                    self.assertEqual(channel.find(ORVANE + "image").attrib, {"href": expected})

    def test_the_link_is_never_converted(self):
        for kind in ("local", "remote", "elsewhere"):
            with self.subTest(kind):
                channel = self.channel_of({"PodcastReference": "/a b/ü", "PodcastReferenceType": kind})
                self.assertEqual(channel.findtext("link"), "/a b/ü")


class ItemTest(ToolTestCase):
    def test_children_stand_in_their_order(self):
        self.assertEqual(tags(self.item_of(EPISODE)), [
            "title", "dc:creator", "orvane:author", "pubDate", "orvane:keywords", "orvane:category", "description",
            "orvane:summary", "orvane:explicit", "qel:uuid", "qel:order", "orvane:image", "enclosure"])

    def test_children_hold_the_episode_s_values(self):
        item = self.item_of(EPISODE)
        texts = {name: item.findtext(name) for name in
                 ("title", DC + "creator", ORVANE + "author", "pubDate", ORVANE + "keywords", "description",
                  ORVANE + "summary", ORVANE + "explicit", QEL_NAMESPACE + "uuid", QEL_NAMESPACE + "order")}
        self.assertEqual(texts, {
            "title": "n", DC + "creator": "a", ORVANE + "author": "a", "pubDate": "Tue, 05 Jun 2007 14:30:00 GMT",
            ORVANE + "keywords": "k", "description": "d", ORVANE + "summary": "d", ORVANE + "explicit": "clean",
            QEL_NAMESPACE + "uuid": "u", QEL_NAMESPACE + "order": "3"})
        self.assertEqual(item.find(ORVANE + "category").attrib, {"text": "c"})
        self.assertEqual(item.find(ORVANE + "image").attrib, {"href": "http://example.com/e.png"})
        self.assertEqual(item.find("enclosure").attrib,
                         {"url": "http://example.com/a.mp3", "type": "audio/mpeg", "length": "1234"})

    def test_an_empty_episode_is_an_empty_item(self):
        item = self.item_of({})
        self.assertEqual((tags(item), item.attrib), ([], {}))

    def test_each_value_alone_makes_its_own_elements(self):
        for key, value, expected in (
                ("EpisodeName", "x", ["title"]),
                ("EpisodeAuthor", "x", ["dc:creator", "orvane:author"]),
                ("EpisodeDate", datetime.datetime(2007, 6, 5), ["pubDate"]),
                ("EpisodeKeywords", "x", ["orvane:keywords"]),
                ("EpisodeCategory", "x", ["orvane:category"]),
                ("EpisodeDescription", "x", ["description", "orvane:summary"]),
                ("EpisodeAdvisoryLabel", "x", []),
                ("EpisodeUUID", "x", ["qel:uuid"]),
                ("EpisodeOrder", 0, ["qel:order"]),
                ("EpisodeOrder", -1, []),
                ("EpisodeType", "x", []),
                ("EpisodeFileSize", 1, []),
                ("EpisodeReference", "x", ["enclosure"]),
                ("EpisodeReferenceType", "local", []),
                ("EpisodePosterReference", "x", ["orvane:image"]),
                ("EpisodePosterReferenceType", "local", [])):
            with self.subTest(key=key, value=value):
                self.assertEqual(tags(self.item_of({key: value})), expected)

    def test_items_keep_the_order_of_the_episodes(self):
        channel = self.channel_of({"Episodes": [{"EpisodeName": name, "EpisodeOrder": order}
                                                for name, order in (("c", 3), ("a", 1), ("b", 2))]})
        self.assertEqual([item.findtext("title") for item in channel.findall("item")], ["c", "a", "b"])

    def test_an_item_never_shows_the_moment_of_generation(self):
        channel = self.channel_of({"Episodes": [{"EpisodeName": "n"}]})
        self.assertIsNone(channel.find("item/pubDate"))

    def test_advisory_labels(self):
        for label, expected in (("Explicit", "yes"), ("explicit", "yes"), ("EXPLICIT", "yes"), ("Yes", "yes"),
                                ("yes", "yes"),
                                ("YES", "yes"), ("Clean", "clean"), ("CLEAN", "clean"), ("no", None), ("", None),
                                ("true", None), (" yes", None), ("Explicit ", None)):
            with self.subTest(label):
                item = self.item_of({"EpisodeAdvisoryLabel": label})
                self.assertEqual(item.findtext(ORVANE + "explicit"), expected)
                channel = self.channel_of({"PodcastAdvisoryLabel": label})
                self.assertEqual(channel.findtext(ORVANE + "explicit"), expected)

    def test_orders(self):
        for order, expected in ((0, "0"), (1, "1"), (2**63 - 1, "9223372036854775807"), (-1, None), (-2**63, None)):
            with self.subTest(order):
                self.assertEqual(self.item_of({"EpisodeOrder": order}).findtext(QEL_NAMESPACE + "order"), expected)

    def test_enclosures_leave_out_what_is_unknown(self):
        for episode, expected in (
                ({}, {"url": "a.mp3"}),
                ({"EpisodeFileSize": 0}, {"url": "a.mp3"}),
                ({"EpisodeFileSize": 1}, {"url": "a.mp3", "length": "1"}),
                ({"EpisodeFileSize": 2**64 - 1}, {"url": "a.mp3", "length": "18446744073709551615"}),
                ({"EpisodeType": "audio/mpeg"}, {"url": "a.mp3", "type": "audio/mpeg"}),
                ({"EpisodeType": ""}, {"url": "a.mp3", "type": ""})):
            with self.subTest(episode):
                enclosure = self.item_of({"EpisodeReference": "a.mp3", **episode}).find("enclosure")
                self.assertEqual((enclosure.attrib, enclosure.text, list(enclosure)), (expected, None, []))

    def test_attributes_of_an_enclosure_stand_in_their_order(self):
        source = self.reference({"Episodes": [EPISODE]})
        self.assertRegex(self.run_tool("createfeed", source).stdout, rb"<enclosure url=\S+ type=\S+ length=\S+ ?/>")

    def test_locations_are_resolved(self):
        for location, kind, expected in (*RESOLVED_LOCATIONS, ("", None, ""), ("a.mp3", None, "a.mp3"),
                                         ("/a.mp3", None, "file:///a.mp3"), ("FILE:///a.mp3", None, "FILE:///a.mp3")):
            with self.subTest(location=location, kind=kind):
                types = {} if kind is None else {"EpisodeReferenceType": kind, "EpisodePosterReferenceType": kind}
                item = self.item_of({"EpisodeReference": location, "EpisodePosterReference": location, **types})
                if expected is None:
                    self.assertEqual(tags(item), [])
                else:
                    self.assertEqual(item.find("enclosure").attrib, {"url": expected})
                    self.assertEqual(item.find(ORVANE + "image").attrib, {"href": expected})

    def test_a_feed_becomes_a_feed(self):
        url = self.feed(rss("<title>Night Walks</title><item><title>One</title></item>"))
        channel = self.createfeed(url).find("channel")
        self.assertEqual((tags(channel), channel.findtext("item/title")), (["title", "pubDate", "item"], "One"))


class AtomTest(ToolTestCase):
    def test_atom_is_a_declaration_without_elements(self):
        result = self.run_tool("createfeed", self.reference({**PODCAST, "Episodes": [EPISODE]}), "-f", "atom")
        self.assertSucceeds(result)
        self.assertRegex(result.stdout, rb"\A<\?xml version=[\"']1\.0[\"'] encoding=[\"']UTF-8[\"']\s*\?>\s*\n\Z")

    def test_atom_goes_to_a_file(self):
        source = self.reference(PODCAST)
        self.assertSucceeds(self.run_tool("createfeed", source, "-f", "atom", "-d", "out.xml"), LOADING)
        self.assertEqual(self.path("out.xml").read_bytes(), self.run_tool("createfeed", source, "-f", "atom").stdout)


class OutputTest(ToolTestCase):
    def setUp(self):
        super().setUp()
        self.source = self.reference({**PODCAST, "Episodes": [EPISODE]})

    def feed_on_standard_output(self):
        result = self.run_tool("createfeed", self.source)
        self.assertSucceeds(result)
        return without_publication_date(result.stdout)

    def test_the_feed_ends_with_an_added_line_break(self):
        self.assertRegex(self.feed_on_standard_output(), rb"</rss>\s*\n\Z")

    def test_a_file_holds_what_standard_output_would(self):
        self.assertSucceeds(self.run_tool("createfeed", self.source, "-d", "out.xml"), LOADING)
        self.assertEqual(without_publication_date(self.path("out.xml").read_bytes()), self.feed_on_standard_output())

    def test_a_longer_file_is_replaced(self):
        self.write("out.xml", b"x" * 1_000_000)
        self.assertSucceeds(self.run_tool("createfeed", self.source, "-d", "out.xml"), LOADING)
        self.assertEqual(without_publication_date(self.path("out.xml").read_bytes()), self.feed_on_standard_output())

    def test_a_file_is_written_through_a_link(self):
        self.write("target", b"old")
        self.path("link").symlink_to("target")
        self.assertSucceeds(self.run_tool("createfeed", self.source, "-d", "link"), LOADING)
        self.assertTrue(self.path("link").is_symlink())
        self.assertIn(b"<rss ", self.path("target").read_bytes())

    def test_the_shell_s_append_appends(self):
        self.write("log", b"before\n")
        for _ in range(2):
            with open(self.path("log"), "ab") as log:
                self.assertEqual(self.run_tool("createfeed", self.source, stdout=log).status, 0)
        feed = self.feed_on_standard_output()
        before, *appended = self.path("log").read_bytes().split(b"<?xml")
        self.assertEqual((before, [without_publication_date(b"<?xml" + each) for each in appended]),
                         (b"before\n", [feed, feed]))

    def test_standard_output_that_is_a_file_is_written_where_it_stands(self):
        with open(self.path("log"), "wb") as log:
            log.write(b"before\n")
            log.flush()
            self.assertEqual(self.run_tool("createfeed", self.source, stdout=log).status, 0)
            log.write(b"after\n")
        self.assertEqual(without_publication_date(self.path("log").read_bytes()),
                         b"before\n" + self.feed_on_standard_output() + b"after\n")

    def test_a_socket_receives_the_feed(self):
        ours, theirs = socket.socketpair()
        with ours, theirs:
            process = start("createfeed", self.source, stdout=theirs, stderr=subprocess.PIPE)
            theirs.close()
            with ours.makefile("rb") as stream:
                received = stream.read()
            _, stderr = process.communicate(timeout=30)
        self.assertEqual(checked((), process.returncode, b"", stderr), (0, b"", b""))
        self.assertEqual(without_publication_date(received), self.feed_on_standard_output())

    def test_a_closed_pipe_does_not_matter(self):
        for command in ("createfeed", "parsefeed"):
            with self.subTest(command):
                read_end, write_end = os.pipe()
                os.close(read_end)
                with open(write_end, "wb") as stdout:
                    result = self.run_tool(command, self.source, stdout=stdout)
                self.assertEqual((result.status, result.stderr), (0, b""))

    def test_a_reader_that_leaves_early_does_not_matter(self):
        source = self.reference({"PodcastDescription": "d" * 3_000_000})
        process = start("createfeed", source, stdout=subprocess.PIPE, stderr=subprocess.PIPE)
        process.stdout.read(10)
        process.stdout.close()
        stderr = process.stderr.read()
        process.stderr.close()
        self.assertEqual(checked((), process.wait(timeout=60), b"", stderr), (0, b"", b""))

    def test_a_full_device_does_not_matter(self):
        with open("/dev/full", "wb") as full:
            self.assertEqual(self.run_tool("createfeed", self.source, stdout=full).status, 0)

    def test_no_standard_output_at_all_does_not_matter(self):
        before = self.source.read_bytes()
        self.assertEqual(self.run_tool("createfeed", self.source, closed=(0, 1)).status, 0)
        self.assertEqual(self.source.read_bytes(), before)

    def fifo_reader(self):
        """A process that reads the FIFO to its first end."""
        reader = subprocess.Popen(["cat", self.path("fifo")], stdout=subprocess.PIPE)
        self.addCleanup(lambda: (reader.kill(), reader.wait(), reader.stdout.close()))
        return reader

    def test_a_fifo_receives_the_feed(self):
        os.mkfifo(self.path("fifo"))
        reader = self.fifo_reader()
        held = os.open(self.path("fifo"), os.O_RDWR)  # keeps the reader reading whatever the tool closes
        try:
            self.assertSucceeds(self.run_tool("createfeed", self.source, "-d", "fifo", timeout=30), LOADING)
        finally:
            os.close(held)
        self.assertEqual(without_publication_date(reader.communicate(timeout=30)[0]), self.feed_on_standard_output())

    def test_a_fifo_s_reader_may_leave_at_the_first_end(self):
        os.mkfifo(self.path("fifo"))
        expected = self.feed_on_standard_output()
        processors = os.sched_getaffinity(0)
        self.addCleanup(os.sched_setaffinity, 0, processors)
        os.sched_setaffinity(0, {min(processors)})
        for turn in range(10):  # on one processor a reader that wakes up reads before a nice tool goes on
            with self.subTest(turn):
                reader = self.fifo_reader()
                result = self.run_tool("createfeed", self.source, "-d", "fifo", timeout=10, prefix=("nice", "-n", "19"))
                self.assertSucceeds(result, LOADING)
                self.assertEqual(without_publication_date(reader.communicate(timeout=10)[0]), expected)

    def test_an_output_that_cannot_be_written_is_not_noticed(self):
        self.path("folder").mkdir()
        for output in ("missing/out", "folder", "reference.plist/out", "/dev/full", ""):
            with self.subTest(output):
                self.assertSucceeds(self.run_tool("createfeed", self.source, "-d", output), LOADING)

    def test_a_failed_run_leaves_the_output_alone(self):
        self.write("out.xml", b"old")
        self.assertFails(self.run_tool("createfeed", self.source, "-f", "opml", "-d", "out.xml"),
                         '"opml" is not a recognized feed format.\n', stdout=LOADING)
        self.assertEqual(self.path("out.xml").read_bytes(), b"old")

    def test_a_shell_pipeline_reads_the_feed(self):
        finished = subprocess.run(["/bin/sh", "-c", '"$0" createfeed "$1" | cat', tool(), self.source],
                                  check=True, capture_output=True, env=environment(), timeout=60)
        self.assertEqual(without_publication_date(finished.stdout), self.feed_on_standard_output())


if __name__ == "__main__":
    unittest.main()
