# SPDX-License-Identifier: MIT
"""Other programs write to an image while its levels are built: no level is current and wrong."""

import mmap
import multiprocessing
import os
import random
import tempfile
import time
import unittest

import numpy
from osgeo import gdal

from orin_e2e import Case, info, random_pixels, read_pixels, run, write_tiff

SIZE = 700
ROUNDS = 24      # for each place and folder
LONGEST = 60     # seconds for each of them
FOLDERS = [folder for folder in (None, "/dev/shm") if folder is None or os.access(folder, os.W_OK)]


def strip_start(path):
    """Where the pixels of an uncompressed file stand, which are in one piece."""
    dataset = gdal.Open(path)
    return int(dataset.GetRasterBand(1).GetMetadataItem("BLOCK_OFFSET_0_0", "TIFF"))


def overwrite(path, start, delay, seed):
    """One positioned write of twenty rows after `delay` seconds."""
    rows = numpy.random.default_rng(seed).integers(0, 256, 20 * SIZE, numpy.uint8).tobytes()
    descriptor = os.open(path, os.O_RDWR)
    time.sleep(delay)
    os.pwrite(descriptor, rows, start + (seed * 37 % (SIZE - 20)) * SIZE)
    os.close(descriptor)


def average_of_two(pixels):
    """The slow twin: means of two by two, halves rounded up."""
    sums = pixels.astype(numpy.uint32)
    sums = sums[:, 0::2, 0::2] + sums[:, 1::2, 0::2] + sums[:, 0::2, 1::2] + sums[:, 1::2, 1::2]
    return ((sums + 2) // 4).astype(numpy.uint8)


class Writers(Case):
    def make(self, folder, name):
        path = os.path.join(folder, name)
        write_tiff(path, random_pixels((1, SIZE, SIZE), numpy.uint8, 3), "Byte",
                   ("COMPRESS=NONE", f"BLOCKYSIZE={SIZE}"))
        return path

    def check_claims(self, path):
        """What is called current is what the image gives now."""
        states = [level["state"] for level in info(path)["levels"]]
        if states == ["current"]:
            self.assertSamePixels(average_of_two(read_pixels(path)), read_pixels(path, 0))
        return states

    def build_while_writing(self, path, place, delay, seed):
        """The code of the build, and the states that are told afterwards."""
        writer = multiprocessing.Process(target=overwrite,
                                         args=(path, strip_start(path), delay, seed))
        writer.start()
        answer = run("build", path, "--levels", "2", "--method", "average", place)
        writer.join()
        return answer, self.check_claims(path)

    def check_random_writes(self, folder, place):
        chance = random.Random(11)
        ended = time.monotonic() + LONGEST
        longest = 0.06
        for turn in range(ROUNDS):
            if time.monotonic() > ended and turn >= 8:
                return  # a slow machine; the others were looked at
            path = self.make(folder, f"{turn}.tif")
            started = time.monotonic()
            answer, states = self.build_while_writing(path, place, chance.uniform(0, longest), turn)
            longest = 1.2 * (time.monotonic() - started) / 2 + longest / 2
            if answer.returncode != 0:
                self.assertIn("changed by another program", answer.stderr)
                self.assertNotEqual(["current"], states)
            self.assertRan(run("build", path, "--levels", "2", "--method", "average", place))
            self.assertEqual(["current"], self.check_claims(path))

    def test_a_write_at_any_moment_leaves_no_wrong_level_current(self):
        for folder in FOLDERS:
            for place in ("--internal", "--external"):
                with self.subTest(folder=folder, place=place), \
                        tempfile.TemporaryDirectory(dir=folder) as there:
                    self.check_random_writes(there, place)

    def test_a_mapped_page_that_was_written_before_shows_the_next_write(self):
        """File systems in memory do not tell; see docs/behaviour.md."""
        for place in ("--internal", "--external"):
            with self.subTest(place=place), tempfile.TemporaryDirectory(dir="/var/tmp") as there:
                path = self.make(there, "mapped.tif")
                start = strip_start(path)
                with open(path, "r+b") as file, mmap.mmap(file.fileno(), 0) as pixels:
                    pixels[start:start + SIZE * SIZE] = b"\1" * (SIZE * SIZE)
                    self.assertRan(run("build", path, "--levels", "2", "--method", "average",
                                       place))
                    self.assertEqual(["current"], self.check_claims(path))
                    pixels[start + 300 * SIZE:start + SIZE * SIZE] = b"\xfa" * (400 * SIZE)
                    states = self.check_claims(path)
                    pixels.flush()
                self.assertEqual(["stale"], states)
                self.assertEqual(["stale"], self.check_claims(path))


if __name__ == "__main__":
    unittest.main()
