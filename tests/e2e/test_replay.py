# SPDX-License-Identifier: MIT
"""What is on disk between any two system calls of the tool, and after a power loss that swallowed
a write which was not synced: the image is what it was, no level lies, the same command finishes."""

import os
import shutil
import unittest

import numpy

import disklog  # first: it says where the files go
from orin_e2e import Case, info, overview_sizes, random_pixels, read_pixels, run, write_tiff

SIZE = (50, 40)  # columns, rows: four tiles of 16 pixels in level 2, one in level 4
LEVELS = "2,4"
KINDS = {
    "classic": ["TILED=YES", "BLOCKXSIZE=16", "BLOCKYSIZE=16"],
    "big_endian_bigtiff": ["TILED=YES", "BLOCKXSIZE=16", "BLOCKYSIZE=16", "BIGTIFF=YES",
                           "ENDIANNESS=BIG", "COMPRESS=DEFLATE"],
}


class Replayed(Case):
    name = "image.tif"

    def setUp(self):
        super().setUp()
        self.pixels = random_pixels((2, SIZE[1], SIZE[0]), numpy.uint8, 8)
        self.original = os.path.join(self.folder, "original")
        self.recorded = os.path.join(self.folder, "recorded")
        self.replayed = os.path.join(self.folder, "replayed")
        os.mkdir(self.original)

    def record(self, *arguments):
        """Runs the tool on a copy of the original folder; the changes that it made."""
        shutil.copytree(self.original, self.recorded)
        log = self.path("log")
        self.assertRan(disklog.run(self.recorded, *arguments[:1],
                                   os.path.join(self.recorded, self.name), *arguments[1:],
                                   log=log))
        return disklog.changes_in(log)

    def replay(self, changes):
        """A fresh copy of the original folder with these changes made; the image in it."""
        shutil.rmtree(self.replayed, ignore_errors=True)
        shutil.copytree(self.original, self.replayed)
        names = {}  # a file goes on under the name that it was given
        for change in changes:
            change.apply(lambda path: names.get(path, path).replace(self.recorded, self.replayed))
            if change.name == "rename":
                names[change.paths[0]] = change.paths[1]
        return os.path.join(self.replayed, self.name)

    def levels(self, image):
        """{factor: pixels} as GDAL reads them."""
        return {SIZE[0] // columns: read_pixels(image, index)
                for index, (columns, _) in enumerate(overview_sizes(image))}

    def valid(self, image):
        return [entry["level"] for entry in info(image)["levels"]
                if all(channel["valid"] for channel in entry["channels"])]

    def check(self, changes, arguments, expected, what):
        """expected: {factor: pixels} of an undisturbed run; `what` says where it was stopped."""
        with self.subTest(what):
            image = self.replay(changes)
            self.assertSamePixels(self.pixels, read_pixels(image))
            there = self.levels(image)
            for level in self.valid(image):
                self.assertSamePixels(expected[level], there[level])
            self.assertRan(run(arguments[0], image, *arguments[1:]))
            self.assertSamePixels(self.pixels, read_pixels(image))
            finished = self.levels(image)
            self.assertEqual(sorted(expected), sorted(finished))
            for level, pixels in expected.items():
                self.assertSamePixels(pixels, finished[level])
            self.assertEqual(sorted(expected), self.valid(image))
            self.assertEqual(sorted(os.listdir(self.recorded)), sorted(os.listdir(self.replayed)))

    def check_all(self, arguments):
        """Every prefix of the run, and every loss of one write that no sync followed."""
        changes = self.record(*arguments)
        recorded = os.path.join(self.recorded, self.name)
        expected = self.levels(recorded)
        self.assertGreater(len(changes), 3)
        for count in range(len(changes) + 1):
            self.check(changes[:count], arguments, expected, f"after {count} calls")
        for lost, stop in self.losses(changes):
            self.check(changes[:lost] + changes[lost + 1:stop], arguments, expected,
                       f"call {lost} lost, stopped before {stop}")

    @staticmethod
    def losses(changes):
        """(lost, stop): the write `lost` may not be on disk when power fails before `stop`."""
        for lost, change in enumerate(changes):
            if change.name != "pwrite":
                continue
            stop = next((number for number in range(lost + 1, len(changes))
                         if changes[number].name == "fsync"), len(changes))
            if stop > lost + 1:
                yield lost, stop


class Build(Replayed):
    arguments = ("build", "--levels", LEVELS, "--method", "nearest")

    def check_image(self, options, *more):
        write_tiff(os.path.join(self.original, "image.tif"), self.pixels, "Byte", options)
        self.check_all((*self.arguments, *more))

    def test_inside_a_classic_file(self):
        self.check_image(KINDS["classic"])

    def test_inside_a_big_endian_bigtiff(self):
        self.check_image(KINDS["big_endian_bigtiff"])

    def test_in_a_side_car(self):
        self.check_image(KINDS["classic"], "--external")

    def test_inside_a_cloud_optimized_file(self):
        from osgeo import gdal
        source = self.path("source.tif")
        write_tiff(source, self.pixels, "Byte")
        gdal.Translate(os.path.join(self.original, "image.tif"), source, format="COG",
                       creationOptions=["BLOCKSIZE=128", "OVERVIEWS=NONE", "COMPRESS=NONE"])
        self.check_all(self.arguments)


class Rebuild(Replayed):
    arguments = ("build", "--levels", LEVELS, "--method", "average", "--force")

    def check_image(self, options, rebuilds, *more):
        """The second rebuild goes into the space that the first one left."""
        image = os.path.join(self.original, "image.tif")
        write_tiff(image, self.pixels, "Byte", options)
        self.assertRan(run("build", image, "--levels", LEVELS, *more))
        with open(image if not more else image + ".ovr", "rb"):  # keeps the old state there
            for _ in range(rebuilds):
                self.assertRan(run("build", image, *self.arguments[1:], *more))
        self.check_all((*self.arguments, *more))

    def valid(self, image):
        """Only levels of the rebuild are compared with it; the old ones are valid as well."""
        return [entry["level"] for entry in info(image)["levels"]
                if entry["method"] == "AVERAGE"
                and all(channel["valid"] for channel in entry["channels"])]

    def test_inside_the_file(self):
        self.check_image(KINDS["classic"], 0)

    def test_inside_the_file_in_space_of_replaced_levels(self):
        self.check_image(KINDS["classic"], 1)

    def test_in_a_side_car(self):
        self.check_image(KINDS["classic"], 0, "--external")


class Clean(Replayed):
    def check_image(self, *place):
        image = os.path.join(self.original, "image.tif")
        write_tiff(image, self.pixels, "Byte", KINDS["classic"])
        self.assertRan(run("build", image, "--levels", LEVELS, *place))
        made = self.levels(image)
        changes = self.record("clean")
        for count in range(len(changes) + 1):
            with self.subTest(count=count):
                image = self.replay(changes[:count])
                self.assertSamePixels(self.pixels, read_pixels(image))
                for level in self.valid(image):
                    self.assertSamePixels(made[level], self.levels(image)[level])
                self.assertRan(run("clean", image))
                self.assertEqual({}, self.levels(image))
                self.assertEqual(["image.tif"], os.listdir(self.replayed))
                self.assertSamePixels(self.pixels, read_pixels(image))

    def test_inside_the_file(self):
        self.check_image()

    def test_of_a_side_car(self):
        self.check_image("--external")


if __name__ == "__main__":
    unittest.main()
