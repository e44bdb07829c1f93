"""The scripts that measure the tool: inputs are what they claim, figures say what was measured and nothing else."""

import json
import os
import plistlib
import shutil
import subprocess
import sys
import unittest
import urllib.request
import xml.etree.ElementTree as ElementTree
from pathlib import Path
from unittest import mock

from support import ToolTestCase, environment, tool

ROOT = Path(__file__).resolve().parents[3]
BENCH = ROOT / "bench"
sys.path.insert(0, str(BENCH))

# pylint: disable=wrong-import-position
import chart  # noqa: E402
import figures  # noqa: E402
import inputs  # noqa: E402
import measuring  # noqa: E402
import media_server  # noqa: E402

SVG = "{http://www.w3.org/2000/svg}"


def timed(limit, ours, theirs, work="work"):
    """A row of two times."""
    return {"work": work, "against": "`rival`", "limit": limit, "ratio": ours / theirs,
            "ours": {"median": ours, "processor": ours, "peak": 20_000_000},
            "theirs": {"median": theirs, "processor": theirs / 2, "peak": 10_000_000}}


MISSING = {"work": "absent work", "against": "`xmllint`", "limit": 1.5, "missing": "xmllint"}
SAMPLE = {
    "judged": True,
    "machine": {"cores": 2, "memory": 8 << 30, "virtual": True, "system": "Linux x86_64"},
    "rivals": {"curl": "7.88.1", "xmllint": None},
    "smallest peak": 8_000_000,
    "rows": [
        timed(2.0, 0.3, 0.2, "fast <work> & more"),
        timed(2.0, 0.6, 0.2, "slow work"),
        timed(None, 0.6, 0.2, "shown only"),
        MISSING,
        {"work": "memory", "against": "32 MB", "limit": 1.0, "ratio": 0.5,
         "ours": {"median": 1.0, "processor": 1.0, "peak": 16_000_000}, "theirs": {"peak": 32_000_000}},
    ],
}


class InputsTest(ToolTestCase):
    def made(self, kind, count):
        path = self.path(f"{kind}-{count}")
        self.assertEqual(inputs.main([kind, str(count), str(path)]), 0)
        return path

    def test_a_feed_has_the_items_and_the_shape_of_published_ones(self):
        path = self.made("feed", 400)
        text = path.read_text(encoding="utf-8")
        items = ElementTree.fromstring(text).findall("channel/item")
        self.assertEqual(len(items), 400)
        self.assertEqual(text.count("<description><![CDATA[<p>"), 300 + 1)  # the channel's is one more
        self.assertEqual(text.count("<description>&lt;p&gt;"), 100)
        self.assertTrue(2100 < path.stat().st_size / 400 < 2500, path.stat().st_size)
        self.assertTrue(all(item.findtext("description").startswith("<p>") for item in items))

    def test_the_tool_takes_everything_from_such_a_feed(self):
        podcast = self.parsefeed(self.made("feed", 40).as_uri())
        self.assertEqual(len(podcast["Episodes"]), 40)
        for episode in podcast["Episodes"]:
            self.assertLessEqual({"EpisodeName", "EpisodeAuthor", "EpisodeDate", "EpisodeDescription",
                                  "EpisodeKeywords", "EpisodeReference", "EpisodeType", "EpisodeFileSize",
                                  "EpisodePosterReference"}, set(episode))

    def test_equal_arguments_give_equal_bytes(self):
        first = self.made("feed", 20).read_bytes()
        self.assertEqual(self.made("feed", 20).read_bytes(), first)

    def test_reference_files_name_media_that_are_missing(self):
        for kind, names in (("episodes", 30), ("one-name", 1)):
            with self.subTest(kind):
                episodes = plistlib.loads(self.made(kind, 30).read_bytes())["Episodes"]
                locations = [Path(episode["EpisodeReference"]) for episode in episodes]
                self.assertEqual((len(locations), len({path.name for path in locations})), (30, names))
                self.assertFalse(any(path.exists() for path in locations))

    def test_media_have_their_size_and_differ(self):
        paths = inputs.write_media(self.path("media"), 3, 3_000_000)
        self.assertEqual({path.stat().st_size for path in paths}, {3_000_000})
        self.assertEqual(len({path.read_bytes() for path in paths}), 3)


