"""The completions of the companions, as the real shells offer them."""

import unittest

from completion_support import DIRECTORIES, FILES, SCHEMES, SOURCES, CompanionCompletions, CompletionTestCase


class CheckCompletionsTest(CompanionCompletions, CompletionTestCase):
    PROGRAM = "qel-check"
    LONG = ["--all", "--directory", "--for-publishing", "--help", "--version"]
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


class KeepCompletionsTest(CompanionCompletions, CompletionTestCase):
    PROGRAM = "qel-keep"
    LONG = ["--allow-local", "--directory", "--dry-run", "--help", "--jobs", "--latest", "--quiet", "--since",
            "--stall", "--version"]
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


class PublishCompletionsTest(CompanionCompletions, CompletionTestCase):
    PROGRAM = "qel-publish"
    LONG = ["--base", "--directory", "--help", "--language", "--link", "--self", "--version"]
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
    OFFERS_BUT_OF_ZSH = [("qel-publish show.plist feed.xml ", [])]
    LINES = [
        ("qel-publish show.po", "qel-publish show.podcast/"),
        (r"qel-publish my\ show.", r"qel-publish my\ show.plist "),
        ("qel-publish pc", "qel-publish pcast:"),
        ("qel-publish show.plist not", "qel-publish show.plist notes.txt "),
    ]


if __name__ == "__main__":
    unittest.main()
