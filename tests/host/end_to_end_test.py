"""Whole runs of the real migrator in the real host, looked at with independent readers."""
import hashlib
import json
import os
import pathlib
import plistlib
import shutil
import subprocess

import jsonschema

import hosttest
from hosttest import account, card, event, record

CONTACTS, BOOKMARKS = "com.vantor.Dataclass.Contacts", "com.vantor.Dataclass.Bookmarks"

# Two dataclasses, one on each way of the migration.
RETIRED = account("Q", "Quillnet", ("Bookmarks", "Contacts"), status=1)
OTHERS = [
    account("M", "Mail", ("Mail",), Class="IMAPAccount", Port=993, Token=b"\x00\xff", Ratio=0.5,
            ChildAccounts=[account("S", "SMTP")]),
    account("B", "Quillnet", ("Contacts",), status=0, Username="bo", Class="QuillnetAccount"),
    account("E", "Exchange", ("Contacts",), DisplayName="Büro"),
]
LINK = "<A HREF=\"https://example.net/\">Example</A>"
RECORDS = [
    record("contacts", None, "local", card("local", "Lo")),
    record("contacts", None, "same", card("same", "Sam")),
    record("contacts", None, "both", card("both", "Old"), modified=1_500_000_000),
    record("contacts", hosttest.SERVICE, "new", card("new", "Nora Ñandú")),
    record("contacts", hosttest.SERVICE, "same", card("same", "Sam")),
    record("contacts", hosttest.SERVICE, "both", card("both", "New")),
    record("contacts", "E", "office", card("office", "Ofelia")),
    record("bookmarks", hosttest.SERVICE, "link", LINK),
]
LOG = [
    "Checking account <ASSBasicAccount: M> of type Mail",
    "Checking account <ASSBasicAccount: Q> of type Quillnet",
    "Merging com.vantor.Dataclass.Contacts to the localstore",
    "mergeSyncDataForDataclass",
    "removeDataStoreForDataclass",
    "DeviceLocalAccount missing. Creating...",
    "Merging com.vantor.Dataclass.Bookmarks to the localstore",
    "createLocalDataSourceForDataclass",
    "Checking account <ASSBasicAccount: B> of type Quillnet",
    "Checking account <ASSBasicAccount: E> of type Exchange",
]


SERVICES = "System/Library/AccountServices"
ALL_SERVICES = ("CalendarService.so", "ContactsService.so", "DeviceService.so", "MailService.so")


