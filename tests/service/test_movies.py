# SPDX-License-Identifier: MIT
"""Movies: what the command line shows of them, and a card full of them."""
import contextlib
import os
import pathlib
import shutil
import signal
import unittest

from harness import wait_until
from test_brivoctl_pictures import PictureCommandTest, jpeg_size, png_size

PROJECT = pathlib.Path(__file__).resolve().parents[2]
CORPUS = pathlib.Path(os.environ.get("BRIVOD_CORPUS", PROJECT.parent / "shared" / "corpus"))
UPRIGHT, TURNED, SOUND = "mk-d-rot0.mp4", "mk-d-rot90-makemodel.mov", "am-sample_audio_only.mp4"


@unittest.skipUnless(CORPUS.is_dir(), f"there is no corpus at {CORPUS}")
class MovieTest(PictureCommandTest):
    def movies(self, name, files):
        """A card with copies of movies of the corpus, by their paths below DCIM."""
        card = pathlib.Path(self.service.volumes, name)
        for path, source in files.items():
            target = card / "DCIM" / path
            target.parent.mkdir(parents=True, exist_ok=True)
            shutil.copy(CORPUS / source, target)
        self.handle_of(str(card))
        return card

    def few(self):
        return self.movies("CARD", {"100ABCDE/MVI_0001.MP4": f"movie/{UPRIGHT}",
                                    "100ABCDE/MVI_0002.MOV": f"movie/{TURNED}",
                                    "100ABCDE/MVI_0003.MP4": f"audio/{SOUND}"})


class CommandTest(MovieTest):
    def test_the_catalogue_tells_size_and_orientation(self):
        self.few()
        found = {entry["path"][-12:]: [entry[key] for key in ("width", "height", "orientation")]
                 for entry in self.json("ls") if not entry["folder"]}
        self.assertEqual(found, {"MVI_0001.MP4": [320, 240, 1], "MVI_0002.MOV": [240, 320, 6],
                                 "MVI_0003.MP4": [0, 0, 0]})

    def test_the_metadata_tell_duration_and_camera(self):
        self.few()
        turned = self.json("info", "DCIM/100ABCDE/MVI_0002.MOV")
        self.assertEqual(turned, {"Orientation": 6, "VideoDuration": 2.0, "PixelWidth": 240, "PixelHeight": 320,
                                  "PixelXDimension": 240, "PixelYDimension": 320, "{MakerNorel}": {},
                                  "{TIFF}": {"Make": "TestMake dev", "Model": "TestModel dev"}})
        sound = self.json("info", "DCIM/100ABCDE/MVI_0003.MP4")
        self.assertAlmostEqual(sound["VideoDuration"], 1.089, places=3)
        self.assertNotIn("PixelWidth", sound)

    def test_the_thumbnail_is_the_first_frame_as_it_is_stored(self):
        self.few()
        for path, size in (("MVI_0001.MP4", (160, 120)), ("MVI_0002.MOV", (160, 120))):
            self.brivoctl("thumb", f"DCIM/100ABCDE/{path}", "--size", "160", "-o", self.out("thumb.jpg"))
            self.assertEqual(jpeg_size(self.bytes_of(self.out("thumb.jpg"))), size)

    def test_sound_alone_has_no_thumbnail(self):
        self.few()
        self.brivoctl("thumb", "DCIM/100ABCDE/MVI_0003.MP4", "-o", self.out("thumb.jpg"), code=1)
        self.assertEqual(self.files(), [])

    def test_a_contact_sheet_shows_movies(self):
        self.few()
        result = self.json("sheet", "-o", self.out("sheet.png"))
        self.assertEqual((result["objects"], result["missing"]), (3, 1), result)
        png_size(self.bytes_of(self.out("sheet.png")))


class FullCardTest(MovieTest):
    COUNT = 500

    def full(self):
        movies = {f"{100 + i // 100}MOVIE/MVI_{i:04}.MP4": f"movie/{UPRIGHT}" for i in range(self.COUNT)}
        return self.movies("FULL", {**movies, "200PHOTO/IMG_0001.JPG": "jpeg/me-beach.jpg"})

    def kill_workers(self):
        """How many processes of the service there were to kill."""
        killed = 0
        for task in pathlib.Path("/proc", str(self.service.process.pid), "task").iterdir():
            with contextlib.suppress(FileNotFoundError, ProcessLookupError):  # threads and workers end by themselves, too
                for worker in (task / "children").read_text().split():
                    os.kill(int(worker), signal.SIGKILL)
                    killed += 1
        return killed

    def sizes(self):
        return [(entry["width"], entry["height"]) for entry in self.json("ls") if entry["path"].endswith(".MP4")]

    def test_all_of_500_movies_are_in_the_catalogue(self):
        self.full()
        self.assertEqual(self.sizes(), [(320, 240)] * self.COUNT)

    def test_a_photo_does_not_wait_for_the_movies(self):
        self.full()
        device = self.device(self.manager(), f"{self.service.volumes}/FULL")
        device.enumerate()
        device.wait_for("IMG_0001.JPG", f"MVI_{self.COUNT - 1:04}.MP4")
        names = [dataset.filename for dataset in device.datasets()]
        self.assertLess(names.index("IMG_0001.JPG"), self.COUNT // 2, "in the first half of what came")

    def test_workers_that_die_cost_their_movies_alone(self):
        self.full()
        device = self.device(self.manager(), f"{self.service.volumes}/FULL")
        device.enumerate()
        killed = arrived = 0
        while killed < 20 and arrived < self.COUNT:
            wait_until(lambda seen=arrived: len(device.datasets()) > seen, "more of them")
            arrived = len(device.datasets())
            killed += self.kill_workers()
        self.assertGreater(killed, 0)
        sizes = self.sizes()
        self.assertEqual(len(sizes), self.COUNT)
        self.assertLessEqual(self.COUNT - sizes.count((320, 240)), killed)
        self.brivoctl("thumb", "DCIM/100MOVIE/MVI_0001.MP4", "--size", "160", "-o", self.out("thumb.jpg"))


if __name__ == "__main__":
    unittest.main()
