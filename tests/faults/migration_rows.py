"""Migrations that are killed or fail on the way, and run again: rows M1 to M3 of docs/reliability.md.

Faults hit the migrator, which the host runs as its child, and in the rows M1 and M3 the host as well.
After each the image is looked at as it was left, then the host runs again, and the image is looked at
against what a migration leaves that nothing disturbed.
"""

import random
import subprocess

import matrix
from migration_image import LIMIT, STORES, MigrationImage, environment
from migration_report import wrong_report
from migration_state import State

# The exit codes of the manual page that a run without a signal to the host itself may have.
DONE, FAILED, LEFT_BEHIND, WRONG, REFUSED, CRASHED, BUSY = 0, 1, 3, 5, 7, 8, 11
DOCUMENTED = {DONE, FAILED, LEFT_BEHIND, WRONG, REFUSED, CRASHED, BUSY}
HOST, CHILD = 0, 1
FIRST_CALL = r"^0 flock"
RECORDS = 1000
TRACES = 3
SEED = 20261121


class Migration(MigrationImage):
    """An image to be migrated, and the calls of its migration."""

    def __init__(self, found, directory, count):
        super().__init__(found, directory, count)
        self._reruns = {}  # what was wrong after another run, for each identity of an image before it
        self.calls = matrix.always([self._traced() for _ in range(TRACES)])
        self._learn_settings()

    def _traced(self):
        return matrix.traced_calls(self.command(self.copy("traced")), self._reporting("traced"), FIRST_CALL)

    def _reporting(self, worker):
        """The environment of a host whose report goes to a file."""
        return {**environment(), "INJECTOR_OUTPUT": str(self._report(worker))}

    def _report(self, worker):
        return self.directory / f"report{worker}"

    def _learn_settings(self):
        """The settings file of every moment: that before each rename of a run, and the last one."""
        self.rules.settings = {self.begin.settings, self.end.settings}
        for call in self.calls_of(CHILD):
            if call.call == "rename":
                image = self.copy("traced")
                matrix.run_with(matrix.kills([call])[0], self.command(image), environment(), LIMIT)
                self.rules.settings.add(self.look(image).settings)

    def calls_of(self, generation):
        return [call for call in self.calls if call.generation == generation]

    def look(self, image, left_out=""):
        return State(image.parent, self.directory, left_out)

    def run(self, image):
        """The exit code, and the report."""
        done = subprocess.run(self.command(image), env=environment(), check=False, timeout=LIMIT,
                              stdout=subprocess.PIPE, stderr=subprocess.DEVNULL, text=True)
        return done.returncode, done.stdout

    def run_under(self, case, worker):
        """The image of the worker after a run with the fault, and the exit code. How often the host asks for
        its child depends on the moment: when it ends before the call, an earlier one of the name is hit."""
        def attempt(case):
            image = self.copy(worker)
            return image, matrix.run_with(case, self.command(image), self._reporting(worker), LIMIT)
        return matrix.where_it_comes(case, attempt, may_be_earlier=case.generation == HOST)

    def report_of(self, worker):
        """What the last run under a fault has printed."""
        return self._report(worker).read_text(encoding="utf-8")

    def rerun(self, image):
        """What is wrong after another run, which must do all that was left to do."""
        code, _ = self.run(image)
        wrong = self.rules.wrong_at_end(self.look(image))
        return wrong if code == DONE else f"the run after that ended with {code}: {wrong}"

    def rerun_once(self, image, state):
        """The same for an image in this state, but another run is not tried for what has been tried before."""
        identity = state.identity()
        if identity is None:
            return self.rerun(image)
        if identity not in self._reruns:
            self._reruns[identity] = self.rerun(image)
        return self._reruns[identity]


def prepared(found, directory, count, name):
    place = directory / name
    place.mkdir()
    return Migration(found, place, count)


