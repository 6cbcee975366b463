import inspect
import os
import subprocess

import numpy as np
import picturezor as pz
import pytest


def steps():
    for description in pz._core._steps():
        *group, name = description["name"].split()
        yield description, getattr(pz._steps.Filters if group else pz.Picture, name.replace("-", "_"))


def test_methods_are_made_from_the_descriptions():
    assert len(list(steps())) == 22
    scale = inspect.signature(pz.Picture.scale)
    assert str(scale.parameters["kernel"]) == "kernel: 'str' = 'lanczos3'"
    assert scale.parameters["width"].default is None
    assert "triangle, box" in pz.Picture.scale.__doc__
    assert inspect.signature(pz._steps.Filters.unsharp).parameters["amount"].default == 1.0
    for description, method in steps():
        required = [option["name"] for option in description["options"] if option["required"]]
        assert list(inspect.signature(method).parameters)[1:1 + len(required)] == required
        assert "--" not in method.__doc__


def test_a_picture_is_left_as_it_was():
    picture = pz.Picture(40, 30, "RGBA")
    picture.fill_rect_random()
    before = picture.to_array()
    badge = pz.Picture(9, 8, "BGRA")
    for description, method in steps():
        given = {"crop": {"rect": (1, 2, 30, 20)}, "rotate": {"angle": 30.0}, "mirror": {"vertical": True},
                 "scale": {"fit": "20x20"}, "filter gamma": {"gamma": 1.5}, "filter gain": {"gain": 0.7},
                 "filter matrix": {"weights": [0, 1, 0, 1, 4, 1, 0, 1, 0]},
                 "filter transfer": {"table": range(256)}}.get(description["name"], {})
        if description["name"] == "combine":
            given = {"overlay": badge}
        owner = picture.filter if description["name"].startswith("filter") else picture
        result = method(owner, **given)
        assert isinstance(result, pz.Picture) and result is not picture, description["name"]
        assert np.array_equal(picture, before), description["name"]


def test_values_come_in_every_way(lake, tmp_path):
    picture = pz.open(lake)
    for one, other in ((picture.scale(fit=(64, 64)), picture.scale(fit="64x64", kernel="lanczos3")),
                       (picture.crop((10, 20, 30, 40)), picture[20:60, 10:40].copy()),
                       (picture.rotate(-90), picture.rotate270()),
                       (picture.rotate(30, background="#ff8000"),
                        picture.rotate(angle=np.float64(30), background=(255, 128, 0))),
                       (picture.filter.gamma(gamma=2), picture.filter.gamma(gamma=[2.0, 2.0, 2.0])),
                       (picture.mirror(vertical=True), picture.mirrored_view().copy()),
                       (picture.convert(), picture.copy()),
                       (picture.run("mirror --horizontal --vertical"), picture.rotate180())):
        assert one.compare_images(other) == 0
    picture[:40, :30].save(tmp_path / "badge.png")
    badge = pz.Picture(9, 8, "BGRA")
    badge.fill_rect_random()
    badge.save(tmp_path / "clear.png")
    assert picture.combine(badge).compare_images(picture.combine(tmp_path / "clear.png")) == 0
    assert np.array_equal(np.asarray(picture.combine(tmp_path / "badge.png", at=(5, 6)))[6:46, 5:35], picture[:40, :30])


def test_refusals_speak_pythons_names():
    picture = pz.Picture(4, 3)
    for call, raised, said in ((lambda: picture.scale(), ValueError, "give width, height, fit or percent"),
                               (lambda: picture.scale(width=5, fit=(3, 3)), ValueError, "fit and width can't be used"),
                               (lambda: picture.scale(width=0), ValueError, "width"),
                               (lambda: picture.scale(width="many"), ValueError, "whole number"),
                               (lambda: picture.scale(width=[1]), TypeError, "width can't be"),
                               (lambda: picture.scale(kernel="nearest", width=2), ValueError, "kernel"),
                               (lambda: picture.scale(5), TypeError, "positional"),
                               (lambda: picture.scale(breadth=5), TypeError, "breadth"),
                               (lambda: picture.crop(), TypeError, "rect"),
                               (lambda: picture.crop((0, 0, 9, 9)), pz.Error, "doesn't lie within"),
                               (lambda: picture.run("fly --high"), ValueError, "fly"),
                               (lambda: pz.Picture(4, 3, "CMYK").filter.dither(), pz.Error, "CMYK"),
                               (lambda: pz.Picture(4, 3, "Buffer").scale(width=2), pz.Error, "colours")):
        with pytest.raises(raised, match=said):
            call()


@pytest.mark.parametrize("size", [(40, 30), (3400, 3300)])
def test_steps_leave_the_picture_as_it_is(size):
    # Of more than 32 MB some take another way.
    picture = pz.Picture(*size)
    picture.fill_rect_random()
    before = picture.clone()
    picture.factory = pz.Factory(lambda *asked: None)
    for step in ("mirror --vertical", "mirror --vertical --horizontal", "rotate --angle 90", "rotate --angle 180",
                 "rotate --angle 0", "scale --percent 50", "crop --rect 1,1,20,20 : filter invert", "filter auto-level",
                 "convert --format rgb", "filter gamma --gamma 2"):
        made = picture.run(step)
        assert picture.compare_images(before) == 0, step
        assert not np.shares_memory(made, picture), step
        assert picture.factory is not None, step


@pytest.mark.skipif("PICTUREZOR_COMMAND" not in os.environ, reason="the command isn't there")
def test_the_command_gives_the_same(tmp_path):
    picture = pz.Picture(150, 120, "RGBA")
    picture.fill_rect_random()
    picture.save(tmp_path / "in.png")
    for step in ("scale --width 70 --kernel mitchell", "filter unsharp --radius 2 --amount 0.5", "rotate --angle 12.5",
                 "filter dither --pattern cluster4 --levels 3", "convert --format gray"):
        words = step.split()
        count = 2 if words[0] == "filter" else 1
        subprocess.run([os.environ["PICTUREZOR_COMMAND"], *words[:count], tmp_path / "in.png", *words[count:], "-q",
                        "-o", tmp_path / "out.png"], check=True)
        assert picture.run(step).encode("png") == (tmp_path / "out.png").read_bytes(), step
