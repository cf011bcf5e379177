#!/usr/bin/env python3
"""Checks a built site: every link and picture that does not leave it is there, anchors too; search; and its size.

    links.py FOLDER MEGABYTES
"""
import json
import re
import sys
from html.parser import HTMLParser
from pathlib import Path
from urllib.parse import unquote, urlsplit


class Page(HTMLParser):
    def __init__(self):
        super().__init__()
        self.links, self.anchors = [], set()

    def handle_starttag(self, tag, attributes):
        for name, value in attributes:
            if name in ("href", "src") and value is not None:
                self.links.append(value)
            elif name in ("id", "name") and value:
                self.anchors.add(value)


def read(path):
    page = Page()
    page.feed(path.read_text())
    return page


def dead(folder):
    """PAGE: LINK of every link that leads nowhere."""
    pages = {path.resolve(): read(path) for path in folder.rglob("*.html")}
    found = []
    for path, page in pages.items():
        for link in page.links:
            parts = urlsplit(link)
            if parts.scheme or parts.netloc:
                continue
            target = (path.parent / unquote(parts.path)).resolve() if parts.path else path
            target = target / "index.html" if target.is_dir() else target
            known = pages.get(target)
            if not target.exists() or (parts.fragment and known and unquote(parts.fragment) not in known.anchors):
                found.append(f"{path.relative_to(folder.resolve())}: {link}")
    return sorted(set(found))


def not_searched(folder):
    """What keeps a search from finding a page of the site as files, from which scripts may load nothing but scripts."""
    if 'src="searchindex.js"' not in (folder / "search.html").read_text():
        return ["search.html: does not load searchindex.js as a script"]
    index = re.match(r"Search\.setIndex\((.*)\)$", (folder / "searchindex.js").read_text().strip(), re.S)
    if not index:
        return ["searchindex.js: hands over no index"]
    known = set(json.loads(index[1])["docnames"]) | {"search", "genindex"}
    pages = (str(path.relative_to(folder).with_suffix("")) for path in folder.rglob("*.html"))
    return sorted(f"{page}: no search finds it" for page in pages if page not in known)


def main(arguments):
    if len(arguments) != 2:
        print(__doc__, file=sys.stderr)
        return 2
    folder, limit = Path(arguments[0]), float(arguments[1])
    found, missed = dead(folder), not_searched(folder)
    size = sum(p.stat().st_size for p in folder.rglob("*") if p.is_file()) / 1e6
    for text in found[:20]:
        print(f"docs: dead link in {text}", file=sys.stderr)
    for text in missed[:20]:
        print(f"docs: {text}", file=sys.stderr)
    print(f"docs: {size:.1f} MB, {len(list(folder.rglob('*.html')))} pages, {len(found)} dead links")
    return int(bool(found or missed) or size > limit)


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
