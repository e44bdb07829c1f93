"""A bundle is what people keep when the server is gone: its layout, and every line said while it is made.

Scripts read the lines and other tools read the layout, so both are held to the byte. Property lists are
judged by Python's own module.
"""

import datetime
import os
import plistlib
import pty
import re
import select
import shutil
import subprocess
import termios
import unittest

from bundle_support import BundleTestCase, contents, notices
from support import LOADING, checked, element, item, rss, start


class WholeRunTest(BundleTestCase):
    """Standard output to the last byte."""

    def test_a_local_show(self):
        show = {"PodcastName": "Night Walks", "PodcastPosterReference": self.media("cover.jpg"),
                "Episodes": [{"EpisodeName": "One", "EpisodeReference": self.media("one.mp3")},
                             {"EpisodeName": "Two", "EpisodeReference": self.media("two.mp3"),
                              "EpisodePosterReference": self.media("two.png")}]}
        self.assertSucceeds(self.create(show), LOADING + b"[N] Fetching 2 episodes\n"
                            b"[N] Fetching episode 1...\n[N] Fetched episode 1\n"
                            b"[N] Fetching episode 2...\n[N] Fetched episode 2\n[N] Done!\n")

    def remote_show(self):
        web = self.server()
        return {"PodcastName": "Night Walks", "PodcastPosterReference": web.serve("/cover.jpg", b"cover"),
                "PodcastPosterReferenceType": "remote",
                "Episodes": [{"EpisodeName": "One", "EpisodeReference": web.serve("/one.mp3", bytes(1000)),
                              "EpisodeFileSize": 7},
                             {"EpisodeName": "Two", "EpisodeReference": web.serve("/two.mp3", b"12"),
                              "EpisodePosterReference": web.serve("/two.png", b"poster")},
                             {"EpisodeName": "Three", "EpisodeReference": web.url("/missing.mp3")},
                             {"EpisodeName": "Four", "EpisodeReference": web.serve("/empty.mp3", b"")}]}

    REMOTE_OUTPUT = LOADING + (
        b'[N] Downloading poster for podcast entitled "Night Walks"...\n'
        b"[N] Fetching 4 episodes\n"
        b"[N] Fetching episode 1...\n"
        b'[N] Downloading episode entitled "One" (7 bytes)...\n'
        b"  -- 1000 / 1000 (100.0%)\n"
        b"[N] Fetched episode 1\n"
        b"[N] Fetching episode 2...\n"
        b'[N] Downloading episode entitled "Two" (0 bytes)...\n'
        b"  -- 2 / 2 (100.0%)\n"
        b'[N] Downloading poster for episode entitled "Two"...\n'
        b"[N] Fetched episode 2\n"
        b"[N] Fetching episode 3...\n"
        b'[N] Downloading episode entitled "Three" (0 bytes)...\n'
        b'[W] Could not save or download episode "Three"\n'
        b"[N] Skipping episode 3\n"
        b"[N] Fetching episode 4...\n"
        b'[N] Downloading episode entitled "Four" (0 bytes)...\n'
        b"[N] Fetched episode 4\n"
        b"[N] Done!\n")

    def test_a_remote_show(self):
        self.assertSucceeds(self.create(self.remote_show()), self.REMOTE_OUTPUT)

    def test_a_terminal_gets_the_same_bytes(self):
        source = self.reference(self.remote_show())
        terminal, side = pty.openpty()
        attributes = termios.tcgetattr(side)
        attributes[1] &= ~termios.OPOST  # or every line break would come with a carriage return
        termios.tcsetattr(side, termios.TCSANOW, attributes)
        with start("createbundle", source, "-d", self.bundle, stdout=side, stderr=subprocess.PIPE) as process:
            os.close(side)
            output = b""
            while True:
                try:
                    piece = os.read(terminal, 65536)
                except OSError:  # all of the tool's ends are closed
                    break
                if not piece:
                    break
                output += piece
            os.close(terminal)
            process.communicate(timeout=60)
        self.assertEqual(checked((), process.returncode).status, 0)
        self.assertEqual(output, self.REMOTE_OUTPUT)

    def test_an_empty_show(self):
        self.assertSucceeds(self.create({"PodcastName": "Night Walks"}),
                            LOADING + b"[N] Fetching 0 episodes\n[N] Done!\n")
        self.assertEqual(set(contents(self.bundle)), {"Info.plist", "Posters"})
        self.assertEqual(self.info(), {"PodcastName": "Night Walks"})

    def test_an_empty_list_of_episodes(self):
        self.assertRuns(self.create({"Episodes": []}), "Fetching 0 episodes")
        self.assertEqual(self.info(), {})

    def test_absent_titles(self):
        web = self.server()
        show = {"PodcastPosterReference": web.serve("/cover.jpg", b"cover"), "PodcastPosterReferenceType": "remote",
                "Episodes": [{"EpisodeReference": web.serve("/one.mp3", b""),
                              "EpisodePosterReference": web.serve("/one.jpg", b"")}, {}]}
        self.assertRuns(self.create(show), 'Downloading poster for podcast entitled "(null)"...',
                        "Fetching 2 episodes", "Fetching episode 1...",
                        'Downloading episode entitled "(null)" (0 bytes)...',
                        'Downloading poster for episode entitled "(null)"...', "Fetched episode 1",
                        "Fetching episode 2...", 'W Found an episode ("(null)") without a specified location',
                        "Skipping episode 2")

    def test_percent_signs_in_titles_are_no_format(self):
        url = self.server().serve("/a", b"")
        self.assertRuns(self.create_episodes({"EpisodeName": "100 %@ %lu %n", "EpisodeReference": url}),
                        "Fetching 1 episodes", "Fetching episode 1...",
                        'Downloading episode entitled "100 %@ %lu %n" (0 bytes)...', "Fetched episode 1")


