# SPDX-License-Identifier: MIT
"""Thumbnails and contact sheets from the command line."""
import json
import os
import pathlib
import pty
import struct
import subprocess
import unittest

from harness import BRIVOCTL, WAIT
from test_brivoctl import FAILURE, NO_SERVICE, REFUSED, SUCCESS, USAGE, BrivoctlTest, copied_brivoctl

PROJECT = pathlib.Path(__file__).resolve().parents[2]
TURNED = "DCIM/100BRIVO/IMG_0002.JPG"
TEXT = {"100ABCDE/IMG_0001.JPG": b"what is no picture", "100ABCDE/IMG_0002.MOV": b"and no movie"}


def png_size(data):
    assert data[:8] == b"\x89PNG\r\n\x1a\n", data[:8]
    return struct.unpack_from(">II", data, 16)


def jpeg_size(data):
    """From the frame header of a JPEG without oddities."""
    assert data[:2] == b"\xff\xd8", data[:2]
    position = 2
    while data[position + 1] not in (0xC0, 0xC1, 0xC2):
        position += 2 + struct.unpack_from(">H", data, position + 2)[0]
    height, width = struct.unpack_from(">HH", data, position + 5)
    return width, height


class PictureCommandTest(BrivoctlTest):
    def setUp(self):
        super().setUp()
        os.mkdir(self.out())

    def sample_card(self):
        card = f"{self.service.volumes}/SAMPLE"
        subprocess.run([PROJECT / "scripts/sample-card", card], check=True)
        self.handle_of(card)
        return card

    def bytes_of(self, path):
        return pathlib.Path(path).read_bytes()

    def embedded_thumbnail(self, card, path):
        """The bytes that the file's EXIF names, found by the mark of the second JPEG in it."""
        picture = self.bytes_of(f"{card}/{path}")
        start = picture.index(b"\xff\xd8", 2)
        return picture[start:picture.index(b"\xff\xd9", start) + 2]

    def files(self):
        """What is in the folder for saved files, hidden ones too."""
        return sorted(os.listdir(self.out()))


class ThumbnailTest(PictureCommandTest):
    def test_the_embedded_thumbnail_comes_byte_by_byte(self):
        card = self.sample_card()
        expected = self.embedded_thumbnail(card, TURNED)
        result = self.brivoctl("thumb", "SAMPLE", TURNED, "-o", self.out("thumb.jpg"))
        self.assertEqual(self.bytes_of(self.out("thumb.jpg")), expected)
        self.assertEqual(self.files(), ["thumb.jpg"])
        self.assertIn(f"{self.out('thumb.jpg')}  160x120  ", result.stdout.decode())
        self.assertEqual(self.brivoctl("thumb", TURNED, "-o", "-").stdout, expected)

    def test_as_json_it_is_one_document(self):
        card = self.sample_card()
        expected = self.embedded_thumbnail(card, TURNED)
        self.assertEqual(self.json("thumb", TURNED, "-o", self.out("thumb.jpg")),
                         {"bytes": len(expected), "width": 160, "height": 120, "orientation": 6,
                          "file": self.out("thumb.jpg")})

    def test_a_file_that_is_there_is_replaced_and_a_link_to_it_stays(self):
        self.sample_card()
        pathlib.Path(self.out("thumb.jpg")).write_bytes(b"before")
        os.symlink(self.out("thumb.jpg"), self.out("link.jpg"))
        self.brivoctl("thumb", TURNED, "-o", self.out("link.jpg"))
        self.assertTrue(os.path.islink(self.out("link.jpg")))
        self.assertEqual(jpeg_size(self.bytes_of(self.out("thumb.jpg"))), (160, 120))
        self.assertEqual(self.files(), ["link.jpg", "thumb.jpg"])

    def test_what_has_no_thumbnail_is_said_in_one_line(self):
        self.card(files=TEXT)
        for path in ("DCIM/100ABCDE/IMG_0001.JPG", "DCIM/100ABCDE"):
            with self.subTest(path):
                result = self.brivoctl("thumb", path, "-o", self.out("thumb.jpg"), code=FAILURE)
                self.assertEqual(result.stderr.decode(), f"brivoctl: {path} has no thumbnail\n")
        self.assertEqual(self.files(), [])

    def test_a_file_that_cannot_be_made_is_a_failure_and_leaves_nothing(self):
        self.sample_card()
        os.mkdir(self.out("folder.jpg"))
        for path in (self.out("folder.jpg"), self.out("none/thumb.jpg"), "/dev/full", "/dev/null"):
            with self.subTest(path):
                self.brivoctl("thumb", TURNED, "-o", path, code=FAILURE)
        self.assertEqual(self.files(), ["folder.jpg"])
        self.assertFalse(os.path.isfile("/dev/null"))

    def test_a_terminal_gets_no_bytes(self):
        terminal, end = pty.openpty()
        result = subprocess.run([BRIVOCTL, "thumb", TURNED, "-o", "-"], env=self.service.environment, stdout=end,
                                stderr=subprocess.PIPE, timeout=WAIT, check=False)
        os.close(end)
        os.close(terminal)
        self.assertEqual(result.returncode, USAGE, result.stderr)
        self.assertIn(b"terminal", result.stderr)

    def test_wrong_usage(self):
        for arguments in ((), (TURNED,), (TURNED, "-o"), (TURNED, "-o", "x.jpg", "--size", "0"),
                          (TURNED, "-o", "x.jpg", "--size", "many"), (TURNED, "-o", "-", "--json"),
                          ("A", "B", "C", "-o", "x.jpg")):
            with self.subTest(arguments):
                result = self.brivoctl("thumb", *arguments, code=USAGE)
                self.assertNotEqual(result.stderr, b"")
                self.assertEqual(result.stdout, b"")


