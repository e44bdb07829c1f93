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
from concurrent.futures import ThreadPoolExecutor
from pathlib import Path

from building import BUILD, WORK
from schemata import MOST_FAULTS

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
        self.meets = frozenset()  # the faults in what it runs
        self.noticed = 0

    def run(self, number, timeout, temporary, **more):
        """Whether it passes with the fault of that number; `more` is for its environment."""
        environment = {**os.environ, **self.environment, "QEL_MUTANT": str(number), "TMPDIR": temporary,
                       "GTEST_FAIL_FAST": "1", **more}

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

    def __init__(self, state, jobs):
        self.lock = threading.Lock()
        self.tests = []
        file = WORK / "tests.json"
        known = json.loads(file.read_text()) if file.is_file() else {}
        self.known = known["tests"] if known.get("state") == state else {}
        units, others = _known_tests()
        # One process for all tests of a suite is much faster than one for each, which some need.
        wholes = [Test(suite, [tests[0].command[0], f"--gtest_filter={suite}.*"], tests[0].environment,
                       tests[0].directory) for suite, tests in units.items()]
        with ThreadPoolExecutor(jobs) as pool:
            for whole, passes in zip(wholes, pool.map(self.take, wholes)):
                if not passes:
                    others += units[whole.name]
            for test, passes in zip(others, pool.map(self.take, others)):
                if not passes:
                    print(f"{test.name} fails without any fault, and is left out", flush=True)
        file.write_text(json.dumps({"state": state, "tests": self.known}))

    def take(self, test):
        """Whether it passes without a fault; then it belongs to the tests."""
        if test.name not in self.known:
            self.known[test.name] = self.tried(test)
        test.seconds, meets = self.known[test.name]
        test.meets = frozenset(meets)
        if test.seconds is not None:
            self.tests.append(test)
        return test.seconds is not None

    def tried(self, test):
        """Its time without a fault, None where it fails then, and the numbers of the faults in what it runs."""
        with tempfile.NamedTemporaryFile(prefix="qm-") as met:
            met.write(bytes(MOST_FAULTS))
            met.flush()
            os.chmod(met.name, 0o666)
            began = time.monotonic()
            if self.run(test, 0, 600, QEL_REACHED=met.name):
                seconds = time.monotonic() - began
                return seconds, [number for number, byte in enumerate(Path(met.name).read_bytes()) if byte]
        began = time.monotonic()  # some count the calls of the system, that file's among them
        passes = self.run(test, 0, 600)
        return time.monotonic() - began if passes else None, list(range(MOST_FAULTS))

    @staticmethod
    def run(test, number, timeout, **more):
        temporary = tempfile.mkdtemp(prefix="qm-")
        os.chmod(temporary, 0o755)  # some tests run the tool as another user
        try:
            return test.run(number, timeout, temporary, **more)
        finally:
            shutil.rmtree(temporary, ignore_errors=True)

    def sequence(self, number, path):
        """The tests that meet the fault, in the order in which one of them will soonest notice it."""
        suite = f"{Path(path).stem}Test"
        remaining = [test for test in self.tests if number in test.meets]
        while remaining:
            with self.lock:
                test = max(remaining, key=lambda one: (one.name.split(".")[0] == suite,
                                                       (one.noticed + 0.2) / (one.seconds + 0.2)))
            remaining.remove(test)
            yield test

    def first_to_notice(self, number, path):
        """The name of the first test that fails with the fault, or None."""
        for test in self.sequence(number, path):
            if not self.run(test, number, LEAST_TIMEOUT + 5 * test.seconds):
                with self.lock:
                    test.noticed += 1
                return test.name
        return None
