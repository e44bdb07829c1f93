"""Parses a feed with feedparser, into its records, and writes how many items it has.

usage: with_feedparser.py FEED OUTPUT
"""

import sys
from pathlib import Path

import feedparser

parsed = feedparser.parse(sys.argv[1])
Path(sys.argv[2]).write_text(f"{len(parsed.entries)}\n", encoding="utf-8")
