"""Security cases about files: what others plant at names that are used, and links out of the image."""

import os
import plistlib
import socket
import stat
import struct
import subprocess

from hostile_image import MARK, OTHER_USER, as_other
from settings_image import PREFERENCES

SAVE_FAILED, NOT_LOADED = 1, 16
REFUSED = 7
# What each program ends with, in the order of hostile_image.PROGRAMS, where the settings are no file that can be
# read. Records go into a store whether or not there are accounts.
WITHOUT_SETTINGS = (16, 7, 6, 6, 6, 0, 6, 6)
# The same where one of the directories is a link out of the image.
LINKED_DIRECTORIES = {
    "tmp": (1, 7, 6, 0, 0, 0, 0, 7), "etc": (1, 7, 6, 0, 0, 0, 0, 1),
    "System": (0, 0, 6, 0, 0, 0, 0, 0), "System/Library/DataClassMigrators": (0, 0, 6, 0, 0, 0, 0, 0),
    "var": (16, 7, 7, 7, 7, 7, 7, 7), "var/run": (0, 7, 6, 0, 7, 7, 0, 7), "var/log": (0, 0, 6, 0, 0, 0, 0, 0),
    "var/mobile": (16, 7, 7, 7, 7, 7, 7, 7), "var/mobile/Library": (16, 7, 7, 7, 7, 7, 7, 7),
    PREFERENCES: WITHOUT_SETTINGS, "var/mobile/Library/Contacts": (0, 3, 6, 6, 0, 6, 0, 0),
}
PLANTED_JOURNAL = (0, 7, 6, 7, 0, 7, 0, 0)
PLANTS = {
    "a link to a secret": lambda image, path: path.symlink_to(image.secret),
    "a link to nothing": lambda image, path: path.symlink_to(image.outside / "nothing"),
    "a FIFO": lambda image, path: os.mkfifo(path, 0o666),
    "a file of theirs": lambda image, path: path.touch(0o666),
    "a hard link to a secret": lambda image, path: os.link(image.secret, path),
    "a directory": lambda image, path: path.mkdir(0o777),
    "a device": lambda image, path: os.mknod(path, stat.S_IFCHR | 0o666, os.makedev(1, 5)),
    "a socket": lambda image, path: socket.socket(socket.AF_UNIX).bind(str(path)),
}


def look(path):
    status = path.lstat()
    return status.st_ino, status.st_mode, status.st_uid, status.st_gid, status.st_size


def plant(image, path, kind):
    PLANTS[kind](image, path)
    if "hard link" not in kind:
        os.chown(path, OTHER_USER, OTHER_USER, follow_symlinks=False)


def planted_temporary_name(kind):
    """The save takes another name, and leaves what lies at the first one alone."""
    def case(image):
        image.open_to_others()
        first, second = image.root / "tmp/fileAAAAAA", image.root / "tmp/fileBBBBBB"
        plant(image, first, kind)
        before = look(first)
        if code := image.save(**image.meddled(names=f"{first}:{second}")):
            return f"the save ended with {code}"
        if look(first) != before:
            return "what was planted has changed"
        if second.exists() or (image.outside / "nothing").exists():
            return "a file is left"
        return image.wrong_settings(image.expected)
    return case


def all_names_taken(image):
    image.open_to_others()
    names = [image.root / f"tmp/fileAAAAA{number}" for number in range(8)]
    for name in names:
        plant(image, name, "a file of theirs")
    code = image.save(**image.meddled(names=":".join(map(str, names))))
    if code != SAVE_FAILED:
        return f"the save ended with {code}"
    if any(name.stat().st_size != 0 for name in names):
        return "a planted file was written"
    return image.wrong_settings(image.old)


def directory_open_to_others(image):
    """A host does not begin where others could do so."""
    (image.root / "tmp").chmod(0o777)
    done = image.host()
    if done.returncode != REFUSED or b"tmp" not in done.stdout + done.stderr:
        return f"the host ended with {done.returncode}: {(done.stdout + done.stderr)[-200:]}"
    return image.wrong_settings(image.old)


def swap_by_another_user(image):
    """In a sticky directory nobody else can move what a save has begun."""
    image.open_to_others()
    begun = image.root / "tmp/fileAAAAAA"
    begun.write_bytes(b"begun")
    done = subprocess.run(["mv", "-f", str(begun), str(begun) + "x"], check=False, capture_output=True, **as_other())
    if done.returncode == 0 or begun.read_bytes() != b"begun":
        return "another user can move a temporary file"
    return f"the save ended with {code}" if (code := image.save()) else image.wrong_settings(image.expected)


