"""Nothing is lost when processes are killed, and nothing half stands under a target's name."""

import os
import re
import shutil
import signal
import subprocess

import pytest
from conftest import COMMAND, wait_for
from distributed import Client

# Stands for the command. The first picture of its name waits with its worker until it is let go; with POISON in its
# name it takes the worker along.
WRAPPED = """#!/usr/bin/python3
import os, pathlib, signal, subprocess, sys
if "--pairs" not in sys.argv:
    os.execv({command!r}, [{command!r}, *sys.argv[1:]])
steps = int(sys.argv[sys.argv.index("--steps") + 1].rpartition("/")[2])
real = subprocess.Popen([{command!r}, *sys.argv[1:]], stdin=subprocess.PIPE, stdout=subprocess.PIPE, pass_fds=[steps])
here = pathlib.Path({here!r})
names = b""
while part := os.read(0, 1 << 16):
    names += part
    while names.count(b"\\0") > 1:
        source, target, names = names.split(b"\\0", 2)
        if b"POISON" in source:
            os.kill(os.getppid(), signal.SIGKILL)
            sys.exit()
        if b"/in/WAIT" in source and not (here / "go").exists():
            (here / "waits.part").write_text(str(os.getppid()))
            (here / "waits.part").rename(here / "waits")
            while not (here / "go").exists():
                if os.getppid() == 1:
                    sys.exit()
                signal.sigtimedwait([], 0.02)
        real.stdin.write(source + b"\\0" + target + b"\\0")
        real.stdin.flush()
        answer = b""
        while not answer.endswith(b"\\0"):
            answer += os.read(real.stdout.fileno(), 1 << 16)
        os.write(1, answer)
"""


@pytest.fixture
def slow(batch):
    """A batch with one picture more, at whose beginning its worker waits."""
    batch.wrapped = batch.directory / "wrapped"
    batch.wrapped.write_text(WRAPPED.format(command=COMMAND, here=str(batch.directory)))
    batch.wrapped.chmod(0o755)
    batch.add("WAIT.png")
    batch.words = batch.all(command=batch.wrapped)

    def wait():
        wait_for((batch.directory / "waits").exists)
        return int((batch.directory / "waits").read_text())

    batch.wait, batch.let_go = wait, (batch.directory / "go").touch
    return batch


def finished(process):
    out, error = process.communicate(timeout=400)
    return process.returncode, out.decode(), error.decode()


