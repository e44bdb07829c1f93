"""What the tests of failing calls share: every call of a scenario fails in a run of its own, and a table says for
each kind of call and each file what the run then says and does.
"""

import errno
import fnmatch
import itertools
import os

from fault_support import ERRORS, FaultTestCase


def table(*parts):
    """Rows of a table in text: kinds of calls, the file that they concern, the consequence, with at least
    two spaces between them. "#2" behind a file means the second call of the kind for it."""
    rows = []
    for line in "\n".join(parts).splitlines():
        cells = [cell.strip() for cell in line.split("  ") if cell.strip()]
        if cells:
            kinds, subjects, consequence = cells
            rows.append((kinds.split(), subjects, consequence))
    return rows


# What is not told apart: the C library's care for the standard streams. What is lost of the progress lines or
# of an output is lost without a word, as everywhere.
STREAMS = """
    ioctl          <std*>            done
    write          <stdout>          unsaid
"""

REFERENCE = """
    stat                  source#1   Could not initialize podcast source with string "{source}".\\n
    stat                  source#2   done
    open fstat read       source     Could not initialize podcast source with string "{source}".\\n
    fadvise close         source     done
"""


class Sweep(FaultTestCase):
    """Makes the calls of a scenario fail one by one, each with one of the errors, in turn."""

    tally = None  # where runs with a fault are counted
    every_error = False  # whether each call fails with each of the errors instead

    def errors(self, number):
        return ERRORS if self.every_error else (ERRORS[number % len(ERRORS)],)

    def runs(self, server, scenario, plan="any@{number}={error}", start=1, **options):
        """The runs in which call 1, 2, 3, ... of the plan's first kind fails, until there is none to fail;
        then the run in which none failed. The root directory is as before for each."""
        kind = plan.partition("@")[0]
        for number in itertools.count(start):
            for error in self.errors(number):
                self.restore()
                run = server.run(plan.format(number=number, error=error), **options)
                self.assertOrderly(run)
                if run.faults:
                    self.tally.add(scenario)
                yield run
            if not any(kind in ("any", fault.call.kind) for fault in run.faults):
                return

    def consequence(self, rows, run, subject):
        """The consequence that the table's one row for the run's fault tells."""
        fault = run.faults[0]
        number = sum(call.kind == fault.call.kind and self.subject(run, call) == subject
                     for call in run.calls[:run.calls.index(fault.call) + 1])
        found = {consequence for kinds, pattern, consequence in rows if fault.call.kind in kinds
                 and fnmatch.fnmatchcase(subject if "#" not in pattern else f"{subject}#{number}", pattern)}
        self.assertEqual(len(found), 1, f"the table has not one row for call {number} of {subject}: {run}")
        return found.pop()

    def subject(self, run, call):
        """What a call concerns, in the words of the tables."""
        raise NotImplementedError

    def message(self, text, run):
        error = os.strerror(getattr(errno, run.faults[0].error))
        return text.replace("\\n", "\n").format(error=error, source=self.source)

    @staticmethod
    def is_late(text):
        """Whether a message comes after the notice that the source is loaded."""
        return text.startswith(("Could not load", "Could not generate"))
