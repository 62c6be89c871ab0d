"""Stacks of rasters, and pixels that become others."""

import array
import subprocess
import unittest

from support import FolderTest, gdal_pixels, needs_gdal, write_orva


class Ramps(FolderTest):
    def write(self, name, value, bands=1, side=20, data_type="UInt16", more=""):
        kinds = {"UInt16": "H", "Single": "f", "Byte": "B"}
        pixels = array.array(kinds[data_type], (value + i for i in range(side * side * bands)))
        return write_orva(self.folder / name, side, side, bands, pixels.tobytes(), data_type, more)

    def read(self, file, kind="H"):
        return list(array.array(kind, gdal_pixels(file, interleave="BSQ")))


@needs_gdal
class Stack(Ramps):
    def test_bands_come_in_the_order_of_the_files(self):
        first, second = self.write("a.dat", 0, bands=2), self.write("b.dat", 5000)
        made = self.folder / "made.tif"
        self.fine("stack", made, first, second, second, "--bands", "3,0,2")
        ramp, second_ramp = list(range(0, 800, 2)), list(range(5000, 5400))  # bands lie pixel by pixel in the first
        self.assertEqual(self.read(made), second_ramp + ramp + second_ramp)

    def test_a_part_is_that_of_all_files(self):
        first, second = self.write("a.dat", 0), self.write("b.dat", 5000)
        made = self.folder / "made.tif"
        self.fine("stack", made, first, second, "--rect", "2,3,4,3", "-q")
        self.assertEqual(self.read(made), [62, 63, 64, 5062, 5063, 5064])

    def test_types_become_one(self):
        first, second = self.write("a.dat", 0), self.write("b.dat", 0.25, data_type="Single")
        made = self.folder / "made.tif"
        self.fails(1, "--type", "stack", made, first, second)
        self.fine("stack", made, first, second, "--type", "Single")
        self.assertEqual(self.read(made, "f"), [*range(400)] + [i + 0.25 for i in range(400)])

    def test_other_sizes_are_refused(self):
        made = self.folder / "made.tif"
        self.fails(1, "10 x 10", "stack", made, self.write("a.dat", 0), self.write("b.dat", 0, side=10))
        self.assertFalse(made.exists())


@needs_gdal
class Conversion(Ramps):
    def test_values_are_rounded_and_what_does_not_fit_is_no_data(self):
        scene = self.write("a.dat", 0.6, data_type="Single")
        made = self.folder / "made.tif"
        self.fine("copy", scene, made, "--type", "Byte", "--strict")
        told = self.fine("stats", made)
        self.assertIn(" 255 ", told)  # 0.6 to 254.6 are valid, the last of them as 255
        self.assertEqual(self.read(made, "B")[:255], list(range(1, 256)))

    def test_values_are_carried_along_a_line(self):
        scene = self.write("a.dat", 0)
        made = self.folder / "made.tif"
        self.fine("copy", scene, made, "--type", "Byte", "--scale", "100,300")
        self.assertEqual(self.read(made, "B"), [min(max(int((i - 100) * 255 / 200 + 0.5), 0), 255) for i in range(400)])
        self.fine("copy", scene, made, "--scale", "0,100,200,0", "--overwrite")
        self.assertEqual(self.read(made), [max(200 - 2 * i, 0) for i in range(400)])
        self.fails(2, "--scale", "copy", scene, made, "--scale", "1,2,3", "--overwrite")
        self.fails(2, "--scale", "copy", scene, made, "--scale", "5,5", "--overwrite")

    def test_values_are_what_the_file_says(self):
        raw = write_orva(self.folder / "raw", 3, 1, 2, array.array("h", [-4, 0, 7] * 2).tobytes(), "Int16")
        scene, made = self.folder / "scaled.tif", self.folder / "made.tif"
        bands = "".join(f'''<VRTRasterBand dataType="Int16" band="{band}" subClass="VRTRawRasterBand">
            <UnitType>K</UnitType><Offset>-1</Offset><Scale>{scale}</Scale>
            <SourceFilename>{raw}</SourceFilename><ImageOffset>{6 * band - 6}</ImageOffset>
            <PixelOffset>2</PixelOffset><LineOffset>6</LineOffset></VRTRasterBand>'''
                        for band, scale in ((1, 0.5), (2, 0.25)))
        (self.folder / "a.vrt").write_text(f'<VRTDataset rasterXSize="3" rasterYSize="1">{bands}</VRTDataset>')
        subprocess.run(["gdal_translate", "-q", self.folder / "a.vrt", scene], check=True)
        self.fine("copy", scene, made, "--unscale")
        self.assertEqual(self.read(made, "f"), [-3, -1, 2.5, -2, -1, 0.75])
        told = subprocess.run(["gdalinfo", made], capture_output=True, text=True, check=True).stdout
        self.assertEqual(told.count("Unit Type: K"), 2)
        self.assertNotIn("Scale", told)


if __name__ == "__main__":
    unittest.main()
