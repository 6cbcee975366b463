import gc
import threading
import weakref

import numpy as np
import picturezor as pz
import pytest


def test_failures_have_types_of_their_own():
    picture = pz.Picture(4, 3)
    for call, raised in ((lambda: picture.row(3), IndexError), (lambda: picture.row(-1), IndexError),
                         (lambda: picture.channel(3), IndexError), (lambda: picture.set_row(0, b"short"), ValueError),
                         (lambda: pz.Picture(0, 1), ValueError), (lambda: pz.Picture(1, 1, "RGBB"), ValueError),
                         (lambda: pz.Picture(4, 3, None), TypeError), (lambda: picture.alpha_channel(), pz.Error),
                         (lambda: picture.fill_rect_rgb("#12345"), ValueError),
                         (lambda: picture.row_in_format(0, "CMYK"), pz.Error),
                         (lambda: picture.compare_images(pz.Picture(3, 3)), pz.Error),
                         (lambda: picture.scale_from(pz.Picture(3, 3, "CMYK"), kernel="box", width=4, height=3),
                          pz.Error),
                         (lambda: pz.Picture(100000, 100000, "Scaling8"), pz.Error),
                         (lambda: pz.HostPicture(0, 1), ValueError),
                         (lambda: pz.HostPicture(2, 2).pixel(2, 0), IndexError)):
        with pytest.raises(raised):
            call()
    picture.close()
    picture.close()
    for call in (picture.h_mirror, picture.clone, lambda: picture.width, lambda: pz.Picture(4, 3).copy_pixels(picture),
                 lambda: picture.scale(width=3), lambda: picture[0:1, 0:1], lambda: picture.encode("png"),
                 picture.to_array,
                 lambda: setattr(picture, "factory", None), lambda: picture.parent, lambda: picture.memory):
        with pytest.raises(ValueError, match="closed"):
            call()
    assert repr(picture) == "<picturezor.Picture, closed>"


def test_results_are_the_very_objects():
    assert pz.Picture(1, 1, "xBGR").image_format == pz.Format.XBGR
    picture, dest = pz.Picture(4, 3), pz.Picture(4, 3)
    assert picture.gamma_filter(dest=dest, gamma=2) is dest
    assert picture.gamma_filter(picture, gamma=2) is picture
    view = picture.red_channel()
    assert view.parent.compare_images(picture) == 0
    parent = pz.Picture(4, 3, "G")
    clip = parent.clip_image((1, 1, 2, 2))
    del parent
    gc.collect()
    clip.fill_rect(9)
    assert clip.parent[1, 1] == 9
    parent = clip.parent
    parent.close()
    assert clip.parent is None and clip[0, 0] == 9


def test_host_pictures():
    host = pz.HostPicture(4, 3)
    assert host.rgb() == b"\xff" * 36 and host.mask is None
    host.set_pixel(1, 2, "#102030")
    assert host.pixel(1, 2) == (16, 32, 48) and host.form == pz.PictureForm.gworld32
    on = pz.Picture.from_host(host)
    assert on.target.width == 4
    on.fill_rect_rgb((3, 0, 1, 1), 1, 2, 3)
    assert host.pixel(3, 0) == (1, 2, 3)
    del on
    gc.collect()
    drawn = pz.Picture(4, 3)
    drawn.draw_picture_rgb(host)
    assert drawn.copy_picture().rgb() == host.rgb()
    world = drawn.copy_gworld()
    assert (world.width, world.height, world.depth) == (4, 3, 24) and len(world.row(0)) == 4 * world.pixel_bytes
    host.draw(drawn.copy_picture(), (0, 0, 4, 3), (0, 0, 4, 3))
    assert host.rgb() == bytes(np.asarray(drawn))


def test_factories_make_the_pictures():
    made = []

    def make(width, height, format):
        made.append(pz.Picture(width, height, format))
        return made[-1]

    picture = pz.Picture(4, 3)
    picture.factory = pz.Factory(make)
    assert picture.neon_filter().compare_images(made[0]) == 0
    picture.factory = pz.Factory(lambda *size: None)
    picture.neon_filter()
    for wrong, raised in ((lambda *size: 1 / 0, ZeroDivisionError), (lambda *size: 5, TypeError)):
        picture.factory = pz.Factory(wrong)
        with pytest.raises(raised):
            picture.neon_filter()
    picture.factory = None
    assert picture.factory is None
    try:
        pz.set_factory(pz.Factory(make))
        assert pz.Picture.create(5, 2, "G").width == 5 and len(made) == 2
        pz.set_factory(pz.Factory(lambda *size: pz.set_factory(None)))
        with pytest.raises(pz.Error, match="at work"):
            pz.Picture.create(5, 2)
    finally:
        pz.set_factory(None)


def test_what_python_gave_comes_back():
    array = np.zeros((5, 4, 3), np.uint8)
    gone = weakref.ref(array)
    picture = pz.from_array(array)
    view = picture.mirrored_view()
    del array, picture
    gc.collect()
    assert gone() is not None
    view.close()
    del view
    gc.collect()
    assert gone() is None


def run_together(*works):
    failures = []

    def guarded(work):
        try:
            for _ in range(60):
                work()
        except Exception as failure:
            failures.append(failure)

    threads = [threading.Thread(target=guarded, args=(work,)) for work in works]
    for thread in threads:
        thread.start()
    for thread in threads:
        thread.join(60)
        assert not thread.is_alive()
    return failures


def test_threads_take_turns(tmp_path):
    mapped = pz.Picture.mapped(tmp_path / "pixels", 3000, 2000)
    mapped.fill_rect_random()
    mirror, part, other = mapped.mirrored_view(), mapped[10:200, 5:2000], pz.Picture(3000, 2000)
    before, row = mapped.to_array(), mapped.row(5)
    # The window of a mapped picture moves under each of them.
    assert not run_together(lambda: mirror.row(0), lambda: part.to_array(), lambda: mapped.row(1999),
                            lambda: mapped.set_row(5, row), lambda: other[:200, :].copy_pixels(mapped[1800:, :]))
    assert np.array_equal(mapped.to_array(), before)
    # Two that need each other, the other way round.
    one, two = pz.Picture(500, 400), pz.Picture(500, 400)
    assert not run_together(lambda: one.copy_pixels(two), lambda: two.copy_pixels(one))


def test_one_thread_closes_while_others_work():
    picture = pz.Picture(300, 200, "RGBA")
    calls = iter(range(60))
    failures = run_together(picture.h_mirror, lambda: picture.scale(width=30), lambda: np.asarray(picture).sum(),
                            lambda: next(calls) == 30 and picture.close())
    assert all(isinstance(failure, ValueError) and "closed" in str(failure) for failure in failures)
