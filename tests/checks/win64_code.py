"""A DLL's code for 64-bit Windows: every instruction that calls or moves the stack pointer lies in a function that the
unwind table lists, and no vector of 32 bytes is moved by an instruction that wants it aligned, as the stack, aligned to 16,
may hold it."""
import re
import struct
import subprocess
import sys
from bisect import bisect_right
from pathlib import Path

objdump, dll = sys.argv[1:]


def unwind_ranges(image):
    """(first address, end) of every function in the exception directory, in its order, and the base of the addresses."""
    header = struct.unpack_from("<I", image, 0x3C)[0]
    machine, sections = struct.unpack_from("<HH", image, header + 4)
    optional = header + 24
    if machine != 0x8664 or struct.unpack_from("<H", image, optional)[0] != 0x20B:
        sys.exit("not a DLL for x86-64")
    base = struct.unpack_from("<Q", image, optional + 24)[0]
    table, size = struct.unpack_from("<II", image, optional + 112 + 3 * 8)
    first_section = optional + struct.unpack_from("<H", image, header + 20)[0]
    for i in range(sections):
        virtual_size, address, _, offset = struct.unpack_from("<IIII", image, first_section + 40 * i + 8)
        if address <= table < address + virtual_size:
            entries = struct.iter_unpack("<III", image[offset + table - address:][:size])
            return [(base + begin, base + end) for begin, end, _ in entries]
    sys.exit("no exception directory")


ranges = unwind_ranges(Path(dll).read_bytes())
if any(begin >= end for begin, end in ranges) or any(a[1] > b[0] for a, b in zip(ranges, ranges[1:])):
    sys.exit("the unwind table is not in order")
begins = [begin for begin, _ in ranges]


def listed(address):
    i = bisect_right(begins, address) - 1
    return i >= 0 and address < ranges[i][1]


# The compiler's own probe of large frames, which is assembly and faults only where the stack has ended; and lists of
# addresses that the linker puts behind the code, which disassemble to anything.
LEFT_OUT = re.compile(r"___chkstk_ms$|\.[cd]tors\b|__[CD]TOR_LIST__$")

moves_stack = re.compile(r"call|push|pop|leave|(?:sub|add|and|lea|mov)q? .*,%rsp$")
wants_alignment = re.compile(r"vmov(?:dqa|ap[sd]) .*\(.*%ymm|vmov(?:dqa|ap[sd]) %ymm.*\(")
function = re.compile(r"^[0-9a-f]+ <(.+)>:$")
name, unlisted, aligned, instructions = "", set(), set(), 0
with subprocess.Popen([objdump, "-d", "--no-show-raw-insn", "-j", ".text", dll], stdout=subprocess.PIPE, text=True) as dump:
    for line in dump.stdout:
        address, colon, code = line.partition(":\t")
        if not colon:
            if match := function.match(line):
                name = match[1]
            continue
        instructions += 1
        code = re.sub(" +", " ", code.rstrip())
        if not LEFT_OUT.match(name) and moves_stack.match(code) and not listed(int(address, 16)):
            unlisted.add(name)
        if wants_alignment.match(code):
            aligned.add(name)
if dump.returncode or instructions < 100:
    sys.exit("the code could not be read")
if unlisted or aligned:
    sys.exit(f"without unwind data: {sorted(unlisted)[:10]}; aligned moves of 32 bytes: {sorted(aligned)[:10]}")
print(f"{instructions} instructions in {len(ranges)} functions with unwind data")
