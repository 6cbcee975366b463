"""Writes picturezor/__init__.pyi, the types that type checkers see, from the built package."""

import inspect
import re
import sys

import picturezor
from picturezor import _steps

HEADER = '''"""{}"""

# Written by write_stubs.py.

from collections.abc import Callable, Iterator, Sequence
from contextlib import AbstractContextManager
from os import PathLike
from typing import Any, BinaryIO, NamedTuple, TypeAlias, overload

import numpy as np
from numpy.typing import NDArray

Buffer: TypeAlias = bytes | bytearray | memoryview | NDArray[np.uint8]
Colour: TypeAlias = str | tuple[int, int, int]
Index: TypeAlias = int | slice | tuple[int | slice, int | slice]
Progress: TypeAlias = Callable[[str, int, int], object]
Rect: TypeAlias = tuple[int, int, int, int]
Samples: TypeAlias = NDArray[np.uint8]
'''
# Types as pybind11 writes them, and as they are written in the stubs.
TYPES = [(r"picturezor\._core\.", ""), (r"numpy\.ndarray\[numpy\.uint8\]", "Samples"),
         (r"numpy\.ndarray", "NDArray[Any]"),
         (r"os\.PathLike\b(?!\[)", "str | PathLike[str]"), (r"\bos\.PathLike\[str\]", "PathLike[str]"),
         (r"\bList\[", "Sequence["), (r"\bTuple\[", "tuple["), (r"\bDict\[", "dict["),
         (r"\bdict\b(?!\[)", "dict[str, Any]"), (r"Optional\[([^]]*)\]", r"\1 | None"),
         (r"\bbuffer\b", "Buffer"), (r"\bcapsule\b", "object")]
SPECIAL = ("__init__", "__enter__", "__exit__", "__getitem__", "__setitem__", "_repr_png_")


def typed(text):
    for old, new in TYPES:
        text = re.sub(old, new, text)
    return text


def parts(text):
    """Splits a list of parameters at the commas between them."""
    found, depth, start = [], 0, 0
    for at, letter in enumerate(text):
        depth += (letter in "[(<") - (letter in "])>")
        if letter == "," and depth == 0:
            found.append(text[start:at].strip())
            start = at + 1
    return [part for part in (*found, text[start:].strip()) if part]


def parameter(text):
    if text.startswith("*"):
        return "*" if text == "*" else text.split(":")[0] + ": Any"
    name, _, kind = text.partition(": ")
    kind, given, default = kind.partition(" = ")
    kind = typed(kind)
    if name == "self":
        return name
    if default == "None" and "None" not in kind:
        kind += " | None"
    return f"{name}: {kind}" + (" = ..." if given else "")


def parameters(text):
    """Parameters without a default that follow one with a default become keyword-only."""
    listed = [parameter(part) for part in parts(text)]
    for at, one in enumerate(listed):
        if at and not one.startswith("*") and "=" not in one and "=" in listed[at - 1] and "*" not in listed[:at]:
            return [*listed[:at], "*", *(other for other in listed[at:] if other != "*")]
    return listed


def signatures(doc):
    """The signatures that pybind11 writes above the docstring: one, or several with numbers."""
    return re.findall(r"^(?:\d+\. )?\w*\((.*)\) -> (.*)$", doc, re.MULTILINE)


def pybind_function(name, function, indent, static=False):
    found = signatures(function.__doc__)
    if len(found) > 1:
        found = [one for one in found if one[0] != "*args, **kwargs"]
    for arguments, result in found:
        if len(found) > 1:
            yield indent + "@overload"
        if static:
            yield indent + "@staticmethod"
        listed = ", ".join(parameters(arguments))
        if indent and not static:
            listed = re.sub(r"^(self|arg0)(: [^,]*)?", "self", listed)
        # A result that may be the very object that was given as dest.
        result = "Picture" if result == "object" else typed(result)
        yield f"{indent}def {name}({listed}) -> {result}: ..."


def python_function(name, function, indent):
    signature = inspect.signature(function)
    shortened = [one if one.default in (one.empty, None) else one.replace(default=...)
                 for one in signature.parameters.values()]
    text = str(signature.replace(parameters=shortened)).replace("Ellipsis", "...")
    result = typed(text.replace("'", "").replace("(self, /", "(self"))
    # What contextlib turns the generator into.
    result = result.replace("-> Iterator[", "-> AbstractContextManager[")
    return f"{indent}def {name}{result}: ..."


def members(kind):
    yield f"class {kind.__name__}:"
    if hasattr(kind, "__members__"):
        for name in kind.__members__:
            yield f"    {name}: {kind.__name__}"
        yield "    @property\n    def name(self) -> str: ..."
        yield "    @property\n    def value(self) -> int: ..."
        return
    for name, member in sorted(vars(kind).items()):
        if name.startswith("_") and name not in SPECIAL:
            continue
        if isinstance(member, property):
            doc = getattr(member.fget, "__doc__", None) or ""
            found = signatures(doc)
            result = typed(found[0][1]) if found else "Filters" if name == "filter" else "Picture"
            yield f"    @property\n    def {name}(self) -> {result}: ..."
            if member.fset:
                value = result if found else "Any"
                yield f"    @{name}.setter\n    def {name}(self, value: {value}) -> None: ..."
        elif inspect.isfunction(member):
            yield python_function(name, member, "    ")
        elif isinstance(member, staticmethod):
            yield from pybind_function(name, member.__func__, "    ", static=True)
        elif name == "__exit__":
            yield "    def __exit__(self, *of: object) -> None: ..."
        elif name == "__enter__":
            yield f"    def __enter__(self) -> {kind.__name__}: ..."
        elif callable(member):
            yield from pybind_function(name, member, "    ")


def main(target):
    lines = [HEADER.format(picturezor.__doc__), "class Error(RuntimeError): ..."]
    names = sorted(picturezor.__all__)
    for kind in (*(getattr(picturezor, name) for name in names), _steps.Filters):
        if inspect.isclass(kind) and kind is not picturezor.Error:
            lines += ["", *members(kind)]
    lines += ["", "class Row(NamedTuple):", "    declaration: str", "    name: str", "    setter: str | None", ""]
    for name in names:
        member = getattr(picturezor, name)
        if inspect.isfunction(member):
            lines.append(python_function(name, member, ""))
        elif not inspect.isclass(member):
            lines += pybind_function(name, member, "")
    with open(target, "w") as file:
        file.write("\n".join(lines) + "\n")


main(sys.argv[1])