class CounterTest(BundleTestCase):
    """The byte counter is drawn over itself while a download runs."""

    def download_in_pieces(self, length, pieces, title="One", size=None):
        """The process and a function that lets the next piece through and gives the new output."""
        gates = [self.gate() for _ in pieces]

        def answer(exchange):
            exchange.head(200, [("Content-Length", str(length))] if length is not None else [("Connection", "close")])
            for gate, piece in zip(gates, pieces):
                gate.wait()
                exchange.send(piece)
            if length is None:
                exchange.close()

        episode = {"EpisodeReference": self.server().route("/one.mp3", answer), "EpisodeName": title}
        if size is not None:
            episode["EpisodeFileSize"] = size
        source = self.reference({"Episodes": [episode]})
        process = start("createbundle", source, "-d", self.bundle, bufsize=0, stdout=subprocess.PIPE,
                        stderr=subprocess.PIPE)
        self.addCleanup(process.communicate)
        self.addCleanup(process.kill)
        waiting = iter(gates)

        def pass_next(expected):
            next(waiting).open()
            output = b""
            while len(output) < len(expected) and select.select([process.stdout], [], [], 20)[0]:
                piece = process.stdout.read(len(expected) - len(output))
                if not piece:
                    break
                output += piece
            self.assertEqual(output, expected)

        return process, pass_next

    def assertEnds(self, process, rest):
        stdout, stderr = process.communicate(timeout=60)
        self.assertEqual((process.returncode, stdout, stderr), (0, rest, b""))

    HEAD = LOADING + b"[N] Fetching 1 episodes\n[N] Fetching episode 1...\n"

    def test_each_piece_is_shown_when_it_comes(self):
        process, pass_next = self.download_in_pieces(2048, [b"a" * 512, b"b" * 500, b"c" * 1036])
        head = self.HEAD + b'[N] Downloading episode entitled "One" (0 bytes)...\n'
        pass_next(head + b"  -- 512 / 2048 (25.0%)")
        pass_next(b"\b" * 23 + b"  -- 1012 / 2048 (49.4%)")
        pass_next(b"\b" * 24 + b"  -- 2048 / 2048 (100.0%)")
        self.assertEnds(process, b"\n[N] Fetched episode 1\n[N] Done!\n")

    def test_more_bytes_than_known_are_never_more_than_all(self):
        process, pass_next = self.download_in_pieces(None, [b"12", b"345", b"6"], size=4)
        head = self.HEAD + b'[N] Downloading episode entitled "One" (4 bytes)...\n'
        pass_next(head + b"  -- 2 / 4 (50.0%)")
        pass_next(b"\b" * 18 + b"  -- 5 / 4 (100.0%)")
        pass_next(b"\b" * 19 + b"  -- 6 / 4 (100.0%)")
        self.assertEnds(process, b"\n[N] Fetched episode 1\n[N] Done!\n")

    def test_no_counter_without_any_length(self):
        process, pass_next = self.download_in_pieces(None, [b"12", b"345"])
        pass_next(b"")
        pass_next(b"")
        self.assertEnds(process, self.HEAD + b'[N] Downloading episode entitled "One" (0 bytes)...\n'
                                             b"[N] Fetched episode 1\n[N] Done!\n")

    def test_a_broken_download_keeps_its_counter_on_the_screen(self):
        url = self.server().truncated("/one.mp3", b"12345", missing=5)
        self.assertSucceeds(self.create_episodes({"EpisodeReference": url, "EpisodeName": "One"}),
                            self.HEAD + b'[N] Downloading episode entitled "One" (0 bytes)...\n'
                            b"  -- 5 / 10 (50.0%)\n"
                            b'[W] Could not save or download episode "One"\n[N] Skipping episode 1\n[N] Done!\n')

    def test_a_large_file_counts_up_to_its_length(self):
        length = 3_000_000
        url = self.write("large.mp3", bytes(length)).as_uri()
        result = self.create_episodes({"EpisodeReference": url, "EpisodeName": "Large"})
        self.assertRuns(result, "Fetching 1 episodes", "Fetching episode 1...",
                        'Downloading episode entitled "Large" (0 bytes)...', "Fetched episode 1")
        drawn = re.findall(rb"(\x08*)(  -- (\d+) / 3000000 \((\d+\.\d)%\))", result.stdout)
        self.assertGreater(len(drawn), 1)
        counts = [int(count) for _, _, count, _ in drawn]
        self.assertEqual((counts, counts[-1]), (sorted(set(counts)), length))
        widths = [0] + [len(text) for _, text, _, _ in drawn]
        for width, (backspaces, _, count, percentage) in zip(widths, drawn):
            self.assertEqual(len(backspaces), width)
            self.assertEqual(percentage.decode(), f"{int(count) / length * 100:.1f}")


