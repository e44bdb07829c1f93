"""README's table of what survives: a feed with each of its tags is kept, and published again, in real runs."""

import plistlib
import re
import unittest
from pathlib import Path
from xml.dom import minidom

from support import ToolTestCase, item, rss

README = Path(__file__).resolve().parents[3] / "README.md"
HEADER = "| tag | of the show | of an episode | in the published feed |"
MARK = "https://mark.example/1.mp3"  # fits wherever a text, a URL or a person may stand

# What stands in a feed for a tag of the table, where it is not a text in an element of that name.
SAMPLES = {
    "image": f"<image><url>{MARK}</url></image>",
    "enclosure": f'<enclosure url="{MARK}" type="audio/mpeg" length="7"/>',
    "pubDate": "<pubDate>Mon, 04 May 2026 01:00:00 +0200</pubDate>",
    "orvane:category": f'<orvane:category text="{MARK}"><orvane:category text="sub"/></orvane:category>',
    "orvane:image": f'<orvane:image href="{MARK}"/>',
    "orvane:explicit": "<orvane:explicit>yes</orvane:explicit>",
    "orvane:owner": f"<orvane:owner><orvane:name>{MARK}</orvane:name></orvane:owner>",
    "atom:link": f'<atom:link rel="self" href="{MARK}"/>',
    "media:content": f'<media:content url="{MARK}"/>',
    "media:thumbnail": f'<media:thumbnail url="{MARK}"/>',
}
# What to look for, where it is not the mark.
MARKS = {"pubDate": ("2026-05-03T23:00:00Z", "Sun, 03 May 2026 23:00:00 GMT"), "orvane:explicit": ("Explicit", "yes")}


def rows():
    """The table, as lists of cells."""
    text = README.read_text(encoding="utf-8")
    lines = text[text.index(HEADER):].splitlines()[2:]
    for line in lines:
        if not line.startswith("|"):
            return
        yield [cell.strip() for cell in line.strip("|").split("|")]


def names(cell):
    return re.findall(r"`([^`]+)`", cell)


class SurvivalTest(ToolTestCase):
    def survivors(self, tag, of_episode):
        """The names of the elements of the published feed in which the tag's content stands; None if it is not kept."""
        sample = SAMPLES.get(tag, f"<{tag}>{MARK}</{tag}>")
        feed = self.feed(rss(item(sample) if of_episode else sample))
        kept, published = MARKS.get(tag, (MARK, MARK))
        reference = self.run_tool("parsefeed", feed)
        self.assertSucceeds(reference)
        self.assertTrue(plistlib.loads(reference.stdout) is not None)
        result = self.run_tool(self.write("kept.plist", reference.stdout), "-", program="qel-publish",
                               env={"SOURCE_DATE_EPOCH": "0"})
        self.assertEqual(result.status, 0)
        found = []
        for element in minidom.parseString(result.stdout).getElementsByTagName("*"):
            texts = [node.data for node in element.childNodes if node.nodeType == node.TEXT_NODE]
            if published in [*texts, *(value for _, value in element.attributes.items())]:
                inside = element.parentNode.nodeName == "image"
                found.append("image" if inside else element.nodeName)
        is_kept = kept.encode() in reference.stdout
        self.assertEqual(is_kept, bool(found), reference.stdout)
        return found if is_kept else None

    def test_every_row(self):
        count = 0
        for tags, of_show, of_episode, published in rows():
            for tag in names(tags):
                count += 1
                for cell, is_episode in ((of_show, False), (of_episode, True)):
                    if cell == "":  # nothing that stands there in real feeds
                        continue
                    with self.subTest(tag=tag, of_episode=is_episode):
                        found = self.survivors(tag, is_episode)
                        self.assertEqual("kept" if found else "lost", cell.split(",")[0])
                        if found:
                            self.assertLessEqual(set(names(published.split(";")[0])), set(found))
        self.assertGreater(count, 30)


if __name__ == "__main__":
    unittest.main()
