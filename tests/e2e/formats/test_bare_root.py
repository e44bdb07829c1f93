"""Conversions of local sources need nothing but the tool and what it is linked with: they say the same in a root
directory that holds nothing else as they say here."""

import datetime
import plistlib
import shutil
import subprocess
import unittest
import zoneinfo
from pathlib import Path

from bare_root import BareRootTestCase
from bundle_support import contents
from support import element, item, rss_text, without_publication_date

SHOW = Path(__file__).resolve().parents[3] / "examples" / "show"
FEED = "file:///feed.xml"
TEXT = "Night Walks, Füße, Zażółć, Ночь, Νύχτα, לילה, ليل, 夜の散歩, 밤 산책, 夜間 镕 🚶"
DAYS = tuple(datetime.datetime(2019, month, 15, 12) for month in (1, 7))

# Zones that are none, and those that were named or corrected after 2022, so that databases differ.
OTHER_ZONES = {"Factory", "localtime", "America/Ciudad_Juarez", "America/Coyhaique", "Antarctica/Vostok"}
LOCALES = {"C": "Oct", "de_DE.UTF-8": "Okt.", "fr_FR": "oct.", "ja_JP.UTF-8": "10月", "ru_RU.UTF-8": "окт.",
           "sr_RS@latin": "okt", "ar_EG.UTF-8": "أكتوبر", "th_TH.UTF-8": "ต.ค."}


def encoding_names():
    """One name for each encoding that ICU has."""
    listed = subprocess.run(["uconv", "-l"], capture_output=True, text=True, check=True).stdout
    return [line.split()[0] for line in listed.splitlines()]


class BareRootTest(BareRootTestCase):
    def here(self, *arguments, **options):
        """The same run here, where the system has all that it ever has."""
        return self.run_tool(*(self.path("feed.xml").as_uri() if argument == FEED else argument
                               for argument in arguments), **options)

    def assertSameAsHere(self, *arguments, **options):
        """The result of a run that has the same one here."""
        result = self.in_root(*arguments, **options)
        here = self.here(*arguments, **options)
        here = here._replace(stdout=here.stdout.replace(str(self.directory).encode(), b""))
        self.assertEqual(*(run._replace(stdout=without_publication_date(run.stdout)) for run in (result, here)))
        return result

    def test_every_form_from_every_source(self):
        shutil.copytree(SHOW, self.directory, dirs_exist_ok=True)
        show = plistlib.loads(Path(SHOW, "reference.plist").read_bytes())
        self.reference(show, "binary.plist", plistlib.FMT_BINARY)
        self.assertSucceeds(self.here("createbundle", "reference.plist", "-d", "show.podcast"))
        for source in (FEED, "reference.plist", "binary.plist", "show.podcast", "-i"):
            stdin = Path(SHOW, "reference.plist").read_bytes() if source == "-i" else b""
            for command in ("parsefeed", "createfeed"):
                with self.subTest(command, source=source):
                    result = self.assertSameAsHere(command, source, stdin=stdin)
                    self.assertSucceeds(result)
                    self.assertIn(b"The Lantern Garden", result.stdout)
            if source == FEED:
                continue  # its media are those of a server
            with self.subTest("createbundle", source=source):
                arguments = ("createbundle", source, "-d")
                self.assertSucceeds(self.in_root(*arguments, "there.podcast", stdin=stdin))
                self.assertSucceeds(self.here(*arguments, "here.podcast", stdin=stdin))
                made = contents(self.path("there.podcast"))
                self.assertEqual(made, contents(self.path("here.podcast")))
                self.assertIn("Info.plist", made)
                for bundle in ("there.podcast", "here.podcast"):
                    shutil.rmtree(self.path(bundle))

    @unittest.skipUnless(shutil.which("uconv"), "uconv, which comes with ICU, is not installed")
    def test_every_encoding(self):
        read = 0
        for name in encoding_names():
            document = f"<?xml version='1.0' encoding='{name}'?>\n{rss_text(element('title', TEXT))}"
            written = subprocess.run(["uconv", "-f", "UTF-8", "-t", name, "--to-callback", "escape-xml-hex"],
                                     input=document.encode(), capture_output=True, check=True).stdout
            self.write("feed.xml", written)
            with self.subTest(name):
                result = self.assertSameAsHere("parsefeed", FEED)
                if result.status == 0:
                    # A few cannot even hold a reference to a character that they do not have.
                    read += plistlib.loads(result.stdout) == {"PodcastName": TEXT}
        self.assertGreater(read, 100)

    def test_every_zone(self):
        self.reference({"Episodes": [{"EpisodeDate": day} for day in DAYS]})
        names = zoneinfo.available_timezones() - OTHER_ZONES
        if not names:
            self.skipTest("no database of time zones is installed")
        for name in sorted(names):
            with self.subTest(name):
                result = self.in_root("createfeed", "reference.plist", env={"TZ": name})
                zone = zoneinfo.ZoneInfo(name)
                for day in DAYS:
                    local = day.replace(tzinfo=datetime.timezone.utc).astimezone(zone)
                    self.assertIn(f"<pubDate>{local:%a, %d %b %Y %H:%M:%S} ".encode(), result.stdout)

    def test_a_zone_of_rules(self):
        self.reference({"Episodes": [{"EpisodeDate": day} for day in DAYS]})
        result = self.assertSameAsHere("createfeed", "reference.plist", env={"TZ": "CET-1CEST,M3.5.0,M10.5.0/3"})
        self.assertRegex(result.stdout, rb"(?s)15 Jan 2019 13:00:00 .*15 Jul 2019 14:00:00 ")

    def test_locales(self):
        self.reference({"Episodes": [{"EpisodeDate": datetime.datetime(2019, 10, 5)}]})
        for name, month in LOCALES.items():
            with self.subTest(name):
                result = self.assertSameAsHere("createfeed", "reference.plist", env={"LC_ALL": name})
                self.assertIn(month, result.stdout.decode())


if __name__ == "__main__":
    unittest.main()
