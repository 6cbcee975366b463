import gc

import numpy as np
import picturezor as pz
import pytest


def test_arrays_show_the_samples_and_outlive_close():
    picture = pz.Picture(8, 6, "RGB")
    array = np.asarray(picture)
    assert array.shape == (6, 8, 3)
    array[:, :, 0] = 255
    assert picture.row(0)[:6] == b"\xff\x00\x00\xff\x00\x00"
    picture.close()
    assert not picture.valid
    gc.collect()
    assert array[5, 7].tolist() == [255, 0, 0]
    with pytest.raises(ValueError, match="closed"):
        picture.width


def test_pictures_stand_on_arrays_and_outlive_them():
    array = np.arange(144, dtype=np.uint8).reshape(6, 8, 3)
    picture = pz.Picture.from_array(array)
    picture.invert()
    assert array[0, 0].tolist() == [255, 254, 253]
    assert np.asarray(picture.red_channel()).shape == (6, 8)
    assert np.array_equal(np.asarray(picture.mirrored_view()), array[::-1])
    del array
    gc.collect()
    assert np.asarray(picture)[5, 7].tolist() == [114, 113, 112]
    for refused in (np.zeros((6, 8, 3), np.uint16), np.zeros((6, 8, 3), np.uint8)[:, ::2], np.zeros(6, np.uint8)):
        with pytest.raises(ValueError):
            pz.Picture.from_array(refused)


def test_failures_have_types_of_their_own():
    picture = pz.Picture(4, 3)
    with pytest.raises(IndexError):
        picture.row(3)
    with pytest.raises(ValueError):
        pz.Picture(0, 1)
    with pytest.raises(pz.Error):
        picture.scale_from(pz.Picture(3, 3, "CMYK"), kernel="box", width=4, height=3)
