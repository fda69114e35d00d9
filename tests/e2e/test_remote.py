# SPDX-License-Identifier: MIT
"""Rasters on a web server: read in parts, levels refused where none can be written."""

import http.server
import os
import re
import threading
import unittest

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
            self.send_error(404)
            return
        with open(path, "rb") as file:
            content = file.read()
        size, part = len(content), re.match(r"bytes=(\d+)-(\d*)$", self.headers.get("Range", ""))
        self.send_response(206 if part else 200)
        if part:
            first, last = int(part[1]), min(int(part[2] or size - 1), size - 1)
            self.send_header("Content-Range", f"bytes {first}-{last}/{size}")
            content = content[first:last + 1]
        self.send_header("Accept-Ranges", "bytes")
        self.send_header("Content-Length", str(len(content)))
        self.end_headers()
        if sends_content:
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
