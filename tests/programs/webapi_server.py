"""Both fronts of the web API in a private installation, for the tests of the web API. Runs inside
scripts/private-root, as root."""

import base64
import http.client
import json
import os
import re
import subprocess

import visitor_server as vs

TOOL = "/usr/tuvo/bin/tuvowebapi"
PLAIN_TOOL = "/usr/tuvo/bin/plain-webapi"  # the same without the set-user-id bit
ENTRY = "/usr/tuvo/bin/entry.cgi"
PLAIN_ENTRY = "/usr/tuvo/bin/plain-entry.cgi"
CONFIG = "/usr/tuvo/etc/tuvosharing.conf"
PATH = "/webapi/entry.cgi"
LINK = "TUVO.Sharing.Link"
INFO = "TUVO.API.Info"
UIDS = {"root": 0, "daemon": 1, "www-data": 33, "alice": 2001, "bob": 2002, "carol": 2003,
        "dave": 2004, "nobody": 65534}

# The answers' codes and their HTTP statuses.
STATUSES = {100: 500, 101: 400, 102: 404, 103: 404, 104: 400, 105: 401, 106: 403, 107: 405, 108: 415,
            109: 403, 110: 413, 200: 400, 201: 400, 202: 400, 203: 400, 204: 409, 205: 404, 206: 403,
            207: 503, 208: 400}


def install(build, project, *share_folders):
    """Installs the build into the private /usr/tuvo, both fronts set-user-id root."""
    vs.install(build, project)
    for program, plain, mode in (TOOL, PLAIN_TOOL, 0o4755), (ENTRY, PLAIN_ENTRY, 0o4750):
        subprocess.run(["install", "-m", "0755", program, plain], check=True)
        os.chown(program, 0, vs.WWW_DATA)
        os.chmod(program, mode)
    with open(CONFIG, "w") as config:
        for folder in share_folders:
            config.write(f"share_folder = {folder}\n")
    # The database is made by who should make it, before a test looks into it as root.
    assert ToolFront().call("root", "list").ok


class Answer:
    """What the web API answered."""

    def __init__(self, document, status=None, exit_status=None):
        self.document = document
        self.status = status  # HTTP's
        self.exit = exit_status  # the command's
        self.ok = document["success"]
        self.data = document.get("data")
        error = document.get("error", {})
        self.code = error.get("code", 1)
        self.field = error.get("field", "")
        self.message = error.get("message", "")

    def __repr__(self):
        return json.dumps(self.document)[:400]


def answer_of(text, **others):
    document = json.loads(text)
    members = {"success", "data"} if document["success"] is True else {"success", "error"}
    assert set(document) == members, document
    if not document["success"]:
        assert set(document["error"]) - {"field"} == {"code", "message"}, document
        assert document["error"]["message"], document
    return Answer(document, **others)


def as_text(value):
    """A value as a command line or a query string has it."""
    if isinstance(value, str):
        return value
    return json.dumps(value, ensure_ascii=False)


def run_tool(who, *arguments, program=TOOL, **options):
    """Runs the command as that account, in its groups; what the system says of its end."""
    uid = UIDS[who]
    groups = {"alice": [3001], "carol": [3002]}.get(who, [])
    environment = {"ASAN_OPTIONS": "detect_leaks=0", **options.pop("environment", {})}
    return subprocess.run([program, *arguments], user=uid, group=uid, extra_groups=groups,
                          stdout=subprocess.PIPE, stderr=subprocess.PIPE, env=environment,
                          cwd="/", timeout=120, **options)


class ToolFront:
    """The command."""

    reads_texts = True

    def call(self, who, method, api=LINK, version=1, program=TOOL, **arguments):
        texts = [f"{name}={as_text(value)}" for name, value in arguments.items()]
        done = run_tool(who, "--exec", f"api={api}", f"version={version}", f"method={method}",
                        *texts, program=program)
        assert done.stdout.endswith(b"\n") and done.stdout.count(b"\n") == 1, done
        # The tool that tells addresses may complain about a hash, and nobody else about anything.
        assert all(line.startswith(b"tuvosharingurl: ") for line in done.stderr.splitlines()), done
        answer = answer_of(done.stdout, exit_status=done.returncode)
        assert done.returncode == (0 if answer.ok else 1), done
        return answer


class HttpFront:
    """POSTs with a JSON body, through a real web server."""

    reads_texts = False

    def __init__(self, server):
        self.server = server

    def call(self, who, method, api=LINK, version=1, **arguments):
        body = json.dumps({"api": api, "version": version, "method": method, **arguments})
        return self.answer(self.post(who, body.encode()))

    def answer(self, reply):
        answer = answer_of(reply.body, status=reply.status)
        assert reply.status == STATUSES.get(answer.code, 200), (reply.status, answer)
        return answer

    def post(self, who, body, **headers):
        return self.request("POST", who, PATH, body,
                            **{"Content-Type": "application/json", **headers})

    def request(self, method, who, path, body=None, **headers):
        headers = {name.replace("_", "-"): value for name, value in headers.items()
                   if value is not None}
        if who is not None:
            headers.setdefault("Authorization", basic(who))
        connection = http.client.HTTPConnection("127.0.0.1", self.server.port, timeout=180)
        try:
            connection.request(method, path, body, headers)
            response = connection.getresponse()
            return vs.Reply(response.status, response.getheaders(), response.read())
        finally:
            connection.close()


def basic(who, password=None):
    text = f"{who}:{password if password is not None else who + '-secret'}"
    return "Basic " + base64.b64encode(text.encode()).decode()


def run_entry(method="POST", body=b"", user="alice", query="", program=ENTRY, uid=vs.WWW_DATA,
              **variables):
    """Starts the program as a web server would, with variables of the test's choice (None: not
    there); its reply, and its exit status as `.exit`."""
    environment = {"REQUEST_METHOD": method, "QUERY_STRING": query, "REMOTE_ADDR": "192.0.2.7",
                   "REMOTE_USER": user, "HTTP_HOST": "nas.example.org", "SERVER_PORT": "80",
                   "GATEWAY_INTERFACE": "CGI/1.1", "ASAN_OPTIONS": "detect_leaks=0"}
    if method == "POST":
        environment["CONTENT_TYPE"] = "application/json"
        environment["CONTENT_LENGTH"] = str(len(body))
    environment.update(variables)
    environment = {name: value for name, value in environment.items() if value is not None}
    done = subprocess.run([program], input=body, env=environment, stdout=subprocess.PIPE, timeout=60,
                          user=uid, group=uid, extra_groups=[])
    head, _, content = done.stdout.partition(b"\r\n\r\n")
    headers = [tuple(line.split(": ", 1)) for line in head.decode().split("\r\n") if line]
    reply = vs.Reply(int(dict(headers)["Status"].split()[0]), headers, content)
    reply.exit = done.returncode
    return reply


def request_body(method, api=LINK, version=1, **arguments):
    return json.dumps({"api": api, "version": version, "method": method, **arguments}).encode()


def events(log):
    """The structured lines of a SystemLog, each as its fields."""
    found = []
    for line in log.lines:
        match = re.match(r"<(\d+)>.*?: sharing (event=.*)", line)
        if match:
            assert int(match.group(1)) % 8 == 6, line  # informational
            found.append(dict(field.split("=", 1) for field in match.group(2).split()))
    return found
