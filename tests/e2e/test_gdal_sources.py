# SPDX-License-Identifier: MIT
"""Where the pixels of an image come from beside its own file: sources, headers, masks."""

import os
import shutil
import subprocess
import unittest
import zipfile

import numpy
from osgeo import gdal, osr

from mask_case import write_mask_beside
from mask_twin import disc
from orin_e2e import TOOL, info, random_pixels, run
from test_gdal_formats import COLUMNS, Formats, ROWS, write

SOURCE = """<VRTRasterBand dataType="Byte" band="1"><SimpleSource>%s
<SourceBand>1</SourceBand></SimpleSource></VRTRasterBand>"""


def write_vrt(path, bands, attributes=""):
    with open(path, "w", encoding="utf-8") as text:
        text.write(f'<VRTDataset rasterXSize="{COLUMNS}" rasterYSize="{ROWS}" {attributes}>'
                   f"{bands}</VRTDataset>")


class Sources(Formats):
    def setUp(self):
        super().setUp()
        self.pixels = random_pixels((1, ROWS, COLUMNS), numpy.uint8, 1)
        self.write_image()

    def write_image(self, change=0):
        system = osr.SpatialReference()
        system.ImportFromEPSG(4326)
        dataset = gdal.GetDriverByName("GTiff").Create("image.tif", COLUMNS, ROWS, 1)
        dataset.SetGeoTransform([10, 0.01, 0, 50, 0, -0.01])
        dataset.SetProjection(system.ExportToWkt())
        dataset.GetRasterBand(1).WriteArray(self.pixels[0] ^ change)

    def states(self, name):
        return {level["state"] for level in info(name)["levels"]}

    def build(self, name, state="current"):
        self.assertRan(run("build", name, "--levels", "2,4", "--method", "nearest"))
        self.assertEqual({state}, self.states(name))

    def check_edit_is_seen(self, name, edit):
        self.build(name)
        edit()
        self.assertIn(self.states(name), ({"stale"}, set()))  # none: of another type or size


class VirtualRasters(Sources):
    def edit_image(self):
        self.write_image(change=255)

    def test_a_warped_raster_depends_on_its_source(self):
        gdal.Warp("warped.vrt", "image.tif", format="VRT", xRes=0.02, yRes=0.02)
        with open("warped.vrt", encoding="utf-8") as text:
            self.assertIn("<SourceDataset", text.read())
        self.check_edit_is_seen("warped.vrt", self.edit_image)

    def test_names_are_found_however_they_are_written(self):
        os.rename("image.tif", "b&c.tif")
        for name in (
                '<SourceFilename relativetoVRT="1">b&amp;c.tif</SourceFilename>',
                "<SourceFilename relativeToVRT='1' shared='0'>b&#38;c.tif</SourceFilename>",
                "<sourcefilename relativetovrt='1'>b&#x26;c.tif</sourcefilename>",
                '<SourceFilename\n relativeToVRT = "1" >./b&amp;c.tif</SourceFilename >',
                f"<SourceFilename>{os.getcwd()}/b&amp;c.tif</SourceFilename>"):
            with self.subTest(name=name):
                write_vrt("image.vrt", SOURCE % name)
                self.build("image.vrt")
                os.utime("b&c.tif")
                self.assertEqual({"stale"}, self.states("image.vrt"))
                os.remove("image.vrt.ovr")

    def test_raw_pixels_are_a_source(self):
        self.pixels.tofile("image.raw")
        write_vrt("image.vrt",
                  '<VRTRasterBand dataType="Byte" band="1" subClass="VRTRawRasterBand">'
                  '<SourceFilename relativetoVRT="1">image.raw</SourceFilename></VRTRasterBand>')
        self.check_edit_is_seen("image.vrt", lambda: (255 - self.pixels).tofile("image.raw"))

    def test_a_page_and_a_part_of_an_archive_lead_to_their_files(self):
        def write_archive():
            with zipfile.ZipFile("all.zip", "w") as archive:
                archive.write("image.tif", "folder/image.tif")

        def edit_archive():
            self.edit_image()
            write_archive()

        write_archive()
        page = f"GTIFF_DIR:1:{os.getcwd()}/image.tif"
        part = f"/vsizip/{os.getcwd()}/all.zip/folder/image.tif"
        braces = f"/vsizip/{{{os.getcwd()}/all.zip}}/folder/image.tif"
        for name, edit in ((page, self.edit_image), (part, edit_archive), (braces, edit_archive)):
            with self.subTest(name=name):
                self.write_image()
                write_archive()
                write_vrt("image.vrt", SOURCE % f"<SourceFilename>{name}</SourceFilename>")
                self.check_edit_is_seen("image.vrt", edit)
                os.remove("image.vrt.ovr")

    def test_a_text_in_a_text_and_a_raster_of_a_raster_lead_to_the_source(self):
        gdal.Translate("inner.vrt", os.path.abspath("image.tif"))
        with open("inner.vrt", encoding="utf-8") as text:
            escaped = text.read().replace("&", "&amp;").replace("<", "&lt;")
        os.remove("inner.vrt")
        write_vrt("image.vrt", SOURCE % f"<SourceFilename>{escaped}</SourceFilename>")
        self.check_edit_is_seen("image.vrt", self.edit_image)

    def test_mask_file_and_header_of_a_source_count(self):
        gdal.Translate("masked.vrt", "image.tif")
        self.check_edit_is_seen("masked.vrt",
                                lambda: write_mask_beside("image.tif", disc(COLUMNS, ROWS)))
        write("cube.envi", "ENVI", self.pixels, "Byte")
        gdal.Translate("cube.vrt", "cube.envi")
        self.check_edit_is_seen("cube.vrt", lambda: os.utime("cube.hdr"))

    def test_what_leads_to_no_file_is_unverified(self):
        os.makedirs("folder")
        for name in ("folder", "/vsimem/none.tif", "/vsicurl/http://127.0.0.1:1/none.tif"):
            with self.subTest(name=name):
                write_vrt("image.vrt", SOURCE % "<SourceFilename>image.tif</SourceFilename>"
                          f"<Metadata><MDI key='X_DATASET'>{name}</MDI></Metadata>")
                self.build("image.vrt", state="unverified")
                os.remove("image.vrt.ovr")


