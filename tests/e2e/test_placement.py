# SPDX-License-Identifier: MIT
"""Levels beside a file: the image stays untouched, and other programs find them."""

import os
import re
import shutil
import subprocess
import unittest

import numpy
from osgeo import gdal
import rasterio

from orin_e2e import (Case, TOOL, info, nearest, overview_sizes, random_opaque_pixels,
                      random_pixels, read_pixels, run, write_tiff)

ROWS, COLUMNS = 777, 1003
GEO_TAGS = ("ModelPixelScale", "ModelTiepoint", "GeoKeyDirectory", "33550", "33922", "34735")


def bytes_of(path):
    with open(path, "rb") as file:
        return file.read()


def stamps_apart(content):
    """A file without what its levels know of its size and time, and what that is."""
    image = re.compile(rb'(?<=ORIN_IMAGE">)(2 [0-9a-f]{32} )(\d{20} [+-]\d{19})'
                       rb'( [0-9a-f]{16} \+0{19} 0{16})(?=<)')
    holder = re.compile(rb'(?<=ORIN_CONTENT">)(2 [0-9a-f]{32} [0-9a-f]{32} )'
                        rb'(\d{20} [+-]\d{19})(?=<)')
    stamps = [found[2] for found in (*image.finditer(content), *holder.finditer(content))]
    return holder.sub(rb"\1", image.sub(rb"\1\3", content)), stamps


class TheImage(Case):
    def setUp(self):
        super().setUp()
        self.file = self.path("scene.tif")
        write_tiff(self.file, random_pixels((3, ROWS, COLUMNS), numpy.uint8, 1), "Byte",
                   ["TILED=YES", "PHOTOMETRIC=RGB"])
        os.utime(self.file, ns=(1_000_000_007, 2_000_000_011))

    def assertUntouched(self, before):
        self.assertEqual(before, bytes_of(self.file))
        self.assertEqual(2_000_000_011, os.stat(self.file).st_mtime_ns)

    @unittest.skipUnless(shutil.which("strace"), "needs strace")
    def test_it_is_never_opened_for_writing_with_external(self):
        before = bytes_of(self.file)
        calls = self.path("calls.txt")
        for arguments in ([], ["--force"], ["--levels", "2,3"], []):
            subprocess.run(["strace", "-f", "-o", calls, "-e", "trace=open,openat,creat,truncate",
                            TOOL, "build", self.file, "--external", *arguments], check=True,
                           capture_output=True, env=dict(os.environ, ORIN_PREFERENCES="/dev/null"))
            with open(calls, encoding="utf-8") as file:
                opened = [line for line in file if f'"{self.file}"' in line]
            self.assertTrue(opened)
            for line in opened:
                self.assertRegex(line, r"open(at)?\(.*O_RDONLY")
            self.assertUntouched(before)

    def test_its_bytes_and_time_stay_whatever_happens_beside_it(self):
        before = bytes_of(self.file)
        for arguments in ([], ["--force", "--method", "average"], ["--co", "COMPRESS=LZW"]):
            self.assertRan(run("build", self.file, "--external", *arguments))
            self.assertUntouched(before)

    def test_asking_for_what_is_there_does_not_touch_a_file_with_levels_inside(self):
        self.assertRan(run("build", self.file))
        before, time = bytes_of(self.file), os.stat(self.file).st_mtime_ns
        answer = run("build", self.file)
        self.assertRan(answer)
        self.assertIn("nothing to do", answer.stdout)
        self.assertEqual(before, bytes_of(self.file))
        self.assertEqual(time, os.stat(self.file).st_mtime_ns)

    def test_a_foreign_time_is_noted_by_the_levels_inside_and_kept(self):
        self.assertRan(run("build", self.file))
        levels = len(info(self.file)["levels"])
        before = stamps_apart(bytes_of(self.file))
        os.utime(self.file, ns=(1_000_000_007, 2_000_000_011))
        answer = run("build", self.file)
        self.assertRan(answer)
        self.assertIn("nothing to do", answer.stdout)
        noted = bytes_of(self.file)
        after = stamps_apart(noted)
        self.assertEqual(before[0], after[0])
        stamp = b"%020d +%019d" % (len(noted), 2_000_000_011)
        self.assertEqual([stamp] * levels * 2, after[1])
        self.assertNotIn(stamp, before[1])
        self.assertRan(run("build", self.file))
        self.assertUntouched(noted)

    def test_levels_in_both_places_are_told_each_for_itself(self):
        self.assertRan(run("build", self.file, "--levels", "2,4", "--internal"))
        self.assertRan(run("build", self.file, "--levels", "2", "--external", "--force"))
        changed = gdal.Open(self.file, gdal.GA_Update)
        pixel = changed.GetRasterBand(1).ReadAsArray(5, 5, 1, 1)
        changed.GetRasterBand(1).WriteArray(pixel ^ 1, 5, 5)
        del changed
        answer = run("build", self.file, "--levels", "2", "--external")
        self.assertRan(answer)
        self.assertIn("Other programs read those inside only.", answer.stderr)
        self.assertRan(run("info", self.file), 3)  # other programs read what is stale
        self.assertEqual([(2, "internal", "stale"), (2, "side-car", "current"),
                          (4, "internal", "stale")],
                         [(level["level"], level["place"], level["state"])
                          for level in info(self.file)["levels"]])

    def test_levels_beside_levels_inside_are_told_once(self):
        self.assertRan(run("build", self.file, "--levels", "2"))
        answer = run("build", self.file, "--levels", "4,8", "--external")
        self.assertRan(answer)
        self.assertEqual(1, answer.stderr.count("Levels stand inside the file (2) and in"),
                         answer.stderr)


