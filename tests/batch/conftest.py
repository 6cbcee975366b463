"""Pictures, and processes that are started as a person would and killed as a machine would."""

import hashlib
import os
import pathlib
import shutil
import subprocess
import sys
import time

import pytest

COMMAND = os.environ["PICTUREZOR"]
ROOT = pathlib.Path(__file__).resolve().parents[2]
ENVIRONMENT = {**os.environ, "PYTHONPATH": str(ROOT / "batch")}
RECIPE = "crop --rect 3,3,150,110\nfilter unsharp # sharper"


def wait_for(happens):
    """Until it gives something true, which comes back; five minutes are as good as never."""
    end = time.monotonic() + 300
    while not (found := happens()):
        assert time.monotonic() < end, "it never happened"
        time.sleep(0.02)
    return found


def sums(directory):
    """The checksums of what stands in a directory, by name. What the batch keeps for itself doesn't count."""
    return {file.name: hashlib.sha256(file.read_bytes()).hexdigest() for file in directory.iterdir()
            if not file.name.startswith((".picturezor-", "picturezor-batch.sqlite"))}


class Batch:
    """The command picturezor-batch in a directory with pictures. `expected` are the checksums of all results, made
    one by one by the command picturezor."""

    def __init__(self, directory, expected):
        self.directory, self.expected, self.started = directory, expected, []

    def start(self, *arguments, **more):
        words = [sys.executable, "-m", "picturezor_batch", *map(os.fspath, arguments)]
        return self.process(words, stdout=subprocess.PIPE, stderr=subprocess.PIPE, stdin=subprocess.DEVNULL, **more)

    def process(self, words, **more):
        self.started.append(subprocess.Popen(words, cwd=self.directory, env=ENVIRONMENT, **more))
        return self.started[-1]

    def run(self, *arguments, code=0):
        """Gives what it says on standard output and on standard error."""
        process = self.start(*arguments)
        out, error = process.communicate(timeout=400)
        assert process.returncode == code, error.decode()
        return out.decode(), error.decode()

    def all(self, *more, command=COMMAND):
        """Arguments that make every picture."""
        return ["steps", "in/*", "-o", "out/{name}.png", "--command", command, *more]

    def add(self, name):
        """One more picture, a copy of another."""
        shutil.copy(self.directory / "in/0.png", self.directory / "in" / name)
        self.expected[name + ".png"] = self.expected["0.png.png"]

    def results(self):
        out = self.directory / "out"
        return sums(out) if out.exists() else {}


@pytest.fixture(scope="session")
def pictures(tmp_path_factory):
    directory = tmp_path_factory.mktemp("pictures")
    (directory / "in").mkdir()
    names = [b"plain.png", b"with blank.png", b"new\nline.png", "ünï¢ode.png".encode(), b"\xff\xfe.png", b"-dash.png",
             b"[0].png", b"{stem}.png", *(b"%d.png" % number for number in range(12))]
    (directory / "steps").write_text(RECIPE)
    expected = directory / "expected"
    expected.mkdir()
    for number, name in enumerate(names):
        source = os.path.join(os.fsencode(directory), b"in", name)
        subprocess.run([COMMAND, "crop", ROOT / "examples/lake.jpg", "--rect", f"{number * 40},{number * 20},200,150",
                        "-q", "-o", source], check=True)
        subprocess.run([COMMAND, "run", source, "-o", os.path.join(os.fsencode(expected), name + b".png"), "-q",
                        "--steps", directory / "steps"], check=True)
    return directory


@pytest.fixture
def batch(pictures, tmp_path):
    """A fresh one."""
    (tmp_path / "in").mkdir()
    for file in (pictures / "in").iterdir():
        os.link(file, tmp_path / "in" / file.name)
    (tmp_path / "steps").write_text(RECIPE)
    made = Batch(tmp_path, sums(pictures / "expected"))
    yield made
    for process in made.started:
        process.kill()
        process.wait()
