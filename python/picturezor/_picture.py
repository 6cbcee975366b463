"""What Picture has beside the rows of its class: files, slices, other libraries' pictures."""

from __future__ import annotations

import contextlib
import io
import operator
import os
from typing import TYPE_CHECKING, Any

import numpy as np

from . import _core, _steps  # noqa: F401, which gives Picture its steps
from ._core import Picture

if TYPE_CHECKING:
    from collections.abc import Iterator
    from typing import BinaryIO

    from . import Buffer, Format, Index, Progress, Samples

# Bytes of a mapped picture that are in an array at a time.
_BLOCK_BYTES = 1 << 24


def _limit(memory_limit):
    return _core._parse_bytes(memory_limit) if isinstance(memory_limit, str) else memory_limit


def _descriptor(file):
    """The descriptor of a file on a disk, at the place that the file object is at; None for other objects."""
    try:
        descriptor = file.fileno()
        os.lseek(descriptor, file.tell(), os.SEEK_SET)
        return descriptor
    except (AttributeError, OSError, ValueError):
        return None


def open(source: str | os.PathLike[str] | Buffer | BinaryIO, *, memory_limit: int | str | None = None,
         temp_dir: str | os.PathLike[str] | None = None, page: int = 0, progress: Progress | None = None) -> Picture:
    """Read an image: from a path, the bytes of a file, or a file object.

    It comes upright, as gray, RGB or CMYK, with alpha where the file has it. A picture that is larger than
    memory_limit (bytes, or a text like "256M"; half of the free memory without it) lives in a nameless file in
    temp_dir, and so do those that are made from it. page is the picture of a file with several, from 0 on. progress
    is called now and then with what is being done, how much of it is done, and how much there is, 0 where nobody can
    tell; what it raises ends the work. ValueError for a wrong limit or page; Error for a file that can't be read,
    or of which only the first picture can.

    >>> import picturezor as pz
    >>> pz.open(pz.Picture(4, 3, "GA").encode("png"))
    <picturezor.Picture 4 x 3 GA>
    """
    name = "image"
    if hasattr(source, "read"):
        name = str(getattr(source, "name", name))
        descriptor = _descriptor(source)
        source = source.read() if descriptor is None else descriptor
        if isinstance(source, str):
            raise ValueError("a file object of bytes is needed")
    elif isinstance(source, int):
        raise TypeError("an image is read from a path, bytes or a file object")
    return _core._open(source, name, _limit(memory_limit), temp_dir, page, progress)


def from_array(array: Samples, format: Format | str | None = None) -> Picture:
    """A picture on the memory of an array; see Picture.from_array.

    >>> import numpy
    >>> from_array(numpy.zeros((3, 4), "uint8"))
    <picturezor.Picture 4 x 3 G>
    """
    return Picture.from_array(array, format)


def from_pil(image: Any) -> Picture:
    """A copy of a picture of Pillow's: gray, RGB or CMYK, with alpha where it has it. Palettes are resolved.

    >>> import PIL.Image
    >>> from_pil(PIL.Image.new("RGB", (4, 3)))
    <picturezor.Picture 4 x 3 RGB>
    """
    if image.mode not in ("L", "LA", "RGB", "RGBA", "CMYK"):
        clear = image.mode in ("PA", "RGBa", "La") or "transparency" in image.info
        image = image.convert("RGBA" if clear else "L" if image.mode == "1" else "RGB")
    return Picture.from_array(np.array(image), "CMYK" if image.mode == "CMYK" else None)


def _adds(function):
    function.__qualname__ = "Picture." + function.__name__
    setattr(Picture, function.__name__, function)
    return function


