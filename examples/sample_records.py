"""Makes the bulk of the sample records: the same bytes at every run, on every machine.

Nothing here is random and nothing asks for the time: a record follows from its number.
"""

import base64
import struct
import zlib

GIVEN_NAMES = (
    "Ada Björn Chloé Dušan Élodie Fatma Güneş Håkon Iñaki Jürgen Klára Łukasz Márta Nuno Øystein "
    "Paloma Quirin Renée Søren Tomáš Ülkü Véronique Wanda Ximena Yağız Zoë さくら 健太 Ольга Νίκος "
    "ליאור مريم अंजलि 지민"
).split()
FAMILY_NAMES = (
    "Ångström Brandão Čapek Dvořák Espinoza Fernández Grünwald Hämäläinen İnönü Jørgensen Kowalczyk "
    "Lefèvre Müller Nakamura O’Brien Peña Quiñones Rivière Škoda Tǎnase Uğurlu Vőrös Weiß Yılmaz "
    "Żeromski Шевченко Παπαδόπουλος كريم 王 김"
).split()
SUBJECTS = (
    "Zahnarzt|Team meeting|Réunion de chantier|Fußballtraining|Piano lesson|Elternabend|Book club|"
    "Déjeuner avec Zoë|Jahresgespräch|Kino|会議|Урок русского|Yoga|Ölwechsel|Call with Łódź"
).split("|")
TASKS = (
    "Water the plants|Fenster putzen|Payer la facture|Paket abholen|Batterien kaufen|電話する|"
    "Renew the passport|Rad reparieren|Envoyer les photos|Кот: ветеринар"
).split("|")
NOTE_LINES = (
    "The door code has changed.|Maße des Schranks: 120 × 60 × 200 cm|Idées de cadeaux pour Noël|"
    "Rezept: 500 g Mehl, 10 g Salz|本のリスト|Wi-fi of the neighbours: ask again|Список покупок|"
    "Qué hacer en Cádiz"
).split("|")

ZONES = {
    "Europe/Paris": ("+0100", "+0200", "-1SU", "3", "-1SU", "10"),
    "America/New_York": ("-0500", "-0400", "2SU", "3", "1SU", "11"),
    "Asia/Kolkata": ("+0530", None, None, None, None, None),
}
CRLF = "\r\n"


def folded(line: str) -> str:
    """The line in pieces of at most 75 bytes, as vCard and iCalendar fold it; no character is cut."""
    pieces, piece = [], b""
    for character in line:
        encoded = character.encode()
        if len(piece) + len(encoded) > 74:
            pieces.append(piece)
            piece = b""
        piece += encoded
    pieces.append(piece)
    return (CRLF + " ").join(piece.decode() for piece in pieces) + CRLF


def lines(*texts: str) -> str:
    return "".join(folded(text) for text in texts)


def picture(number: int, size: int = 32) -> bytes:
    """A PNG with a pattern of its own."""

    def chunk(name: bytes, content: bytes) -> bytes:
        checked = name + content
        return struct.pack(">I", len(content)) + checked + struct.pack(">I", zlib.crc32(checked))

    rows = b"".join(
        b"\0" + bytes((x * y * (number + 3) + channel * 85) % 256 for x in range(size) for channel in range(3))
        for y in range(size)
    )
    # Level 0 stores the rows as they are, so that every version of zlib writes the same.
    return (
        b"\x89PNG\r\n\x1a\n"
        + chunk(b"IHDR", struct.pack(">IIBBBBB", size, size, 8, 2, 0, 0, 0))
        + chunk(b"IDAT", zlib.compress(rows, 0))
        + chunk(b"IEND", b"")
    )


def stamp(number: int) -> str:
    """A moment of the year 2025."""
    return f"2025{1 + number % 12:02}{1 + number % 28:02}T{number % 24:02}{number % 60:02}00Z"


def contact(owner: str, number: int, phone: str = "", changed: str = "") -> str:
    """One vCard. `phone` and `changed` make another version of the contact."""
    given = GIVEN_NAMES[number % len(GIVEN_NAMES)]
    family = FAMILY_NAMES[number * 7 % len(FAMILY_NAMES)]
    phone = phone or f"+99 555 {number:04}"
    if number % 5 == 4:
        head = ["VERSION:4.0", f"UID:urn:x-sample:{owner}-{number}", f"TEL;VALUE=uri:tel:{phone.replace(' ', '-')}"]
    else:
        head = ["VERSION:3.0", f"UID:{owner}-contact-{number}", f"TEL;TYPE=CELL:{phone}"]
    body = [f"N:{family};{given};;;", f"FN:{given} {family}", f"EMAIL:person{number}@{owner}.example"]
    if number % 4 == 0:
        note_line = NOTE_LINES[number % len(NOTE_LINES)]
        body.append(f"NOTE:Met at the {number}. conference\\, and a text long enough to be folded: {note_line}")
    if number % 6 == 0:
        encoded = base64.b64encode(picture(number)).decode()
        body.append(
            f"PHOTO:data:image/png;base64,{encoded}" if number % 5 == 4 else f"PHOTO;ENCODING=b;TYPE=PNG:{encoded}"
        )
    if number % 7 == 0:
        body.append(f"X-SAMPLE-RATING;X-OUT-OF=\"5;0\":{number % 6}")
    return lines("BEGIN:VCARD", *head, *body, f"REV:{changed or stamp(number)}", "END:VCARD")


