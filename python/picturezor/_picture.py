"""What Picture offers beside the methods of its class: files, slices, conversion to and from other libraries."""

from __future__ import annotations

import contextlib
import io
import operator
import os
from typing import TYPE_CHECKING, Any

import numpy as np

from . import _core, _steps  # noqa: F401, which adds the steps to Picture
from ._core import Picture

if TYPE_CHECKING:
    from collections.abc import Iterator
    from typing import BinaryIO

    from . import Buffer, Format, Index, Progress, Samples

# The most bytes of a mapped picture that are in an array at a time.
_BLOCK_BYTES = 1 << 24


def _limit(memory_limit):
    return _core._parse_bytes(memory_limit) if isinstance(memory_limit, str) else memory_limit


def _descriptor(file):
    """The descriptor of a file on disk, moved to the position of the file object; None for other objects."""
    try:
        descriptor = file.fileno()
        os.lseek(descriptor, file.tell(), os.SEEK_SET)
        return descriptor
    except (AttributeError, OSError, ValueError):
        return None


def open(source: str | os.PathLike[str] | Buffer | BinaryIO, *, memory_limit: int | str | None = None,
         temp_dir: str | os.PathLike[str] | None = None, page: int = 0, progress: Progress | None = None) -> Picture:
    """Read an image from a path, the bytes of a file, or a file object.

    The picture is gray, RGB or CMYK, with alpha if the file has it, and upright. A picture that exceeds memory_limit
    (bytes, or a text such as "256M"; half of the free memory by default) is kept in an unnamed file in temp_dir, and
    so are the pictures made from it. page selects one of several images in a file, counted from 0. progress is called
    from time to time as progress(stage, done, total), where total is 0 if it isn't known; an exception that it raises
    ends the work. Raises ValueError for an invalid limit, or a page that the file doesn't have; Error for a file that
    can't be read, and for a page above 0 of a type that holds only one image.

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
    """Return a picture that shares the memory of an array; see Picture.from_array.

    >>> import numpy
    >>> from_array(numpy.zeros((3, 4), "uint8"))
    <picturezor.Picture 4 x 3 G>
    """
    return Picture.from_array(array, format)


def from_pil(image: Any) -> Picture:
    """Return a copy of a Pillow image as gray, RGB or CMYK, with alpha if it has any. Palettes are expanded.

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
    """Write an image file to a path or a file object. type ("png") sets the file type; by default it is taken from the
    path's extension.

    quality, 1 to 100, applies to lossy types; lossless keeps every sample exactly (not available for JPEG). level is
    the compression effort, 0 to 9. The other options are for TIFF: compression is "none", "lzw", "deflate", "zstd",
    "jpeg" or "webp"; tile is the width and height of its tiles, a multiple of 16, or 0 for strips; big writes 64-bit
    offsets (BigTIFF); pyramid adds smaller copies of the image, in tiles of 256 unless tile says otherwise. progress
    is as in open. The file appears under its name only when it is complete. Raises ValueError for an unknown type or an invalid option, and Error if the file
    can't be written or the pixel format has no colour model (Buffer, Scaling1 to Scaling8). Alpha that the type can't
    store is dropped, with a warning.

    >>> import io, picturezor as pz
    >>> file = io.BytesIO()
    >>> pz.Picture(4, 3).save(file, type="tif", compression="deflate")
    >>> pz.open(file.getvalue())
    <picturezor.Picture 4 x 3 RGB>
    """
    stream = hasattr(target, "write")
    if stream and type is None:
        raise ValueError("a file object has no extension that sets the type: give type")
    data = _core._save(self, None if stream else target, type or "", quality, compression, level, lossless, tile,
                       big, pyramid, progress)
    if stream:
        target.write(data)


@_adds
def encode(self, type: str, **options: Any) -> bytes:
    """Return the bytes of an image file of a type ("png"). The options are those of save.

    >>> import picturezor as pz
    >>> pz.Picture(4, 3).encode("png")[:4]
    b'\\x89PNG'
    """
    file = io.BytesIO()
    self.save(file, type=type, **options)
    return file.getvalue()