class Headers(Sources):
    """Files without a header of their own: what stands beside decides how they are read."""

    def edit_header(self, name, old, new):
        with open(name, encoding="utf-8") as header:
            text = header.read()
        self.assertIn(old, text)
        with open(name, "w", encoding="utf-8") as header:
            header.write(text.replace(old, new))

    def test_of_envi_byte_order_interleave_offset_and_type(self):
        pixels = random_pixels((3, ROWS, COLUMNS), numpy.int16, 1)
        for old, new in (("byte order = 0", "byte order = 1"),
                         ("interleave = bsq", "interleave = bil"),
                         ("data type = 2", "data type = 12"),
                         ("header offset = 0", "header offset = 0\nheader offset = 2")):
            with self.subTest(edit=new):
                write("cube.envi", "ENVI", pixels, "Int16")
                with open("cube.envi", "ab") as file:
                    file.write(bytes(16))
                self.check_edit_is_seen("cube.envi", lambda: self.edit_header("cube.hdr", old, new))
                os.remove("cube.envi.ovr")

    def test_of_ehdr_byte_order_layout_and_skipped_bytes(self):
        pixels = random_pixels((3, ROWS, COLUMNS), numpy.uint16, 1)
        for old, new in (("BYTEORDER      I", "BYTEORDER      M"),
                         ("LAYOUT         BIL", "LAYOUT BSQ"),
                         ("PIXELTYPE      UNSIGNEDINT", "PIXELTYPE SIGNEDINT"),
                         ("LAYOUT", "SKIPBYTES 2\nLAYOUT")):
            with self.subTest(edit=new):
                write("scene.bil", "EHdr", pixels, "UInt16")
                with open("scene.bil", "ab") as file:
                    file.write(bytes(16))
                self.check_edit_is_seen("scene.bil",
                                        lambda: self.edit_header("scene.hdr", old, new))
                os.remove("scene.bil.ovr")

    def test_of_ehdr_a_palette_that_is_added(self):
        write("scene.bil", "EHdr", self.pixels, "Byte")

        def add():
            with open("scene.clr", "w", encoding="utf-8") as palette:
                palette.write("".join(f"{i} {255 - i} 0 0\n" for i in range(256)))
        self.check_edit_is_seen("scene.bil", add)

    def test_places_on_the_earth_and_statistics_leave_levels_current(self):
        write("scene.bil", "EHdr", self.pixels, "Byte")
        self.build("scene.bil")
        self.edit_header("scene.hdr", "ULXMAP", "ULXMAP 1\nIGNORED")
        with open("scene.prj", "w", encoding="utf-8") as system:
            system.write("Projection GEOGRAPHIC\n")
        with open("scene.stx", "w", encoding="utf-8") as statistics:
            statistics.write("1 0 255 128 10\n")
        self.assertEqual({"current"}, self.states("scene.bil"))