class AccountServices(hosttest.HostTestCase):
    """Code bundles of the image, which make accounts and hear of changes."""

    def place(self, source, *names):
        folder = self.image / SERVICES
        folder.mkdir(mode=0o700)
        for name in names:
            shutil.copy(source or hosttest.MIGRATORS.parent / "services" / name, folder / name)
            (folder / name).chmod(0o600)

    def journal(self, name):
        lines = (self.image / "var/log" / name).read_text().splitlines()
        return [{key: value for key, value in json.loads(line).items() if key != "time"}
                for line in lines]

    def copied_migrator(self):
        """A copy of the installed migrator, to be changed by the test."""
        installed = next(hosttest.MIGRATORS.glob("*.migrator"))
        return pathlib.Path(shutil.copytree(installed, self.directory / installed.name))

    def migrate_with(self, bundle):
        self.write_agent_name("ada")
        self.write_settings(OTHERS[0], RETIRED, *OTHERS[1:])
        self.make_image(RECORDS)
        run = self.run_host("--json", "--quiet", "--bundle", bundle)
        self.assertEqual((0, "done"), (run.code, run.report["outcome"]), run.output)
        self.assertEqual(["retired"], [entry["outcome"] for entry in run.report["accounts"]
                                       if entry["identifier"] == RETIRED["Identifier"]])
        self.assertEqual(LOG, run.report["log"])

    def test_a_migration_loads_none_of_them(self):
        bundle = self.copied_migrator()
        creators = bundle / "AccountCreators.plist"
        # Every service makes and hears of the accounts that the migration retires and creates.
        catalogue = plistlib.loads(creators.read_bytes())
        for name in ("Quillnet", "OnMyDevice"):
            for kind in ("FullAccount", "SyncAccount", "NotifierAccount"):
                for service in ALL_SERVICES:
                    catalogue[name].append({"Type": kind, "Description": {
                        "Supported Dataclasses": [CONTACTS, BOOKMARKS],
                        "Framework": f"{SERVICES}/{service}", "Class": "Crashing"}})
        creators.write_bytes(plistlib.dumps(catalogue))
        # Whoever loaded one of these would be killed.
        self.place(hosttest.BUNDLES / "CrashesWhenLoaded.migrator/CrashesWhenLoaded.so",
                   *ALL_SERVICES)
        self.migrate_with(bundle)
        self.assertEqual([], self.journal("account-changes.jsonl"))

    def test_a_migration_needs_no_catalogue_of_them(self):
        bundle = self.copied_migrator()
        (bundle / "AccountCreators.plist").unlink()
        for table in bundle.glob("*.lproj/AccountsManager.strings"):
            table.unlink()
        self.migrate_with(bundle)

    def test_a_plugin_in_the_host_loads_asks_and_notifies_them(self):
        self.write_settings(account("cal", "CalDAV", ("Calendars",)),
                            account("group", "Gmail", ("Calendars",)))
        self.place(None, *ALL_SERVICES)
        run = self.run_bundle("AsksAccountServices")
        self.assertEqual((0, "done"), (run.code, run.report["outcome"]), run.output)
        self.assertEqual(["<CalendarServiceAccount: cal>", "<GroupServiceAccount: group>"],
                         run.report["log"])
        self.assertEqual(
            [{"notifier": "CalendarServiceNotifier", "change": "did change", "account": name,
              "dataclass": "com.vantor.Dataclass.Calendars"} for name in ("cal", "group")],
            self.journal("account-changes.jsonl"))
        self.assertEqual(
            [("CalendarService", "cal", True), ("MailService", "group", True)],
            [(line["service"], line["account"], line["answer"])
             for line in self.journal("refreshes.jsonl")])

    def test_a_service_that_cannot_be_loaded_ends_the_plugin_that_asks_it(self):
        self.write_settings(account("cal", "CalDAV", ("Calendars",)))
        self.place(hosttest.BUNDLES / "UnresolvedSymbol.migrator/UnresolvedSymbol.so",
                   "CalendarService.so")
        run = self.run_bundle("AsksAccountServices")
        self.assertEqual(8, run.code)
        self.assertIn("Could not load the account creator framework", run.output)


