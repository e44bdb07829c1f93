"""Runs commands one after the other and tells how long they took, and how much memory.

Programs of one contest take turns, so that whatever else the machine does hits all of them alike; only
figures of one contest may be compared.
"""

import os
import shutil
import signal
import statistics
import subprocess
import sys
from dataclasses import dataclass, field
from pathlib import Path
from typing import Callable, Optional

STOPWATCH = Path(__file__).parent / "stopwatch.py"
# A proxy would stand between the server and the rivals.
ENVIRONMENT = {**{name: value for name, value in os.environ.items() if not name.lower().endswith("_proxy")},
               "TZ": "UTC", "LC_ALL": "C"}

LONGEST_RUN = 600  # seconds


class Failure(Exception):
    """A program did not do its work, so that its time would mean nothing."""


@dataclass
class Contestant:
    """One program with its work."""

    name: str
    command: Optional[list]  # None where the program is missing
    output: Optional[Path] = None  # the file or directory that it makes; gone before each run
    needs_directory: bool = False  # whether the output is a directory that must exist
    check: Callable[[Path], bool] = field(default=lambda output: True)  # whether the output is whole


@dataclass
class Run:
    seconds: float
    processor_seconds: float
    peak: int  # bytes


def run(contestant):
    """One run, timed from before the program is started until it has ended."""
    output = contestant.output
    if output is not None:
        remove(output)
        if contestant.needs_directory:
            output.mkdir()
    os.sync()  # nobody waits for the disk on account of another
    stopwatch = subprocess.Popen([sys.executable, "-I", "-S", STOPWATCH, *contestant.command], env=ENVIRONMENT,
                                 stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, start_new_session=True)
    try:
        seconds, processor_seconds, peak, status = stopwatch.communicate(timeout=LONGEST_RUN)[0].split()
    except subprocess.TimeoutExpired:
        raise Failure(f"{contestant.name}: {contestant.command[0]} did not end within {LONGEST_RUN} seconds") from None
    finally:
        if stopwatch.poll() is None:
            os.killpg(stopwatch.pid, signal.SIGKILL)  # the program, too
            stopwatch.wait()
    if int(status) != 0:
        raise Failure(f"{contestant.name}: {contestant.command[0]} ended with {int(status)}")
    return Run(float(seconds), float(processor_seconds), int(peak))


def is_whole(contestant):
    try:
        return contestant.check(contestant.output)
    except OSError:  # nothing is there
        return False


def remove(path):
    if path.is_dir():
        shutil.rmtree(path)
    else:
        path.unlink(missing_ok=True)


def contest(contestants, rounds):
    """The summary of each contestant's runs by its name; contestants that are missing are left out."""
    present = [contestant for contestant in contestants if contestant.command]
    for contestant in present:  # not counted: fills the page cache for all, and shows that each does its work
        run(contestant)
        if not is_whole(contestant):
            raise Failure(f"{contestant.name}: its output is not whole")
    runs = {contestant.name: [] for contestant in present}
    for number in range(rounds):
        for contestant in present if number % 2 else reversed(present):
            runs[contestant.name].append(run(contestant))
    for contestant in present:
        if contestant.output is not None:
            remove(contestant.output)
    return {name: summary(those) for name, those in runs.items()}


def summary(runs):
    seconds = [run.seconds for run in runs]
    return {
        "runs": len(runs),
        "median": round(statistics.median(seconds), 6),
        "least": round(min(seconds), 6),
        "greatest": round(max(seconds), 6),
        "processor": round(statistics.median(run.processor_seconds for run in runs), 6),
        "peak": round(statistics.median(run.peak for run in runs)),
    }


def smallest_peak():
    """The least peak (in bytes) that can be told: a program counts the memory of the one that started it."""
    return run(Contestant("an empty program", ["/bin/sh", "-c", ":"])).peak