class FiguresTest(unittest.TestCase):
    VERDICTS = [
        (timed(2.0, 0.4, 0.2), "met"),
        (timed(2.0, 0.401, 0.2), "missed by less than 1 %"),
        (timed(2.0, 0.6, 0.2), "missed by 50 %"),
        (timed(None, 0.6, 0.2), "–"),
        (MISSING, "missing: xmllint"),
    ]

    def test_a_verdict_is_by_the_limit(self):
        for row, expected in self.VERDICTS:
            with self.subTest(expected):
                self.assertEqual(figures.verdict(row), expected)

    def test_small_inputs_get_no_verdict(self):
        self.assertEqual(figures.verdict(timed(2.0, 0.1, 0.2), judged=False), "not judged")

    def test_the_table_of_the_manual_shows_each_row(self):
        self.assertEqual(figures.document_table(SAMPLE), [
            "| work | against | ratio | at most | verdict |",
            "|---|---|---|---|---|",
            "| fast <work> & more | `rival` | 1.50 | 2 | met |",
            "| slow work | `rival` | 3.00 | 2 | missed by 50 % |",
            "| shown only | `rival` | 3.00 | – | – |",
            "| absent work | `xmllint` | – | 1.5 | missing: xmllint |",
            "| memory | 32 MB | 0.50 | 1 | met |",
        ])

    def test_the_console_shows_what_was_compared(self):
        lines = figures.console_table(SAMPLE)
        self.assertRegex(lines[2], r"300\.0 ms +200\.0 ms +1\.50 +2 +met +3\.00 +20\.0 MB +10\.0 MB$")
        self.assertRegex(lines[5], r"xmllint +– +– +– +1\.5 +missing: xmllint +– +– +–$")
        self.assertRegex(lines[6], r"16\.0 MB +32\.0 MB +0\.50 +1 +met +– +16\.0 MB +32\.0 MB$")

    def test_the_chart_has_a_bar_for_each_measured_limit(self):
        root = ElementTree.fromstring(chart.svg(SAMPLE))
        self.assertEqual(root.tag, f"{SVG}svg")
        bars = {bar.get("class"): float(bar.get("width")) for bar in root.iter(f"{SVG}rect")}
        del bars["ground"]
        self.assertEqual(sorted(bars), ["met", "missed"])
        self.assertEqual(len(list(root.iter(f"{SVG}rect"))), 1 + 3)
        self.assertGreater(bars["missed"], bars["met"])
        texts = ["".join(text.itertext()) for text in root.iter(f"{SVG}text")]
        self.assertIn("fast <work> & more", texts)
        self.assertIn("missing: xmllint", texts)
        self.assertNotIn("shown only", texts)


class ReportTest(ToolTestCase):
    def report(self, *arguments, root=ROOT):
        return subprocess.run([sys.executable, "-B", root / "bench/report", *arguments], timeout=60,
                              capture_output=True, text=True, check=False)

    def copy(self, document):
        """A project of its own that holds what the report touches."""
        root = self.path("project")
        shutil.copytree(BENCH, root / "bench", ignore=shutil.ignore_patterns("__pycache__"))
        (root / "docs").mkdir()
        (root / "docs/performance.md").write_text(document, encoding="utf-8")
        return root

    def test_the_manual_shows_the_figures_that_are_kept(self):
        finished = self.report("--check")
        self.assertEqual((finished.returncode, finished.stderr), (0, ""))

    def test_figures_become_a_table_and_a_chart(self):
        root = self.copy("# Speed\n\n<!-- figures: bench/report writes them -->\nold\n<!-- end of figures -->\n\nend\n")
        source = self.write("figures.json", json.dumps(SAMPLE))
        self.assertEqual(self.report("--check", root=root).returncode, 1)
        self.assertEqual(self.report(str(source), root=root).returncode, 0)
        self.assertEqual(self.report("--check", root=root).returncode, 0)
        document = (root / "docs/performance.md").read_text(encoding="utf-8")
        self.assertTrue(document.startswith("# Speed\n") and document.endswith("\n\nend\n"), document)
        self.assertIn("| slow work | `rival` | 3.00 | 2 | missed by 50 % |\n", document)
        self.assertIn("Measured on a virtual machine with 2 cores and 8 GiB of memory (Linux x86_64), against curl "
                      "7.88.1.\n", document)
        self.assertNotIn("old", document)
        ElementTree.parse(root / "docs/performance.svg")

    def test_figures_of_a_quick_run_are_refused(self):
        root = self.copy("")
        source = self.write("figures.json", json.dumps({**SAMPLE, "judged": False}))
        finished = self.report(str(source), root=root)
        self.assertEqual((finished.returncode, finished.stderr), (1, "report: figures of a quick run say nothing\n"))


