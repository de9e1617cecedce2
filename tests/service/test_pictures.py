# SPDX-License-Identifier: MIT
"""What is in a picture: the catalogue's facts and the metadata, on a sample card and on files of real cameras."""
import json
import os
import pathlib
import subprocess
import unittest

from gi.repository import GLib

from harness import wait_until
from test_brivoctl import BrivoctlTest

PROJECT = pathlib.Path(__file__).resolve().parents[2]
CORPUS = pathlib.Path(os.environ.get("BRIVOD_CORPUS", PROJECT.parent / "shared" / "corpus"))
TURNED = (5, 6, 7, 8)
PREVIEW_SIZE_EXPECTED = (".raf",)  # exiftool tells the size of the preview, the catalogue that of the picture
SIZE_UNKNOWN = {
    "jpeg/me-beach.jpg",  # its frame header leaves the height to the end of the scan
    "jpeg/structure/pil-junk_jpeg_header.jpg",  # does not begin as a JPEG
}


class SampleCardTest(BrivoctlTest):
    def setUp(self):
        super().setUp()
        card = f"{self.service.volumes}/SAMPLE"
        subprocess.run([PROJECT / "scripts/sample-card", card], check=True)
        self.handle_of(card)
        self.picture = pathlib.Path(card, "DCIM/100BRIVO/IMG_0002.JPG").read_bytes()

    def test_the_catalogue_tells_size_orientation_and_thumbnail(self):
        found = {entry["path"]: entry for entry in self.json("ls")}
        upright, turned = (found[f"DCIM/100BRIVO/IMG_000{number}.JPG"] for number in (1, 2))
        self.assertEqual([upright[key] for key in ("width", "height", "orientation")], [640, 480, 1])
        self.assertEqual([turned[key] for key in ("width", "height", "orientation")], [480, 640, 6])
        self.assertEqual([turned[key] for key in ("thumbWidth", "thumbHeight")], [160, 120])
        thumbnail = self.picture[turned["thumbOffset"]:][:turned["thumbSize"]]
        self.assertEqual((thumbnail[:2], thumbnail[-2:]), (b"\xff\xd8", b"\xff\xd9"))

    def test_the_long_list_shows_it_to_people(self):
        lines = self.brivoctl("ls", "--long").stdout.decode().splitlines()
        turned = next(line for line in lines if line.endswith("IMG_0002.JPG"))
        offset = next(entry["thumbOffset"] for entry in self.json("ls") if entry["path"].endswith("IMG_0002.JPG"))
        self.assertEqual(turned.split()[-5:], ["480x640", "6", "160x120", f"@{offset}", "DCIM/100BRIVO/IMG_0002.JPG"])

    def test_metadata_as_json_and_as_text(self):
        metadata = self.json("info", "DCIM/100BRIVO/IMG_0002.JPG")
        self.assertEqual([metadata[key] for key in ("PixelWidth", "PixelHeight", "Orientation", "Depth")], [480, 640, 6, 8])
        self.assertEqual(metadata["{Exif}"]["DateTimeOriginal"], "2024:05:01 10:00:07")
        self.assertEqual(metadata["{TIFF}"]["Make"], "Brivo")
        lines = self.brivoctl("info", "DCIM/100BRIVO/IMG_0002.JPG").stdout.decode().splitlines()
        self.assertIn("  DateTimeOriginal: 2024:05:01 10:00:07", lines)
        self.assertIn("Orientation: 6", lines)

    def test_metadata_survive_the_file(self):
        before = self.json("info", "DCIM/100BRIVO/IMG_0003.JPG")
        os.remove(f"{self.service.volumes}/SAMPLE/DCIM/100BRIVO/IMG_0003.JPG")
        handle = next(entry["handle"] for entry in self.json("ls") if entry["path"].endswith("IMG_0003.JPG"))
        self.assertEqual(self.json("info", str(handle)), before)

    def test_an_object_without_metadata_says_so(self):
        self.assertEqual(self.json("info", "DCIM"), {})
        result = self.brivoctl("info", "DCIM")
        self.assertEqual(result.stdout, b"")
        self.assertIn(b"DCIM has no metadata", result.stderr)

    def test_where_speed_is_wanted_raw_files_are_read_all_the_same(self):
        device = self.device(self.manager(), f"{self.service.volumes}/SAMPLE")
        device.enumerate(OVEnumerationPrioritizeSpeed=GLib.Variant("b", True))
        wait_until(lambda: "<------ rawImageMinimumProperties <------" in self.service.log(), "the raw file was read")


