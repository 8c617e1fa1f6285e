"""Programs that are wrong on purpose: row Q3 of docs/reliability.md. Each control changes a copy of the sources,
builds what its row needs and expects the row to have bad cases; a row that stays green proves nothing."""

import collections
import os
import pathlib
import shutil
import subprocess

import matrix
import save_rows

TOP = pathlib.Path(__file__).resolve().parents[2]
HOST = ["device-image", "migration-host", "QuillnetAccountRemoval", "bundle_resources"]

# `changes` are (file, what stands there, what stands there instead), each for every place in the file.
Control = collections.namedtuple("Control", "name row targets changes")
CONTROLS = [
    Control("a writer that writes in place", "S3", ["fault_saver", "device-image"], [
        ("platform/posix/PosixFileServices.cpp", "if (std::rename(from.c_str(), to.c_str()) != 0)",
         "if (!(std::ofstream(to, std::ofstream::trunc) << std::ifstream(from).rdbuf()) ||"
         " std::remove(from.c_str()) != 0)"),
        ("platform/posix/PosixFileServices.cpp", "#include <cstdio>", "#include <cstdio>\n#include <fstream>")]),
    Control("a merge that prefers the disk", "R4", ["fault_merges"], [
        ("QuillnetAccountTypeRemoval/ASSAccountsManagerSaving.cpp",
         "changedInMemory ? Dictionary::Entry(disk.key(), *now) : disk", "changedInMemory ? disk : disk")]),
    Control("a merge that does not know what it has merged", "M1", HOST, [
        ("deviceimage/RecordPlacer.cpp", "if (_isThere(candidate)) {", "if (false && _isThere(candidate)) {"),
        ("deviceimage/Schema.h", "  UNIQUE (store, kind, base_uid, content_hash),\n", "")]),
    Control("a reader without a limit of depth", "R1", ["fault_lists"], [
        ("propertylist/BinaryReader.cpp", "> kMaximumDepth", "> std::size_t{1} << 40U"),
        ("propertylist/BinaryReader.cpp", ">= kMaximumDepth", ">= std::size_t{1} << 40U")]),
    Control("a writer without fsync", "S4", ["fault_saver", "device-image"], [
        ("QuillnetAccountTypeRemoval/SettingsFileWriting.cpp",
         "_files.makePrivate(_descriptor).isSuccess() &&\n"
         "                          _files.synchronizeFile(_descriptor).isSuccess();",
         "_files.makePrivate(_descriptor).isSuccess();")]),
]


def copy_of_the_tree(directory):
    names = subprocess.run(["git", "ls-files", "-co", "--exclude-standard"], cwd=TOP, check=True,
                           stdout=subprocess.PIPE, text=True).stdout.splitlines()
    for name in names:
        if (TOP / name).is_file():
            (directory / name).parent.mkdir(parents=True, exist_ok=True)
            shutil.copy2(TOP / name, directory / name)


class Copy:
    """A copy of the sources with a build folder of its own."""

    def __init__(self, directory):
        self.top = directory
        copy_of_the_tree(directory)
        self.environment = {**os.environ, "CCACHE_BASEDIR": str(directory), "CCACHE_NOHASHDIR": "1"}
        launcher = ["-DCMAKE_CXX_COMPILER_LAUNCHER=ccache"] if shutil.which("ccache") else []
        self._run(["cmake", "--preset", "release", *launcher])

    def _run(self, command):
        done = subprocess.run(command, cwd=self.top, env=self.environment, check=False, text=True,
                              stdout=subprocess.PIPE, stderr=subprocess.STDOUT)
        if done.returncode != 0:
            raise SystemExit(f"{' '.join(command)}: {done.stdout[-2000:]}")

    def build(self, targets):
        """The programs by name."""
        self._run(["cmake", "--build", "--preset", "release", "-j", str(os.cpu_count()), "--target", *targets])
        programs = self.top / "build/release/bin"
        return {path.name: str(path) for path in programs.iterdir()}

    def change(self, changes):
        for name, old, new in changes:
            path = self.top / name
            text = path.read_text(encoding="utf-8")
            if old not in text:
                raise SystemExit(f"{name} has changed: there is no '{old}' to be made wrong")
            path.write_text(text.replace(old, new), encoding="utf-8")

    def restore(self, changes):
        for name in {name for name, _, _ in changes}:
            shutil.copy(TOP / name, self.top / name)


def bad_cases(row, make, found, directory):
    return make(found, directory, False)[1]


def try_controls(rows, directory):
    (directory / "copy").mkdir()
    copy = Copy(directory / "copy")
    green, count = [], 0
    for number, control in enumerate(CONTROLS):
        if control.row not in rows:
            print(f"     Q3 {control.name}: skipped, this needs row {control.row}", flush=True)
            continue
        count += 1
        copy.change(control.changes)
        place = directory / f"control{number}"
        place.mkdir()
        _, make = rows[control.row]
        bad = bad_cases(control.row, make, copy.build(control.targets), place)
        copy.restore(control.changes)
        print(f"     Q3 {control.name}: row {control.row} has {len(bad)} bad cases", flush=True)
        if not bad:
            green.append((control.name, f"row {control.row} stays green"))
    return count, green


def rows_about(rows):
    """The row that tries the given ones."""
    def controls(_found, directory, _is_full):
        return try_controls(rows, directory)
    return {"Q3": ("programs that are wrong on purpose turn their rows red", controls)}
