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


def print_table(rows):
    print(f"{'operation':<34}{'size':>12}" + "".join(f"{title:>11}" for _, title, _ in COLUMNS))
    for operation, size, run in rows:
        cells = [form.format(run[key]) if key in run else "" for key, _, form in COLUMNS]
        print(f"{operation:<34}{size:>12}" + "".join(f"{c:>11}" for c in cells))
    print("\nroofline: time of moving the same bytes over ours; x plain, x peer: their time over ours; x best: our rate, in\n"
          "copies of the same size in the same run, over the best rate known; spread: between the rounds' quartiles")


def draw(rows, path):
    """One bar a row: our share of the roofline, cut at 2."""
    height, left, scale, cut = 18, 330, 260, 2.0
    lines = [f'<svg xmlns="http://www.w3.org/2000/svg" width="{left + scale * cut + 80:.0f}" height="{height * len(rows) + 50}" '
             'font-family="DejaVu Sans, sans-serif" font-size="11">', '<rect width="100%" height="100%" fill="white"/>',
             f'<text x="{left}" y="16">share of the roofline (line: moving the same bytes and doing nothing else)</text>']
    for i, (operation, size, run) in enumerate(rows):
        y, share = 30 + i * height, run["roof"]
        lines.append(f'<text x="{left - 6}" y="{y + 12}" text-anchor="end">{escape(operation)}  {escape(size)}</text>')
        lines.append(f'<rect x="{left}" y="{y + 2}" width="{scale * min(share, cut):.1f}" height="{height - 5}" fill="#3a7ca5"/>')
        lines.append(f'<text x="{left + scale * min(share, cut) + 4:.1f}" y="{y + 12}">{share:.2f}</text>')
    x = left + scale
    lines.append(f'<line x1="{x}" x2="{x}" y1="24" y2="{30 + height * len(rows)}" stroke="#c0392b" stroke-dasharray="3 3"/></svg>')
    Path(path).write_text("\n".join(lines))


def main(arguments):
    if len(arguments) != 2:
        print(__doc__, file=sys.stderr)
        return 2
    rows = load(arguments[0])
    if not rows:
        print("bench: no row matched", file=sys.stderr)
        return 1
    print_table(rows)
    draw(rows, arguments[1])
    print(f"picture: {arguments[1]}")
    return 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
