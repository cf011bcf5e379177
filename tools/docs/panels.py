"""The demo's panels: one function of examples/ is the recipe of the contact sheet and of the page, picture and code."""
import re
import subprocess
import tempfile
from dataclasses import dataclass
from html import escape
from pathlib import Path

from PIL import Image

import inputs
import panel_values
import render
from paths import DEMO, ROOT, TYPEFACE

ENTRY = re.compile(r'\{(?:"([^"]+)"|recipes::k(\w+)\.caption),\s*"([^"]+)",\s*(\w+)', re.S)


class PanelError(Exception):
    pass


@dataclass
class Panel:
    caption: str
    exports: str
    code: str
    recipe: str     # the name of the row whose values it shows, or nothing


def function(name, source):
    """A function with the comment above it."""
    match = re.search(rf"^(?:///[^\n]*\n)*Picture {name}\(.*?^}}\n", source, re.M | re.S)
    if not match:
        raise PanelError(f"no function {name}")
    return match[0]


def load(folder=ROOT / "examples"):
    """{family: panels} in the order of the sheet."""
    captions = {name: text for name, text, _, _ in panel_values.panels(ROOT / "docs" / "recipes")}
    order = re.findall(r"(\w+)Panels\(\)", (folder / "demo.cpp").read_text())
    found = {}
    for family in order:
        source = (folder / f"{family}_panels.cpp").read_text()
        listed = source[source.index("kPanels[]"):]
        found[family] = [Panel(c or captions[r], e, function(f, source), r) for c, r, e, f in ENTRY.findall(listed)]
    return found


def of_recipes():
    """{name of a row: its panel's number on the sheet}."""
    panels = [p for family in load().values() for p in family]
    return {p.recipe: number for number, p in enumerate(panels, 1) if p.recipe}


def run(folder):
    """The panels of the photograph as pictures 1.png and on; how many there are."""
    photograph = folder / "photograph.png"
    inputs.original().save(photograph, compress_level=1)
    done = subprocess.run([DEMO, photograph, folder / "sheet.png", TYPEFACE, folder], check=True, capture_output=True,
                          text=True)
    return len(re.findall(r"^ *\d+/\d+ ", done.stdout, re.M))


def figure(number, panel, name):
    caption = escape(panel.caption)
    return (f'<figure><a href="#panel-{number}"><img src="_static/pictures/{name}" alt="{caption}" loading="lazy"></a>'
            f"<figcaption>{caption}<br><code>{escape(panel.exports)}</code></figcaption></figure>")


def markdown(pictures):
    """By family the pictures, and below them the code of each."""
    with tempfile.TemporaryDirectory() as place:
        count, families = run(Path(place)), load()
        if count != sum(map(len, families.values())):
            raise PanelError(f"the demo has {count} panels, examples/ lists {sum(map(len, families.values()))}")
        lines, number = [], 0
        for family, panels in families.items():
            figures, codes = [], []
            for number, panel in enumerate(panels, number + 1):
                picture = Image.open(Path(place) / f"{number}.png")
                figures.append(figure(number, panel, render.save(picture, pictures / f"panel_{number}.webp")))
                # An anchor within: browsers open what they are sent into.
                codes += [f'<details><summary>{escape(panel.caption)}</summary><a id="panel-{number}"></a>', "", "```cpp",
                          panel.code.rstrip(), "```", "", "</details>", ""]
            lines += [f"## {family.capitalize()}", "", '<div class="shots">', *figures, "</div>", "", *codes]
    return "\n".join(lines)
