"""Many feeds through an engine around the tool: what is interrupted resumes, and every file is whole.

Nobody looks at a hundred thousand files, so what the scripts of examples/fleet promise must hold unseen.
"""

import os
import plistlib
import signal
import subprocess
import time
import unittest
from pathlib import Path

from support import ToolTestCase, environment, has_gnu_parallel, run, tool

FLEET = Path(__file__).resolve().parents[3] / "examples" / "fleet"
FEEDS = 60
BAD = 7
FIRST_SLOW = 30

# The tool as it is in the middle of its output, from the thirtieth feed on.
SLOW_TOOL = """#!/bin/sh
case $2 in
  */00000[3-6]?.xml)
    '{tool}' "$@" | head -c 1000
    echo $$ >>'{pids}'
    exec sleep 100 ;;
  *) exec '{tool}' "$@" ;;
esac
"""


class FleetTestCase(ToolTestCase):
    def script(self, name, *arguments, qel=None, **options):
        """Starts a script of the fleet in the test's directory, with both its outputs to be read."""
        variables = environment({"QEL": str(qel or tool()), "HOME": str(self.directory)})
        return subprocess.Popen([FLEET / name, *arguments], cwd=self.directory, env=variables,
                                stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.PIPE,
                                text=True, **options)

    def outcome(self, name, *arguments, **options):
        """The exit status, standard output and standard error of a script that has ended."""
        process = self.script(name, *arguments, **options)
        output, messages = process.communicate(timeout=240)
        return process.returncode, output, messages


class ConvertOneTest(FleetTestCase):
    def setUp(self):
        super().setUp()
        self.assertEqual(self.outcome("make-feeds", "1", "30"), (0, "", ""))
        self.source, self.target = self.path("feeds.tsv").read_text().strip().split("\t")

    def test_it_writes_what_the_tool_writes(self):
        self.assertEqual(self.outcome("convert-one", self.source, self.target), (0, "", ""))
        self.assertEqual(self.path(self.target).read_bytes(), run("parsefeed", self.source).stdout)

    def test_a_failure_is_told_in_a_line_and_leaves_the_file_that_was_there(self):
        self.write("kept.plist", "kept")
        missing = self.path("missing.xml").as_uri()
        self.assertEqual(self.outcome("convert-one", missing, "kept.plist"),
                         (1, "", f"{missing}: Could not load source: No such file or directory\n"))
        self.assertEqual(self.path("kept.plist").read_text(), "kept")
        self.assertFalse(self.path("kept.plist.part").exists())

    def test_a_file_that_the_disk_did_not_take_whole_is_a_failure(self):
        limited = self.write("limited", f"#!/bin/bash\nulimit -f 1\nexec '{tool()}' \"$@\"\n")
        limited.chmod(0o755)
        self.assertEqual(self.outcome("convert-one", self.source, "a.plist", qel=limited),
                         (1, "", f"{self.source}: the reference file could not be written\n"))
        self.assertEqual(list(self.directory.glob("a.plist*")), [])


