"""device-image import, export, restore and purge."""

import contextlib
import html.parser
import os
import pty
import stat
import subprocess
import unittest

from imagetest import TOOL, ImageTest, run

ADA = "BEGIN:VCARD\r\nVERSION:3.0\r\nUID:ada\r\nFN:Ada Müller\r\nX-ODD;P=\"a:b\":k\r\n ept\r\nEND:VCARD\r\n"
BOB = "BEGIN:VCARD\nVERSION:4.0\nFN:Bob\nEND:VCARD\n"
HEAD = "BEGIN:VCALENDAR\r\nVERSION:2.0\r\nPRODID:-//t//EN\r\n"
TAIL = "END:VCALENDAR\r\n"
EVENT = "BEGIN:VEVENT\r\nUID:e1\r\nDTSTART:20260101T000000Z\r\nEND:VEVENT\r\n"
OTHER_EVENT = "BEGIN:VEVENT\r\nUID:e2\r\nDTSTART:20260102T000000Z\r\nEND:VEVENT\r\n"
TASK = "BEGIN:VTODO\r\nUID:t1\r\nSUMMARY:x\r\nEND:VTODO\r\n"
NOTES = ["UID: n1\nSubject: x\n\nbody\n", "no headers, no line end", "UID: n3\r\n\r\n--x--\r\n\r\n"]
BOOKMARKS = """<!DOCTYPE NETSCAPE-Bookmark-file-1>
<DL><p>
<DT><A HREF="https://a.example/?x=1&amp;y=2" ADD_DATE="5">Ä &lt;1&gt;</A>
<DT><H3>Küche &amp; "Garten"</H3>
<DL><p>
  <DT><A HREF="https://b.example/">b</A>
  <DD>described
on two lines
  <DT><H3>Innen</H3>
  <DL><p>
    <dt><a href='https://c.example/'>日本</a>
  </DL><p>
  <DT><H3>Leer</H3>
  <DL><p></DL><p>
</DL><p>
</DL><p>
"""


class RoundTrip(ImageTest):
    def test_contacts_leave_as_they_came(self):
        self.import_text("contacts", "a.vcf", ADA + BOB)
        self.assertEqual(sorted(self.export("contacts").split(b"BEGIN")), sorted((ADA + BOB).encode().split(b"BEGIN")))
        self.assertEqual(
            self.records(),
            [
                (None, "contact", "0e9b0ff3cebf5af2fec2172409585636fd01cb4285bf876765489148a09b5480", BOB.encode()),
                (None, "contact", "ada", ADA.encode()),
            ],
        )

    def test_a_file_with_one_record_leaves_as_it_came(self):
        cases = [
            ("contacts", ADA),
            ("calendars", HEAD + "X-ODD:1\r\n" + EVENT + TAIL),
            ("reminders", HEAD + TASK + TAIL),
            ("notes", NOTES[0]),
            ("notes", NOTES[1]),
        ]
        for number, (dataclass, text) in enumerate(cases):
            with self.subTest(number):
                self.image = self.directory / f"image{number}"
                self.succeed("create", self.image)
                self.import_text(dataclass, "file", text)
                self.assertEqual(self.export(dataclass), text.encode())

    def test_an_export_is_imported_to_the_same_records(self):
        self.import_text("contacts", "a", ADA + BOB.removesuffix("\n"))
        self.import_text("calendars", "b", HEAD + EVENT + OTHER_EVENT + TASK + TAIL)
        self.import_text("reminders", "c", HEAD + EVENT + OTHER_EVENT + TASK + TAIL)
        self.import_text("bookmarks", "d", BOOKMARKS)
        for number, note in enumerate(NOTES):
            self.import_text("notes", f"n{number}", note)
        before = self.records()
        self.assertEqual(len(before), 2 + 2 + 1 + 3 + 3)
        first = self.image
        self.image = self.directory / "second"
        self.succeed("create", self.image)
        for dataclass in ["contacts", "calendars", "reminders", "bookmarks", "notes"]:
            self.import_text(dataclass, "exported", run("export", first, "--dataclass", dataclass).stdout)
        self.assertEqual(self.records(), before)

    def test_a_record_is_the_same_wherever_in_a_file_it_stands(self):
        self.import_text("contacts", "last", BOB.replace("Bob", "Al") + ADA.removesuffix("\r\n"))
        said = self.import_text("contacts", "first", ADA + BOB.replace("Bob", "Al"))
        self.assertIn(b"0 added, 2 already there", said)
        self.import_text("reminders", "alone", "\ufeff" + HEAD + TASK + "END:VCALENDAR")
        said = self.import_text("reminders", "not alone", HEAD + EVENT + TAIL + HEAD + TASK + TAIL + "\r\n")
        self.assertIn(b"0 added, 1 already there", said)

    def test_a_calendar_of_several_events_is_divided(self):
        self.import_text("calendars", "a.ics", HEAD + EVENT + OTHER_EVENT + TAIL)
        self.assertEqual(
            self.records(),
            [
                (None, "event", "e1", (HEAD + EVENT + TAIL).encode()),
                (None, "event", "e2", (HEAD + OTHER_EVENT + TAIL).encode()),
            ],
        )

    def test_an_empty_store_gives_an_empty_export(self):
        for dataclass in ["contacts", "calendars", "reminders", "notes"]:
            self.assertEqual(self.export(dataclass), b"")


