# SPDX-License-Identifier: MIT
"""Removing levels, as a script sees it."""

import json
import os
import subprocess
import unittest

from orin_cli import TOOL, Case, contents, environment, run, write_raster


class Clean(Case):
    def setUp(self):
        super().setUp()
        self.file = write_raster(self.path("scene.tif"), 1003, 777, channels=3)
        self.before = contents(self.file)

    def levels(self):
        return [(level["level"], level["place"])
                for level in json.loads(run("info", "--json", self.file).stdout)["levels"]]

    def clean(self, *arguments, code=0):
        answer = run("clean", self.file, *arguments)
        self.assertRan(answer, code)
        return answer

    def test_all_levels_inside_go_and_the_file_is_what_it_was(self):
        run("build", self.file)
        self.assertEqual(f"{self.file}: levels removed: 2, 4 (inside the file)\n",
                         self.clean().stdout)
        self.assertEqual(self.before, contents(self.file))

    def test_single_levels_go_and_the_others_stay(self):
        run("build", self.file, "--levels", "2,4,8")
        answer = self.clean("--levels", "4,16")
        self.assertIn("levels removed: 4 (inside the file)", answer.stdout)
        self.assertEqual([(2, "internal"), (8, "internal")], self.levels())

    def test_a_side_car_goes_with_its_last_level(self):
        run("build", self.file, "--external", "--levels", "2,4")
        self.clean("--levels", "2")
        self.assertTrue(os.path.exists(self.file + ".ovr"))
        answer = self.clean()
        self.assertEqual(f"{self.file}: levels removed: 4 (in {self.file}.ovr)\n", answer.stdout)
        self.assertEqual(["scene.tif"], os.listdir(self.folder))
        self.assertEqual(self.before, contents(self.file))

    def test_levels_of_one_place_go_alone_when_that_is_named(self):
        run("build", self.file, "--levels", "2")
        run("build", self.file, "--levels", "4", "--external")
        self.clean("--external")
        self.assertEqual([(2, "internal")], self.levels())
        run("build", self.file, "--levels", "4", "--external")
        self.clean("--internal")
        self.assertEqual([(4, "side-car")], self.levels())
        self.assertEqual(self.before, contents(self.file))

    def test_levels_of_other_programs_go_too(self):
        from osgeo import gdal
        gdal.UseExceptions()
        dataset = gdal.Open(self.file, gdal.GA_Update)
        dataset.BuildOverviews("AVERAGE", [2, 4])
        del dataset
        self.assertIn("levels removed: 2, 4", self.clean().stdout)
        self.assertEqual([], self.levels())

    def test_masks_of_removed_levels_go_and_the_images_mask_stays(self):
        from osgeo import gdal
        gdal.UseExceptions()
        gdal.SetConfigOption("GDAL_TIFF_INTERNAL_MASK", "YES")
        dataset = gdal.Open(self.file, gdal.GA_Update)
        dataset.CreateMaskBand(gdal.GMF_PER_DATASET)
        dataset.GetRasterBand(1).GetMaskBand().Fill(255)
        dataset.BuildOverviews("NEAREST", [2, 4])
        del dataset
        self.clean("--levels", "4")
        dataset = gdal.Open(self.file)
        mask = dataset.GetRasterBand(1).GetMaskBand()
        self.assertEqual(1, dataset.GetRasterBand(1).GetOverviewCount())
        self.assertEqual((1, 255), (mask.GetOverviewCount(), mask.ReadAsArray().min()))

    def test_what_is_not_there_is_no_failure(self):
        self.assertEqual(f"{self.file}: nothing to do: there are no levels\n", self.clean().stdout)
        run("build", self.file, "--levels", "2")
        self.assertIn("there are no such levels", self.clean("--levels", "3").stdout)
        self.assertEqual("", self.clean("--quiet").stdout)
        self.assertEqual([], self.levels())

    def test_what_cannot_be_opened_is_reported_and_does_not_stop_the_others(self):
        run("build", self.file)
        missing = self.path("missing.tif")
        self.assertRan(run("clean", missing), 4)
        answer = run("clean", missing, self.file)
        self.assertRan(answer, 1)
        self.assertIn(missing, answer.stderr)
        self.assertEqual([], self.levels())

    def test_levels_inside_a_read_only_file_stay_and_the_reason_is_named(self):
        run("build", self.file)
        os.chmod(self.file, 0o444)
        os.chmod(self.folder, 0o777)
        user = {"user": 65534} if os.geteuid() == 0 else {}
        try:
            answer = subprocess.run([TOOL, "clean", self.file], capture_output=True, text=True,
                                    env=environment(), timeout=60, check=False, **user)
        except PermissionError:
            self.skipTest("the tool lies where other users cannot run it")
        self.assertRan(answer, 5)
        self.assertIn(f"{self.file}: cannot be opened for writing: Permission denied",
                      answer.stderr)
        self.assertEqual([2, 4], [level for level, _ in self.levels()])

    def test_wrong_usage(self):
        self.assertRan(run("clean"), 2)
        self.assertRan(run("clean", self.file, "--levels", "2;4"), 2)
        self.assertRan(run("clean", self.file, "--internal", "--external"), 2)


if __name__ == "__main__":
    unittest.main()
