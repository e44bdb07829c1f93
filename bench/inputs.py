#!/usr/bin/env python3
"""Makes what the benchmarks read: feeds in the shape that publishers give them, reference files, media.

usage: inputs.py feed ITEMS FILE       a feed of about 2.3 KB for each item
       inputs.py episodes COUNT FILE   a reference file of that many episodes; what it names lies nowhere
       inputs.py one-name COUNT FILE   the same, with media that are all called alike

Equal arguments give equal bytes, so that figures of two days are figures of the same work.
"""

import datetime
import random
import sys
from pathlib import Path
from xml.sax.saxutils import escape

HEAD = """<?xml version="1.0" encoding="UTF-8"?>
<rss version="2.0" xmlns:dc="http://purl.org/dc/elements/1.1/" xmlns:atom="http://www.w3.org/2005/Atom"
  xmlns:content="http://purl.org/rss/1.0/modules/content/" xmlns:orvane="https://orvane.example/ns/podcast-1.0">
  <channel>
    <title>The Long Way Round</title>
    <link>https://round.example/</link>
    <atom:link rel="self" type="application/rss+xml" href="https://round.example/feed.xml"/>
    <description><![CDATA[<p>A walk a day &amp; what was heard on it.</p>]]></description>
    <copyright>© Round &amp; Sons</copyright>
    <language>en</language>
    <generator>By hand</generator>
    <orvane:author>Ann &amp; Bob Round</orvane:author>
    <orvane:type>episodic</orvane:type>
    <orvane:owner><orvane:name>Ann Round</orvane:name><orvane:email>ann@round.example</orvane:email></orvane:owner>
    <orvane:category text="Society &amp; Culture"><orvane:category text="Places &amp; Travel"/></orvane:category>
    <orvane:keywords>walks,places,sounds</orvane:keywords>
    <orvane:explicit>no</orvane:explicit>
    <orvane:image href="https://round.example/cover.jpg?w=3000&amp;h=3000"/>
    <image><url>https://round.example/cover.jpg</url><title>The Long Way Round</title></image>
"""
TAIL = "  </channel>\n</rss>\n"

# One item in four has its HTML escaped and not in CDATA sections, as about every fourth publisher does it.
ITEM = """    <item>
      <title>{title}</title>
      <orvane:title>{title}</orvane:title>
      <orvane:episode>{number}</orvane:episode>
      <orvane:episodeType>full</orvane:episodeType>
      <guid isPermaLink="false">{uuid}</guid>
      <link>https://round.example/episodes/{number}?utm_source=feed&amp;utm_medium=rss</link>
      <pubDate>{date}</pubDate>
      <description>{description}</description>
      <content:encoded>{notes}</content:encoded>
      <orvane:summary>{summary}</orvane:summary>
      <orvane:author>Ann &amp; Bob Round</orvane:author>
      <orvane:keywords>{keywords}</orvane:keywords>
      <orvane:duration>{duration}</orvane:duration>
      <orvane:explicit>{explicit}</orvane:explicit>
      <orvane:image href="https://img.round.example/{uuid}/cover.jpg?w=1400&amp;h=1400"/>
      <enclosure url="https://media.round.example/track/{uuid}/walk-{number}.mp3?source=feed&amp;t={length}" """ \
    """length="{length}" type="audio/mpeg"/>
    </item>
"""

SYLLABLES = ("ba be bri ca chan clo da den dra e fa fen gla go hal he in ja ka lan lo ma mer mo na ne o pa per pla "
             "ra ri ro sa sen sha so ta ter tho u va ven vi wa wen wi ya zo").split()
DECORATED = ("<em>{}</em>", "<strong>{}</strong>", "“{}”", "{}’s", "{}—", "{} &amp;", "{}é", "{}ü",
             '<a href="https://places.example/{}?ref=feed&amp;via=notes" target="_blank" rel="noopener">{}</a>')
ZONES = ("+0000", "GMT", "-0500", "+0200", "EST", "PDT")


class Prose:
    """HTML and plain text without meaning, but with the lengths, the markup and the letters of show notes."""

    def __init__(self, source):
        self.random = source
        self.words = ["".join(source.choices(SYLLABLES, k=source.choice((1, 2, 2, 3, 4)))) for _ in range(1500)]
        self.plain = [self._sentence(decorated=False) for _ in range(1000)]
        self.html = [f"<p>{' '.join(self._sentence() for _ in range(source.randint(1, 3)))}</p>" for _ in range(1000)]

    def _sentence(self, decorated=True):
        words = self.random.choices(self.words, k=self.random.randint(6, 18))
        if decorated:
            place = self.random.randrange(len(words))
            words[place] = self.random.choice(DECORATED).replace("{}", words[place])
        return " ".join(words).capitalize() + "."

    def paragraphs(self, characters):
        """Sentences in HTML, of about that many characters."""
        return self._joined(self.html, "\n", characters)

    def sentences(self, characters):
        """Sentences without markup, of about that many characters."""
        return self._joined(self.plain, " ", characters)

    def _joined(self, choice, glue, characters):
        parts, length = [], 0
        while length < characters:
            parts.append(self.random.choice(choice))
            length += len(parts[-1]) + 1
        return glue.join(parts)

    def title(self):
        return " ".join(self.random.choices(self.words, k=6)).title()


