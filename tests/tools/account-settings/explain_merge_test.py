"""account-settings explain-merge."""

import json
import os
import plistlib
import random
import unittest

from settingstest import MAIL, SettingsTest, run

BASE = {"Identifier": "A", "Type": "LDAP", "Class": "LDAPAccount"}
WINNER_OF = {
    "unchanged": "both",
    "added in memory only": "memory",
    "changed in memory only": "memory",
    "deleted in memory only": "memory",
    "added on disk only": "disk",
    "changed on disk only": "disk",
    "deleted on disk only": "disk",
    "added alike on both": "both",
    "changed alike on both": "both",
    "deleted alike on both": "both",
    "added on both: memory wins": "memory",
    "changed on both: memory wins": "memory",
    "deleted in memory, changed on disk: memory wins": "memory",
    "changed in memory, deleted on disk: memory wins": "memory",
}


class ExplainMerge(SettingsTest):
    def explain(self, in_memory, original, on_disk, *options):
        files = []
        for name, accounts in [("in-memory", in_memory), ("original", original), ("on-disk", on_disk)]:
            path = self.directory / name
            path.write_bytes(plistlib.dumps({"Version": 12, "Accounts": accounts}))
            files += [f"--{name}", path]
        return run("explain-merge", *files, *options)

    def lines(self, in_memory, original, on_disk) -> dict:
        """(winner, why, value) by account and key."""
        ended = self.explain(in_memory, original, on_disk, "--json")
        self.assertEqual((ended.returncode, ended.stderr), (0, b""))
        return {
            (line["account"], line["key"]): (line["winner"], line["why"], line["value"])
            for line in json.loads(ended.stdout)["lines"]
        }

    def test_refuses_an_account_without_identifier(self):
        for name, nameless in [("none", {"Type": "LDAP", "Class": "C"}), ("a number", dict(BASE, Identifier=7))]:
            with self.subTest(name):
                ended = self.explain([BASE], [BASE], [BASE, nameless])
                self.assertEqual((ended.returncode, ended.stdout), (6, b""))
                self.assertIn(b"on-disk: Accounts[1]: Identifier: is missing or no string", ended.stderr)

    def test_passes_unknown_keys_beside_the_accounts_over(self):
        path = self.directory / "settings"
        path.write_bytes(plistlib.dumps({"Version": 12, "Other": 1, "Accounts": [BASE]}))
        ended = run("explain-merge", "--in-memory", path, "--original", path, "--on-disk", path)
        self.assertEqual((ended.returncode, ended.stderr), (0, b""))

    def test_tells_for_each_key_which_side_won_and_why(self):
        cases = {
            # key: (in memory, original, on disk), (winner, why, value)
            "same": ((1, 1, 1), ("both", "unchanged", 1)),
            "memory": ((2, 1, 1), ("memory", "changed in memory only", 2)),
            "memory new": ((2, None, None), ("memory", "added in memory only", 2)),
            "memory gone": ((None, 1, 1), ("memory", "deleted in memory only", None)),
            "disk": ((1, 1, 2), ("disk", "changed on disk only", 2)),
            "disk new": ((None, None, 2), ("disk", "added on disk only", 2)),
            "disk gone": ((1, 1, None), ("disk", "deleted on disk only", None)),
            "alike": ((2, 1, 2), ("both", "changed alike on both", 2)),
            "alike new": ((2, None, 2), ("both", "added alike on both", 2)),
            "alike gone": ((None, 1, None), ("both", "deleted alike on both", None)),
            "both": ((2, 1, 3), ("memory", "changed on both: memory wins", 2)),
            "both new": ((2, None, 3), ("memory", "added on both: memory wins", 2)),
            "gone, changed": ((None, 1, 3), ("memory", "deleted in memory, changed on disk: memory wins", None)),
            "changed, gone": ((2, 1, None), ("memory", "changed in memory, deleted on disk: memory wins", 2)),
        }
        versions = [
            [dict(BASE, **{key: values[side] for key, (values, _) in cases.items() if values[side] is not None})]
            for side in range(3)
        ]
        lines = self.lines(*versions)
        self.assertEqual(lines[("A", None)][1], "merged key by key")
        for key, (_, expected) in cases.items():
            with self.subTest(key):
                self.assertEqual(lines[("A", key)], expected)

    def test_tells_what_becomes_of_accounts_that_not_every_file_has(self):
        def account(name):
            return dict(BASE, Identifier=name)

        lines = self.lines(
            [account("all"), account("memory"), account("memory+original"), account("memory+disk")],
            [account("all"), account("original"), account("memory+original"), account("original+disk")],
            [account("all"), account("disk"), account("memory+disk"), account("original+disk")],
        )
        whole = {name: (winner, why, value) for (name, key), (winner, why, value) in lines.items() if key is None}
        self.assertEqual(
            whole,
            {
                "all": ("both", "merged key by key", account("all")),
                "memory": ("memory", "added in memory only", account("memory")),
                "memory+original": (
                    "memory", "deleted on disk, but still in memory: written as in memory", account("memory+original"),
                ),
                "memory+disk": ("both", "added on both: written as in memory", account("memory+disk")),
                "disk": ("memory", "added on disk only: a save does not carry it over", None),
                "original+disk": ("memory", "deleted in memory: not written", None),
                "original": ("both", "deleted on both", None),
            },
        )  # fmt: skip

    def test_agrees_with_the_result_for_random_versions(self):
        seed = int.from_bytes(os.urandom(4), "big")
        source = random.Random(seed)
        seen = set()

        def version():
            accounts = []
            for name in source.sample("ABCD", source.randrange(1, 5)):
                keys = source.sample(["k", "l", "m", "n", "o", "p"], source.randrange(0, 7))
                accounts.append(dict(BASE, Identifier=name, **{key: source.randrange(3) for key in keys}))
            return accounts

        for number in range(60):
            with self.subTest(number, seed=seed):
                sides = [version() for _ in range(3)]
                by_id = [{account["Identifier"]: account for account in side} for side in sides]
                lines = self.lines(*sides)
                for (name, key), (winner, why, value) in lines.items():
                    memory, _, disk = [side.get(name) for side in by_id]
                    if key is not None:
                        memory, disk = memory.get(key), disk.get(key)
                        self.assertEqual(winner, WINNER_OF[why], (name, key))
                        seen.add(why)
                    if winner in ("both", "memory"):
                        self.assertEqual(value, memory, (name, key, why))
                    if winner in ("both", "disk"):
                        self.assertEqual(value, disk, (name, key, why))
                    self.assertTrue(winner != "neither" or why == "merged key by key")
                self.assertEqual({name for name, key in lines if key is None},
                                 {name for side in by_id for name in side})  # fmt: skip
        self.assertEqual(seen, set(WINNER_OF))

    def test_as_a_table(self):
        ended = self.explain([dict(MAIL, PortNumber=1)], [MAIL], [dict(MAIL, DisplayName="New")])
        self.assertEqual((ended.returncode, ended.stderr), (0, b""))
        rows = [line.split() for line in ended.stdout.decode().splitlines()]
        self.assertEqual(rows[1], ["M1", "merged", "key", "by", "key"])
        self.assertIn(["DisplayName", "disk", "changed", "on", "disk", "only", "New"], rows)
        self.assertIn(["PortNumber", "memory", "changed", "in", "memory", "only", "1"], rows)

    def test_leaves_nothing_behind(self):
        temporary = self.directory / "temporary"
        temporary.mkdir()
        for accounts, code in [([MAIL], 0), ([7], 6)]:
            path = self.directory / "file"
            path.write_bytes(plistlib.dumps({"Version": 12, "Accounts": accounts}))
            ended = run("explain-merge", "--in-memory", path, "--original", path, "--on-disk", path,
                        env=dict(os.environ, TMPDIR=str(temporary)))  # fmt: skip
            self.assertEqual(ended.returncode, code, ended.stderr)
            self.assertEqual(list(temporary.iterdir()), [])

    def test_refuses_a_file_that_the_library_cannot_read_as_a_whole(self):
        ended = self.explain([MAIL], [MAIL, MAIL], [MAIL])
        self.assertEqual(ended.returncode, 6)
        self.assertIn(b"original: Accounts[1] (M1): Identifier", ended.stderr)


if __name__ == "__main__":
    unittest.main()
