"""What the tests of examples/fleet share: its scripts, run in a directory of the test, and tools that misbehave."""

import subprocess
import time
from pathlib import Path

from support import ToolTestCase, environment, run, tool

FLEET = Path(__file__).resolve().parents[3] / "examples" / "fleet"
MISSING = "Could not load source: No such file or directory"

# A tool that halts in the middle of its output.
HALTING = """#!/bin/sh
output=$('{tool}' "$@") || exit
printf '%.1000s' "$output"
sleep 0.03
printf '%s\\n' "${{output#"$(printf '%.1000s' "$output")"}}"
"""

# A tool that stays in the middle of its output, from the thirtieth feed on.
STAYING = """#!/bin/sh
case $2 in
  */00000[3-6]?.xml)
    '{tool}' "$@" | head -c 1000
    echo $$ >>'{directory}'/pids
    exec sleep 100 ;;
  *) exec '{tool}' "$@" ;;
esac
"""


class FleetTestCase(ToolTestCase):
    def feeds(self, count, episodes=10):
        """Makes feeds and their list; returns sources and targets."""
        self.assertEqual(self.outcome("make-feeds", str(count), str(episodes)), (0, "", ""))
        lines = self.path("feeds.tsv").read_text().splitlines()
        return [line.split("\t")[0] for line in lines], [self.path(line.split("\t")[1]) for line in lines]

    def list(self, *lines, name="feeds.tsv"):
        self.write(name, "".join(line + "\n" for line in lines))

    def fake_tool(self, text):
        path = self.write("fake-tool", text.format(tool=tool(), directory=self.directory))
        path.chmod(0o755)
        return path

    def script(self, name, *arguments, qel=None, env=None, **options):
        """Starts a script of the fleet in the test's directory, with both its outputs to be read."""
        variables = environment({"QEL": str(qel or tool()), "HOME": str(self.directory), **(env or {})})
        return subprocess.Popen([FLEET / name, *arguments], cwd=self.directory, env=variables,
                                stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.PIPE,
                                text=True, **options)

    def outcome(self, name, *arguments, **options):
        """The exit status, standard output and standard error of a script that has ended."""
        process = self.script(name, *arguments, **options)
        output, messages = process.communicate(timeout=240)
        return process.returncode, output, messages

    def log(self, name="feeds.tsv.log"):
        """The lines of a log without times and machine."""
        return [tuple(line.split("\t")[3:]) for line in self.path(name).read_text().splitlines()]

    def files(self, folder):
        return sorted(path for path in self.path(folder).rglob("*") if path.is_file())

    def assertWhole(self, sources, targets):
        self.assertGreater(len(sources), 0)
        for source, target in zip(sources, targets):
            with self.subTest(source):
                self.assertEqual(target.read_bytes(), run("parsefeed", source).stdout)

    def wait_until(self, condition):
        deadline = time.monotonic() + 120
        while not condition():
            self.assertLess(time.monotonic(), deadline)
            time.sleep(0.02)

    def staying(self):
        """The processes of the tool that stay in the middle of their output."""
        path = self.path("pids")
        return [int(line) for line in path.read_text().splitlines()] if path.exists() else []


def processes_of(session):
    """The processes of a session that are still there."""
    for process in Path("/proc").glob("[0-9]*"):
        try:
            state, _, _, of = process.joinpath("stat").read_text().rpartition(")")[2].split()[:4]
        except OSError:
            continue
        if int(of) == session and state != "Z":
            yield int(process.name)
