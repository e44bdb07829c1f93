"""What the figures of a run say: ratios, verdicts, and tables of them."""

import json


def kept_text(figures):
    """The figures as they are kept, a row on each line."""
    rows = ",\n".join(f"  {json.dumps(row, ensure_ascii=False)}" for row in figures["rows"])
    text = json.dumps({**figures, "rows": []}, indent=1, ensure_ascii=False)
    return text.replace('"rows": []', f'"rows": [\n{rows}\n ]') + "\n"


def shown_ratio(ratio):
    """A ratio with three digits that count, but no more than it deserves."""
    if ratio is None:
        return "–"
    return f"{ratio:.1f}" if ratio >= 10 else f"{ratio:.2f}" if ratio >= 0.1 else f"{ratio:.3f}"


def shown_limit(row):
    return "–" if row["limit"] is None else f"{row['limit']:g}"


def verdict(row, judged=True):
    """Whether the row is within its limit. Small inputs (judged is False) say nothing about that."""
    if "missing" in row:
        return f"missing: {row['missing']}"
    if row["limit"] is None:
        return "–"
    if not judged:
        return "not judged"
    if row["ratio"] <= row["limit"]:
        return "met"
    excess = 100 * (row["ratio"] / row["limit"] - 1)
    return f"missed by {excess:.0f} %" if excess >= 1 else "missed by less than 1 %"


def shown_time(seconds):
    return f"{seconds:.2f} s" if seconds >= 1 else f"{seconds * 1000:.1f} ms"


def shown_memory(bytes_):
    return f"{bytes_ / 1_000_000:.1f} MB"


def compared(row):
    """What the row's ratio is of: two medians, or two amounts of memory."""
    if "missing" in row:
        return "–", "–"
    quantity, shown = ("median", shown_time) if "median" in row["theirs"] else ("peak", shown_memory)
    return shown(row["ours"][quantity]), shown(row["theirs"][quantity])


def processor_ratio(row):
    """The ratio of processor times, which another program's work disturbs less; None where there is none."""
    ours, theirs = row.get("ours", {}).get("processor"), row.get("theirs", {}).get("processor")
    return ours / theirs if ours and theirs else None


def text_table(header, rows):
    """The lines of a table in columns of equal width."""
    widths = [max(len(cell) for cell in column) for column in zip(header, *rows)]
    lines = ["  ".join(cell.ljust(width) for cell, width in zip(cells, widths)).rstrip() for cells in [header, *rows]]
    return [lines[0], "-" * max(map(len, lines)), *lines[1:]]


def console_table(figures):
    """The table of one run with all that was measured."""
    header = ["work", "against", "ours", "theirs", "ratio", "at most", "verdict", "processor", "peak", "their peak"]
    rows = []
    for row in figures["rows"]:
        peaks = [shown_memory(row[side]["peak"]) if side in row else "–" for side in ("ours", "theirs")]
        rows.append([row["work"], row["against"].replace("`", ""), *compared(row), shown_ratio(row.get("ratio")),
                     shown_limit(row), verdict(row, figures["judged"]), shown_ratio(processor_ratio(row)), *peaks])
    return text_table(header, rows)


def document_table(figures):
    """The table of docs/performance.md, in Markdown."""
    lines = ["| work | against | ratio | at most | verdict |", "|---|---|---|---|---|"]
    for row in figures["rows"]:
        cells = (row["work"], row["against"], shown_ratio(row.get("ratio")), shown_limit(row),
                 verdict(row, figures["judged"]))
        lines.append(f"| {' | '.join(cells)} |")
    return lines


def measured_with(figures):
    """A sentence on the machine and the rivals."""
    machine = figures["machine"]
    versions = ", ".join(f"{name} {version}" for name, version in figures["rivals"].items() if version)
    kind = "virtual machine" if machine["virtual"] else "machine"
    return (f"Measured on a {kind} with {machine['cores']} cores and {machine['memory'] / 2**30:.0f} GiB of memory "
            f"({machine['system']}), against {versions}.")
