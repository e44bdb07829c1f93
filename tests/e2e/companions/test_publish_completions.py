"""The completions of qel-publish, as the real shells offer them."""

import unittest

from completion_support import FILES, SCHEMES, SOURCES, CompletionTestCase

LONG = ["--base", "--directory", "--help", "--language", "--link", "--self", "--version"]

# A line up to the cursor, and what is offered there.
OFFERS = [
    ("qel-publish ", SOURCES + SCHEMES),
    ("qel-publish s", ["show.plist", "show.podcast", "sub"]),
    ("qel-publish h", ["http:", "https:"]),
    ("qel-publish n", []),
    ("qel-publish show.plist ", FILES),
    ("qel-publish show.plist n", ["notes.txt"]),
    ("qel-publish --base ", []),
    ("qel-publish -L en s", ["show.plist", "show.podcast", "sub"]),
    ("qel-publish --base=http://127.0.0.1/a=b https://127.0.0.1/x n", ["notes.txt"]),
    ("qel-publish --la", ["--language"]),
]
# Zsh offers options where nothing else can stand.
NOTHING_LEFT = [("qel-publish show.plist feed.xml ", [])]
LINES = [
    ("qel-publish show.po", "qel-publish show.podcast/"),
    (r"qel-publish my\ show.", r"qel-publish my\ show.plist "),
    ("qel-publish pc", "qel-publish pcast:"),
    ("qel-publish show.plist not", "qel-publish show.plist notes.txt "),
]


class PublishCompletionsTest(CompletionTestCase):
    PROGRAM = "qel-publish"

    def test_bash(self):
        self.check_offers("bash", [*OFFERS, *NOTHING_LEFT, ("qel-publish --", LONG)])
        self.record.unlink()
        self.check_lines("bash", LINES)

    def test_zsh(self):
        self.check_offers("zsh", OFFERS)
        self.record.unlink()
        self.check_lines("zsh", LINES)

    def test_fish(self):
        self.check_offers("fish", [*OFFERS, *NOTHING_LEFT, ("qel-publish --", LONG)])


if __name__ == "__main__":
    unittest.main()