class Bookmarks(ImageTest):
    def setUp(self):
        super().setUp()
        self.import_text("bookmarks", "b.html", BOOKMARKS)

    def test_keep_their_folders_and_their_lines(self):
        self.assertEqual(
            self.export("bookmarks").decode().split("<H1>Bookmarks</H1>\n")[1],
            """<DL><p>
    <DT><A HREF="https://a.example/?x=1&amp;y=2" ADD_DATE="5">Ä &lt;1&gt;</A>
    <DT><H3>Küche &amp; &quot;Garten&quot;</H3>
    <DL><p>
        <DT><A HREF="https://b.example/">b</A>
  <DD>described
on two lines
        <DT><H3>Innen</H3>
        <DL><p>
            <dt><a href='https://c.example/'>日本</a>
        </DL><p>
    </DL><p>
</DL><p>
""",
        )

    def test_are_seen_alike_by_another_reader(self):
        class Reader(html.parser.HTMLParser):
            def __init__(self):
                super().__init__()
                self.folders, self.found, self.name = [], [], None

            def handle_starttag(self, tag, attributes):
                if tag == "dl":
                    self.folders.append(self.name)
                    self.name = None
                elif tag == "a":
                    self.found.append((tuple(self.folders[1:]), dict(attributes)["href"]))
                elif tag == "h3":
                    self.name = ""

            def handle_endtag(self, tag):
                if tag == "dl":
                    self.folders.pop()

            def handle_data(self, data):
                if self.name is not None:
                    self.name += data.strip()

        reader = Reader()
        reader.feed(self.export("bookmarks").decode())
        self.assertEqual(reader.folders, [])
        kitchen = 'Küche & "Garten"'
        self.assertEqual(
            reader.found,
            [
                ((), "https://a.example/?x=1&y=2"),
                ((kitchen,), "https://b.example/"),
                ((kitchen, "Innen"), "https://c.example/"),
            ],
        )


