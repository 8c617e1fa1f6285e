"""Allocations that fail in a load and save: row S9 of docs/reliability.md."""

import plistlib
import shutil
import subprocess

import matrix
import save_rows
from starting_points import Images

SAMPLE = 200  # cases of each kind in quick
STARTS = ("", "unreadable, of two names")


def failing_allocations(found, directory, is_full):
    """Each fails once, and for good until the first save is over: the file is the old or the new one, nothing is
    left beside it, what is logged is true, and the next save of the same process writes everything."""
    place = directory / "s9"
    place.mkdir()
    count, bad = 0, []
    for start in STARTS:
        cases, judge = failing_from(found, place, start, is_full)
        count += len(cases)
        bad += [(f"{start or 'settings'}, allocation {number}{'+' if lasting else ''}", text)
                for (number, lasting), text in matrix.judge_all(cases, judge)]
    shutil.rmtree(place)
    return count, bad


def wrong_merge(image):
    """What is wrong with the settings that a process has saved twice, the second time without a change of its own,
    when another program has renamed every account between. The process had renamed the first account and the last
    one: if its first save came about, both names are known to the file and the newer ones stay; if not, it has its
    own still to write."""
    expected = plistlib.loads(image.old)["Accounts"]
    found = plistlib.loads(image.settings.read_bytes())["Accounts"]
    is_saved = found[0].get("Seen") == "changed"
    for account in expected:
        is_renamed = account in (expected[0], expected[-1])
        account["Seen"] = "changed" if is_saved and is_renamed else account["DisplayName"]
        account["DisplayName"] = "changed" if is_renamed and not is_saved else "theirs"
    if found != expected:
        names = [account.get("DisplayName") for account in found]
        return f"merged wrongly after a first save that {'came about' if is_saved else 'failed'}: {names}"
    return ""


def failing_from(found, place, start, is_full):
    images = Images(found, place, start)

    def save(image, again, before_second="", **variables):
        environment = {**image.environment(), "LD_PRELOAD": found["failing_allocations"],
                       **({"SAVER_BEFORE_SECOND": before_second} if before_second else {}),
                       **{f"FAILING_{name.upper()}": str(value) for name, value in variables.items()}}
        return subprocess.run(images.command(image, again), env=environment, check=False,
                              timeout=save_rows.LIMIT).returncode

    def counted(path):
        """The allocations, and those that failed."""
        return [int(word) for word in path.read_text(encoding="utf-8").split()]

    first = images.images[0]
    save(first, False, count=place / "count")
    first.reset()
    total, _ = counted(place / "count")
    step = 1 if is_full else max(1, total // SAMPLE)
    # The last ones are those of the save, where something may be left behind.
    numbers = sorted({*range(1, total + 1, step), *range(max(1, total - 200), total + 1)})

    def judge(case, worker):
        number, lasting = case
        image = images.images[worker]
        failures = place / f"count{worker}"
        lasting_too = {"on": 1} if lasting else {}
        # First what the failure leaves, then the next save, by the same process and by another one.
        image.reset()
        code = save(image, False, at=number, count=failures, **lasting_too)
        if counted(failures)[1] == 0:
            return "no allocation has failed"
        wrong = image.wrong_files() if code == save_rows.OUT_OF_MEMORY else \
            save_rows.outcome_of_failed_call(code, image)
        if wrong := wrong or save_rows.next_save(images, image):
            return wrong
        image.reset()
        # What cannot be read, another program cannot change.
        other = "" if start else f"{images.saver} change {image.root}"
        code = save(image, True, other, at=number, **lasting_too)
        if code < 0 or code & (save_rows.SECOND_FAILED | save_rows.LEAKED):
            return f"the next save of the same process ended with {code}"
        if other:
            left = image.temporary_files()
            return wrong_merge(image) or (f"temporary files are left: {left}" if left else "")
        return image.wrong_files() or ("" if image.is_new() else "the next save of the same process wrote nothing")
    return [(number, lasting) for number in numbers for lasting in (False, True)], judge


ROWS = {"S9": ("an allocation of a load and save fails, once and for good", failing_allocations)}
