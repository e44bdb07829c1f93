"""Many feeds through an engine around the tool: what is interrupted resumes, and every output is whole.

Nobody looks at a hundred thousand files, so what the scripts of examples/fleet promise must hold unseen.
"""

import os
import random
import shutil
import signal
import time
import unittest
import xml.etree.ElementTree as ElementTree
from collections import Counter
from pathlib import Path

from fleet_support import HALTING, MISSING, STAYING, FleetTestCase, processes_of
from support import has_gnu_parallel, run, soaking

FEEDS = 60
BAD = 7
FIRST_STAYING = 30

# Runs a command here as ssh does there, in a home of its own.
SSH_STAND_IN = """#!/bin/sh
while [ "${{1#-}}" != "$1" ]; do [ "$1" = -l ] && shift; shift; done
export HOME='{directory}'/home-$1; shift
[ "$1" != -- ] || shift
mkdir -p "$HOME" && cd "$HOME" && exec sh -c "$*"
"""


@unittest.skipUnless(has_gnu_parallel(), "GNU parallel is not installed")
class ConvertAllTest(FleetTestCase):
    def setUp(self):
        super().setUp()
        self.sources, self.targets = self.feeds(FEEDS)
        self.lines = self.path("feeds.tsv").read_text().splitlines()

    def convert_all(self, *options, **settings):
        return self.outcome("convert-all", *options, "feeds.tsv", "-j", "2", **settings)

    def start_and_wait_until_both_jobs_stay(self):
        process = self.script("convert-all", "feeds.tsv", "-j", "2", qel=self.fake_tool(STAYING),
                              start_new_session=True)
        self.addCleanup(process.communicate)
        self.addCleanup(self.end, process.pid)
        self.wait_until(lambda: len(self.staying()) == 2)
        return process

    def engine_of(self, process):
        """The process of GNU parallel."""
        return int(Path(f"/proc/{process.pid}/task/{process.pid}/children").read_text())

    def end(self, leader):
        """Ends all processes of a session at once, as a power cut does."""
        while processes := list(processes_of(leader)):
            for process in processes:
                try:
                    os.kill(process, signal.SIGKILL)
                except ProcessLookupError:
                    pass

    def assertClean(self):
        """Every feed is converted, and nothing lies there that a run needs only while it goes on."""
        self.assertEqual(self.files("references"), self.targets)
        self.assertWhole(self.sources, self.targets)
        self.assertEqual(sorted(path.name for path in self.directory.glob("feeds.tsv*")),
                         ["feeds.tsv", "feeds.tsv.lock", "feeds.tsv.log"])

    def test_an_interrupted_run_resumes_and_ends_complete(self):
        bad = self.directory / "feeds" / "0000" / f"{BAD:07}.xml"
        good = bad.read_bytes()
        bad.write_bytes(good[:500])

        process = self.start_and_wait_until_both_jobs_stay()
        process.send_signal(signal.SIGTERM)
        _, messages = process.communicate(timeout=60)
        self.assertEqual(process.returncode, 255)
        self.assertIn(f"{self.sources[BAD - 1]}: Could not load source: ", messages)

        # What is done is whole, what was in work has left nothing.
        done = [number for number in range(1, FIRST_STAYING) if number != BAD]
        converted = [self.targets[number - 1] for number in done]
        self.assertEqual(self.files("references"), converted)
        status, output, counts = self.outcome("list-failures", "feeds.tsv")
        self.assertEqual((status, counts), (1, f"{len(done)} converted, 1 failed, {FEEDS - FIRST_STAYING + 1} to do\n"))
        self.assertRegex(output, rf"\A{BAD}\t{self.lines[BAD - 1]}\tCould not load source: .+\n\Z")

        # It goes on behind what was done, and the bad feed stops nothing.
        inodes = [target.stat().st_ino for target in converted]
        status, _, messages = self.convert_all()
        self.assertEqual(status, 1)
        self.assertEqual(messages.count("\n"), 2, messages)
        self.assertTrue(messages.endswith(f"{FEEDS - 1} converted, 1 failed, 0 to do\n"))
        self.assertEqual([target.stat().st_ino for target in converted], inodes)

        bad.write_bytes(good)
        for _ in range(2):
            self.assertEqual(self.convert_all(), (0, "", f"{FEEDS} converted, 0 failed, 0 to do\n"))
        self.assertEqual(self.outcome("list-failures", "feeds.tsv"), (0, "", f"{FEEDS} converted, 0 failed, 0 to do\n"))
        self.assertEqual(Counter(word for word, *_ in self.log()), {"converted": FEEDS, "failed": 2})
        self.assertClean()

    def test_it_may_be_killed_at_any_moment(self):
        halting = self.fake_tool(HALTING)
        whole = {target: run("parsefeed", source).stdout for source, target in zip(self.sources, self.targets)}
        chance = random.Random(os.urandom(8))
        parts = 0
        for _ in range(60 if soaking() else 6):
            process = self.script("convert-all", "--batch", "5", "feeds.tsv", "-j", "2", qel=halting,
                                  start_new_session=True)
            time.sleep(chance.uniform(0.2, 1.5))
            number = chance.choice((signal.SIGKILL, signal.SIGTERM, signal.SIGINT))
            with self.subTest(signal=number):
                if number == signal.SIGKILL:
                    self.end(process.pid)
                process.send_signal(number)
                process.communicate(timeout=60)
                finished = [target for target in self.targets if target.exists()]
                for target in finished:
                    self.assertEqual(target.read_bytes(), whole[target])
                parts += len(list(self.path("references").rglob("*.part")))
                if len(finished) == FEEDS:
                    shutil.rmtree(self.path("references"))
                    self.path("feeds.tsv.log").unlink()
        self.assertEqual(self.convert_all(), (0, "", f"{FEEDS} converted, 0 failed, 0 to do\n"))
        self.assertClean()
        if soaking():
            print(f"{parts} parts met")
            self.assertGreater(parts, 0)

    def test_hup_lets_the_jobs_that_run_finish(self):
        process = self.script("convert-all", "--batch", "3", "feeds.tsv", "-j", "2", qel=self.fake_tool(HALTING))
        self.wait_until(lambda: self.path("feeds.tsv.log").exists() and self.log())
        process.send_signal(signal.SIGHUP)
        _, messages = process.communicate(timeout=60)
        converted = len(self.log())
        self.assertEqual(process.returncode, 255)
        self.assertIn(f"{converted} converted, 0 failed, {FEEDS - converted} to do\n", messages)
        self.assertEqual((converted % 3, converted < FEEDS), (0, True))
        self.assertEqual(len(self.files("references")), converted)

    def test_a_run_does_not_start_beside_the_jobs_of_another(self):
        process = self.start_and_wait_until_both_jobs_stay()
        refusal = (255, "", "convert-all: feeds.tsv is still being converted\n")
        self.assertEqual(self.convert_all(), refusal)

        # Killed alone, it leaves its jobs behind; they would write beside those of the next run.
        engine = self.engine_of(process)
        process.kill()
        process.wait(timeout=60)
        self.assertEqual(self.convert_all(), refusal)
        os.kill(engine, signal.SIGKILL)
        self.wait_until(lambda: engine not in processes_of(process.pid))
        self.assertEqual(self.convert_all(), refusal)

        self.end(process.pid)
        self.assertEqual(self.convert_all(), (0, "", f"{FEEDS} converted, 0 failed, 0 to do\n"))
        self.assertClean()

    def test_what_is_no_entry_is_passed_over_or_named_with_its_number(self):
        one, two, *_ = self.sources
        self.list("# comment", "", " ", f"{one}\ta.plist\r", "no target", "\tb.plist", f"{one}\t", "a\tb.plist\tc",
                  "a\tc.txt", f"{two}\ta.plist", f"{two}\tb.xml", "missing.plist\tb.podcast", f"{two}\t./a//../a.plist")
        no_entry, no_form, twice = ("not a source, a tab and a target", "the ending of the target names no form",
                                    "an earlier line has the same target")
        faults = {5: no_entry, 6: no_entry, 7: no_entry, 8: no_entry, 9: no_form, 10: twice, 13: twice}
        refusal = 'Could not initialize podcast source with string "missing.plist".'
        self.assertEqual(self.convert_all(), (1, "", "".join(f"feeds.tsv:{number}: {fault}\n" for number, fault in
                                                             faults.items()) +
                                              f"missing.plist: {refusal}\n2 converted, 8 failed, 0 to do\n"))
        lines = self.path("feeds.tsv").read_text().splitlines()
        self.assertEqual(self.outcome("list-failures", "feeds.tsv")[1],
                         "".join(f"{number}\t{lines[number - 1]}\t{fault}\n" for number, fault in
                                 sorted([*faults.items(), (12, refusal)])))
        self.assertTrue(self.path("a.plist").exists() and self.path("b.xml").exists())

    def test_lines_may_be_moved_added_and_corrected(self):
        self.list(*self.lines[:20], f"file:///missing.xml\t{self.lines[20].split(chr(9))[1]}")
        self.assertEqual(self.convert_all()[2], f"file:///missing.xml: {MISSING}\n20 converted, 1 failed, 0 to do\n")
        self.list(*reversed(self.lines))
        self.assertEqual(self.convert_all(), (0, "", f"{FEEDS} converted, 0 failed, 0 to do\n"))
        self.assertEqual(len(self.log()), FEEDS + 1)
        self.assertClean()

    def test_a_piece_of_a_line_in_the_log_is_no_outcome(self):
        self.assertEqual(self.convert_all()[0], 0)
        log = self.path("feeds.tsv.log").read_bytes().splitlines(keepends=True)
        self.path("feeds.tsv.log").write_bytes(b"".join(log[:-2]) + log[-2][:40] + log[-1])
        self.assertEqual(self.convert_all(), (0, "", f"{FEEDS} converted, 0 failed, 0 to do\n"))
        self.assertEqual(len(self.path("feeds.tsv.log").read_bytes().splitlines()), FEEDS + 1)

    def test_a_job_without_end_is_ended(self):
        self.list(*self.lines[FIRST_STAYING - 2:FIRST_STAYING])
        status, _, _ = self.convert_all("--limit", "1", qel=self.fake_tool(STAYING))
        self.assertEqual(status, 1)
        failure = f"2\t{self.lines[FIRST_STAYING - 1]}\tno end after 1 s\n"
        self.assertEqual(self.outcome("list-failures", "feeds.tsv"),
                         (1, failure, "1 converted, 1 failed, 0 to do\n"))

    def test_jobs_that_die_leave_their_lines_to_do(self):
        self.assertEqual(self.convert_all(qel="/missing/qel")[0], 255)
        self.assertEqual(self.outcome("list-failures", "feeds.tsv"), (1, "", f"0 converted, 0 failed, {FEEDS} to do\n"))

    def test_a_job_fails_for_the_engine_if_all_its_lines_fail(self):
        self.list(*(f"file:///missing.xml\t{number}.plist" for number in range(60)), self.lines[0])
        status, _, messages = self.outcome("convert-all", "--batch", "2", "feeds.tsv", "-j", "1",
                                           "--halt", "soon,fail=3")
        self.assertEqual((status, messages.splitlines()[-1]), (255, "0 converted, 6 failed, 55 to do"))

    def test_a_host_is_asked_by_no_more_jobs_than_it_may(self):
        self.list(*(f"http://{'ab'[number % 2]}.example/{number}\t{number}.plist" for number in range(12)))
        # A job is one process, the parent of all tools that it runs.
        telling = self.fake_tool('#!/bin/sh\necho "$PPID $2" >>\'{directory}\'/asked\necho "</plist>"\n')
        for options, jobs in (((), 1), (("--batch", "1"), 1), (("--batch", "1", "--per-host", "3"), 3)):
            with self.subTest(options):
                self.assertEqual(self.convert_all(*options, qel=telling)[0], 0)
                asked = {tuple(line.split()) for line in self.path("asked").read_text().splitlines()}
                for host in ("http://a.", "http://b."):
                    self.assertEqual(len({job for job, source in asked if source.startswith(host)}), jobs)
                self.path("asked").unlink()
                self.path("feeds.tsv.log").unlink()

    def test_what_cannot_be_done_is_refused(self):
        for arguments, message in ((["a.tsv"], "there is no list a.tsv"),
                                   (["--batch", "0", "feeds.tsv"], "argument --batch: invalid count value: '0'"),
                                   (["--per-host", "0", "feeds.tsv"], "argument --per-host: invalid count value: '0'"),
                                   (["--limit", "0", "feeds.tsv"], "argument --limit: invalid limit value: '0'"),
                                   (["--limit", "inf", "feeds.tsv"], "argument --limit: invalid limit value: 'inf'"),
                                   (["--limit", "nan", "feeds.tsv"], "argument --limit: invalid limit value: 'nan'"),
                                   (["--pause", "-1", "feeds.tsv"], "argument --pause: invalid seconds value: '-1'"),
                                   (["--bring-back", "feeds.tsv"],
                                    "--bring-back needs --nodes, and the list in the working directory"),
                                   (["--bring-back", "--nodes", "nodes", str(self.path("feeds.tsv"))],
                                    "--bring-back needs --nodes, and the list in the working directory")):
            status, _, messages = self.outcome("convert-all", *arguments)
            self.assertEqual((status, messages.splitlines()[-1]), (2, f"convert-all: error: {message}"))
        self.assertEqual(self.outcome("list-failures", "a.tsv"), (1, "", "list-failures: there is no list a.tsv\n"))
        self.assertEqual(self.outcome("draw-log", "a.log"),
                         (1, "", "draw-log: [Errno 2] No such file or directory: 'a.log'\n"))
        self.assertEqual(self.outcome("make-feeds", "many"), (
            2, "", "usage: make-feeds COUNT [EPISODES]\n"
                   "make-feeds: error: argument count: invalid int value: 'many'\n"))

    def test_another_program_of_the_same_name_is_refused(self):
        other = self.fake_tool("#!/bin/sh\nexit 0\n")
        other.rename(self.path("parallel"))
        self.assertEqual(self.convert_all(env={"PATH": f"{self.directory}:{os.environ['PATH']}"}),
                         (255, "", 'convert-all needs GNU parallel (the package "parallel")\n'))

    @unittest.skipUnless(shutil.which("rsync"), "rsync is not installed")
    def test_targets_are_brought_back_from_machines_that_share_nothing(self):
        ssh = self.fake_tool(SSH_STAND_IN)
        away = "only a target below the working directory can be brought back"
        source = self.sources[0]
        self.list(*self.lines, f"{source}\t{self.directory}/absolute.plist", f"{source}\t../above.plist")
        self.list("2/one.example", "2/two.example", name="nodes")
        status, _, messages = self.outcome("convert-all", "--nodes", "nodes", "--bring-back", "feeds.tsv",
                                           env={"PARALLEL_SSH": str(ssh)})
        self.assertEqual((status, messages.splitlines()[-1]), (1, f"{FEEDS} converted, 2 failed, 0 to do"))
        self.assertEqual([entry[3] for entry in self.log() if entry[0] == "failed"], [away, away])
        homes = list(self.directory.glob("home-*"))
        self.assertEqual((len(homes), [path for home in homes for path in home.glob(".parallel/tmp/*-*-*")]), (2, []))
        self.assertClean()


class DrawLogTest(FleetTestCase):
    def test_each_machine_has_its_colour_and_each_mark_its_line(self):
        outcomes = [f"{1000 + second}.5\tnode{second % 2}\t0.5\tconverted\ta\tb\t" for second in range(20)]
        self.list(*outcomes, "1003.5\tnode1\t1\tfailed\ta\tb\twhy", "1004\tnode1 & all", name="a & b.log")
        status, output, messages = self.outcome("draw-log", "a & b.log")
        self.assertEqual((status, messages), (0, ""))
        drawing = ElementTree.fromstring(output)
        elements = [(element.get("class"), element.text) for element in drawing.iter()]
        counts = Counter(kind for kind, _ in elements)
        self.assertEqual((counts["m0"], counts["m1"], counts["mark"]), (11, 11, 1))  # with one each in the legend
        self.assertIn(("title", "a & b: podcasts converted in a second"), elements)
        self.assertIn(("small", "node1 & all"), elements)

    def test_a_log_without_conversions_is_refused(self):
        self.write("a.log", "")
        self.assertEqual(self.outcome("draw-log", "a.log"), (1, "", "draw-log: a.log tells of no conversion\n"))


if __name__ == "__main__":
    unittest.main()
