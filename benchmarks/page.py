"""docs/performance.md and its drawings, from the results of a run."""

import math
import re
import textwrap
from xml.sax.saxutils import escape

import measure

PAGE = measure.ROOT / "docs/performance.md"
IMAGES = measure.ROOT / "docs/images"


def number(value):
    if math.isnan(value):
        return "nan"
    if value == 0 or 0.01 <= abs(value) < 1000:
        return f"{value:.3g}"
    return f"{value:,.0f}" if abs(value) >= 1000 else f"{value:.1g}"


def goal_table(rows, results):
    lines = ["| row | what | measured | spread | goal | |", "|---|---|--:|--:|--:|---|"]
    for row in rows:
        for goal in row.goals:
            found = results.get(row.name, {}).get("goals", {}).get(goal.what)
            unit = f" {goal.unit}" if goal.unit else ""
            limit = f"≤ {number(goal.limit)}{unit}" if goal.limit is not None else ""
            if found is None:
                lines.append(f"| {row.name} | {goal.what} | | | {limit} | not measured |")
                continue
            verdict = ""
            if goal.limit is not None:
                verdict = "reached" if found["value"] <= goal.limit else "**not reached**"
            lines.append(f"| {row.name} | {goal.what} | {number(found['value'])}{unit} | {number(found['spread'])} "
                         f"| {limit} | {verdict} |")
    return "\n".join(lines) + "\n"


def figure_table(row, figures):
    """The contenders by size and by what was counted."""
    lines = {}
    for key, found in figures.items():
        contender, size, counter = re.fullmatch(r"(.*?)(?:/(\d+))?(?: \[(\w+)\])?", key).groups()
        lines.setdefault(contender, {})[(counter or row.unit, int(size or 0))] = found
    columns = sorted({column for line in lines.values() for column in line})
    titles = [f"{what} at {size:,}" if size else what for what, size in columns]
    table = [f"| | {' | '.join(titles)} |", f"|---|{'--:|' * len(columns)}"]
    for name in sorted(lines, key=lambda name: (name != "here", lines[name].get(columns[0], math.inf))):
        cells = [number(lines[name][column]) if column in lines[name] else "" for column in columns]
        table.append(f"| {name} | {' | '.join(cells)} |")
    return "\n".join(table) + "\n"


def row_section(row, result):
    parts = [f"### {row.title}\n", wrapped(f"`{row.name}`. {row.conditions}"), wrapped(f"Limited by: {row.limit}")]
    if result is not None:
        parts.append(figure_table(row, result["figures"]))
        parts += [f"![{curve.title}](images/{curve.file})\n" for curve in row.curves]
    return "\n".join(parts)


def wrapped(text, indent=""):
    return textwrap.fill(text, 110, subsequent_indent=indent, break_long_words=False, break_on_hyphens=False) + "\n"


def write(machine, rows, results):
    for row in rows:
        for curve in row.curves:
            if row.name in results:
                (IMAGES / curve.file).write_text(drawing(curve, results[row.name]["figures"]))
    who = "root" if machine["root"] else "an ordinary user"
    method = [
        f"Machine: {machine['processor']}, {machine['cores']} cores, Linux {machine['kernel']}; load "
        f"{machine['load']:.1f} when the run began, on {machine['date']}. Release preset, {machine['compiler']}, "
        f"commit {machine['commit']}.",
        f"Run by {who} at nice {machine['nice']}. No thread is pinned to a core.",
        f"A value is the median of {machine['repeats']} repeats; the rows take turns. A ratio is formed within each "
        "repeat, whose contenders run in one process in random order, five times each; less is better everywhere. "
        "The spread is the distance of the quartiles.",
        "\"here\" is this project; the other contenders are peers that do the same work.",
        "The rows `linux-frames` and `linux-reports` are made in a virtual machine, in virtual time, as they say; "
        "`benchmarks/run --only linux-frames --only linux-reports` makes them alone.",
    ]
    PAGE.write_text("\n".join([
        "# Performance\n",
        wrapped("Made by `benchmarks/run`; do not edit it. The rows, their goals and their conditions are in "
                "`benchmarks/rows.py`."),
        "".join(wrapped(f"- {line}", "  ") for line in method),
        goal_table(rows, results),
        "## Rows\n",
        *(row_section(row, results.get(row.name)) for row in rows)]))


HUES = ("#2a78d6", "#1a9a6c", "#c4741a")
STYLE = ("text{font:12px sans-serif;fill:#444}path{fill:none;stroke-width:2}.grid{stroke:#8884;stroke-width:1}"
         "@media(prefers-color-scheme:dark){text{fill:#bbb}}")


def drawing(curve, figures):
    """A curve on logarithmic axes as SVG."""
    left, top, width, height = 60, 40, 500, 220
    points = {series: [(size, figures[curve.key.format(series=series, size=size)])
                       for size in curve.sizes] for series in curve.series}
    heights = [y for series in points.values() for _, y in series if y > 0] or [1]
    axes = [(decade(min(values)), max(decade(max(values)) + 1, decade(min(values)) + 1))
            for values in (curve.sizes, heights)]

    def place(x, y):
        (x0, x1), (y0, y1) = axes
        y = max(y, 10.0 ** y0)  # a logarithm has no zero
        return (left + width * (math.log10(x) - x0) / (x1 - x0),
                top + height * (1 - (math.log10(y) - y0) / (y1 - y0)))

    parts = []
    for power in range(axes[0][0], axes[0][1] + 1):
        x, _ = place(10.0 ** power, 10.0 ** axes[1][0])
        parts.append(f'<path class="grid" d="M{x:.1f} {top}V{top + height}"/>'
                     f'<text x="{x:.1f}" y="{top + height + 16}" text-anchor="middle">{number(10.0 ** power)}</text>')
    for power in range(axes[1][0], axes[1][1] + 1):
        _, y = place(10.0 ** axes[0][0], 10.0 ** power)
        parts.append(f'<path class="grid" d="M{left} {y:.1f}H{left + width}"/>'
                     f'<text x="{left - 6}" y="{y + 4:.1f}" text-anchor="end">{number(10.0 ** power)}</text>')
    for index, (series, values) in enumerate(points.items()):
        hue = HUES[index % len(HUES)]
        places = [place(x, y) for x, y in values]
        dashes = ("", ' stroke-dasharray="7 4"', ' stroke-dasharray="2 3"')[index % 3]
        parts.append(f'<path stroke="{hue}"{dashes} d="M' + "L".join(f"{x:.1f} {y:.1f}" for x, y in places) + '"/>')
        parts += [f'<circle cx="{x:.1f}" cy="{y:.1f}" r="3" fill="{hue}"/>' for x, y in places]
        legend = left + width + 12
        parts.append(f'<path stroke="{hue}"{dashes} d="M{legend} {top + 8 + 20 * index}h24"/>'
                     f'<text x="{legend + 30}" y="{top + 12 + 20 * index}">{escape(series)}</text>')
    return (f'<svg xmlns="http://www.w3.org/2000/svg" viewBox="0 0 740 {top + height + 44}" role="img" '
            f'aria-label="{escape(curve.title)}"><style>{STYLE}</style>'
            f'<text x="{left}" y="18">{escape(curve.title)} ({escape(curve.y)})</text>' + "".join(parts) +
            f'<text x="{left + width}" y="{top + height + 34}" text-anchor="end">{escape(curve.x)}</text></svg>\n')


def decade(value):
    return math.floor(math.log10(value) + 1e-9)
