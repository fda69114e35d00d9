# SPDX-License-Identifier: MIT
"""Levels of images with alpha keep it as it is, whatever the image's codec; where the user wants a
codec that cannot, they get exact masks."""

import itertools
import os
import unittest

import numpy
from osgeo import gdal

from mask_case import HEIGHT, MaskCase, SIZE, TILED, WIDTH, write_mask_beside
from mask_twin import METHODS, disc, level_validity, masks_of_levels
from orin_e2e import READS_ALL_FORMATS, info, nearest, read_pixels, run, write_tiff

JPEG = ("COMPRESS=JPEG", "JPEG_QUALITY=75")


def scene(channels=4):
    """Smooth colours under an opaque disc; nothing round it. The last channel is opacity."""
    rows, columns = numpy.mgrid[0:HEIGHT, 0:WIDTH]
    valid = disc(WIDTH, HEIGHT)
    pixels = [numpy.where(valid, 40 + (rows * (i + 1) + columns) // 3 % 200, 0)
              for i in range(channels - 1)]
    return numpy.stack([*pixels, valid * 255]).astype(numpy.uint8)


def codec_of(path, index):
    """Of a level that GDAL lists: its compression, from the directory that holds it."""
    dataset = gdal.Open(f"GTIFF_DIR:{index}:{path}")
    return dataset.GetMetadataItem("COMPRESSION", "IMAGE_STRUCTURE")


class AlphaCase(MaskCase):
    def make_jpeg(self, name, *options, channels=4):
        file = self.path(name)
        colours = ("PHOTOMETRIC=RGB",) if channels == 4 else ()
        write_tiff(file, scene(channels), "Byte", ("ALPHA=YES", *colours, *TILED, *JPEG, *options))
        return file


class OfJpegImages(AlphaCase):
    def assert_exact(self, file, levels=(2, 4)):
        """Nearest pixels of the image as it reads, nothing where it is transparent."""
        for index, level in enumerate(levels):
            expected = nearest(read_pixels(file), 1, level, SIZE)
            expected[:, expected[-1] == 0] = 0
            self.assertSamePixels(expected, read_pixels(file, index))

    def test_levels_are_without_loss(self):
        for channels, order, place in itertools.product((4, 2), ("PIXEL", "BAND"),
                                                        ("--internal", "--external")):
            with self.subTest(channels=channels, order=order, place=place):
                file = self.make_jpeg(f"{channels}{order}{place}.tif", "INTERLEAVE=" + order,
                                      channels=channels)
                answer = run("build", file, "--levels", "2,4", "--method", "nearest", place)
                self.assertRan(answer)
                self.assertNotIn("alpha", answer.stderr)
                self.assert_exact(file)
                holder, first = (file, 2) if place == "--internal" else (file + ".ovr", 1)
                self.assertEqual("DEFLATE", codec_of(holder, first))
                self.assertTrue(all(mask is None for mask in masks_of_levels(file)))

    def test_alpha_says_exactly_what_each_method_filled(self):
        for method, place in itertools.product(METHODS, ("--internal", "--external")):
            with self.subTest(method=method, place=place):
                file = self.make_jpeg(method + place + ".tif")
                known = read_pixels(file)[3] > 0
                self.assertTrue((read_pixels(file)[3][known] < 100).any(), "no rim to be kept")
                self.build(file, "--levels", "2,4", "--method", method, place)
                for index, (source, level) in enumerate(((1, 2), (2, 4))):
                    channels = 4 if place == "--internal" else 1
                    known = level_validity(known, source, level, SIZE, method, channels)
                    pixels = read_pixels(file, index)
                    self.assertTrue(((pixels[3] > 0) == known).all(), f"level {level}")
                    self.assertEqual({0}, set(pixels[:, ~known].flat))

    def test_a_fourth_channel_that_is_no_alpha_is_compressed_as_the_image(self):
        file = self.path("four.tif")
        write_tiff(file, scene(), "Byte", ("ALPHA=UNSPECIFIED", "PHOTOMETRIC=RGB", *TILED, *JPEG))
        self.build(file, "--levels", "2")
        self.assertEqual("JPEG", codec_of(file, 2))

    def test_a_quality_without_a_codec_is_refused(self):
        answer = run("build", self.make_jpeg("scene.tif"), "--levels", "2", "--co", "QUALITY=50")
        self.assertRan(answer, 2)
        self.assertIn("add COMPRESS=JPEG or WEBP", answer.stderr)


class Overshooting(AlphaCase):
    def test_bicubic_leaves_no_pixel_with_data_transparent(self):
        columns = numpy.arange(WIDTH)
        for (dtype, type_name), place in itertools.product(
                ((numpy.uint8, "Byte"), (numpy.int16, "Int16"), (numpy.uint32, "UInt32")),
                ("--internal", "--external")):
            with self.subTest(type=type_name, place=place):
                opaque = numpy.where(columns // 7 % 2, 120, 1)  # the step is overshot on both sides
                alpha = numpy.tile(opaque, (HEIGHT, 1))
                alpha[:, :20] = 0
                pixels = numpy.stack([alpha, alpha, alpha, alpha]).astype(dtype)
                file = self.path(type_name + place + ".tif")
                write_tiff(file, pixels, type_name, ("ALPHA=YES", "PHOTOMETRIC=RGB", *TILED))
                self.build(file, "--levels", "2,4", "--method", "bicubic", place)
                known = alpha > 0
                for index, (source, level) in enumerate(((1, 2), (2, 4))):
                    known = level_validity(known, source, level, SIZE, "bicubic", 4)
                    pixels = read_pixels(file, index)
                    self.assertTrue(((pixels[3] != 0) == known).all())
                    if index == 0 and dtype == numpy.uint8:  # the same numbers, as a colour
                        self.assertTrue((pixels[0][known] == 0).any(), "nothing overshoots")


class AsTheUserSays(AlphaCase):
    def image(self, name, codec):
        file = self.path(name)
        write_tiff(file, scene(), "Byte", ("ALPHA=YES", "PHOTOMETRIC=RGB", *TILED, *codec))
        return file

    def assert_masks(self, file, method, place, levels=((1, 2), (2, 4))):
        known = read_pixels(file)[3] > 0
        masks = masks_of_levels(file)
        self.assertEqual(len(levels), len(masks))
        for (source, level), mask in zip(levels, masks):
            known = level_validity(known, source, level, SIZE, method,
                                   4 if place == "--internal" else 1)
            self.assertIsNotNone(mask, f"level {level} has no mask")
            self.assertTrue((known == mask).all(), f"level {level}: the mask is another")

    def test_jpeg_levels_have_exact_masks_and_a_warning_says_why(self):
        for codec, place, method in itertools.product(
                (JPEG, ("COMPRESS=DEFLATE",)), ("--internal", "--external"),
                ("nearest", "bicubic")):
            with self.subTest(codec=codec[0], place=place, method=method):
                file = self.image(codec[0] + place + method + ".tif", codec)
                answer = run("build", file, "--levels", "2,4", "--method", method, place, "--co",
                             "COMPRESS=JPEG", "--co", "QUALITY=60")
                self.assertRan(answer)
                self.assertEqual(1, answer.stderr.count("JPEG keeps the alpha channel"))
                holder, first = (file, 2) if place == "--internal" else (file + ".ovr", 1)
                self.assertEqual("JPEG", codec_of(holder, first))
                self.assert_masks(file, method, place)

    def test_info_tells_of_masks_and_alpha(self):
        file = self.image("scene.tif", JPEG)
        self.build(file, "--levels", "2", "--co", "COMPRESS=JPEG")
        self.build(file, "--levels", "4")
        told = info(file)
        self.assertEqual((False, 4), (told["mask"], told["alphaChannel"]))
        self.assertEqual([True, False], [level["mask"] for level in told["levels"]])
        write_mask_beside(file, disc(WIDTH, HEIGHT))
        self.assertTrue(info(file)["mask"])
        self.assertIn("no data by: a mask, alpha (channel 4)\n", run("info", file).stdout)

    def test_a_jpeg_level_of_another_program_goes_by_the_alpha_of_the_image(self):
        file = self.image("scene.tif", JPEG)
        dataset = gdal.Open(file, gdal.GA_Update)
        dataset.BuildOverviews("NEAREST", [2])
        del dataset
        self.assertEqual("JPEG", codec_of(file, 2))
        self.build(file, "--levels", "4", "--method", "nearest")
        two = (read_pixels(file)[3] > 0)[1::2, 1::2]  # at the centres of its pixels
        blurred = read_pixels(file, 0)[3, :HEIGHT // 2, :WIDTH // 2] > 0
        self.assertFalse((blurred == two).all(), "its own alpha is as good")
        four = level_validity(two, 2, 4, SIZE, "nearest", 4)
        self.assertTrue(((read_pixels(file, 1)[3] > 0) == four).all())

    def test_jpeg_levels_built_again_keep_their_form_and_their_masks(self):
        for place in ("--internal", "--external"):
            with self.subTest(place=place):
                file = self.image(place + ".tif", JPEG)
                self.build(file, "--levels", "2", "--method", "nearest", place, "--co",
                           "COMPRESS=JPEG")
                self.build(file, "--levels", "2", "--method", "mode", place, "--force")
                self.assert_masks(file, "mode", place, ((1, 2),))
                self.build(file, "--levels", "2", "--method", "nearest", place, "--force", "--co",
                           "COMPRESS=DEFLATE")
                expected = nearest(read_pixels(file), 1, 2, SIZE)
                expected[:, expected[3] == 0] = 0
                self.assertSamePixels(expected, read_pixels(file, 0))
                self.assertEqual([None], masks_of_levels(file))
                self.assertRan(run("clean", file))

    def test_lossy_webp_keeps_alpha(self):
        file = self.image("scene.tif", ("COMPRESS=LZW",))
        answer = run("build", file, "--levels", "2", "--method", "nearest", "--co", "COMPRESS=WEBP",
                     "--co", "QUALITY=20")
        self.assertRan(answer)
        self.assertNotIn("alpha", answer.stderr)
        expected, pixels = nearest(scene(), 1, 2, SIZE), read_pixels(file, 0)
        self.assertEqual("WEBP", codec_of(file, 2))
        self.assertTrue((expected[3] == pixels[3]).all())
        self.assertFalse((expected[:3] == pixels[:3]).all(), "nothing was lost at all")


class BesideOtherFormats(AlphaCase):
    def test_levels_are_without_loss(self):
        write_tiff(self.path("scene.tif"), scene(), "Byte", ("ALPHA=YES", "PHOTOMETRIC=RGB"))
        for driver, name, options in (("PNG", "scene.png", ()),
                                      ("WEBP", "scene.webp", ("QUALITY=50",)),
                                      ("WEBP", "exact.webp", ("LOSSLESS=YES",)),
                                      ("JP2OpenJPEG", "scene.jp2", ("QUALITY=20",))):
            with self.subTest(name=name):
                file = self.path(name)
                gdal.Translate(file, self.path("scene.tif"), format=driver,
                               creationOptions=list(options))
                if not READS_ALL_FORMATS:
                    self.skipTest("this build reads no other formats")
                self.build(file, "--levels", "2,4", "--method", "nearest")
                self.assertTrue(os.path.exists(file + ".ovr"))
                self.assertEqual("DEFLATE", codec_of(file + ".ovr", 1))
                for index, level in enumerate((2, 4)):
                    expected = nearest(read_pixels(file), 1, level, SIZE)
                    expected[:, expected[3] == 0] = 0
                    beside = read_pixels(f"GTIFF_DIR:{index + 1}:{file}.ovr")
                    self.assertSamePixels(expected, beside)  # the format may make up levels


if __name__ == "__main__":
    unittest.main()
