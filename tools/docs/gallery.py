"""Runs the recipes and gives the Markdown of pictures, examples and errors of each operation."""
import re
import traceback
from html import escape

import numpy as np

import examples
import inputs
import panels
import recipes
import render

CODE = re.compile(r"```python\n(.*?)```\n", re.S)
SHOW = re.compile(r"<!-- show: (.*?) -->")


def figure(name, caption, kind="", alt=""):
    crop = ' class="crop"' if kind == "crop" else ""
    label = ' class="input"' if kind == "input" else ""
    return (f'<figure><img src="../_static/pictures/{name}" alt="{escape(alt, True)}" loading="lazy"{crop}>'
            f"<figcaption{label}>{caption}</figcaption></figure>")


def code(text):
    """As code that breaks behind a function's name rather than in it; short lists in parentheses stay on one line."""
    text = re.sub(r"\([^()\n]{1,22}\)", r'<span class="whole">\g<0></span>', escape(text))
    return "<code>" + re.sub(r"(qori\.\w+\()(?!<)", r"\1<wbr>", text) + "</code>"


def inputs_shown(folder):
    """All pictures that recipes begin with: name, elements, shape."""
    figures = []
    for name, array in inputs.everything().items():
        if array.dtype != np.uint8:
            continue
        picture = render.save(render.picture_of(array), folder / f"input_{name}.webp")
        shape = " x ".join(map(str, array.shape))
        figures.append(figure(picture, f"{code(name)} {shape}", alt=name).replace("../_static", "_static"))
    return '<div class="shots">\n' + "\n".join(figures) + "\n</div>"


def value_text(result):
    """What stands beside the call of a result that is not a picture."""
    if isinstance(result, (int, float)):
        return f"{result:.6g}" if isinstance(result, float) else str(result)
    if isinstance(result, tuple):
        parts = [value_text(r) for r in result]
        return "(" + ", ".join(parts) + ")" if all(parts) else ""
    return ""


def row_figures(recipe, number, row, names, folder):
    figures = []
    for name in row.input:
        picture = render.save(render.picture_of(names[name], None), folder / f"input_{name}.webp")
        link = f'<a href="../pictures.html">{escape(name)}</a>'
        figures.append(figure(picture, link, "input", name))
    for index, (text, drawn, result) in enumerate(recipes.run_row(row, names)):
        picture = render.save(render.picture_of(drawn, row.crop), folder / f"{recipe.operation}_{number}_{index}.webp")
        value = value_text(result)
        caption = code(text) + (f" <b>{escape(value)}</b>" if value else "")
        figures.append(figure(picture, caption, "crop" if row.crop else "", text.replace("\n", "; ")))
    return figures


def pictures(recipe, names, folder):
    lines = []
    for number, row in enumerate(recipe.rows):
        if row.note:
            lines += [row.note, ""]
        if row.setup and not row.varied_setup:
            lines += ["```python", recipes.put(row.setup, "").strip(), "```", ""]
        lines += ['<div class="shots">', *row_figures(recipe, number, row, names, folder), "</div>", ""]
    return lines


def errors(recipe, names):
    if not recipe.wrong:
        return []
    text = recipe.wrong.strip()
    error = recipes.refusal(text, names)
    return ['<div class="refused">', "", "```python", text, "```", "", "```text", error, "```", "", "</div>", ""]


def make(pages, folder):
    """({operation: pictures, example, errors, thumbnail}, what could not be made and why)."""
    qori = recipes.door()
    names = recipes.namespace(qori)
    found, failed = {}, []
    known = recipes.load()
    unknown = set(known) - set(pages)
    if unknown:
        raise recipes.RecipeError(f"recipes of no operation: {sorted(unknown)}")
    model = examples.model()
    for name, recipe in known.items():
        shown = found[name] = {"brief": recipe.brief}
        for what, maker in (("pictures", lambda: pictures(recipe, names, folder)),
                            ("example", lambda: examples.markdown(recipe, names, model)),
                            ("panels", lambda: panels.of_operation(name, names["photo"], qori, folder)),
                            ("errors", lambda: errors(recipe, names))):
            try:
                shown[what] = maker()
            except Exception as error:
                shown[what] = []
                failed.append((name, what, error))
        if shown["pictures"]:
            shown["thumbnail"] = f"{name}_0_{(len(recipe.rows[0].vary) - 1) // 2}.webp"
    return found, [f"{name}: no {what}: {''.join(traceback.format_exception_only(error)).strip()}"
                   for name, what, error in failed]


# --- pages written by hand ------------------------------------------------------------------------------------------

def assigned(name, blocks):
    """The statement that gave a name its value, as the caption of its picture."""
    for text in reversed(blocks):
        match = re.search(rf"^{name} = (.*?)(?=\n\S|\Z)", text, re.M | re.S)
        if match:
            return f"{name} = {match[1].strip()}"
    return name


def run_page(path, names, show=lambda name, value: None):
    """Executes the blocks of a page in order; `show` is called with what its comments name. Returns the new text."""
    text, blocks = path.read_text(), []

    def each(match):
        if match.group().startswith("<!--"):
            figures = []
            for part in match[1].split(";"):
                expression, _, view = part.strip().partition(" as ")
                value = eval(view or expression, vars(render) | names | {"r": names.get(expression)})
                figures.append(show(expression, value, code(assigned(expression, blocks))))
            return '<div class="shots">\n' + "\n".join(figures) + "\n</div>"
        blocks.append(match[1])
        printed = examples.printed(match[1], names)
        return match.group() + (f"\n```text\n{printed}```\n" if printed else "")

    either = re.compile(CODE.pattern + "|" + SHOW.pattern, re.S)
    return either.sub(lambda m: each(CODE.match(m.group()) or SHOW.match(m.group())), text)


def fill_pages(folder):
    """Runs the pages written by hand, puts in what they print and show, and gives what failed."""
    failed = []
    recipes.door()
    for path in sorted([*folder.glob("tasks/*.md"), folder / "index.md"]):
        if not path.exists() or "```python" not in path.read_text():
            continue
        stem = path.stem
        place = "_static/pictures" if path.parent == folder else "../_static/pictures"

        def show(name, value, caption, stem=stem, place=place):
            picture = render.save(render.picture_of(value), folder / "_static" / "pictures" / f"{stem}_{name}.webp")
            return figure(picture, caption, alt=name).replace("../_static/pictures", place)

        try:
            with examples.scratch():
                path.write_text(run_page(path, {"__name__": "__page__"}, show))
        except Exception as error:
            failed.append(f"{path.name}: {''.join(traceback.format_exception_only(error)).strip()}")
    return failed
