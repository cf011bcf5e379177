"""Every example of the documentation: in Python by the package, in C by one compiled program, and what is refused."""
import ast
import ctypes
import re
import subprocess
import sys
from pathlib import Path

import numpy as np
import pytest

ROOT = Path(__file__).resolve().parents[2]
sys.path.insert(0, str(ROOT / "tools" / "docs"))
import paths  # noqa: E402
import door_python_model  # noqa: E402
import examples  # noqa: E402
import gallery  # noqa: E402
import inputs  # noqa: E402
import panels  # noqa: E402
import recipes  # noqa: E402
import registry  # noqa: E402
import render  # noqa: E402

RECIPES = recipes.load()
PAGES = sorted(p for p in [*(ROOT / "docs").glob("*.md"), *(ROOT / "docs" / "tasks").glob("*.md")])


@pytest.fixture(scope="session")
def names():
    return recipes.namespace(recipes.door())


@pytest.fixture(scope="session")
def in_c():
    model = examples.model()
    return {name: examples.in_c(recipe, model) for name, recipe in RECIPES.items()}


def compiled(text, folder, name):
    source = folder / f"{name}.c"
    source.write_text(text)
    place = paths.LIBRARY.parent
    subprocess.run(["cc", "-std=c99", "-O0", "-Wall", "-Werror", f"-I{ROOT / 'include'}", source, "-o", folder / name,
                    f"-L{place}", f"-Wl,-rpath,{place}", "-lqorik5", "-lm"], check=True)
    return folder / name


def plain(value):
    """Arrays and numbers of a result in one order, as bytes."""
    if isinstance(value, (tuple, list)):
        return [p for v in value for p in plain(v)]
    if isinstance(value, ctypes.Array):
        return plain(list(value))
    if value is None:
        return []
    array = np.asarray(value).squeeze()                # a list is a list, as a row too
    return [array] if array.ndim else [float(array) if array.dtype.kind in "iuf" else array]


def same(a, b):
    def equal(x, y):
        return np.array_equal(x, y, equal_nan=np.asarray(x).dtype.kind == "f")
    return len(a) == len(b) and all(map(equal, a, b))


@pytest.mark.parametrize("name", RECIPES)
def test_an_example_in_python_gives_what_c_gives(name, names, in_c):
    value = recipes.run(RECIPES[name].example, dict(names))
    assert in_c[name].computed, "the example computes nothing"
    assert same(plain(value), plain(in_c[name].value))


def test_the_examples_in_c_compile_and_give_the_same_bytes(in_c, tmp_path):
    program = compiled(examples.program(in_c), tmp_path, "examples")
    printed = subprocess.run([program], check=True, capture_output=True, text=True, timeout=60).stdout.splitlines()
    assert len(printed) == len(in_c)
    for line, (name, example) in zip(printed, in_c.items()):
        found = line.split()
        assert found == [name] + [computed.hex() for computed in example.computed.values()]


@pytest.mark.parametrize("name", [n for n, r in RECIPES.items() if r.wrong])
def test_what_a_page_shows_as_wrong_is_refused_by_the_package(name, names):
    text = recipes.refusal(RECIPES[name].wrong, names)
    kind, _, words = text.partition(": ")
    assert kind in ("qori.Error", "ValueError", "TypeError", "OverflowError"), text
    assert len(words) > 10 and "internal" not in words


@pytest.mark.parametrize("path", [p for p in PAGES if "```python" in p.read_text()], ids=lambda p: p.stem)
def test_the_python_of_a_page_runs_from_top_to_bottom(path, names):
    shown = []
    with examples.scratch():
        gallery.run_page(path, {}, lambda name, value, caption: shown.append(np.asarray(value).size) or "")
    assert all(shown)


@pytest.mark.parametrize("path", [p for p in PAGES if "int main(void)" in p.read_text()], ids=lambda p: p.stem)
def test_the_programs_of_a_page_run(path, tmp_path):
    for index, text in enumerate(re.findall(r"```c\n(.*?)```", path.read_text(), re.S)):
        if "int main(void)" in text:
            program = compiled(text, tmp_path, f"program{index}")
            subprocess.run([program], check=True, stdout=subprocess.DEVNULL, timeout=60)


def test_every_panel_of_the_demo_has_a_recipe_and_every_recipe_a_panel():
    entries = [entry for family in panels.listed().values() for entry in family]
    assert all(recipe == function for recipe, function in entries)
    assert sorted(recipe for recipe, _ in entries) == sorted(panels.recipes())
    families = [family for family, those in panels.listed().items() for _ in those]
    assert [panels.recipes()[name].family for name, _ in entries] == families
    assert {panel.of for panel in panels.recipes().values()} <= RECIPES.keys()


@pytest.fixture(scope="session", params=[(20, 0, 580, 400), (100, 50, 401, 253)], ids=["560x400", "301x203"])
def sheet(request, tmp_path_factory):
    """A photograph, and the demo's pictures of it."""
    photo = inputs.original().crop(request.param)
    return np.asarray(photo), panels.run(photo, tmp_path_factory.mktemp("demo"))


@pytest.mark.parametrize("name", panels.recipes())
def test_a_recipe_of_a_panel_makes_in_python_what_the_demo_makes_in_c(name, sheet):
    photo, shown = sheet
    np.testing.assert_array_equal(panels.made(panels.recipes()[name], photo.copy(), recipes.door()), shown[name])


def test_every_operation_has_pictures_an_example_and_a_wrong_use():
    operations = {f.name for f in door_python_model.functions(registry.load(ROOT / "api"))}
    assert set(RECIPES) == operations
    assert not [n for n, r in RECIPES.items() if not (r.example and r.wrong and r.rows)]


def shows_its_input(row):
    """By name above the results, or as a part of their pictures."""
    drawn = {n.id for n in ast.walk(ast.parse(recipes.put(row.picture, row.vary[0]))) if isinstance(n, ast.Name)}
    return bool(row.input or drawn - {"r", "np"} - vars(render).keys())


def test_every_row_of_pictures_has_three_to_five_and_every_page_its_input():
    assert not [n for n, r in RECIPES.items() if not all(3 <= len(set(row.vary)) <= 5 for row in r.rows)]
    assert not [n for n, r in RECIPES.items() if not any(map(shows_its_input, r.rows))]


def test_where_methods_stand_beside_each_other_a_part_is_magnified():
    beside = [(n, row) for n, r in RECIPES.items() for row in r.rows if row.call in ("@", "qori.@")]
    assert len(beside) > 5 and not [n for n, row in beside if not row.crop]
