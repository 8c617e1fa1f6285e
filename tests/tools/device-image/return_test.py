"""What device-image has exported comes back as the same records: into the image that it came from, where
nothing changes, and into an empty one."""

import hashlib
import unittest

from imagetest import ImageTest

DATACLASSES = ["contacts", "calendars", "reminders", "bookmarks", "notes"]
CARD = "BEGIN:VCARD\r\nVERSION:3.0\r\nUID:{0}\r\nREV:{1}0101T000000Z\r\nFN:{0} {1}\r\nEND:VCARD"
NAMELESS_CARD = "BEGIN:VCARD\nVERSION:4.0\nFN:Bo\nEND:VCARD"
CALENDAR = "BEGIN:VCALENDAR\r\nVERSION:2.0\r\n{}END:VCALENDAR"
EVENT = "BEGIN:VEVENT\r\nUID:{0}\r\nDTSTART:20260101T000000Z\r\nSUMMARY:{1}\r\nEND:VEVENT\r\n"
TASK = "BEGIN:VTODO\r\nUID:{0}\r\nSUMMARY:{1}\r\nEND:VTODO\r\n"
NAMELESS_TASK = "BEGIN:VTODO\nSUMMARY:?\nEND:VTODO\n"
LINK = '<DT><A HREF="https://example.net/{0}" ADD_DATE="{1}">{0}</A>\n'
FOLDER = "<DT><H3>{}</H3>\n<DL><p>\n{}</DL><p>\n"
LIST = "<!DOCTYPE NETSCAPE-Bookmark-file-1>\n<DL><p>\n{}</DL><p>\n"
DIGEST = "Content-Type: multipart/digest; boundary=b\n\n--b\n\ninner\n--b--\n"


