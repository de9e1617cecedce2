# SPDX-License-Identifier: MIT
"""Thumbnails of the files of real cameras, against what other decoders make of the same files. Every difference is
listed with its reason in thumbnail_disagreements.json and in docs/thumbnails.md, and each that is listed is there."""
import io
import json
import os
import pathlib
import shutil
import tempfile
import unittest

from harness import ServiceTest, needs

try:
    import numpy
    from PIL import Image, ImageDraw, ImageOps

    from reference_pictures import (BY_DCRAW, BY_HEIF_CONVERT, KINDS, ORIENTATION, Reference, as_stored, by_pil,
                                    flattened)
    from structural_similarity import luma, similarity
    MISSING = ""
except ImportError as error:
    MISSING = f"{error}; python3-numpy and python3-pil are needed"
    BY_DCRAW = BY_HEIF_CONVERT = KINDS = frozenset()

PROJECT = pathlib.Path(__file__).resolve().parents[2]
CORPUS = pathlib.Path(os.environ.get("BRIVOD_CORPUS", PROJECT.parent / "shared" / "corpus"))
DISAGREEMENTS = pathlib.Path(__file__).with_name("thumbnail_disagreements.json")
MANUAL = PROJECT / "docs/thumbnails.md"

SIZES = (160, 256, 1024)  # pixels
ALIKE = 0.95
QUALITY = 85  # what coding alone costs is no difference: the other picture is coded too

DCF_EXTENSIONS = {"JPEG": "JPG", "TIFF": "TIF", "BTF": "TIF", "WEBP": "PNG", "AVIF": "HIF", "HEIF": "HIF"}

# What a thumbnail can be found guilty of.
OURS_ALONE = "only we read it"
THEIRS_ALONE = "only others read it"
NOT_EMBEDDED = "an embedded JPEG that is none"
TOO_SMALL = "smaller than asked for"
WRONG_SIZE = "size"
WRONG_CONTENT = "content"


def differences(reference, size, reply):
    """In what the reply to a request of this size differs from what it should be."""
    data = reply.get("thumb") or b""
    if data and data in reference.data:
        return embedded_differences(reference, size, data)
    expected = reference.picture(size, reply.get("Orientation", 1))
    if not data or expected is None:
        return set() if not data and expected is None else {OURS_ALONE if data else THEIRS_ALONE}
    return decoded_differences(expected, size, data)


def embedded_differences(reference, size, data):
    """Bytes of the file itself: those of a finished JPEG in it, which is no smaller than a decoded one would be."""
    if data not in [reference.data[offset:][:length] for offset, length in reference.embedded()]:
        return {NOT_EMBEDDED}
    whole = max(reference.facts.get("width", size), reference.facts.get("height", size))
    return {TOO_SMALL} if max(Image.open(io.BytesIO(data)).size) < min(size, whole) else set()


def decoded_differences(expected, size, data):
    thumbnail = by_pil(data)
    if thumbnail is None:
        return {WRONG_CONTENT}
    scale = min(1, size / max(expected.size))
    if any(abs(side - whole * scale) > 1 for side, whole in zip(thumbnail.size, expected.size)):
        return {WRONG_SIZE}
    return set() if likeness(thumbnail, expected) >= ALIKE else {WRONG_CONTENT}


def likeness(thumbnail, picture):
    return similarity(luma(thumbnail), luma(coded(picture.resize(thumbnail.size, Image.Resampling.BICUBIC))))


def coded(picture):
    jpeg = io.BytesIO()
    picture.convert("RGB").save(jpeg, "JPEG", quality=QUALITY)
    return Image.open(jpeg)


def dcf_extension(path):
    """An extension that DCF allows; what a file is, its bytes say."""
    extension = path.rsplit(".", 1)[1].upper()
    return DCF_EXTENSIONS.get(extension, extension)


def listed():
    return json.loads(DISAGREEMENTS.read_text(encoding="utf-8"))


