"""Programs that are linked go on: what packaging/interface-8.txt says of functions and types, the headers still say; and
what packages say of themselves."""
import re
import sys
import tempfile
import unittest
from pathlib import Path

ROOT = Path(__file__).resolve().parents[2]
sys.path.insert(0, str(ROOT / "tools"))
import abi  # noqa: E402
import debian_control  # noqa: E402


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


class DebianPackages(unittest.TestCase):
    def test_a_link_takes_a_block_and_not_what_it_leads_to(self):
        with tempfile.TemporaryDirectory() as place:
            folder = Path(place) / "usr" / "lib"
            folder.mkdir(parents=True)
            (folder / "lib.so.8.2").write_bytes(bytes(5000))
            (folder / "lib.so.8").symlink_to("lib.so.8.2")
            (folder / "absent").symlink_to("nowhere")
            (Path(place) / "DEBIAN").mkdir()
            (Path(place) / "DEBIAN" / "control").write_bytes(bytes(9000))
            self.assertEqual(debian_control.installed_size(Path(place)), 5 + 2 + 2)

    def test_libraries_of_several_architectures_may_be_installed_at_once(self):
        text = "Architecture: amd64\nPackage: {}\nInstalled-Size: 18337\n"
        self.assertEqual(debian_control.completed(text.format("libqorik5-8"), 9),
                         "Architecture: amd64\nMulti-Arch: same\nPackage: libqorik5-8\nInstalled-Size: 9\n")
        self.assertNotIn("Multi-Arch", debian_control.completed(text.format("python3-qori"), 9))


if __name__ == "__main__":
    unittest.main()