class InfoTest(BundleTestCase):
    def test_every_podcast_key_but_the_reference_is_kept(self):
        described = {f"Podcast{key}": f"the {key}" for key in (
            "UUID", "Name", "Author", "Copyright", "Keywords", "Category", "Description", "AdvisoryLabel")}
        self.create({**described, "PodcastReference": "http://host/", "PodcastReferenceType": "remote",
                     "AllowedEpisodeTypes": ["mp3"], "AllowedPosterTypes": ["jpg"], "Unknown": 1})
        self.assertEqual(self.info(), described)

    def test_every_episode_key_is_kept(self):
        episode = {"EpisodeUUID": "u", "EpisodeName": "n", "EpisodeAuthor": "a",
                   "EpisodeDate": datetime.datetime(2020, 2, 29, 23, 59, 59), "EpisodeKeywords": "k",
                   "EpisodeDescription": "d\n", "EpisodeCategory": "c", "EpisodeAdvisoryLabel": "Clean",
                   "EpisodeOrder": 0, "EpisodeType": "audio/mpeg", "EpisodeFileSize": 2**63}
        self.create_episodes({**episode, "EpisodeReference": self.media("one.mp3"),
                              "EpisodePosterReference": self.media("face.jpg"), "Unknown": 1})
        self.assertEqual(self.info()["Episodes"],
                         [{**episode, "EpisodeReference": "one.mp3", "EpisodeReferenceType": "local",
                           "EpisodePosterReference": "Posters/one.jpg", "EpisodePosterReferenceType": "local"}])

    def test_it_is_an_xml_property_list(self):
        self.create({"PodcastName": "Night Walks"})
        content = (self.bundle / "Info.plist").read_bytes()
        self.assertTrue(content.startswith(b"<?xml"), content[:40])
        self.assertEqual(plistlib.loads(content, fmt=plistlib.FMT_XML), {"PodcastName": "Night Walks"})

    def test_empty_texts_are_kept(self):
        self.create({"PodcastName": "", "Episodes": [{"EpisodeName": "", "EpisodeReference": self.media("a.mp3")}]})
        self.assertEqual(self.info(), {"PodcastName": "", "Episodes": [
            {"EpisodeName": "", "EpisodeReference": "a.mp3", "EpisodeReferenceType": "local"}]})

    def test_texts_of_every_kind_survive(self):
        title = "<Füße> & \"Walks\" ]]> \r\n\t🚶"
        source = self.reference({"PodcastName": title}, fmt=plistlib.FMT_BINARY)  # the XML writer loses a "\r"
        self.assertEqual(self.create(source).status, 0)
        self.assertEqual(self.info(), {"PodcastName": title})

    def test_skipped_episodes_leave_no_entry_and_the_others_keep_their_order(self):
        self.assertWarns(self.create_episodes(self.media("b.mp3"), str(self.path("missing.mp3")), self.media("a.mp3")),
                         'Could not save or download episode "(null)"')
        self.assertEqual(self.references(), ["b.mp3", "a.mp3"])

    def test_without_any_fetched_episode_there_is_no_list(self):
        self.create({"PodcastName": "Night Walks", "Episodes": [{}]})
        self.assertEqual(self.info(), {"PodcastName": "Night Walks"})

    def test_the_podcasts_poster(self):
        self.create({"PodcastPosterReference": self.media("cover.art.PNG", b"cover")})
        self.assertEqual(self.info(), {"PodcastPosterReference": "Posters/Podcast.PNG",
                                       "PodcastPosterReferenceType": "local"})
        self.assertEqual(self.files(), {"Posters/Podcast.PNG": b"cover"})

    def test_no_poster_reference_of_the_source_survives(self):
        missing = "/nowhere/at/all.jpg"
        result = self.create({"PodcastName": "Show", "PodcastPosterReference": missing,
                              "PodcastPosterReferenceType": "local",
                              "Episodes": [{"EpisodeName": "One", "EpisodeReference": self.media("a.mp3"),
                                            "EpisodePosterReference": missing}]})
        self.assertRuns(result, 'W Could not save or download poster image for podcast "Show"',
                        "Fetching 1 episodes", "Fetching episode 1...",
                        'W Could not save or download poster image for episode "One"', "Fetched episode 1")
        self.assertEqual(self.info(), {"PodcastName": "Show", "Episodes": [
            {"EpisodeName": "One", "EpisodeReference": "a.mp3", "EpisodeReferenceType": "local"}]})

    def test_a_poster_type_without_location_is_dropped(self):
        self.create({"PodcastPosterReferenceType": "remote", "Episodes": [
            {"EpisodeReference": self.media("a.mp3"), "EpisodePosterReferenceType": "local"}]})
        self.assertEqual(self.info(), {"Episodes": [{"EpisodeReference": "a.mp3", "EpisodeReferenceType": "local"}]})

    def test_a_feed_becomes_a_bundle(self):
        web = self.server()
        feed = rss(element("title", "Night Walks"), element("orvane:image", href=web.serve("/c.jpg", b"cover")),
                   item(element("title", "One"), element("pubDate", "Tue, 05 Jun 2007 14:30:00 GMT"),
                        element("enclosure", url=web.serve("/one.mp3?id=7", b"12345"), length="99",
                                type="audio/mpeg")))
        self.assertEqual(self.create(web.serve("/feed", feed)).status, 0)
        self.assertEqual(self.info(), {
            "PodcastName": "Night Walks", "PodcastPosterReference": "Posters/Podcast.jpg",
            "PodcastPosterReferenceType": "local",
            "Episodes": [{"EpisodeName": "One", "EpisodeDate": datetime.datetime(2007, 6, 5, 14, 30),
                          "EpisodeType": "audio/mpeg", "EpisodeFileSize": 5, "EpisodeReference": "one.mp3",
                          "EpisodeReferenceType": "local"}]})
        self.assertEqual(self.files(), {"one.mp3": b"12345", "Posters/Podcast.jpg": b"cover"})


