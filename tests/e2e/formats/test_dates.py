"""Publication dates of feeds come in every spelling; here is the instant that each of them means.

A table is one feed with an item for each row, so that a whole table takes one run of the tool; a failing
row is named by its text.
"""

import datetime
import unittest

from support import ToolTestCase, element, item, rss

LOS_ANGELES = "America/Los_Angeles"
CENTRAL_EUROPE = "CET-1CEST,M3.5.0,M10.5.0/3"


def at(year, month=1, day=1, hour=0, minute=0, second=0):
    return datetime.datetime(year, month, day, hour, minute, second)


class ReadingTestCase(ToolTestCase):
    def assertDates(self, rows, zone="UTC"):
        """Each row is a date text and the instant (in UTC) that it means, or None for no date."""
        feed = self.feed(rss(*[item(element("pubDate", text)) for text, _ in rows]))
        episodes = self.parsefeed(feed, env={"TZ": zone})["Episodes"]
        self.assertEqual(len(episodes), len(rows))
        for (text, expected), episode in zip(rows, episodes):
            with self.subTest(text, zone=zone):
                self.assertEqual(episode.get("EpisodeDate"), expected)


class FieldTest(ReadingTestCase):
    def test_number_of_fields(self):
        noon = at(2007, 6, 5, 14, 30)
        self.assertDates([
            ("Tue, 05 Jun 2007 14:30:00 GMT", noon),
            ("05 Jun 2007 14:30:00 GMT", noon),
            ("05 Jun 2007 14:30 GMT", noon),
            ("05\tJun\t2007\t14:30\tGMT", noon),
            ("05\u00a0Jun\u30002007\u200314:30 GMT", noon),
            ("Any 05 Jun 2007 14:30:00 GMT", noon),
            (" 05 Jun 2007 14:30:00 GMT", noon),
            ("\nTue, 05 Jun 2007 14:30:00 GMT", noon),
            ("Tue,  05 Jun 2007 14:30:00 GMT", None),
            ("Tue, 05 Jun 2007 14:30:00 GMT ", None),
            (" Tue, 05 Jun 2007 14:30:00 GMT", None),
            ("Tue, 05 Jun 2007 14:30:00", None),
            ("05 Jun 2007 14:30", None),
            ("05\nJun 2007 14:30 GMT", None),
            ("2007-06-05T14:30:00Z", None),
            ("today", None),
            ("", None),
            (" ", None),
            ("     ", None),
            ("Tue, 05 Jun 2007 14:30:00 GMT (comment)", None),
        ])

    def test_days(self):
        self.assertDates([
            ("5 Jun 2007 10:00 GMT", at(2007, 6, 5, 10)),
            ("05, Jun 2007 10:00 GMT", at(2007, 6, 5, 10)),
            ("5th Jun 2007 10:00 GMT", at(2007, 6, 5, 10)),
            ("+5 Jun 2007 10:00 GMT", at(2007, 6, 5, 10)),
            ("31 Jun 2007 10:00 GMT", at(2007, 7, 1, 10)),
            ("32 Jan 2007 10:00 GMT", at(2007, 2, 1, 10)),
            ("29 Feb 2007 10:00 GMT", at(2007, 3, 1, 10)),
            ("29 Feb 2008 10:00 GMT", at(2008, 2, 29, 10)),
            ("400 Jan 2007 10:00 GMT", at(2008, 2, 4, 10)),
            ("0 Jun 2007 10:00 GMT", at(2007, 5, 31, 10)),
            ("-1 Jun 2007 10:00 GMT", at(2007, 5, 30, 10)),
            ("fifth Jun 2007 10:00 GMT", at(2007, 5, 31, 10)),
        ])

    def test_months(self):
        names = ["Jan", "Feb", "Mar", "Apr", "May", "Jun", "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"]
        self.assertDates([(f"05 {name} 2007 10:00 GMT", at(2007, number, 5, 10))
                          for number, name in enumerate(names, 1)])
        self.assertDates([
            ("05 June 2007 10:00 GMT", at(2007, 6, 5, 10)),
            ("05 JUN 2007 10:00 GMT", at(2007, 6, 5, 10)),
            ("05 jun 2007 10:00 GMT", at(2007, 6, 5, 10)),
            ("05 December, 2007 10:00 GMT", at(2007, 12, 5, 10)),
            ("05 Maybe 2007 10:00 GMT", at(2007, 5, 5, 10)),
            ("05 Foo 2007 10:00 GMT", at(2007, 1, 5, 10)),
            ("05 Ju 2007 10:00 GMT", at(2007, 1, 5, 10)),
            ("05 06 2007 10:00 GMT", at(2007, 1, 5, 10)),
            ("05 Mai 2007 10:00 GMT", at(2007, 1, 5, 10)),
        ])

    def test_years(self):
        pivot = datetime.datetime.now(datetime.timezone.utc).year - 2000
        self.assertDates([
            ("05 Jun 2007 10:00 GMT", at(2007, 6, 5, 10)),
            ("05 Jun 2007, 10:00 GMT", at(2007, 6, 5, 10)),
            ("05 Jun 07 10:00 GMT", at(2007, 6, 5, 10)),
            ("05 Jun 7 10:00 GMT", at(2007, 6, 5, 10)),
            ("05 Jun 00 10:00 GMT", at(2000, 6, 5, 10)),
            ("05 Jun 99 10:00 GMT", at(1999, 6, 5, 10)),
            (f"05 Jun {pivot:02} 10:00 GMT", at(2000 + pivot, 6, 5, 10)),
            (f"05 Jun {pivot + 1:02} 10:00 GMT", at(1900 + pivot + 1, 6, 5, 10)),
            ("05 Jun soon 10:00 GMT", at(2000, 6, 5, 10)),
            ("05 Jun -5 10:00 GMT", at(1995, 6, 5, 10)),
            ("05 Jun 1969 10:00 GMT", at(1969, 6, 5, 10)),
            ("05 Jun 1901 10:00 GMT", at(1901, 6, 5, 10)),
            ("05 Jun 2999 10:00 GMT", at(2999, 6, 5, 10)),
        ])

    def test_a_year_of_three_digits_stands_as_it_is(self):
        date = self.episode_of("<pubDate>05 Jun 107 10:00 GMT</pubDate>")["EpisodeDate"]
        self.assertEqual((date.year, date.month, date.hour), (107, 6, 10))

    def test_times(self):
        self.assertDates([
            ("05 Jun 2007 14:30:15 GMT", at(2007, 6, 5, 14, 30, 15)),
            ("05 Jun 2007 4:3:5 GMT", at(2007, 6, 5, 4, 3, 5)),
            ("05 Jun 2007 14:30:15:99 GMT", at(2007, 6, 5, 14, 30)),
            ("05 Jun 2007 14:30:15.75 GMT", at(2007, 6, 5, 14, 30, 15)),
            ("05 Jun 2007 14:30: GMT", at(2007, 6, 5, 14, 30)),
            ("05 Jun 2007 14: GMT", at(2007, 6, 5, 14)),
            ("05 Jun 2007 : GMT", at(2007, 6, 5)),
            ("05 Jun 2007 a:b:c GMT", at(2007, 6, 5)),
            ("05 Jun 2007 24:00 GMT", at(2007, 6, 6)),
            ("05 Jun 2007 25:00 GMT", at(2007, 6, 6, 1)),
            ("05 Jun 2007 14:75 GMT", at(2007, 6, 5, 15, 15)),
            ("05 Jun 2007 14:30:90 GMT", at(2007, 6, 5, 14, 31, 30)),
            ("05 Jun 2007 -1:00 GMT", at(2007, 6, 4, 23)),
            ("31 Dec 2007 23:59:60 GMT", at(2008)),
            ("05 Jun 2007 1430 GMT", None),
            ("05 Jun 2007 14.30 GMT", None),
            ("05 Jun 2007 noon GMT", None),
        ])


