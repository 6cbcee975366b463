import gc
import pickle

import numpy as np
import picturezor as pz
import pytest
from hypothesis import given, settings
from hypothesis import strategies as some

# The bytes of a pixel in an array: the letters of a format without X.
CHANNELS = {"RGB": 3, "RGBX": 3, "XBGR": 3, "AKYMC": 5, "G": 1, "AG": 2, "OneOf4": 1, "Buffer": 1, "Scaling7": 7}


def test_arrays_show_the_samples_and_outlive_close():
    picture = pz.Picture(8, 6, "RGB")
    array = np.asarray(picture)
    assert array.shape == (6, 8, 3)
    array[:, :, 0] = 255
    assert picture.row(0)[:6] == b"\xff\x00\x00\xff\x00\x00"
    assert memoryview(picture).shape == (6, 8, 3)
    picture.close()
    assert not picture.valid
    gc.collect()
    assert array[5, 7].tolist() == [255, 0, 0]
    with pytest.raises(ValueError, match="closed"):
        picture.width
    with pytest.raises(BufferError, match="closed"):
        memoryview(picture)
    with pytest.raises(ValueError, match="closed"):
        np.asarray(picture)


def test_pictures_stand_on_arrays_and_outlive_them():
    array = np.arange(144, dtype=np.uint8).reshape(6, 8, 3)
    picture = pz.from_array(array)
    picture.invert()
    assert array[0, 0].tolist() == [255, 254, 253]
    assert np.shares_memory(picture.memory_target, array)
    del array
    gc.collect()
    assert np.asarray(picture)[5, 7].tolist() == [114, 113, 112]
    frozen = np.zeros((6, 8), np.uint8)
    frozen.flags.writeable = False
    zeros = np.zeros((6, 8, 3), np.uint8)
    for refused in (zeros.astype(np.uint16), zeros[:, ::2], zeros[0, 0], zeros[:0], frozen, zeros[:, :, ::-1],
                    np.broadcast_to(zeros[:1], (6, 8, 3)), np.zeros((6, 8, 6), np.uint8)):
        with pytest.raises(ValueError):
            pz.from_array(refused)


@pytest.mark.parametrize("format", list(CHANNELS))
def test_every_kind_of_pixel_has_an_array(format):
    picture = pz.Picture(5, 4, format)
    picture.fill_rect_random()
    array = np.asarray(picture)
    assert array.shape == (4, 5) + ((CHANNELS[format],) if CHANNELS[format] > 1 else ())
    assert np.array_equal(picture.to_array(), array)
    assert np.array_equal(picture.copy(), array)
    again = pickle.loads(pickle.dumps(picture))
    assert again.image_format == picture.image_format and np.array_equal(again, array)


ends = some.integers(-9, 9) | some.none()
spans = some.tuples(ends, ends).map(lambda both: slice(*both))


@settings(max_examples=150, deadline=None)
@given(height=some.integers(1, 7), width=some.integers(1, 7), channels=some.integers(1, 5), before=some.integers(0, 3),
       behind=some.integers(0, 3), upwards=some.booleans(), mapped=some.booleans(), down=spans, across=spans,
       flip=some.booleans())
def test_slices_are_those_of_arrays(height, width, channels, before, behind, upwards, mapped, down, across, flip):
    whole = np.random.default_rng(1).integers(0, 256, (height, before + width + behind, channels), np.uint8)
    array = whole[::-1 if upwards else 1, before:before + width]
    expected = array.copy()
    picture = pz.from_array(array)
    around = whole.copy()
    assert np.array_equal(np.asarray(picture).reshape(array.shape), array)
    if flip:
        down = slice(None, None, -1)
    if 0 in expected[down, across].shape:
        with pytest.raises(ValueError):
            picture[down, across]
        return
    view = picture[down, across]
    assert np.array_equal(view.to_array().reshape(expected[down, across].shape), expected[down, across])
    picture[down, across] = 7
    expected[down, across] = 7
    assert np.array_equal(array, expected)
    changed = whole != around
    assert not changed[:, :before].any() and not changed[:, before + width:].any()


def test_planes_and_pixels():
    picture = pz.Picture(80, 120, "BGRA")
    picture.red[100:200, 50:80] = 7
    array = np.asarray(picture)
    assert array[110, 60].tolist() == [0, 0, 7, 0] and array.sum() == 20 * 30 * 7
    assert picture[110, 60] == (0, 0, 7, 0) and picture.red[-1, -1] == 7
    picture.alpha = 255
    picture[0, 0] = (1, 2, 3, 4)
    assert picture[0, 0] == (1, 2, 3, 4) and picture[0, 1] == (0, 0, 0, 255)
    picture[1:3, 0:2] = pz.from_array(np.full((2, 2, 3), 9, np.uint8))
    assert picture[2, 1][:3] == (9, 9, 9)
    assert not hasattr(picture, "cyan")
    for where, raised in (((120, 0), IndexError), (slice(0, 9, 2), ValueError),
                          ((0, slice(None, None, -1)), ValueError), ("a", TypeError)):
        with pytest.raises(raised):
            picture[where]
    with pytest.raises(TypeError):
        iter(picture)


def test_rows_of_mapped_pictures(tmp_path):
    picture = pz.Picture.mapped(tmp_path / "pixels", 50, 40)
    with pytest.raises(ValueError, match="to_array"):
        np.asarray(picture)
    with pytest.raises(BufferError):
        memoryview(picture)
    with picture.rows(10, 5) as block:
        block[:, 3] = (1, 2, 3)
    picture[20:22, 4:6] = 8
    picture.red[39] = 5
    array = picture.to_array()
    assert array[14, 3].tolist() == [1, 2, 3] and array[15, 3].tolist() == [0, 0, 0]
    assert array[21, 5].tolist() == [8, 8, 8] and array[39, 49].tolist() == [5, 0, 0]
    for first, count in ((36, 5), (-1, 2), (0, -1)):
        with pytest.raises(IndexError):
            with picture.rows(first, count):
                pass
    with pytest.raises(ValueError):
        picture.raw_row(0)
    with pytest.raises(TypeError, match="save"):
        pickle.dumps(picture)
    kept = picture.to_array()
    picture.close()
    assert np.array_equal(kept, array)


def test_memory_outlives_its_picture():
    picture = pz.Picture(5, 4, "G")
    row, memory, mirrored = picture.raw_row(1), picture.memory, np.asarray(picture.mirrored_view())
    picture.close()
    del picture
    gc.collect()
    row[:5] = 3
    assert mirrored[2].tolist() == [3] * 5 and (memory == 3).sum() == 5


def test_pillow_both_ways():
    image = pytest.importorskip("PIL.Image")
    for mode, format in (("L", "G"), ("LA", "GA"), ("RGB", "RGB"), ("RGBA", "RGBA"), ("CMYK", "CMYK")):
        shape = (3, 4, len(mode)) if len(mode) > 1 else (3, 4)
        samples = np.random.default_rng(2).integers(0, 256, shape, np.uint8)
        picture = pz.from_pil(image.fromarray(samples, mode))
        assert picture.image_format.name == format and np.array_equal(picture, samples)
        assert picture.to_pil().mode == mode and np.array_equal(picture.to_pil(), samples)
    palette = image.new("P", (2, 2))
    palette.putpalette([1, 2, 3])
    assert pz.from_pil(palette)[0, 0] == (1, 2, 3)
    assert pz.Picture(2, 2, "XBGR").to_pil().mode == "RGB"
    with pytest.raises(pz.Error):
        pz.Picture(2, 2, "CMYKA").to_pil()
