"""What the tests of the migration host share: images, runs, and looks at what is left.

The paths of the programs under test come from the environment that CTest sets.
"""
import contextlib
import fcntl
import hashlib
import json
import os
import pathlib
import plistlib
import shutil
import sqlite3
import subprocess
import sys
import tempfile
import unittest

import jsonschema

HOST = os.environ["MIGRATION_HOST"]
MAKE_IMAGE = os.environ["MAKE_TEST_IMAGE"]
WITHOUT_CALL = os.environ["WITHOUT_CALL"]
BUNDLES = pathlib.Path(os.environ["TEST_BUNDLES"])
MIGRATORS = pathlib.Path(os.environ["INSTALLED_MIGRATORS"])
SETTINGS = "var/mobile/Library/Preferences/com.vantor.accountsettings.plist"
LOCK = "var/run/image.lock"
REPORT_VALIDATOR = jsonschema.Draft202012Validator(
    json.loads(pathlib.Path(os.environ["SCHEMA"]).read_text()))
SERVICE = "Quillnet:ada"

DATACLASS = "com.vantor.Dataclass."
# The kind of a dataclass's records and the database that holds them.
KINDS = {"contacts": ("contact", "var/mobile/Library/Contacts/Contacts.sqlite"),
         "calendars": ("event", "var/mobile/Library/Calendars/Calendars.sqlite"),
         "reminders": ("todo", "var/mobile/Library/Calendars/Calendars.sqlite"),
         "bookmarks": ("bookmark", "var/mobile/Library/Bookmarks/Bookmarks.sqlite"),
         "notes": ("note", "var/mobile/Library/Notes/Notes.sqlite")}


def account(identifier, kind, dataclasses=(), status=None, **more):
    """One entry of the settings file's "Accounts"."""
    entry = {"Identifier": identifier, "Type": kind, "Class": more.pop("Class", kind + "Account"),
             "DisplayName": identifier.lower() + "@example.net",
             "Enabled Dataclasses": [DATACLASS + name for name in dataclasses], **more}
    if status is not None:
        entry["QuillnetStatus"] = status
    return entry


def record(dataclass, store, uid, content, modified=1_600_000_000):
    return {"dataclass": dataclass, "account": store, "uid": uid, "content": content,
            "modified": modified}


def event(uid, title):
    return (f"BEGIN:VCALENDAR\r\nVERSION:2.0\r\nBEGIN:VEVENT\r\nUID:{uid}\r\nSUMMARY:{title}\r\n"
            f"END:VEVENT\r\nEND:VCALENDAR\r\n")


def card(uid, name):
    return f"BEGIN:VCARD\r\nVERSION:3.0\r\nUID:{uid}\r\nFN:{name}\r\nEND:VCARD\r\n"


class Run:
    """One finished run of the host."""

    def __init__(self, code, output, errors):
        self.code, self.output, self.errors = code, output, errors

    @property
    def report(self):
        """The report, which keeps to its schema and to what its figures promise."""
        report = json.loads(self.output)
        REPORT_VALIDATOR.validate(report)
        check_sums(report)
        return report


def check_sums(report):
    if not report["balanced"]:
        return
    growth, local = {}, {}
    for line in report["dataclasses"]:
        places = sum(line[key] for key in ("moved", "already_there", "conflict_copies", "retired",
                                           "left_behind"))
        assert places == line["service_before"], line
        name = line["dataclass"]
        growth[name] = growth.get(name, 0) + line["moved"] + line["conflict_copies"]
        local.setdefault(name, set()).add((line["local_before"], line["local_after"]))
    for name, figures in local.items():
        assert len(figures) == 1, (name, figures)
        before, after = figures.pop()
        assert after == before + growth[name], (name, before, after, growth[name])


