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
    """One name for a file, however its directory is reached."""
    directory, last = os.path.split(name)
    return os.path.join(_real(directory or b"."), last)


def inputs(names):
    """The files that names and patterns (`*`, `?`, `[...]`, `**` for any depth) mean, in bytes. Names in bytes stand
    for themselves. Throws UsageFailure for a pattern that fits nothing, and for a directory."""
    for given in names:
        name = os.fsencode(given)
        if isinstance(given, bytes):
            yield name
        elif glob.has_magic(name) and not os.path.lexists(name):
            # Where results lie among inputs, the journal does too.
            found = sorted(one for one in glob.iglob(name, recursive=True) if not os.path.isdir(one)
                           and not os.path.basename(one).startswith(b"picturezor-batch.sqlite"))
            if not found:
                raise UsageFailure(f"{os.fsdecode(name)}: no file has such a name")
            yield from found
        elif os.path.isdir(name):
            raise UsageFailure(f"{os.fsdecode(name)}: a directory; "
                               f"'{os.path.join(os.fsdecode(name), '**')}' means all files in it")
        else:
            yield name


def listed(stream, end):
    """The names that a binary stream holds, each ended by the byte `end`."""
    rest = b""
    while part := stream.read(1 << 16):
        *names, rest = (rest + part).split(end)
        yield from filter(None, names)
    if rest:
        yield rest


class Pattern:
    """The name of a result, like 'out/{stem}.jpg'. {stem}, {name} and {ext} are the input's name without and with its
    ending, and the ending; {dir} is the input's directory, as seen from the current one where it lies below it, and
    from the root otherwise. Throws UsageFailure for other words in braces."""

    def __init__(self, text):
        self._parts = re.split(rb"(\{[^{}]*\})", os.fsencode(text))
        for part in self._parts[1::2]:
            if part[1:-1].decode(errors="replace") not in _WORDS:
                raise UsageFailure(f"{os.fsdecode(part)}: {{stem}}, {{name}}, {{ext}} and {{dir}} are filled in, "
                                   "and nothing else")
        if not os.fsencode(text) or self._parts[-1].endswith(b"/"):
            raise UsageFailure(f"{text}: the name of a directory, not of results")

    @property
    def directory(self):
        """Where all results lie, at one depth or another."""
        return os.path.dirname(self._parts[0]) or (b"/" if self._parts[0].startswith(b"/") else b".")

    def of(self, source):
        """The name for an absolute one."""
        directory, name = os.path.split(source)
        stem, ext = os.path.splitext(name)
        here = os.getcwdb()
        below = os.path.relpath(directory, here) if directory.startswith(here) else directory[1:]
        if below.startswith(b".."):
            below = directory[1:]
        words = {b"{stem}": stem, b"{name}": name, b"{ext}": ext[1:], b"{dir}": below}
        return b"".join(words.get(part, part) for part in self._parts)