class WholeRun(hosttest.HostTestCase):
    def setUp(self):
        super().setUp()
        self.write_agent_name("ada")
        self.write_settings(OTHERS[0], RETIRED, *OTHERS[1:])
        self.make_image(RECORDS)

    def test_every_log_line_comes_in_order_and_everywhere(self):
        path = self.directory / "run.log"
        run = self.run_host("--json", "--log", path)
        self.assertEqual((0, "done"), (run.code, run.report["outcome"]))
        self.assertEqual(LOG, run.report["log"])
        self.assertEqual(LOG, run.errors.splitlines())
        self.assertEqual(LOG, path.read_text().splitlines())
        in_image = (self.image / "var/log/system.log").read_text().splitlines()
        self.assertEqual(len(LOG), len(in_image))
        for line, written in zip(LOG, in_image):
            self.assertTrue(written.endswith(" " + line), written)

    def test_the_report_says_where_each_record_is(self):
        report = self.run_host("--json", "--quiet").report
        self.assertEqual(
            [{"account": "Q", "dataclass": "contacts", "service_before": 3, "local_before": 3,
              "local_after": 5, "moved": 1, "already_there": 1, "conflict_copies": 1, "retired": 0,
              "left_behind": 0},
             {"account": "Q", "dataclass": "bookmarks", "service_before": 1, "local_before": 0,
              "local_after": 1, "moved": 1, "already_there": 0, "conflict_copies": 0, "retired": 0,
              "left_behind": 0}], report["dataclasses"])
        self.assertEqual([("M", "Mail", "m@example.net", "not selected"),
                          ("Q", "Quillnet", "q@example.net", "retired"),
                          ("B", "Quillnet", "b@example.net", "not selected"),
                          ("E", "Exchange", "Büro", "not selected")],
                         [tuple(entry[key] for key in ("identifier", "type", "display_name",
                                                       "outcome"))
                          for entry in report["accounts"]])
        self.assertEqual([("Quillnet Account Removal", "done")],
                         [(each["name"], each["result"]) for each in report["migrators"]])
        self.assertTrue(report["balanced"])

    def test_every_record_is_in_the_local_store_once_with_its_bytes(self):
        self.assertEqual(0, self.run_host("--quiet").code)
        self.assertEqual(sorted(card(*each).encode() for each in (
            ("local", "Lo"), ("same", "Sam"), ("both", "Old"), ("both", "New"),
            ("new", "Nora Ñandú"))), self.contents("contacts"))
        self.assertEqual([LINK.encode()], self.contents("bookmarks"))
        for dataclass in ("contacts", "bookmarks"):
            self.assertEqual([], self.contents(dataclass, hosttest.SERVICE))
        self.assertEqual([card("office", "Ofelia").encode()], self.contents("contacts", "E"))

    def test_what_left_the_services_store_is_kept_in_a_retired_one(self):
        self.run_host("--quiet")
        self.assertEqual(3, len(self.contents("contacts", hosttest.SERVICE, retired=True)))
        self.assertEqual(1, len(self.contents("bookmarks", hosttest.SERVICE, retired=True)))

    def test_the_settings_hold_every_other_account_as_it_was(self):
        self.run_host("--quiet")
        path = self.image / hosttest.SETTINGS
        self.assertEqual(b"bplist00", path.read_bytes()[:8])
        self.assertEqual({"Version": 12, "Accounts": OTHERS}, self.settings())
        status = path.stat()
        self.assertEqual(0o100600, status.st_mode)
        self.assertEqual(self.mobile(), (status.st_uid, status.st_gid))
        self.assertEqual([], os.listdir(self.image / "tmp"))

    def test_settings_in_the_xml_form_come_out_binary(self):
        (self.image / hosttest.SETTINGS).write_bytes(
            plistlib.dumps({"Version": 7, "Accounts": [*OTHERS, RETIRED]}))
        self.assertEqual(0, self.run_host("--quiet").code)
        self.assertEqual(b"bplist00", (self.image / hosttest.SETTINGS).read_bytes()[:8])
        self.assertEqual({"Version": 12, "Accounts": OTHERS}, self.settings())

    def test_a_second_run_changes_no_byte_of_settings_and_stores(self):
        self.run_host("--quiet")
        before = self.digest(leave_out=("var/log/system.log",))
        run = self.run_host("--json", "--quiet")
        self.assertEqual((0, True, []), (run.code, run.report["balanced"], run.report["dataclasses"]))
        self.assertEqual(before, self.digest(leave_out=("var/log/system.log",)))

    def test_a_mail_account_may_have_its_class_put_right(self):
        self.write_settings(RETIRED, account("M", "Mail", Class="GoneAccount",
                                             AccountPath="Mail/POP-ada@example.net"))
        run = self.run_host("--json", "--quiet")
        self.assertEqual((0, "not selected"), (run.code, run.report["accounts"][1]["outcome"]))
        self.assertEqual(["POPAccount"], [each["Class"] for each in self.settings()["Accounts"]])

    def test_a_mail_account_whose_class_cannot_be_put_right_is_dropped(self):
        self.write_settings(RETIRED, account("M", "Mail", Class="GoneAccount"))
        run = self.run_host("--json", "--quiet")
        self.assertEqual((3, "dropped", True), (run.code, run.report["accounts"][1]["outcome"],
                                                run.report["balanced"]))

    def test_every_mail_account_that_the_bundle_says_it_keeps_is_kept(self):
        bundle = next(hosttest.MIGRATORS.glob("*.migrator"))
        known = plistlib.loads((bundle / "Info.plist").read_bytes())["UnkeepableAccounts"]
        accounts = [account(name, "Mail", Class=name) for name in known["KnownClasses"]]
        accounts += [account(part, "Mail", Class="GoneAccount", AccountPath=f"/x/{part}y")
                     for part in known["KnownPathParts"]]
        self.assertEqual((8, 16), (len(known["KnownClasses"]), len(accounts)))
        self.write_settings(RETIRED, *accounts)
        run = self.run_host("--json", "--quiet")
        self.assertEqual(0, run.code, run.output)
        self.assertEqual(accounts[:8], self.settings()["Accounts"][:8])
        self.assertLessEqual({entry["Class"] for entry in self.settings()["Accounts"]},
                             set(known["KnownClasses"]))

    def test_an_account_without_an_identifier_gets_one_and_is_known_again(self):
        nameless = account("", "Exchange", DisplayName="Nameless")
        del nameless["Identifier"]
        self.write_settings(RETIRED, nameless)
        run = self.run_host("--json", "--quiet")
        self.assertEqual((0, ["retired", "not selected"]),
                         (run.code, [entry["outcome"] for entry in run.report["accounts"]]))

    def test_the_status_selects_by_its_integer_value(self):
        for status, outcome in ((1, "retired"), ("1", "retired"), (True, "retired"),
                                (2, "not selected"), ("abc", "not selected"), (0, "not selected")):
            with self.subTest(status):
                self.write_settings({**RETIRED, "QuillnetStatus": status, "Class": "QuillnetAccount"})
                report = self.run_host("--json", "--quiet").report
                self.assertEqual(outcome, report["accounts"][0]["outcome"])

    def test_records_of_a_dataclass_that_is_not_enabled_are_left_behind(self):
        self.write_settings(account("Q", "Quillnet", ("Contacts",), status=1))
        run = self.run_host("--json", "--quiet")
        self.assertEqual((3, True), (run.code, run.report["balanced"]))
        self.assertIn("1 record of bookmarks of account Q", run.report["reasons"][0])


