"""The web server's side of FastCGI, and a spawner of FastCGI programs, for tests that must say what
a web server would not: half a body, a connection that breaks, an address of their own."""

import os
import socket
import struct
import subprocess
import time

BEGIN, END, PARAMS, STDIN, STDOUT, STDERR = 1, 3, 4, 5, 6, 7
RESPONDER = 1
KEEP_CONNECTION = 1
WWW_DATA = 33


def record(kind, content=b"", request=1):
    return struct.pack(">BBHHBx", 1, kind, request, len(content), 0) + content


def _length(size):
    return struct.pack(">B", size) if size < 128 else struct.pack(">L", size | 1 << 31)


def _params(variables):
    return b"".join(_length(len(name)) + _length(len(value)) + name + value
                    for name, value in ((n.encode(), v.encode()) for n, v in variables.items()))


class Spawned:
    """A program that listens, for the lifetime of a `with`."""

    def __init__(self, program, uid, groups=(), path="/tmp/program.sock", family=socket.AF_UNIX):
        self.command, self.uid, self.groups = [program], uid, list(groups)
        self.path, self.family = path, family

    def __enter__(self):
        listening = socket.socket(self.family, socket.SOCK_STREAM)
        if self.family == socket.AF_UNIX:
            if os.path.lexists(self.path):
                os.unlink(self.path)
            listening.bind(self.path)
            os.chmod(self.path, 0o666)
        else:
            listening.bind(("127.0.0.1", 0))
        listening.listen(64)
        environment = {"TZ": "/tmp/zone", "REMOTE_ADDR": "192.0.2.98",
                       "LIBFCGI_IS_AF_UNIX_KEEPER_POLL_TIMEOUT": "0"}  # nothing of it may count
        if self.uid != 1:
            # Of a build with sanitizers: the leak check cannot look into a process of mixed ids.
            environment["ASAN_OPTIONS"] = "detect_leaks=0"
        self.process = subprocess.Popen(self.command, stdin=listening, env=environment,
                                        user=self.uid, group=self.uid, extra_groups=self.groups)
        listening.close()
        return self

    def __exit__(self, *_):
        if self.process.poll() is None:
            self.process.terminate()
        try:
            self.process.wait(120)
        except subprocess.TimeoutExpired:
            self.process.kill()
            raise

    @property
    def pid(self):
        return self.process.pid

    def status(self, name):
        with open(f"/proc/{self.pid}/status") as lines:
            return next(line.split(":", 1)[1].split() for line in lines
                        if line.startswith(name + ":"))

    def memory(self):
        """Kilobytes that are in memory."""
        return int(self.status("VmRSS")[0])

    def descriptors(self):
        """Of a program at rest: the last connection may be about to be closed."""
        counts = []
        for _ in range(10):
            counts.append(len(os.listdir(f"/proc/{self.pid}/fd")))
            time.sleep(0.05)
        return min(counts)

    def connect(self):
        connection = socket.socket(socket.AF_UNIX, socket.SOCK_STREAM)
        connection.settimeout(60)
        connection.connect(self.path)
        return connection

    def begin(self, variables, keep=False, connection=None):
        """A connection with a request on it whose body is yet to come."""
        connection = connection or self.connect()
        begin = struct.pack(">HB5x", RESPONDER, KEEP_CONNECTION if keep else 0)
        connection.sendall(record(BEGIN, begin))
        _send(connection, PARAMS, _params(variables))
        return connection

    def request(self, variables, body=b"", keep=False):
        """One whole request; (the answer's bytes, whether its end came)."""
        with self.begin(variables, keep) as connection:
            send_body(connection, body)
            return receive(connection)


def send_body(connection, body):
    _send(connection, STDIN, body)


def _send(connection, kind, content):
    for start in range(0, len(content), 60000):
        connection.sendall(record(kind, content[start:start + 60000]))
    connection.sendall(record(kind))


def _exactly(connection, size):
    data = b""
    while len(data) < size:
        piece = connection.recv(size - len(data))
        if not piece:
            return None
        data += piece
    return data


def receive(connection):
    """The answer on a connection; whether its end came. Then the program must close it."""
    answer, ended = b"", False
    while True:
        header = _exactly(connection, 8)
        if header is None:
            return answer, ended
        kind, length, padding = struct.unpack(">xB2xHBx", header)
        content = _exactly(connection, length + padding)
        if content is None:
            return answer, False
        if kind == STDOUT:
            answer += content[:length]
        elif kind == END:
            ended = True
