"""The completions of qel-keep, as the real shells offer them."""

import unittest

from completion_support import DIRECTORIES, SCHEMES, SOURCES, CompletionTestCase

LONG = ["--allow-local", "--directory", "--dry-run", "--help", "--jobs", "--latest", "--quiet", "--since", "--stall",
        "--version"]

# A line up to the cursor, and what is offered there.
OFFERS = [
    ("qel-keep ", SOURCES + SCHEMES),
    ("qel-keep s", ["show.plist", "show.podcast", "sub"]),
    ("qel-keep h", ["http:", "https:"]),
    ("qel-keep n", []),
    ("qel-keep show.plist ", DIRECTORIES),
    ("qel-keep show.plist s", ["show.podcast", "sub"]),
    ("qel-keep --jobs ", []),
    ("qel-keep -q --latest 3 s", ["show.plist", "show.podcast", "sub"]),
    ("qel-keep --directory=a=http://127.0.0.1/ https://127.0.0.1/x s", ["show.podcast", "sub"]),
    ("qel-keep --dr", ["--dry-run"]),
]
LINES = [
    ("qel-keep show.po", "qel-keep show.podcast/"),
    (r"qel-keep my\ show.", r"qel-keep my\ show.plist "),
    ("qel-keep pc", "qel-keep pcast:"),
]


class KeepCompletionsTest(CompletionTestCase):
    PROGRAM = "qel-keep"

    def test_bash(self):
        self.check_offers("bash", [*OFFERS, ("qel-keep --", LONG)])
        self.record.unlink()
        self.check_lines("bash", LINES)

    def test_zsh(self):
        self.check_offers("zsh", OFFERS)
        self.record.unlink()
        self.check_lines("zsh", LINES)

    def test_fish(self):
        self.check_offers("fish", [*OFFERS, ("qel-keep --", LONG)])


if __name__ == "__main__":
    unittest.main()
