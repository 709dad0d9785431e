"""A private installation of the project with a web server in front of it, for the tests of the
visitor's program. Runs inside scripts/private-root, as root."""

import http.client
import json
import os
import re
import socket
import sqlite3
import subprocess
import threading
import time
import urllib.parse

PROGRAM = "/usr/tuvo/bin/sharing.cgi"
PLAIN_PROGRAM = "/usr/tuvo/bin/plain.cgi"  # the same without the set-user-id bit
OWNERS_PROGRAM = "/usr/tuvo/bin/entry.cgi"
DATABASE = "/usr/tuvo/etc/private/session/sharing.db"
PAGE = "/usr/tuvo/share/tuvosharing/web/"
WWW_DATA = 33
SYSTEM = 1
LOG_ERR = 3

_build = None
_project = None


def skip(reason):
    """Ends the test program as skipped."""
    print("skipped:", reason, flush=True)
    os._exit(77)


def install(build, project):
    """Installs the build into the private /usr/tuvo, the web programs set-user-id root."""
    global _build, _project
    if os.environ.get("TUVO_PRIVATE_ROOT") != "1" or os.getuid() != 0:
        skip("runs as root inside scripts/private-root only")
    if not os.path.exists("/usr/sbin/lighttpd"):
        skip("the package lighttpd is missing")
    _build, _project = build, project
    subprocess.run(["cmake", "--install", build, "--prefix", "/usr/tuvo"], check=True,
                   stdout=subprocess.DEVNULL)
    subprocess.run(["install", "-m", "0755", PROGRAM, PLAIN_PROGRAM], check=True)
    for program in PROGRAM, OWNERS_PROGRAM:
        os.chown(program, 0, WWW_DATA)
        os.chmod(program, 0o4750)


def is_sanitized():
    """Whether the build's allocator keeps what is freed, so that memory says nothing."""
    done = subprocess.run(["ldd", PLAIN_PROGRAM], stdout=subprocess.PIPE)
    return b"asan" in done.stdout


def free_port():
    with socket.socket() as probe:
        probe.bind(("127.0.0.1", 0))
        return probe.getsockname()[1]


def fastcgi_configuration(sockets="/tmp/run", processes=1):
    """Writes a configuration with everything by FastCGI; its path. A folder of sockets is for one
    server: a second one would find the programs of the first there."""
    folder = _project + "/packaging/lighttpd/"
    os.makedirs(sockets, mode=0o700, exist_ok=True)
    os.chown(sockets, WWW_DATA, WWW_DATA)
    with open(folder + "standalone.conf") as file:
        text = file.read()
    parts = f'var.tuvosharing_run = "{sockets}"\n'
    for name in "owner.conf", "webapi-fastcgi.conf", "sharing-fastcgi.conf":
        with open(folder + name) as file:
            part = re.sub(r'"max-procs" => \d+', f'"max-procs" => {processes}', file.read())
        with open("/tmp/" + name, "w") as file:
            file.write(part)
        parts += f'include "{name}"\n'
    with open("/tmp/fastcgi.conf", "w") as file:
        file.write(text.split("include", 1)[0] + parts)
    return "/tmp/fastcgi.conf"


def changed_configuration(old, new):
    """Writes a configuration like the project's, with the first `old` made `new`; its path."""
    folder = _project + "/packaging/lighttpd/"
    with open(folder + "standalone.conf") as file:
        text = file.read()
    with open("/tmp/changed.conf", "w") as file:
        file.write(text.replace(old, new, 1).replace('include "', f'include "{folder}'))
    return "/tmp/changed.conf"


class WebServer:
    """The web server with the project's configuration, or another, for the lifetime of a `with`."""

    def __init__(self, configuration=None):
        self.configuration = configuration or _project + "/packaging/lighttpd/standalone.conf"

    def __enter__(self):
        for _ in range(5):  # somebody may be quicker to take the free port
            self.port = free_port()
            if self._start():
                return self
        with open("/tmp/lighttpd.log") as log:
            raise RuntimeError("the web server does not start:\n" + log.read())

    def _start(self):
        environment = dict(os.environ, TUVO_PORT=str(self.port), TUVO_LOG="/tmp/lighttpd.log")
        self.process = subprocess.Popen(
            ["/usr/sbin/lighttpd", "-D", "-f", self.configuration],
            env=environment, stdin=subprocess.DEVNULL)
        for _ in range(1200):
            if self.process.poll() is not None:
                return False
            try:
                socket.create_connection(("127.0.0.1", self.port)).close()
                return True
            except ConnectionRefusedError:
                time.sleep(0.05)
        self.process.kill()
        return False

    def programs(self):
        """The processes that it has started."""
        done = subprocess.run(["ps", "-o", "pid=", "--ppid", str(self.process.pid)],
                              stdout=subprocess.PIPE)
        return [int(pid) for pid in done.stdout.split()]

    def __exit__(self, *_):
        self.process.terminate()
        self.process.wait()


class Reply:
    """A program's or a server's answer."""

    def __init__(self, status, headers, body):
        self.status = status
        self.headers = headers  # pairs, in order
        self.body = body

    def all(self, name):
        return [value for key, value in self.headers if key.lower() == name.lower()]

    def get(self, name):
        values = self.all(name)
        assert len(values) <= 1, f"{name} more than once: {values}"
        return values[0] if values else None

    @property
    def text(self):
        return self.body.decode()

    def session_id(self):
        cookie = self.get("Set-Cookie") or ""
        match = re.match(r"sharing_sid=([A-Za-z0-9_-]{32});", cookie)
        return match and match.group(1)


