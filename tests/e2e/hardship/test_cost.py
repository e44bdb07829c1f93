"""No document takes more memory than a small multiple of its size.

That time grows as the size does is for scripts/cost-table --check to say, since it takes minutes.
"""

import unittest

from cost import ALLOWANCE, FAMILIES, cost_of
from support import ToolTestCase, is_sanitized, rss

MEGABYTE = 1_000_000


class CostTest(ToolTestCase):
    def setUp(self):
        super().setUp()
        if is_sanitized():
            self.skipTest("a sanitizer takes memory and time of its own")

    def test_memory_stays_within_a_multiple_of_the_document(self):
        least = cost_of("parsefeed", self.feed(rss())).memory
        for family in FAMILIES:
            with self.subTest(family.name):
                size, (cost,) = family.costs(MEGABYTE)
                self.assertRegex(cost.message, rf"\A(?s:{family.message})\Z")
                self.assertLessEqual(cost.memory, least + ALLOWANCE + family.memory * size)


if __name__ == "__main__":
    unittest.main()
