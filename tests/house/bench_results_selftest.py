"""What bench/run says of bad numbers: a missed goal, one that was not measured, and time that grows too fast."""

import contextlib
import io
import os
import sys
import unittest
from pathlib import Path

sys.path.insert(0, os.fspath(Path(__file__).resolve().parents[2] / "bench"))
import jobs  # noqa: E402
import results  # noqa: E402
import small  # noqa: E402


def rows(operation: str, who: str, sizes: list[int], each: float = 1.0, power: float = 1.0) -> list[dict]:
    """Rows of which the time is `each` nanoseconds times the size to the `power`."""
    return [{"operation": operation, "who": who, "accounts": size, "cpu": each * size ** power,
             "clock": 10 * each * size ** power} for size in sizes]


def line(found: results.Results, what: str) -> list[str]:
    """The table's cells behind this name, without the empty ones."""
    cells = next(cells for cells in results.table(found) if cells[0] == what)
    return [cell for cell in cells[1:] if cell]


class Verdicts(unittest.TestCase):
    def test_a_goal_is_met_at_every_size_or_missed(self):
        for values, said in (({1: 2.0, 2: 3.0}, "yes"), ({1: 2.0, 2: 1.9}, "no"), ({1: 2.0, 2: 2.0, 3: 0.1}, "yes"),
                             ({1: 2.0}, ""), ({2: 1.0}, ""), ({}, "")):
            with self.subTest(values=values):
                self.assertEqual(results.verdict(values, [1, 2], 2.0, results.at_least), said)
        self.assertEqual(results.verdict({1: 2.0}, [1], None, results.at_least), "")

    def test_the_table_judges_where_all_sizes_are_measured(self):
        what = "read binary, times as fast as RapidJSON"
        for peer, sizes, met in ((3.0, results.SIZES, ["yes"]), (2.0, results.SIZES, ["no"]),
                                 (3.0, [100, 1_000, 10_000], []), (2.0, [100, 1_000, 10_000], [])):
            with self.subTest(peer=peer, sizes=sizes):
                found = results.Results(rows("read binary", "own", sizes)
                                        + rows("read binary", "RapidJSON", sizes, peer), [], [])
                self.assertEqual(line(found, what), [f"{peer:.2f}"] * len(sizes) + ["≥ 2.8", *met])

    def test_growth_is_judged_where_all_sizes_are_measured(self):
        for power, sizes, cells in ((1.0, results.SIZES, ["1.00", "≤ 1.05", "yes"]),
                                    (2.0, results.SIZES, ["2.00", "≤ 1.05", "no"]),
                                    (2.0, [100, 1_000], ["2.00", "≤ 1.05"])):
            with self.subTest(power=power, sizes=sizes):
                found = results.Results(rows("save", "own", sizes, power=power), [], [])
                self.assertEqual(line(found, "save: exponent of growth"), cells)

    def test_memory_and_jobs_are_judged(self):
        memory = [{"accounts": size, "held": size * 1_300, "peak": size * 2_600, "binary": size * 400}
                  for size in results.MEMORY_SIZES]
        times = {"sample image": 0.1, "200 accounts": 0.1, "nothing to do": 0.05}
        whole = [{"job": job, "who": who, "processor": time * factor, "clock": time * factor}
                 for job, time in times.items() for who, factor in (("own", 1), ("Python script", 4))]
        found = results.Results([], memory, whole)
        self.assertEqual(line(found, "bytes an account held by a loaded store"), ["1,300"] * 3 + ["≤ 1,200", "no"])
        self.assertEqual(line(found, "peak while saving, times what is held"), ["2.00"] * 3 + ["≤ 4.0", "yes"])
        faster = "times as fast as the Python script"
        self.assertEqual(line(found, f"whole job, sample image: {faster}"), ["4.00", "≥ 5.0", "no"])
        self.assertEqual(line(found, f"whole job, 200 accounts: {faster}"), ["4.00"])
        self.assertEqual(line(found, "whole job, nothing to do, own: ms of processor time"), ["50.0", "≤ 30", "no"])
        self.assertEqual(line(found, "whole job, sample image, Python script: ms of processor time"), ["400"])


