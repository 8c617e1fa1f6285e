"""Security cases about texts: identifiers, names, image arguments, log lines."""

import contextlib
import json
import os
import plistlib
import re
import sqlite3

from settings_image import PREFERENCES, account

FORGED = "\n2026-01-01T00:00:00Z migration-host[1]: all is well"
TEXTS = {
    "that climb": "../../../../x", "that are absolute": "/etc/passwd", "with NUL": "a\0b",
    "with a forged log line": "a" + FORGED, "of 300 letters": "x" * 300, "of 5,000 letters": "ü" * 5000,
    "with format letters": "%n %s %@ %d %1$n", "with SQL": "x'); DROP TABLE records; --",
    "that steer a terminal": "\x1b[2J\x1b]0;x\x07\r", "that are two points": "..", "that are empty": "",
}
REFUSED = 7
LOG_LINE = re.compile(r"\d{4}-\d\d-\d\dT\d\d:\d\d:\d\dZ [\w-]+\[\d+\]: [^\x00-\x1f\x7f]*")
CONTACTS = "var/mobile/Library/Contacts/Contacts.sqlite"


def contents(image, where):
    with contextlib.closing(sqlite3.connect(f"file:{image.root / CONTACTS}?mode=ro", uri=True)) as database:
        return sorted(row[0] for row in database.execute(
            "SELECT content FROM records JOIN stores ON stores.id = records.store WHERE " + where))


def name_everything(image, text):
    """Gives the account to be retired, its texts, its store and the sync agent's account this name."""
    image.write_settings(image.settings, [account("A", DisplayName=text, Description=text), {
        "Identifier": text, "Type": "Quillnet", "Class": "QuillnetAccount", "QuillnetStatus": 1,
        "DisplayName": text, "Username": text, "AccountPath": text, text: text,
        "Enabled Dataclasses": ["com.vantor.Dataclass.Contacts", text]}])
    agent = image.root / PREFERENCES / "com.vantor.OTASyncAgent.plist"
    agent.write_bytes(plistlib.dumps({"AccountName": text}, fmt=plistlib.FMT_BINARY))
    with contextlib.closing(sqlite3.connect(image.root / CONTACTS)) as database:
        database.execute("UPDATE stores SET account = ? WHERE account IS NOT NULL", ("Quillnet:" + text,))
        database.commit()


def wrong_log(image):
    lines = (image.root / "var/log/system.log").read_text().split("\n")
    strange = [line for line in lines[:-1] if not LOG_LINE.fullmatch(line)]
    if strange or lines[-1]:
        return f"the log has the line {(strange or lines)[-1][:80]!r}"
    return "a log line was forged" if any(line.startswith("2026-01-01") for line in lines) else ""


def wrong_output(done):
    shown = done.stdout + done.stderr
    if any(byte < 32 and byte != 10 or byte == 127 for byte in shown):
        return f"control characters are printed: {shown[:200]!r}"
    if b"\n2026-01-01T" in shown:
        return "a forged line is printed"
    return ""


def hostile_text(text):
    """The migration does its work as with any other name, and nothing outside the image is touched."""
    def case(image):
        name_everything(image, text)
        service = contents(image, "account IS NOT NULL")
        done = image.host("--log", image.directory / "log")
        if done.returncode != 0:
            return f"the host ended with {done.returncode}: {done.stdout[-200:]} {done.stderr[-200:]}"
        if wrong := wrong_output(done) or wrong_log(image):
            return wrong
        if contents(image, "account IS NULL AND retired_at IS NULL") != service:
            return "the records are not in the local store"
        entries = plistlib.loads(image.settings.read_bytes())["Accounts"]
        if [entry["Identifier"] for entry in entries] != ["A"] or entries[0]["DisplayName"] != text:
            return f"the accounts are {entries}"
        for command in image.commands()[2:]:
            if wrong := image.wrong_end(command, 0, wrong_output):
                return f"{os.path.basename(command[0])} {command[1]}: {wrong}"
        names = {path.name for path in image.directory.iterdir()}
        return "" if names == {"image", "outside", "base", "cards.vcf", "log"} else f"there is {names}"
    return case


def hostile_report(image):
    """The report for programs keeps to its form and shows every text as it is."""
    name_everything(image, TEXTS["with a forged log line"])
    done = image.host("--json", "--quiet")
    report = json.loads(done.stdout)
    first = report["accounts"][1]["identifier"]
    return "" if first == TEXTS["with a forged log line"] and done.returncode == 0 else f"{first!r}"


def log_of_a_plugin(image):
    """A plug-in writes a line with a break in it."""
    bundle = os.path.join(image.found["bundles"], "LogsAndSucceeds.migrator")
    done = image.host("--bundle", bundle, "--log", image.directory / "log")
    if done.returncode != 3:  # this plug-in leaves the account where it is
        return f"the host ended with {done.returncode}"
    shown, kept = done.stderr.splitlines(), (image.directory / "log").read_bytes().splitlines()
    if len(shown) != 2 or len(kept) != 2:
        return f"two lines became {len(shown)} and {len(kept)}"
    return wrong_log(image)


ARGUMENTS = {
    "that is empty": lambda image: "", "with a line break": lambda image: f"{image.directory}/a{FORGED}",
    "of 4,096 bytes": lambda image: "/" + "x/" * 2047 + "y",
    "of a name of 4,096 bytes": lambda image: str(image.directory) + "/" + "x" * 4096,
    "that climbs out": lambda image: f"{image.root}/../../..",
    "that is a file": lambda image: str(image.secret), "that is a device": lambda image: "/dev/zero",
}


def hostile_argument(make):
    """Every program refuses it in one line or a report, and nothing comes to be."""
    def case(image):
        argument = make(image)
        for command in image.commands()[1:]:
            if wrong := image.wrong_end([argument if word == image.root else word for word in command], REFUSED,
                                        wrong_output):
                return f"{os.path.basename(command[0])} {command[1]}: {wrong}"
        return ""
    return case


def image_with_a_line_break(image):
    """An image may have such a name; what is printed about it has not."""
    strange = image.directory / f"strange{FORGED.replace('/', '')}"
    image.root.rename(strange)
    try:
        for command in image.commands()[1:]:
            if wrong := image.wrong_end([strange if word == image.root else word for word in command], 0, wrong_output,
                                        environment=image.environment(TMPDIR=str(strange / "tmp"))):
                return f"{os.path.basename(command[0])} {command[1]}: {wrong}"
    finally:
        strange.rename(image.root)
    return ""


def image_with_points(image):
    """A path with ".." that leads to the image is as good as any other."""
    path = f"{image.root}/../image/tmp/.."
    done = image.run([image.found["migration-host"], "run", "--image", path])
    return "" if done.returncode == 0 else f"the host ended with {done.returncode}"


CASES = {
    **{f"identifiers and names {kind}": hostile_text(text) for kind, text in TEXTS.items()},
    "a report about a forged line": hostile_report,
    "a plug-in logs a line break": log_of_a_plugin,
    **{f"an image argument {kind}": hostile_argument(make) for kind, make in ARGUMENTS.items()},
    "an image whose name has a line break": image_with_a_line_break,
    "an image argument with points": image_with_points,
}
