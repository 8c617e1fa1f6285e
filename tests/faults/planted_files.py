"""Security cases about files: what others plant at names that are used, and links out of the image."""

import os
import socket
import stat
import subprocess

from hostile_image import MARK, OTHER_USER, SECRET, as_other
from settings_image import PREFERENCES

SAVE_FAILED, NOT_LOADED = 1, 16
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
        return "" if b"changed" in image.settings.read_bytes() else "nothing was saved"
    return case


def all_names_taken(image):
    image.open_to_others()
    names = [image.root / f"tmp/fileAAAAA{number}" for number in range(8)]
    for name in names:
        plant(image, name, "a file of theirs")
    before = image.settings.read_bytes()
    code = image.save(**image.meddled(names=":".join(map(str, names))))
    if code != SAVE_FAILED or image.settings.read_bytes() != before:
        return f"the save ended with {code}"
    return "" if all(name.stat().st_size == 0 for name in names) else "a planted file was written"


def swapped_before_the_change_of_owner(image):
    image.save(**image.meddled(link=image.secret))
    return ""  # the secret is looked at for every case


def swap_by_another_user(image):
    """In a sticky directory nobody else can move what a save has begun."""
    image.open_to_others()
    begun = image.root / "tmp/fileAAAAAA"
    begun.write_bytes(b"begun")
    done = subprocess.run(["mv", "-f", str(begun), str(begun) + "x"], check=False, capture_output=True, **as_other())
    return "another user can move a temporary file" if done.returncode == 0 else ""


def settings_are(make, outcome=NOT_LOADED):
    """Nothing is loaded, and what lies at the name is as it was."""
    def case(image):
        image.settings.unlink()
        make(image)
        before = look(image.settings)
        code = image.save()
        if code != outcome:
            return f"the program ended with {code}"
        for command in image.commands():
            done = image.run(["prlimit", "--as=3000000000", *command])
            # Records go into a store whether or not there are accounts.
            if done.returncode not in (outcome, 6, 7) and "import" not in command:
                return f"{command[1]} of {os.path.basename(command[0])} ended with {done.returncode}"
            if SECRET in done.stdout + done.stderr:
                return "the secret was printed"
        return "" if look(image.settings) == before else "the settings file has changed"
    return case


def settings_grow_while_they_are_read(image):
    image.settings.write_bytes(b"bplist00")
    code = image.save(**image.meddled(grow=image.settings))
    return "" if code == NOT_LOADED else f"the program ended with {code}"


def settings_of_many_gigabytes(image):
    image.settings.touch(0o600)
    os.truncate(image.settings, 10 << 30)


def linked_directory(name):
    """A directory of the image is a link out of it: programs say so, and nothing there is read or changed."""
    def case(image):
        moved = image.put_outside(name)
        before = {path: (look(path), path.read_bytes() if path.is_file() else b"")
                  for path in [moved, *moved.rglob("*")]}
        for command in image.commands():
            done = image.run(command)
            what = f"{os.path.basename(command[0])} {command[1]}"
            if done.returncode < 0 or done.returncode >= 128:
                return f"{what} ended with {done.returncode}"
            if MARK.encode() in done.stdout + done.stderr:
                return f"{what} has read what is outside"
            now = {path: (look(path), path.read_bytes() if path.is_file() else b"")
                   for path in [moved, *moved.rglob("*")]}
            if now != before:
                changed = sorted(str(path) for path in now.keys() | before.keys() if now.get(path) != before.get(path))
                return f"{what} has changed {changed}"
        return ""
    return case


def directory_swapped_while_it_is_used(image):
    """Between any two calls the directory of the settings turns into a link out of the image, and back."""
    outside = image.outside / "Preferences"
    outside.mkdir()
    image.write_settings(outside / image.settings.name, [])
    there = (outside / image.settings.name).read_bytes()
    link = image.root / "var/mobile/Library/link"
    link.symlink_to(outside)
    for turn in range(20):
        code = image.save(**image.meddled(swap=f"{image.root / PREFERENCES}:{link}"))
        if code < 0 or code >= 128:
            return f"turn {turn} ended with {code}"
        if (outside / image.settings.name).read_bytes() != there or len(list(outside.iterdir())) != 1:
            return f"turn {turn} has changed what is outside"
    return ""


def linked_journal(image):
    """A link lies where the database's journal would."""
    for database in list(image.root.rglob("*.sqlite")):
        database.with_name(database.name + "-journal").symlink_to(image.secret)
    for command in image.commands():
        done = image.run(command)
        if done.returncode < 0 or SECRET in done.stdout + done.stderr:
            return f"{command[:2]} ended with {done.returncode}"
    return ""


CASES = {
    **{f"at the temporary name: {kind}": planted_temporary_name(kind) for kind in PLANTS},
    "all proposed names are taken": all_names_taken,
    "the name is swapped before the change of owner": swapped_before_the_change_of_owner,
    "another user swaps the name": swap_by_another_user,
    "the settings file is a link to a secret": settings_are(lambda i: i.settings.symlink_to(i.secret)),
    "the settings file is a FIFO": settings_are(lambda i: os.mkfifo(i.settings)),
    "the settings file is a device": settings_are(
        lambda i: os.mknod(i.settings, stat.S_IFCHR | 0o666, os.makedev(1, 5))),
    "the settings file is 10 GiB of nothing": settings_are(settings_of_many_gigabytes),
    "the settings file grows while it is read": settings_grow_while_they_are_read,
    **{f"a link out of the image: {name}": linked_directory(name) for name in (
        "tmp", "etc", "System", "var/run", "var/log", "var", "var/mobile", "var/mobile/Library", PREFERENCES,
        "var/mobile/Library/Contacts", "System/Library/DataClassMigrators")},
    "a directory is swapped for a link meanwhile": directory_swapped_while_it_is_used,
    "a journal is a link to a secret": linked_journal,
}
