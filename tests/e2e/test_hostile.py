# SPDX-License-Identifier: MIT
"""Files that claim what they do not hold: each works or is refused, soon and in little memory."""

import os
import pathlib
import struct
import unittest
import zlib

import limits
import tiffbytes as tb
from orin_e2e import Case, overview_sizes
from tiffbytes import TiffFile, Value, image_tags

WORKS, REFUSED = True, False


def plain(file, **others):
    """The tags of a sound image of 20 x 12 pixels."""
    return image_tags(20, 12, [file.add(bytes(range(240)))], [240], **others)


def one(tags_of, **options):
    """A file of one directory; `tags_of` makes its tags."""
    file = TiffFile(**options)
    file.directory(tags_of(file))
    return file


def changed(tag, value, big=False):
    """The sound image but for one tag."""
    return one(lambda file: {**plain(file), tag: value}, big=big)


def tiles(blob, width, height, tile, **others):
    """An image of which a file holds the first tile only."""
    return one(lambda file: image_tags(width, height, [file.add(blob)], [len(blob)], tile,
                                       **others))


def strip(blob, width, height, **others):
    """An image in one strip."""
    return one(lambda file: image_tags(width, height, [file.add(blob)], [len(blob)], **others))


def chain(count, tags):
    """A sound image and `count` equal directories behind it."""
    file = TiffFile()
    pixels = file.add(bytes(3600))
    file.directory(image_tags(60, 60, [pixels], [3600]))
    start = len(file.bytes)
    file.directory(image_tags(*tags[0], [pixels], [900], **tags[1]))
    one_more = bytes(file.bytes[start:-4])
    for _ in range(count - 1):
        following = len(file.bytes)
        file.patch(following - 4, file.link(following))
        file.bytes += one_more + file.link(0)
    return file


def loop():
    file = TiffFile()
    first = file.directory(plain(file))
    file.directory(plain(file, subfile=1), following=first)
    return file


