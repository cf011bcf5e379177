"""The generator on small registries: names, argument lists, stack sizes, order, and what it refuses."""
import sys
import tempfile
import tomllib
import unittest
from pathlib import Path

ROOT = Path(__file__).resolve().parents[2]
sys.path.insert(0, str(ROOT / "tools"))
import apigen  # noqa: E402
import registry  # noqa: E402
import roles  # noqa: E402

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


def load(text, roles_text=(ROOT / "api" / "roles.toml").read_text()):
    with tempfile.TemporaryDirectory() as folder:
        (Path(folder) / "forms.toml").write_text((ROOT / "api" / "forms.toml").read_text())
        (Path(folder) / "roles.toml").write_text(roles_text)
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


class Roles(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.members = {m.name: m for m in registry.all_members(registry.load(ROOT / "api"))}

    def named(self, name):
        return [(a.kind, a.name) for a in self.members[name].arguments if a.kind not in ("step", "region")]

    def test_operands_stand_in_their_natural_order(self):
        self.assertEqual([("image_in", "b"), ("image_in", "a"), ("image_out", "dst"), ("scalar", "scale")],
                         self.named("qoriSub_8u_C1RSfs"))
        self.assertEqual([("image_in", "b"), ("image_inout", "a")], self.named("qoriDiv_32f_C1IR"))
        self.assertEqual([("image_in", "a"), ("image_inout", "b")], self.named("qoriAdd_32f_C1IR"))
        self.assertEqual([("value", "b"), ("image_inout", "a")], self.named("qoriAddC_32f_C3IR"))

    def test_declarations_complete_roles(self):
        self.assertEqual(("planes_out", "dst"), self.named("qoriCopy_8u_C3P3R")[1])
        self.assertEqual([("array_in", "src"), ("array_out", "dst")], self.named("qoriDCT8x8Fwd_32f_C1"))
        self.assertEqual(("lists_out", "levels"), self.named("qoriHistogramEven_8u_C3R")[2])
        self.assertEqual({"prepare", "allocate", "release", "query", "operation"},
                         {m.purpose for name, m in self.members.items() if name.startswith("qoriFFT")})
        self.assertEqual("inspect", self.members["qoriResizeGetSrcRoi_8u"].purpose)

    def test_work_memory_is_measured_by_a_query_that_exists(self):
        self.assertEqual("qoriFilterRoundGetBufSize32s_16u_AC4R",
                         roles.buffer_query(self.members["qoriFilter_Round32s_16u_AC4R"]))
        self.assertEqual("qoriDFTGetBufSize_R_32s", roles.buffer_query(self.members["qoriDFTInv_PackToR_32s8u_C1RSfs"]))

    def test_every_entry_of_the_table_is_used(self):
        table = tomllib.loads((ROOT / "api" / "roles.toml").read_text())
        self.assertEqual([], roles.unused(self.members.values(), table))

    def test_a_gap_is_an_error(self):
        text = (ROOT / "api" / "roles.toml").read_text()

        def named(entries):
            return text.replace("[operations]", "[operations]\n" + entries)
        strange = FAMILY.replace("int32_t scaleFactor", "int32_t strangeness").replace('cpp = "scaleFactor"', 'cpp = "0"')
        sums = FAMILY.replace('op = "Turn"', 'op = "Sums"').replace('"8u32f"', '"32f"').replace(
            '"C3P3"', '"C1"').replace("src dstPlanes roi", "src1 src2 dst roi")
        for family, table in ((strange, text), (FAMILY, text.replace('pDst = "image_out', 'pDst = "picture')),
                              (FAMILY, named('Sum = { reach = "9" }')), (FAMILY, named('Fill = { snake = "template" }')),
                              (FAMILY, named('Fill = { buffer = "qoriNone" }')), (sums, named('Sums = { snake = "sum" }'))):
            with self.assertRaises(registry.RegistryError):
                load(family, table)


if __name__ == "__main__":
    unittest.main()
