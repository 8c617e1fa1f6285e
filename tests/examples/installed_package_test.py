"""The installed package, as a newcomer uses it: the examples are built against it outside the tree, with
CMake and with pkg-config, and what the notifier hears of a renamed account is compared."""

import os
import plistlib
import re
import shutil
import subprocess
import tempfile
import unittest
from pathlib import Path

from documents import TREE, samples

BUILD, CMAKE, CXX = (os.environ[name] for name in ("BUILD_TREE", "CMAKE", "CXX"))
FLAGS = os.environ.get("CXXFLAGS", "").split()
PLACE = "System/Library/AccountServices/SampleNotifier.so"


def run(*command, **options) -> str:
    """What the command put out; it must succeed."""
    ended = subprocess.run([str(word) for word in command], stdout=subprocess.PIPE,
                           stderr=subprocess.STDOUT, text=True, timeout=200, **options)
    if ended.returncode:
        raise AssertionError(f"{command}: {ended.returncode}\n{ended.stdout}")
    return ended.stdout


class InstalledPackage(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.directory = Path(tempfile.mkdtemp())
        cls.addClassCleanup(shutil.rmtree, cls.directory)
        # Installed in one place and moved to another: nothing may remember the first.
        run(CMAKE, "--install", BUILD, "--prefix", cls.directory / "first")
        cls.prefix = cls.directory / "prefix"
        (cls.directory / "first").rename(cls.prefix)
        cls.package = next(cls.prefix.rglob("account-retirement.pc")).parent
        cls.environment = {**os.environ, "PKG_CONFIG_PATH": str(cls.package), "CXX": CXX}
        cls.examples = next(cls.prefix.rglob("examples/notifier")).parent

    def pkg_config(self, *words) -> list[str]:
        return run("pkg-config", *words, env=self.environment).split()

    def copy_of(self, example: str) -> Path:
        """A copy of an installed example, for one build."""
        folder = Path(tempfile.mkdtemp(dir=self.directory)) / example
        shutil.copytree(self.examples / example, folder)
        return folder

    def run_sample(self, sample: str, folder: Path):
        """Runs a shell sample of the document in the folder, with this compiler."""
        lines = re.sub(r"\bPREFIX\b", str(self.prefix), sample)
        lines = re.sub(r"^c\+\+", f"{CXX} {' '.join(FLAGS)}", lines)
        run("sh", "-e", "-c", lines, cwd=folder, env=self.environment)

    def image_with(self, notifier: Path) -> tuple[Path, Path]:
        """An image with the notifier and two accounts, and resources that name the notifier for one."""
        image, resources = notifier.parent / "image", notifier.parent / "resources"
        tool = self.prefix / "bin/device-image"
        run(tool, "create", image)
        for identifier, kind in (("club", "CalDAV"), ("other", "CardDAV")):
            run(tool, "add-account", image, "--type", kind, "--identifier", identifier, "--enable",
                "calendars")
        shutil.copy(notifier, image / PLACE)
        (image / PLACE).chmod(0o600)
        shutil.copytree(*self.pkg_config("--variable=resourcesdir", "account-retirement"), resources)
        catalogue = plistlib.loads((resources / "AccountCreators.plist").read_bytes())
        (entry,) = samples("xml")
        catalogue["CalDAV"].append(plistlib.loads(f"<plist version='1.0'>{entry}</plist>".encode()))
        (resources / "AccountCreators.plist").write_bytes(plistlib.dumps(catalogue))
        return image, resources

    def heard(self, notifier: Path, program: Path) -> list[str]:
        """What the notifier logs when the program renames an account that it serves."""
        image, resources = self.image_with(notifier)
        for identifier in ("club", "other"):
            self.assertIn(f"{identifier}  ", run(program, image, resources, identifier, "New name"))
        lines = (image / "var/log/system.log").read_text(encoding="utf-8").splitlines()
        run(self.prefix / "bin/device-image", "check", image)
        return [re.sub(r"^\S+ rename-account\[\d+\]: ", "", line) for line in lines]

    def check_examples(self, notifier: Path, program: Path):
        self.assertEqual(
            self.heard(notifier, program),
            ["SampleNotifier heard of {AccountID = club; AccountType = CalDAV; ChangeType = 1; "
             "OriginalDataclasses = (com.vantor.Dataclass.Calendars)}"])
        dynamic = run("readelf", "-dW", notifier)
        self.assertNotRegex(dynamic, r"\((RPATH|RUNPATH)\)")
        self.assertIn("NODELETE", dynamic)

    def test_the_examples_are_built_with_cmake(self):
        notifier, program = self.copy_of("notifier"), self.copy_of("rename-account")
        (build_file,) = samples("cmake")
        (notifier / "CMakeLists.txt").write_text(build_file, encoding="utf-8")
        self.run_sample(samples("sh")[0], notifier)
        self.run_sample(samples("sh")[0], program)
        self.check_examples(notifier / "build/SampleNotifier.so", program / "build/rename-account")
        self.check_other_version(notifier / "build/SampleNotifier.so", program / "build/rename-account")

    def check_other_version(self, notifier: Path, program: Path):
        """A bundle that was built for another version does not load, and the loader's text is told."""
        code = notifier.read_bytes()
        other = code.replace(b"libaccount-retirement-platform.so.0.1", b"libaccount-retirement-platform.so.9.9")
        self.assertNotEqual(other, code)
        (self.directory / "other").mkdir()
        notifier = self.directory / "other/SampleNotifier.so"
        notifier.write_bytes(other)
        image, resources = self.image_with(notifier)
        ended = subprocess.run([program, image, resources, "club", "New name"], capture_output=True, text=True,
                               timeout=200)
        self.assertEqual(ended.returncode, 1)
        self.assertIn("rename-account: the installation is broken: Could not load the account creator "
                      f"framework {image / PLACE}. Error libaccount-retirement-platform.so.9.9: "
                      "cannot open shared object file", ended.stderr)

    def test_the_examples_are_built_with_pkg_config(self):
        notifier, program = self.copy_of("notifier"), self.copy_of("rename-account")
        self.run_sample(samples("sh")[1], notifier)
        (libraries,) = self.pkg_config("--variable=libdir", "account-retirement")
        run(CXX, "-std=c++20", *FLAGS, "rename_account.cpp", "-o", "rename-account",
            *self.pkg_config("--cflags", "--libs", "account-retirement",
                             "account-retirement-deviceimage"), f"-Wl,-rpath,{libraries}", cwd=program)
        self.check_examples(notifier / "SampleNotifier.so", program / "rename-account")

    def configure(self, prefix: Path, found: str, *options: str) -> subprocess.CompletedProcess:
        """Configures a project that links whatever there is of this find_package line."""
        folder = Path(tempfile.mkdtemp(dir=self.directory))
        (folder / "CMakeLists.txt").write_text(
            "cmake_minimum_required(VERSION 3.25)\nproject(consumer LANGUAGES CXX)\n"
            f"find_package(AccountRetirement 0.1 {found})\n"
            'message(STATUS "found ${AccountRetirement_FOUND} ${AccountRetirement_deviceimage_FOUND}")\n'
            "foreach(name IN ITEMS platform account_settings deviceimage)\n"
            "  if(TARGET AccountRetirement::${name})\n    message(STATUS \"target ${name}\")\n  endif()\n"
            "endforeach()\n", encoding="utf-8")
        return subprocess.run([CMAKE, "-S", folder, "-B", folder / "build", f"-DCMAKE_PREFIX_PATH={prefix}",
                               *options], stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True,
                              timeout=200, env=self.environment)

    def test_the_components_runtime_and_development_are_all_that_cmake_needs(self):
        prefix = self.directory / "components"
        for component in ("runtime", "development"):
            run(CMAKE, "--install", BUILD, "--prefix", prefix, "--component", component)
        ended = self.configure(prefix, "REQUIRED COMPONENTS deviceimage")
        self.assertEqual(ended.returncode, 0, ended.stdout)
        self.assertIn("-- found 1 TRUE\n-- target platform\n-- target account_settings\n"
                      "-- target deviceimage\n", ended.stdout)
        self.assertFalse((prefix / "share/doc").exists())

    def test_the_component_runtime_runs_alone(self):
        prefix = self.directory / "runtime"
        run(CMAKE, "--install", BUILD, "--prefix", prefix, "--component", "runtime")
        run(prefix / "bin/device-image", "create", prefix / "image")
        run(prefix / "bin/migration-host", "run", "--image", prefix / "image")
        self.assertEqual([*prefix.rglob("*.h"), *prefix.rglob("*.a"), *prefix.rglob("*.cmake")], [])

    def test_without_sqlite_only_the_device_image_is_missing(self):
        without = "-DCMAKE_DISABLE_FIND_PACKAGE_SQLite3=ON"
        ended = self.configure(self.prefix, "REQUIRED OPTIONAL_COMPONENTS deviceimage", without)
        self.assertEqual(ended.returncode, 0, ended.stdout)
        self.assertIn("-- found 1 FALSE\n-- target platform\n-- target account_settings\n", ended.stdout)
        self.assertNotIn("target deviceimage", ended.stdout)
        ended = self.configure(self.prefix, "REQUIRED COMPONENTS deviceimage", without)
        self.assertNotEqual(ended.returncode, 0)
        self.assertIn("needs SQLite3", ended.stdout)

    def test_every_installed_header_finds_those_it_includes(self):
        top = self.prefix / "include/account-retirement"
        headers = sorted(str(path.relative_to(top)) for path in top.rglob("*.h"))
        for name in ("ASSAccountsManager", "ASSBasicAccount", "ASSDeviceLocalAccount", "AccountChanges",
                     "AccountConstants", "AccountCreatorClasses"):
            self.assertIn(f"QuillnetAccountTypeRemoval/{name}.h", headers)
        for name in ("localdata/AccountSettingsUISyncDataController.h", "localdata/DataclassFunctions.h",
                     "deviceimage/DeviceImageServices.h", "platform/Services.h", "propertylist/Value.h"):
            self.assertIn(name, headers)
        self.assertEqual([name for name in headers if "testing/" in name or "Assertions" in name], [])
        source = "".join(f'#include "{name}"\n' for name in headers)
        run(CXX, "-std=c++20", "-fsyntax-only", "-x", "c++", "-",
            *self.pkg_config("--cflags", "account-retirement"), input=source)

    def test_pkg_config_and_cmake_know_version_and_folders(self):
        (version,) = self.pkg_config("--modversion", "account-retirement")
        text = (TREE / "CMakeLists.txt").read_text(encoding="utf-8")
        self.assertIn(f"VERSION {version} ", text)
        for module in ("account-retirement", "account-retirement-platform"):
            (resources,) = self.pkg_config("--variable=resourcesdir", module)
            self.assertTrue((Path(resources) / "AccountCreators.plist").exists())
            (services,) = self.pkg_config("--variable=servicesdir", module)
            self.assertTrue((Path(services) / "MailService.so").exists())
        file = self.package.parent / "cmake/AccountRetirement/AccountRetirementConfigVersion.cmake"
        script = self.directory / "look.cmake"
        for major, minor, fits in ((0, 1, "TRUE"), (0, 2, "FALSE"), (1, 1, "FALSE")):
            script.write_text(f'set(PACKAGE_FIND_VERSION {major}.{minor})\n'
                              f'set(PACKAGE_FIND_VERSION_MAJOR {major})\n'
                              f'set(PACKAGE_FIND_VERSION_MINOR {minor})\ninclude("{file}")\n'
                              'message("${PACKAGE_VERSION} ${PACKAGE_VERSION_COMPATIBLE}")\n')
            self.assertEqual(run(CMAKE, "-P", script), f"{version} {fits}\n")

    def test_no_installed_text_remembers_where_it_was_built_or_first_installed(self):
        for path in [*self.package.glob("*.pc"), *(self.package.parent / "cmake").rglob("*.cmake")]:
            text = path.read_text(encoding="utf-8")
            for place in (BUILD, str(TREE), str(self.directory / "first")):
                self.assertNotIn(place, text, path)


if __name__ == "__main__":
    unittest.main()
