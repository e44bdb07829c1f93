"""What a document costs the tool: processor time, instructions, and memory at its peak.

cost_families.py has the shapes of documents, which can be made of any size: test_cost.py holds them to their bounds,
and scripts/cost-table prints what they cost.
"""

import gzip
import json
import re
import shutil
import subprocess
import sys
import tempfile
from pathlib import Path
from typing import Callable, NamedTuple

from feed_server import FeedServer
from hostile_documents import feed
from support import checked, environment, tool


class Cost(NamedTuple):
    seconds: float  # of the processor, for the tool and for the system on its behalf
    memory: int     # bytes at the peak
    message: str    # on standard error; empty for success


# The peak of a process counts that of the one it was born of, so a small one has to start the tool.
_RUNNER = """
import json, resource, subprocess, sys
status = subprocess.run(sys.argv[1:], stdin=subprocess.DEVNULL, stdout=subprocess.DEVNULL).returncode
usage = resource.getrusage(resource.RUSAGE_CHILDREN)
print(json.dumps([status, usage.ru_utime + usage.ru_stime, usage.ru_maxrss * 1024]))
"""


def cost_of(*arguments):
    """The cost of one run of the tool, whose standard output is dropped."""
    finished = subprocess.run([sys.executable, "-S", "-E", "-c", _RUNNER, tool(), *arguments], env=environment(),
                              stdout=subprocess.PIPE, stderr=subprocess.PIPE, timeout=600, check=True)
    status, seconds, memory = json.loads(finished.stdout)
    checked(arguments, status, stderr=finished.stderr)
    return Cost(seconds, memory, finished.stderr.decode())


# The bytes of memory that a byte of a document may cost. Where a few bytes become a record they cost the most, and
# where they were received compressed.
USUAL = 32
RECORDS = 64
COMPRESSED = 500

# And the bytes on top, for buffers that do not grow and for documents that are small whatever they do.
ALLOWANCE = 16_000_000


class Family(NamedTuple):
    """Documents of one shape."""
    name: str
    make: Callable[[int], bytes]  # a document whose repeated part has about that many bytes
    memory: int = USUAL           # the bound, in bytes for each byte of the document
    command: str = "parsefeed"
    message: str = ""             # a pattern of what standard error says
    extension: str = ".xml"
    is_served: bool = False       # compressed, by a server of this machine; its size is that of what is sent
    outgrows_caches: bool = False  # what is kept of it lies scattered, so that not all of the time is work

    def runs(self, size, runs, measure):
        """The size of a document, and what `measure` says of as many conversions of it."""
        document = self.make(size)
        if self.is_served:
            server = FeedServer()
            document = gzip.compress(document)
            try:
                source = server.serve("/feed", document, headers=[("Content-Encoding", "gzip")])
                return len(document), [measure(self.command, source) for _ in range(runs)]
            finally:
                server.stop()
        with tempfile.TemporaryDirectory(prefix="qel-cost-") as directory:
            path = Path(directory, "document" + self.extension)
            path.write_bytes(document)
            size = len(document)
            del document
            source = path.as_uri() if self.extension == ".xml" else str(path)
            return size, [measure(self.command, source, *self._target(Path(directory, f"{run}.podcast")))
                          for run in range(runs)]

    def costs(self, size, runs=1):
        return self.runs(size, runs, cost_of)

    def _target(self, bundle):
        return ("-d", str(bundle)) if self.command == "createbundle" else ()


# Time for eight times the size, and for the size: 8 for what is linear, 13.5 for what grows with the power of 1.25.
# What lies between them is for caches that no longer hold all, and for other programs on the machine.
STEEPEST = 13
# The same for instructions, to which neither matters.
STEEPEST_WORK = 10

_SHORTEST = 0.03  # seconds that the smallest document has to take, to be measured at all
_SMALLEST, _LARGEST = 250_000, 8_000_000  # sizes of the smallest document
_LARGE = 100_000_000


class Growth(NamedTuple):
    """What documents of one shape cost, each twice as large as the one before."""
    size: int             # of the largest, in bytes
    seconds: list[float]  # without the tool's start
    memory: int           # for the largest, without that for an empty document

    @property
    def steepness(self):
        """The time for the largest by that for the smallest; None when the size makes no difference."""
        return self.seconds[-1] / self.seconds[0] if self.seconds[-1] > _SHORTEST else None


def nothing(is_served=False):
    """The document of nothing."""
    return Family("nothing", lambda _: feed(b""), is_served=is_served)


def start_cost(is_served=False):
    """What the document of nothing costs."""
    costs = nothing(is_served).costs(0, runs=10)[1]
    return Cost(min(cost.seconds for cost in costs), max(cost.memory for cost in costs), "")


def growth_of(family, start, is_large=False):
    smallest = _LARGE if is_large else _SMALLEST

    def measured(size, runs=1 if is_large else 3):
        size, costs = family.costs(size, runs)
        seconds = max(min(cost.seconds for cost in costs) - start.seconds, 0.001)
        return size, seconds, max(costs[-1].memory - start.memory, 0)

    while measured(smallest, runs=1)[1] < _SHORTEST and smallest < _LARGEST:
        smallest *= 2
    rows = [measured(smallest << doubling) for doubling in range(4)]
    return Growth(rows[-1][0], [seconds for _, seconds, _ in rows], rows[-1][2])


def _counted_by_perf(*arguments):
    said = subprocess.run(["perf", "stat", "-x,", "-e", "instructions:u", tool(), *arguments], env=environment(),
                          stdout=subprocess.DEVNULL, stderr=subprocess.PIPE, text=True).stderr
    found = re.search(r"^(\d+),", said, re.MULTILINE)
    return int(found[1]) if found else None


def _counted_by_valgrind(*arguments):
    said = subprocess.run(["valgrind", "--tool=cachegrind", "--cache-sim=no", "--cachegrind-out-file=/dev/null",
                           tool(), *arguments], env=environment(),
                          stdout=subprocess.DEVNULL, stderr=subprocess.PIPE, text=True).stderr
    found = re.search(r"I +refs: +([\d,]+)", said)
    return int(found[1].replace(",", "")) if found else None


def work_of(family):
    """Instructions for eight times the size by those for the size; None where nothing can count them."""
    for program, counted in (("perf", _counted_by_perf), ("valgrind", _counted_by_valgrind)):
        start = nothing().runs(0, 1, counted)[1][0] if shutil.which(program) else None
        if start:
            smaller, larger = (family.runs(size, 1, counted)[1][0] - start for size in (125_000, 1_000_000))
            return larger / smaller
    return None


def _is_work(family, notes):
    """Whether the time is too steep because there is too much to do, and not because caches are too small for it."""
    if not family.outgrows_caches:
        return True
    work = work_of(family)
    if work is None:
        notes.append(f"Skipped, since nothing counts instructions here: why \"{family.name}\" are so slow.")
        return False
    notes.append(f"{family.name}: {work:.1f} times the instructions for 8 times the size")
    return work > STEEPEST_WORK


def faults(family, growth, notes):
    """In what the growth exceeds its bounds; appends to the notes how steep times were told apart."""
    if growth.steepness and growth.steepness > STEEPEST and _is_work(family, notes):
        yield f"{family.name}: {growth.steepness:.1f} times the time for 8 times the size"
    if growth.memory > ALLOWANCE + family.memory * growth.size:
        yield f"{family.name}: {growth.memory / growth.size:.1f} bytes for each byte, of {family.memory}"
