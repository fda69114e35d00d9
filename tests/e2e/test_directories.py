# SPDX-License-Identifier: MIT
"""Which directory of a TIFF file is image, page, level or mask: levels and masks of other pages,
levels of one factor, levels in SubIFDs."""

import re
import subprocess
import unittest

from orin_e2e import Case, info, run
from tiffbytes import SUB_IFDS, TiffFile, image_tags

REDUCED, MASK = 1, 4


def size_of(path):
    """(columns, rows) and subfile type of every directory in the chain, as libtiff lists them."""
    listed = subprocess.run(["tiffinfo", path], capture_output=True, text=True).stdout
    found = []
    for part in re.split("=== TIFF directory", listed)[1:]:
        width, height = re.search(r"Image Width: (\d+) Image Length: (\d+)", part).groups()
        kind = re.search(r"Subfile Type: .*\((\d)", part)
        found.append(((int(width), int(height)), int(kind.group(1)) if kind else 0))
    return found


class Chain(TiffFile):
    """Images of constant grey in one strip."""

    def image(self, width, height, value, subfile=0, chained=True, **tags):
        strip = self.add(bytes([value]) * (width * height))
        all_tags = image_tags(width, height, strip, width * height, subfile=subfile,
                              photometric=4 if subfile & MASK else 1)
        all_tags.update(tags.get("more", {}))
        return self.directory(all_tags, chained)


def overwrite_pixels(path, old, new):
    """Another program's edit of all pixels of one value."""
    with open(path, "r+b") as file:
        content = file.read()
        at = content.find(bytes([old]) * 100)
        assert at > 0
        file.seek(at)
        file.write(bytes([new]) * 100)


class Pages(Case):
    """Two pages of one size, each with a level and masks of its own."""

    def two_pages(self, name="pages.tif", masked=(True, True)):
        chain = Chain()
        for page in range(2):
            chain.image(60, 40, 10 + page)
            if masked[page]:
                chain.image(60, 40, 255 - page, MASK)
            chain.image(30, 20, 20 + page, REDUCED)
            if masked[page]:
                chain.image(30, 20, 250 - page, REDUCED | MASK)
        return chain.write(self.path(name))

    def test_clean_leaves_level_and_masks_of_the_other_page(self):
        file = self.two_pages()
        self.assertRan(run("clean", file))
        self.assertEqual([((60, 40), 0), ((60, 40), MASK), ((60, 40), 0), ((60, 40), MASK),
                          ((30, 20), REDUCED), ((30, 20), REDUCED | MASK)], size_of(file))

    def test_clean_leaves_the_mask_of_the_other_page_where_the_first_has_none(self):
        file = self.two_pages(masked=(False, True))
        self.assertRan(run("clean", file))
        self.assertEqual([((60, 40), 0), ((60, 40), 0), ((60, 40), MASK),
                          ((30, 20), REDUCED), ((30, 20), REDUCED | MASK)], size_of(file))
        self.assertFalse(info(file)["mask"])

    def test_an_edit_of_the_other_pages_mask_leaves_the_levels_current(self):
        for masked in ((True, True), (False, True)):
            with self.subTest(masked=masked):
                file = self.two_pages(f"edit{masked[0]}.tif", masked)
                self.assertRan(run("build", file, "--levels", "2", "--force"))
                overwrite_pixels(file, 254, 0)
                states = {level["level"]: level["state"] for level in info(file)["levels"]}
                self.assertEqual("current", states[2])

    def test_an_edit_of_its_own_mask_makes_them_stale(self):
        file = self.two_pages()
        self.assertRan(run("build", file, "--levels", "2", "--force"))
        overwrite_pixels(file, 255, 0)
        states = {level["level"]: level["state"] for level in info(file)["levels"]}
        self.assertEqual("stale", states[2])

    def test_a_level_that_is_built_again_takes_no_mask_of_the_other_page(self):
        file = self.two_pages()
        self.assertRan(run("build", file, "--levels", "2", "--force"))
        kinds = size_of(file)
        self.assertEqual(4, kinds.count(((30, 20), REDUCED)) +
                         kinds.count(((30, 20), REDUCED | MASK)), kinds)
        self.assertEqual([((60, 40), 0), ((60, 40), MASK), ((30, 20), REDUCED),
                          ((30, 20), REDUCED | MASK)], kinds[-4:])


class OneFactor(Case):
    """Sizes that round to one factor: 13 x 19 with 2 x 3 and 1 x 2."""

    def pyramid(self, name):
        chain = Chain()
        chain.image(13, 19, 1)
        for width, height in ((7, 10), (4, 5), (2, 3), (1, 2)):
            chain.image(width, height, width, REDUCED)
        return chain.write(self.path(name))

    def levels(self, file):
        return [(level["level"], level["width"], level["height"])
                for level in info(file)["levels"]]

    def test_info_lists_all_of_them(self):
        self.assertEqual([(2, 7, 10), (4, 4, 5), (8, 1, 2), (8, 2, 3)],
                         sorted(self.levels(self.pyramid("all.tif"))))

    def test_clean_removes_the_one_that_is_named(self):
        file = self.pyramid("one.tif")
        self.assertRan(run("clean", file, "--levels", "8"))
        self.assertEqual([(2, 7, 10), (4, 4, 5), (8, 1, 2)], self.levels(file))

    def test_clean_without_levels_removes_all(self):
        file = self.pyramid("none.tif")
        self.assertRan(run("clean", file))
        self.assertEqual([], self.levels(file))
        self.assertEqual([((13, 19), 0)], size_of(file))


class SubDirectories(Case):
    """Levels as microscopy formats keep them: inside the image's directory."""

    def pyramid(self, name="sub.tif"):
        chain = Chain()
        offsets = [chain.image(width, height, width % 200, REDUCED, chained=False)
                   for width, height in ((64, 48), (32, 24))]
        chain.image(128, 96, 7, more={SUB_IFDS: offsets})
        return chain.write(self.path(name))

    def test_info_lists_them_as_what_they_are(self):
        file = self.pyramid()
        self.assertEqual([(2, 64, 48, "subifd", "unverified"), (4, 32, 24, "subifd", "unverified")],
                         [(level["level"], level["width"], level["height"], level["place"],
                           level["state"]) for level in info(file)["levels"]])
        table = run("info", file).stdout
        self.assertIn("inside (SubIFD)", table)
        self.assertNotIn("no overview levels", table)

    def test_they_survive_a_build_and_a_clean_byte_for_byte(self):
        file = self.pyramid()
        with open(file, "rb") as before:
            content = before.read()
        self.assertRan(run("build", file, "--levels", "2", "--force", "--internal"))
        self.assertEqual(3, len(info(file)["levels"]))
        self.assertRan(run("clean", file))
        with open(file, "rb") as after:
            cleaned = after.read()
        self.assertEqual(2, len(info(file)["levels"]))
        first = content.find(bytes([64]) * 100)
        self.assertEqual(content[first:first + 64 * 48], cleaned[first:first + 64 * 48])
        with open(file, "rb") as kept:
            self.assertEqual(len(content), len(kept.read()))


if __name__ == "__main__":
    unittest.main()
