"""Draws the figures of a run: for each row that has a limit, how much of that limit the tool takes.

One scale serves rows as different as memory and time, and the only line that matters is the limit.
"""

from xml.sax.saxutils import escape

from figures import shown_limit, shown_ratio, verdict

WIDTH, ROW, BAR, MARGIN = 880, 34, 14, 16
LABELS = 430  # where labels end and bars begin
SCALE = 240  # pixels of a bar that takes its limit fully
LONGEST = 1.4  # of the limit; longer bars are cut there, and say so by their figure

# With a ground of its own the chart is readable on a page of any colour.
STYLE = """
    text { font: 13px sans-serif; fill: #24292f }
    .ground { fill: #ffffff; stroke: #d0d7de }
    .small { font-size: 11px; fill: #57606a }
    .limit { stroke: #57606a; stroke-dasharray: 3 3 }
    .met { fill: #2f81c7 }
    .missed { fill: #d9730d }
    @media (prefers-color-scheme: dark) {
      text { fill: #e6edf3 }
      .ground { fill: #161b22; stroke: #30363d }
      .small { fill: #9aa4af }
      .limit { stroke: #9aa4af }
      .met { fill: #58a6ff }
      .missed { fill: #f0883e }
    }
"""


def label_of(row):
    """What is measured, and against what, in two lines."""
    return row["work"], f"against {row['against'].replace('`', '')}"


def bar(row, top):
    """The elements of one row whose upper edge lies there."""
    work, against = map(escape, label_of(row))
    middle = top + ROW / 2
    yield f'<text x="{LABELS - 10}" y="{middle - 3:g}" text-anchor="end">{work}</text>'
    yield f'<text x="{LABELS - 10}" y="{middle + 11:g}" text-anchor="end" class="small">{against}</text>'
    if "missing" in row:
        yield f'<text x="{LABELS + 6}" y="{middle + 4:g}" class="small">{escape(verdict(row))}</text>'
        return
    share = row["ratio"] / row["limit"]
    kind = "met" if share <= 1 else "missed"
    length = max(1.0, SCALE * min(share, LONGEST))
    figure = f"{shown_ratio(row['ratio'])} of {shown_limit(row)}"
    yield f'<rect x="{LABELS}" y="{middle - BAR / 2:g}" width="{length:.1f}" height="{BAR}" class="{kind}"/>'
    place = LABELS + max(length, SCALE) + 8  # behind the line of the limit
    yield f'<text x="{place:.1f}" y="{middle + 4:g}" class="small">{escape(figure)}</text>'


def svg(figures):
    """The chart, as the text of an SVG document."""
    rows = [row for row in figures["rows"] if row["limit"] is not None]
    top = MARGIN + 24
    bottom = top + ROW * len(rows)
    elements = [element for number, row in enumerate(rows) for element in bar(row, top + ROW * number)]
    limit = LABELS + SCALE
    title = "How much of its limit each figure takes"
    return "\n".join([
        f'<svg xmlns="http://www.w3.org/2000/svg" viewBox="0 0 {WIDTH} {bottom + MARGIN}" role="img" '
        f'width="{WIDTH}" height="{bottom + MARGIN}" aria-label="{title}">',
        f"  <title>{title}</title>",
        f"  <style>{STYLE}  </style>",
        f'  <rect x="0.5" y="0.5" width="{WIDTH - 1}" height="{bottom + MARGIN - 1}" rx="6" class="ground"/>',
        *(f"  {element}" for element in elements),
        f'  <line x1="{limit}" y1="{top - 4}" x2="{limit}" y2="{bottom}" class="limit"/>',
        f'  <text x="{limit}" y="{top - 10}" text-anchor="middle" class="small">the limit</text>',
        f'  <text x="{LABELS}" y="{top - 10}" class="small">0</text>',
        "</svg>",
        "",
    ])
