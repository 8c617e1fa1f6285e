"""How every check of this folder ends: one line a problem, and an exit code that CTest sees."""

import sys


def finish(problems: list[str], looked_at: int, what: str) -> None:
    """Prints the problems and leaves with 1; a check that found nothing to look at has failed too."""
    if looked_at == 0:
        problems = [f"found no {what} to check; the check looks in the wrong place"]
    for problem in problems:
        print(problem)
    print(f"{looked_at} {what} checked, {len(problems)} problems")
    sys.exit(1 if problems else 0)
