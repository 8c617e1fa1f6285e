"""Plug-ins that behave as badly as they can, and a host that is killed: rows H1 and H2 of docs/reliability.md."""

import contextlib
import ctypes
import fcntl
import os
import pathlib
import shutil
import signal
import subprocess
import time

import matrix
from migration_image import environment
from migration_rows import prepared

RECORDS = 6  # of each kind
LIMIT = 60  # seconds, after which a host counts as hanging
LOCK = "var/run/image.lock"
# The exit codes that the manual page gives; a bundle that does what it should leaves Q1 behind, code 3.
HOSTILE = {
    "Missing": {7}, "NoLibrary": {7}, "UnresolvedSymbol": {7}, "NoEntry": {7}, "OtherVersion": {7}, "OtherKind": {7},
    "CrashesWhenLoaded": {8}, "ThrowsException": {8}, "ThrowsInteger": {8}, "RaisesInternalConsistencyFailure": {8},
    "ThrowsThroughNoexcept": {8}, "Exits": {8}, "ExitsAtOnce": {8}, "EndsItsThread": {8}, "Aborts": {8},
    "OverflowsTheStack": {8}, "Spins": {8}, "Sleeps": {8}, "IgnoresTermination": {8}, "LeavesGrandchildren": {3},
    "LeavesAWriter": {3}, "KeepsItsOutputOpen": {3}, "IsTracedByItsChild": {3}, "ClosesDescriptors": {8},
    "FillsItsOutput": {3}, "WritesOutputForEver": {8}, "LogsForEver": {8}, "AllocatesWithoutEnd": {8},
    "ReportsFailure": {1},
}


def processes_of(image):
    """Those whose environment names the image's temporary directory, zombies aside."""
    wanted, found = f"TMPDIR={image}/tmp".encode(), []
    for entry in pathlib.Path("/proc").iterdir():
        with contextlib.suppress(OSError):
            if entry.name.isdigit() and wanted in (entry / "environ").read_bytes().split(b"\0"):
                found.append(int(entry.name))
    return found


def adopt_what_hosts_leave():
    """From here on, what outlives a host becomes a child of this process, and shows in `zombies`."""
    ctypes.CDLL(None).prctl(36, 1, 0, 0, 0)  # PR_SET_CHILD_SUBREAPER


def zombies():
    """Processes of plug-ins that have ended, that their host did not ask for, and that came to us."""
    found = []
    for entry in pathlib.Path("/proc").iterdir():
        with contextlib.suppress(OSError):
            if entry.name.isdigit():
                before, _, after = (entry / "stat").read_text().rpartition(")")
                # The program is started anew through a link of this name.
                if before.endswith("(exe") and after.split()[:2] == ["Z", str(os.getpid())]:
                    found.append(int(entry.name))
    return found


def is_lock_held(image):
    with open(image / LOCK, "rb") as lock:
        try:
            fcntl.flock(lock, fcntl.LOCK_EX | fcntl.LOCK_NB)
        except BlockingIOError:
            return True
    return False


def bundle_of(found, directory, name):
    if name == "Missing":
        return directory / "Missing.migrator"
    if name == "NoLibrary":
        bundle = directory / "NoLibrary.migrator"
        shutil.copytree(pathlib.Path(found["bundles"]) / "Aborts.migrator", bundle, dirs_exist_ok=True)
        (bundle / "Aborts.so").write_text("no library")
        return bundle
    return pathlib.Path(found["bundles"]) / f"{name}.migrator"


def hostile_plugins(found, directory, is_full):
    """Each ends with its code, in time, and leaves no process, no lock and no record touched."""
    migration = prepared(found, directory, RECORDS, "h1")
    bundles = {name: bundle_of(found, migration.directory, name) for name in HOSTILE}

    def judge(name, worker):
        image = migration.copy(worker)
        command = [*migration.command(image), "--bundle", str(bundles[name]), "--timeout", "2"]
        host = subprocess.Popen(command, env=environment(), stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
        try:
            code = host.wait(LIMIT)
        except subprocess.TimeoutExpired:
            host.kill()
            host.wait()
            return "the host does not end"
        if code not in HOSTILE[name]:
            return f"the host ended with {code}"
        if left := processes_of(image):
            return f"processes are left: {left}"
        if (image / LOCK).exists() and is_lock_held(image):
            return "the lock is held"
        state = migration.look(image)
        if (state.active, state.retired) != (migration.begin.active, migration.begin.retired):
            return "the records have changed"
        (image / "tmp/opened").unlink(missing_ok=True)  # ClosesDescriptors makes a file of its own
        return migration.rerun(image)
    adopt_what_hosts_leave()
    bad = matrix.judge_all(list(HOSTILE), judge)
    if left := zombies():
        bad.append(("the end", f"zombies are left: {left}"))
    return len(HOSTILE), bad


def wait_until(condition, host):
    """False when the host ended, or time went by, first."""
    end = time.monotonic() + LIMIT
    while time.monotonic() < end:
        if value := condition():
            return value
        if host.poll() is not None:
            return None
    return None


def log_has(image, count):
    def look():
        with contextlib.suppress(OSError):
            return (image / "var/log/system.log").read_bytes().count(b"\n") >= count
        return False
    return look


DAEMON = "SpinsBesideADaemon"
# A bundle that works until it is killed, or, for the real migrator, the lines that it has logged by then.
KILLED = ["Spins", DAEMON, "Sleeps", "LogsForEver", "WritesOutputForEver", 0, 1, 2, 3, 5, 8]


def killed_host(found, directory, is_full):
    """The migrator goes with its host, the lock is free then, and the next run does the work. A daemon of the
    migrator's own stays, because nobody is left who could end it, and holds no lock."""
    migration = prepared(found, directory, RECORDS, "h2")

    def shoot(kind, worker):
        """The image after the host was killed; None when it had ended before."""
        image = migration.copy(worker)
        command = migration.command(image)
        if isinstance(kind, str):
            command += ["--bundle", str(bundle_of(found, migration.directory, kind))]
        host = subprocess.Popen(command, env=environment(), stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
        children = pathlib.Path(f"/proc/{host.pid}/task/{host.pid}/children")
        wait_until(lambda: children.exists() and children.read_text(), host)
        if isinstance(kind, int):
            wait_until(log_has(image, kind), host)
        was_running = bool(children.exists() and children.read_text())
        host.send_signal(signal.SIGKILL)
        return image if host.wait() == -signal.SIGKILL and was_running else None

    def judge(kind, worker):
        image = None
        for _ in range(20):  # a fast migrator is gone before it is hit
            image = image or shoot(kind, worker)
        if not image:
            return "the host always ended before it could be killed"
        may_stay = 1 if kind == DAEMON else 0
        end = time.monotonic() + LIMIT
        while len(processes_of(image)) > may_stay or is_lock_held(image):
            if time.monotonic() > end:
                return f"left: processes {processes_of(image)}, lock held {is_lock_held(image)}"
        for process in processes_of(image):
            os.kill(process, signal.SIGKILL)
        return migration.rerun(image)
    return len(KILLED), matrix.judge_all(KILLED, judge)


ROWS = {
    "H1": ("hostile plug-ins", hostile_plugins),
    "H2": ("the host is killed while the plug-in runs", killed_host),
}
