# SPDX-License-Identifier: MIT
"""Every lossless codec keeps every value of a level, whatever the image; lossy ones need leave."""

import itertools
import os
import tempfile
import unittest

import numpy
from osgeo import gdal

from orin_e2e import (Case, NUMPY_TYPES, nearest, overview_sizes, random_opaque_pixels,
                      random_pixels, read_pixels, run, write_tiff)

ROWS, COLUMNS = 75, 99
LOSSLESS = ("NONE", "DEFLATE", "LZW", "ZSTD", "PACKBITS", "LZMA", "LERC")
PREDICTING = ("DEFLATE", "LZW", "ZSTD")
TYPES = ("Byte", "UInt16", "Int16", "Float32", "Float64")
CHANNELS = (1, 3, 4)


def tiff_tags(path, index):
    """How a directory is stored, as GDAL reports it."""
    dataset = gdal.Open(f"GTIFF_DIR:{index}:{path}")
    structure = dataset.GetMetadata("IMAGE_STRUCTURE")
    structure["TILE"] = "x".join(map(str, dataset.GetRasterBand(1).GetBlockSize()))
    return structure


def picture(channels, type_name, seed, holes=True):
    """Random values; floating point ones with NaN, infinities and a negative zero among them."""
    has_alpha = channels == 4 and type_name in ("Byte", "UInt16")  # as GDAL writes them
    make = random_opaque_pixels if has_alpha else random_pixels
    pixels = make((channels, ROWS, COLUMNS), NUMPY_TYPES[type_name], seed)
    if holes and type_name.startswith("Float"):
        for start, value in enumerate((numpy.nan, numpy.inf, -numpy.inf, -0.0)):
            pixels.reshape(-1)[start * 2::37] = value
    return pixels


def half(pixels):
    return nearest(pixels, 1, 2, (COLUMNS, ROWS))


class InMemory(Case):
    """A folder that is not on a disk where there is such a place: hundreds of files are synced."""

    def setUp(self):
        folder = tempfile.TemporaryDirectory(dir="/dev/shm" if os.path.isdir("/dev/shm") else None)
        self.addCleanup(folder.cleanup)
        self.folder = folder.name


