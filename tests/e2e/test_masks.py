# SPDX-License-Identifier: MIT
"""Masks, mask files and alpha as validity: what levels are filled with, and the masks they get."""

import itertools
import os
import shutil
import subprocess
import unittest

import numpy
from osgeo import gdal
import rasterio

from mask_case import (HEIGHT, MaskCase, SIZE, TILED, WIDTH, directories_of, picture, write_mask,
                       write_mask_beside)
from mask_twin import METHODS, disc, level_validity, masks_of_levels
from orin_e2e import READS_ALL_FORMATS, overview_sizes, read_pixels, run, write_tiff

class EveryMethod(MaskCase):
    def test_the_mask_of_a_level_is_where_the_method_filled(self):
        for method, place, inside, channels in itertools.product(
                METHODS, ("--internal", "--external"), (True, False), (3, 1)):
            with self.subTest(method=method, place=place, inside=inside, channels=channels):
                file, valid = self.make(f"{method}{place}{inside}{channels}.tif", inside, channels)
                self.build(file, "--method", method, "--levels", "2,3,4", place)
                self.assert_levels(file, valid, method, channels, place == "--internal")

    def test_rasterio_reads_the_mask_of_a_level(self):
        file, valid = self.make("scene.tif")
        self.build(file, "--method", "average", "--levels", "2")
        expected = level_validity(valid, 1, 2, SIZE, "average", 3)
        with rasterio.open(file, overview_level=0) as level:
            self.assertTrue(((level.read_masks(1) > 0) == expected).all())
        with rasterio.open(file) as dataset:
            mask = dataset.read_masks(1, out_shape=expected.shape)
            self.assertTrue(((mask > 0) == expected).all())

    def test_an_image_without_a_valid_pixel_and_one_without_a_masked_one(self):
        for name, value in (("none.tif", False), ("all.tif", True)):
            valid = numpy.full((HEIGHT, WIDTH), value)
            file, _ = self.make(name, valid=valid)
            self.build(file, "--method", "bicubic", "--levels", "2,4")
            for mask in masks_of_levels(file):
                self.assertTrue((mask == value).all())

    def test_thin_levels(self):
        valid = numpy.arange(3 * 700).reshape(700, 3) % 5 > 1
        file = self.path("thin.tif")
        write_tiff(file, picture(valid), "Byte", TILED)
        write_mask(file, valid, True)
        self.build(file, "--levels", "2,3", "--method", "nearest")
        two = level_validity(valid, 1, 2, (3, 700), "nearest", 3)
        three = level_validity(two, 2, 3, (3, 700), "nearest", 3)
        for expected, mask in zip((two, three), masks_of_levels(file)):
            self.assertTrue((expected == mask).all())

    def test_a_level_larger_than_a_block(self):
        valid = disc(3001, 2500)
        file = self.path("large.tif")
        write_tiff(file, picture(valid), "Byte", ("TILED=YES", "COMPRESS=DEFLATE"))
        write_mask(file, valid, True)
        for place in ("--internal", "--external"):
            copy = shutil.copy(file, self.path(place + ".tif"))
            self.build(copy, "--levels", "2", "--method", "bilinear", place)
            expected = level_validity(valid, 1, 2, (3001, 2500), "bilinear", 3)
            self.assertTrue((expected == masks_of_levels(copy)[0]).all())


