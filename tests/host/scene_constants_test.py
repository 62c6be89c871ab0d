"""Calibration by the metadata of Landsat and Sentinel-2 scenes, beside the published formulas.

The metadata are made here, by the data format control books of the USGS (LSDS-1822, LSDS-1414) and the
products specification of Sentinel-2.
"""

import array
import json
import math
import unittest

from support import FolderTest, run, write_orva

SUN, DISTANCE = 51.25, 1.0105

# For each sensor: its name, and the bands with reflectance, with thermal constants, and with neither.
SENSORS = {
    "LT04": ("LANDSAT_4", "TM", ["1", "2", "3", "4", "5", "7"], ["6"]),
    "LT05": ("LANDSAT_5", "TM", ["1", "2", "3", "4", "5", "7"], ["6"]),
    "LE07": ("LANDSAT_7", "ETM", ["1", "2", "3", "4", "5", "7", "8"], ["6_VCID_1", "6_VCID_2"]),
    "LC08": ("LANDSAT_8", "OLI_TIRS", [str(band) for band in range(1, 10)], ["10", "11"]),
    "LC09": ("LANDSAT_9", "OLI_TIRS", [str(band) for band in range(1, 10)], ["10", "11"]),
    "LM05": ("LANDSAT_5", "MSS", ["1", "2", "3", "4"], []),
}


def number_of(band):
    """A number of its own for each band."""
    return int(band.split("_")[0]) + (0.5 if band.endswith("2") and "_" in band else 0)


def radiance(band, count):
    return (0.01 + number_of(band) / 1000) * count - 50 - number_of(band)


def reflectance(band, count, sun=SUN):
    return ((2e-5 + number_of(band) / 1e7) * count - 0.1) / math.sin(math.radians(sun))


def kelvins(band, count):
    k1, k2 = 600 + number_of(band), 1200 + number_of(band)
    return k2 / math.log(k1 / radiance(band, count) + 1)


def sections_of(sensor, collection, level="L1TP"):
    """The metadata of a scene as sections of names and texts, in the order of the file."""
    satellite, instrument, solar, thermal = SENSORS[sensor]
    product = f"{sensor}_{level}_012031_20130714_20200912_0{collection}_T1"
    bands = sorted(solar + thermal, key=number_of)
    surface = {"B": "SR_B"} if level == "L2SP" else {}
    files = {f"FILE_NAME_BAND_{b}": f'"{product}_{surface.get("B", "B")}{b}.TIF"' for b in bands}
    identity = {"SPACECRAFT_ID": f'"{satellite}"', "SENSOR_ID": f'"{instrument}"', "DATE_ACQUIRED": "2013-07-14",
                "SCENE_CENTER_TIME": '"15:41:02.2590770Z"'}
    image = {"CLOUD_COVER": "12.50", "SUN_AZIMUTH": "131.5", "SUN_ELEVATION": str(SUN), "EARTH_SUN_DISTANCE": str(DISTANCE)}
    scaling = {}
    for band in bands:
        scaling[f"RADIANCE_MULT_BAND_{band}"] = f"{0.01 + number_of(band) / 1000:.4E}"
    for band in bands:
        scaling[f"RADIANCE_ADD_BAND_{band}"] = f"{-50 - number_of(band):.5f}"
    for band in solar:
        scaling[f"REFLECTANCE_MULT_BAND_{band}"] = f"{2e-5 + number_of(band) / 1e7:.4E}"
        scaling[f"REFLECTANCE_ADD_BAND_{band}"] = "-0.100000"
    constants = {}
    for band in thermal:
        constants[f"K1_CONSTANT_BAND_{band}"] = f"{600 + number_of(band):.2f}"
        constants[f"K2_CONSTANT_BAND_{band}"] = f"{1200 + number_of(band):.2f}"
    if collection == 1:
        heat = "TIRS_THERMAL_CONSTANTS" if "TIRS" in instrument else "THERMAL_CONSTANTS"
        return "L1_METADATA_FILE", {
            "METADATA_FILE_INFO": {"ORIGIN": '"Image courtesy of the U.S. Geological Survey"',
                                   "LANDSAT_PRODUCT_ID": f'"{product}"', "COLLECTION_NUMBER": "01"},
            "PRODUCT_METADATA": {"DATA_TYPE": f'"{level}"', **identity, **files},
            "IMAGE_ATTRIBUTES": image, "RADIOMETRIC_RESCALING": scaling, heat: constants}
    sections = {
        "PRODUCT_CONTENTS": {"LANDSAT_PRODUCT_ID": f'"{product}"', "PROCESSING_LEVEL": f'"{level}"',
                             "COLLECTION_NUMBER": "02", **files},
        "IMAGE_ATTRIBUTES": {**identity, **image},
        "LEVEL1_RADIOMETRIC_RESCALING": scaling, "LEVEL1_THERMAL_CONSTANTS": constants}
    if level == "L2SP":
        sections["LEVEL2_SURFACE_REFLECTANCE_PARAMETERS"] = {"REFLECTANCE_MULT_BAND_4": "2.75e-05",
                                                             "REFLECTANCE_ADD_BAND_4": "-0.2"}
    return "LANDSAT_METADATA_FILE", sections