def overlapping_directories():
    """Behind a sound image, directories of 65535 entries that start 12 bytes apart."""
    entries, count = 65535, 20000
    file = TiffFile()
    file.directory(plain(file))
    start = len(file.bytes) + -len(file.bytes) % 4
    file.patch(file.link_at, file.link(start))
    file.bytes += bytes(start - len(file.bytes)) + struct.pack("<H", entries)
    two = b"".join(struct.pack("<HHIHH", tag, 3, 1, 20, entries) for tag in (tb.WIDTH, tb.HEIGHT))
    file.bytes += two * ((entries + count) // 2 + 2)
    for number in range(count):
        behind = start + 12 * number + 2 + 12 * entries
        file.patch(behind, file.link(start + 12 * (number + 1)))
    return file


def nested_directories():
    """Sub-directories, each in another one, and the last in the image two hundred times."""
    file, inner = TiffFile(), 0
    for _ in range(3000):
        tags = plain(file)
        if inner:
            tags[tb.SUB_IFDS] = Value(tb.LONG, [inner])
        inner = file.directory(tags, chained=False)
    file.directory({**plain(file), tb.SUB_IFDS: Value(tb.LONG, [inner] * 200)})
    return file


def many_items():
    items = "".join(f'<Item name="A{i}">x</Item>' for i in range(40000)) + "\0"
    metadata = Value(tb.ASCII, items.encode())
    return one(lambda file: image_tags(100, 100, [file.add(bytes(100))], [100], samples=65535,
                                       metadata=metadata))


def jpeg(width, height):
    """A JPEG stream of that size."""
    from osgeo import gdal
    image = gdal.GetDriverByName("MEM").Create("", width, height)
    gdal.GetDriverByName("JPEG").CreateCopy("/vsimem/tile.jpg", image)
    source = gdal.VSIFOpenL("/vsimem/tile.jpg", "rb")
    stream = bytes(gdal.VSIFReadL(1, 1 << 20, source))
    gdal.VSIFCloseL(source)
    gdal.Unlink("/vsimem/tile.jpg")
    return stream


ZEROS = zlib.compress(bytes(10000))
FILES = {   # what makes it, whether `info` works, whether a level can be built
    # Dimensions.
    "bands": (lambda: strip(bytes(10), 65535, 900, samples=65535), WORKS, REFUSED),
    "wide-strip": (lambda: strip(ZEROS, (1 << 31) - 2, 10, compression=8), WORKS, REFUSED),
    "tiles-2^32": (lambda: tiles(bytes(10), 1 << 20, 1 << 20, (16, 16)), REFUSED, REFUSED),
    "tiles-2^36": (lambda: tiles(bytes(10), 1 << 18, 1 << 18, (1, 1)), REFUSED, REFUSED),
    "tile-of-2^31": (lambda: tiles(bytes(10), 1000, 1000, (1 << 31, 1 << 31)), WORKS, REFUSED),
    "deflated-tile-of-2^31": (lambda: tiles(ZEROS, 1000, 1000, (1 << 31, 16), compression=8),
                              WORKS, REFUSED),
    "deflated-tile-of-1-GiB": (lambda: tiles(ZEROS, 1000, 1000, (32768, 32752), compression=8),
                               WORKS, REFUSED),
    "zstd-tile-of-1-GiB": (lambda: tiles(bytes(99), 1000, 1000, (32768, 32752), compression=50000),
                           WORKS, REFUSED),
    "lerc-strip-of-3-GiB": (lambda: strip(bytes(99), 60000, 60000, compression=34887),
                            WORKS, REFUSED),
    # Counts and positions.
    "offsets-2^61": (lambda: changed(tb.STRIP_OFFSETS, Value(tb.LONG8, [8], 1 << 61, 16), big=True),
                     WORKS, REFUSED),
    "offsets-2^32": (lambda: changed(tb.STRIP_OFFSETS, Value(tb.LONG, [8], (1 << 32) - 1, 16)),
                     WORKS, REFUSED),
    "negative-offset": (lambda: changed(tb.STRIP_OFFSETS, Value(tb.LONG8, [(1 << 64) - 8]),
                                        big=True), WORKS, REFUSED),
    "bytes-2^32": (lambda: changed(tb.STRIP_BYTES, (1 << 32) - 1), WORKS, WORKS),
    "too-few-bytes": (lambda: tiles(bytes(255), 16, 16, (16, 16)), WORKS, REFUSED),
    "metadata-of-1-GiB": (lambda: changed(tb.METADATA, Value(tb.ASCII, b"x", 1 << 30, 8)),
                          WORKS, WORKS),
    "short-table": (lambda: one(lambda file: image_tags(
        64, 64, [file.add(bytes(1024))] * 3, [1024] * 3, (32, 32))), WORKS, REFUSED),
    "overlapping-tiles": (lambda: one(lambda file: image_tags(
        64, 64, [file.add(bytes(1024))] * 4, [1024] * 4, (32, 32))), WORKS, WORKS),
    # Directories.
    "loop": (loop, WORKS, WORKS),
    "hundred-thousand-pages": (lambda: chain(100000, ((60, 60), {})), WORKS, WORKS),
    "hundred-thousand-levels": (lambda: chain(100000, ((30, 30), {"subfile": 1})), WORKS, WORKS),
    "overlapping-directories": (overlapping_directories, WORKS, WORKS),
    "nested-directories": (nested_directories, WORKS, WORKS),
    "forty-thousand-items": (many_items, WORKS, REFUSED),
    # Pixels.
    "bits": (lambda: strip(bytes(999), 64, 64, bits=33), REFUSED, REFUSED),
    "no-bits": (lambda: strip(bytes(999), 64, 64, bits=0), REFUSED, REFUSED),
    "float-predictor": (lambda: strip(ZEROS, 100, 100, compression=8, predictor=3), WORKS, REFUSED),
    "unknown-predictor": (lambda: strip(ZEROS, 100, 100, compression=8, predictor=9),
                          WORKS, REFUSED),
    "unknown-codec": (lambda: strip(ZEROS, 100, 100, compression=4711), REFUSED, REFUSED),
    "too-much-in-a-tile": (lambda: tiles(zlib.compress(bytes(9 << 20)), 1000, 1000, (1008, 1008),
                                         compression=8), WORKS, WORKS),
    "too-little-in-a-tile": (lambda: tiles(ZEROS, 1000, 1000, (1008, 1008), compression=8),
                             WORKS, REFUSED),
    "jpeg-too-small": (lambda: tiles(jpeg(32, 32), 64, 64, (64, 64), compression=7),
                       WORKS, REFUSED),
    "jpeg-too-large": (lambda: tiles(jpeg(512, 512), 64, 64, (64, 64), compression=7),
                       WORKS, REFUSED),
}


class Hostile(Case):
    def check(self, ended, path, works, refused):
        self.assertIsNone(limits.fault(ended, path, refused))
        self.assertEqual(0 if works else refused, ended.code, ended.out + ended.error)

    def test_info_tells_what_it_is_or_refuses_it(self):
        for name, (make, works, _) in FILES.items():
            with self.subTest(file=name):
                path = make().write(self.path(f"{name}.tif"))
                ended = limits.run("info", path, seconds=limits.INFO_SECONDS)
                self.check(ended, path, works, limits.CANNOT_OPEN)

    def test_build_makes_a_level_or_refuses_and_leaves_the_file_as_it_was(self):
        for name, (make, opens, works) in FILES.items():
            for place in ("--internal", "--external"):
                with self.subTest(file=name, place=place):
                    path = make().write(self.path(f"{name}{place}.tif"))
                    before = pathlib.Path(path).read_bytes()
                    ended = limits.run("build", path, "--quiet", "--levels", "2", place,
                                       seconds=limits.BUILD_SECONDS)
                    code = limits.CANNOT_BUILD if opens else limits.CANNOT_OPEN
                    self.check(ended, path, works, code)
                    if not works or place == "--external":
                        self.assertEqual(before, pathlib.Path(path).read_bytes())
                    if not works:
                        self.assertEqual([os.path.basename(path)], os.listdir(self.folder))
                    for made in os.listdir(self.folder):
                        os.remove(self.path(made))

    def test_a_huge_image_of_which_no_tile_is_stored_gets_a_level(self):
        path = one(lambda _: image_tags(66000, 66000, [0] * 4, [0] * 4, (33008, 33008))).write(
            self.path("huge.tif"))
        ended = limits.run("info", path, seconds=limits.INFO_SECONDS)
        self.check(ended, path, WORKS, limits.CANNOT_OPEN)
        ended = limits.run("build", path, "--quiet", "--levels", "4", "--method", "nearest",
                           seconds=limits.BUILD_SECONDS)
        self.check(ended, path, WORKS, limits.CANNOT_BUILD)
        self.assertEqual([(16500, 16500)], overview_sizes(path))
        self.assertLess(os.path.getsize(path), 1 << 20)

    def test_texts_of_a_file_do_not_reach_the_terminal_as_commands(self):
        text = ('<Item name="RESAMPLING">\x1b[31mRED\x07</Item><Item name="ORIN_FACTOR">2</Item>'
                f'<Item name="ORIN_PROGRAM">{"y" * 5000}</Item><Item name="ORIN_VALID">1</Item>\0')
        file = TiffFile()
        file.directory(plain(file))
        file.directory({**image_tags(10, 6, [8], [60], subfile=1),
                        tb.METADATA: Value(tb.ASCII, text.encode())})
        path = file.write(self.path("texts.tif"))
        ended = limits.run("info", path, seconds=limits.INFO_SECONDS)
        self.check(ended, path, WORKS, limits.CANNOT_OPEN)
        self.assertIn(r"\x1b[31mRED\x07", ended.out)
        self.assertTrue(all(len(line) < 200 for line in ended.out.splitlines()), ended.out)
        self.assertTrue(ended.out.replace("\n", "").isprintable())

    def test_a_side_car_that_is_no_file_is_refused_at_once(self):
        kinds = {"pipe": os.mkfifo, "folder": os.mkdir,
                 "device": lambda name: os.symlink("/dev/zero", name)}
        for kind, make in kinds.items():
            path = one(plain).write(self.path(f"{kind}.tif"))
            make(path + ".ovr")
            for arguments in (["info"], ["build", "--external", "--levels", "2"]):
                ended = limits.run(*arguments, path, seconds=limits.INFO_SECONDS)
                self.check(ended, path, REFUSED, limits.CANNOT_OPEN)

    def test_memory_that_runs_out_is_a_refusal(self):
        if limits.IS_SANITIZED:
            self.skipTest("a sanitizer needs more address space than a limit can leave it")
        items, parts = b"<Item name='a'>x</Item>" * 100000, 40
        size = len(items) * parts
        path = changed(tb.METADATA, Value(tb.ASCII, b"", size, 1000)).write(self.path("large.tif"))
        with open(path, "r+b") as file:
            file.seek(1000)
            for _ in range(parts):
                file.write(items)
        ended = limits.run("info", path, seconds=limits.INFO_SECONDS, address_space=3 * size)
        self.assertEqual(limits.CANNOT_OPEN, ended.code, ended.error)
        self.assertIn(f"{path}: cannot be read: ", ended.error)


if __name__ == "__main__":
    unittest.main()
