"""Names of inputs and of results."""

import functools
import glob
import os
import re

from .failures import UsageFailure

_WORDS = ("stem", "name", "ext", "dir")


@functools.lru_cache(maxsize=4096)
def _real(directory):
    return os.path.realpath(directory)


def absolute(name):
    """Returns the absolute name of a file, with symbolic links in its directory resolved: one name for each file."""
    directory, last = os.path.split(name)
    return os.path.join(_real(directory or b"."), last)


def inputs(names):
    """Yields the names of the files, as bytes, that names and patterns (`*`, `?`, `[...]`, `**` for any depth) match.
    Names given as bytes are taken literally. Raises UsageFailure for a pattern that matches nothing, and for a
    directory."""
    for given in names:
        name = os.fsencode(given)
        if isinstance(given, bytes):
            yield name
        elif glob.has_magic(name) and not os.path.lexists(name):
            # If results are in the directory of the inputs, so is the journal.
            found = sorted(one for one in glob.iglob(name, recursive=True) if not os.path.isdir(one)
                           and not os.path.basename(one).startswith(b"picturezor-batch.sqlite"))
            if not found:
                raise UsageFailure(f"{os.fsdecode(name)}: no file matches")
            yield from found
        elif os.path.isdir(name):
            raise UsageFailure(f"{os.fsdecode(name)}: a directory; "
                               f"'{os.path.join(os.fsdecode(name), '**')}' means all files in it")
        else:
            yield name


def listed(stream, end):
    """Yields the names in a binary stream, each ended by the byte `end`. Empty ones are skipped."""
    rest = b""
    while part := stream.read(1 << 16):
        *names, rest = (rest + part).split(end)
        yield from filter(None, names)
    if rest:
        yield rest


class Pattern:
    """The pattern of the results' names, such as 'out/{stem}.jpg'. {stem} and {name} are the input's name without and
    with its extension, {ext} is the extension without the dot. {dir} is the input's directory, relative to the current
    one if it is below it, and otherwise to the root. Raises UsageFailure for other placeholders."""

    def __init__(self, text):
        self._parts = re.split(rb"(\{[^{}]*\})", os.fsencode(text))
        for part in self._parts[1::2]:
            if part[1:-1].decode(errors="replace") not in _WORDS:
                raise UsageFailure(f"{os.fsdecode(part)}: {{stem}}, {{name}}, {{ext}} and {{dir}} are the only "
                                   "placeholders")
        if not os.fsencode(text) or self._parts[-1].endswith(b"/"):
            raise UsageFailure(f"{text}: the name of a directory, not of results")

    @property
    def directory(self):
        """The directory that holds all results, some of them perhaps in directories below it."""
        return os.path.dirname(self._parts[0]) or (b"/" if self._parts[0].startswith(b"/") else b".")

    def of(self, source):
        """Returns the name of the result for the absolute name of an input."""
        directory, name = os.path.split(source)
        stem, ext = os.path.splitext(name)
        here = os.getcwdb()
        below = os.path.relpath(directory, here) if directory.startswith(here) else directory[1:]
        if below.startswith(b".."):
            below = directory[1:]
        words = {b"{stem}": stem, b"{name}": name, b"{ext}": ext[1:], b"{dir}": below}
        return b"".join(words.get(part, part) for part in self._parts)
