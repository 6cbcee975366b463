"""What a worker does with a group of images. This module is sent to the workers along with the work, so that they need
nothing but Dask and the command picturezor; it therefore uses only the standard library and Dask."""

import errno
import os
import shutil
import signal
import socket
import subprocess
import time

# Faults of the machine, not of the image: another machine may succeed.
MACHINE_FAULTS = ("No space left on device", "Disk quota exceeded", "Read-only file system", "no space left for",
                  "setpriv: failed to execute")
# The source, which the batch itself could see, is missing here or can't be read.
SOURCE_FAULTS = ("No such file or directory", "Stale file handle", "Input/output error")


def threads_of(commands):
    """The number of threads for each of so many commands that run at once, 1 to 32."""
    return min(32, max(1, len(os.sched_getaffinity(0)) // commands))


def _guarded(command):
    """The command line of a process that ends with its worker, even if the worker is killed."""
    return (["setpriv", "--pdeathsig", "TERM"] if shutil.which("setpriv") else []) + command


def last_words(said, code):
    """Returns why a command ended, from its standard error and its exit code."""
    lines = said.decode(errors="replace").strip().splitlines()
    if lines:
        return lines[-1].removeprefix("picturezor: ")
    if code < 0:
        return f"the command was ended by signal {-code} ({signal.strsignal(-code)})"
    return f"the command ended with code {code}"


class _Command:
    """A process of the command picturezor, which is given one pair of names after another. An image that crashes it
    affects no other process."""

    def __init__(self, job, memory, threads):
        # An unnamed file, which the child process opens as its file of steps.
        steps = os.memfd_create("steps")
        self._errors = os.memfd_create("errors")
        self._told = b""
        try:
            os.write(steps, job["steps"])
            arguments = _guarded([job["command"], "run", "--pairs", "-", "--steps", f"/dev/fd/{steps}", "--quiet",
                                  "--threads", str(threads), *job["writing"]])
            if memory:
                arguments += ["--memory-limit", str(memory)]
            if job["temp_dir"]:
                arguments += ["--temp-dir", job["temp_dir"]]
            # In a session of its own, so that Ctrl-C reaches only the batch.
            self._process = subprocess.Popen(
                arguments, stdin=subprocess.PIPE, stdout=subprocess.PIPE, stderr=self._errors, pass_fds=[steps],
                cwd=job["directory"], start_new_session=True, env={**os.environ, "LC_ALL": "C"})
        except BaseException:
            os.close(self._errors)
            raise
        finally:
            os.close(steps)

    def send(self, source, target):
        """Sends the names of the next image, while earlier ones may still be in progress. Raises EOFError with the
        reason if the process has ended."""
        try:
            self._process.stdin.write(source + b"\0" + target + b"\0")
            self._process.stdin.flush()
        except BrokenPipeError:
            raise EOFError(self._last_words()) from None

    def answer(self):
        """Waits for the first image that isn't answered yet. Returns (its number of pixels, ""), or (0, the error
        message). Raises EOFError with the reason if the process ended while it worked on that image."""
        while b"\0" not in self._told:
            part = os.read(self._process.stdout.fileno(), 1 << 16)
            if not part:
                raise EOFError(self._last_words())
            self._told += part
        answer, _, self._told = self._told.partition(b"\0")
        word, _, rest = answer.partition(b" ")
        if word != b"done":
            return 0, os.fsdecode(rest)
        width, height = rest.split()
        return int(width) * int(height), ""

    def _last_words(self):
        code = self._process.wait()
        return last_words(os.pread(self._errors, 1 << 12, 0), code)

    def close(self):
        try:
            self._process.stdin.close()
        except BrokenPipeError:
            pass
        self._process.stdout.close()
        self._process.wait()
        os.close(self._errors)


def _machine_fault(message, source, target):
    if any(fault in message for fault in MACHINE_FAULTS):
        return message
    for name in (source, target):
        if not os.path.isdir(os.path.dirname(name)):
            return f"{os.fsdecode(os.path.dirname(name))}: not on this machine"
    return ""


def _directory_faults(target):
    """Makes a result's directory. Returns the error message for this result, and that for this machine; both are empty
    on success."""
    try:
        os.makedirs(os.path.dirname(target), exist_ok=True)
    except OSError as error:
        if error.errno in (errno.EEXIST, errno.ENOTDIR, errno.ENAMETOOLONG):
            return str(error), ""
        return "", str(error)
    return "", ""


def make_group(job, pairs):
    """Processes the images of `pairs`, (source, target) as bytes, one after another. Returns a dict: "machine" is the
    host name, "worker" the worker's address, "answers" has (message, seconds, pixels) for each image, the message
    empty on success, and "fault" says why this machine can't continue, or is empty. After a fault, the images without
    an answer must be made elsewhere."""
    from distributed import get_worker

    worker = get_worker()
    worker_threads = worker.state.nthreads
    limit = job["memory_limit"] or worker.memory_manager.memory_limit
    threads = job["threads"] or threads_of(worker_threads)
    answers, fault, command, sent = [], "", None, 0
    try:
        for number, (source, target) in enumerate(pairs):
            start = time.perf_counter()
            pixels = 0
            if not command:
                sent = number
            if sent == number:
                message, fault = _directory_faults(target)
                if fault:
                    break
                if message:
                    answers.append((message, time.perf_counter() - start, 0))
                    sent += 1
                    continue
            try:
                command = command or _Command(job, limit and limit // worker_threads, threads)
                if sent == number:
                    command.send(source, target)
                    sent += 1
                # It works on the next image while its answer for this one is processed.
                if sent == number + 1 < len(pairs) and not any(_directory_faults(pairs[sent][1])):
                    command.send(*pairs[sent])
                    sent += 1
                pixels, message = command.answer()
            except EOFError as end:
                message = str(end)
                command.close()
                command = None
            except OSError as error:
                fault = str(error)
                break
            fault = message and _machine_fault(message, source, target)
            if fault:
                break
            answers.append((message, time.perf_counter() - start, pixels))
    finally:
        if command:
            command.close()
    return {"machine": socket.gethostname(), "worker": worker.address, "answers": answers, "fault": fault}


def make_parts(job, numbers):
    """Makes parts of an image pyramid; the number 0 completes the pyramid. Returns the same as make_group."""
    from distributed import get_worker

    worker = get_worker()
    worker_threads = worker.state.nthreads
    memory = job["memory_limit"] or worker.memory_manager.memory_limit
    memory = ["--memory-limit", str(memory // worker_threads)] if memory else []
    answers, fault = [], ""
    for number in numbers:
        start = time.perf_counter()
        if number:
            share = ["--part", f"{number}/{job['parts']}"]
        else:
            share = ["--join", str(job["parts"]), *job["at_the_end"]]
        # No other part is in progress when the pyramid is completed.
        threads = (job["threads"] or threads_of(worker_threads)) if number else threads_of(1)
        try:
            done = subprocess.run(
                _guarded([job["command"], "tiles", job["source"], "-o", job["target"], "--quiet", "--threads",
                          str(threads), *share, *memory, *job["options"]]),
                stdin=subprocess.DEVNULL, stdout=subprocess.DEVNULL, stderr=subprocess.PIPE, cwd=job["directory"],
                start_new_session=True, env={**os.environ, "LC_ALL": "C"})
        except OSError as error:
            fault = str(error)
            break
        message = last_words(done.stderr, done.returncode) if done.returncode else ""
        if number == 0 and "it is there already" in message and not os.path.exists(job["target"] + b".unfinished"):
            # The worker that had completed it died before it could say so.
            message = ""
        if any(fault in message for fault in SOURCE_FAULTS):
            fault = message
        else:
            fault = message and _machine_fault(message, job["source"], job["target"])
        if fault:
            break
        answers.append((message, time.perf_counter() - start, 0))
    return {"machine": socket.gethostname(), "worker": worker.address, "answers": answers, "fault": fault}
