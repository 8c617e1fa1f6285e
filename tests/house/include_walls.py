"""Whether an #include crosses a wall of the house.   usage: include_walls.py TREE

Somebody who ports the plug-in implements platform/ and changes nothing else; that stays true only as
long as no floor of the plug-in reaches past platform/, and nothing below the plug-in reaches into it.
"""

import re
import sys
from pathlib import Path

from report import finish

# For each floor: the folders, or single headers, it may include besides its own, and the libraries. "posix" stands for
# the headers of the C library that are not standard C++.
FLOORS = {
    "propertylist": ([], ["posix"]),
    "platform": (["propertylist"], ["posix"]),
    "QuillnetAccountTypeRemoval": (["propertylist", "platform"], ["posix"]),
    "localdata": (["propertylist", "platform", "QuillnetAccountTypeRemoval"], ["posix"]),
    "migrator": (
        ["propertylist", "platform", "QuillnetAccountTypeRemoval", "localdata"],
        ["posix"],
    ),
    "deviceimage": (["propertylist", "platform"], ["posix", "sqlite3", "nettle", "fmt"]),
    "accountservices": (
        [
            "propertylist", "platform", "deviceimage/DeviceImage.h", "deviceimage/Journal.h",
            "QuillnetAccountTypeRemoval/ASSBasicAccount.h",
            "QuillnetAccountTypeRemoval/AccountChanges.h",
            "QuillnetAccountTypeRemoval/AccountConstants.h",
            "QuillnetAccountTypeRemoval/AccountCreatorClasses.h",
        ],
        ["posix"],
    ),
    "accountsdatamigrator": (
        [
            "propertylist", "platform", "QuillnetAccountTypeRemoval/AccountConstants.h",
            "QuillnetAccountTypeRemoval/AccountsDataMigrator.h",
            "QuillnetAccountTypeRemoval/PropertyNumbers.h",
            "QuillnetAccountTypeRemoval/SettingsFileWriting.h",
        ],
        [],
    ),
    "host": (
        [
            "propertylist", "platform", "deviceimage",
            "QuillnetAccountTypeRemoval/AccountsDataMigrator.h",
        ],
        ["posix", "fmt", "nlohmann"],
    ),
    "tools": (
        [
            "propertylist", "platform", "QuillnetAccountTypeRemoval", "localdata", "deviceimage",
            "host",
        ],
        ["posix", "sqlite3", "fmt", "nlohmann", "CLI"],
    ),
}

POSIX = set(
    """aio.h dirent.h dlfcn.h errno.h fcntl.h fnmatch.h getopt.h glob.h grp.h libgen.h limits.h link.h
    locale.h poll.h pthread.h pwd.h sched.h semaphore.h signal.h spawn.h stdint.h stdio.h stdlib.h
    string.h strings.h syslog.h termios.h time.h unistd.h utime.h wchar.h""".split()
)
INCLUDE = re.compile(r"\s*#\s*(?:include|include_next|import)\b\s*(.*)")
SOURCES = {".h", ".hpp", ".inc", ".c", ".cc", ".cpp", ".in"}


def library(header: str) -> str:
    """The library that the header in angle brackets belongs to; "standard" for standard C++."""
    if re.fullmatch(r"[a-z_]+", header) or header == "cxxabi.h":
        return "standard"  # no other header goes without a suffix
    if header in POSIX or header.split("/")[0] in {"sys", "linux"}:
        return "posix"
    return header.split("/")[0].removesuffix(".h")


def problem_of(floor: str, in_tests: bool, argument: str) -> str | None:
    """What is wrong with `#include argument` on this floor, if anything. Is the file for tests only?"""
    folders, libraries = FLOORS[floor]
    if match := re.match(r"<([^>]+)>", argument):
        name = library(match[1])
        if name in FLOORS:
            return f"includes {match[0]} in angle brackets; a header of the house is quoted"
        if name != "standard" and name not in libraries:
            return f"{floor} must not include {match[0]}"
        return None
    if match := re.match(r'"([^"]+)"', argument):
        folder = match[1].split("/")[0]
        if "/" not in match[1] or ".." in match[1].split("/"):
            return f"includes {match[0]}, which is not written from the top of the tree"
        if folder != floor and folder not in folders and match[1] not in folders:
            return f"{floor} must not include {match[0]}"
        if match[1].startswith("platform/testing/") and not in_tests:
            return f"includes {match[0]}, which is for tests"
        return None
    return f"includes {argument.strip()}, which cannot be read without the preprocessor"


def check(tree: Path) -> tuple[list[str], int]:
    """The problems, and the number of #include lines that were looked at."""
    problems, count = [], 0
    for floor in FLOORS:
        for path in sorted((tree / floor).rglob("*")):
            if path.suffix not in SOURCES or not path.is_file():
                continue
            in_tests = "testing" in path.parts
            for number, line in enumerate(path.read_text(encoding="utf-8").splitlines(), 1):
                match = INCLUDE.match(line)
                if match is None:
                    continue
                count += 1
                if problem := problem_of(floor, in_tests, match[1]):
                    problems.append(f"{path}:{number}: {problem}")
    return problems, count


if __name__ == "__main__":
    finish(*check(Path(sys.argv[1])), "#include lines")
