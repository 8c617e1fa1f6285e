"""Whether every source of the floors and of the tests is built.   usage: built_tests.py TREE BUILD

A test file that no target builds passes for ever. BUILD is the build folder, whose
compile_commands.json lists what is compiled.
"""

import json
import sys
from pathlib import Path

from report import finish

FLOORS = ["propertylist", "platform", "QuillnetAccountTypeRemoval", "localdata", "migrator",
          "deviceimage", "accountservices", "host", "tools"]


def check(tree: Path, build: Path) -> tuple[list[str], int]:
    """The problems, and the number of files that were looked at."""
    commands = json.loads((build / "compile_commands.json").read_text(encoding="utf-8"))
    built = {(Path(entry["directory"]) / entry["file"]).resolve() for entry in commands}
    files = [path for floor in FLOORS for path in (tree / floor).rglob("*.cpp")]
    files += (tree / "tests").rglob("*.cpp")
    missing = [path for path in sorted(files) if path.resolve() not in built]
    return [f"{path}: no target builds it" for path in missing], len(files)


if __name__ == "__main__":
    finish(*check(Path(sys.argv[1]), Path(sys.argv[2])), "source files")
