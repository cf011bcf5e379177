#!/usr/bin/env python3
"""What a program that is linked against the libraries relies on, in a form that is read, compared and compiled.

    abi.py interface HEADER...     types of the headers as C; then each signature, and indented the functions that have it
    abi.py source FILE             C source of a library of empty functions with that interface

The exports are stubs of assembly, of which debug information knows no types: abidiff compares such empty libraries.
"""
import re
import subprocess
import sys
import textwrap
from pathlib import Path

FUNCTION = re.compile(r"^(.+?)\s*\b(qori?[A-Z]\w*)\((.*)\);$")


class InterfaceError(Exception):
    pass


def declarations(header):
    """The header's own declarations, as the library sees them, each on a line. The system's types stay names."""
    text = Path(header).read_text().replace("#include <stdint.h>", "")
    text = subprocess.run(["cc", "-E", "-P", "-DQORI_BUILDING", "-x", "c", "-"], input=text, check=True,
                          capture_output=True, text=True).stdout
    lines, depth, line = [], 0, ""
    for character in re.sub(r"\s+", " ", text):
        line += character
        depth += {"{": 1, "}": -1}.get(character, 0)
        if character == ";" and depth == 0:
            lines.append(line.strip())
            line = ""
    if line.strip():
        raise InterfaceError(f"{header}: what does `{line.strip()}` declare?")
    return lines


def without_names(parameters):
    return ", ".join(p if p == "void" else re.sub(r"\s*\b\w+((?:\[\w*\])?)$", r"\1", p) for p in parameters.split(", "))


def interface(headers):
    types, signatures = [], {}
    for line in (line for header in headers for line in declarations(header)):
        if match := FUNCTION.match(line):
            signatures.setdefault(f"{match[1]} ({without_names(match[3])})", []).append(match[2])
        else:
            types.append(line)
    lines = ["#include <stdint.h>"]
    for line in types:
        lines += textwrap.wrap(line, 120)
    for signature, names in sorted(signatures.items()):
        lines += [signature] + textwrap.wrap(" ".join(sorted(names)), 120, initial_indent="    ", subsequent_indent="    ")
    return "\n".join(lines) + "\n"


def source(text):
    """Results are integers, pointers, or nothing. A function for each type holds those that no export mentions, as most
    enumerations, whose values are passed as integers."""
    lines, signature = [], None
    for line in text.splitlines():
        if match := re.match(r"^(\w[\w ]*\*?) (\(.*\))$", line):
            signature = match
        elif signature and line.startswith("    "):
            body = "{}" if signature[1] == "void" else "{ return 0; }"
            lines += [f"{signature[1]} {name}{signature[2]} {body}" for name in line.split()]
        else:
            lines.append(line)
    names = re.findall(r"^typedef\s+(?:enum|struct)\s+\w+(?:\s*\{[^}]*\})?\s+(\w+);", text, re.MULTILINE)
    return "\n".join(lines + [f"void qoriType{name}({name}* value) {{}}" for name in names]) + "\n"


def main(arguments):
    command, *files = arguments or [""]
    try:
        if command == "interface" and files:
            sys.stdout.write(interface(files))
        elif command == "source" and len(files) == 1:
            sys.stdout.write(source(Path(files[0]).read_text()))
        else:
            print(__doc__, file=sys.stderr)
            return 2
    except (InterfaceError, OSError, subprocess.CalledProcessError) as error:
        print(f"abi: {error}", file=sys.stderr)
        return 1
    return 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
