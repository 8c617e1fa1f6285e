"""Saving where the surroundings have become odd: rows S7 and S8 of docs/reliability.md. The settings are loaded
first, so that a failure has something to lose, then the place is broken, then they are saved. Everything that the
image holds is looked at before and after the save."""

import hashlib
import os
import pathlib
import re
import shutil
import subprocess

import matrix
from settings_image import NAME, PREFERENCES, SettingsImage
from starting_points import Images

SAVE_FAILED, NOT_LOADED = 1, 16
CANNOT_BE_MADE = 77
LOG_LINE = "Failed to save accounts to filesystem. Maybe the information did not conform to a plist.\n"
SETTINGS = f"./{PREFERENCES}/{NAME}"

# What breaks the place; what comes of the save: FAILED, or KEPT when it has put something that was no settings
# file under another name and saved; what mends the place.
FAILED, KEPT, SAVED = "failed", "kept", "saved"
ODD_PLACES = {
    "temporary directory on another mount": ('mount -t tmpfs tmpfs "$i/tmp"', FAILED, 'umount "$i/tmp"'),
    "temporary directory missing": ('rmdir "$i/tmp"', FAILED, 'mkdir "$i/tmp"'),
    "temporary directory read-only": (
        'mount --bind "$i/tmp" "$i/tmp"; mount -o remount,ro,bind "$i/tmp"', FAILED, 'umount "$i/tmp"'),
    "temporary directory is a file": ('rmdir "$i/tmp"; : >"$i/tmp"', FAILED, 'rm "$i/tmp"; mkdir "$i/tmp"'),
    "temporary directory immutable": ('chattr +i "$i/tmp" || exit 77', FAILED, 'chattr -i "$i/tmp"'),
    "temporary directory is a link": (
        'mv "$i/tmp" "$i/real"; ln -s real "$i/tmp"', FAILED, 'rm "$i/tmp"; mv "$i/real" "$i/tmp"'),
    "target directory read-only": (
        'mount --bind "$p" "$p"; mount -o remount,ro,bind "$p"', FAILED, 'umount "$p"'),
    "target directory missing": ('mv "$p" "$p.away"', FAILED, 'mv "$p.away" "$p"'),
    "target directory is a file": ('mv "$p" "$p.away"; : >"$p"', FAILED, 'rm "$p"; mv "$p.away" "$p"'),
    "target directory immutable": ('chattr +i "$p" || exit 77', FAILED, 'chattr -i "$p"'),
    "settings file immutable": ('chattr +i "$s" || exit 77', FAILED, 'chattr -i "$s"'),
    "settings file is a directory": ('rm "$s"; mkdir "$s"; : >"$s/x"', FAILED, 'rm -r "$s"'),
    "settings file is a FIFO": ('rm "$s"; mkfifo "$s"', KEPT, ':'),
    "settings file is a link to nothing": ('rm "$s"; ln -s /no/such "$s"', KEPT, ':'),
    "settings file is a socket": (
        'rm "$s"; python3 -c "import socket, sys; socket.socket(socket.AF_UNIX).bind(sys.argv[1])" s;'
        ' mv s "$s"', KEPT, ':'),
}
ODD_OWNERS = {
    "mobile missing": ('printf "root:*:0:0::/:/bin/sh\\n" >"$i/etc/passwd"', FAILED),
    "mobile numeric": ('printf "501:*:501:501::/:/bin/sh\\n" >"$i/etc/passwd"', FAILED),
    "mobile without a number": ('printf "mobile:*:abc:501::/:/bin/sh\\n" >"$i/etc/passwd"', FAILED),
    "mobile of a number too large": ('printf "mobile:*:99999999999:501::/:/bin/sh\\n" >"$i/etc/passwd"', FAILED),
    "mobile of a negative number": ('printf "mobile:*:-1:501::/:/bin/sh\\n" >"$i/etc/passwd"', FAILED),
    "mobile is the superuser": (
        'printf "mobile:*:0:0::/:/bin/sh\\n" >"$i/etc/passwd"; printf "mobile:*:0:\\n" >"$i/etc/group"', SAVED),
    "users' file a directory": ('rm "$i/etc/passwd"; mkdir "$i/etc/passwd"', FAILED),
    "users' file missing": ('rm "$i/etc/passwd"', FAILED),
    "users' file empty": (': >"$i/etc/passwd"', FAILED),
    "groups' file missing": ('rm "$i/etc/group"', FAILED),
    "group mobile missing": (': >"$i/etc/group"', FAILED),
    "group mobile without a number": ('printf "mobile:*:x:\\n" >"$i/etc/group"', FAILED),
    "users' file a link out": ('rm "$i/etc/passwd"; ln -s /etc/passwd "$i/etc/passwd"', FAILED),
    "users' file a FIFO": ('rm "$i/etc/passwd"; mkfifo "$i/etc/passwd"', FAILED),
    "no right to change owners": ("", FAILED),
}
WITHOUT_THE_RIGHT = "setpriv --bounding-set=-chown --inh-caps=-chown"
RUN = r"""
saver=$1 out=$2 with=$3
export i=$4 look=$5 out
export p=$i/var/mobile/Library/Preferences s=$i/var/mobile/Library/Preferences/com.vantor.accountsettings.plist
cd "$out"
code=0
SAVER_LOG=$out/log SAVER_BEFORE_SAVE='set -e; %s
  python3 -B "$look" "$i" >"$out/before"' \
  TMPDIR=$i/tmp timeout 20 $with "$saver" once "$i" || code=$?
python3 -B "$look" "$i" >"$out/after"
%s
exit $((code + 100))
"""


