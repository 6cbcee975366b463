"""Runs a batch: sends groups of images to Dask's workers, and records the results in the journal."""

import os
import time
from dataclasses import dataclass, field

from . import worker
from .failures import BatchFailure
from .journal import Journal
from .names import Pattern, absolute, inputs as files_of
from .recipe import Recipe
from .work import Stopped, Work, job_of, located, make_directory, workers_of

# Bytes that are added to the size of each file when work is estimated: the cost of an image, however small.
_EVERY_PICTURE = 1 << 16


@dataclass
class Failed:
    """An input that has no result. `message` says why; `aside` is set if it was given up because its workers died."""

    input: bytes
    message: str
    machine: str = ""
    aside: bool = False


@dataclass
class Report:
    """The outcome of a batch. `done` counts the results that were made, `skipped` those that existed before, and
    `failed` is a list of Failed. `pixels` counts the pixels of the inputs that are done, `seconds` is the time that
    the whole batch took. `unfinished` counts the inputs left for the next run; `stopped` says why there are any."""

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
    """Divides the remaining images into groups. A group should take a worker thread about `seconds`, estimated from the
    images measured so far. Towards the end groups become smaller, so that all workers finish together, but not
    shorter than a tenth of `seconds`, since each group has a cost of its own."""

    def __init__(self, rows, weight, seconds):
        self._rows, self._left, self._seconds = iter(rows), weight, seconds
        self._spent = self._made = 0.0

    @staticmethod
    def weight(row):
        return row[2] + _EVERY_PICTURE

    def learn(self, row, seconds):
        self._spent += seconds
        self._made += self.weight(row)

    def next(self, threads):
        """Returns the next rows of the journal's plan, or an empty list at the end. `threads` is the number of worker
        threads, each of which processes one group at a time."""
        most = 0.0  # One image, as long as nothing was measured.
        if self._spent > 0:
            usual = self._made / self._spent * self._seconds
            most = min(usual, max(self._left / (2 * threads), min(usual / 10, self._left / threads)))
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
    """Applies the recipe to each input. Returns a Report.

    recipe: the steps, as text in the form that `picturezor run` takes, or an os.PathLike of a file that holds them.
    inputs: names and glob patterns of files, as str or os.PathLike; names given as bytes are taken literally.
    output: the pattern of the results' names, such as 'out/{stem}.jpg'; the placeholders are {stem}, {name}, {ext}
      and {dir}.
    client: a Dask client whose workers see the same files under the same paths. Without one, `workers` processes are
      started on this machine, by default one per processor.
    journal: the file that records what is done, by default picturezor-batch.sqlite next to the results. A result that
      it lists with the same recipe, and with an input of the same name, time and size, isn't made again.
    redo: make results of another recipe again; without it, any such result is an error.
    fail_fast: stop at the first input that fails.
    memory_limit: memory in bytes that one worker may use for its images; by default the limit that the worker was
      started with. It is divided among the images that the worker processes at once.
    temp_dir: the directory on each machine for images that exceed their share of the limit.
    writing: options of `picturezor run` for the results, such as ["--quality", "80"].
    command: name or path of the command picturezor on all machines.
    task_seconds: about how long a worker takes for one group of images.
    progress: called as progress(1, total) when an image is done or has failed; total is the number of images to do.
    stop: a threading.Event that stops the batch when it is set.
    report: the name of an HTML page to write, with thumbnails of results and all failures.

    Raises UsageFailure for an invalid recipe, pattern or option, and BatchFailure if the command is missing, the
    journal or the output directory can't be used, or results conflict; both before any work. BatchFailure is also
    raised if the workers can't run the tasks, or the report can't be written. If the batch is interrupted or loses its
    scheduler, it returns a Report that says so, and the next run makes the rest.
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
                with workers_of(client, min(workers, count)) as (connected, own):
                    Work(connected, groups, worker.make_group, job, lambda row: row[:2], answered, stop, own).do()
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
