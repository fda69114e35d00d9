# SPDX-License-Identifier: MIT
"""One table: what is done to a file with levels, and what `info` says of them afterwards."""

import os
import shutil
import struct
import subprocess
import unittest
import warnings

import numpy
from osgeo import gdal
import rasterio

from orin_e2e import Case, READS_ALL_FORMATS, info, random_pixels, run, write_tiff

warnings.filterwarnings("ignore", category=rasterio.errors.NotGeoreferencedWarning)

ROWS, COLUMNS = 211, 307
PLACES = ("--internal", "--external")


def update(path):
    return gdal.Open(path, gdal.GA_Update)


def edit_pixel(path):
    dataset = update(path)
    pixel = dataset.GetRasterBand(1).ReadAsArray(7, 5, 1, 1)
    dataset.GetRasterBand(1).WriteArray(pixel ^ 1, 7, 5)


def edit_and_restore_time(path):
    times = os.stat(path)
    edit_pixel(path)
    os.utime(path, ns=(times.st_atime_ns, times.st_mtime_ns))


def set_no_data(path):
    dataset = update(path)
    dataset.GetRasterBand(1).SetNoDataValue(60)


def set_no_data_beside(path):
    with open(path + ".aux.xml", "w", encoding="ascii") as file:
        file.write('<PAMDataset><PAMRasterBand band="1"><NoDataValue>60</NoDataValue>'
                   '</PAMRasterBand></PAMDataset>')


def drop_no_data(path):
    dataset = update(path)
    dataset.GetRasterBand(1).DeleteNoDataValue()


def respell_no_data(path):
    """The item of raster metadata says the same number in other words."""
    dataset = update(path)
    dataset.SetMetadataItem("NO_DATA_VALUE", "17.0")


def set_georeference(path):
    dataset = update(path)
    dataset.SetGeoTransform([500000, 1, 0, 4000000, 0, -1])
    dataset.SetMetadataItem("AREA", "a longer text than the directory has space for" * 9)


def add_mask(inside):
    def add(path):
        with rasterio.Env(GDAL_TIFF_INTERNAL_MASK=inside), rasterio.open(path, "r+") as dataset:
            mask = numpy.full((ROWS, COLUMNS), 255, numpy.uint8)
            mask[50:] = 0
            dataset.write_mask(mask)
    return add


def set_palette(path):
    table = gdal.ColorTable()
    table.SetColorEntry(3, (1, 2, 3, 255))
    dataset = update(path)
    dataset.GetRasterBand(1).SetColorTable(table)


def tag_position(path, tag):
    """Where the value of a short tag of the first directory stands (little-endian, classic)."""
    with open(path, "rb") as file:
        data = file.read()
    start, = struct.unpack_from("<I", data, 4)
    count, = struct.unpack_from("<H", data, start)
    for entry in range(start + 2, start + 2 + 12 * count, 12):
        number, kind, values = struct.unpack_from("<HHI", data, entry)
        if number == tag:
            where = entry + 8
            if kind == 3 and values > 2:
                where, = struct.unpack_from("<I", data, where)
            return where
    raise KeyError(tag)


def patch_tag(tag, value):
    def patch(path):
        position = tag_position(path, tag)
        with open(path, "r+b") as file:
            file.seek(position)
            file.write(struct.pack("<H", value))
    return patch


def foreign_overviews(path):
    subprocess.run(["gdaladdo", "-q", "-r", "average", path, "2"], check=True)


def foreign_overviews_beside(path):
    subprocess.run(["gdaladdo", "-q", "-ro", "-r", "average", path, "2"], check=True)


def write_level(path):
    dataset = update(path)
    band = dataset.GetRasterBand(1)
    band.GetOverview(0).WriteArray(numpy.full((3, 3), 77, numpy.uint8), 9, 9)


def write_level_beside(path):
    dataset = update(path + ".ovr")
    dataset.GetRasterBand(1).WriteArray(numpy.full((3, 3), 77, numpy.uint8), 9, 9)


def touch(path):
    os.utime(path)


def copy(path):
    for suffix in ("", ".ovr"):
        if os.path.exists(path + suffix):
            shutil.copyfile(path + suffix, path + ".copy" + suffix)
            os.replace(path + ".copy" + suffix, path + suffix)


def replace_by_another_of_equal_size_and_time(path):
    """As unpacking an archive or a version of a repository does."""
    times = os.stat(path)
    other = path + ".other"
    shutil.copyfile(path, other)
    position = os.path.getsize(other) // 2
    with open(other, "r+b") as file:
        file.seek(position)
        byte = file.read(1)[0]
        file.seek(position)
        file.write(bytes((byte ^ 255,)))
    os.utime(other, ns=(times.st_atime_ns, times.st_mtime_ns))
    os.replace(other, path)


PLAIN = ("TILED=NO", "COMPRESS=NONE")
TILED = ("TILED=YES", "BLOCKXSIZE=64", "BLOCKYSIZE=64")
DEFLATE = TILED + ("COMPRESS=DEFLATE", "PREDICTOR=2")
NO_DATA = object()  # the file declares one

