"""The methods that are generated from the descriptions of the steps: scale, crop, filter.blur and so on."""

from __future__ import annotations

import inspect
from inspect import Parameter

from . import _core
from ._core import Picture

_TYPES = {"flag": "bool", "integer": "int", "number": "float", "choice": "str", "size": "tuple[int, int] | str",
          "rectangle": "tuple[int, int, int, int] | str", "point": "tuple[int, int] | str", "colour": "Colour",
          "numbers": "float | Sequence[float] | str", "integers": "Sequence[int] | str",
          "file": "str | PathLike[str] | Picture"}


def _default(option):
    text = option["default"]
    if option["kind"] == "flag":
        return False
    if not text:
        return None
    return {"integer": int, "number": float}.get(option["kind"], str)(text)


def _signature(step):
    parameters = [Parameter("self", Parameter.POSITIONAL_ONLY)]
    # First the required ones, which may be positional.
    for option in sorted(step["options"], key=lambda option: not option["required"]):
        kind = _TYPES[option["kind"]]
        if option["required"]:
            parameters.append(Parameter(option["name"], Parameter.POSITIONAL_OR_KEYWORD, annotation=kind))
        else:
            default = _default(option)
            annotation = kind if default is not None else kind + " | None"
            parameters.append(Parameter(option["name"], Parameter.KEYWORD_ONLY, default=default, annotation=annotation))
    parameters.append(Parameter("progress", Parameter.KEYWORD_ONLY, default=None, annotation="Progress | None"))
    return inspect.Signature(parameters, return_annotation="Picture")


def _documentation(step):
    lines = [step["help"] + "."]
    if step["more"]:
        lines += ["", step["more"]]
    if step["options"]:
        lines.append("")
    for option in step["options"]:
        line = f"{option['name']}: {option['help']}"
        if option["choices"]:
            line += ": " + ", ".join(option["choices"])
        elif option["least"] < option["most"] < 1e8:
            line += f" ({option['least']:g} to {option['most']:g})"
        lines.append(line)
    return "\n".join(lines)


def _method(step, picture_of):
    signature = _signature(step)

    def method(*arguments, **options):
        given = signature.bind(*arguments, **options).arguments
        progress = given.pop("progress", None)
        picture = picture_of(given.pop("self"))
        values = {name: value for name, value in given.items() if value is not None}
        return _core._run(picture, step["name"], values, progress)

    method.__name__ = step["name"].split()[-1].replace("-", "_")
    method.__signature__ = signature
    method.__doc__ = _documentation(step)
    return method


class Filters:
    """The filters of a picture. They don't change alpha."""

    def __init__(self, picture: Picture) -> None:
        self._picture = picture


for _step in _core._steps():
    if _step["name"].startswith("filter "):
        _made = _method(_step, lambda filters: filters._picture)
        setattr(Filters, _made.__name__, _made)
    else:
        _made = _method(_step, lambda picture: picture)
        setattr(Picture, _made.__name__, _made)
    _made.__qualname__ = ("Filters." if " " in _step["name"] else "Picture.") + _made.__name__
Picture.filter = property(Filters, doc=Filters.__doc__)
