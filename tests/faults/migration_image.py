"""Images to be migrated: six accounts, three of them to be retired, with records of all five kinds.

The service's records lie in the store of the Quillnet agent and in the calendars of two child accounts; the
device has records of its own, some of them equal to the service's and some of another version; an account
that is to stay has a store too. Beside the image lie files that are nobody's business.
"""

import os
import pathlib
import shutil
import subprocess

from migration_state import Rules, State

# The accounts that are to be retired, and the stores with their records.
SELECTED = {"Q1", "Q2", "V1"}
SELECTED_STORES = {"Quillnet:ada", "Q2-calendars", "V1-calendars"}
# The store of the agent is that of each account of its types.
STORES = {"Q1": {"Quillnet:ada"}, "Q2": {"Quillnet:ada", "Q2-calendars"}, "V1": {"Quillnet:ada", "V1-calendars"}}
DATACLASSES = ["contacts", "calendars", "reminders", "bookmarks", "notes"]
# Of 1,000 records of the service, so many lie in each of the three stores with calendars, 10 are on the
# device too, and 10 in another version.
SHARED = 100
LIMIT = 120  # seconds, after which a host counts as hanging


def cards(prefix, numbers, text=""):
    return [f"BEGIN:VCARD\r\nVERSION:3.0\r\nUID:{prefix}{i}\r\nFN:{prefix} {i}{text}\r\nN:{i};{prefix};;;\r\n"
            "END:VCARD\r\n" for i in numbers]


def components(kind, prefix, numbers, text=""):
    body = "".join(f"BEGIN:{kind}\r\nUID:{prefix}{i}\r\nDTSTAMP:20260101T000000Z\r\nDTSTART:20260101T000000Z\r\n"
                   f"SUMMARY:{prefix} {i}{text}\r\nEND:{kind}\r\n" for i in numbers)
    return [f"BEGIN:VCALENDAR\r\nVERSION:2.0\r\nPRODID:-//test//\r\n{body}END:VCALENDAR\r\n"]


def bookmarks(prefix, numbers, text=""):
    links = "".join(f'<DT><A HREF="http://{prefix}{i}.example/">{prefix} {i}{text}</A>\n' for i in numbers)
    return [f"<!DOCTYPE NETSCAPE-Bookmark-file-1>\n<DL><p>\n{links}</DL><p>\n"]


def notes(prefix, numbers, text=""):
    return [f"UID: {prefix}{i}\nSubject: {prefix} {i}\n\nText of {prefix} {i}{text}\n" for i in numbers]


def texts_of(dataclass, prefix, numbers, text=""):
    """The contents of the files to be imported."""
    if dataclass == "contacts":
        return ["".join(cards(prefix, numbers, text))]
    if dataclass == "calendars":
        return components("VEVENT", prefix, numbers, text)
    if dataclass == "reminders":
        return components("VTODO", prefix, numbers, text)
    return (bookmarks if dataclass == "bookmarks" else notes)(prefix, numbers, text)


SUFFIX = {"contacts": "vcf", "calendars": "ics", "reminders": "ics", "bookmarks": "html", "notes": "txt"}


