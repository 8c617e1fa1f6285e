"""Saving the settings while something fails: rows S1 to S3, S5 to S8 and S10 of docs/reliability.md."""

import os
import pathlib
import shutil
import subprocess

import matrix
from settings_image import PREFERENCES, SettingsImage

SAVE_FAILED, MANY_LINES, SECOND_FAILED, LEAKED, NOT_LOADED = 1, 2, 4, 8, 16
FIRST_CALL = r'openat.*com\.vantor\.accountsettings\.plist'


class Images:
    """One image for each worker, and what a save does to it."""

    def __init__(self, tools, directory, workers=2):
        self.saver = tools["fault_saver"]
        self.images = [SettingsImage(tools, directory / f"image{i}") for i in range(workers)]
        for image in self.images:
            image.learn(self.command("once", image), image.environment())
        first = self.images[0]
        self.calls = matrix.traced_calls(self.command("once", first), first.environment(),
                                         str(directory / "trace"), FIRST_CALL)
        first.reset()

    def command(self, work, image):
        return [self.saver, work, str(image.root)]


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


def fail_once(images):
    def judge(case, worker):
        image = images.images[worker]
        image.reset()
        code = matrix.run_with(case, images.command("once", image), image.environment())
        return outcome_of_failed_call(code, image)
    return matrix.errors(images.calls), judge


def fail_from_there_on(images):
    _, judge = fail_once(images)
    return matrix.errors(images.calls, lasting=True), judge


def save_again(images):
    """After each failed call the same process saves again, and holds no more descriptors than before."""
    def judge(case, worker):
        image = images.images[worker]
        image.reset()
        code = matrix.run_with(case, images.command("twice", image), image.environment())
        if code == "hang" or code < 0 or code >= 128:
            return f"the program ended with {code}"
        if wrong := image.wrong_files():
            return wrong
        if code & NOT_LOADED:
            return ""
        if code & SECOND_FAILED or not image.is_new():
            return "the second save failed"
        # A close that fails without having been carried out leaves its descriptor open.
        if code & LEAKED and case.call != "close":
            return "descriptors are left open"
        return ""
    return matrix.errors(images.calls), judge


def kill(images):
    def judge(case, worker):
        image = images.images[worker]
        image.reset()
        matrix.run_with(case, images.command("once", image), image.environment())
        if wrong := image.wrong_files(stale_allowed=True):
            return wrong
        code = subprocess.run(images.command("once", image), env=image.environment(), check=False).returncode
        return "" if code == 0 and image.is_new() else f"the next save ended with {code}"
    return matrix.kills(images.calls), judge


def in_own_mounts(script, *arguments):
    """Runs a shell script in a mount name space of its own; None where that is not allowed."""
    if os.geteuid() != 0:
        return None
    return subprocess.run(["unshare", "-m", "sh", "-euc", script, "sh", *map(str, arguments)], check=False,
                          capture_output=True, text=True)


def judge_copy(image, root):
    """The image's state, judged in a copy at another place."""
    kept = image.root, image.settings
    try:
        image.root = pathlib.Path(root)
        image.settings = image.root / PREFERENCES / image.settings.name
        return image.wrong_files()
    finally:
        image.root, image.settings = kept


FULL_DISK = r"""
saver=$1 image=$2 mount=$3 free=$4 inodes=$5 result=$6
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
TMPDIR=$mount/i/tmp "$saver" once "$mount/i" || code=$?
rm -rf "$result"; cp -a "$mount/i" "$result"
exit $((code + 100))
"""


def full_disk(images):
    """A file system with 0, 4, 8 ... KiB left, and with no inode or one."""
    cases = [("KiB", kib) for kib in range(0, 160, 4)] + [("inodes", count) for count in range(3)]

    def judge(case, worker):
        image = images.images[worker]
        image.reset()
        mount = pathlib.Path(f"{image.root}.mount")
        mount.mkdir(exist_ok=True)
        result = f"{image.root}.full"
        done = in_own_mounts(FULL_DISK, images.saver, image.root, mount, case[1], int(case[0] == "inodes"),
                             result)
        code = done.returncode - 100
        if code < 0:
            return f"the test could not be set up: {done.stderr.strip()[-200:]}"
        settings = pathlib.Path(result) / PREFERENCES / image.settings.name
        if wrong := judge_copy(image, result):
            return wrong
        if bool(code & SAVE_FAILED) == (settings.read_bytes() == image.expected):
            return f"exit code {code} says something else than the file"
        return ""
    return cases, judge


