"""The servers that are measured: the project's visitor program, and its peers. Each is for the
lifetime of a `with`, inside scripts/private-root, and has a database file and one link of its own."""

import contextlib
import itertools
import os
import shutil
import signal
import socket
import sqlite3
import subprocess
import sys
import time

import job
import processes

PROJECT = os.path.dirname(os.path.dirname(os.path.dirname(os.path.abspath(__file__))))
sys.path.insert(0, os.path.join(PROJECT, "tests/programs"))
import visitor_server as vs  # noqa: E402  (the installation that the tests have, too)

PEERS = os.path.join(PROJECT, "bench/peers")
PEERS_COPY = "/tmp/peers"  # readable for www-data wherever the project lies
DATABASES = "/tmp/databases"
_numbers = itertools.count()


@contextlib.contextmanager
def installed(build, disk, node_modules=None):
    """Installs the build, and puts all databases into folders of `disk`, which is a real one:
    /usr/tuvo and /tmp are in memory here. `node_modules` is where Node's packages are."""
    bound = []

    def bind(source, target):
        os.makedirs(target, exist_ok=True)
        subprocess.run(["mount", "--bind", source, target], check=True)
        bound.append(target)

    def bind_new(name, target, owner, mode):
        source = os.path.join(disk, name)
        os.mkdir(source)
        os.chown(source, owner, owner)
        os.chmod(source, mode)
        bind(source, target)

    try:
        bind_new("ours", os.path.dirname(vs.DATABASE), vs.SYSTEM, 0o711)
        bind_new("peers", DATABASES, vs.WWW_DATA, 0o700)
        vs.install(build, PROJECT)
        shutil.copytree(PEERS, PEERS_COPY, dirs_exist_ok=True)
        if node_modules:
            bind(node_modules, PEERS_COPY + "/node/node_modules")
        yield
    finally:
        for target in reversed(bound):
            subprocess.run(["umount", target], check=True)


class Server:
    """`roots`: the processes above all that serve. `workers()`: those that run the program itself."""

    # What is looked at in the database, as table and column; None when nobody else may.
    expiry = ("session", "expires_at"), ("token", "expires_at")

    def __init__(self, name):
        self.name = name
        self.visitor = None

    @property
    def path(self):
        return "/sharing/" + self.link

    def shorten(self, seconds, tables=("session", "token")):
        """Lets sessions, tokens or both end earlier."""
        for table, column in self.expiry:
            if table in tables:
                self._sql(f"UPDATE {table} SET {column} = {column} - ?", seconds)

    def expiries(self):
        """The ends of all sessions, and of all tokens."""
        return [[row[0] for row in self._sql(f"SELECT {column} FROM {table}")]
                for table, column in self.expiry]

    def _sql(self, statement, *values):
        connection = sqlite3.connect(self.database, timeout=30)
        try:
            with connection:
                return connection.execute(statement, values).fetchall()
        finally:
            connection.close()


class Ours(Server):
    """The visitor's program behind lighttpd with the project's configuration."""

    expiry = ("session", "timeout"), ("token", "timeout")
    database = vs.DATABASE

    def __init__(self, name, workers=None):
        """With a number of workers by FastCGI, else by CGI."""
        super().__init__(name)
        configuration = workers and vs.fastcgi_configuration(processes=workers)
        self._server = vs.WebServer(configuration)

    def __enter__(self):
        done = subprocess.run(
            ["/usr/tuvo/bin/tuvosharing", "create", "--owner", "alice", "--project", "album",
             "--uses", str(job.USES), "--no-auto-gc", "--password-stdin", "--quiet"],
            input=job.PASSWORD + "\n", stdout=subprocess.PIPE, check=True, text=True)
        self.link = done.stdout.strip()
        self._server.__enter__()
        self.port, self.roots = self._server.port, [self._server.process.pid]
        return self

    def workers(self):
        return [pid for pid in processes.descendants(self.roots[0])
                if processes.command(pid) == "sharing.cgi"]

    def __exit__(self, *_):
        started = processes.descendants(self.roots[0])[1:]
        self._server.__exit__()
        while any(processes.command(pid) for pid in started):  # they end a moment later
            time.sleep(0.02)