class Return(ImageTest):
    def everything(self) -> list:
        """Every record with its store and the folders it lies in."""
        rows = []
        for database in self.databases().values():
            rows += database.execute(
                "WITH RECURSIVE path (id, name) AS ("
                " SELECT id, name FROM collections WHERE parent IS NULL UNION ALL"
                " SELECT c.id, path.name || '/' || c.name FROM path JOIN collections c ON c.parent = path.id)"
                "SELECT kind, path.name, uid, base_uid, content, modified_at, account FROM records"
                " JOIN stores ON stores.id = store JOIN path ON path.id = collection"
            )
            database.close()
        return sorted(rows, key=str)

    def check(self, count: int) -> None:
        """Exports all, and imports it here and into an empty image."""
        before = self.everything()
        self.assertEqual(len(before), count)
        exports = {name: self.export(name) for name in DATACLASSES}
        for name, text in exports.items():
            if text:
                said = self.import_text(name, "exported", text)
                self.assertRegex(said, rb": 0 added, \d+ already there, 0 conflicting copies, 0 bad; the local")
        self.assertEqual(self.everything(), before)
        self.image = self.directory / "empty"
        self.succeed("create", self.image)
        for name, text in exports.items():
            if text:
                self.import_text(name, "exported", text)
        self.assertEqual(self.everything(), before)

    def test_contacts(self):
        self.import_text("contacts", "a", CARD.format("z", 2020))
        self.import_text("contacts", "b", CARD.format("a", 2020) + "\r\n\r\n" + CARD.format("m", 2020))
        self.import_text("contacts", "c", NAMELESS_CARD)
        self.check(4)

    def test_contacts_in_several_versions(self):
        for year in (2022, 2020, 2021):
            self.import_text("contacts", str(year), CARD.format("a", year))
        self.check(3)

    def test_calendars_and_reminders(self):
        self.import_text("calendars", "a", "\ufeff" + CALENDAR.format(EVENT.format("z", "one")))
        self.import_text("calendars", "b", "\n" + CALENDAR.format(EVENT.format("a", "two")) + "\r\n\r\n\n")
        self.import_text("calendars", "c", CALENDAR.format(EVENT.format("m", "three") + EVENT.format("n", "four")))
        self.import_text("calendars", "d", CALENDAR.format(EVENT.format("z", "another version")))
        self.import_text("reminders", "e", CALENDAR.format(TASK.format("z", "five")))
        self.import_text("reminders", "f", CALENDAR.format(TASK.format("a", "six") + NAMELESS_TASK))
        self.check(8)

    def test_bookmarks_of_folders(self):
        self.import_text("bookmarks", "a", LIST.format(
            LINK.format("top", 1) + FOLDER.format("Work", LINK.format("top", 2) + FOLDER.format(
                "Plans", LINK.format("inner", 3))) + LINK.format("last", 4)))
        self.check(4)

    def test_bookmarks_of_a_folder_that_is_called_as_the_top_one(self):
        inner = FOLDER.format("Bookmarks", LINK.format("deep", 3)) + FOLDER.format("Sub", LINK.format("sub", 4))
        self.import_text("bookmarks", "a", LIST.format(
            LINK.format("top", 1) + FOLDER.format("Bookmarks", LINK.format("inside", 2) + inner)
            + FOLDER.format("Sub", LINK.format("sub", 5))))
        self.check(5)

    def test_bookmarks_that_were_put_into_a_collection(self):
        text = LIST.format(LINK.format("top", 1) + FOLDER.format("Sub", LINK.format("sub", 2)))
        for name in ("Work", "Bookmarks", " <blanks & marks> ", "\n"):
            self.import_text("bookmarks", "a", text, "--collection", name)
        self.check(8)

    def test_bookmarks_in_two_versions(self):
        self.import_text("bookmarks", "a", LIST.format(LINK.format("x", 1)), "--collection", "Work")
        self.import_text("bookmarks", "b", LIST.format(LINK.format("x", 2)), "--collection", "Work")
        self.check(2)

    def test_bookmarks_as_deep_as_they_may_lie(self):
        text = LINK.format("deep", 1)
        for level in range(63):
            text = FOLDER.format(level, text)
        self.import_text("bookmarks", "a", LIST.format(text), "--collection", "Top")
        self.assertIn("deeper than 64 levels", self.fail_with(
            4, "import", self.image, "--dataclass", "bookmarks", "--collection", "Top",
            self.file("b", LIST.format(FOLDER.format("one more", text)))))
        self.check(1)

    def test_notes(self):
        for number, note in enumerate(["UID: n\n\nbody", "no headers", "ends in lines\n\n", "--x\n"]):
            self.import_text("notes", str(number), note)
        self.check(4)

    def test_a_single_note_that_is_a_digest_itself(self):
        outer = "Content-Type: multipart/digest; boundary=o\n\n--o\n\n" + DIGEST + "\n--o--\n"
        self.import_text("notes", "a", outer)
        self.check(1)

    def test_records_that_came_another_way(self):
        """What a service sent need not look as an import leaves it; coming back, it changes nothing."""
        self.import_text("contacts", "a", CARD.format("x", 2020) + "\r\n" + NAMELESS_CARD)
        self.import_text("calendars", "b", CALENDAR.format(EVENT.format("x", "one")))
        self.import_text("reminders", "c", CALENDAR.format(TASK.format("x", "one")))
        self.import_text("bookmarks", "d", LIST.format(LINK.format("x", 1)), "--collection", "Work")
        self.import_text("notes", "e", "x")
        for database in self.databases().values():
            with database:
                for row, kind, content in database.execute("SELECT id, kind, content FROM records").fetchall():
                    uid = "x" if kind in ("contact", "event", "todo") and b"UID:x" in content else f"own-{kind}"
                    if kind in ("contact", "todo"):
                        content = content.removesuffix(b"\n").removesuffix(b"\r")
                    if kind == "event":
                        content = b"\xef\xbb\xbf" + content + b"\r\n\r\n"
                    database.execute("UPDATE records SET content = ?, uid = ?, base_uid = ?, content_hash = ?"
                                     " WHERE id = ?",
                                     (content, uid, uid, hashlib.sha256(content).hexdigest(), row))
            database.close()
        before = self.everything()
        self.assertEqual(len(before), 6)
        for name in DATACLASSES:
            said = self.import_text(name, "exported", self.export(name))
            self.assertIn(b": 0 added", said)
            self.assertIn(b"0 conflicting copies, 0 bad", said)
        self.assertEqual(self.everything(), before)


if __name__ == "__main__":
    unittest.main()