def settings_are(make):
    """Nothing is loaded, and what lies at the name is as it was."""
    def case(image):
        image.settings.unlink()
        make(image)
        before = look(image.settings)
        return image.wrong_ends(WITHOUT_SETTINGS, prefix=["prlimit", "--as=3000000000"]) or \
            ("" if look(image.settings) == before else "the settings file has changed")
    return case


def settings_grow_while_they_are_read(image):
    image.settings.write_bytes(b"bplist00")
    code = image.save(**image.meddled(grow=image.settings))
    return "" if code == NOT_LOADED else f"the program ended with {code}"


def settings_of_many_gigabytes(image):
    image.settings.touch(0o600)
    os.truncate(image.settings, 10 << 30)


def contents(directory):
    return {path: (look(path), path.read_bytes() if path.is_file() else b"")
            for path in [directory, *directory.rglob("*")]}


def wrong_accounts(path):
    """Whether the settings are not whole; other programs than the savers change them too."""
    try:
        identifiers = [entry["Identifier"] for entry in plistlib.loads(path.read_bytes())["Accounts"]]
    except Exception as error:  # whatever the independent reader does not like
        return f"the settings cannot be read: {error!r}"
    return "" if "A" in identifiers else f"the accounts are {identifiers}"


def linked_directory(name):
    """A directory of the image is a link out of it: programs say so, and nothing there is read or changed. A save
    comes about when it needs nothing from there."""
    def case(image):
        codes = LINKED_DIRECTORIES[name]
        holds_settings = image.settings.is_relative_to(image.root / name)
        moved = image.put_outside(name)
        before = contents(moved)

        def wrong(program, done):
            if MARK.encode() in done.stdout + done.stderr:
                return "it has read what is outside"
            if contents(moved) != before:
                return f"it has changed {sorted(map(str, dict(contents(moved).items() ^ before.items())))}"
            if program == "save" and not holds_settings:
                return image.wrong_settings(image.old if codes[0] else image.expected)
            return ""
        return image.wrong_ends(codes, wrong) or ("" if holds_settings else wrong_accounts(image.settings))
    return case


def journal_that_names(image):
    """A journal without pages of a transaction over several files, of which one is outside of the image."""
    name = os.fsencode(image.secret)
    header = bytes.fromhex("d9d505f920a163d7") + struct.pack(">IIIII", 0, 0, 16, 512, 4096)
    return (header.ljust(512, b"\0") + struct.pack(">I", 0) + name + struct.pack(">II", len(name), sum(name))
            + header[:8])


def planted_journal(plant):
    """Something lies where each database's journal would."""
    def case(image):
        for database in list(image.root.rglob("*.sqlite")):
            plant(image, database.with_name(database.name + "-journal"))
        before = image.secret.read_bytes()
        if wrong := image.wrong_ends(PLANTED_JOURNAL) or wrong_accounts(image.settings):
            return wrong
        return "" if image.secret.read_bytes() == before else "the secret has changed"
    return case


CASES = {
    **{f"at the temporary name: {kind}": planted_temporary_name(kind) for kind in PLANTS},
    "all proposed names are taken": all_names_taken,
    "everybody may swap names": directory_open_to_others,
    "another user swaps the name": swap_by_another_user,
    "the settings file is a link to a secret": settings_are(lambda i: i.settings.symlink_to(i.secret)),
    "the settings file is a FIFO": settings_are(lambda i: os.mkfifo(i.settings)),
    "the settings file is a device": settings_are(
        lambda i: os.mknod(i.settings, stat.S_IFCHR | 0o666, os.makedev(1, 5))),
    "the settings file is 10 GiB of nothing": settings_are(settings_of_many_gigabytes),
    "the settings file grows while it is read": settings_grow_while_they_are_read,
    **{f"a link out of the image: {name}": linked_directory(name) for name in LINKED_DIRECTORIES},
    "a journal is a link to a secret": planted_journal(lambda i, journal: journal.symlink_to(i.secret)),
    "a journal is a FIFO": planted_journal(lambda i, journal: os.mkfifo(journal)),
    "a journal names a secret": planted_journal(lambda i, journal: journal.write_bytes(journal_that_names(i))),
}
