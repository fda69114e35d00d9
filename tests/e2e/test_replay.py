# SPDX-License-Identifier: MIT
"""What is on disk between any two system calls of the tool, and after a power loss that swallowed
a write which was not synced: the image is what it was, no level lies, the same command finishes."""

import contextlib
import functools
import os
import shutil
import tempfile
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
    image = "image.tif"

    def setUp(self):
        super().setUp()
        self.pixels = random_pixels((2, SIZE[1], SIZE[0]), numpy.uint8, 8)
        self.original = os.path.join(self.folder, "original")
        self.recorded = os.path.join(self.folder, "recorded")
        os.mkdir(self.original)

    def record(self, *arguments):
        """Runs the tool on a copy of the original folder; the changes that it made."""
        shutil.copytree(self.original, self.recorded)
        log = self.path("log")
        self.assertRan(disklog.run(self.recorded, *arguments[:1],
                                   os.path.join(self.recorded, self.image), *arguments[1:],
                                   log=log))
        return disklog.changes_in(log)

    @contextlib.contextmanager
    def replay(self, changes):
        """A fresh copy of the original folder with these changes made; the image in it."""
        folder = tempfile.mkdtemp(dir=self.folder)
        shutil.copytree(self.original, folder, dirs_exist_ok=True)
        names = {}  # a file goes on under the name that it was given
        for change in changes:
            change.apply(lambda path: names.get(path, path).replace(self.recorded, folder))
            if change.name == "rename":
                names[change.paths[0]] = change.paths[1]
        yield os.path.join(folder, self.image)
        shutil.rmtree(folder)

    def levels(self, image):
        """{factor: pixels} as GDAL reads them."""
        return {SIZE[0] // columns: read_pixels(image, index)
                for index, (columns, _) in enumerate(overview_sizes(image))}

    def valid(self, image):
        return [entry["level"] for entry in info(image)["levels"]
                if all(channel["valid"] for channel in entry["channels"])]

    def check(self, changes, arguments, expected):
        """expected: {factor: pixels} of an undisturbed run"""
        with self.replay(changes) as image:
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
            self.assertEqual(sorted(os.listdir(self.recorded)),
                             sorted(os.listdir(os.path.dirname(image))))

    def check_all(self, arguments):
        """Every prefix of the run, and every loss of one write that no sync followed.

        \\returns the changes that the run made"""
        changes = self.record(*arguments)
        expected = self.levels(os.path.join(self.recorded, self.image))
        self.assertGreater(len(changes), 3)
        self.check_each(self.states(changes), arguments, expected)
        return changes

    def check_each(self, states, *arguments):
        disklog.check_at_once(self, {
            what: functools.partial(self.check, done, *arguments) for what, done in states.items()})

    @classmethod
    def states(cls, changes):
        """What is on disk where the run was stopped: the changes, by where."""
        states = {f"after {count} calls": changes[:count] for count in range(len(changes) + 1)}
        for lost, stop in cls.losses(changes):
            states[f"call {lost} lost, stopped before {stop}"] = (
                changes[:lost] + changes[lost + 1:stop])
        return states

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

    def check_growth(self, *more):
        """The new level fits nowhere: it goes to the file's end and comes down again."""
        self.pixels[:, ::2, ::2] = 7  # all that nearest neighbour takes
        image = os.path.join(self.original, "image.tif")
        write_tiff(image, self.pixels, "Byte", ["COMPRESS=DEFLATE"])
        self.assertRan(run("build", image, "--levels", "2", "--method", "nearest", *more))
        arguments = ("build", "--levels", "2", "--method", "average", "--force", *more)
        changes = self.check_all(arguments)
        shortened = [change for change in changes if change.name == "ftruncate"]
        self.assertTrue(shortened)
        top = max(change.numbers[0] for change in changes if change.name == "pwrite")
        self.assertGreater(top, shortened[-1].numbers[0], "nothing was moved")

    def test_by_a_longer_level_inside_the_file(self):
        self.check_growth()

    def test_by_a_longer_level_in_a_side_car(self):
        self.check_growth("--external")


class Clean(Replayed):
    def check_removal(self, levels, *place):
        """Of the levels these are left."""
        image = os.path.join(self.original, "image.tif")
        write_tiff(image, self.pixels, "Byte", KINDS["classic"])
        self.assertRan(run("build", image, "--levels", LEVELS, *place))
        made = self.levels(image)
        arguments = ("clean", "--levels", ",".join(str(l) for l in made if l not in levels))
        self.check_each(self.states(self.record(*arguments)), arguments, made, levels)

    def check(self, changes, arguments, made, left):
        with self.replay(changes) as image:
            self.assertSamePixels(self.pixels, read_pixels(image))
            there = self.levels(image)
            for level in {*left, *self.valid(image)}:
                self.assertSamePixels(made[level], there[level])
            self.assertRan(run(arguments[0], image, *arguments[1:]))
            self.assertEqual(left, self.valid(image))
            finished = self.levels(image)
            self.assertEqual(left, list(finished))
            for level, pixels in finished.items():
                self.assertSamePixels(made[level], pixels)
            self.assertEqual(sorted(os.listdir(self.recorded)),
                             sorted(os.listdir(os.path.dirname(image))))
            self.assertSamePixels(self.pixels, read_pixels(image))

    def test_inside_the_file(self):
        self.check_removal([])

    def test_of_a_side_car(self):
        self.check_removal([], "--external")

    def test_of_some_levels_inside_the_file(self):
        self.check_removal([4])

    def test_of_some_levels_of_a_side_car(self):
        self.check_removal([4], "--external")


if __name__ == "__main__":
    unittest.main()
