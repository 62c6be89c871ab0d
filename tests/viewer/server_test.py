"""The viewer's server: whom it refuses, and that what it gives is what other programs read."""

import array
import json
import math
import os
import re
import socket
import struct
import subprocess
import time
import unittest

from viewer import Viewer

from support import DATA, VEXG, FolderTest, gdal_pixels, needs_data, needs_gdal, run

SCENE = DATA / "landsat7_olinda.tif"


@needs_data
class Refusals(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.viewer = Viewer(SCENE)
        cls.addClassCleanup(cls.viewer.__exit__)

    def test_nothing_is_given_without_the_key_the_host_and_the_origin(self):
        key = self.viewer.key
        wrong = key[:-1] + ("0" if key[-1] != "0" else "1")
        port = self.viewer.port
        for why, options in {
            "no key": {"key": False},
            "another key": {"headers": {"X-Vexg-Key": wrong}},
            "a part of the key": {"headers": {"X-Vexg-Key": key[:-1]}},
            "the key as a query": {"key": False, "path": f"/api/scene?key={key}"},
            "a name that leads here": {"host": f"evil.example:{port}"},
            "another name of the machine": {"host": f"localhost:{port}"},
            "another port": {"host": "127.0.0.1:1"},
            "no port": {"host": "127.0.0.1"},
            "a foreign origin": {"headers": {"Origin": "http://evil.example"}},
            "an origin of another port": {"headers": {"Origin": "http://127.0.0.1:1"}},
            "a page without an origin": {"headers": {"Origin": "null"}},
            "a secure origin": {"headers": {"Origin": f"https://127.0.0.1:{port}"}},
            "a body of no known size": {"method": "POST", "path": "/api/region/0",
                                        "headers": {"Transfer-Encoding": "chunked"}},
            **{method: {"method": method} for method in ("PUT", "DELETE", "OPTIONS", "PATCH")},
            "a post to a page": {"method": "POST", "path": "/", "body": b""},
        }.items():
            with self.subTest(why):
                status, headers, body = self.viewer.ask(options.pop("path", "/api/scene"), **options)
                self.assertEqual((status, body), (403, b"refused\n"))
                self.assertNotIn("Access-Control-Allow-Origin", headers)
        for options in ({}, {"headers": {"Origin": f"http://127.0.0.1:{port}"}}, {"method": "HEAD"}):
            self.assertEqual(self.viewer.ask("/api/scene", **options)[0], 200)

    def test_the_page_comes_with_the_rules_of_a_closed_page(self):
        for path in ("/", "/main.js", "/ol.js"):
            status, headers, body = self.viewer.ask(path, key=False)
            self.assertEqual(status, 200)
            self.assertIn("default-src 'self'", headers["Content-Security-Policy"])
            self.assertIn("frame-ancestors 'none'", headers["Content-Security-Policy"])
            self.assertEqual(headers["X-Content-Type-Options"], "nosniff")
            self.assertEqual(int(headers["Content-Length"]), len(body))
        self.assertNotIn(self.viewer.key.encode(), body)

    def test_names_of_files_lead_nowhere(self):
        for path in ("/../../../../etc/passwd", "/%2e%2e/%2e%2e/etc/passwd", "/etc/passwd", "//etc/passwd",
                     "/main.js/../../mdf", "/view/main.js", "/..%5cmain.js", "/%00", "/ol.LICENSE.txt",
                     f"/api/{SCENE}", "/api/tile/../0", "/api/bands/0?bands=0,,1", "/api/nothing", "/api/",
                     "/api/pixel?x=-1&y=0", "/api/pixel?x=1e3&y=0", "/api/tile/1/0/0/0?bands=0",
                     "/api/tile/0/9/0/0?bands=0", "/api/tile/0/0/0/0?bands=6", "/api/tile/0/0/0/0?bands=",
                     "/api/tile/0/0/4294967295/0?bands=0", "/api/tile/0/0/16777216/0?bands=0",
                     "/api/tile/0/0/2/0?bands=0", "/api/shapes/0", "/api/scales/9", "/api/region/0"):
            with self.subTest(path):
                status, _, body = self.viewer.ask(path)
                self.assertIn(status, (400, 404), body[:80])
                self.assertNotIn(b"root:", body)
        for body in (b"", b"{", b"[]", b'{"ring":1}', b'{"ring":[[1,2],[3,4]]}', b'{"ring":[[1,2],[3,4],["a",5]]}',
                     b'{"ring":' + b"[" * 50000):
            self.assertEqual(self.viewer.ask("/api/region/0", "POST", body=body)[0], 404, body[:40])
        self.assertEqual(self.viewer.ask("/api/region/0", "POST", body=b" " * (2 << 20))[0], 413)
        self.assertNotIn(str(SCENE.parent), json.dumps(self.viewer.get("scene")))

    def test_other_addresses_of_the_machine_reach_nobody(self):
        for address in ("127.0.0.2", "127.1.2.3"):
            with self.assertRaises(OSError):
                socket.create_connection((address, self.viewer.port), timeout=2).close()

    def test_silent_connections_do_not_keep_a_page_waiting(self):
        silent = [socket.create_connection(("127.0.0.1", self.viewer.port)) for _ in range(64)]
        for each in silent[::2]:
            each.send(b"GET /api/scene HTTP/1.1\r\nHost: ")
        try:
            begin = time.monotonic()
            self.assertEqual(self.viewer.ask("/api/scene")[0], 200)
            self.assertLess(time.monotonic() - begin, 8)
        finally:
            for each in silent:
                each.close()


@needs_data
@needs_gdal
class Answers(FolderTest):
    def test_tiles_are_the_pixels_and_states_of_the_raster(self):
        with Viewer(SCENE) as viewer:
            told = viewer.get("scene")["rasters"][0]
            self.assertEqual((told["samples"], told["lines"], told["bands"]), (349, 352, 6))
            for column, row, left, top, width, height in ((0, 0, 0, 0, 256, 256), (1, 1, 256, 256, 93, 96)):
                status, headers, body = viewer.ask(f"/api/tile/0/0/{column}/{row}?bands=2,0")
                self.assertEqual((status, headers["X-Vexg-Size"]), (200, f"{width} {height}"))
                want = gdal_pixels(SCENE, "-b", "3", "-b", "1", "-srcwin", *map(str, (left, top, width, height)),
                                   interleave="BSQ")
                self.assertEqual(body, want + bytes(len(want)))
            status, headers, body = viewer.ask("/api/tile/0/0/0/0?bands=5&edge=1")
            self.assertEqual(headers["X-Vexg-Size"], "257 257")

    def picture(self, viewer, query):
        """The red, green, blue and alpha of the pixels of a picture of a tile."""
        status, headers, body = viewer.ask(f"/api/picture/{query}")
        self.assertEqual((status, headers.get("Content-Type")), (200, "image/png"), query)
        file = self.folder / "tile.png"
        file.write_bytes(body)
        pixels = gdal_pixels(file)
        return [tuple(pixels[4 * i:4 * i + 4]) for i in range(len(pixels) // 4)]

    def test_pictures_of_tiles_are_stretched_as_they_are_asked_for(self):
        curves = {"linear": lambda at: at, "sqrt": math.sqrt, "gamma&gamma=2.5": lambda at: at ** 0.4,
                  "log": lambda at: math.log1p(99 * at) / math.log(100)}
        red, green, blue = (gdal_pixels(SCENE, "-b", str(band), "-srcwin", "256", "256", "93", "96") for band in (4, 1, 2))
        bright = lambda value, low, high, curve: curve(min(max((value - low) / (high - low), 0), 1)) * 255  # noqa: E731
        with Viewer(SCENE) as viewer:
            for name, curve in curves.items():
                found = self.picture(viewer, f"0/0/1/1?bands=3,0,1&ends=20,90,40.5,120,30,77&curve={name}")
                for color, values in zip(found, zip(red, green, blue, strict=True), strict=True):
                    for shown, value, low, high in zip(color, values, (20, 40.5, 30), (90, 120, 77)):
                        self.assertLessEqual(abs(shown - bright(value, low, high, curve)), 0.5 + 1e-9, name)
                    self.assertEqual(color[3], 255)
            everything = sorted(gdal_pixels(SCENE, "-b", "4"))
            low, high = (everything[int(share * len(everything))] for share in (0.05, 0.95))
            for color, value in zip(self.picture(viewer, "0/0/1/1?bands=3&cut=5"), red, strict=True):
                self.assertLessEqual(abs(color[0] - bright(value, low, high, curves["linear"])), 0.5 + 1e-9)
                self.assertEqual(color, (color[0],) * 3 + (255,))
            for wrong in ("bands=0,1", "bands=0&ends=1", "bands=0&ends=2,1", "bands=0&ends=nan,1", "bands=0&curve=cubic",
                          "bands=0&gamma=0", "bands=0&cut=50", "bands=9", ""):
                self.assertEqual(viewer.ask(f"/api/picture/0/0/0/0?{wrong}")[0], 404, wrong)
        with Viewer(DATA / "RGB.byte.tif") as viewer:
            first = gdal_pixels(DATA / "RGB.byte.tif", "-b", "1", "-srcwin", "0", "0", "256", "256")
            self.assertEqual([color[3] == 0 for color in self.picture(viewer, "0/0/0/0?bands=0")], [not value for value in first])

    def test_no_data_has_a_state(self):
        scene = DATA / "RGB.byte.tif"
        with Viewer(scene) as viewer:
            _, _, body = viewer.ask("/api/tile/0/0/0/0?bands=0")
            pixels, states = body[:65536], body[65536:]
            self.assertEqual([state != 0 for state in states], [pixel == 0 for pixel in pixels])
            self.assertTrue(any(states) and not all(states))

    def test_values_of_pixels_are_those_of_the_source_of_any_type(self):
        for name in ("landsat7_u16_tiled.tif", "dem_olinda.tif", "landsat7_f32_strip.tif", "dem_int16.tif"):
            with self.subTest(name), Viewer(DATA / name) as viewer:
                told = viewer.get("pixel?x=70&y=90")
                out = subprocess.run(["gdallocationinfo", "-valonly", DATA / name, "70", "90"], capture_output=True,
                                     text=True, check=True).stdout.split()
                for value, want in zip(told["values"][0], out, strict=True):
                    self.assertAlmostEqual(float(value), float(want), delta=1e-7 * abs(float(want)))
        with Viewer(DATA / "complex64.tif") as viewer:
            value = viewer.get("pixel?x=5&y=6")["values"][0][0]
            real, imaginary = struct.unpack("<2f", gdal_pixels(DATA / "complex64.tif", "-srcwin", "5", "6", "1", "1"))
            self.assertAlmostEqual(complex(value.replace("i", "j")), complex(real, imaginary), 4)
            self.assertEqual(viewer.ask("/api/tile/0/0/0/0?bands=0")[0], 200)

    def test_bands_are_told_with_their_names_and_wavelengths(self):
        file = self.folder / "named.vrt"
        subprocess.run(["gdal_translate", "-q", "-of", "VRT", "-b", "1", "-b", "2", "-b", "3", "-b", "4", SCENE, file], check=True)
        text = file.read_text()
        names = ("640.5 nm", "0.55 um", "vegetation", "12 dB")
        for number, name in enumerate(names, 1):
            text = re.sub(rf'(<VRTRasterBand [^>]*band="{number}"[^>]*>)', rf"\1<Description>{name}</Description>", text)
        file.write_text(text)
        subprocess.run(["gdal_translate", "-q", file, self.folder / "named.tif"], check=True)
        with Viewer(self.folder / "named.tif") as viewer:
            told = viewer.get("scene")["rasters"][0]
        self.assertEqual((told["bandNames"], told["wavelengths"]), (list(names), [640.5, 550.0, None, None]))

    def test_another_grid_is_carried_to_the_first(self):
        moved = self.folder / "moved.tif"
        subprocess.run(["gdal_translate", "-q", "-srcwin", "40", "30", "200", "150", SCENE, moved], check=True)
        with Viewer(SCENE, moved) as viewer:
            inside, outside = viewer.get("pixel?x=100&y=99")["values"], viewer.get("pixel?x=10&y=99")["values"]
            self.assertEqual(inside[0], inside[1])
            self.assertEqual(set(outside[1]), {None})

    def test_levels_of_another_grid_show_the_places_that_they_cover(self):
        side, steps = 2000, {"below": 10, "above": 3.7}  # m
        pixels = [array.array("H", (x for _ in range(side) for x in range(side))),
                  array.array("H", (y for y in range(side) for _ in range(side)))]
        for name, step in steps.items():
            (self.folder / f"{name}.img").write_bytes(b"".join(band.tobytes() for band in pixels))
            (self.folder / f"{name}.hdr").write_text(
                f"ENVI\nsamples = {side}\nlines = {side}\nbands = 2\ndata type = 12\ninterleave = bsq\nbyte order = 0\n"
                f"map info = {{UTM, 1, 1, 300105, 9099895, {step}, {step}, 25, South, WGS-84}}\n")
            subprocess.run(["gdal_translate", "-q", self.folder / f"{name}.img", self.folder / f"{name}.tif"], check=True)
        with Viewer(self.folder / "below.tif", self.folder / "above.tif") as viewer:
            for level in (0, 1, 3):
                _, headers, body = viewer.ask(f"/api/tile/1/{level}/0/0?bands=0,1")
                width, height = map(int, headers["X-Vexg-Size"].split())
                bands = array.array("H", body[:4 * width * height])
                size = 2 ** level * steps["below"] / steps["above"]  # of a pixel of the level, in those of the source
                off = []
                for at in range(0, width * height, 7):
                    wanted = ((at % width + 0.5) * size, (at // width + 0.5) * size)
                    if max(wanted) > side - size:
                        continue
                    self.assertFalse(body[4 * width * height + at])
                    off.append([bands[at + band * width * height] + 0.5 - wanted[band] for band in (0, 1)])
                for axis in zip(*off, strict=True):
                    self.assertLessEqual(max(map(abs, axis)), size / 2 + 0.5, level)
                self.assertGreater(len(off), 100)

    def test_a_region_has_the_statistics_that_the_command_line_gives_its_file(self):
        ring = [[20.3, 30.7], [180.2, 44.1], [150.9, 210.4], [60.5, 170.5]]
        for name in ("landsat7_olinda.tif", "RGB.byte.tif"):
            with self.subTest(name), Viewer(DATA / name) as viewer:
                told = viewer.post("region/0", {"ring": ring})
                file = self.folder / "region.geojson"
                file.write_text(json.dumps(told["geoJson"]))
                _, out, _ = run("stats", str(DATA / name), "--region", str(file), "--json", "-q")
                self.assertEqual(told["bands"], json.loads(out)["bands"])
                self.assertGreater(told["pixels"], 10000)
        with Viewer(DATA / "landsat7_rgb.png") as viewer:  # which has no place on a map
            told = viewer.post("region/0", {"ring": [[10, 10], [20, 10], [20, 15], [10, 15]]})
            self.assertEqual((told["pixels"], told["bands"][0]["count"]), (50, 50))

    def test_segments_of_a_tree_have_the_values_that_the_command_line_gives(self):
        self.fine("segment", SCENE, self.folder / "l.tif", "--merge-value", "2000", "--tree", self.folder / "s.tree")
        labels = self.folder / "cut.tif"
        self.fine("segment", "cut", self.folder / "s.tree", labels, "--merge-value", "1500")
        table = self.folder / "t.csv"
        self.fine("attributes", SCENE, labels, "-o", self.folder / "a", "--table", table)
        names, *rows = (line.split(",") for line in table.read_text().splitlines())
        with Viewer(SCENE, "--labels", self.folder / "s.tree") as viewer:
            self.assertEqual(len(viewer.get("scales/1")["costs"]), len(viewer.get("scales/1")["segments"]))
            for _ in range(100):
                told = viewer.get("segment/1?x=100&y=120&cost=1500")
                if "progress" not in told:
                    break
                time.sleep(0.1)
            self.assertEqual(str(told["label"]), viewer.get("pixel?x=100&y=120&cost=1500")["values"][1][0])
            row = next(row for row in rows if row[names.index("label")] == str(told["label"]))
            for each in told["attributes"]:
                self.assertAlmostEqual(each["value"], float(row[names.index(each["name"])]),
                                       delta=1e-5 * abs(each["value"]) + 1e-6, msg=each["name"])

    def test_shapes_lie_where_gdal_puts_them(self):
        shapes = self.folder / "s.geojson"
        shapes.write_text(json.dumps({"type": "FeatureCollection", "features": [
            {"type": "Feature", "properties": {"name": "a"}, "geometry": {
                "type": "Polygon", "coordinates": [[[-34.90, -7.98], [-34.88, -7.98], [-34.88, -7.97], [-34.90, -7.98]]]}}]}))
        with Viewer(SCENE, "--shapes", shapes) as viewer:
            told = viewer.get("shapes/0")
            (x, y), *_ = told["features"][0]["geometry"]["coordinates"][0][0]
            out = subprocess.run(["gdaltransform", "-i", "-t_srs", "EPSG:4326", SCENE], input="-34.90 -7.98\n",
                                 capture_output=True, text=True, check=True).stdout.split()
            self.assertAlmostEqual(x, float(out[0]), 3)
            self.assertAlmostEqual(y, float(out[1]), 3)
            self.assertEqual(told["features"][0]["properties"]["name"], "a")

    def test_a_view_of_many_shapes_has_those_that_it_shows(self):
        shapes, side = self.folder / "s.geojson", 160  # squares of 1.5 pixels each way, and a large one over them
        square = lambda x, y, size: [[[x, y], [x + size, y], [x + size, y + size], [x, y + size], [x, y]]]  # noqa: E731
        shapes.write_text(json.dumps({"type": "FeatureCollection", "crs": None, "features": [
            {"type": "Feature", "properties": {"n": n}, "geometry": {"type": "Polygon", "coordinates": coordinates}}
            for n, coordinates in enumerate([square(2 * x, 2 * y, 1.5) for y in range(side) for x in range(side)]
                                            + [square(0, 0, 340)])]}))
        with Viewer(DATA / "landsat7_rgb.png", "--shapes", shapes) as viewer:
            corners = lambda told: [tuple(each["geometry"]["coordinates"][0][0][0]) for each in told["features"]]  # noqa: E731
            told = viewer.get("shapes/0?rect=20,30,60.5,50&step=0.1")
            self.assertEqual((told["isWhole"], told["left"], told["inView"]), (False, 0, 21 * 11 + 1))
            self.assertEqual(sorted(corners(told)), sorted([(2.0 * x, 2.0 * y) for y in range(15, 26)
                                                            for x in range(10, 31)] + [(0, 0)]))
            told = viewer.get("shapes/0?rect=0,0,400,400&step=1")  # each is a shape of its own there
            self.assertEqual((told["inView"], told["left"], len(told["features"])), (25601, 5601, 20000))
            self.assertIn(340, [point[0] for each in told["features"] for point in each["geometry"]["coordinates"][0][0]])
            told = viewer.get("shapes/0?rect=0,0,400,400&step=8")  # of 16 on a pixel of the screen one
            self.assertEqual((told["inView"], told["left"], len(told["features"])), (25601, 0, 1601))
            for wrong in ("rect=1", "rect=0,0,1,x", "rect=0,0,1,1&step=0", "rect=0,0,1,1&step=-1"):
                self.assertEqual(viewer.ask(f"/api/shapes/0?{wrong}")[0], 404, wrong)

    def test_a_pyramid_can_be_built_and_is_used(self):
        scene = self.folder / "scene.tif"
        subprocess.run(["gdal_translate", "-q", "-outsize", "1500", "1400", DATA / "landsat7_rgb.png", scene], check=True)
        with Viewer(scene) as viewer:
            before = viewer.ask("/api/tile/0/2/0/0?bands=0,1,2")[2]
            told = viewer.post("pyramid/0", {})
            while told["state"] == "runs":
                time.sleep(0.05)
                told = viewer.get("pyramid")
            self.assertEqual(told["state"], "done", told)
            self.assertTrue(viewer.get("scene")["rasters"][0]["hasLevels"])
            self.assertEqual(viewer.ask("/api/tile/0/2/0/0?bands=0,1,2")[2], before)
        self.assertTrue((self.folder / "scene.tif.pyr").exists())


@needs_data
class Servers(FolderTest):
    def setUp(self):
        super().setUp()
        self.name = f"viewed{os.getpid()}"
        self.server = subprocess.Popen([VEXG, "serve", "--quiet", self.name])
        self.addCleanup(self.server.wait)
        self.addCleanup(self.server.kill)

    def test_a_server_gives_what_the_file_has(self):
        self.fine("segment", SCENE, self.folder / "l.tif", "--merge-value", "2000", "--tree", self.folder / "s.tree")
        moved = self.folder / "moved.tif"
        subprocess.run(["gdal_translate", "-q", "-srcwin", "40", "30", "200", "150", SCENE, moved], check=True)
        files = (SCENE, moved, "--labels", self.folder / "s.tree")
        ring = {"ring": [[20.3, 30.7], [180.2, 44.1], [150.9, 210.4]]}
        with Viewer("--server", self.name, *files) as viewer, Viewer(*files) as own:
            for path in ("scene", "tile/0/0/1/1?bands=2,0", "tile/0/1/0/0?bands=5", "tile/1/1/0/0?bands=1",
                         "tile/2/0/0/0?bands=0&edge=1&cost=1500", "bands/0?bands=0,1", "pixel?x=70&y=90", "scales/2"):
                with self.subTest(path):
                    self.assertEqual(viewer.ask(f"/api/{path}")[::2], own.ask(f"/api/{path}")[::2])
            self.assertEqual(viewer.post("region/0", ring), own.post("region/0", ring))
            for _ in range(100):
                told = viewer.get("segment/2?x=100&y=120&cost=1500")
                if "progress" not in told:
                    break
                time.sleep(0.1)
            self.assertGreater(len(told["attributes"]), 10, told)
            with Viewer("--server", self.name) as other:
                names = [raster["name"] for raster in other.get("scene")["rasters"]]
                self.assertTrue({SCENE.name, moved.name} <= set(names), names)
                first = SCENE if names[0] == SCENE.name else moved
                viewer.end()  # which had opened them
                want = gdal_pixels(first, "-b", "4", "-srcwin", "0", "0", "200", "150")
                status, _, body = other.ask("/api/tile/0/0/0/0?bands=3")
                self.assertEqual((status, bytes(body[256 * y + x] for y in range(150) for x in range(200))
                                  if first is SCENE else body[:30000]), (200, want))
                self.assertEqual(other.ask("/api/pyramid/0", "POST", body=b"")[0], 422)
        self.fails(1, "has no raster open", "view", "--no-browser", "--server", self.name)

    def test_a_server_that_goes_away_is_one_line_everywhere(self):
        with Viewer("--server", self.name, SCENE) as viewer:
            viewer.get("alive")
            self.server.kill()
            self.server.wait()
            begin = time.monotonic()
            for path in ("alive", "tile/0/0/0/0?bands=0", "pixel?x=1&y=1", "bands/0?bands=0"):
                status, _, body = viewer.ask(f"/api/{path}")
                self.assertEqual((status, json.loads(body)), (422, {"fault": f'the server "{self.name}" has gone away'}))
            self.assertEqual(viewer.end(), (3, f'vexg: the server "{self.name}" has gone away\n'))
            self.assertLess(time.monotonic() - begin, 5)
        self.fails(3, "no server", "view", "--no-browser", "--server", self.name, "--no-wait")


@needs_data
class Life(FolderTest):
    def test_it_ends_by_an_interrupt_and_leaves_nothing(self):
        viewer = Viewer(SCENE)
        with viewer:
            viewer.ask("/api/scene")
            begin = time.monotonic()
            self.assertEqual(viewer.end(), (0, ""))
            self.assertLess(time.monotonic() - begin, 4)

    def test_it_ends_when_the_page_has_been_closed_for_long(self):
        with Viewer(SCENE, "--idle", "0.03") as viewer:
            for _ in range(4):
                time.sleep(0.8)
                viewer.get("alive")
            viewer.ask("/", key=False)
            self.assertEqual(viewer.process.wait(20), 0)

    def test_faults_are_told_at_the_start(self):
        broken = self.folder / "broken.tif"
        broken.write_bytes(b"II*\0")
        self.fails(2, "give a raster, --mosaic or --server", "view")
        for arguments in ([broken], [SCENE, self.folder / "none.tif"], [SCENE, "--labels", broken],
                          [SCENE, "--shapes", self.folder / "none.shp"]):
            code, out, err = run("view", "--no-browser", *map(str, arguments))
            self.assertEqual((code, out), (1, ""), arguments)
            self.assertRegex(err, r"\Avexg: [^\n]+\n\Z")
        with Viewer(SCENE) as viewer:
            self.fails(1, f"--port: {viewer.port} is taken", "view", SCENE, "--no-browser", "--port", viewer.port)

    def test_many_tiles_leave_the_memory_as_it_was(self):
        with Viewer(SCENE) as viewer:
            def load(count):
                for i in range(count):
                    viewer.ask(f"/api/tile/0/0/{i % 2}/{i // 2 % 2}?bands=0,1,2,3,4,5")
            load(400)
            before = viewer.memory()
            load(1200)
            self.assertLess(viewer.memory() - before, 16 << 20)


if __name__ == "__main__":
    unittest.main()