@_adds
def run(self, steps: str, *, progress: Progress | None = None) -> Picture:
    """Apply steps, written as for the command: separated by colons, or one per line. Returns a new picture. Raises
    ValueError for a mistake in the steps, and Error if this picture doesn't support one of them.

    >>> import picturezor as pz
    >>> pz.Picture(40, 30).run("scale --fit 10x10 : rotate --angle 90")
    <picturezor.Picture 8 x 10 RGB>
    """
    return _core._run_text(self, steps, progress)


@_adds
def copy(self) -> Picture:
    """Return a copy with the same format and samples. Like other results, it is in memory or in a temporary file.

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
    """Access a block of rows as an array, inside a with statement: rows x columns (x channels), as from to_array().

    What is written to the array is in the picture at the end of the with. For a picture in memory, the array is a
    view; for a mapped picture, it is a copy that is stored at the end. Raises IndexError for rows outside the picture.

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
    """Yields the first row and the number of rows of blocks of a few megabytes."""
    together = max(1, _BLOCK_BYTES // max(1, picture.width * picture.channel_count))
    return ((first, min(together, picture.height - first)) for first in range(0, picture.height, together))


def _span(index, size):
    """First row or column, number of them, and whether they run backwards, for a slice or a number."""
    if not isinstance(index, slice):
        at = operator.index(index)
        if not -size <= at < size:
            raise IndexError(f"index {at} is out of range for size {size}")
        return at % size, 1, False
    first, end, step = index.indices(size)
    if step not in (1, -1):
        raise ValueError("a view has every row and column; numpy.asarray(picture) can leave some out")
    if step == 1:
        return first, max(0, end - first), False
    return end + 1, max(0, first - end), True


def _view(picture, where):
    """The view that an index selects; None if it is empty."""
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
    """picture[rows, columns] is a view of a rectangle; with the step -1, its rows are in reverse order. picture[y, x]
    gives the samples of a pixel. Raises IndexError for a row or column outside the picture, and ValueError for another
    step and for an empty selection.

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
    """Store a sample, the samples of a pixel, an array or a picture in the pixels that the index selects, as for
    reading; an empty selection stores nothing. A picture is converted to this picture's format. Raises ValueError for an array or a picture of another
    size, and Error for a picture whose format can't be converted, such as RGB to CMYK."""
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


# A picture isn't a sequence, although it can be indexed.
Picture.__iter__ = None


def _plane(name):
    def view(self):
        if not getattr(self, "has_" + name):
            raise AttributeError(f"{self!r} has no {name}")
        return getattr(self, name + "_channel")()

    def store(self, value):
        view(self)[:, :] = value

    return property(view, store,
                    doc=f"A view of the {name} channel, as a gray picture. Raises AttributeError if there is none.")


for _name in ("red", "green", "blue", "gray", "alpha", "cyan", "magenta", "yellow", "black"):
    setattr(Picture, _name, _plane(_name))


@_adds
def to_pil(self) -> Any:
    """Return a copy as a Pillow image of mode L, LA, RGB, RGBA or CMYK. Raises Error for CMYK with alpha, and for
    formats without a colour model (Buffer, Scaling1 to Scaling8).

    >>> import picturezor as pz
    >>> pz.Picture(4, 3, "BGR").to_pil().mode
    'RGB'
    """
    from PIL import Image
    if not (self.is_gray or self.is_rgb or self.is_cmyk) or (self.is_cmyk and self.has_alpha):
        raise _core.Error(f"Pillow has no picture like {self!r}")
    mode = ("L" if self.is_gray else "RGB" if self.is_rgb else "CMYK") + ("A" if self.has_alpha else "")
    format = {"L": "G", "LA": "GA"}.get(mode, mode)
    if self.image_format.name == format:
        return Image.fromarray(self.to_array(), mode)
    return Image.frombytes(mode, (self.width, self.height), self.data_string_in_format(format))


@_adds
def _repr_png_(self) -> bytes | None:
    """The PNG that notebooks display, at most 2000 x 2000 pixels. None unless the picture is gray or RGB."""
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
    """Pickle a picture in memory with its samples, and a mapped picture as the path that it was opened from: it is then
    read from that file again. Raises TypeError for a mapped picture that wasn't opened from a path."""
    if not self.is_mapping:
        return _restore, (self.width, self.height, self.image_format.name, self.to_array().tobytes())
    path, page = self._file
    if not path.name or self.parent is not None:
        raise TypeError("a mapped picture that wasn't opened from a file can't be pickled; save it")
    return _reopen, (path, page)
