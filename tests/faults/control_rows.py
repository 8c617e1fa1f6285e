"""Programs that are wrong on purpose: row Q3 of docs/reliability.md. Each control changes copies of a few sources,
links what its row needs anew and expects the row to have bad cases of the kind that the change brings about; a row
that stays green proves nothing. With the programs as they are it has to be green."""

import collections
import concurrent.futures
import os
import pathlib
import re
import shutil
import subprocess
import time

import branch_mutants
import matrix

TOP = pathlib.Path(__file__).resolve().parents[2]

# `changes` are (file, what stands there, what stands there instead), each for every place in the file; `sign` is
# what the row says of the cases that the change makes bad; `programs` are those that the row uses, and `library` the
# shared one that they have the changed sources from, if they do.
Control = collections.namedtuple("Control", "name row sign library programs changes")
CONTROLS = [
    Control("a writer that writes in place", "S3", "neither the old nor the new one|is gone",
            "platform", ["fault_saver"], [
        ("platform/posix/PosixFileServices.cpp", "if (std::rename(from.c_str(), to.c_str()) != 0)",
         "if (!(std::ofstream(to, std::ofstream::trunc) << std::ifstream(from).rdbuf()) ||"
         " std::remove(from.c_str()) != 0)"),
        ("platform/posix/PosixFileServices.cpp", "#include <cstdio>", "#include <cstdio>\n#include <fstream>")]),
    Control("a merge that prefers the disk", "R4", "over", None, ["fault_merges"], [
        ("QuillnetAccountTypeRemoval/ASSAccountsManagerSaving.cpp",
         "changedInMemory ? Dictionary::Entry(disk.key(), *now) : disk", "changedInMemory ? disk : disk")]),
    # A migration that nothing disturbs has nothing to do twice and goes well.
    Control("a merge that does not know what it has merged", "M1", "ended with 5: .* doubled in the local stores",
            None, ["device-image", "migration-host"], [
        ("deviceimage/RecordPlacer.cpp", 't.content = r.content"',
         't.content = r.content AND t.source_account IS NULL"'),
        ("deviceimage/Schema.h", "  UNIQUE (store, kind, base_uid, content_hash),\n", "")]),
    Control("a reader without a limit of depth", "R1", "depth.*Segmentation fault",
            "propertylist", ["fault_lists"], [
        ("propertylist/BinaryReader.cpp", "> kMaximumDepth", "> std::size_t{1} << 40U"),
        ("propertylist/BinaryReader.cpp", ">= kMaximumDepth", ">= std::size_t{1} << 40U")]),
    Control("a writer without fsync", "S4", "neither the old nor the new one|is lost|is gone",
            None, ["fault_saver"], [
        ("QuillnetAccountTypeRemoval/SettingsFileWriting.cpp",
         "_files.makePrivate(_descriptor).isSuccess() &&\n"
         "                          _files.synchronizeFile(_descriptor).isSuccess();",
         "_files.makePrivate(_descriptor).isSuccess();")]),
]


def dependencies():
    """The files from which the build makes each of its objects, the source first."""
    listed = subprocess.run(["ninja", "-t", "deps"], cwd=matrix.BUILD, check=True, stdout=subprocess.PIPE,
                            text=True).stdout
    for entry in listed.split("\n\n"):
        paths = [os.path.normpath(matrix.BUILD / line.strip()) for line in entry.splitlines()[1:]]
        yield [os.path.relpath(path, TOP) for path in paths if path.startswith(f"{TOP}/")]


def sources_with(names):
    """The sources that are, or include, one of the files; not those of the tests."""
    return sorted({files[0] for files in dependencies()
                   if not names.isdisjoint(files) and not files[0].startswith("tests/")})


def change(changes, top):
    for name, old, new in changes:
        path = top / name
        if not path.exists():
            path.parent.mkdir(parents=True, exist_ok=True)
            shutil.copy(TOP / name, path)
        text = path.read_text(encoding="utf-8")
        if old not in text:
            raise SystemExit(f"{name} has changed: there is no '{old}' to be made wrong")
        path.write_text(text.replace(old, new), encoding="utf-8")


def compile_changed(source, top, output):
    command = branch_mutants.compiling(matrix.BUILD, source, str(output))
    if (top / source).exists():
        command[-1] = str(top / source)
    command.insert(1, f"-I{top}")  # before the headers as they are
    if branch_mutants.run(command, matrix.BUILD) != 0:
        raise SystemExit(f"{source} does not compile with the change")


def link(output, objects, place):
    """Links a file of the build folder with the objects into the same folder of `place`."""
    program = branch_mutants.Program(matrix.BUILD, output, [])
    made = program.link(objects, place / pathlib.Path(output).parent, f"-Wl,-rpath,{place}/lib")
    if made is None:
        raise SystemExit(f"{output} cannot be linked with the change")
    return made


def make_programs(control, place):
    """The programs with the change, by name, in a copy of what lies beside them in the build folder."""
    changed = place / "sources"
    change(control.changes, changed)
    objects = {}
    for source in sources_with({name for name, _, _ in control.changes}):
        objects[source] = str(place / f"{source.replace('/', '-')}.o")
        compile_changed(source, changed, objects[source])
    shutil.copytree(matrix.BUILD / "lib", place / "lib", symlinks=True)
    (place / "bin").mkdir()
    if control.library:
        link(branch_mutants.library(control.library), objects, place)
        objects = {}
    return {name: link(f"bin/{name}", objects, place) for name in control.programs}


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


def try_controls(rows, controls, green, found, directory):
    """A case for each control: its row with the programs as they are, then with the changed ones."""
    wrong = []
    places = [directory / f"control{number}" for number in range(len(controls))]
    with concurrent.futures.ThreadPoolExecutor(2) as pool:
        programs = list(pool.map(make_programs, controls, places))
    for control, changed in zip(controls, programs):
        begin = time.monotonic()
        _, make = rows[control.row]
        if control.row not in green:
            bad, _ = run_row(control, make, found, directory / "unchanged")
            if bad:
                wrong.append((control.name, f"row {control.row} is red without any change: {bad[0]}"))
                continue
        bad, signs = run_row(control, make, {**found, **changed}, directory / "changed")
        print(f"     Q3 {control.name}: row {control.row} has {len(bad)} bad cases, such as {bad[:1]};"
              f" {time.monotonic() - begin:.0f} s", flush=True)
        if not signs:
            wrong.append((control.name, f"row {control.row} does not notice"))
    for place in places:
        shutil.rmtree(place)
    return len(controls), wrong


def rows_about(rows, why_skipped, green):
    """The row that tries the given ones, but for those of which `why_skipped` has something to say. Those in `green`
    when it begins have just passed with the programs as they are."""
    def controls(found, directory, _is_full):
        return try_controls(rows, possible_controls(why_skipped), green, found, directory)
    return {"Q3": ("programs that are wrong on purpose turn their rows red", controls)}
