# SPDX-License-Identifier: MIT
"""What other decoders make of a still picture: PIL, heif-convert for HEIF and AVIF, dcraw for sensor images."""
import io
import os
import subprocess
import tempfile
import warnings

import numpy
from PIL import Image

LIMIT = 60  # seconds for one picture
DAMAGE = (b"Unexpected end of file", b"Corrupt data")  # what dcraw says and decodes all the same

BY_PIL = {"JPEG", "MPO", "THM", "PNG", "TIFF", "BTF", "WEBP", "Extended WEBP", "GIF", "BMP"}
BY_HEIF_CONVERT = {"HEIC", "HEIF", "HEIFS", "AVIF"}
BY_DCRAW = {"ARW", "CR2", "CR3", "CRW", "DNG", "KDC", "MRW", "NEF", "ORF", "PEF", "RAF", "RAW", "RW2", "SRW", "X3F"}
KINDS = BY_PIL | BY_HEIF_CONVERT | BY_DCRAW

JPEG_START = b"\xff\xd8"
ORIENTATION = 0x0112  # tag of EXIF and TIFF

# What turns a picture as it is shown back to how it is stored, by its EXIF orientation.
STORED = {
    2: Image.Transpose.FLIP_LEFT_RIGHT,
    3: Image.Transpose.ROTATE_180,
    4: Image.Transpose.FLIP_TOP_BOTTOM,
    5: Image.Transpose.TRANSPOSE,
    6: Image.Transpose.ROTATE_90,
    7: Image.Transpose.TRANSVERSE,
    8: Image.Transpose.ROTATE_270,
}


def as_stored(picture, orientation):
    return picture.transpose(STORED[orientation]) if orientation in STORED else picture


def flattened(picture):
    """The picture in 8 bits a sample and without alpha, on white."""
    if picture.mode.startswith("I"):
        samples = numpy.asarray(picture, dtype=float)
        return Image.fromarray(numpy.clip(samples / 257, 0, 255).astype("uint8"))
    if picture.mode in ("LA", "PA", "RGBA") or "transparency" in picture.info:
        seen = picture.convert("RGBA")
        return Image.alpha_composite(Image.new("RGBA", seen.size, "white"), seen).convert("RGB")
    return picture.convert("RGB")


def by_pil(data):
    """The first image of these bytes as it is stored; None when PIL cannot read it."""
    try:
        with warnings.catch_warnings(action="ignore"), Image.open(io.BytesIO(data)) as picture:
            picture.load()
            if picture.format == "TIFF":  # the one kind that PIL turns by itself
                picture = as_stored(picture, picture.tag_v2.get(ORIENTATION))
            return flattened(picture)
    except (OSError, SyntaxError, ValueError, TypeError, KeyError, IndexError, EOFError, MemoryError, OverflowError,
            Image.DecompressionBombError):
        return None


def by_heif_convert(path):
    """The primary image as it is shown; None when it cannot be read."""
    with tempfile.TemporaryDirectory() as folder:
        done = subprocess.run(["heif-convert", path, f"{folder}/out.png"], capture_output=True, timeout=LIMIT,
                              check=False)
        names = [name for name in ("out.png", "out-1.png") if os.path.exists(f"{folder}/{name}")]
        if done.returncode != 0 or not names:
            return None
        with open(f"{folder}/{names[0]}", "rb") as file:
            return by_pil(file.read())


def by_dcraw(path, *options):
    """The sensor image as it is stored; None when it cannot be read, or is damaged."""
    done = subprocess.run(["dcraw", "-c", "-w", "-t", "0", *options, path], capture_output=True, timeout=LIMIT,
                          check=False)
    is_damaged = any(complaint in done.stderr for complaint in DAMAGE)
    return None if done.returncode != 0 or is_damaged else by_pil(done.stdout)


class Reference:
    """One file of the corpus, and what expected.json says of it."""

    def __init__(self, path, facts):
        self.path = str(path)
        self.facts = facts
        with open(path, "rb") as file:
            self.data = file.read()
        self._decoded = {}

    def embedded(self):
        """Place and length of each finished JPEG in the file."""
        told = [*self.facts.get("images", []), self.facts.get("exif_thumbnail", {})]
        return {(image["offset"], image["length"]) for image in told
                if image.get("jpeg") and image.get("in_file", True)}

    def picture(self, size, orientation):
        """What a thumbnail of at most `size` pixels is made from, as it is stored; `orientation` is how it is shown.
        None when there is none."""
        kind = self.facts["file_type"]
        if kind in BY_PIL or self.data.startswith(JPEG_START):
            return self._once("whole", lambda: by_pil(self.data))
        if kind in BY_HEIF_CONVERT:
            shown = self._once("whole", lambda: by_heif_convert(self.path))
            return shown and as_stored(shown, orientation)
        return self._preview(size) or self._sensor(size)

    def _once(self, name, decode):
        if name not in self._decoded:
            self._decoded[name] = decode()
        return self._decoded[name]

    def _preview(self, size):
        """The narrowest preview that is large enough."""
        previews = [self._once(place, lambda: by_pil(self.data[place[0]:][:place[1]])) for place in self.embedded()]
        wanted = min(size, max(self.facts.get("width", size), self.facts.get("height", size)))
        enough = [preview for preview in previews if preview and max(preview.size) >= wanted]
        return min(enough, key=lambda preview: max(preview.size), default=None)

    def _sensor(self, size):
        half = self._once("half", lambda: by_dcraw(self.path, "-h"))
        if half is None or max(half.size) >= size:
            return half
        return self._once("full", lambda: by_dcraw(self.path))
