"""The work of a batch: groups of pictures on the workers of the engine, results in the journal."""

import os
import time
from dataclasses import dataclass, field

from . import worker
from .failures import BatchFailure
from .journal import Journal
from .names import Pattern, absolute, inputs as files_of
from .recipe import Recipe
from .work import Stopped, Work, job_of, located, make_directory, workers_of

# Bytes that a picture weighs beside those of its file: what it costs however small it is.
_EVERY_PICTURE = 1 << 16


@dataclass
class Failed:
    """An input without a result, and why. `aside`: it was given up since workers died of it."""

    input: bytes
    message: str
    machine: str = ""
    aside: bool = False


@dataclass
class Report:
    """What became of a batch. `pixels` are those of the inputs that are done, `seconds` those of the whole batch,
    `unfinished` the inputs left for the next run, and `stopped` says why where there are some."""

    done: int = 0
    skipped: int = 0
    unfinished: int = 0
    pixels: int = 0
    seconds: float = 0.0
    stopped: str = ""
    failed: list = field(default_factory=list)


def _planned(names, pattern):
    for name in files_of(names):
        source = absolute(name)
        target = absolute(pattern.of(source))
        try:
            about = os.stat(source)
        except OSError as error:
            yield source, target, None, None, error.strerror
            continue
        yield source, target, about.st_size, about.st_mtime_ns, ""


class _Groups:
    """Makes groups of the pictures that are left: as many as take a worker `seconds` by what was measured so far,
    and fewer towards the end, so that all workers end together, but none for less than a tenth of that: a group costs
    something, too."""

    def __init__(self, rows, weight, seconds):
        self._rows, self._left, self._seconds = iter(rows), weight, seconds
        self._spent = self._made = 0.0

    @staticmethod
    def weight(row):
        return row[2] + _EVERY_PICTURE

    def learn(self, row, seconds):
        self._spent += seconds
        self._made += self.weight(row)

    def next(self, hands):
        """Rows of the journal's plan; none at the end. `hands` are pictures that may be in work at a time."""
        most = 0.0  # One picture, as long as nothing is known.
        if self._spent > 0:
            usual = self._made / self._spent * self._seconds
            most = min(usual, max(self._left / (2 * hands), min(usual / 10, self._left / hands)))
        group, weight = [], 0
        for row in self._rows:
            group.append(row)
            weight += self.weight(row)
            if weight >= most or len(group) >= 1000:
                break
        self._left -= weight
        return group


def run(recipe, inputs, output, client=None, *, journal=None, redo=False, fail_fast=False, memory_limit=None,
        temp_dir=None, writing=(), command=None, workers=None, task_seconds=2.0, progress=None, stop=None,
        report=None):
    """Makes a picture of each input, and gives a Report.

    recipe: the steps of `picturezor run` as text, or an os.PathLike of the file that holds them.
    inputs: names and patterns of files; names in bytes stand for themselves.
    output: the results' names, like 'out/{stem}.jpg'; see Pattern for what stands in braces.
    client: of the engine, whose workers see the same files under the same names; without one, `workers` processes
      of this machine work, by default one a processor.
    journal: the file that holds what is done, picturezor-batch.sqlite beside the results by default. What stands
      there with the same input, time, size and recipe isn't made again.
    redo: makes results of another recipe again, which is refused otherwise.
    fail_fast: stops at the first input that fails.
    memory_limit: bytes that a worker's pictures may take together, by default what the worker was started with.
    temp_dir: a directory on each machine for pictures that pass the limit.
    writing: options of `picturezor run` that say how files are written.
    command: name of the command picturezor on all machines.
    task_seconds: how long a worker takes for a group of pictures, about.
    progress: called with the number of pictures that came to an end, and that of all.
    stop: a threading.Event that ends the batch early.
    report: a name for a page with small pictures of results and all failures.

    Throws UsageFailure for what makes no sense, and BatchFailure for what can't be begun, before any work.
    Interrupted or without a scheduler it ends with a Report that says so; the next run does the rest.
    """
    start = time.monotonic()
    recipe, pattern = Recipe(recipe, writing), Pattern(output)
    where = located(command)
    recipe.check(where, absolute(pattern.of(b"/picture.png")))
    make_directory(pattern.directory)
    book = Journal(journal or os.path.join(os.fsdecode(pattern.directory), "picturezor-batch.sqlite"))
    try:
        book.plan(_planned(inputs, pattern))
        changed = book.settle(recipe.hash, redo)
        if changed:
            raise BatchFailure(f"{changed} results were made by another recipe; --redo makes them again")
        outcome = Report(skipped=book.count("skipped"))
        outcome.failed = [Failed(source, message) for source, message in book.failed_before()]
        count = book.count("to do")

        def answered(row, result, message, seconds, pixels, machine):
            if result == "aside":
                message += ", so it is set aside"
            book.write(row, recipe.hash, result, message, seconds, pixels, machine)
            if result == "done":
                outcome.done += 1
                outcome.pixels += pixels
            else:
                outcome.failed.append(Failed(row[0], message, machine, result == "aside"))
            if progress:
                progress(1, count)
            if message and fail_fast:
                raise Stopped("an input failed")

        try:
            if fail_fast and outcome.failed:
                raise Stopped("an input failed")
            if count:
                workers = workers or len(os.sched_getaffinity(0))
                job = job_of(client, command, workers, memory_limit, steps=recipe.text, writing=recipe.writing,
                             temp_dir=temp_dir)
                groups = _Groups(book.to_do(), book.weight() + count * _EVERY_PICTURE, task_seconds)
                with workers_of(client, min(workers, count)) as (engine, own):
                    Work(engine, groups, worker.make_group, job, lambda row: row[:2], answered, stop, own).do()
        except Stopped as stopped:
            outcome.stopped = str(stopped)
        outcome.unfinished = book.count("to do") + book.count("failed") - outcome.done - len(outcome.failed)
        outcome.seconds = time.monotonic() - start
        book.flush()
        if report:
            from .page import write_page

            write_page(report, outcome, recipe, book, where)
        return outcome
    finally:
        book.close()
