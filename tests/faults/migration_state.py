"""What a migration has made of an image so far, and the rules that hold in every state and at the end."""

import collections
import hashlib
import pathlib
import plistlib
import re
import stat

from database_look import look_at_database, together
from settings_image import NAME, PREFERENCES

LIBRARY = "var/mobile/Library"
DATABASES = {name: f"{LIBRARY}/{name}/{name}.sqlite" for name in ("Contacts", "Calendars", "Bookmarks", "Notes")}
SETTINGS = f"{PREFERENCES}/{NAME}"
TEMPORARY = re.compile(r"image/tmp/file[0-9A-Za-z]{6}")
LEFTOVER = re.compile(r"image/.*/\.new-[^/]*")
# A settings file that could not be read when a save looked at it.
SET_ASIDE = re.compile(re.escape(f"image/{SETTINGS}.unreadable-") + r"\d+")
JOURNALS = {f"image/{path}-journal" for path in DATABASES.values()}

# What is different in each line of a log.
LOG = "image/var/log/system.log"
LOG_PREFIX = re.compile(rb"(?m)^\S+ ([\w-]+)\[\d+\]: ")


class State:
    """Of an image at place/image, and the files beside it, without the database that is left out. Reads only; the
    directory `scratch` is for copies."""

    def __init__(self, place, scratch, left_out=""):
        self.damage, self.files = "", {}
        place = pathlib.Path(place)
        for path in sorted(place.rglob("*")):
            self.files[str(path.relative_to(place))] = _look_at(path)
        keys = []
        for name, path in DATABASES.items():
            if name != left_out and (place / "image" / path).exists():
                found = look_at_database(place / "image" / path, scratch)
                keys.append(found.key)
                self.damage = self.damage or found.damage and f"{name}: {found.damage}"
        self.records = tuple(keys)  # equal for states with equal records
        self.active, self.retired = together(self.records)
        self.settings = (place / "image" / SETTINGS).read_bytes()
        entries = plistlib.loads(self.settings)["Accounts"]
        self.accounts = {entry["Identifier"]: entry for entry in entries}
        if len(self.accounts) != len(entries):
            self.damage = "an account is in the settings more than once"
        journals = [(place / name).read_bytes() for name in JOURNALS & self.files.keys()]
        self._has_hot_journal = any(journal[:1] not in (b"", b"\0") for journal in journals)
        self._log = b""
        if LOG in self.files:
            self._log = LOG_PREFIX.sub(rb"\1: ", (place / LOG).read_bytes())

    def identity(self):
        """The same for images that a program cannot tell from one another but by times, numbers of processes,
        names of temporary files, and what is in a journal that was not begun and is never read. None when there is
        one to be rolled back, which is another one each time."""
        if self._has_hot_journal:
            return None
        files = [(TEMPORARY.sub("image/tmp/file", name), *look) for name, look in self.files.items() if name != LOG]
        return self.records, self._log, tuple(files)

    def rows_of(self, accounts):
        """The rows of active stores; the local one has the account ''."""
        return collections.Counter({row: count for row, count in self.active.items() if row.account in accounts})

    @property
    def local(self):
        return self.rows_of({""})

    def temporary_files(self):
        return [name for name in self.files if TEMPORARY.fullmatch(name) or LEFTOVER.fullmatch(name)]


def _look_at(path):
    status = path.lstat()
    content = ""
    if stat.S_ISREG(status.st_mode) and not path.name.endswith((".sqlite", "-journal")):
        content = hashlib.sha256(path.read_bytes()).hexdigest()
    return status.st_mode, status.st_uid, status.st_gid, content


def contents(rows):
    """How often each content is there, whatever its UID: a conflict copy has one of its own."""
    counts = collections.Counter()
    for row, count in rows.items():
        counts[row.kind, row.content] += count
    return counts


