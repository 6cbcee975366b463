"""Scale, filter, rotate and convert images of any size, with the same bytes on every machine."""

import atexit as _atexit

from ._core import (DitherMatrix, Error, Factory, Format, GWorld, HostPicture, Kernel, Picture, PictureForm, alive,
                    make_pictures_as, set_factory)
from ._picture import from_array, from_pil, open
from ._rows import rows

__all__ = ["DitherMatrix", "Error", "Factory", "Format", "GWorld", "HostPicture", "Kernel", "Picture", "PictureForm",
           "alive", "from_array", "from_pil", "make_pictures_as", "open", "rows", "set_factory"]

# A factory is a Python object, and the interpreter ends before the module is unloaded.
_atexit.register(set_factory, None)
