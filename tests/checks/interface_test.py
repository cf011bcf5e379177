"""Programs that are linked go on: what packaging/interface-8.txt says of functions and types, the headers still say; and
what packages say of themselves."""
import re
import shutil
import subprocess
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

    def refused(self, folder):
        done = subprocess.run([folder / "scripts" / "package"], capture_output=True, text=True)
        self.assertEqual((done.returncode, done.stdout), (1, ""))
        return done.stderr

    def test_what_cannot_be_made_again_is_refused_with_the_reason(self):
        with tempfile.TemporaryDirectory() as place:
            plain, whole, shallow = (Path(place) / name for name in ("plain", "whole", "shallow"))
            git = ["git", "-c", "user.name=a", "-c", "user.email=a@b.invalid", "-c", "init.defaultBranch=main"]
            for folder in plain, whole:
                shutil.copytree(ROOT / "scripts", folder / "scripts")
            self.assertIn("no git repository", self.refused(plain))
            subprocess.run([*git, "init", "-q"], cwd=whole, check=True)
            for name in "one", "two":
                (whole / "file").write_text(name)
                subprocess.run([*git, "add", "."], cwd=whole, check=True)
                subprocess.run([*git, "commit", "-qm", name], cwd=whole, check=True)
            subprocess.run([*git, "clone", "-q", "--depth", "1", whole.as_uri(), shallow], check=True)
            self.assertRegex(self.refused(shallow), "the clone is shallow.* git fetch --unshallow")
            (whole / "file").write_text("changed")
            (whole / "new").write_text("")
            text = self.refused(whole)
            self.assertRegex(text, "differs from its commit.*commit or stash")
            self.assertIn(" M file", text)
            self.assertIn("?? new", text)


if __name__ == "__main__":
    unittest.main()
