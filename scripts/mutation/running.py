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
        self.seconds = 0.0  # without a fault
        self.noticed = 0

    def run(self, number, timeout, temporary):
        """Whether it passes with the fault of that number."""
        environment = {**os.environ, **self.environment, "QEL_MUTANT": str(number), "TMPDIR": temporary,
                       "GTEST_FAIL_FAST": "1"}

        def limit():
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
    """The unit tests as one test, and the others that run the product; the scripts' own tests stay out."""
    listed = json.loads(subprocess.run(["ctest", "--show-only=json-v1"], cwd=BUILD, capture_output=True, check=True,
                                       text=True).stdout)
    unit = None
    others = []
    for entry in listed["tests"]:
        properties = {value["name"]: value["value"] for value in entry["properties"]}
        environment = dict(pair.split("=", 1) for pair in properties.get("ENVIRONMENT", []))
        directory = properties.get("WORKING_DIRECTORY", BUILD)
        if Path(entry["command"][0]).name == "qel_unit_tests":
            unit = Test("unit tests", [entry["command"][0], "--gtest_brief=1"], environment, directory)
        elif entry["name"] == "e2e.test_documentation" or \
                entry["name"] != "layers" and "project" not in properties.get("LABELS", []):
            command = entry["command"] + (["-f"] if entry["name"].startswith("e2e.") else [])
            others.append(Test(entry["name"], command, environment, directory))
    return unit, others


class Tests:
    def __init__(self, state):
        """Tries every test without a fault first, unless that was done for this state of the sources."""
        self.unit, self.others = _known_tests()
        self.lock = threading.Lock()
        known = WORK / "tests.json"
        seconds = json.loads(known.read_text()) if known.is_file() else {}
        if seconds.get("state") != state:
            seconds = {"state": state}
            for test in (self.unit, *self.others):
                began = time.monotonic()
                passes = self.with_temporary(lambda temporary, test=test: test.run(0, 600, temporary))
                seconds[test.name] = time.monotonic() - began if passes else None
            if seconds[self.unit.name] is None:
                raise RuntimeError("the unit tests fail without any fault")
            known.write_text(json.dumps(seconds))
        for test in (self.unit, *self.others):
            if seconds[test.name] is None:
                print(f"{test.name} fails without any fault, and is left out", flush=True)
            test.seconds = seconds[test.name]
        self.others = [test for test in self.others if test.seconds is not None]

    @staticmethod
    def with_temporary(action):
        temporary = tempfile.mkdtemp(prefix="qm-")
        os.chmod(temporary, 0o755)  # some tests run the tool as another user
        try:
            return action(temporary)
        finally:
            shutil.rmtree(temporary, ignore_errors=True)

    def sequence(self, path):
        """The tests in the order in which one of them will soonest notice a fault in the file."""
        suite = Path(path).stem
        related = Test(f"{suite}Test", [*self.unit.command, f"--gtest_filter={suite}Test.*"], self.unit.environment,
                       self.unit.directory)
        related.seconds = self.unit.seconds
        yield related
        yield self.unit
        remaining = list(self.others)
        while remaining:
            with self.lock:
                test = max(remaining, key=lambda one: (one.noticed + 0.2) / (one.seconds + 0.2))
            remaining.remove(test)
            yield test

    def first_to_notice(self, number, path):
        """The name of the first test that fails with the fault, or None."""
        for test in self.sequence(path):
            timeout = LEAST_TIMEOUT + 5 * test.seconds
            if not self.with_temporary(lambda temporary, test=test, timeout=timeout:
                                       test.run(number, timeout, temporary)):
                with self.lock:
                    test.noticed += 1
                return test.name
        return None
