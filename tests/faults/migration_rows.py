"""Migrations that are killed or fail on the way, and run again: rows M1 to M3 and M5 of docs/reliability.md.

The image holds a retired account with records of all five kinds, one that is not retired, and records of
the device's own, some of them equal to the service's. After a re-run each record is in the local store or in
a retired one, none of the local ones has changed, and none is there twice.
"""

import os
import pathlib
import plistlib
import random
import shutil
import sqlite3
import subprocess

import matrix
from settings_image import NAME, PREFERENCES

DATABASES = {"contacts": "Contacts/Contacts.sqlite", "calendars": "Calendars/Calendars.sqlite",
             "reminders": "Calendars/Calendars.sqlite", "bookmarks": "Bookmarks/Bookmarks.sqlite",
             "notes": "Notes/Notes.sqlite"}
SETTINGS = f"{PREFERENCES}/{NAME}"
# Done; done, with records left behind; refused at the start.
ENDS_ALLOWED = {0, 3}
FIRST_CALL = r"flock\("


def cards(prefix, count):
    return "".join(f"BEGIN:VCARD\r\nVERSION:3.0\r\nUID:{prefix}{i}\r\nFN:{prefix} {i}\r\nN:{i};{prefix};;;\r\n"
                   "END:VCARD\r\n" for i in range(count))


def components(kind, prefix, count):
    body = "".join(f"BEGIN:{kind}\r\nUID:{prefix}{i}\r\nDTSTAMP:20260101T000000Z\r\nDTSTART:20260101T000000Z\r\n"
                   f"SUMMARY:{prefix} {i}\r\nEND:{kind}\r\n" for i in range(count))
    return f"BEGIN:VCALENDAR\r\nVERSION:2.0\r\nPRODID:-//test//\r\n{body}END:VCALENDAR\r\n"


def bookmarks(prefix, count):
    links = "".join(f'<DT><A HREF="http://{prefix}{i}.example/">{prefix} {i}</A>\n' for i in range(count))
    return f"<!DOCTYPE NETSCAPE-Bookmark-file-1>\n<DL><p>\n{links}</DL><p>\n"


def note(prefix):
    return f"Subject: {prefix}\n\nText of {prefix}\n"


class Migration:
    def __init__(self, found, directory, count):
        self.found = found
        self.directory = pathlib.Path(directory)
        self.base = self.directory / "base"
        self._make(count)
        self.records = self.contents(self.base)
        self.local = self.contents(self.base, "account IS NULL")

    def _tool(self, *arguments):
        subprocess.run([self.found["device-image"], *map(str, arguments)], check=True,
                       stdout=subprocess.DEVNULL)

    def _make(self, count):
        self._tool("create", self.base, "--without-services", "--sync-account-name", "ada")
        self._tool("add-account", self.base, "--type", "Quillnet", "--identifier", "Q1", "--status", 1,
                   "--username", "ada", *[word for name in DATABASES for word in ("--enable", name)])
        self._tool("add-account", self.base, "--type", "Quillnet", "--identifier", "Q2", "--status", 0,
                   "--username", "bo", "--enable", "contacts")
        for account, prefixes in (("Q1", ("service", "both")), (None, ("own", "both"))):
            for prefix in prefixes:
                self._fill(account, prefix, count)

    def _fill(self, account, prefix, count):
        texts = {"contacts": ("vcf", cards(prefix, count)),
                 "calendars": ("ics", components("VEVENT", prefix, count)),
                 "reminders": ("ics", components("VTODO", prefix, count)),
                 "bookmarks": ("html", bookmarks(prefix, count)), "notes": ("txt", note(prefix))}
        for dataclass, (suffix, text) in texts.items():
            file = self.directory / f"{prefix}.{suffix}"
            file.write_bytes(text.encode())
            self._tool("import", self.base, "--dataclass", dataclass,
                       *(["--account", account] if account else []), file)

    def command(self, image):
        return [self.found["migration-host"], "run", "--image", str(image), "--quiet"]

    def copy(self, worker):
        image = self.directory / f"m{worker}"
        shutil.rmtree(image, ignore_errors=True)
        shutil.copytree(self.base, image, symlinks=True)
        if os.geteuid() == 0:
            for path in [image, *image.rglob("*")]:
                there = (self.base / path.relative_to(image)).lstat()
                os.chown(path, there.st_uid, there.st_gid, follow_symlinks=False)
        return image

    @staticmethod
    def contents(image, where="1"):
        """How often each record's content lies in the stores: {(kind, content): count}."""
        found = {}
        for name in sorted(set(DATABASES.values())):
            path = image / "var/mobile/Library" / name
            if not path.exists():
                continue
            database = sqlite3.connect(f"file:{path}?mode=ro", uri=True)
            try:
                rows = database.execute(
                    "SELECT records.kind, content FROM records"
                    f" JOIN stores ON stores.id = records.store WHERE {where}").fetchall()
            finally:
                database.close()
            for kind, content in rows:
                found[kind, content] = found.get((kind, content), 0) + 1
        return found

    def damage(self, image):
        """What is wrong with the databases, asked of SQLite itself."""
        for name in sorted(set(DATABASES.values())):
            path = image / "var/mobile/Library" / name
            if path.exists():
                database = sqlite3.connect(path)
                try:
                    for pragma in ("integrity_check", "foreign_key_check"):
                        rows = database.execute(f"PRAGMA {pragma}").fetchall()
                        if rows not in ([], [("ok",)]):
                            return f"{name}: {pragma} says {rows[:3]}"
                finally:
                    database.close()
        return ""

    def records_of(self, name):
        """What the one database holds at the beginning."""
        database = sqlite3.connect(f"file:{self.base}/var/mobile/Library/{name}?mode=ro", uri=True)
        try:
            return database.execute("SELECT kind, content FROM records").fetchall()
        finally:
            database.close()

    def judge_end(self, image):
        """After the last run: retired, and nothing lost or doubled."""
        if wrong := self.damage(image):
            return wrong
        local = self.contents(image, "account IS NULL AND retired_at IS NULL")
        everywhere = self.contents(image)
        lost = [record for record in self.records if record not in everywhere]
        if lost:
            return f"{len(lost)} records are lost"
        if missing := [record for record in self.records if record not in local]:
            return f"{len(missing)} records are not in the local stores"
        if doubled := [record for record, count in local.items() if count > 1]:
            return f"{len(doubled)} records are doubled in the local stores"
        identifiers = {entry.get("Identifier") for entry in
                       plistlib.loads((image / SETTINGS).read_bytes())["Accounts"]}
        if "Q1" in identifiers or "Q2" not in identifiers:
            return f"the accounts are {sorted(map(str, identifiers))}"
        stale = [path.name for path in (image / "tmp").iterdir() if path.name != "AccountMigrationInProgress"]
        return f"temporary files are left: {stale}" if stale else ""


