"""Runs the tests against one fault after another, until one notices it."""

import json
import os
import resource
import shutil
import signal
import subprocess
import tempfile
import threading
import time
from collections import defaultdict
from pathlib import Path

from building import BUILD, WORK

MEMORY = 6 << 30    # for a fault that takes all
FILE_SIZE = 8 << 30  # some tests make sparse files beyond 2 GiB
LEAST_TIMEOUT = 20  # seconds


class Test:
    def __init__(self, name, command, environment, directory):
        self.name = name
        self.command = command
        self.environment = environment
        self.directory = directory
        self.seconds = None  # without a fault; None as well where it fails then
        self.noticed = 0

    def run(self, number, timeout, temporary):
        """Whether it passes with the fault of that number."""
        environment = {**os.environ, **self.environment, "QEL_MUTANT": str(number), "TMPDIR": temporary,
                       "GTEST_FAIL_FAST": "1"}

        def limit():
            signal.signal(signal.SIGINT, signal.SIG_DFL)  # a shell that started this behind its back ignores it
            resource.setrlimit(resource.RLIMIT_AS, (MEMORY, MEMORY))
            resource.setrlimit(resource.RLIMIT_FSIZE, (FILE_SIZE, FILE_SIZE))
            resource.setrlimit(resource.RLIMIT_CORE, (0, 0))

        process = subprocess.Popen(self.command, cwd=self.directory, env=environment, start_new_session=True,
                                   stdin=subprocess.DEVNULL, stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL,
                                   preexec_fn=limit)
        try:
            return process.wait(timeout=timeout) == 0
        except subprocess.TimeoutExpired:
            return False
        finally:
            try:
                os.killpg(process.pid, signal.SIGKILL)  # what it left running too
            except ProcessLookupError:
                pass
            process.wait()


def _known_tests():
    """The unit tests, a list for each suite, and the other tests that run the product; those of scripts stay out."""
    listed = json.loads(subprocess.run(["ctest", "--show-only=json-v1"], cwd=BUILD, capture_output=True, check=True,
                                       text=True).stdout)
    units = defaultdict(list)
    others = []
    for entry in listed["tests"]:
        properties = {value["name"]: value["value"] for value in entry["properties"]}
        environment = dict(pair.split("=", 1) for pair in properties.get("ENVIRONMENT", []))
        test = Test(entry["name"], entry["command"], environment, properties.get("WORKING_DIRECTORY", BUILD))
        if Path(test.command[0]).name == "qel_unit_tests":
            units[test.name.rpartition(".")[0]].append(test)
        elif test.name == "e2e.test_documentation" or \
                test.name != "layers" and "project" not in properties.get("LABELS", []):
            if test.name.startswith("e2e."):
                test.command.append("-f")
            others.append(test)
    return units, others


class Tests:
    """All tests that pass without a fault, which is tried first unless that was done for this state of the sources."""

    def __init__(self, state):
        self.lock = threading.Lock()
        self.tests = []
        file = WORK / "tests.json"
        known = json.loads(file.read_text()) if file.is_file() else {}
        self.seconds = known["seconds"] if known.get("state") == state else {}
        units, others = _known_tests()
        for suite, tests in units.items():
            # One process for all its tests is much faster than one for each, which some need.
            first = tests[0]
            whole = Test(suite, [first.command[0], f"--gtest_filter={suite}.*"], first.environment, first.directory)
            if not self.take(whole):
                others += tests
        for test in others:
            if not self.take(test):
                print(f"{test.name} fails without any fault, and is left out", flush=True)
        file.write_text(json.dumps({"state": state, "seconds": self.seconds}))

    def take(self, test):
        """Whether it passes without a fault; then it belongs to the tests."""
        if test.name not in self.seconds:
            began = time.monotonic()
            passes = self.run(test, 0, 600)
            self.seconds[test.name] = time.monotonic() - began if passes else None
        test.seconds = self.seconds[test.name]
        if test.seconds is not None:
            self.tests.append(test)
        return test.seconds is not None

    @staticmethod
    def run(test, number, timeout):
        temporary = tempfile.mkdtemp(prefix="qm-")
        os.chmod(temporary, 0o755)  # some tests run the tool as another user
        try:
            return test.run(number, timeout, temporary)
        finally:
            shutil.rmtree(temporary, ignore_errors=True)

    def sequence(self, path):
        """The tests in the order in which one of them will soonest notice a fault in the file."""
        suite = f"{Path(path).stem}Test"
        remaining = list(self.tests)
        while remaining:
            with self.lock:
                test = max(remaining, key=lambda one: (one.name.split(".")[0] == suite,
                                                       (one.noticed + 0.2) / (one.seconds + 0.2)))
            remaining.remove(test)
            yield test

    def first_to_notice(self, number, path):
        """The name of the first test that fails with the fault, or None."""
        for test in self.sequence(path):
            if not self.run(test, number, LEAST_TIMEOUT + 5 * test.seconds):
                with self.lock:
                    test.noticed += 1
                return test.name
        return None
