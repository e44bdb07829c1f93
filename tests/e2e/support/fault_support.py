"""What the tests of faults share: runs of the tool in which chosen calls fail, what these runs did, and a
show to run on.

The module that the environment variable QEL_FAULTS names (tests/faults) is preloaded into the tool. It
starts every run from one process that has come as far as main, so that thousands of runs take seconds,
and writes a log of the calls that were counted. tests/faults/FaultPlan.h says how a plan is written.
"""

import os
import plistlib
import select
import shutil
import subprocess
import tempfile
import unittest
from collections import Counter
from pathlib import Path
from typing import NamedTuple

from bundle_support import IN_PLACE, BundleTestCase, contents
from support import LOADING, SANITIZER_STATUS, counting_from_start, element, environment, item, rss, tool

ERRORS = ("ENOSPC", "EIO", "EACCES", "EMFILE")

_LONGEST_RUN = 90  # seconds; the module itself ends a run before that


class Call(NamedTuple):
    """A call that was counted: its kind, what it was about, and which of this kind and subject it was."""
    kind: str
    path: str
    number: int


class Fault(NamedTuple):
    call: Call
    error: str
    frames: str  # for an allocation: who asked for it

    def __str__(self):
        subject = "" if self.call.path == "-" else f" of {self.call.path}"
        callers = f", asked for by {self.frames}" if self.frames else ""
        return f"{self.call.kind}{subject} (number {self.call.number}) failing with {self.error}{callers}"


class Run(NamedTuple):
    """A run and what its log tells."""
    plan: str
    status: int  # the exit status; a negative one is the signal that ended the run
    stdout: bytes
    stderr: bytes
    calls: list  # all that were counted, in order, failed or not
    faults: list
    leaks: list  # descriptors open at the end
    allocations: int
    ended: bool  # whether it came to its ordinary end

    def __str__(self):
        faults = "; ".join(str(fault) for fault in self.faults) or "no fault"
        return (f"plan {self.plan!r}: {faults}\n"
                f"  status {self.status}, stderr {self.stderr.decode(errors='replace')!r}, "
                f"stdout {self.stdout[-300:].decode(errors='replace')!r}")


def require_faults(allocations=False):
    """Skips the test where faults cannot be made."""
    if not os.environ.get("QEL_FAULTS"):
        raise unittest.SkipTest("faults can be made on Linux with an x86-64 processor only")
    executable = Path(tool()).read_bytes()
    if b"__tsan_init" in executable:
        raise unittest.SkipTest("the thread sanitizer keeps the calls of its program to itself")
    if allocations and b"__asan_init" in executable:
        raise unittest.SkipTest("the address sanitizer allocates the memory itself")


class FaultServer:
    """Runs the tool, or a companion, with the same arguments in the same directory, again and again."""

    def __init__(self, arguments, directory, env=None, program="qel"):
        self._scratch = Path(tempfile.mkdtemp(prefix="qel-faults-"))
        request_end, self._requests = os.pipe()
        self._answers, answer_end = os.pipe()
        # The sanitizer's search for leaks traces the run, which the trap for its calls would end.
        sanitizer = f"exitcode={SANITIZER_STATUS}:verify_asan_link_order=0:detect_leaks=0"
        self._process = subprocess.Popen(
            [tool(program), *arguments], cwd=directory, pass_fds=(request_end, answer_end),
            env=environment({"LD_PRELOAD": os.environ["QEL_FAULTS"],
                             "QEL_FAULT_SERVER": f"{request_end},{answer_end}",
                             "ASAN_OPTIONS": sanitizer, **counting_from_start(), **(env or {})}))
        os.close(request_end)
        os.close(answer_end)

    def stop(self):
        os.close(self._requests)
        self._process.wait()
        os.close(self._answers)
        shutil.rmtree(self._scratch, ignore_errors=True)

    def run(self, plan="", stdin=os.devnull, stdout=None):
        """One run, with a plan for its faults and standard input from a file, to its end."""
        paths = [self._scratch / name for name in ("stdout", "stderr", "log")]
        paths[2].unlink(missing_ok=True)
        fields = [plan, stdin, stdout or paths[0], paths[1], paths[2]]
        os.write(self._requests, ("\t".join(map(str, fields)) + "\n").encode())
        if not select.select([self._answers], [], [], _LONGEST_RUN)[0]:
            self._process.kill()
            raise AssertionError(f"plan {plan!r}: the run did not end")
        answer = os.read(self._answers, 64)
        if not answer:
            raise RuntimeError(f"plan {plan!r}: the server of runs has ended")
        output = b"" if stdout else paths[0].read_bytes()
        log = paths[2].read_text(errors="replace") if paths[2].exists() else ""
        return _interpreted(plan, os.waitstatus_to_exitcode(int(answer)), output, paths[1].read_bytes(), log)


