"""The code of a call through the C++ header is the code of the C call.

    same_code.py INCLUDE SOURCE COMPILER...
"""
import re
import subprocess
import sys


def functions(assembly):
    """{name: its instructions}, with labels numbered in their order."""
    found, name = {}, None
    for line in assembly.splitlines():
        label = re.match(r"^((?:c|door)_\w+):", line)
        if label:
            name = label[1]
            found[name] = []
        elif name and re.match(r"^\s*\.size\s", line):
            name = None
        elif name and line.startswith(("\t", " ")) and not re.match(r"^\s*[.#]", line):
            found[name].append(re.sub(r"\s*#.*", "", line).strip())
    for lines in found.values():
        labels = {}
        for i, line in enumerate(lines):
            lines[i] = re.sub(r"\.L\w+", lambda m: labels.setdefault(m[0], f".L{len(labels)}"), line)
    return found


def main(include, source, *compilers):
    wrong = 0
    for compiler in compilers:
        run = subprocess.run([compiler, "-std=c++17", "-O2", "-S", "-I", include, source, "-o", "-"], check=True,
                             capture_output=True, text=True)
        code = functions(run.stdout)
        pairs = [name[2:] for name in code if name.startswith("c_")]
        if len(pairs) < 5:
            sys.exit(f"{compiler}: only {pairs}")
        for pair in pairs:
            if not code["c_" + pair] or code["c_" + pair] != code["door_" + pair]:
                wrong += 1
                print(f"{compiler}: {pair} differs\n  C:    " + "\n        ".join(code["c_" + pair]) +
                      "\n  door: " + "\n        ".join(code["door_" + pair]))
        print(f"{compiler}: {len(pairs)} pairs of functions")
    return wrong != 0


if __name__ == "__main__":
    sys.exit(main(*sys.argv[1:]))
