"""qel-check on documents that are damaged or made to harm: a finding for each, and neither a crash nor an avalanche."""

import plistlib
import unittest

from hostile_documents import array_object, ascii_object, binary_list, dictionary_object
from support import ToolTestCase, item, rss, soaking

SHOW = {"PodcastName": "x", "AllowedPosterTypes": ["png"],
        "Episodes": [{"EpisodeReference": "a.mp3", "EpisodeOrder": 1}, {"EpisodeReference": "b.mp3"}]}
STEP = 1 if soaking() else 7  # bytes


class HostileTest(ToolTestCase):
    def check(self, document):
        """The findings, which are few, of a document that may be anything."""
        result = self.run_tool("-", stdin=document, program="qel-check", memory_limit=1 << 30, timeout=60)
        self.assertEqual(result.stderr, b"")
        self.assertIn(result.status, (0, 1))
        self.assertLess(len(result.stdout), 10_000)
        return result.stdout.decode(errors="replace").splitlines()

    def test_documents_cut_anywhere(self):
        for document in (plistlib.dumps(SHOW), plistlib.dumps(SHOW, fmt=plistlib.FMT_BINARY), rss(item("<x/>"))):
            for size in range(0, len(document.rstrip()) - 1, STEP):
                with self.subTest(document[:6], size=size):
                    (finding,) = self.check(document[:size])
                    self.assertIn(": error: ", finding)

    def test_binary_lists_with_bytes_replaced(self):
        document = plistlib.dumps(SHOW, fmt=plistlib.FMT_BINARY)
        for position in range(6, len(document), STEP):
            for byte in (0x00, 0x7F, 0xD1, 0xFF):
                damaged = document[:position] + bytes([byte]) + document[position + 1:]
                findings = self.check(damaged)
                if self.run_tool("parsefeed", "-i", stdin=damaged).status != 0:
                    with self.subTest(position=position, byte=byte):
                        self.assertIn(": error: ", "".join(findings))

    def test_depth(self):
        deep = 100_000
        (finding,) = self.check(b"<plist>" + b"<array>" * deep)
        self.assertIn("arrays and dictionaries nested deeper than 512 levels", finding)
        self.assertIn("error: ", self.check(b"<rss>" + b"<a>" * deep)[0])
        below = b"<plist><dict><key>x</key>" + b"<array>" * 511 + b"</array>" * 511 + b"</dict></plist>"
        self.assertEqual(self.check(below), [
            '-:1:14: warning: "x" is no key of a podcast, and is ignored: correct it or leave it out'])

    def test_a_key_with_values_of_two_kinds(self):
        for first, second in (("<array><string/><string/></array>", "<dict/>"), ("<dict><key>a</key><true/></dict>",
                              "<array/>"), ("<array><dict/></array>", "<array><true/><dict/></array>")):
            self.assertTrue(self.check(
                f"<plist><dict><key>Episodes</key>{first}<key>Episodes</key>{second}</dict></plist>".encode()))

    def test_lists_that_contain_themselves_or_much(self):
        key = ascii_object(b"Episodes")
        (finding,) = self.check(binary_list([dictionary_object({1: 2}), key, array_object([2])]))
        self.assertIn("object 2: an array or dictionary that contains itself", finding)
        shared = self.check(binary_list([dictionary_object({1: 2}), key, array_object([3] * 1000),
                                         dictionary_object({})]))
        self.assertEqual(len(shared), 3)
        self.assertTrue(shared[2].endswith("(and 997 more like this; --all shows them)"))


if __name__ == "__main__":
    unittest.main()