class BenchTest(ToolTestCase):
    def bench(self, *arguments, executable=None, search_path=None):
        """A quick run, which installs nothing; with a search path only what lies there can be found."""
        variables = environment({"PATH": str(search_path)} if search_path else None)
        command = [sys.executable, "-B", ROOT / "scripts/bench", "--quick", "--no-install", "--data", self.path("data"),
                   "--tool", executable or tool(), *arguments]
        return subprocess.run(command, env=variables, timeout=300, capture_output=True, text=True, check=False)

    def figures(self):
        return json.loads(self.path("data/figures.json").read_text(encoding="utf-8"))

    def test_a_missing_rival_is_said_to_be_missing(self):
        self.path("empty").mkdir()
        finished = self.bench("feed", "peers", "many", "start", search_path=self.path("empty"))
        self.assertEqual(finished.returncode, 0, finished.stderr)
        rows = self.figures()["rows"]
        compared = [row for row in rows if "missing" not in row]
        self.assertEqual({row["against"] for row in compared if row["contest"] not in ("many", "peers")},
                         {"the feed's size"})
        self.assertLessEqual({"xmllint", "xsltproc", "true", "libmrss0-dev", "golang-github-mmcdole-gofeed-dev"},
                             {row.get("missing") for row in rows})
        for row in rows:
            if "missing" in row:
                self.assertNotIn("ratio", row)
        self.assertIn("missing: xmllint", finished.stdout)

    def test_a_run_leaves_figures_and_nothing_else_but_its_inputs(self):
        finished = self.bench("growth", "names", "local")
        self.assertEqual(finished.returncode, 0, finished.stderr)
        kept = self.figures()
        self.assertFalse(kept["judged"])
        self.assertEqual([row["contest"] for row in kept["rows"]], ["growth", "growth", "names", *["local"] * 4])
        for row in kept["rows"]:
            self.assertGreater(row["ours"]["median"], 0)
            self.assertGreater(row["ours"]["peak"], 1_000_000)
            self.assertAlmostEqual(row["ratio"], row["ours"]["median"] / row["theirs"]["median"])
        self.assertEqual([path.name for path in self.path("data").iterdir() if not path.name.startswith("inputs-")],
                         ["figures.json"])

    def test_a_tool_that_does_not_do_the_work_gets_no_figures(self):
        idle = self.write("idle", "#!/bin/sh\nexit 0\n")
        idle.chmod(0o755)
        finished = self.bench("feed", executable=idle)
        self.assertEqual((finished.returncode, finished.stdout), (1, ""))
        self.assertIn("bench: parsefeed: its output is not whole", finished.stderr)

    def test_a_tool_that_fails_gets_no_figures(self):
        finished = self.bench("feed", executable=shutil.which("false"))
        self.assertEqual((finished.returncode, finished.stdout), (1, ""))
        self.assertIn("bench: parsefeed: ", finished.stderr)
        self.assertIn(" ended with 1\n", finished.stderr)

    def test_a_program_that_does_not_end_is_ended(self):
        with mock.patch.object(measuring, "LONGEST_RUN", 1), self.assertRaises(measuring.Failure) as caught:
            measuring.run(measuring.Contestant("endless", ["/bin/sh", "-c", "sleep 60"]))
        self.assertRegex(str(caught.exception), "^endless: /bin/sh did not end within 1 seconds$")

    def test_a_contest_that_does_not_exist_is_refused(self):
        finished = self.bench("fed")
        self.assertEqual(finished.returncode, 2)
        self.assertIn("no such contest: fed", finished.stderr)


@unittest.skipUnless(media_server.program(), "nginx is not installed; scripts/setup --bench installs it")
class MediaServerTest(ToolTestCase):
    def test_files_are_served_until_the_block_ends(self):
        os.chmod(self.directory, 0o755)
        inputs.write_media(self.path("media"), 1, 1000)
        with media_server.serving(self.path("media")) as url:
            with urllib.request.urlopen(f"{url}/walk-1.mp3", timeout=10) as answer:
                self.assertEqual(len(answer.read()), 1000)
        with self.assertRaises(OSError):
            urllib.request.urlopen(f"{url}/walk-1.mp3", timeout=10).close()


if __name__ == "__main__":
    unittest.main()
