"""The picture in README shows what the programs print today."""

import re
import subprocess
import sys
import unittest
from pathlib import Path

from support import ToolTestCase, environment, tool

ROOT = Path(__file__).resolve().parents[3]


def texts(picture):
    # Transfers end in any order.
    return sorted(re.findall(r"<text[^>]*>(.*)</text>", picture.read_text(encoding="utf-8")))


class TerminalPictureTest(ToolTestCase):
    def test_it_is_of_a_run(self):
        picture = self.path("terminal.svg")
        subprocess.run([sys.executable, "-B", ROOT / "scripts" / "draw-terminal", picture], check=True, timeout=120,
                       env=environment({"QEL": str(Path(tool()).absolute())}))
        self.assertEqual(texts(picture), texts(ROOT / "docs" / "terminal.svg"))


if __name__ == "__main__":
    unittest.main()
