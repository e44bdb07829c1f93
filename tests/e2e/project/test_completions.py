"""The completions of the tool, as the real shells offer them and as they complete the line."""

import unittest

from completion_support import DIRECTORIES, FILES, SCHEMES, SOURCES, CompletionTestCase

COMMANDS = "createbundle createfeed parsefeed"

# A line up to the cursor, and what is offered there; directories without the slash that some shells add.
OFFERS = [
    ("qel ", COMMANDS.split()),
    ("qel create", ["createbundle", "createfeed"]),
    ("qel x", []),
    ("qel -d out ", COMMANDS.split()),
    ("qel -i p", ["parsefeed"]),
    ("qel -", ["-d", "-f", "-i"]),
    ("qel createfeed -", ["-d", "-f", "-i"]),
    ("qel createbundle -", ["-d", "-i"]),
    ("qel parsefeed show.plist -", ["-d", "-i"]),
    ("qel createfeed ", SOURCES + SCHEMES),
    ("qel parsefeed s", ["show.plist", "show.podcast", "sub"]),
    ("qel createbundle my", ["my show.plist", "my shows"]),
    ("qel createbundle n", []),
    ("qel createbundle h", ["http:", "https:"]),
    ("qel createfeed -d out -f rss f", ["file:"]),
    ("qel createfeed -f ", ["atom", "rss"]),
    ("qel -f r", ["rss"]),
    ("qel createfeed http://127.0.0.1/a=b -f a", ["atom"]),
    ("qel createbundle show.plist -d ", DIRECTORIES),
    ("qel createfeed show.plist -d ", FILES),
    ("qel parsefeed -d n", ["notes.txt"]),
    ("qel -d sho", ["show.plist", "show.podcast"]),
]
# Fish offers options only behind a dash, the others also where nothing else can stand.
OPTIONS_LEFT = [
    ("qel createfeed -i ", ["-d", "-f"]),
    ("qel createfeed show.plist ", ["-d", "-f", "-i"]),
    ("qel parsefeed -d out show.plist ", ["-i"]),
]
# An option takes the next word, whatever it is. Zsh takes this -i for the option all the same.
TAKEN = [("qel createfeed -d -i s", ["show.plist", "show.podcast", "sub"])]
# A line, and what completing makes of it.
LINES = [
    ("qel createf", "qel createfeed "),
    ("qel parsefeed U", "qel parsefeed UP.PLIST "),
    ("qel parsefeed show.po", "qel parsefeed show.podcast/"),
    (r"qel parsefeed my\ show.", r"qel parsefeed my\ show.plist "),
    ("qel parsefeed pc", "qel parsefeed pcast:"),
    ("qel createfeed show.plist -d not", "qel createfeed show.plist -d notes.txt "),
]
# Bash takes the words apart at colons and equals signs.
BASH_LINES = [
    ("qel createfeed 'my show.", "qel createfeed 'my show.plist' "),
    ("qel createfeed pcast:", "qel createfeed pcast:"),
    ("qel createfeed show.plist -d a:b", "qel createfeed show.plist -d a:b.xml "),
    ("qel createfeed -d a:b.xml show.pl", "qel createfeed -d a:b.xml show.plist "),
    ("qel -d a=b c", "qel -d a=b create"),
]


class CompletionsTest(CompletionTestCase):
    def test_bash_offers(self):
        self.check_offers("bash", OFFERS + OPTIONS_LEFT + TAKEN)

    def test_bash_completes(self):
        self.check_lines("bash", LINES + BASH_LINES)

    def test_zsh_offers(self):
        self.check_offers("zsh", OFFERS + OPTIONS_LEFT)

    def test_zsh_completes(self):
        self.check_lines("zsh", LINES)

    def test_fish_offers(self):
        self.check_offers("fish", OFFERS + TAKEN + [(line, []) for line, _ in OPTIONS_LEFT])


if __name__ == "__main__":
    unittest.main()
