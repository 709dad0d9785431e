#!/usr/bin/env python3
"""Requests through the web server: the visitor program and its peers, the same visitor's authorised
request of a small page again and again.

  sudo python3 bench/web/web_rows.py [--seconds S] [--build FOLDER] [--json]
  scripts/private-root python3 bench/web/web_rows.py …     the same, but installs and builds nothing

Servers are measured in turns, in several rounds: what else the machine does meets all of them. See
docs/performance.md for what the numbers say."""

import argparse
import contextlib
import json
import os
import shutil
import statistics
import subprocess
import sys
import tempfile

sys.path.insert(0, os.path.dirname(os.path.abspath(__file__)))
sys.path.append(os.path.join(os.path.dirname(os.path.abspath(__file__)), "..", "harness"))
import ending  # noqa: E402
import installing  # noqa: E402
import job  # noqa: E402
import load  # noqa: E402
from installing import PROJECT, install  # noqa: E402,F401  (install: for scripts/bench)

CONNECTIONS = 1, 8, 64
ROUNDS = 5
SECONDS = 5
WORKERS = 4  # as packaging/lighttpd/sharing-fastcgi.conf has it
BUILD = "build/release"

CGI = "visitor program, CGI"
FASTCGI = "visitor program, FastCGI"
IN_PROCESS = "authorisation check in process"
FOLDED = ", log folded back"


def rows(options):
    """A dict for each server and number of connections. Of `options` the members seconds and build
    (a release build's folder) are looked at; either may be missing or None."""
    seconds = getattr(options, "seconds", None) or SECONDS
    build = os.path.abspath(getattr(options, "build", None) or os.path.join(PROJECT, BUILD))
    if os.environ.get("TUVO_PRIVATE_ROOT") == "1":
        return _measured(build, seconds)
    done = subprocess.run([PROJECT + "/scripts/private-root", sys.executable,
                           os.path.abspath(__file__), "--json", "--seconds", str(seconds),
                           "--build", build], stdout=subprocess.PIPE, text=True, check=True)
    return json.loads(done.stdout.splitlines()[-1])


def ratios(found):
    """The comparisons that there are targets for, a line each with the median of the rounds."""
    by_point = {(row["name"], row["connections"]): row for row in found if "rps" in row}
    in_process = by_point.get((IN_PROCESS, None))
    lines = []
    for connections in CONNECTIONS:
        ours = by_point.get((FASTCGI, connections))
        if ours is None:
            continue
        # A server with fewer connections than workers cannot keep all of them busy.
        if in_process and connections >= WORKERS:
            lines.append(_held(f"FastCGI / in process, requests per second, {connections} connections",
                               _ratio(ours, in_process, "rps"), least=0.85))
        for (name, others), peer in by_point.items():
            if others == connections and name not in (CGI, FASTCGI):
                lines.append(_held(f"FastCGI / {name}, requests per second, {connections} connections",
                                   _ratio(ours, peer, "rps"), least=5))
                if connections == CONNECTIONS[-1]:  # which is where it was looked at
                    lines.append(_held(f"FastCGI / {name}, memory per worker",
                                       ours["pss_kib"] / peer["pss_kib"], most=0.1))
    return lines


def _held(text, ratio, least=None, most=None):
    kept = ratio >= least if most is None else ratio <= most
    target = f"at least {least:g}" if most is None else f"at most {most:g}"
    return f"{text}: {ratio:.2f}, {target}: {'ok' if kept else 'MISSED'}"


def _ratio(one, other, key):
    pairs = zip(one["rounds"], other["rounds"])
    return statistics.median(first[key] / second[key] for first, second in pairs)


def _plan(missing):
    """The servers that can be started here, and a row for each that cannot."""
    from servers import Node, Ours, Php
    servers = [lambda: Ours(CGI), lambda: Ours(FASTCGI, WORKERS)]
    skipped = []
    peers = [
        ("php", "PHP", Php, WORKERS, []),
        ("native", "Node, native SQLite", Node, WORKERS, ["native"]),
        # WAL, which this build has for one process only; or several processes without it.
        ("wasm", "Node, WebAssembly SQLite, 1 process", Node, 1, ["wasm"]),
        ("wasm", "Node, WebAssembly SQLite, no WAL", Node, WORKERS, ["wasm"]),
    ]
    for needed, name, kind, workers, more in peers:
        # The library folds the write-ahead log back at each request's end; a peer's author would
        # leave that to SQLite. Both are measured.
        for fold_back in (False, True) if needed != "wasm" else (False,):
            full_name = name + (FOLDED if fold_back else "")
            if needed in missing:
                skipped.append({"name": full_name, "connections": None,
                                "skipped": missing[needed]})
            else:
                servers.append(lambda kind=kind, full_name=full_name, workers=workers,
                               fold_back=fold_back, more=more:
                               kind(full_name, workers, fold_back, *more))
    return servers, skipped


