"""The Python names of the methods of the class."""

import re
from typing import NamedTuple

from . import _core

# Methods whose names are those of steps, or wouldn't follow from the rule below.
_OTHER_NAMES = {
    "Combine": "combine_with", "CreatePictureZOR": "create_picture", "Rotate": "rotate_by", "Scale": "scale_from",
    "ScaleFast": "scale_fast_from", "ScaleMT": "scale_mt_from",
    "CopyGWorld": "copy_gworld", "CMYKChannels": "cmyk_channels", "RGBChannels": "rgb_channels",
    "HMirror": "h_mirror", "VMirror": "v_mirror",
}
_CONSTRUCTORS = {"FilePath": "mapped", "pic": "from_host", "Buf": "from_array", "width": "Picture"}


class Row(NamedTuple):
    """A method of the class: its declaration, its name in Python and, if the declaration can be assigned to, the name
    of the Python method that stores a value, otherwise None."""

    declaration: str
    name: str
    setter: "str | None"


def _name(declaration: str) -> str:
    name = re.match(r"\w+", declaration)[0]
    if name == "Constructor":
        return next(of for word, of in _CONSTRUCTORS.items() if word in declaration)
    if declaration == "Rotate180":
        return "rotate180_in_place"
    if name in _OTHER_NAMES:
        return _OTHER_NAMES[name]
    return re.sub(r"(?<=[a-z])(?=[A-Z])", "_", name).lower()


def rows() -> "list[Row]":
    """Return all methods of the class, in the order in which it declares them.

    >>> rows()[28]
    Row(declaration='GammaFilter(dest as PictureZOR, gamma as double) as PictureZOR', name='gamma_filter', setter=None)
    >>> len(rows())
    120
    """
    return [Row(declaration, _name(declaration), "set_" + _name(declaration) if assignable else None)
            for declaration, assignable in _core._declarations()]