class SheetTest(PictureCommandTest):
    def test_both_kinds_of_file_have_the_size_that_is_announced(self):
        self.sample_card()
        for name, size_of in (("sheet.jpg", jpeg_size), ("sheet.JPEG", jpeg_size), ("sheet.png", png_size)):
            with self.subTest(name):
                document = self.json("sheet", "SAMPLE", "-o", self.out(name))
                self.assertEqual(list(document), ["file", "width", "height", "columns", "rows", "objects", "missing"])
                self.assertEqual(document["file"], self.out(name))
                self.assertEqual(size_of(self.bytes_of(self.out(name))), (document["width"], document["height"]))
                self.assertEqual(document["objects"], 5)
        self.assertEqual(self.files(), ["sheet.JPEG", "sheet.jpg", "sheet.png"])

    def test_pictures_are_on_it_and_what_has_none_is_counted(self):
        self.sample_card()
        document = self.json("sheet", "-o", self.out("sheet.png"))
        self.assertEqual(document["missing"], 2, "the raw twin and the movie hold noise")
        text = self.brivoctl("sheet", "-o", self.out("sheet.png")).stdout.decode()
        self.assertEqual(text, f"{self.out('sheet.png')}  {document['width']}x{document['height']}  "
                               "5 objects, 2 without a thumbnail\n")

    def test_without_any_thumbnail_there_is_a_sheet_all_the_same(self):
        self.card(files=TEXT)
        document = self.json("sheet", "-o", self.out("sheet.jpg"))
        self.assertEqual([document[key] for key in ("columns", "rows", "objects", "missing")], [2, 1, 2, 2])

    def test_sounds_and_folders_are_not_shown(self):
        self.card(files={**TEXT, "100ABCDE/SND_0003.WAV": b"sound"})
        self.assertIn("DCIM/100ABCDE/SND_0003.WAV", [entry["path"] for entry in self.json("ls")])
        self.assertEqual(self.json("sheet", "-o", self.out("sheet.jpg"))["objects"], 2)

    def test_columns_and_size_can_be_chosen(self):
        self.card(files={f"100ABCDE/IMG_{n:04}.JPG": b"x" for n in range(1, 8)})
        small = self.json("sheet", "-o", self.out("sheet.jpg"), "--columns", "3", "--size", "64")
        self.assertEqual([small[key] for key in ("columns", "rows", "objects")], [3, 3, 7])
        large = self.json("sheet", "-o", self.out("sheet.jpg"), "--columns", "3", "--size", "128")
        self.assertGreaterEqual(large["width"], small["width"] + 3 * 64)

    def test_each_of_several_folders_begins_a_row(self):
        self.card(files={f"10{folder}ABCDE/IMG_{n:04}.JPG": b"x" for folder in (0, 1) for n in range(1, 4)})
        document = self.json("sheet", "-o", self.out("sheet.jpg"), "--columns", "2")
        self.assertEqual([document[key] for key in ("columns", "rows", "objects")], [2, 4, 6])

    def test_what_a_limit_leaves_out_is_said(self):
        self.card(files={f"100ABCDE/IMG_{n:04}.JPG": b"x" for n in range(1, 8)})
        result = self.brivoctl("sheet", "-o", self.out("sheet.jpg"), "--limit", "5", "--json")
        self.assertEqual(json.loads(result.stdout)["objects"], 5)
        self.assertIn(b"2 objects are left out", result.stderr)
        whole = self.brivoctl("sheet", "-o", self.out("sheet.jpg"), "--limit", "7")
        self.assertEqual(whole.stderr, b"")

    def test_names_in_any_script_are_drawn(self):
        names = ("写真写真0001.JPG", "صورة0002.JPG", "αβγδ0003.JPG", "ШИЛО0004.JPG")
        self.card(files={f"100ABCDE/{name}": b"x" for name in names})
        self.assertEqual(self.json("sheet", "-o", self.out("sheet.png"))["objects"], len(names))

    def test_an_empty_card_is_a_failure(self):
        self.card(files={"100ABCDE/SND_0003.WAV": b"sound"})
        result = self.brivoctl("sheet", "-o", self.out("sheet.jpg"), code=FAILURE)
        self.assertIn(b"no pictures and no movies", result.stderr)
        self.assertEqual(self.files(), [])

    def test_a_file_that_cannot_be_made_is_a_failure_and_leaves_nothing(self):
        self.card(files=TEXT)
        os.mkdir(self.out("folder.jpg"))
        for path in (self.out("folder.jpg"), self.out("none/sheet.jpg")):
            with self.subTest(path):
                self.brivoctl("sheet", "-o", path, code=FAILURE)
        self.assertEqual(self.files(), ["folder.jpg"])

    def test_a_sheet_that_no_file_holds_names_the_option_that_helps(self):
        self.card(files={f"100ABCDE/IMG_{n:04}.JPG": b"x" for n in range(1, 31)})
        for options, advice in ((("--size", "4096", "--columns", "1"), b"more --columns"),
                                (("--size", "4096", "--columns", "30"), b"fewer --columns"),
                                (("--size", "4096", "--columns", "6"), b"smaller --size")):
            with self.subTest(options):
                result = self.brivoctl("sheet", "-o", self.out("sheet.jpg"), *options, code=FAILURE)
                self.assertIn(advice, result.stderr)
        self.assertEqual(self.files(), [])

    def test_another_extension_and_other_wrong_usage(self):
        for arguments in ((), ("-o",), ("-o", "sheet.gif"), ("-o", "sheet"), ("-o", "-"), ("A", "B", "-o", "x.jpg"),
                          ("-o", "x.jpg", "--size", "15"), ("-o", "x.jpg", "--columns", "0"),
                          ("-o", "x.jpg", "--limit", "0")):
            with self.subTest(arguments):
                result = self.brivoctl("sheet", *arguments, code=USAGE)
                self.assertNotEqual(result.stderr, b"")
                self.assertEqual(result.stdout, b"")