def spread(cases, number):
    """That many of the cases, in even distances, with the first and the last."""
    number = min(number, len(cases))
    return [cases[index * (len(cases) - 1) // max(1, number - 1)] for index in range(number)]


def told(row, cases, all_cases):
    """Says which part of the cases is tried."""
    child = sum(case.generation == CHILD for case in cases)
    every = sum(case.generation == CHILD for case in all_cases)
    print(f"     {row} {child} of {every} cases in the migrator, {len(cases) - child} of"
          f" {len(all_cases) - every} in the host", flush=True)
    return cases


def sampled(row, cases, in_child, in_host):
    child = [case for case in cases if case.generation == CHILD]
    host = [case for case in cases if case.generation == HOST]
    return told(row, spread(child, in_child) + spread(host, in_host), cases)


def wrong_end_of_killed(case, code):
    expected = -9 if case.generation == HOST else CRASHED
    return "" if code == expected else f"the host ended with {code}"


def kill_and_rerun(found, directory, is_full):
    """In full at every call of the migrator."""
    migration = prepared(found, directory, RECORDS if is_full else 6, "m1")
    kills = matrix.kills(migration.calls)
    cases = sampled("M1", kills, *((len(kills), 300) if is_full else (240, 60)))

    def judge(case, worker):
        image, code = migration.run_under(case, worker)
        state = migration.look(image)
        return wrong_end_of_killed(case, code) or migration.rules.wrong_after_kill(state) or \
            migration.rerun_once(image, state)
    return len(cases), matrix.judge_all(cases, judge)


def kill_twice(found, directory, is_full):
    """The second run is killed too, at a call of its own if it comes that far, and a third one follows."""
    migration = prepared(found, directory, RECORDS if is_full else 6, "m2")
    kills = matrix.kills(migration.calls_of(CHILD))
    chance = random.Random(SEED)
    pairs = [(first, chance.choice(kills)) for first in spread(kills, 500 if is_full else 40)]

    def judge(pair, worker):
        image, code = killed_twice(migration, *pair, worker)
        return wrong_end_of_killed(pair[1], code) or migration.rules.wrong_after_kill(migration.look(image)) or \
            migration.rerun(image)
    bad = matrix.judge_all(pairs, judge)
    return len(pairs), [(" then ".join(map(matrix.name_of, pair)), text) for pair, text in bad]


def killed_twice(migration, first, second, worker):
    """The image, and the exit code of the second run. That one has less to do and may end before the call:
    then all is done again with an earlier call of the name, and at last with the migrator's exit."""
    for attempt in (second, second._replace(nth=max(1, second.nth // 4)),
                    second._replace(call="exit_group", nth=1)):
        image, code = migration.run_under(first, worker)
        if wrong := wrong_end_of_killed(first, code):
            return image, f"{wrong} in the first run"
        try:
            return image, matrix.run_with(attempt, migration.command(image), environment(), LIMIT)
        except matrix.NotHit:
            continue
    raise matrix.NotHit("the second run makes none of the calls")


def fail_and_rerun(found, directory, is_full):
    migration = prepared(found, directory, 100 if is_full else 6, "m3")
    cases = sampled("M3", matrix.errors(migration.calls), *((2400, 400) if is_full else (200, 60)))
    rules = migration.rules

    def judge(case, worker):
        image, code = migration.run_under(case, worker)
        left = migration.look(image)
        if code not in DOCUMENTED:
            return f"the host ended with {code}"
        wrong = rules.wrong_always(left) or rules.wrong_in_run(migration.begin, left, code) or \
            wrong_report(STORES, migration.begin, left, code, migration.report_of(worker))
        if wrong:
            return f"{wrong}; the host had ended with {code}"
        again, report = migration.run(image)
        if again not in (DONE, LEFT_BEHIND):
            return f"the run after that ended with {again}, the first with {code}"
        end = migration.look(image)
        wrong = rules.wrong_always(end) or rules.wrong_in_run(left, end, again) or rules.wrong_remains(end) or \
            wrong_report(STORES, left, end, again, report)
        return f"{wrong}; the host had ended with {code}, then {again}" if wrong else ""
    return len(cases), matrix.judge_all(cases, judge)


ROWS = {
    "M1": ("a migration is killed at a system call, then run again", kill_and_rerun),
    "M2": ("the second run is killed too, then a third run", kill_twice),
    "M3": ("a system call of a migration fails, then run again", fail_and_rerun),
}
