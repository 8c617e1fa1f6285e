"""Security cases about files: what others plant at names that are used, and links out of the image."""

import os
import plistlib
import socket
import stat
import subprocess

from hostile_image import MARK, OTHER_USER, SECRET, as_other
from settings_image import PREFERENCES, account

SAVE_FAILED, NOT_LOADED = 1, 16
REFUSED = 7
# What programs may end with: success, every failure that their manual pages name, and what a saver says.
DOCUMENTED = {*range(12), NOT_LOADED}
PROGRAMS = ["save", "migrate", "check", "show", "add an account", "import", "list accounts", "set a property"]
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


def swapped_name(when):
    """In a directory that is not sticky somebody puts a link in the place of what a save has begun: the save
    fails, and neither what the link leads to nor the settings have changed."""
    def case(image):
        (image.root / "tmp").chmod(0o777)
        code = image.save(**image.meddled(**{when: image.secret}))
        if code != SAVE_FAILED:
            return f"the save ended with {code}"
        return image.wrong_settings(image.old)
    return case


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
        holds_settings = image.settings.is_relative_to(image.root / name)
        moved = image.put_outside(name)
        before = contents(moved)
        for command in image.commands():
            done = image.run(command)
            what = f"{os.path.basename(command[0])} {command[1]}"
            if done.returncode not in DOCUMENTED:
                return f"{what} ended with {done.returncode}"
            if MARK.encode() in done.stdout + done.stderr:
                return f"{what} has read what is outside"
            if contents(moved) != before:
                changed = dict(contents(moved).items() ^ before.items())
                return f"{what} has changed {sorted(map(str, changed))}"
            if command[:2] == image.commands()[0][:2]:
                wanted = NOT_LOADED if holds_settings else SAVE_FAILED if name in ("tmp", "etc") else 0
                if done.returncode != wanted:
                    return f"the save ended with {done.returncode} instead of {wanted}"
                if wrong := not holds_settings and image.wrong_settings(image.old if wanted else image.expected):
                    return wrong
        return "" if holds_settings else wrong_accounts(image.settings)
    return case


def swapped_directory(name, number):
    """Between any two calls of a program the directory turns into a link out of the image, and back."""
    def case(image):
        directory, link = image.root / name, image.root / "link"
        outside = image.outside / "there"
        subprocess.run(["cp", "-a", str(directory), str(outside)], check=True)
        for path in outside.rglob(image.settings.name):
            image.write_settings(path, [account("A", DisplayName=MARK)])
        before = contents(outside)
        command = image.commands()[number]
        for turn in range(6):
            link.symlink_to(outside)
            if turn % 2:
                exchange(directory, link)
            done = image.run(command, environment=image.environment(**image.meddled(swap=f"{directory}:{link}")))
            if directory.is_symlink():
                exchange(directory, link)
            link.unlink()
            if done.returncode not in DOCUMENTED:
                return f"turn {turn} ended with {done.returncode}: {done.stderr[-200:]}"
            if MARK.encode() in done.stdout + done.stderr:
                return f"turn {turn} has read what is outside"
            if contents(outside) != before:
                return f"turn {turn} has changed what is outside"
            if wrong := wrong_accounts(image.settings):
                return f"turn {turn}: {wrong}"
        return ""
    return case


def exchange(a, b):
    """Both names change places."""
    spare = a.with_name(a.name + ".exchanged")
    a.rename(spare)
    b.rename(a)
    spare.rename(b)


def linked_journal(image):
    """A link lies where the database's journal would."""
    for database in list(image.root.rglob("*.sqlite")):
        database.with_name(database.name + "-journal").symlink_to(image.secret)
    for command in image.commands():
        done = image.run(command)
        if done.returncode not in DOCUMENTED or SECRET in done.stdout + done.stderr:
            return f"{command[:2]} ended with {done.returncode}"
    return wrong_accounts(image.settings)


CASES = {
    **{f"at the temporary name: {kind}": planted_temporary_name(kind) for kind in PLANTS},
    "all proposed names are taken": all_names_taken,
    "the name is swapped before the change of owner": swapped_name("link"),
    "the name is swapped before the bytes are on the disk": swapped_name("later"),
    "everybody may swap names": directory_open_to_others,
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
    **{f"a link meanwhile: {name}, {program}": swapped_directory(name, number)
       for name in (PREFERENCES, "var/mobile/Library/Contacts", "tmp", "etc")
       for number, program in enumerate(PROGRAMS)},
    "a journal is a link to a secret": linked_journal,
}
