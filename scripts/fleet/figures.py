"""What scripts/check-fleet measured, as docs/fleet.md shows it."""

import os
import shutil
import textwrap
import time
from pathlib import Path

DOCUMENT = Path(__file__).resolve().parents[2] / "docs/fleet.md"
MANY = 5_000_000
DEATH = ", one dies"  # ends the title of a run that loses a machine
END = "<!-- end -->\n"


def wrapped(text):
    return textwrap.fill(text, 118)


def table(rows):
    """The table, and what follows from it. The first row is that of qel alone, the second that of one machine."""
    alone, here, *_ = rows
    yield "| run | feeds | seconds | feeds per second | processor time per feed |"
    yield "|---|--:|--:|--:|--:|"
    for row in rows:
        yield (f"| {row['title']} | {row['feeds']:,} | {row['seconds']:.1f} | {row['rate']:.0f} "
               f"| {row['milliseconds']:.2f} ms |")
    yield ""
    yield wrapped(
        f"Measured on {time.strftime('%-d %B %Y')} on {os.cpu_count()} processors, of which other work took "
        f"{100 * here['others']:.0f} % during the run on one machine. With `convert-all` around it, `qel` takes "
        f"{here['milliseconds'] / alone['milliseconds']:.2f} times the processor time that it takes alone.")


def cost_of_death(rows):
    """How much longer each engine took when it lost a machine."""
    seconds = {row["title"]: row["seconds"] for row in rows}
    for title, lossy in seconds.items():
        if title.endswith(DEATH):
            engine = title.removesuffix(DEATH)
            yield f"- {engine}: {lossy:.1f} s in place of {seconds[engine]:.1f} s."


def arithmetic(rows):
    """What the figures mean for five million feeds."""
    rate = round(rows[1]["rate"])
    seconds = MANY / rate
    yield wrapped(
        f"**Processors.** At {rate} feeds per second one such machine takes {MANY:,} / {rate} = {seconds:,.0f} s "
        f"= {seconds / 3600:.1f} hours; two machines with half of the list each take {seconds / 7200:.1f} hours.")


BLOCKS = {"figures": table, "cost": cost_of_death, "arithmetic": arithmetic}


def shown(rows):
    return "\n".join(line for block in BLOCKS.values() for line in block(rows))


def record(rows, picture):
    """Puts the figures between their marks in the document, and the picture beside it."""
    text = DOCUMENT.read_text(encoding="utf-8")
    for name, block in BLOCKS.items():
        mark = f"<!-- {name}: scripts/check-fleet writes this -->\n"
        before, _, rest = text.partition(mark)
        _, end, after = rest.partition(END)
        if not end:
            raise ValueError(f"{DOCUMENT} has no place for {name}")
        text = before + mark + "\n" + "\n".join(block(rows)) + "\n\n" + end + after
    DOCUMENT.write_text(text, encoding="utf-8")
    shutil.copyfile(picture, DOCUMENT.with_suffix(".svg"))
