"""Texts of strangers reach a terminal without their control characters, and anything else as they are."""

import os
import pty
import subprocess
import threading
import tty
import unittest

from bundle_support import BundleTestCase
from support import start

# What a terminal would obey and what it would not, and how it is shown.
TEXT = "a\r\n[w] forged\t\x1b[2m\x7f\x9b1mü🚶\u200f\u2028"
SHOWN = "a��[w] forged��[2m��1mü🚶\u200f\u2028"
# Some terminals find control characters in what is no UTF-8, and in forms with too many bytes.
MALFORMED = b"\x9b2m \xe2\x9b.\xc0\x9b\xff".decode(errors="surrogateescape")
MALFORMED_SHOWN = "�2m �.���"


def collect(reading, content):
    try:
        while piece := os.read(reading, 65536):
            content.extend(piece)
    except OSError:  # a terminal that nobody writes to any more
        pass
    os.close(reading)


class TerminalTest(BundleTestCase):
    def seen(self, *arguments, terminals=()):
        """What the tool writes to standard output and standard error, of which `terminals` lists those that are a
        terminal; the others are pipes."""
        contents = []
        readers = []
        ends = []
        for number in (1, 2):
            reading, writing = pty.openpty() if number in terminals else os.pipe()
            if number in terminals:
                tty.setraw(writing)
            contents.append(bytearray())
            readers.append(threading.Thread(target=collect, args=(reading, contents[-1])))
            ends.append(writing)
        process = start(*arguments, stdin=subprocess.DEVNULL, stdout=ends[0], stderr=ends[1], cwd=self.directory)
        for reader, end in zip(readers, ends):
            reader.start()
            os.close(end)
        process.wait(timeout=60)
        for reader in readers:
            reader.join(timeout=60)
        return tuple(content.decode(errors="surrogateescape") for content in contents)

    def test_a_title_in_progress(self):
        title = TEXT.replace("\x1b", "").replace("\r", "")  # which no XML holds
        source = self.feed(f"<rss><channel><item><title>{title}</title></item></channel></rss>")
        for terminals, inserted in (((), title), ((2,), title),
                                    ((1,), SHOWN.replace("a��", "a�").replace("��[2m", "�[2m"))):
            with self.subTest(terminals):
                stdout, _ = self.seen("createbundle", source, "-d", self.bundle, terminals=terminals)
                self.assertIn(f'\n[W] Found an episode ("{inserted}") without a specified location\n', stdout)
                self.assertTrue(stdout.endswith("\n[N] Done!\n"), stdout)

    def test_every_text_in_messages(self):
        reference = self.reference()
        for arguments, message in (
                (("parsefeed", "{}"), 'Could not initialize podcast source with string "{}".\n'),
                (("{}",), "Command `{}' not recognized.\n"),
                (("parsefeed", "http://{}"), '"http://{}" is not a valid podcast source.\n'),
                (("createfeed", reference, "-f", "{}"), '"{}" is not a recognized feed format.\n')):
            for text, shown in ((TEXT, SHOWN), (MALFORMED, MALFORMED_SHOWN)):
                if "-f" in arguments and text == MALFORMED:
                    continue  # a format is told in lower case, which malformed text has not
                given = [str(argument).replace("{}", text) for argument in arguments]
                for terminals, inserted in (((), text), ((1,), text), ((2,), shown), ((1, 2), shown)):
                    with self.subTest(given, terminals=terminals):
                        self.assertEqual(self.seen(*given, terminals=terminals), ("", message.format(inserted)))


if __name__ == "__main__":
    unittest.main()