class SizeTest(BundleTestCase):
    def size(self, **episode):
        """The file size in the entry of the only episode."""
        self.assertEqual(self.create_episodes({"EpisodeFileSize": 77, **episode}).status, 0)
        return self.info()["Episodes"][0].get("EpisodeFileSize")

    def test_an_announced_length_replaces_the_sources(self):
        self.assertEqual(self.size(EpisodeReference=self.server().serve("/a.mp3", b"12345")), 5)

    def test_a_file_url_announces_its_length(self):
        self.assertEqual(self.size(EpisodeReference=self.write("a.mp3", b"12345").as_uri()), 5)

    def test_an_unknown_length_leaves_the_sources(self):
        self.assertEqual(self.size(EpisodeReference=self.server().until_closed("/a.mp3", b"12345")), 77)
        self.assertEqual(self.size(EpisodeReference=self.server().chunked("/a.mp3", [b"12345"])), 77)

    def test_an_announced_length_of_nothing_is_unknown(self):
        self.assertIsNone(self.size(EpisodeReference=self.server().serve("/a.mp3", b"")))

    def test_a_local_copy_leaves_the_sources(self):
        self.assertEqual(self.size(EpisodeReference=self.media("a.mp3", b"12345")), 77)

    def test_a_posters_announced_length_replaces_it_again(self):
        web = self.server()
        self.assertEqual(self.size(EpisodeReference=web.serve("/a.mp3", b"12345"),
                                   EpisodePosterReference=web.serve("/a.jpg", b"123")), 3)

    def test_a_posters_length_replaces_that_of_a_local_episode(self):
        self.assertEqual(self.size(EpisodeReference=self.media("a.mp3"),
                                   EpisodePosterReference=self.server().serve("/a.jpg", b"123")), 3)

    def test_a_poster_without_length_replaces_nothing(self):
        web = self.server()
        self.assertEqual(self.size(EpisodeReference=web.serve("/a.mp3", b"12345"),
                                   EpisodePosterReference=web.chunked("/a.jpg", [b"123"])), 5)

    def test_a_local_poster_replaces_nothing(self):
        self.assertEqual(self.size(EpisodeReference=self.server().serve("/a.mp3", b"12345"),
                                   EpisodePosterReference=self.media("a.jpg", b"123")), 5)

    def test_the_page_of_a_missing_poster_replaces_nothing(self):
        web = self.server()
        self.assertEqual(self.size(EpisodeReference=web.serve("/a.mp3", b"12345"),
                                   EpisodePosterReference=web.url("/missing.jpg")), 5)

    def test_a_redirects_page_replaces_nothing(self):
        web = self.server()
        web.chunked("/last", [b"12345"])
        self.assertEqual(self.size(EpisodeReference=web.redirect("/a.mp3", "/last")), 77)

    def test_the_podcasts_poster_replaces_nothing(self):
        web = self.server()
        self.create({"PodcastPosterReference": web.serve("/c.jpg", b"123"), "PodcastPosterReferenceType": "remote",
                     "Episodes": [{"EpisodeReference": self.media("a.mp3"), "EpisodeFileSize": 77}]})
        self.assertEqual(self.info()["Episodes"][0]["EpisodeFileSize"], 77)


