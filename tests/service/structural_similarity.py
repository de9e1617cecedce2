# SPDX-License-Identifier: MIT
"""How alike two pictures look: structural similarity of their luma."""
import numpy

WINDOW = 8  # pixels
STEADY = ((0.01 * 255) ** 2, (0.03 * 255) ** 2)  # keep flat windows from dividing by nothing


def luma(picture):
    """The luma of a PIL picture (ITU-R BT.601), 0 to 255."""
    return numpy.asarray(picture.convert("RGB"), dtype=float) @ (0.299, 0.587, 0.114)


def means(values, window):
    """The mean of every window of window[0] × window[1] values."""
    sums = numpy.pad(values, ((1, 0), (1, 0))).cumsum(0).cumsum(1)
    down, across = window
    total = sums[down:, across:] - sums[:-down, across:] - sums[down:, :-across] + sums[:-down, :-across]
    return total / (down * across)


def similarity(one, other):
    """From -1 to 1, where 1 is the same picture. Both are luma of the same shape."""
    if one.shape != other.shape:
        raise ValueError(f"shapes differ: {one.shape} and {other.shape}")
    window = tuple(min(WINDOW, side) for side in one.shape)
    mean_one, mean_other = means(one, window), means(other, window)
    spread_one = means(one * one, window) - mean_one ** 2
    spread_other = means(other * other, window) - mean_other ** 2
    together = means(one * other, window) - mean_one * mean_other
    brightness = (2 * mean_one * mean_other + STEADY[0]) / (mean_one ** 2 + mean_other ** 2 + STEADY[0])
    structure = (2 * together + STEADY[1]) / (spread_one + spread_other + STEADY[1])
    return float((brightness * structure).mean())