@unittest.skipUnless((CORPUS / "expected.json").exists(), f"there are no camera files in {CORPUS}")
class CorpusTest(BrivoctlTest):
    """Files of real cameras under DCF names."""

    @classmethod
    def setUpClass(cls):
        cls.expected = json.loads((CORPUS / "expected.json").read_text(encoding="utf-8"))["files"]

    def put_on_card(self, suffixes, folders):
        """Puts files on a card; their catalogue entries, with the corpus path and what is expected of each."""
        chosen = [path for path in sorted(self.expected)
                  if path.lower().endswith(suffixes) and path.startswith(folders)]
        names = {f"DCIM/100CORPS/PICT{number:04}.{path.rsplit('.', 1)[1].upper()}": path
                 for number, path in enumerate(chosen, 1)}
        self.card(files={name.removeprefix("DCIM/"): (CORPUS / path).read_bytes() for name, path in names.items()})
        entries = {entry["path"]: entry for entry in self.json("ls")}
        self.assertTrue(names)
        return [(names[name], entries[name], self.expected[names[name]]) for name in names]

    def test_jpegs_have_the_expected_facts(self):
        for path, entry, facts in self.put_on_card((".jpg",), ("card-", "jpeg/")):
            if facts.get("file_type") != "JPEG" or path in SIZE_UNKNOWN:
                continue
            with self.subTest(path):
                exif = facts.get("exif", {})
                size = [exif.get("ExifIFD:ExifImageWidth", facts["width"]),
                        exif.get("ExifIFD:ExifImageHeight", facts["height"])]
                shown = size[::-1] if entry["orientation"] in TURNED else size
                self.assertEqual([entry["width"], entry["height"]], shown)
                stated = facts.get("orientation", 1)
                self.assertEqual(entry["orientation"], stated if 1 <= stated <= 8 else 1)
                thumbnail = facts.get("exif_thumbnail", {})
                if thumbnail.get("jpeg") and thumbnail.get("in_file"):
                    self.assertEqual([entry["thumbOffset"], entry["thumbSize"]],
                                     [thumbnail["offset"], thumbnail["length"]])
                else:
                    self.assertEqual(entry["thumbSize"], 1, "it can only be decoded")

    def test_metadata_of_jpegs_have_the_expected_dates(self):
        for path, entry, facts in self.put_on_card((".jpg",), ("card-",)):
            with self.subTest(path):
                metadata = self.json("info", str(entry["handle"]))
                self.assertEqual(metadata["{Exif}"]["DateTimeOriginal"], facts["date_time_original"])
                self.assertEqual(metadata["{TIFF}"]["Model"].rstrip(), facts["model"])

    def test_raw_files_have_a_size_and_an_orientation(self):
        suffixes = (".cr2", ".nef", ".arw", ".orf", ".rw2", ".raf", ".pef", ".cr3")
        for path, entry, facts in self.put_on_card(suffixes, ("raw/",)):
            with self.subTest(path):
                self.assertEqual(entry["orientation"], facts.get("orientation", 1))
                self.assertGreater(min(entry["width"], entry["height"]), 0)
                if path.lower().endswith(PREVIEW_SIZE_EXPECTED):
                    continue
                shown = [facts["width"], facts["height"]]
                if entry["orientation"] in TURNED:
                    shown.reverse()
                self.assertEqual([entry["width"], entry["height"]], shown)


if __name__ == "__main__":
    unittest.main()
