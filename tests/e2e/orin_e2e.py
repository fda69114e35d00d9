# SPDX-License-Identifier: MIT
"""What the end-to-end tests share: making rasters, running the tool, reading levels with GDAL."""

import json
import os
import subprocess
import tempfile
import time
import unittest

import numpy
from osgeo import gdal

gdal.UseExceptions()

TOOL = os.environ["ORIN_TOOL"]
# As the tool was configured: without the GDAL library it reads TIFF alone. Never found out by
# trying, or a tool that fails would have its tests skipped.
READS_ALL_FORMATS = os.environ.get("ORIN_FORMATS", "all") == "all"
NUMPY_TYPES = {
    "Byte": numpy.uint8, "UInt16": numpy.uint16, "Int16": numpy.int16, "UInt32": numpy.uint32,
    "Int32": numpy.int32, "Float32": numpy.float32, "Float64": numpy.float64,
    "UInt64": numpy.uint64, "Int64": numpy.int64, "CFloat32": numpy.complex64,
    "CFloat64": numpy.complex128,
}


def keep_files_in_memory():
    """For tests whose hundreds of runs sync what they write: not to a disk."""
    if os.access("/dev/shm", os.W_OK):
        tempfile.tempdir = "/dev/shm"


def run(*arguments, environment=None, **options):
    """Runs the tool; its completed process with text output."""
    full = dict(os.environ, ORIN_PREFERENCES="/dev/null", LC_ALL="C", **(environment or {}))
    return subprocess.run([TOOL, *map(str, arguments)], capture_output=True, text=True, env=full,
                          timeout=240, **options)


def kill_build(delay, file, arguments):
    """Starts a build and kills it after `delay` seconds. True when it was still running."""
    environment = dict(os.environ, ORIN_PREFERENCES="/dev/null")
    process = subprocess.Popen([TOOL, "build", file, *arguments], env=environment,
                               stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
    time.sleep(delay)
    running = process.poll() is None
    process.kill()
    process.wait()
    return running


def info(path):
    """What `info --json` says of a file."""
    answer = run("info", "--json", path)
    told = json.loads(answer.stdout) if answer.stdout else None
    states = [level["state"] for level in told["levels"]] if told else []
    is_due = any(state in ("stale", "changed", "unfinished") for state in states)
    is_due = is_due or (told is not None and told["leftOver"] is not None)
    assert answer.returncode == (3 if is_due else 0), answer.stdout + answer.stderr
    return told


def random_pixels(shape, dtype, seed):
    """Values over the whole range of the type, shape (channels, rows, columns)."""
    generator = numpy.random.default_rng(seed)
    if numpy.issubdtype(dtype, numpy.complexfloating):
        return (generator.normal(size=shape) + 1j * generator.normal(size=shape)).astype(dtype)
    if numpy.issubdtype(dtype, numpy.floating):
        return generator.normal(scale=1000, size=shape).astype(dtype)
    limits = numpy.iinfo(dtype)
    return generator.integers(limits.min, limits.max, shape, dtype, endpoint=True)


def random_opaque_pixels(shape, dtype, seed):
    """The same with an alpha channel, the last one, of which no pixel is transparent."""
    pixels = random_pixels(shape, dtype, seed)
    pixels[-1] = numpy.maximum(pixels[-1], 1)
    return pixels


def write_tiff(path, pixels, type_name, options=(), no_data=None):
    """Writes pixels of shape (channels, rows, columns) with GDAL."""
    channels, rows, columns = pixels.shape
    driver = gdal.GetDriverByName("GTiff")
    dataset = driver.Create(str(path), columns, rows, channels,
                            gdal.GetDataTypeByName(type_name), list(options))
    for index in range(channels):
        band = dataset.GetRasterBand(index + 1)
        if no_data is not None:
            band.SetNoDataValue(no_data)
        band.WriteArray(pixels[index])
    dataset.FlushCache()
    del band, dataset


def read_pixels(path, level_index=None):
    """Pixels of the image, or of the n-th overview that GDAL lists: (channels, rows, columns)."""
    dataset = gdal.Open(str(path))
    bands = [dataset.GetRasterBand(i + 1) for i in range(dataset.RasterCount)]
    if level_index is not None:
        bands = [band.GetOverview(level_index) for band in bands]
    return numpy.stack([band.ReadAsArray() for band in bands])


def overview_sizes(path):
    """(columns, rows) of the overviews that GDAL lists."""
    dataset = gdal.Open(str(path))  # has to outlive its bands
    band = dataset.GetRasterBand(1)
    return [(band.GetOverview(i).XSize, band.GetOverview(i).YSize)
            for i in range(band.GetOverviewCount())]


def nearest(source, source_level, level, full_size):
    """The slow twin of nearest neighbour: level `level` from level `source_level`."""
    ratio = source_level / level
    columns, rows = full_size[0] // level, full_size[1] // level
    ys = [min(int(j / ratio), source.shape[1] - 1) for j in range(rows)]
    xs = [min(int(i / ratio), source.shape[2] - 1) for i in range(columns)]
    return source[:, ys][:, :, xs]


class Case(unittest.TestCase):
    """A test with a folder of its own."""

    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.folder = folder.name

    def path(self, name):
        return os.path.join(self.folder, name)

    def assertRan(self, answer, code=0):
        self.assertEqual(answer.returncode, code, answer.stdout + answer.stderr)

    def assertSamePixels(self, expected, actual):
        self.assertEqual(expected.dtype, actual.dtype)
        self.assertEqual(expected.shape, actual.shape)
        self.assertEqual(expected.tobytes(), actual.tobytes())
