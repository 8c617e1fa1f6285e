"""What the command migrate-legacy of account-settings shows of the lines that a migrator writes, however many."""

import json
import plistlib
import unittest

from legacy_test import LegacyTest

MIB = 1 << 20


class LegacyLog(LegacyTest):
    def migrated(self, *arguments) -> tuple:
        """The lines on standard output, and those on standard error."""
        ended = self.run_on_image("migrate-legacy", *arguments)
        self.assertEqual(ended.returncode, 0, ended.stderr.decode()[-1000:])
        return ended.stdout.decode().splitlines(), ended.stderr.decode().splitlines()

    def write_unknown(self, count: int) -> None:
        """A legacy mail accounts file with entries of a class that nobody knows, and one of a class known."""
        entries = [{"Class": f"Unknown{number}"} for number in range(count)]
        self.mail_file.parent.mkdir(exist_ok=True)
        self.mail_file.write_bytes(plistlib.dumps(
            {"MailAccounts": [*entries, {"Class": "IMAPAccount", "UniqueIdentifier": "L1"}]}))

    def test_thousands_of_bad_entries_are_told_of_in_a_bounded_number_of_lines(self):
        self.write_unknown(5000)
        log = self.answer("migrate-legacy")["log"]
        self.assertEqual(len(log), 104)
        self.assertIn('"MailAccounts"[0]', log[2])
        self.assertIn('"MailAccounts"[99]', log[101])
        self.assertEqual(log[102:], [f'AccountMigrator: {self.mail_file}: "MailAccounts": and 4900 more of such lines',
                                     f"AccountMigrator: built {self.settings_file} with 1 accounts"])
        self.assertEqual(self.identifiers(), ["L1"])

    def test_people_see_as_many_lines_as_programs(self):
        self.write_unknown(5000)
        _, said = self.migrated()
        self.assertEqual(len(said), 104)
        self.assertIn("and 4900 more of such lines", said[102])

    def test_a_migrator_that_writes_on_fills_the_answer_up_to_a_limit(self):
        self.write_legacy_mail("L1")
        self.use_scripted_migrator("writes, logs 65 MiB")
        output, _ = self.migrated("--json")
        answer = json.loads("\n".join(output))
        self.assertTrue(answer["log_was_cut"])
        self.assertEqual([len(line) for line in answer["log"][3:]], [MIB] * 63)
        self.assertEqual((self.image / "var/log/system.log").read_bytes().count(b"x" * MIB + b"\n"), 65)


if __name__ == "__main__":
    unittest.main()
