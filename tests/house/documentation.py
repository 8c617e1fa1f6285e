"""Whether what the documents point at exists.   usage: documentation.py TREE

Looks at every Markdown file: the targets of links, the paths between back quotes, the project's own
commands and the options shown with them.
"""

import re
import subprocess
import sys
from pathlib import Path

from report import finish

SKIPPED = {".git", "build", "out", "data"}
LINK = re.compile(r"\[[^\]]*\]\(([^)\s]+)\)")
CODE = re.compile(r"`([^`\n]+)`")
# A path between back quotes: begins with a folder at the top of the tree.
PATH = re.compile(r"[\w.-]+(?:/[\w.{}-]*)+")
# The project's own commands, at the beginning of a line of a code block or between back quotes.
COMMAND = re.compile(r"(?:\./(check|demo)|(migration-host|device-image|account-settings))\b([^`#|]*)")


def anchors(path: Path) -> set[str]:
    """The anchors that the headings of a Markdown file make."""
    heads = re.findall(r"^#+ +(.*)$", path.read_text(encoding="utf-8"), re.MULTILINE)
    return {re.sub(r"[^\w\- ]", "", head.lower()).replace(" ", "-") for head in heads}


def link_problem(file: Path, target: str) -> str | None:
    if re.match(r"[a-z]+:", target):
        return None  # another site
    name, _, anchor = target.partition("#")
    path = file.parent / name if name else file
    if not path.exists():
        return f"links to {target}, which does not exist"
    if anchor and path.suffix == ".md" and anchor not in anchors(path):
        return f"links to {target}, but there is no such heading"
    return None


def link_problems(folder: Path) -> tuple[list[str], int]:
    """The links of the Markdown files below the folder that lead nowhere, and the number of links."""
    problems, count = [], 0
    for file in sorted(folder.rglob("*.md")):
        for target in LINK.findall(file.read_text(encoding="utf-8")):
            count += 1
            if problem := link_problem(file, target):
                problems.append(f"{file.relative_to(folder)}: {problem}")
    return problems, count


def path_problem(tree: Path, text: str) -> str | None:
    """A path into the tree must exist; one that begins elsewhere is none of this check's business."""
    top = text.split("/")[0]
    if not PATH.fullmatch(text) or top in {".", "build"} or not (tree / top).is_dir():
        return None
    return None if (tree / text).exists() else f"names {text}, which does not exist"


class Commands:
    """The commands that documents may show, with the options that their --help lists."""

    def __init__(self, tree: Path, programs: Path | None):
        self._tree, self._programs, self._help = tree, programs, {}

    def problem(self, match: re.Match) -> str | None:
        script, program, rest = match.groups()
        if program and self._programs is None:
            return None
        path = self._tree / script if script else self._programs / program
        if not path.exists():
            return f"shows {path.name}, which does not exist"
        if not path.stat().st_mode & 0o100:
            return f"shows {path.name}, which cannot be run"
        help_text = self._help_of(path, "")
        words = rest.split()
        if program and words and re.fullmatch(r"[a-z][a-z-]+", words[0]):
            if not re.search(rf"^\s+{words[0]}\b", help_text, re.MULTILINE):
                return f"shows {path.name} {words[0]}, which its --help does not know"
            help_text += self._help_of(path, words[0])
        for option in re.findall(r"(?<!\S)\[?(--[a-z][a-z-]*)", rest):
            if not re.search(rf"{option}\b", help_text):
                return f"shows {option} of {path.name}, which its --help does not know"
        return None

    def _help_of(self, path: Path, subcommand: str) -> str:
        key = (path, subcommand)
        if key not in self._help:
            command = [str(path), *([subcommand] if subcommand else []), "--help"]
            done = subprocess.run(command, capture_output=True, text=True, timeout=60)
            self._help[key] = done.stdout
        return self._help[key]


def check(tree: Path, programs: Path | None) -> tuple[list[str], int]:
    """The problems, and the number of references that were looked at. `programs` is the folder with
    the built tools; without it only the scripts' options are looked at."""
    problems, count = [], 0
    commands = Commands(tree, programs)
    for file in sorted(tree.rglob("*.md")):
        if SKIPPED & set(file.relative_to(tree).parts):
            continue
        in_block = False
        for number, line in enumerate(file.read_text(encoding="utf-8").splitlines(), 1):
            if line.startswith("```"):
                in_block = not in_block
            found = [link_problem(file, link) for link in LINK.findall(line)]
            spans = CODE.findall(line)
            found += [path_problem(tree, span) for span in spans]
            if in_block or line.startswith("    "):
                spans = [line.strip().removeprefix("$ ")]
            matches = [COMMAND.match(span) for span in spans]
            found += [commands.problem(match) for match in matches if match]
            count += len(found)
            problems += [f"{file}:{number}: {problem}" for problem in found if problem]
    return problems, count


if __name__ == "__main__":
    finish(*check(Path(sys.argv[1]).resolve(), Path(sys.argv[2])), "references in documents")
