"""What the report of a migration must say, judged by the states of the image before and after the run."""

import collections
import json

DATACLASSES = {"contact": "contacts", "event": "calendars", "todo": "reminders", "bookmark": "bookmarks",
               "note": "notes"}
DONE, LEFT_BEHIND, WRONG = 0, 3, 5  # exit codes
LOCAL = ("moved", "already_there", "conflict_copies")
UNSEEN = "What account {} has of {} is left as it was, in a database that cannot be used; when it can, put the " \
    "account back into the settings and run the host again."


def read(text):
    """The report in the text; None when it has not come whole."""
    try:
        return json.loads(text)
    except ValueError:
        return None


def outcomes(report):
    """What the report says of each account."""
    return {account["identifier"]: account["outcome"] for account in report["accounts"]}


class Facts:
    """What a run has made of the state `before`: `stores` are those of each account that is to be retired.

    `figures` has for each dataclass how many records of these accounts are in the local store, are left behind or
    are in a retired store alone, and how many the local store had and has."""

    def __init__(self, stores, before, after):
        self.before, self.after = before, after
        self.outcomes = {name: "not selected" if name not in stores else
                         "kept" if name in after.accounts else "retired" for name in before.accounts}
        self.figures = {name: collections.Counter() for name in DATACLASSES.values()}
        local = {(row.kind, row.content) for row in after.local}
        owned = set().union(*(stores[name] for name in stores.keys() & before.accounts.keys()))
        for row, count in before.rows_of(owned).items():
            place = "local" if (row.kind, row.content) in local else \
                "left_behind" if row in after.active else "retired"
            self.figures[DATACLASSES[row.kind]][place] += count
        for name, state in (("local_before", before), ("local_after", after)):
            for row, count in state.local.items():
                self.figures[DATACLASSES[row.kind]][name] += count

    def left(self):
        """The dataclasses with records that are not in the local store."""
        return [name for name, figures in self.figures.items() if figures["left_behind"] or figures["retired"]]

    def has_records(self, name):
        return any(self.figures[name][place] for place in ("local", "left_behind", "retired"))

    def is_untouched(self, names=tuple(DATACLASSES.values())):
        """Whether all records of these dataclasses are as they were."""
        return all(_of(getattr(self.before, what), names) == _of(getattr(self.after, what), names)
                   for what in ("active", "retired"))


def _of(rows, names):
    return {row: count for row, count in rows.items() if DATACLASSES[row.kind] in names}


def wrong_report(stores, before, after, code, text):
    """What is wrong with what a run says that ended with the code and has printed the text."""
    facts = Facts(stores, before, after)
    report = read(text)
    if report is None:
        if code in (DONE, LEFT_BEHIND):
            return f"the run ended with {code} without a whole report"
        is_any_gone = "retired" in facts.outcomes.values()
        return f"nobody is told of what is left of {facts.left()}" if facts.left() and is_any_gone else ""
    if report["exit_code"] != code or (code == DONE) == bool(report["reasons"]):
        return f"the report says {report['exit_code']} and gives the reasons {report['reasons']}"
    if code == WRONG:
        return ""  # there are no figures of what cannot be looked at
    if not report["accounts"]:
        is_nothing_done = facts.is_untouched() and before.settings == after.settings
        return "" if is_nothing_done else f"the report says that nothing was done: {report['reasons']}"
    if outcomes(report) != facts.outcomes:
        return f"the report says of the accounts {outcomes(report)}"
    if code == DONE and facts.left():
        return f"the run ended with 0, and records of {facts.left()} are not in the local stores"
    return _wrong_figures(facts, report)


def _wrong_figures(facts, report):
    for name, wanted in facts.figures.items():
        lines = [line for line in report["dataclasses"] if line["dataclass"] == name]
        told = collections.Counter()
        for line in lines:
            told.update({place: line[place] for place in ("left_behind", "retired")})
            told["local"] += sum(line[place] for place in LOCAL)
            told |= {place: line[place] for place in ("local_before", "local_after")}
        if not lines and any(UNSEEN.format(each, name) in report["reasons"] for each in facts.outcomes):
            if not facts.is_untouched([name]):
                return f"the report says that {name} are left as they were"
        elif (lines or facts.has_records(name)) and told != wanted:
            return f"the report says of {name} {dict(told)} where there is {dict(wanted)}"
    return ""
