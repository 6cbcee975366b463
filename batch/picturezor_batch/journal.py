"""Records what a batch has done and has to do, in one SQLite file."""

import os
import sqlite3
import time
from contextlib import contextmanager

from .failures import BatchFailure

_VERSION = 1
_TABLES = """
CREATE TABLE IF NOT EXISTS results (
  target PRIMARY KEY, input NOT NULL, size INTEGER, time INTEGER, recipe TEXT NOT NULL, result TEXT NOT NULL,
  message TEXT NOT NULL, seconds REAL NOT NULL, pixels INTEGER NOT NULL, machine TEXT NOT NULL) WITHOUT ROWID;
CREATE TEMP TABLE plan (
  number INTEGER PRIMARY KEY, input UNIQUE NOT NULL, target UNIQUE NOT NULL, size INTEGER, time INTEGER,
  state TEXT NOT NULL, message TEXT NOT NULL DEFAULT '');
"""


def _stored(name):
    """A file name as text if it is valid UTF-8, so that the journal can be read; otherwise as bytes."""
    try:
        return name.decode()
    except UnicodeDecodeError:
        return name


def _bytes(stored):
    return stored.encode() if isinstance(stored, str) else stored


class Journal:
    """The journal file, locked for other processes until it is closed. Results are written when more than half a second
    has passed since the last write, and at the end.

    The table `results` has one row for each target. `input` and `target` are absolute names, `size` and `time` are the
    input's size in bytes and its modification time in nanoseconds, `recipe` is the hash of the steps and of the
    options for writing, `result` is done, failed or aside (given up because its workers died), `seconds` is the time
    that a worker took, and `pixels` is the number of pixels of the input."""

    def __init__(self, file):
        self.file = os.fspath(file)
        self._waiting, self._written = [], time.monotonic()
        with self._failures():
            self._base = sqlite3.connect(self.file, timeout=0, isolation_level=None)
            self._base.execute("PRAGMA locking_mode = EXCLUSIVE")
            self._base.execute("BEGIN IMMEDIATE")
            version = self._base.execute("PRAGMA user_version").fetchone()[0]
            if version not in (0, _VERSION):
                raise BatchFailure(f"{self.file}: made by another version of this program")
            self._base.execute(f"PRAGMA user_version = {_VERSION}")
            self._base.execute("COMMIT")
            self._base.executescript(_TABLES)
            self._base.create_function("stands", 1, lambda name: os.path.exists(_bytes(name)))

    @contextmanager
    def _failures(self):
        try:
            yield
        except sqlite3.OperationalError as error:
            if "locked" in str(error):
                raise BatchFailure(f"{self.file}: another batch is using it") from None
            raise BatchFailure(f"{self.file}: {error}") from None
        except sqlite3.DatabaseError as error:
            raise BatchFailure(f"{self.file}: {error}") from None

    def plan(self, pairs):
        """Stores the plan: (input, target, size, time, message) for each image. Names are absolute, as bytes; message
        says why an input can't be processed, or is empty. An input that is given twice counts once. Raises
        BatchFailure for two inputs with the same target, and for a target that is an input."""
        with self._failures():
            self._base.execute("BEGIN")
            for source, target, size, changed, message in pairs:
                row = (_stored(source), _stored(target), size, changed, "failed" if message else "to do", message)
                try:
                    self._base.execute("INSERT INTO plan (input, target, size, time, state, message) "
                                       "VALUES (?, ?, ?, ?, ?, ?) ON CONFLICT (input) DO NOTHING", row)
                except sqlite3.IntegrityError:
                    other, = self._base.execute("SELECT input FROM plan WHERE target = ?", (row[1],)).fetchone()
                    raise BatchFailure(f"{os.fsdecode(source)}: its result would have the name of that of "
                                       f"{os.fsdecode(_bytes(other))}: {os.fsdecode(target)}") from None
            self._base.execute("COMMIT")
            taken = self._base.execute("SELECT input FROM plan WHERE input IN (SELECT target FROM plan)").fetchone()
        if taken:
            raise BatchFailure(f"{os.fsdecode(_bytes(taken[0]))}: it would be overwritten by a result")

    def settle(self, recipe, redo):
        """Marks the images of the plan that are done already as skipped. Without `redo`, returns the number of results
        that were made by another recipe, and if there are any, marks nothing; with `redo`, these are made again, and
        0 is returned."""
        same = ("FROM results r WHERE r.target = plan.target AND r.input = plan.input AND r.result = 'done' "
                "AND r.size = plan.size AND r.time = plan.time AND stands(plan.target)")
        with self._failures():
            if not redo:
                changed = self._base.execute(
                    f"SELECT count(*) FROM plan WHERE EXISTS (SELECT 1 {same} AND r.recipe != ?)",
                    (recipe,)).fetchone()[0]
                if changed:
                    return changed
            self._base.execute(f"UPDATE plan SET state = 'skipped' WHERE EXISTS (SELECT 1 {same} AND r.recipe = ?)",
                               (recipe,))
            self._base.execute("INSERT OR REPLACE INTO results SELECT target, input, size, time, ?, 'failed', "
                               "message, 0, 0, '' FROM plan WHERE state = 'failed'", (recipe,))
        return 0

    def count(self, state):
        """Counts the inputs of the plan in a state: 'to do', 'skipped', or 'failed' (before any work)."""
        return self._base.execute("SELECT count(*) FROM plan WHERE state = ?", (state,)).fetchone()[0]

    def weight(self):
        """The total size in bytes of the inputs that are to do."""
        return self._base.execute("SELECT total(size) FROM plan WHERE state = 'to do'").fetchone()[0]

    def failed_before(self):
        """Yields (input, message) of the inputs that failed before any work."""
        for source, message in self._base.execute("SELECT input, message FROM plan WHERE state = 'failed'"):
            yield _bytes(source), message

    def to_do(self):
        """Yields (input, target, size, time) of the images that are to do. Results may be written in the meantime."""
        last, rows = 0, True
        while rows:
            rows = self._base.execute("SELECT number, input, target, size, time FROM plan WHERE number > ? "
                                      "AND state = 'to do' ORDER BY number LIMIT 1000", (last,)).fetchall()
            for last, source, target, size, changed in rows:
                yield _bytes(source), _bytes(target), size, changed

    def write(self, row, recipe, result, message, seconds, pixels, machine):
        """Records the result of a row of to_do."""
        source, target, size, changed = row
        self._waiting.append((_stored(target), _stored(source), size, changed, recipe, result,
                              message.encode(errors="backslashreplace").decode(), seconds, pixels, machine))
        if time.monotonic() - self._written > 0.5:
            self.flush()

    def flush(self):
        with self._failures():
            self._base.execute("BEGIN")
            self._base.executemany("INSERT OR REPLACE INTO results VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?, ?)", self._waiting)
            self._base.execute("COMMIT")
        self._waiting.clear()
        self._written = time.monotonic()

    def sample(self, number):
        """Returns the targets of up to `number` results of the plan, evenly chosen among all that are done."""
        done = "FROM plan p JOIN results r USING (target) WHERE r.result = 'done'"
        total = self._base.execute(f"SELECT count(*) {done}").fetchone()[0]
        step = max(1, -(-total // number))
        standing = self._base.execute(f"SELECT target {done} ORDER BY p.number")
        return [_bytes(target) for at, (target,) in enumerate(standing) if at % step == 0]

    def close(self):
        try:
            if self._waiting:
                self.flush()
        finally:
            self._base.close()
