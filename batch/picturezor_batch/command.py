"""The command picturezor-batch."""

import argparse
import os
import pathlib
import re
import signal
import sys
import threading

from .batch import run
from .failures import BatchFailure, UsageFailure
from .names import listed
from .pyramid import tiles

_ABOUT = """Does the same steps to many images, on the processors of this machine or on a cluster.

RECIPE is a file with the steps of `picturezor run`, or their text: 'scale --fit 1280x800 : filter unsharp'.
An INPUT is a file, or a pattern in quotes that is looked for here: 'scans/**/*.tif'.

Run again, it makes what is missing or whose input has changed, and nothing else.

`picturezor-batch tiles IN -o NAME` makes one image pyramid of a large image by parts; see its --help."""

_ABOUT_TILES = """Makes an image pyramid by parts, on the processors of this machine or on a cluster, with the bytes that
`picturezor tiles` makes alone. IN should be a TIFF in tiles or strips, whose rows can be read anywhere.

Run again, it goes on where it was interrupted."""

_END = """exit codes:
  0 done; 2 something failed or is left for the next run (the reason is on standard error); 3 the command line or
  the recipe is wrong; 130 interrupted

examples:
  picturezor-batch 'scale --fit 1280x800' photos/*.jpg -o 'web/{stem}.jpg' --quality 80
  picturezor-batch page.steps --inputs list.txt -o 'pages/{dir}/{stem}.png' --scheduler tcp://10.0.0.1:8786
  picturezor-batch tiles map.tif -o map --page --scheduler tcp://10.0.0.1:8786"""

_WRITING_VALUES, _WRITING_FLAGS = ("type", "quality", "compression", "tile"), ("bigtiff", "pyramid")
_TILES_VALUES, _TILES_FLAGS = ("layout", "overlap", "format", "quality", "background", "address"), ("skip-blank", "page")


class _Parser(argparse.ArgumentParser):
    def error(self, message):
        raise UsageFailure(f"{message} (see picturezor-batch --help)")


def _size(text):
    match = re.fullmatch(r"(\d+(?:\.\d+)?)([KMGT]?)(?:i?B)?", text, re.IGNORECASE)
    if not match or float(match[1]) == 0:
        raise argparse.ArgumentTypeError(f"{text} isn't a size like 256M or 2G")
    return int(float(match[1]) * 1024 ** " KMGT".index(match[2].upper() or " "))


def _positive(kind):
    def parse(text):
        value = kind(text)
        if not value > 0:
            raise ValueError
        return value

    parse.__name__ = "number"
    return parse


def _add_engine(parser):
    parser.add_argument("--scheduler", metavar="ADDRESS",
                        help="work on the cluster of this scheduler, like tcp://10.0.0.1:8786, whose machines see the "
                        "same files under the same names")
    parser.add_argument("--workers", metavar="N", type=_positive(int),
                        help="processes on this machine, by default one a processor")
    parser.add_argument("--memory-limit", metavar="SIZE", type=_size,
                        help="memory of a worker, divided among its pictures at work, as 256M or 2G; by default what "
                        "the worker was started with")
    parser.add_argument("--temp-dir", metavar="DIR", help="directory of temporary files on each machine")
    parser.add_argument("--command", metavar="NAME", help="the command picturezor on all machines")
    parser.add_argument("-q", "--quiet", action="store_true", help="no progress bar and no summary")


