"""Makes one image pyramid on many machines, in parts that are distributed to the workers."""

import math
import os
import re
import subprocess
import time

from . import worker
from .batch import Report
from .failures import BatchFailure, UsageFailure
from .names import absolute
from .work import Stopped, Work, job_of, located, make_directory, workers_of

# What the command appends to messages about its options.
_USAGE = " (see picturezor tiles --help)"


class _OneByOne:
    """Makes each part a group of its own, since parts are large enough."""

    def __init__(self, numbers):
        self._numbers = iter(numbers)

    def next(self, _threads):
        return [number] if (number := next(self._numbers, None)) is not None else []

    def learn(self, _number, _seconds):
        pass


def _size_of(source, command):
    try:
        done = subprocess.run([command, "info", source], stdin=subprocess.DEVNULL, capture_output=True)
    except OSError as error:
        raise BatchFailure(f"{command}: {error.strerror}") from None
    # The name comes first, and may have lines of its own.
    told = done.stdout.split(b"\n", source.count(b"\n") + 1)[-1]
    size = re.search(rb"^size: +(\d+) x (\d+)", told, re.MULTILINE)
    if not size:
        raise BatchFailure(worker.last_words(done.stderr, done.returncode))
    return int(size[1]), int(size[2])


def usual_parts(rows):
    """Returns the default number of parts for an image with so many rows of tiles. The larger levels are made in parts
    by all workers, the smaller ones by the worker that completes the pyramid. If m levels are halved within the parts,
    a part is 2^m / rows of the work, and what is left for the end is 4^-m / 3; the sum is least where 2^m is the cube
    root of 2 rows / 3."""
    halved = max(0, round(math.log2(2 * rows / 3) / 3))
    return -(-rows // 2 ** halved)


def tiles(source, output, client=None, *, options=(), tile=256, parts=None, memory_limit=None, temp_dir=None,
          command=None, workers=None, progress=None, stop=None):
    """Makes an image pyramid in parts. The bytes are those of a single run of `picturezor tiles`. Returns a Report
    whose `done` counts parts.

    source: the image. It should be a TIFF in tiles or strips, so that each worker reads only the rows it needs.
    output: the name of the pyramid, which is a folder, as for `picturezor tiles -o`.
    client: a Dask client whose workers see the same files under the same paths. Without one, `workers` processes are
      started on this machine, by default one per processor.
    options: further options of `picturezor tiles`, such as ["--layout", "iiif", "--page"].
    tile: the width and height of a tile in pixels.
    parts: the number of parts, 1 to the number of rows of tiles; by default as many as share the work evenly.
    progress: called as progress(1, parts) when a part is done, and as progress(0, parts) when the pyramid is complete.
    memory_limit, temp_dir, command, stop: as for run.

    After an interruption, the same call continues the work. Raises UsageFailure for invalid options, and BatchFailure
    if a part can't be made.
    """
    start = time.monotonic()
    source, target = absolute(os.fsencode(source)), absolute(os.fsencode(output).rstrip(b"/"))
    width, height = _size_of(source, located(command))
    make_directory(os.path.dirname(target))
    parts = parts or usual_parts(-(-height // tile))
    workers = min(workers or len(os.sched_getaffinity(0)), parts)
    job = job_of(client, command, workers, memory_limit, source=source, target=target, parts=parts,
                 options=["--tile", str(tile), *(one for one in options if one != "--page"),
                          *(["--temp-dir", temp_dir] if temp_dir else [])],
                 at_the_end=[one for one in options if one == "--page"])
    report = Report()

    def answered(number, _result, message, _seconds, _pixels, _machine):
        if message.endswith(_USAGE):
            raise UsageFailure(message.removesuffix(_USAGE))
        if message:
            raise BatchFailure(f"part {number} of {parts}: {message}" if number else message)
        report.done += number > 0
        if progress:
            progress(number > 0, parts)

    try:
        with workers_of(client, workers) as (connected, own):
            for numbers in (range(1, parts + 1), [0]):
                Work(connected, _OneByOne(numbers), worker.make_parts, job, lambda number: number, answered, stop,
                     own).do()
        report.pixels = width * height
    except Stopped as stopped:
        report.stopped = str(stopped)
        # At least the last task, which joins the parts, is left.
        report.unfinished = max(1, parts - report.done)
    report.seconds = time.monotonic() - start
    return report