def _interpreted(plan, status, stdout, stderr, log):
    calls, faults, leaks, allocations, ended = [], [], [], 0, False
    seen = Counter()
    for line in log.splitlines():
        kind, *fields = line.split("\t")
        if kind in ("call", "fault"):
            seen[fields[0], fields[1]] += 1
            call = Call(fields[0], fields[1], seen[fields[0], fields[1]])
            calls.append(call)
            if kind == "fault":
                faults.append(Fault(call, fields[2], ""))
        elif kind == "frames":
            faults[-1] = faults[-1]._replace(frames=fields[0].strip())
        elif kind == "leak":
            leaks.append(int(fields[0]))
        elif kind == "end":
            allocations, ended = int(fields[0] or 0), True
    return Run(plan, status, stdout, stderr, calls, faults, leaks, allocations, ended)


def restore(directory, snapshot):
    """Makes the directory hold what bundle_support.contents told of it before, without touching what is right."""
    present = contents(directory)
    for path in sorted(present, reverse=True):
        if path in snapshot and present[path] == snapshot[path]:
            continue
        target = os.path.join(directory, path)
        if os.path.isdir(target) and not os.path.islink(target):
            os.rmdir(target)
        else:
            os.unlink(target)
    for path in sorted(snapshot):
        content = snapshot[path]
        if path in present and present[path] == content:
            continue
        target = os.path.join(directory, path)
        if content is None:
            os.mkdir(target)
        elif isinstance(content, str):
            os.symlink(content.removeprefix("-> "), target)
        else:
            Path(target).write_bytes(content)


# A show of two episodes; what is fetched for it, in order, and the bundle's reference file last.

COVER, ONE, FACE, TWO, INFO = "cover.jpg", "one.mp3", "face.jpg", "two.mp3", "Info.plist"
ITEMS = (COVER, ONE, FACE, TWO, INFO)
ORIGINALS = {COVER: b"the cover" * 50, ONE: b"the first episode" * 500, FACE: b"a face" * 70,
             TWO: b"the second episode" * 600}
NAMES = {COVER: "Posters/Podcast.jpg", ONE: ONE, FACE: "Posters/one.jpg", TWO: TWO, INFO: INFO}
TEXTS = {"PodcastName": "Show", "PodcastDescription": "About the show"}
LOST = {COVER: 'Could not save or download poster image for podcast "Show"',
        ONE: 'Could not save or download episode "One"',
        FACE: 'Could not save or download poster image for episode "One"',
        TWO: 'Could not save or download episode "Two"'}
NO_INFO = "Could not generate bundle: Could not write Info.plist file\n"
LEFTOVER = ".qel-0123456789abcdef.part"  # of a run that was killed


def show(locate):
    """The show's reference dictionary; locate makes the location of an original from its name."""
    kind = "remote" if ":" in locate(COVER) else "local"
    return {**TEXTS, "PodcastPosterReference": locate(COVER), "PodcastPosterReferenceType": kind,
            "Episodes": [{"EpisodeName": "One", "EpisodeReference": locate(ONE),
                          "EpisodePosterReference": locate(FACE)},
                         {"EpisodeName": "Two", "EpisodeReference": locate(TWO)}]}


