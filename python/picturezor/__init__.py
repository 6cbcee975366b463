"""Images that may be larger than memory, with the same bytes on every machine."""

import atexit as _atexit

from ._core import (DitherMatrix, Error, Factory, Format, GWorld, HostPicture, Kernel, Picture, PictureForm, alive,
                    make_pictures_as, set_factory)
from ._picture import from_array, from_pil, open
from ._rows import rows

__all__ = ["DitherMatrix", "Error", "Factory", "Format", "GWorld", "HostPicture", "Kernel", "Picture", "PictureForm",
           "alive", "from_array", "from_pil", "make_pictures_as", "open", "rows", "set_factory"]

# A factory is Python's, and the interpreter goes before the module does.
_atexit.register(set_factory, None)