class AllowedTypesTest(BundleTestCase):
    def test_other_media_are_skipped(self):
        show = {"AllowedEpisodeTypes": ["mp3", "m4a"], "Episodes": [
            {"EpisodeName": name, "EpisodeReference": self.media(name)} for name in ("a.mp3", "b.ogg", "c.M4A", "d")]}
        self.assertRuns(self.create(show), "Fetching 4 episodes", "Fetching episode 1...", "Fetched episode 1",
                        "Fetching episode 2...", 'W Invalid file type "ogg" for episode "b.ogg"', "Skipping episode 2",
                        "Fetching episode 3...", "Fetched episode 3",
                        "Fetching episode 4...", 'W Invalid file type "" for episode "d"', "Skipping episode 4")
        self.assertEqual(set(self.files()), {"a.mp3", "c.M4A"})

    def test_a_skipped_type_is_shown_as_it_stands_and_not_fetched(self):
        web = self.server()
        web.serve("/a.OGG", b"media")
        self.assertWarns(self.create({"AllowedEpisodeTypes": ["mp3"], "Episodes": [
            {"EpisodeName": "A", "EpisodeReference": web.url("/a.OGG?type=.mp3")}]}),
            'Invalid file type "OGG" for episode "A"')
        self.assertEqual(web.requests, [])

    def test_a_skipped_type_keeps_its_name(self):
        self.create({"AllowedEpisodeTypes": ["mp3"], "Episodes": [
            {"EpisodeReference": self.media(name)} for name in ("a.ogg", "a.mp3")]})
        self.assertEqual(self.references(), ["a-2.mp3"])

    def test_the_list_itself_is_not_lowercased(self):
        self.assertWarns(self.create({"AllowedEpisodeTypes": ["MP3"], "Episodes": [
            {"EpisodeName": "A", "EpisodeReference": self.media("a.MP3")}]}), 'Invalid file type "MP3" for episode "A"')

    def test_an_empty_list_allows_nothing(self):
        self.assertWarns(self.create({"AllowedEpisodeTypes": [], "AllowedPosterTypes": [], "PodcastName": "Show",
                                      "PodcastPosterReference": self.media("c.jpg"),
                                      "Episodes": [{"EpisodeReference": self.media("a.mp3")}]}),
                         'Unsupported poster image type "jpg" for podcast "Show"',
                         'Invalid file type "mp3" for episode "(null)"')
        self.assertEqual(self.files(), {})

    def test_an_empty_text_allows_media_without_extension(self):
        self.assertWarns(self.create({"AllowedEpisodeTypes": [""], "Episodes": [
            {"EpisodeReference": self.media("a")}]}))
        self.assertEqual(self.references(), ["a."])

    def test_other_posters_are_left_out(self):
        show = {"AllowedPosterTypes": ["png"], "PodcastName": "Show", "PodcastPosterReference": self.media("c.JPG"),
                "Episodes": [{"EpisodeName": "One", "EpisodeReference": self.media("a.mp3"),
                              "EpisodePosterReference": self.media("a.Gif")},
                             {"EpisodeName": "Two", "EpisodeReference": self.media("b.mp3"),
                              "EpisodePosterReference": self.media("b.PNG")}]}
        self.assertRuns(self.create(show), 'W Unsupported poster image type "JPG" for podcast "Show"',
                        "Fetching 2 episodes", "Fetching episode 1...",
                        'W Unsupported poster image type "Gif" for episode "One"', "Fetched episode 1",
                        "Fetching episode 2...", "Fetched episode 2")
        self.assertEqual(set(self.files()), {"a.mp3", "b.mp3", "Posters/b.PNG"})
        self.assertEqual(self.info(), {"PodcastName": "Show", "Episodes": [
            {"EpisodeName": "One", "EpisodeReference": "a.mp3", "EpisodeReferenceType": "local"},
            {"EpisodeName": "Two", "EpisodeReference": "b.mp3", "EpisodeReferenceType": "local",
             "EpisodePosterReference": "Posters/b.PNG", "EpisodePosterReferenceType": "local"}]})

    def test_a_remote_poster_in_capitals_is_allowed(self):
        self.assertWarns(self.create({"AllowedPosterTypes": ["png"], "PodcastPosterReferenceType": "remote",
                                      "PodcastPosterReference": self.server().serve("/c.PNG", b"cover")}))
        self.assertEqual(self.files(), {"Posters/Podcast.PNG": b"cover"})


