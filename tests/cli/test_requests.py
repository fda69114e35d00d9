# SPDX-License-Identifier: MIT
"""What a build makes of its request and of the levels that are there."""

import json
import os
import subprocess
import time
import unittest

from orin_cli import Case, TOOL, contents, environment, run, write_raster


def levels(file):
    """Level to (method, place, state), those beside the file before those inside."""
    answer = json.loads(run("info", "--json", file).stdout)
    return {level["level"]: (level["method"], level["place"], level["state"])
            for level in answer["levels"]}


def edit(file):
    """Another program changes some pixels."""
    from osgeo import gdal
    gdal.UseExceptions()
    time.sleep(0.02)
    dataset = gdal.Open(file, gdal.GA_Update)
    band = dataset.GetRasterBand(1)
    band.WriteArray(band.ReadAsArray(5, 5, 40, 40) ^ 255, 5, 5)
    dataset.FlushCache()
    del band, dataset


class RequestCase(Case):
    def setUp(self):
        super().setUp()
        self.file = write_raster(self.path("scene.tif"), 1003, 777, channels=3)

    def build(self, *arguments, code=0, **changes):
        answer = run("build", self.file, *arguments, **changes)
        self.assertRan(answer, code)
        return answer


class Method(RequestCase):
    def test_a_stale_level_keeps_the_method_that_it_records(self):
        self.build("--method", "average")
        edit(self.file)
        answer = self.build()
        self.assertIn("levels built: 2, 4 (AVERAGE, inside the file)", answer.stdout)
        self.assertEqual({2: ("AVERAGE", "internal", "current"),
                          4: ("AVERAGE", "internal", "current")}, levels(self.file))

    def test_each_stale_level_keeps_its_own(self):
        self.build("--method", "average", "--levels", "2")
        self.build("--method", "mode", "--levels", "4")
        edit(self.file)
        self.build()
        self.assertEqual({2: "AVERAGE", 4: "MODE"},
                         {level: told[0] for level, told in levels(self.file).items()})

    def test_a_new_level_takes_that_of_the_others(self):
        self.build("--method", "average", "--levels", "2")
        self.build("--levels", "8")
        self.assertEqual("AVERAGE", levels(self.file)[8][0])

    def test_a_named_method_rebuilds_what_another_one_made_with_a_notice(self):
        self.build("--method", "nearest")
        answer = self.build("--method", "average")
        self.assertIn("Rebuilding levels 2, 4 by AVERAGE: they were made by NEAREST.",
                      answer.stderr)
        self.assertEqual({"AVERAGE"}, {told[0] for told in levels(self.file).values()})
        again = self.build("--method", "average")
        self.assertEqual("", again.stderr)
        self.assertIn("nothing to do", again.stdout)

    def test_the_environment_decides_before_the_preferences(self):
        preferences = self.path("mine.toml", '[raster-layer]\noverview-method = "average"\n')
        self.build(ORIN_PREFERENCES=preferences, ORIN_OVERVIEW_METHOD="bilinear")
        self.assertEqual({"BILINEAR"}, {told[0] for told in levels(self.file).values()})

    def test_an_environment_that_names_no_method_is_wrong_usage(self):
        answer = self.build(ORIN_OVERVIEW_METHOD="avrage", code=2)
        self.assertIn("ORIN_OVERVIEW_METHOD", answer.stderr)
        self.assertIn("Did you mean average?", answer.stderr)
        self.assertEqual({}, levels(self.file))


class Form(RequestCase):
    def compressions(self):
        listed = subprocess.run(["tiffinfo", self.file], capture_output=True, text=True,
                                check=False).stdout
        return [line.split(":")[1].strip() for line in listed.splitlines()
                if "Compression Scheme" in line]

    def test_levels_stored_otherwise_are_rebuilt_with_a_notice(self):
        self.build("--co", "COMPRESS=DEFLATE")
        answer = self.build("--co", "COMPRESS=LZW")
        self.assertIn("Rebuilding levels 2, 4: they are stored otherwise than --co says.",
                      answer.stderr)
        self.assertEqual(["LZW", "LZW"], self.compressions()[1:])
        self.assertIn("nothing to do", self.build("--co", "COMPRESS=LZW").stdout)

    def test_tiles_and_quality_count_as_well(self):
        jpeg = ("--co", "COMPRESS=JPEG", "--co")
        self.build(*jpeg, "QUALITY=90")
        self.assertIn("nothing to do", self.build(*jpeg, "QUALITY=90").stdout)
        self.assertIn("levels built: 2, 4", self.build(*jpeg, "QUALITY=50").stdout)
        self.assertIn("levels built: 2, 4", self.build("--co", "TILE=64").stdout)
        self.assertIn("nothing to do", self.build("--co", "TILE=64").stdout)

    def test_the_form_of_a_side_car_is_refused_inside(self):
        before = contents(self.file)
        answer = self.build("--co", "BIGTIFF=YES", "--internal", code=2)
        self.assertIn("BIGTIFF= is the form of a side-car", answer.stderr)
        self.assertEqual(before, contents(self.file))
        self.build("--co", "BIGTIFF=YES", "--external")


class OutOfDate(RequestCase):
    def test_a_plain_build_rebuilds_levels_outside_the_usual_list(self):
        self.build("--levels", "2,3,4,8")
        edit(self.file)
        answer = self.build()
        self.assertIn("Rebuilding levels 2, 3, 4, 8: they no longer match the image", answer.stderr)
        self.assertEqual({"current"}, {told[2] for told in levels(self.file).values()})

    def test_levels_above_a_rebuilt_one_follow(self):
        self.build("--levels", "2,4,8")
        answer = self.build("--levels", "2", "--force", "--method", "average")
        self.assertIn("Rebuilding levels 4, 8: the levels they were computed from are rebuilt.",
                      answer.stderr)
        self.assertIn("levels built: 2, 4, 8 (AVERAGE", answer.stdout)


