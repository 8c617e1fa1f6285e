"""Hosts that run at the same time, once more, and over what a killed run has left: row M5 of docs/reliability.md."""

import subprocess
import sys

import matrix
import migration_report as report
from migration_image import SELECTED, environment
from migration_rows import BUSY, DONE, LIMIT, prepared
from migration_state import DATABASES, SETTINGS

RECORDS = 6  # of each kind
AT_ONCE = 10
NOT_SELECTED = dict.fromkeys(("stays", "dav", "directory"), "not selected")
# A program that is killed when it has changed the database and not yet removed its journal.
HALF_A_CHANGE = """import sqlite3, sys
database = sqlite3.connect(sys.argv[1])
database.execute("UPDATE records SET content = x'78'")
database.commit()"""


def write(name, content, mode=0o600):
    def plant(image):
        (image / name).write_bytes(content)
        (image / name).chmod(mode)
    return plant


def leave_half_a_change(path):
    """The database at the path, and its journal, as a program leaves them that was killed at that moment."""
    kill = matrix.Case("unlink", "SIGKILL", 1, False)
    matrix.run_with(kill, [sys.executable, "-c", HALF_A_CHANGE, str(path)], environment())


def all_of(*plants):
    def plant(image):
        for each in plants:
            each(image)
    return plant


# What the next run removes or rolls back.
SWEPT = {
    "an empty temporary file": write("tmp/fileAbC123", b""),
    "the beginning of a temporary file": write("tmp/fileAbC123", b"bplist00\xd2"),
    "three temporary files": all_of(*(write(f"tmp/fileAbC12{i}", b"bplist00") for i in range(3))),
    "half a property list beside the settings": write(f"{SETTINGS.rpartition('/')[0]}/.new-77-x.plist", b"bpl"),
    "an empty journal": write(f"{DATABASES['Contacts']}-journal", b""),
    "a journal that was not begun": write(f"{DATABASES['Contacts']}-journal", bytes(512)),
    **{f"half a change of {name}": lambda image, path=path: leave_half_a_change(image / path)
       for name, path in DATABASES.items()},
}
# What may be somebody else's stays as it is.
KEPT = {
    "a file of another name": ("tmp/fileAbC1234", write("tmp/fileAbC1234", b"bplist00")),
    "a file that others may read": ("tmp/fileAbC123", write("tmp/fileAbC123", b"bplist00", 0o644)),
    "a text": ("tmp/fileAbC123", write("tmp/fileAbC123", b"hello")),
    "a directory": ("tmp/fileAbC123", lambda image: (image / "tmp/fileAbC123").mkdir()),
    "a link": ("tmp/fileAbC123", lambda image: (image / "tmp/fileAbC123").symlink_to("/etc/passwd")),
}


def two_at_once(migration, image):
    """One of them retires every account; the other one is turned away, or comes when nothing is left to do."""
    hosts = [subprocess.Popen(migration.command(image), env=environment(), stdout=subprocess.PIPE,
                              stderr=subprocess.DEVNULL, text=True) for _ in range(2)]
    reports = [report.read(host.communicate(timeout=LIMIT)[0]) for host in hosts]
    ends = [(host.returncode, each and report.outcomes(each)) for host, each in zip(hosts, reports)]
    ends.sort(key=lambda end: SELECTED <= (end[1] or {}).keys())
    if ends[1] != (DONE, {**dict.fromkeys(SELECTED, "retired"), **NOT_SELECTED}) or \
            ends[0] not in ((BUSY, {}), (DONE, NOT_SELECTED)):
        return f"two hosts ended with {ends}"
    return migration.rules.wrong_at_end(migration.look(image)) or migration.rerun(image)


def run_again(migration, image):
    if wrong := migration.rerun(image):
        return wrong
    before = migration.look(image)
    if wrong := migration.rerun(image):
        return f"once more: {wrong}"
    after = migration.look(image)
    changed = {name for name in before.files if before.files[name] != after.files[name]}
    if (before.active, before.retired, before.settings) != (after.active, after.retired, after.settings) or \
            changed - {"image/var/log/system.log"}:
        return f"a host that has nothing to do changes something: {sorted(changed)}"
    return ""


def run_over_what_is_kept(migration, image, name, plant):
    plant(image)
    before = migration.look(image).files[f"image/{name}"]
    code, _ = migration.run(image)
    after = migration.look(image)
    if code != DONE or after.files.pop(f"image/{name}", None) != before:
        return f"the host ended with {code}, and {name} has changed or is gone"
    return migration.rules.wrong_at_end(after)


def repeated_runs(found, directory, _is_full):
    """All cases, always."""
    migration = prepared(found, directory, RECORDS, "m5")
    cases = [*(f"two at once, {number}" for number in range(AT_ONCE)), "again", *SWEPT, *KEPT]

    def judge(name, worker):
        image = migration.copy(worker)
        if name in KEPT:
            return run_over_what_is_kept(migration, image, *KEPT[name])
        if name in SWEPT:
            SWEPT[name](image)
            return migration.rerun(image)
        return run_again(migration, image) if name == "again" else two_at_once(migration, image)
    return len(cases), matrix.judge_all(cases, judge)


ROWS = {"M5": ("two hosts at once, once more, and over left-overs", repeated_runs)}