class FailureTest(BundleTestCase):
    """What stops a run, and what is only warned about."""

    def assertNotCreated(self, path, reason, **options):
        result = self.run_tool("createbundle", self.reference({}), "-d", path, **options)
        self.assertFails(result, f"Could not generate bundle: Could not create bundle: {reason}\n", stdout=LOADING)

    def test_a_file_in_the_bundles_place(self):
        path = self.write("taken", b"mine")
        self.assertNotCreated(path, "File exists")
        self.assertEqual(path.read_bytes(), b"mine")

    def test_a_file_in_a_parents_place(self):
        self.assertNotCreated(self.write("taken", b"mine") / "show.podcast", "Not a directory")

    def test_an_empty_output_path(self):
        self.assertNotCreated("", "No such file or directory")

    def test_a_name_that_is_too_long(self):
        self.assertNotCreated("n" * 256, "File name too long")

    def test_a_directory_in_the_reference_files_place(self):
        (self.bundle / "Info.plist").mkdir(parents=True)
        result = self.create_episodes(self.media("a.mp3"))
        self.assertFails(result, "Could not generate bundle: Could not write Info.plist file\n",
                         stdout=notices("Fetching 1 episodes", "Fetching episode 1...", "Fetched episode 1"))
        self.assertEqual(contents(self.bundle), {"Info.plist": None, "Posters": None, "a.mp3": b"media"})

    def test_a_file_in_the_posters_place(self):
        self.bundle.mkdir()
        (self.bundle / "Posters").write_bytes(b"mine")
        web = self.server()
        show = {"PodcastName": "Show", "PodcastPosterReference": self.media("c.jpg"),
                "Episodes": [{"EpisodeName": "One", "EpisodeReference": self.media("a.mp3"),
                              "EpisodePosterReference": web.serve("/a.jpg", b"poster")}]}
        self.assertRuns(self.create(show), 'W Could not save or download poster image for podcast "Show"',
                        "Fetching 1 episodes", "Fetching episode 1...",
                        'Downloading poster for episode entitled "One"...',
                        'W Could not save or download poster image for episode "One"', "Fetched episode 1")
        self.assertEqual(self.files(), {"Posters": b"mine", "a.mp3": b"media"})
        self.assertEqual(self.references(), ["a.mp3"])

    def test_an_episode_without_location_reserves_no_name(self):
        self.assertRuns(self.create_episodes({"EpisodeName": "Lost"}, self.media("(null).mp3")),
                        "Fetching 2 episodes", "Fetching episode 1...",
                        'W Found an episode ("Lost") without a specified location', "Skipping episode 1",
                        "Fetching episode 2...", "Fetched episode 2")
        self.assertEqual(self.references(), ["(null).mp3"])

    def test_a_location_that_is_no_url(self):
        self.assertRuns(self.create_episodes({"EpisodeName": "Bad", "EpisodeReference": "http://host/a b.mp3"},
                                             self.media("a b.mp3")),
                        "Fetching 2 episodes", "Fetching episode 1...",
                        'W Could not generate sane path for episode "Bad"', "Skipping episode 1",
                        "Fetching episode 2...", "Fetched episode 2")
        self.assertEqual(self.references(), ["a b.mp3"])

    def test_posters_that_are_no_urls(self):
        self.assertWarns(self.create({"PodcastName": "Show", "PodcastPosterReference": "http://[/c.jpg",
                                      "PodcastPosterReferenceType": "remote",
                                      "Episodes": [{"EpisodeName": "One", "EpisodeReference": self.media("a.mp3"),
                                                    "EpisodePosterReference": "http:///a.jpg"}]}),
                         'Could not generate sane path for poster image for podcast "Show"',
                         'Could not generate sane path for poster image for episode "One"')
        self.assertEqual(self.files(), {"a.mp3": b"media"})

    def test_a_type_other_than_remote_means_a_copy(self):
        url = self.server().serve("/a.mp3", b"media")
        for kind in ("local", "Remote", "REMOTE", ""):
            with self.subTest(kind):
                self.assertRuns(self.create_episodes({"EpisodeReference": url, "EpisodeReferenceType": kind}),
                                "Fetching 1 episodes", "Fetching episode 1...",
                                'W Could not save or download episode "(null)"', "Skipping episode 1")

    def test_a_remote_path_is_no_url(self):
        self.assertWarns(self.create_episodes({"EpisodeReference": self.media("a.mp3"),
                                               "EpisodeReferenceType": "remote"}),
                         'Could not generate sane path for episode "(null)"')

    def test_a_podcast_poster_without_type_is_copied(self):
        self.assertWarns(self.create({"PodcastPosterReference": self.server().serve("/c.jpg", b"cover")}),
                         'Could not save or download poster image for podcast "(null)"')


