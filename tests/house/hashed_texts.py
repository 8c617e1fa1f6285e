"""Whether a table is hashed by texts that come from files.   usage: hashed_texts.py TREE

The standard hash of a text is known, so whoever writes a settings file can choose texts that all meet in
one place of a hash table, and every look-up then walks over all of them: a file of a few megabytes would
take hours to read. Ordered containers cannot be led astray. So in the readers and in the plug-in no table
is hashed by a text. Addresses are fine as keys; nobody outside chooses them.
"""

import re
import sys
from pathlib import Path

from report import finish

FLOORS = ["propertylist", "platform", "QuillnetAccountTypeRemoval", "localdata", "migrator"]
SOURCES = {".h", ".cpp"}
TABLE = re.compile(r"\b(?:unordered_)?(?:multi)?(?:map|set)\s*<\s*([^,>]*)")
HASHED = re.compile(r"\bunordered_")
COMMENT = re.compile(r"//[^\n]*")


def is_address(key: str) -> bool:
    """Whether the key of a table is an address: a pointer, or one of the names for a shared one."""
    return key.strip().endswith("*") or key.strip().endswith("Ptr")


def check(tree: Path) -> tuple[list[str], int]:
    """The problems, and the number of tables, ordered ones too, that were looked at."""
    problems, count = [], 0
    for floor in FLOORS:
        for path in sorted((tree / floor).rglob("*")):
            if path.suffix not in SOURCES or "testing" in path.parts:
                continue
            source = COMMENT.sub("", path.read_text(encoding="utf-8"))
            for match in TABLE.finditer(source):
                count += 1
                if HASHED.match(match[0]) and not is_address(match[1]):
                    line = source.count("\n", 0, match.start()) + 1
                    problems.append(
                        f"{path}:{line}: hashed by {match[1].strip()}, which a file may choose; "
                        "take an ordered table"
                    )
    return problems, count


if __name__ == "__main__":
    finish(*check(Path(sys.argv[1])), "tables")
