"""What account-settings says of itself, on the command line and in its man page."""

import os
import re
import unittest
from pathlib import Path

from settingstest import run

COMMANDS = ["list", "show", "enable", "disable", "set", "unset", "insert", "delete", "add-child", "remove-child",
            "validate", "convert", "explain-merge", "migrate-legacy", "wait-for-migration", "stop-daemon"]  # fmt: skip
MAN_PAGE = Path(os.environ["SOURCE_TREE"], "docs/man/account-settings.1").read_text(encoding="utf-8")


class Help(unittest.TestCase):
    def help_of(self, *command) -> str:
        ended = run(*command, "--help")
        self.assertEqual((ended.returncode, ended.stderr), (0, b""))
        return ended.stdout.decode()

    def test_names_every_command_and_exit_code_and_gives_an_example(self):
        text = self.help_of()
        self.assertEqual(re.findall(r"^  ([a-z-]+)  ", text.split("Subcommands:")[1], re.MULTILINE), COMMANDS)
        self.assertIn("Example:", text)
        for code in ["0 done", "1 unexpected", "2 wrong", "6 a settings file", "7 refused", "9 the time", "10 the data",
                     "11 another", "130 interrupted"]:
            self.assertIn(code, text)

    def test_of_each_command_gives_an_example(self):
        for command in COMMANDS:
            with self.subTest(command):
                self.assertRegex(self.help_of(command), rf"Examples?:\n(  echo .*\n)?  account-settings {command} ")

    def test_says_the_version(self):
        ended = run("--version")
        self.assertEqual(ended.returncode, 0)
        self.assertRegex(ended.stdout.decode(), r"^account-settings \d+\.\d+\.\d+\n$")

    def test_wrong_usage_ends_with_2_and_a_hint(self):
        for arguments in [[], ["dance"], ["list"], ["show", "--nope"], ["convert", "x", "--to", "yaml"],
                          ["set", "A", "B", "C", "--image", "x", "--wait", "-1"],
                          ["wait-for-migration", "--image", "x", "--timeout", "0"],
                          ["wait-for-migration", "--image", "x", "--timeout", "nan"]]:  # fmt: skip
            with self.subTest(arguments):
                ended = run(*arguments)
                self.assertEqual((ended.returncode, ended.stdout), (2, b""))
                self.assertIn(b"--help", ended.stderr)

    def test_of_an_image_may_stand_before_every_command(self):
        more = {"show": ["A"], "enable": ["A", "mail"], "disable": ["A", "mail"], "set": ["A", "B", "C"],
                "unset": ["A", "B"], "insert": ["/dev/null"], "delete": ["A"], "add-child": ["A", "/dev/null"],
                "remove-child": ["A"]}  # fmt: skip
        for command in COMMANDS:
            if command in ("convert", "explain-merge"):
                continue
            for image in (["--image", "/nowhere"], ["--image=/nowhere"]):
                with self.subTest(command, image=image):
                    behind = run(command, *image, *more.get(command, []))
                    before = run(*image, command, *more.get(command, []))
                    self.assertNotIn(before.returncode, (0, 2))
                    self.assertEqual((before.returncode, before.stderr), (behind.returncode, behind.stderr))

    def test_the_man_page_knows_every_command_and_option(self):
        for command in COMMANDS:
            self.assertRegex(MAN_PAGE, rf"\.(Cm|It Cm)( enable [|,])? {command}\b")
            for option in re.findall(r"--([a-z-]+)", self.help_of(command).split("Options:")[1].split("Example")[0]):
                if option != "help":
                    self.assertRegex(MAN_PAGE, rf"(Fl| ,) -{option}\b", command)

    def test_the_man_page_knows_every_exit_code(self):
        codes = re.findall(r"^\.It (\d+)$", MAN_PAGE, re.MULTILINE)
        self.assertEqual(codes, ["0", "1", "2", "6", "7", "9", "10", "11", "130"])


if __name__ == "__main__":
    unittest.main()
