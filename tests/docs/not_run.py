"""The shell lines of the pages that cannot be run by a test, each with the reason and with what is
looked at instead. A line that is not listed is run (run_page.py); an entry that no page has any line
for is a failure, as is one whose own check fails."""

import dataclasses
import os
import pathlib
import re
import subprocess

import pages


class Wrong(Exception):
    """A listed line that is not as it says."""


@dataclasses.dataclass
class Entry:
    pattern: str  # of the whole line, without its comment
    reason: str
    check: object  # called with the line, the project's folder and the build's; raises Wrong


def need(condition, what):
    if not condition:
        raise Wrong(what)


def options_are_known(words, text, name):
    for word in words:
        if word.startswith("-") and word.strip("-"):
            option = word.split("=")[0]
            need(re.search(re.escape(option) + r"(?![\w-])", text), f"{name} knows no {option}")


def script(line, project, build):
    """The script is there, can be started, has no fault of syntax, and knows the options."""
    words = [word for word in line.split() if word != "sudo" and "=" not in word.split("/")[0]]
    name = words[0]
    path = pathlib.Path(project) / name
    need(path.is_file() and os.access(path, os.X_OK), f"{name} is no program")
    text = path.read_text(encoding="utf-8")
    if "python" in text.split("\n")[0]:
        compile(text, name, "exec")
    else:
        checked = subprocess.run(["bash", "-n", path], stderr=subprocess.PIPE, text=True)
        need(checked.returncode == 0, checked.stderr)
    for folder in re.findall(r"\bbench/harness\b", text):
        for part in sorted((pathlib.Path(project) / folder).glob("*.py")):
            text += part.read_text(encoding="utf-8")
    options_are_known(words[1:], text, name)


def by_ci(line, project, build):
    """As `script`; besides, continuous integration runs it."""
    script(line, project, build)
    name = re.search(r"scripts/[\w-]+", line)[0]
    runs = (pathlib.Path(project) / ".ci/run").read_text(encoding="utf-8")
    need(re.search(rf"^step {name}(?![\w-])", runs, re.MULTILINE), f".ci/run does not run {name}")


def long_test(line, project, build):
    """A test with numbers of its own: ctest runs it with the usual ones, and it reads these."""
    program = re.search(r"build/dev/tests/(\w+)/(\w+)", line)
    sources = "".join(path.read_text(encoding="utf-8") for path in
                      sorted((pathlib.Path(project) / "tests" / program[1]).glob("*.cpp")))
    listed = subprocess.run(["ctest", "--test-dir", build, "-N"], stdout=subprocess.PIPE, text=True,
                            check=True).stdout
    need(re.search(rf": {program[2]}$", listed, re.MULTILINE), f"ctest has no {program[2]}")
    for variable in re.findall(r"\b(TUVO_\w+)=", line):
        need(f'"{variable}"' in sources, f"no source of tests/{program[1]} reads {variable}")


def preset(line, project, build):
    text = (pathlib.Path(project) / "scripts/test").read_text(encoding="utf-8")
    need("preset=dev\n" in text, "scripts/test builds another preset")
    for part in line.split(" && "):
        need(part.replace(" dev", ' "$preset"') in text, f"scripts/test does not do this: {part}")


def own_folder(line, project, build):
    text = (pathlib.Path(project) / "scripts/package").read_text(encoding="utf-8")
    need(f"output={line.split()[1]} " in text, f"scripts/package does not fill {line.split()[1]}")


def hook(line, project, build):
    folder = pathlib.Path(project) / line.split()[-1]
    need(os.access(folder / "pre-commit", os.X_OK), f"{folder} has no hook")


def pictures(line, project, build):
    words = line.split()
    test = next(word for word in words if word.endswith(".py"))
    suite, case = words[-1].split(".")
    text = (pathlib.Path(project) / test).read_text(encoding="utf-8")
    need(re.search(rf"^class {suite}\(", text, re.MULTILINE), f"{test} has no {suite}")
    need(re.search(rf"^    def {case}\(", text, re.MULTILINE), f"{test} has no {case}")


def packages(line, project, build):
    """The packages are among those that scripts/test installs, so that there are such packages."""
    listed = subprocess.run(["bash", "-c", ". scripts/lib/packages.sh; tuvo_packages"], cwd=project,
                            stdout=subprocess.PIPE, text=True, check=True).stdout.split()
    for word in line.split("install", 1)[1].split():
        need(word in listed, f"{word} is in no list of packages")