class Visitor:
    """A browser at an address of its own, with one cookie."""

    def __init__(self, server, address="127.0.0.1"):
        self.server = server
        self.address = address
        self.session_id = None

    def request(self, method, path, body=None, headers=None):
        headers = dict(headers or {})
        if self.session_id and "Cookie" not in headers:
            headers["Cookie"] = "sharing_sid=" + self.session_id
        connection = http.client.HTTPConnection("127.0.0.1", self.server.port, timeout=60,
                                                source_address=(self.address, 0))
        try:
            connection.request(method, path, body, headers)
            response = connection.getresponse()
            reply = Reply(response.status, response.getheaders(), response.read())
        finally:
            connection.close()
        if reply.session_id():
            self.session_id = reply.session_id()
        return reply

    def get(self, path, **headers):
        return self.request("GET", path, headers=_names(headers))

    def head(self, path, **headers):
        return self.request("HEAD", path, headers=_names(headers))

    def post(self, path, fields=None, **headers):
        headers = _names(headers)
        headers.setdefault("Content-Type", "application/x-www-form-urlencoded")
        return self.request("POST", path, urllib.parse.urlencode(fields or {}), headers)


def _names(headers):
    return {name.replace("_", "-"): value for name, value in headers.items()}


def run_program(method, path_info, body=b"", uid=WWW_DATA, program=None, prefix=(), **variables):
    """Starts the program as a web server would; its answer, and its exit status as `.exit`."""
    environment = {"REQUEST_METHOD": method, "PATH_INFO": path_info, "QUERY_STRING": "",
                   "REMOTE_ADDR": "192.0.2.7", "GATEWAY_INTERFACE": "CGI/1.1"}
    if method == "POST":
        environment["CONTENT_TYPE"] = "application/x-www-form-urlencoded"
        environment["CONTENT_LENGTH"] = str(len(body))
    if uid != SYSTEM:
        # Of a build with sanitizers: the leak check cannot look into a process of mixed ids.
        environment["ASAN_OPTIONS"] = "detect_leaks=0"
    environment.update(variables)
    environment = {name: value for name, value in environment.items() if value is not None}
    ids = {} if prefix else {"user": uid, "group": uid, "extra_groups": []}
    command = [*prefix, program or (PROGRAM if uid == WWW_DATA else PLAIN_PROGRAM)]
    done = subprocess.run(command, input=body, env=environment, stdout=subprocess.PIPE,
                          timeout=60, **ids)
    head, _, content = done.stdout.partition(b"\r\n\r\n")
    headers = [tuple(line.split(": ", 1)) for line in head.decode().split("\r\n") if line]
    status = [int(value.split()[0]) for name, value in headers if name == "Status"]
    reply = Reply(status[0] if status else None, headers, content)
    reply.exit = done.returncode
    return reply


def make_link(**members):
    """Creates a link through the library and returns its hash."""
    return make_links([members])[0]


def make_links(wanted):
    """As many at once; their hashes. They are not purged once they have ended, unless that is asked
    for: one login in a hundred purges, and would take them from under another test."""
    wanted = [{"auto_gc": False, **members} for members in wanted]
    done = subprocess.run([_build + "/tests/programs/visitor_link_maker"],
                          input=json.dumps(wanted).encode(), stdout=subprocess.PIPE, check=True)
    return done.stdout.decode().split()


def make_file_link(path, **members):
    return make_link(app={"path": path}, **members)


def sql(statement, *values):
    """Runs a statement on the database of links, from outside; the rows it returns."""
    connection = sqlite3.connect(DATABASE, timeout=30)
    try:
        with connection:
            return connection.execute(statement, values).fetchall()
    finally:
        connection.close()


def use_count(link):
    return sql("SELECT use_count FROM entry WHERE hash=?", link)[0][0]


def change_data(link, **members):
    """Changes members of a link's JSON document behind the library's back."""
    data = json.loads(sql("SELECT data FROM entry WHERE hash=?", link)[0][0])
    data.update(members)
    sql("UPDATE entry SET data=? WHERE hash=?", json.dumps(data), link)


class SystemLog:
    """What is written to the system log, for the lifetime of a `with`."""

    def __enter__(self):
        self.lines = []
        if os.path.lexists("/dev/log"):
            os.unlink("/dev/log")
        self._socket = socket.socket(socket.AF_UNIX, socket.SOCK_DGRAM)
        self._socket.bind("/dev/log")
        os.chmod("/dev/log", 0o666)
        self._thread = threading.Thread(target=self._receive, daemon=True)
        self._thread.start()
        return self

    def _receive(self):
        while True:
            line = self._socket.recv(65536).decode(errors="replace")
            if line == "the end":
                return
            self.lines.append(line)

    def __exit__(self, *_):
        with socket.socket(socket.AF_UNIX, socket.SOCK_DGRAM) as end:
            end.connect("/dev/log")
            end.send(b"the end")
        self._thread.join()
        self._socket.close()
        os.unlink("/dev/log")

    def errors(self):
        """The lines of priority error and worse."""
        return [line for line in self.lines
                if int(re.match(r"<(\d+)>", line).group(1)) % 8 <= LOG_ERR]
