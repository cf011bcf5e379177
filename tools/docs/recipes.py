"""Recipes: what the pages show of each operation. One text is what runs and what is printed below the picture.

docs/recipes/*.toml are lists of [[recipe]]:
    of        operations; OP in the texts below stands for each in turn
    brief     what the operation does, where the registry says it of its forms only
    example   statements on small arrays; the value of the last, an expression, is printed
    wrong     an expression that is refused; its error is printed
    [[recipe.row]]
    input     names of pictures (inputs.py) that are shown first
    setup     statements that run before; with @ in them they are part of each caption, else printed once
    call      the expression; @ stands for each text of `vary` in turn, @@ for the operator
    vary      three to five texts
    picture   what is drawn of the result r, an expression of render.py's functions; the result itself where left out
    note      a sentence before the pictures; crop: [row, column, height, width] that is magnified
docs/recipes/panels/*.toml are the recipes of the demo's panels: see panel_values.py and panels.py
"""
import ast
import copy
import tomllib
from dataclasses import dataclass, field

import numpy as np

import inputs
import render
from paths import PACKAGE, ROOT


class RecipeError(Exception):
    pass


@dataclass
class Row:
    call: str
    input: list = field(default_factory=list)
    setup: str = ""
    vary: list = field(default_factory=lambda: [""])
    picture: str = "r"
    note: str = ""
    crop: list = None

    def text(self, value):
        """What stands below the picture."""
        setup = put(self.setup, value).strip() + "\n" if self.varied_setup else ""
        return setup + put(self.call, value)

    @property
    def varied_setup(self):
        return put(self.setup, "\1") != put(self.setup, "")


@dataclass
class Recipe:
    operation: str
    brief: str = ""
    example: str = ""
    wrong: str = ""
    rows: list = field(default_factory=list)


def replaced(value, name):
    if isinstance(value, str):
        return value.replace("OP", name)
    if isinstance(value, list):
        return [replaced(v, name) for v in value]
    return {k: replaced(v, name) for k, v in value.items()} if isinstance(value, dict) else value


def put(text, value):
    """The text with a value for each @; @@ is the operator."""
    return text.replace("@@", "\0").replace("@", value).replace("\0", "@")


def load(folder=ROOT / "docs" / "recipes"):
    found = {}
    for path in sorted(folder.glob("*.toml")):
        for entry in tomllib.loads(path.read_text())["recipe"]:
            for name in entry["of"]:
                if name in found:
                    raise RecipeError(f"{path.name}: {name} has two recipes")
                own = replaced({k: v for k, v in entry.items() if k != "of"}, name)
                rows = [Row(**r) for r in own.pop("row", [])]
                try:
                    found[name] = Recipe(name, rows=rows, **own)
                except TypeError as error:
                    raise RecipeError(f"{path.name}: {name}: {error}") from error
    return found


def door():
    """The Python package of the build."""
    import sys
    sys.path.insert(0, str(PACKAGE))
    import qori
    return qori


def namespace(qori):
    return {"np": np, "qori": qori, "gauss_noise": inputs.gauss_noise} | inputs.everything()


def run(text, names):
    """Executes statements; the value of the last, where it is an expression."""
    tree = ast.parse(text)
    last = tree.body.pop() if tree.body and isinstance(tree.body[-1], ast.Expr) else None
    exec(compile(tree, "<recipe>", "exec"), names)
    return eval(compile(ast.Expression(last.value), "<recipe>", "eval"), names) if last else None


def run_row(row, names):
    """(text below, picture, result) of each value."""
    for value in row.vary:
        own = copy.copy(names)
        run(put(row.setup, value), own)
        result = run(put(row.call, value), own)
        drawn = eval(put(row.picture, value), vars(render) | own | {"r": result})
        yield row.text(value), drawn, result


def refusal(text, names):
    """The error that an expression ends in, as Python prints it."""
    try:
        run(text, dict(names))
    except Exception as error:                      # whatever it is, it is what the user meets
        kind = type(error)
        place = "" if kind.__module__ == "builtins" else kind.__module__.split(".")[0] + "."
        return f"{place}{kind.__name__}: {error}"
    raise RecipeError(f"not refused: {text}")
