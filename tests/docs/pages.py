"""The project's pages as the tests of them read them: their code blocks, and the commands in these."""

import dataclasses
import pathlib
import re

SHELL = ("sh", "shell", "bash", "console")
FENCE = re.compile(r"( *)(`{3,}|~{3,})(.*)$")
# Markdown takes lines that are further in for code as well; nobody would run those.
INDENTED_COMMAND = re.compile(r" {4,}(sudo|scripts/|cmake|ctest|tuvosharing\w*|\$) ")


@dataclasses.dataclass
class Block:
    page: str      # from the project's folder
    line: int      # of the block's first line
    language: str  # empty when the page tells none
    lines: list    # without the page's indentation
    shown: list    # of a "text" block that follows at once: what it prints; else None

    @property
    def is_shell(self):
        return self.language in SHELL

    @property
    def place(self):
        return f"{self.page}:{self.line}"

    @property
    def file_name(self):
        """Under which name it is to be saved: "// share.cpp" in its first line says that."""
        named = re.fullmatch(r"// ([\w-]+\.(?:cpp|c))", self.lines[0]) if self.lines else None
        return named and named[1]


@dataclasses.dataclass
class Command:
    text: str     # as it is given to a shell
    output: list  # the lines that the page shows, None when it shows none


def all_pages(project):
    """Every page, from the project's folder."""
    project = pathlib.Path(project)
    files = [*project.glob("*.md"), *(project / "docs").rglob("*.md"),
             *(project / "bench").rglob("*.md"), *(project / "packaging").rglob("*.md")]
    return sorted(file.relative_to(project).as_posix() for file in files
                  if "node_modules" not in file.parts)


def blocks_of(project, page):
    """The code blocks of a page, in order."""
    lines = (pathlib.Path(project) / page).read_text(encoding="utf-8").split("\n")
    blocks, here, last_end = [], 0, None
    while here < len(lines):
        fence = FENCE.match(lines[here])
        here += 1
        if not fence:
            if "```" in lines[here - 1]:
                raise ValueError(f"{page}:{here}: a code block begins behind something else")
            if INDENTED_COMMAND.match(lines[here - 1]):
                raise ValueError(f"{page}:{here}: a command that stands in no code block")
            continue
        indent, begin, first = len(fence[1]), fence[2], here
        while lines[here].strip() != begin:
            here += 1
            if here == len(lines):
                raise ValueError(f"{page}:{first}: a code block without an end")
        inside = [line[indent:] for line in lines[first:here]]
        here += 1
        block = Block(page, first + 1, fence[3].strip(), inside, None)
        between = lines[last_end:first - 1] if last_end is not None else ["text"]
        if block.language == "text" and not any(line.strip() for line in between):
            blocks[-1].shown = inside
        blocks.append(block)
        last_end = here
    return blocks


def spans_of(project, page):
    """What stands between backticks in a page's sentences, each on one line."""
    text = (pathlib.Path(project) / page).read_text(encoding="utf-8")
    outside = re.sub(r"^ *```.*?^ *```$", "", text, flags=re.MULTILINE | re.DOTALL)
    return [re.sub(r"\s+", " ", span) for span in re.findall(r"`([^`]+)`", outside)]


def joined(lines):
    """The lines with those that end in a backslash put together with the next."""
    whole, open_line = [], None
    for line in lines:
        open_line = line if open_line is None else open_line + "\n" + line
        if not line.endswith("\\"):
            whole.append(open_line)
            open_line = None
    if open_line is not None:
        whole.append(open_line)
    return whole


def plain(line):
    """A command in one line, without its comment."""
    text = re.sub(r"\s*\\\n\s*", " ", line)
    return re.sub(r"(^|\s)#.*", "", text).strip()


def commands_of(block):
    """The commands of a shell block. In a "console" block those behind "$ " (and "> " where they
    go on), each with what it prints; any other block is one command."""
    if block.language != "console":
        return [Command("\n".join(block.lines), block.shown)]
    commands = []
    for line in block.lines:
        if line.startswith("$ "):
            commands.append(Command(line[2:], []))
        elif not commands:
            raise ValueError(f"{block.place}: a console block begins with \"$ \"")
        elif not commands[-1].output and (line.startswith("> ") or line == ">"):
            commands[-1].text += "\n" + line[2:]
        else:
            commands[-1].output.append(line)
    return commands
