# SPDX-License-Identifier: Apache-2.0
"""Gradients of 64 x 48 pixels, of a colour of its own for each photo."""

import struct
import zlib


def png(seed):
    rows = b""
    for y in range(48):
        row = bytearray([0])
        for x in range(64):
            row += bytes(((seed * 37 + 4 * x) % 256, (seed * 91 + 5 * y) % 256, 128))
        rows += bytes(row)

    def chunk(kind, data):
        return (struct.pack(">I", len(data)) + kind + data
                + struct.pack(">I", zlib.crc32(kind + data)))

    header = struct.pack(">IIBBBBB", 64, 48, 8, 2, 0, 0, 0)
    return (b"\x89PNG\r\n\x1a\n" + chunk(b"IHDR", header)
            + chunk(b"IDAT", zlib.compress(rows, 9)) + chunk(b"IEND", b""))


class BitWriter:
    def __init__(self):
        self.bits = ""

    def write(self, value, length):
        if length:
            self.bits += format(value, f"0{length}b")

    def done(self):
        bits = self.bits + "1" * (-len(self.bits) % 8)
        data = bytes(int(bits[i:i + 8], 2) for i in range(0, len(bits), 8))
        return data.replace(b"\xff", b"\xff\x00")


def jpeg(seed):
    """A grey baseline JPEG (ITU-T T.81): one value for each 8 x 8 block makes a coarse gradient."""
    lengths = bytes([0, 2, 3, 1, 1, 1, 1, 1] + [0] * 8)  # categories 0 to 9, of 2 to 8 bits
    categories = bytes(range(10))
    codes = {}
    code = 0
    index = 0
    for bits, count in enumerate(lengths, start=1):
        for _ in range(count):
            codes[categories[index]] = (code, bits)
            code += 1
            index += 1
        code <<= 1

    def segment(marker, data):
        return bytes([0xFF, marker]) + struct.pack(">H", len(data) + 2) + data

    writer = BitWriter()
    last = 0
    for block in range(8 * 6):
        level = ((seed * 23 + 12 * (block % 8) + 14 * (block // 8)) % 200) - 100
        difference = level - last
        last = level
        category = abs(difference).bit_length()
        writer.write(*codes[category])
        value = difference if difference >= 0 else difference + (1 << category) - 1
        writer.write(value, category)
        writer.write(0, 1)  # end of block, the only code of the AC table
    return (b"\xff\xd8"
            + segment(0xE0, b"JFIF\0\x01\x01\0\0\x01\0\x01\0\0")
            + segment(0xDB, b"\0" + bytes([8] * 64))
            + segment(0xC0, struct.pack(">BHHBBBB", 8, 48, 64, 1, 1, 0x11, 0))
            + segment(0xC4, b"\x00" + lengths + categories)
            + segment(0xC4, b"\x10" + bytes([1] + [0] * 15) + b"\0")
            + segment(0xDA, b"\x01\x01\0\0\x3f\0")
            + writer.done() + b"\xff\xd9")
