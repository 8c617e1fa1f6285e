"""Whether what `cmake --install` lays down is whole and runs.   usage: installation.py CMAKE BUILD

The build folder is installed into a new place, and the installed tools migrate an image there. That the
plug-in is really the installed one shows when it is taken away.
"""

import json
import shutil
import subprocess
import sys
import tempfile
from pathlib import Path

from documentation import link_problems
from report import finish

BUNDLE = "account-retirement/migrators/QuillnetAccountRemoval.migrator"
EXPECTED = [
    "bin/account-settings", "bin/device-image", "bin/migration-host",
    "include/account-retirement/QuillnetAccountTypeRemoval/ASSAccountsManager.h",
    "include/account-retirement/deviceimage/DeviceImageServices.h",
    "include/account-retirement/localdata/DataclassFunctions.h",
    "include/account-retirement/platform/Services.h",
    "include/account-retirement/propertylist/Value.h",
    "share/doc/account-retirement/LICENSE", "share/doc/account-retirement/docs/architecture.md",
    "share/man/man1/account-settings.1", "share/man/man1/device-image.1", "share/man/man1/migration-host.1",
]
IN_LIBRARIES = [
    *(f"libaccount-retirement-{name}.so{version}" for name in ("platform", "propertylist")
      for version in ("", ".0.1", ".0.1.0")),
    "libaccount_settings.a", "libdeviceimage.a",
    *(f"account-retirement/services/{name}Service.so" for name in ("Calendar", "Contacts", "Device", "Mail")),
    *(f"account-retirement/services/AccountMigrator.migrator/{name}" for name in (
        "Info.plist", "AccountMigrator.so", "AccountTypesProperties.plist")),
    *(f"cmake/AccountRetirement/AccountRetirement{name}.cmake"
      for name in ("Config", "ConfigVersion", "Targets", "DeviceImageTargets")),
    *(f"pkgconfig/account-retirement{name}.pc" for name in ("", "-platform", "-deviceimage")),
    *(f"{BUNDLE}/{name}" for name in (
        "Info.plist", "QuillnetAccountRemoval.so", "AccountTypesProperties.plist",
        "DataclassesProperties.plist", "AccountCreators.plist",
        *(f"{language}.lproj/{table}.strings" for language in ("de", "en", "es", "fr", "ja")
          for table in ("AccountsManager", "DeviceLocalAccount")),
    )),
]


def run(*command: object) -> subprocess.CompletedProcess:
    words = [str(word) for word in command]
    return subprocess.run(words, capture_output=True, text=True, timeout=300)


def check_run(prefix: Path, image: Path) -> list[str]:
    """Makes an image with one account to retire and migrates it with the installed tools."""
    tool, host = prefix / "bin/device-image", prefix / "bin/migration-host"
    for words in (["create", image],
                  ["add-account", image, "--type", "Quillnet", "--status", "1"]):
        done = run(tool, *words)
        if done.returncode:
            return [f"device-image {words[0]}: {done.returncode}: {done.stderr}"]
    done = run(host, "run", "--image", image, "--json", "--quiet")
    if done.returncode:
        return [f"migration-host run: {done.returncode}: {done.stdout}{done.stderr}"]
    outcomes = [account["outcome"] for account in json.loads(done.stdout)["accounts"]]
    return [] if outcomes == ["retired"] else [f"migration-host run: {outcomes}, not retired"]


def check(cmake: str, build: str) -> tuple[list[str], int]:
    """The problems, and the number of things that were looked at."""
    with tempfile.TemporaryDirectory() as folder:
        prefix = Path(folder) / "prefix"
        done = run(cmake, "--install", build, "--prefix", prefix)
        if done.returncode:
            return [f"cmake --install: {done.returncode}: {done.stderr}"], 1
        libraries = next(prefix.rglob("libaccount-retirement-platform.so"), prefix / "lib/none").parent
        expected = [prefix / name for name in EXPECTED]
        expected += [libraries / name for name in IN_LIBRARIES]
        problems = [f"{path.relative_to(prefix)}: not installed" for path in expected if not path.exists()]
        links, link_count = link_problems(prefix)
        problems += links
        if not problems:
            problems = check_run(prefix, Path(folder) / "image")
            shutil.rmtree(libraries / BUNDLE)
            done = run(prefix / "bin/migration-host", "run", "--image", Path(folder) / "image")
            if done.returncode != 7:
                problems.append(f"migration-host runs without its bundle: {done.returncode}")
        return problems, len(expected) + link_count + 2


if __name__ == "__main__":
    finish(*check(sys.argv[1], sys.argv[2]), "installed things")
