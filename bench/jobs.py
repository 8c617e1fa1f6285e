"""The whole migration as a process: this project's program and a plain script on equal images."""

import contextlib
import os
import plistlib
import shutil
import sqlite3
import statistics
import subprocess
import sys
import tempfile
import time
from pathlib import Path

HERE = Path(__file__).resolve().parent
SETTINGS = "var/mobile/Library/Preferences/com.vantor.accountsettings.plist"
RETIRED_IN = 20  # one account in so many


def output_of(command: list, environment: dict | None = None) -> bytes:
    """What the program prints; the end of this one, with what it said, when it fails."""
    ended = subprocess.run(command, stdout=subprocess.PIPE, stderr=subprocess.PIPE, env=environment, check=False)
    if ended.returncode != 0:
        sys.exit(f"bench/run: {Path(command[0]).name} ended with {ended.returncode}:\n"
                 + ended.stderr.decode(errors="replace"))
    return ended.stdout


class Job:
    """One kind of image, and what runs on fresh copies of it."""

    def __init__(self, name: str, image: Path):
        self.name, self.image = name, image

    def timed(self, command: list[str]) -> tuple[float, float, Path]:
        """Runs the command on a copy; the seconds of processor time and of the clock, and the copy."""
        copy = self.image.with_name(self.image.name + "-copy")
        shutil.rmtree(copy, ignore_errors=True)
        shutil.copytree(self.image, copy, symlinks=True)
        os.sync()
        words = [word.replace("IMAGE", str(copy)) for word in command]
        with open(os.devnull, "wb") as nowhere, tempfile.TemporaryFile() as errors:
            begin = time.perf_counter()
            started = subprocess.Popen(words, stdout=nowhere, stderr=errors)
            _, status, usage = os.wait4(started.pid, 0)
            clock = time.perf_counter() - begin
            started.returncode = os.waitstatus_to_exitcode(status)
            if started.returncode != 0:
                errors.seek(0)
                sys.exit(f"bench/run: {' '.join(words)} ended with {started.returncode}:\n"
                         + errors.read().decode(errors="replace"))
        return usage.ru_utime + usage.ru_stime, clock, copy


def left_in(image: Path) -> list:
    """The accounts of the image and the records of its local stores, in an order of their own."""
    with open(image / SETTINGS, "rb") as file:
        accounts = [account["Identifier"] for account in plistlib.load(file)["Accounts"]]
    records = []
    for database in sorted(image.glob("var/mobile/Library/*/*.sqlite")):
        with contextlib.closing(sqlite3.connect(f"file:{database}?mode=ro", uri=True)) as base:
            records += base.execute("SELECT kind, uid, base_uid, content_hash FROM records JOIN stores "
                                    "ON stores.id = store WHERE account IS NULL AND retired_at IS NULL").fetchall()
    return accounts + sorted(records)


def make_images(programs: Path, directory: Path, many: int) -> dict[str, Job]:
    sample = directory / "sample"
    output_of([HERE.parent / "examples/make-sample-image", sample, "--tool", programs / "device-image"])
    large, idle = directory / "large", directory / "idle"
    shutil.copytree(sample, large, symlinks=True)
    shutil.copytree(sample, idle, symlinks=True)
    change_settings(large, lambda accounts: many_accounts(accounts, many))
    change_settings(idle, lambda accounts: [dict(account, QuillnetStatus=0) if "QuillnetStatus" in account
                                            else account for account in accounts])
    return {job.name: job for job in
            [Job("sample image", sample), Job(f"{many:,} accounts", large), Job("nothing to do", idle)]}


def change_settings(image: Path, change) -> None:
    path = image / SETTINGS
    settings = plistlib.loads(path.read_bytes())
    settings["Accounts"] = change(settings["Accounts"])
    path.write_bytes(plistlib.dumps(settings, fmt=plistlib.FMT_BINARY))


def many_accounts(accounts: list[dict], many: int) -> list[dict]:
    """The sample's accounts that stay, and others like its accounts; of all of them one in RETIRED_IN is to go."""
    going = next(account for account in accounts if account.get("QuillnetStatus") == 1)
    staying = [account for account in accounts if "QuillnetStatus" not in account and account["Type"] != "OnMyDevice"]
    made = [account for account in accounts if account.get("QuillnetStatus") != 1]
    while len(made) < many:
        number = len(made)
        model = going if number % RETIRED_IN == RETIRED_IN - 1 else staying[number % len(staying)]
        made.append(renamed(model, number))
    retired = sum(account.get("QuillnetStatus") == 1 for account in made)
    if (len(made), retired) != (many, many // RETIRED_IN):
        sys.exit(f"bench/run: {retired} of {len(made)} accounts are to go, not {many // RETIRED_IN} of {many}")
    return made


def renamed(account: dict, number: int) -> dict:
    copy = dict(account, Identifier=f"{account['Identifier']}-{number}", DisplayName=f"Account {number}",
                Username=f"user{number}@example.com")
    if "Sync Identifier" in copy:
        copy["Sync Identifier"] = copy["Identifier"]
    if "ChildAccounts" in copy:
        copy["ChildAccounts"] = [
            dict(child, Identifier=f"{child['Identifier']}-{number}") for child in copy["ChildAccounts"]]
    return copy


def measure(programs: Path, repetitions: int, many: int) -> list[dict]:
    """One result for each job and program, in turn so that both see the same machine."""
    commands = {"own": [str(programs / "migration-host"), "run", "--image", "IMAGE", "--quiet", "--json"],
                "Python script": [sys.executable, "-B", str(HERE / "migrate.py"), "IMAGE"]}
    times: dict[tuple[str, str], list[tuple[float, float]]] = {}
    with tempfile.TemporaryDirectory() as directory:
        jobs = make_images(programs, Path(directory), many)
        for repetition in range(repetitions + 1):  # the first is for warming up
            for job in jobs.values():
                left = {}
                for who, command in commands.items():
                    processor, clock, copy = job.timed(command)
                    left[who] = left_in(copy)
                    if repetition > 0:
                        times.setdefault((job.name, who), []).append((processor, clock))
                if left["own"] != left["Python script"]:
                    sys.exit(f"bench/run: the program and the script leave different images ({job.name})")
    return [{"job": job, "who": who, "processor": statistics.median(run[0] for run in runs),
             "clock": statistics.median(run[1] for run in runs)} for (job, who), runs in times.items()]
