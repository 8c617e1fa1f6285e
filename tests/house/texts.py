"""Whether every text of the plug-in is compared literally in a test.   usage: texts.py TREE

Programs and people read the log by these texts, and a misspelling in one of them is there on purpose. So
every sentence among the string literals of the plug-in's floors, and every exported constant, must stand
in a literal of a test, with anything in the places of its arguments.
"""

import re
import sys
from pathlib import Path

from report import finish

FLOORS = ["QuillnetAccountTypeRemoval", "localdata", "migrator"]
LITERAL = re.compile(r'"((?:[^"\\\n]|\\.)*)"')
RAW = re.compile(r'R"(\w*)\((.*?)\)\1"', re.DOTALL)
ARGUMENT = re.compile(r"%(?:@|s|d|ld)")


def without_comments(source: str) -> str:
    """`source` without its comments and #include lines; string literals stay as they are."""
    token = re.compile(r'"(?:[^"\\\n]|\\.)*"|//[^\n]*|/\*.*?\*/', re.DOTALL)
    source = token.sub(lambda match: match[0] if match[0].startswith('"') else " ", source)
    source = re.sub(r"^\s*#.*$", "", source, flags=re.MULTILINE)
    # Why a status is dropped is written for the reader of the source only.
    return re.sub(r'\.ignore\(\s*"[^"]*"\s*\)', "", source)


def literals(source: str) -> list[str]:
    """The string literals of C++ or Python source; adjacent ones are one, as a compiler sees them."""
    source = re.sub(r'"\s*\n\s*"', "", without_comments(source))
    found = [match[1].replace('\\"', '"').replace("\\\\", "\\") for match in LITERAL.finditer(source)]
    return found + [match[2] for match in RAW.finditer(source)]


def is_sentence(text: str) -> bool:
    """Whether people read it: more than one word. Names, keys and paths are not meant."""
    return re.search(r"[A-Za-z]+[ :]+\S*[A-Za-z%]", text) is not None and "/" not in text


def is_compared(text: str, in_tests: str) -> bool:
    """Whether the text stands in a test. Its fixed parts may be in several literals, since a test may
    put an argument in between."""
    parts = [part.strip() for part in ARGUMENT.split(text)]
    return all(part in in_tests for part in parts if len(part) > 2)


def check(tree: Path) -> tuple[list[str], int]:
    """The problems, and the number of texts that were looked at."""
    tests = [path for path in (tree / "tests").rglob("*") if path.suffix in {".cpp", ".h"}]
    in_tests = "\n".join(
        text for path in tests for text in literals(path.read_text(encoding="utf-8"))
    )
    problems, count = [], 0
    for floor in FLOORS:
        for path in sorted((tree / floor).rglob("*")):
            if path.suffix not in {".h", ".cpp"}:
                continue
            for text in literals(path.read_text(encoding="utf-8")):
                if is_sentence(text) or path.name == "AccountConstants.h":
                    count += 1
                    if not is_compared(text, in_tests):
                        problems.append(f'{path}: no test compares "{text}"')
    return problems, count


if __name__ == "__main__":
    finish(*check(Path(sys.argv[1])), "texts")
