"""What the tests of hostile feeds share: what becomes of a feed, and what is said to be wrong with one.

Each feed has a limit of memory and of time that only a run out of hand exceeds; what it really costs is for
test_cost.py.
"""

from support import ToolTestCase

MEMORY = 2 << 30
TIMEOUT = 120

READ = {"PodcastName": "t"}

# What is wrong; the place follows.
AMPLIFIED = r"limit on input amplification factor \(from DTD and entities\) breached"
INVALID = r"not well-formed \(invalid token\)"
DECLARATION = "XML declaration not well-formed"
MISPLACED_DECLARATION = "XML or text declaration not at start of entity"
JUNK = "junk after document element"
NO_ELEMENT = "no element found"
REFERENCE = "reference to invalid character number"
RECURSIVE = "recursive entity reference"
UNDEFINED = "undefined entity"
UNCLOSED = "unclosed token"


def title(content, prolog=b""):
    """A small feed whose title has the content."""
    return prolog + b"<rss><title>" + content + b"</title></rss>"


class HostileFeedTestCase(ToolTestCase):
    def convert(self, document):
        return self.run_tool("parsefeed", self.feed(document), timeout=TIMEOUT, memory_limit=MEMORY)

    def assertOutcome(self, document, expected):
        """The reference dictionary that the document becomes, or the pattern of what is wrong with it."""
        if isinstance(expected, str):
            self.assertLoadFails(self.convert(document), expected + r" at line 1, column \d+")
        else:
            outcome = self.parsefeed(self.feed(document), timeout=TIMEOUT, memory_limit=MEMORY)
            self.assertTrue(outcome == expected, f"{outcome!r:.1000}")  # too large, some of them, for a difference

    def assertOutcomes(self, *rows):
        for name, document, expected in rows:
            with self.subTest(name):
                self.assertOutcome(document, expected)
