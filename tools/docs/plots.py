"""Plots of measured rows: our share of the roofline, as a picture for light pages and one for dark ones."""
import json
from html import escape

COLOURS = {"light": ("#1c1c1c", "#6b6b6b", "#dcdcdc", "#0b6e72", "#9cc9ca"),
           "dark": ("#e8e8e8", "#a0a0a0", "#3c3c3c", "#4fc1c4", "#27696b")}


def chart(title, rows, colours):
    """Bars of shares; the roofline is the line at 1. Bars beyond twice the roofline end in a point."""
    ink, pale, grid, strong, weak = colours
    height, top, scale, cut = 19, 34, 190, 2.0
    left = max(232, 16 + 6.6 * max(len(row["operation"]) for row in rows))
    end = left + scale * cut
    bottom, width = top + height * len(rows) + 4, end + 110
    lines = [f'<svg xmlns="http://www.w3.org/2000/svg" viewBox="0 0 {width:.0f} {bottom + 6}" font-size="11.5" '
             f'font-family="system-ui, DejaVu Sans, sans-serif" fill="{ink}" role="img" aria-label="{escape(title)}">']
    for tick in (0, 0.5, 1.0, 1.5, 2.0):
        x, roof = left + scale * tick, tick == 1.0
        label = "roofline" if roof else f"{tick:g}"
        lines.append(f'<text x="{x}" y="{top - 10}" text-anchor="middle" fill="{ink if roof else pale}">{label}</text>')
        lines.append(f'<line x1="{x}" x2="{x}" y1="{top - 4}" y2="{bottom}" stroke="{ink if roof else grid}" '
                     f'stroke-width="{1.2 if roof else 1}"/>')
    lines.append(f'<text x="{width - 6:.0f}" y="{top - 10}" text-anchor="end" fill="{pale}">Mpix/s</text>')
    for i, row in enumerate(rows):
        y, share = top + i * height, row["roof"]
        x, low, high = left + scale * min(share, cut), y + 3.5, y + height - 3.5
        point = f"{x + 6:.1f},{(low + high) / 2} " if share > cut else ""
        lines.append(f'<polygon points="{left},{low} {x:.1f},{low} {point}{x:.1f},{high} {left},{high}" '
                     f'fill="{strong if share >= 0.9 else weak}"/>')
        lines.append(f'<text x="{left - 8}" y="{y + 14}" text-anchor="end">{escape(row["operation"])}</text>')
        beside = x + 8 if share < cut - 0.2 else end + 12
        lines.append(f'<text x="{beside:.1f}" y="{y + 14}" fill="{pale}" font-size="10.5">{share:.2f}</text>')
        lines.append(f'<text x="{width - 6:.0f}" y="{y + 14}" text-anchor="end">{row["rate"]:,.0f}</text>')
    return "\n".join(lines + ["</svg>", ""])


def markdown(source, folder):
    """Draws the plots of all groups, SVG for light and for dark pages, and gives the function that names a group's."""
    folder.mkdir(parents=True, exist_ok=True)
    groups = json.loads(source.read_text())["groups"]
    for name, group in groups.items():
        for mode, colours in COLOURS.items():
            (folder / f"speed_{name}_{mode}.svg").write_text(chart(group["title"], group["rows"], colours))

    def images(name):
        return "\n".join(f'<img class="plot {mode}-only" src="_static/speed_{name}_{mode}.svg" '
                         f'alt="{escape(groups[name]["title"])}">' for mode in COLOURS)
    return images
