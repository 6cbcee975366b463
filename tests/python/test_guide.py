import doctest
import os
import re
import shutil
import subprocess
import sys

import picturezor as pz
import pytest
from conftest import SOURCE


def test_the_guide_runs_and_makes_its_pictures(tmp_path, monkeypatch, capsys):
    page = (SOURCE / "docs" / "python.md").read_text()
    shutil.copy(SOURCE / "examples" / "lake.jpg", tmp_path)
    monkeypatch.chdir(tmp_path)
    blocks = re.findall(r"^```python\n(.*?)^```$", page, re.MULTILINE | re.DOTALL)
    assert len(blocks) == 8
    names = {}
    for block in blocks:
        exec(compile(block, "docs/python.md", "exec"), names)
    assert "100 %" in capsys.readouterr().out
    shown = re.findall(r"!\[.*?\]\(python/(.*?)\)", page)
    assert len(shown) == 4
    for name in shown:
        made, kept = pz.open(name), pz.open(SOURCE / "docs" / "python" / name)
        # Encoders of JPEG differ by a little.
        assert made.compare_images(kept) < made.total_size, name


@pytest.mark.parametrize("module", [pz._picture, pz._rows])
def test_docstrings_are_true(module):
    failed, tried = doctest.testmod(module)
    assert tried and not failed


def test_everything_public_says_what_it_does():
    for kind in (pz.Picture, pz.HostPicture, pz.GWorld, pz._steps.Filters):
        for name, member in vars(kind).items():
            if not name.startswith("_") and not isinstance(member, (kind, int)):
                assert member.__doc__, f"{kind.__name__}.{name}"


def test_types(tmp_path):
    pytest.importorskip("mypy")
    (tmp_path / "program.py").write_text("""
import numpy as np
import picturezor as pz

picture: pz.Picture = pz.open("a.png", memory_limit="1M").scale(width=3, kernel="box")
small: pz.Picture = picture.filter.unsharp(radius=2).run("convert")
small.save("b.png", quality=3)
size: int = small.width + small.gamma_filter(gamma=2).height
pz.from_array(np.zeros((2, 2), np.uint8)).combine_with(small, (0, 0, 1, 1), mask=None)
with small.rows(0, 1) as block:
    block[0] = 3
small.red[0:2, 0:2] = 7
picture.scale(width="3")  # type: ignore[arg-type]
picture.scale(breadth=3)  # type: ignore[call-arg]
picture.crop()  # type: ignore[call-arg]
picture.width = 3  # type: ignore[misc]
picture.fill_rect()  # type: ignore[call-overload]
pz.Picture(3, 3, 5)  # type: ignore[arg-type]
""")
    path = os.path.dirname(os.path.dirname(pz.__file__))
    environment = {**os.environ, "MYPYPATH": path, "LD_PRELOAD": ""}
    checked = subprocess.run([sys.executable, "-m", "mypy", "--strict", "--warn-unused-ignores", "--cache-dir",
                              str(tmp_path / "cache"), "program.py", os.path.join(path, "picturezor", "__init__.pyi")],
                             cwd=tmp_path, env=environment, capture_output=True, text=True)
    assert checked.returncode == 0, checked.stdout
