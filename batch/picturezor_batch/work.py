"""Distributes tasks to Dask's workers, collects their answers, and deals with workers that die."""

import collections
import contextlib
import itertools
import os
import shutil
import time
import uuid

from . import worker
from .failures import BatchFailure

# Seconds after which the workers of this machine are given up. Those of a cluster may appear at any time.
_WITHOUT_WORKERS = 180
# Groups per worker thread: one in progress, one waiting.
_AHEAD = 2


class Stopped(Exception):
    """The work ends before everything is done. The message says why."""


def located(command):
    """Returns the path of the command on this machine. Raises BatchFailure if it isn't there."""
    where = shutil.which(command or "picturezor")
    if not where:
        raise BatchFailure(f"{command or 'picturezor'}: there is no such command")
    return where


def make_directory(directory):
    """Raises BatchFailure if it can't be made."""
    try:
        os.makedirs(directory, exist_ok=True)
    except OSError as error:
        raise BatchFailure(f"{os.fsdecode(directory)}: {error.strerror}") from None


def job_of(client, command, workers, memory_limit, **more):
    """Returns what is sent to the workers beside the rows; `more` is for the task alone."""
    return {"directory": os.getcwd(), "memory_limit": memory_limit,
            "command": "picturezor" if client and not command else located(command),
            "threads": None if client else worker.threads_of(workers), **more}


class Work:
    """Processes rows in groups, each row once. `groups` has next(threads), which returns the rows of the next group,
    and learn(row, seconds). `task` is the function of worker.py that processes a group: it is called with `job` and a
    list that holds told(row) for each row. `answered(row, result, message, seconds, pixels, machine)` is called for
    each row, in any order; result is "done", "failed" or "aside" (given up because its workers died), and message is
    empty for "done". `stop` is a threading.Event or None. `own` is the local cluster if it was started for this work,
    or None."""

    def __init__(self, client, groups, task, job, told, answered, stop, own):
        from distributed import as_completed

        self._client, self._groups, self._task, self._job, self._told = client, groups, task, job, told
        self._answered, self._stop = answered, stop
        self._run = uuid.uuid4().hex[:8]
        self._numbers = itertools.count()
        self._in_work = {}  # Future: its rows
        self._bound = {}  # Future: the addresses of the workers to which it is bound, if any
        self._again = collections.deque()  # Groups that a machine couldn't do
        self._suspects = collections.deque()  # Rows whose group's workers died
        self._unfit = {}  # Address of a worker: what keeps it from working
        self._alone = False
        self._own, self._seen, self._called = own, time.monotonic(), time.monotonic()
        self._known, self._asked = {}, 0.0  # The workers, and when they were asked for
        self._results = as_completed(with_results=True, loop=client.loop, raise_errors=False)

    def do(self):
        """Returns when everything is done. Raises Stopped, or BatchFailure if no worker can do the work."""
        try:
            while True:
                self._fill()
                if not self._in_work:
                    if not self._suspects:
                        return
                    self._alone = True
                    continue
                if self._stop and self._stop.is_set():
                    raise Stopped("interrupted")
                ready = self._results.next_batch(block=False)
                for future, result in ready:
                    self._bound.pop(future, None)
                    if future in self._in_work:
                        self._take(future, result)
                if not ready:
                    time.sleep(0.02)
        finally:
            for future in self._in_work:
                future.release()

    def _workers(self):
        # This asks the scheduler, so not too often.
        if time.monotonic() - self._asked > 1:
            self._known, self._asked = self._client.scheduler_info()["workers"], time.monotonic()
        return self._known

    def _fill(self):
        """Keeps the workers busy, and Dask's list of tasks short however many rows there are."""
        workers = self._workers()
        if workers:
            self._seen = time.monotonic()
        elif self._own and time.monotonic() - self._seen > _WITHOUT_WORKERS:
            raise Stopped("the workers died and don't come back")
        if self._own and time.monotonic() - self._called > 20:
            # Dask doesn't restart a worker that died while it was starting, unless it is asked to.
            self._own.scale(len(self._own.worker_spec))
            self._called = time.monotonic()
        fit = {address: about for address, about in workers.items() if address not in self._unfit}
        if workers and not fit:
            raise Stopped("no machine is left to work on: " + next(iter(self._unfit.values())))
        self._take_back(workers)
        threads = sum(about["nthreads"] for about in fit.values()) or 1
        # A row that does kill its worker should have no other row beside it.
        most = max(1, len(fit) // 2) if self._alone else _AHEAD * threads
        while len(self._in_work) < most:
            if self._alone:
                group = [self._suspects.popleft()] if self._suspects else []
            else:
                group = self._again.popleft() if self._again else self._groups.next(threads)
            if not group:
                return
            where = {"workers": list(fit), "allow_other_workers": False} if len(fit) < len(workers) else {}
            future = self._client.submit(
                self._task, self._job, [self._told(row) for row in group],
                key=f"pictures-{self._run}-{next(self._numbers)}", pure=False, **where)
            self._in_work[future] = group
            if where:
                self._bound[future] = set(fit)
            self._results.add(future)

    def _take_back(self, workers):
        """Takes back groups whose workers have all gone. Restarted workers have other addresses, so Dask would wait."""
        for future in [one for one, bound in self._bound.items() if not bound & workers.keys()]:
            del self._bound[future]
            group = self._in_work.pop(future, None)
            if group:
                (self._suspects.extend if self._alone else self._again.append)(group)
                future.cancel()

    def _take(self, future, result):
        group = self._in_work.pop(future)
        if future.status == "finished":
            self._take_answers(group, result)
        elif future.status == "error":
            error = result[1]
            if type(error).__name__ != "KilledWorker":
                raise BatchFailure(f"a worker can't do its work: {error!r}")
            if self._alone:
                self._answered(group[0], "aside", "its workers died", 0.0, 0, "")
            self._suspects.extend([] if self._alone else group)
        else:
            self._in_work[future] = group
            raise Stopped("the scheduler has ended")

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
            self._answered(row, "failed" if message else "done", message, seconds, pixels, machine)


@contextlib.contextmanager
def workers_of(client, count):
    """Yields (client, None) or, without a client, the client and the cluster of `count` new workers on this machine."""
    # Workers are sent the functions themselves, so that this package needn't be installed there.
    import cloudpickle

    cloudpickle.register_pickle_by_value(worker)
    if client:
        yield client, None
        return
    import dask
    from distributed import Client, LocalCluster

    # A task that kills two workers is given up. Profiles are useless for tasks that only wait for a command.
    dask.config.set({"distributed.scheduler.allowed-failures": 1, "distributed.worker.profile.interval": "1s",
                     "distributed.worker.profile.cycle": "10s",
                     # A very busy machine may take long to restart a worker.
                     "distributed.comm.timeouts.connect": "120s"})
    cluster = LocalCluster(n_workers=count, threads_per_worker=1, dashboard_address="127.0.0.1:0",
                           silence_logs="CRITICAL")
    own = Client(cluster)
    try:
        yield own, cluster
        # A worker that is just restarting would complain that the scheduler is gone.
        with contextlib.suppress(TimeoutError):
            own.wait_for_workers(count, timeout=20)
    finally:
        own.close()
        with contextlib.suppress(TimeoutError):
            cluster.close(timeout=5)