def write_mtl(folder, sensor, collection, form="txt", leave_out=(), level="L1TP"):
    root, sections = sections_of(sensor, collection, level)
    for section in sections.values():
        for name in leave_out:
            section.pop(name, None)
    if form == "txt":
        text = f"GROUP = {root}\n"
        for name, values in sections.items():
            text += f"  GROUP = {name}\n" + "".join(f"    {key} = {value}\n" for key, value in values.items())
            text += f"  END_GROUP = {name}\n"
        text += f"END_GROUP = {root}\nEND\n"
    else:
        plain = {name: {key: value.strip('"') for key, value in values.items()} for name, values in sections.items()}
        text = json.dumps({root: plain}, indent=2)
        if form == "xml":
            text = f'<?xml version="1.0" encoding="UTF-8"?>\n<{root}>\n'
            for name, values in plain.items():
                text += f"<{name}>" + "".join(f"<{key}>{value}</{key}>\n" for key, value in values.items()) + f"</{name}>\n"
            text += f"</{root}>\n"
    path = folder / f"{sensor}_C{collection}_MTL.{form}"
    path.write_text(text)
    return path


MSI = ["B1", "B2", "B3", "B4", "B5", "B6", "B7", "B8", "B8A", "B9", "B10", "B11", "B12"]
FACTOR = 0.9705  # U, of July


def write_msi(folder, has_offsets=True, level="Level-1C", tail=""):
    """MTD_MSIL1C.xml, with offsets that differ by band and lists that aren't in the order of the bands."""
    order = list(range(13))[::-1]
    offsets = "".join(f'<RADIO_ADD_OFFSET band_id="{i}">{-1000 - i}</RADIO_ADD_OFFSET>' for i in order)
    irradiances = "".join(f'<SOLAR_IRRADIANCE bandId="{i}" unit="W/m²/µm">{1900 - 100 * i}.5</SOLAR_IRRADIANCE>' for i in order)
    spectral = "".join(f'<Spectral_Information bandId="{i}" physicalBand="{MSI[i]}"><RESOLUTION>60</RESOLUTION><Wavelength>'
                       f'<MIN unit="nm">{400 + i}</MIN></Wavelength></Spectral_Information>' for i in range(13))
    path = folder / f"MTD_MSI{level[-2:]}.xml"
    path.write_text(f"""<?xml version="1.0" encoding="UTF-8"?>
<n1:{level}_User_Product xmlns:n1="https://psd-14.sentinel2.eo.esa.int/PSD/User_Product_{level}.xsd">
<n1:General_Info><Product_Info><PRODUCT_START_TIME>2022-07-14T10:30:31.024Z</PRODUCT_START_TIME>
<PROCESSING_LEVEL>{level}</PROCESSING_LEVEL><Datatake datatakeIdentifier="x"><SPACECRAFT_NAME>Sentinel-2A</SPACECRAFT_NAME>
</Datatake></Product_Info><Product_Image_Characteristics>
<QUANTIFICATION_VALUE unit="none">10000</QUANTIFICATION_VALUE>
{"<Radiometric_Offset_List>" + offsets + "</Radiometric_Offset_List>" if has_offsets else ""}
<Reflectance_Conversion><U>{FACTOR}</U><Solar_Irradiance_List>{irradiances}</Solar_Irradiance_List></Reflectance_Conversion>
<Spectral_Information_List>{spectral}</Spectral_Information_List>
</Product_Image_Characteristics></n1:General_Info>{tail}</n1:{level}_User_Product>
""", encoding="utf-8")
    return path