class ZoneTest(ReadingTestCase):
    def test_named_zones_follow_the_rules_of_their_region(self):
        rows = []
        for names, standard in ((("EST", "EDT"), 5), (("CST", "CDT"), 6), (("MST", "MDT"), 7), (("PST", "PDT"), 8)):
            for name in names:
                rows.append((f"05 Dec 2007 10:00 {name}", at(2007, 12, 5, 10 + standard)))
                rows.append((f"05 Jun 2007 10:00 {name}", at(2007, 6, 5, 10 + standard - 1)))
        rows += [("05 Jun 2007 10:00 UT", at(2007, 6, 5, 10)), ("05 Jun 2007 10:00 GMT", at(2007, 6, 5, 10))]
        for zone in ("UTC", LOS_ANGELES, "Asia/Tokyo"):
            self.assertDates(rows, zone)

    def test_the_documented_examples(self):
        self.assertDates([
            ("Tue, 05 Jun 2007 14:30:00 PDT", at(2007, 6, 5, 21, 30)),
            ("05 Jun 2007 14:30:00 PDT", at(2007, 6, 5, 21, 30)),
            ("Wed, 05 Dec 2007 14:30:00 PDT", at(2007, 12, 5, 22, 30)),
        ])

    def test_names_are_found_in_any_case(self):
        self.assertDates([
            ("05 Jun 2007 10:00 pdt", at(2007, 6, 5, 17)),
            ("05 Jun 2007 10:00 Gmt", at(2007, 6, 5, 10)),
            ("05 Jun 2007 10:00 ut", at(2007, 6, 5, 10)),
        ], "Asia/Tokyo")

    def test_military_zones(self):
        letters = {"A": 1, "B": 2, "C": 3, "D": 4, "E": 5, "F": 6, "G": 7, "H": 8, "I": 9, "J": 0, "K": 10, "L": 11,
                   "M": 12,
                   "N": -1, "O": -2, "P": -3, "Q": -4, "R": -5, "S": -6, "T": -7, "U": -8, "V": -9, "W": -10, "X": -11,
                   "Y": -12, "Z": 0, "1": 0, "?": 0, "_": 0}
        rows = []
        for letter, hours_to_add in letters.items():
            expected = at(2007, 6, 5, 12) + datetime.timedelta(hours=hours_to_add)
            rows.append((f"05 Jun 2007 12:00 {letter}", expected))
            rows.append((f"05 Jun 2007 12:00 {letter.lower()}", expected))
        self.assertDates(rows, "Asia/Tokyo")

    def test_signed_zones(self):
        self.assertDates([
            ("05 Jun 07 14:30 +0200", at(2007, 6, 5, 12, 30)),
            ("05 Jun 07 14:30 +02:00", at(2007, 6, 5, 12, 30)),
            ("05 Jun 07 14:30 -0530", at(2007, 6, 5, 20)),
            ("05 Jun 07 14:30 -05:30", at(2007, 6, 5, 20)),
            ("05 Jun 07 14:30 +0000", at(2007, 6, 5, 14, 30)),
            ("05 Jun 07 14:30 -0000", at(2007, 6, 5, 14, 30)),
            ("05 Jun 07 14:30 +05", at(2007, 6, 5, 9, 30)),
            ("05 Jun 07 14:30 -05", at(2007, 6, 5, 19, 30)),
            ("05 Jun 07 14:30 +5:30", at(2007, 6, 5, 9)),
            ("05 Jun 07 14:30 +0545", at(2007, 6, 5, 8, 45)),
            ("05 Jun 07 14:30 +0199", at(2007, 6, 5, 11, 51)),
            ("05 Jun 07 14:30 +02:00:00", at(2007, 6, 5, 12, 30)),
            ("05 Jun 07 14:30 +ab", at(2007, 6, 5, 14, 30)),
            ("05 Jun 07 14:30 +abcd", at(2007, 6, 5, 14, 30)),
            ("05 Jun 07 14:30 +5", None),
            ("05 Jun 07 14:30 -5", None),
        ], "Asia/Tokyo")

    def test_a_zone_of_one_character_is_military_even_if_it_is_a_sign(self):
        self.assertDates([
            ("05 Jun 07 14:30 +", at(2007, 6, 5, 14, 30)),
            ("05 Jun 07 14:30 -", at(2007, 6, 5, 14, 30)),
        ], "Asia/Tokyo")

    def test_unknown_zones_are_local_time(self):
        texts = ["05 Jun 2007 12:00 UTC", "05 Jun 2007 12:00 BST", "05 Jun 2007 12:00 CEST", "05 Jun 2007 12:00 ",
                 "Tue, 05 Jun 2007 12:00:00 ", "05 Jun 2007 12:00 Europe/Berlin", "05 Jun 2007 12:00 GMT+2",
                 "05 Jun 2007 12:00 GMT\n"]
        for zone, hour in (("UTC", 12), ("Asia/Tokyo", 3), (LOS_ANGELES, 19)):
            self.assertDates([(text, at(2007, 6, 5, hour)) for text in texts], zone)

    def test_local_time_by_a_rule_instead_of_a_name(self):
        self.assertDates([
            ("05 Jun 2007 12:00 XYZ", at(2007, 6, 5, 10)),
            ("05 Dec 2007 12:00 XYZ", at(2007, 12, 5, 11)),
            ("25 Mar 2007 01:59:59 XYZ", at(2007, 3, 25, 0, 59, 59)),
            ("25 Mar 2007 02:30 XYZ", at(2007, 3, 25, 1, 30)),
            ("25 Mar 2007 03:00 XYZ", at(2007, 3, 25, 1)),
            ("28 Oct 2007 01:59:59 XYZ", at(2007, 10, 27, 23, 59, 59)),
            ("28 Oct 2007 02:30 XYZ", at(2007, 10, 28, 1, 30)),
            ("28 Oct 2007 03:00 XYZ", at(2007, 10, 28, 2)),
        ], CENTRAL_EUROPE)

    def test_a_rejected_date_leaves_the_earlier_one(self):
        episode = self.episode_of("<pubDate>05 Jun 2007 10:00 GMT</pubDate><pubDate>yesterday</pubDate>")
        self.assertEqual(episode, {"EpisodeDate": at(2007, 6, 5, 10)})

    def test_the_later_date_wins(self):
        episode = self.episode_of("<pubDate>05 Jun 2007 10:00 GMT</pubDate><pubDate>06 Jun 2007 10:00 GMT</pubDate>")
        self.assertEqual(episode, {"EpisodeDate": at(2007, 6, 6, 10)})

    def test_dates_beyond_every_calendar_do_not_crash(self):
        nines = "9" * 30
        texts = [f"{nines} Jun 2007 10:00 GMT", f"05 Jun {nines} 10:00 GMT", f"05 Jun -{nines} 10:00 GMT",
                 f"05 Jun 2007 {nines}:00 GMT", f"05 Jun 2007 10:{nines}:{nines} GMT", f"05 Jun 2007 10:00 +99{nines}",
                 f"05 Jun 2007 10:00 -99{nines}", "05 Jun 2147483648 10:00 GMT", "05 Jun 10000 10:00 GMT",
                 "2147483648 Jun 2007 10:00 GMT", "05 Jun 2007 10:00 +9999", "05 Jun 2007 10:00 +-5+5", "0 0 0 0:0 0"]
        for text in texts:
            feed = self.feed(rss(item(element("pubDate", text))))
            for command in ("parsefeed", "createfeed"):
                with self.subTest(text, command=command):
                    self.assertSucceeds(self.run_tool(command, feed))


