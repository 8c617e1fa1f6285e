"""Security cases about other users of the machine: private files, plug-ins that they may change, locks."""

import fcntl
import os
import pathlib
import plistlib
import re
import shutil
import signal
import subprocess

from hostile_image import OTHER_USER, as_other
from planted_files import PLANTS, REFUSED, look, plant, wrong_accounts

HELD = 11
LEFT_BEHIND = 3
# A property list of an older version, in the binary form: the integer that is 12.
OLDER = (b"\x10\x0c", b"\x10\x0b")
PYTHON = "/usr/bin/python3"  # one that other users can run
# Tries to read and to write every file of the image that it can get at, until it is told to stop.
INTRUDER = r"""
import os, select, sys
root, opened = sys.argv[1], set()
print("ready", flush=True)
while not select.select([sys.stdin], [], [], 0)[0]:
    for place, _, names in os.walk(root):
        for name in names:
            path = os.path.join(place, name)
            for flags in (os.O_RDONLY, os.O_WRONLY):
                try:
                    os.close(os.open(path, flags | os.O_NONBLOCK | os.O_NOFOLLOW))
                    opened.add(path)
                except OSError:
                    pass
print(len(opened), *sorted(opened), flush=True)
"""
MAKING_CALL = re.compile(r'\b(openat|open|mkdir|mkdirat|mknod|mknodat|creat)\(.*?"([^"]*)".*?(?:, (0\d+))?\) = \d')


def change_everything(image):
    """One command each that makes settings, records, copies and logs, with its exit code: the notes are of an
    account that has none, and are left behind."""
    root, outside = image.root, image.outside
    yield [image.found["fault_saver"], "many", root, "A", 50], 0
    yield [image.found["device-image"], "add-account", root, "--type", "CalDAV", "--identifier", "New"], 0
    yield [image.found["device-image"], "import", root, "--dataclass", "notes", "--account", "Q1",
           image.directory / "note.txt"], 0
    yield [image.found["account-settings"], "set", "A", "Key", "value", "--image", root], 0
    yield [image.found["migration-host"], "run", "--image", root, "--log", outside / "log"], LEFT_BEHIND
    yield [image.found["device-image"], "export", root, "--dataclass", "contacts", "--output", outside / "cards"], 0


def intruder_in_a_loop(image):
    """Another user tries to open every file while it is made, where directories and umask allow it."""
    image.open_to_others()
    image.outside.chmod(0o755)
    (image.directory / "note.txt").write_text("Subject: x\n\ny\n")
    intruder = subprocess.Popen([PYTHON, "-c", INTRUDER, str(image.directory)], stdin=subprocess.PIPE,
                                stdout=subprocess.PIPE, text=True, **as_other())
    try:
        # What the test itself made is not meant.
        for path in (image.directory / "note.txt", image.directory / "cards.vcf"):
            path.chmod(0o600)
        image.directory.joinpath("base").chmod(0o700)
        intruder.stdout.readline()
        for command, code in change_everything(image):
            if wrong := image.wrong_end(command, code, umask=0):
                return f"{command[:2]}: {wrong}"
    finally:
        output, _ = intruder.communicate("stop\n", timeout=60)
        (image.directory / "cards.vcf").chmod(0o644)
    count, *names = output.split(maxsplit=1)
    return "" if count == "0" else f"another user has opened {names}"


def modes_when_made(image):
    """No call makes a file or directory that others could use, even before its mode is changed."""
    (image.directory / "note.txt").write_text("Subject: x\n\ny\n")
    trace = image.directory / "trace"
    made_some = 0
    for command, code in change_everything(image):
        # With a file for each process no call is told of in two halves.
        shutil.rmtree(trace, ignore_errors=True)
        trace.mkdir()
        if wrong := image.wrong_end(command, code, umask=0, prefix=[
                "strace", "-ff", "-qq", "-o", trace / "of", "-e", "trace=openat,open,mkdir,mkdirat,mknod,creat", "--"]):
            return f"{command[:2]}: {wrong}"
        for line in [line for path in trace.iterdir() for line in path.read_text(errors="replace").splitlines()]:
            made = MAKING_CALL.search(line)
            if made is None or not ("O_CREAT" in line or "mk" in made[1]):
                continue
            made_some += 1
            if made[3] is None or int(made[3], 8) & 0o077:
                return f"{os.path.basename(command[0])} {command[1]}: {line}"
    return "" if made_some > 10 else f"only {made_some} files were made"


