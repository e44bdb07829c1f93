"""A show that is kept: what is new comes, what is there stays, and what the source says is brought up to date."""

import os
import plistlib
import unittest

from bundle_support import contents
from keep_support import KeepTestCase
from support import element, item, rss


class KeepTest(KeepTestCase):
    def test_new_episodes_are_fetched_and_known_ones_are_not(self):
        self.publish(self.episode(2), self.episode(1))
        result = self.keep()
        self.assertKept(result, "2 new, 0 known, 0 failed")
        self.assertEqual(sorted(result.stdout.decode().splitlines()[:2]),
                         ['fetched "Episode 1": 1.mp3 (7 B)', 'fetched "Episode 2": 2.mp3 (7 B)'])
        self.publish(self.episode(3), self.episode(2), self.episode(1))
        self.assertKept(self.keep(source=None), "1 new, 2 known, 0 failed")
        self.media(3, 2, 1)
        self.assertEqual([self.web.hits(f"/{number}.mp3") for number in (1, 2, 3)], [1, 1, 1])
        self.assertNothingHidden()

    def test_a_run_without_news_writes_nothing(self):
        self.publish(self.episode(1))
        self.keep()
        before = (self.bundle / "Info.plist").stat()
        self.assertKept(self.keep(), "0 new, 1 known, 0 failed")
        after = (self.bundle / "Info.plist").stat()
        self.assertEqual((after.st_ino, after.st_mtime_ns), (before.st_ino, before.st_mtime_ns))

    def test_the_bundle_is_one_that_the_tool_reads(self):
        self.publish(self.episode(1, element("description", "Said")))
        self.keep()
        channel = self.createfeed(self.bundle).find("channel")
        self.assertEqual(channel.findtext("title"), "Show")
        self.assertEqual(channel.find("item/enclosure").get("url"), (self.bundle / "1.mp3").as_uri())
        self.assertEqual(channel.find("item/enclosure").get("length"), "7")

    def test_what_the_source_says_is_brought_up_to_date(self):
        self.publish(self.episode(1, element("description", "Old"), element("dc:creator", "Kept")))
        self.keep()
        self.publish(self.episode(1, element("description", "New"), title="Renamed"))
        self.assertKept(self.keep(), "0 new, 1 known, 0 failed")
        entry = self.info()["Episodes"][0]
        self.assertEqual((entry["EpisodeName"], entry["EpisodeDescription"], entry["EpisodeAuthor"]),
                         ("Renamed", "New", "Kept"))

    def test_what_is_gone_from_the_source_stays_behind_the_others(self):
        self.publish(self.episode(3), self.episode(2), self.episode(1))
        self.keep()
        self.publish(self.episode(4), self.episode(2))
        self.assertKept(self.keep(), "1 new, 1 known, 0 failed")
        self.media(4, 2, 3, 1)

    def test_keys_of_others_stay(self):
        self.publish(self.episode(1))
        self.keep()
        info = self.info()
        info["Mine"] = "root"
        info["Episodes"][0]["Mine"] = "entry"
        (self.bundle / "Info.plist").write_bytes(plistlib.dumps(info, fmt=plistlib.FMT_BINARY))
        self.publish(self.episode(1), self.episode(0))
        self.keep()
        self.assertEqual((self.info()["Mine"], self.listed("Mine")), ("root", ["entry", None]))

    def test_a_listed_file_that_is_gone_is_fetched_again(self):
        self.publish(self.episode(2), self.episode(1))
        self.keep()
        (self.bundle / "1.mp3").unlink()
        (self.bundle / "2.mp3").write_bytes(b"")
        self.assertKept(self.keep("--latest", "1"), "2 new, 0 known, 0 failed")
        self.media(2, 1)
        self.assertEqual(self.listed("EpisodeReference"), ["2-2.mp3", "1.mp3"])

    def test_a_file_that_cannot_be_fetched_again_stays_listed(self):
        poster = self.web.serve("/1.png", b"poster")
        part = element("orvane:image", href=poster)
        self.publish(self.episode(1, part))
        self.keep()
        info = self.info()
        info["Episodes"][0]["Mine"] = "entry"
        (self.bundle / "Info.plist").write_bytes(plistlib.dumps(info))
        (self.bundle / "1.mp3").unlink()
        self.web.serve("/1.mp3", b"", 404)
        item = self.episode(1, part, url=self.web.url("/1.mp3"))
        self.publish(item)
        self.assertKept(self.keep(), "0 new, 0 known, 1 failed", 1,
                        f'qel-keep: "Episode 1": {self.web.url("/1.mp3")}: HTTP status 404\n')
        self.assertEqual(self.info(), info)
        self.web.serve("/1.mp3", b"media 1")
        self.assertKept(self.keep(), "1 new, 0 known, 0 failed")
        self.media(1)
        self.assertEqual((self.listed("Mine"), self.web.hits("/1.png")), (["entry"], 1))

    def test_a_file_that_nobody_has_any_more_is_told(self):
        self.publish(self.episode(1))
        self.keep()
        (self.bundle / "1.mp3").unlink()
        self.publish(self.episode(2))
        self.assertKept(self.keep(), "1 new, 0 known, 0 failed", 1,
                        'qel-keep: "Episode 1": its file is gone, and the source does not have it any more; '
                        'put it back, or take its entry out of Info.plist\n')
        self.assertEqual(self.listed(), ["Episode 2", "Episode 1"])

    def test_another_file_of_one_url_is_another_episode(self):
        url = self.web.serve("/latest.mp3", b"media 1")
        self.publish(self.episode(1, url=url))
        self.keep()
        self.web.serve("/latest.mp3", b"media 2")
        self.publish(self.episode(2, url=url))
        self.assertKept(self.keep(), "1 new, 0 known, 0 failed")
        self.media(2, 1)
        self.assertEqual(self.listed("EpisodeReference"), ["latest-2.mp3", "latest.mp3"])

    def test_a_bundle_of_the_tool_is_gone_on_with(self):
        poster = self.web.serve("/show.png", b"poster")
        self.publish(self.episode(2), self.episode(1), channel=[element("orvane:image", href=poster)])
        self.assertEqual(self.run_tool("createbundle", self.feed_url, "-d", self.bundle).status, 0)
        hits = len(self.web.requests)
        self.assertKept(self.keep(), "0 new, 2 known, 0 failed")
        self.assertEqual(len(self.web.requests), hits + 1)  # the feed
        self.assertEqual(self.listed("EpisodeOrigin"), [self.web.url("/2.mp3"), self.web.url("/1.mp3")])
        self.assertEqual(self.info()["PodcastOrigin"], self.feed_url)
        self.assertEqual(self.info()["PodcastPosterOrigin"], poster)

    def test_nothing_that_lies_there_is_touched(self):
        self.bundle.mkdir()
        (self.bundle / "Posters").mkdir()
        mine = {"1.mp3": b"mine", "notes.txt": b"mine", "Posters/1.png": b"mine"}
        for name, content in mine.items():
            (self.bundle / name).write_bytes(content)
        poster = self.web.serve("/poster.png", b"poster")
        self.publish(self.episode(1, element("orvane:image", href=poster)))
        self.assertKept(self.keep(), "1 new, 0 known, 0 failed")
        found = contents(self.bundle)
        self.assertEqual({name: found[name] for name in mine}, mine)
        self.media(1)
        self.assertEqual(self.listed("EpisodeReference"), ["1-2.mp3"])
        self.assertEqual(self.listed("EpisodePosterReference"), ["Posters/1-2.png"])

    def test_failures_are_told_with_title_url_and_cause(self):
        missing = self.web.url("/missing.mp3")
        self.publish(self.episode(2, url=missing), self.episode(1), self.episode(3, body=b""),
                     self.episode(4, url="http://127.0.0.1:1/a b.mp3"))
        self.assertKept(self.keep(), "1 new, 0 known, 3 failed", 1,
                        f'qel-keep: "Episode 2": {missing}: HTTP status 404\n'
                        f'qel-keep: "Episode 3": {self.web.url("/3.mp3")}: The file is empty\n'
                        'qel-keep: "Episode 4": http://127.0.0.1:1/a b.mp3: It is no valid URL\n')
        self.media(1)
        self.assertEqual(sorted(contents(self.bundle)), ["1.mp3", "Info.plist", "Posters"])
        self.web.serve("/missing.mp3", b"media 2")
        self.publish(self.episode(2, url=missing), self.episode(1))
        self.assertKept(self.keep(), "1 new, 1 known, 0 failed")
        self.media(2, 1)

    def test_an_item_without_media_is_no_failure(self):
        self.publish(self.episode(1), item(element("title", "News")))
        self.assertKept(self.keep(), "1 new, 0 known, 0 failed, 1 without media")
        self.media(1)

    def test_posters_are_fetched_once_and_again_when_they_change(self):
        show = self.web.serve("/show.png", b"show")
        other = self.web.serve("/other.png", b"other")
        channel = [element("orvane:image", href=show)]
        self.publish(self.episode(2, element("orvane:image", href=show)), self.episode(1), channel=channel)
        self.assertKept(self.keep(), "2 new, 0 known, 0 failed")
        self.assertEqual(self.web.hits("/show.png"), 1)
        self.assertEqual(self.info()["PodcastPosterReference"], "Posters/Podcast.png")
        self.assertEqual(self.listed("EpisodePosterReference"), ["Posters/Podcast.png", None])
        self.publish(self.episode(2, element("orvane:image", href=other)), self.episode(1), channel=channel)
        self.assertKept(self.keep(), "0 new, 2 known, 0 failed")
        self.assertEqual(self.listed("EpisodePosterReference"), ["Posters/2.png", None])
        self.assertEqual(self.listed("EpisodePosterOrigin"), [other, None])
        self.assertEqual((self.bundle / "Posters" / "2.png").read_bytes(), b"other")
        self.keep()
        self.assertEqual((self.web.hits("/show.png"), self.web.hits("/other.png")), (1, 1))

    def test_a_poster_that_fails_leaves_the_old_one(self):
        show = self.web.serve("/show.png", b"show")
        self.publish(self.episode(1), channel=[element("orvane:image", href=show)])
        self.keep()
        gone = self.web.url("/gone.png")
        self.publish(self.episode(1), channel=[element("orvane:image", href=gone)])
        self.assertKept(self.keep(), "0 new, 1 known, 1 failed", 1,
                        f'qel-keep: poster of "Show": {gone}: HTTP status 404\n')
        self.assertEqual((self.info()["PodcastPosterReference"], self.info()["PodcastPosterOrigin"]),
                         ("Posters/Podcast.png", show))

    def test_the_poster_of_an_episode_comes_with_it_and_not_alone(self):
        parts = [element("orvane:image", href=self.web.serve("/1.png", b"poster"))]
        missing = self.episode(1, *parts, url=self.web.url("/missing.mp3"))
        for number in (2, 3):  # that Info.plist is written each time
            self.publish(missing, self.episode(number))
            self.assertEqual(self.keep().status, 1)
        self.assertEqual((list((self.bundle / "Posters").iterdir()), self.web.hits("/1.png")), ([], 0))
        self.publish(missing, self.episode(4, *parts))
        self.assertEqual(self.keep().status, 1)
        self.publish(self.episode(1, *parts), self.episode(4, *parts))
        self.assertKept(self.keep(), "1 new, 1 known, 0 failed")
        self.assertEqual(self.listed("EpisodePosterReference"), ["Posters/missing.png"] * 2 + [None] * 2)
        self.assertEqual(self.web.hits("/1.png"), 1)
        self.assertNothingHidden()

    def test_paths_that_are_no_text_are_known_again(self):
        folder = os.fsencode(self.directory) + b"/\xE9"
        os.mkdir(folder)
        for name, content in [(b"1.mp3", b"media 1"), (b"1.png", b"poster"), (b"show.plist", plistlib.dumps(
                {"Episodes": [{"EpisodeName": "Episode 1", "EpisodeReference": "1.mp3",
                               "EpisodePosterReference": "1.png"}]}))]:
            with open(folder + b"/" + name, "wb") as file:
                file.write(content)
        source = os.fsdecode(folder + b"/show.plist")
        self.assertKept(self.keep(source=source), "1 new, 0 known, 0 failed")
        before = contents(self.bundle)
        self.assertKept(self.keep(source=source), "0 new, 1 known, 0 failed")
        self.assertEqual(contents(self.bundle), before)

    def test_local_files_are_kept_from_a_local_source(self):
        media = self.write("one.mp3", b"media 1")
        media.chmod(0o600)
        source = self.reference({"PodcastName": "Mine", "Episodes": [
            {"EpisodeName": "Episode 1", "EpisodeReference": str(media)},
            {"EpisodeName": "Episode 2", "EpisodeReference": self.write("two.mp3", b"media 2").as_uri()}]})
        self.assertKept(self.keep(source=source.name), "2 new, 0 known, 0 failed")
        self.media(1, 2)
        self.assertEqual(self.info()["PodcastOrigin"], str(source))
        self.assertEqual((self.bundle / "one.mp3").stat().st_mode & 0o777, 0o600)
        self.assertKept(self.keep(source=None), "0 new, 2 known, 0 failed")

    def test_relative_paths_of_a_reference_file_begin_in_its_directory(self):
        folder = self.path("folder")
        folder.mkdir()
        for name, content in [("1.mp3", b"media 1"), ("1.png", b"poster")]:
            (folder / name).write_bytes(content)
        (folder / "show.plist").write_bytes(plistlib.dumps({"PodcastName": "Mine", "Episodes": [
            {"EpisodeName": "Episode 1", "EpisodeReference": "1.mp3", "EpisodePosterReference": "1.png"}]}))
        self.assertKept(self.keep(source="folder/show.plist"), "1 new, 0 known, 0 failed")
        self.media(1)
        self.assertEqual(self.listed("EpisodePosterReference"), ["Posters/1.png"])
        self.assertKept(self.keep(source=None), "0 new, 1 known, 0 failed")

    def test_a_way_out_of_a_link_leads_to_where_the_link_is_not(self):
        for folder in (self.directory, self.path("away")):
            (folder / "show").mkdir(parents=True)
            (folder / "1.mp3").write_bytes(b"media 1" if folder.name == "away" else b"another")
        (self.path("away") / "feed.plist").write_bytes(plistlib.dumps({"Episodes": [
            {"EpisodeName": "Episode 1", "EpisodeReference": "1.mp3"}]}))
        self.path("link").symlink_to("away/show")
        self.assertKept(self.keep(source="link/../feed.plist"), "1 new, 0 known, 0 failed")
        self.media(1)
        self.assertTrue(os.path.samefile(self.info()["PodcastOrigin"], self.path("away") / "feed.plist"))
        self.assertKept(self.keep(source=None), "0 new, 1 known, 0 failed")

    def test_a_source_is_remembered_by_the_name_of_a_link(self):
        for day in ("monday", "tuesday"):
            self.path(day).mkdir()
            source = self.reference({"Episodes": [{"EpisodeName": f"Episode {day}", "EpisodeReference":
                                                   self.web.serve(f"/{day}.mp3", b"media")}]})
            source.rename(self.path(day) / "feed.plist")
            self.path("current").unlink(missing_ok=True)
            self.path("current").symlink_to(day)
            result = self.keep(source="current/feed.plist" if day == "monday" else None)
        self.assertKept(result, "1 new, 0 known, 0 failed")
        self.assertEqual(self.info()["PodcastOrigin"], str(self.path("current") / "feed.plist"))

    def test_the_case_of_uuids_does_not_matter(self):
        for case in (str.upper, str.lower):
            source = self.reference({"Episodes": [{
                "EpisodeName": case("one"), "EpisodeReference": self.web.serve(f"/{case('a')}.mp3", b"media"),
                "EpisodeUUID": case("6d0f3c3e-0f5c-4f0a-9a3b-0c6a4a1f2b7d")}]})
            result = self.keep(source=source)
        self.assertKept(result, "0 new, 1 known, 0 failed")

    def test_a_bundle_is_kept_in_another(self):
        poster = self.web.serve("/1.png", b"poster")
        self.publish(self.episode(1, element("orvane:image", href=poster)))
        self.keep()
        self.bundle, first = self.path("copy.podcast"), self.bundle
        self.assertKept(self.keep(source=first), "1 new, 0 known, 0 failed")
        self.media(1)
        self.assertEqual(self.listed("EpisodePosterReference"), ["Posters/1.png"])

    def test_a_feed_of_the_network_names_no_local_file(self):
        secret = self.write("secret.mp3", b"secret")
        away = self.web.redirect("/away.mp3", secret.as_uri())
        self.publish(self.episode(1, url=str(secret)), self.episode(2, url=secret.as_uri()), self.episode(3, url=away),
                     self.episode(4, element("orvane:image", href=str(secret))))
        result = self.keep()
        self.assertKept(result, "1 new, 0 known, 4 failed", 1, result.stderr.decode())
        self.assertEqual(result.stderr.decode().count("A feed of the network names a local file, see --allow-local\n"),
                         3)
        self.media(4)
        self.assertNotIn(b"secret", contents(self.bundle).values())
        result = self.keep("--allow-local")
        self.assertKept(result, "2 new, 1 known, 1 failed", 1, result.stderr.decode())
        self.assertIn(b"secret", contents(self.bundle).values())

    def test_a_url_that_is_not_fetched_is_told_as_such(self):
        self.publish(self.episode(1, url="ftp://a.example/1.mp3"))
        for options in ([], ["--allow-local"]):
            self.assertKept(self.keep(*options), "0 new, 0 known, 1 failed", 1,
                            'qel-keep: "Episode 1": ftp://a.example/1.mp3: '
                            "Only http, https and file URLs are fetched\n")

    def test_a_url_that_is_said_to_be_local_is_told_as_such(self):
        for location in ("https://a.example/1.mp3", "HTTP://a.example/1.mp3", "file:///1.mp3"):
            source = self.reference({"Episodes": [{"EpisodeName": "Episode 1", "EpisodeReference": location,
                                                   "EpisodeReferenceType": "local"}]})
            self.assertKept(self.keep(source=source), "0 new, 0 known, 1 failed", 1,
                            f'qel-keep: "Episode 1": {location}: It is a URL, but its type is not "remote"\n')

    def test_a_feed_on_disk_may_name_local_files(self):
        media = self.write("one.mp3", b"media 1")
        feed = self.feed(rss(self.episode(1, url=str(media))), name="my feed.xml")
        self.assertKept(self.keep(source=feed), "1 new, 0 known, 0 failed")
        self.media(1)


if __name__ == "__main__":
    unittest.main()
