"""The lines that the migrator writes to the system log when it migrates the image of migration_image.py."""

import re

from migration_state import DATABASES

SELECTED = (("Q1", "Quillnet"), ("Q2", "Quillnet"), ("V1", "VantorAccount"))
OTHERS = (("stays", "Quillnet"), ("dav", "CalDAV"), ("directory", "LDAP"))
DATACLASSES = (("Contacts", "Contacts"), ("Calendars", "Calendars"), ("Reminders", "Calendars"),
               ("Bookmarks", "Bookmarks"), ("Notes", "Notes"))  # with their databases, in the order of the work
LINE = re.compile(r"\d{4}-\d\d-\d\dT\d\d:\d\d:\d\dZ migration-host\[\d+\]: (.*)")


def lines_of(dataclass, error):
    """Those about one dataclass of one account; `error` is that of its database, or empty."""
    full = f"com.vantor.Dataclass.{dataclass}"
    of_whom = f"the datasource for the dataclass {full} of the Device Local Account. Error {error}"
    none_made, none_enabled = f"Could not create {of_whom}", f"Could not ENABLE {of_whom}"
    begin = f"Merging {full} to the localstore"
    if dataclass == "Bookmarks":
        failed = [none_enabled, none_made, none_made] if error else []
        return [begin, "createLocalDataSourceForDataclass", *failed]
    failed = [none_made, none_made,
              f"Could not merge (null) from {full} into the local store. Error: there is no open data source"]
    lines = [begin, "mergeSyncDataForDataclass", *(failed if error else []), "removeDataStoreForDataclass",
             *([none_made, none_made] if error else [])]
    if dataclass == "Contacts":
        lines.append("DeviceLocalAccount missing. Creating...")
    if dataclass != "Notes" and error:
        lines.append(f"Error creating data source. Error = {error}")
    return lines


def expected_log(unusable=""):
    """All lines of a migration that does without the database of this name."""
    error = f'the database "{DATABASES[unusable]}" cannot be used and is left alone' if unusable else ""
    lines = []
    for account, kind in SELECTED:
        lines.append(f"Checking account <ASSBasicAccount: {account}> of type {kind}")
        for dataclass, database in DATACLASSES:
            lines += lines_of(dataclass, error if database == unusable else "")
    return lines + [f"Checking account <ASSBasicAccount: {account}> of type {kind}" for account, kind in OTHERS]


def wrong_log(image, unusable=""):
    """What is wrong with the image's system log."""
    lines = (image / "var/log/system.log").read_text(encoding="utf-8").splitlines()
    found = [match and match[1] for match in map(LINE.fullmatch, lines)]
    for number, (line, wanted) in enumerate(zip(found, expected_log(unusable))):
        if line != wanted:
            return f"line {number} of the log is {lines[number]!r} instead of {wanted!r}"
    return "" if len(found) == len(expected_log(unusable)) else f"{len(found)} lines are logged"