def nothing_is_public(image):
    """After all of it no file of the image can be used by others."""
    (image.directory / "note.txt").write_text("Subject: x\n\ny\n")
    for command, _ in change_everything(image):
        image.run(command, umask=0)
    for path in [*image.root.rglob("*"), image.outside / "log", image.outside / "cards"]:
        if path.lstat().st_mode & 0o077:
            return f"others may use {path.name}: {path.lstat().st_mode:o}"
    return ""


BUNDLE = "LogsAndSucceeds"


def plugin(change, in_image=False):
    """A plug-in that others may write, or replace, is not loaded."""
    def case(image):
        place = image.root / "System/Library/DataClassMigrators" if in_image else image.directory / "plug-ins"
        place.mkdir(exist_ok=True)
        bundle = place / f"{BUNDLE}.migrator"
        try:
            shutil.copytree(pathlib.Path(image.found["bundles"]) / bundle.name, bundle)
            for path in [bundle, *bundle.rglob("*")]:
                path.chmod(0o755)
            # Alone it leaves the account where it is.
            good = image.host(*([] if in_image else ["--bundle", bundle]))
            if good.returncode != (0 if in_image else LEFT_BEHIND):
                return "the plug-in is refused as it is"
            image.reset()
            if in_image:
                shutil.copytree(pathlib.Path(image.found["bundles"]) / bundle.name, bundle)
            change(bundle)
            done = image.host(*([] if in_image else ["--bundle", bundle]))
            if done.returncode != REFUSED or b"first line of" in done.stderr:
                return f"the host ended with {done.returncode}"
            return ""
        finally:
            shutil.rmtree(place)
    return case


def give_away(path):
    os.chown(path, OTHER_USER, OTHER_USER)


def replace_by_link(path):
    path.rename(path.with_suffix(".real"))
    path.symlink_to(path.with_suffix(".real"))


def library(bundle):
    return bundle / f"{BUNDLE}.so"


def own_group(path):
    os.chown(path, 0, OTHER_USER)
    path.chmod(0o775)


PLUGINS = {
    "its library may be written": lambda bundle: library(bundle).chmod(0o757),
    "its folder may be written": lambda bundle: bundle.chmod(0o777),
    "the folder above may be written": lambda bundle: bundle.parent.chmod(0o777),
    "its information may be written": lambda bundle: (bundle / "Info.plist").chmod(0o666),
    "a group may write its library": lambda bundle: own_group(library(bundle)),
    "its library is another user's": lambda bundle: give_away(library(bundle)),
    "its folder is another user's": give_away,
    "the folder above is another user's": lambda bundle: give_away(bundle.parent),
    "its library is a link": lambda bundle: replace_by_link(library(bundle)),
}


def held_by_another(image):
    """Another user holds the image's lock for ever: everybody is told so and turned away."""
    lock = image.root / "var/run/image.lock"
    with open(lock, "a+b") as file:
        os.fchmod(file.fileno(), 0o666)
        fcntl.flock(file, fcntl.LOCK_EX)
        holder = subprocess.Popen(["sleep", "1000"], pass_fds=[file.fileno()], **as_other())
    try:
        for command in [*image.commands()[1:2], *image.commands()[4:6], image.commands()[7]]:
            done = image.run(command)
            if done.returncode != HELD:
                return f"{os.path.basename(command[0])} {command[1]} ended with {done.returncode}"
    finally:
        holder.kill()
        holder.wait()
    return "" if image.host().returncode == 0 else "the lock is not free when its holder has gone"


def lock_that_others_may_not_take(name):
    def case(image):
        image.open_to_others()
        image.run(next(change_everything(image))[0])
        image.run([image.found["fault_saver"], "add", image.root, "L", 1], umask=0)
        image.host()
        path = image.root / name
        if not path.exists():
            return f"{name} is not there"
        done = subprocess.run(["flock", "-n", str(path), "true"], check=False, capture_output=True, **as_other())
        return "another user can take the lock" if done.returncode == 0 else ""
    return case


LOCKS = {"the image's lock": "var/run/image.lock", "the migration lock": "tmp/AccountMigrationInProgress"}


def held_for_ever(image, path):
    """Another user's process that has made the lock file and holds it."""
    path.unlink(missing_ok=True)
    path.parent.chmod(0o1777)
    holder = subprocess.Popen(["flock", str(path), "sh", "-c", "echo held; exec sleep 1000"], start_new_session=True,
                              stdout=subprocess.PIPE, **as_other())
    if holder.stdout.readline() != b"held\n":
        raise RuntimeError("the lock could not be planted")
    return holder


def end(holder):
    os.killpg(holder.pid, signal.SIGKILL)
    holder.wait()
    holder.stdout.close()


