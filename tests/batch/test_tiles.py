"""One pyramid by several workers."""

import hashlib
import os
import signal
import subprocess

import pytest
from conftest import COMMAND, ROOT, wait_for

OPTIONS = ["--tile", "64", "--overlap", "1", "--quality", "80"]


def tree(directory):
    return {str(file.relative_to(directory)): hashlib.sha256(file.read_bytes()).hexdigest()
            for file in directory.rglob("*") if file.is_file()}


@pytest.fixture(scope="module")
def scan(tmp_path_factory):
    """A TIFF, and beside it the pyramid as the command makes it alone."""
    directory = tmp_path_factory.mktemp("scan")
    subprocess.run([COMMAND, "scale", ROOT / "examples/lake.jpg", "--width", "1501", "--compression", "none", "-q", "-o",
                    directory / "scan.tif"], check=True)
    subprocess.run([COMMAND, "tiles", directory / "scan.tif", "-o", directory / "alone/p", "--page", "-q", *OPTIONS],
                   check=True)
    return directory


# Catches seams, and parts that depend on who makes them.
@pytest.mark.parametrize("workers, more", [(1, ["--parts", "5"]), (2, []), (5, [])])
def test_the_same_bytes_however_many_work(batch, scan, workers, more):
    out, error = batch.run("tiles", scan / "scan.tif", "-o", "made/p/", "--page", "--workers", str(workers), "--command",
                           COMMAND, *OPTIONS, *more)
    assert tree(batch.directory / "made") == tree(scan / "alone")
    assert " parts done; " in out and error == ""
    error = batch.run("tiles", scan / "scan.tif", "-o", "made/p", "--command", COMMAND, *OPTIONS, code=2)[1]
    assert "it is there already" in error and len(error.splitlines()) == 1


# Catches parts that are believed to be there, and a pyramid that stands before it is complete.
@pytest.mark.parametrize("by, code", [(signal.SIGKILL, -9), (signal.SIGINT, 130)])
def test_interrupted_it_goes_on(batch, scan, by, code):
    words = ["tiles", scan / "scan.tif", "-o", "made/p", "--page", "--workers", "1", "--command", COMMAND, *OPTIONS]
    process = batch.start(*words)
    unfinished = batch.directory / "made/p.unfinished"
    wait_for(lambda: (unfinished / "part-2").exists() or (batch.directory / "made/p.dzi").exists())
    process.send_signal(by)
    process.communicate(timeout=60)
    assert process.returncode == code and not (batch.directory / "made/p.dzi").exists()
    # The second part's tiles aren't made again.
    second = unfinished / "p_files/11/0_2.jpg"
    made = second.stat().st_mtime_ns if (unfinished / "part-2").exists() else None
    assert made
    # One part's file says that its tiles are there; without it they are made again.
    (unfinished / "part-1").unlink()
    os.truncate(unfinished / "p_files/11/0_0.jpg", 0)
    (unfinished / "p_files/11/.picturezor-killed").touch()
    batch.run(*words)
    assert (batch.directory / "made/p_files/11/0_2.jpg").stat().st_mtime_ns == made
    assert tree(batch.directory / "made") == tree(scan / "alone")


# Catches work that begins before everything is known to fit.
@pytest.mark.parametrize("arguments, code, told", [
    (["nothing.tif", "-o", "p"], 2, "nothing.tif: No such file"),
    (["in/0.png", "-o", "p", "--format", "tif"], 3, "no browser shows tiles of the type tif"),
    (["in/0.png", "-o", "p/p", "--parts", "1000"], 3, "there are only 1 rows of tiles to divide"),
    (["in/0.png", "-o", "p", "--quality", "101"], 3, "101"),
    (["in/0.png", "-o", "in/0.png/p"], 2, "in/0.png: "),
    (["in/0.png", "-o", "p", "--parts", "0"], 3, "--parts: invalid number value: '0'"),
    (["in/0.png", "-o", "p.zip"], 3, "only a folder can be made by parts"),
    (["in/0.png"], 3, "-o/--output"),
])
def test_refused(batch, arguments, code, told):
    error = batch.run("tiles", *arguments, "--command", COMMAND, "--workers", "1", code=code)[1]
    assert told in error and len(error.splitlines()) == 1
    assert not list(batch.directory.glob("p/*")) and not list(batch.directory.glob("p.*"))