class Rules:
    """What must hold of a state of an image that was `begin`, and is `end` after a migration."""

    def __init__(self, begin, end, selected, selected_stores):
        self.begin, self.end = begin, end
        self.selected = selected
        self.service = begin.rows_of(selected_stores)
        self.own = begin.local
        self.others = begin.active - self.service - self.own
        self.stores = selected_stores
        self.settings = {begin.settings, end.settings}  # the settings file of every moment
        self.changing = {name for name in begin.files.keys() | end.files.keys()
                         if begin.files.get(name) != end.files.get(name)}
        self.changing |= {f"image/{path}" for path in [*DATABASES.values(), SETTINGS]}
        self._verdicts = {}

    def _of_records(self, judge, state):
        """judge(state), of which a state with the same records has been given the answer before."""
        key = judge.__name__, state.records
        if key not in self._verdicts:
            self._verdicts[key] = judge(state)
        return self._verdicts[key]

    def wrong_always(self, state):
        """What is wrong at whatever moment the migration was left."""
        return state.damage or self._of_records(self._wrong_records, state) or self._wrong_accounts(state) or \
            self._wrong_files(state)

    def wrong_after_kill(self, state):
        """What is wrong when a run was killed, and each call that it made was carried out."""
        if state.settings not in self.settings:
            return f"the settings file is torn, or none that a migration writes ({len(state.settings)} bytes)"
        return self.wrong_always(state)

    def _wrong_records(self, state):
        if lost := _identities(self.own) - _identities(state.local):
            return f"{sum(lost.values())} of the device's own records are lost or changed: {_some(lost)}"
        others = collections.Counter({row: count for row, count in state.active.items()
                                      if row.account and row.account not in self.stores})
        if others != self.others:
            return "a store that was not to be touched has changed"
        kept = state.rows_of(self.stores) + state.retired
        if lost := self.service - kept:
            return f"{sum(lost.values())} of the service's records are lost: {_some(lost)}"
        if more := kept - self.service:
            return f"{sum(more.values())} of the service's records are doubled: {_some(more)}"
        local = contents(state.local)
        if doubled := [key for key, count in local.items() if count > 1]:
            return f"{len(doubled)} records are doubled in the local stores: {doubled[:2]}"
        if strange := local.keys() - contents(self.own).keys() - contents(self.service).keys():
            return f"{len(strange)} records are of nobody: {list(strange)[:2]}"
        return ""

    def _wrong_accounts(self, state):
        for name, entry in self.begin.accounts.items():
            if name not in self.selected and state.accounts.get(name) != entry:
                return f"the account {name} has changed"
            if state.accounts.get(name, entry) not in (entry, self.end.accounts.get(name)):
                return f"the account {name} is neither the old one nor gone"
        if strange := state.accounts.keys() - self.begin.accounts.keys() - self.end.accounts.keys():
            return f"there are accounts of nobody: {sorted(strange)}"
        return ""

    def _wrong_files(self, state):
        if len(temporary := state.temporary_files()) > 1:
            return f"several temporary files are left: {temporary}"
        set_aside = [name for name in state.files if SET_ASIDE.fullmatch(name)]
        whole = {hashlib.sha256(settings).hexdigest() for settings in self.settings}
        if torn := [name for name in set_aside if state.files[name][-1] not in whole]:
            return f"what was set aside is no whole settings file: {torn}"
        allowed = self.begin.files.keys() | self.end.files.keys() | JOURNALS | {*temporary, *set_aside}
        if strange := state.files.keys() - allowed:
            return f"there are files of nobody: {sorted(strange)}"
        if gone := self.begin.files.keys() - state.files.keys():
            return f"files are gone: {sorted(gone)}"
        for name, (mode, user, group, content) in state.files.items():
            expected = self.begin.files.get(name) or self.end.files.get(name)
            if expected and mode != expected[0] or not expected and mode != stat.S_IFREG | 0o600:
                return f"{name} has mode {mode:o}"
            if name in self.begin.files and name not in self.changing and \
                    (mode, user, group, content) != self.begin.files[name]:
                return f"{name} has changed"
        return ""

    def not_local(self, state):
        """The service's records that are not in the local stores."""
        return contents(self.service).keys() - contents(state.local).keys()

    def wrong_in_run(self, before, after, code):
        """A run that says 0 leaves none of the records outside of the local stores that it met."""
        stranded = self.not_local(after) & (contents(before.active) - contents(after.active)).keys()
        if code == 0 and stranded:
            return f"the run ended with 0, and {len(stranded)} records are not in the local stores"
        return ""

    def wrong_remains(self, state):
        """What is wrong after a run in which nothing failed, whatever happened before it."""
        if left := state.accounts.keys() & self.selected:
            return f"the accounts {sorted(left)} are not retired"
        if temporary := state.temporary_files():
            return f"temporary files are left: {temporary}"
        return ""

    def _wrong_last_records(self, state):
        if state.local != self.end.local:
            missing, more = self.end.local - state.local, state.local - self.end.local
            return f"local rows are missing: {_some(missing)}, and there are more: {_some(more)}"
        return "the service's stores are not retired" if state.rows_of(self.stores) else ""

    def wrong_at_end(self, state):
        """What is wrong after a migration that was carried out to its end."""
        if wrong := self.wrong_always(state):
            return wrong
        if wrong := self._of_records(self._wrong_last_records, state):
            return wrong
        if state.settings != self.end.settings:
            return f"the settings are not those of a run that nothing disturbed: {sorted(state.accounts)}"
        if wrong := self.wrong_remains(state):
            return wrong
        if state.files.keys() != self.end.files.keys():
            return f"other files than after a run that nothing disturbed: {state.files.keys() ^ self.end.files.keys()}"
        return ""


def _identities(rows):
    """The rows without their place: of two versions of a record only one has the UID itself."""
    return collections.Counter({row._replace(uid=row.base_uid): count for row, count in rows.items()
                                if row.uid == row.base_uid or row.uid.startswith(f"{row.base_uid}-conflict-")})


def _some(rows):
    return [(row.account, row.kind, row.uid) for row in list(rows)[:3]]
