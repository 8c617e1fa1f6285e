"""Databases that cannot be used while the others are migrated: row M6 of docs/reliability.md."""

import os
import plistlib
import shutil
import sqlite3
import subprocess

import matrix
from migration_rows import DATABASES, SETTINGS, environment, prepared

LEFT_BEHIND = 3
LIBRARY = "var/mobile/Library"


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
}
LOCKED, READ_ONLY = "locked", "read-only"
READ_ONLY_RUN = 'mount --bind "$1" "$1" && mount -o remount,ro,bind "$1" && shift && exec "$@"'


def what_is_at(path):
    return path.read_bytes() if path.is_file() else path.lstat().st_mode


def run_host(migration, image, kind, path):
    command = migration.command(image)
    if kind == READ_ONLY:
        command = ["unshare", "-m", "sh", "-c", READ_ONLY_RUN, "sh", str(path), *command]
    return subprocess.run(command, env=environment(), check=False, capture_output=True, text=True, timeout=120)


def judge_others(migration, image, name):
    """All but the one database are migrated whole; what is left of the image is put aside for the look."""
    for each in set(DATABASES.values()) - {name}:
        database = sqlite3.connect(f"file:{image / LIBRARY / each}?mode=ro", uri=True)
        try:
            local = {row[0] for row in database.execute(
                "SELECT content FROM records JOIN stores ON stores.id = store"
                " WHERE account IS NULL AND retired_at IS NULL")}
            every = {row[0] for row in database.execute("SELECT content FROM records")}
            active = database.execute("SELECT count(*) FROM stores JOIN records ON stores.id = store"
                                      " WHERE account IS NOT NULL AND retired_at IS NULL").fetchone()[0]
        finally:
            database.close()
        expected = {content for (kind, content) in migration.records_of(each)}
        if local != expected or every != expected or active:
            return f"{each} is not migrated"
    return ""


def damaged_stores(found, directory, is_full):
    """All cases, always."""
    migration, _ = prepared(found, directory, False, "m6")
    names = sorted(set(DATABASES.values()))
    kinds = [*DAMAGES, *([READ_ONLY] if os.geteuid() == 0 else [])]
    cases = [(name, kind) for name in names for kind in kinds] + [(name, LOCKED) for name in names[:2]]

    def judge(case, worker):
        name, kind = case
        image = migration.copy(worker)
        path = image / LIBRARY / name
        DAMAGES.get(kind, lambda _: None)(path)
        before = what_is_at(path)
        holder = sqlite3.connect(path, isolation_level=None) if kind == LOCKED else None
        if holder:
            holder.execute("BEGIN EXCLUSIVE")
        try:
            done = run_host(migration, image, kind, path)
        finally:
            if holder:
                holder.close()
        if done.returncode != LEFT_BEHIND:
            return f"the host ended with {done.returncode}: {done.stdout[-300:]}"
        if what_is_at(path) != before:
            return "what could not be used has changed"
        if f"{path} was left alone" not in done.stdout or "What account Q1 has of" not in done.stdout and \
                kind != READ_ONLY:
            return f"the report does not say what was left: {done.stdout[-300:]}"
        if "is left alone" not in (image / "var/log/system.log").read_text():
            return "nothing is logged"
        if wrong := judge_others(migration, image, name):
            return wrong
        accounts = [entry["Identifier"] for entry in plistlib.loads((image / SETTINGS).read_bytes())["Accounts"]]
        return "" if "Q1" not in accounts and "Q2" in accounts else f"the accounts are {accounts}"
    try:
        return len(cases), matrix.judge_all(cases, judge)
    finally:
        shutil.rmtree(migration.directory, ignore_errors=True)


ROWS = {"M6": ("damaged, locked and read-only stores are left alone", damaged_stores)}
