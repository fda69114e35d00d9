# SPDX-License-Identifier: MIT
"""Rasters on a web server: read in parts, levels refused where none can be written."""

import contextlib
import http.server
import os
import re
import threading
import unittest
import zipfile

import numpy
from osgeo import gdal

from orin_e2e import Case, info, nearest, random_pixels, read_pixels, run, write_tiff


class Server(http.server.BaseHTTPRequestHandler):
    """Serves the files of one folder, parts of them too."""

    protocol_version = "HTTP/1.1"
    folder = None

    def answer(self, sends_content):
        path = os.path.join(self.folder, os.path.basename(self.path))
        if not os.path.isfile(path):
            self.send_error(403 if "forbidden" in path else 404)
            return
        with open(path, "rb") as file:
            content = file.read()
        size, part = len(content), re.match(r"bytes=(\d+)-(\d*)$", self.headers.get("Range", ""))
        if "whole" in path:  # as a server that knows no parts
            part = None
        self.send_response(206 if part else 200)
        if part:
            first, last = int(part[1]), min(int(part[2] or size - 1), size - 1)
            self.send_header("Content-Range", f"bytes {first}-{last}/{size}")
            content = content[first:last + 1]
        self.send_header("Accept-Ranges", "bytes")
        self.send_header("Content-Length", str(len(content)))
        self.end_headers()
        if sends_content:
            with contextlib.suppress(ConnectionError):  # who wanted a part hangs up
                self.wfile.write(content)

    def do_GET(self):
        self.answer(True)

    def do_HEAD(self):
        self.answer(False)

    def log_message(self, *_):
        pass


class Remote(Case):
    def setUp(self):
        super().setUp()
        handler = type("Handler", (Server,), {"folder": self.folder})
        server = http.server.ThreadingHTTPServer(("127.0.0.1", 0), handler)
        thread = threading.Thread(target=server.serve_forever)
        thread.start()
        self.addCleanup(thread.join)
        self.addCleanup(server.server_close)
        self.addCleanup(server.shutdown)
        self.url = f"/vsicurl/http://127.0.0.1:{server.server_port}/"
        self.direct = {"NO_PROXY": "127.0.0.1", "no_proxy": "127.0.0.1"}
        os.environ.update(self.direct)  # for `info` of the shared tools and for GDAL here

    def test_a_raster_on_a_server_is_read_and_its_side_car_refused(self):
        write_tiff(self.path("image.tif"), random_pixels((3, 300, 400), numpy.uint8, 1), "Byte")
        name = self.url + "image.tif"
        self.assertEqual((400, 300), (info(name)["width"], info(name)["height"]))
        answer = run("build", name)
        self.assertNotEqual(0, answer.returncode)
        self.assertIn(name + ".ovr", answer.stderr)

    def test_the_answer_of_the_server_is_told(self):
        write_tiff(self.path("whole.tif"), random_pixels((3, 900, 900), numpy.uint8, 1), "Byte")
        for name, reason in (("forbidden.tif", "403"), ("missing.tif", "404"),
                             ("whole.tif", "Range downloading not supported")):
            for command in ("info", "build"):
                answer = run(command, self.url + name)
                self.assertNotEqual(0, answer.returncode)
                self.assertRegex(answer.stderr, f"{name}: cannot be opened: .*{reason}")
        answer = run("info", "/vsicurl/http://127.0.0.1:1/image.tif")
        self.assertIn("cannot be opened: CURL error: Failed to connect", answer.stderr)

    def test_levels_on_a_server_and_in_an_archive_are_told_of_and_not_used(self):
        image = self.path("image.tif")
        write_tiff(image, random_pixels((3, 300, 400), numpy.uint8, 1), "Byte")
        self.assertRan(run("build", image, "--internal", "--levels", "2,4", "--method", "average"))
        dataset = gdal.Open(image, gdal.GA_Update)
        dataset.BuildOverviews("NEAREST", [8])
        del dataset
        with zipfile.ZipFile(self.path("all.zip"), "w") as archive:
            archive.write(image, "image.tif")
        for name in (self.url + "image.tif", f"/vsizip/{self.path('all.zip')}/image.tif"):
            levels = info(name)["levels"]
            self.assertEqual([(2, "AVERAGE", 1), (4, "AVERAGE", 2), (8, None, None)],
                             [(one["level"], one["method"], one["sourceLevel"]) for one in levels])
            self.assertEqual({"unverified"}, {one["state"] for one in levels})
            self.assertEqual((200, 150), (levels[0]["width"], levels[0]["height"]))
            self.assertNotIn("no overview levels", run("info", name).stdout)

    def test_a_virtual_raster_over_a_server_gets_levels(self):
        pixels = random_pixels((3, 300, 400), numpy.uint8, 1)
        write_tiff(self.path("image.tif"), pixels, "Byte")
        virtual = self.path("image.vrt")
        gdal.Translate(virtual, self.url + "image.tif")
        self.assertRan(run("build", virtual, "--levels", "2", "--method", "nearest"))
        self.assertSamePixels(nearest(pixels, 1, 2, (400, 300)), read_pixels(virtual, 0))
        self.assertEqual(["unverified"], [level["state"] for level in info(virtual)["levels"]])

    def test_what_is_not_there_is_refused(self):
        answer = run("info", self.url + "other.tif")
        self.assertNotEqual(0, answer.returncode)
        self.assertIn("other.tif: cannot be opened", answer.stderr)


if __name__ == "__main__":
    unittest.main()
