"""Writes a page about a batch: figures, thumbnails of results, and failures."""

import base64
import html
import os
import subprocess
import tempfile

from .failures import BatchFailure

_MOST_PICTURES = 240

_PAGE = """<!DOCTYPE html>
<html lang="en">
<meta charset="utf-8">
<meta name="viewport" content="width=device-width">
<title>{title}</title>
<style>
body {{ font: 15px/1.4 sans-serif; margin: 2em auto; max-width: 75em; padding: 0 1em; color-scheme: light dark }}
td, th {{ text-align: left; vertical-align: top; padding: .15em 1em .15em 0; overflow-wrap: anywhere }}
figure {{ display: inline-block; width: 170px; margin: 0 .4em .8em 0; vertical-align: bottom; text-align: center }}
figure img {{ max-width: 160px }}
figcaption {{ font-size: 12px; overflow-wrap: anywhere }}
pre {{ white-space: pre-wrap }}
</style>
<h1>{title}</h1>
<table>{figures}</table>
<pre>{recipe}</pre>
{failures}
{pictures}
</html>
"""


def _text(value):
    """Escapes a text, or a file name that may hold any bytes, for HTML."""
    name = value if isinstance(value, str) else os.fsdecode(value)
    return html.escape(name.encode(errors="backslashreplace").decode())


def _small_pictures(command, targets):
    """Yields (number, bytes) of JPEG thumbnails of at most 160 pixels, for the targets that can be read."""
    with tempfile.TemporaryDirectory() as place:
        links = []
        for number, target in enumerate(targets):
            # Numbers, since files in different directories may have the same name.
            links.append(os.path.join(place, f"{number}{os.path.splitext(os.fsdecode(target))[1]}"))
            os.symlink(target, links[-1])
        made = os.path.join(place, "made")
        listed = [command, "thumbnail", *links, "-o", made, "--size", "160", "--name", "{stem}.jpg", "--quality", "75",
                  "--quiet"]
        subprocess.run(listed, stdin=subprocess.DEVNULL, stderr=subprocess.DEVNULL, check=False)
        for number in range(len(targets)):
            file = os.path.join(made, f"{number}.jpg")
            if os.path.exists(file):
                with open(file, "rb") as image:
                    yield number, image.read()


def write_page(file, report, recipe, journal, command):
    """Writes a page that contains its images. Raises BatchFailure if it can't be written."""
    rows = [("done", report.done), ("done before", report.skipped), ("failed", len(report.failed)),
            ("left for the next run", report.unfinished), ("seconds", f"{report.seconds:.1f}"),
            ("megapixels per second", f"{report.pixels / max(report.seconds, 1e-9) / 1e6:.1f}"),
            ("stopped", report.stopped or "no"), ("journal", _text(journal.file))]
    failures = ""
    if report.failed:
        failures = "<h2>Failures</h2><table><tr><th>Input<th>Reason<th>Machine" + "".join(
            f"<tr><td>{_text(one.input)}<td>{_text(one.message)}<td>{_text(one.machine)}" for one in report.failed
        ) + "</table>"
    sample = journal.sample(_MOST_PICTURES)
    figures = "".join(
        f'<figure><img alt="" src="data:image/jpeg;base64,{base64.b64encode(image).decode()}">'
        f"<figcaption>{_text(os.path.basename(sample[number]))}</figcaption></figure>"
        for number, image in _small_pictures(command, sample))
    page = _PAGE.format(
        title="Batch of images", figures="".join(f"<tr><th>{name}<td>{value}" for name, value in rows),
        recipe=_text(recipe.text + b"\n" + " ".join(recipe.writing).encode()), failures=failures,
        pictures=f"<h2>Results</h2>{figures}" if figures else "")
    try:
        with open(file, "w", encoding="utf-8") as out:
            out.write(page)
    except OSError as error:
        raise BatchFailure(f"{file}: {error.strerror}") from None
