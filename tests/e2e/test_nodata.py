# SPDX-License-Identifier: MIT
"""No-data values, palettes and narrow samples: levels of the tool as other programs read them."""

import itertools
import os
import unittest

import numpy
from osgeo import gdal
import rasterio

from orin_e2e import READS_ALL_FORMATS, Case, info, random_pixels, read_pixels, run, write_tiff

METHODS = ("nearest", "average", "mode", "bilinear", "bicubic")
PLACES = ("--internal", "--external")
LOWEST = numpy.finfo(numpy.float32).min


def with_holes(pixels, value, seed=1):
    """The same for all channels: blocks, single pixels and the first column without data."""
    generator = numpy.random.default_rng(seed)
    rows, columns = pixels.shape[1:]
    hole = generator.random((rows, columns)) < 0.05
    hole |= numpy.add.outer(numpy.arange(rows) // 9, numpy.arange(columns) // 13) % 3 == 0
    hole[:, 0] = True
    pixels[:, hole] = value
    return pixels


def level_masks(path, index):
    """What GDAL takes for no data in the n-th overview of band 1: True where it does."""
    dataset = gdal.Open(path)
    return dataset.GetRasterBand(1).GetOverview(index).GetMaskBand().ReadAsArray() == 0


class NotANumber(Case):
    def build(self, name, pixels, type_name, no_data, *arguments):
        file = self.path(name)
        write_tiff(file, pixels, type_name, ["TILED=YES"], no_data)
        self.assertRan(run("build", file, "--levels", "2,3,4", *arguments))
        return file

    def check(self, pixels, type_name, special, place, method):
        """Levels of an image with `special` are those of its twin with a plain number."""
        plain = -54321.0
        arguments = (place, "--method", method)
        twin = self.build("twin.tif", with_holes(pixels.copy(), plain), type_name, plain,
                          *arguments, "--force")
        file = self.build("image.tif", with_holes(pixels.copy(), special), type_name, special,
                          *arguments, "--force")
        for index in range(3):
            expected, actual = read_pixels(twin, index), read_pixels(file, index)
            hole = expected == plain
            self.assertTrue(hole.any() and not hole.all())
            expected[hole] = special
            self.assertEqual(expected.dtype, actual.dtype)
            numpy.testing.assert_array_equal(expected, actual)
            numpy.testing.assert_array_equal(hole[0], level_masks(file, index))
            with rasterio.open(file, overview_level=index) as level:
                numpy.testing.assert_array_equal(hole[0], level.read_masks(1) == 0)
        for path in (file, twin, file + ".ovr", twin + ".ovr"):
            if os.path.exists(path):
                os.remove(path)

    def test_levels_have_no_rim_round_nan_and_infinities(self):
        for type_name, place, method in itertools.product(("Float32", "Float64"), PLACES, METHODS):
            pixels = random_pixels((2, 201, 310), numpy.dtype(type_name.lower()), 3)
            for special in (float("nan"), float("-inf"), float("inf")):
                with self.subTest(type=type_name, place=place, method=method, value=special):
                    self.check(pixels, type_name, special, place, method)

    def test_complex_levels_have_no_rim_round_nan(self):
        for type_name, place, method in itertools.product(("CFloat32", "CFloat64"), PLACES,
                                                          ("nearest", "average")):
            with self.subTest(type=type_name, place=place, method=method):
                dtype = numpy.complex64 if type_name == "CFloat32" else numpy.complex128
                pixels = with_holes(random_pixels((1, 201, 310), dtype, 4) + dtype(5), numpy.nan)
                file = self.build(f"{type_name}{place}{method}.tif", pixels, type_name,
                                  float("nan"), place, "--method", method)
                largest = numpy.nanmax(numpy.abs(pixels))
                for index in range(3):
                    level = read_pixels(file, index)
                    valid = ~numpy.isnan(level)
                    self.assertTrue(valid.any() and not valid.all())
                    self.assertLessEqual(numpy.abs(level[valid]).max(), largest * 1.001)
                    self.assertGreater(numpy.abs(level[valid]).min(), 0)
                    numpy.testing.assert_array_equal(~valid[0], level_masks(file, index))

    def test_values_of_the_image_are_never_taken_for_no_data(self):
        pixels = with_holes(random_pixels((1, 200, 300), numpy.float32, 5), numpy.nan)
        pixels[0, 100:160, 100:200] = LOWEST
        pixels[0, 20:60, 20:60] = numpy.nextafter(LOWEST, numpy.float32(0))
        file = self.build("lowest.tif", pixels, "Float32", float("nan"), "--method", "nearest")
        level = read_pixels(file, 0)
        numpy.testing.assert_array_equal(pixels[:, ::2, ::2], level)

    def test_the_tags_text_stays_as_it_was(self):
        pixels = with_holes(random_pixels((1, 200, 300), numpy.float32, 5), numpy.nan)
        for place in PLACES:
            file = self.build(f"text{place}.tif", pixels, "Float32", float("nan"), place)
            dataset = gdal.Open(file)
            for index in range(3):
                value = dataset.GetRasterBand(1).GetOverview(index).GetNoDataValue()
                self.assertTrue(numpy.isnan(value))

    def test_an_integer_channel_holds_no_nan(self):
        pixels = random_pixels((1, 200, 300), numpy.int16, 6)
        pixels[0, :50] = 0
        file = self.build("integer.tif", pixels, "Int16", float("nan"), "--method", "nearest")
        self.assertSamePixels(pixels[:, ::2, ::2], read_pixels(file, 0))

    def test_a_negative_value_of_64_bit_integers_is_kept(self):
        pixels = with_holes(random_pixels((1, 200, 300), numpy.int64, 7), -9999)
        file = self.path("int64.tif")
        dataset = gdal.GetDriverByName("GTiff").Create(file, 300, 200, 1, gdal.GDT_Int64)
        dataset.GetRasterBand(1).SetNoDataValue(-9999)
        dataset.GetRasterBand(1).WriteArray(pixels[0])
        del dataset
        self.assertRan(run("build", file, "--levels", "2", "--method", "nearest"))
        self.assertSamePixels(pixels[:, ::2, ::2], read_pixels(file, 0))


class ItemsOfAUser(Case):
    """Items that are called like facts of ours are a user's own texts and change nothing."""

    NAMES = ("NO_DATA_VALUE_IS_FILL", "VALIDITY", "DECLARED_NO_DATA_VALUE", "ALPHA")

    def levels(self, file, method):
        self.assertRan(run("build", file, "--levels", "2,3", "--method", method))
        return [read_pixels(file, index) for index in range(2)]

    def with_items(self, file):
        dataset = gdal.Open(file, gdal.GA_Update)
        dataset.SetMetadata({name: "YES" for name in self.NAMES})
        for band in range(1, dataset.RasterCount + 1):
            dataset.GetRasterBand(band).SetMetadata({name: "YES" for name in self.NAMES})
        del dataset
        self.assertEqual("YES", gdal.Open(file).GetMetadataItem("VALIDITY"))
        return file

    def check(self, make):
        for method in METHODS:
            with self.subTest(method=method):
                expected = self.levels(make("plain" + method), method)
                actual = self.levels(self.with_items(make("items" + method)), method)
                for with_none, with_items in zip(expected, actual):
                    self.assertTrue((with_none == 0).any())
                    self.assertSamePixels(with_none, with_items)

    def tiff(self, name):
        pixels = with_holes(random_pixels((2, 120, 144), numpy.uint8, 11) | 1, 0)
        file = self.path(name + ".tif")
        write_tiff(file, pixels, "Byte", [], 0)
        return file

    def vrt(self, name):
        source = self.tiff(name)
        file = self.path(name + ".vrt")
        gdal.Translate(file, source, format="VRT")
        return file

    def test_in_a_tiff(self):
        self.check(self.tiff)

    @unittest.skipUnless(READS_ALL_FORMATS, "the build reads TIFF only")
    def test_in_another_format(self):
        self.check(self.vrt)

    def test_a_no_data_item_that_is_no_number_does_not_hide_the_tag(self):
        expected = self.levels(self.tiff("tag"), "average")
        file = self.tiff("none")
        dataset = gdal.Open(file, gdal.GA_Update)
        dataset.SetMetadataItem("NO_DATA_VALUE", "none")
        del dataset
        for with_tag, with_item in zip(expected, self.levels(file, "average")):
            self.assertSamePixels(with_tag, with_item)


class FloatText(Case):
    def test_the_lowest_float_is_no_data_however_its_text_was_cut(self):
        pixels = with_holes(random_pixels((1, 200, 300), numpy.float32, 8), LOWEST)
        for number, value in enumerate((-3.4028234663852886e+38, -3.4028235e+38)):
            for method in METHODS:
                with self.subTest(value=value, method=method):
                    file = self.path(f"{number}{method}.tif")
                    write_tiff(file, pixels, "Float32", [], value)
                    self.assertRan(run("build", file, "--levels", "2,4", "--method", method))
                    for index in range(2):
                        level = read_pixels(file, index)
                        valid = level != LOWEST
                        self.assertTrue(valid.any() and not valid.all())
                        self.assertLess(numpy.abs(level[valid]).max(), 1e5)


class NarrowSamples(Case):
    def test_overshoot_stays_inside_the_bits(self):
        generator = numpy.random.default_rng(9)
        for bits, place in itertools.product((3, 7, 9, 12, 15, 17, 23, 31), PLACES):
            with self.subTest(bits=bits, place=place):
                highest = 2 ** bits - 1
                type_name, dtype = (("Byte", numpy.uint8) if bits <= 8 else
                                    ("UInt16", numpy.uint16) if bits <= 16 else
                                    ("UInt32", numpy.uint32))
                blocks = generator.integers(0, 2, (2, 40, 60)) * highest
                pixels = numpy.kron(blocks, numpy.ones((1, 3, 5))).astype(dtype)
                narrow, wide = self.path(f"n{bits}{place}.tif"), self.path(f"w{bits}{place}.tif")
                write_tiff(narrow, pixels, type_name, [f"NBITS={bits}", "TILED=YES"])
                write_tiff(wide, pixels, type_name, ["TILED=YES"])
                for file in (narrow, wide):
                    self.assertRan(run("build", file, "--levels", "2,4", "--method", "bicubic",
                                       place))
                wide_level = read_pixels(wide, 0)
                if bits < 24:  # blends of larger numbers are rounded to single precision
                    self.assertGreater(wide_level.max(), highest)
                self.assertSamePixels(numpy.minimum(wide_level, highest).astype(dtype),
                                      read_pixels(narrow, 0))
                self.assertLessEqual(read_pixels(narrow, 1).max(), highest)
                overview = gdal.Open(narrow + ".ovr" if place == "--external" else
                                     f"GTIFF_DIR:2:{narrow}")
                self.assertEqual(str(bits), overview.GetRasterBand(1).GetMetadataItem(
                    "NBITS", "IMAGE_STRUCTURE"))


class Palette(Case):
    def setUp(self):
        super().setUp()
        self.pixels = random_pixels((1, 400, 500), numpy.uint8, 10) % 7
        self.file = self.path("palette.tif")
        dataset = gdal.GetDriverByName("GTiff").Create(self.file, 500, 400, 1, gdal.GDT_Byte)
        self.colours = gdal.ColorTable()
        for index in range(7):
            self.colours.SetColorEntry(index, (index * 30, 255 - index * 20, index, 255))
        dataset.GetRasterBand(1).SetColorTable(self.colours)
        dataset.GetRasterBand(1).WriteArray(self.pixels[0])
        del dataset

    def colours_of(self, band):
        return [band.GetColorTable().GetColorEntry(index) for index in range(256)]

    def test_every_level_has_the_images_colours(self):
        for place in PLACES:
            answer = run("build", self.file, "--levels", "2,3", "--method", "mode", "--force",
                         place)
            self.assertRan(answer)
            self.assertNotIn("colours", answer.stderr)
            dataset = gdal.Open(self.file)
            band = dataset.GetRasterBand(1)
            for index in range(2):
                self.assertEqual(self.colours_of(band), self.colours_of(band.GetOverview(index)))
        del band, dataset

    def test_methods_that_invent_colours_are_warned_of(self):
        for method in ("average", "bilinear", "bicubic"):
            answer = run("build", self.file, "--levels", "2", "--method", method, "--force",
                         "--quiet")
            self.assertRan(answer)
            self.assertEqual(1, answer.stderr.count("Use --method mode or --method nearest."))
            self.assertEqual("", answer.stdout)

    def test_nothing_is_said_when_nothing_is_built(self):
        self.assertRan(run("build", self.file, "--levels", "2", "--method", "average"))
        for method in ([], ["--method", "average"]):
            answer = run("build", self.file, "--levels", "2", *method)
            self.assertIn("nothing to do", answer.stdout)
            self.assertEqual("", answer.stderr)

    def test_named_classes_are_warned_of_too(self):
        file = self.path("classes.tif")
        dataset = gdal.GetDriverByName("GTiff").Create(file, 500, 400, 1, gdal.GDT_Byte)
        dataset.GetRasterBand(1).SetCategoryNames(["water", "wood", "town"])
        del dataset
        answer = run("build", file, "--levels", "2", "--method", "average")
        self.assertRan(answer)
        self.assertIn("classes", answer.stderr)


class Beside(Case):
    """A value that stands in NAME.tif.aux.xml, where programs keep it for files that they may not
    write."""

    def setUp(self):
        super().setUp()
        self.pixels = random_pixels((2, 80, 90), numpy.uint8, 1)
        self.pixels[:, 21:50, 11:70] = 60

    def levels(self, name, beside="", no_data=None, method="average"):
        """The level 2 of both channels, and which of its pixels hold data."""
        file = self.path(name)
        write_tiff(file, self.pixels, "Byte", no_data=no_data)
        if beside:
            with open(file + ".aux.xml", "w", encoding="utf-8") as text:
                text.write(f"<PAMDataset>{beside}</PAMDataset>")
        self.assertRan(run("build", file, "--levels", "2", "--method", method, "--internal"))
        return read_pixels(file, 0), level_masks(file, 0)

    def band(self, channel, value):
        return f'<PAMRasterBand band="{channel}"><NoDataValue>{value}</NoDataValue></PAMRasterBand>'

    def test_counts_as_one_in_the_tag_does(self):
        everywhere = self.band(1, 60) + self.band(2, 60)
        for method in ("average", "bilinear", "bicubic", "nearest", "mode"):
            with self.subTest(method=method):
                expected = self.levels(f"{method}-tag.tif", no_data=60, method=method)
                found = self.levels(f"{method}.tif", everywhere, method=method)
                self.assertSamePixels(expected[0], found[0])
                self.assertSamePixels(expected[1], found[1])
                plain = self.levels(f"{method}-none.tif", method=method)
                self.assertEqual(method == "nearest",
                                 expected[0].tobytes() == plain[0].tobytes())

    def test_goes_before_the_tag_as_for_other_programs(self):
        everywhere = self.band(1, 60) + self.band(2, 60)
        expected = self.levels("tag.tif", no_data=60)
        found = self.levels("both.tif", everywhere, no_data=7)
        dataset = gdal.Open(self.path("both.tif"))
        self.assertEqual(60, dataset.GetRasterBand(1).GetNoDataValue())
        self.assertSamePixels(expected[0], found[0])

    def test_of_one_channel_counts_there_alone(self):
        write_tiff(self.path("one.tif"), self.pixels, "Byte")
        with open(self.path("one.tif.aux.xml"), "w", encoding="utf-8") as text:
            text.write(f"<PAMDataset>{self.band(2, 60)}</PAMDataset>")
        build = ("build", "--levels", "2", "--method", "average", "--external")
        self.assertRan(run(*build, self.path("one.tif")))
        found = read_pixels(self.path("one.tif"), 0)
        for channel, no_data in ((0, None), (1, 60)):
            file = self.path(f"channel-{channel}.tif")
            write_tiff(file, self.pixels[channel:channel + 1], "Byte", no_data=no_data)
            self.assertRan(run(*build, file))
            self.assertSamePixels(read_pixels(file, 0), found[channel:channel + 1])

    def test_that_is_damaged_or_no_file_is_passed_over(self):
        plain, _ = self.levels("plain.tif")
        found, _ = self.levels("damaged.tif", self.band(1, 60) + "<PAMRasterBand>")
        self.assertSamePixels(plain, found)
        for make in (os.mkfifo, os.mkdir, lambda path: os.symlink("/dev/zero", path)):
            file = self.path("image.tif")
            write_tiff(file, self.pixels, "Byte")
            make(file + ".aux.xml")
            self.assertRan(run("build", file, "--levels", "2", "--method", "average"))
            os.rename(file + ".aux.xml", self.path("away"))
            self.assertSamePixels(plain, read_pixels(file, 0))
            if os.path.isdir(self.path("away")) and not os.path.islink(self.path("away")):
                os.rmdir(self.path("away"))
            else:
                os.remove(self.path("away"))


class BitMask(Case):
    def test_a_named_mask_of_one_bit_is_refused_with_a_reason(self):
        file = self.path("mask.tif")
        write_tiff(file, random_pixels((1, 300, 300), numpy.uint8, 1) % 2, "Byte", ["NBITS=1"])
        answer = run("build", file, "--channels", "1", "--levels", "2")
        self.assertRan(answer, 2)
        self.assertIn(f"{file}: channel 1 is a mask of one bit, which has no levels. Leave it out "
                      "of --channels.", answer.stderr)
        self.assertEqual([], info(file)["levels"])


if __name__ == "__main__":
    unittest.main()
