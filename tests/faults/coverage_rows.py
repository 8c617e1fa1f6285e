"""The branches that tests reach in the parts on which the promises stand: row Q1 of docs/reliability.md.

They are the conditions of the source, each with two outcomes, as clang counts them; those that macros of the
standard library bring along are its own. `check --all` runs the tests of the same build and leaves their counts, which
are taken as long as nothing has been built and no test has been changed since."""

import collections
import json
import os
import pathlib
import re
import shutil
import subprocess

TOP = pathlib.Path(__file__).resolve().parents[2]
BUILD = TOP / "build/clang"
PROFILES = BUILD / "profiles"
COMPLETE = PROFILES / "complete"
LIBRARIES = ["propertylist", "platform"]
PROGRAMS = ["propertylist_test", "account_settings_test", "platform_test", "localdata_tests", "migrator_tests",
            "deviceimage_test"]
GOAL = 98
GROUPS = {
    "readers": ["propertylist/Arena.cpp", "propertylist/Arena.h", "propertylist/BinaryForm.h",
                "propertylist/BinaryReader.cpp", "propertylist/BinaryReader.h",
                "propertylist/BinaryReaderValues.cpp", "propertylist/DateText.cpp", "propertylist/LeafText.cpp",
                "propertylist/Reading.cpp", "propertylist/UTF8.cpp", "propertylist/UTF8.h",
                "propertylist/XMLReader.cpp", "propertylist/XMLScanner.cpp"],
    "writer": ["propertylist/BinaryWriter.cpp", "propertylist/BinaryWriterBytes.cpp",
               "propertylist/ValueCount.cpp", "propertylist/XMLWriter.cpp"],
    "values and tables": ["propertylist/Equality.cpp", "propertylist/Nodes.h", "propertylist/Storage.h",
                          "propertylist/TextTable.cpp", "propertylist/TextTable.h", "propertylist/Value.cpp",
                          "propertylist/Value.h", "QuillnetAccountTypeRemoval/IdentifierTable.h"],
    "loading and changing": ["QuillnetAccountTypeRemoval/ASSAccountsManagerLoading.cpp",
                             "QuillnetAccountTypeRemoval/ASSAccountsManagerMutations.cpp"],
    "merge and save": ["QuillnetAccountTypeRemoval/ASSAccountsManagerSaving.cpp",
                       "QuillnetAccountTypeRemoval/SettingsFileWriting.cpp"],
    "migration": ["localdata/ASSDeviceLocalAccountSettingsUI.cpp", "localdata/AccountSettingsUISyncDataController.cpp",
                  "localdata/DataclassFunctions.cpp", "localdata/LocalStores.cpp",
                  "migrator/MergeAndRemoveQuillnetAccounts.cpp"],
    "records of an image": ["deviceimage/ImageSyncDataSource.cpp", "deviceimage/RecordPlacer.cpp",
                            "deviceimage/RecordStores.cpp", "deviceimage/RecordStoresChanges.cpp",
                            "deviceimage/StoreRows.cpp"],
    # Rows S1 to S10 are about these; most that is missing here is a system call that fails.
    "calls of the system": ["propertylist/FileReading.cpp", "platform/posix/PosixFileServices.cpp",
                            "platform/posix/SetAside.cpp"],
}
WITHOUT_GOAL = {"calls of the system"}
# Conditions with one outcome only: endless loops, failures, which answer false, and the way past all cases of a
# switch that has every case.
NO_CONDITION = re.compile(r"true\b|(_scanner\.|_)?fail(At)?\(")


def run(command):
    done = subprocess.run(command, cwd=TOP, check=False, text=True, capture_output=True)
    if done.returncode != 0:
        raise SystemExit(f"{' '.join(map(str, command))}: {(done.stdout + done.stderr)[-2000:]}")
    return done.stdout


def objects():
    return [*(BUILD / f"lib/libaccount-retirement-{name}.so" for name in LIBRARIES),
            *(BUILD / "bin" / name for name in PROGRAMS)]


def build_tests():
    launcher = ["-DCMAKE_CXX_COMPILER_LAUNCHER=ccache"] if shutil.which("ccache") else []
    run(["cmake", "--preset", "clang", *launcher])
    run(["cmake", "--build", "--preset", "clang", "-j", str(os.cpu_count()), "--target", *PROGRAMS])


def are_counted():
    """Whether all tests have been run with the programs and the files that they read as they are now."""
    if not COMPLETE.exists():
        return False
    files = run(["git", "ls-files", "-co", "--exclude-standard", "tests", "resources"]).splitlines()
    newest = max(path.stat().st_mtime_ns for path in [*objects(), *(TOP / name for name in files)] if path.exists())
    return newest < COMPLETE.stat().st_mtime_ns


def run_tests():
    shutil.rmtree(PROFILES, ignore_errors=True)
    run(["ctest", "--test-dir", BUILD, "-j", str(os.cpu_count()), "-R", f"^({'|'.join(PROGRAMS)})\\.",
         "--no-tests=error"])
    COMPLETE.touch()


def merged_profile(directory):
    profile = directory / "tests.profdata"
    run(["llvm-profdata-14", "merge", "-sparse", "-o", profile, *PROFILES.glob("*.profraw")])
    return profile


def outcomes(profile):
    """How often each outcome of each condition came: {file: {(line, column, outcome): count}}."""
    first, *others = objects()
    report = run(["llvm-cov-14", "export", "-format=text", "-skip-functions", f"-instr-profile={profile}",
                  first, *[word for path in others for word in ("-object", path)]])
    counts = collections.defaultdict(collections.Counter)
    for entry in json.loads(report)["data"][0]["files"]:
        path = (BUILD / entry["filename"]).resolve()  # some compiler caches make names relative
        if not path.is_relative_to(TOP):
            continue
        name, text = str(path.relative_to(TOP)), path.read_text(encoding="utf-8").splitlines()
        for line, column, _, _, true, false, *_ in entry["branches"]:
            if NO_CONDITION.match(text[line - 1][column - 1:]) or \
                    text[line - 1][:column - 1].endswith("switch ("):
                continue
            counts[name][line, column, True] += true
            counts[name][line, column, False] += false
    return counts


def coverage(_found, directory, _is_full):
    build_tests()
    if not are_counted():
        run_tests()
    counts = outcomes(merged_profile(directory))
    total, bad = 0, []
    for group, names in GROUPS.items():
        missed = [(name, *place) for name in names for place, count in sorted(counts[name].items()) if count == 0]
        count = sum(len(counts[name]) for name in names)
        if lost := [name for name in names if not counts[name]]:
            bad.append((group, f"no branches of {', '.join(lost)} are counted"))
            continue
        share = 100 * (count - len(missed)) / count
        print(f"     Q1 {group}: {count - len(missed)} of {count} branches, {share:.1f} %", flush=True)
        for name, line, column, outcome in missed:
            print(f"        {name}:{line}:{column} is never {str(outcome).lower()}", flush=True)
        total += count
        if share < GOAL and group not in WITHOUT_GOAL:
            bad.append((group, f"fewer than {GOAL} %"))
    return total, bad


ROWS = {"Q1": (f"branches that tests reach, {GOAL} % of each group", coverage)}
