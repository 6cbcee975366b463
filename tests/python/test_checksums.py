import struct

import numpy as np
import picturezor as pz
import pytest
from conftest import SOURCE

# The calls of tests/trust/checksums.cpp, through Python: the same seeds, and so the same sums.
SHAPES = ((77, 7), (5, 9), (33, 8), (130, 3), (16, 12), (64, 5))
# For a row the class's method, and its numbers with the ends of their ranges, the real ones in sixteenths.
ROWS = {
    "Invert()": ("invert", {}),
    "HMirror()": ("h_mirror", {}),
    "VMirror()": ("v_mirror", {}),
    "SolarizeFilter(p)": ("solarize_filter", {}),
    "NeonFilter(p)": ("neon_filter", {}),
    "Rotate90(p)": ("rotate90", {}),
    "Rotate270(p)": ("rotate270", {}),
    "GammaFilter(pd)": ("gamma_filter", {"gamma": (-32, 96, 16)}),
    "GainFilter(pdd)": ("gain_filter", {"gain": (-32, 96, 16), "bias": (-32, 96, 16)}),
    "BoxBlurFractionalFilter(pd)": ("box_blur_fractional_filter", {"radius": (-8, 80, 16)}),
    "OilFilter(pii)": ("oil_filter", {"levels": (-9, 300), "range": (0, 7)}),
    "EngraveFilter(pi)": ("engrave_filter", {"level": (-9, 300)}),
}


class Noise:
    def __init__(self, seed):
        self.engine = np.random.MT19937()
        self.engine._legacy_seeding(seed)

    def many(self, count):
        return self.engine.random_raw(count).astype(np.uint8)

    def between(self, first, last):
        return first + int(self.engine.random_raw()) % (last - first + 1)


def filled(width, height, format, noise):
    picture = pz.Picture(width, height, pz.Format(format))
    for y in range(height):
        picture.set_row(y, noise.many(picture.row_size))
    return picture


def bytes_of(picture):
    if picture is None:
        return bytes(8)
    numbers = (1, picture.width, picture.height, picture.pixel_size, picture.row_size, picture.row_offset,
               int(picture.image_format))
    return struct.pack("<7q", *numbers) + b"".join(bytes(picture.row(y)) for y in range(picture.height))


def bytes_of_call(key, format, variant):
    method, numbers = ROWS[key]
    noise = Noise(variant)
    width, height = SHAPES[variant]
    picture = filled(width, height, format, noise)
    given, dests = {}, []
    if "(p" in key:
        dest = picture if variant % 3 == 1 else None
        if variant % 3 == 2:
            other = noise.between(1, 13) if variant % 2 else format
            dest = filled(width + variant // 3, height + variant // 3, other, noise)
        given["dest"] = dest
        dests.append(dest)
    for name, (first, last, *parts) in numbers.items():
        number = noise.between(first, last)
        given[name] = number / parts[0] if parts else number
    try:
        result = getattr(picture, method)(**given)
    except (ValueError, pz.Error):
        result = None
    made = bytes_of(result) if dests else b""
    return bytes(8) + made + bytes_of(picture) + b"".join(map(bytes_of, dests))


@pytest.mark.parametrize("key", ROWS)
def test_python_gives_the_sums_of_the_class(key):
    lines = map(str.split, (SOURCE / "tests/trust/checksums.txt").read_text().splitlines())
    wanted = {int(line[2]): line[3] for line in lines if line[0] == key and "extreme" not in line}
    for format in (1, 4, 11, 13, 24):
        state = 14695981039346656037
        for variant in range(len(SHAPES)):
            for byte in bytes_of_call(key, format, variant):
                state = (state ^ byte) * 1099511628211 % 2**64
        assert f"{(state ^ state >> 32) % 2**32:08x}" == wanted[format], format
