"""Allocations that fail in a load and save: row S9 of docs/reliability.md."""

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


def failing_from(found, place, start, is_full):
    images = Images(found, place, start)

    def save(image, again, **variables):
        environment = {**image.environment(), "LD_PRELOAD": found["failing_allocations"],
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
        code = save(image, True, at=number, **lasting_too)
        if code < 0 or code & (save_rows.SECOND_FAILED | save_rows.LEAKED):
            return f"the next save of the same process ended with {code}"
        return image.wrong_files() or ("" if image.is_new() else "the next save of the same process wrote nothing")
    return [(number, lasting) for number in numbers for lasting in (False, True)], judge


ROWS = {"S9": ("an allocation of a load and save fails, once and for good", failing_allocations)}
