# SPDX-License-Identifier: MIT
"""Writes TIFF files byte by byte, also ones that no library would write."""

import struct

BYTE, ASCII, SHORT, LONG, RATIONAL, UNDEFINED, FLOAT, DOUBLE, LONG8 = 1, 2, 3, 4, 5, 7, 11, 12, 16
SIZES = {1: 1, 2: 1, 3: 2, 4: 4, 5: 8, 7: 1, 11: 4, 12: 8, 16: 8}
CODES = {1: "B", 3: "H", 4: "I", 11: "f", 12: "d", 16: "Q"}

SUBFILE, WIDTH, HEIGHT, BITS, COMPRESSION, PHOTOMETRIC = 254, 256, 257, 258, 259, 262
STRIP_OFFSETS, SAMPLES, ROWS_PER_STRIP, STRIP_BYTES = 273, 277, 278, 279
PLANAR, PREDICTOR, TILE_WIDTH, TILE_HEIGHT, TILE_OFFSETS, TILE_BYTES = 284, 317, 322, 323, 324, 325
SUB_IFDS, EXTRA_SAMPLES, SAMPLE_FORMAT, JPEG_TABLES = 330, 338, 339, 347
METADATA, NO_DATA = 42112, 42113


class Value:
    """A tag's value: its type and elements, and what the directory claims instead of the truth."""

    def __init__(self, kind, elements, count=None, position=None):
        self.kind = kind
        self.elements = elements if isinstance(elements, (list, bytes)) else [elements]
        self.count = len(self.elements) if count is None else count
        self.position = position

    def packed(self, order):
        if isinstance(self.elements, bytes):
            return self.elements
        return struct.pack(f"{order}{len(self.elements)}{CODES[self.kind]}", *self.elements)


def number(value):
    """A value of the narrowest usual type."""
    values = value if isinstance(value, list) else [value]
    top = max(values, default=0)
    return Value(SHORT if top < 1 << 16 else LONG if top < 1 << 32 else LONG8, values)


class TiffFile:
    """Grows at its end; each new directory is linked to by the one before."""

    def __init__(self, order="<", big=False):
        self.order, self.big = order, big
        mark = b"II" if order == "<" else b"MM"
        self.bytes = bytearray(mark + struct.pack(order + ("HHH" if big else "H"),
                                                  *((43, 8, 0) if big else (42,))))
        self.link_at = len(self.bytes)
        self.bytes += self.link(0)
        self.boundaries = [len(self.bytes)]   # where something ends

    def link(self, position):
        return struct.pack(self.order + ("Q" if self.big else "I"), position)

    def add(self, blob):
        """Appends bytes at an even position, which is returned."""
        self.bytes += b"\0" * (len(self.bytes) % 2)
        position = len(self.bytes)
        self.bytes += blob
        self.boundaries.append(len(self.bytes))
        return position

    def field(self, value):
        """The value field of an entry; what is too long for it is appended."""
        width = 8 if self.big else 4
        if value.position is not None:
            return self.link(value.position)
        packed = value.packed(self.order)
        return packed.ljust(width, b"\0") if len(packed) <= width else self.link(self.add(packed))

    def directory(self, tags, chained=True, following=0):
        """Appends a directory of {tag: Value or number(s)}. \\returns its position"""
        entries = b""
        for tag, value in sorted(tags.items()):
            value = value if isinstance(value, Value) else number(value)
            field = self.field(value)
            entries += struct.pack(self.order + ("HHQ" if self.big else "HHI"),
                                   tag, value.kind, value.count) + field
        head = struct.pack(self.order + ("Q" if self.big else "H"), len(tags))
        position = self.add(head + entries + self.link(following))
        if chained:
            self.patch(self.link_at, self.link(position))
            self.link_at = len(self.bytes) - (8 if self.big else 4)
        return position

    def patch(self, position, blob):
        self.bytes[position:position + len(blob)] = blob

    def write(self, path):
        with open(path, "wb") as file:
            file.write(self.bytes)
        return str(path)


def image_tags(width, height, offsets, sizes, tile=None, samples=1, bits=8, **others):
    """The tags of a plain image; `tile` is its tiles' (width, height), else it has one strip."""
    tags = {WIDTH: width, HEIGHT: height, BITS: [bits] * min(samples, 65535), COMPRESSION: 1,
            PHOTOMETRIC: 1, SAMPLES: samples, PLANAR: 1}
    if samples > 1:
        tags[EXTRA_SAMPLES] = [0] * (samples - 1)
    if tile:
        tags.update({TILE_WIDTH: tile[0], TILE_HEIGHT: tile[1],
                     TILE_OFFSETS: offsets, TILE_BYTES: sizes})
    else:
        tags.update({ROWS_PER_STRIP: height, STRIP_OFFSETS: offsets, STRIP_BYTES: sizes})
    names = {"compression": COMPRESSION, "predictor": PREDICTOR, "planar": PLANAR,
             "photometric": PHOTOMETRIC, "rows": ROWS_PER_STRIP, "subfile": SUBFILE,
             "format": SAMPLE_FORMAT, "metadata": METADATA, "no_data": NO_DATA}
    tags.update({names[name]: value for name, value in others.items()})
    return tags


def boundaries(content):
    """Positions in a file's bytes where its directories and their values start and end."""
    order = "<" if content[:2] == b"II" else ">"
    big = content[2:4] in (b"+\0", b"\0+")
    link, width, entry_bytes = ("Q", 8, 20) if big else ("I", 4, 12)

    def at(code, position):
        return struct.unpack_from(order + code, content, position)[0]

    found, position = set(), at(link, 8 if big else 4)
    while position and position not in found:
        head = 8 if big else 2
        count = at("Q" if big else "H", position)
        first, end = position + head, position + head + count * entry_bytes
        found.update((position, first, end, end + width))
        for entry in range(first, end, entry_bytes):
            size = SIZES.get(at("H", entry + 2), 1) * at(link, entry + 4)
            if size > width:
                start = at(link, entry + 4 + width)
                found.update((start, start + size))
        position = at(link, end)
    return sorted(found)
