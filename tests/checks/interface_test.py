"""Programs that are linked go on: what packaging/interface-8.txt says of functions and types, the headers still say."""
import re
import sys
import unittest
from pathlib import Path

ROOT = Path(__file__).resolve().parents[2]
sys.path.insert(0, str(ROOT / "tools"))
import abi  # noqa: E402


def functions_and_types(text):
    """{function: signature} and {name: whole type}; lines are wrapped."""
    functions, types, signature = {}, "", None
    for line in text.splitlines():
        if line.startswith("    ") and signature:
            functions.update(dict.fromkeys(line.split(), signature))
        elif re.match(r"^\w[\w ]*\*? \(.*\)$", line):
            signature = line
        else:
            types += line.strip() + " "
    return functions, {t.rsplit(" ", 1)[-1]: t for t in re.split(r"(?<=;) (?=typedef)", types.strip())}


class Interface(unittest.TestCase):
    def test_nothing_of_the_committed_interface_has_changed(self):
        kept, kept_types = functions_and_types((ROOT / "packaging" / "interface-8.txt").read_text())
        now, types = functions_and_types(abi.interface([ROOT / "include" / "qori.h", ROOT / "core" / "qorcore.h"]))
        self.assertGreater(len(kept), 2500)
        self.assertGreater(len(kept_types), 10)
        for before, after in ((kept, now), (kept_types, types)):
            changed = [f"{name}: {before[name]}, now {after.get(name)}" for name in before if before[name] != after.get(name)]
            self.assertEqual(changed[:5], [])


if __name__ == "__main__":
    unittest.main()