@_adds
def save(self, target: str | os.PathLike[str] | BinaryIO, *, type: str | None = None, quality: int = 90,
         compression: str | None = None, level: int | None = None, lossless: bool = False, tile: int = 0,
         big: bool = False, pyramid: bool = False, progress: Progress | None = None) -> None:
    """Write an image file, to a path or a file object. The path's ending says its type, or type does ("png").

    quality is 1 to 100, for types that lose some of it; lossless loses nothing where a type can. level is the effort of
    packing, 0 to 9. TIFF can be packed with compression "none", "lzw", "deflate", "zstd", "jpeg" or "webp"; stand in
    tiles with edges of a multiple of 16; have 64-bit offsets (big), and smaller copies of itself (pyramid). The file
    stands under its name when it is complete, and not before. ValueError for an unknown type and a wrong option; Error
    where the file can't be written or pixels have no colours. Alpha that a type lacks is left out, with a warning.

    >>> import io, picturezor as pz
    >>> file = io.BytesIO()
    >>> pz.Picture(4, 3).save(file, type="tif", compression="deflate")
    >>> pz.open(file.getvalue())
    <picturezor.Picture 4 x 3 RGB>
    """
    stream = hasattr(target, "write")
    if stream and type is None:
        raise ValueError("a file object has no ending that says the type: give type")
    data = _core._save(self, None if stream else target, type or "", quality, compression, level, lossless, tile,
                       big, pyramid, progress)
    if stream:
        target.write(data)


@_adds
def encode(self, type: str, **options: Any) -> bytes:
    """The bytes of an image file of a type ("png"), with the options of save.

    >>> import picturezor as pz
    >>> pz.Picture(4, 3).encode("png")[:4]
    b'\\x89PNG'
    """
    file = io.BytesIO()
    self.save(file, type=type, **options)
    return file.getvalue()


@_adds
def run(self, steps: str, *, progress: Progress | None = None) -> Picture:
    """Do steps as they are written for the command, with a colon between two or a line for each. ValueError for
    what is written wrong, Error for what this picture doesn't allow.

    >>> import picturezor as pz
    >>> pz.Picture(40, 30).run("scale --fit 10x10 : rotate --angle 90")
    <picturezor.Picture 8 x 10 RGB>
    """
    return _core._run_text(self, steps, progress)


@_adds
def copy(self) -> Picture:
    """A picture of the same format and samples, where this one's results live.

    >>> import picturezor as pz
    >>> first = pz.Picture(4, 3)
    >>> second = first.copy()
    >>> second.invert()
    >>> first[0, 0], second[0, 0]
    ((0, 0, 0), (255, 255, 255))
    """
    made = self._like()
    for first, count in _blocks(self):
        made._write_rows(first, self._read_rows(first, count))
    return made


@_adds
@contextlib.contextmanager
def rows(self, first: int, count: int) -> Iterator[Samples]:
    """A block of rows as an array that is valid inside a with: rows x columns (x channels), as to_array() gives it.

    What is written to it stands in the picture at the end. Of a picture in memory it is a view; of a mapped one a copy,
    which is stored at the end. IndexError outside of the picture.

    >>> import picturezor as pz
    >>> picture = pz.Picture(4, 3, "G")
    >>> with picture.rows(1, 2) as block:
    ...     block[:, 0] = 9
    >>> picture.to_array().tolist()
    [[0, 0, 0, 0], [9, 0, 0, 0], [9, 0, 0, 0]]
    """
    if self.is_mapping:
        block = self._read_rows(first, count)
        yield block
        self._write_rows(first, block)
    elif first < 0 or count < 0 or first + count > self.height:
        raise IndexError(f"rows {first} to {first + count - 1} of a picture of {self.height}")
    else:
        yield np.asarray(self)[first:first + count]


