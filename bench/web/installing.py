"""What the measurements need beyond the project's own packages: Debian's for the load and for PHP,
npm's for Node. Installed only where it is missing; what cannot be is a peer that is left out, with
the reason."""

import os
import shutil
import subprocess

PROJECT = os.path.dirname(os.path.dirname(os.path.dirname(os.path.abspath(__file__))))
NODE_SOURCE = os.path.join(PROJECT, "bench/peers/node")
NODE_FOLDER = os.path.join(PROJECT, "build/bench-peers")
NODE_MODULES = os.path.join(NODE_FOLDER, "node_modules")
_NATIVE = os.path.join(NODE_MODULES, "better-sqlite3")

# What it is for, the programs that show that it is there, the packages.
_NEEDED = [
    ("load", ["wrk"], ["wrk"]),
    ("php", ["php-fpm8.2", "php8.2"], ["php8.2-fpm", "php8.2-cli", "php8.2-sqlite3"]),
    ("node", ["node", "npm"], ["nodejs", "npm"]),
    ("native", ["make", "g++", "python3"], ["make", "g++", "python3"]),
]


def install():
    """Installs what is missing; afterwards missing() says what is still not there. As root, outside
    scripts/private-root, where the account files are not the machine's."""
    for _, programs, packages in _NEEDED:
        if not all(_found(program) for program in programs):
            _install_packages(packages)
    _tell(_install_node_modules())
    _tell(_build_native())


def missing():
    """What cannot be measured here, by "load", "php", "wasm" and "native", with the reasons."""
    reasons = {}
    for name, programs, packages in _NEEDED[:3]:
        lacking = [program for program in programs if not _found(program)]
        if lacking:
            reasons[name] = f"{', '.join(lacking)} missing (packages {' '.join(packages)})"
    if "php" not in reasons and not _php_has_sqlite():
        reasons["php"] = "PHP's pdo_sqlite is missing (package php8.2-sqlite3)"
    no_node = reasons.pop("node", None)
    if no_node or not os.path.isdir(NODE_MODULES + "/node-sqlite3-wasm"):
        reasons["wasm"] = no_node or "express and its company could not be installed by npm"
    if "wasm" in reasons or not os.path.exists(_NATIVE + "/build/Release/better_sqlite3.node"):
        reasons["native"] = reasons.get("wasm") or "better-sqlite3 could not be compiled"
    return reasons


def _found(program):
    return shutil.which(program, path=os.environ.get("PATH", "") + ":/usr/sbin:/sbin") is not None


def _tell(problem):
    if problem:
        print("bench/web:", problem, flush=True)


def _install_packages(packages):
    """By the project's own way, which starts no service; nor does the next boot start one that was
    not there before."""
    script = ('. scripts/lib/packages.sh; there=; [ ! -e /etc/init.d/php8.2-fpm ] || there=1; '
              'tuvo_apt_install "$@"; '
              'if [ -z "$there" ] && [ -e /etc/init.d/php8.2-fpm ]; then '
              'update-rc.d php8.2-fpm disable; fi')
    done = subprocess.run(["bash", "-c", script, "packages", *packages], cwd=PROJECT)
    _tell(done.returncode and f"could not install {' '.join(packages)}")


def _php_has_sqlite():
    done = subprocess.run(["php8.2", "-m"], stdout=subprocess.PIPE, text=True)
    return "pdo_sqlite" in done.stdout


def _same(one, other):
    try:
        with open(one, "rb") as first, open(other, "rb") as second:
            return first.read() == second.read()
    except FileNotFoundError:
        return False


def _install_node_modules():
    """Exactly what the lock says, and no package's own script: those fetch programs from elsewhere.
    The copy of the lock is put there last, and says that the rest is complete."""
    if not _found("npm"):
        return "no npm"
    lock = NODE_FOLDER + "/package-lock.json"
    if _same(lock, NODE_SOURCE + "/package-lock.json") and os.path.isdir(NODE_MODULES):
        return None
    shutil.rmtree(NODE_FOLDER, ignore_errors=True)
    os.makedirs(NODE_FOLDER)
    for name in "package.json", "package-lock.json", ".npmrc":
        shutil.copy(os.path.join(NODE_SOURCE, name), NODE_FOLDER)
    done = subprocess.run(["npm", "ci", "--ignore-scripts", "--no-audit", "--no-fund"],
                          cwd=NODE_FOLDER)
    if done.returncode != 0:
        os.unlink(lock)
        return "npm ci failed"
    return None


def _headers():
    """Where node's own headers are; without them the compilation would fetch some."""
    done = subprocess.run(["node", "-p", "process.execPath"], stdout=subprocess.PIPE, text=True)
    prefix = os.path.dirname(os.path.dirname(done.stdout.strip()))
    for place in prefix + "/include/node", prefix + "/include/nodejs/src":
        if os.path.exists(place + "/node_version.h"):
            return prefix if place.endswith("/node") else prefix + "/include/nodejs"
    return None


def _build_native():
    """Compiles better-sqlite3 with the SQLite that comes with it, once: some two minutes."""
    if not os.path.isdir(_NATIVE):
        return "no better-sqlite3 to compile"
    if os.path.exists(_NATIVE + "/build/Release/better_sqlite3.node"):
        return None
    headers = _headers()
    if headers is None:
        return "node's headers are not installed: better-sqlite3 is not compiled"
    done = subprocess.run(["npm", "run", "build-release"], cwd=_NATIVE, stdout=subprocess.PIPE,
                          stderr=subprocess.STDOUT, text=True,
                          env=dict(os.environ, npm_config_nodedir=headers))
    return done.returncode and "better-sqlite3 could not be compiled:\n" + done.stdout[-2000:]
