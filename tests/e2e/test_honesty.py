# SPDX-License-Identifier: MIT
"""What commonly goes wrong with pyramids: each ends with a failure, and `info` tells the truth."""

import os
import resource
import signal
import subprocess
import time

import numpy
from osgeo import gdal

from orin_e2e import (Case, TOOL, info, nearest, overview_sizes, random_pixels, read_pixels, run,
                      write_tiff)

SIZE = 3000
TILED = ["TILED=YES", "COMPRESS=DEFLATE", "BLOCKXSIZE=256", "BLOCKYSIZE=256"]


class Honesty(Case):
    def setUp(self):
        super().setUp()
        self.file = self.path("scene.tif")
        self.pixels = random_pixels((3, SIZE, SIZE), numpy.uint8, 5)
        write_tiff(self.file, self.pixels, "Byte", TILED)

    def assertHonest(self):
        r"""GDAL lists what `info` lists; the channels that `info` calls valid are right, and in a
        level that it calls current these are all.

        \returns the current levels
        """
        self.assertSamePixels(self.pixels, read_pixels(self.file))
        levels = info(self.file)["levels"]
        factors = [level["level"] for level in levels]
        self.assertEqual([(SIZE // f, SIZE // f) for f in factors], overview_sizes(self.file))
        current = []
        for position, level in enumerate(levels):
            self.assertIn(level["state"], ("current", "unfinished"))
            valid = [channel["valid"] for channel in level["channels"]]
            self.assertEqual(level["state"] == "current", all(valid))
            expected = nearest(self.pixels, 1, level["level"], (SIZE, SIZE))
            self.assertSamePixels(expected[valid], read_pixels(self.file, position)[valid])
            current += [level["level"]] if all(valid) else []
        return current

    def assertContinues(self, place):
        self.assertRan(run("build", self.file, place, "--levels", "2,4,8", "--method", "nearest"))
        self.assertEqual([2, 4, 8], self.assertHonest())

    def build(self, place, **options):
        arguments = ["build", self.file, place, "--levels", "2,4,8", "--method", "nearest"]
        return subprocess.Popen([TOOL, *arguments], stdout=subprocess.PIPE, text=True,
                                stderr=subprocess.PIPE, **options,
                                env=dict(os.environ, ORIN_PREFERENCES="/dev/null", LC_ALL="C"))

    def bytes_there(self):
        return sum(os.path.getsize(self.path(name)) for name in os.listdir(self.folder))

    def test_a_build_that_is_stopped_by_a_signal(self):
        for place in ("--internal", "--external"):
            for number in (signal.SIGINT, signal.SIGTERM):
                with self.subTest(place=place, signal=number):
                    self.assertRan(run("clean", self.file))
                    before = self.bytes_there()
                    process = self.build(place)
                    while process.poll() is None and self.bytes_there() < before + 500000:
                        time.sleep(0.001)
                    process.send_signal(number)
                    _, errors = process.communicate()
                    self.assertEqual(130, process.returncode, errors)
                    self.assertNotIn(8, self.assertHonest())
                    self.assertContinues(place)

    def test_a_disk_that_is_full(self):
        for place in ("--internal", "--external"):
            with self.subTest(place=place):
                self.assertRan(run("clean", self.file))
                base = os.path.getsize(self.file) if place == "--internal" else 0
                most = base + 1500000  # bytes; level 2 takes more
                process = self.build(place, preexec_fn=lambda: resource.setrlimit(
                    resource.RLIMIT_FSIZE, (most, most)))
                _, errors = process.communicate()
                self.assertEqual(5, process.returncode)
                self.assertIn(self.file, errors)
                self.assertRegex(errors, "too large|No space")
                self.assertEqual([], self.assertHonest())
                self.assertContinues(place)

    def test_a_tile_that_is_damaged(self):
        dataset = gdal.Open(self.file)
        offset = int(dataset.GetRasterBand(1).GetMetadataItem("BLOCK_OFFSET_7_9", "TIFF"))
        del dataset
        with open(self.file, "r+b") as file:
            file.seek(offset + 40)
            right = file.read(300)
            file.seek(offset + 40)
            file.write(b"\xff" * 300)
        for place in ("--internal", "--external"):
            with self.subTest(place=place):
                answer = run("build", self.file, place, "--levels", "2,4", "--method", "nearest")
                self.assertRan(answer, 5)
                self.assertIn(self.file, answer.stderr)
                self.assertEqual([], info(self.file)["levels"])
                self.assertEqual([], overview_sizes(self.file))
        with open(self.file, "r+b") as file:
            file.seek(offset + 40)
            file.write(right)
        self.assertContinues("--external")

    def test_an_image_that_is_edited(self):
        for place in ("--internal", "--external"):
            with self.subTest(place=place):
                self.assertRan(run("clean", self.file))
                self.assertContinues(place)
                dataset = gdal.Open(self.file, gdal.GA_Update)
                self.pixels[1, 1700, 900] ^= 0x55
                dataset.GetRasterBand(2).WriteArray(self.pixels[1, 1700:1701, 900:901], 900, 1700)
                del dataset
                answer = run("info", self.file)
                self.assertRan(answer, 3)
                self.assertEqual(3, answer.stdout.count(" stale "), answer.stdout)
                self.assertEqual({"stale"}, {e["state"] for e in info(self.file)["levels"]})
                answer = run("build", self.file, place, "--levels", "2,4,8", "--method", "nearest")
                self.assertRan(answer)
                self.assertIn("Rebuilding levels 2, 4, 8: they no longer match the image.",
                              answer.stderr)
                self.assertEqual([2, 4, 8], self.assertHonest())
                self.assertRan(run("info", self.file))