class Calendars(hosttest.HostTestCase):
    def test_events_and_reminders_move_by_their_own_stores(self):
        self.write_agent_name("ada")
        child = account("child", "CalDAV", Class="MobileCalDAVAccount")
        self.write_settings(account("Q", "VantorAccount", ("Calendars", "Reminders"), status=1,
                                    ChildAccounts=[child]),
                            account("DeviceLocalAccount", "OnMyDevice", Class="ASSDeviceLocalAccount"))
        todo = event("t", "Task").replace("VEVENT", "VTODO")
        self.make_image([record("calendars", "child", "a", event("a", "Party")),
                         record("calendars", None, "l", event("l", "Local")),
                         record("reminders", hosttest.SERVICE, "t", todo)])
        run = self.run_host("--json", "--quiet")
        self.assertEqual(0, run.code, run.output)
        self.assertEqual([
            "Checking account <ASSBasicAccount: Q> of type VantorAccount",
            "Merging com.vantor.Dataclass.Calendars to the localstore",
            "mergeSyncDataForDataclass",
            "removeDataStoreForDataclass",
            "Merging com.vantor.Dataclass.Reminders to the localstore",
            "mergeSyncDataForDataclass",
            "removeDataStoreForDataclass",
            "Checking account <ASSDeviceLocalAccount: DeviceLocalAccount> of type OnMyDevice",
        ], run.report["log"])
        self.assertEqual(sorted((event("a", "Party").encode(), event("l", "Local").encode())),
                         self.contents("calendars"))
        self.assertEqual([todo.encode()], self.contents("reminders"))


    def run_with_events_beside_the_reminders(self, *dataclasses):
        self.write_agent_name("ada")
        self.write_settings(account("Q", "Quillnet", dataclasses, status=1))
        self.todo = event("t", "Task").replace("VEVENT", "VTODO")
        self.make_image([record("calendars", hosttest.SERVICE, "a", event("a", "Party")),
                         record("reminders", hosttest.SERVICE, "t", self.todo)])
        return self.run_host("--json", "--quiet")

    def test_events_beside_the_reminders_of_an_account_without_calendars_are_retired(self):
        run = self.run_with_events_beside_the_reminders("Reminders")
        self.assertEqual((3, True), (run.code, run.report["balanced"]), run.output)
        self.assertEqual([("reminders", 1, 0), ("calendars", 0, 1)],
                         sorted(((line["dataclass"], line["moved"], line["retired"])
                                 for line in run.report["dataclasses"]), reverse=True))
        self.assertEqual([self.todo.encode()], self.contents("reminders"))
        self.assertEqual([], self.contents("calendars"))
        self.assertEqual([event("a", "Party").encode()],
                         self.contents("calendars", hosttest.SERVICE, retired=True))

    def test_calendars_move_first_whatever_the_order_they_are_enabled_in(self):
        run = self.run_with_events_beside_the_reminders("Reminders", "Calendars")
        self.assertEqual((0, True), (run.code, run.report["balanced"]), run.output)
        self.assertEqual([self.todo.encode()], self.contents("reminders"))
        self.assertEqual([event("a", "Party").encode()], self.contents("calendars"))