def _tiles_parser():
    parser = _Parser("picturezor-batch tiles", description=_ABOUT_TILES,
                     formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("source", metavar="IN")
    parser.add_argument("-o", "--output", metavar="NAME", required=True, help="name of the pyramid, a folder")
    parser.add_argument("--parts", metavar="N", type=_positive(int),
                        help="parts to divide it into, by default so many that the work is even")
    _add_engine(parser)
    making = parser.add_argument_group("how the pyramid is made, as in picturezor tiles")
    making.add_argument("--tile", metavar="N", type=_positive(int), default=256)
    for name in _TILES_VALUES:
        making.add_argument(f"--{name}", metavar=name.upper())
    for name in _TILES_FLAGS:
        making.add_argument(f"--{name}", action="store_true")
    return parser


def _parser():
    parser = _Parser("picturezor-batch", description=_ABOUT, epilog=_END,
                     formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("recipe", metavar="RECIPE")
    parser.add_argument("inputs", metavar="INPUT", nargs="*")
    parser.add_argument("-o", "--output", metavar="PATTERN", required=True,
                        help="name of the results: {stem}, {name} and {ext} are the input's name without and with its "
                        "ending, and the ending; {dir} is its directory")
    parser.add_argument("--inputs", metavar="FILE", dest="list",
                        help="a file with more inputs, one a line; - is standard input")
    parser.add_argument("-0", "--null", action="store_true",
                        help="a zero byte stands behind each name of that file, and no line's end")
    _add_engine(parser)
    parser.add_argument("--journal", metavar="FILE",
                        help="what is done, by default picturezor-batch.sqlite beside the results")
    parser.add_argument("--redo", action="store_true", help="make results of another recipe again")
    parser.add_argument("--fail-fast", action="store_true", help="stop at the first input that fails")
    parser.add_argument("--report", metavar="FILE", help="write a page with small pictures and the failures")
    parser.add_argument("--task-seconds", metavar="S", type=_positive(float), default=2.0,
                        help="how long a worker takes for a group of pictures, about; 2 by default")
    writing = parser.add_argument_group("how images are written, as in picturezor run")
    for name in _WRITING_VALUES:
        writing.add_argument(f"--{name}", metavar=name.upper())
    for name in _WRITING_FLAGS:
        writing.add_argument(f"--{name}", action="store_true")
    return parser


def _words(options, *names):
    """Options as they are given to the command."""
    words = []
    for name in names:
        value = getattr(options, name.replace("-", "_"))
        words += [f"--{name}"] if value is True else [f"--{name}", value] if value else []
    return words


def _all_inputs(options):
    yield from options.inputs
    if options.list:
        end = b"\0" if options.null else b"\n"
        if options.list == "-":
            yield from listed(sys.stdin.buffer, end)
        else:
            try:
                with open(options.list, "rb") as stream:
                    yield from listed(stream, end)
            except OSError as error:
                raise UsageFailure(f"{options.list}: {error.strerror}") from None


def _stop_at_signals():
    """Set from the first Ctrl-C on. Workers are started with it held back, so it is for this process alone."""
    stop = threading.Event()
    signal.pthread_sigmask(signal.SIG_BLOCK, [signal.SIGINT])

    def wait():
        signal.sigwait([signal.SIGINT])
        stop.set()

    threading.Thread(target=wait, daemon=True).start()
    signal.signal(signal.SIGTERM, lambda *_: stop.set())
    return stop


def _connected(address):
    from distributed import Client

    try:
        return Client(address, timeout=10)
    except (OSError, ValueError) as error:
        raise BatchFailure(f"{address}: no scheduler answers ({error})") from None


def _tell(text):
    print("picturezor-batch: " + text.encode(errors="backslashreplace").decode().replace("\n", " "), file=sys.stderr)


def _summary(report):
    seconds = max(report.seconds, 1e-9)
    text = f"{report.done} done, {report.skipped} done before, {len(report.failed)} failed"
    if report.unfinished:
        text += f", {report.unfinished} left for the next run"
    return (f"{text}; {report.seconds:.1f} s, {report.done / seconds:.1f} pictures and "
            f"{report.pixels / seconds / 1e6:.1f} megapixels a second")


def _tiles_summary(report):
    text = f"{report.done} parts done"
    if report.unfinished:
        text += f", {report.unfinished} left for the next run"
    return f"{text}; {report.seconds:.1f} s, {report.pixels / max(report.seconds, 1e-9) / 1e6:.1f} megapixels a second"


def _make_tiles(options, client, progress, stop):
    return tiles(options.source, options.output, client, tile=options.tile, parts=options.parts,
                 options=_words(options, *_TILES_VALUES, *_TILES_FLAGS), memory_limit=options.memory_limit,
                 temp_dir=options.temp_dir, command=options.command,
                 workers=options.workers, progress=progress, stop=stop)


def _make_batch(options, client, progress, stop):
    recipe = pathlib.Path(options.recipe) if os.path.isfile(options.recipe) else options.recipe
    return run(recipe, _all_inputs(options), options.output, client, journal=options.journal, redo=options.redo,
               fail_fast=options.fail_fast, memory_limit=options.memory_limit, temp_dir=options.temp_dir,
               writing=_words(options, *_WRITING_VALUES, *_WRITING_FLAGS), command=options.command,
               workers=options.workers, task_seconds=options.task_seconds, progress=progress, stop=stop,
               report=options.report)


def main(arguments=None):
    """Gives the exit code."""
    from tqdm import tqdm

    # What the engine has to tell of its workers is told here in the batch's own words. Workers read these too.
    os.environ.setdefault("DASK_LOGGING__DISTRIBUTED", "critical")
    os.environ.setdefault("DASK_LOGGING__ASYNCIO", "critical")

    arguments = sys.argv[1:] if arguments is None else arguments
    one = arguments[:1] == ["tiles"]
    make, summary, unit = (_make_tiles, _tiles_summary, " parts") if one else (_make_batch, _summary, " pictures")
    client = None
    try:
        if one:
            options = _tiles_parser().parse_args(arguments[1:])
        else:
            options = _parser().parse_intermixed_args(arguments)
            if not options.inputs and not options.list:
                raise UsageFailure("there are no inputs (see picturezor-batch --help)")
        stop = _stop_at_signals()
        if options.scheduler:
            client = _connected(options.scheduler)
        with tqdm(unit=unit, disable=True if options.quiet else None, dynamic_ncols=True) as bar:

            def progress(ended, total):
                bar.total = total
                bar.update(ended)

            report = make(options, client, progress, stop)
    except UsageFailure as failure:
        _tell(str(failure))
        return 3
    except BatchFailure as failure:
        _tell(str(failure))
        return 2
    finally:
        if client:
            client.close()
    for one in report.failed:
        _tell(f"{os.fsdecode(one.input)}: {one.message.removeprefix(os.fsdecode(one.input) + ': ')}")
    if report.stopped:
        _tell(f"{report.stopped}; the next run goes on from here")
    if not options.quiet:
        print(summary(report))
    if stop.is_set():
        return 130
    return 2 if report.failed or report.stopped else 0