class Layouts(MaskCase):
    def test_a_mask_of_eight_bits_inside_the_file(self):
        file, valid = self.make("plain.tif")
        write_tiff(self.path("pixels.tif"), picture(valid), "Byte", TILED)
        write_tiff(self.path("mask.tif"), valid[None].astype(numpy.uint8) * 255, "Byte", TILED)
        both = self.path("both.tif")
        subprocess.run(["tiffcp", self.path("pixels.tif"), self.path("mask.tif"), both], check=True,
                       capture_output=True)
        subprocess.run(["tiffset", "-d", "1", "-s", "254", "4", both], check=True,
                       capture_output=True)
        self.build(both, "--method", "mode", "--levels", "2,3,4")
        self.assert_levels(both, valid, "mode", 3)

    def test_file_formats_and_codecs(self):
        for options in (("BIGTIFF=YES",), ("ENDIANNESS=BIG",), ("COMPRESS=LZW", "INTERLEAVE=BAND"),
                        ("BIGTIFF=YES", "ENDIANNESS=BIG", "COMPRESS=DEFLATE")):
            for place in ("--internal", "--external"):
                with self.subTest(options=options, place=place):
                    file, valid = self.make("-".join(options) + place + ".tif", options=options)
                    self.build(file, "--method", "bilinear", "--levels", "2,3,4", place)
                    self.assert_levels(file, valid, "bilinear", 3, place == "--internal")

    def test_types(self):
        for dtype in ("UInt16", "Int32", "Float32", "Float64"):
            for method in ("average", "bicubic"):
                with self.subTest(dtype=dtype, method=method):
                    file, valid = self.make(dtype + method + ".tif", dtype=dtype)
                    self.build(file, "--method", method, "--levels", "2,4")
                    self.assert_levels(file, valid, method, 3, levels=(2, 4))

    def test_jpeg_levels_have_exact_masks(self):
        file, valid = self.make("jpeg.tif", options=(*TILED, "COMPRESS=JPEG", "PHOTOMETRIC=YCBCR"))
        self.build(file, "--method", "average", "--levels", "2,4")
        two = level_validity(valid, 1, 2, SIZE, "average", 3)
        four = level_validity(two, 2, 4, SIZE, "average", 3)
        for expected, mask in zip((two, four), masks_of_levels(file)):
            self.assertTrue((expected == mask).all())

    def test_masks_stand_behind_their_levels(self):
        file, _ = self.make("inside.tif")
        for levels in ("4", "2", "8,3"):
            self.build(file, "--levels", levels)
        self.assertEqual([0, 4] + [1, 5] * 4, directories_of(file))
        file, valid = self.make("beside.tif", inside=False)
        for levels in ("4", "2", "8,3"):  # a larger level comes before the one that was first
            self.build(file, "--levels", levels, "--external")
        self.assertEqual([1, 4] + [1, 5] * 3, directories_of(file + ".ovr"))
        self.assertFalse(any(mask is None for mask in masks_of_levels(file)))

    def test_a_removed_level_takes_its_mask_with_it(self):
        file, valid = self.make("beside.tif")
        two = level_validity(valid, 1, 2, SIZE, "nearest", 1)
        for gone, left in (("2", [1, 4, 1, 5]), ("8", [1, 4, 1, 5]), ("2,4", [1, 4])):
            with self.subTest(gone=gone):
                self.build(file, "--levels", "2,4,8", "--method", "nearest", "--external")
                self.assertTrue((two == masks_of_levels(file)[0]).all())
                self.assertRan(run("clean", file, "--levels", gone))
                self.assertEqual(left, directories_of(file + ".ovr"))
                self.assertEqual(len(left) // 2, len(overview_sizes(file)))
        self.assertRan(run("clean", file))
        self.assertFalse(os.path.exists(file + ".ovr"))

    def test_a_mask_gets_the_tiles_of_its_level_when_that_gets_others(self):
        for place in ("--internal", "--external"):
            file, valid = self.make(place + ".tif")
            two = level_validity(valid, 1, 2, SIZE, "nearest", 1)
            for tile in ("256", "128", "256x112", "112x256"):  # as many tiles, of another size
                with self.subTest(place=place, tile=tile):
                    self.build(file, "--levels", "2", "--method", "nearest", place, "--force",
                               "--co", "TILE=" + tile)
                    self.assertTrue((two == masks_of_levels(file)[0]).all())

    def test_a_mask_file_beside_an_image_of_another_format(self):
        valid = disc(WIDTH, HEIGHT)
        write_tiff(self.path("scene.tif"), picture(valid), "Byte")
        file = self.path("scene.png")
        gdal.Translate(file, self.path("scene.tif"), format="PNG")
        if not READS_ALL_FORMATS:
            self.skipTest("this build reads no PNG")
        write_mask_beside(file, valid)
        self.build(file, "--levels", "2,3,4", "--method", "bilinear")
        self.assert_levels(file, valid, "bilinear", 3, as_one=False)

    def test_the_mask_of_a_virtual_raster_or_a_jpeg_file(self):
        image, valid = self.make("scene.tif")
        for driver, name in (("VRT", "scene.vrt"), ("JPEG", "scene.jpg")):
            file = self.path(name)
            gdal.Translate(file, image, format=driver)
            if not READS_ALL_FORMATS:
                self.skipTest("this build reads no other formats")
            self.build(file, "--levels", "2,4", "--method", "bilinear")
            two = level_validity(valid, 1, 2, SIZE, "bilinear", 1)
            four = level_validity(two, 2, 4, SIZE, "bilinear", 1)
            for expected, mask in zip((two, four), masks_of_levels(file)):
                self.assertTrue((expected == mask).all())
            self.assertTrue((read_pixels(file, 0)[:, ~two] == 0).all())


class NoDataToo(MaskCase):
    def test_a_declared_value_fills_and_counts_beside_the_mask(self):
        for place in ("--internal", "--external"):
            for method in METHODS:
                with self.subTest(place=place, method=method):
                    valid = disc(WIDTH, HEIGHT)
                    file = self.path(method + place + ".tif")
                    pixels = picture(valid, 1)
                    pixels[0, 40:60, 100:120] = 7  # no data by value, inside the mask's disc
                    write_tiff(file, pixels, "Byte", TILED, no_data=7)
                    write_mask(file, valid, True)
                    self.build(file, "--method", method, "--levels", "2,4", place)
                    both = valid & (pixels[0] != 7)
                    two = level_validity(both, 1, 2, SIZE, method, 1)
                    four = level_validity(two, 2, 4, SIZE, method, 1)
                    for index, expected in enumerate((two, four)):
                        self.assertTrue((expected == masks_of_levels(file)[index]).all())
                        level = read_pixels(file, index)[0]
                        self.assertEqual({7}, set(level[~expected].tolist()))
                        self.assertNotIn(7, level[expected])

    def test_a_declared_nan_leaves_levels_their_masks(self):
        for place, method in itertools.product(("--internal", "--external"), METHODS):
            with self.subTest(place=place, method=method):
                valid = disc(WIDTH, HEIGHT)
                file = self.path(method + place + ".tif")
                pixels = picture(valid, 1, numpy.float32)
                pixels[0, 40:60, 100:120] = numpy.nan
                write_tiff(file, pixels, "Float32", TILED, no_data=float("nan"))
                write_mask(file, valid, True)
                self.build(file, "--method", method, "--levels", "2,4", place)
                two = level_validity(valid & ~numpy.isnan(pixels[0]), 1, 2, SIZE, method, 1)
                four = level_validity(two, 2, 4, SIZE, method, 1)
                levels = file + ".ovr" if place == "--external" else file
                self.assertEqual([1, 5], directories_of(levels)[-2:])
                for index, expected in enumerate((two, four)):
                    self.assertTrue((expected == masks_of_levels(file)[index]).all())
                    level = read_pixels(file, index)[0]
                    self.assertTrue((numpy.isnan(level) == ~expected).all())

    def test_a_side_cars_mask_calls_valid_what_any_channel_holds(self):
        valid = numpy.ones((HEIGHT, WIDTH), bool)
        pixels = picture(valid, 2)
        pixels[0, :40, :40] = 9    # channel 1 has no data here,
        pixels[1, 20:60, :40] = 9  # channel 2 here: both only in between
        file = self.path("two.tif")
        write_tiff(file, pixels, "Byte", TILED, no_data=9)
        write_mask(file, valid, True)
        self.build(file, "--levels", "2", "--method", "nearest", "--external")
        expected = numpy.ones((HEIGHT // 2, WIDTH // 2), bool)
        expected[10:20, :20] = False
        self.assertTrue((expected == masks_of_levels(file)[0]).all())


class Alpha(MaskCase):
    def check(self, dtype, place, method, no_data=None, options=()):
        valid = disc(WIDTH, HEIGHT)
        alpha = numpy.where(valid, 200, 0)
        colours = picture(valid, 3, dtype, outside=3)
        file = self.path(f"{numpy.dtype(dtype).name}{place}{method}{no_data}.tif")
        write_tiff(file, numpy.concatenate([colours, alpha[None].astype(dtype)]),
                   {"uint8": "Byte", "uint16": "UInt16", "float32": "Float32"}[
                       numpy.dtype(dtype).name],
                   ("PHOTOMETRIC=RGB", "ALPHA=YES", *TILED, *options), no_data)
        self.build(file, "--method", method, "--levels", "2,4", place)
        one = place == "--internal"
        two = level_validity(valid, 1, 2, SIZE, method, 4 if one else 1)
        four = level_validity(two, 2, 4, SIZE, method, 4 if one else 1)
        for index, expected in enumerate((two, four)):
            level = read_pixels(file, index)
            self.assertTrue(((level[3] > 0) == expected).all(), f"alpha of level {index}")
            self.assertEqual({200}, set(level[3][expected].tolist()))
            self.assertEqual({no_data or 0}, set(level[:3, ~expected].flatten().tolist()))
            self.assertFalse((level[:3, expected] == 3).any(), "hidden colours shine through")
        self.assertTrue(all(mask is None for mask in masks_of_levels(file)))

    def test_transparent_colours_do_not_get_into_levels(self):
        for dtype, place, method in itertools.product(
                (numpy.uint8, numpy.uint16, numpy.float32), ("--internal", "--external"), METHODS):
            with self.subTest(dtype=dtype, place=place, method=method):
                self.check(dtype, place, method)

    def test_a_declared_value_fills_colours_and_leaves_alpha_transparent(self):
        for place in ("--internal", "--external"):
            with self.subTest(place=place):
                self.check(numpy.uint8, place, "average", no_data=250)

    def test_alpha_and_mask_together(self):
        valid = disc(WIDTH, HEIGHT)
        y, x = numpy.mgrid[0:HEIGHT, 0:WIDTH]
        opaque = x > 60
        for place in ("--internal", "--external"):
            file = self.path(place + ".tif")
            write_tiff(file, numpy.concatenate([picture(valid), (opaque * 255)[None].astype("u1")]),
                       "Byte", ("PHOTOMETRIC=RGB", "ALPHA=YES", *TILED))
            write_mask(file, valid, True)
            self.build(file, "--levels", "2,4", "--method", "mode", place)
            two = level_validity(valid & opaque, 1, 2, SIZE, "mode", 4)
            four = level_validity(two, 2, 4, SIZE, "mode", 4)
            for expected, mask in zip((two, four), masks_of_levels(file)):
                self.assertTrue((expected == mask).all())

    def test_levels_of_the_colours_alone(self):
        valid = disc(WIDTH, HEIGHT)
        file = self.path("scene.tif")
        write_tiff(file, numpy.concatenate([picture(valid, outside=3),
                                            (valid * 255)[None].astype("u1")]),
                   "Byte", ("PHOTOMETRIC=RGB", "ALPHA=YES", *TILED))
        self.build(file, "--levels", "2,4", "--channels", "1-3", "--method", "average",
                   "--external")
        for index in (0, 1):
            self.assertNotIn(3, read_pixels(file, index)[:3])


if __name__ == "__main__":
    unittest.main()
