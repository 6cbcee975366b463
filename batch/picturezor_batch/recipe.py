"""The steps of a batch."""

import hashlib
import os
import subprocess

from .failures import BatchFailure, UsageFailure


class Recipe:
    """The steps, in the form that `picturezor run --steps` takes, and how results are written. `steps` is their text,
    or an os.PathLike of a file that holds it; `writing` has options of `picturezor run`, such as ["--quality", "80"].
    Raises UsageFailure if the file can't be read."""

    def __init__(self, steps, writing=()):
        self.name = os.fspath(steps) if isinstance(steps, os.PathLike) else "recipe"
        if isinstance(steps, os.PathLike):
            try:
                with open(steps, "rb") as file:
                    self.text = file.read()
            except OSError as error:
                raise UsageFailure(f"{self.name}: {error.strerror}") from None
        else:
            self.text = os.fsencode(steps)
        self.writing = list(writing)

    @property
    def hash(self):
        """A hash of the steps and options. Blank lines, and lines that hold only a comment, don't count."""
        lines = [line.strip() for line in self.text.splitlines()]
        whole = [line for line in lines if line and not line.startswith(b"#")] + [os.fsencode(w) for w in self.writing]
        return hashlib.sha256(b"\0".join(whole)).hexdigest()

    def check(self, command, target):
        """Raises UsageFailure for a mistake in the steps, the options or the name of the results, and BatchFailure if
        the command or a file that the steps need is missing."""
        # The command reports mistakes before it looks at the image, so none is needed.
        steps = os.memfd_create("steps")
        try:
            os.write(steps, self.text)
            file = f"/dev/fd/{steps}"
            done = subprocess.run(
                [command, "run", "/dev/null", "-o", target, "--quiet", "--steps", file, *self.writing],
                stdin=subprocess.DEVNULL, stdout=subprocess.DEVNULL, stderr=subprocess.PIPE, pass_fds=[steps])
        except OSError as error:
            raise BatchFailure(f"{command}: {error.strerror}") from None
        finally:
            os.close(steps)
        message = os.fsdecode(done.stderr).strip().removeprefix("picturezor: ").replace(file, self.name)
        message = message.replace(" (see picturezor run --help)", "")
        if done.returncode == 3:
            raise UsageFailure(message)
        if "/dev/null: " not in message:
            raise BatchFailure(message or f"{command}: it ended with code {done.returncode}")