class MigrationImage:
    """An image at directory/base/image with `count` records of each kind in the service's stores, and copies of it
    for each worker. `begin` and `end` are its states before and after a run that nothing disturbed,
    `rules` what holds of the states between."""

    def __init__(self, found, directory, count):
        self.found = found
        self.directory = pathlib.Path(directory)
        self.base = self.directory / "base"
        self._make(count)
        self.begin = State(self.base, self.directory)
        image = self.copy("learning")
        done = subprocess.run(self.command(image), env=environment(), check=False, capture_output=True, text=True,
                              timeout=LIMIT)
        self.end = State(image.parent, self.directory)
        self.rules = Rules(self.begin, self.end, SELECTED, SELECTED_STORES)
        if wrong := self.rules.wrong_at_end(self.end):
            raise RuntimeError(f"a migration that nothing disturbs: {wrong}")
        if done.returncode != 0:
            raise RuntimeError(f"a migration that nothing disturbs ends with {done.returncode}: {done.stdout[-500:]}")
        self._check_learned(count)

    def _check_learned(self, count):
        selected = self.begin.rows_of(SELECTED_STORES)
        for kind in ("contact", "event", "todo", "bookmark", "note"):
            number = sum(row.kind == kind for row in selected)
            if number != count:
                raise RuntimeError(f"the image holds {number} records of the kind {kind}, not {count}")
        if set(self.begin.accounts) - set(self.end.accounts) != SELECTED:
            raise RuntimeError(f"the migration leaves the accounts {sorted(self.end.accounts)}")

    def _tool(self, *arguments):
        subprocess.run([self.found["device-image"], *map(str, arguments)], check=True, stdout=subprocess.DEVNULL)

    def _make(self, count):
        self.base.mkdir()
        image = self.base / "image"
        outside = self.base / "outside"
        outside.mkdir()
        (outside / "secret").write_text("nobody's business\n")
        (outside / "secret").chmod(0o640)
        self._tool("create", image, "--without-services", "--sync-account-name", "ada")
        enabled = [word for name in DATACLASSES for word in ("--enable", name)]
        child = "type=CalDAV,class=MobileCalDAVAccount,identifier={}-calendars,enable=calendars"
        for words in (["Quillnet", "Q1", "--status", 1, "--username", "ada", *enabled],
                      ["Quillnet", "Q2", "--status", 1, *enabled, "--child", child.format("Q2")],
                      ["VantorAccount", "V1", "--status", 1, *enabled, "--child", child.format("V1")],
                      ["Quillnet", "stays", "--status", 0, "--username", "bo", "--enable", "contacts"],
                      ["CalDAV", "dav", "--enable", "calendars", "--enable", "reminders"],
                      ["LDAP", "directory", "--property", "Port:integer=389"]):
            self._tool("add-account", image, "--type", words[0], "--identifier", *words[1:])
        self._fill(image, count)

    def _fill(self, image, count):
        shared = max(1, count // SHARED)
        third = count // 3
        for dataclass in DATACLASSES:
            if dataclass == "calendars":
                self._import(image, dataclass, "Q1", "service", range(2 * third, count))
                self._import(image, dataclass, "Q2", "service", range(third))
                self._import(image, dataclass, "V1", "service", range(third, 2 * third))
            else:
                self._import(image, dataclass, "Q1", "service", range(count))
            self._import(image, dataclass, None, "service", range(count - shared, count))
            self._import(image, dataclass, None, "service", range(count - 2 * shared, count - shared), " changed")
            self._import(image, dataclass, None, "own", range(2 * shared))
        for dataclass in ("calendars", "reminders"):
            self._import(image, dataclass, "dav", "dav", range(2 * shared))

    def _import(self, image, dataclass, account, prefix, numbers, text=""):
        files = []
        for number, content in enumerate(texts_of(dataclass, prefix, numbers, text)):
            file = self.directory / f"{number}.{SUFFIX[dataclass]}"
            file.write_bytes(content.encode())
            files.append(file)
        if files:
            self._tool("import", image, "--dataclass", dataclass, *(["--account", account] if account else []), *files)
        for file in files:
            file.unlink()

    def command(self, image):
        return [self.found["migration-host"], "run", "--image", str(image), "--quiet", "--json"]

    def copy(self, worker):
        """An image of the worker's own, as it was in the beginning; its parent holds what lies outside."""
        place = self.directory / f"m{worker}"
        shutil.rmtree(place, ignore_errors=True)
        subprocess.run(["cp", "-a", str(self.base), str(place)], check=True)
        return place / "image"


def environment():
    return {"PATH": os.environ["PATH"], "LC_ALL": "C"}