class WritingTest(ToolTestCase):
    DATES = (
        (at(2007, 6, 5, 14, 30), "Tue, 05 Jun 2007 14:30:00 GMT", "Tue, 05 Jun 2007 07:30:00 GMT-07:00",
         "Tue, 05 Jun 2007 20:00:00 GMT+05:30"),
        (at(2007, 12, 5, 4, 5, 6), "Wed, 05 Dec 2007 04:05:06 GMT", "Tue, 04 Dec 2007 20:05:06 GMT-08:00",
         "Wed, 05 Dec 2007 09:35:06 GMT+05:30"),
        (at(2007, 3, 11, 9, 59, 59), "Sun, 11 Mar 2007 09:59:59 GMT", "Sun, 11 Mar 2007 01:59:59 GMT-08:00",
         "Sun, 11 Mar 2007 15:29:59 GMT+05:30"),
        (at(2007, 3, 11, 10), "Sun, 11 Mar 2007 10:00:00 GMT", "Sun, 11 Mar 2007 03:00:00 GMT-07:00",
         "Sun, 11 Mar 2007 15:30:00 GMT+05:30"),
        (at(2000, 1, 1), "Sat, 01 Jan 2000 00:00:00 GMT", "Fri, 31 Dec 1999 16:00:00 GMT-08:00",
         "Sat, 01 Jan 2000 05:30:00 GMT+05:30"),
        (at(1970, 1, 1), "Thu, 01 Jan 1970 00:00:00 GMT", "Wed, 31 Dec 1969 16:00:00 GMT-08:00",
         "Thu, 01 Jan 1970 05:30:00 GMT+05:30"),
    )

    def written(self, dates, **variables):
        channel = self.channel_of({"Episodes": [{"EpisodeDate": date} for date in dates]}, env=variables)
        return [found.findtext("pubDate") for found in channel.findall("item")]

    def test_dates_in_utc(self):
        self.assertEqual(self.written([row[0] for row in self.DATES], TZ="UTC"), [row[1] for row in self.DATES])

    def test_dates_in_los_angeles(self):
        self.assertEqual(self.written([row[0] for row in self.DATES], TZ=LOS_ANGELES), [row[2] for row in self.DATES])

    def test_dates_in_a_zone_of_half_hours(self):
        self.assertEqual(self.written([row[0] for row in self.DATES], TZ="Asia/Kolkata"),
                         [row[3] for row in self.DATES])

    def test_dates_in_a_zone_that_is_a_rule(self):
        self.assertEqual(self.written([at(2007, 6, 5, 14, 30), at(2007, 12, 5, 4, 5, 6)], TZ=CENTRAL_EUROPE),
                         ["Tue, 05 Jun 2007 16:30:00 GMT+02:00", "Wed, 05 Dec 2007 05:05:06 GMT+01:00"])

    def test_years_follow_the_locale(self):
        thai, = self.written([at(2007, 6, 5, 14, 30)], LC_ALL="th_TH", TZ="UTC")
        self.assertRegex(thai, r"\b05 \S+ 2550 14:30:00 GMT\Z")

    def test_names_follow_the_locale(self):
        french, = self.written([at(2007, 6, 5, 14, 30)], LC_ALL="fr_FR.UTF-8")
        self.assertIn("juin", french)
        self.assertIn("05", french)

    def test_the_date_of_the_channel_is_in_the_same_form(self):
        channel = self.channel_of({}, env={"TZ": LOS_ANGELES})
        self.assertRegex(channel.findtext("pubDate"),
                         r"\A(Mon|Tue|Wed|Thu|Fri|Sat|Sun), \d\d (Jan|Feb|Mar|Apr|May|Jun|Jul|Aug|Sep|Oct|Nov|Dec) "
                         r"\d{4} \d\d:\d\d:\d\d GMT-0[78]:00\Z")


if __name__ == "__main__":
    unittest.main()
