"""Runs work on a thread of its own, so that the main thread can show progress and be interrupted."""

import ctypes
import sys
import threading

from ._library import library

_PATIENCE = 0.15  # seconds that an interrupted piece of work gets to end
_COMMIT_PATIENCE = 10.0  # the same while it moves files to their places
_LOOK = 0.1  # seconds between two looks at the progress


class Task:
    """A piece of work that can be aborted and tells how far it is."""

    def __init__(self):
        self.abort = ctypes.c_uint8(0)
        self.progress = ctypes.c_double(0.0)
        self.is_committing = False
        self._lock = threading.Lock()
        self._done = threading.Event()
        self._result = None
        self._failure = None

    @property
    def is_aborted(self):
        """Whether the work is to end."""
        return self.abort.value == 1

    def request_abort(self):
        """Asks the work to end; not once it has begun to move files to their places."""
        with self._lock:
            if not self.is_committing:
                self.abort.value = 1

    def begin_commit(self):
        """Begins to move files to their places. False where the work is to end instead."""
        with self._lock:
            if self.is_aborted:
                return False
            self.is_committing = True
            return True

    def _run(self, work):
        try:
            self._result = work(self)
        except BaseException as failure:  # the thread that waits raises it
            self._failure = failure
        finally:
            self._done.set()

    def _take(self):
        if self._failure is not None:
            raise self._failure
        return self._result


class _Running:
    """The tasks that run, for the end of the interpreter."""

    def __init__(self):
        self._lock = threading.Lock()
        self._tasks = set()

    def add(self, task):
        """Counts a task among those that run."""
        with self._lock:
            self._tasks.add(task)

    def remove(self, task):
        """Takes it out again."""
        with self._lock:
            self._tasks.discard(task)

    def end(self):
        """Aborts all tasks, and waits a while for them."""
        with self._lock:
            tasks = list(self._tasks)
        for task in tasks:
            task.request_abort()
        for task in tasks:
            task._done.wait(_COMMIT_PATIENCE)


_running = _Running()
library.before_end.append(_running.end)


class _Bar:
    """Shows the progress of a task: by tqdm, where it is installed, or through a function."""

    def __init__(self, wanted, label):
        self._tell = wanted if callable(wanted) else None
        self._bar = None
        if wanted and self._tell is None:
            try:
                from tqdm.auto import tqdm
            except ImportError:
                return
            try:
                self._bar = self._open(tqdm, label)
            except ImportError:  # of the widgets in a notebook
                from tqdm import tqdm as plain

                self._bar = self._open(plain, label)

    @staticmethod
    def _open(tqdm, label):
        return tqdm(total=100, desc=label, unit="%", file=sys.stderr, leave=False,
                    bar_format="{desc}: {percentage:3.0f}%|{bar}| {elapsed}<{remaining}")

    def show(self, fraction):
        """Shows a fraction from 0 to 1."""
        if self._tell is not None:
            self._tell(fraction)
        elif self._bar is not None:
            self._bar.update(round(100 * fraction) - self._bar.n)

    def close(self):
        """Takes the bar away."""
        if self._bar is not None:
            self._bar.close()


def watch(work, progress=False, label=""):
    """Runs `work(task)` and gives what it gives.

    On the main thread the work has a thread of its own: an interrupt (Ctrl-C) aborts it and comes
    out within a fifth of a second, whether it has ended by then or not. It has to look at
    task.is_aborted before it leaves anything behind. On other threads, which no interrupt reaches,
    it runs at once where no progress is asked for.

    Args:
        progress: True for a bar of tqdm, or a function that gets the fraction done.
        label: stands in front of the bar.
    """
    task = Task()
    _running.add(task)
    if threading.current_thread() is not threading.main_thread() and not progress:
        try:
            return work(task)
        finally:
            task._done.set()
            _running.remove(task)

    def run():
        try:
            task._run(work)
        finally:
            _running.remove(task)

    bar = None
    try:
        threading.Thread(target=run, name="vexg", daemon=True).start()
        if progress:
            bar = _Bar(progress, label)
        while not task._done.wait(_LOOK):
            if bar is not None:
                bar.show(task.progress.value)
        if bar is not None:
            bar.show(1.0)
    except BaseException:
        task.request_abort()
        task._done.wait(_COMMIT_PATIENCE if task.is_committing else _PATIENCE)
        raise
    finally:
        if bar is not None:
            bar.close()
    return task._take()