class SceneConstants(FolderTest):
    COUNTS = [9000, 20000, 41000]

    def scene(self, name, bands=1, names=""):
        pixels = array.array("H", [count + 7 * band for count in self.COUNTS for band in range(bands)])
        plain = self.folder / (name if not names else "plain.dat")
        write_orva(plain, len(self.COUNTS), 1, bands, pixels.tobytes(), data_type="UInt16")
        if not names:
            return plain
        named = (self.folder / name).with_suffix(".tif")
        self.fine("calc", named, "; ".join(f"{name}=b{band}" for band, name in enumerate(names.split())), plain,
                  "--type", "UInt16", "--overwrite", "--progress", "none")
        return named

    def expect(self, quantity, source, metadata, bands, formula, *options, said=""):
        """Compares every pixel of the result with a formula of band and count."""
        out = self.folder / "out.dat"
        code, _, err = run("calibrate", quantity, str(source), str(out), "--from-metadata", str(metadata), "--type", "Double",
                           "--overwrite", "--progress", "none", *options)
        self.assertEqual(code, 0, err)
        self.assertIn(said, err)
        values = self.values(out, len(bands))
        for index, band in enumerate(bands):
            for value, count in zip(values[index], self.COUNTS):
                want = formula(band, count + 7 * index)
                self.assertAlmostEqual(value / want, 1, delta=1e-12, msg=f"{quantity} of {band}")
        return err

    def values(self, file, bands):
        """The pixels of each band."""
        header = file.with_name(file.name + ".hdr").read_text().lower()
        pixels = array.array("d", file.read_bytes())
        if "interleave = bip" in header:
            return [pixels[band::bands] for band in range(bands)]
        return [pixels[band * len(self.COUNTS):][:len(self.COUNTS)] for band in range(bands)]  # of one line

    def refuses(self, words, quantity, source, metadata, *options):
        before = sorted(self.folder.iterdir())
        code, out, err = run("calibrate", quantity, str(source), str(self.folder / "no.dat"), "--from-metadata", str(metadata),
                             *options)
        self.assertNotEqual(code, 0)
        self.assertIn(words, err)
        self.assertEqual((out, len(err.splitlines())), ("", 1), err)
        self.assertEqual(sorted(self.folder.iterdir()), before)

    def test_landsat_of_every_sensor_collection_and_form(self):
        """All bands at once; each sensor in two of the forms."""
        forms = [(1, "txt"), (2, "txt"), (2, "json"), (2, "xml")]
        for number, (sensor, (_, _, solar, thermal)) in enumerate(SENSORS.items()):
            for collection, form in (forms[number % 2], forms[2 + number // 2 % 2]):
                with self.subTest(sensor=sensor, collection=collection, form=form):
                    mtl = write_mtl(self.folder, sensor, collection, form)
                    for quantity, bands, formula in (("radiance", solar + thermal, radiance),
                                                     ("reflectance", solar, reflectance), ("temperature", thermal, kelvins)):
                        if not bands:
                            continue
                        scene = self.scene("all.dat", len(bands))
                        self.expect(quantity, scene, mtl, bands, formula, "--metadata-bands", ",".join(bands), said="as chosen")

    def test_what_tells_the_bands(self):
        mtl = write_mtl(self.folder, "LC08", 1)
        etm = write_mtl(self.folder, "LE07", 2)
        tm = write_mtl(self.folder, "LT05", 1)
        vcid = self.scene("x_B6_VCID_2.dat")
        self.expect("temperature", vcid, etm, ["6_VCID_2"], kelvins, said="of the bands B6_VCID_2, by the name of the file")
        named = self.scene("LC08_L1TP_012031_20130714_20200912_01_T1_B4.dat")
        self.expect("reflectance", named, mtl, ["4"], reflectance)
        chosen = self.scene("LC08_B2.dat", 3)
        self.expect("reflectance", chosen, mtl, ["4", "3", "9"], reflectance, "--metadata-bands", "4,B3,b09", said="as chosen")
        by_names = self.scene("a.dat", 3, "NIR_B5 red_Band_4 x_B03")
        self.expect("reflectance", by_names, mtl, ["5", "4", "3"], reflectance, said="B5, B4, B3, by the names of the bands")
        self.expect("reflectance", self.scene("b.dat", 7), mtl, list("1234567"), reflectance, said="by their number")
        for metadata in (etm, tm):
            self.expect("reflectance", self.scene("c.dat", 6), metadata, list("123457"), reflectance)
        self.expect("temperature", self.scene("d.dat", 2), etm, ["6_VCID_1", "6_VCID_2"], kelvins, said="by their number")
        self.expect("temperature", self.scene("e.dat"), tm, ["6"], kelvins)
        self.expect("radiance", self.scene("f.dat", 7), tm, list("1234567"), radiance)
        other = self.expect("radiance", self.scene("LC08_L1TP_199031_20130714_20200912_01_T1_B4.dat"), mtl, ["4"], radiance)
        self.assertIn("seems to be of another scene", other)

    def test_bands_in_doubt_are_refused(self):
        mtl = write_mtl(self.folder, "LC08", 1)
        etm = write_mtl(self.folder, "LE07", 1)
        three = self.scene("three.dat", 3, "Band_1 Band_2 Band_3")
        self.refuses("the 3 bands of three.tif is not told", "reflectance", three, mtl)
        self.refuses("; --metadata-bands says it", "reflectance", self.scene("three2.dat", 3), mtl)
        self.refuses("2 of its bands are named, and three.tif has 3 bands", "radiance", three, mtl, "--metadata-bands", "1,2")
        self.refuses('it tells of no band "12", but of B1, ', "radiance", three, mtl, "--metadata-bands", "1,2,12")
        self.refuses("x_B12.dat is of band 12 by its name", "radiance", self.scene("x_B12.dat"), mtl)
        self.refuses('no band "6"', "temperature", self.scene("y.dat"), etm, "--metadata-bands", "6")
        self.refuses("which of its bands", "radiance", self.scene("B3_B4.dat"), mtl)
        self.refuses("x_SR_B4.dat is of the surface", "reflectance", self.scene("x_SR_B4.dat"), mtl)
        self.refuses("level L2SP", "reflectance", self.scene("x_B4.dat"), write_mtl(self.folder, "LC09", 2, level="L2SP"))
        self.fails(2, "--metadata-bands: it goes with", "calibrate", "radiance", three, self.folder / "no.dat",
                   "--metadata-bands", "1")

    def test_what_is_missing_is_one_line(self):
        full = write_mtl(self.folder, "LC08", 2)
        self.refuses("it doesn't tell --k1, which temperature needs", "temperature", self.scene("x_B4.dat"), full)
        self.refuses("it doesn't tell --k1 of band B9, which temperature needs", "temperature", self.scene("z.dat", 2), full,
                     "--metadata-bands", "10,9")
        self.refuses("--irradiance, which reflectance needs", "reflectance", self.scene("x_B10.dat"), full)
        part = write_mtl(self.folder, "LC08", 2, "json", ["RADIANCE_ADD_BAND_4", "SUN_ELEVATION"])
        self.refuses("it doesn't tell --offset, which radiance needs", "radiance", self.scene("x_B4.dat"), part)
        self.refuses("--sun-elevation, which reflectance needs", "reflectance", self.scene("x_B4.dat"), part)
        self.expect("reflectance", self.scene("x_B4.dat"), part, ["4"], lambda b, c: reflectance(b, c, 30),
                    "--sun-elevation", "30")
        for name, text in (("a_MTL.txt", "GROUP = X\nEND_GROUP = X\n"), ("b_MTL.json", "{}"), ("c_MTL.txt", "")):
            (self.folder / name).write_text(text)
            self.refuses("neither L1_METADATA_FILE nor LANDSAT_METADATA_FILE", "radiance", self.scene("x_B4.dat"),
                         self.folder / name)
        for text, words in (('{"a": ', "line 1"), ('{"a": ' * 100 + "1" + "}" * 100, "nested too deep"), ('{"a": "\xff"}', "MTL.json")):
            (self.folder / "d_MTL.json").write_bytes(text.encode("latin-1"))
            self.refuses(words, "radiance", self.scene("x_B4.dat"), self.folder / "d_MTL.json")

    def test_what_was_taken_can_be_given(self):
        """The line of what was taken holds the options that give the same file; radiances serve too."""
        mtl = write_mtl(self.folder, "LC08", 1)
        scene = self.scene("x_B4.dat")
        err = self.expect("reflectance", scene, mtl, ["4"], reflectance)
        taken = err[err.index(": taken ") + 8:err.index(" of the bands")].split()
        self.assertEqual(taken[::2], ["--reflectance-gain", "--reflectance-offset", "--sun-elevation"])
        self.fine("calibrate", "reflectance", scene, self.folder / "given.dat", "--type", "Double", *taken)
        self.assertEqual((self.folder / "given.dat").read_bytes(), (self.folder / "out.dat").read_bytes())
        self.expect("reflectance", scene, mtl, ["4"], lambda b, c: math.pi * radiance(b, c) * DISTANCE ** 2 / (
            1500 * math.sin(math.radians(SUN))), "--irradiance", "1500")

    def test_celsius(self):
        mtl = write_mtl(self.folder, "LC09", 2)
        scene = self.scene("x_B10.dat")
        self.expect("temperature", scene, mtl, ["10"], lambda b, c: kelvins(b, c) - 273.15, "--unit", "celsius")
        self.expect("temperature", scene, mtl, ["10"], lambda b, c: 10 * (kelvins(b, c) - 273.15), "--unit", "celsius", "--scale", "10")
        self.refuses("--unit: radiance has no use for it", "radiance", scene, mtl, "--unit", "celsius")

    def test_sentinel_2(self):
        def wanted(quantization_offset):
            return lambda band, count: (count + quantization_offset(MSI.index(band))) / 10000
        new, plain = wanted(lambda i: -1000 - i), wanted(lambda i: 0)
        mtd = write_msi(self.folder)
        for band, name in (("B4", "T32_20220714T103031_B04.dat"), ("B8A", "T32_20220714T103031_B8A.dat")):
            self.expect("reflectance", self.scene(name), mtd, [band], new, said="by the name of the file")
        self.expect("reflectance", self.scene("s.dat", 13), mtd, MSI, new)
        ten = self.scene("t.dat", 4, "x_B04 x_B03 x_B02 x_B08")
        self.expect("reflectance", ten, mtd, ["B4", "B3", "B2", "B8"], new)
        self.refuses("which of its bands", "reflectance", self.scene("u.dat", 4), mtd)
        self.refuses("--sun-elevation: it is in the reflectances", "reflectance", ten, mtd, "--sun-elevation", "50")

        def radiance_of(band, count):
            sun = math.sin(math.radians(50))
            return new(band, count) * (1900.5 - 100 * MSI.index(band)) * sun * FACTOR / math.pi
        self.refuses("radiance follows from it with --sun-elevation", "radiance", ten, mtd)
        self.refuses("--sun-elevation: the sun stands", "radiance", ten, mtd, "--sun-elevation", "-5")
        self.expect("radiance", ten, mtd, ["B4", "B3", "B2", "B8"], radiance_of, "--sun-elevation", "50")
        self.expect("reflectance", ten, write_msi(self.folder, has_offsets=False), ["B4", "B3", "B2", "B8"], plain)
        self.refuses("level Level-2A", "reflectance", ten, write_msi(self.folder, level="Level-2A"))


if __name__ == "__main__":
    unittest.main()
