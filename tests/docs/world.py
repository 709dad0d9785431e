"""The machine on which run_page.py runs the lines of a page: a private one, inside
scripts/private-root and a network namespace. Besides what private-root makes private there are an
/etc, /srv, /usr/local, /var/backups and /var/tmp of its own, a copy of the project's folder, the
build's programs installed and configured as docs/deployment.md says, a web server on port 80 and
somebody who listens at /dev/log. All else of the host, but the build's folder, cannot be written to.

Some commands are stood in for, since there is no system running here and no time to build:

  sudo        starts the command, which is root anyway, with the PATH that Debian's sudo gives
  cmake       --build only looks whether there is something to build; --install installs the build
              that is being tested, whatever folder is named
  systemctl   Debian's own, told that no system is running: it makes and removes links, starts nothing
  journalctl  what came to /dev/log, with the options -t, -o cat and --since"""

import glob
import os
import pathlib
import shutil
import socket
import subprocess
import threading
import time

WORLD = pathlib.Path("/tmp/world")
PROJECT = WORLD / "project"
JOURNAL = WORLD / "journal"
SECURE_PATH = "/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin"

SUDO = """#!/bin/bash
while [[ ${1:-} == *=* ]]; do export "$1"; shift; done
PATH=%(stand_ins)s:%(path)s exec "$@"
"""

CMAKE = """#!/bin/bash
case $1 in
  --build) exec /usr/bin/cmake "$@" -- -n >/dev/null ;;
  --install) exec /usr/bin/cmake --install %(build)s "${@:3}" >/dev/null ;;
esac
exec /usr/bin/cmake "$@" >/dev/null
"""

SYSTEMCTL = """#!/bin/bash
words=()
for word in "$@"; do [ "$word" = --now ] || words+=("$word"); done
SYSTEMD_OFFLINE=1 exec /usr/bin/systemctl "${words[@]}"
"""

JOURNALCTL = """#!/usr/bin/python3
import argparse
options = argparse.ArgumentParser()
options.add_argument("-t")
options.add_argument("-o")
options.add_argument("--since")
given = options.parse_args()
for line in open("%(journal)s"):
    name, number, text = line.rstrip("\\n").split("\\t")
    if given.t in (None, name):
        print(text if given.o == "cat" else f"Nov 22 06:30:00 nas {name}[{number}]: {text}")
"""


def run(*command, **options):
    subprocess.run(command, check=True, stdout=subprocess.DEVNULL, **options)


def own_folder(path, keep):
    """Makes a folder of the machine's private, with its contents or empty."""
    copy = WORLD / path.strip("/").replace("/", "-")
    if keep:
        run("cp", "-a", path, copy)
    else:
        copy.mkdir()
    run("mount", "--bind", copy, path)


def forget_installation():
    """Removes from the private /etc what an installation on this host may have left there."""
    for pattern in ("/etc/tuvosharing*", "/etc/lighttpd/conf-*/*tuvosharing*",
                    "/etc/nginx/sites-*/tuvosharing*", "/etc/cron.d/tuvosharing",
                    "/etc/systemd/system/tuvosharing*", "/etc/systemd/system/*/tuvosharing*"):
        run("rm", "-rf", *glob.glob(pattern))


def copy_project(build, project):
    shutil.copytree(project, PROJECT, symlinks=True,
                    ignore=shutil.ignore_patterns("build", ".git", ".cache", "node_modules"))
    (PROJECT / "build").mkdir()
    (PROJECT / "build/dev").symlink_to(build)


def write_stand_ins(build):
    folder = WORLD / "bin"
    folder.mkdir()
    words = {"stand_ins": folder, "path": SECURE_PATH, "build": build, "journal": JOURNAL}
    for name, text in ("sudo", SUDO), ("cmake", CMAKE), ("systemctl", SYSTEMCTL), (
            "journalctl", JOURNALCTL):
        (folder / name).write_text(text % words)
        (folder / name).chmod(0o755)
    return f"{folder}:{SECURE_PATH}"


def install(build):
    run("cmake", "--install", build, "--prefix", "/usr/tuvo")
    for program in "sharing.cgi", "entry.cgi":
        shutil.chown(f"/usr/tuvo/bin/{program}", "root", "www-data")
        os.chmod(f"/usr/tuvo/bin/{program}", 0o4750)
    # Where the packages have these, programs and pkg-config look by themselves; and here:
    os.symlink("/usr/tuvo/bin/tuvosharing", "/usr/local/sbin/tuvosharing")
    os.symlink("/usr/tuvo/lib/pkgconfig", "/usr/local/lib/pkgconfig")
    pathlib.Path("/usr/tuvo/etc/tuvosharing.conf").write_text(
        "external_address = https://nas.example.org\nshare_folder = /srv/shares\n")
    os.makedirs("/srv/shares")
    for name in "report.pdf", "report.txt":
        pathlib.Path("/srv/shares", name).write_text("All is well.\n")


def listen_to_log():
    """Keeps what is logged from now on, one line each: name, process, text."""
    listener = socket.socket(socket.AF_UNIX, socket.SOCK_DGRAM)
    listener.bind("/dev/log")
    os.chmod("/dev/log", 0o666)
    JOURNAL.touch()

    def receive():
        while True:
            head, _, text = listener.recv(65536).decode(errors="replace").rstrip("\0\n").partition(
                ": ")
            name, _, number = head.split()[-1].partition("[")
            with JOURNAL.open("a") as journal:
                journal.write(f"{name}\t{number.rstrip(']')}\t{text}\n")

    threading.Thread(target=receive, daemon=True).start()


def start_web_server(project):
    log = "/tmp/lighttpd.log"
    server = subprocess.Popen(
        ["/usr/sbin/lighttpd", "-D", "-f", f"{project}/packaging/lighttpd/standalone.conf"],
        env={"PATH": SECURE_PATH, "TUVO_PORT": "80", "TUVO_LOG": log})
    for _ in range(1200):
        try:
            socket.create_connection(("127.0.0.1", 80)).close()
            return server
        except ConnectionRefusedError:
            time.sleep(0.05)
    raise RuntimeError("the web server does not start: " + pathlib.Path(log).read_text())


def protect_host(build):
    """Makes every other mount read-only, whatever a page's lines may try."""
    run("mount", "--bind", build, build)  # cmake --install leaves its list there
    writable = [str(WORLD), "/etc", "/srv", "/usr/local", "/usr/tuvo", "/var/backups", "/var/tmp",
                "/tmp", "/dev", "/proc", "/sys", build]
    for line in reversed(pathlib.Path("/proc/self/mountinfo").read_text().splitlines()):
        point = line.split()[4].encode().decode("unicode_escape")
        # /usr itself is private-root's, and holds /usr/tuvo.
        if point != "/usr" and not any(point == path or point.startswith(path + "/")
                                       for path in writable):
            done = subprocess.run(["mount", "-o", "remount,bind,ro", point],
                                  stderr=subprocess.DEVNULL)
            if done.returncode != 0 and point == "/":
                raise RuntimeError("the host's files cannot be protected")


def make(build, project):
    """Lays everything out; the web server's process and the PATH for the page's lines."""
    WORLD.mkdir()
    run("ip", "link", "set", "lo", "up")
    own_folder("/etc", keep=True)
    forget_installation()
    for path in "/srv", "/usr/local", "/var/backups", "/var/tmp":
        own_folder(path, keep=False)
    for path in "/usr/local/bin", "/usr/local/sbin", "/usr/local/lib":
        os.mkdir(path)
    copy_project(build, project)
    listen_to_log()
    install(build)
    protect_host(build)
    return start_web_server(project), write_stand_ins(build)