@unittest.skipUnless(has_gnu_parallel(), "GNU parallel is not installed")
class ConvertAllTest(FleetTestCase):
    def setUp(self):
        super().setUp()
        self.assertEqual(self.outcome("make-feeds", str(FEEDS)), (0, "", ""))
        self.lines = self.path("feeds.tsv").read_text().splitlines()
        self.sources = [line.split("\t")[0] for line in self.lines]
        self.targets = [self.path(line.split("\t")[1]) for line in self.lines]
        self.pids = self.path("pids")
        self.slow_tool = self.write("slow-tool", SLOW_TOOL.format(tool=tool(), pids=self.pids))
        self.slow_tool.chmod(0o755)

    def convert_all(self, **options):
        return self.outcome("convert-all", "feeds.tsv", "-j", "2", **options)

    def start_and_wait_until_both_jobs_are_slow(self):
        process = self.script("convert-all", "feeds.tsv", "-j", "2", qel=self.slow_tool)
        self.addCleanup(process.communicate)
        self.addCleanup(process.terminate)
        deadline = time.monotonic() + 120
        while not self.pids.exists() or len(self.slow_jobs()) < 2:
            self.assertLess(time.monotonic(), deadline)
            self.assertIsNone(process.poll())
            time.sleep(0.05)
        return process

    def slow_jobs(self):
        return [int(line) for line in self.pids.read_text().splitlines()]

    def assertWhole(self, sources, targets):
        self.assertGreater(len(sources), 0)
        for source, target in zip(sources, targets):
            with self.subTest(source):
                self.assertEqual(target.read_bytes(), run("parsefeed", source).stdout)

    def test_an_interrupted_run_resumes_and_ends_complete(self):
        bad = self.directory / "feeds" / "0000" / f"{BAD:07}.xml"
        good = bad.read_bytes()
        bad.write_bytes(good[:500])

        process = self.start_and_wait_until_both_jobs_are_slow()
        process.send_signal(signal.SIGTERM)
        _, messages = process.communicate(timeout=60)
        self.assertEqual(process.returncode, 255)
        self.assertIn(f"{self.sources[BAD - 1]}: Could not load source: ", messages)

        # The half of a file that a killed job leaves has not got the name of a whole one.
        done = [number for number in range(1, FIRST_SLOW) if number != BAD]
        converted = [self.targets[number - 1] for number in done]
        self.assertEqual([target for target in self.targets if target.exists()], converted)
        parts = [Path(f"{target}.part") for target in self.targets[FIRST_SLOW - 1:][:2]]
        self.assertEqual(sorted(self.path("references").rglob("*.part")), parts)
        for part in parts:
            self.assertEqual(part.stat().st_size, 1000)
            self.assertRaises(Exception, plistlib.loads, part.read_bytes())
        status, output, counts = self.outcome("list-failures", "feeds.tsv")
        self.assertEqual((status, output), (1, self.lines[BAD - 1] + "\n"))
        self.assertEqual(counts, f"{len(done)} converted, 1 failed, {FEEDS - FIRST_SLOW + 1} to do\n")

        # It goes on behind what was done, and the bad feed stops nothing.
        inodes = [target.stat().st_ino for target in converted]
        status, _, messages = self.convert_all()
        self.assertEqual(status, 1)
        self.assertEqual(messages.count("\n"), 1, messages)
        self.assertIn(f"{self.sources[BAD - 1]}: Could not load source: ", messages)
        self.assertEqual([target.stat().st_ino for target in converted], inodes)
        self.assertEqual([target for target in self.targets if not target.exists()], [self.targets[BAD - 1]])
        self.assertEqual(self.outcome("list-failures", "feeds.tsv"),
                         (1, self.lines[BAD - 1] + "\n", f"{FEEDS - 1} converted, 1 failed, 0 to do\n"))

        bad.write_bytes(good)
        self.assertEqual(self.convert_all(), (0, "", ""))
        self.assertEqual(self.outcome("list-failures", "feeds.tsv"), (0, "", f"{FEEDS} converted, 0 failed, 0 to do\n"))
        self.assertEqual(sorted(path for path in self.path("references").rglob("*") if path.is_file()), self.targets)
        self.assertWhole(self.sources, self.targets)

    def test_a_run_does_not_start_beside_the_jobs_of_another(self):
        process = self.start_and_wait_until_both_jobs_are_slow()
        refusal = (255, "", "convert-all: feeds.tsv is still being converted\n")
        self.assertEqual(self.convert_all(), refusal)

        # parallel itself can be killed without its jobs; they would write beside those of the next run.
        process.kill()
        process.wait(timeout=60)
        jobs = self.slow_jobs()
        self.addCleanup(end, jobs)
        self.assertEqual(self.convert_all(), refusal)

        end(jobs)
        deadline = time.monotonic() + 60
        while (outcome := self.convert_all()) == refusal:
            self.assertLess(time.monotonic(), deadline)
            time.sleep(0.05)
        self.assertEqual(outcome, (0, "", ""))
        self.assertWhole(self.sources[FIRST_SLOW - 1:], self.targets[FIRST_SLOW - 1:])

    def test_a_job_without_end_is_ended(self):
        with self.path("feeds.tsv").open("w") as listing:
            listing.write("".join(line + "\n" for line in self.lines[FIRST_SLOW - 2:FIRST_SLOW]))
        status, _, _ = self.outcome("convert-all", "feeds.tsv", "--timeout", "2", qel=self.slow_tool)
        self.assertEqual(status, 1)
        self.assertEqual(self.outcome("list-failures", "feeds.tsv"),
                         (1, self.lines[FIRST_SLOW - 1] + "\n", "1 converted, 1 failed, 0 to do\n"))


def end(processes):
    for process in processes:
        try:
            os.kill(process, signal.SIGTERM)
        except ProcessLookupError:
            pass


if __name__ == "__main__":
    unittest.main()