def time_zone(name: str) -> str:
    standard, daylight, start_day, start_month, end_day, end_month = ZONES[name]

    def rule(kind: str, before: str, after: str, day: str | None, month: str | None) -> list[str]:
        recurrence = [f"RRULE:FREQ=YEARLY;BYMONTH={month};BYDAY={day}"] if day else []
        return [
            f"BEGIN:{kind}", "DTSTART:19700101T020000", f"TZOFFSETFROM:{before}", f"TZOFFSETTO:{after}",
            *recurrence, f"END:{kind}",
        ]

    parts = rule("STANDARD", daylight or standard, standard, end_day, end_month)
    if daylight:
        parts += rule("DAYLIGHT", standard, daylight, start_day, start_month)
    return lines("BEGIN:VTIMEZONE", f"TZID:{name}", *parts, "END:VTIMEZONE")


def event(owner: str, number: int, title: str = "", changed: str = "") -> str:
    """The VEVENTs of one event; every fourth recurs, and has an exception and a cancelled date."""
    title = title or SUBJECTS[number % len(SUBJECTS)]
    changed = changed or stamp(number)
    zone = list(ZONES)[number % len(ZONES)]
    day, hour = 1 + number % 21, 8 + number % 10
    common = [f"UID:{owner}-event-{number}", f"DTSTAMP:{changed}", f"LAST-MODIFIED:{changed}"]
    if number % 9 == 8:
        when = [f"DTSTART;VALUE=DATE:202607{day:02}", f"DTEND;VALUE=DATE:202607{day + 1:02}"]
    else:
        date = f"TZID={zone}:202605{day:02}"
        when = [f"DTSTART;{date}T{hour:02}0000", f"DTEND;{date}T{hour + 1:02}3000"]
    details = [f"SUMMARY:{title} {number}"]
    if number % 3 == 0:
        details += ["BEGIN:VALARM", "ACTION:DISPLAY", f"DESCRIPTION:{title}", "TRIGGER:-PT15M", "END:VALARM"]
    if number % 4 != 0 or number % 9 == 8:
        return lines("BEGIN:VEVENT", *common, *when, *details, "END:VEVENT")
    repeating = ["RRULE:FREQ=DAILY;INTERVAL=2;COUNT=12", f"EXDATE;TZID={zone}:202605{day + 2:02}T{hour:02}0000"]
    moved = [
        f"RECURRENCE-ID;TZID={zone}:202605{day + 4:02}T{hour:02}0000", *common,
        f"DTSTART;TZID={zone}:202605{day + 4:02}T{hour + 2:02}0000", "DURATION:PT45M",
        f"SUMMARY:{title} {number} (moved)",
    ]
    first = lines("BEGIN:VEVENT", *common, *when, *repeating, *details, "END:VEVENT")
    return first + lines("BEGIN:VEVENT", *moved, "END:VEVENT")


def task(owner: str, number: int, title: str = "", changed: str = "") -> str:
    title = title or TASKS[number % len(TASKS)]
    state = ["STATUS:COMPLETED", "PERCENT-COMPLETE:100"] if number % 3 == 0 else ["STATUS:NEEDS-ACTION"]
    return lines(
        "BEGIN:VTODO", f"UID:{owner}-task-{number}", f"DTSTAMP:{changed or stamp(number)}", f"SUMMARY:{title} {number}",
        f"DUE;VALUE=DATE:202609{1 + number % 30:02}", *state, f"X-SAMPLE-ORDER:{number}", "END:VTODO",
    )


def calendar(name: str, components: list[str]) -> str:
    zones = [time_zone(zone) for zone in ZONES if any(f"TZID={zone}:" in component for component in components)]
    head = lines("BEGIN:VCALENDAR", "VERSION:2.0", "PRODID:-//Sample data//Generated//EN", f"NAME:{name}")
    return head + "".join(zones) + "".join(components) + lines("END:VCALENDAR")


def bookmarks(owner: str, count: int) -> str:
    """Folders in folders, eight bookmarks in each."""
    text = ["<!DOCTYPE NETSCAPE-Bookmark-file-1>", "<TITLE>Bookmarks</TITLE>", "<H1>Bookmarks</H1>", "<DL><p>"]
    depth = 0
    for number in range(count):
        if number % 8 == 0 and number:
            text += [f"<DT><H3 ADD_DATE=\"1700000000\">Ordner &amp; Größe {number // 8}</H3>", "<DL><p>"]
            depth += 1
        title = SUBJECTS[number % len(SUBJECTS)]
        text.append(
            f"    <DT><A HREF=\"https://{owner}.example/page/{number}?a=1&amp;b=%C3%A9\" "
            f"ADD_DATE=\"{1700000000 + number}\">{title} &lt;{number}&gt;</A>"
        )
    return "\n".join(text + ["</DL><p>"] * (depth + 1)) + "\n"


def note(owner: str, number: int, changed: str = "") -> str:
    body = "\n".join(NOTE_LINES[(number + i) % len(NOTE_LINES)] for i in range(1 + number % 5))
    if number % 6 == 5:
        return f"{owner} {number}: {body}"
    version = " (again)" if changed else ""
    return (
        f"Subject: {NOTE_LINES[number % len(NOTE_LINES)]}\nUID: {owner}-note-{number}\n"
        f"Date: {changed or '2025-06-%02dT08:00:00Z' % (1 + number % 28)}\n\n{body}{version}\n"
    )