def _measured(build, seconds):
    missing = installing.missing()
    if "load" in missing:
        return [{"name": "all", "connections": None, "skipped": missing["load"]}]
    import servers  # looks for the tests' installation, which only such a place has
    # On a disk, and not below the build, which every script gives back to its owner at its end.
    disk = tempfile.mkdtemp(prefix="bench-web-", dir="/var/tmp")
    os.chmod(disk, 0o711)
    node_modules = None if "wasm" in missing else installing.NODE_MODULES
    try:
        with servers.installed(build, disk, node_modules):
            makers, skipped = _plan(missing)
            return _run(makers, seconds) + skipped
    finally:
        shutil.rmtree(disk, ignore_errors=True)


def _run(makers, seconds):
    found, order = _timed(makers, seconds)
    memory = {}
    for make in makers:
        with make() as server:
            server.visitor = job.begin(server)
            memory[server.name] = load.memory(server, CONNECTIONS[-1], 1)
    points = sorted(found, key=lambda point: order.index(point[0]))
    return [_row(*point, found[point], memory.get(point[0])) for point in points]


def _timed(makers, seconds):
    """All rounds of every point, and the order of the names."""
    program = _compile_in_process()
    each = max(1, round(seconds / ROUNDS))
    found = {}
    with contextlib.ExitStack() as stack:
        started = [stack.enter_context(make()) for make in makers]
        fastcgi = next(server for server in started if server.name == FASTCGI)
        for server in started:
            server.visitor = job.begin(server)
            load.web_round(server, CONNECTIONS[-1], 1)  # warm: code compiled, pages read
        for _ in range(max(1, round(seconds / each))):
            for connections in CONNECTIONS:
                for server in started:
                    found.setdefault((server.name, connections), []).append(
                        load.web_round(server, connections, each))
            found.setdefault((IN_PROCESS, None), []).append(
                load.in_process_round(program, fastcgi, WORKERS, each))
        for server in started:
            job.end(server, server.visitor)
    order = [server.name for server in started]
    order.insert(order.index(FASTCGI) + 1, IN_PROCESS)
    return found, order


def _row(name, connections, rounds, memory):
    def median(key):
        return statistics.median(one[key] for one in rounds)

    rates = [one["rps"] for one in rounds]
    return {"name": name, "connections": connections, "rps": median("rps"), "rps_min": min(rates),
            "rps_max": max(rates), "p99_ms": median("p99_ms"), "cpu_ms": median("cpu_ms"),
            "pss_kib": memory, "failures": sum(one["failures"] for one in rounds),
            "rounds": rounds}


def _compile_in_process():
    """Against the installed library, as any program would be."""
    program = "/tmp/in_process"
    found = subprocess.run(
        ["pkg-config", "--cflags", "--libs", "tuvosharing"], stdout=subprocess.PIPE, check=True,
        text=True, env=dict(os.environ, PKG_CONFIG_PATH=_package_folder())).stdout.split()
    subprocess.run(["g++", "-std=c++17", "-O2", "-Wall", "-Wextra", "-Werror", "-o", program,
                    PROJECT + "/bench/web/in_process.cpp", *found], check=True)
    return program


def _package_folder():
    for folder, _, files in os.walk("/usr/tuvo"):
        if "tuvosharing.pc" in files:
            return folder
    raise RuntimeError("the library is not installed")


def table(found):
    """The rows as text."""
    head = (f"{'':42}{'conn.':>6}{'req/s':>9}{'min':>8}{'max':>8}{'p99 ms':>8}{'CPU ms':>8}"
            f"{'KiB/worker':>12}{'failed':>8}")
    lines = [head]
    for row in found:
        if "skipped" in row:
            lines.append(f"{row['name']:42}skipped: {row['skipped']}")
            continue
        lines.append(f"{row['name']:42}{row['connections'] or '':>6}{row['rps']:9.0f}"
                     f"{row['rps_min']:8.0f}{row['rps_max']:8.0f}{row['p99_ms']:8.2f}"
                     f"{row['cpu_ms']:8.3f}{row['pss_kib'] or '':>12}{row['failures']:8}")
    return "\n".join(lines)


def _build():
    subprocess.run(["cmake", "--preset", "release", "-DTUVOSHARING_BUILD_TESTS=OFF"], cwd=PROJECT,
                   stdout=subprocess.DEVNULL, check=True)
    subprocess.run(["cmake", "--build", "--preset", "release"], cwd=PROJECT, check=True)


def main():
    parser = argparse.ArgumentParser(description="Measure requests through the web server")
    parser.add_argument("--seconds", type=float, default=SECONDS, help="for each point (default 5)")
    parser.add_argument("--build", help="a release build (default: build/release, made here)")
    parser.add_argument("--json", action="store_true", help="the rows as JSON, in one line")
    options = parser.parse_args()
    if os.environ.get("TUVO_PRIVATE_ROOT") != "1":
        install()
        if options.build is None:
            _build()
    found = rows(options)
    if options.json:
        print(json.dumps(found))
        return
    print(table(found))
    print("\nLoad average (1, 5, 15 minutes), with that of the measurement itself:",
          *(f"{average:.1f}" for average in os.getloadavg()), end="\n\n")
    print("\n".join(ratios(found)))


if __name__ == "__main__":
    ending.by_exception()
    main()
