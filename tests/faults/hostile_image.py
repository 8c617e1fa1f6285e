"""What the security cases share: an image in a place that others can reach, programs, and looks."""

import os
import pathlib
import plistlib
import shutil
import stat
import subprocess

from settings_image import NAME, PREFERENCES, account

OTHER_USER = 12345  # a number that nobody has
SECRET = b"a secret of root"
MARK = "SECRETNAME"  # in the settings outside the image; to be seen nowhere
LIMIT = 60  # seconds
# What commands() are, in their order.
PROGRAMS = ("save", "migrate", "check", "show", "add an account", "import", "list accounts", "set a property")

HOSTILE_CARD = (
    "BEGIN:VCARD\r\nVERSION:3.0\r\nUID:'); DROP TABLE records; --\r\nFN:%n %s %@ %d\r\nN:x;;;;\r\n"
    "NOTE:'; DELETE FROM stores; --\r\nEND:VCARD\r\n"
    "BEGIN:VCARD\r\nVERSION:3.0\r\nUID:../../../x\r\nFN:\x1b[2J\r\nN:y;;;;\r\nEND:VCARD\r\n").encode()


def as_other():
    return {"user": OTHER_USER, "group": OTHER_USER, "extra_groups": [], "umask": 0}


class HostileImage:
    """An image with the accounts "A" and "Q1", of which Q1 is to be retired, and a folder outside of it
    with a secret. Whoever comes to the machine can walk to both. `old` and `expected` are the settings before and
    after a save that nobody disturbs."""

    def __init__(self, found, directory):
        self.found = found
        self.directory = pathlib.Path(directory)
        self.root = self.directory / "image"
        self.outside = self.directory / "outside"
        self.secret = self.outside / "secret"
        self._base = self.directory / "base"
        self.directory.mkdir()
        self._make()
        self.reset()
        self.old = self.settings.read_bytes()
        if self.save() != 0:
            raise SystemExit("a save fails that nobody disturbs")
        self.expected = self.settings.read_bytes()
        self.reset()

    def _make(self):
        subprocess.run([self.found["device-image"], "create", str(self._base), "--without-services",
                        "--sync-account-name", "ada"], check=True, stdout=subprocess.DEVNULL)
        self.write_settings(self._base / PREFERENCES / NAME, [account("A"), {
            "Identifier": "Q1", "Type": "Quillnet", "Class": "QuillnetAccount", "QuillnetStatus": 1,
            "DisplayName": "Q1", "Enabled Dataclasses": ["com.vantor.Dataclass.Contacts"]}])
        cards = self.directory / "cards.vcf"
        cards.write_bytes(HOSTILE_CARD)
        subprocess.run([self.found["device-image"], "import", str(self._base), "--dataclass", "contacts",
                        "--account", "Q1", str(cards)], check=True, stdout=subprocess.DEVNULL)

    @staticmethod
    def write_settings(path, accounts):
        path.write_bytes(plistlib.dumps({"Version": 12, "Accounts": accounts}, fmt=plistlib.FMT_BINARY))
        os.chmod(path, 0o600)
        os.chown(path, 501, 501)

    def reset(self):
        for path in (self.root, self.outside):
            shutil.rmtree(path, ignore_errors=True)
        subprocess.run(["cp", "-a", str(self._base), str(self.root)], check=True)
        self.outside.mkdir()
        self.secret.write_bytes(SECRET)
        self.secret.chmod(0o600)
        self.directory.chmod(0o755)

    @property
    def settings(self):
        return self.root / PREFERENCES / NAME

    def wrong_settings(self, content):
        """What is wrong with the settings file, which is to have this content."""
        status = self.settings.lstat()
        if not stat.S_ISREG(status.st_mode) or stat.S_IMODE(status.st_mode) != 0o600 or status.st_uid != 501:
            return f"the settings file is of mode {status.st_mode:o} and user {status.st_uid}"
        return "" if self.settings.read_bytes() == content else "the settings file has other content"

    def open_to_others(self):
        """Makes every directory passable, and tmp sticky and writable for all, as on many a machine."""
        for path in [self.root, *self.root.rglob("*")]:
            if path.is_dir():
                path.chmod(0o755)
        (self.root / "tmp").chmod(0o1777)

    def put_outside(self, name):
        """Moves a directory of the image out of it, leaves a link in its place, and gives its new path."""
        moved = self.outside / "moved"
        (self.root / name).rename(moved)
        for path in moved.rglob(NAME):
            self.write_settings(path, [account("A", DisplayName=MARK, Username=MARK)])
        (self.root / name).symlink_to(moved)
        return moved

    def environment(self, **more):
        return {"TMPDIR": str(self.root / "tmp"), "PATH": os.environ["PATH"], "LC_ALL": "C", **more}

    def run(self, command, **more):
        """The ended command, with words in front of it if there is a `prefix`; its output is bytes. Past the limit
        it raises TimeoutExpired."""
        environment = more.pop("environment", self.environment())
        words = [str(word) for word in [*more.pop("prefix", []), *command]]
        return subprocess.run(words, env=environment, check=False, timeout=LIMIT, capture_output=True,
                              stdin=subprocess.DEVNULL, **more)

    def save(self, **environment):
        return self.run([self.found["fault_saver"], "once", self.root],
                        environment=self.environment(**environment)).returncode

    def meddled(self, **names):
        return {"LD_PRELOAD": self.found["meddler"], **{f"MEDDLER_{key.upper()}": str(value)
                                                        for key, value in names.items()}}

    def host(self, *arguments, **more):
        return self.run([self.found["migration-host"], "run", "--image", self.root, *arguments], **more)

    def commands(self):
        """One command of each program, those that look and those that change."""
        image = self.root
        return [[self.found["fault_saver"], "once", image],
                [self.found["migration-host"], "run", "--image", image],
                [self.found["device-image"], "check", image], [self.found["device-image"], "show", image],
                [self.found["device-image"], "add-account", image, "--type", "CalDAV", "--identifier", "New"],
                [self.found["device-image"], "import", image, "--dataclass", "contacts",
                 self.directory / "cards.vcf"],
                [self.found["account-settings"], "list", "--image", image],
                [self.found["account-settings"], "set", "A", "Key", "value", "--image", image]]

    def wrong_ends(self, codes, wrong=lambda program, done: "", **more):
        """Runs one program after the other: what is wrong with an exit code, which is to be that of the same place
        in `codes`, or with what a program has done."""
        for program, command, code in zip(PROGRAMS, self.commands(), codes, strict=True):
            if text := self.wrong_end(command, code, lambda done, program=program: wrong(program, done), **more):
                return f"{program}: {text}"
        return ""

    def wrong_end(self, command, code, wrong=lambda done: "", **more):
        """What is wrong with the end of a command. The secret is to be seen nowhere."""
        done = self.run(command, **more)
        if done.returncode != code:
            return f"ended with {done.returncode} instead of {code}: {(done.stdout + done.stderr)[-200:]}"
        if SECRET in done.stdout + done.stderr:
            return "the secret was printed"
        return wrong(done)

    def is_secret_kept(self):
        status = self.secret.lstat()
        return stat.S_ISREG(status.st_mode) and self.secret.read_bytes() == SECRET and \
            (stat.S_IMODE(status.st_mode), status.st_uid, status.st_gid) == (0o600, 0, 0)
