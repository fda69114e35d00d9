# SPDX-License-Identifier: MIT
"""What the tests of the tool share: running it as a user does, and rasters to run it on."""

import os
import subprocess
import tempfile
import unittest

TOOL = os.environ["ORIN_TOOL"]


def environment(**changes):
    """A user's environment without preferences and without a language of its own."""
    own = ("LANG", "LC_", "ORIN_", "XDG_")
    variables = {name: value for name, value in os.environ.items() if not name.startswith(own)}
    variables.update(ORIN_PREFERENCES="/dev/null", LC_ALL="C.UTF-8", TERM="xterm")
    variables.update({name: str(value) for name, value in changes.items()})
    return variables


def run(*arguments, **changes):
    """The completed process of the tool, its output as text."""
    return subprocess.run([TOOL, *map(str, arguments)], capture_output=True, text=True,
                          env=environment(**changes), timeout=240, stdin=subprocess.DEVNULL)


class Case(unittest.TestCase):
    """A test with a folder of its own."""

    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.folder = folder.name

    def path(self, name, text=None):
        """The path of a file in the folder, written when a text is given."""
        path = os.path.join(self.folder, name)
        if text is not None:
            with open(path, "w", encoding="utf-8") as file:
                file.write(text)
        return path

    def assertRan(self, answer, code):
        self.assertEqual(code, answer.returncode, answer.stdout + answer.stderr)


def contents(path):
    """The bytes of a file."""
    with open(path, "rb") as file:
        return file.read()


def write_raster(path, columns, rows, channels=1, type_name="Byte", options=()):
    """Writes a TIFF with GDAL whose pixels differ everywhere."""
    import numpy
    from osgeo import gdal
    gdal.UseExceptions()
    dataset = gdal.GetDriverByName("GTiff").Create(
        str(path), columns, rows, channels, gdal.GetDataTypeByName(type_name), list(options))
    for channel in range(channels):
        across = (numpy.arange(columns) * 7 + channel).astype(numpy.uint8)
        down = (numpy.arange(rows) * 13).astype(numpy.uint8)
        dataset.GetRasterBand(channel + 1).WriteArray(numpy.add.outer(down, across))
    dataset.FlushCache()
    del dataset
    return str(path)
