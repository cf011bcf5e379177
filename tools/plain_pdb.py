#!/usr/bin/env python3
"""Takes out of .pdb files what differs between equal builds: plain_pdb.py FOLDER FILE.pdb...

The linker writes the time, its own command and the folders of object files. The time becomes SOURCE_DATE_EPOCH, and paths under FOLDER
become relative to it. Debuggers match a file by its GUID and age, which follow from the DLL alone and stay.
"""
import os
import struct
import sys
from pathlib import Path

MAGIC = b"Microsoft C/C++ MSF 7.00\r\n\x1aDS\0\0\0"
BLOCK = 4096
NO_STREAM = 0xFFFFFFFF
INFO, DEBUG_INFO = 1, 3     # streams of fixed numbers
DEBUG_HEADER = MODULE_HEADER = 64
NO_SYMBOLS = struct.pack("<II", 4, 0)


def read_streams(data):
    if data[:32] != MAGIC:
        sys.exit("plain_pdb: not a program database")
    block, _, _, directory_size, _, map_block = struct.unpack_from("<6I", data, 32)

    def gather(blocks, size):
        return b"".join(data[i * block:(i + 1) * block] for i in blocks)[:size]

    def blocks_of(size):
        return -(-size // block)

    directory = gather(struct.unpack_from(f"<{blocks_of(directory_size)}I", data, map_block * block), directory_size)
    count = struct.unpack_from("<I", directory)[0]
    sizes = struct.unpack_from(f"<{count}I", directory, 4)
    streams, at = [], 4 + 4 * count
    for size in sizes:
        number = 0 if size == NO_STREAM else blocks_of(size)
        streams.append(None if size == NO_STREAM else gather(struct.unpack_from(f"<{number}I", directory, at), size))
        at += 4 * number
    return streams


def write_streams(streams):
    """Streams one after the other, their directory, its map. Two blocks of each interval of BLOCK blocks, the second and
    third, say which blocks are free."""
    blocks = {}
    following = 3

    def store(contents):
        nonlocal following
        numbers = []
        for begin in range(0, len(contents), BLOCK):
            while following % BLOCK in (1, 2):
                following += 1
            blocks[following] = contents[begin:begin + BLOCK]
            numbers.append(following)
            following += 1
        return struct.pack(f"<{len(numbers)}I", *numbers)

    places = [store(stream or b"") for stream in streams]
    sizes = [NO_STREAM if stream is None else len(stream) for stream in streams]
    directory = struct.pack(f"<{1 + len(sizes)}I", len(sizes), *sizes) + b"".join(places)
    directory_map = store(directory)
    map_block = struct.unpack("<I", store(directory_map))[0]
    blocks[0] = MAGIC + struct.pack("<6I", BLOCK, 1, following, len(directory), 0, map_block)
    free = bytearray(b"\xFF" * (-(-following // (8 * BLOCK)) * BLOCK))
    for i in range(following):
        free[i // 8] &= ~(1 << i % 8)
    for index, begin in enumerate(range(1, following, BLOCK)):
        blocks[begin] = blocks[begin + 1] = bytes(free[index * BLOCK:(index + 1) * BLOCK])
    return b"".join(blocks.get(i, b"").ljust(BLOCK, b"\xFF" if i % BLOCK in (1, 2) else b"\0") for i in range(following))


def relative_modules(streams, folder):
    """The linker's own module has symbols that say where and how it ran; they go."""
    stream = streams[DEBUG_INFO]
    size = struct.unpack_from("<i", stream, 24)[0]
    modules, at, end = b"", DEBUG_HEADER, DEBUG_HEADER + size
    while at < end:
        record = stream[at:at + MODULE_HEADER]
        at += MODULE_HEADER
        if stream.startswith(b"* Linker *\0", at):
            streams[struct.unpack_from("<H", record, 34)[0]] = NO_SYMBOLS
            record = record[:36] + struct.pack("<I", 4) + record[40:]
        for _ in range(2):      # the module and the file that it is in
            stop = stream.index(b"\0", at)
            record += stream[at:stop].replace(folder, b"") + b"\0"
            at = stop + 1
        at += -at % 4
        modules += record + b"\0" * (-len(record) % 4)
    return stream[:24] + struct.pack("<i", len(modules)) + stream[28:DEBUG_HEADER] + modules + stream[end:]


def main(folder, *files):
    for path in map(Path, files):
        streams = read_streams(path.read_bytes())
        when = int(os.environ["SOURCE_DATE_EPOCH"]) & 0xFFFFFFFF
        streams[INFO] = streams[INFO][:4] + struct.pack("<I", when) + streams[INFO][8:]
        streams[DEBUG_INFO] = relative_modules(streams, os.path.realpath(folder).encode() + b"/")
        path.write_bytes(write_streams(streams))


if __name__ == "__main__":
    if len(sys.argv) < 3:
        sys.exit(__doc__)
    main(*sys.argv[1:])
