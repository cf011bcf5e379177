"""The documentation's generator: parts of names, statuses in order, recipes, dead links."""
import re
import sys
import tempfile
import unittest
from pathlib import Path

ROOT = Path(__file__).resolve().parents[2]
sys.path[:0] = [str(ROOT / "tools" / "docs"), str(ROOT / "tools")]
import links  # noqa: E402
import panel_values  # noqa: E402
import reference  # noqa: E402
import registry  # noqa: E402
import signatures  # noqa: E402


class Reference(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.families = registry.load(ROOT / "api")
        cls.pages = reference.operations(cls.families)

    def test_every_export_stands_on_one_page(self):
        support = reference.support(self.families)
        listed = [m.name for p in self.pages.values() for m in p.members]
        listed += [m.name for members in support.values() for m in members]
        self.assertEqual(sorted(listed), sorted(m.name for m in registry.all_members(self.families)))

    def test_every_operation_is_found_by_one_task(self):
        found = [p.name for _, group in reference.by_task(self.pages) for p in group]
        self.assertEqual(sorted(found), sorted(self.pages))

    def test_names_come_apart(self):
        members = {m.name: m for m in registry.all_members(self.families)}
        for name, parts in {"qoriAdd_8u_C1RSfs": ("8u", "C1", "RSfs"), "qoriCopy_8u_C3P3R": ("8u", "C3P3", "R"),
                            "qoriLUTPalette_8u_C3A0C4R": ("8u", "C3A0C4", "R"), "qoriSet_8u_C3CR": ("8u", "C3C", "R"),
                            "qoriDCT8x8Fwd_8u16s_C1R": ("8u16s", "C1", "R"), "qoriCopy_8u_AC4C3R": ("8u", "AC4C3", "R"),
                            "qoriMul_16sc_C1IRSfs": ("16sc", "C1", "IRSfs"), "qoriGetLibVersion": ("", "", "")}.items():
            self.assertEqual(reference.code_parts(members[name]), parts, name)

    def test_statuses_stand_in_the_order_of_the_checks(self):
        page = self.pages["filter_median"]
        lines = [line for line in reference.statuses(page.members) if line.startswith(("| 1 ", "| 2 "))]
        first, second = page.members[0].checks[:2]
        self.assertIn(first.split(" ")[0], lines[0])
        self.assertIn(second.split(" ")[0], lines[1])

    def test_text_of_the_registry_is_not_markup(self):
        self.assertEqual(reference.escape("a * b < c_d | [e]"), r"a \* b \< c\_d \| \[e\]")

    def test_plans_of_the_signatures_are_those_of_the_cpp_header(self):
        header = (ROOT / "include" / "qori.hpp").read_text()
        used = {p.members[0].operation.plan for p in self.pages.values()} - {""}
        self.assertEqual(set(signatures.PLANS), used)
        for name, text in signatures.PLANS.items():
            self.assertRegex(header, rf"class {name}\b")
            for method in set(re.findall(r"plan\.(\w+)\(", text.replace("WAY", "forward"))):
                self.assertIn(f"QorResult {method}(", header)

    def test_the_page_of_numerics_says_of_every_operation_what_holds(self):
        text = reference.bounds(self.pages)
        self.assertEqual([name for name in self.pages if f"(operations/{name}.md)" not in text], [])
        self.assertRegex(text, r"\[exp\]\(operations/exp.md\): .*within 1 ulp")

    def test_what_does_not_exist_is_an_empty_cell(self):
        table = "\n".join(reference.existing(self.pages["filter_median"]))
        self.assertIn("| `64f` | R |  |  |  |", table)


class Panels(unittest.TestCase):
    def load(self, panels, vary="[]"):
        with tempfile.TemporaryDirectory() as folder:
            (Path(folder) / "panels").mkdir()
            (Path(folder) / "one.toml").write_text(f'[[recipe]]\nof = ["blur"]\n[[recipe.row]]\ncall = ""\nvary = {vary}')
            first = '[[panel]]\nname = "one"\nof = "blur"\nexports = "Blur"\npython = "out = photo * side"\n'
            (Path(folder) / "panels" / "blur.toml").write_text(first + panels)
            return panel_values.load(Path(folder)), panel_values.header(Path(folder))

    def test_values_become_constants_and_captions(self):
        text = self.load('caption = "By {sides} x {sides} pixels"\nvalues = {sides = {row = 0}}', '["3", "15"]')[1]
        self.assertIn('namespace one {\ninline constexpr About about{"By 3 x 3, 15 x 15 pixels", "Blur"};', text)
        self.assertIn("inline constexpr std::array<int, 2> sides{3, 15};", text)
        text = self.load('caption = "{n}: {k}"\nvalues = {k = {row = 0}, n = 0.5}', """["'a', b=1", "'c'"]""")[1]
        self.assertIn('about{"0.5: a, b=1, c", "Blur"};\ninline constexpr std::array<const char*, 2> k{"a, b=1", "c"};', text)
        self.assertIn("inline constexpr double n = 0.5;", text)
        with self.assertRaises(ValueError):
            self.load('caption = ""\nvalues = {mixed = [3, 0.5]}')

    def test_a_panel_has_the_statements_of_another(self):
        other = '\n[[panel]]\nname = "two"\nof = "blur"\ncaption = "{side}"\nsame = "one"\nvalues = {side = 5}\n'
        panels = self.load('caption = ""\nvalues = {side = 3, more = 1}' + other + 'instead = [["photo", "-photo"]]')[0]
        self.assertEqual(panels["two"].values, {"side": 5, "more": 1})
        self.assertEqual((panels["two"].python, panels["one"].python), ("out = -photo * side", "out = photo * side"))
        with self.assertRaises(ValueError):
            self.load('caption = ""' + other + 'instead = [["what is not there", ""]]')


class Links(unittest.TestCase):
    def dead(self, **pages):
        with tempfile.TemporaryDirectory() as folder:
            for name, text in pages.items():
                (Path(folder) / f"{name}.html").write_text(text)
            return links.dead(Path(folder))

    def test_links_that_lead_nowhere_are_found(self):
        self.assertEqual(self.dead(a='<a href="b.html#here">', b='<p id="here">'), [])
        self.assertEqual(self.dead(a='<a href="b.html#there">', b='<p id="here">'), ["a.html: b.html#there"])
        self.assertEqual(self.dead(a='<img src="pictures/none.webp">'), ["a.html: pictures/none.webp"])
        self.assertEqual(self.dead(a='<a href="#top">'), ["a.html: #top"])

    def searched(self, index, script='<script src="searchindex.js"></script>'):
        with tempfile.TemporaryDirectory() as folder:
            for name, text in {"search.html": script, "a.html": "", "b.html": "", "searchindex.js": index}.items():
                (Path(folder) / name).write_text(text)
            return links.not_searched(Path(folder))

    def test_a_search_in_files_finds_every_page(self):
        self.assertEqual(self.searched('Search.setIndex({"docnames": ["a", "b"]})'), [])
        self.assertEqual(self.searched('Search.setIndex({"docnames": ["b"]})'), ["a: no search finds it"])
        self.assertEqual(len(self.searched('{"docnames": ["a", "b"]}')), 1)
        self.assertEqual(len(self.searched('Search.setIndex({"docnames": ["a", "b"]})', "")), 1)


if __name__ == "__main__":
    unittest.main()