class Table(unittest.TestCase):
    def test_a_figure_of_no_number_of_accounts_has_its_own_column(self):
        found = results.Results(rows("save", "own", results.SIZES), [], [])
        lines = results.table(found)
        self.assertEqual(lines[0][-4:], ["100,000", "at any size", "goal", "met"])
        growth = next(cells for cells in lines if cells[0] == "save: exponent of growth")
        self.assertEqual(growth[-4:-2], ["", "1.00"])

    def test_what_a_row_counts_is_in_its_name(self):
        found = results.Results(rows("move events", "own", [100]) + rows("durable save", "own", [100]), [], [])
        self.assertEqual(line(found, "move events, own: ns a record"), ["1.00"])
        self.assertEqual(line(found, "durable save, own: ns an account, by the clock"), ["10.0"])

    def test_a_document_without_both_markers_is_refused(self):
        whole = f"a\n{results.BEGIN}\nold\n{results.END}\nb\n"
        self.assertEqual(results.put_between(whole, "new"), whole.replace("old", "new"))
        for broken in (whole.replace(results.END, ""), whole.replace(results.BEGIN, ""),
                       f"{results.END}\n{results.BEGIN}\n"):
            with self.subTest(broken=broken), self.assertRaises(ValueError):
                results.put_between(broken, "new")


class Jobs(unittest.TestCase):
    def test_one_account_in_twenty_is_to_go(self):
        sample = [{"Identifier": name, "Type": "Mail"} for name in "abcde"]
        sample += [{"Identifier": name, "Type": "Quillnet", "QuillnetStatus": status} for name, status in
                   (("f", 1), ("g", 0), ("h", 1))]
        for many in (200, 1_000):
            made = jobs.many_accounts(sample, many)
            self.assertEqual(sum(account.get("QuillnetStatus") == 1 for account in made), many // 20)
            self.assertEqual(len({account["Identifier"] for account in made}), many)
        with self.assertRaises(SystemExit):
            jobs.many_accounts(sample, len(sample) - 3)


class Check(unittest.TestCase):
    def said(self, bad: dict[tuple[str, str], dict]) -> tuple[int, list[str]]:
        """What small.check answers, and its lines about bad rules, when all rows but `bad` are as they should be."""
        whos = {(operation, who) for operation, own, other, peer, _ in small.MOST_OF_PEER
                for operation, who in ((operation, own), (other, peer))}
        whos |= {("delete from the end", "own"), ("compare", "own")}
        made = [row for operation, who in sorted(whos)
                for row in rows(operation, who, small.SIZES, **bad.get((operation, who), {}))]
        printed = io.StringIO()
        given = iter([made] + [[]] * len(small.FILTERS))
        with contextlib.redirect_stdout(printed):
            code = small.check(lambda *_: next(given))
        return code, [text for text in printed.getvalue().splitlines() if text.startswith("bad ")]

    def test_time_in_proportion_passes(self):
        self.assertEqual(self.said({}), (0, []))

    def test_quadratic_time_is_bad(self):
        self.assertEqual(self.said({("delete from the end", "own"): {"power": 2.0}}),
                         (1, ["bad delete from the end: exponent of growth: 2.00, at most 1.45"]))

    def test_comparing_may_wait_for_memory_and_not_be_quadratic(self):
        self.assertEqual(self.said({("compare", "own"): {"power": 1.6}}), (0, []))
        self.assertEqual(self.said({("compare", "own"): {"power": 2.0}}),
                         (1, ["bad compare: exponent of growth: 2.00, at most 1.75"]))

    def test_a_row_far_behind_its_peer_is_bad(self):
        self.assertEqual(self.said({("read binary", "own"): {"each": 3.5}}),
                         (1, ["bad read binary: times the time of read binary, RapidJSON: 3.50, at most 3"]))


if __name__ == "__main__":
    unittest.main()
