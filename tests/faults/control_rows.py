"""Programs that are wrong on purpose: row Q3 of docs/reliability.md. Each control changes a copy of the sources,
builds what its row needs and expects the row to have bad cases of the kind that the change brings about; a row
that stays green proves nothing. First the same copy has to pass unchanged."""

import collections
import os
import pathlib
import re
import shutil
import subprocess
import time

import matrix

TOP = pathlib.Path(__file__).resolve().parents[2]
HOST = ["device-image", "migration-host", "QuillnetAccountRemoval", "bundle_resources"]

# `changes` are (file, what stands there, what stands there instead), each for every place in the file; `sign` is
# what the row says of the cases that the change makes bad.
Control = collections.namedtuple("Control", "name row sign targets changes")
CONTROLS = [
    Control("a writer that writes in place", "S3", "neither the old nor the new one|is gone",
            ["fault_saver", "device-image"], [
        ("platform/posix/PosixFileServices.cpp", "if (std::rename(from.c_str(), to.c_str()) != 0)",
         "if (!(std::ofstream(to, std::ofstream::trunc) << std::ifstream(from).rdbuf()) ||"
         " std::remove(from.c_str()) != 0)"),
        ("platform/posix/PosixFileServices.cpp", "#include <cstdio>", "#include <cstdio>\n#include <fstream>")]),
    Control("a merge that prefers the disk", "R4", "over", ["fault_merges"], [
        ("QuillnetAccountTypeRemoval/ASSAccountsManagerSaving.cpp",
         "changedInMemory ? Dictionary::Entry(disk.key(), *now) : disk", "changedInMemory ? disk : disk")]),
    # A migration that nothing disturbs has nothing to do twice and goes well.
    Control("a merge that does not know what it has merged", "M1", "ended with 5: .* doubled in the local stores", HOST, [
        ("deviceimage/RecordPlacer.cpp", 't.content = r.content"',
         't.content = r.content AND t.source_account IS NULL"'),
        ("deviceimage/Schema.h", "  UNIQUE (store, kind, base_uid, content_hash),\n", "")]),
    Control("a reader without a limit of depth", "R1", "depth.*Segmentation fault", ["fault_lists"], [
        ("propertylist/BinaryReader.cpp", "> kMaximumDepth", "> std::size_t{1} << 40U"),
        ("propertylist/BinaryReader.cpp", ">= kMaximumDepth", ">= std::size_t{1} << 40U")]),
    Control("a writer without fsync", "S4", "neither the old nor the new one|is lost|is gone",
            ["fault_saver", "device-image"], [
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


def run_row(control, make, found, place):
    """All bad cases, and those that show the sign of the control. The row prints what it has to say."""
    place.mkdir()
    _, bad = matrix.run_row(make, found, place, False)
    shutil.rmtree(place)
    return bad, [text for _, text in bad if re.search(control.sign, text)]


def possible_controls(why_skipped):
    """Those whose row can be tried here. The others are told of."""
    possible = []
    for control in CONTROLS:
        if reason := why_skipped(control.row):
            print(f"     Q3 {control.name}: skipped, row {control.row} {reason}", flush=True)
        else:
            possible.append(control)
    return possible


def try_controls(rows, controls, directory):
    """A case for each control: its row with the unchanged programs, then with the changed ones."""
    (directory / "copy").mkdir()
    copy = Copy(directory / "copy")
    wrong = []
    unchanged = copy.build(sorted({target for control in controls for target in control.targets}))
    for control in controls:
        begin = time.monotonic()
        _, make = rows[control.row]
        bad, _ = run_row(control, make, unchanged, directory / "unchanged")
        if bad:
            wrong.append((control.name, f"row {control.row} is red without any change: {bad[0]}"))
            continue
        copy.change(control.changes)
        bad, signs = run_row(control, make, copy.build(control.targets), directory / "changed")
        copy.restore(control.changes)
        copy.build(control.targets)
        print(f"     Q3 {control.name}: row {control.row} has {len(bad)} bad cases, such as {bad[:1]};"
              f" {time.monotonic() - begin:.0f} s", flush=True)
        if not signs:
            wrong.append((control.name, f"row {control.row} does not notice"))
    shutil.rmtree(directory / "copy")
    return len(controls), wrong


def rows_about(rows, why_skipped):
    """The row that tries the given ones, but for those of which `why_skipped` has something to say."""
    def controls(_found, directory, _is_full):
        return try_controls(rows, possible_controls(why_skipped), directory)
    return {"Q3": ("programs that are wrong on purpose turn their rows red", controls)}
