"""Many processes save and read one settings file: rows C1 to C3 of docs/reliability.md."""

import collections
import plistlib
import random
import select
import signal
import subprocess
import time

from settings_image import SettingsImage

SAVERS, READERS = 8, 4
LIMIT = 1800  # seconds


def start(found, image, *arguments):
    return subprocess.Popen([found["fault_saver"], arguments[0], str(image.root), *map(str, arguments[1:])],
                            env=image.environment())


def wait_for(processes, what):
    return [(what, f"ended with {code}") for code in [process.wait(LIMIT) for process in processes] if code != 0]


def save_against_readers(found, directory, is_full):
    """The savers go on, in rounds, until every reader has read often enough; each file they meet is whole."""
    saves, reads = (1000, 250_000) if is_full else (100, 25_000)
    image = SettingsImage(found, directory / "c1")
    old = directory / "c1.old"
    old.write_bytes(image.old)
    readers = [subprocess.Popen([found["fault_reader"], str(image.root), str(old), str(reads)],
                                stdin=subprocess.PIPE, stdout=subprocess.PIPE, text=True) for _ in range(READERS)]
    count, bad, busy = 0, [], readers
    while busy and not bad:
        bad += wait_for([start(found, image, "many", chr(ord("A") + i), saves) for i in range(SAVERS)], "saver")
        count += SAVERS * saves
        ready, _, _ = select.select([reader.stdout for reader in busy], [], [], 0)
        busy = [reader for reader in busy if reader.stdout not in ready]
    bad += judged_readers(readers)
    accounts = plistlib.loads(image.settings.read_bytes())["Accounts"]
    if [entry["Identifier"] for entry in accounts] != [chr(ord("A") + i) for i in range(26)]:
        bad.append(("the end", f"{len(accounts)} of 26 accounts are there"))
    if image.temporary_files():
        bad.append(("the end", "temporary files are left"))
    return count, bad


def judged_readers(readers):
    """Ends the readers: what is wrong with what they saw."""
    reads, bad = 0, []
    for number, reader in enumerate(readers):
        output, _ = reader.communicate(timeout=LIMIT)
        if reader.returncode != 0:
            bad.append((f"reader {number}", "met a file that is not whole"))
            continue
        read, changes = map(int, output.split()[-2:])
        reads += read
        if changes == 0:
            bad.append((f"reader {number}", "met one file only"))
    print(f"     C1: {reads} reads", flush=True)
    return bad


def add_under_the_lock(found, directory, is_full):
    count = 1000 if is_full else 100
    image = SettingsImage(found, directory / "c2")
    expected = collections.Counter(identifiers_in(image))
    bad = wait_for([start(found, image, "add", f"S{i}", count) for i in range(SAVERS)], "saver")
    expected.update(f"S{i}-{j}" for i in range(SAVERS) for j in range(count))
    present = collections.Counter(identifiers_in(image))
    bad += [(identifier, "is missing") for identifier in expected - present]
    bad += [(identifier, "is there and should not be, or once more") for identifier in present - expected]
    return SAVERS * count, bad


def identifiers_in(image):
    return [entry["Identifier"] for entry in plistlib.loads(image.settings.read_bytes())["Accounts"]]


def wrong_settings(image):
    try:
        accounts = plistlib.loads(image.settings.read_bytes())["Accounts"]
    except Exception as error:  # whatever the independent reader does not like
        return f"the settings file cannot be read: {error!r}"
    return "" if len(accounts) == 26 else "accounts are missing"


def kill_at_random(found, directory, is_full):
    """Savers are killed at random moments of their work, while others save; then hosts are, and the next host
    removes what all of them have left."""
    image = SettingsImage(found, directory / "c3")
    chance = random.Random(20261121)
    savers, bad = kill_savers(found, image, chance, 1000 if is_full else 150)
    left = image.temporary_files()
    bad += [(path.name, "others can read a stale temporary file") for path in left if path.stat().st_mode & 0o077]
    if len(left) > savers:
        bad.append(("the end", f"{len(left)} temporary files are left by {savers} savers"))
    if is_full and not left:
        bad.append(("the end", "no saver was killed while it had a temporary file"))
    hosts, more = kill_hosts(found, image, chance, 100 if is_full else 10)
    print(f"     C3: {savers} savers had left {len(left)} temporary files", flush=True)
    return savers + hosts, bad + more


def kill_savers(found, image, chance, at_least):
    end = time.monotonic() + (60 if at_least >= 1000 else 5)
    savers = [start(found, image, "until", chr(ord("A") + i)) for i in range(SAVERS)]
    count, bad = 0, []
    while time.monotonic() < end or count < at_least:
        time.sleep(chance.uniform(0.001, 0.02))
        chosen = chance.randrange(SAVERS)
        savers[chosen].kill()
        if (code := savers[chosen].wait()) != -signal.SIGKILL:
            bad.append((count, f"a saver ended on its own with {code}"))
        count += 1
        if wrong := wrong_settings(image):
            bad.append((count, wrong))
        savers[chosen] = start(found, image, "until", chr(ord("A") + chosen))
    for saver in savers:
        saver.kill()
        saver.wait()
    return count + SAVERS, bad


def kill_hosts(found, image, chance, at_least):
    """Hosts at work on an image with left-overs. A last one, left alone, does its work and tidies up."""
    command = [found["migration-host"], "run", "--image", str(image.root)]
    count, bad = 0, []
    for count in range(1, at_least + 1):
        (image.root / "tmp/fileAAAAAA").touch(0o600)
        host = subprocess.Popen(command, env=image.environment(), stdout=subprocess.DEVNULL,
                                stderr=subprocess.DEVNULL)
        time.sleep(chance.uniform(0, 0.06))
        host.kill()
        host.wait()
        if wrong := wrong_settings(image):
            bad.append((f"host {count}", wrong))
    try:
        code = subprocess.run(command, env=image.environment(), check=False, timeout=60,
                              stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL).returncode
    except subprocess.TimeoutExpired:
        code = "hang"
    if code != 0 or wrong_settings(image):
        bad.append(("the last host", f"ended with {code}, {wrong_settings(image)}"))
    if left := [path.name for path in image.temporary_files() if path.name.startswith("file")]:
        bad.append(("the last host", f"has left {left}"))
    return count + 1, bad


ROWS = {
    "C1": ("8 processes save against 4 readers", save_against_readers),
    "C2": ("8 processes add accounts under the lock", add_under_the_lock),
    "C3": ("savers and hosts are killed at random; the next host sweeps", kill_at_random),
}