def environment():
    return {"PATH": os.environ["PATH"], "LC_ALL": "C"}


def rerun(migration, image):
    code = subprocess.run(migration.command(image), env=environment(), check=False,
                          stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL).returncode
    if code not in ENDS_ALLOWED:
        return f"the re-run ended with {code}"
    return migration.judge_end(image)


def traced(migration, directory):
    image = migration.copy("t")
    return matrix.traced_calls(migration.command(image), environment(), str(directory / "trace"), FIRST_CALL)


def sampled(cases, every):
    return cases[::every]


def prepared(found, directory, is_full, name):
    place = directory / name
    place.mkdir()
    return Migration(found, place, 1000 if is_full else 5), place


def kill_and_rerun(found, directory, is_full):
    migration, place = prepared(found, directory, is_full, "m1")
    cases = sampled(matrix.kills(traced(migration, place)), 1 if is_full else 25)

    def judge(case, worker):
        image = migration.copy(worker)
        matrix.run_with(case, migration.command(image), environment(), limit=120)
        return rerun(migration, image)
    return len(cases), matrix.judge_all(cases, judge)


def kill_twice(found, directory, is_full):
    """The second run is killed at another call of its own, and a third one follows."""
    migration, place = prepared(found, directory, is_full, "m2")
    kills = matrix.kills(traced(migration, place))
    chance = random.Random(20261121)
    pairs = [(first, chance.choice(kills)) for first in sampled(kills, 7 if is_full else 100)]

    def judge(pair, worker):
        image = migration.copy(worker)
        for case in pair:
            matrix.run_with(case, migration.command(image), environment(), limit=120)
        return rerun(migration, image)
    bad = matrix.judge_all(pairs, judge)
    return len(pairs), [(" then ".join(map(matrix.name_of, pair)), text) for pair, text in bad]


def fail_and_rerun(found, directory, is_full):
    migration, place = prepared(found, directory, is_full, "m3")
    cases = sampled(matrix.errors(traced(migration, place)), 1 if is_full else 97)

    def judge(case, worker):
        image = migration.copy(worker)
        code = matrix.run_with(case, migration.command(image), environment(), limit=120)
        if code == "hang" or code < 0:
            return f"the host ended with {code}"
        if migration.damage(image):
            return migration.damage(image)
        lost = [record for record in migration.records if record not in migration.contents(image)]
        if lost:
            return f"{len(lost)} records are lost, exit code {code}"
        # What is retired has left the settings with its account: the records lie in a retired store.
        identifiers = {entry.get("Identifier") for entry in
                       plistlib.loads((image / SETTINGS).read_bytes())["Accounts"]}
        return rerun(migration, image) if "Q1" in identifiers else ""
    return len(cases), matrix.judge_all(cases, judge)


def two_at_once(found, directory, is_full):
    migration, _ = prepared(found, directory, is_full, "m5")
    rounds, bad = 20, []
    for number in range(rounds):
        image = migration.copy(0)
        hosts = [subprocess.Popen(migration.command(image), env=environment(), stdout=subprocess.DEVNULL,
                                  stderr=subprocess.DEVNULL) for _ in range(2)]
        codes = sorted(host.wait() for host in hosts)
        if codes not in ([0, 0], [0, 11], [0, 3], [3, 3], [3, 11]):
            bad.append((number, f"two hosts ended with {codes}"))
        elif text := rerun(migration, image):
            bad.append((number, text))
    return rounds, bad


ROWS = {
    "M1": ("a migration is killed at a system call, then run again", kill_and_rerun),
    "M2": ("the second run is killed too, then a third run", kill_twice),
    "M3": ("a system call of a migration fails", fail_and_rerun),
    "M5": ("two hosts at once, and a host run again", two_at_once),
}
