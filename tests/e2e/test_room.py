# SPDX-License-Identifier: MIT
"""Files too large for a classic TIFF, and disks too small: known before the first byte."""

import os
import struct
import subprocess
import unittest

import numpy
from osgeo import gdal

from orin_e2e import (Case, info, nearest, overview_sizes, random_pixels, read_pixels, run,
                      write_tiff)

CLASSIC = 1 << 32


def kind(path):
    """42 for a classic TIFF, 43 for a BigTIFF."""
    with open(path, "rb") as file:
        return struct.unpack("<H", file.read(4)[2:])[0]


def write_sparse(path, edge, *options):
    """An image of which no tile is stored."""
    gdal.GetDriverByName("GTiff").Create(str(path), edge, edge, 1, gdal.GDT_Byte,
                                         ["SPARSE_OK=TRUE", "TILED=YES", *options])


def write_huge(path, edge, strip_rows):
    """A BigTIFF of float64 pixels all of whose strips share the same few bytes of a sparse file."""
    strips = edge // strip_rows
    tags = [(256, 4, 1, edge), (257, 4, 1, edge), (258, 3, 1, 64), (259, 3, 1, 1), (262, 3, 1, 1),
            (273, 16, strips, 4096), (277, 3, 1, 1), (278, 4, 1, strip_rows),
            (279, 16, strips, 4096 + 8 * strips), (339, 3, 1, 3)]
    pixels = 4096 + 16 * strips
    with open(path, "wb") as file:
        file.write(struct.pack("<2sHHHQ", b"II", 43, 8, 0, 16))
        file.write(struct.pack("<Q", len(tags)))
        for tag in tags:
            file.write(struct.pack("<HHQQ", *tag))
        file.write(struct.pack("<Q", 0))
        file.seek(4096)
        file.write(struct.pack("<Q", pixels) * strips)
        file.write(struct.pack("<Q", edge * strip_rows * 8) * strips)
        file.truncate(pixels + edge * strip_rows * 8)