def look(root):
    """All that the directory holds: a line for each thing, with its kind, mode, owner and content."""
    for path in sorted(pathlib.Path(root).rglob("*")):
        status = path.lstat()
        content = os.readlink(path) if path.is_symlink() else \
            hashlib.sha256(path.read_bytes()).hexdigest() if path.is_file() else ""
        print(f"./{path.relative_to(root)} {status.st_mode:o} {status.st_uid}:{status.st_gid} {content}")


def expected_line(content, owner):
    return f"{SETTINGS} 100600 {owner[0]}:{owner[1]} {hashlib.sha256(content).hexdigest()}"


def wrong_look(outcome, before, after, image):
    """What is wrong with the differences between both looks."""
    gone, come = sorted(set(before) - set(after)), sorted(set(after) - set(before))
    if outcome == FAILED:
        return f"of {gone} the failed save has made {come}" if gone or come else ""
    wanted = [expected_line(image.expected, (0, 0) if outcome == SAVED else image.owner)]
    if outcome == KEPT:
        wanted.append(gone[0].replace(SETTINGS, SETTINGS + ".unreadable-1"))
    if len(gone) != 1 or not gone[0].startswith(SETTINGS + " ") or come != sorted(wanted):
        return f"of {gone} the save has made {come}"
    return ""


def odd_surroundings(found, place, scripts):
    place.mkdir()
    images = Images(found, place)

    def judge(case, worker):
        script, outcome, *undo = scripts[case]
        original = images.images[worker]
        copy, out = pathlib.Path(f"{original.root}.odd"), pathlib.Path(f"{original.root}.out")
        for path in (copy, out):
            shutil.rmtree(path, ignore_errors=True)
        out.mkdir()
        subprocess.run(["cp", "-a", str(original.root), str(copy)], check=True)
        elsewhere = set(os.listdir("/tmp"))
        done = subprocess.run(["unshare", "-m", "sh", "-euc", RUN % (script, undo[0] if undo else ":"), "sh",
                               images.saver, str(out), "" if script else WITHOUT_THE_RIGHT, str(copy), __file__],
                              check=False, capture_output=True, text=True, timeout=60)
        code = done.returncode - 100
        log = (out / "log").read_text(encoding="utf-8") if (out / "log").exists() else ""
        if code != (SAVE_FAILED if outcome == FAILED else 0):
            return f"exit code {code}: {done.stderr.strip()[-200:]}"
        if wrong := wrong_look(outcome, *((out / name).read_text(encoding="utf-8").splitlines()
                                          for name in ("before", "after")), original):
            return wrong
        if log != (LOG_LINE if outcome == FAILED else ""):
            return f"logged: {log!r}"
        if left := [name for name in set(os.listdir("/tmp")) - elsewhere if re.fullmatch(r"file\w{6}", name)]:
            return f"a temporary file is left elsewhere: {left}"
        return saved_when_mended(copy, original)

    def saved_when_mended(copy, original):
        shutil.rmtree(copy / "etc")
        shutil.copytree(original.root / "etc", copy / "etc")
        mended = SettingsImage.at(copy, original)
        if not mended.settings.is_file():
            mended.settings.write_bytes(original.old)
        code = subprocess.run(images.command(mended), env=mended.environment(), check=False, timeout=20).returncode
        return "" if code == 0 and mended.is_new() else f"the next save ended with {code}"
    cases = [case for case in scripts if is_possible(case, images.images[0], scripts)]
    return len(cases), matrix.judge_all(cases, judge)


def is_possible(case, image, scripts):
    """Not every file system knows files that cannot be changed, and /tmp may be as good as the image's."""
    if "immutable" in case:
        kind = subprocess.run(["sh", "-c", 'chattr +i "$1" && chattr -i "$1"', "sh", str(image.settings)],
                              check=False, capture_output=True)
        if kind.returncode != 0:
            print(f"     {case}: skipped, this file system has no such thing", flush=True)
            return False
    if case in ("temporary directory missing", "temporary directory is a file") and \
            os.stat("/tmp").st_dev == image.root.stat().st_dev:
        print(f"     {case}: skipped, /tmp is on the same file system", flush=True)
        return False
    return case in scripts


ROWS = {
    "S7": ("odd temporary and target directories",
           lambda found, directory, _is_full: odd_surroundings(found, directory / "s7", ODD_PLACES)),
    "S8": ("no owner to give the file to",
           lambda found, directory, _is_full: odd_surroundings(found, directory / "s8", ODD_OWNERS)),
}

if __name__ == "__main__":
    import sys
    look(sys.argv[1])