def show_feed(locate, encoding="UTF-8"):
    """The show as a feed, with dates of named zones."""
    feed = rss(element("title", TEXTS["PodcastName"]), element("description", TEXTS["PodcastDescription"]),
               element("orvane:image", href=locate(COVER)),
               item(element("title", "One"), element("enclosure", url=locate(ONE), length="9"),
                    element("orvane:image", href=locate(FACE)), element("pubDate", "Mon, 06 Jan 2020 10:00:00 EST")),
               item(element("title", "Two"), element("enclosure", url=locate(TWO)),
                    element("author", "J\u00e9r\u00f4me \u0141uk\u00e1\u0161"),
                    element("pubDate", "Tue, 07 Jul 2020 10:00:00 GMT")))
    return feed.decode().replace("UTF-8", encoding).encode(encoding, "xmlcharrefreplace")


def shown(run):
    """A run's progress lines without those about downloads, whose counters depend on the connection."""
    lines = IN_PLACE.sub(b"", run.stdout).decode(errors="replace").splitlines()
    return [line for line in lines if not line.startswith("[N] Downloading ")]


def warned(run):
    """What a run left out, by its warnings. A warning that is not one of these is a failure."""
    meant = {message: name for name, message in LOST.items()}
    return {meant[line.removeprefix("[W] ")] for line in shown(run) if line.startswith("[W] ")}


