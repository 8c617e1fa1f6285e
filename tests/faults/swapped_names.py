"""Security cases about names that become others while a program works."""

import plistlib
import subprocess

from hostile_image import MARK, PROGRAMS
from hostile_texts import contents as records
from planted_files import SAVE_FAILED, contents, wrong_accounts
from settings_image import PREFERENCES, account

CONTACTS = "var/mobile/Library/Contacts"
# What each program may end with, in the order of PROGRAMS, where a directory turns into a link out of the image
# and back before each opening: which look meets the link depends on how many there are.
AT_OPENINGS = {
    PREFERENCES: ({0, 1, 16}, {0, 3, 5, 7}, {0, 6}, {0, 6}, {0, 6}, {0}, {0, 6}, {0, 1, 6}),
    CONTACTS: ({0}, {0, 3}, {0, 6}, {0, 6, 7}, {0}, {0, 6, 7}, {0}, {0}),
    "tmp": ({0, 1}, {0, 7}, {0, 6}, {0}, {0}, {0}, {0}, {0, 1, 7}),
    "etc": ({0, 1}, {0, 7}, {0, 6}, {0}, {0}, {0}, {0}, {0, 1}),
}
# The programs that make each of the other calls.
MAKE = {"rename": ("save", "add an account", "set a property"), "unlink": ("add an account", "import"),
        "fchown": ("save", "add an account", "import", "set a property")}
# Before these the directory is held open already, and nothing is lost, but that of the settings is not yet when
# the temporary file is given away.
MEETS_THE_LINK = {("fchown", PREFERENCES, "save"), ("fchown", PREFERENCES, "set a property")}


def swapped_name(when):
    """In a directory that is not sticky somebody puts a link in the place of what a save has begun: the save
    fails, and neither what the link leads to nor the settings have changed."""
    def case(image):
        (image.root / "tmp").chmod(0o777)
        code = image.save(**image.meddled(**{when: image.secret}))
        if code != SAVE_FAILED:
            return f"the save ended with {code}"
        return image.wrong_settings(image.old)
    return case


class SwappedDirectory:
    """A directory of the image, and a link beside it to one outside that is as full; or a file, and a link to a
    copy."""

    def __init__(self, image, name):
        image.reset()
        self.image = image
        self.directory, self.link = image.root / name, image.root / "link"
        self.outside = image.outside / "there"
        subprocess.run(["cp", "-a", str(self.directory), str(self.outside)], check=True)
        for path in [self.outside] if name.endswith(image.settings.name) else self.outside.rglob(image.settings.name):
            image.write_settings(path, [account("A", DisplayName=MARK)])
        self.before = contents(self.outside)
        self.link.symlink_to(self.outside)

    def exchange(self):
        """Both names change places."""
        spare = self.image.root / "exchanged"
        self.directory.rename(spare)
        self.link.rename(self.directory)
        spare.rename(self.link)

    @property
    def names(self):
        """As those who make them change places want them."""
        return f"{self.directory}:{self.link}"

    def run(self, program, prefix=(), **environment):
        """The ended program, with the directory back in its place; what is wrong outside; and whether the directory
        was away."""
        command = self.image.commands()[PROGRAMS.index(program)]
        done = self.image.run(command, prefix=prefix, environment=self.image.environment(**environment))
        if was_away := self.directory.is_symlink():
            self.exchange()
        self.link.unlink()
        if MARK.encode() in done.stdout + done.stderr:
            return done, "has read what is outside", was_away
        return done, "has changed what is outside" if contents(self.outside) != self.before else "", was_away

    def judge(self, program, codes, **environment):
        """What is wrong after the program, and whether the directory was away."""
        done, wrong, was_away = self.run(program, **environment)
        if not wrong and done.returncode not in codes:
            wrong = f"ended with {done.returncode}, not one of {codes}: {done.stderr[-200:]}"
        return wrong or wrong_effect(self.image, program, done.returncode), was_away


def wrong_effect(image, program, code):
    """What is wrong with what the program has done, which is all or, when it failed, nothing."""
    if wrong := wrong_accounts(image.settings):
        return wrong
    entries = plistlib.loads(image.settings.read_bytes())["Accounts"]
    identifiers = [entry["Identifier"] for entry in entries]
    has_done = {
        "save": image.settings.read_bytes() == image.expected, "add an account": "New" in identifiers,
        "set a property": entries[0].get("Key") == "value", "migrate": "Q1" not in identifiers,
        "import": len(records(image, "account IS NULL")) == 2}
    if program not in has_done:
        return "" if image.settings.read_bytes() == image.old else "the settings have changed"
    if program == "migrate" and code == 3:  # the account is left behind, or only records of it
        return "" if 2 in (len(records(image, "account IS NULL")), len(records(image, "account IS NOT NULL"))) else \
            "records are missing"
    # A migration that cannot look at what it has done has retired the account.
    succeeded = code in (0, 5) if program == "migrate" else code == 0
    if has_done[program] != succeeded:
        return f"ended with {code}, and has {'' if has_done[program] else 'not '}done its work"
    return ""


def swapped_at_openings(name, program):
    """Once when the directory is in its place at first, once when the link is."""
    def case(image):
        for begins_with_link in (False, True):
            swapped = SwappedDirectory(image, name)
            if begins_with_link:
                swapped.exchange()
            swaps = image.outside / "swaps"
            wrong, _ = swapped.judge(program, AT_OPENINGS[name][PROGRAMS.index(program)],
                                     **image.meddled(swap=swapped.names, swaps=swaps))
            if not wrong and not swaps.exists():
                wrong = "nothing has changed places"
            if wrong:
                return f"{'link' if begins_with_link else 'directory'} first: {wrong}"
        return ""
    return case


def swapped_at(call, name, program):
    def case(image):
        code = 1 if (call, name, program) in MEETS_THE_LINK else 0
        swapped = SwappedDirectory(image, name)
        wrong, was_away = swapped.judge(program, {code}, **image.meddled(swap=swapped.names, swap_at=call))
        return wrong or ("" if was_away else "nothing has changed places")
    return case


CASES = {
    "the name is swapped before the change of owner": swapped_name("link"),
    "the name is swapped before the bytes are on the disk": swapped_name("later"),
    **{f"a link meanwhile: {name}, {program}": swapped_at_openings(name, program)
       for name in AT_OPENINGS for program in PROGRAMS},
    **{f"a link before each {call}: {name}, {program}": swapped_at(call, name, program)
       for call, programs in MAKE.items() for name in AT_OPENINGS for program in programs},
}
