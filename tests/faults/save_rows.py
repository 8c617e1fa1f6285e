"""Saving the settings while something fails: rows S1 to S3, S5, S6 and S10 of docs/reliability.md."""

import collections
import os
import pathlib
import shutil
import signal
import subprocess

import matrix
from starting_points import STARTS, Images, StartedCase

SAVE_FAILED, MANY_LINES, SECOND_FAILED, LEAKED, NOT_LOADED, OUT_OF_MEMORY = 1, 2, 4, 8, 16, 64
LIMIT = 30  # seconds of one save


def outcome_of_failed_call(code, image):
    """What is wrong after a save in which a call failed."""
    if code == "hang" or code < 0 or code >= 128:
        return f"the program ended with {code}"
    if wrong := image.wrong_files():
        return wrong
    if code & MANY_LINES:
        return "more than one line was logged"
    if code & NOT_LOADED:
        return "" if not image.is_new() else "saved without having loaded"
    if bool(code & SAVE_FAILED) == image.is_new():
        return "the log line and the file say different things"
    return ""


def next_save(images, image, environment=None):
    """What is wrong with a save that nothing disturbs, after one that something did."""
    code = subprocess.run(images.command(image), env=environment or image.environment(), check=False,
                          timeout=LIMIT).returncode
    return "" if code == 0 and image.is_new() else f"the next save ended with {code}"


def started(all_images, starts, faults):
    return [StartedCase(start, fault) for start in starts for fault in faults(all_images[start].calls)
            # A call that says that a file is missing which is there lies, and what was not seen is not kept.
            if not start or fault.fault != "ENOENT"]


def fail_once(all_images):
    def judge(case, worker):
        images = all_images[case.start]
        image, code = images.run_under(case.fault, worker)
        return outcome_of_failed_call(code, image)
    return started(all_images, all_images, matrix.errors), judge


def fail_from_there_on(all_images):
    _, judge = fail_once(all_images)
    starts = [start for start in all_images if start != "not loaded"]
    return started(all_images, starts, lambda calls: matrix.errors(calls, lasting=True)), judge


def save_again(all_images):
    """After each failed call the same process saves again, or loads and saves when it had loaded nothing: it
    writes everything, and holds no more descriptors than before."""
    def judge(case, worker):
        images = all_images[case.start]
        image, code = images.run_under(case.fault, worker, again=True)
        if code == "hang" or code < 0 or code >= 128:
            return f"the program ended with {code}"
        if wrong := image.wrong_files():
            return wrong
        if code & SECOND_FAILED or not image.is_new():
            return "the second save failed"
        # A close that fails without having been carried out leaves its descriptor open.
        if code & LEAKED and case.fault.call != "close":
            return "descriptors are left open"
        return ""
    return started(all_images, all_images, matrix.errors), judge


def kill(all_images):
    def judge(case, worker):
        images = all_images[case.start]
        image, code = images.run_under(case.fault, worker)
        if code != -signal.SIGKILL:
            return f"it was not killed, but ended with {code}"
        return image.wrong_files(stale_allowed=True) or next_save(images, image) or \
            image.wrong_files(stale_allowed=True)
    starts = [start for start in all_images if start != "not loaded"]
    return started(all_images, starts, matrix.kills), judge


def in_own_mounts(script, *arguments):
    """Runs a shell script in a mount name space of its own; None where that is not allowed."""
    if os.geteuid() != 0:
        return None
    return subprocess.run(["unshare", "-m", "sh", "-euc", script, "sh", *map(str, arguments)], check=False,
                          capture_output=True, text=True)


FULL_DISK = r"""
saver=$1 work=$2 image=$3 mount=$4 free=$5 inodes=$6 result=$7
mount -t tmpfs -o size=16m tmpfs "$mount"
cp -a "$image" "$mount/i"
if [ "$inodes" = 1 ]; then
  used=$(df --output=iused "$mount" | tail -n 1)
  mount -o "remount,nr_inodes=$((used + free))" "$mount"
else
  left=$(df --output=avail -k "$mount" | tail -n 1)
  dd if=/dev/zero of="$mount/filler" bs=1k count=$((left - free)) 2>/dev/null
fi
code=0
TMPDIR=$mount/i/tmp "$saver" "$work" "$mount/i" || code=$?
rm -rf "$result"; cp -a "$mount/i" "$result"
exit $((code + 100))
"""
# Where the room has to do: for the new settings, and for a copy of the old ones.
STARTS_THAT_WRITE = ("", "unreadable, of two names")