def lock_planted_by_another(name):
    """Another user made the lock file first, and holds it: a run does not wait for it."""
    def case(image):
        image.open_to_others()
        holder = held_for_ever(image, image.root / LOCKS[name])
        try:
            code = image.host().returncode
        finally:
            end(holder)
        if code != (0 if "migration" in name else HELD):
            return f"the host ended with {code}"
        return image.wrong_settings(image.old) if code else wrong_accounts(image.settings)
    return case


def legacy_lock_held_for_ever(image):
    """A run with a legacy step needs the migration lock: it gives up in time, has changed nothing, holds nothing,
    and works when the lock is free."""
    install_migrator(image)
    image.settings.write_bytes(image.old.replace(*OLDER))
    image.open_to_others()
    before = image.settings.read_bytes()
    holder = held_for_ever(image, image.root / LOCKS["the migration lock"])
    try:
        done = image.host("--legacy", "--timeout", 2)
        if done.returncode != HELD:
            return f"the host ended with {done.returncode}: {done.stdout[-200:]} {done.stderr[-200:]}"
        if wrong := image.wrong_settings(before):
            return wrong
    finally:
        end(holder)
    (image.root / LOCKS["the migration lock"]).unlink()
    done = image.host("--legacy", "--timeout", 60)
    if done.returncode != 0:
        return f"the next run ended with {done.returncode}: {done.stdout[-200:]} {done.stderr[-200:]}"
    version = plistlib.loads(image.settings.read_bytes())["Version"]
    return "" if version == 12 else f"the settings are of version {version}"


def install_migrator(image):
    """The bundle for legacy settings, as an image has it that is made with its services."""
    whole = image.directory / "whole"
    try:
        subprocess.run([image.found["device-image"], "create", str(whole)], check=True, stdout=subprocess.DEVNULL)
        place = image.root / "System/Library/DataClassMigrators"
        place.mkdir(exist_ok=True, parents=True)
        for bundle in (whole / "System/Library/DataClassMigrators").glob("AccountMigrator.migrator"):
            shutil.copytree(bundle, place / bundle.name)
    finally:
        shutil.rmtree(whole, ignore_errors=True)


# In the order of hostile_image.PROGRAMS: where the image's lock cannot be taken; and where the lock can be, because
# a hard link is a file like any other, or is none that these programs take.
LOCK_REFUSED = (0, REFUSED, 6, 0, REFUSED, REFUSED, 0, REFUSED)
LOCK_NOT_NEEDED = (0, 0, 6, 0, 0, 0, 0, 0)


def something_in_the_place_of(name, kind):
    """Another user put something else where a lock is looked for: nobody waits, opens it or follows it."""
    def case(image):
        image.open_to_others()
        path = image.root / LOCKS[name]
        path.unlink(missing_ok=True)
        path.parent.chmod(0o1777)
        plant(image, path, kind)
        before = look(path)
        codes = LOCK_REFUSED if "image" in name and "hard link" not in kind else LOCK_NOT_NEEDED
        host = [image.found["migration-host"], "run", "--image", image.root, "--legacy", "--timeout", 5]
        wrong = image.wrong_ends(codes) or \
            image.wrong_end([image.found["fault_saver"], "add", image.root, "L", 1], 0) or \
            image.wrong_end(host, codes[1])
        if wrong:
            return wrong
        if look(path) != before or (image.outside / "nothing").exists():
            return "what was planted has changed"
        return wrong_accounts(image.settings)
    return case


CASES = {
    "another user opens every new file in a loop": intruder_in_a_loop,
    "modes of new files at the moment they are made": modes_when_made,
    "nothing is public afterwards": nothing_is_public,
    **{f"a plug-in: {kind}": plugin(change) for kind, change in PLUGINS.items()},
    "a plug-in of the image: its library may be written": plugin(
        lambda bundle: library(bundle).chmod(0o757), in_image=True),
    "a plug-in of the image: its folder is another user's": plugin(give_away, in_image=True),
    "another user holds the image's lock": held_by_another,
    "another user takes the image's lock": lock_that_others_may_not_take("var/run/image.lock"),
    "another user takes the migration lock": lock_that_others_may_not_take("tmp/AccountMigrationInProgress"),
    **{f"another user has made {name} and holds it": lock_planted_by_another(name) for name in LOCKS},
    **{f"in the place of {name}: {kind}": something_in_the_place_of(name, kind)
       for name in LOCKS for kind in PLANTS if kind != "a file of theirs"},
    "another user holds the migration lock of a legacy step": legacy_lock_held_for_ever,
}
