"""The work of a batch: groups of pictures on the workers of the engine, results in the journal."""

import collections
import contextlib
import itertools
import os
import shutil
import time
import uuid
from dataclasses import dataclass, field

from . import worker
from .failures import BatchFailure
from .journal import Journal
from .names import Pattern, absolute, inputs as files_of
from .recipe import Recipe

# Bytes that a picture weighs beside those of its file: what it costs however small it is.
_EVERY_PICTURE = 1 << 16
# Seconds after which workers of this machine are given up. Those of a cluster may come at any time.
_WITHOUT_WORKERS = 180
# Groups for each hand of a worker: one in work, one that waits beside it.
_AHEAD = 2


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


class _Stopped(Exception):
    """The batch ends before all is done."""


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


class _Batch:
    def __init__(self, client, journal, recipe, job, fail_fast, seconds, progress, stop, report, own):
        from distributed import as_completed

        self._client, self._journal, self._recipe, self._job = client, journal, recipe, job
        self._fail_fast, self._progress, self._stop, self._report = fail_fast, progress, stop, report
        to_do = journal.count("to do")
        self._groups = _Groups(journal.to_do(), journal.weight() + to_do * _EVERY_PICTURE, seconds)
        self._total = to_do
        self._run = uuid.uuid4().hex[:8]
        self._numbers = itertools.count()
        self._in_work = {}  # Future: its rows
        self._again = collections.deque()  # Groups that a machine couldn't do
        self._suspects = collections.deque()  # Pictures whose group's workers died
        self._unfit = {}  # Address of a worker: what keeps it from working
        self._alone = False
        self._own, self._seen, self._called = own, time.monotonic(), time.monotonic()
        self._known, self._asked = {}, 0.0  # The workers, and when they were asked for
        self._results = as_completed(with_results=True, loop=client.loop, raise_errors=False)

    def work(self):
        try:
            while True:
                self._fill()
                if not self._in_work:
                    if not self._suspects:
                        return
                    self._alone = True
                    continue
                if self._stop and self._stop.is_set():
                    raise _Stopped("interrupted")
                ready = self._results.next_batch(block=False)
                for future, result in ready:
                    self._take(future, result)
                if not ready:
                    time.sleep(0.02)
        finally:
            for future in self._in_work:
                future.release()

    def _workers(self):
        # The scheduler is asked, so not too often.
        if time.monotonic() - self._asked > 1:
            self._known, self._asked = self._client.scheduler_info()["workers"], time.monotonic()
        return self._known

    def _fill(self):
        """Keeps the workers busy, and the engine's list of tasks short however many pictures there are."""
        workers = self._workers()
        if workers:
            self._seen = time.monotonic()
        elif self._own and time.monotonic() - self._seen > _WITHOUT_WORKERS:
            raise _Stopped("the workers died and don't come back")
        if self._own and time.monotonic() - self._called > 20:
            # The engine doesn't start a worker again that died while it was starting, unless it is asked.
            self._own.scale(len(self._own.worker_spec))
            self._called = time.monotonic()
        fit = {address: about for address, about in workers.items() if address not in self._unfit}
        if workers and not fit:
            raise _Stopped("no machine is left to work on: " + next(iter(self._unfit.values())))
        hands = sum(about["nthreads"] for about in fit.values()) or 1
        # A suspect that is one indeed takes its worker along, and nothing else should be there then.
        most = max(1, len(fit) // 2) if self._alone else _AHEAD * hands
        while len(self._in_work) < most:
            if self._alone:
                group = [self._suspects.popleft()] if self._suspects else []
            else:
                group = self._again.popleft() if self._again else self._groups.next(hands)
            if not group:
                return
            where = {"workers": list(fit), "allow_other_workers": False} if len(fit) < len(workers) else {}
            future = self._client.submit(
                worker.make_group, self._job, [row[:2] for row in group],
                key=f"pictures-{self._run}-{next(self._numbers)}", pure=False, **where)
            self._in_work[future] = group
            self._results.add(future)

    def _take(self, future, result):
        group = self._in_work.pop(future)
        if future.status == "finished":
            self._take_answers(group, result)
        elif future.status == "error":
            error = result[1]
            if type(error).__name__ != "KilledWorker":
                raise BatchFailure(f"a worker can't do its work: {error!r}")
            if self._alone:
                self._put(group[0], "aside", "its workers died, so it is set aside")
            self._suspects.extend([] if self._alone else group)
        else:
            self._in_work[future] = group
            raise _Stopped("the scheduler has ended")

    def _take_answers(self, group, result):
        machine = result["machine"]
        if result["fault"]:
            self._unfit[result["worker"]] = f"{machine}: {result['fault']}"
            rest = group[len(result["answers"]):]
            if self._alone:
                self._suspects.extend(rest)
            else:
                self._again.append(rest)
        for row, (message, seconds, pixels) in zip(group, result["answers"]):
            self._groups.learn(row, seconds)
            self._put(row, "failed" if message else "done", message, seconds, pixels, machine)

    def _put(self, row, result, message, seconds=0.0, pixels=0, machine=""):
        self._journal.write(row, self._recipe.hash, result, message, seconds, pixels, machine)
        if result == "done":
            self._report.done += 1
            self._report.pixels += pixels
        else:
            self._report.failed.append(Failed(row[0], message, machine, result == "aside"))
        if self._progress:
            self._progress(1, self._total)
        if message and self._fail_fast:
            raise _Stopped("an input failed")


def _local_client(workers):
    import dask
    from distributed import Client, LocalCluster

    # A task that takes two workers along is given up. Nobody looks at profiles of what only waits for a command.
    dask.config.set({"distributed.scheduler.allowed-failures": 1, "distributed.worker.profile.interval": "1s",
                     "distributed.worker.profile.cycle": "10s",
                     # A machine that is very busy may take long to bring a worker back.
                     "distributed.comm.timeouts.connect": "120s"})
    cluster = LocalCluster(n_workers=workers, threads_per_worker=1, dashboard_address="127.0.0.1:0",
                           silence_logs="CRITICAL")
    return Client(cluster)


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
    where = shutil.which(command or "picturezor")
    if not where:
        raise BatchFailure(f"{command or 'picturezor'}: there is no such command")
    recipe.check(where, absolute(pattern.of(b"/picture.png")))
    try:
        os.makedirs(pattern.directory, exist_ok=True)
    except OSError as error:
        raise BatchFailure(f"{os.fsdecode(pattern.directory)}: {error.strerror}") from None
    book = Journal(journal or os.path.join(os.fsdecode(pattern.directory), "picturezor-batch.sqlite"))
    own = None
    try:
        book.plan(_planned(inputs, pattern))
        changed = book.settle(recipe.hash, redo)
        if changed:
            raise BatchFailure(f"{changed} results were made by another recipe; --redo makes them again")
        outcome = Report(skipped=book.count("skipped"))
        outcome.failed = [Failed(source, message) for source, message in book.failed_before()]
        count = book.count("to do")
        if fail_fast and outcome.failed:
            outcome.stopped = "an input failed"
        elif count:
            workers = workers or len(os.sched_getaffinity(0))
            if not client:
                own = client = _local_client(min(workers, count))
            job = {"steps": recipe.text, "writing": recipe.writing, "directory": os.getcwd(), "temp_dir": temp_dir,
                   "memory_limit": memory_limit, "command": where if own or command else "picturezor",
                   "threads": max(1, len(os.sched_getaffinity(0)) // workers) if own else None}
            _send_along()
            try:
                _Batch(client, book, recipe, job, fail_fast, task_seconds, progress, stop, outcome,
                       own and own.cluster).work()
                if own:
                    # One that is just coming back would complain of a scheduler that is gone.
                    with contextlib.suppress(TimeoutError):
                        client.wait_for_workers(min(workers, count), timeout=20)
            except _Stopped as stopped:
                outcome.stopped = str(stopped)
        outcome.unfinished = book.count("to do") + book.count("failed") - outcome.done - len(outcome.failed)
        outcome.seconds = time.monotonic() - start
        book.flush()
        if report:
            from .page import write_page

            write_page(report, outcome, recipe, book, where)
        return outcome
    finally:
        if own:
            cluster = own.cluster
            own.close()
            cluster.close(timeout=5)
        book.close()


def _send_along():
    """Workers get the function itself, so that this package needn't be there."""
    import cloudpickle

    cloudpickle.register_pickle_by_value(worker)