class Stores(ImageTest):
    def test_are_found_as_the_sync_agent_names_them(self):
        self.add_account("Quillnet", "Q1", "--child", "type=CalDAV,class=MobileCalDAVAccount,identifier=Q1C")
        self.add_account("VantorAccount", "V1")
        self.add_account("CardDAV", "C1", "--property", "Sync Identifier=C1S")
        self.add_account("Gmail", "G1")
        self.add_account("OnMyDevice", "L1")
        contact, calendar = ADA, HEAD + EVENT + TASK + TAIL
        cases = [
            ("Q1", "contacts", contact, "Quillnet:ada"),
            ("Q1", "calendars", calendar, "Q1C"),
            ("Q1", "reminders", calendar, "Quillnet:ada"),
            ("V1", "calendars", calendar, "Quillnet:ada"),
            ("C1", "contacts", contact, "C1S"),
            ("G1", "notes", "x", "G1"),
        ]
        for account, dataclass, text, store in cases:
            with self.subTest(account=account, dataclass=dataclass):
                said = self.import_text(dataclass, "file", text, "--account", account).decode()
                self.assertIn(f'store "{store}" of account {account}', said)
                self.assertIn(store, {record[0] for record in self.records()})
                self.assertNotEqual(self.export(dataclass, "--account", account), b"")
        self.assertIn(b"the local store", self.import_text("contacts", "file", contact, "--account", "L1"))
        self.assertEqual(
            self.stores("contacts"), {("local", "active"): 1, ("Q1", "active"): 1, ("C1", "active"): 1}
        )

    def test_without_a_name_cannot_be_used(self):
        self.image = self.directory / "nameless"
        self.succeed("create", self.image)
        self.add_account("Quillnet", "Q1")
        file = self.file("a.vcf", ADA)
        said = self.fail_with(7, "import", self.image, "--dataclass", "contacts", "--account", "Q1", file)
        self.assertIn("--sync-account-name", said)
        self.assertIn("com.vantor.OTASyncAgent.plist", said)

    def test_collections_are_made_when_they_are_named(self):
        self.import_text("contacts", "a.vcf", ADA, "--collection", "Familie")
        self.import_text("contacts", "b.vcf", BOB, "--collection", "Büro")
        store = self.show()["stores"][0]
        self.assertEqual((store["collections"], store["records"]), (2, 2))

    def test_show_has_these_keys(self):
        self.import_text("notes", "n", "x")
        self.assertEqual(
            self.show()["stores"],
            [
                {
                    "dataclass": "notes", "store": "local", "store_identifier": None, "state": "active",
                    "collections": 1, "records": 1, "visible": True, "number": 1, "retired_at": None,
                }
            ],
        )  # fmt: skip
        self.assertRegex(self.succeed("show", self.image).decode(), r"notes +local +active +1 +1 +1 +yes\n")


class Repeating(ImageTest):
    def test_an_import_doubles_nothing(self):
        self.import_text("contacts", "a.vcf", ADA + BOB)
        before = self.records()
        said = self.import_text("contacts", "a.vcf", ADA + BOB)
        self.assertEqual(
            said.decode(),
            "contacts: 0 added, 2 already there, 0 conflicting copies, 0 bad; the local store\n",
        )
        self.assertEqual(self.records(), before)

    def test_another_version_is_kept_beside_the_newer_one(self):
        old = ADA.replace("FN:", "REV:20200101T000000Z\r\nFN:Old ")
        new = ADA.replace("FN:", "REV:20260101T000000Z\r\nFN:New ")
        self.import_text("contacts", "new.vcf", new)
        said = self.import_text("contacts", "old.vcf", old)
        self.assertIn(b"1 conflicting copies", said)
        records = self.records()
        self.assertEqual({content for _, _, _, content in records}, {old.encode(), new.encode()})
        self.assertIn((None, "contact", "ada", new.encode()), records)


