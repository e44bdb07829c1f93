"""The layering check finds each kind of breach, and says where it is."""

import ast
import re
import subprocess
import sys
import tempfile
import unittest
from pathlib import Path

ROOT = Path(__file__).resolve().parents[3]
CHECK = ROOT / "scripts" / "check-layers"

SOUND = {
    "platform/text/Text.h": "#pragma once\n\n#include <string>\n",
    "platform/net/URL.h": '#pragma once\n\n#include "platform/text/Text.h"\n',
    "platform/net/URL.cpp": '#include "platform/net/URL.h"\n\n#include <curl/curl.h>\n',
    "cli/common/QELError.h": '#pragma once\n\n#include "platform/net/URL.h"\n',
    "cli/Driver.h": '#pragma once\n\n#include "cli/common/QELError.h"\n',
    "model/QELEpisode.h": '#pragma once\n\n#include <string>\n\n#include "cli/common/QELError.h"\n',
    "dates/RFC822Parsing.h": "#pragma once\n",
}

# What is added to the sound tree, and the one line that must come of it.
BREACHES = [
    ({"model/A.cpp": '#include "cli/Driver.h"\n'}, 'model/A.cpp:1: model/ may not include "cli/Driver.h"'),
    ({"model/A.cpp": "#include <unistd.h>\n"}, "model/A.cpp:1: only platform/ may include <unistd.h>"),
    ({"cli/A.cpp": "#include <curl/curl.h>\n"}, "cli/A.cpp:1: only platform/ may include <curl/curl.h>"),
    (
        {"platform/text/A.cpp": '#include "cli/common/QELError.h"\n'},
        'platform/text/A.cpp:1: platform/text/ may not include "cli/common/QELError.h"',
    ),
    (
        {"platform/text/A.cpp": '#include "platform/net/URL.h"\n'},
        'platform/text/A.cpp:1: platform/text/ may not include "platform/net/URL.h"',
    ),
    (
        {"platform/plist/A.cpp": '#include "platform/net/URL.h"\n'},
        'platform/plist/A.cpp:1: platform/plist/ may not include "platform/net/URL.h"',
    ),
    (
        {"dates/A.cpp": '#include "cli/common/QELError.h"\n'},
        'dates/A.cpp:1: dates/ may not include "cli/common/QELError.h"',
    ),
    (
        {"generators/A.cpp": '#include "dates/RFC822Parsing.h"\n'},
        'generators/A.cpp:1: generators/ may not include "dates/RFC822Parsing.h"',
    ),
    (
        {"cli/common/A.cpp": '#include "model/QELEpisode.h"\n'},
        'cli/common/A.cpp:1: cli/common/ may not include "model/QELEpisode.h"',
    ),
    (
        {"cli/common/A.cpp": '#include "cli/Driver.h"\n'},
        'cli/common/A.cpp:1: cli/common/ may not include "cli/Driver.h"',
    ),
    ({"platform/A.cpp": "#include <string>\n"}, "platform/A.cpp:1: platform/ is no room for sources"),
    ({"platform/text/A.h": "// no guard\n"}, 'platform/text/A.h:1: a header opens with "#pragma once"'),
    (
        {"model/QELEpisode.cpp": '#include <string>\n#include "model/QELEpisode.h"\n'},
        'model/QELEpisode.cpp:1: a source includes its own header "model/QELEpisode.h" first',
    ),
    (
        {"model/A.cpp": '#include "model/QELEpisode.h"\n#include <string>\n'},
        "model/A.cpp:2: <string> belongs above our own headers",
    ),
    (
        {"model/A.cpp": '#include "QELEpisode.h"\n'},
        'model/A.cpp:1: "QELEpisode.h" is no header named from the root',
    ),
]


def check(files):
    """The check's exit status and its lines, over a tree of these files."""
    with tempfile.TemporaryDirectory() as root:
        for name, text in files.items():
            path = Path(root, name)
            path.parent.mkdir(parents=True, exist_ok=True)
            path.write_text(text, encoding="utf-8")
        run = subprocess.run(
            [sys.executable, "-B", CHECK, root], capture_output=True, text=True, timeout=60
        )
        return run.returncode, run.stderr.splitlines()


class CheckLayersTest(unittest.TestCase):
    def test_a_sound_tree_passes_in_silence(self):
        self.assertEqual(check(SOUND), (0, []))

    def test_each_breach_is_told_with_its_place(self):
        for files, line in BREACHES:
            with self.subTest(line):
                status, lines = check(SOUND | files)
                self.assertEqual(status, 1)
                self.assertIn(line, lines)

    def test_the_manual_shows_the_table_that_is_checked(self):
        checked = ast.literal_eval(re.search(r"(?ms)^MAY_INCLUDE = (.*?^})", CHECK.read_text(encoding="utf-8"))[1]
                                   .replace("set()", "()"))
        text = (ROOT / "CONTRIBUTING.md").read_text(encoding="utf-8")
        rows = re.findall(r"(?m)^\| `([^`|]+)/` \| [^|]+ \| ([^|]+) \|$", text)
        shown = {room: set(re.findall(r"`(.+?)/`", rooms)) for room, rooms in rows}
        self.assertEqual(shown, {room: set(rooms) for room, rooms in checked.items()})

    def test_a_tree_without_sources_is_no_success(self):
        self.assertEqual(check({})[0], 1)


if __name__ == "__main__":
    unittest.main()
