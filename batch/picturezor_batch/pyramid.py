"""One image pyramid on many machines, by parts that workers take."""

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

# Behind what the command says of its options.
_USAGE = " (see picturezor tiles --help)"


class _OneByOne:
    """Parts are large enough to be groups of their own."""

    def __init__(self, numbers):
        self._numbers = iter(numbers)

    def next(self, _hands):
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
    """How many parts a picture with so many rows of tiles is divided into. Levels that the parts share are made by all
    workers, the others by the one that completes the pyramid. With m levels halved among the parts, a part weighs
    2^m / rows of all, and what is left 4^-m / 3; the sum is least where 2^m is the cube root of 2 rows / 3."""
    halved = max(0, round(math.log2(2 * rows / 3) / 3))
    return -(-rows // 2 ** halved)


def tiles(source, output, client=None, *, options=(), tile=256, parts=None, memory_limit=None, temp_dir=None,
          command=None, workers=None, progress=None, stop=None):
    """Makes an image pyramid by parts, with the bytes that `picturezor tiles` makes alone. Gives a Report, whose `done`
    counts parts.

    source: a picture from which rows can be read anywhere, a TIFF in tiles or strips as a rule.
    output: the pyramid's name, as for `picturezor tiles -o`.
    client: of the engine, whose workers see the same files under the same names; without one, `workers` processes of
      this machine work, by default one a processor.
    options: of `picturezor tiles`, like ["--layout", "iiif", "--page"]; `tile` is the edge of a tile.
    parts: how many, 1 to the number of rows of tiles; by default so many that the work is even.
    memory_limit, temp_dir, command, progress, stop: as for run.

    A run that was stopped is gone on with by the same call. Throws UsageFailure for options that make no sense, and
    BatchFailure where a part can't be made.
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
        with workers_of(client, workers) as (engine, own):
            for numbers in (range(1, parts + 1), [0]):
                Work(engine, _OneByOne(numbers), worker.make_parts, job, lambda number: number, answered, stop, own).do()
        report.pixels = width * height
    except Stopped as stopped:
        report.stopped = str(stopped)
        # What joins them is left, if nothing else.
        report.unfinished = max(1, parts - report.done)
    report.seconds = time.monotonic() - start
    return report
