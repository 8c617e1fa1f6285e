"""Whether the plug-in's property lists and string tables are whole.   usage: resources.py TREE

The account model loses an account whose type is missing from these files, and shows a bare key for a
text that one language lacks; neither failure is loud, so both are found here.
"""

import plistlib
import re
import sys
from pathlib import Path

from report import finish

TYPES = {
    "BookmarkDAV", "BriskIMAP", "CalDAV", "CardDAV", "Exchange", "Gmail", "IMAPNotes", "LDAP",
    "Mail", "OnMyDevice", "Quillnet", "SMTP", "Subscribed Calendar", "VantorAccount", "Yahoo",
}
DATACLASSES = {
    "com.vantor.Dataclass." + name
    for name in (
        "Mail", "Contacts", "Calendars", "Reminders", "Bookmarks", "Notes", "MediaStream",
        "DeviceLocator", "ContactsSearch", "Backup", "Ubiquity", "KeyValue", "Shoebox",
        "SharedStreams",
    )
}
TOGGLE_ACTIONS = {
    "None", "Keep Local Data", "Merge Local Data", "Delete Local Data", "Merge Sync Data",
    "Delete Sync Data",
}
ACTIONS = {
    "Enable Actions": TOGGLE_ACTIONS,
    "Disable Actions": TOGGLE_ACTIONS,
    "Delete Account Actions": {"Merge Data", "Delete Data"},
}
FLAGS = {"Supports Multiple Stores", "Display Dataclass Switch", "Requires User Confirmation"}
LANGUAGES = {"de", "en", "es", "fr", "ja"}
TABLES = {
    "AccountsManager": {
        "SUBSCRIBED_CALENDAR_GROUP_TITLE",
        "SUBSCRIBED_CALENDAR_GROUP_MID_SENTENCE_TITLE",
    },
    "DeviceLocalAccount": {
        "ON_MY_DEVICE_TYPE_KALLO",
        "ON_MY_DEVICE_TYPE_KALLO_MINI",
        "ON_MY_DEVICE_TYPE_KALLO_SLATE",
    },
}


def read(path: Path, problems: list[str]) -> dict:
    """The dictionary in `path`; empty, with a problem added, when there is none."""
    try:
        text = path.read_bytes()
        value = plistlib.loads(text, fmt=plistlib.FMT_XML)
    except Exception as error:  # whatever the reader stumbles over is one problem of this file
        problems.append(f"{path}: cannot be read: {error}")
        return {}
    if not isinstance(value, dict):
        problems.append(f"{path}: the root is no dictionary")
        return {}
    # The reader takes the last of two equal keys silently. Keys of the root are indented by two.
    root_keys = re.findall(r"^  <key>(.*)</key>$", text.decode(), re.MULTILINE)
    for key in sorted({key for key in root_keys if root_keys.count(key) > 1}):
        problems.append(f"{path}: {key}: stands twice")
    return value


def unequal(where: str, found: set, expected: set) -> list[str]:
    """One problem for each key that is missing or not expected."""
    lines = [f"{where}: {key}: missing" for key in sorted(expected - found)]
    return lines + [f"{where}: {key}: unknown" for key in sorted(found - expected)]


def account_types(path: Path) -> list[str]:
    problems: list[str] = []
    catalogue = read(path, problems)
    problems += unequal(str(path), set(catalogue), TYPES)
    keys = {"Supported Dataclasses", "Show Reminders Separately", *ACTIONS}
    for name, entry in catalogue.items():
        where = f"{path}: {name}"
        problems += unequal(where, set(entry), keys)
        supported = entry.get("Supported Dataclasses", [])
        problems += unequal(where, set(supported), DATACLASSES & set(supported))
        if len(set(supported)) != len(supported):
            problems.append(f"{where}: a dataclass stands twice")
        for list_name, allowed in ACTIONS.items():
            actions = set(entry.get(list_name, []))
            problems += unequal(f"{where}: {list_name}", actions, allowed & actions)
        if not isinstance(entry.get("Show Reminders Separately"), bool):
            problems.append(f"{where}: Show Reminders Separately: no boolean")
    return problems


def dataclasses(path: Path) -> list[str]:
    problems: list[str] = []
    catalogue = read(path, problems)
    problems += unequal(str(path), set(catalogue), DATACLASSES)
    for name, entry in catalogue.items():
        problems += unequal(f"{path}: {name}", set(entry), FLAGS)
        for flag, value in entry.items():
            if not isinstance(value, bool):
                problems.append(f"{path}: {name}: {flag}: no boolean")
    return problems


def creators(path: Path, services: set[str]) -> list[str]:
    """`services` are the paths of the bundles that an image holds."""
    problems: list[str] = []
    catalogue = read(path, problems)
    problems += unequal(str(path), set(catalogue), TYPES)
    for name, entries in catalogue.items():
        for entry in entries:
            where = f"{path}: {name}"
            if entry.get("Type") not in {"FullAccount", "SyncAccount", "NotifierAccount"}:
                problems.append(f"{where}: {entry.get('Type')}: no creator type")
            description = entry.get("Description", {})
            problems += [
                f"{where}: {key}: missing or empty"
                for key in ("Framework", "Class")
                if not description.get(key)
            ]
            if entry.get("Type") == "NotifierAccount":
                heard = set(description.get("Supported Dataclasses", []))
                problems += unequal(where, heard, DATACLASSES & heard)
                if not heard:
                    problems.append(f"{where}: Supported Dataclasses: missing or empty")
            framework = description.get("Framework")
            if framework and framework not in services:
                problems.append(f"{where}: {framework}: no image holds this bundle")
    if not any(entry.get("Type") == "FullAccount" for entry in catalogue.get("OnMyDevice", [])):
        problems.append(f"{path}: OnMyDevice: nothing makes its full account")
    return problems


def service_bundles(tree: Path) -> set[str]:
    sources = (tree / "accountservices").glob("*Service.cpp")
    return {f"System/Library/AccountServices/{path.stem}.so" for path in sources}


def string_tables(folder: Path) -> list[str]:
    languages = {path.stem for path in folder.glob("*.lproj")}
    problems = unequal(str(folder), languages, LANGUAGES)
    for language in sorted(languages & LANGUAGES):
        for table, keys in TABLES.items():
            path = folder / f"{language}.lproj" / f"{table}.strings"
            texts = read(path, problems)
            problems += unequal(str(path), set(texts), keys)
            problems += [
                f"{path}: {key}: no text"
                for key, text in texts.items()
                if not isinstance(text, str) or not text.strip() or text == key
            ]
    return problems


def check(tree: Path) -> list[str]:
    folder = tree / "resources"
    return (
        account_types(folder / "AccountTypesProperties.plist")
        + dataclasses(folder / "DataclassesProperties.plist")
        + creators(folder / "AccountCreators.plist", service_bundles(tree))
        + string_tables(folder)
    )


if __name__ == "__main__":
    top = Path(sys.argv[1])
    files = [path for path in (top / "resources").rglob("*") if path.is_file()]
    finish(check(top), len(files), "resource files")
