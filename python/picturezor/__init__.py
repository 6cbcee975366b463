"""Images that may be larger than memory, with the same bytes on every machine."""

from ._core import *
