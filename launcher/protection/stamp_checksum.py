#!/usr/bin/env python3
"""Stamps the checksum of an executable into its own stamp field, in place.

The launcher compares the field with a checksum of its own file at start-up (protection_posix.cpp, protection_win32.cpp).
Windows: the PE image checksum field of the optional header (GNU ld leaves it 0). ELF: the four
bytes after the marker "QZ57-STAMP-1" in the launcher's data, which must appear exactly once. The
sum is the usual image checksum: the file's little-endian 16-bit words (an odd last byte as a word
of its own) added with end-around carry, the four bytes of the field counted as zero, then the file
length added. Stamping twice gives the same file.

Usage: stamp_checksum.py FILE [--print]
  --print  only prints the stamped and the computed value; exit status 1 when they differ
"""
import struct
import sys
from array import array

CHECKSUM_IN_OPTIONAL_HEADER = 64  # the same in PE32 and PE32+


ELF_MARKER = b"QZ57-STAMP-1"


def checksum_offset(data: bytes) -> int:
    if data[:4] == b"\x7fELF":
        at = data.find(ELF_MARKER)
        if at < 0 or data.find(ELF_MARKER, at + 1) >= 0:
            raise ValueError("the stamp marker must appear exactly once")
        return at + len(ELF_MARKER)
    if len(data) < 0x40 or data[:2] != b"MZ":
        raise ValueError("not an MZ image")
    pe = struct.unpack_from("<I", data, 0x3C)[0]
    field = pe + 4 + 20 + CHECKSUM_IN_OPTIONAL_HEADER  # signature, file header, optional header
    if field + 4 > len(data) or data[pe:pe + 4] != b"PE\0\0":
        raise ValueError("no PE header")
    if struct.unpack_from("<H", data, pe + 24)[0] not in (0x10B, 0x20B):
        raise ValueError("unknown optional header")
    return field


def pe_checksum(data: bytes, field: int) -> int:
    zeroed = bytearray(data)
    zeroed[field:field + 4] = b"\0\0\0\0"
    if len(zeroed) % 2:
        zeroed.append(0)
    words = array("H")
    words.frombytes(bytes(zeroed))
    if sys.byteorder != "little":
        words.byteswap()
    # A plain sum folded once at the end equals the running end-around-carry sum.
    total = sum(words)
    while total >> 16:
        total = (total & 0xFFFF) + (total >> 16)
    return (total + len(data)) & 0xFFFFFFFF


def main(argv) -> int:
    args = [a for a in argv[1:] if a != "--print"]
    if len(args) != 1 or len(argv) - len(args) > 2:
        print("usage: stamp_checksum.py FILE [--print]", file=sys.stderr)
        return 2
    path = args[0]
    with open(path, "rb") as f:
        data = f.read()
    try:
        field = checksum_offset(data)
    except ValueError as error:
        print("%s: %s" % (path, error), file=sys.stderr)
        return 1
    value = pe_checksum(data, field)
    if "--print" in argv[1:]:
        stamped = struct.unpack_from("<I", data, field)[0]
        print("stamped=0x%08x computed=0x%08x" % (stamped, value))
        return 0 if stamped == value else 1
    with open(path, "r+b") as f:
        f.seek(field)
        f.write(struct.pack("<I", value))
    return 0


if __name__ == "__main__":
    sys.exit(main(sys.argv))
