"""What feedparser sees of a feed. usage: with_feedparser.py URL"""

import calendar
import json
import sys

import feedparser

parsed = feedparser.parse(sys.argv[1])
print(json.dumps({
    "poster": parsed.feed.image.href,
    "episodes": [{
        "guid": entry.id,
        "date": calendar.timegm(entry.published_parsed),
        "enclosure": entry.enclosures[0].href,
        "length": int(entry.enclosures[0].length),
        "type": entry.enclosures[0].type,
        "poster": entry.get("orvane_image", {}).get("href"),
    } for entry in parsed.entries],
}))
