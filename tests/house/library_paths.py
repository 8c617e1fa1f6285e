"""Whether built programs look for their libraries in places of their own.   usage: library_paths.py BUILD

An empty or relative entry in a run path is the directory that a program is started in: whoever may write
there has a say in what the program does.
"""

import re
import subprocess
import sys
from pathlib import Path

from report import finish


def problems_in(listing: str) -> list[str]:
    """The entries of the run paths in the output of readelf -d that lead to no fixed place."""
    paths = re.findall(r"\((?:RUNPATH|RPATH)\).*\[(.*)\]", listing)
    return [f"the run path has the entry \"{entry}\"" for path in paths for entry in path.split(":")
            if not re.match(r"/|\$ORIGIN(/|$)", entry)]


def check(build: Path) -> tuple[list[str], int]:
    """The problems, and the number of programs and libraries that were looked at."""
    files = [path for folder in ("bin", "lib", "tests") for path in sorted((build / folder).rglob("*"))
             if path.is_file() and not path.is_symlink()]
    found = [path for path in files if path.open("rb").read(4) == b"\x7fELF" and path.suffix != ".o"]
    problems = []
    for path in found:
        listing = subprocess.run(["readelf", "-d", str(path)], check=True, capture_output=True, text=True).stdout
        problems += [f"{path}: {problem}" for problem in problems_in(listing)]
    return problems, len(found)


if __name__ == "__main__":
    finish(*check(Path(sys.argv[1])), "programs and libraries")
