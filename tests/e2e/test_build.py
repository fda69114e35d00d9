# SPDX-License-Identifier: MIT
"""Levels that the tool wrote, read back by other programs and compared with a slow twin."""

import itertools
import os
import pathlib
import subprocess
import unittest

import numpy
from osgeo import gdal
import rasterio

from orin_e2e import (Case, NUMPY_TYPES, info, nearest, overview_sizes, random_pixels, read_pixels,
                      run, write_tiff)


class EveryLayout(Case):
    def check(self, name, pixels, type_name, options, arguments=()):
        file = self.path(name)
        write_tiff(file, pixels, type_name, options)
        size = (pixels.shape[2], pixels.shape[1])
        self.assertRan(run("build", file, "--method", "nearest", "--levels", "2,4", *arguments))
        self.assertSamePixels(pixels, read_pixels(file))
        two = nearest(pixels, 1, 2, size)
        self.assertSamePixels(two, read_pixels(file, 0))
        self.assertSamePixels(nearest(two, 2, 4, size), read_pixels(file, 1))

    def test_every_type_inside_and_beside_the_file(self):
        for number, (type_name, dtype) in enumerate(NUMPY_TYPES.items()):
            for place in ("--internal", "--external"):
                with self.subTest(type=type_name, place=place):
                    pixels = random_pixels((2, 301, 517), dtype, number)
                    self.check(f"{type_name}{place}.tif", pixels, type_name, [], [place])

    def test_every_lossless_codec_and_layout(self):
        layouts = itertools.product(
            ("NONE", "DEFLATE", "LZW", "ZSTD", "PACKBITS", "LZMA", "LERC"),
            ("YES", "NO"), ("PIXEL", "BAND"))
        for number, (codec, tiled, interleave) in enumerate(layouts):
            options = [f"COMPRESS={codec}", f"TILED={tiled}", f"INTERLEAVE={interleave}",
                       "BIGTIFF=" + ("YES" if number % 2 else "NO"),
                       "ENDIANNESS=" + ("BIG" if number % 3 else "LITTLE")]
            if codec in ("DEFLATE", "LZW", "ZSTD"):
                options.append("PREDICTOR=2")
            with self.subTest(options=options):
                pixels = random_pixels((3, 293, 421), numpy.uint16, number)
                self.check(f"layout{number}.tif", pixels, "UInt16", options)

    def test_samples_of_twelve_bits(self):
        pixels = random_pixels((3, 400, 300), numpy.uint16, 12) % 4096
        self.check("twelve.tif", pixels, "UInt16", ["NBITS=12"])

    def test_sizes_around_tiles_and_thin_images(self):
        for rows, columns in ((1, 700), (700, 1), (511, 513), (512, 512), (2, 2), (3, 1025)):
            with self.subTest(rows=rows, columns=columns):
                pixels = random_pixels((1, rows, columns), numpy.uint8, rows)
                file = self.path(f"{rows}x{columns}.tif")
                write_tiff(file, pixels, "Byte")
                expected = [] if min(rows, columns) < 2 else [(columns // 2, rows // 2)]
                self.assertRan(run("build", file, "--levels", "2"), 0 if expected else 2)
                self.assertEqual(expected, overview_sizes(file))
                if expected:
                    two = nearest(pixels, 1, 2, (columns, rows))
                    self.assertSamePixels(two, read_pixels(file, 0))


class OtherPrograms(Case):
    def setUp(self):
        super().setUp()
        self.file = self.path("scene.tif")
        self.pixels = random_pixels((3, 1501, 2003), numpy.uint8, 1)
        write_tiff(self.file, self.pixels, "Byte", ["TILED=YES", "PHOTOMETRIC=RGB"])

    def test_rasterio_and_gdalinfo_and_tiffinfo_read_internal_levels(self):
        self.assertRan(run("build", self.file))
        with rasterio.open(self.file) as dataset:
            self.assertEqual([2, 4, 8], dataset.overviews(1))
        listed = subprocess.run(["gdalinfo", self.file], capture_output=True, text=True, check=True)
        self.assertIn("Overviews: 1001x750, 500x375, 250x187", listed.stdout)
        self.assertEqual("", listed.stderr)
        directories = subprocess.run(["tiffinfo", self.file], capture_output=True, text=True,
                                     check=True)
        self.assertEqual(3, directories.stdout.count("Subfile Type: reduced-resolution image"))

    def test_rasterio_and_gdalinfo_read_a_side_car(self):
        before = os.stat(self.file)
        self.assertRan(run("build", self.file, "--external"))
        after = os.stat(self.file)
        self.assertEqual((before.st_size, before.st_mtime_ns), (after.st_size, after.st_mtime_ns))
        with rasterio.open(self.file) as dataset:
            self.assertEqual([2, 4, 8], dataset.overviews(1))
        with rasterio.open(self.file + ".ovr") as dataset:
            self.assertEqual((1001, 750), (dataset.width, dataset.height))
        self.assertSamePixels(nearest(self.pixels, 1, 2, (2003, 1501)), read_pixels(self.file, 0))

    def test_levels_stand_largest_first_whatever_the_order_of_building(self):
        for levels in ("4", "16,2", "8", "3"):
            self.assertRan(run("build", self.file, "--levels", levels))
        sizes = [(2003 // level, 1501 // level) for level in (2, 3, 4, 8, 16)]
        self.assertEqual(sizes, overview_sizes(self.file))
        self.assertEqual([2, 3, 4, 8, 16], [entry["level"] for entry in info(self.file)["levels"]])

    def test_a_level_is_built_from_the_largest_smaller_one(self):
        self.assertRan(run("build", self.file, "--levels", "2,3,6,8"))
        size = (2003, 1501)
        two = nearest(self.pixels, 1, 2, size)
        three = nearest(two, 2, 3, size)
        six = nearest(three, 3, 6, size)
        for index, expected in enumerate((two, three, six, nearest(six, 6, 8, size))):
            self.assertSamePixels(expected, read_pixels(self.file, index))
        sources = [entry["sourceLevel"] for entry in info(self.file)["levels"]]
        self.assertEqual([1, 2, 3, 6], sources)

    def test_levels_of_another_program_count_and_are_replaced_when_forced(self):
        dataset = gdal.Open(self.file, gdal.GA_Update)
        dataset.BuildOverviews("AVERAGE", [2, 4])
        del dataset
        self.assertEqual([(1002, 751), (501, 376)], overview_sizes(self.file))
        answer = run("build", self.file, "--levels", "2,4")
        self.assertRan(answer)
        self.assertEqual([(1002, 751), (501, 376)], overview_sizes(self.file))
        self.assertRan(run("build", self.file, "--levels", "2,4", "--force"))
        self.assertEqual([(1001, 750), (500, 375)], overview_sizes(self.file))
        self.assertSamePixels(nearest(self.pixels, 1, 2, (2003, 1501)), read_pixels(self.file, 0))

    def test_gdaladdo_cleans_our_levels(self):
        self.assertRan(run("build", self.file))
        subprocess.run(["gdaladdo", "-q", "-clean", self.file], check=True)
        self.assertEqual([], overview_sizes(self.file))
        self.assertSamePixels(self.pixels, read_pixels(self.file))
        self.assertRan(run("build", self.file))
        self.assertEqual([(1001, 750), (500, 375), (250, 187)], overview_sizes(self.file))


class NoData(Case):
    def test_no_data_pixels_stay_no_data_and_the_value_is_inherited(self):
        pixels = random_pixels((1, 300, 420), numpy.int16, 5)
        pixels[:, 40:200, 10:333] = -9999
        file = self.path("dem.tif")
        write_tiff(file, pixels, "Int16", no_data=-9999)
        self.assertRan(run("build", file, "--levels", "2"))
        self.assertSamePixels(nearest(pixels, 1, 2, (420, 300)), read_pixels(file, 0))
        dataset = gdal.Open(file)
        self.assertEqual(-9999, dataset.GetRasterBand(1).GetOverview(0).GetNoDataValue())


class Placement(Case):
    def test_a_read_only_file_gets_a_side_car(self):
        file = self.path("locked.tif")
        pixels = random_pixels((1, 600, 600), numpy.uint8, 3)
        write_tiff(file, pixels, "Byte")
        os.chmod(file, 0o444)
        os.chmod(self.folder, 0o777)
        # The superuser may write to anything, so the tool runs as somebody else then.
        somebody = {"user": 65534} if os.geteuid() == 0 else {}
        self.assertRan(run("build", file, "--levels", "2", **somebody))
        self.assertTrue(os.path.exists(file + ".ovr"))
        self.assertSamePixels(nearest(pixels, 1, 2, (600, 600)), read_pixels(file, 0))

    def test_the_second_build_has_nothing_to_do(self):
        file = self.path("again.tif")
        write_tiff(file, random_pixels((1, 600, 600), numpy.uint8, 3), "Byte")
        self.assertRan(run("build", file))
        before = pathlib.Path(file).read_bytes()
        stamp = os.stat(file).st_mtime_ns
        self.assertRan(run("build", file))
        self.assertEqual(before, pathlib.Path(file).read_bytes())
        self.assertEqual(stamp, os.stat(file).st_mtime_ns)


if __name__ == "__main__":
    unittest.main()
