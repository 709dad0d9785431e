"""Running the measuring programs."""

import json
import os
import pathlib
import re
import subprocess
import tempfile

LIBRARY, FLOOR = "library", "floor"
SIDES = (FLOOR, LIBRARY)

# Nothing of the caller's: where the texts of the environment lie moves what is on the stack.
ENVIRONMENT = {"PATH": "/usr/bin:/bin", "LC_ALL": "C", "REMOTE_ADDR": "192.0.2.1"}

# For counts that are to be the same on another machine. The C library chooses its text functions by
# what the processor can do, and their thresholds by its caches; here it gets to see a plain one.
PLAIN_PROCESSOR = {
    "GLIBC_TUNABLES": ":".join([
        "glibc.cpu.hwcaps=-AVX,-AVX2,-AVX512F,-AVX512VL,-AVX512BW,-AVX512CD,-AVX512ER,-AVX512DQ,"
        "-AVX_Fast_Unaligned_Load,-AVX2_Usable,-ERMS,-FSRM,-RTM,-BMI1,-BMI2,-LZCNT,-MOVBE,"
        "-POPCNT,-SSE4_1,-SSE4_2,-SSSE3,-Fast_Unaligned_Copy,-Prefer_No_VZEROUPPER",
        "glibc.cpu.x86_data_cache_size=32768",
        "glibc.cpu.x86_shared_cache_size=1048576",
        "glibc.cpu.x86_non_temporal_threshold=786432",
        "glibc.cpu.x86_rep_movsb_threshold=1048576",
        "glibc.cpu.x86_rep_stosb_threshold=1048576",
    ]),
    "OPENSSL_ia32cap": "~0xffffffffffffffff:~0xffffffffffffffff",
}

COLLECTED = re.compile(r"Collected : (\d+)")


def command(place, row, side, iterations, warm_up, first):
    program = {LIBRARY: "bench_library", FLOOR: "bench_floor_json" if row.json else "bench_floor"}
    return [place.programs / program[side], row.operation, str(row.links), str(iterations),
            str(warm_up), str(first)]


def _output(arguments, environment=None):
    ended = subprocess.run(arguments, env={**ENVIRONMENT, **(environment or {})},
                           stdout=subprocess.PIPE, text=True, check=True)
    return ended.stdout


def measure(place, row, side, iterations, first):
    """What a run took; times are per operation, in seconds."""
    if row.process:
        arguments = [place.programs / "bench_launch", str(iterations),
                     *command(place, row, side, 1, 0, first)]
    else:
        warm_up = 0 if row.most == 1 else max(2, iterations // 10)
        arguments = command(place, row, side, iterations, warm_up, first)
    took = json.loads(_output(arguments))
    return {
        "wall": took["wall_ns"] / iterations / 1e9,
        "cpu": took["cpu_ns"] / iterations / 1e9,
        "peak_kib": took["peak_kib"],
        "grown_kib": took["peak_kib"] - took["base_kib"],
        "kept_kib": took["kept_bytes"] / 1024,
    }


def trace(place, row, side, iterations):
    """The lines that a run's calls into SQLite and the kernel leave."""
    with tempfile.TemporaryDirectory() as folder:
        os.chmod(folder, 0o711)
        path = pathlib.Path(folder, "trace")
        _output(command(place, row, side, iterations, 0, 0),
                {"LD_PRELOAD": str(place.programs / "bench_trace.so"), "BENCH_TRACE": str(path)})
        return path.read_text(encoding="utf-8", errors="replace").splitlines()


def fsyncs(place, row, side):
    """How many an operation makes; a process, all that it makes."""
    def count(iterations):
        place.lay_out(row.links, row.expired)
        lines = trace(place, row, side, iterations)
        return sum(line in ("fsync", "fdatasync") for line in lines)

    if row.process:
        return count(1)
    if row.once:
        return count(1) - count(0)
    # Beyond the first, which begins a new log.
    return (count(1 + 4) - count(1)) / 4


def instructions(place, row, side, iterations, first=0, fixed=False):
    """Instructions in user space per operation; with `fixed`, in a world that never changes."""
    environment = dict(PLAIN_PROCESSOR)
    if fixed:
        environment["LD_PRELOAD"] = str(place.programs / "bench_fixed_world.so")
    scope = [] if row.process else ["--toggle-collect=bench_loop"]
    count = 1 if row.process else iterations
    ended = subprocess.run(
        ["valgrind", "--tool=callgrind", "--callgrind-out-file=/dev/null", *scope,
         *command(place, row, side, count, 0 if row.process else 3, first)],
        env={**ENVIRONMENT, **environment}, stdout=subprocess.DEVNULL, stderr=subprocess.PIPE,
        text=True, check=False)
    found = COLLECTED.search(ended.stderr)
    if ended.returncode != 0 or not found or int(found[1]) == 0:
        raise RuntimeError(f"callgrind failed:\n{ended.stderr}")
    return int(found[1]) / count
