"""Databases that cannot be used while the others are migrated: row M6 of docs/reliability.md."""

import os
import sqlite3
import subprocess

import matrix
from migration_image import environment
from migration_rows import DONE, LEFT_BEHIND, LIMIT, prepared
from migration_state import DATABASES
from repeated_run_rows import leave_half_a_change

RECORDS = 6  # of each kind
KINDS = {"Contacts": {"contact"}, "Calendars": {"event", "todo"}, "Bookmarks": {"bookmark"}, "Notes": {"note"}}


def cut_to(size):
    return lambda path: os.truncate(path, size(path.stat().st_size))


def zero(begin, end):
    def change(path):
        content = bytearray(path.read_bytes())
        content[begin:end] = bytes(len(content[begin:end]))
        path.write_bytes(content)
    return change


def execute(*statements):
    def change(path):
        database = sqlite3.connect(path, isolation_level=None)
        for statement in statements:
            database.execute(statement)
        database.close()
    return change


def replace_by(make):
    def change(path):
        path.unlink()
        make(path)
    return change


def half_a_change(change_journal):
    """Without its journal the change cannot be taken back, and what is there is no whole state."""
    def change(path):
        leave_half_a_change(path)
        change_journal(path.with_name(f"{path.name}-journal"))
    return change


DAMAGES = {
    "cut in half": cut_to(lambda size: size // 2), "cut to 100 bytes": cut_to(lambda size: 100),
    "empty": cut_to(lambda size: 0), "all zeros": zero(0, 1 << 30), "without its header": zero(0, 16),
    "without its schema": zero(100, 1000), "with a page of zeros": zero(8192, 12288),
    "of another program": replace_by(execute("CREATE TABLE records (id)")),
    "of a newer version": execute("PRAGMA user_version = 2"),
    "with another table": execute("CREATE TABLE more (id)"),
    "with other contents than its hashes": execute("UPDATE records SET content = x'78'"),
    "a text": replace_by(lambda path: path.write_text("no database")),
    "a directory": replace_by(lambda path: path.mkdir()), "a FIFO": replace_by(os.mkfifo),
    "with half a change and no journal": half_a_change(os.unlink),
    "with half a change and a journal without its header": half_a_change(zero(0, 28)),
    "with half a change and an empty journal": half_a_change(cut_to(lambda size: 0)),
}
# Ways to hold a database, and what the rest of the world may still do with it.
HELD = {"locked": "BEGIN EXCLUSIVE", "about to be written": "BEGIN IMMEDIATE"}
READ_ONLY = "read-only"
READ_ONLY_RUN = 'mount --bind "$1" "$1" && mount -o remount,ro,bind "$1" && shift && exec "$@"'


def what_is_at(path):
    return path.read_bytes() if path.is_file() else path.lstat().st_mode


def run_host(migration, image, kind, path):
    command = migration.command(image)
    if kind == READ_ONLY:
        command = ["unshare", "-m", "sh", "-c", READ_ONLY_RUN, "sh", str(path), *command]
    holder = sqlite3.connect(path, isolation_level=None) if kind in HELD else None
    try:
        if holder:
            holder.execute(HELD[kind])
        return subprocess.run(command, env=environment(), check=False, capture_output=True, text=True,
                              timeout=LIMIT)
    finally:
        if holder:
            holder.close()


def of_kinds(rows, kinds):
    return {row: count for row, count in rows.items() if row.kind in kinds}


def wrong_others(migration, state, name):
    """All but the one database are migrated whole, and so are the settings."""
    others = set().union(*(kinds for each, kinds in KINDS.items() if each != name))
    for what in ("active", "retired"):
        if of_kinds(getattr(state, what), others) != of_kinds(getattr(migration.end, what), others):
            return f"the {what} records of the other databases are not those of a whole migration"
    return "" if state.settings == migration.end.settings else f"the accounts are {sorted(state.accounts)}"


def damaged_stores(found, directory, _is_full):
    """All cases, always."""
    migration = prepared(found, directory, RECORDS, "m6")
    kinds = [*DAMAGES, *HELD]
    if os.geteuid() == 0:
        kinds.append(READ_ONLY)
    else:
        print(f"     M6 {READ_ONLY}: skipped, this needs root", flush=True)
    cases = [(name, kind) for name in DATABASES for kind in kinds]

    def judge(case, worker):
        name, kind = case
        image = migration.copy(worker)
        path = image / DATABASES[name]
        DAMAGES.get(kind, lambda _: None)(path)
        before = what_is_at(path)
        done = run_host(migration, image, kind, path)
        if done.returncode != LEFT_BEHIND:
            return f"the host ended with {done.returncode}: {done.stdout[-300:]}"
        if what_is_at(path) != before:
            return "what could not be used has changed"
        # One that is only read by others is found out when it is to be written.
        if kind != "about to be written" and f"{path} was left alone" not in done.stdout:
            return f"the report does not say what was left: {done.stdout[-300:]}"
        if kind in DAMAGES and "What account Q1 has of" not in done.stdout:
            return f"the report does not say whose records were left: {done.stdout[-300:]}"
        if not (image / "var/log/system.log").read_text():
            return "nothing is logged"
        return wrong_others(migration, migration.look(image, left_out=name), name)
    # Those that are held wait most of the time.
    return len(cases), matrix.judge_all(cases, judge, workers=4)


ROWS = {"M6": ("damaged, locked and read-only stores are left alone", damaged_stores)}
