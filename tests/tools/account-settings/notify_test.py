"""The option --notify of account-settings' changing commands."""

import json
import os
import plistlib
import shutil
import unittest
from pathlib import Path

from settingstest import DATACLASS, MAIL, TOOL, SettingsTest

SERVICES = "System/Library/AccountServices"
RESOURCES = "lib/account-retirement/migrators/QuillnetAccountRemoval.migrator"


class Notify(SettingsTest):
    def journal(self) -> list:
        path = self.image / "var/log/account-changes.jsonl"
        return [json.loads(line) for line in path.read_text().splitlines()] if path.exists() else []

    def test_has_the_services_hear_of_the_change(self):
        self.succeed("set", "M1", "PortNumber:integer", "995")
        self.assertEqual(self.journal(), [])
        answer = self.answer("set", "M1", "PortNumber:integer", "996", "--notify")
        self.assertEqual((answer["saved"], answer["notified"]), (True, True))
        heard = self.journal()
        self.assertEqual(len(heard), 1)
        self.assertIn("M1", json.dumps(heard[0]))

    def test_is_silent_when_nothing_changed_or_in_a_dry_run(self):
        self.succeed("set", "M1", "PortNumber:integer", "993", "--notify")
        self.succeed("set", "M1", "PortNumber:integer", "994", "--notify", "--dry-run")
        self.assertEqual(self.journal(), [])

    def test_is_refused_where_others_could_have_put_code(self):
        before = self.settings_file.read_bytes()
        for name in [SERVICES, "System/Library", SERVICES + "/MailService.so"]:
            with self.subTest(name):
                path = self.image / name
                mode = path.stat().st_mode
                path.chmod(mode | 0o002)
                said = self.fail_with(7, "set", "M1", "A", "b", "--notify")
                self.assertIn(str(path), said)
                self.assertIn("--notify", said)
                self.assertEqual(self.settings_file.read_bytes(), before)
                path.chmod(mode)
        target = self.image / SERVICES
        shutil.move(target, self.directory / "elsewhere")
        target.symlink_to(self.directory / "elsewhere")
        self.assertIn(str(target), self.fail_with(7, "set", "M1", "A", "b", "--notify"))
        self.assertEqual(self.settings_file.read_bytes(), before)

    def installation_with(self, catalogue) -> Path:
        """account-settings in an installation of its own with this catalogue of account creators."""
        installation = self.directory / "installation"
        shutil.copytree(Path(TOOL).parent.parent / RESOURCES, installation / RESOURCES)
        (installation / "bin").mkdir()
        shutil.copy2(TOOL, installation / "bin")
        (installation / "lib").mkdir(exist_ok=True)
        for library in (Path(TOOL).parent.parent / "lib").glob("*.so*"):
            (installation / "lib" / library.name).symlink_to(library)
        (installation / RESOURCES / "AccountCreators.plist").write_bytes(plistlib.dumps(catalogue))
        return installation / "bin/account-settings"

    def test_is_refused_where_others_could_have_put_a_bundle_that_the_catalogue_names(self):
        entry = {"Type": "NotifierAccount", "Description": {
            "Supported Dataclasses": [DATACLASS + "Mail"], "Framework": "Library/Own/../Own/Mail.so", "Class": "Own",
        }}  # fmt: skip
        before = self.settings_file.read_bytes()
        folder = self.image / "Library/Own"
        folder.mkdir(parents=True)
        bundle = folder / "Mail.so"
        bundle.write_bytes(b"no code")
        for kind in ("NotifierAccount", "FullAccount"):
            tool = self.installation_with({"Mail": [{**entry, "Type": kind}]})
            for path, mode in ((bundle, 0o602), (folder, 0o777), (folder.parent, 0o777)):
                with self.subTest(kind, path=path):
                    kept = path.stat().st_mode
                    path.chmod(mode)
                    ended = self.run_on_image("set", "M1", "A", "b", "--notify", tool=tool)
                    self.assertEqual((ended.returncode, ended.stdout), (7, b""))
                    self.assertIn(f"{path} may be written by others", ended.stderr.decode())
                    self.assertIn("chmod go-w. Nothing was changed; leave --notify out otherwise",
                                  ended.stderr.decode())
                    self.assertNotIn("migrator", ended.stderr.decode())
                    self.assertEqual(self.settings_file.read_bytes(), before)
                    path.chmod(kept)
            shutil.rmtree(tool.parent.parent)
        self.installation_with({"Mail": [entry]})
        with self.subTest("missing, in a folder that others may write"):
            bundle.unlink()
            folder.chmod(0o1777)
            ended = self.run_on_image("set", "M1", "A", "b", "--notify", tool=tool)
            self.assertEqual(ended.returncode, 7)
            self.assertIn(f"{folder} may be written by others", ended.stderr.decode())
        with self.subTest("a link in its place"):
            folder.chmod(0o755)
            bundle.symlink_to("/dev/null")
            ended = self.run_on_image("set", "M1", "A", "b", "--notify", tool=tool)
            self.assertEqual(ended.returncode, 7)
            self.assertIn(f"{bundle} is neither a file nor a folder; put the account service itself there",
                          ended.stderr.decode())
        self.assertEqual(self.settings_file.read_bytes(), before)

    def test_is_refused_without_a_catalogue(self):
        tool = self.installation_with([])
        before = self.settings_file.read_bytes()
        ended = self.run_on_image("set", "M1", "A", "b", "--notify", tool=tool)
        self.assertEqual(ended.returncode, 7)
        self.assertIn("AccountCreators.plist: it holds no dictionary", ended.stderr.decode())
        self.assertEqual(self.settings_file.read_bytes(), before)

    def test_of_root_is_refused_on_an_image_of_somebody_else(self):
        if os.geteuid() != 0:
            self.skipTest("only root meets images of others that it can write")
        for path in [self.image, *self.image.rglob("*")]:
            os.chown(path, 65534, 65534)
        said = self.fail_with(7, "set", "M1", "A", "b", "--notify")
        self.assertIn("another user; give it to the user who runs account-settings or to root with chown", said)

    def test_says_what_is_missing_and_that_the_accounts_are_saved(self):
        (self.image / SERVICES / "MailService.so").unlink()
        said = self.fail_with(1, "set", "M1", "A", "b", "--notify")
        self.assertIn("saved, but not every notifier was told", said)
        self.assertIn("Could not load the account creator framework", said)
        self.assertIn(str(self.image / SERVICES / "MailService.so"), said)
        self.assertIn("AccountCreators.plist", said)
        self.assertIn("leave --notify out", said)
        self.assertEqual(self.account("M1"), dict(MAIL, A="b"))
        self.succeed("set", "M1", "A", "c")
        file = self.directory / "account.json"
        file.write_text(json.dumps(dict(MAIL, Identifier="M2")))
        ended = self.run_on_image("insert", file, "--notify")
        self.assertEqual((ended.returncode, ended.stdout), (1, b"M2\n"))

    def test_says_which_resource_of_the_installation_is_broken(self):
        tool = self.installation_with({"Mail": [{"Type": "NotifierAccount", "Description": {
            "Supported Dataclasses": [DATACLASS + "Mail"], "Framework": SERVICES + "/Absent.so", "Class": "Absent",
        }}]})  # fmt: skip
        resources = tool.parent.parent / RESOURCES
        creators = resources / "AccountCreators.plist"
        ended = self.run_on_image("set", "M1", "A", "b", "--notify", tool=tool)
        self.assertEqual(ended.returncode, 1)
        self.assertIn(str(creators).encode(), ended.stderr)
        self.assertIn(b"Absent.so", ended.stderr)
        self.assertEqual(self.account("M1")["A"], "b")
        (resources / "AccountTypesProperties.plist").unlink()
        before = self.settings_file.read_bytes()
        ended = self.run_on_image("set", "M1", "A", "c", tool=tool)
        self.assertEqual(ended.returncode, 1)
        self.assertIn(b"AccountTypesProperties.plist", ended.stderr)
        self.assertIn(b"nothing was changed", ended.stderr)
        self.assertEqual(self.settings_file.read_bytes(), before)


if __name__ == "__main__":
    unittest.main()