class Cluster:
    """A scheduler, and workers with one hand each, as processes of their own."""

    def __init__(self, batch, before=((), ())):
        """`before` are the words that start each worker's program, before its own."""
        self.batch = batch
        self.scheduler = batch.process(["dask-scheduler", "--host", "127.0.0.1", "--port", "0", "--no-dashboard",
                                        "--scheduler-file", "scheduler.json"],
                                       stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
        file = batch.directory / "scheduler.json"
        wait_for(lambda: file.exists() and "address" in file.read_text())
        self.address = re.search(r"tcp://[\d.:]+", file.read_text())[0]
        file.unlink()
        self.workers = [
            batch.process([*words, "dask-worker", self.address, "--nthreads", "1", "--no-dashboard", "--no-nanny",
                           "--local-directory", str(batch.directory / f"worker{number}")],
                          stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
            for number, words in enumerate(before)]
        # A batch ends where the only worker that is there yet can't work.
        with Client(self.address) as client:
            client.wait_for_workers(len(before), timeout=300)

    def end(self):
        for process in [*self.workers, self.scheduler]:
            process.kill()
            process.wait()


def test_a_killed_worker_takes_nothing_along(slow):
    work = slow.start(*slow.words)
    os.kill(slow.wait(), signal.SIGKILL)
    slow.let_go()
    assert finished(work)[0] == 0 and slow.results() == slow.expected


# Catches a journal that is written at the end alone, and one that a killed batch keeps locked.
@pytest.mark.parametrize("by, code", [(signal.SIGKILL, -9), (signal.SIGINT, 130), (signal.SIGTERM, 130)])
def test_a_batch_that_is_ended_goes_on_the_next_time(slow, by, code):
    work = slow.start(*slow.words, "--workers", "2")
    slow.wait()
    wait_for(lambda: len(slow.results()) >= 3)
    work.send_signal(by)
    assert finished(work)[0] == code
    assert slow.results().items() <= slow.expected.items()
    places = {file: file.stat().st_ino for file in (slow.directory / "out").glob("*.png")}
    slow.let_go()
    code, out, error = finished(slow.start(*slow.words))
    done, before = map(int, re.match(r"(\d+) done, (\d+) done before", out).groups())
    assert code == 0 and done + before == 21 and slow.results() == slow.expected
    if by != signal.SIGKILL:
        assert sum(file.stat().st_ino == place for file, place in places.items()) >= before > 0


def test_without_its_scheduler_it_ends_and_goes_on_with_another(slow):
    first = Cluster(slow)
    work = slow.start(*slow.words, "--scheduler", first.address)
    slow.wait()
    first.scheduler.kill()
    code, out, error = finished(work)
    assert code == 2 and "the scheduler has ended; the next run continues" in error
    assert slow.results().items() <= slow.expected.items()
    first.end()
    slow.let_go()
    second = Cluster(slow)
    assert finished(slow.start(*slow.words, "--scheduler", second.address))[0] == 0
    assert slow.results() == slow.expected
    second.end()


# Catches a batch that ends for it, one that goes on killing, and innocents that share its fate.
def test_a_picture_that_kills_its_workers_is_set_aside(slow):
    shutil.copy(slow.directory / "in/0.png", slow.directory / "in/POISON.png")
    slow.let_go()
    code, out, error = finished(slow.start(*slow.words))
    assert code == 2 and out.startswith("21 done, 0 done before, 1 failed") and slow.results() == slow.expected
    assert len(error.splitlines()) == 1 and "in/POISON.png: its workers died, so it is set aside" in error


def private_disk(directory):
    """Words that start a program for which a directory is a full disk."""
    return ["unshare", "-rm", "sh", "-c", f'mount -t tmpfs -o size=4k none "{directory}" && exec "$@"', "sh"]


# Catches a worker that fails fast and so gets all the work.
def test_a_full_disk_is_left_to_itself(batch):
    out = batch.directory / "out"
    out.mkdir()
    if subprocess.run([*private_disk(out), "true"], capture_output=True).returncode != 0:
        pytest.skip("no file systems of one's own here")
    cluster = Cluster(batch, [private_disk(out), ()])
    assert "20 done" in batch.run(*batch.all("--scheduler", cluster.address))[0]
    assert batch.results() == batch.expected
    cluster.end()

    shutil.rmtree(out)
    out.mkdir()
    cluster = Cluster(batch, [private_disk(out)])
    error = batch.run(*batch.all("--scheduler", cluster.address), code=2)[1]
    assert "no machine is left to work on" in error and "No space left on device" in error
    assert batch.results() == {}
    cluster.end()


# Catches a result of a crash that is taken for one, and neighbours in its group that aren't made.
def test_a_crash_is_the_pictures_own(batch):
    crashing = batch.directory / "crashing"
    crashing.write_text(WRAPPED.format(command=COMMAND, here=str(batch.directory))
                        .replace("os.getppid(), signal.SIGKILL", "os.getpid(), signal.SIGSEGV"))
    crashing.chmod(0o755)
    shutil.copy(batch.directory / "in/0.png", batch.directory / "in/POISON.png")
    out, error = batch.run(*batch.all(command=crashing), code=2)
    assert out.startswith("20 done, 0 done before, 1 failed") and batch.results() == batch.expected
    assert "in/POISON.png: the command was ended by signal 11" in error
