#!/usr/bin/env -S python3 -B
"""Retires the service accounts of a device image, in a page of plain Python.   usage: migrate.py IMAGE

What somebody would write who has no use for the programs of this project: the records of each account that
is to go are copied into the local store, the account's stores are retired, and the settings are saved
without it, on the disk, before the next account's turn. bench/run compares what both leave in the image.
"""

import os
import plistlib
import sqlite3
import sys
import time

if len(sys.argv) != 2:
    print("usage: migrate.py IMAGE", file=sys.stderr)
    sys.exit(2)
LIBRARY = sys.argv[1] + "/var/mobile/Library/"
SETTINGS = LIBRARY + "Preferences/com.vantor.accountsettings.plist"
AGENT = LIBRARY + "Preferences/com.vantor.OTASyncAgent.plist"
KINDS = {"Mail": ("MailAccounts", "mailaccount"), "Contacts": ("Contacts", "contact"),
         "Calendars": ("Calendars", "event"), "Reminders": ("Calendars", "todo"),
         "Bookmarks": ("Bookmarks", "bookmark"), "Notes": ("Notes", "note")}


def collection_in(base, store, row):
    """The local store's collection for the source's collection `row`, made when it is missing."""
    parent, kind, name, writable = base.execute(
        "SELECT parent, kind, name, writable FROM collections WHERE id = ?", (row,)).fetchone()
    target = collection_in(base, store, parent) if parent else None
    place = (store, kind, target, name)
    found = base.execute("SELECT id FROM collections WHERE store = ? AND kind = ? AND ifnull(parent, 0) = "
                         "ifnull(?, 0) AND name = ?", place).fetchone()
    return found[0] if found else base.execute("INSERT INTO collections (store, kind, parent, name, writable) "
                                               "VALUES (?, ?, ?, ?, ?)", (*place, writable)).lastrowid


def place_record(base, store, record, account, collections):
    row, kind, uid, base_uid, content, digest, modified, collection = record
    if base.execute("SELECT 1 FROM records WHERE store = ? AND kind = ? AND base_uid = ? AND content_hash = ? "
                    "AND content = ?", (store, kind, base_uid, digest, content)).fetchone():
        return
    if collection not in collections:
        collections[collection] = collection_in(base, store, collection)
    other = base.execute("SELECT id, base_uid, content_hash, modified_at FROM records WHERE store = ? AND kind = ? "
                         "AND uid = ?", (store, kind, uid)).fetchone()
    target_uid = uid
    if other and (other[3], other[2]) > (modified, digest):
        target_uid = f"{base_uid}-conflict-{digest[:16]}"
    elif other:
        base.execute("UPDATE records SET uid = ? WHERE id = ?", (f"{other[1]}-conflict-{other[2][:16]}", other[0]))
    base.execute("INSERT INTO records (store, kind, collection, uid, base_uid, content, content_hash, modified_at, "
                 "source_account, source_uid) VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?, ?)",
                 (store, kind, collections[collection], target_uid, base_uid, content, digest, modified, account, uid))


def move_records(dataclass, account):
    name, kind = KINDS[dataclass]
    path = f"{LIBRARY}{name}/{name}.sqlite"
    if not os.path.exists(path):
        return
    base = sqlite3.connect(path, isolation_level=None)
    base.execute("PRAGMA foreign_keys = ON")
    base.execute("PRAGMA synchronous = EXTRA")
    base.execute("BEGIN IMMEDIATE")
    source = base.execute("SELECT id FROM stores WHERE account = ? AND retired_at IS NULL", (account,)).fetchone()
    if source:
        local = base.execute("SELECT id FROM stores WHERE account IS NULL AND retired_at IS NULL").fetchone()
        store = local[0] if local else base.execute("INSERT INTO stores (account) VALUES (NULL)").lastrowid
        collections = {}
        for record in base.execute("SELECT id, kind, uid, base_uid, content, content_hash, modified_at, collection "
                                   "FROM records WHERE store = ? AND kind = ? ORDER BY id", (*source, kind)).fetchall():
            place_record(base, store, record, account, collections)
        if not base.execute("SELECT 1 FROM records WHERE store = ? AND kind <> ?", (*source, kind)).fetchone():
            base.execute("UPDATE stores SET retired_at = ? WHERE id = ?", (int(time.time()), *source))
    base.execute("COMMIT")
    base.close()


def save(settings):
    with open(SETTINGS + ".new", "wb", opener=lambda path, flags: os.open(path, flags, 0o600)) as file:
        plistlib.dump(settings, file, fmt=plistlib.FMT_BINARY)
        file.flush()
        os.fsync(file.fileno())
    os.rename(SETTINGS + ".new", SETTINGS)
    directory = os.open(os.path.dirname(SETTINGS), os.O_RDONLY)
    os.fsync(directory)
    os.close(directory)


def main():
    with open(SETTINGS, "rb") as file:
        settings = plistlib.load(file)
    agent = None
    if os.path.exists(AGENT):
        with open(AGENT, "rb") as file:
            agent = plistlib.load(file)["AccountName"]
    for account in list(settings["Accounts"]):
        if account["Type"] not in ("Quillnet", "VantorAccount") or account.get("QuillnetStatus") != 1:
            continue
        enabled = {name.rpartition(".")[2] for name in account.get("Enabled Dataclasses", [])}
        calendars = [child["Identifier"] for child in account.get("ChildAccounts", [])
                     if child.get("Class") == "MobileCalDAVAccount"]
        for dataclass in [name for name in KINDS if name in enabled]:
            move_records(dataclass, calendars[0] if dataclass == "Calendars" and calendars else f"Quillnet:{agent}")
        settings["Accounts"].remove(account)
        save(settings)


main()
