"""What a list and its log say. They are read as bytes, since paths and URLs may be in any encoding."""

import os
import sys

FORMS = (b".plist", b".podcast", b".rss", b".xml")


def fault_of(entry, targets):
    """What is wrong with an entry of a list, or None. Adds its target to those of the entries before it."""
    source, _, target = entry.partition(b"\t")
    if not source or not target or b"\t" in target:
        return "not a source, a tab and a target"
    if not target.lower().endswith(FORMS):
        return "the ending of the target names no form"
    path = os.path.normpath(target)  # two jobs that write "a.xml" and "./a.xml" would spoil one file
    if path in targets:
        return "an earlier line has the same target"
    targets.add(path)
    return None


def read_list(path):
    """Yields number, entry and fault of each line that is neither blank nor a comment."""
    targets = set()
    with open(path, "rb") as lines:
        for number, line in enumerate(lines, 1):
            entry = line.rstrip(b"\r\n")
            if entry.strip() and not entry.startswith(b"#"):
                yield number, entry, fault_of(entry, targets)


def read_log(path):
    """The last outcome of each entry: an empty text if it was converted, else why not."""
    outcomes = {}
    try:
        with open(path, "rb") as lines:
            for line in lines:
                fields = line.rstrip(b"\n").split(b"\t")
                # Where the machine or the disk failed there may be a piece of a line.
                if len(fields) == 7 and line.endswith(b"\n"):
                    _, _, _, word, source, target, messages = fields
                    outcomes[source + b"\t" + target] = b"" if word == b"converted" else messages or word
    except FileNotFoundError:
        pass
    return outcomes


def tally(path, show=None):
    """Says on standard error how many lines of a list are converted, failed and to do, and returns these numbers.

    show is called with number, entry and reason of each line that failed.
    """
    converted = failed = left = 0
    outcomes = read_log(f"{path}.log")
    for number, entry, fault in read_list(path):
        why = fault.encode() if fault else outcomes.get(entry)
        if why is None:
            left += 1
        elif not why:
            converted += 1
        else:
            failed += 1
            if show:
                show(number, entry, why)
    print(f"{converted} converted, {failed} failed, {left} to do", file=sys.stderr)
    return converted, failed, left
