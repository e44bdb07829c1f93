"""Publication dates are read in every spelling and written in the locale and the time zone of whoever runs the tool.

RFC822ParsingTest and DateFormatterTest have the tables; here is what reaches a reference file and a feed, in time
zones that the environment names.
"""

import datetime
import struct
import unittest

from support import ToolTestCase, element, item, rss

LOS_ANGELES = "America/Los_Angeles"
CENTRAL_EUROPE = "CET-1CEST,M3.5.0,M10.5.0/3"


def at(year, month=1, day=1, hour=0, minute=0, second=0):
    return datetime.datetime(year, month, day, hour, minute, second)


class ReadingTest(ToolTestCase):
    def assertDates(self, rows, zone):
        """Each row is a date text and the instant (in UTC) that it means, or None for no date."""
        feed = self.feed(rss(*[item(element("pubDate", text)) for text, _ in rows]))
        episodes = self.parsefeed(feed, env={"TZ": zone})["Episodes"]
        for (text, expected), episode in zip(rows, episodes, strict=True):
            with self.subTest(text, zone=zone):
                self.assertEqual(episode.get("EpisodeDate"), expected)

    def test_one_of_each_form(self):
        for zone in ("UTC", "Asia/Tokyo"):
            self.assertDates([
                ("Tue, 05 Jun 2007 14:30:15 GMT", at(2007, 6, 5, 14, 30, 15)),
                ("5 June 07 14:30 PST", at(2007, 6, 5, 21, 30)),
                ("Wed, 05 Dec 2007 14:30:00 PDT", at(2007, 12, 5, 22, 30)),
                ("05 Jun 2007 14:30 +05:30", at(2007, 6, 5, 9)),
                ("05 Jun 2007 14:30 a", at(2007, 6, 5, 15, 30)),
                ("05 Jun 107 10:00 Z", at(107, 6, 5, 10)),
                ("Tue,  05 Jun 2007 14:30:00 GMT", None),
                ("05 Jun 2007 1430 GMT", None),
                ("2007-06-05T14:30:00Z", None),
                ("", None),
            ], zone)

    def test_unknown_zones_are_local_time(self):
        texts = ["05 Jun 2007 12:00 UTC", "05 Jun 2007 12:00 BST", "05 Jun 2007 12:00 ", "05 Jun 2007 12:00 GMT\n"]
        for zone, hour in (("UTC", 12), ("Asia/Tokyo", 3), (LOS_ANGELES, 19), (CENTRAL_EUROPE, 10)):
            self.assertDates([(text, at(2007, 6, 5, hour)) for text in texts], zone)

    def test_two_digit_years_end_with_the_year_of_the_local_time(self):
        """In a zone where the clocks are 366 days ahead that is the next one."""
        offset = struct.pack(">i", 366 * 86400)
        zone = self.write("zone", b"TZif" + bytes(16 + 4 * 4) + struct.pack(">II", 1, 4) + offset + bytes(2) + b"XXX\0")
        before = datetime.datetime.now(datetime.timezone.utc)
        for days in (0, 366):
            year = (before + datetime.timedelta(days=days)).year
            self.assertDates([(f"05 Jun {year % 100} 10:00 GMT", at(year, 6, 5, 10)),
                              (f"05 Jun {year % 100 + 1} 10:00 GMT", at(year - 99, 6, 5, 10))],
                             f":{zone}" if days else "UTC")

    def test_the_later_date_wins_and_a_rejected_one_changes_nothing(self):
        episode = self.episode_of("<pubDate>05 Jun 2007 10:00 GMT</pubDate><pubDate>06 Jun 2007 10:00 GMT</pubDate>"
                                  "<pubDate>yesterday</pubDate>")
        self.assertEqual(episode, {"EpisodeDate": at(2007, 6, 6, 10)})

    def test_dates_beyond_every_calendar_do_not_crash(self):
        nines = "9" * 30
        texts = [f"{nines} Jun 2007 10:00 GMT", f"05 Jun {nines} 10:00 GMT", f"05 Jun -{nines} 10:00 GMT",
                 f"05 Jun 2007 {nines}:00 GMT", f"05 Jun 2007 10:{nines}:{nines} GMT", f"05 Jun 2007 10:00 +99{nines}",
                 f"05 Jun 2007 10:00 -99{nines}", "05 Jun 2147483648 10:00 GMT", "05 Jun 10000 10:00 GMT",
                 "2147483648 Jun 2007 10:00 GMT", "05 Jun 2007 10:00 +9999", "05 Jun 2007 10:00 +-5+5", "0 0 0 0:0 0"]
        feed = self.feed(rss(*(item(element("pubDate", text)) for text in texts)))
        for command in ("parsefeed", "createfeed"):
            with self.subTest(command):
                self.assertSucceeds(self.run_tool(command, feed))


class WritingTest(ToolTestCase):
    def written(self, **variables):
        """The dates of a summer's and a winter's episode."""
        dates = (at(2007, 6, 5, 14, 30), at(2007, 12, 5, 4, 5, 6))
        channel = self.channel_of({"Episodes": [{"EpisodeDate": date} for date in dates]}, env=variables)
        return [found.findtext("pubDate") for found in channel.findall("item")]

    def test_offsets_follow_the_time_zone_at_the_date(self):
        for zone, expected in (
                ("UTC", ["Tue, 05 Jun 2007 14:30:00 GMT", "Wed, 05 Dec 2007 04:05:06 GMT"]),
                (LOS_ANGELES, ["Tue, 05 Jun 2007 07:30:00 GMT-07:00", "Tue, 04 Dec 2007 20:05:06 GMT-08:00"]),
                ("Asia/Kolkata", ["Tue, 05 Jun 2007 20:00:00 GMT+05:30", "Wed, 05 Dec 2007 09:35:06 GMT+05:30"]),
                (CENTRAL_EUROPE, ["Tue, 05 Jun 2007 16:30:00 GMT+02:00", "Wed, 05 Dec 2007 05:05:06 GMT+01:00"])):
            with self.subTest(zone):
                self.assertEqual(self.written(TZ=zone), expected)

    def test_years_and_names_follow_the_locale(self):
        self.assertRegex(self.written(LC_ALL="th_TH", TZ="UTC")[0], r"\b05 \S+ 2550 14:30:00 GMT\Z")
        self.assertIn("05 juin 2007", self.written(LC_ALL="fr_FR.UTF-8")[0])

    def test_the_date_of_the_channel_is_in_the_same_form(self):
        channel = self.channel_of({}, env={"TZ": LOS_ANGELES})
        self.assertRegex(channel.findtext("pubDate"),
                         r"\A(Mon|Tue|Wed|Thu|Fri|Sat|Sun), \d\d (Jan|Feb|Mar|Apr|May|Jun|Jul|Aug|Sep|Oct|Nov|Dec) "
                         r"\d{4} \d\d:\d\d:\d\d GMT-0[78]:00\Z")


if __name__ == "__main__":
    unittest.main()
