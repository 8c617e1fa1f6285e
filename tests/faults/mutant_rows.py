"""Whether the tests notice mutants of the merge, the save and the readers: row Q2 of docs/reliability.md."""

import os
import pathlib
import subprocess

import branch_mutants

TOP = pathlib.Path(__file__).resolve().parents[2]
BUILD = pathlib.Path(os.environ.get("BUILD", TOP / "build/release"))
STORE = ["QuillnetAccountTypeRemoval/ASSAccountsManagerSaving.cpp",
         "QuillnetAccountTypeRemoval/SettingsFileWriting.cpp"]
READERS = ["propertylist/BinaryReader.cpp", "propertylist/BinaryReaderValues.cpp", "propertylist/XMLReader.cpp",
           "propertylist/XMLScanner.cpp"]
STORE_SUITES = "Merge.*:Saving*:SettingsFile*:*Fixers*:Malformed*"
READER_SUITES = "*Binary*:*XML*:*Files*:*Reading*"
# Mutants that are the same program. What both have and memory has changed is in the result already, and would come
# again with the same value; a file that could not be made has no descriptor.
SAME = {("if (onDisk.contains(now.key())) continue;", "never"),
        ("if (_isThere) _descriptor = opened.descriptor;", "never")}
# Per cent of the mutants; of the readers' a few more only cost time.
ENOUGH = {"propertylist": 95}


def tests_of(program, suites):
    """A command for each case, since much of the state under test is kept per process."""
    listed = subprocess.run([program, "--gtest_list_tests", f"--gtest_filter={suites}"], check=True,
                            stdout=subprocess.PIPE, text=True).stdout.splitlines()
    suite, commands = "", []
    for line in listed:
        if not line.startswith(" "):
            suite = line.split()[0] if line else suite
        else:
            commands.append(["{program}", f"--gtest_filter={suite}{line.split()[0]}"])
    return commands


def is_same(source, place):
    _, line, kind = place.split()
    return ((TOP / source).read_text(encoding="utf-8").splitlines()[int(line) - 1].strip(), kind) in SAME


def mutants(_found, directory, _is_full):
    store = branch_mutants.Program(
        BUILD, "bin/account_settings_test", tests_of(BUILD / "bin/account_settings_test", STORE_SUITES))
    library = next(path.name for path in (BUILD / "lib").glob("libaccount-retirement-propertylist.so.*.*.*"))
    readers = branch_mutants.Program(
        BUILD, f"lib/{library}", [[str(BUILD / "bin/propertylist_test"), "--gtest_fail_fast", f"--gtest_filter={READER_SUITES}"],
                                  [str(BUILD / "bin/fault_lists"), "odd-files"]])
    total, bad = 0, []
    for source in [*STORE, *READERS]:
        program = store if source in STORE else readers
        count, left = branch_mutants.survivors(source, program, directory / source.replace("/", "-"))
        left = [place for place in left if not is_same(source, place)]
        score = 100 * (count - len(left)) / count
        print(f"     Q2 {source}: {count} mutants, {len(left)} not noticed, {score:.1f} %", flush=True)
        total += count
        if score < ENOUGH.get(source.split("/", maxsplit=1)[0], 100):
            bad += [(source, place) for place in left]
    return total, bad


ROWS = {"Q2": ("mutants of branches are noticed by the tests", mutants)}
