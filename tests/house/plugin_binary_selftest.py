"""A shared object that needs or shows too much is found: small ones are built and checked.

usage: plugin_binary_selftest.py COMPILER
"""

import subprocess
import sys
import tempfile
import unittest
from pathlib import Path

import plugin_binary

COMPILER = sys.argv.pop(1) if len(sys.argv) > 1 else "c++"
MODEST = """
#include <string>
#include <vector>
namespace {
struct Registered {
  std::vector<std::string> names;
  Registered() { names.push_back("a name that is too long for the string itself"); }
} registered;
}
"""


class PluginBinary(unittest.TestCase):
    def problems(self, source: str, *options: str, instrumented: bool = False,
                 account_classes: bool = False) -> list[str]:
        """What the check says of the shared object built from `source`."""
        with tempfile.TemporaryDirectory() as folder:
            file = Path(folder) / "object.cpp"
            file.write_text(source, encoding="utf-8")
            command = [COMPILER, "-shared", "-fPIC", "-fvisibility=hidden", "-Wl,-z,nodelete", str(file)]
            subprocess.run([*command, "-o", f"{folder}/object.so", *options], check=True)
            found, _ = plugin_binary.check(Path(folder) / "object.so", instrumented, account_classes)
            return [problem.removeprefix(f"{folder}/") for problem in found]

    def test_an_object_that_needs_the_run_time_and_shows_nothing_passes(self):
        self.assertEqual(self.problems(MODEST), [])

    def test_a_library_besides_the_run_time_is_found(self):
        found = self.problems(MODEST, "-Wl,--no-as-needed", "-lresolv")
        self.assertEqual(found, ["object.so: needs libresolv.so.2"])

    def test_an_object_that_can_be_unloaded_is_found(self):
        with tempfile.TemporaryDirectory() as folder:
            file = Path(folder) / "object.cpp"
            file.write_text(MODEST, encoding="utf-8")
            binary = Path(folder) / "object.so"
            subprocess.run([COMPILER, "-shared", "-fPIC", "-fvisibility=hidden", file, "-o", binary], check=True)
            found, _ = plugin_binary.check(binary, False)
        self.assertEqual(found, [f"{binary}: can be unloaded"])

    def test_a_function_that_is_shown_is_found(self):
        shown = '__attribute__((visibility("default"))) int shown() { return 1; }'
        self.assertEqual(
            self.problems(MODEST + shown), ["object.so: shows the symbol shown() (T)"]
        )

    def test_what_compilers_add_for_counting_is_found_unless_it_is_allowed(self):
        shown = 'extern "C" __attribute__((visibility("default"))) int {}() {{ return 1; }}'
        source = shown.format("__llvm_profile_x") + shown.format("profile")
        one, other = (f"object.so: shows the symbol {name} (T)" for name in ("__llvm_profile_x", "profile"))
        self.assertEqual(self.problems(source), [one, other])
        self.assertEqual(self.problems(source, instrumented=True), [other])

    def test_a_class_that_is_shown_is_found(self):
        shown = """struct __attribute__((visibility("default"))) Shown { virtual ~Shown() {} };
        struct __attribute__((visibility("hidden"))) User { Shown shown; } user;"""
        self.assertIn("object.so: shows the symbol vtable for Shown (V)", self.problems(shown))

    def test_interfaces_of_account_classes_are_found_unless_they_are_allowed(self):
        source = """namespace accountsettings {
        struct __attribute__((visibility("default"))) ANotifier { virtual ~ANotifier() {} };
        struct __attribute__((visibility("default"))) AStore { virtual ~AStore() {} };
        }
        namespace { struct : accountsettings::ANotifier {} notifier; accountsettings::AStore store; }"""
        one = "object.so: shows the symbol typeinfo for accountsettings::ANotifier (V)"
        other = "object.so: shows the symbol typeinfo for accountsettings::AStore (V)"
        found = self.problems(source)
        self.assertIn(one, found)
        self.assertIn(other, found)
        found = self.problems(source, account_classes=True)
        self.assertNotIn(one, found)
        self.assertIn(other, found)


if __name__ == "__main__":
    unittest.main()
