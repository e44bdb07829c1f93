"""No document takes more memory than a small multiple of its size.

That time grows as the size does is for scripts/cost-table --check to say, since it takes minutes.
"""

import os
import plistlib
import unittest
import unittest.mock

import cost
from cost import ALLOWANCE, Family, Growth, faults, start_cost
from cost_families import FAMILIES
from support import ToolTestCase, is_sanitized

MEGABYTE = 1_000_000


class CostTest(ToolTestCase):
    def setUp(self):
        super().setUp()
        if is_sanitized():
            self.skipTest("a sanitizer takes memory and time of its own")

    def test_memory_stays_within_a_multiple_of_the_document(self):
        least = {is_served: start_cost(is_served).memory for is_served in (False, True)}
        for family in FAMILIES:
            with self.subTest(family.name):
                size, (cost,) = family.costs(MEGABYTE)
                self.assertRegex(cost.message, rf"\A(?s:{family.message})\Z")
                self.assertLessEqual(cost.memory, least[family.is_served] + ALLOWANCE + family.memory * size)

    def test_memory_of_a_bundle_grows_little_with_each_file_that_is_saved(self):
        original = self.path("a" * 100)
        original.write_bytes(b"media")
        episode = {"EpisodeReference": original.as_uri(), "EpisodePosterReference": original.as_uri()}

        def memory(count):
            # What stands for nothing is room for the records that the shared episode becomes.
            document = {"Unknown": bytes(100_000), "Episodes": [episode] * count}
            source = self.write(f"{count}.plist", plistlib.dumps(document, fmt=plistlib.FMT_BINARY))
            taken = cost.cost_of("createbundle", str(source), "-d", str(self.path(f"{count}.podcast"))).memory
            self.assertEqual(len(os.listdir(self.path(f"{count}.podcast") / "Posters")), count)
            return taken

        files = 2 * (4000 - 1000)
        self.assertLessEqual(memory(4000) - memory(1000), 2000 * files)


class BoundsTest(unittest.TestCase):
    """The bounds of scripts/cost-table, with costs made up."""
    FAMILY = Family("some", lambda size: b"", memory=32)

    def faults_of(self, exponent, memory=0, **changes):
        growth = Growth(100, [2 ** (exponent * doubling) for doubling in range(4)], memory)
        return list(faults(self.FAMILY._replace(**changes), growth, self.notes))

    def setUp(self):
        self.notes = []

    def test_growth_of_the_power_of_one_and_a_quarter_is_a_fault(self):
        self.assertEqual(self.faults_of(1), [])
        self.assertEqual(self.faults_of(1.2), [])
        self.assertEqual(self.faults_of(1.25), ["some: 13.5 times the time for 8 times the size"])

    def test_instructions_tell_apart_what_outgrows_caches(self):
        for work, found in ((8.2, 0), (10.1, 1), (None, 0)):
            with self.subTest(work), unittest.mock.patch.object(cost, "work_of", lambda family, work=work: work):
                self.notes.clear()
                self.assertEqual(len(self.faults_of(1.5, outgrows_caches=True)), found)
                note = (f"some: {work} times the instructions for 8 times the size" if work else
                        'Skipped, since nothing counts instructions here: why "some" are so slow.')
                self.assertEqual(self.notes, [note])

    def test_memory_beyond_the_multiple_is_a_fault(self):
        self.assertEqual(self.faults_of(1, ALLOWANCE + 3200), [])
        self.assertEqual(self.faults_of(1, ALLOWANCE + 3201), ["some: 160032.0 bytes for each byte, of 32"])


if __name__ == "__main__":
    unittest.main()