def of_packages_test(text):
    """A check that the test of the packages, in a fresh Debian, does the same: `text` stands there."""
    def check(line, project, build):
        folder = pathlib.Path(project) / "tests/packages"
        done = "".join(path.read_text(encoding="utf-8") for path in sorted(folder.glob("*.sh")))
        need(text in done, f"tests/packages does not do this: {text}")
    return check


def own_packages(line, project, build):
    """The project's packages by their files: there are such packages, and the test installs them."""
    control = (pathlib.Path(project) / "packaging/debian/control").read_text(encoding="utf-8")
    for word in line.split("install", 1)[1].split():
        name = re.fullmatch(r"(?:\S*/)?([\w-]+)_\*_(?:amd64|i386|all)\.deb", word)
        need(name, f"{word} is no package's file")
        need(re.search(rf"^Package: {name[1]}$", control, re.MULTILINE), f"no package {name[1]}")
    of_packages_test('install "$packages" ')(line, project, build)


NOT_RUN = [
    Entry(r"sudo scripts/(test|test-i386|lint|fuzz)( .*)?",
          "takes minutes, and scripts/test is what runs this test", by_ci),
    Entry(r"(sudo )?scripts/(memcheck|coverage|bench|mutate|abi-baseline)( .*)?",
          "builds anew and takes minutes; run by hand before a release", script),
    Entry(r"sudo scripts/soak( \d+)?",
          "takes twenty minutes; soak_test sees what it adds up, and the tests it runs are run by ctest",
          script),
    Entry(r"sudo (PORT=\d+ )?scripts/demo( .*)?",
          "builds anew, and the demonstration runs until it is stopped", script),
    Entry(r"sudo (TUVO_\w+=\d+ )+scripts/private-root build/dev/tests/.*",
          "the long form of a test", long_test),
    Entry(r"cmake --preset dev && cmake --build --preset dev",
          "what scripts/test has just done, in the folder that is being tested", preset),
    Entry(r"scripts/release( .*)?",
          "needs a git checkout without changes; release_test runs it in small ones", script),
    Entry(r"git config core\.hooksPath .*",
          "needs a git checkout; pre_commit_test runs this very line in one", hook),
    Entry(r"sudo env TUVO_SCREENSHOTS=.*", "writes the pictures of the guide anew", pictures),
    Entry(r"sudo apt install \./.*", "the packages are not built here", own_packages),
    Entry(r"sudo apt(-get)? install [^.].*", "fetches packages for the whole machine", packages),
    Entry(r"sudo scripts/package( .*)?", "builds anew, for both widths", script),
    Entry(r"sudo scripts/test-packages( .*)?", "needs the packages, and takes minutes", script),
    Entry(r"cd build/packages", "there are none here; goes with the line that installs them",
          own_folder),
    # What of the packages' page is for an installation from packages.
    Entry(r"sudo dpkg-statoverride .*", "for installed packages",
          of_packages_test("dpkg-statoverride --update --add root root 0755 "
                           "/usr/tuvo/bin/tuvowebapi")),
    Entry(r"sudo lighttpd-enable-mod tuvosharing && sudo service lighttpd reload",
          "for installed packages and a running server",
          of_packages_test("lighttpd-enable-mod tuvosharing >")),
    Entry(r"sudo lighttpd-enable-mod tuvosharing-owner && sudo service lighttpd restart",
          "for installed packages and a running server",
          of_packages_test("lighttpd-enable-mod tuvosharing-owner >")),
    Entry(r"sudo ln -s .* /etc/nginx/sites-enabled/ && sudo service nginx reload",
          "for installed packages and a running server",
          of_packages_test("ln -s ../sites-available/tuvosharing /etc/nginx/sites-enabled/")),
    Entry(r"echo .* \| sudo debconf-set-selections", "for installed packages",
          of_packages_test("debconf-set-selections")),
    Entry(r"sudo apt purge tuvosharing", "for installed packages",
          of_packages_test("apt purge ")),
]


def entry_for(line):
    """The entry that a line (without its comment) falls under, None for a line that is run."""
    for entry in NOT_RUN:
        if re.fullmatch(entry.pattern, line):
            return entry
    return None


def runs(command):
    """What of a command is run: its lines without the listed ones, the empty text for nothing."""
    lines = [line for line in pages.joined(command.text.split("\n"))
             if not entry_for(pages.plain(line))]
    return "\n".join(lines) if any(pages.plain(line) for line in lines) else ""
