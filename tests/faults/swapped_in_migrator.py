"""Security cases about names that become others while the migrator works, a process with an environment of its own,
in which nothing can be loaded beforehand: the tracer makes the names change places."""

import collections
import contextlib
import plistlib
import re
import sqlite3

import matrix
from hostile_image import PROGRAMS
from settings_image import NAME, PREFERENCES
from swapped_names import CONTACTS, SwappedDirectory

CHILD = 1  # the migrator's generation
# What comes of the account Q1 and its two records: the exit code of the host, which looks at what the migrator has
# done; whether the account has gone; the exit code of the next run, which nobody disturbs; and whether the records are
# local then.
Outcome = collections.namedtuple("Outcome", "code has_gone next_code are_local", defaults=(True,))
DONE = Outcome(0, True, 0)
DONE_UNSEEN = Outcome(5, True, 0)  # the link is still there when the host looks
NOT_SAVED = Outcome(3, False, 0)
NOT_SAVED_UNSEEN = Outcome(5, False, 0)
# The records stay in the account's store for good, where the database is out of reach, or nothing tells whose the
# store is.
RECORDS_LEFT = Outcome(5, True, 3, False)
STORE_UNKNOWN = Outcome(3, True, 3, False)
NOT_RETIRED = Outcome(0, True, 3)  # the same when the records are local already: the store looks as if left
# Where a directory, or a file, turns into a link before the first, second ... opening of it, and stays one.
AT_ITS_OPENINGS = {
    PREFERENCES: 7 * [NOT_SAVED_UNSEEN] + [DONE_UNSEEN],  # the last is to bring the directory to the disk
    CONTACTS: 2 * [RECORDS_LEFT],
    "tmp": [NOT_SAVED],
    "etc": 2 * [NOT_SAVED],
    f"{PREFERENCES}/{NAME}": [NOT_SAVED_UNSEEN] + 3 * [DONE],  # from then on it is only compared, and replaced
    f"{CONTACTS}/Contacts.sqlite": [RECORDS_LEFT],
    f"{PREFERENCES}/com.vantor.OTASyncAgent.plist": [STORE_UNKNOWN, NOT_RETIRED],
    "etc/passwd": [NOT_SAVED],
    "etc/group": [NOT_SAVED],
    "System/Library/DeviceProperties.plist": 3 * [DONE],
}
AFTER_ITS_OPENINGS = {PREFERENCES: DONE_UNSEEN, CONTACTS: DONE_UNSEEN, "tmp": DONE, "etc": DONE_UNSEEN}
# Where it turns into the link, or back, before each opening, beginning with the first one or the second one. What
# does not get there in one step goes again step by step, and may find the directory back in its place.
AT_EACH_OPENING = {
    PREFERENCES: [DONE_UNSEEN, DONE_UNSEEN], CONTACTS: [DONE, DONE], "tmp": [DONE, NOT_SAVED], "etc": [DONE, NOT_SAVED],
}
# Where it turns into the link before the first, second ... of another call. Both journals of the database are given
# away and removed before the settings are written, given away and renamed.
AT_OTHER_CALLS = {
    PREFERENCES: {"unlink": 2 * [NOT_SAVED_UNSEEN], "fchown": 3 * [NOT_SAVED_UNSEEN], "rename": [DONE_UNSEEN]},
    CONTACTS: {"unlink": 2 * [DONE_UNSEEN], "fchown": 3 * [DONE_UNSEEN], "rename": [DONE_UNSEEN]},
    "tmp": {"unlink": 2 * [NOT_SAVED], "fchown": 2 * [NOT_SAVED] + [DONE], "rename": [DONE]},
    "etc": {"unlink": 2 * [NOT_SAVED], "fchown": 2 * [NOT_SAVED] + [DONE_UNSEEN], "rename": [DONE_UNSEEN]},
}


def paths_opened(image):
    """By a migrator that nobody disturbs, in their order."""
    done = image.run([matrix.INJECTOR, "list", *image.commands()[PROGRAMS.index("migrate")]])
    return re.findall(rf"^{CHILD} {matrix.number_of('openat')} (.*)$", done.stdout.decode(), re.MULTILINE)


