#!/usr/bin/env python3
"""Prints the results of the benchmarks as a table and draws them as bars against the roofline.

    bench_report.py RESULTS.json PICTURE.svg
"""
import json
import sys
from html import escape
from pathlib import Path

COLUMNS = [("Mpix/s", "Mpix/s", "{:,.0f}"), ("GB/s", "GB/s", "{:.1f}"), ("ns", "ns/call", "{:,.0f}"),
           ("roof", "roofline", "{:.2f}"), ("vs_plain", "x plain", "{:.1f}"), ("vs_peer", "x peer", "{:.2f}"),
           ("vs_best", "x best", "{:.2f}"), ("spread", "spread", "{:.0%}")]


def load(path):
    rows = []
    text = Path(path).read_text()           # empty when no name matched
    for run in json.loads(text)["benchmarks"] if text else []:
        operation, size = run["name"].split("/")[:2]
        rows.append((operation, size, run))
    return rows


def print_ladders(rows):
    """The largest step between neighbours of each ladder; above 2 it needs a reason."""
    print(f"{'ladder':<54}{'step':>8}   where; why it has to be")
    for operation, _, run in rows:
        mark = "" if run["step"] <= 2 or ";" in run.get("label", "") else "   <-- above 2 without a reason"
        print(f"{operation.removeprefix('ladder '):<54}{run['step']:>8.2f}   {run.get('label', '')}{mark}")


def print_table(rows):
    print(f"{'operation':<34}{'size':>12}" + "".join(f"{title:>11}" for _, title, _ in COLUMNS))
    for operation, size, run in rows:
        cells = [form.format(run[key]) if key in run else "" for key, _, form in COLUMNS]
        print(f"{operation:<34}{size:>12}" + "".join(f"{c:>11}" for c in cells))
    print("\nroofline: time of moving the same bytes over ours; x plain, x peer: their time over ours; x best: our rate, in\n"
          "copies of the same size in the same run, over the best rate known; spread: between the rounds' quartiles")


def draw(rows, path):
    """One bar a row: our share of the roofline. Bars beyond the cut end in a point; the numbers are whole."""
    height, top, left, scale, cut = 18, 58, 290, 260, 2.0
    column, bottom = left + scale * cut + 70, top + height * len(rows)
    lines = [f'<svg xmlns="http://www.w3.org/2000/svg" width="{column + 80:.0f}" height="{bottom + 16}" '
             'font-family="DejaVu Sans, sans-serif" font-size="11" fill="#222">',
             '<rect width="100%" height="100%" fill="white"/>',
             '<text x="16" y="22" font-size="14">Share of the roofline: the time of moving the same bytes and doing nothing '
             'else, over ours</text>',
             f'<g text-anchor="end"><text x="{column}" y="{top - 10}">share</text>'
             f'<text x="{column + 64}" y="{top - 10}">Mpix/s</text></g>']
    for tick in (0.5, 1.0, 1.5, 2.0):
        x, strong = left + scale * tick, tick == 1.0
        lines.append(f'<text x="{x}" y="{top - 10}" text-anchor="middle">{tick}</text>')
        lines.append(f'<line x1="{x}" x2="{x}" y1="{top - 4}" y2="{bottom}" stroke="{"#c0392b" if strong else "#ddd"}"/>')
    for i, (operation, size, run) in enumerate(rows):
        y, share = top + i * height, run["roof"]
        end, low, high = left + scale * min(share, cut), y + 3, y + height - 3
        point = f"{end + 7:.1f},{(low + high) / 2} " if share > cut else ""
        lines.append(f'<polygon points="{left},{low} {end:.1f},{low} {point}{end:.1f},{high} {left},{high}" '
                     f'fill="{"#3a7ca5" if share >= 1 else "#8db8d3"}"/>')
        lines.append(f'<g text-anchor="end"><text x="{left - 8}" y="{y + 13}">{escape(operation)}  {escape(size)}</text>'
                     f'<text x="{column}" y="{y + 13}">{share:.2f}</text>'
                     f'<text x="{column + 64}" y="{y + 13}">{run["Mpix/s"]:,.0f}</text></g>')
    Path(path).write_text("\n".join(lines + ["</svg>", ""]))


def main(arguments):
    if len(arguments) != 2:
        print(__doc__, file=sys.stderr)
        return 2
    rows = load(arguments[0])
    if not rows:
        print("bench: no row matched", file=sys.stderr)
        return 1
    ladders = [row for row in rows if "step" in row[2]]
    rows = [row for row in rows if "step" not in row[2]]
    if rows:
        print_table(rows)
        draw(rows, arguments[1])
        print(f"picture: {arguments[1]}")
    if ladders:
        print_ladders(ladders)
    return 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
