"""One round of load: how many requests, how long they took, what they cost. CPU time is that of the
server and its workers, not of the load's own tool."""

import json
import os
import subprocess

import processes

_REPORT = os.path.join(os.path.dirname(os.path.abspath(__file__)), "report.lua")


def web_round(server, connections, seconds):
    """The same visitor's request over some connections, as fast as it is answered."""
    before = processes.cpu_seconds(server.roots)
    done = subprocess.run(
        ["wrk", "-t1", f"-c{connections}", f"-d{seconds}s", "--timeout", "10s", "-s", _REPORT,
         "-H", "Cookie: " + server.visitor.cookie,
         f"http://127.0.0.1:{server.port}{server.path}"],
        stdout=subprocess.PIPE, check=True, text=True)
    measured = json.loads(done.stdout.splitlines()[-1])
    return _result(measured, processes.cpu_seconds(server.roots) - before)


def memory(server, connections, seconds):
    """The largest share of memory of one worker under load. Outside the rounds that are timed, since
    each look holds the process up; and while no other server runs that shares pages with it."""
    with processes.MemoryWatch(server.workers) as watch:
        web_round(server, connections, seconds)
    return watch.largest


def in_process_round(program, server, count, seconds):
    """The same check by as many processes, without a web server."""
    session = server.visitor.cookie.partition("=")[2]
    done = subprocess.run([program, server.link, session, str(count), str(seconds)],
                          stdout=subprocess.PIPE, check=True, text=True)
    measured = json.loads(done.stdout)
    return _result(measured, measured["cpu_seconds"])


def _result(measured, cpu):
    return {"rps": measured["requests"] / measured["seconds"], "p99_ms": measured["p99_ms"],
            "failures": measured["failures"], "cpu_ms": cpu * 1000 / max(measured["requests"], 1)}