class SampleImage(hosttest.HostTestCase):
    """The image of the examples: many accounts and hundreds of records."""

    MULTI_STORE = ("contacts", "calendars", "reminders", "notes")

    def setUp(self):
        super().setUp()
        self.image = self.directory / "sample"
        subprocess.run([os.environ["MAKE_SAMPLE_IMAGE"], "--tool", os.environ["DEVICE_IMAGE"],
                        str(self.image)], check=True)

    def selected(self):
        return [entry for entry in self.settings()["Accounts"]
                if entry["Type"] in ("Quillnet", "VantorAccount") and entry.get("QuillnetStatus") == 1]

    def stores_of(self, entry, dataclass):
        """The active stores that the account's records of the dataclass may lie in."""
        children = [child["Identifier"] for child in entry.get("ChildAccounts", [])
                    if child["Class"] == "MobileCalDAVAccount"]
        agent = plistlib.loads((self.image / "var/mobile/Library/Preferences"
                                / "com.vantor.OTASyncAgent.plist").read_bytes())
        if dataclass == "calendars" and children:
            return children
        return ["Quillnet:" + agent["AccountName"]]

    def test_every_selected_account_goes_and_every_record_stays_once(self):
        accounts = self.settings()["Accounts"]
        gone = self.selected()
        self.assertEqual(2, len(gone))
        local = {name: self.contents(name) for name in self.MULTI_STORE}
        service = {name: {content for entry in gone for store in self.stores_of(entry, name)
                          for content in self.contents(name, store)} for name in self.MULTI_STORE}
        run = self.run_host("--json", "--quiet")
        self.assertEqual((0, "done", True),
                         (run.code, run.report["outcome"], run.report["balanced"]), run.report["reasons"])
        self.assertEqual([entry for entry in accounts if entry not in gone],
                         self.settings()["Accounts"])
        for name in self.MULTI_STORE:
            with self.subTest(name):
                self.assertGreater(len(service[name]), 20)
                self.assertEqual(sorted(local[name] + sorted(service[name] - set(local[name]))),
                                 self.contents(name))

    def test_a_second_run_changes_no_byte_of_settings_and_stores(self):
        self.assertEqual(0, self.run_host("--quiet").code)
        before = self.digest(leave_out=("var/log/system.log",))
        self.assertEqual(0, self.run_host("--quiet").code)
        self.assertEqual(before, self.digest(leave_out=("var/log/system.log",)))


class ReportSchema(hosttest.HostTestCase):
    """Every report of these tests is held against the schema; here, that the schema can say no."""

    def test_the_schema_is_sound(self):
        jsonschema.Draft202012Validator.check_schema(hosttest.REPORT_VALIDATOR.schema)

    def test_the_schema_refuses_what_is_no_report(self):
        report = self.run_host("--json", "--quiet").report
        for change in ({"exit_code": 3}, {"outcome": "fine"}, {"balanced": False}, {"image": None},
                       {"accounts": [{"identifier": "A"}]}, {"log": [1]}, {"more": 1},
                       {"reasons": ["but"]}):
            with self.subTest(change), self.assertRaises(jsonschema.ValidationError):
                hosttest.REPORT_VALIDATOR.validate({**report, **change})