class WhateverTheImage(InMemory):
    """Images in every codec; the levels in whatever codec they get."""

    def images(self):
        """Yields path and pixels of every image."""
        number = 0
        for codec, type_name, channels, order in itertools.product(
                LOSSLESS, TYPES, CHANNELS, ("LITTLE", "BIG")):
            number += 1
            options = [f"COMPRESS={codec}", f"ENDIANNESS={order}",
                       "TILED=" + ("YES" if number % 2 else "NO")]
            if codec in PREDICTING:
                options.append(f"PREDICTOR={1 + number % (3 if 'Float' in type_name else 2)}")
            # LERC has no room for a NaN in one of several channels
            pixels = picture(channels, type_name, number, holes=codec != "LERC" or channels == 1)
            path = self.path(f"{codec}-{type_name}-{channels}-{order}.tif")
            write_tiff(path, pixels, type_name, options)
            yield path, read_pixels(path)  # some codecs have lost values by now

    def test_levels_have_the_nearest_pixels_exactly(self):
        images = list(self.images())
        paths = [path for path, _ in images]
        for place in ("--external", "--internal"):  # the side-cars first: levels inside hide them
            self.assertRan(run("build", "--quiet", "--method", "nearest", "--levels", "2", place,
                               *paths))
            for path, pixels in images:
                with self.subTest(image=os.path.basename(path), place=place):
                    self.assertEqual([(COLUMNS // 2, ROWS // 2)], overview_sizes(path))
                    self.assertSamePixels(half(pixels), read_pixels(path, 0))
                    self.assertSamePixels(pixels, read_pixels(path))
            for path in paths:
                self.assertEqual(place == "--external", os.path.exists(path + ".ovr"))
                if place == "--external":
                    os.remove(path + ".ovr")

    def test_interleaved_floats_with_holes_leave_lerc_which_would_lose_them(self):
        pixels = picture(3, "Float32", 5, holes=False)
        path = self.path("lerc.tif")
        write_tiff(path, pixels, "Float32", ["COMPRESS=LERC", "INTERLEAVE=PIXEL"])
        self.assertRan(run("build", path, "--levels", "2"))
        self.assertEqual("DEFLATE", tiff_tags(path, 2)["COMPRESSION"])

    def test_colours_under_translucent_pixels_are_kept_and_none_under_transparent_ones(self):
        pixels = random_pixels((4, ROWS, COLUMNS), numpy.uint8, 6)
        pixels[3] = numpy.choose(pixels[3] % 4, (0, 1, 128, 255)).astype(numpy.uint8)
        images = [(self.path(f"{codec}.tif"), codec) for codec in ("WEBP", "LERC", "DEFLATE")]
        for path, codec in images:
            write_tiff(path, pixels, "Byte", [f"COMPRESS={codec}", "PHOTOMETRIC=RGB", "ALPHA=YES",
                                              "WEBP_LOSSLESS=YES", "TILED=YES"])
            expected = half(read_pixels(path))  # the image may have lost them already
            is_transparent = expected[3] == 0
            self.assertEqual({0, 1, 128, 255}, set(expected[3].flat))
            expected[:, is_transparent] = 0  # as no-data is
            self.assertRan(run("build", path, "--levels", "2"))
            self.assertSamePixels(expected, read_pixels(path, 0))

    def test_webp_levels_of_a_webp_image_are_without_loss(self):
        pixels = random_pixels((3, ROWS, COLUMNS), numpy.uint8, 7)
        for options in (["WEBP_LOSSLESS=YES"], ["WEBP_LEVEL=30"]):
            path = self.path("webp.tif")
            write_tiff(path, pixels, "Byte", ["COMPRESS=WEBP", "INTERLEAVE=PIXEL", *options])
            stored = read_pixels(path)
            self.assertRan(run("build", path, "--levels", "2"))
            self.assertEqual("WEBP", tiff_tags(path, 2)["COMPRESSION"])
            self.assertSamePixels(half(stored), read_pixels(path, 0))

    def test_levels_of_a_lerc_image_with_errors_have_no_more_of_them(self):
        path = self.path("lerc.tif")
        write_tiff(path, picture(1, "UInt16", 8), "UInt16", ["COMPRESS=LERC", "MAX_Z_ERROR=50"])
        stored = read_pixels(path)
        self.assertRan(run("build", path, "--levels", "2"))
        self.assertEqual("LERC", tiff_tags(path, 2)["COMPRESSION"])
        self.assertSamePixels(half(stored), read_pixels(path, 0))


class AsTheUserSays(InMemory):
    """Images without compression; the levels in the codec that the user names."""

    def setUp(self):
        super().setUp()
        self.images = []
        for number, (type_name, channels, order) in enumerate(itertools.product(
                TYPES, CHANNELS, ("LITTLE", "BIG"))):
            pixels = picture(channels, type_name, number)
            path = self.path(f"{type_name}-{channels}-{order}.tif")
            write_tiff(path, pixels, type_name, [f"ENDIANNESS={order}", "INTERLEAVE=PIXEL"])
            self.images.append((path, pixels, type_name, channels))

    def build(self, place, options, skip=lambda path, type_name, channels: False):
        """Builds in one place and compares; cleans up for the next."""
        chosen = [image for image in self.images if not skip(image[0], *image[2:])]
        arguments = [argument for option in options for argument in ("--co", option)]
        self.assertRan(run("build", "--quiet", "--method", "nearest", "--levels", "2", place,
                           "--force", *arguments, *[image[0] for image in chosen]))
        for path, pixels, _, _ in chosen:
            with self.subTest(image=os.path.basename(path), place=place, options=options):
                self.assertSamePixels(half(pixels), read_pixels(path, 0))
                if place == "--external":
                    os.remove(path + ".ovr")

    def test_every_lossless_codec_keeps_every_value_beside_the_file(self):
        for codec in LOSSLESS:
            self.build("--external", [f"COMPRESS={codec}"])
        for codec in PREDICTING:
            self.build("--external", [f"COMPRESS={codec}", "PREDICTOR=2"])
            self.build("--external", [f"COMPRESS={codec}", "PREDICTOR=3"],
                       skip=lambda _, type_name, channels: not type_name.startswith("Float"))

    def test_a_level_is_stored_again_in_one_codec_after_the_other(self):
        for codec in LOSSLESS:
            def cannot(path, type_name, channels, lerc=codec == "LERC"):
                return lerc and (type_name.startswith("Float") and channels > 1 or
                                 type_name == "Byte" and channels == 4 or  # RGB with alpha
                                 type_name != "Byte" and path.endswith("BIG.tif"))
            self.build("--internal", [f"COMPRESS={codec}", "TILE=64x32"], skip=cannot)
            for path, _, type_name, channels in self.images:
                if not cannot(path, type_name, channels):
                    tags = tiff_tags(path, 2)
                    self.assertEqual("64x32", tags["TILE"])
                    self.assertEqual(codec, tags.get("COMPRESSION", "NONE"))


class WithLoss(InMemory):
    def setUp(self):
        super().setUp()
        rows, columns = numpy.mgrid[0:300, 0:400]
        self.smooth = numpy.stack([(rows + columns) // 3 % 256, (rows * 2 + columns) // 4 % 256,
                                   (columns - rows) // 2 % 256]).astype(numpy.uint8)
        self.file = self.path("smooth.tif")

    def test_levels_of_a_jpeg_image_have_its_quality(self):
        for quality in (35, 80, 97):
            for photometric, tables in itertools.product(("YCBCR", "RGB"), ("0", "1")):
                write_tiff(self.file, self.smooth, "Byte",
                           ["COMPRESS=JPEG", f"JPEG_QUALITY={quality}", "TILED=YES",
                            f"JPEGTABLESMODE={tables}", "INTERLEAVE=PIXEL",
                            f"PHOTOMETRIC={photometric}"])
                self.assertRan(run("build", self.file, "--levels", "2"))
                level = read_pixels(self.file, 0).astype(int)
                expected = nearest(read_pixels(self.file), 1, 2, (400, 300)).astype(int)
                self.assertLess(numpy.abs(level - expected).mean(), 12)
                self.assertEqual(luminance_table(stored_tiles(self.file, 1)[0]),
                                 luminance_table(stored_tiles(self.file, 2)[0]))

    def test_a_side_car_of_a_jpeg_image_is_without_loss(self):
        write_tiff(self.file, self.smooth, "Byte", ["COMPRESS=JPEG", "PHOTOMETRIC=YCBCR"])
        self.assertRan(run("build", self.file, "--levels", "2", "--external"))
        self.assertSamePixels(nearest(read_pixels(self.file), 1, 2, (400, 300)),
                              read_pixels(self.file, 0))

    def test_all_channels_beside_the_file_have_the_quality_asked_for(self):
        write_tiff(self.file, self.smooth, "Byte", ["PHOTOMETRIC=RGB"])
        self.assertRan(run("build", self.file, "--levels", "2", "--external", "--co",
                           "COMPRESS=JPEG", "--co", "QUALITY=97"))
        tables = [luminance_table(stored_tiles(self.file + ".ovr", 1, channel)[0])
                  for channel in (1, 2, 3)]
        self.assertEqual([tables[0]] * 3, tables)
        self.assertLess(max(tables[0]), 10)  # 255 and so on at low qualities

    def test_loss_in_the_levels_of_a_lossless_image_is_the_users_choice(self):
        write_tiff(self.file, self.smooth, "Byte", ["COMPRESS=LZW", "PHOTOMETRIC=RGB"])
        exact = nearest(self.smooth, 1, 2, (400, 300))
        errors, sizes = [], []
        for options in (["COMPRESS=JPEG", "QUALITY=20"], ["COMPRESS=JPEG", "QUALITY=95"],
                        ["COMPRESS=WEBP", "QUALITY=10"], ["COMPRESS=WEBP"]):
            arguments = [argument for option in options for argument in ("--co", option)]
            self.assertRan(run("build", self.file, "--levels", "2", "--force", *arguments))
            errors.append(numpy.abs(read_pixels(self.file, 0).astype(int) - exact).mean())
            sizes.append(sum(map(len, stored_tiles(self.file, 2))))
        self.assertGreater(errors[0], errors[1])
        self.assertLess(sizes[0], sizes[1])
        self.assertGreater(errors[2], 0)
        self.assertEqual(0, errors[3])


def stored_tiles(path, index, channel=1):
    """The stored bytes of the tiles or strips of a directory, tables of a JPEG in front."""
    dataset = gdal.Open(f"GTIFF_DIR:{index}:{path}")
    band = dataset.GetRasterBand(channel)
    tables = band.GetMetadataItem("JPEGTABLES", "TIFF")
    head = bytes.fromhex(tables)[:-2] if tables else b""
    width, height = band.GetBlockSize()
    tiles = []
    with open(path, "rb") as file:
        for y in range((band.YSize + height - 1) // height):
            for x in range((band.XSize + width - 1) // width):
                offset = band.GetMetadataItem(f"BLOCK_OFFSET_{x}_{y}", "TIFF")
                size = band.GetMetadataItem(f"BLOCK_SIZE_{x}_{y}", "TIFF")
                if offset:
                    file.seek(int(offset))
                    tiles.append(head + file.read(int(size)))
    return tiles


def luminance_table(stream):
    """The quantisation table 0 of a JPEG stream."""
    at = stream.index(b"\xff\xdb") + 4
    assert stream[at] == 0
    return stream[at + 1:at + 65]


if __name__ == "__main__":
    unittest.main()
