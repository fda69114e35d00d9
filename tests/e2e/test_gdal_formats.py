# SPDX-License-Identifier: MIT
"""Every format but TIFF: levels beside the file, read back by other programs."""

import os
import subprocess
import unittest
import zipfile

import numpy
from osgeo import gdal
import rasterio

from mask_twin import disc, level_validity
from orin_e2e import (Case, NUMPY_TYPES, info, nearest, overview_sizes, random_opaque_pixels,
                      random_pixels, read_pixels, run)

ROWS, COLUMNS = 205, 333

# Driver, file, GDAL's type, channels, creation options. What a driver cannot write itself it is
# given through CreateCopy.
FORMATS = (
    ("PNG", "rgb.png", "Byte", 3, ()),
    ("PNG", "alpha.png", "Byte", 4, ()),
    ("PNG", "deep.png", "UInt16", 1, ()),
    ("JPEG", "photo.jpg", "Byte", 3, ()),
    ("JPEG", "grey.jpg", "Byte", 1, ("PROGRESSIVE=ON",)),
    ("JP2OpenJPEG", "photo.jp2", "Byte", 3, ()),
    ("JP2OpenJPEG", "deep.jp2", "UInt16", 1, ("REVERSIBLE=YES", "QUALITY=100")),
    ("WEBP", "photo.webp", "Byte", 3, ("LOSSLESS=YES",)),
    ("GIF", "classes.gif", "Byte", 1, ()),
    ("BMP", "rgb.bmp", "Byte", 3, ()),
    ("ENVI", "cube.envi", "Int16", 3, ("INTERLEAVE=BIL",)),
    ("ENVI", "complex.envi", "CFloat32", 1, ()),
    ("EHdr", "heights.bil", "Int16", 1, ()),
    ("AAIGrid", "grid.asc", "Int32", 1, ()),
    ("netCDF", "field.nc", "Float32", 1, ()),
    ("NITF", "scene.ntf", "Byte", 3, ()),
    ("GRIB", "field.grib2", "Float64", 2, ("DATA_ENCODING=IEEE_FLOATING_POINT",)),
    ("MRF", "tiles.mrf", "Byte", 3, ()),
)


def write(path, driver, pixels, type_name, options=(), no_data=()):
    """Writes pixels of shape (channels, rows, columns) through GDAL."""
    memory = gdal.GetDriverByName("MEM").Create("", pixels.shape[2], pixels.shape[1],
                                                pixels.shape[0], gdal.GetDataTypeByName(type_name))
    if driver != "NITF":  # takes no georeference without a coordinate system
        memory.SetGeoTransform((10, 0.01, 0, 50, 0, -0.01))
    if driver == "GRIB":  # takes none without
        memory.SetProjection('GEOGCS["WGS 84",DATUM["WGS_1984",SPHEROID["WGS 84",6378137,'
                             '298.257223563]],PRIMEM["Greenwich",0],UNIT["degree",'
                             '0.0174532925199433]]')
    for index, channel in enumerate(pixels):
        memory.GetRasterBand(index + 1).WriteArray(channel)
    for index, value in enumerate(no_data):
        if value is not None:
            memory.GetRasterBand(index + 1).SetNoDataValue(value)
    copy = gdal.GetDriverByName(driver).CreateCopy(str(path), memory, options=list(options))
    copy.FlushCache()
    del copy
    if os.path.exists(f"{path}.aux.xml"):
        os.remove(f"{path}.aux.xml")


