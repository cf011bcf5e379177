"""The site: hand-written Markdown and pages made from the registry, assembled by tools/docs/assemble.py."""
import re
from pathlib import Path

project = "qori"
copyright = "the authors of qori, Apache-2.0"
release = re.search(r"project\(qori VERSION ([\d.]+)", (Path(__file__).parents[3] / "CMakeLists.txt").read_text())[1]
version = release.rpartition(".")[0]

extensions = ["myst_parser"]
myst_heading_anchors = 3
nitpicky = True

html_theme = "furo"
html_title = f"qori {version}"
html_static_path = ["_static"]
html_css_files = ["qori.css"]
html_search_scorer = str(Path(__file__).with_name("search_scorer.js"))
html_show_sourcelink = False
html_copy_source = False
html_show_sphinx = False
html_last_updated_fmt = None
pygments_style, pygments_dark_style = "friendly", "github-dark"
html_theme_options = {
    "light_css_variables": {"color-brand-primary": "#0b6e72", "color-brand-content": "#0b6e72"},
    "dark_css_variables": {"color-brand-primary": "#4fc1c4", "color-brand-content": "#4fc1c4"},
}
