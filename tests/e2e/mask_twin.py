# SPDX-License-Identifier: MIT
"""The slow twin of masks: which pixels of a level a method fills for want of valid ones."""

import contextlib
import math

import numpy
from osgeo import gdal

@contextlib.contextmanager
def masks_inside(inside):
    """Masks that GDAL makes meanwhile stand inside a TIFF, or beside it."""
    gdal.SetConfigOption("GDAL_TIFF_INTERNAL_MASK", "YES" if inside else "NO")
    yield
    gdal.SetConfigOption("GDAL_TIFF_INTERNAL_MASK", None)


METHODS = ("nearest", "average", "mode", "bilinear", "bicubic")


def centre(method, at, ratio, limit):
    """The source pixel on which it depends whether destination pixel `at` gets data."""
    if method in ("bilinear", "bicubic"):
        return min(max(math.floor((at + 0.5) / ratio - 0.5), 0), limit - 1)
    return min(int(at / ratio), limit - 1)


def level_validity(valid, source_level, level, full_size, method, channels):
    """Validity of `level` from that of `source_level`: arrays of bool, (rows, columns)."""
    columns, rows = full_size[0] // level, full_size[1] // level
    factor = level / source_level
    if method == "average" and channels == 1 and factor in (2, 3):
        factor = int(factor)
        needed = 2 if factor == 2 else 5
        squares = valid[:rows * factor, :columns * factor]
        squares = squares.reshape(rows, factor, columns, factor)
        return squares.sum(axis=(1, 3)) >= needed
    ratio = source_level / level
    ys = [centre(method, j, ratio, valid.shape[0]) for j in range(rows)]
    xs = [centre(method, i, ratio, valid.shape[1]) for i in range(columns)]
    return valid[ys][:, xs]


def disc(columns, rows):
    """Valid inside a disc, with a hole and a diagonal line of single pixels cut out."""
    y, x = numpy.mgrid[0:rows, 0:columns]
    inside = (x - columns / 2) ** 2 + (y - rows / 2) ** 2 < (min(columns, rows) * 0.45) ** 2
    inside &= ~((abs(x - columns // 3) < 9) & (abs(y - rows // 2) < 7))
    return inside & (x - y != 11)


def masks_of_levels(path):
    """The masks that GDAL reads with the levels of channel 1, arrays of bool; None for a level
    that has no mask of its own size, but alpha for example."""
    dataset = gdal.Open(str(path))
    band = dataset.GetRasterBand(1)
    masks = []
    for i in range(band.GetOverviewCount()):
        level = band.GetOverview(i)
        mask = level.GetMaskBand()
        own = level.GetMaskFlags() == gdal.GMF_PER_DATASET and mask.XSize == level.XSize
        masks.append(mask.ReadAsArray() > 0 if own else None)
    return masks
