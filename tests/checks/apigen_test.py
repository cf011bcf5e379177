"""The generator on small registries: names, argument lists, stack sizes, order, and what it refuses."""
import sys
import tempfile
import unittest
from pathlib import Path

ROOT = Path(__file__).resolve().parents[2]
sys.path.insert(0, str(ROOT / "tools"))
import apigen  # noqa: E402
import registry  # noqa: E402

FAMILY = """
title = "Sample"
namespace = "sample"
checks = ["null", "size"]
[tokens]
scale = { c = ["int32_t scaleFactor"], cpp = "scaleFactor" }
[[group]]
op = "Sum"
args = "binary"
kinds = ["R", "IR"]
call = "sum<{S}, {L}>"
brief = "Adds."
members = [
    { types = ["8u", "16sc"], layouts = ["C3", "AC4"], suffix = "Sfs", tail = "scale" },
    { types = ["32f"], layouts = ["C1"] },
]
[[group]]
op = "Fill"
types = ["64f", "32fc"]
layouts = ["C1", "C3", "C4C"]
kinds = ["R"]
args = "fill"
call = "fill<{D}, {N}>"
brief = "Fills."
[[group]]
op = "Turn"
types = ["8u32f"]
layouts = ["C3P3"]
kinds = ["R"]
args = "src dstPlanes roi"
call = "turn<{S}, {D}>"
brief = "Turns."
"""


def load(text):
    with tempfile.TemporaryDirectory() as folder:
        (Path(folder) / "forms.toml").write_text((ROOT / "api" / "forms.toml").read_text())
        (Path(folder) / "sample.toml").write_text(text)
        return apigen.load(Path(folder))


class Generator(unittest.TestCase):
    def setUp(self):
        self.families = load(FAMILY)
        self.members = {m.name: m for m in apigen.all_members(self.families)}

    def test_members_are_products_and_sorted_bytewise(self):
        self.assertEqual(sorted(self.members), list(self.members))
        self.assertEqual(17, len(self.members))
        for name in ("qoriSum_8u_AC4IRSfs", "qoriSum_32f_C1R", "qoriFill_64f_C4CR", "qoriTurn_8u32f_C3P3R"):
            self.assertIn(name, self.members)

    def test_stack_bytes_count_values_not_pointers(self):
        for name, size in {"qoriSum_8u_C3RSfs": 36, "qoriSum_32f_C1IR": 24, "qoriFill_64f_C1R": 24, "qoriFill_64f_C3R": 20,
                           "qoriFill_32fc_C1R": 24, "qoriTurn_8u32f_C3P3R": 24}.items():
            self.assertEqual(size, self.members[name].stack_bytes, name)

    def test_single_channel_takes_the_value_itself(self):
        self.assertEqual("double value", self.members["qoriFill_64f_C4CR"].parameters[0])
        self.assertEqual("const double value[3]", self.members["qoriFill_64f_C3R"].parameters[0])
        self.assertEqual("&value", self.members["qoriFill_64f_C1R"].expressions[0])

    def test_in_place_image_is_last_source_and_destination(self):
        expressions = ", ".join(self.members["qoriSum_32f_C1IR"].expressions)
        self.assertEqual("Image<const float>{pSrc, srcStep}, Image<const float>{pSrcDst, srcDstStep}, "
                         "Image<float>{pSrcDst, srcDstStep}, roiSize", expressions)

    def test_alpha_layout_processes_three_channels(self):
        self.assertEqual(3, registry.processed("AC4"))
        self.assertEqual(("C3", "C4"), registry.split_layout("C3A0C4"))
        self.assertEqual(("C4C", "C4C"), registry.split_layout("C4C"))

    def test_table_import_list_and_members_agree(self):
        members = apigen.all_members(self.families)
        table = apigen.entry_table(members)
        self.assertIn("QORI_STUB qoriFill_32fc_C1R, 0", table)
        self.assertIn("    qoriSum_8u_C3RSfs@36\n", apigen.import_definition(members))
        self.assertIn("QORI_MEMBER(qoriSum_16sc_AC4IRSfs, sum, QorComplex16s, QorComplex16s, AC4, AC4, IR, Sfs)",
                      apigen.members_list(self.families[0]))

    def test_some_families_or_all(self):
        self.assertEqual(["sample"], [f.stem for f in apigen.choose(self.families, ["sample"])])
        self.assertEqual(self.families, apigen.choose(self.families, []))
        with self.assertRaises(apigen.RegistryError):
            apigen.choose(self.families, ["sample", "samples"])

    def test_where_finds_function_and_kernels_of_every_group(self):
        families = apigen.load(ROOT / "api")
        for group in (g for f in families for g in f.groups):
            lines = apigen.where(families, group.members[0].name)
            for word in ("registry", "calls", "function", "kernels"):
                self.assertTrue(any(line.startswith(word) for line in lines), f"{group.members[0].name}: no {word}")

    def test_refuses_what_it_cannot_mean(self):
        for wrong in (FAMILY.replace('"64f"', '"65f"'), FAMILY.replace('"C3P3"', '"C3Q3"'),
                      FAMILY.replace('tail = "scale"', 'tail = "scales"'), FAMILY.replace('op = "Fill"', 'op = "Sum"'
                      ).replace('"64f", "32fc"', '"32f"'), FAMILY.replace('brief = "Fills."', "")):
            with self.assertRaises(apigen.RegistryError):
                load(wrong)


if __name__ == "__main__":
    unittest.main()
