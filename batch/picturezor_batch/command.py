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

_ABOUT = """Applies the same steps to many images, on the processors of this machine or on a cluster.

RECIPE is the steps as for `picturezor run`, such as 'scale --fit 1280x800 : filter unsharp', or a file that holds
them. An INPUT is a file, or a pattern in quotes, such as 'scans/**/*.tif'; this program expands it.

A second run makes only what is missing, failed or changed.

`picturezor-batch tiles IN -o NAME` makes one image pyramid of a large image in parts; see its --help."""

_ABOUT_TILES = """Makes an image pyramid in parts, on the processors of this machine or on a cluster. The bytes are
those of a single run of `picturezor tiles`. IN should be a TIFF in tiles or strips, so that each machine reads only
its rows.

After an interruption, the same command continues the work."""

_END = """exit codes:
  0 done; 2 something failed or is left for the next run (the reason is on standard error); 3 the command line or
  the recipe is invalid; 130 interrupted

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
        raise argparse.ArgumentTypeError(f"{text} isn't a size such as 256M or 2G")
    return int(float(match[1]) * 1024 ** " KMGT".index(match[2].upper() or " "))


def _positive(kind):
    def parse(text):
        value = kind(text)
        if not value > 0:
            raise ValueError
        return value

    parse.__name__ = "number"
    return parse


def _add_worker_options(parser):
    parser.add_argument("--scheduler", metavar="ADDRESS",
                        help="use the workers of this Dask scheduler, such as tcp://10.0.0.1:8786; their machines must "
                        "see the same files under the same paths")
    parser.add_argument("--workers", metavar="N", type=_positive(int),
                        help="number of processes on this machine, without --scheduler; one per processor by default")
    parser.add_argument("--memory-limit", metavar="SIZE", type=_size,
                        help="memory of one worker, such as 256M or 2G, divided among the images that it processes at "
                        "once; the limit that the worker was started with by default")
    parser.add_argument("--temp-dir", metavar="DIR", help="directory for temporary files on each machine")
    parser.add_argument("--command", metavar="NAME", help="name or path of the command picturezor on all machines")
    parser.add_argument("-q", "--quiet", action="store_true", help="print no progress bar and no summary")


def _tiles_parser():
    parser = _Parser("picturezor-batch tiles", description=_ABOUT_TILES,
                     formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("source", metavar="IN")
    parser.add_argument("-o", "--output", metavar="NAME", required=True, help="name of the pyramid, which is a folder")
    parser.add_argument("--parts", metavar="N", type=_positive(int),
                        help="number of parts; by default as many as share the work evenly")
    _add_worker_options(parser)
    making = parser.add_argument_group("options of picturezor tiles")
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
                        help="names of the results: {stem} and {name} stand for the input's name without and with its "
                        "extension, {ext} for the extension, {dir} for the directory")
    parser.add_argument("--inputs", metavar="FILE", dest="list",
                        help="file that lists more inputs, one per line; - is standard input")
    parser.add_argument("-0", "--null", action="store_true",
                        help="names in the file of --inputs end with a zero byte instead of a newline")
    _add_worker_options(parser)
    parser.add_argument("--journal", metavar="FILE",
                        help="file that records what is done; picturezor-batch.sqlite next to the results by "
                        "default")
    parser.add_argument("--redo", action="store_true", help="make results of another recipe again")
    parser.add_argument("--fail-fast", action="store_true", help="stop at the first input that fails")
    parser.add_argument("--report", metavar="FILE", help="write an HTML page with thumbnails and all failures")
    parser.add_argument("--task-seconds", metavar="S", type=_positive(float), default=2.0,
                        help="about how long a worker takes for one group of images; 2 by default")
    writing = parser.add_argument_group("options of picturezor run for the results")
    for name in _WRITING_VALUES:
        writing.add_argument(f"--{name}", metavar=name.upper())
    for name in _WRITING_FLAGS:
        writing.add_argument(f"--{name}", action="store_true")
    return parser


def _words(options, *names):
    """Returns the options as arguments of the command picturezor."""
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
    """Returns an event that is set by Ctrl-C or SIGTERM. Workers are started with Ctrl-C blocked, so that only this
    process receives it."""
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
    return (f"{text}; {report.seconds:.1f} s, {report.done / seconds:.1f} images and "
            f"{report.pixels / seconds / 1e6:.1f} megapixels per second")


def _tiles_summary(report):
    text = f"{report.done} parts done"
    if report.unfinished:
        text += f", {report.unfinished} left for the next run"
    speed = report.pixels / max(report.seconds, 1e-9) / 1e6
    return f"{text}; {report.seconds:.1f} s, {speed:.1f} megapixels per second"


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
    """Runs the command. Returns its exit code."""
    from tqdm import tqdm

    # Dask's messages about its workers are replaced by the batch's own. Workers read these variables too.
    os.environ.setdefault("DASK_LOGGING__DISTRIBUTED", "critical")
    os.environ.setdefault("DASK_LOGGING__ASYNCIO", "critical")

    arguments = sys.argv[1:] if arguments is None else arguments
    one = arguments[:1] == ["tiles"]
    make, summary, unit = (_make_tiles, _tiles_summary, " parts") if one else (_make_batch, _summary, " images")
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
        _tell(f"{report.stopped}; the next run continues from here")
    if not options.quiet:
        print(summary(report))
    if stop.is_set():
        return 130
    return 2 if report.failed or report.stopped else 0