class EndingTest(PictureCommandTest):
    COMMANDS = (("thumb", TURNED, "-o"), ("sheet", "-o"))

    def test_help_succeeds(self):
        for command in ("thumb", "sheet"):
            self.assertIn(command.encode(), self.brivoctl("--help").stdout)
            self.assertIn(b"--size", self.brivoctl(command, "--help").stdout)

    def test_without_a_service_they_say_so(self):
        self.service.stop()
        for command in self.COMMANDS:
            with self.subTest(command):
                self.assertEqual(self.brivoctl(*command, self.out("x.jpg"), code=NO_SERVICE).stdout, b"")

    def test_a_program_without_a_grant_is_refused(self):
        self.sample_card()
        copy = copied_brivoctl(self.service)
        for command in self.COMMANDS:
            with self.subTest(command):
                result = subprocess.run([copy, *command, self.out("x.jpg")], env=self.service.environment,
                                        capture_output=True, timeout=WAIT, check=False)
                self.assertEqual(result.returncode, REFUSED, result.stderr)
        self.assertEqual(self.files(), [])

    def test_on_a_terminal_the_sheet_shows_how_far_it_is_and_takes_it_away(self):
        self.card(files={f"100ABCDE/IMG_{n:04}.JPG": b"x" for n in range(1, 3001)})
        terminal, end = pty.openpty()
        process = subprocess.Popen([BRIVOCTL, "sheet", "-o", self.out("sheet.jpg"), "--limit", "3000", "--size", "40"],
                                   env=self.service.environment, stdout=subprocess.DEVNULL, stderr=end)
        os.close(end)
        written = b""
        try:
            while chunk := os.read(terminal, 65536):
                written += chunk
        except OSError:
            pass  # the other end has closed
        os.close(terminal)
        self.assertEqual(process.wait(WAIT), SUCCESS, written)
        self.assertRegex(written.decode(), r"\r\x1b\[KIMG_\d+\.JPG \[#* *\] \d+ of 3000")
        self.assertTrue(written.endswith(b"\r\x1b[K"), written[-100:])


if __name__ == "__main__":
    unittest.main()
