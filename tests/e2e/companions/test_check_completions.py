"""The completions of qel-check, as the real shells offer them."""

import unittest

from completion_support import FILES, CompletionTestCase

LONG = ["--all", "--directory", "--for-publishing", "--help", "--version"]

# A line up to the cursor, and what is offered there.
OFFERS = [
    ("qel-check ", FILES),
    ("qel-check n", ["notes.txt"]),
    ("qel-check show.plist s", ["show.plist", "show.podcast", "sub"]),
    ("qel-check --all -p n", ["notes.txt"]),
    ("qel-check --directory ", []),
    ("qel-check -d ", []),
    ("qel-check -d a=b n", ["notes.txt"]),
    ("qel-check --for", ["--for-publishing"]),
]
LINES = [
    ("qel-check show.po", "qel-check show.podcast/"),
    (r"qel-check my\ show.", r"qel-check my\ show.plist "),
    ("qel-check show.plist not", "qel-check show.plist notes.txt "),
]


class CheckCompletionsTest(CompletionTestCase):
    PROGRAM = "qel-check"

    def test_bash(self):
        self.check_offers("bash", [*OFFERS, ("qel-check --", LONG)])
        self.record.unlink()
        self.check_lines("bash", LINES)

    def test_zsh(self):
        self.check_offers("zsh", OFFERS)
        self.record.unlink()
        self.check_lines("zsh", LINES)

    def test_fish(self):
        self.check_offers("fish", [*OFFERS, ("qel-check --", LONG)])


if __name__ == "__main__":
    unittest.main()
