"""The demo's panels: a recipe of docs/recipes/panels is what the contact sheet shows, made in C, and what the
operation's page shows, made in Python. A test holds the two together byte for byte."""
import functools
import math
import re
import subprocess
import tempfile
import textwrap
from html import escape
from pathlib import Path

import numpy as np
from PIL import Image

import inputs
import panel_values
import render
from paths import DEMO, ROOT, TYPEFACE

ENTRY = re.compile(r"\{recipes::(\w+)::about,\s*(\w+)[,}]")


class PanelError(Exception):
    pass


@functools.cache
def recipes():
    """{name: recipe}."""
    return panel_values.load(ROOT / "docs" / "recipes")


def listed(folder=ROOT / "examples"):
    """{family: (name of the recipe, name of the function) of each panel} in the order of the sheet."""
    order = re.findall(r"(\w+)Panels\(\)", (folder / "demo.cpp").read_text())
    sources = {family: (folder / f"{family}_panels.cpp").read_text() for family in order}
    return {family: ENTRY.findall(text[text.index("kPanels[]"):]) for family, text in sources.items()}


def numbers():
    """{name: its number on the sheet}."""
    return {name: n for n, (name, _) in enumerate([p for family in listed().values() for p in family], 1)}


def function(name, source):
    """A function with the comment above it."""
    match = re.search(rf"^(?:///[^\n]*\n)*Picture {name}\(.*?^}}\n", source, re.M | re.S)
    if not match:
        raise PanelError(f"no function {name}")
    return match[0]


def code(panel):
    """Its values and statements, as they run."""
    values = (textwrap.fill(f"{name} = {given!r}".replace("'", '"'), 96, subsequent_indent=" " * (len(name) + 4))
              for name, given in panel.values.items())
    return "\n".join([*values, panel.python.strip()])


def made(panel, photo, qori):
    """The picture by the package."""
    names = {"np": np, "math": math, "qori": qori, "photo": photo}
    exec(compile(code(panel), panel.name, "exec"), names)
    return names["out"]


def run(photo, folder):
    """The panels of a photograph, an image, by the demo: {name: pixels}."""
    source = folder / "photograph.png"
    photo.save(source, compress_level=1)
    done = subprocess.run([DEMO, source, folder / "sheet.png", TYPEFACE, folder], check=True, capture_output=True,
                          text=True)
    names = numbers()
    count = len(re.findall(r"^ *\d+/\d+ ", done.stdout, re.M))
    if count != len(names):
        raise PanelError(f"the demo has {count} panels, examples/ lists {len(names)}")
    return {name: np.asarray(Image.open(folder / f"{n}.png")) for name, n in names.items()}


def of_operation(name, photo, qori, folder):
    """For an operation's page: the pictures of its panels, their statements in Python, and where they stand in C."""
    figures, codes = [], []
    for panel in (p for p in recipes().values() if p.of == name):
        drawn = render.picture_of(made(panel, photo, qori))
        picture = render.save(drawn, folder / f"panel_of_{panel.name}.webp")
        caption, link = escape(panel.caption), f"../demo.html#panel-{numbers()[panel.name]}"
        figures.append(f'<figure><img src="../_static/pictures/{picture}" alt="{caption}" loading="lazy">'
                       f'<figcaption>{caption}; <a href="{link}">in C</a></figcaption></figure>')
        codes += [f"<details><summary>{caption}</summary>", "", "```python", code(panel), "```", "", "</details>", ""]
    return ["## On the demo's sheet", "", '<div class="shots">', *figures, "</div>", "", *codes] if figures else []


def figure(number, panel, name):
    caption = escape(panel.caption)
    return (f'<figure><a href="#panel-{number}"><img src="_static/pictures/{name}" alt="{caption}" loading="lazy"></a>'
            f"<figcaption>{caption}<br><code>{escape(panel.exports)}</code></figcaption></figure>")


def markdown(pictures):
    """By family the pictures, and below them the code of each."""
    with tempfile.TemporaryDirectory() as place:
        shown = run(inputs.original(), Path(place))
    lines, number = [], 0
    for family, panels in listed().items():
        figures, codes = [], []
        source = (ROOT / "examples" / f"{family}_panels.cpp").read_text()
        for number, (name, maker) in enumerate(panels, number + 1):
            panel = recipes()[name]
            picture = render.save(Image.fromarray(shown[name]), pictures / f"panel_{number}.webp")
            figures.append(figure(number, panel, picture))
            # An anchor within: browsers open what they are sent into.
            codes += [f'<details><summary>{escape(panel.caption)}</summary><a id="panel-{number}"></a>', "", "```cpp",
                      function(maker, source).rstrip(), "```", "",
                      f'<p>In Python: <a href="operations/{panel.of}.html">{panel.of}</a>.</p>', "", "</details>", ""]
        lines += [f"## {family.capitalize()}", "", '<div class="shots">', *figures, "</div>", "", *codes]
    return "\n".join(lines)
