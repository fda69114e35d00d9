# SPDX-License-Identifier: MIT
"""Masks, mask files and alpha as validity: what levels are filled with, and the masks they get."""

import itertools
import os
import random
import re
import shutil
import subprocess
import time
import unittest

import numpy
from osgeo import gdal
import rasterio

from mask_twin import METHODS, disc, level_validity, masks_inside, masks_of_levels
from orin_e2e import Case, TOOL, info, overview_sizes, read_pixels, run, write_tiff

WIDTH, HEIGHT = 203, 151  # not divisible by 2, 3 or 4
SIZE = (WIDTH, HEIGHT)
TILED = ("TILED=YES", "BLOCKXSIZE=64", "BLOCKYSIZE=64")


def picture(valid, channels=3, dtype=numpy.uint8, outside=0):
    """A constant colour inside, a valid black corner of it, `outside` elsewhere."""
    pixels = numpy.empty((channels,) + valid.shape, dtype)
    for channel in range(channels):
        pixels[channel] = numpy.where(valid, 100 + 40 * channel, outside)
    rows, columns = valid.shape
    pixels[:, rows // 2:rows // 2 + 20, columns // 2:columns // 2 + 20] *= (
        pixels[:, rows // 2:rows // 2 + 20, columns // 2:columns // 2 + 20] == outside)
    return pixels


def write_mask(path, valid, inside):
    """Adds a mask to a raster: inside the file, or as `PATH.msk`."""
    with masks_inside(inside):
        dataset = gdal.Open(str(path), gdal.GA_Update)
        dataset.CreateMaskBand(gdal.GMF_PER_DATASET)
        dataset.GetRasterBand(1).GetMaskBand().WriteArray(valid.astype(numpy.uint8) * 255)
        dataset.FlushCache()
        del dataset


def directories_of(path):
    """The subfile types of the directories of a TIFF file, 0 for none, in their order."""
    listed = subprocess.run(["tiffinfo", path], capture_output=True, text=True, check=True)
    types = []
    for part in listed.stdout.split("TIFF Directory at")[1:]:
        found = re.search(r"Subfile Type: .*\((\d)", part)
        types.append(int(found.group(1)) if found else 0)
    return types


class MaskCase(Case):
    def make(self, name, inside=True, channels=3, valid=None, no_data=None, outside=0,
             dtype="Byte", options=TILED):
        valid = disc(WIDTH, HEIGHT) if valid is None else valid
        file = self.path(name)
        pixels = picture(valid, channels, getattr(numpy, {"Byte": "uint8"}.get(dtype, dtype.lower())),
                         outside)
        write_tiff(file, pixels, dtype, options, no_data)
        write_mask(file, valid, inside)
        return file, valid

    def build(self, file, *arguments):
        self.assertRan(run("build", file, *arguments))

    def assert_levels(self, file, valid, method, channels, as_one=True, levels=(2, 3, 4), fill=0):
        """Masks are the twin's, filled pixels hold `fill`, all others are no darker than those
        around them. \\param as_one  all channels were treated in one pass"""
        known = {1: valid}
        for index, (level, mask) in enumerate(zip(levels, masks_of_levels(file))):
            sources = [1] + [l for l in levels if l < level]
            if method == "average":
                sources = [l for l in sources if level % l == 0]
            source = max(sources)
            expected = level_validity(known[source], source, level, SIZE, method,
                                      channels if as_one else 1)
            known[level] = expected
            self.assertIsNotNone(mask, f"level {level} has no mask")
            self.assertEqual(expected.shape, mask.shape)
            self.assertTrue((expected == mask).all(), f"level {level}: the mask is another")
            pixels = read_pixels(file, index)
            self.assertTrue((pixels[:, ~mask] == fill).all(), f"level {level}: fill")
            black = (pixels[0] == 0) & mask
            rows, columns = mask.shape
            y, x = numpy.nonzero(black)
            margin = 12 // level + 2  # black is where the picture is black, and nowhere else
            self.assertTrue(len(y) > 0, "valid black is gone")
            self.assertTrue((y >= rows // 2 - margin).all() and (x >= columns // 2 - margin).all())
            far = mask.copy()
            far[rows // 2 - margin:rows // 2 + 20 // level + margin,
                columns // 2 - margin:columns // 2 + 20 // level + margin] = False
            for channel in range(channels):
                self.assertEqual({100 + 40 * channel}, set(pixels[channel][far].tolist()),
                                 f"level {level}: a rim")


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

    def test_a_mask_file_beside_an_image_of_another_format(self):
        valid = disc(WIDTH, HEIGHT)
        write_tiff(self.path("scene.tif"), picture(valid), "Byte")
        file = self.path("scene.png")
        gdal.Translate(file, self.path("scene.tif"), format="PNG")
        if run("info", file).returncode != 0:
            self.skipTest("this build reads no PNG")
        write_mask_beside(file, valid)
        self.build(file, "--levels", "2,3,4", "--method", "bilinear")
        self.assert_levels(file, valid, "bilinear", 3, as_one=False)


def write_mask_beside(file, valid, flags="2"):
    mask = file + ".msk"
    write_tiff(mask, valid[None].astype(numpy.uint8) * 255, "Byte")
    dataset = gdal.Open(mask, gdal.GA_Update)
    if flags:
        dataset.SetMetadataItem("INTERNAL_MASK_FLAGS_1", flags)
    dataset.FlushCache()
    del dataset
    os.replace(mask, file + ".msk")


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
        self.build(file, "--levels", "2,4", "--channels", "1-3", "--method", "average")
        for index in (0, 1):
            self.assertNotIn(3, read_pixels(file, index)[:3])


class Again(MaskCase):
    def test_a_second_build_has_nothing_to_do_and_a_forced_one_follows_a_changed_mask(self):
        for place in ("--internal", "--external"):
            file, valid = self.make(place + ".tif", inside=False)
            arguments = ("--levels", "2,3,4", "--method", "bilinear", place)
            self.build(file, *arguments)
            answer = run("build", file, *arguments)
            self.assertRan(answer)
            self.assertIn("nothing to do", answer.stdout)
            other = valid[::-1].copy()
            write_tiff(file, picture(other), "Byte", TILED)  # takes the levels inside away
            write_mask(file, other, False)
            self.build(file, *arguments, "--force")
            self.assert_levels(file, other, "bilinear", 3, place == "--internal")
            holder = file if place == "--internal" else file + ".ovr"
            self.assertEqual(3, directories_of(holder).count(5) + directories_of(holder).count(4))

    def test_levels_from_before_there_was_a_mask_are_built_anew(self):
        for inside, place in itertools.product((True, False), ("--internal", "--external")):
            with self.subTest(inside=inside, place=place):
                valid = disc(WIDTH, HEIGHT)
                file = self.path(f"{inside}{place}.tif")
                write_tiff(file, picture(valid), "Byte", TILED)
                self.build(file, "--levels", "2,3,4", "--method", "bilinear", place)
                write_mask(file, valid, inside)
                listed = info(file)["levels"]
                self.assertFalse(any(c["valid"] for level in listed for c in level["channels"]))
                self.build(file, "--levels", "2,3,4", "--method", "bilinear", place)
                self.assert_levels(file, valid, "bilinear", 3, place == "--internal")

    def test_a_mask_that_did_not_change_is_not_stored_again(self):
        file, _ = self.make("scene.tif", inside=False)
        self.build(file, "--levels", "2", "--external")
        one = os.path.getsize(file + ".ovr")
        single, _ = self.make("single.tif", inside=False, channels=1)
        self.build(single, "--levels", "2", "--external")
        self.assertLess(one, 3 * os.path.getsize(single + ".ovr"))

    def test_levels_of_another_program_give_way_with_their_masks(self):
        file, valid = self.make("scene.tif")
        with masks_inside(True):
            dataset = gdal.Open(file, gdal.GA_Update)
            dataset.BuildOverviews("AVERAGE", [2, 4])
            del dataset
        self.assertEqual([0, 4, 1, 1, 5, 5], directories_of(file))
        self.build(file, "--levels", "2,4", "--method", "nearest", "--force")
        self.assertEqual([0, 4, 1, 5, 1, 5], directories_of(file))
        self.assert_levels(file, valid, "nearest", 3, levels=(2, 4))

    def test_a_level_of_another_program_is_read_with_its_mask(self):
        file, valid = self.make("scene.tif")
        with masks_inside(True):
            dataset = gdal.Open(file, gdal.GA_Update)
            dataset.BuildOverviews("AVERAGE", [2])
            del dataset
        two = masks_of_levels(file)[0]
        self.build(file, "--levels", "4", "--method", "nearest")
        expected = level_validity(two, 2, 4, SIZE, "nearest", 3)
        self.assertTrue((expected == masks_of_levels(file)[1]).all())

    def test_a_level_without_a_mask_goes_by_that_of_the_image(self):
        file, valid = self.make("scene.tif", inside=False)
        dataset = gdal.Open(file, gdal.GA_Update)
        dataset.BuildOverviews("NEAREST", [2])  # no mask levels for a mask file, here
        del dataset
        self.assertEqual([0, 1], directories_of(file))
        self.build(file, "--levels", "4", "--method", "nearest")
        at_centres = valid[1::2, 1::2]
        expected = level_validity(at_centres, 2, 4, SIZE, "nearest", 3)
        self.assertTrue((expected == masks_of_levels(file)[1]).all())

    def test_one_channel_of_a_side_car_at_a_time(self):
        file, valid = self.make("scene.tif")
        for channel in (2, 1, 3):
            self.build(file, "--levels", "2,3,4", "--channels", channel, "--external", "--method",
                       "mode")
        self.assert_levels(file, valid, "mode", 3, as_one=False)


class Killed(MaskCase):
    def test_no_valid_level_is_without_its_mask(self):
        for place in ("--internal", "--external"):
            valid = disc(1900, 1700)
            original = self.path("original.tif")
            write_tiff(original, picture(valid), "Byte", ("TILED=YES", "COMPRESS=DEFLATE"))
            write_mask(original, valid, True)
            undisturbed = shutil.copy(original, self.path("undisturbed.tif"))
            arguments = ("--levels", "2,4,8", "--method", "nearest", place)
            start = time.monotonic()
            self.build(undisturbed, *arguments)
            duration = time.monotonic() - start
            expected = masks_of_levels(undisturbed)
            moments = random.Random(7)
            for number in range(10):
                file = shutil.copy(original, self.path(f"{number}{place}.tif"))
                process = subprocess.Popen([TOOL, "build", file, *arguments],
                                           stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
                time.sleep(moments.uniform(0, duration))  # the moment is what is tested
                process.kill()
                process.wait()
                finished = [(entry["width"], entry["height"]) for entry in info(file)["levels"]
                            if all(channel["valid"] for channel in entry["channels"])]
                for size, mask in zip(overview_sizes(file), masks_of_levels(file)):
                    if size in finished:
                        own = [m for m in expected if m.shape == size[::-1]][0]
                        self.assertTrue(mask is not None and (own == mask).all())
                self.build(file, *arguments)
                for own, mask in zip(expected, masks_of_levels(file)):
                    self.assertTrue((own == mask).all())


class MaskFilesThatCannotServe(MaskCase):
    def check(self, name, reason):
        answer = run("build", self.path("scene.tif"), "--levels", "2")
        self.assertRan(answer)
        self.assertIn("scene.tif.msk: is not used as the mask of its image: " + reason,
                      answer.stderr)
        self.assertEqual(1, answer.stderr.count("is not used as the mask"), name)

    def setUp(self):
        super().setUp()
        self.valid = disc(WIDTH, HEIGHT)
        self.file = self.path("scene.tif")
        write_tiff(self.file, picture(self.valid), "Byte", TILED)

    def test_another_size(self):
        write_mask_beside(self.file, self.valid[:-1])
        self.check("size", "it has 203 x 150 pixels")

    def test_no_word_of_how_it_applies(self):
        write_mask_beside(self.file, self.valid, flags=None)
        self.check("flags", "it does not say how it applies")

    def test_a_mask_for_each_channel(self):
        write_mask_beside(self.file, self.valid, flags="0")
        self.check("channel", "only one mask for all channels")

    def test_no_tiff_at_all(self):
        with open(self.file + ".msk", "wb") as mask:
            mask.write(b"mask")
        self.check("tiff", "")


if __name__ == "__main__":
    unittest.main()