# name, options of the file, edit, state of the levels inside, and of those beside; None: not asked
EDITS = [
    ("touch", TILED, touch, "current", "current"),
    ("copy", TILED, copy, "current", "current"),
    ("georeference", TILED, set_georeference, "current", "current"),
    ("pixel", TILED, edit_pixel, "stale image", "stale image"),
    ("pixel compressed", DEFLATE, edit_pixel, "stale image", "stale image"),
    ("pixel, old time", PLAIN, edit_and_restore_time, "current", "stale image"),
    ("other image", PLAIN, replace_by_another_of_equal_size_and_time, None, "stale image"),
    ("no-data", TILED, set_no_data, "stale no-data", "stale no-data"),
    ("no-data gone", TILED + (NO_DATA,), drop_no_data, "stale no-data", "stale no-data"),
    ("no-data respelled", TILED + (NO_DATA,), respell_no_data, "current", "current"),
    ("mask inside", TILED, add_mask(True), "stale mask", "stale mask"),
    ("mask beside", TILED, add_mask(False), "stale mask", "stale mask"),
    ("palette", TILED + ("PHOTOMETRIC=PALETTE",), set_palette, "stale palette", "stale palette"),
    ("predictor", DEFLATE, patch_tag(317, 1), "stale storage", "stale storage"),
    ("photometric", TILED, patch_tag(262, 0), "stale storage", "stale storage"),
    ("level by gdaladdo", TILED, foreign_overviews, "changed", None),
    ("level by gdaladdo, compressed", DEFLATE, foreign_overviews, "changed", None),
    ("level beside by gdaladdo", TILED, foreign_overviews_beside, None, "changed"),
    ("level by WriteArray", TILED, write_level, "changed", "changed"),
    ("level beside by WriteArray", TILED, write_level_beside, None, "changed"),
]


# format, edit, state of the levels beside
OTHER_EDITS = [
    ("PNG", touch, "current"),
    ("PNG", copy, "current"),
    ("PNG", set_no_data_beside, "stale no-data"),
    ("ENVI", touch, "current"),
    ("ENVI", edit_pixel, "stale image"),
    ("ENVI", edit_and_restore_time, "stale image"),
    ("ENVI", replace_by_another_of_equal_size_and_time, "stale image"),
    ("HFA", touch, "current"),
    ("HFA", edit_pixel, "stale image"),
    ("HFA", set_no_data, "stale no-data"),
]


def answers(path):
    """[state and reason of level 2, of level 4]"""
    return [" ".join(filter(None, (level["state"], level["staleReason"])))
            for level in info(path)["levels"]]


class Edits(Case):
    def make(self, name, options):
        path = self.path(name)
        pixels = random_pixels((1, ROWS, COLUMNS), numpy.uint8, 7)
        no_data = 17 if NO_DATA in options else None
        write_tiff(path, pixels, "Byte", [o for o in options if o is not NO_DATA], no_data)
        return path

    def check(self, name, options, edit, place, expected):
        path = self.make(f"{name.replace(' ', '_')}{place}.tif", options)
        self.assertRan(run("build", path, "--levels", "2,4", "--method", "nearest", place))
        self.assertEqual(["current", "current"], answers(path))
        edit(path)
        for _ in range(2):  # an answer changes no answer
            self.assertEqual(expected, answers(path))
        self.check_made_again(path, expected, place)

    def check_made_again(self, path, expected, place):
        answer = run("build", path, "--levels", "2,4", "--method", "nearest", place)
        self.assertRan(answer)
        self.assertEqual(["current", "current"], answers(path))
        if expected[0] == "changed":
            self.assertIn("another program wrote into them", answer.stderr)
        if expected == ["current", "current"]:
            self.assertIn("nothing to do; already up to date: 2, 4", answer.stdout)

    def test_tiff(self):
        for name, options, edit, inside, beside in EDITS:
            for place, states in zip(PLACES, (inside, beside)):
                if states is None:
                    continue
                # level 4 was computed from level 2
                expected = [states, "stale source-level" if states == "changed" else states]
                with self.subTest(edit=name, place=place):
                    self.check(name, options, edit, place, expected)

    @unittest.skipUnless(READS_ALL_FORMATS, "this build reads TIFF only")
    def test_levels_beside_other_formats(self):
        for driver, edit, expected in OTHER_EDITS:
            with self.subTest(format=driver, edit=edit.__name__):
                path = self.path(f"{driver}_{edit.__name__}.{driver.lower()}")
                memory = gdal.GetDriverByName("MEM").Create("", COLUMNS, ROWS, 1)
                pixels = random_pixels((1, ROWS, COLUMNS), numpy.uint8, 7)
                memory.GetRasterBand(1).WriteArray(pixels[0])
                gdal.GetDriverByName(driver).CreateCopy(path, memory)
                self.check_other(path, edit, expected)

    def check_other(self, path, edit, expected):
        build = ("build", path, "--levels", "2,4", "--method", "nearest", "--external")
        self.assertRan(run(*build))
        self.assertEqual(["current", "current"], answers(path))
        edit(path)
        self.assertEqual([expected, expected], answers(path))
        self.assertRan(run(*build))
        self.assertEqual(["current", "current"], answers(path))


if __name__ == "__main__":
    unittest.main()
