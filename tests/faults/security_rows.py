"""What others on the machine, and hostile files and names, can do: row X1 of docs/reliability.md."""

import hostile_texts
import matrix
import other_users
import planted_files
import swapped_in_migrator
import swapped_names
from hostile_image import HostileImage

CASES = {**planted_files.CASES, **swapped_names.CASES, **swapped_in_migrator.CASES, **hostile_texts.CASES,
         **other_users.CASES}


def security(found, directory, is_full):
    """All cases, always, but for those that take longer than their images."""
    cases = {**CASES, **swapped_in_migrator.IN_FULL} if is_full else CASES
    directory.chmod(0o711)
    images = [HostileImage(found, directory / f"x{worker}") for worker in range(2)]

    def judge(case, worker):
        image = images[worker]
        image.reset()
        try:
            wrong = cases[case](image)
        except Exception as error:  # a case that cannot be set up, or a program that does not end
            wrong = repr(error)
        return wrong or ("" if image.is_secret_kept() else "the secret is not what it was")
    return len(cases), matrix.judge_all(list(cases), judge)


ROWS = {"X1": ("other users, planted files, hostile names", security)}