class Peer(Server):
    """What both stacks have in common: a small program of ours, a database made by it."""

    def __init__(self, name, workers, fold_back):
        super().__init__(name)
        self.database = f"{DATABASES}/{next(_numbers)}.db"
        self.link = "peer-link"
        self.port = vs.free_port()
        self._log = f"/tmp/peer-{self.port}.log"
        self._environment = {
            "PATH": os.environ["PATH"], "PEER_PORT": str(self.port), "PEER_LOG": self._log,
            "PEER_WORKERS": str(workers), "PEER_DATABASE": self.database,
            "PEER_FOLDER": PEERS_COPY + "/php", "PEER_SOCKET": f"/tmp/peer-{self.port}.sock",
            "PEER_FOLD_BACK": "1" if fold_back else "0", "NODE_ENV": "production"}
        self._started = []

    def _set_up(self, *command):
        subprocess.run([*command, self.database, PEERS_COPY + "/schema.sql", self.link,
                        job.PASSWORD, str(job.USES)], check=True, env=self._environment,
                       user=vs.WWW_DATA, group=vs.WWW_DATA, extra_groups=[])

    def _start(self, *command, **ids):
        with open(self._log, "a") as log:
            self._started.append(subprocess.Popen(command, env=self._environment, stdout=log,
                                                  stderr=log, stdin=subprocess.DEVNULL,
                                                  start_new_session=True, **ids))

    def _await(self, connect):
        for _ in range(400):
            try:
                connect()
                return
            except OSError:
                time.sleep(0.05)
        with open(self._log) as log:
            raise RuntimeError(f"{self.name} does not start:\n{log.read()}")

    def _await_port(self):
        self._await(lambda: socket.create_connection(("127.0.0.1", self.port)).close())

    def __enter__(self):
        try:
            self._begin()
        except BaseException:
            self.__exit__()
            raise
        return self

    def __exit__(self, *_):
        for process in reversed(self._started):
            _end_group(process)


def _end_group(leader):
    """Ends a process that leads a group, and waits for all of the group: workers outlive the process
    that started them for a moment, and write."""
    try:
        os.killpg(leader.pid, signal.SIGTERM)
        leader.wait()
        while True:
            os.killpg(leader.pid, 0)
            time.sleep(0.02)
    except ProcessLookupError:
        leader.wait()


class Php(Peer):
    """PHP under php-fpm, behind lighttpd as the visitor's program is."""

    def _begin(self):
        self._set_up("php8.2", PEERS_COPY + "/php/setup.php")
        # Production's settings: programs do not change while they run.
        self._start("php-fpm8.2", "-F", "-y", PEERS_COPY + "/php/php-fpm.conf",
                    "-d", "opcache.enable=1", "-d", "opcache.validate_timestamps=0",
                    "-d", "session.use_strict_mode=1", "-d", "session.gc_probability=0")
        self._await(lambda: os.stat(self._environment["PEER_SOCKET"]))
        self._start("/usr/sbin/lighttpd", "-D", "-f", PEERS_COPY + "/php/lighttpd.conf")
        self._await_port()
        self.roots = [process.pid for process in self._started]

    def workers(self):
        return processes.descendants(self._started[0].pid)[1:]


class Node(Peer):
    """Node with express, by itself: a web server before it would only add to its work."""

    def __init__(self, name, workers, fold_back, sqlite):
        super().__init__(name, workers, fold_back)
        self._environment["PEER_SQLITE"] = sqlite
        self._alone = workers == 1

    def _begin(self):
        folder = PEERS_COPY + "/node"
        self._set_up("node", folder + "/setup.js", self._environment["PEER_SQLITE"])
        self._start("node", folder + "/server.js", user=vs.WWW_DATA, group=vs.WWW_DATA,
                    extra_groups=[])
        self._await_port()
        if self._alone:
            self.database = None
        self.roots = [self._started[0].pid]

    def workers(self):
        below = processes.descendants(self.roots[0])[1:]
        return below or self.roots