@unittest.skipIf(MISSING, MISSING)
@unittest.skipUnless((CORPUS / "expected.json").exists(), f"there are no camera files in {CORPUS}")
class ThumbnailOracleTest(ServiceTest):
    @classmethod
    def setUpClass(cls):
        cls.expected = json.loads((CORPUS / "expected.json").read_text(encoding="utf-8"))["files"]

    def put_on_card(self, paths):
        """Puts files on a card under DCF names; gives the device that serves it, and the handle of each."""
        card = f"{self.service.volumes}/CARD"
        os.makedirs(f"{card}/DCIM/100CORPS")
        names = {path: f"PICT{number:04}.{dcf_extension(path)}" for number, path in enumerate(paths, 1)}
        for path, name in names.items():
            shutil.copy(CORPUS / path, f"{card}/DCIM/100CORPS/{name}")
        device = self.device(self.manager(), card)
        device.enumerate()
        found = device.wait_for(*names.values())
        return device, {path: found[name].handle for path, name in names.items()}

    def check(self, folders, kinds=None):
        """Compares the files in these folders, if they are of these kinds."""
        paths = [path for path, facts in sorted(self.expected.items())
                 if path.startswith(folders) and facts.get("file_type") in (kinds or KINDS)]
        self.assertTrue(paths)
        device, handles = self.put_on_card(paths)
        for path in paths:
            reference = Reference(CORPUS / path, self.expected[path])
            with self.subTest(path):
                found = {size: differences(reference, size, self.ask(device, handles[path], size)) for size in SIZES}
                self.assertEqual(set().union(*found.values()), set(listed().get(path, {})), found)

    def ask(self, device, handle, size):
        return device.request("requestThumbnailDataForObjectHandle", handle, {"OVThumbnailMaxPixelSize": size})

    def test_jpegs(self):
        self.check(("card-", "jpeg/"), KINDS - BY_DCRAW - BY_HEIF_CONVERT)

    def test_png_tiff_and_webp(self):
        self.check(("png/", "tiff/", "webp/"))

    @needs("heif-convert")
    def test_heif_and_avif(self):
        self.check(("heif/", "avif/"))

    @needs("dcraw")
    def test_raw_files(self):
        self.check(("raw/",))

    @needs("heif-convert", "dcraw")
    def test_damaged_and_hostile_files(self):
        self.check(("malformed/",))


class DisagreementsTest(unittest.TestCase):
    def test_the_list_is_the_one_in_the_manual(self):
        written = {line for line in MANUAL.read_text(encoding="utf-8").splitlines() if line.startswith("| `")}
        self.assertEqual(written, {f"| `{path}` | {what} | {reason} |"
                                   for path, reasons in listed().items() for what, reason in reasons.items()})

    @unittest.skipUnless((CORPUS / "expected.json").exists(), f"there are no camera files in {CORPUS}")
    def test_the_list_names_files_of_the_corpus(self):
        self.assertEqual([path for path in listed() if not (CORPUS / path).exists()], [])


