import re

import numpy as np
import picturezor as pz
import pytest
from conftest import SOURCE

RECT = (1, 1, 6, 5)
TABLE = list(range(255, -1, -1))
BLUR = (1, 2, 1, 2, 4, 2, 1, 2, 1)


class Kit:
    """Pictures of 10 x 8 for a call, their samples random."""

    def __init__(self):
        for name, format in (("rgb", "RGB"), ("rgba", "RGBA"), ("gray", "G"), ("other", "RGB"), ("ga", "GA"),
                             ("ink", "CMYKA")):
            picture = pz.Picture(10, 8, format)
            picture.fill_rect_random()
            setattr(self, name, picture)
        self.host = pz.HostPicture(10, 8)
        self.host.set_rgb(bytes(range(240)))
        self.host.make_mask().set_pixel(2, 2, "#000000")


# For each row of the class in its order, a picture, and what is given to the row.
CALLS = [
    *5 * [("rgb", lambda kit: dict(image=kit.other, dest=RECT, mask=kit.gray))],
    ("rgb", lambda kit: dict(image=kit.other, dest=RECT, source_x=1, source_y=1, premultiplied=True, mask=kit.gray)),
    ("rgb", lambda kit: dict(image=kit.other, dest=RECT, premultiplied=True)),
    ("rgb", lambda kit: dict(image=kit.other, dest=RECT, premultiplied=False, mask_colour=(9, 8, 7))),
    ("rgb", lambda kit: dict(image=kit.other, dest=RECT, fore_colour="#102030", mask_colour="ff0000")),
    ("rgb", lambda kit: dict(image=kit.gray, dest=RECT, fore_colour=(1, 2, 3))),
    ("rgb", lambda kit: (4, 3, "BGR")),
    ("rgb", lambda kit: (kit.other, 5, 4)),
    ("rgb", lambda kit: dict(source=kit.other, kernel="mitchell", width=5, height=4)),
    ("rgb", lambda kit: dict(threads=2, source=kit.other, kernel=pz.Kernel.box, width=5, height=4)),
    (None, lambda kit: dict(file=kit.file, width=9, height=7, format="GA")),
    (None, lambda kit: dict(width=9, height=7, format="XCMYK")),
    (None, lambda kit: (kit.host, True)),
    (None, lambda kit: dict(array=np.zeros((4, 5, 4), np.uint8), format="ABGR")),
    ("rgb", lambda kit: dict(dest=kit.other, levels=16, range=2)),
    ("rgb", lambda kit: dict(level=3)),
    ("rgb", lambda kit: dict(level=2)),
    ("rgb", lambda kit: ()),
    ("rgb", lambda kit: dict(radius=2.0, horizontal=False)),
    ("rgb", lambda kit: dict(radius=1, iterations=3)),
    ("rgb", lambda kit: dict(radius=1.5)),
    ("rgb", lambda kit: ()),
    ("rgb", lambda kit: dict(red_gamma=1.1, green_gamma=1.2, blue_gamma=1.3)),
    ("rgba", lambda kit: dict(red_gamma=1.1, green_gamma=1.2, blue_gamma=1.3, alpha_gamma=2)),
    ("gray", lambda kit: dict(gamma=2.2)),
    ("ga", lambda kit: dict(gamma=2.2, alpha_gamma=1)),
    ("rgb", lambda kit: dict(matrix="ordered4x4", levels=3)),
    ("rgb", lambda kit: dict(gain=0.6, bias=0.4)),
    ("gray", lambda kit: dict(radius=2, threshold=0.5, softness=0.1, black="#000000", white="#ffffff")),
    ("rgb", lambda kit: dict(red=TABLE, green=TABLE, blue=TABLE)),
    ("rgba", lambda kit: dict(red=TABLE, green=TABLE, blue=TABLE, alpha=np.arange(256))),
    ("gray", lambda kit: dict(gray=TABLE)),
    ("ga", lambda kit: dict(gray=TABLE, alpha=TABLE)),
    ("rgb", lambda kit: dict(original=kit.other, amount=0.5, threshold=2)),
    ("rgba", lambda kit: ()),
    *3 * [("rgb", lambda kit: ())],
    ("ga", lambda kit: ()),
    ("rgba", lambda kit: ()),
    *5 * [("ink", lambda kit: ())],
    ("rgb", lambda kit: (2,)),
    ("rgb", lambda kit: ()),
    ("other", lambda kit: ()),
    *4 * [("rgb", lambda kit: ())],
    ("rgb", lambda kit: (RECT,)),
    ("rgb", lambda kit: ()),
    ("rgb", lambda kit: dict(rect=RECT)),
    *3 * [("rgba", lambda kit: (RECT,))],
    *3 * [("rgba", lambda kit: ())],
    ("rgb", lambda kit: (7,)),
    ("rgb", lambda kit: (7,)),
    ("rgb", lambda kit: (7, "G")),
    ("rgba", lambda kit: (7, "ARGB", True)),
    ("rgb", lambda kit: (0, "RGBX")),
    ("rgb", lambda kit: ("BGR",)),
    ("rgb", lambda kit: ()),
    ("rgb", lambda kit: ()),
    ("rgb", lambda kit: (RECT,)),
    ("rgb", lambda kit: (kit.other,)),
    ("rgb", lambda kit: (9,)),
    ("rgb", lambda kit: (RECT, 9)),
    ("rgb", lambda kit: ()),
    ("rgb", lambda kit: (RECT,)),
    ("rgb", lambda kit: (1, 2, 3)),
    ("rgba", lambda kit: (1, 2, 3, 4)),
    ("rgb", lambda kit: (RECT, 1, 2, 3)),
    ("rgba", lambda kit: (RECT, 1, 2, 3, 4)),
    ("rgb", lambda kit: ("#010203",)),
    ("rgba", lambda kit: ((1, 2, 3), 4)),
    ("rgb", lambda kit: (RECT, "010203")),
    ("rgba", lambda kit: dict(rect=RECT, colour=(1, 2, 3), alpha=4)),
    *3 * [("gray", lambda kit: (kit.host, RECT, 1, 2)), ("gray", lambda kit: (kit.host, RECT))],
    ("rgb", lambda kit: (kit.host,)),
    ("rgb", lambda kit: (kit.host, 1, 2)),
    ("rgb", lambda kit: (kit.host, RECT)),
    ("rgb", lambda kit: (kit.host, RECT, 1, 2)),
    *2 * [("rgba", lambda kit: (kit.host, False)),
          ("rgba", lambda kit: (kit.host, 1, 2)),
          ("rgba", lambda kit: dict(picture=kit.host, dest=RECT, invert_mask=True)),
          ("rgba", lambda kit: (kit.host, RECT, 1, 2, True))],
    ("rgb", lambda kit: (kit.gray, RECT, 1, 2)),
    ("rgb", lambda kit: (kit.other, RECT)),
    ("rgb", lambda kit: (kit.other,)),
    ("rgb", lambda kit: ()),
    ("rgb", lambda kit: (RECT,)),
    ("rgb", lambda kit: ()),
    ("rgb", lambda kit: (kit.other,)),
    ("rgb", lambda kit: ()),
    ("rgb", lambda kit: dict(angle=30, red=255)),
    ("rgb", lambda kit: ()),
    ("rgb", lambda kit: ()),
    ("rgb", lambda kit: dict(dimension=3, matrix=BLUR)),
    ("rgb", lambda kit: dict(dimension=3, matrix=BLUR, delta=5)),
    ("rgb", lambda kit: dict(dimension=3, matrix=BLUR, delta=5, scale_factor=0.0625)),
    ("rgb", lambda kit: ()),
]


