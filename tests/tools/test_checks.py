# SPDX-License-Identifier: MIT
"""The checks of the tree find what is planted in a small tree, and pass it when nothing is."""
import os
import pathlib
import subprocess
import tempfile
import unittest

SCRIPTS = pathlib.Path(os.environ["ORIN_SCRIPTS"])
HEAD = "// SPDX-License-Identifier: MIT\n"


class Tree(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.root = pathlib.Path(folder.name)
        self.write("host/services/text.h", HEAD)
        self.write("basic/gobs/raster.h",
                   HEAD + '#include "host/services/text.h"\n#include <vector>\n')

    def write(self, name, text):
        path = self.root / name
        path.parent.mkdir(parents=True, exist_ok=True)
        path.write_text(text)

    def run_check(self, script):
        done = subprocess.run([SCRIPTS / script, self.root],
                              capture_output=True, text=True, check=False)
        self.assertEqual("", done.stderr)
        return done.returncode, done.stdout

    def assert_passes(self, script):
        self.assertEqual((0, ""), self.run_check(script))

    def assert_finds(self, script, *words):
        code, output = self.run_check(script)
        self.assertEqual(1, code)
        self.assertEqual(1, len(output.splitlines()), output)
        for word in words:
            self.assertIn(word, output)


class Includes(Tree):
    def plant(self, name, include):
        self.write(name, HEAD + f"#include {include}\n")

    def test_a_lower_folder_may_be_included(self):
        self.assert_passes("check-includes")

    def test_a_higher_folder_is_refused(self):
        self.plant("host/services/up.h", '"basic/gobs/raster.h"')
        self.assert_finds("check-includes", "host/services/up.h:2:", "against the arrows")

    def test_one_driver_may_not_use_another(self):
        self.write("host/drivers/tiff/tiffdriver.h", HEAD)
        self.plant("host/drivers/memory/memorydriver.h", '"host/drivers/tiff/tiffdriver.h"')
        self.assert_finds("check-includes", "memorydriver.h:2:", "against the arrows")

    def test_a_folder_inside_another_is_its_own(self):
        self.write("processes/qrtfilters/resamplers/parallelio/iodriver.h", HEAD)
        self.plant("processes/qrtfilters/resamplers/factories.h",
                   '"processes/qrtfilters/resamplers/parallelio/iodriver.h"')
        self.assert_finds("check-includes", "factories.h:2:", "against the arrows")

    def test_a_name_that_does_not_start_at_the_root_is_refused(self):
        self.plant("basic/gobs/raster.cpp", '"raster.h"')
        self.assert_finds("check-includes", "raster.cpp:2:", "no file of the tree")

    def test_our_own_headers_stand_in_quotes(self):
        self.plant("basic/gobs/raster.cpp", "<basic/gobs/raster.h>")
        self.assert_finds("check-includes", "raster.cpp:2:", "in quotes")

    def test_libtiff_stays_in_its_driver(self):
        self.plant("host/drivers/tiff/codec.cpp", "<tiffio.h>")
        self.assert_passes("check-includes")
        self.plant("host/datasources/formats.cpp", "<tiffio.h>")
        self.assert_finds("check-includes", "formats.cpp:2:", "only in host/drivers/tiff")

    def test_the_command_line_parser_stays_in_the_tool(self):
        self.plant("apps/orin-overviews/main.cpp", "<CLI/CLI.hpp>")
        self.assert_passes("check-includes")
        self.plant("host/services/text.cpp", "<CLI/CLI.hpp>")
        self.assert_finds("check-includes", "text.cpp:2:", "only in apps")

    def test_a_folder_without_arrows_is_refused(self):
        self.write("host/extra/thing.h", HEAD)
        self.assert_finds("check-includes", "host/extra/thing.h", "no arrows")


class Files(Tree):
    def plant(self, line):
        self.write("basic/gobs/raster.cpp", HEAD + line)

    def test_a_tidy_tree_passes(self):
        self.assert_passes("check-files")

    def test_a_missing_licence_line_is_found(self):
        self.write("basic/gobs/raster.cpp", "int x;\n")
        self.assert_finds("check-files", "raster.cpp:1:", "licence")

    def test_a_hundred_columns_pass_and_one_more_is_found(self):
        self.plant("/" * 100 + "\n")
        self.assert_passes("check-files")
        self.plant("/" * 101 + "\n")
        self.assert_finds("check-files", "raster.cpp:2:", "101 columns")

    def test_450_lines_pass_and_one_more_is_found(self):
        self.plant("\n" * 449)
        self.assert_passes("check-files")
        self.plant("\n" * 450)
        self.assert_finds("check-files", "451 lines")

    def test_an_open_end_names_its_issue(self):
        self.plant("// TO" "DO(#12): wait for the next release\n")
        self.assert_passes("check-files")
        self.plant("// TO" "DO: later\n")
        self.assert_finds("check-files", "raster.cpp:2:", "without its issue")

    def test_a_home_directory_is_found(self):
        self.plant('const char* kData = "/ho' 'me/me/data";\n')
        self.assert_finds("check-files", "raster.cpp:2:", "machine")

    def test_a_missing_last_newline_is_found(self):
        self.plant("int x;")
        self.assert_finds("check-files", "raster.cpp:2:", "newline")

    def test_blanks_at_the_end_are_found(self):
        self.plant("int x; \n")
        self.assert_finds("check-files", "raster.cpp:2:", "blanks")


if __name__ == "__main__":
    unittest.main()
