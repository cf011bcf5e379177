#!/usr/bin/env python3
"""Assembles the source of the site: hand-written pages, pages of the registry, pictures of the recipes.

    assemble.py FOLDER [--no-pictures]

Fails where an operation has no picture or no example, or one of them cannot be made.
"""
import re
import shutil
import sys
from pathlib import Path

from paths import ROOT

import gallery
import panels
import plots
import reference
import registry


def write(path, text):
    path.parent.mkdir(parents=True, exist_ok=True)
    path.write_text(text.rstrip("\n") + "\n")


def fill(path, what, made):
    """Replaces comments of a page; an old one in it that is not there any more is an error."""
    text, count = re.subn(rf"<!-- {what} -->", lambda m: made(m[1] if m.groups() else None), path.read_text())
    if not count:
        raise registry.RegistryError(f"{path.name}: no place for {what}")
    path.write_text(text)


def toctree(names, **options):
    lines = ["```{toctree}"] + [f":{key.replace('_', '-')}: {value}".rstrip() for key, value in options.items()]
    return "\n".join(lines + [""] + names + ["```", ""])


def overview(pages, shown):
    """All operations by task, each with its thumbnail."""
    lines = ["# Operations", "", f"{len(pages)} operations, by what they are for. Each page shows what it does, how "
             "it is called in Python, C++ and C, for which elements and layouts it exists, and when it refuses. `photo`, `gray` and so on "
             "are [the pictures of these pages](../pictures.md).", ""]
    for title, group in reference.by_task(pages):
        lines += [f"## {title}", "", '<div class="cards">']
        for page in group:
            picture = shown.get(page.name, {}).get("thumbnail")
            image = '<div class="none"></div>'
            if picture:
                image = f'<img src="../_static/pictures/{picture}" alt="" loading="lazy">'
            lines.append(f'<a href="{page.name}.html">{image}<span>{page.name}</span></a>')
        lines += ["</div>", ""]
    return "\n".join(lines) + "\n" + toctree(sorted(pages), hidden="", maxdepth=1)


def plans_index(families, members):
    lines = ["# Plans, buffers and queries", "",
             "In Python and C++ plans are objects and buffers look after themselves; see [plans and buffers]"
             "(../tasks/plans.md). These are the C functions behind them, by family.", ""]
    return "\n".join(lines) + toctree(list(members), maxdepth=1)


def main(arguments):
    if not arguments or arguments[0].startswith("-"):
        print(__doc__, file=sys.stderr)
        return 2
    folder = Path(arguments[0]).resolve()
    shutil.rmtree(folder, ignore_errors=True)
    shutil.copytree(ROOT / "docs", folder, ignore=shutil.ignore_patterns("recipes", "speed.json"))
    families = registry.load(ROOT / "api")
    pages, helpers = reference.operations(families), reference.support(families)
    plain = "--no-pictures" in arguments
    shown, failed = ({}, []) if plain else gallery.make(pages, folder / "_static" / "pictures")
    for page in pages.values():
        write(folder / "operations" / f"{page.name}.md",
              reference.operation_page(page, pages, helpers, shown.get(page.name, {})))
    write(folder / "operations" / "index.md", overview(pages, shown))
    stems = {f.stem: f for f in families}
    for stem, members in helpers.items():
        write(folder / "plans" / f"{stem}.md", reference.support_page(stems[stem], members, pages))
    write(folder / "plans" / "index.md", plans_index(families, helpers))
    fill(folder / "numerics.md", "bounds", lambda _: reference.bounds(pages))
    fill(folder / "speed.md", "plot: (\\w+)", plots.markdown(ROOT / "docs" / "speed.json", folder / "_static"))
    if not plain:
        failed += gallery.fill_pages(folder) + lacking(pages, shown)
        fill(folder / "demo.md", "panels", lambda _: panels.markdown(folder / "_static" / "pictures"))
        fill(folder / "pictures.md", "pictures", lambda _: gallery.inputs_shown(folder / "_static" / "pictures"))
    for text in failed:
        print(f"docs: {text}", file=sys.stderr)
    return int(bool(failed))


def lacking(pages, shown):
    """Prints how many operations have a picture and an example, and gives what is missing."""
    found = []
    for what in ("pictures", "example"):
        without = [name for name in pages if not shown.get(name, {}).get(what)]
        print(f"docs: {len(pages) - len(without)} of {len(pages)} operations have {what}")
        found += [f"{name} has no {what}" for name in without]
    return found


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
