"""What processes cost, read from /proc."""

import os
import re
import threading

_TICK = os.sysconf("SC_CLK_TCK")


def _stat(pid):
    """The fields of a process behind its name: state, parent, …; None when it is gone."""
    try:
        with open(f"/proc/{pid}/stat") as file:
            return file.read().rpartition(")")[2].split()
    except (FileNotFoundError, ProcessLookupError):
        return None


def descendants(root):
    """A process and all below it."""
    parents = {}
    for name in os.listdir("/proc"):
        fields = _stat(name) if name.isdigit() else None
        if fields:
            parents.setdefault(int(fields[1]), []).append(int(name))
    found = [root]
    for pid in found:
        found += parents.get(pid, [])
    return found


def command(pid):
    try:
        with open(f"/proc/{pid}/comm") as file:
            return file.read().strip()
    except (FileNotFoundError, ProcessLookupError):
        return None


def cpu_seconds(roots):
    """User and system time of processes, of all below them, and of those that have ended there."""
    ticks = 0
    for root in roots:
        for pid in descendants(root):
            fields = _stat(pid)
            if fields:
                ticks += sum(int(field) for field in fields[11:15])
    return ticks / _TICK


def pss_kib(pid):
    """A process's share of memory: its own pages, and its part of those that it shares."""
    try:
        with open(f"/proc/{pid}/smaps_rollup") as file:
            return int(re.search(r"^Pss:\s+(\d+)", file.read(), re.MULTILINE).group(1))
    except (FileNotFoundError, ProcessLookupError, AttributeError):
        return None


class MemoryWatch:
    """The largest share of memory of any worker, for the lifetime of a `with`."""

    def __init__(self, workers, every=0.05):
        self.largest = 0
        self._workers = workers
        self._every = every
        self._end = threading.Event()
        self._thread = threading.Thread(target=self._watch, daemon=True)

    def _watch(self):
        while not self._end.wait(self._every):
            for pid in self._workers():
                self.largest = max(self.largest, pss_kib(pid) or 0)

    def __enter__(self):
        self._thread.start()
        return self

    def __exit__(self, *_):
        self._end.set()
        self._thread.join()