class TheSideCar(Case):
    def setUp(self):
        super().setUp()
        self.file = self.path("scene.tif")

    def check(self, pixels, type_name, options=(), no_data=None):
        """Builds out of order and reads with GDAL, gdalinfo and rasterio; the side-car's tags."""
        write_tiff(self.file, pixels, type_name, options, no_data)
        dataset = gdal.Open(self.file, gdal.GA_Update)
        dataset.SetGeoTransform([440000, 2, 0, 5100000, 0, -2])
        del dataset
        if os.path.exists(self.file + ".ovr"):
            os.remove(self.file + ".ovr")
        for levels in ("8", "2"):
            self.assertRan(run("build", self.file, "--external", "--levels", levels, "--method",
                               "nearest"))
        sizes = [(COLUMNS // level, ROWS // level) for level in (2, 8)]
        self.assertEqual(sizes, overview_sizes(self.file))
        two = nearest(pixels, 1, 2, (COLUMNS, ROWS))
        eight = nearest(pixels, 1, 8, (COLUMNS, ROWS))
        self.assertSamePixels(two, read_pixels(self.file, 0))
        self.assertSamePixels(eight, read_pixels(self.file, 1))
        with rasterio.open(self.file) as image:
            self.assertEqual([2, 8], image.overviews(1))
            small = image.read(out_shape=(image.count, *two.shape[1:]))
            self.assertEqual(two.tobytes(), small.tobytes())
        listed = subprocess.run(["gdalinfo", self.file], capture_output=True, text=True, check=True)
        self.assertEqual("", listed.stderr)
        self.assertIn("Overviews: 501x388, 125x97", listed.stdout)
        tags = subprocess.run(["tiffinfo", self.file + ".ovr"], capture_output=True, text=True,
                              check=True).stdout
        self.assertEqual(["501", "125"], re.findall(r"Image Width: (\d+)", tags))
        for tag in GEO_TAGS:
            self.assertNotIn(tag, tags)
        return tags

    def test_of_every_layout(self):
        for options in (["INTERLEAVE=PIXEL"], ["INTERLEAVE=BAND"], ["COMPRESS=LZW", "TILED=YES"],
                        ["COMPRESS=ZSTD", "ENDIANNESS=BIG"], ["BIGTIFF=YES"]):
            with self.subTest(options=options):
                self.check(random_pixels((2, ROWS, COLUMNS), numpy.uint16, 2), "UInt16", options)

    def test_no_data_is_declared_by_the_levels_too(self):
        pixels = random_pixels((1, ROWS, COLUMNS), numpy.int16, 3)
        self.check(pixels, "Int16", [], -9999)
        side_car = gdal.Open(self.file + ".ovr")  # has to outlive its band
        self.assertEqual(-9999, side_car.GetRasterBand(1).GetNoDataValue())
        with rasterio.open(self.file + ".ovr") as side_car:
            self.assertEqual(-9999, side_car.nodata)

    def test_a_palette_is_in_the_levels_too(self):
        pixels = random_pixels((1, ROWS, COLUMNS), numpy.uint8, 4)
        write_tiff(self.file, pixels, "Byte")
        palette = gdal.ColorTable()
        for entry in range(256):
            palette.SetColorEntry(entry, (entry, 255 - entry, 7, 255))
        dataset = gdal.Open(self.file, gdal.GA_Update)
        dataset.GetRasterBand(1).SetColorTable(palette)
        del dataset
        self.assertRan(run("build", self.file, "--external", "--method", "nearest"))
        side_car = gdal.Open(self.file + ".ovr")
        self.assertEqual((9, 246, 7, 255),
                         side_car.GetRasterBand(1).GetColorTable().GetColorEntry(9))
        self.assertSamePixels(nearest(pixels, 1, 2, (COLUMNS, ROWS)), read_pixels(self.file, 0))

    def test_alpha_is_alpha_in_the_levels_too(self):
        self.check(random_opaque_pixels((4, ROWS, COLUMNS), numpy.uint8, 5), "Byte",
                   ["PHOTOMETRIC=RGB", "ALPHA=YES"])
        side_car = gdal.Open(self.file + ".ovr")
        self.assertEqual(gdal.GCI_AlphaBand, side_car.GetRasterBand(4).GetColorInterpretation())
        self.assertEqual(["side-car"] * 2, [level["place"] for level in info(self.file)["levels"]])


if __name__ == "__main__":
    unittest.main()