@unittest.skipIf(MISSING, MISSING)
class MeasureTest(unittest.TestCase):
    """What compares can tell, and what it does not mind."""

    def setUp(self):
        self.picture = Image.radial_gradient("L").resize((300, 200)).convert("RGB")
        draw = ImageDraw.Draw(self.picture)
        for x in range(10, 290, 14):
            draw.ellipse((x, x / 2, x + 25, x / 2 + 40), fill=(x % 256, 3 * x % 256, 7 * x % 256))

    def likeness_of(self, changed):
        return likeness(changed.resize((150, 100), Image.Resampling.LANCZOS), self.picture)

    def test_a_picture_is_like_itself(self):
        values = luma(self.picture)
        self.assertAlmostEqual(similarity(values, values), 1)

    def test_the_way_of_scaling_and_the_loss_of_coding_do_not_matter(self):
        self.assertGreater(self.likeness_of(self.picture), ALIKE)
        self.assertGreater(self.likeness_of(coded(self.picture)), ALIKE)

    def test_a_picture_that_is_turned_shifted_darker_or_blurred_is_another(self):
        for other in (ImageOps.mirror(self.picture), ImageOps.flip(self.picture), ImageOps.invert(self.picture),
                      self.picture.transform((300, 200), Image.Transform.AFFINE, (1, 0, 4, 0, 1, 0)),
                      self.picture.point(lambda value: value * 0.6),
                      self.picture.resize((40, 27)).resize((300, 200))):
            self.assertLess(self.likeness_of(other), ALIKE)

    def test_a_picture_smaller_than_a_window_can_be_compared(self):
        black, white = numpy.zeros((2, 3)), numpy.full((2, 3), 255.0)
        self.assertAlmostEqual(similarity(black, black), 1)
        self.assertLess(similarity(black, white), 0.01)

    def test_the_way_back_from_each_orientation(self):
        for orientation in range(1, 9):
            exif = Image.Exif()
            exif[ORIENTATION] = orientation
            file = io.BytesIO()
            self.picture.save(file, "PNG", exif=exif)
            shown = ImageOps.exif_transpose(Image.open(file))
            self.assertEqual(as_stored(shown, orientation).tobytes(), self.picture.tobytes(), orientation)

    def test_pictures_without_alpha_are_on_white(self):
        clear = Image.new("RGBA", (1, 1), (0, 0, 0, 0))
        self.assertEqual(flattened(clear).getpixel((0, 0)), (255, 255, 255))

    def test_sixteen_bits_become_eight(self):
        grey = Image.fromarray(numpy.array([[0, 32896, 65535]], dtype="uint16"))
        self.assertEqual(list(flattened(grey).getdata()), [0, 128, 255])


@unittest.skipIf(MISSING, MISSING)
class VerdictTest(unittest.TestCase):
    """What the comparison says of replies, right and wrong ones, to requests for a picture of 640 × 480 with an
    embedded JPEG of 160 × 120."""

    def setUp(self):
        self.picture = Image.effect_mandelbrot((640, 480), (-2, -1.2, 1, 1.2), 100).convert("RGB")
        whole, self.small = (self.jpeg_of(self.picture.resize(size), 95) for size in ((640, 480), (160, 120)))
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        path = pathlib.Path(folder.name, "picture")
        path.write_bytes(whole + self.small)
        thumbnail = {"offset": len(whole), "length": len(self.small), "jpeg": True, "in_file": True}
        self.facts = {"file_type": "JPEG", "width": 640, "height": 480, "exif_thumbnail": thumbnail}
        self.reference = Reference(path, self.facts)

    def jpeg_of(self, picture, quality=90):
        file = io.BytesIO()
        picture.save(file, "JPEG", quality=quality)
        return file.getvalue()

    def verdict(self, size, data):
        return differences(self.reference, size, {"thumb": data} if data else {})

    def test_right_replies(self):
        self.assertEqual(self.verdict(160, self.small), set())
        for size, thumbnail in ((256, (256, 192)), (1024, (640, 480))):
            self.assertEqual(self.verdict(size, self.jpeg_of(self.picture.resize(thumbnail))), set())

    def test_wrong_replies(self):
        self.assertEqual(self.verdict(256, self.small), {TOO_SMALL})
        self.assertEqual(self.verdict(160, self.small[:-2]), {NOT_EMBEDDED})
        self.assertEqual(self.verdict(160, None), {THEIRS_ALONE})
        self.assertEqual(self.verdict(256, self.jpeg_of(self.picture.resize((250, 188)))), {WRONG_SIZE})
        self.assertEqual(self.verdict(256, self.jpeg_of(self.picture.resize((192, 256)))), {WRONG_SIZE})
        self.assertEqual(self.verdict(256, self.jpeg_of(ImageOps.mirror(self.picture).resize((256, 192)))),
                         {WRONG_CONTENT})
        self.assertEqual(self.verdict(256, b"no JPEG"), {WRONG_CONTENT})

    def test_a_file_that_nobody_else_reads(self):
        self.reference.data = self.reference.data[:5000]
        self.assertEqual(self.verdict(256, None), set())
        self.assertEqual(self.verdict(256, self.jpeg_of(self.picture.resize((256, 192)))), {OURS_ALONE})


if __name__ == "__main__":
    unittest.main()
