"""Allocations that fail in a load and save: row S9 of docs/reliability.md."""

import subprocess

import matrix
import save_rows

OUT_OF_MEMORY = 128  # the failure came out of the library as an exception
SAMPLE = 200  # cases of each kind in quick


def failing_allocations(found, directory, is_full):
    """Each fails once, and for good: the file is the old or the new one, nothing is left beside it, what is
    logged is true, and the next save succeeds."""
    place = directory / "s9"
    place.mkdir()
    images = save_rows.Images(found, place)

    def save(image, **variables):
        environment = {**image.environment(), "LD_PRELOAD": found["failing_allocations"],
                       **{f"FAILING_{name.upper()}": str(value) for name, value in variables.items()}}
        try:
            return subprocess.run(images.command("once", image), env=environment, check=False, timeout=30).returncode
        except subprocess.TimeoutExpired:
            return "hang"

    first = images.images[0]
    save(first, count=place / "count")
    first.reset()
    total = int((place / "count").read_text())
    step = 1 if is_full else max(1, total // SAMPLE)
    # The last ones are those of the save, where something may be left behind.
    numbers = sorted({*range(1, total + 1, step), *range(max(1, total - 200), total + 1)})
    cases = [(number, lasting) for number in numbers for lasting in (False, True)]

    def judge(case, worker):
        number, lasting = case
        image = images.images[worker]
        image.reset()
        code = save(image, at=number, **({"on": 1} if lasting else {}))
        if code == OUT_OF_MEMORY:
            wrong = image.wrong_files()
        else:
            wrong = save_rows.outcome_of_failed_call(code, image)
        if wrong:
            return wrong
        code = subprocess.run(images.command("once", image), env=image.environment(), check=False).returncode
        return "" if code == 0 and image.is_new() else f"the next save ended with {code}"
    bad = matrix.judge_all(cases, judge)
    return len(cases), [(f"allocation {number}{'+' if lasting else ''} of {total}", text)
                        for (number, lasting), text in bad]


ROWS = {"S9": ("an allocation of a load and save fails, once and for good", failing_allocations)}
