"""Every wall stops what it should stop: small trees with one bad line each."""

import tempfile
import unittest
from pathlib import Path

import include_walls


class IncludeWalls(unittest.TestCase):
    def problems(self, file: str, line: str) -> list[str]:
        """What the check says of a tree with this one file, whose second line is `line`."""
        with tempfile.TemporaryDirectory() as folder:
            path = Path(folder) / file
            path.parent.mkdir(parents=True)
            path.write_text(f"#pragma once\n{line}\n", encoding="utf-8")
            found, count = include_walls.check(Path(folder))
            self.assertEqual(count, 1)
            return [problem.removeprefix(f"{folder}/") for problem in found]

    def test_lines_that_stay_inside_the_walls_pass(self):
        for file, line in (
            ("propertylist/a.h", "#include <string>"),
            ("platform/a.h", '#include "propertylist/Value.h"'),
            ("platform/a.cpp", "#include <sys/stat.h>"),
            ("localdata/a.cpp", '#include "QuillnetAccountTypeRemoval/a.h"'),
            ("migrator/a.cpp", '#include "localdata/a.h"'),
            ("deviceimage/a.cpp", "#include <sqlite3.h>"),
            ("host/a.cpp", '#include "deviceimage/a.h"'),
            ("host/a.cpp", '#include "QuillnetAccountTypeRemoval/AccountsDataMigrator.h"'),
            ("accountservices/a.cpp", '#include "deviceimage/Journal.h"'),
            ("accountservices/a.cpp", '#include "QuillnetAccountTypeRemoval/AccountChanges.h"'),
            ("tools/a.cpp", "#include <CLI/CLI.hpp>"),
        ):
            with self.subTest(file=file, line=line):
                self.assertEqual(self.problems(file, line), [])

    def test_lines_that_cross_a_wall_are_found_with_their_place(self):
        for file, line in (
            ("propertylist/a.h", '#include "platform/Clock.h"'),
            ("propertylist/a.h", "#include <sqlite3.h>"),
            ("platform/a.h", '#include "deviceimage/a.h"'),
            ("platform/a.cpp", "#include <fmt/core.h>"),
            ("QuillnetAccountTypeRemoval/a.h", '#include "localdata/a.h"'),
            ("QuillnetAccountTypeRemoval/a.h", '#include "deviceimage/a.h"'),
            ("QuillnetAccountTypeRemoval/a.cpp", "#include <sqlite3.h>"),
            ("localdata/a.cpp", "#include <nlohmann/json.hpp>"),
            ("localdata/a.cpp", '#include "migrator/a.h"'),
            ("migrator/a.cpp", "#include <CLI/CLI.hpp>"),
            ("migrator/a.cpp", '#include "host/a.h"'),
            ("deviceimage/a.cpp", '#include "host/a.h"'),
            ("deviceimage/a.cpp", '#include "QuillnetAccountTypeRemoval/a.h"'),
            ("accountservices/a.cpp", '#include "deviceimage/RecordStores.h"'),
            ("accountservices/a.cpp", '#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"'),
            ("host/a.cpp", '#include "accountservices/a.h"'),
            ("host/a.cpp", '#include "migrator/a.h"'),
            ("host/a.cpp", '#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"'),
            ("deviceimage/a.cpp", '#include "QuillnetAccountTypeRemoval/AccountsDataMigrator.h"'),
            ("host/a.cpp", '  #  include "localdata/a.h"  // wanted'),
            ("tools/a.cpp", '#include "tests/a.h"'),
        ):
            with self.subTest(file=file, line=line):
                (problem,) = self.problems(file, line)
                self.assertTrue(problem.startswith(f"{file}:2: "), problem)
                self.assertIn("must not include", problem)

    def test_a_path_that_hides_the_folder_is_found(self):
        for line in ('#include "a.h"', '#include "host/../migrator/a.h"'):
            with self.subTest(line=line):
                (problem,) = self.problems("host/b.cpp", line)
                self.assertIn("not written from the top", problem)

    def test_what_is_for_tests_stays_there(self):
        line = '#include "platform/testing/InMemoryClock.h"'
        self.assertEqual(self.problems("platform/testing/a.h", line), [])
        (problem,) = self.problems("host/b.cpp", line)
        self.assertIn("is for tests", problem)

    def test_angle_brackets_and_macros_hide_nothing(self):
        (problem,) = self.problems("host/b.cpp", "#include <migrator/a.h>")
        self.assertIn("is quoted", problem)
        (problem,) = self.problems("host/b.cpp", "#include HEADER")
        self.assertIn("cannot be read", problem)


if __name__ == "__main__":
    unittest.main()