class OutputPathTest(BundleTestCase):
    def create_at(self, path, **options):
        self.assertEqual(self.run_tool("createbundle", self.reference({"PodcastName": "Night Walks"}), "-d", path,
                                       **options).status, 0)

    def test_the_path_is_taken_as_given_whatever_its_extension(self):
        for path in ("plain", "show.podcast", "show.PODCAST", "show.txt", "trailing/", "a b", "füße 🚶", ".hidden"):
            with self.subTest(path):
                before = set(os.listdir(self.directory)) | {"reference.plist"}
                self.create_at(path)
                self.assertEqual(set(os.listdir(self.directory)) - before, {path.rstrip("/")})
                self.assertEqual(set(os.listdir(self.path(path))), {"Info.plist", "Posters"})

    def test_missing_parents_are_created(self):
        self.create_at("one/two/three/show.podcast")
        self.assertEqual(self.info(self.path("one/two/three/show.podcast")), {"PodcastName": "Night Walks"})

    def test_the_working_directory(self):
        self.path("here").mkdir()
        self.create_at(".", cwd=self.path("here"))
        self.assertEqual(set(os.listdir(self.path("here"))), {"Info.plist", "Posters"})

    def test_a_relative_path_belongs_to_the_working_directory(self):
        self.path("one").mkdir()
        self.create_at("../two", cwd=self.path("one"))
        self.assertEqual(set(os.listdir(self.path("two"))), {"Info.plist", "Posters"})

    def test_a_link_to_a_directory_is_filled(self):
        self.path("target").mkdir()
        self.path("link").symlink_to("target")
        self.create_at("link")
        self.assertEqual(set(os.listdir(self.path("target"))), {"Info.plist", "Posters"})

    def test_a_tilde_is_a_name(self):
        self.create_at("~", env={"HOME": str(self.path("home"))})
        self.assertTrue((self.directory / "~" / "Info.plist").exists())

    def test_a_path_that_is_no_utf_8(self):
        self.create_at(b"\xff\xfe")
        self.assertEqual(set(os.listdir(bytes(self.directory) + b"/\xff\xfe")), {b"Info.plist", b"Posters"})

    def test_without_a_path_the_temporary_directory_itself_is_filled(self):
        for arguments in ((), ("-d",)):
            with self.subTest(arguments):
                temporary = self.path(f"temporary{len(arguments)}")
                temporary.mkdir()
                (temporary / "other").write_bytes(b"mine")
                result = self.run_tool("createbundle", self.reference({"PodcastName": "Night Walks"}), *arguments,
                                       env={"TMPDIR": str(temporary)})
                self.assertSucceeds(result, notices("Fetching 0 episodes", "Done!"))
                self.assertEqual(set(contents(temporary)), {"Info.plist", "Posters", "other"})

    def test_files_may_be_read_by_whom_the_user_lets(self):
        web = self.server()
        for mask, mode in ((0o022, 0o644), (0o077, 0o600)):
            with self.subTest(mode=oct(mode)):
                shutil.rmtree(self.bundle, ignore_errors=True)
                os.chmod(self.media("b.mp3"), 0o644)
                self.assertWarns(self.create_episodes(web.serve("/a.mp3", b"media"), self.media("b.mp3"),
                                                      preexec_fn=lambda mask=mask: os.umask(mask)))
                self.assertEqual({name: (self.bundle / name).stat().st_mode & 0o777
                                  for name in ("Info.plist", "a.mp3", "b.mp3")},
                                 {"Info.plist": mode, "a.mp3": mode, "b.mp3": mode})

    def test_relative_locations_belong_to_the_working_directory(self):
        self.media("a.mp3")
        self.path("elsewhere").mkdir()
        self.assertWarns(self.create_episodes("../media/a.mp3", cwd=self.path("elsewhere")))
        self.assertEqual(self.files(), {"a.mp3": b"media"})

    def test_a_local_tilde_is_a_name(self):
        (self.path("~")).mkdir()
        self.write("~/a.mp3", b"here")
        self.assertWarns(self.create_episodes("~/a.mp3", env={"HOME": "/nowhere"}))
        self.assertEqual(self.files(), {"a.mp3": b"here"})