def _blocks(picture):
    """First rows and numbers of rows, a few megabytes together."""
    together = max(1, _BLOCK_BYTES // max(1, picture.width * picture.channel_count))
    return ((first, min(together, picture.height - first)) for first in range(0, picture.height, together))


def _span(index, size):
    """First line, number of lines, and whether they run backwards, of a slice or a number."""
    if not isinstance(index, slice):
        at = operator.index(index)
        if not -size <= at < size:
            raise IndexError(f"{at} is outside of {size}")
        return at % size, 1, False
    first, end, step = index.indices(size)
    if step not in (1, -1):
        raise ValueError("a view has every row and column; numpy.asarray(picture) can leave some out")
    if step == 1:
        return first, max(0, end - first), False
    return end + 1, max(0, first - end), True


def _view(picture, where):
    """The view that a slice means; None where nothing is in it."""
    down, across = where if isinstance(where, tuple) else (where, slice(None))
    y, height, upwards = _span(down, picture.height)
    x, width, backwards = _span(across, picture.width)
    if backwards:
        raise ValueError("a view runs from left to right; mirror(horizontal=True) makes a picture")
    if width == 0 or height == 0:
        return None
    return picture._view((x, y, width, height), upwards)


@_adds
def __getitem__(self, where: Index) -> Any:
    """picture[rows, columns]: a view of a rectangle, from the last row up where rows has the step -1. Of two numbers
    the pixel's samples. IndexError outside of the picture; ValueError for another step, and where nothing is left.

    >>> import picturezor as pz
    >>> picture = pz.Picture(8, 6)
    >>> picture.red[1:3, 2:4] = 7
    >>> picture[1, 2]
    (7, 0, 0)
    >>> picture[:, 4:]
    <picturezor.Picture 4 x 6 RGB>
    """
    view = _view(self, where)
    if view is None:
        raise ValueError("a picture has at least one row and one column")
    if isinstance(where, tuple) and not any(isinstance(index, slice) for index in where):
        samples = view._read_rows(0, 1).ravel().tolist()
        return samples[0] if len(samples) == 1 else tuple(samples)
    return view


@_adds
def __setitem__(self, where: Index, value: Any) -> None:
    """Store a sample, the samples of a pixel, an array, or a picture of any format, in a view as above. ValueError for
    an array or a picture of another size, Error for a picture whose format has no way to this one."""
    view = _view(self, where)
    if view is None:
        return
    if isinstance(value, Picture):
        if (value.width, value.height) != (view.width, view.height):
            raise ValueError("the picture has another size than the view")
        return view.copy_pixels(value)
    if not view.is_mapping:
        np.asarray(view)[...] = value
        return
    channels = () if view.channel_count == 1 else (view.channel_count,)
    samples = np.broadcast_to(np.asarray(value, np.uint8), (view.height, view.width, *channels))
    for first, count in _blocks(view):
        view._write_rows(first, samples[first:first + count])


# A picture isn't a sequence, though it has indices.
Picture.__iter__ = None


def _plane(name):
    def view(self):
        if not getattr(self, "has_" + name):
            raise AttributeError(f"{self!r} has no {name}")
        return getattr(self, name + "_channel")()

    def store(self, value):
        view(self)[:, :] = value

    return property(view, store, doc=f"A view of the {name} samples, as gray. AttributeError where there are none.")


for _name in ("red", "green", "blue", "gray", "alpha", "cyan", "magenta", "yellow", "black"):
    setattr(Picture, _name, _plane(_name))


@_adds
def to_pil(self) -> Any:
    """A copy as a picture of Pillow's: L, LA, RGB, RGBA or CMYK. Error for inks with alpha, and pixels without colours.

    >>> import picturezor as pz
    >>> pz.Picture(4, 3, "BGR").to_pil().mode
    'RGB'
    """
    from PIL import Image
    if not (self.is_gray or self.is_rgb or self.is_cmyk) or (self.is_cmyk and self.has_alpha):
        raise _core.Error(f"Pillow has no picture like {self!r}")
    mode = ("L" if self.is_gray else "RGB" if self.is_rgb else "CMYK") + ("A" if self.has_alpha else "")
    format = {"L": "G", "LA": "GA"}.get(mode, mode)
    if self.image_format_string == format:
        return Image.fromarray(self.to_array(), mode)
    return Image.frombytes(mode, (self.width, self.height), self.data_string_in_format(format))


@_adds
def _repr_png_(self) -> bytes | None:
    """For notebooks, which show at most 2000 pixels across and down. None for ink and pixels without colours."""
    if not (self.is_gray or self.is_rgb):
        return None
    shown = self if max(self.width, self.height) <= 2000 else self.scale(fit=(2000, 2000), kernel="box")
    return shown.encode("png")


def _restore(width, height, format, samples):
    made = Picture(width, height, format)
    made._write_rows(0, np.frombuffer(samples, np.uint8).reshape(made.to_array().shape))
    return made


def _reopen(path, page):
    return open(path, page=page)


@_adds
def __reduce__(self) -> tuple[Any, ...]:
    """Pictures in memory are pickled with their samples, mapped ones by the path that they were opened from: they come
    back as the file is then."""
    if not self.is_mapping:
        return _restore, (self.width, self.height, self.image_format.name, self.to_array().tobytes())
    path, page = self._file
    if not path.name or self.parent is not None:
        raise TypeError("a mapped picture that wasn't opened from a file can't be pickled; save it")
    return _reopen, (path, page)
