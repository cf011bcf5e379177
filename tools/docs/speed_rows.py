#!/usr/bin/env python3
"""Picks the rows of docs/speed.json from runs of scripts/bench, the median of each row over the runs.

    speed_rows.py RUN.json... > docs/speed.json
"""
import json
import statistics
import sys

GROUPS = {
    "values": ("Pixels and values, 512 x 512", "512x512", [
        "copy 8u C1", "copy 8u C3", "copy masked 8u C1", "split 8u C3P3", "merge 8u P3C3", "set 8u C3",
        "mirror columns 8u C3", "border replicate 8u C3", "convert 8u32f C1", "convert 32f8u C1", "add 8u C1 sfs 0",
        "add 32f C1", "addC 8u C3 sfs 0", "mul 8u C1 sfs 8", "div 32f C1", "LUT palette 8u C1", "LUT palette 8u C3",
        "LUT linear 32f C1, 16 levels"]),
    "filters": ("Filters, 512 x 512", "512x512", [
        "box 3x3 8u C1", "box 31x31 8u C1", "gauss 3x3 8u C1", "gauss 5x5 8u C1", "filter 3x3 8u C1",
        "filter 7x7 8u C1", "filter 7x7 32f C1", "erode 3x3 8u C1", "erode 7x7 8u C1 (rectangle)",
        "erode 7x7 8u C1 (disc)", "median 3x3 8u C1", "median 5x5 8u C1", "median 15x15 8u C1",
        "adaptive threshold box 15x15 8u C1", "LBP 3x3 8u C1"]),
    "geometry": ("Resize and warp, full HD and more", None, [
        "resize nearest 8u C3 from 1920x1080/1280x720", "resize linear 8u C1 from 1920x1080/1280x720",
        "resize linear 8u C3 from 1920x1080/1280x720", "resize linear 8u C3 from 3840x2160/1920x1080",
        "resize linear 8u C3 from 960x540/1920x1080", "resize cubic 8u C3 from 1920x1080/1366x768",
        "resize linear 32f C1 from 1920x1080/1280x720"]),
}


def load(paths):
    rows = {}
    for path in paths:
        for run in json.loads(open(path).read())["benchmarks"]:
            if "roof" in run:
                rows.setdefault("/".join(run["name"].split("/")[:2]), []).append(run)
    return rows


def main(paths):
    if not paths:
        print(__doc__, file=sys.stderr)
        return 2
    rows, groups = load(paths), {}
    for key, (title, size, names) in GROUPS.items():
        picked = []
        for name in names:
            full = f"{name}/{size}" if size else name
            if full not in rows:
                print(f"speed_rows: no row {full}", file=sys.stderr)
                return 1
            picked.append({"operation": name.replace(" from ", " ").replace("/", " to ") if not size else name,
                           "roof": round(statistics.median(r["roof"] for r in rows[full]), 3),
                           "rate": round(statistics.median(r["Mpix/s"] for r in rows[full]), 1)})
        groups[key] = {"title": title, "rows": picked}
    print(json.dumps({"runs": len(paths), "groups": groups}, indent=1))
    return 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
