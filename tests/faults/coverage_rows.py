"""The branches that tests reach in the parts on which the promises stand: row Q1 of docs/reliability.md.

They are the conditions of the source, each with two outcomes, as clang counts them; those that macros of the
standard library bring along are its own."""

import collections
import json
import os
import pathlib
import re
import shutil
import subprocess

TOP = pathlib.Path(__file__).resolve().parents[2]
BUILD = TOP / "build/branches"
LIBRARIES = ["propertylist", "platform"]
PROGRAMS = ["propertylist_test", "account_settings_test", "platform_test", "localdata_tests", "migrator_tests",
            "deviceimage_test"]
GOAL = 98
GROUPS = {
    "readers": ["propertylist/BinaryReader.cpp", "propertylist/BinaryReaderValues.cpp", "propertylist/DateText.cpp",
                "propertylist/LeafText.cpp", "propertylist/Reading.cpp",
                "propertylist/UTF8.cpp", "propertylist/XMLReader.cpp", "propertylist/XMLScanner.cpp"],
    "writer": ["propertylist/BinaryWriter.cpp", "propertylist/ValueCount.cpp", "propertylist/XMLWriter.cpp"],
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


def run(command, **environment):
    done = subprocess.run(command, cwd=TOP, check=False, text=True, capture_output=True,
                          env={**os.environ, **environment})
    if done.returncode != 0:
        raise SystemExit(f"{' '.join(map(str, command))}: {(done.stdout + done.stderr)[-2000:]}")
    return done.stdout


def run_tests(directory):
    """Builds the tests and runs them; the profile that they leave."""
    launcher = ["-DCMAKE_CXX_COMPILER_LAUNCHER=ccache"] if shutil.which("ccache") else []
    run(["cmake", "--preset", "branches", *launcher])
    run(["cmake", "--build", "--preset", "branches", "-j", str(os.cpu_count()), "--target", *PROGRAMS])
    run(["ctest", "--test-dir", BUILD, "-j", str(os.cpu_count()), "-R", f"^({'|'.join(PROGRAMS)})\\.",
         "--no-tests=error"], LLVM_PROFILE_FILE=str(directory / "raw-%4m.profraw"))
    profile = directory / "tests.profdata"
    run(["llvm-profdata-14", "merge", "-sparse", "-o", profile, *directory.glob("raw-*.profraw")])
    return profile


def outcomes(profile):
    """How often each outcome of each condition came: {file: {(line, column, outcome): count}}."""
    objects = [BUILD / f"lib/libaccount-retirement-{name}.so" for name in LIBRARIES]
    objects += [BUILD / "bin" / name for name in PROGRAMS]
    report = run(["llvm-cov-14", "export", "-format=text", "-skip-functions", f"-instr-profile={profile}",
                  objects[0], *[word for name in objects[1:] for word in ("-object", name)]])
    counts = collections.defaultdict(collections.Counter)
    for entry in json.loads(report)["data"][0]["files"]:
        path = pathlib.Path(entry["filename"]).resolve()
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
    counts = outcomes(run_tests(directory))
    total, bad = 0, []
    for group, names in GROUPS.items():
        missed = [(name, *place) for name in names for place, count in sorted(counts[name].items()) if count == 0]
        count = sum(len(counts[name]) for name in names)
        share = 100 * (count - len(missed)) / count
        print(f"     Q1 {group}: {count - len(missed)} of {count} branches, {share:.1f} %", flush=True)
        for name, line, column, outcome in missed:
            print(f"        {name}:{line}:{column} is never {str(outcome).lower()}", flush=True)
        total += count
        if share < GOAL and group not in WITHOUT_GOAL:
            bad.append((group, f"fewer than {GOAL} %"))
    return total, bad


ROWS = {"Q1": (f"branches that tests reach, {GOAL} % of each group", coverage)}