class Place(RequestCase):
    def test_missing_levels_join_those_beside(self):
        self.build("--levels", "2", "--external")
        before = contents(self.file)
        self.build("--levels", "2,4")
        self.assertEqual({2: "side-car", 4: "side-car"},
                         {level: told[1] for level, told in levels(self.file).items()})
        self.assertEqual(before, contents(self.file))

    def test_building_inside_over_levels_beside_says_so(self):
        self.build("--levels", "2", "--external")
        answer = self.build("--levels", "2", "--internal")
        self.assertIn(f"Levels 2 stand in {self.file}.ovr. Other programs read the levels inside "
                      "the file instead.", answer.stderr)

    def test_some_channels_inside_are_refused_unless_the_others_have_the_level(self):
        before = contents(self.file)
        answer = self.build("--levels", "2", "--channels", "1", code=2)
        self.assertIn("other programs would see zeros", answer.stderr)
        self.assertEqual(before, contents(self.file))
        self.build("--levels", "2")
        self.build("--levels", "2", "--channels", "1", "--force")
        self.assertEqual("current", levels(self.file)[2][2])

    def test_a_cloud_optimized_file_gets_them_beside_and_stays_one(self):
        from osgeo import gdal
        cloud = self.path("cloud.tif")
        gdal.Translate(cloud, self.file, format="COG", creationOptions=["OVERVIEWS=NONE"])
        before = contents(cloud)
        answer = run("build", cloud)
        self.assertRan(answer, 0)
        self.assertIn(f"The file is a cloud optimized GeoTIFF. The levels go to {cloud}.ovr",
                      answer.stderr)
        self.assertEqual(before, contents(cloud))
        self.assertIn("layout: cloud optimized GeoTIFF\n", run("info", cloud).stdout)
        self.assertTrue(json.loads(run("info", "--json", cloud).stdout)["cloudOptimized"])
        self.assertRan(run("clean", cloud), 0)
        answer = run("build", cloud, "--internal")
        self.assertRan(answer, 0)
        self.assertIn("the file is no longer a cloud optimized GeoTIFF", answer.stderr)
        self.assertNotIn("layout:", run("info", cloud).stdout)


class LeftOverSideCar(RequestCase):
    def setUp(self):
        super().setUp()
        self.build("--external")
        os.remove(self.file)
        write_raster(self.file, 640, 480, channels=3)

    def test_info_names_it(self):
        answer = run("info", self.file)
        self.assertRan(answer, 3)
        self.assertIn(f"{self.file}.ovr holds levels of an image of another size "
                      "(501 x 388 pixels)", answer.stdout)
        told = json.loads(run("info", "--json", self.file).stdout)
        self.assertEqual({"file": self.file + ".ovr", "width": 501, "height": 388},
                         told["leftOver"])
        self.assertEqual([], told["levels"])

    def test_a_build_beside_replaces_it_with_a_notice(self):
        answer = self.build("--external")
        self.assertIn(f"Replacing {self.file}.ovr: it holds levels of an image of another size",
                      answer.stderr)
        self.assertRan(run("info", self.file), 0)
        from osgeo import gdal
        band = gdal.Open(self.file + ".ovr").GetRasterBand(1)
        self.assertEqual((320, 240), (band.XSize, band.YSize))

    def test_clean_removes_it(self):
        answer = run("clean", self.file)
        self.assertRan(answer, 0)
        self.assertIn(f"removed {self.file}.ovr, which held levels of an image of another size",
                      answer.stdout)
        self.assertFalse(os.path.exists(self.file + ".ovr"))
        self.assertRan(run("info", self.file), 0)

    def test_it_stays_while_single_levels_are_cleaned(self):
        self.assertRan(run("clean", self.file, "--levels", "2"), 0)
        self.assertTrue(os.path.exists(self.file + ".ovr"))


class WhatCannotBe(RequestCase):
    def test_named_levels_of_masks_of_one_bit(self):
        bits = write_raster(self.path("bits.tif"), 600, 500, options=["NBITS=1"])
        answer = run("build", bits, "--levels", "2")
        self.assertRan(answer, 2)
        self.assertIn("All channels are masks of one bit", answer.stderr)
        self.assertRan(run("build", bits), 0)

    def test_the_pyramid_of_a_thin_image_ends_where_its_levels_do(self):
        for columns, rows, expected in ((600, 1, []), (20000, 10, [2, 4, 8])):
            thin = write_raster(self.path(f"thin{rows}.tif"), columns, rows)
            answer = run("build", thin)
            self.assertRan(answer, 0)
            self.assertEqual("", answer.stderr)
            self.assertEqual(expected, sorted(levels(thin)))
            self.assertRan(run("build", thin, "--force"), 0)


class OneOpening(RequestCase):
    def test_a_build_with_nothing_to_do_opens_its_files_twelve_times_at_most(self):
        self.build()
        trace = self.path("trace")
        subprocess.run(["strace", "-f", "-o", trace, "-e", "trace=open,openat", TOOL, "build",
                        self.file], env=environment(), check=True, capture_output=True)
        with open(trace, encoding="utf-8") as lines:
            opened = [line for line in lines if "scene.tif" in line and "execve" not in line]
        self.assertGreater(len(opened), 0)
        self.assertLessEqual(len(opened), 12, "".join(opened))


if __name__ == "__main__":
    unittest.main()