class BadInput(ImageTest):
    def import_bad(self, code, dataclass, *files):
        return self.fail_with(code, "import", self.image, "--dataclass", dataclass, *files)

    def test_a_bad_record_is_named_and_the_others_are_imported(self):
        bad_card = "BEGIN:VCARD\r\nVERSION:2.1\r\nFN:x\r\nEND:VCARD\r\n"
        bad_event = "BEGIN:VEVENT\r\nUID:e9\r\nEND:VEVENT\r\n"
        cases = [
            ("contacts", ADA + bad_card + BOB, 8, "version is not 3.0 or 4.0; export it as", 2),
            ("calendars", HEAD + EVENT + bad_event + OTHER_EVENT + TAIL, 8, "no DTSTART; give it", 2),
            ("bookmarks", BOOKMARKS.replace(' HREF="https://a', ' X="'), 3, "no address; give it an HREF", 2),
            ("notes", b"\xff", 1, "not UTF-8 text; save the file", 0),
        ]
        for dataclass, text, line, what, count in cases:
            with self.subTest(dataclass):
                file = self.file("bad file", text)
                said = self.import_bad(4, dataclass, file)
                self.assertIn(f"{file}:{line}: ", said)
                self.assertIn(what, said)
                self.assertEqual(sum(self.stores(dataclass).values()), count)

    def test_a_file_that_cannot_be_read_stops_everything(self):
        good = self.file("good.vcf", ADA)
        pipe = self.directory / "pipe"
        os.mkfifo(pipe)
        for bad in [self.directory / "missing", self.directory, pipe]:
            self.assertIn(str(bad), self.import_bad(7, "contacts", good, bad))
        self.assertEqual(self.records(), [])

    def test_wrong_usage(self):
        file = self.file("a.vcf", ADA)
        self.import_bad(2, "dreams", file)
        self.import_bad(2, "mail", file)
        self.import_bad(2, "contacts")
        self.fail_with(2, "import", self.image, file)
        self.fail_with(2, "import", self.image, "--dataclass", "contacts", "--account", "x", "--retired", file)

    def test_an_unknown_account_is_refused(self):
        file = self.file("a.vcf", ADA)
        said = self.fail_with(7, "import", self.image, "--dataclass", "contacts", "--account", "who", file)
        self.assertIn('no account "who"', said)
        self.fail_with(7, "export", self.image, "--dataclass", "contacts", "--account", "who")

    def test_what_is_no_image_is_refused(self):
        file = self.file("a.vcf", ADA)
        for path in [self.directory / "missing", self.directory, file]:
            self.assertIn(str(path), self.fail_with(7, "import", path, "--dataclass", "contacts", file))

    def test_events_and_to_dos_are_told_apart(self):
        file = self.file("both.ics", HEAD + EVENT + TASK + TAIL)
        ended = run("import", self.image, "--dataclass", "calendars", file)
        self.assertEqual(ended.returncode, 0)
        self.assertIn("1 to-dos left out; import them with --dataclass reminders", ended.stderr.decode())
        self.assertEqual(self.stores("calendars"), {("local", "active"): 1})
        ended = run("import", self.image, "--dataclass", "reminders", file)
        self.assertIn("1 events left out; import them with --dataclass calendars", ended.stderr.decode())
        self.assertEqual({kind for _, kind, _, _ in self.records()}, {"event", "todo"})

    def test_control_characters_of_names_do_not_reach_the_terminal(self):
        said = self.import_bad(7, "contacts", self.directory / "a\x1b[31m\nb")
        self.assertIn("a\\x1b[31m\\x0ab", said)


class Progress(ImageTest):
    def test_is_shown_on_a_terminal_and_wiped(self):
        outer, inner = pty.openpty()
        command = [TOOL, "import", self.image, "--dataclass", "contacts", self.file("a.vcf", ADA)]
        subprocess.run(command, stdout=subprocess.PIPE, stderr=inner, check=True)
        os.close(inner)
        shown = b""
        with contextlib.suppress(OSError):  # the terminal's way to say that nobody writes to it any more
            while piece := os.read(outer, 10000):
                shown += piece
        os.close(outer)
        self.assertIn(b"reading file 1 of 1", shown)
        self.assertIn(b"writing 1 records", shown)
        self.assertTrue(shown.endswith(b"\r\x1b[K"))

    def test_is_silent_in_a_pipe(self):
        ended = run("import", self.image, "--dataclass", "contacts", self.file("a.vcf", ADA))
        self.assertEqual(ended.stderr, b"")


