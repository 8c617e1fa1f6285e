"""Databases that cannot be used while the others are migrated: row M6 of docs/reliability.md."""

import os
import sqlite3
import subprocess

import matrix
import migration_log
import migration_report
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
# What cannot even be read. Of the others is known what they hold, and that it is nowhere else: all but the one
# record of each kind that the device has too.
UNREAD = {*DAMAGES, "locked"}
DATACLASSES = {"Contacts": ["contacts"], "Calendars": ["calendars", "reminders"], "Bookmarks": ["bookmarks"],
               "Notes": ["notes"]}
STILL_THERE = {
    "Contacts": ["5 records of contacts of account Q1 are"], "Bookmarks": ["5 records of bookmarks of account Q1 are"],
    "Notes": ["5 records of notes of account Q1 are"],
    "Calendars": ["1 record of calendars of account Q1 is", "5 records of reminders of account Q1 are",
                  "2 records of calendars of account Q2 are", "2 records of calendars of account V1 are"]}
REMEDY = "; bring back a sound copy, or wait for who uses it."
REMEDIES = {
    "about to be written": "; wait for who uses it.",
    READ_ONLY: "; give the right to write, or mount the image so that it can be written."}
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


def wrong_reasons(kind, name, path, reasons):
    """What is wrong with what the report says was left: the database, and what is in it of each account."""
    *owners, last = reasons
    if not last.startswith(f"{path} was left alone: ") or not last.endswith(REMEDIES.get(kind, REMEDY)):
        return f"the report does not say what was left, and why: {last}"
    if kind in UNREAD:
        wanted = [migration_report.UNSEEN.format(account, dataclass)
                  for account in ("Q1", "Q2", "V1") for dataclass in DATACLASSES[name]]
    else:
        wanted = [f"{what} still in the account's own store alone." for what in STILL_THERE[name]]
    return "" if owners == wanted else f"the report does not say whose records were left: {owners}"


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
        return wrong_reasons(kind, name, path, migration_report.read(done.stdout)["reasons"]) or \
            migration_log.wrong_log(image, name) or \
            wrong_others(migration, migration.look(image, left_out=name), name)
    # Those that are held wait most of the time.
    return len(cases), matrix.judge_all(cases, judge, workers=4)


ROWS = {"M6": ("damaged, locked and read-only stores are left alone", damaged_stores)}