def call(function, given):
    return function(**given) if isinstance(given, dict) else function(*given)


@pytest.mark.parametrize("number", range(120))
def test_every_row_is_reached_by_its_name(number, tmp_path):
    row, (which, arguments) = pz.rows()[number], CALLS[number]
    kit = Kit()
    kit.file = tmp_path / "pixels"
    owner = getattr(kit, which) if which else pz.Picture
    function = pz.Picture if row.name == "Picture" else getattr(owner, row.name)
    result = call(function, arguments(kit))
    gives_picture = re.search(r"(as PictureZOR$|^ClipImage|^Constructor)", row.declaration)
    assert isinstance(result, pz.Picture) == bool(gives_picture)
    if row.setter:
        place = 1 if row.name.startswith("data") else min(2, len(arguments(kit)))
        given = list(arguments(kit))
        given.insert(place, np.zeros(400, np.uint8))
        getattr(owner, row.setter)(*given)
        assert not any(call(function, arguments(kit)))


# Catches arguments that are mixed up on their way: a step calls the class without this module.
@pytest.mark.parametrize("row, given, step", [
    ("invert", {}, "filter invert"),
    ("h_mirror", {}, "mirror --horizontal"),
    ("v_mirror", {}, "mirror --vertical"),
    ("rotate90", {}, "rotate --angle 90"),
    ("rotate270", {}, "rotate --angle 270"),
    ("rotate_by", dict(angle=30, red=1, green=2, blue=3), "rotate --angle 30 --background 010203"),
    ("solarize_filter", {}, "filter solarize"),
    ("neon_filter", {}, "filter neon"),
    ("gamma_filter", dict(gamma=1.7), "filter gamma --gamma 1.7"),
    ("gamma_filter", dict(red_gamma=1.1, green_gamma=1.5, blue_gamma=2), "filter gamma --gamma 1.1,1.5,2"),
    ("gain_filter", dict(gain=0.6, bias=0.4), "filter gain --gain 0.6 --bias 0.4"),
    ("transfer_filter", dict(red=[1], green=[2], blue=[3]), "filter transfer --red 1 --green 2 --blue 3"),
    ("apply_matrix", dict(dimension=3, matrix=BLUR, delta=5, scale_factor=0.05),
     "filter matrix --weights 1,2,1,2,4,2,1,2,1 --delta 5 --scale 0.05"),
    ("box_blur_filter", dict(radius=3, iterations=2, horizontal=False),
     "filter blur --radius 3 --iterations 2 --only-vertical"),
    ("box_blur_fractional_filter", dict(radius=0.4), "filter soft-blur --radius 0.4"),
    ("stamp_filter", dict(radius=6, threshold=0.4, softness=0.5, black=(1, 2, 3), white="f0e0d0"),
     "filter stamp --radius 6 --threshold 0.4 --softness 0.5 --black 010203 --white f0e0d0"),
    ("oil_filter", dict(levels=16, range=2), "filter oil --levels 16 --range 2"),
    ("engrave_filter", dict(level=2), "filter engrave --level 2"),
    ("dither_filter", dict(matrix="cluster3", levels=3), "filter dither --pattern cluster3 --levels 3"),
])
def test_rows_do_what_steps_do(row, given, step):
    picture = pz.Picture(40, 30)
    picture.fill_rect_random()
    changed = picture.copy()
    result = getattr(changed, row)(**given) or changed
    made = picture.run(step)
    assert made.compare_images(result) == 0
    assert made.width != picture.width or made.compare_images(picture) > 0


def test_no_row_and_no_property_is_without_a_name():
    assert len(pz.rows()) == len(CALLS) == 120
    declared = (SOURCE / "docs" / "methods.md").read_text()
    methods, shared, properties = (re.split(r"^## ", declared, flags=re.MULTILINE)[at] for at in (1, 2, 3))
    assert [row.declaration for row in pz.rows()] == re.findall(r"^\| \d+ \| `(.*?)` \|", methods, re.MULTILINE)
    names = re.findall(r"^\| \d+ \| `(\w+)` \| \w+ \| .*? \| (.*?) \|", properties, re.MULTILINE)
    assert len(names) == 41
    for name, written in names:
        python = {"IsRGB": "is_rgb", "IsCMYK": "is_cmyk"}.get(name) or re.sub(r"(?<=[a-z])(?=[A-Z])", "_", name).lower()
        assert isinstance(getattr(pz.Picture, python), property), name
        assert bool(written) == (getattr(pz.Picture, python).fset is not None), name
    assert pz.Picture.calculate_memory(16, 8, "RGBA") == 512 and pz.Picture.can_allocate(16, 8, "RGBA")
    assert pz.Picture.create(16, 8, "RGBA").total_size == 512
