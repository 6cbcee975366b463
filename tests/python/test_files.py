import io
import pickle
import signal
import subprocess
import sys

import numpy as np
import picturezor as pz
import pytest


def test_paths_bytes_and_files_give_the_same(lake, tmp_path):
    by_path = pz.open(lake)
    assert (by_path.width, by_path.height, by_path.image_format.name) == (1920, 1200, "RGB")
    data = lake.read_bytes()
    with open(lake, "rb") as file, open(lake, "rb") as behind:
        sources = [str(lake), data, memoryview(data), bytearray(data), io.BytesIO(data), file]
        for source in sources:
            assert by_path.compare_images(pz.open(source)) == 0
        # From where it is at.
        (tmp_path / "two").write_bytes(b"head" + by_path[:4, :4].encode("png"))
    with open(tmp_path / "two", "rb") as behind:
        behind.read(4)
        assert pz.open(behind).width == 4


def test_saving(tmp_path):
    picture = pz.Picture(64, 48, "RGBA")
    picture.fill_rect_random()
    for name, options in (("a.png", {"level": 1}), ("a.tif", {"compression": "deflate", "tile": 16}),
                          ("b.tif", {"big": True})):
        picture.save(tmp_path / name, **options)
        assert picture.compare_images(pz.open(tmp_path / name)) == 0
    file = io.BytesIO()
    picture.save(file, type="png", level=1)
    assert file.getvalue() == (tmp_path / "a.png").read_bytes()
    with pytest.warns(UserWarning, match="alpha"):
        rough, fine = (len(picture.encode("jpg", quality=quality)) for quality in (10, 95))
    assert rough < fine / 3
    # Other orders of samples, and views.
    turned = pz.Picture(64, 48, "XBGR")
    turned.copy_pixels(picture)
    assert np.array_equal(pz.open(turned.encode("png")), np.asarray(picture)[:, :, :3])
    view = picture[40:8:-1, 3:30].blue
    assert np.array_equal(pz.open(view.encode("tif")), np.asarray(view))


@pytest.mark.parametrize("quality, subsampling", [(75, 2), (95, 0)])
def test_a_jpeg_made_in_bands_is_that_of_one_go(lake, quality, subsampling):
    image = pytest.importorskip("PIL.Image")
    picture = pz.open(lake).crop((0, 0, 1501, 1101))
    rgb = np.asarray(picture)
    for format, mode, samples in (("RGB", "RGB", rgb), ("G", "L", rgb[:, :, 0]),
                                  ("CMYK", "CMYK", np.dstack([rgb, rgb[:, :, 1]]))):
        samples = np.ascontiguousarray(samples)
        whole = io.BytesIO()
        # Only colours have a resolution of their own.
        image.fromarray(samples, mode).save(whole, "JPEG", quality=quality,
                                            subsampling=subsampling if mode == "RGB" else 0)
        made = pz.from_array(samples, format=format).encode("jpg", quality=quality)
        assert b"\xff\xdd\0\4" in made, "no restart interval"
        assert np.array_equal(image.open(io.BytesIO(made)), image.open(whole)), mode


def test_what_goes_with_the_pixels(lake, tmp_path):
    image = pytest.importorskip("PIL.Image")
    image.new("RGB", (60, 30)).save(tmp_path / "a.png", dpi=(300, 150))
    picture = pz.open(tmp_path / "a.png")
    assert picture.info["density"] == pytest.approx((300, 150), rel=1e-3)
    turned = pz.open(picture.rotate(angle=90).encode("png"))
    assert turned.info["density"] == pytest.approx((150, 300), rel=1e-3)
    assert pz.Picture(3, 3).info == {}


def test_failures(tmp_path, lake):
    picture = pz.Picture(4, 3)
    (tmp_path / "text.png").write_text("no image")
    for call, raised in ((lambda: pz.open(tmp_path / "none.png"), pz.Error), (lambda: pz.open(b""), pz.Error),
                         (lambda: pz.open(tmp_path / "text.png"), pz.Error),
                         (lambda: pz.open(lake.read_bytes()[:5000]), pz.Error),
                         (lambda: pz.open(lake, page=1), pz.Error), (lambda: pz.open(lake, page=-1), ValueError),
                         (lambda: pz.open(3), TypeError),
                         (lambda: pz.open(io.StringIO("text")), ValueError),
                         (lambda: pz.open(lake, memory_limit="many"), ValueError),
                         (lambda: picture.save(tmp_path / "a.unknown"), ValueError),
                         (lambda: picture.save(io.BytesIO()), ValueError),
                         (lambda: picture.save(tmp_path / "none" / "a.png"), pz.Error),
                         (lambda: picture.encode("tif", compression="rar"), ValueError),
                         (lambda: picture.encode("tif", tile=17), ValueError),
                         (lambda: picture.encode("jpg", quality=0), ValueError),
                         (lambda: pz.Picture(4, 3, "CMYK").encode("png"), pz.Error),
                         (lambda: pz.Picture(4, 3, "Buffer").encode("png"), pz.Error)):
        with pytest.raises(raised):
            call()


def test_larger_than_memory(lake, tmp_path):
    mapped = pz.open(lake, memory_limit="1M", temp_dir=tmp_path)
    whole = pz.open(lake)
    assert mapped.is_mapping and not whole.is_mapping
    assert mapped.compare_images(whole) == 0
    for step in ("scale --width 300", "rotate --angle 90 : filter blur --radius 3", "mirror --vertical",
                 "crop --rect 5,5,90,90"):
        assert mapped.run(step).compare_images(whole.run(step)) == 0, step
    assert mapped.copy().is_mapping and mapped.rotate(angle=180).is_mapping and not mapped.scale(width=9).is_mapping
    again = pickle.loads(pickle.dumps(mapped))
    assert again.compare_images(whole) == 0
    with pytest.raises(TypeError, match="save"):
        pickle.dumps(mapped[:, :])
    with pytest.raises(pz.Error):
        pz.open(lake, memory_limit=1, temp_dir=tmp_path / "none")


def test_progress_tells_and_stops(lake):
    told = []
    picture = pz.open(lake, progress=lambda *at: told.append(at))
    assert told[0] == ("reading", 0, 1200) and told[-1] == ("reading", 1200, 1200)
    assert [done for _, done, _ in told] == sorted(done for _, done, _ in told)

    def stop(stage, done, total):
        raise KeyError(stage)

    for work in (lambda: pz.open(lake, progress=stop), lambda: picture.encode("png", progress=stop),
                 lambda: picture.filter.blur(radius=2, progress=stop), lambda: picture.scale(width=90, progress=stop)):
        with pytest.raises(KeyError):
            work()
    assert picture.filter.invert().filter.invert().compare_images(picture) == 0


def test_ctrl_c_ends_long_work():
    program = """
import picturezor as pz
picture = pz.Picture(3000, 3000)
def begun(*at):
    print("begun", flush=True)
picture.run(" : ".join(["filter gamma --gamma 1.1"] * 500), progress=begun)
"""
    with subprocess.Popen([sys.executable, "-c", program], stdout=subprocess.PIPE, stderr=subprocess.PIPE) as process:
        process.stdout.readline()
        process.send_signal(signal.SIGINT)
        _, error = process.communicate(timeout=60)
        assert b"KeyboardInterrupt" in error


def test_notebooks_get_a_picture(lake):
    picture = pz.open(lake)
    assert pz.open(picture._repr_png_()).compare_images(picture) == 0
    assert pz.open(pz.Picture(4100, 10)._repr_png_()).width == 2000
    assert pz.Picture(4, 3, "CMYK")._repr_png_() is None