class ExportFiles(ImageTest):
    def test_take_their_name_when_they_are_complete_and_are_private(self):
        self.import_text("contacts", "a.vcf", ADA)
        output = self.file("out.vcf", "old")
        self.assertEqual(self.export("contacts", "--output", output), b"")
        self.assertEqual(output.read_bytes(), ADA.encode())
        self.assertEqual(stat.S_IMODE(output.stat().st_mode), 0o600)
        self.assertEqual(sorted(path.name for path in self.directory.iterdir()), ["a.vcf", "image", "out.vcf"])

    def test_that_cannot_be_made_are_refused(self):
        self.fail_with(7, "export", self.image, "--dataclass", "contacts", "--output", self.directory / "no" / "x")

    def test_a_full_device_is_a_failure(self):
        self.import_text("contacts", "a.vcf", ADA)
        with open("/dev/full", "wb") as full:
            ended = subprocess.run(
                [TOOL, "export", self.image, "--dataclass", "contacts"],
                stdout=full, stderr=subprocess.PIPE, check=False,
            )  # fmt: skip
        self.assertEqual(ended.returncode, 1)
        self.assertIn(b"cannot write standard output", ended.stderr)


class Retired(ImageTest):
    def setUp(self):
        super().setUp()
        self.add_account("Quillnet", "Q1")
        self.import_text("contacts", "a.vcf", ADA + BOB, "--account", "Q1")
        self.import_text("calendars", "a.ics", HEAD + EVENT + TAIL, "--account", "Q1")
        self.import_text("reminders", "b.ics", HEAD + TASK + TAIL, "--account", "Q1")
        self.retire_stores()

    def test_stores_are_shown_by_their_own_name(self):
        self.assertEqual(self.stores("contacts"), {("Quillnet:ada", "retired"): 2})

    def test_records_are_exported_on_request_alone(self):
        self.assertEqual(self.export("contacts"), b"")
        self.assertEqual(self.export("contacts", "--account", "Q1"), b"")
        self.assertEqual(len(self.export("contacts", "--retired")), len((ADA + BOB).encode()))
        number = self.show()["stores"][0]["number"]
        self.assertEqual(
            self.export("contacts", "--retired", "--store", number), self.export("contacts", "--retired")
        )
        self.fail_with(7, "export", self.image, "--dataclass", "contacts", "--retired", "--store", 99)
        self.fail_with(2, "export", self.image, "--dataclass", "contacts", "--store", 1)
        self.fail_with(2, "export", self.image, "--dataclass", "contacts", "--retired", "--account", "Q1")

    def test_records_come_back_once_and_byte_for_byte(self):
        self.import_text("contacts", "a.vcf", ADA)
        said = self.succeed("restore", self.image, "--dataclass", "contacts").decode()
        self.assertEqual(said, "contacts: 1 brought back, 1 already there, 0 conflicting copies; the local store\n")
        self.succeed("restore", self.image, "--dataclass", "contacts")
        self.assertEqual(self.stores("contacts"), {("local", "active"): 2, ("Quillnet:ada", "retired"): 2})
        self.assertEqual(
            sorted(content for _, _, _, content in self.records()), sorted([ADA.encode(), BOB.encode()])
        )

    def test_records_come_back_into_the_account(self):
        self.succeed("restore", self.image, "--dataclass", "reminders", "--account", "Q1")
        self.assertEqual(self.export("reminders", "--account", "Q1").decode(), HEAD + TASK + TAIL)

    def test_purging_destroys_them_and_nothing_else(self):
        self.import_text("contacts", "c.vcf", BOB)
        self.assertEqual(self.succeed("purge", self.image, "--dataclass", "contacts"), b"contacts: 2 records destroyed\n")
        self.assertEqual(self.stores("contacts"), {("local", "active"): 1})
        self.assertEqual(self.stores("calendars")[("Quillnet:ada", "retired")], 1)
        self.succeed("purge", self.image, "--dataclass", "contacts")
        self.fail_with(7, "purge", self.image, "--dataclass", "contacts", "--store", 99)


if __name__ == "__main__":
    unittest.main()
