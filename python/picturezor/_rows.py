"""What the rows of the class are called in Python."""

import re
from typing import NamedTuple

from . import _core

# Names that steps have, and rows that Python says in another way.
_OTHER_NAMES = {
    "Combine": "combine_with", "CreatePictureZOR": "create_picture", "Rotate": "rotate_by", "Scale": "scale_from",
    "ScaleFast": "scale_fast_from", "ScaleMT": "scale_mt_from",
    "CopyGWorld": "copy_gworld", "CMYKChannels": "cmyk_channels", "RGBChannels": "rgb_channels",
    "HMirror": "h_mirror", "VMirror": "v_mirror",
}
_CONSTRUCTORS = {"FilePath": "mapped", "pic": "from_host", "Buf": "from_array", "width": "Picture"}


class Row(NamedTuple):
    """A method of the class: its declaration, and the name of what reaches it in Python. A row that can be assigned to
    has a second name, of what stores the value."""

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
    """All methods of the class, in the order of its table.

    >>> rows()[28]
    Row(declaration='GammaFilter(dest as PictureZOR, gamma as double) as PictureZOR', name='gamma_filter', setter=None)
    >>> len(rows())
    120
    """
    return [Row(declaration, _name(declaration), "set_" + _name(declaration) if assignable else None)
            for declaration, assignable in _core._declarations()]
