"""The generator of the C++ header on small registries: how members become calls, and what it refuses."""
import sys
import tempfile
import unittest
from pathlib import Path

ROOT = Path(__file__).resolve().parents[2]
sys.path.insert(0, str(ROOT / "tools"))
import door_cpp  # noqa: E402
import door_cpp_text  # noqa: E402
import registry  # noqa: E402

FAMILY = """
title = "Sample"
namespace = "sample"
brief = "Something."
[tokens]
scale = { c = ["int32_t scaleFactor"], cpp = "scaleFactor" }
mode = { c = ["int32_t roundMode"], cpp = "roundMode" }
[[group]]
op = "Sums"
layouts = ["C1", "AC4"]
kinds = ["R", "IR"]
call = "sums<{S}>"
args = "binary"
members = [{ types = ["8u"], suffix = "Sfs", tail = "scale" }, { types = ["32f"] }]
"""


def load(text):
    with tempfile.TemporaryDirectory() as folder:
        for name in ("forms.toml", "roles.toml"):
            (Path(folder) / name).write_text((ROOT / "api" / name).read_text())
        (Path(folder) / "sample.toml").write_text(text)
        return registry.load(Path(folder))


def forms(text):
    return door_cpp.forms_of([m for f in load(text) for g in f.groups for m in g.members])


class Signatures(unittest.TestCase):
    def signatures(self, text):
        return [(tuple(f"{a.kind}:{a.name}" for a in s.arguments), [c.form.anyone().name for c in s.choices])
                for name, found in forms(text).items() for s in door_cpp.signatures_of(name, found)]

    def test_what_may_be_left_out_makes_a_call_of_its_own(self):
        self.assertEqual([
            (("in:a", "in:b", "out:dst", "plain:scale"), ["qoriSums_8u_C1RSfs"]),
            (("in:a", "in:b", "out:dst"), ["qoriSums_32f_C1R", "qoriSums_8u_C1RSfs"]),
            (("in:a", "inout:b", "plain:scale"), ["qoriSums_8u_C1IRSfs"]),
            (("in:a", "inout:b"), ["qoriSums_32f_C1IR", "qoriSums_8u_C1IRSfs"])], self.signatures(FAMILY))

    def test_keys_are_of_elements_and_layouts(self):
        self.assertEqual([0x1111, 0x1515], list(forms(FAMILY)["sums"][0].members))

    def test_members_that_one_call_would_mean_are_refused(self):
        with self.assertRaises(door_cpp.DoorError):                # both have elements of one byte
            forms(FAMILY.replace('types = ["8u"]', 'types = ["8u", "1u"]'))

    def test_calls_that_look_alike_are_refused(self):
        # Where an image is expected in one and the other, and a number follows in both.
        alike = FAMILY.replace('{ types = ["32f"] }', '{ types = ["32f"], tail = "bits" }').replace(
            "[[group]]", 'bits = { c = ["int32_t copyFlags"], cpp = "copyFlags" }\n[[group]]')
        with self.assertRaises(door_cpp.DoorError):
            for name, found in forms(alike).items():
                door_cpp.signatures_of(name, found)

    def test_the_message_lists_what_exists(self):
        words = door_cpp_text.words("sums", forms(FAMILY)["sums"])
        self.assertIn("sums(a, b, dst, [scale]) or sums(a, in_place(b), [scale]) of 8u: C1 AC4.", words)
        self.assertIn("of 32f: C1 AC4", words)


if __name__ == "__main__":
    unittest.main()
