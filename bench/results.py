"""What a run measured, the goals, and the one table of both."""

import math
from typing import NamedTuple

SIZES = [8, 100, 1_000, 10_000, 100_000]
FEWER_SIZES = [100, 1_000, 10_000]  # of the rows that move records, and of the one that is quadratic
GROWTH_FROM = 100  # below, fixed costs show

# Operation, the peer's row in the same operation, the least ratio of the peer's time to ours, and the sizes
# at which it has to be kept.
FASTER_THAN = [
    ("read binary", "RapidJSON", 2.8, SIZES),
    ("read binary", "simdjson", None, SIZES),
    ("read binary", "nlohmann-json", None, SIZES),
    ("read binary", "memcpy", None, SIZES),
    ("read XML", "pugixml", 0.7, [10_000]),
    ("read XML", "expat", 3.0, [10_000]),
    ("write binary", "RapidJSON", 1.2, SIZES),
    ("write binary", "nlohmann-json", None, SIZES),
]
# Operation, whose row and which operation ours is held against, the most that ours may take of its time, the
# sizes at which that has to be kept, and the time that counts: the processor's or the clock's.
AT_MOST = [
    ("load", "read alone", "load", 1.6, SIZES, "cpu"),
    ("save", "own", "load", 4.0, [10_000], "cpu"),
    ("durable save", "file alone", "durable save", 2.0, [10_000], "clock"),
    ("move contacts", "sqlite3", "move contacts", 1.5, [10_000], "cpu"),
    ("move events", "sqlite3", "move events", 1.5, [10_000], "cpu"),
]
# Operations whose time is to grow as the accounts do, and the sizes from which that is seen.
LINEAR = {operation: [size for size in SIZES if size >= GROWTH_FROM] for operation in
          ["read binary", "read XML", "write binary", "load", "save", "delete from the end", "replace types",
           "query identifiers", "query types", "list children"]}
LINEAR |= dict.fromkeys(["delete in any order", "move contacts", "move events"], FEWER_SIZES)
MOST_GROWTH = 1.05
MOST_HELD, MOST_PEAK = 1_200, 4.0  # bytes an account; of what is held
MEMORY_SIZES = [1_000, 10_000, 100_000]  # below, fixed costs show
JOB_FASTER = {"sample image": 5.0, "1,000 accounts": 10.0}
MOST_IDLE = 0.030  # seconds of processor time
BY_THE_CLOCK = ["durable save"]  # it waits for the disk
BEGIN, END = "<!-- The table of bench/run begins here. -->", "<!-- It ends here. -->"


class Row(NamedTuple):
    what: str
    values: dict  # by number of accounts, or by None when it is of no number of them
    goal: str = ""
    met: str = ""


class Results:
    def __init__(self, rows: list[dict], memory: list[dict], jobs: list[dict], origin: dict | None = None):
        self.rows, self.memory, self.jobs, self.origin = rows, memory, jobs, origin or {}
        self._times = {(row["operation"], row["who"], row["accounts"]): row for row in rows}

    def time(self, operation: str, who: str, size: int, measure: str = "cpu") -> float | None:
        """Nanoseconds, the median of the repetitions."""
        row = self._times.get((operation, who, size))
        return None if row is None else row[measure]

    def ratios(self, above: tuple[str, str], below: tuple[str, str], measure: str = "cpu") -> dict[int, float]:
        ratios = {}
        for size in SIZES:
            over, under = self.time(*above, size, measure), self.time(*below, size, measure)
            if over and under:
                ratios[size] = over / under
        return ratios

    def growth(self, operation: str) -> float | None:
        """The exponent of time over accounts: the slope of the fitted line between logarithms."""
        points = [(math.log(size), math.log(time)) for size in SIZES
                  if size >= GROWTH_FROM and (time := self.time(operation, "own", size))]
        if len(points) < 2:
            return None
        mean_x = sum(x for x, _ in points) / len(points)
        mean_y = sum(y for _, y in points) / len(points)
        return sum((x - mean_x) * (y - mean_y) for x, y in points) / sum((x - mean_x) ** 2 for x, _ in points)

    def growth_between(self, operation: str, small: int, large: int) -> float:
        ratio = self.time(operation, "own", large) / self.time(operation, "own", small)
        return math.log(ratio) / math.log(large / small)


def verdict(values: dict, sizes: list, goal: float | None, is_met) -> str:
    """Whether the goal is met at all the sizes that it names; nothing when one of them was not measured."""
    if goal is None or not all(size in values for size in sizes):
        return ""
    return "yes" if all(is_met(values[size], goal) for size in sizes) else "no"


def at_least(value: float, goal: float) -> bool:
    return value >= goal


def at_most(value: float, goal: float) -> bool:
    return value <= goal


def ratio_rows(results: Results) -> list[Row]:
    rows = []
    for operation, peer, goal, sizes in FASTER_THAN:
        ratios = results.ratios((operation, peer), (operation, "own"))
        rows.append(Row(f"{operation}, times as fast as {peer}", ratios, f"≥ {goal}" if goal else "",
                        verdict(ratios, sizes, goal, at_least)))
    for operation, other, base, goal, sizes, measure in AT_MOST:
        ratios = results.ratios((operation, "own"), (base, other), measure)
        against = f"{base} ({other})" if other != "own" else base
        rows.append(Row(f"{operation}, times the time of {against}", ratios, f"≤ {goal}",
                        verdict(ratios, sizes, goal, at_most)))
    rows += memory_rows(results)[1:]
    return rows + job_rows(results)


