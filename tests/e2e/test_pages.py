# SPDX-License-Identifier: MIT
"""Levels in a TIFF of several pages: other programs find each page under the number that it had,
and the levels of the first page as such."""

import os
import re
import subprocess
import unittest

import numpy
from osgeo import gdal

from mask_case import write_mask
from orin_e2e import (Case, info, keep_files_in_memory, nearest, overview_sizes, random_pixels,
                      read_pixels, run, write_tiff)

keep_files_in_memory()


def page_sizes(file):
    """Of all directories, as a program counts them that takes each for a page."""
    answer = subprocess.run(["tiffinfo", file], capture_output=True, text=True, check=True)
    return re.findall(r"Image Width: (\d+) Image Length: (\d+)", answer.stdout)


def page(file, number):
    """Pixels of a page as GDAL reads them, and the sizes of its overviews."""
    name = f"GTIFF_DIR:{number}:{file}"
    return read_pixels(name), overview_sizes(name if number > 1 else file)


class Pages(Case):
    def write(self, sizes, **options):
        """A file with pages of these columns and rows; their pixels."""
        pages = []
        file = self.path("pages.tif")
        creation = [f"{key}={value}" for key, value in options.items()]
        for number, (columns, rows) in enumerate(sizes):
            pixels = random_pixels((1, rows, columns), numpy.uint8, number)
            pages.append(pixels)
            source = file if number == 0 else self.path("page.tif")
            write_tiff(source, pixels, "Byte", creation)
            if number > 0:
                gdal.Translate(file, source, format="GTiff",
                               creationOptions=[*creation, "APPEND_SUBDATASET=YES"])
        return file, pages

    def check(self, sizes, **options):
        file, pages = self.write(sizes, **options)
        numbers = page_sizes(file)
        self.assertEqual(len(sizes), len(numbers))
        self.assertRan(run("build", file, "--internal", "--levels", "4"))
        self.assertRan(run("build", file, "--internal", "--levels", "2,8", "--method", "nearest"))
        found = page_sizes(file)
        self.assertEqual(numbers, found[:len(sizes)])
        self.assertEqual(len(sizes) + 3, len(found))
        for number, pixels in enumerate(pages, 1):
            seen, overviews = page(file, number)
            self.assertSamePixels(pixels, seen)
            columns, rows = sizes[0]
            self.assertEqual([(columns // level, rows // level) for level in (2, 4, 8)]
                             if number == 1 else [], sorted(overviews, reverse=True))
        self.assertSamePixels(nearest(pages[0], 1, 2, sizes[0]), read_pixels(file, 0))
        self.assertEqual([2, 4, 8], [level["level"] for level in info(file)["levels"]])
        self.assertIn("nothing to do",
                      run("build", file, "--internal", "--levels", "2,4,8").stdout)
        self.assertRan(run("build", file, "--internal", "--levels", "2", "--force", "--method",
                           "average"))
        self.assertEqual(numbers, page_sizes(file)[:len(sizes)])
        self.assertRan(run("clean", file, "--levels", "4"))
        self.assertEqual([2, 8], [level["level"] for level in info(file)["levels"]])
        self.assertRan(run("clean", file))
        self.assertEqual(numbers, page_sizes(file))
        for number, pixels in enumerate(pages, 1):
            self.assertSamePixels(pixels, page(file, number)[0])

    def test_of_one_size_keep_their_numbers(self):
        self.check([(300, 300), (300, 300)])

    def test_of_which_the_second_could_be_a_level_keep_their_numbers(self):
        self.check([(400, 320), (200, 160), (310, 290)], COMPRESS="DEFLATE")

    def test_of_a_bigtiff_keep_their_numbers(self):
        self.check([(260, 300), (300, 300), (900, 40)], BIGTIFF="YES", ENDIANNESS="BIG")

    def test_with_masks_keep_their_numbers(self):
        file = self.path("masked.tif")
        pixels = random_pixels((1, 300, 300), numpy.uint8, 1)
        write_tiff(file, pixels, "Byte")
        other = self.path("other.tif")
        write_tiff(other, pixels[:, ::-1].copy(), "Byte")
        valid = numpy.ones((300, 300), bool)
        valid[:100] = False
        write_mask(file, valid, inside=True)
        gdal.Translate(file, other, format="GTiff", creationOptions=["APPEND_SUBDATASET=YES"])
        numbers = page_sizes(file)
        self.assertRan(run("build", file, "--internal", "--levels", "2"))
        self.assertEqual(numbers, page_sizes(file)[:len(numbers)])
        self.assertEqual([2], [level["level"] for level in info(file)["levels"]])
        dataset = gdal.Open(file)
        mask = dataset.GetRasterBand(1).GetOverview(0).GetMaskBand().ReadAsArray()
        self.assertTrue((mask[:49] == 0).all())
        self.assertTrue((mask[51:] == 255).all())
        self.assertSamePixels(pixels[:, ::-1].copy(), read_pixels(f"GTIFF_DIR:3:{file}"))

    def test_levels_of_another_program_are_matched_as_before(self):
        file, pages = self.write([(300, 300), (300, 300)])
        subprocess.run(["gdaladdo", "-q", "-r", "nearest", file, "2"], check=True)
        told = [level["level"] for level in info(file)["levels"]]
        self.assertIn(told, ([], [2]))  # behind a page of the same size it may be that page's
        self.assertSamePixels(pages[1], page(file, 2)[0])


if __name__ == "__main__":
    unittest.main()