class NamedCase(collections.namedtuple("NamedCase", "start kind number")):
    def __str__(self):
        return f"{self.start or 'settings'}, {self.number} {self.kind}"


def full_disk(all_images):
    """A file system with 0, 4, 8 ... KiB left, and with no inode or a few; the next save has room."""
    starts = {start: all_images[start] for start in STARTS_THAT_WRITE}
    cases = [NamedCase(start, kind, number) for start in starts
             for kind, numbers in (("KiB", range(0, 160, 4)), ("inodes", range(4))) for number in numbers]

    def judge(case, worker):
        images = starts[case.start]
        image = images.images[worker]
        image.reset()
        mount = pathlib.Path(f"{image.root}.mount")
        mount.mkdir(exist_ok=True)
        left = image.at(f"{image.root}.full", image)
        done = in_own_mounts(FULL_DISK, images.saver, images.work, image.root, mount, case.number,
                             int(case.kind == "inodes"), left.root)
        code = done.returncode - 100
        if code < 0:
            return f"the test could not be set up: {done.stderr.strip()[-200:]}"
        if wrong := left.wrong_files():
            return wrong
        if code != (0 if left.is_new() else SAVE_FAILED):
            return f"exit code {code} says something else than the file"
        if not case.number and left.is_new():
            return "saved without any room"
        return next_save(images, left) or left.wrong_files()
    return cases, judge


def size_limit(all_images):
    """Files that may grow to a limit only, the signal ignored (short writes, then EFBIG) and not; the next save
    has no limit."""
    cases, sizes = [], {}
    for start in STARTS_THAT_WRITE:
        first = all_images[start].images[0]
        size = sizes[start] = max(len(first.expected), len(first.old) if start else 0)
        limits = {0, 1, 7, 512, 4095, 4096, 4097, size - 1, size, size + 1} | set(range(0, size, size // 8))
        cases += [NamedCase(start, kind, limit) for kind in ("bytes", "bytes at most") for limit in sorted(limits)]

    def judge(case, worker):
        start, kind, limit = case
        is_ignored, size = kind == "bytes", sizes[start]
        images = all_images[start]
        image = images.images[worker]
        image.reset()
        command = ["prlimit", f"--fsize={limit}", *(["env", "--ignore-signal=XFSZ"] if is_ignored else []),
                   *images.command(image)]
        code = subprocess.run(command, env=image.environment(), check=False, timeout=LIMIT).returncode
        if wrong := image.wrong_files(stale_allowed=not is_ignored):
            return wrong
        if image.is_new() != (limit >= size):
            return f"saved with a limit of {limit} bytes" if image.is_new() else "not saved with room enough"
        wanted = 0 if limit >= size else SAVE_FAILED if is_ignored else -signal.SIGXFSZ
        return f"exit code {code} instead of {wanted}" if code != wanted else \
            next_save(images, image) or image.wrong_files(stale_allowed=not is_ignored)
    return cases, judge


class AllImages(dict):
    """The images of a start, made when they are first asked for."""

    def __init__(self, found, directory):
        super().__init__({start: None for start in STARTS})
        self.found, self.directory = found, directory

    def __getitem__(self, start):
        if super().__getitem__(start) is None:
            self[start] = Images(self.found, self.directory, start)
        return super().__getitem__(start)


def row(name, cases_of):
    def make(found, directory, _is_full):
        place = directory / name
        place.mkdir()
        cases, judge = cases_of(AllImages(found, place))
        bad = matrix.judge_all(cases, judge)
        shutil.rmtree(place)
        return len(cases), [(str(case), text) for case, text in bad]
    return make


ROWS = {
    "S1": ("every call of a save fails once", row("s1", fail_once)),
    "S2": ("every call fails from there on", row("s2", fail_from_there_on)),
    "S3": ("killed before every call; the next save succeeds", row("s3", kill)),
    "S5": ("the disk is full", row("s5", full_disk)),
    "S6": ("short writes and the limit of file sizes", row("s6", size_limit)),
    "S10": ("the same process saves again after a failed call", row("s10", save_again)),
}