def memory_rows(results: Results) -> list[Row]:
    held = {entry["accounts"]: entry["held"] / entry["accounts"] for entry in results.memory}
    peak = {entry["accounts"]: entry["peak"] / entry["held"] for entry in results.memory}
    return [Row("bytes an account held by a loaded store", held, f"≤ {MOST_HELD:,}",
                verdict(held, MEMORY_SIZES, MOST_HELD, at_most)),
            Row("peak while saving, times what is held", peak, f"≤ {MOST_PEAK}",
                verdict(peak, MEMORY_SIZES, MOST_PEAK, at_most))]


def job_rows(results: Results) -> list[Row]:
    times = {(job["job"], job["who"]): job for job in results.jobs}
    rows = []
    for job in dict.fromkeys(job["job"] for job in results.jobs):
        own, script = times[job, "own"], times[job, "Python script"]
        if job == "nothing to do":
            continue
        goal = JOB_FASTER.get(job)
        ratio = {None: script["processor"] / own["processor"]}
        rows.append(Row(f"whole job, {job}: times as fast as the Python script", ratio, f"≥ {goal}" if goal else "",
                        verdict(ratio, [None], goal, at_least)))
        rows.append(Row(f"whole job, {job}: the same by the clock", {None: script["clock"] / own["clock"]}))
    return rows


def job_time_rows(results: Results) -> list[Row]:
    rows = []
    for job in results.jobs:
        goal = MOST_IDLE * 1000 if (job["job"], job["who"]) == ("nothing to do", "own") else None
        time = {None: job["processor"] * 1000}
        rows.append(Row(f"whole job, {job['job']}, {job['who']}: ms of processor time", time,
                        f"≤ {goal:.0f}" if goal else "", verdict(time, [None], goal, at_most)))
    return rows


def table_rows(results: Results) -> list[Row]:
    rows = ratio_rows(results) + job_time_rows(results)
    seen = dict.fromkeys((row["operation"], row["who"]) for row in results.rows)
    for operation, who in seen:
        measure = "clock" if operation in BY_THE_CLOCK else "cpu"
        times = {size: time / size for size in SIZES if (time := results.time(operation, who, size, measure))}
        rows.append(Row(f"{operation}, {who}: ns {'a record' if operation.startswith('move ') else 'an account'}"
                        + (", by the clock" if measure == "clock" else ""), times))
    rows.append(Row("binary file: bytes an account",
                    {entry["accounts"]: entry["binary"] / entry["accounts"] for entry in results.memory}))
    rows.append(memory_rows(results)[0])
    for operation, sizes in LINEAR.items():
        growth = results.growth(operation)
        if growth is not None:
            is_whole = all(results.time(operation, "own", size) for size in sizes)
            rows.append(Row(f"{operation}: exponent of growth", {None: growth}, f"≤ {MOST_GROWTH}",
                            verdict({None: growth}, [None], MOST_GROWTH, at_most) if is_whole else ""))
    return rows


def shown(value: float) -> str:
    if value >= 100:
        return f"{value:,.0f}"
    return f"{value:.1f}" if value >= 10 else f"{value:.2f}"


def table(results: Results) -> list[list[str]]:
    """Cells: what, one column for each number of accounts, one for values of no number, goal, met."""
    sizes = sorted({row["accounts"] for row in results.rows} | {entry["accounts"] for entry in results.memory})
    lines = [["", *[f"{size:,}" for size in sizes], "at any size", "goal", "met"]]
    for row in table_rows(results):
        cells = [shown(row.values[size]) if size in row.values else "" for size in [*sizes, None]]
        lines.append([row.what, *cells, row.goal, row.met])
    return lines


def as_text(lines: list[list[str]]) -> str:
    widths = [max(len(line[column]) for line in lines) for column in range(len(lines[0]))]
    return "\n".join(line[0].ljust(widths[0]) + "".join("  " + cell.rjust(width) for cell, width
                                                        in zip(line[1:], widths[1:])) for line in lines)


def as_markdown(lines: list[list[str]]) -> str:
    head = ["| " + " | ".join(lines[0]) + " |", "|---|" + "---:|" * (len(lines[0]) - 1)]
    return "\n".join(head + ["| " + " | ".join(line) + " |" for line in lines[1:]])


def origin_line(origin: dict) -> str:
    return f"{origin['date']}, commit {origin['commit']}, {origin['processor']}, {origin['compiler']}"


def put_between(document: str, generated: str) -> str:
    """The document with `generated` in place of what stands between the markers; ValueError when one is missing."""
    before, begin, rest = document.partition(BEGIN)
    _, end, behind = rest.partition(END)
    if not begin or not end:
        raise ValueError(f"the line '{END if begin else BEGIN}' is missing")
    return f"{before}{BEGIN}\n{generated}\n{END}{behind}"
