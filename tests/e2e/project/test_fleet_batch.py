"""A batch of podcasts: each line has an outcome of its own, and each output is whole or not there."""

import shutil
import signal
import subprocess
import time
import unittest
from pathlib import Path

from fleet_support import FLEET, MISSING, STAYING, FleetTestCase
from support import environment, tool, without_publication_date


class ConvertBatchTest(FleetTestCase):
    def batch(self, *lines, options=(), **settings):
        """Exit status, outcomes without times and machine, and standard error of a batch of these lines."""
        self.list(*lines, name="batch")
        status, output, messages = self.outcome("convert-batch", *options, "batch", **settings)
        return status, [tuple(line.split("\t")[3:]) for line in output.splitlines()], messages

    def show(self):
        """A reference file with one episode on the disk, and a missing one; returns its name."""
        self.write("one.mp3", b"sound")
        self.reference({"PodcastName": "Show", "Episodes": [{"EpisodeName": "One", "EpisodeReference": "one.mp3"},
                                                            {"EpisodeName": "Two", "EpisodeReference": "two.mp3"}]},
                       name="show.plist")
        return "show.plist"

    def test_the_ending_of_a_target_says_what_is_made(self):
        show = self.show()
        lost = '[W] Could not save or download episode "Two"'
        self.assertEqual(self.batch(f"{show}\ta/b.plist", f"{show}\ta/b.xml", f"{show}\tb.RSS", f"{show}\tc.podcast"),
                         (0, [("converted", show, "a/b.plist", ""), ("converted", show, "a/b.xml", ""),
                              ("converted", show, "b.RSS", ""), ("converted", show, "c.podcast", lost)],
                          f"{show}: {lost}\n"))
        self.assertEqual(self.path("a/b.plist").read_bytes(), self.run_tool("parsefeed", show).stdout)
        feed = without_publication_date(self.run_tool("createfeed", show).stdout)
        for name in ("a/b.xml", "b.RSS"):
            self.assertEqual(without_publication_date(self.path(name).read_bytes()), feed)
        self.assertEqual(self.files("c.podcast"), [self.path("c.podcast/Info.plist"), self.path("c.podcast/one.mp3")])
        self.assertEqual(list(self.directory.rglob("*.part")), [])

    def test_an_outcome_tells_when_where_and_how_long(self):
        self.list(f"{self.show()}\ta.plist", name="batch")
        before = time.time()
        _, output, _ = self.outcome("convert-batch", "batch", env={"SLURMD_NODENAME": "node7"})
        end, machine, seconds, *_ = output.split("\t")
        self.assertTrue(before <= float(end) + 0.001 and float(end) <= time.time())
        self.assertTrue(0 < float(seconds) <= time.time() - before)
        self.assertEqual(machine, "node7")

    def test_zone_and_locale_are_the_same_on_all_machines_unless_told(self):
        teller = self.fake_tool('#!/bin/sh\necho "$TZ $LC_ALL" >&2\nexit 1\n')
        self.list("a\ta.plist", name="batch")
        for variables, told in (({}, "UTC C"), ({"TZ": "Asia/Tokyo", "LC_ALL": "de_DE"}, "Asia/Tokyo de_DE")):
            plain = {name: value for name, value in environment().items() if name not in ("TZ", "LC_ALL")}
            finished = subprocess.run([FLEET / "convert-batch", "batch"], cwd=self.directory, check=False,
                                      env={**plain, "QEL": str(teller), **variables}, capture_output=True, text=True)
            self.assertEqual(finished.stderr, f"a: {told}\n")

    def test_a_failure_is_told_and_leaves_what_was_there(self):
        self.write("kept.plist", "kept")
        self.path("kept.podcast").mkdir()
        self.write("kept.podcast/Info.plist", "kept")
        refusal = 'Could not initialize podcast source with string "missing.plist".'
        self.assertEqual(self.batch("file:///missing.xml\tkept.plist", "missing.plist\tkept.podcast"),
                         (1, [("failed", "file:///missing.xml", "kept.plist", MISSING),
                              ("failed", "missing.plist", "kept.podcast", refusal)],
                          f"file:///missing.xml: {MISSING}\nmissing.plist: {refusal}\n"))
        self.assertEqual(self.path("kept.plist").read_text(), "kept")
        self.assertEqual(self.path("kept.podcast/Info.plist").read_text(), "kept")
        self.assertEqual(list(self.directory.glob("*.part")), [])

    def test_targets_of_an_earlier_run_are_replaced(self):
        show = self.show()
        self.write("a.plist", "old")
        self.path("b.podcast").mkdir()
        self.write("b.podcast/old.mp3", "old")
        self.path("b.podcast.part").mkdir()  # of a killed run
        self.write("b.podcast.part/stray.mp3", "stray")
        status, _, _ = self.batch(f"{show}\ta.plist", f"{show}\tb.podcast")
        self.assertEqual(status, 0)
        self.assertEqual(self.path("a.plist").read_bytes(), self.run_tool("parsefeed", show).stdout)
        self.assertEqual(self.files("b.podcast"), [self.path("b.podcast/Info.plist"), self.path("b.podcast/one.mp3")])
        self.assertEqual(list(self.directory.glob("*.old")), [])

    def test_the_replacement_of_a_bundle_may_be_killed_anywhere(self):
        for left, kept in ((("b.podcast.part", "b.podcast.old"), "b.podcast.old"),
                           (("b.podcast", "b.podcast.old"), "b.podcast")):
            for folder in left:
                self.path(folder).mkdir()
                self.write(f"{folder}/Info.plist", folder)
            self.assertEqual(self.batch("missing.plist\tb.podcast")[0], 1)
            self.assertEqual(self.path("b.podcast/Info.plist").read_text(), kept)
            self.assertEqual([path.name for path in self.directory.glob("b.*")], ["b.podcast"])
            shutil.rmtree(self.path("b.podcast"))

    def test_an_output_that_the_disk_did_not_take_whole_is_a_failure(self):
        sources, _ = self.feeds(1, episodes=30)
        limited = self.fake_tool("#!/bin/bash\ntrap '' XFSZ\nulimit -f 1\nexec '{tool}' \"$@\"\n")
        for target in ("a.plist", "a.xml"):
            self.assertEqual(self.batch(f"{sources[0]}\t{target}", qel=limited)[1],
                             [("failed", sources[0], target, "the output could not be written")])
        # A bundle's Info.plist is checked as well, though qel does tell when it cannot write that.
        cutting = self.fake_tool("#!/bin/sh\n'{tool}' \"$@\" && truncate -s -1 \"$4/Info.plist\"\n")
        self.assertEqual(self.batch(f"{self.show()}\ta.podcast", qel=cutting)[1],
                         [("failed", "show.plist", "a.podcast", "the output could not be written")])
        self.assertEqual(list(self.directory.glob("a.*")), [])

    def test_a_target_that_cannot_be_is_a_failure_of_its_line(self):
        show = self.show()
        self.path("a.plist").mkdir()
        targets = ("a.plist", f"{show}/b.plist", "c.txt", "d.plist")
        self.assertEqual(self.batch(*(f"{show}\t{target}" for target in targets)),
                         (0, [("failed", show, "a.plist", "a.plist: Is a directory"),
                              ("failed", show, f"{show}/b.plist", f"{show}/b.plist: File exists"),
                              ("failed", show, "c.txt", "the ending of the target names no form"),
                              ("converted", show, "d.plist", "")],
                          f"{show}: a.plist: Is a directory\n{show}: {show}/b.plist: File exists\n"
                          f"{show}: the ending of the target names no form\n"))

    def test_a_conversion_without_end_is_ended_and_costs_only_its_line(self):
        sources, targets = self.feeds(31)
        staying = self.fake_tool(STAYING)
        self.assertEqual(self.batch(*self.path("feeds.tsv").read_text().splitlines()[28:], options=["--limit=1"],
                                    qel=staying)[1],
                         [("converted", sources[28], "references/0000/0000029.plist", ""),
                          ("failed", sources[29], "references/0000/0000030.plist", "no end after 1 s"),
                          ("failed", sources[30], "references/0000/0000031.plist", "no end after 1 s")])
        self.assertEqual(self.files("references"), [targets[28]])
        self.assertEqual([Path(f"/proc/{process}").exists() for process in self.staying()], [False, False])

    def test_a_host_that_takes_too_long_three_times_in_a_row_is_left_alone(self):
        hanging = self.fake_tool('#!/bin/sh\ncase $2 in *good) echo "</plist>" ;; *) exec sleep 100 ;; esac\n')
        late, left = "no end after 0.2 s", "not tried, since a.example took too long 3 times"
        rows = (("a.example/1", late), ("b.example/1", late), ("a.example/2", late), ("a.example/good", ""),
                ("a.example/3", late), ("a.example/4", late), ("a.example/5", late), ("a.example/good", left),
                ("b.example/good", ""))
        _, outcomes, _ = self.batch(*(f"http://{source}\t{number}.plist" for number, (source, _) in enumerate(rows)),
                                    options=["--limit=0.2"], qel=hanging)
        self.assertEqual([message for *_, message in outcomes], [message for _, message in rows])

    def test_a_pause_is_made_between_sources_of_a_host(self):
        self.list(*(f"http://{host}.example/\t{number}.plist" for number, host in enumerate("aab")), name="batch")
        quick = self.fake_tool("#!/bin/sh\necho '</plist>'\n")
        _, output, _ = self.outcome("convert-batch", "--pause=2", "batch", qel=quick)
        first, second, third = (float(line.split("\t")[0]) for line in output.splitlines())
        self.assertGreater(second - first, 2)
        self.assertLess(third - second, 2)

    def test_a_signal_ends_the_tool_too_and_leaves_no_part(self):
        self.feeds(30)
        staying = self.fake_tool(STAYING)
        for number in (signal.SIGHUP, signal.SIGINT, signal.SIGTERM):
            process = self.script("convert-batch", "feeds.tsv", qel=staying)
            self.wait_until(self.staying)
            process.send_signal(number)
            output, _ = process.communicate(timeout=60)
            self.assertEqual((process.returncode, output.count("\n")), (128 + number, 29))
            self.assertFalse(Path(f"/proc/{self.staying()[0]}").exists())
            self.assertEqual(list(self.directory.rglob("*.part")), [])
            self.path("pids").unlink()

    def test_without_the_tool_it_ends(self):
        self.assertEqual(self.batch("a\ta.plist", qel="/missing/qel"),
                         (1, [], "convert-batch: /missing/qel: No such file or directory\n"))

    def test_a_log_that_cannot_be_written_ends_it(self):
        self.list(f"{self.show()}\ta.plist", f"{self.show()}\tb.plist", name="batch")
        with open("/dev/full", "wb") as full:
            finished = subprocess.run([FLEET / "convert-batch", "batch"], cwd=self.directory, stdout=full, check=False,
                                      stderr=subprocess.PIPE, env=environment({"QEL": tool()}))
        self.assertEqual((finished.returncode, finished.stderr),
                         (1, b"convert-batch: an outcome could not be written\n"))
        self.assertFalse(self.path("b.plist").exists())

    def test_an_archive_brings_targets_and_outcomes_to_another_machine(self):
        show = self.show()
        self.list(f"{show}\ta/b.plist", f"{show}\tc.podcast", "missing.plist\td.plist", name="batch")
        status, printed, _ = self.outcome("convert-batch", "--archive=results.tar", "batch")
        self.assertEqual((status, printed), (0, "results.tar\n"))
        self.assertEqual([path for path in self.directory.rglob("*") if path.suffix != ".tar"
                          and path.name not in ("batch", "one.mp3", "show.plist", "a")], [])

        # What is there already is replaced, what a killed run left is no obstacle.
        self.path("c.podcast.part").mkdir()
        self.write("c.podcast.part/stray.mp3", "stray")
        self.path("c.podcast").mkdir()
        self.write("c.podcast/old.mp3", "old")
        for _ in range(2):
            status, printed, messages = self.outcome("convert-batch", "--accept", "results.tar")
            self.assertEqual((status, messages), (0, ""))
            self.assertEqual(self.files("c.podcast"),
                             [self.path("c.podcast/Info.plist"), self.path("c.podcast/one.mp3")])
        self.assertEqual([tuple(line.split("\t")[3:6]) for line in printed.splitlines()],
                         [("converted", show, "a/b.plist"), ("converted", show, "c.podcast"),
                          ("failed", "missing.plist", "d.plist")])
        self.assertEqual(self.path("a/b.plist").read_bytes(), self.run_tool("parsefeed", show).stdout)
        self.assertEqual([path for path in self.directory.rglob("*") if path.suffix in (".part", ".old")], [])

    def test_nothing_of_a_cut_archive_is_taken(self):
        self.list(f"{self.show()}\ta.plist", name="batch")
        self.outcome("convert-batch", "--archive=results.tar", "batch")
        whole = self.path("results.tar").read_bytes()
        for size in (0, 700, 1100, 1700):
            self.write("results.tar", whole[:size])
            status, printed, messages = self.outcome("convert-batch", "--accept", "results.tar")
            self.assertEqual((status, printed, self.path("a.plist").exists()), (1, "", False), size)
            self.assertRegex(messages, r"\Aconvert-batch: results\.tar: .+\n\Z")


if __name__ == "__main__":
    unittest.main()
