"""What does not exist stops at one error of at most five lines, and the error says what does.

    misuses.py INCLUDE COMPILER...    of clang, which quotes sources that are not there, without the source quoted
"""
import subprocess
import sys
import tempfile
from pathlib import Path

HEAD = """#include "qori.hpp"
using namespace qori;
QorResult misuse(View<const uint8_t, C3> a, View<const uint8_t, C3> b, View<uint8_t, C3> out, View<uint16_t, C3> wide,
                 uint8_t* pixels) {
    (void)a, (void)b, (void)out, (void)wide, (void)pixels;
"""
# What is written, and words of the message.
MISUSES = [
    ("return add(a, b, wide);", "qori::add: no such call. add(a, b, dst, [scale])"),           # no such pair of types
    ("return subtract(a, out, b);", "32fc: C1 C3 AC4"),                                        # b is read only
    ("return convert(a, View<double, C3>());", "8u->32f"),
    ("return filter_gauss(a, pixels, mask3x3);", "filter_gauss(src, dst, mask) of 8u, 16s, 16u, 32f: C1 C3 C4 AC4"),
    ("View<uint8_t, C3> written = a; return fill({1, 2, 3}, written);", "deleted"),            # const does not go away
    ("return add(a, b);", "qori::add: no such call."),                                         # an argument too few
    ("return fill({1, 2}, out);", "qori::fill: no such call."),                                # two of three channels
    ("ResizePlan<int32_t> plan({8, 8}, {4, 4}, Interpolation::linear()); return 0;", "8u 16u 16s 32f 64f"),
    ("double sums[4]; return sum(a, sums);", "qori::sum: no such call."),
]


def main(include, *compilers):
    wrong = 0
    with tempfile.TemporaryDirectory() as folder:
        file = Path(folder) / "misuse.cpp"
        for compiler in compilers:
            plain = ["-fno-caret-diagnostics"] if "clang" in compiler else []
            for text, said in MISUSES:
                file.write_text(HEAD + "    " + text + "\n}\n")
                run = subprocess.run([compiler, "-std=c++17", "-fsyntax-only", *plain, "-I", include, str(file)],
                                     capture_output=True, text=True)
                lines = [line for line in run.stderr.splitlines() if line]
                errors = sum(" error: " in line for line in lines)
                # GCC quotes the line of the caller that calls what is deleted, and names the function that it is in.
                most = 6 if said == "deleted" and not plain else 5
                if run.returncode == 0 or errors != 1 or len(lines) > most or said not in run.stderr:
                    wrong += 1
                    print(f"{compiler}: {text}: {len(lines)} lines, {errors} errors")
                    print("\n".join(line[:200] for line in lines))
    return wrong != 0


if __name__ == "__main__":
    sys.exit(main(*sys.argv[1:]))
