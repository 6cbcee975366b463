"""What a batch makes, what it makes again, and what it refuses."""

import os
import sqlite3

import pytest
from conftest import COMMAND, sums


# Catches results that depend on who makes them, and names that are cut, quoted or taken for patterns on the way.
@pytest.mark.parametrize("workers", [1, 5])
def test_the_same_bytes_however_many_work(batch, workers):
    out, error = batch.run(*batch.all("--workers", str(workers)))
    assert batch.results() == batch.expected
    assert out.startswith("20 done, 0 done before, 0 failed") and error == ""


# Catches a journal that forgets, and one that believes in results that are gone or old.
def test_again_it_makes_what_is_missing_or_changed(batch):
    batch.run(*batch.all("--workers", "2"))
    assert batch.results() == batch.expected
    places = {file: file.stat().st_ino for file in (batch.directory / "out").glob("*.png")}
    gone, old = batch.directory / "out/3.png.png", batch.directory / "in/5.png"
    gone.unlink()
    os.utime(old, (1, 1))
    assert batch.run(*batch.all())[0].startswith("2 done, 18 done before")
    made = {file for file, place in places.items() if file.stat().st_ino != place}
    assert {gone, batch.directory / "out/5.png.png"} >= made and batch.results() == batch.expected

    # A comment is no other recipe; a step is.
    (batch.directory / "steps").write_text("# new\n" + (batch.directory / "steps").read_text())
    assert batch.run(*batch.all())[0].startswith("0 done, 20 done before")
    (batch.directory / "steps").write_text("filter invert")
    error = batch.run(*batch.all(), code=2)[1]
    assert "20 results were made by another recipe; --redo" in error and batch.results() == batch.expected
    assert batch.run(*batch.all("--redo"))[0].startswith("20 done, 0 done before")
    assert batch.results().keys() == batch.expected.keys() and batch.results() != batch.expected
    assert batch.run(*batch.all("--quality", "50"), code=2)[1].startswith("picturezor-batch: 20 results")


# Catches a bad input that ends the batch, one that is passed over, and one that gets a result.
def test_bad_inputs_are_told_and_the_rest_is_made(batch):
    bad = {"bad.png": "not a PNG", "empty.png": "the file is empty", "cut.png": "cut.png"}
    (batch.directory / "in/bad.png").write_text("no picture")
    (batch.directory / "in/empty.png").touch()
    (batch.directory / "in/cut.png").write_bytes((batch.directory / "in/0.png").read_bytes()[:9000])
    out, error = batch.run(*batch.all("in/nowhere.png", "--report", "page.html"), code=2)
    assert out.startswith("20 done, 0 done before, 4 failed") and batch.results() == batch.expected
    told = error.splitlines()
    assert len(told) == 4 and "nowhere.png: No such file" in error
    for name, reason in bad.items():
        assert any(name in line and reason in line for line in told)
    page = (batch.directory / "page.html").read_text()
    assert page.count("data:image/jpeg;base64,/9j/") == 20 and "cut.png" in page and "No such file" in page
    rows = sqlite3.connect(batch.directory / "out/picturezor-batch.sqlite").execute(
        "SELECT count(*), sum(pixels), count(DISTINCT recipe) FROM results GROUP BY result ORDER BY result").fetchall()
    assert rows == [(20, 20 * 200 * 150, 1), (4, 0, 1)]
    out, error = batch.run(*batch.all("--fail-fast", "--redo", "--journal", "other.sqlite", "--workers", "1"), code=2)
    assert "an input failed" in error and "left for the next run" in out


# Catches work that begins before everything is known to fit.
@pytest.mark.parametrize("arguments, code, told", [
    (["steps", "in/*", "-o", "out/{stam}.png"], 3, "{stam}: {stem}, {name}, {ext} and {dir}"),
    (["steps", "in/*", "-o", "out/"], 3, "the name of a directory"),
    (["steps", "in/*", "-o", "out/{stem}.gif"], 3, "must end in"),
    (["steps", "in/*", "-o", "out/{ext}.png"], 2, "its result would have the name of that of"),
    (["steps", "in/*", "-o", "in/{stem}.png"], 2, "it would be overwritten"),
    (["steps", "-o", "out/{stem}.png"], 3, "there are no inputs"),
    (["steps", "in", "-o", "out/{stem}.png"], 3, "a directory"),
    (["steps", "nothing/*", "-o", "out/{stem}.png"], 3, "no file matches"),
    (["blur", "in/*", "-o", "out/{stem}.png"], 3, "there is no step blur"),
    (["scale --wide 3", "in/*", "-o", "out/{stem}.png"], 3, "recipe:1: step 1 (scale): it has no option --wide"),
    (["combine no.png --at 1,1", "in/*", "-o", "out/{stem}.png"], 2, "no.png: No such file"),
    (["steps", "in/*", "-o", "out/{stem}.png", "--quality", "101"], 3, "101"),
    (["steps", "in/*", "-o", "out/{stem}.png", "--journal", "steps"], 2, "steps: file is not a database"),
    (["steps", "in/*", "-o", "out/{stem}.png", "--memory-limit", "much"], 3, "isn't a size"),
    (["steps", "in/*", "-o", "steps/{stem}.png"], 2, "steps: "),
])
def test_refused_before_any_work(batch, arguments, code, told):
    before = sums(batch.directory / "in")
    error = batch.run(*arguments, "--command", COMMAND, code=code)[1]
    assert told in error and len(error.splitlines()) == 1
    assert batch.results() == {} and sums(batch.directory / "in") == before


def test_lists_of_names_and_trees_of_results(batch):
    names = sorted(b"in/" + name for name in os.listdir(os.fsencode(batch.directory / "in")))
    # A file stands where the directory of one result would.
    for directory in ("tree", "other"):
        (batch.directory / directory).mkdir()
    (batch.directory / "tree/other").touch()
    (batch.directory / "other/0.png").write_bytes((batch.directory / "in/0.png").read_bytes())
    names.insert(3, b"other/0.png")
    (batch.directory / "list").write_bytes(b"".join(name + b"\0" for name in names))
    error = batch.run("steps", "--inputs", "list", "-0", "-o", "tree/{dir}/{name}.png", "--command", COMMAND, code=2)[1]
    assert "other/0.png: " in error and "File exists" in error and len(error.splitlines()) == 1
    assert sums(batch.directory / "tree/in") == batch.expected