def disturbed(image, name, case, outcome):
    """What is wrong after a run in which the directory turns into a link, and after the next one."""
    swapped = SwappedDirectory(image, name)
    done, wrong, _ = swapped.run("migrate", matrix.injection(case), INJECTOR_SWAP=swapped.names, INJECTOR_SHOWS="1")
    if wrong:
        return wrong
    if not done.stdout.endswith(b"hit\n"):
        return "nothing has changed places"
    if done.returncode != outcome.code:
        return f"ended with {done.returncode} instead of {outcome.code}: {done.stdout[-300:]}"
    if has_gone(image) != outcome.has_gone:
        return f"the account has {'' if has_gone(image) else 'not '}gone"
    if (code := image.host().returncode) != outcome.next_code:
        return f"the next run ended with {code} instead of {outcome.next_code}"
    return "" if has_gone(image) else "the account has not gone with the next run"


def has_gone(image):
    """Whether the account Q1 has; A never does."""
    entries = plistlib.loads(image.settings.read_bytes())["Accounts"]
    identifiers = [entry["Identifier"] for entry in entries]
    if identifiers not in (["A", "Q1"], ["A"]):
        raise AssertionError(f"the accounts are {identifiers}")
    return identifiers == ["A"]


def wrong_records(image, outcome):
    """The service's store keeps its two records, and the local one has each once, unless they were left."""
    with contextlib.closing(sqlite3.connect(f"file:{image.root / CONTACTS / 'Contacts.sqlite'}?mode=ro",
                                            uri=True)) as database:
        counts = dict(database.execute(
            "SELECT account IS NULL, count(DISTINCT uid) || ' of ' || count(*) FROM records"
            " JOIN stores ON stores.id = records.store GROUP BY 1"))
        integrity = database.execute("PRAGMA integrity_check").fetchone()[0]
    expected = {0: "2 of 2", 1: "2 of 2"} if outcome.are_local else {0: "2 of 2"}
    return "" if counts == expected and integrity == "ok" else f"the records are {counts}, integrity {integrity}"


def judged(image, name, case, outcome):
    return disturbed(image, name, case, outcome) or wrong_records(image, outcome)


def swapped(name, call, nth, outcome, is_lasting=False):
    def case(image):
        where = nth(image) if callable(nth) else nth
        return judged(image, name, matrix.Case(call, matrix.SWAP, where, is_lasting, CHILD), outcome)
    return case


def swapped_before_any_opening(name):
    """It is the next opening of the directory itself that meets the link."""
    def case(image):
        paths = paths_opened(image)
        outcomes = [*AT_ITS_OPENINGS[name], AFTER_ITS_OPENINGS[name]]
        for nth in range(paths.index(str(image.root)) + 1, len(paths) + 1):
            outcome = outcomes[paths[:nth - 1].count(name.rpartition("/")[2])]
            if wrong := judged(image, name, matrix.Case("openat", matrix.SWAP, nth, False, CHILD), outcome):
                return f"{nth}, {paths[nth - 1]}: {wrong}"
        return ""
    return case


def opening_of(name, nth):
    """Its number among all openings. The table is to have one case for each."""
    def number(image):
        names = [path.rpartition("/")[2] for path in paths_opened(image)]
        numbers = [number for number, last in enumerate(names, 1) if last == name.rpartition("/")[2]]
        if len(numbers) != len(AT_ITS_OPENINGS[name]):
            raise AssertionError(f"{name} is opened {len(numbers)} times; write all into AT_ITS_OPENINGS")
        return numbers[nth]
    return number


def opening_in_image(nth):
    return lambda image: paths_opened(image).index(str(image.root)) + 1 + nth


CASES = {
    **{f"a link before the migrator's opening {nth + 1} of {name}": swapped(name, "openat", opening_of(name, nth),
                                                                         outcome)
       for name, outcomes in AT_ITS_OPENINGS.items() for nth, outcome in enumerate(outcomes)},
    **{f"a link meanwhile in the migrator, from opening {nth + 1} on: {name}": swapped(
        name, "openat", opening_in_image(nth), outcome, is_lasting=True)
       for name, outcomes in AT_EACH_OPENING.items() for nth, outcome in enumerate(outcomes)},
    **{f"a link before the migrator's {call} {nth}: {name}": swapped(name, call, nth, outcome)
       for name, calls in AT_OTHER_CALLS.items() for call, outcomes in calls.items()
       for nth, outcome in enumerate(outcomes, 1)},
}
IN_FULL = {f"a link before each of the migrator's openings: {name}": swapped_before_any_opening(name)
           for name in AFTER_ITS_OPENINGS}