class Formats(Case):
    def setUp(self):
        super().setUp()
        previous = os.getcwd()
        os.chdir(self.folder)
        self.addCleanup(os.chdir, previous)

    def check_levels(self, name, pixels):
        """Levels 2 and 4 of `name`, as GDAL finds them, against the slow twin."""
        size = (pixels.shape[2], pixels.shape[1])
        two = nearest(pixels, 1, 2, size)
        self.assertEqual([(size[0] // 2, size[1] // 2), (size[0] // 4, size[1] // 4)],
                         overview_sizes(name))
        self.assertSamePixels(two, read_pixels(name, 0))
        self.assertSamePixels(nearest(two, 2, 4, size), read_pixels(name, 1))


class SideCars(Formats):
    def test_of_every_format_are_its_overviews_in_other_programs(self):
        for number, (driver, name, type_name, channels, options) in enumerate(FORMATS):
            with self.subTest(format=driver, name=name):
                make = random_opaque_pixels if channels == 4 else random_pixels
                pixels = make((channels, ROWS, COLUMNS), NUMPY_TYPES[type_name], number)
                write(name, driver, pixels, type_name, options)
                stored = read_pixels(name)  # codecs may be lossy, GIF renumbers
                files = set(os.listdir("."))
                before = {file: os.stat(file).st_mtime_ns for file in files}
                answer = run("build", name, "--method", "nearest", "--levels", "2,4")
                self.assertRan(answer)
                self.assertEqual(files | {name + ".ovr"}, set(os.listdir(".")))
                self.assertEqual(before, {file: os.stat(file).st_mtime_ns for file in files})
                self.check_levels(name, stored)
                with rasterio.open(name) as dataset:
                    self.assertEqual([2, 4], dataset.overviews(1))
                listed = info(name)
                self.assertEqual([2, 4], [level["level"] for level in listed["levels"]])
                self.assertIn("nothing to do", run("build", name, "--levels", "2,4").stdout)
                for file in os.listdir("."):
                    os.remove(file)

    def test_of_virtual_rasters_over_tiff_and_jpeg(self):
        for driver, name in (("GTiff", "image.tif"), ("JPEG", "image.jpg")):
            with self.subTest(format=driver):
                write(name, driver, random_pixels((3, ROWS, COLUMNS), numpy.uint8, 1), "Byte")
                gdal.Translate("part.vrt", name, srcWin=[10, 20, 300, 150])
                self.assertRan(run("build", "part.vrt", "--levels", "2,4", "--method", "nearest"))
                self.check_levels("part.vrt", read_pixels("part.vrt"))
                os.remove("part.vrt.ovr")

    def test_levels_that_a_format_makes_up_are_not_counted(self):
        pixels = random_pixels((3, 900, 1100), numpy.uint8, 1)
        write("photo.jpg", "JPEG", pixels, "Byte")
        self.assertNotEqual([], overview_sizes("photo.jpg"))
        self.assertEqual([], info("photo.jpg")["levels"])
        gdal.Translate("photo.vrt", "photo.jpg")
        self.assertEqual([], info("photo.vrt")["levels"])

    def test_full_resolution_is_the_source_where_the_format_offers_less(self):
        pixels = random_pixels((1, 1024, 1024), numpy.uint8, 1)
        write("photo.jpg", "JPEG", pixels, "Byte")
        self.assertRan(run("build", "photo.jpg", "--levels", "4", "--method", "average"))
        stored = read_pixels("photo.jpg")[0].reshape(256, 4, 256, 4).mean(axis=(1, 3))
        level = read_pixels("photo.jpg.ovr")[0]
        self.assertLessEqual(numpy.abs(level - stored).max(), 0.5)

    def test_cannot_be_asked_for_inside_the_file(self):
        write("rgb.png", "PNG", random_pixels((3, ROWS, COLUMNS), numpy.uint8, 1), "Byte")
        answer = run("build", "rgb.png", "--internal")
        self.assertNotEqual(0, answer.returncode)
        self.assertIn("PNG files hold no levels inside", answer.stderr)
        self.assertEqual(["rgb.png"], os.listdir("."))

    def test_of_an_image_made_on_one_bit_are_not_needed(self):
        pixels = random_pixels((1, ROWS, COLUMNS), numpy.uint8, 1) % 2
        write("bits.png", "PNG", pixels, "Byte", ["NBITS=1"])
        self.assertEqual("bit", info("bits.png")["channels"][0]["type"])
        self.assertRan(run("build", "bits.png"))
        self.assertEqual(["bits.png"], os.listdir("."))


class NoData(Formats):
    def test_of_each_channel_is_its_own(self):
        pixels = random_pixels((2, ROWS, COLUMNS), numpy.int16, 3) % 100
        pixels[0, 50:60, 50:60] = -1
        pixels[1, 80:90, 80:90] = -2
        write("image.tif", "GTiff", pixels, "Int16")
        gdal.Translate("own.vrt", "image.tif")
        dataset = gdal.Open("own.vrt", gdal.GA_Update)
        dataset.GetRasterBand(1).SetNoDataValue(-1)
        dataset.GetRasterBand(2).SetNoDataValue(-2)
        del dataset
        self.assertRan(run("build", "own.vrt", "--levels", "2", "--method", "average"))
        levels = read_pixels("own.vrt", 0)
        self.assertTrue((levels[0, 25:30, 25:30] == -1).all())
        self.assertTrue((levels[1, 40:45, 40:45] == -2).all())
        self.assertTrue((levels[0, 40:45, 40:45] >= 0).all())

    def test_declared_beside_the_file_counts(self):
        pixels = random_pixels((1, ROWS, COLUMNS), numpy.uint8, 3) % 100
        pixels[0, 50:60, 50:60] = 200
        pixels[0, 50:60:2, 50:60:2] = 255
        write("image.bmp", "BMP", pixels, "Byte")
        with open("image.bmp.aux.xml", "w", encoding="utf-8") as file:
            file.write('<PAMDataset><PAMRasterBand band="1"><NoDataValue>255</NoDataValue>'
                       "</PAMRasterBand></PAMDataset>")
        before = os.stat("image.bmp.aux.xml").st_mtime_ns
        self.assertRan(run("build", "image.bmp", "--levels", "2", "--method", "average"))
        self.assertTrue((read_pixels("image.bmp", 0)[0, 25:30, 25:30] == 200).all())
        self.assertEqual(before, os.stat("image.bmp.aux.xml").st_mtime_ns)

    def test_nan_and_infinities_leave_no_rim(self):
        places = (("ENVI", "heights.envi"), ("netCDF", "field.nc"), ("GTiff", "heights.tif"))
        for driver, file in places:
            for value in (float("nan"), float("-inf")):
                name = file
                with self.subTest(format=driver, value=value):
                    pixels = random_pixels((1, ROWS, COLUMNS), numpy.float32, 3) + 9000
                    pixels[0, 50:90, 40:101] = value
                    write(name, driver, pixels, "Float32", no_data=[value])
                    if driver == "GTiff":
                        gdal.Translate("heights.vrt", name)
                        name = "heights.vrt"
                    self.assertRan(run("build", name, "--levels", "2,4", "--method", "average"))
                    for index, level in ((0, 2), (1, 4)):
                        stored = read_pixels(name, index)[0]
                        hole = ~numpy.isfinite(stored)
                        rows, columns = (slice(-(-50 // level), 90 // level),
                                         slice(40 // level, 100 // level))
                        self.assertTrue(hole[rows, columns].all())
                        self.assertTrue(numpy.array_equal(
                            stored[hole], numpy.full(hole.sum(), value, stored.dtype),
                            equal_nan=True))
                        self.assertGreater(stored[~hole].min(), 4000)
                        self.assertLess(hole.sum(), 42 * 64 // (level * level) + 60)
                    for other in os.listdir("."):
                        os.remove(other)

    def test_of_64_bits_is_exact(self):
        value = 2**63 - 1
        pixels = numpy.full((1, 64, 64), value - 1, numpy.int64)
        pixels[0, :32] = value
        memory = gdal.GetDriverByName("GTiff").Create("image.tif", 64, 64, 1, gdal.GDT_Int64)
        memory.GetRasterBand(1).WriteArray(pixels[0])
        memory.GetRasterBand(1).SetNoDataValue(value)
        del memory
        gdal.Translate("image.vrt", "image.tif")
        self.assertRan(run("build", "image.vrt", "--levels", "2", "--method", "nearest"))
        self.assertSamePixels(pixels[:, ::2, ::2], read_pixels("image.vrt", 0))


class Channels(Formats):
    def test_of_opacity_say_what_is_valid(self):
        for method in ("average", "bilinear", "nearest"):
            with self.subTest(method=method):
                valid = disc(COLUMNS, ROWS)
                pixels = numpy.empty((4, ROWS, COLUMNS), numpy.uint8)
                pixels[:3] = numpy.where(valid, 150, 3)  # 3: colours that nobody sees
                pixels[3] = valid * 255
                write("rgba.png", "PNG", pixels, "Byte")
                self.assertRan(run("build", "rgba.png", "--levels", "2,4", "--method", method))
                two = level_validity(valid, 1, 2, (COLUMNS, ROWS), method, 1)
                four = level_validity(two, 2, 4, (COLUMNS, ROWS), method, 1)
                for index, expected in enumerate((two, four)):
                    level = read_pixels("rgba.png", index)
                    self.assertTrue(((level[3] > 0) == expected).all())
                    self.assertEqual({150}, set(level[:3, expected].flatten().tolist()))
                    self.assertEqual({0}, set(level[:3, ~expected].flatten().tolist()))
                with rasterio.open("rgba.png.ovr") as levels:
                    self.assertEqual("alpha", levels.colorinterp[3].name)
                os.remove("rgba.png.ovr")

    def test_of_classes_are_not_blended_without_a_warning(self):
        pixels = random_pixels((1, ROWS, COLUMNS), numpy.uint8, 1) % 3
        write("classes.gif", "GIF", pixels, "Byte")
        memory = gdal.GetDriverByName("MEM").Create("", COLUMNS, ROWS, 1)
        memory.GetRasterBand(1).WriteArray(pixels[0])
        colours = gdal.ColorTable()
        for index in range(3):
            colours.SetColorEntry(index, (index * 50, 0, 0, 255))
        memory.GetRasterBand(1).SetColorTable(colours)
        gdal.GetDriverByName("PNG").CreateCopy("classes.png", memory)
        gdal.GetDriverByName("HFA").CreateCopy("classes.img", memory)
        for name in ("classes.gif", "classes.png", "classes.img"):
            with self.subTest(name=name):
                answer = run("build", name, "--levels", "2", "--method", "average")
                self.assertRan(answer)
                self.assertIn("numbers of palette colours or classes", answer.stderr)
                answer = run("build", name, "--levels", "2", "--method", "mode", "--force")
                self.assertRan(answer)
                self.assertEqual("", answer.stderr)

    def test_of_few_bits_stay_so(self):
        pixels = random_pixels((1, ROWS, COLUMNS), numpy.uint16, 1) % 4096
        write("deep.jp2", "JP2OpenJPEG", pixels, "UInt16",
              ["NBITS=12", "REVERSIBLE=YES", "QUALITY=100"])
        self.assertRan(run("build", "deep.jp2", "--levels", "2", "--method", "bicubic"))
        self.assertLessEqual(read_pixels("deep.jp2", 0).max(), 4095)
        with rasterio.open("deep.jp2.ovr") as levels:
            self.assertEqual("12", levels.tags(1, ns="IMAGE_STRUCTURE")["NBITS"])


class Damaged(Formats):
    def check_refused(self, name):
        answer = run("build", name, "--levels", "2")
        self.assertNotEqual(0, answer.returncode, name)
        self.assertIn(name, answer.stderr)
        for line in answer.stderr.splitlines():
            self.assertTrue(line.startswith("orin-overviews: "), line)
        if os.path.exists(name + ".ovr"):
            # A channel that lies before the cut may be whole.
            self.assertFalse(any(all(channel["valid"] for channel in level["channels"])
                                 for level in info(name)["levels"]), name)

    def test_files_cut_in_the_middle_are_refused_and_leave_no_valid_level(self):
        cut = ("rgb.png", "photo.jpg", "photo.jp2", "photo.webp", "classes.gif", "rgb.bmp",
               "cube.envi", "heights.bil", "grid.asc", "field.nc", "scene.ntf", "field.grib2")
        for number, (driver, name, type_name, channels, options) in enumerate(FORMATS):
            if name not in cut:
                continue
            with self.subTest(format=driver):
                pixels = random_pixels((channels, ROWS, COLUMNS), NUMPY_TYPES[type_name], number)
                write(name, driver, pixels, type_name, options)
                os.truncate(name, os.path.getsize(name) * 6 // 10)
                self.check_refused(name)

    def test_a_virtual_raster_without_its_source_is_refused(self):
        write("image.tif", "GTiff", random_pixels((1, ROWS, COLUMNS), numpy.uint8, 1), "Byte")
        gdal.Translate("image.vrt", "image.tif")
        os.remove("image.tif")
        self.check_refused("image.vrt")

    def test_what_is_no_raster_is_refused(self):
        for name, content in (("empty.png", b""), ("text.jpg", b"no picture"),
                              ("head.img", b"EHFA_HEADER_TAG\0" + b"\xff" * 40)):
            with open(name, "wb") as file:
                file.write(content)
            with self.subTest(name=name):
                self.check_refused(name)
                self.assertNotEqual(0, run("info", name).returncode)


class Containers(Formats):
    def setUp(self):
        super().setUp()
        self.pixels = random_pixels((1, ROWS, COLUMNS), numpy.float32, 7)
        write("field.nc", "netCDF", numpy.concatenate([self.pixels] * 2), "Float32")

    def test_without_a_raster_of_their_own_name_those_inside(self):
        answer = run("info", "field.nc")
        self.assertNotEqual(0, answer.returncode)
        self.assertIn("'NETCDF:\"field.nc\":Band2'", answer.stderr)

    def test_rasters_inside_are_read_and_the_side_car_refused_where_nobody_would_look(self):
        name = 'NETCDF:"field.nc":Band2'
        self.assertEqual((COLUMNS, ROWS), (info(name)["width"], info(name)["height"]))
        answer = run("build", name)
        self.assertNotEqual(0, answer.returncode)
        self.assertIn(name + ".ovr", answer.stderr)
        self.assertIn("VRT", answer.stderr)
        self.assertEqual(["field.nc"], os.listdir("."))

    def test_one_that_holds_one_raster_is_that_raster(self):
        write("one.nc", "netCDF", self.pixels, "Float32", ["FORMAT=NC4"])
        os.rename("one.nc", "one.h5")
        self.assertEqual("HDF5", info("one.h5")["format"]["name"])
        stored = read_pixels("one.h5")
        self.assertRan(run("build", "one.h5", "--method", "nearest", "--levels", "2,4"))
        # The library looks for no side-car of it; the levels are there all the same.
        self.assertSamePixels(nearest(stored, 1, 2, (COLUMNS, ROWS)), read_pixels("one.h5.ovr"))
        self.assertIn("nothing to do", run("build", "one.h5", "--levels", "2,4").stdout)
        self.assertEqual({"field.nc", "one.h5", "one.h5.ovr"}, set(os.listdir(".")))

    def test_of_hdf5_work_alike(self):
        write("two.nc", "netCDF", numpy.concatenate([self.pixels] * 2), "Float32", ["FORMAT=NC4"])
        os.rename("two.nc", "two.h5")
        self.assertIn("'HDF5:\"two.h5\"://Band2'", run("info", "two.h5").stderr)
        name = 'HDF5:"two.h5"://Band2'
        self.assertEqual((COLUMNS, ROWS), (info(name)["width"], info(name)["height"]))
        self.assertIn(name + ".ovr", run("build", name).stderr)
        gdal.Translate("band2.vrt", name)
        stored = read_pixels("band2.vrt")
        self.assertSamePixels(numpy.sort(self.pixels, axis=None), numpy.sort(stored, axis=None))
        self.assertRan(run("build", "band2.vrt", "--method", "nearest", "--levels", "2,4"))
        self.check_levels("band2.vrt", stored)

    def test_rasters_inside_get_levels_through_a_virtual_raster(self):
        gdal.Translate("band2.vrt", 'NETCDF:"field.nc":Band2')
        self.assertRan(run("build", "band2.vrt", "--method", "nearest", "--levels", "2,4"))
        self.check_levels("band2.vrt", self.pixels)


class Archives(Formats):
    def setUp(self):
        super().setUp()
        self.pixels = random_pixels((3, ROWS, COLUMNS), numpy.uint8, 7)
        write("image.tif", "GTiff", self.pixels, "Byte")
        write("image.png", "PNG", self.pixels, "Byte")
        with zipfile.ZipFile("archive.zip", "w") as archive:
            archive.write("image.tif")
            archive.write("image.png")
        subprocess.run(["gzip", "-k", "image.png"], check=True)
        os.remove("image.tif")

    def test_are_read_and_the_side_car_refused_naming_its_place(self):
        files = set(os.listdir("."))
        for name in ("/vsizip/archive.zip/image.tif", "/vsizip/archive.zip/image.png",
                     "/vsigzip/image.png.gz", f"/vsizip/{self.folder}/archive.zip/image.png"):
            with self.subTest(name=name):
                self.assertEqual(COLUMNS, info(name)["width"])
                answer = run("build", name, "--levels", "2")
                self.assertNotEqual(0, answer.returncode)
                self.assertIn(name + ".ovr", answer.stderr)
                self.assertEqual(files, set(os.listdir(".")))

    def test_get_levels_through_a_virtual_raster(self):
        gdal.Translate("image.vrt", "/vsizip/archive.zip/image.tif")
        self.assertRan(run("build", "image.vrt", "--method", "nearest", "--levels", "2,4"))
        self.check_levels("image.vrt", self.pixels)

    def test_that_do_not_hold_the_name_are_refused(self):
        answer = run("info", "/vsizip/archive.zip/other.tif")
        self.assertNotEqual(0, answer.returncode)
        self.assertIn("/vsizip/archive.zip/other.tif: cannot be opened", answer.stderr)


if __name__ == "__main__":
    unittest.main()
