"""The sample image of examples/make-sample-image, looked at with independent readers."""

import collections
import os
import re
import shutil
import subprocess
import tempfile
import unittest
from pathlib import Path

from imagetest import SETTINGS, TOOL, ImageTest

TREE = Path(os.environ["SOURCE_TREE"])
ADA = "A7D1C0DE-0000-4000-8000-000000000001"
CARD = re.compile(rb"BEGIN:VCARD\r?\n.*?END:VCARD\r?\n", re.DOTALL)
COMPONENT = re.compile(rb"BEGIN:(VEVENT|VTODO)\r?\n.*?END:\1\r?\n", re.DOTALL)
UID = re.compile(rb"^UID:(.*?)\r?$", re.MULTILINE)
ANCHOR = re.compile(rb"<DT><A .*?</A>(?:\n\s*<DD>[^<]*[^<\s])?", re.DOTALL)


def make_image(directory: Path) -> Path:
    script = TREE / "examples/make-sample-image"
    subprocess.run(
        [script, directory / "image", "--tool", TOOL, "--sources", directory / "sources"], check=True, timeout=60
    )
    return directory / "image"


class SampleImage(ImageTest):
    @classmethod
    def setUpClass(cls):
        cls.made = Path(tempfile.mkdtemp())
        cls.addClassCleanup(shutil.rmtree, cls.made)
        cls.made_image = make_image(cls.made)

    def setUp(self):
        super().setUp()
        self.image = self.made_image

    def source_files(self, dataclass: str) -> list:
        """The contents of the files that were imported for the dataclass."""
        hand_written = {
            "contacts": ["contacts.vcf", "contacts-version-4.vcf"],
            "calendars": ["family.ics", "single-event.ics"],
            "reminders": ["tasks.ics"],
            "bookmarks": ["bookmarks.html"],
            "notes": ["notes/shopping.txt", "notes/plain.txt", "notes/poem.txt"],
        }[dataclass]
        files = [TREE / "examples/data" / name for name in hand_written]
        files += (self.made / "sources").glob(f"*-{dataclass}-*")
        return [path.read_bytes() for path in files]

    def contents(self, kind: str) -> list:
        return [content for _, record_kind, _, content in self.records() if record_kind == kind]

    def test_is_sound(self):
        self.succeed("check", self.image)

    def test_has_the_accounts_of_a_family(self):
        accounts = self.settings()["Accounts"]
        self.assertGreaterEqual(len(accounts), 8)
        self.assertGreaterEqual(len({account["Type"] for account in accounts}), 6)
        selected = collections.Counter(
            (account["Type"], account.get("QuillnetStatus", 0) == 1)
            for account in accounts
            if account["Type"] in ("Quillnet", "VantorAccount")
        )
        self.assertEqual(
            selected, {("Quillnet", True): 1, ("Quillnet", False): 1, ("VantorAccount", True): 1}
        )
        for account in accounts:
            if account["Type"] in ("Quillnet", "VantorAccount"):
                self.assertIn("MobileCalDAVAccount", [child["Class"] for child in account["ChildAccounts"]])

    def test_has_several_hundred_records_in_many_stores(self):
        stores = self.show()["stores"]
        self.assertGreater(sum(store["records"] for store in stores), 500)
        self.assertGreater(len(stores), 15)
        services = {(store["dataclass"], store["store"]) for store in stores}
        for dataclass in ["contacts", "calendars", "reminders", "bookmarks", "notes"]:
            self.assertIn((dataclass, ADA), services)

    def test_keeps_every_card_byte_for_byte(self):
        cards = [card for text in self.source_files("contacts") for card in CARD.findall(text)]
        self.assertGreater(len(cards), 300)
        self.assertEqual(set(self.contents("contact")), set(cards))

    def test_keeps_the_components_of_each_event_and_to_do_together(self):
        for dataclass, kind in [("calendars", "event"), ("reminders", "todo")]:
            expected = set()
            for text in self.source_files(dataclass):
                by_uid = collections.defaultdict(list)
                for component in COMPONENT.finditer(text):
                    uid = UID.search(component[0])
                    by_uid[uid[1] if uid else component[0]].append(component[0])
                expected |= {tuple(components) for components in by_uid.values()}
            found = {tuple(match[0] for match in COMPONENT.finditer(text)) for text in self.contents(kind)}
            self.assertEqual(found, expected)

    def test_gives_each_event_the_time_zones_that_it_names(self):
        for text in self.contents("event"):
            named = set(re.findall(rb";TZID=([^:;]+)[:;]", text))
            defined = re.findall(rb"^TZID:(.*?)\r?$", text, re.MULTILINE)
            self.assertEqual(len(defined), len(set(defined)))
            self.assertEqual(set(defined), named)

    def test_keeps_every_bookmark_and_note_byte_for_byte(self):
        anchors = [anchor for text in self.source_files("bookmarks") for anchor in ANCHOR.findall(text)]
        self.assertGreater(len(anchors), 50)
        self.assertEqual(set(self.contents("bookmark")), set(anchors))
        self.assertEqual(set(self.contents("note")), set(self.source_files("notes")))

    def test_has_duplicates_and_other_versions_in_the_local_stores(self):
        for kind in ["contact", "event", "todo", "note"]:
            by_store = collections.defaultdict(dict)
            for account, record_kind, uid, content in self.records():
                if record_kind == kind:
                    by_store[account is None][uid] = by_store[account is None].get(uid, set()) | {content}
            shared = by_store[True].keys() & by_store[False].keys()
            same = [uid for uid in shared if by_store[True][uid] & by_store[False][uid]]
            self.assertGreater(len(same), 4, kind)
            self.assertGreater(len(shared) - len(same), 2, kind)

    def test_every_store_is_exported_record_by_record(self):
        for store in self.show()["stores"]:
            options = [] if store["store"] == "local" else ["--account", store["store"]]
            if store["dataclass"] in ("contacts", "calendars", "reminders"):
                exported = self.export(store["dataclass"], *options)
                kind = {"contacts": "contact", "calendars": "event", "reminders": "todo"}[store["dataclass"]]
                records = [row for row in self.records() if row[:2] == (store["store_identifier"], kind)]
                self.assertEqual(len(records), store["records"])
                self.assertEqual(exported, b"".join(content for _, _, _, content in records))

    def test_is_made_alike_a_second_time(self):
        second = Path(tempfile.mkdtemp())
        self.addCleanup(shutil.rmtree, second)
        records, settings = self.records(), (self.image / SETTINGS).read_bytes()
        self.image = make_image(second)
        self.assertEqual(self.records(), records)
        self.assertEqual((self.image / SETTINGS).read_bytes(), settings)


if __name__ == "__main__":
    unittest.main()
