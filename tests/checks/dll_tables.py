"""The DLL exports exactly the registry's names, undecorated and sorted, through 16-byte stubs that jump through
consecutive slots, imports nothing but the operating system's own DLLs and the companion's four functions, and carries its version."""
import re
import struct
import subprocess
import sys
from pathlib import Path

objdump, dll, list_file = sys.argv[1:]
SYSTEM = {"kernel32.dll", "msvcrt.dll"}
COMPANION = {"qorMalloc", "qorFree", "qorGetEnabledCpuFeatures", "qorGetMaxCacheSizeB"}

expected = Path(list_file).read_text().split()
assert expected == sorted(expected), "the registry's list is not sorted byte-wise"
tables = subprocess.run([objdump, "-p", dll], check=True, capture_output=True, text=True).stdout

names = re.findall(r"^\s*\[\s*\d+\](?: \+base\[\s*\d+\])?\s+(?:[0-9a-f]{4}\s+)?(\w\S*)$",
                   tables.split("[Ordinal/Name Pointer] Table")[1], re.M)
if names != expected:
    sys.exit(f"exports differ from the registry: missing {sorted(set(expected) - set(names))[:5]}, "
             f"extra {sorted(set(names) - set(expected))[:5]}, or not sorted")

imports = {}
for block in re.split(r"DLL Name: ", tables)[1:]:
    name, _, rest = block.partition("\n")
    imports[name.strip().lower()] = set(re.findall(r"^\t[0-9a-f]+[ \t]+\d+[ \t]+(\w+)", rest, re.M))
if imports.keys() - SYSTEM != {"qorcore-8.2.dll"}:
    sys.exit(f"imports from {sorted(imports)}")
if imports["qorcore-8.2.dll"] != COMPANION:
    sys.exit(f"imports {sorted(imports['qorcore-8.2.dll'])} from the companion")

# In 32 bits names have an underscore and the jump its slot's address; in 64 bits the slot's distance behind itself.
image = Path(dll).read_bytes()
wide = struct.unpack_from("<H", image, struct.unpack_from("<I", image, 0x3C)[0] + 4)[0] == 0x8664
code = subprocess.run([objdump, "-d", "-j", ".text", dll], check=True, capture_output=True, text=True).stdout
jumps = {name: (int(address, 16), int.from_bytes(bytes.fromhex(slot), "little", signed=wide)) for name, address, slot in
         re.findall(r"<_?(qori\w+)>:\n\s*([0-9a-f]+):\s+ff 25 ([0-9a-f ]{11})", code)}
stubs = [(jumps[n][0], jumps[n][1] + (jumps[n][0] + 6 if wide else 0)) for n in expected]
for i, (address, slot) in enumerate(stubs):
    if address != stubs[0][0] + 16 * i or slot != stubs[0][1] + (8 if wide else 4) * i:
        sys.exit(f"stub {i} ({expected[i]}) at {address:#x} jumps through {slot:#x}")
# VS_FIXEDFILEINFO: signature, structure version, then file and product version as two words of major.minor, patch.build.
fixed = image[image.index(struct.pack("<I", 0xFEEF04BD)):][:24]
if struct.unpack("<4I", fixed[8:]) != (8 << 16 | 2, 1 << 16 | 1083) * 2:
    sys.exit("the version resource is not 8.2.1.1083")
if "8.2.1 (r44077)".encode("utf-16-le") not in image:
    sys.exit("the version resource lacks the version text")

print(f"{len(names)} exports, imports from {', '.join(sorted(imports))}")
