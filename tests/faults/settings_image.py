"""Device images with settings that a fault may hit, and the look at what is left of them."""

import os
import pathlib
import plistlib
import shutil
import stat
import subprocess

PREFERENCES = "var/mobile/Library/Preferences"
NAME = "com.vantor.accountsettings.plist"


def account(identifier, **more):
    return {"Identifier": identifier, "Type": "CalDAV", "Class": "CalDAVAccount",
            "DisplayName": identifier, "Notes": "x" * 600, **more}


class SettingsImage:
    """An image at `root` with accounts "A", "B" and so on, which reset() brings back.

    `expected` is the settings file after a save that nothing disturbed; see learn()."""

    def __init__(self, tools, root, accounts=26):
        self.root = pathlib.Path(root)
        shutil.rmtree(self.root, ignore_errors=True)
        subprocess.run([tools["device-image"], "create", str(self.root), "--without-services"], check=True,
                       stdout=subprocess.DEVNULL)
        self.settings = self.root / PREFERENCES / NAME
        entries = [account(chr(ord("A") + i) if i < 26 else f"N{i}") for i in range(accounts)]
        self.old = plistlib.dumps({"Version": 12, "Accounts": entries}, fmt=plistlib.FMT_BINARY)
        self.owner = (self.settings.stat().st_uid, self.settings.stat().st_gid)
        self.expected = None
        self.reset()

    @classmethod
    def at(cls, root, like):
        """An image that is at `root` already, to be judged by what `like` has learnt."""
        image = cls.__new__(cls)
        image.root = pathlib.Path(root)
        image.settings = image.root / PREFERENCES / NAME
        image.old, image.owner, image.expected = like.old, like.owner, like.expected
        return image

    def reset(self):
        for directory in (self.root / "tmp", self.root / PREFERENCES):
            for path in directory.iterdir():
                if path.is_file() and path.name != ".GlobalPreferences.plist":
                    path.unlink()
        self.settings.write_bytes(self.old)
        os.chmod(self.settings, 0o600)
        os.chown(self.settings, *self.owner)

    def learn(self, command, environment):
        """Runs the command without a fault; its settings file is the one to expect from here on."""
        self.reset()
        code = subprocess.run(command, env=environment, check=False).returncode
        if code != 0:
            raise SystemExit(f"{command}: exit code {code} without any fault")
        self.expected = self.settings.read_bytes()
        if self.expected == self.old:
            raise SystemExit(f"{command}: the settings did not change")
        self.reset()

    def environment(self):
        return {"TMPDIR": str(self.root / "tmp"), "PATH": os.environ["PATH"], "LC_ALL": "C"}

    def temporary_files(self):
        return sorted((self.root / "tmp").iterdir())

    def wrong_settings(self):
        """A settings file that is gone or torn."""
        if not self.settings.is_file():
            return "the settings file is gone"
        content = self.settings.read_bytes()
        if content not in (self.old, self.expected):
            return f"the settings file is neither the old nor the new one ({len(content)} bytes)"
        return ""

    def wrong_files(self, stale_allowed=False):
        """What no fault may leave behind: torn or public files, temporary files."""
        if wrong := self.wrong_settings():
            return wrong
        stale = self.temporary_files()
        if len(stale) > (1 if stale_allowed else 0):
            return f"temporary files are left: {[path.name for path in stale]}"
        sides = [path for path in (self.root / PREFERENCES).iterdir() if NAME in path.name]
        for path in [*stale, *sides]:
            if stat.S_IMODE(path.stat().st_mode) != 0o600:
                return f"{path.name} has mode {stat.S_IMODE(path.stat().st_mode):o}"
        for path in sides:
            if path != self.settings and path.read_bytes() != self.old and not stale_allowed:
                return f"{path.name} is no whole copy of the old file"
        if self.is_new() and \
                (self.settings.stat().st_uid, self.settings.stat().st_gid) != self.owner:
            return "the new settings file has another owner"
        return ""

    def is_new(self):
        return self.settings.read_bytes() == self.expected
