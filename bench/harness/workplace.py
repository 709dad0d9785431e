"""The folder that is measured in: a kept database, copied to where library and floor look for it.

Works inside scripts/private-root, whose /usr/tuvo lies in memory, where an fsync costs nothing. So a
folder on a real disk is laid over the data folder. It is none of the build's: the scripts that build
give all of that folder back to its owner, and the library would find a database of root's.
"""

import contextlib
import fcntl
import hashlib
import os
import pathlib
import shutil
import subprocess
import sys
import tempfile

PROJECT = pathlib.Path(__file__).resolve().parents[2]
SESSION = pathlib.Path("/usr/tuvo/etc/private/session")
SYSTEM = 1  # uid and gid


class Workplace:
    def __init__(self, build):
        self.build = build.resolve()
        self.programs = self.build / "bench"
        self._data = self.build / "data"

    @contextlib.contextmanager
    def mounted(self):
        """Has the folder on the disk in place, for one at a time."""
        self._data.mkdir(parents=True, exist_ok=True)
        with open(self._data / "in-use", "w", encoding="utf-8") as lock:
            try:
                fcntl.flock(lock, fcntl.LOCK_EX | fcntl.LOCK_NB)
            except BlockingIOError:
                sys.exit(f"another scripts/bench is measuring in {self.build}")
            with tempfile.TemporaryDirectory(prefix="tuvo-bench-", dir="/var/tmp") as disk:
                os.chmod(disk, 0o711)
                os.chown(disk, SYSTEM, SYSTEM)
                subprocess.run(["mount", "--bind", disk, SESSION], check=True)
                try:
                    self._make_auto_block()
                    yield self
                finally:
                    subprocess.run(["umount", SESSION], check=True)

    def lay_out(self, links, expired=0):
        """Puts a fresh copy of the database of that size in place."""
        self._remove_database()
        target = SESSION / "sharing.db"
        shutil.copyfile(self._kept(links, expired), target)
        os.chown(target, SYSTEM, SYSTEM)
        os.chmod(target, 0o660)
        # What the copy still has to write would be written while something is measured.
        os.sync()

    def _kept(self, links, expired):
        path = self._data / f"{links}-{expired}-{self._stamp()}.db"
        if not path.exists():
            for old in self._data.glob(f"{links}-{expired}-*"):
                old.unlink()
            print(f"making the database of {links} + {expired} links", flush=True)
            unfinished = path.with_suffix(".new")
            subprocess.run([self.programs / "bench_make_data", unfinished, PROJECT / "schema",
                            str(links), str(expired)], check=True)
            unfinished.rename(path)
        return path

    @staticmethod
    def _stamp():
        """Another one whenever the content would be another."""
        digest = hashlib.sha256()
        for name in ("bench/common/content.c", "bench/common/content.h",
                     "bench/data/make_data.c", "schema/1.sql", "schema/2.sql"):
            digest.update((PROJECT / name).read_bytes())
        return digest.hexdigest()[:12]

    def _make_auto_block(self):
        """The first login makes auto-block's file; a floor's would find none."""
        self.lay_out(1000)
        subprocess.run([self.programs / "bench_library", "login_open", "1000", "1", "0", "0"],
                       check=True, stdout=subprocess.DEVNULL)

    @staticmethod
    def _remove_database():
        for path in SESSION.glob("sharing.db*"):
            path.unlink()