class FaultTestCase(BundleTestCase):
    """Runs in the directory `root`, which is as it was before each run; the bundle is sub/show.podcast."""

    allocations = False  # whether the test refuses memory

    def setUp(self):
        require_faults(self.allocations)
        super().setUp()
        self.root = self.path("root")
        self.root.mkdir()
        self.bundle = self.root / "sub" / "show.podcast"
        self.before = {}

    def serve_runs(self, *arguments, env=None, program="qel"):
        """A server of runs; what is in the root directory now is what each run finds."""
        server = FaultServer(arguments, self.root, env, program)
        self.addCleanup(server.stop)
        self.before = contents(self.root)
        return server

    def restore(self):
        restore(self.root, self.before)

    def originals(self):
        """Puts the show's originals into the root directory."""
        for name, content in ORIGINALS.items():
            path = self.root / "media" / name
            path.parent.mkdir(exist_ok=True)
            path.write_bytes(content)

    def earlier_bundle(self):
        """Puts the bundle of an earlier run there, which is not that of a later one, and two leftovers."""
        for name in (*NAMES.values(), "other.txt", LEFTOVER, f"Posters/{LEFTOVER}"):
            path = self.bundle / name
            path.parent.mkdir(parents=True, exist_ok=True)
            path.write_bytes(b"an earlier " + name.encode())

    def leftovers(self):
        """The leftovers of an earlier run that are still there."""
        return {path for path in (LEFTOVER, f"Posters/{LEFTOVER}") if (self.bundle / path).exists()}

    def in_bundle(self, name):
        return os.path.relpath(self.bundle / name, self.root)

    # Judging

    def assertOrderly(self, run):
        """What holds for every run: an exit status, an ordinary end, nothing left open."""
        self.assertTrue(run.ended and run.status in (0, 1), run)
        self.assertEqual(run.leaks, [], run)
        if not any(fault.call.path == "<stderr>" for fault in run.faults):
            self.assertEqual(run.status == 0, run.stderr == b"", run)

    def assertBundle(self, run, lost=frozenset(), leftovers=frozenset(), posters=True, warnings=None):
        """The root directory holds what was there before and a bundle without the items that were lost, and
        the run says so. leftovers are the names of leftovers in the bundle that stay; without posters
        "Posters" could not be made; warnings are what is said about lost items, when it is not LOST."""
        warnings = {**LOST, **(warnings or {})}
        fetched = [name for name in ITEMS if name not in lost and not (name == FACE and ONE in lost)]

        lines = [f"[W] {warnings[COVER]}"] if COVER in lost else []
        lines.append("[N] Fetching 2 episodes")
        for number, (media, face) in enumerate(((ONE, FACE), (TWO, None)), 1):
            lines.append(f"[N] Fetching episode {number}...")
            lines += [f"[W] {warnings[name]}" for name in (media, face) if name in lost and (name == media or media in fetched)]
            lines.append(f"[N] {'Fetched' if media in fetched else 'Skipping'} episode {number}")
        lines += ["[N] Done!"] if INFO in fetched else []
        self.assertEqual(shown(run), LOADING.decode().splitlines() + lines, run)
        self.assertEqual((run.status, run.stderr.decode()), (0, "") if INFO in fetched else (1, NO_INFO), run)

        found = contents(self.root)
        info = found.pop(self.in_bundle(INFO), None)
        expected = dict(self.before)
        earlier_info = expected.pop(self.in_bundle(INFO), None)
        for directory in (self.bundle.parent, self.bundle):
            expected[os.path.relpath(directory, self.root)] = None
        if posters:
            expected.setdefault(self.in_bundle("Posters"), None)
        for path in [path for path in expected if os.path.basename(path) == LEFTOVER]:
            if os.path.relpath(path, self.in_bundle(".")) not in leftovers:
                del expected[path]
        expected.update({self.in_bundle(NAMES[name]): ORIGINALS[name] for name in fetched if name != INFO})
        self.assertEqual(found, expected, run)
        if INFO in fetched:
            self.assertInfo(plistlib.loads(info), fetched, run)
        else:
            self.assertEqual(info, earlier_info, run)

    def assertInfo(self, info, fetched, run):
        """The reference file has an entry for what was fetched, and for nothing else."""
        def poster(key, name):
            return {f"{key}Reference": NAMES[name], f"{key}ReferenceType": "local"} if name in fetched else {}

        episodes = []
        for title, media, face in (("One", ONE, FACE), ("Two", TWO, None)):
            if media in fetched:
                episodes.append({"EpisodeName": title, "EpisodeReference": media, "EpisodeReferenceType": "local",
                                 **poster("EpisodePoster", face)})
        for found in info.get("Episodes", []):
            # Only downloads tell a size: that of the media or of the poster, whichever was asked for last.
            size = found.pop("EpisodeFileSize", None)
            self.assertIn(size, (None, len(ORIGINALS[ONE]), len(ORIGINALS[TWO]), len(ORIGINALS[FACE])), run)
            found.pop("EpisodeDate", None)
            found.pop("EpisodeAuthor", None)
        expected = {**TEXTS, **poster("PodcastPoster", COVER)}
        self.assertEqual(info, {**expected, "Episodes": episodes} if episodes else expected, run)

    def assertConsistentBundle(self, run, leftovers=frozenset()):
        """Whatever was lost: the warnings, the files and the reference file agree."""
        lost = warned(run) | ({INFO} if run.status else set())
        self.assertBundle(run, lost, leftovers)
        return lost

    def assertNothingHappened(self, run, stderr, stdout=b""):
        """The run was refused with the message, and nothing is different in the root directory."""
        self.assertEqual((run.status, run.stderr.decode(), run.stdout), (1, stderr, stdout), run)
        self.assertEqual(contents(self.root), self.before, run)


class Tally:
    """Counts the runs with a fault, for one line at the end of a test file."""

    def __init__(self, what):
        self._what = what
        self._counts = Counter()

    def add(self, scenario):
        self._counts[scenario] += 1

    def show(self):
        parts = ", ".join(f"{scenario} {count}" for scenario, count in sorted(self._counts.items()))
        print(f"\n{self._what}: {sum(self._counts.values())} in all; {parts}", flush=True)