class HostTestCase(unittest.TestCase):
    maxDiff = None

    def setUp(self):
        self.directory = pathlib.Path(tempfile.mkdtemp(prefix="host-test-"))
        self.addCleanup(self._remove_directory)
        self.image = self.directory / "image"
        self.make_image([])

    def _remove_directory(self):
        shutil.rmtree(self.directory)

    # The image -----------------------------------------------------------------------------------

    def make_image(self, records):
        """Makes the image, or adds records to it."""
        subprocess.run([MAKE_IMAGE, self.image], input=json.dumps(records).encode(), check=True)

    def write_plist(self, relative, value):
        path = self.image / relative
        path.parent.mkdir(parents=True, exist_ok=True)
        path.write_bytes(plistlib.dumps(value, fmt=plistlib.FMT_BINARY))
        path.chmod(0o600)

    def write_settings(self, *accounts):
        self.write_plist(SETTINGS, {"Version": 12, "Accounts": list(accounts)})
        os.chown(self.image / SETTINGS, *self.mobile())

    def mobile(self):
        """The numbers of the image's own "mobile", as user and group."""
        fields = (self.image / "etc/passwd").read_text().split("mobile:", 1)[1].split(":")
        return int(fields[1]), int(fields[2])

    def settings(self):
        return plistlib.loads((self.image / SETTINGS).read_bytes())

    def write_agent_name(self, name):
        self.write_plist("var/mobile/Library/Preferences/com.vantor.OTASyncAgent.plist",
                         {"AccountName": name})

    def contents(self, dataclass, store=None, retired=False):
        """The contents of a store's records, sorted; read with no help of the programs under test."""
        kind, file = KINDS[dataclass]
        with contextlib.closing(sqlite3.connect(f"file:{self.image / file}?mode=ro", uri=True)) as database:
            self.assertEqual([("ok",)], database.execute("PRAGMA integrity_check").fetchall())
            self.assertEqual([], database.execute("PRAGMA foreign_key_check").fetchall())
            rows = database.execute(
                "SELECT content FROM records r JOIN stores s ON s.id = r.store WHERE r.kind = ?"
                " AND ifnull(s.account, '') = ? AND (s.retired_at IS NOT NULL) = ?",
                (kind, store or "", retired)).fetchall()
        return sorted(row[0] for row in rows)

    def digest(self, leave_out=()):
        """Every file and directory of the image: its mode, owner and content."""
        found = {}
        for path in sorted(self.image.rglob("*")):
            name = str(path.relative_to(self.image))
            if name in leave_out:
                continue
            status = path.lstat()
            content = ""
            if path.is_symlink():
                content = os.readlink(path)
            elif path.is_file():
                content = hashlib.sha256(path.read_bytes()).hexdigest()
            found[name] = (oct(status.st_mode), status.st_uid, status.st_gid, content)
        return found

    @contextlib.contextmanager
    def unchanged_image(self):
        before = self.digest()
        yield
        self.assertEqual(before, self.digest())

    # Runs ----------------------------------------------------------------------------------------

    def command(self, *arguments):
        return [HOST, "run", "--image", str(self.image), *map(str, arguments)]

    def start(self, *arguments, prefix=()):
        return subprocess.Popen([*prefix, *self.command(*arguments)], stdout=subprocess.PIPE,
                                stderr=subprocess.PIPE, stdin=subprocess.DEVNULL)

    def finish(self, process):
        output, errors = process.communicate(timeout=100)
        self.assert_nothing_is_left()
        return Run(process.returncode, output.decode(), errors.decode())

    def run_host(self, *arguments, prefix=()):
        return self.finish(self.start(*arguments, prefix=prefix))

    def run_bundle(self, name, *arguments, limit=60):
        """Runs one of the test bundles alone and gives the run with its report."""
        return self.run_host("--json", "--quiet", "--bundle", BUNDLES / (name + ".migrator"),
                             "--timeout", limit, *arguments)

    def assert_nothing_is_left(self):
        """No lock is held, and no process of a run is alive."""
        lock = self.image / LOCK
        if lock.exists():
            with open(lock, "rb") as file:
                fcntl.flock(file, fcntl.LOCK_EX | fcntl.LOCK_NB)
        self.assertEqual([], self.processes_of_runs())

    def processes_of_runs(self):
        """The processes, zombies aside, whose environment names this image's temporary directory."""
        wanted = f"TMPDIR={self.image}/tmp".encode()
        found = []
        for entry in pathlib.Path("/proc").iterdir():
            if not entry.name.isdigit():
                continue
            with contextlib.suppress(OSError):
                if wanted in (entry / "environ").read_bytes().split(b"\0"):
                    found.append(int(entry.name))
        return found

    def assert_refused(self, run, *words):
        """The run was refused with one reason that has all the words in it."""
        self.assertEqual(7, run.code, run.output + run.errors)
        reasons = run.report["reasons"]
        self.assertTrue(any(all(str(word) in reason for word in words) for reason in reasons),
                        f"{words} not in one of {reasons}")
        self.assertEqual("refused", run.report["outcome"])


def skip_unless_root(test):
    return unittest.skipUnless(os.geteuid() == 0, "needs root: it mounts file systems")(test)


def wait_for_line(stream, word):
    """Reads lines until one has the word in it."""
    for line in iter(stream.readline, b""):
        if word.encode() in line:
            return line.decode()
    raise AssertionError(f"no line with {word}")


if __name__ == "__main__":
    sys.exit("not a test by itself")
