# SPDX-License-Identifier: MIT
"""What the tests of masks share: rasters with masks, and what their levels must look like."""

import os
import re
import subprocess

import numpy
from osgeo import gdal

from mask_twin import level_validity, disc, masks_inside, masks_of_levels
from orin_e2e import Case, NUMPY_TYPES, read_pixels, run, write_tiff

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


def write_mask_beside(file, valid, flags="2"):
    mask = file + ".msk"
    write_tiff(mask, valid[None].astype(numpy.uint8) * 255, "Byte")
    dataset = gdal.Open(mask, gdal.GA_Update)
    if flags:
        dataset.SetMetadataItem("INTERNAL_MASK_FLAGS_1", flags)
    dataset.FlushCache()
    del dataset
    os.replace(mask, file + ".msk")


class MaskCase(Case):
    def make(self, name, inside=True, channels=3, valid=None, outside=0, dtype="Byte",
             options=TILED):
        valid = disc(WIDTH, HEIGHT) if valid is None else valid
        file = self.path(name)
        pixels = picture(valid, channels, NUMPY_TYPES[dtype], outside)
        write_tiff(file, pixels, dtype, options)
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
