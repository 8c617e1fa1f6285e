"""What a built bundle needs and what it shows.
usage: plugin_binary.py SHARED_OBJECT [--instrumented] [--account-classes]

It may need the C and the C++ run time and the two libraries it shares with its host, nothing else; and
since it is loaded into somebody else's process, none of its own symbols may be seen there. It registers
classes there, so no dlclose may unload it.
--instrumented allows the run time of sanitizers and of counted branches, --account-classes what describes
the interfaces of account creators and notifiers.
"""

import re
import subprocess
import sys
from pathlib import Path

from report import finish

NEEDED = re.compile(
    r"(libstdc\+\+\.so\.6|libm\.so\.6|libgcc_s\.so\.1|libc\.so\.6|ld-linux-[\w-]+\.so\.\d"
    r"|libaccount-retirement-(propertylist|platform)\.so\.\d+\.\d+)"
)
SANITIZERS = re.compile(r"lib(asan|ubsan|tsan)\.so\.\d+|lib(pthread|dl|rt|resolv)\.so\.\d")
FROM_COMPILER = re.compile(r"_*(asan|ubsan|tsan|odr)_|__llvm_profile_|__(start|stop)___llvm_prf_")
# Templates of the standard library, and what describes the shared libraries' classes, are emitted by
# every object that uses them and are weak everywhere.
SHARED_WEAK = re.compile(
    r"(vtable for |typeinfo for |typeinfo name for |guard variable for |VTT for )?"
    r"([^()]* )?((std|__gnu_cxx|platform|propertylist)::|operator (new|delete))"
)

ACCOUNT_CLASSES = re.compile(
    r"(vtable|typeinfo|typeinfo name) for accountsettings::\w+(Class|Creator|Notifier|Protocol)$"
)


def lines_of(*command: str) -> list[str]:
    return subprocess.run(command, check=True, capture_output=True, text=True).stdout.splitlines()


def needed(binary: Path) -> list[str]:
    """The shared libraries that the loader would fetch for `binary`."""
    rows = (re.search(r"\(NEEDED\).*\[(.*)\]", line) for line in lines_of("readelf", "-dW", str(binary)))
    return [row[1] for row in rows if row]


def stays_loaded(binary: Path) -> bool:
    """Whether the loader keeps `binary` until the process ends, whoever closes it."""
    rows = lines_of("readelf", "-dW", str(binary))
    return any("(FLAGS_1)" in row and "NODELETE" in row.split() for row in rows)


def exported(binary: Path) -> list[tuple[str, str]]:
    """Kind letter and readable name of each symbol that `binary` defines for others."""
    rows = (line.split(maxsplit=2) for line in lines_of("nm", "-DC", "--defined-only", str(binary)))
    return [(row[1], row[2]) for row in rows if len(row) == 3]


def check(binary: Path, instrumented: bool, account_classes: bool = False) -> tuple[list[str], int]:
    """The problems, and the number of libraries and symbols that were looked at."""
    problems = []
    libraries = needed(binary)
    for name in libraries:
        if not NEEDED.fullmatch(name) and not (instrumented and SANITIZERS.fullmatch(name)):
            problems.append(f"{binary}: needs {name}")
    if not stays_loaded(binary):
        problems.append(f"{binary}: can be unloaded")
    symbols = exported(binary)
    for kind, name in symbols:
        shared = SHARED_WEAK.match(name) or account_classes and ACCOUNT_CLASSES.match(name)
        weak = kind in "VWu" and shared
        from_compiler = instrumented and FROM_COMPILER.match(name)
        if not weak and not from_compiler:
            problems.append(f"{binary}: shows the symbol {name} ({kind})")
    return problems, len(libraries) + 1 + len(symbols)


if __name__ == "__main__":
    options = sys.argv[2:]
    finish(*check(Path(sys.argv[1]), "--instrumented" in options, "--account-classes" in options),
           "libraries and symbols")
