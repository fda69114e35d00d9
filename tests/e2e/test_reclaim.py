# SPDX-License-Identifier: MIT
"""Space is given back whatever the file is like, and however often the program was killed while it
did so: after the next command that succeeds the file is about as long as a fresh build."""

import os
import random
import shutil
import subprocess
import unittest

import numpy
from osgeo import gdal

import disklog  # first: it says where the files go
from mask_case import write_mask
from orin_e2e import (Case, info, overview_sizes, random_pixels, read_pixels, run, write_tiff)

SIZE = (330, 290)  # columns, rows
CHANGING = ("pwrite", "fsync", "ftruncate", "rename", "unlink", "open", "futimens")


def smooth_pixels(channels=1):
    """Waves with noise in one half: how well they compress depends on the method."""
    shape = (channels, SIZE[1], SIZE[0])
    numbers, rows, columns = numpy.indices(shape)
    waves = 100 + 60 * numpy.sin(columns / 9 + numbers) + 60 * numpy.cos(rows / 7)
    noise = numpy.random.default_rng(4).integers(-30, 31, shape) * (columns > SIZE[0] // 2)
    return numpy.clip(waves + noise, 1, 255).astype(numpy.uint8)


def write_deflated(file):
    write_tiff(file, smooth_pixels(), "Byte", ["COMPRESS=DEFLATE"])


def write_cog(file):
    write_tiff(file + ".source", smooth_pixels(), "Byte")
    gdal.Translate(file, file + ".source", format="COG",
                   creationOptions=["BLOCKSIZE=128", "OVERVIEWS=NONE", "COMPRESS=DEFLATE"])
    os.remove(file + ".source")


def write_pages(file):
    """Two pages of one size."""
    write_deflated(file)
    write_deflated(file + ".source")
    gdal.Translate(file, file + ".source", format="GTiff",
                   creationOptions=["APPEND_SUBDATASET=YES", "COMPRESS=LZW"])
    os.remove(file + ".source")


def write_trailed(file):
    """Somebody's signature behind the TIFF."""
    write_deflated(file)
    with open(file, "ab") as stream:
        stream.write(b"signature" * 101)


def write_with_foreign_level(file):
    write_deflated(file)
    subprocess.run(["gdaladdo", "-q", "-r", "average", file, "4"], check=True)


def write_masked(file):
    write_deflated(file)
    valid = numpy.ones((SIZE[1], SIZE[0]), bool)
    valid[:SIZE[1] // 2, :SIZE[0] // 2] = False
    write_mask(file, valid, inside=True)


KINDS = {"deflated": write_deflated, "cog": write_cog, "pages": write_pages,
         "trailed": write_trailed, "foreign": write_with_foreign_level, "masked": write_masked}


class Reclaimed(Case):
    def test_cleaning_leaves_the_size_of_before_in_any_file(self):
        for kind, write in KINDS.items():
            if kind == "foreign":
                continue
            for levels in ("2,4,8", "2"):
                with self.subTest(kind=kind, levels=levels):
                    file = self.path(f"{kind}{levels}.tif")
                    write(file)
                    size, pixels = os.path.getsize(file), read_pixels(file)
                    for _ in range(3):
                        self.assertRan(run("build", file, "--internal", "--levels", levels))
                        self.assertGreater(os.path.getsize(file), size)
                        self.assertRan(run("clean", file))
                        self.assertEqual(size, os.path.getsize(file))
                        self.assertSamePixels(pixels, read_pixels(file))

    def test_cleaning_some_levels_leaves_no_gap_in_any_file(self):
        for kind, write in KINDS.items():
            with self.subTest(kind=kind):
                file = self.path(kind + ".tif")
                write(file)
                pixels = read_pixels(file)
                self.assertRan(run("build", file, "--internal", "--levels", "8,16"))
                size = os.path.getsize(file)
                for _ in range(3):
                    self.assertRan(run("build", file, "--internal", "--levels", "2"))
                    self.assertRan(run("clean", file, "--levels", "2"))
                    self.assertLessEqual(os.path.getsize(file), 1.04 * size + 128)
                    self.assertSamePixels(pixels, read_pixels(file))

    def test_levels_round_those_of_another_program_go_without_a_trace(self):
        file = self.path("round.tif")
        write_deflated(file)
        size, pixels = os.path.getsize(file), read_pixels(file)
        for _ in range(3):
            self.assertRan(run("build", file, "--levels", "2"))
            subprocess.run(["gdaladdo", "-q", file, "4"], check=True)
            self.assertRan(run("build", file, "--levels", "8"))
            self.assertRan(run("clean", file))
            self.assertEqual([], overview_sizes(file))
            self.assertLessEqual(os.path.getsize(file), size + 2)
            self.assertSamePixels(pixels, read_pixels(file))


class Killed(Case):
    """Commands that are killed at a system call, several times in a row, and then succeed."""

    def setUp(self):
        super().setUp()
        self.original = self.path("original")
        os.mkdir(self.original)
        self.image = os.path.join(self.original, "image.tif")

    def fresh_size(self, write, build, grown):
        folder = self.path("fresh")
        os.mkdir(folder)
        file = os.path.join(folder, "image.tif")
        write(file)
        if build:
            self.assertRan(run(build[0], file, *build[1:]))
        return os.path.getsize(file + grown) if os.path.exists(file + grown) else 0

    def calls_of(self, command):
        """The calls that change something in an undisturbed run."""
        folder = self.path("undisturbed")
        shutil.copytree(self.original, folder)
        calls = self.path("calls")
        self.assertRan(disklog.run(folder, command[0], os.path.join(folder, "image.tif"),
                                   *command[1:], calls=calls))
        return [(name, number) for name, number, _ in disklog.calls_in(calls)
                if name in CHANGING]

    def levels_of(self, image):
        return {SIZE[0] // columns: read_pixels(image, index).tobytes()
                for index, (columns, _) in enumerate(overview_sizes(image))}

    def check_chain(self, command, kills, limit, grown):
        folder = self.path("-".join("".join(map(str, kill)) for kill in kills))
        shutil.copytree(self.original, folder)
        image = os.path.join(folder, "image.tif")
        killed = 0
        for name, number in kills:
            answer = disklog.run(folder, command[0], image, *command[1:],
                                 fault=f"{name} {number} kill")
            killed += answer.returncode != 0
            self.assertIn(answer.returncode, (-9, 0), answer.stderr)
            self.assertEqual(self.pixels, read_pixels(image).tobytes())
        self.assertRan(run(command[0], image, *command[1:]))
        self.assertEqual(self.pixels, read_pixels(image).tobytes())
        self.assertEqual(self.levels, self.levels_of(image))
        size = os.path.getsize(image + grown) if os.path.exists(image + grown) else 0
        self.assertLessEqual(size, 1.1 * limit + 4096, kills)
        self.assertEqual([], [name for name in os.listdir(folder) if name.endswith(".partial")])
        shutil.rmtree(folder)
        return killed

    def check(self, command, limit, grown="", chains=40):
        """Each call once, then chains of up to five kills, in the first run and in those that take
        up its work."""
        self.pixels = read_pixels(self.image).tobytes()
        calls = self.calls_of(command)
        self.levels = self.levels_of(os.path.join(self.path("undisturbed"), "image.tif"))
        self.assertGreater(len(calls), 10)
        numbers = random.Random(7)
        kills = [[call] for call in calls]
        kills += [[numbers.choice(calls) for _ in range(numbers.randint(2, 5))]
                  for _ in range(chains)]
        truncations = [call for call in calls if call[0] == "ftruncate"]
        kills += [[call] * 5 for call in truncations[:2]]
        answers = disklog.check_at_once(self, {
            str(chain): lambda chain=chain: self.check_chain(command, chain, limit, grown)
            for chain in kills})
        self.assertGreater(sum(answers.values()), len(calls) // 2)

    def test_rebuilds_of_levels_that_get_longer(self):
        write_deflated(self.image)
        self.assertRan(run("build", self.image, "--levels", "2,4", "--method", "nearest"))
        command = ("build", "--levels", "2,4", "--method", "bicubic", "--force")
        self.check(command, self.fresh_size(write_deflated, command, ""))

    def test_rebuilds_beside_the_file(self):
        write_masked(self.image)
        self.assertRan(run("build", self.image, "--levels", "2,4", "--external", "--method",
                           "average"))
        command = ("build", "--levels", "2,4", "--external", "--method", "nearest", "--force")
        self.check(command, self.fresh_size(write_masked, command, ".ovr"), ".ovr")

    def test_removal_of_all_levels(self):
        for kind in ("cog", "pages", "trailed"):
            with self.subTest(kind=kind):
                KINDS[kind](self.image)
                limit = os.path.getsize(self.image)
                self.assertRan(run("build", self.image, "--internal", "--levels", "2,4"))
                self.check(("clean",), limit, chains=10)
                for folder in ("undisturbed", "original"):
                    shutil.rmtree(self.path(folder))
                os.mkdir(self.original)

    def test_removal_of_the_largest_level(self):
        write_deflated(self.image)
        self.assertRan(run("build", self.image, "--levels", "4,2,8"))
        build = ("build", "--levels", "4,8")
        self.check(("clean", "--levels", "2"), self.fresh_size(write_deflated, build, ""))


if __name__ == "__main__":
    unittest.main()
