"""What the databases of an image hold. Each content is read once: a row of cases leaves few different ones, and
most of the time that a case takes in Python goes into the rows of a thousand records."""

import collections
import functools
import hashlib
import pathlib
import shutil
import sqlite3
import tempfile

# A record with all that is told of it but the numbers of its row and store. `account` is empty in the local
# store.
Row = collections.namedtuple(
    "Row", "account kind uid base_uid content modified_at source_account source_uid collection")
_ROWS = """SELECT ifnull(stores.account, ''), records.kind, uid, base_uid, content, modified_at, source_account,
  source_uid, collections.name, stores.retired_at IS NOT NULL FROM records
  JOIN stores ON stores.id = records.store JOIN collections ON collections.id = records.collection"""
_TIMES = "SELECT DISTINCT retired_at FROM stores WHERE retired_at IS NOT NULL"

# `key` is the same for files that differ in no byte but those of the times at which stores were retired.
Contents = collections.namedtuple("Contents", "key active retired damage")
_seen = {}
_rows = {}  # each row once, whatever number of contents it is in


def look_at_database(path, scratch):
    """The contents of the database. Reads only: a journal that is to be rolled back is so in a copy, in a directory
    of its own in `scratch`."""
    path = pathlib.Path(path)
    journal = path.with_name(f"{path.name}-journal")
    if not journal.exists():
        return _look_at(path)
    with tempfile.TemporaryDirectory(prefix="look-", dir=scratch) as copy:
        for file in (path, journal):
            shutil.copy(file, copy)
        return _look_at(pathlib.Path(copy) / path.name)


def _look_at(path):
    database = sqlite3.connect(f"file:{path}?mode=rw", uri=True)
    try:
        times = [time for time, in database.execute(_TIMES)]  # after the first statement nothing is rolled back
        key = _digest(path.read_bytes(), times)
        if key not in _seen:
            _seen[key] = _read(database, key)
        return _seen[key]
    finally:
        database.close()


def _digest(content, times):
    for time in times:
        content = content.replace(time.to_bytes(4, "big"), bytes(4))
    return hashlib.sha256(content).hexdigest()


def _read(database, key):
    active, retired, damage = collections.Counter(), collections.Counter(), ""
    for pragma in ("integrity_check", "foreign_key_check"):
        found = database.execute(f"PRAGMA {pragma}").fetchall()
        if found not in ([], [("ok",)]):
            damage = f"{pragma} says {found[:3]}"
    for *row, is_retired in database.execute(_ROWS):
        row = Row(*row)
        (retired if is_retired else active)[_rows.setdefault(row, row)] += 1
    return Contents(key, active, retired, damage)


@functools.lru_cache(maxsize=64)
def together(keys):
    """The active and the retired rows of databases with these keys. Not to be changed."""
    active, retired = collections.Counter(), collections.Counter()
    for key in keys:
        active.update(_seen[key].active)
        retired.update(_seen[key].retired)
    return active, retired
