"""Programs over the header compile without warnings in each standard, and including it is cheap.

    compiles.py INCLUDE SOURCES LONG COMPILER...    SOURCES, joined by colons, in every standard; LONG by the last compiler
"""
import resource
import subprocess
import sys
from pathlib import Path

WARNINGS = "-Wall -Wextra -Wconversion -Wsign-conversion -Wshadow -pedantic -Werror".split()
STANDARDS = ("c++17", "c++20", "c++2b")
MOST_SECONDS = 0.5          # of including, over an empty source
ROUNDS = 5


def processor_seconds():
    used = resource.getrusage(resource.RUSAGE_CHILDREN)
    return used.ru_utime + used.ru_stime


def seconds(command, text):
    """The least of some rounds, on the processor: what else the machine does makes it longer only."""
    least = float("inf")
    for _ in range(ROUNDS):
        start = processor_seconds()
        subprocess.run(command, input=text, text=True, check=True)
        least = min(least, processor_seconds() - start)
    return least


def compiles(compiler, include, standard, source):
    command = [compiler, "-fsyntax-only", f"-std={standard}", *WARNINGS, "-I", include]
    return subprocess.run([*command, "-I", Path(source).parent, "-I", Path(__file__).parent, source]).returncode == 0


def example(include):
    """The example that the header begins with, as a program."""
    comment = (Path(include) / "qori.hpp").read_text().partition("*/")[0]
    first, *rest = [line[7:] for line in comment.splitlines() if line.startswith(" *     ")]
    return "\n".join([first, "int main() {", *rest, "}"]) + "\n"


def main(include, sources, long, *compilers):
    wrong = 0
    for compiler in compilers:
        command = [compiler, "-fsyntax-only", "-std=c++17", *WARNINGS, "-I", include, "-x", "c++", "-"]
        wrong += subprocess.run(command, input=example(include), text=True).returncode != 0
        wrong += sum(not compiles(compiler, include, standard, source)
                     for standard in STANDARDS for source in sources.split(":"))
        first = [compiler, "-fsyntax-only", "-std=c++17", "-I", include, "-x", "c++", "-"]
        cost = seconds(first, '#include "qori.hpp"\n') - seconds(first, "\n")
        print(f"{compiler}: including costs {cost:.2f} s")
        wrong += cost > MOST_SECONDS
    wrong += not compiles(compilers[-1], include, STANDARDS[-1], long)
    return wrong != 0


if __name__ == "__main__":
    sys.exit(main(*sys.argv[1:]))
