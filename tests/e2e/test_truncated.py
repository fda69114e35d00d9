# SPDX-License-Identifier: MIT
"""Every beginning of a few good files: it works or is refused clearly, and is never changed."""

import concurrent.futures
import os
import pathlib
import shutil
import unittest

import numpy

import limits
from orin_e2e import Case, random_pixels, run, write_tiff
from tiffbytes import boundaries

# Every length up to this one; behind it, wherever something starts or ends, and some more. A
# sanitizer makes each start of the tool slow, and so gets fewer of them.
EVERY_BYTE = 64 if limits.IS_SANITIZED else 384   # two processes for each
SAMPLES = 60
TILES = ["TILED=YES", "BLOCKXSIZE=16", "BLOCKYSIZE=16"]
LAYOUTS = {   # options, channels, levels inside
    "strips": (["BLOCKYSIZE=7"], 1, False),
    "big": (["BIGTIFF=YES", "COMPRESS=DEFLATE", *TILES], 1, True),
    "planes": (["ENDIANNESS=BIG", "INTERLEAVE=BAND", "COMPRESS=LZW", *TILES], 2, True),
    "jpeg": (["COMPRESS=JPEG", *TILES], 1, True),
}


def lengths(content):
    """The lengths to cut a file to."""
    size = len(content)
    chosen = set(range(min(EVERY_BYTE, size)))
    chosen.update(range(0, size, max(1, size // SAMPLES)))
    for position in boundaries(content):
        chosen.update((position - 1, position, position + 1))
    return sorted(length for length in chosen if 0 <= length < size)


class Truncated(Case):
    def good_file(self, name):
        """A file of one of the layouts: its path and bytes."""
        options, channels, has_levels = LAYOUTS[name]
        path = self.path(f"{name}.tif")
        write_tiff(path, random_pixels((channels, 37, 45), numpy.uint8, 5), "Byte", options)
        if has_levels:
            self.assertRan(run("build", path, "--levels", "2,4"))
        return path, pathlib.Path(path).read_bytes()

    def assertNoFaults(self, faults):
        self.assertEqual([], [fault for fault in faults if fault])

    def check_info(self, path, content, extension=""):
        """`info` on copies of `path` whose file with that extension is cut."""
        def look(length):
            copy = self.path(f"cut{length}.tif")
            if extension:
                shutil.copy(path, copy)
            pathlib.Path(copy + extension).write_bytes(content[:length])
            ended = limits.run("info", copy, seconds=limits.INFO_SECONDS)
            fault = limits.fault(ended, copy, limits.CANNOT_OPEN)
            for made in {copy, copy + extension}:
                os.remove(made)
            return fault and f"{length} bytes: {fault}"

        with concurrent.futures.ThreadPoolExecutor(2) as pool:
            self.assertNoFaults(pool.map(look, lengths(content)))

    def test_info_shows_the_beginning_of_a_file_or_refuses_it(self):
        for name in LAYOUTS:
            with self.subTest(layout=name):
                path, content = self.good_file(name)
                self.check_info(path, content)

    def test_info_shows_an_image_beside_the_beginning_of_a_side_car_or_refuses_it(self):
        path, _ = self.good_file("strips")
        self.assertRan(run("build", path, "--external", "--levels", "2,4"))
        self.check_info(path, pathlib.Path(path + ".ovr").read_bytes(), ".ovr")

    def build_all(self, copies, *arguments):
        """One run over all of them. \\returns those that its messages name"""
        ended = limits.run("build", "--levels", "2", *arguments, *copies,
                           seconds=limits.BUILD_SECONDS)
        self.assertIn(ended.code, (0, limits.SOME_FAILED), ended.error[-500:])
        self.assertTrue(limits.IS_SANITIZED or ended.memory < limits.MOST_MEMORY, ended.memory)
        # The side-car is named by itself where it is what cannot be read.
        return {copy for copy in copies if f"{copy}: " in ended.error or f"{copy}.ovr: "
                in ended.error}

    def test_build_refuses_the_beginning_of_a_file_without_changing_it_or_it_works(self):
        for name in LAYOUTS:
            with self.subTest(layout=name):
                _, content = self.good_file(name)
                copies = {self.path(f"{name}-{length}.tif"): content[:length]
                          for length in lengths(content)}
                for copy, bytes_before in copies.items():
                    pathlib.Path(copy).write_bytes(bytes_before)
                refused = self.build_all(list(copies))
                self.assertTrue(refused)
                changed = [copy for copy in refused
                           if pathlib.Path(copy).read_bytes() != copies[copy]]
                self.assertEqual([], changed)
                left = [name for name in os.listdir(self.folder)
                        if name.endswith((".ovr", ".partial"))]
                self.assertEqual([], left)

    def test_build_beside_the_image_never_touches_it_whatever_the_side_car_holds(self):
        path, image = self.good_file("strips")
        self.assertRan(run("build", path, "--external", "--levels", "2,4"))
        content = pathlib.Path(path + ".ovr").read_bytes()
        copies = {}
        for length in lengths(content):
            copy = self.path(f"cut{length}.tif")
            shutil.copy(path, copy)
            pathlib.Path(copy + ".ovr").write_bytes(content[:length])
            copies[copy] = content[:length]
        refused = self.build_all(list(copies), "--external")
        for copy in copies:
            self.assertEqual(image, pathlib.Path(copy).read_bytes(), copy)
        for copy in refused:
            self.assertEqual(copies[copy], pathlib.Path(copy + ".ovr").read_bytes(), copy)


if __name__ == "__main__":
    unittest.main()
