"""Each way in which a resource can be broken is found: a copy of the real files is broken and checked."""

import shutil
import tempfile
import unittest
from pathlib import Path

import resources

TREE = Path(__file__).resolve().parents[2]


class Resources(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.tree = Path(folder.name)
        for name in ("resources", "accountservices"):
            shutil.copytree(TREE / name, self.tree / name)

    def replaced(self, name: str, old: str, new: str) -> str:
        """What the check says once the first `old` of the file `name` has become `new`."""
        path = self.tree / "resources" / name
        text = path.read_text(encoding="utf-8")
        self.assertIn(old, text)
        path.write_text(text.replace(old, new, 1), encoding="utf-8")
        return "\n".join(resources.check(self.tree))

    def test_the_files_as_they_are_pass(self):
        self.assertEqual(resources.check(self.tree), [])

    def test_a_file_that_is_no_property_list_is_found(self):
        self.assertIn(
            "cannot be read", self.replaced("AccountCreators.plist", "</dict>\n</plist>", "")
        )

    def test_a_missing_type_is_found(self):
        said = self.replaced("AccountTypesProperties.plist", "<key>LDAP</key>", "<key>LDAQ</key>")
        self.assertIn("LDAP: missing", said)
        self.assertIn("LDAQ: unknown", said)

    def test_a_type_without_creators_list_is_found(self):
        said = self.replaced("AccountCreators.plist", "  <key>BookmarkDAV</key>\n  <array/>\n", "")
        self.assertIn("BookmarkDAV: missing", said)

    def test_a_type_that_stands_twice_is_found(self):
        said = self.replaced("AccountCreators.plist", "<key>SMTP</key>", "<key>Mail</key>")
        self.assertIn("Mail: stands twice", said)

    def test_an_unknown_dataclass_is_found(self):
        said = self.replaced(
            "AccountTypesProperties.plist", "Dataclass.Bookmarks<", "Dataclass.Bookmark<"
        )
        self.assertIn("com.vantor.Dataclass.Bookmark: unknown", said)

    def test_an_unknown_action_is_found(self):
        said = self.replaced("AccountTypesProperties.plist", "Keep Local Data", "Keep Local")
        self.assertIn("Keep Local: unknown", said)

    def test_a_missing_dataclass_is_found(self):
        said = self.replaced("DataclassesProperties.plist", "Dataclass.Notes", "Dataclass.Note")
        self.assertIn("com.vantor.Dataclass.Notes: missing", said)

    def test_a_flag_that_is_no_boolean_is_found(self):
        said = self.replaced("DataclassesProperties.plist", "<true/>", "<string>yes</string>")
        self.assertIn("no boolean", said)

    def test_a_creator_without_a_class_is_found(self):
        said = self.replaced("AccountCreators.plist", "<string>ASSDeviceLocalAccount<", "<string><")
        self.assertIn("OnMyDevice: Class: missing or empty", said)

    def test_a_notifier_for_an_unknown_dataclass_is_found(self):
        said = self.replaced("AccountCreators.plist", "Dataclass.Notes<", "Dataclass.Note<")
        self.assertIn("com.vantor.Dataclass.Note: unknown", said)

    def test_a_notifier_that_hears_of_nothing_is_found(self):
        said = self.replaced("AccountCreators.plist", "<key>Supported Dataclasses<", "<key>Dataclasses<")
        self.assertIn("Supported Dataclasses: missing or empty", said)

    def test_a_bundle_that_no_image_holds_is_found(self):
        said = self.replaced("AccountCreators.plist", "System/Library", "../System/Library")
        self.assertIn("MailService.so: no image holds this bundle", said)
        (self.tree / "accountservices/DeviceService.cpp").unlink()
        said = "\n".join(resources.check(self.tree))
        self.assertIn("OnMyDevice: System/Library/AccountServices/DeviceService.so: no image holds", said)

    def test_a_missing_language_is_found(self):
        shutil.rmtree(self.tree / "resources" / "ja.lproj")
        self.assertIn("ja: missing", "\n".join(resources.check(self.tree)))

    def test_a_key_that_one_language_lacks_is_found(self):
        said = self.replaced("fr.lproj/DeviceLocalAccount.strings", "KALLO_MINI", "KALLO_MAXI")
        self.assertIn("ON_MY_DEVICE_TYPE_KALLO_MINI: missing", said)

    def test_an_empty_text_is_found(self):
        said = self.replaced("de.lproj/AccountsManager.strings", "Abonnierte Kalender", " ")
        self.assertIn("SUBSCRIBED_CALENDAR_GROUP_TITLE: no text", said)


if __name__ == "__main__":
    unittest.main()