def feed_items(count):
    """The items of a feed, one text for each."""
    source = random.Random(1)
    prose = Prose(source)
    newest = datetime.datetime(2026, 1, 1, 6)
    for number in range(count, 0, -1):
        wrap = escape if number % 4 == 0 else "<![CDATA[{}]]>".format
        uuid = f"{source.getrandbits(128):032x}"
        yield ITEM.format(
            number=number,
            title=f"{number}: {prose.title()} &amp; On",
            uuid="-".join((uuid[:8], uuid[8:12], uuid[12:16], uuid[16:20], uuid[20:])),
            date=(newest - datetime.timedelta(hours=7 * (count - number))).strftime("%a, %d %b %Y %H:%M:%S ")
            + ZONES[number % len(ZONES)],
            description=wrap(prose.paragraphs(source.randint(150, 695))),
            notes=wrap(prose.paragraphs(source.randint(80, 460))),
            summary=prose.sentences(source.randint(60, 250)),
            keywords=",".join(source.choices(prose.words, k=4)),
            duration=f"{source.randint(0, 2)}:{source.randint(10, 59)}:{source.randint(10, 59)}",
            explicit="yes" if number % 10 == 0 else "no",
            length=source.randint(5_000_000, 90_000_000),
        )


def write_feed(path, count):
    with open(path, "w", encoding="utf-8") as file:
        file.write(HEAD)
        file.writelines(feed_items(count))
        file.write(TAIL)


def write_reference(path, locations, kind="local"):
    """Writes a reference file of one episode for each location of its media."""
    with open(path, "w", encoding="utf-8") as file:
        file.write('<?xml version="1.0" encoding="UTF-8"?>\n'
                   '<!DOCTYPE plist PUBLIC "-//Apple//DTD PLIST 1.0//EN" '
                   '"http://www.apple.com/DTDs/PropertyList-1.0.dtd">\n'
                   '<plist version="1.0">\n<dict>\n\t<key>PodcastName</key>\n\t<string>The Long Way Round</string>\n'
                   "\t<key>Episodes</key>\n\t<array>\n")
        for number, location in enumerate(locations, 1):
            file.write("\t\t<dict>\n"
                       f"\t\t\t<key>EpisodeName</key>\n\t\t\t<string>Walk {number}</string>\n"
                       "\t\t\t<key>EpisodeDate</key>\n\t\t\t<date>2026-01-01T06:00:00Z</date>\n"
                       f"\t\t\t<key>EpisodeReference</key>\n\t\t\t<string>{escape(location)}</string>\n"
                       f"\t\t\t<key>EpisodeReferenceType</key>\n\t\t\t<string>{kind}</string>\n"
                       "\t\t\t<key>EpisodeType</key>\n\t\t\t<string>audio/mpeg</string>\n"
                       "\t\t</dict>\n")
        file.write("\t</array>\n</dict>\n</plist>\n")


def write_episodes(path, count):
    write_reference(path, (f"/nonexistent/walk-{number}.mp3" for number in range(count)))


def write_one_name(path, count):
    write_reference(path, (f"/nonexistent/{number}/walk.mp3" for number in range(count)))


def write_media(directory, count, size):
    """Writes files of that many bytes, no two alike, and returns their paths."""
    directory.mkdir(parents=True, exist_ok=True)
    source = random.Random(size)
    block = source.randbytes(min(size, 1 << 20))
    paths = []
    for number in range(1, count + 1):
        paths.append(directory / f"walk-{number}.mp3")
        with open(paths[-1], "wb") as file:
            head = number.to_bytes(8, "big")[: size]
            file.write(head)
            left = size - len(head)
            while left:
                left -= file.write(block[:left])
    return paths


def main(arguments):
    writers = {"feed": write_feed, "episodes": write_episodes, "one-name": write_one_name}
    if len(arguments) != 3 or arguments[0] not in writers or not arguments[1].isdecimal():
        print(__doc__.split("\n\n")[1], file=sys.stderr)
        return 1
    writers[arguments[0]](Path(arguments[2]), int(arguments[1]))
    return 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
