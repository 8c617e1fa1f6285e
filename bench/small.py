"""The small version for every change: growth and the distance to peers, with margins that a busy machine keeps."""

import results

SIZES = [200, 12_800]
FILTERS = {
    "bench-lists": "^(read binary/(own|RapidJSON)|read XML/(own|expat)|write binary/(own|RapidJSON)|compare/own)/",
    "bench-stores": "^(load|save|query .*|list .*|delete from the end|replace .*)/",
    "bench-records": "^move contacts/",
}
REPETITIONS = 3  # the least of which the median leaves out one that was disturbed
# Twice the time at twice the accounts is 1, four times 2; caches and a busy machine take their part.
MOST_GROWTH = 1.6
# Two large lists together leave the near caches, and a neighbour may take the far one: up to 1.5 was measured. A
# deletion that walks over the whole list comes to 1.63 only, because a step of that takes little.
MOST_GROWTH_OF = {"compare": 1.75, "delete from the end": 1.45}
# Operation, our row, the peer's operation and row, and how many times its time ours may be.
MOST_OF_PEER = [
    ("read binary", "own", "read binary", "RapidJSON", 3),
    ("write binary", "own", "write binary", "RapidJSON", 4),
    ("read XML", "own", "read XML", "expat", 6),
    ("load", "own", "load", "read alone", 5),
    ("save", "own", "load", "own", 12),
    ("move contacts", "own", "move contacts", "sqlite3", 3),
]


def check(rows_of) -> int:
    """Prints one line for each rule; 1 when one is broken."""
    rows = []
    for program, wanted in FILTERS.items():
        rows += rows_of(program, SIZES, REPETITIONS, wanted, 0.03)
    found = results.Results(rows, [], [])
    small, large = SIZES
    bad = 0
    for operation in dict.fromkeys(row["operation"] for row in rows):
        growth = found.growth_between(operation, small, large)
        bad += told(f"{operation}: exponent of growth", growth, MOST_GROWTH_OF.get(operation, MOST_GROWTH))
    for operation, who, other, peer, most in MOST_OF_PEER:
        ratio = found.time(operation, who, large) / found.time(other, peer, large)
        bad += told(f"{operation}: times the time of {other}, {peer}", ratio, most)
    print(f"{'All' if bad == 0 else bad} {'rules hold' if bad == 0 else 'bad rules'}")
    return 1 if bad else 0


def told(what: str, value: float, most: float) -> int:
    good = value <= most
    print(f"{'ok ' if good else 'bad'} {what}: {value:.2f}, at most {most}")
    return 0 if good else 1