class SecondRunTest(BundleTestCase):
    """A bundle may be made again in the same place."""

    def test_downloads_are_replaced(self):
        web = self.server()
        show = {"PodcastPosterReference": web.serve("/c.jpg", b"old cover"), "PodcastPosterReferenceType": "remote",
                "Episodes": [{"EpisodeReference": web.serve("/a.mp3", b"old media"),
                              "EpisodePosterReference": web.serve("/a.jpg", b"old poster")}]}
        self.assertWarns(self.create(show))
        web.serve("/c.jpg", b"new")
        web.serve("/a.mp3", b"new and longer media")
        web.serve("/a.jpg", b"newer")
        self.assertWarns(self.create(show))
        self.assertEqual(self.files(), {"a.mp3": b"new and longer media", "Posters/Podcast.jpg": b"new",
                                        "Posters/a.jpg": b"newer"})

    def test_copies_refuse_what_is_there(self):
        show = {"PodcastPosterReference": self.media("c.jpg"), "Episodes": [{"EpisodeReference": self.media("a.mp3")}]}
        self.assertWarns(self.create(show))
        self.media("a.mp3", b"new media")
        self.assertWarns(self.create(show), 'Could not save or download poster image for podcast "(null)"',
                         'Could not save or download episode "(null)"')
        self.assertEqual(self.files(), {"a.mp3": b"media", "Posters/Podcast.jpg": b"media"})
        self.assertEqual(self.info(), {})

    def test_what_is_no_longer_part_of_the_show_stays(self):
        self.create({"PodcastName": "Old", "Episodes": [{"EpisodeReference": self.media("old.mp3")}]})
        (self.bundle / "notes.txt").write_bytes(b"mine")
        (self.bundle / ".hidden").write_bytes(b"mine too")
        self.create({"PodcastName": "New", "Episodes": [{"EpisodeReference": self.media("new.mp3")}]})
        self.assertEqual(self.info()["PodcastName"], "New")
        self.assertEqual(self.references(), ["new.mp3"])
        self.assertEqual(set(self.files()), {"old.mp3", "new.mp3", "notes.txt", ".hidden"})

    def test_files_on_disk_do_not_number_names(self):
        web = self.server()
        show = {"Episodes": [{"EpisodeReference": web.serve(path, b"x")} for path in ("/1/a.mp3", "/2/a.mp3")]}
        for _ in range(2):
            self.assertWarns(self.create(show))
            self.assertEqual(self.references(), ["a.mp3", "a-2.mp3"])
        self.assertEqual(set(self.files()), {"a.mp3", "a-2.mp3"})

    def test_a_failed_download_leaves_the_file_of_the_first_run(self):
        web = self.server()
        show = {"Episodes": [{"EpisodeReference": web.serve("/a.mp3", b"old media")}]}
        self.create(show)
        web.truncated("/a.mp3", b"new", missing=4)
        self.assertWarns(self.create(show), 'Could not save or download episode "(null)"')
        self.assertEqual(self.files(), {"a.mp3": b"old media"})
        self.assertEqual(self.info(), {})

    def test_a_failed_load_touches_nothing(self):
        self.create({"PodcastName": "Old"})
        before = contents(self.bundle)
        self.assertFails(self.create(self.feed(b"<feed/>")), "Could not load source: The feed was neither RSS nor Atom",
                         stdout=LOADING)
        self.assertEqual(contents(self.bundle), before)

    def test_the_source_may_be_replaced_by_its_own_reference_file(self):
        self.bundle.mkdir()
        source = self.reference({"PodcastName": "Show", "Episodes": [{"EpisodeReference": self.media("a.mp3")}]},
                                name="show.podcast/Info.plist")
        self.assertWarns(self.create(source))
        self.assertEqual(self.info(), {"PodcastName": "Show", "Episodes": [
            {"EpisodeReference": "a.mp3", "EpisodeReferenceType": "local"}]})


class ScaleTest(BundleTestCase):
    def test_thousands_of_episodes_of_one_name(self):
        count = 20_000
        episode = {"EpisodeReference": str(self.path("missing.mp3"))}
        result = self.create({"Episodes": [episode] * count + [{"EpisodeReference": self.media("missing.mp3")}]},
                             timeout=60)
        self.assertEqual((result.status, result.stdout.count(b"[W] ")), (0, count))
        self.assertEqual(self.references(), [f"missing-{count + 1}.mp3"])

    def test_a_text_as_long_as_a_book(self):
        text = "Night & Walks 🚶 " * 200_000
        self.create({"PodcastDescription": text}, timeout=60)
        self.assertEqual(self.info(), {"PodcastDescription": text})


if __name__ == "__main__":
    unittest.main()