class FourGiB(Case):
    def setUp(self):
        super().setUp()
        self.file = self.path("scene.tif")
        self.pixels = random_pixels((1, 2000, 2000), numpy.uint8, 1)

    def write(self, room):
        """A classic TIFF with that many bytes left to its limit."""
        write_tiff(self.file, self.pixels, "Byte", ["TILED=YES", "BIGTIFF=NO"])
        os.truncate(self.file, CLASSIC - room)

    def test_levels_that_could_pass_the_limit_go_beside_the_file_and_the_reason_is_told(self):
        self.write(1_000_000)
        answer = run("build", self.file)
        self.assertRan(answer)
        self.assertIn(f"{self.file}: could pass 4 GiB, the limit of a classic TIFF", answer.stderr)
        self.assertIn("beside it instead", answer.stderr)
        self.assertEqual(CLASSIC - 1_000_000, os.path.getsize(self.file))
        self.assertEqual({self.file + ".ovr"}, {l["file"] for l in info(self.file)["levels"]})
        self.assertSamePixels(nearest(self.pixels, 1, 2, (2000, 2000)), read_pixels(self.file, 0))
        again = run("build", self.file)
        self.assertRan(again)
        self.assertIn("nothing to do", again.stdout)
        self.assertEqual("", again.stderr)

    def test_internal_fails_before_the_first_byte(self):
        self.write(1_000_000)
        before = os.stat(self.file)
        answer = run("build", self.file, "--internal", "--levels", "16,2")
        self.assertRan(answer, 5)
        self.assertIn("could pass 4 GiB", answer.stderr)
        self.assertIn("--external", answer.stderr)
        after = os.stat(self.file)
        self.assertEqual((before.st_size, before.st_mtime_ns), (after.st_size, after.st_mtime_ns))
        self.assertEqual([], info(self.file)["levels"])

    def test_levels_that_fit_below_the_limit_stay_inside(self):
        self.write(3_000_000)
        answer = run("build", self.file)
        self.assertRan(answer)
        self.assertEqual("", answer.stderr)
        self.assertGreater(CLASSIC, os.path.getsize(self.file))
        self.assertEqual([(1000, 1000), (500, 500), (250, 250)], overview_sizes(self.file))

    def test_a_side_car_is_a_bigtiff_when_its_levels_could_pass_the_limit(self):
        file = self.path("huge.tif")
        for edge, options, expected in ((66000, [], 42), (130000, [], 43),
                                        (130000, ["BIGTIFF=YES"], 43), (500, ["BIGTIFF=YES"], 43),
                                        (80000, ["BIGTIFF=IF_SAFER"], 43),
                                        (80000, ["BIGTIFF=IF_NEEDED"], 42),
                                        (66000, ["BIGTIFF=NO"], 42)):
            with self.subTest(edge=edge, options=options):
                write_sparse(file, edge, "BIGTIFF=YES")
                arguments = [argument for option in options for argument in ("--co", option)]
                level = 64 if edge > 500 else 2
                self.assertRan(run("build", file, "--external", "--levels", level, *arguments))
                self.assertEqual(expected, kind(file + ".ovr"))
                self.assertEqual([(edge // level, edge // level)], overview_sizes(file))
                os.remove(file + ".ovr")

    def test_a_classic_side_car_that_would_be_too_small_is_refused_before_it_is_made(self):
        file = self.path("huge.tif")
        write_sparse(file, 140000, "BIGTIFF=YES")
        answer = run("build", file, "--external", "--co", "BIGTIFF=NO")
        self.assertRan(answer, 5)
        self.assertIn("BIGTIFF=NO", answer.stderr)
        self.assertEqual(["huge.tif"], os.listdir(self.folder))

    def test_a_classic_side_car_without_room_says_what_to_do(self):
        write_tiff(self.file, self.pixels, "Byte")
        self.assertRan(run("build", self.file, "--external", "--levels", "8"))
        os.truncate(self.file + ".ovr", CLASSIC - 100_000)
        answer = run("build", self.file, "--external")
        self.assertRan(answer, 5)
        self.assertIn(f"{self.file}.ovr: could pass 4 GiB", answer.stderr)
        self.assertIn("Delete the side-car", answer.stderr)
        self.assertEqual([8], [level["level"] for level in info(self.file)["levels"]])


class FreeSpace(Case):
    def test_levels_for_which_no_disk_is_large_enough_are_refused(self):
        file = self.path("huge.tif")
        write_huge(file, 1 << 22, 1 << 10)  # level 2: 32 TiB
        size = os.path.getsize(file)
        for place in ("--internal", "--external"):
            answer = run("build", file, place, "--levels", "2", "--co", "COMPRESS=NONE")
            self.assertRan(answer, 5)
            self.assertRegex(answer.stderr, r"the levels need about 35\d{12} bytes")
            self.assertIn("are free", answer.stderr)
            self.assertEqual(size, os.path.getsize(file))
            self.assertEqual(["huge.tif"], os.listdir(self.folder))

    def small_disk(self):
        """The folder of a disk of 3 MiB."""
        disk = self.path("disk")
        os.mkdir(disk)
        mounted = subprocess.run(["mount", "-t", "tmpfs", "-o", "size=3m", "tmpfs", disk],
                                 capture_output=True, check=False)
        if mounted.returncode != 0:
            self.skipTest("file systems cannot be mounted here")
        self.addCleanup(subprocess.run, ["umount", disk], check=True)
        return disk

    def test_a_small_disk_is_found_too_small_before_the_first_byte(self):
        disk = self.small_disk()
        file = os.path.join(disk, "scene.tif")
        pixels = random_pixels((1, 1400, 1500), numpy.uint8, 2)
        write_tiff(file, pixels, "Byte", ["TILED=YES"])
        with open(os.path.join(disk, "other"), "wb") as other:
            other.write(bytes(300_000))
        with open(file, "rb") as opened:
            before = opened.read()
        for place in ("--internal", "--external"):
            answer = run("build", file, place)
            self.assertRan(answer, 5)
            self.assertRegex(answer.stderr, r"need about \d{6} bytes .* \d+ bytes .* are free")
            with open(file, "rb") as opened:
                self.assertEqual(before, opened.read())
            self.assertEqual(["other", "scene.tif"], sorted(os.listdir(disk)))
        self.assertRan(run("build", file, "--levels", "4"))  # that much is free
        self.assertSamePixels(nearest(pixels, 1, 4, (1500, 1400)), read_pixels(file, 0))

    def test_a_small_disk_is_found_too_small_for_levels_of_an_erdas_imagine_file(self):
        disk = self.small_disk()
        pixels = random_pixels((1, 1400, 1200), numpy.uint8, 2)
        for options in ([], ["COMPRESSED=YES"]):
            with self.subTest(options):
                file = os.path.join(disk, "scene.img")
                dataset = gdal.GetDriverByName("HFA").Create(file, 1200, 1400, 1, gdal.GDT_Byte,
                                                             options)
                dataset.GetRasterBand(1).WriteArray(pixels[0])
                del dataset
                self.assertRan(run("build", file, "--levels", "4", "--method", "nearest"))
                with open(os.path.join(disk, "other"), "wb") as other:
                    free = os.statvfs(disk)
                    other.write(bytes(free.f_bavail * free.f_bsize - 200_000))
                with open(file, "rb") as opened:
                    before = opened.read()
                for levels in (["2"], ["2,4", "--force"]):
                    answer = run("build", file, "--levels", *levels, "--method", "nearest")
                    self.assertRan(answer, 5)
                    self.assertRegex(answer.stderr,
                                     r"scene.img: the levels need about \d{6} bytes .* are free")
                    with open(file, "rb") as opened:
                        self.assertEqual(before, opened.read())
                    self.assertEqual(["other", "scene.img"], sorted(os.listdir(disk)))
                self.assertRan(run("build", file, "--levels", "4", "--method", "nearest",
                                   "--force"))  # that much is free
                self.assertSamePixels(nearest(pixels, 1, 4, (1200, 1400)), read_pixels(file, 0))
                os.remove(file)
                os.remove(os.path.join(disk, "other"))


if __name__ == "__main__":
    unittest.main()
