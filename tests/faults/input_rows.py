"""Files and values of every kind, read and merged: rows R1 to R4 of docs/reliability.md."""

import concurrent.futures
import pathlib
import re
import subprocess
import sys

TOP = pathlib.Path(__file__).resolve().parents[2]
EXCHANGE = TOP / "tests/propertylist/exchange.py"
SEED = 20261121
BATCH = 2500


def counted(command):
    """Runs a program that prints its bad cases and "N cases": the number, and what was bad."""
    done = subprocess.run(command, check=False, stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True,
                          errors="replace")
    bad = [("", line) for line in done.stdout.splitlines() if line.startswith("bad ")]
    count = re.search(r"^(\d+) cases$", done.stdout, re.MULTILINE)
    if count is None or (done.returncode != 0) != bool(bad):
        bad.append(("", f"{' '.join(command)} ended with {done.returncode}: {done.stdout[-300:]}"))
    return int(count[1]) if count else 0, bad


def damaged_lists(found, _directory, _is_full):
    program = found["fault_lists"]
    commands = [[program, "odd-files"], [program, "every-change", "0"], [program, "every-change", "1"]]
    with concurrent.futures.ThreadPoolExecutor(2) as pool:
        results = list(pool.map(counted, commands))
    return sum(count for count, _ in results), [text for _, bad in results for text in bad]


def why_crashed(output, name):
    """The indented lines behind the target's own: where the input lies, and what the fuzzer said last."""
    found = re.search(rf"^{name} .*\n((?:    .*\n)*)", output, re.MULTILINE)
    return " | ".join(line.strip() for line in found[1].splitlines())


def fuzzed(_found, _directory, is_full):
    """Every target of fuzz/ for half a minute, or for five minutes each."""
    done = subprocess.run([str(TOP / "fuzz/run"), "25" if is_full else "2.5"], check=False,
                          stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True, errors="replace")
    lines = re.findall(r"^([a-z-]+) +(\d+) runs +(\d+) crashes\b", done.stdout, re.MULTILINE)
    for name, runs, crashes in lines:
        print(f"     R2 {name:<14} {runs:>12} runs {crashes:>4} crashes", flush=True)
    bad = [(name, why_crashed(done.stdout, name)) for name, _, crashes in lines if crashes != "0"]
    targets = {path.name for path in (TOP / "fuzz/corpus").iterdir()}
    bad += [(name, "has made no run") for name in targets - {name for name, runs, _ in lines if runs != "0"}]
    if done.returncode != 0 and not bad:
        bad.append(("fuzz/run", f"ended with {done.returncode}: {done.stdout[-300:]}"))
    return sum(int(runs) for _, runs, _ in lines), bad


def exchanged_values(found, _directory, is_full):
    """Half of the values are written by the product and read by Python's plistlib, half the other way."""
    total = 200_000 if is_full else 20_000
    print(f"     R3 seed {SEED}", flush=True)

    def exchange(seed):
        done = subprocess.run([sys.executable, str(EXCHANGE), found["propertylist-exchange"], str(BATCH),
                               str(seed)], check=False, capture_output=True, text=True)
        return (f"seed {seed}", done.stderr[-300:]) if done.returncode != 0 else None

    seeds = range(SEED, SEED + total // (2 * BATCH))
    with concurrent.futures.ThreadPoolExecutor(2) as pool:
        return 2 * BATCH * len(seeds), [bad for bad in pool.map(exchange, seeds) if bad]


def merged_triples(found, _directory, _is_full):
    return counted([found["fault_merges"]])


ROWS = {
    "R1": ("damaged property lists are read within the limits", damaged_lists),
    "R2": ("fuzzers under the sanitizers", fuzzed),
    "R3": ("values are exchanged with an independent reader", exchanged_values),
    "R4": ("all small merges, against a model", merged_triples),
}