def size_limit(images):
    """Files that may grow to a limit only, the signal ignored (short writes, then EFBIG) and not."""
    size = len(images.images[0].expected)
    limits = sorted({0, 1, 7, 512, 4095, 4096, 4097, size - 1, size, size + 1} | set(range(0, size, size // 8)))
    cases = [(ignored, limit) for ignored in (True, False) for limit in limits]

    def judge(case, worker):
        ignored, limit = case
        image = images.images[worker]
        image.reset()
        command = ["prlimit", f"--fsize={limit}", *(["env", "--ignore-signal=XFSZ"] if ignored else []),
                   *images.command("once", image)]
        code = subprocess.run(command, env=image.environment(), check=False).returncode
        if wrong := image.wrong_files(stale_allowed=not ignored):
            return wrong
        if limit >= size:
            return "" if code == 0 and image.is_new() else f"exit code {code} with room enough"
        if image.is_new():
            return "saved past the limit"
        return "" if not ignored or code == SAVE_FAILED else f"exit code {code}"
    return cases, judge


ODD_PLACES = {
    "temporary directory on another mount": 'mount -t tmpfs tmpfs "$i/tmp"',
    "temporary directory missing": 'rmdir "$i/tmp"',
    "temporary directory read-only": 'mount --bind "$i/tmp" "$i/tmp"; mount -o remount,ro,bind "$i/tmp"',
    "temporary directory is a file": 'rmdir "$i/tmp"; : >"$i/tmp"',
    "target directory read-only": 'mount --bind "$p" "$p"; mount -o remount,ro,bind "$p"',
    "target directory gone": 'mv "$p" "$p.away"',
    "settings file immutable": 'chattr +i "$p/com.vantor.accountsettings.plist" || exit 77',
    "settings file is a directory": 's=$p/com.vantor.accountsettings.plist; rm "$s"; mkdir "$s"; : >"$s/x"',
    "settings file is a FIFO": 's=$p/com.vantor.accountsettings.plist; rm "$s"; mkfifo "$s"',
    "settings file is a link to nothing": 's=$p/com.vantor.accountsettings.plist; rm "$s"; ln -s /no/such "$s"',
}
ODD_OWNERS = {
    "mobile missing": 'printf "root:*:0:0::/:/bin/sh\\n" >"$i/etc/passwd"',
    "mobile numeric": 'printf "501:*:501:501::/:/bin/sh\\n" >"$i/etc/passwd"',
    "mobile without a number": 'printf "mobile:*:abc:501::/:/bin/sh\\n" >"$i/etc/passwd"',
    "mobile of a number too large": 'printf "mobile:*:99999999999:501::/:/bin/sh\\n" >"$i/etc/passwd"',
    "users' file a directory": 'rm "$i/etc/passwd"; mkdir "$i/etc/passwd"',
    "users' file missing": 'rm "$i/etc/passwd"',
    "groups' file missing": 'rm "$i/etc/group"',
    "group mobile missing": ': >"$i/etc/group"',
    "users' file a link out": 'rm "$i/etc/passwd"; ln -s /etc/passwd "$i/etc/passwd"',
    "no right to change owners": "with='setpriv --bounding-set=-chown --inh-caps=-chown'",
}
ODD_RUN = r"""
saver=$1 image=$2 i=$3
rm -rf "$i"; cp -a "$image" "$i"
p=$i/var/mobile/Library/Preferences with=
%s
code=0
TMPDIR=$i/tmp timeout 20 $with "$saver" once "$i" || code=$?
chattr -i "$p/com.vantor.accountsettings.plist" 2>/dev/null || :
ls "$i/tmp" >&2 || :
f=$p/com.vantor.accountsettings.plist
[ -f "$f" ] && cmp -s "$f" "$image/var/mobile/Library/Preferences/com.vantor.accountsettings.plist" && echo old
exit $((code + 100))
"""


def odd_surroundings(images, scripts):
    """Each is refused with one line, with nothing left behind; what was a whole file stays the old one."""
    cases = list(scripts)

    def judge(case, worker):
        image = images.images[worker]
        image.reset()
        copy = pathlib.Path(f"{image.root}.odd")
        done = in_own_mounts(ODD_RUN % scripts[case], images.saver, image.root, copy)
        if done.returncode == 77:
            print(f"     {case}: skipped, this file system has no such thing", flush=True)
            return ""
        code = done.returncode - 100
        replaced = case.startswith("settings file is") or case == "target directory gone"
        try:
            if replaced:
                # There was nothing to load: account "A" is not there, so nothing is saved.
                return "" if code == NOT_LOADED else f"exit code {code}"
            if code != SAVE_FAILED:
                return f"exit code {code}: {done.stderr.strip()[-200:]}"
            return "" if done.stdout.strip() == "old" else "the settings file is not the old one"
        finally:
            shutil.rmtree(copy, ignore_errors=True)
    return cases, judge


ROWS = {
    "S1": ("every call of a save fails once", fail_once),
    "S2": ("every call fails from there on", fail_from_there_on),
    "S3": ("killed before every call; the next save succeeds", kill),
    "S5": ("the disk is full", full_disk),
    "S6": ("short writes and the limit of file sizes", size_limit),
    "S7": ("odd temporary and target directories", lambda images: odd_surroundings(images, ODD_PLACES)),
    "S8": ("no owner to give the file to", lambda images: odd_surroundings(images, ODD_OWNERS)),
    "S10": ("the same process saves again after a failed call", save_again),
}
