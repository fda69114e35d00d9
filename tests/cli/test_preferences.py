# SPDX-License-Identifier: MIT
"""The user's preference file decides what the command line leaves open."""

import json
import os
import unittest

from orin_cli import Case, run, write_raster


class Preferences(Case):
    def setUp(self):
        super().setUp()
        self.file = write_raster(self.path("scene.tif"), 900, 700)

    def built(self, *arguments, **changes):
        """Levels and method that a build with these preferences made."""
        self.assertRan(run("build", self.file, *arguments, **changes), 0)
        levels = json.loads(run("info", "--json", self.file).stdout)["levels"]
        return [level["level"] for level in levels], {level["method"] for level in levels}

    def test_method_and_factor_come_from_the_file_named_by_the_environment(self):
        preferences = self.path("mine.toml", '[raster-layer]\noverview-method = "average"\n'
                                             "decimation-factor = 3\n")
        self.assertEqual(([3, 9], {"AVERAGE"}), self.built(ORIN_PREFERENCES=preferences))

    def test_and_from_the_configuration_folder(self):
        os.mkdir(self.path("orin"))
        self.path("orin/preferences.toml", "[raster-layer]\noverview-method = 2\n")
        self.assertEqual(([2, 4], {"MODE"}),
                         self.built(ORIN_PREFERENCES="", XDG_CONFIG_HOME=self.folder))

    def test_the_command_line_wins(self):
        preferences = self.path("mine.toml", '[raster-layer]\noverview-method = "average"\n'
                                             "decimation-factor = 3\n")
        self.assertEqual(([2, 4], {"NEAREST"}), self.built("--factor", "2", "--method", "nearest",
                                                           ORIN_PREFERENCES=preferences))

    def test_without_preferences_nearest_by_two(self):
        self.assertEqual(([2, 4], {"NEAREST"}), self.built(ORIN_PREFERENCES=self.path("none.toml")))


class BadPreferences(Case):
    def test_a_named_file_that_is_missing_is_reported(self):
        missing = self.path("none.toml")
        answer = run("info", self.path("missing.tif"), ORIN_PREFERENCES=missing)
        self.assertIn(f"orin-overviews: {missing}: The preference file does not exist.",
                      answer.stderr)

    def test_unknown_keys_are_reported(self):
        file, errors = self.warning('[raster-layer]\noverview-metod = "average"\n'
                                    "[raster]\ndecimation-factor = 3\n")
        self.assertIn(f'{file}:2: Unknown key "overview-metod"', errors)
        self.assertIn(f'{file}:3: Unknown key "raster"', errors)

    def warning(self, text):
        """Standard error of a run whose preference file holds `text`."""
        preferences = self.path("bad.toml", text)
        answer = run("info", self.path("missing.tif"), ORIN_PREFERENCES=preferences)
        return preferences, answer.stderr

    def test_a_value_that_cannot_be_used_is_reported_with_file_and_line(self):
        file, errors = self.warning('[raster-layer]\noverview-method = "average"\n'
                                    "decimation-factor = 5\n")
        self.assertIn(f"orin-overviews: {file}:3: decimation-factor must be 2 or 3.", errors)
        self.assertNotIn(":2:", errors)

    def test_a_file_that_is_not_toml_is_reported_with_the_line(self):
        file, errors = self.warning("[raster-layer]\n\noverview-method =\n")
        self.assertIn(f"orin-overviews: {file}:3: ", errors)
        self.assertIn("The defaults apply.", errors)


if __name__ == "__main__":
    unittest.main()