class Refusals(Sources):
    """Why a file is not read, in the words of the system, and what to do."""

    def check(self, name, *texts):
        answer = run("info", name, **({"user": 65534} if os.geteuid() == 0 else {}))
        self.assertNotEqual(0, answer.returncode)
        for text in texts:
            self.assertIn(text, answer.stderr)

    def test_are_those_of_the_system(self):
        write("photo.png", "PNG", self.pixels, "Byte")
        os.chmod(".", 0o755)
        for name in ("photo.png", "image.tif"):
            os.chmod(name, 0)
            self.check(name, f"{name}: cannot be opened: Permission denied.")
        os.mkdir("folder.tif")
        self.check("folder.tif", "is a directory")
        self.check("/dev/null", "is a pipe or a device")
        self.check("missing.png", "missing.png: cannot be opened: No such file or directory.")

    def test_of_an_unknown_format_name_the_way_out(self):
        os.chmod(".", 0o755)
        with open("raster.xyz", "wb") as file:
            file.write(b"no format of ours")
        self.check("raster.xyz", "known format", "gdal_translate raster.xyz OUT.tif")

    def test_inside_an_archive_are_those_of_the_library(self):
        with zipfile.ZipFile("all.zip", "w") as archive:
            archive.write("image.tif")
        self.check(f"/vsizip/{os.getcwd()}/all.zip/other.tif", "does not exist in the file system")


class Pipes(Sources):
    """What is opened under the name of an image may be a pipe: nobody waits for it."""

    def check_refused(self, name, pipe):
        answer = subprocess.run([TOOL, "info", name], capture_output=True, text=True, timeout=30,
                                stdin=subprocess.DEVNULL)
        self.assertNotEqual(0, answer.returncode)
        self.assertRegex(answer.stderr, f"{pipe} is a pipe")

    def test_beside_an_image(self):
        for pipe in ("photo.png.aux.xml", "photo.png.ovr", "photo.png.msk", "photo.pgw"):
            with self.subTest(pipe=pipe):
                write("photo.png", "PNG", self.pixels, "Byte")
                os.mkfifo(pipe)
                self.check_refused("photo.png", pipe)
                os.remove(pipe)
        write("cube.envi", "ENVI", self.pixels, "Byte")
        os.remove("cube.hdr")
        os.mkfifo("cube.hdr")
        self.check_refused("cube.envi", "cube.hdr")

    def test_of_another_name_are_none_of_its_business(self):
        write("photo.png", "PNG", self.pixels, "Byte")
        for pipe in ("photos.png", "photo", "other.aux.xml"):
            os.mkfifo(pipe)
        self.assertEqual([], info("photo.png")["levels"])

    def test_as_a_source_or_beside_a_source(self):
        os.mkfifo("pipe.tif")
        for text in (SOURCE % "<SourceFilename relativeToVRT='1'>pipe.tif</SourceFilename>",
                     "<VRTRasterBand dataType='Byte' band='1' subClass='VRTRawRasterBand'>"
                     "<SourceFilename relativeToVRT='1'>pipe.tif</SourceFilename></VRTRasterBand>"):
            write_vrt("image.vrt", text)
            self.check_refused("image.vrt", "pipe.tif")
        gdal.Warp("warped.vrt", "image.tif", format="VRT", xRes=0.02, yRes=0.02)
        gdal.Translate("outer.vrt", "warped.vrt")
        shutil.move("pipe.tif", "image.tif.aux.xml")
        self.check_refused("outer.vrt", "image.tif.aux.xml")

    def test_as_the_image(self):
        os.mkfifo("pipe.png")
        answer = subprocess.run([TOOL, "info", "pipe.png"], capture_output=True, text=True,
                                timeout=30, check=False)
        self.assertNotEqual(0, answer.returncode)
        self.assertIn("pipe.png", answer.stderr)


if __name__ == "__main__":
    unittest.main()
