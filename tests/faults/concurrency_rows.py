"""Many processes save and read one settings file: rows C1 to C3 of docs/reliability.md."""

import os
import plistlib
import random
import subprocess
import time

from settings_image import SettingsImage

SAVERS, READERS = 8, 4


def start(found, image, *arguments):
    return subprocess.Popen([found["fault_saver"], arguments[0], str(image.root), *map(str, arguments[1:])],
                            env=image.environment())


def wait_for(processes, what):
    return [(what, f"ended with {code}") for code in [process.wait() for process in processes] if code != 0]


def save_against_readers(found, directory, is_full):
    saves, reads = (1000, 250_000) if is_full else (100, 25_000)
    image = SettingsImage(found, directory / "c1")
    savers = [start(found, image, "many", chr(ord("A") + i), saves) for i in range(SAVERS)]
    readers = [start(found, image, "read", reads) for _ in range(READERS)]
    bad = wait_for(savers, "saver") + wait_for(readers, "reader")
    accounts = plistlib.loads(image.settings.read_bytes())["Accounts"]
    if len(accounts) != 26:
        bad.append(("the end", f"{len(accounts)} of 26 accounts are there"))
    if image.temporary_files():
        bad.append(("the end", "temporary files are left"))
    return SAVERS * saves, bad


def add_under_the_lock(found, directory, is_full):
    count = 1000 if is_full else 100
    image = SettingsImage(found, directory / "c2")
    bad = wait_for([start(found, image, "add", f"S{i}", count) for i in range(SAVERS)], "saver")
    present = {entry["Identifier"] for entry in plistlib.loads(image.settings.read_bytes())["Accounts"]}
    for i in range(SAVERS):
        bad += [(f"S{i}-{j}", "is missing") for j in range(count) if f"S{i}-{j}" not in present]
    return SAVERS * count, bad


def kill_savers(found, directory, is_full):
    """A saver is killed at a random moment of its work, while others save; a minute, or a few seconds."""
    image = SettingsImage(found, directory / "c3")
    chance = random.Random(20261121)
    end = time.monotonic() + (60 if is_full else 5)
    savers = [start(found, image, "until", chr(ord("A") + i)) for i in range(SAVERS)]
    count, bad = 0, []
    while time.monotonic() < end:
        time.sleep(chance.uniform(0.001, 0.02))
        chosen = chance.randrange(SAVERS)
        savers[chosen].kill()
        savers[chosen].wait()
        count += 1
        try:
            if len(plistlib.loads(image.settings.read_bytes())["Accounts"]) != 26:
                bad.append((count, "accounts are missing"))
        except Exception as error:  # whatever the independent reader does not like
            bad.append((count, f"the settings file cannot be read: {error!r}"))
        savers[chosen] = start(found, image, "until", chr(ord("A") + chosen))
    for saver in savers:
        saver.kill()
        saver.wait()
    for path in image.temporary_files():
        if path.stat().st_mode & 0o077:
            bad.append((path.name, "others can read a stale temporary file"))
    if os.path.getsize(image.settings) == 0:
        bad.append(("the end", "the settings file is empty"))
    return count, bad


ROWS = {
    "C1": ("8 processes save against 4 readers", save_against_readers),
    "C2": ("8 processes add accounts under the lock", add_under_the_lock),
    "C3": ("savers are killed at random", kill_savers),
}
