#!/usr/bin/env python3
"""Stamps the PE image checksum into an executable's optional header, in place.

GNU ld leaves the field 0; the launcher compares it with a checksum of its own file at start-up.
The algorithm is the platform's: 16-bit one's-complement-style sum of the file with the checksum
field taken as zero, folded to 16 bits, plus the file length.
Usage: stamp_checksum.py FILE [--print]   (--print only prints stamped and computed values)
"""
import struct
import sys
from array import array


def checksum_offset(data: bytes) -> int:
    if data[:2] != b"MZ":
        raise ValueError("not an MZ image")
    pe = struct.unpack_from("<I", data, 0x3C)[0]
    if data[pe:pe + 4] != b"PE\0\0":
        raise ValueError("no PE signature")
    return pe + 4 + 20 + 64  # signature, file header, then CheckSum at offset 64 of the optional header


def pe_checksum(data: bytes, field: int) -> int:
    padded = data + (b"\0" if len(data) % 2 else b"")
    words = array("H")
    words.frombytes(padded)
    if sys.byteorder != "little":
        words.byteswap()
    words[field // 2] = 0
    words[field // 2 + 1] = 0
    total = 0
    for start in range(0, len(words), 1 << 15):  # fold often enough to stay small
        total += sum(words[start:start + (1 << 15)])
        total = (total & 0xFFFF) + (total >> 16)
    while total >> 16:
        total = (total & 0xFFFF) + (total >> 16)
    return (total + len(data)) & 0xFFFFFFFF


def main() -> int:
    path = sys.argv[1]
    with open(path, "rb") as f:
        data = f.read()
    field = checksum_offset(data)
    value = pe_checksum(data, field)
    if "--print" in sys.argv[2:]:
        print("stamped=0x%08x computed=0x%08x" % (struct.unpack_from("<I", data, field)[0], value))
        return 0
    with open(path, "r+b") as f:
        f.seek(field)
        f.write(struct.pack("<I", value))
    return 0


if __name__ == "__main__":
    sys.exit(main())
