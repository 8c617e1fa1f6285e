"""What a save starts from, for the rows that fail and kill its calls: settings that can be read, settings that
cannot be and must be kept under a second name first, and settings that a load did not get."""

import collections
import functools
import os
import stat

import matrix
from settings_image import NAME, PREFERENCES, SettingsImage

FIRST_CALL = r'openat.*com\.vantor\.accountsettings\.plist'
TEMPORARY_FILE = r'openat.*/file\w{6}\b'
UNREADABLE = b"bplist00, but nothing else of one. " * 3000


class UnreadableImage(SettingsImage):
    """Settings that nobody can read, and that others may. `further_name`: they have a second name already,
    so that a save has to copy them."""

    further_name = False

    def __init__(self, tools, root):
        super().__init__(tools, root)
        self.old = UNREADABLE
        self.reset()

    def reset(self):
        super().reset()
        os.chmod(self.settings, 0o644)
        if self.further_name:
            os.link(self.settings, self.root / PREFERENCES / "another.plist")

    def asides(self):
        return sorted(path for path in (self.root / PREFERENCES).iterdir() if path.name.startswith(NAME + "."))

    def wrong_files(self, stale_allowed=False):
        if wrong := self.wrong_settings() or self.wrong_temporary_files(stale_allowed):
            return wrong
        return self.wrong_asides(self.settings.read_bytes(), stale_allowed)

    def wrong_temporary_files(self, stale_allowed):
        stale = self.temporary_files()
        if len(stale) > (1 if stale_allowed else 0):
            return f"temporary files are left: {[path.name for path in stale]}"
        public = [path.name for path in stale if stat.S_IMODE(path.stat().st_mode) != 0o600]
        return f"others can read {public}" if public else ""

    def wrong_asides(self, content, after_kill):
        """What was kept is private and whole, and is there when the settings are new."""
        kept = 0
        for path in self.asides():
            status, bytes_kept = path.stat(), path.read_bytes()
            # Killed between the making of a second name and the change of the mode: no more can read it
            # than could before.
            is_second_name = status.st_ino == self.settings.stat().st_ino
            if stat.S_IMODE(status.st_mode) != 0o600 and not (after_kill and is_second_name):
                return f"{path.name} has mode {stat.S_IMODE(status.st_mode):o}"
            if bytes_kept == self.old:
                kept += 1
                if (status.st_uid, status.st_gid) != self.owner and not after_kill:
                    return f"{path.name} has another owner"
            elif not (after_kill and self.old.startswith(bytes_kept)):
                return f"{path.name} is no whole copy of the old file"
        if kept > 1:
            return "the old file was kept twice"
        if content != self.old and not kept:
            return "the old file is lost"
        if content != self.old and (self.settings.stat().st_uid, self.settings.stat().st_gid) != self.owner:
            return "the new settings file has another owner"
        return ""


class UnreadableImageOfTwoNames(UnreadableImage):
    further_name = True


class UnloadedImage(UnreadableImage):
    """Settings that can be read, but were not when they were loaded. A save that has not seen the accounts
    keeps the file as one that cannot be read."""

    def __init__(self, tools, root):
        super().__init__(tools, root)
        unread = UnreadableImage(tools, f"{root}.unread")
        unread.learn([tools["fault_saver"], "insert", str(unread.root)], unread.environment())
        self.alone = unread.expected
        SettingsImage.__init__(self, tools, root)

    def wrong_files(self, stale_allowed=False):
        content = self.settings.read_bytes()
        if content not in (self.old, self.expected, self.alone):
            return f"the settings file is neither the old nor the new one ({len(content)} bytes)"
        return self.wrong_temporary_files(stale_allowed) or \
            self.wrong_asides(self.old if content == self.expected else content, stale_allowed)

    def is_new(self):
        return self.settings.read_bytes() in (self.expected, self.alone)


# How the image is made, what a saver does with it, and which of its calls are tried: from the first that matches
# `first` up to the first that matches `end`.
Start = collections.namedtuple("Start", "make work first end")
STARTS = {
    "": Start(SettingsImage, "once", FIRST_CALL, None),
    "unreadable": Start(UnreadableImage, "insert", TEMPORARY_FILE, None),
    "unreadable, of two names": Start(UnreadableImageOfTwoNames, "insert", TEMPORARY_FILE, None),
    "not loaded": Start(UnloadedImage, "insert", FIRST_CALL, TEMPORARY_FILE),
}
AGAIN = {"once": "twice", "insert": "insert-twice"}


class StartedCase(collections.namedtuple("StartedCase", "start fault")):
    """A fault that hits a save from one of the starts."""

    def __str__(self):
        return f"{self.start or 'settings'}, {matrix.name_of(self.fault)}"


class Images:
    """One image for each worker, and `calls`, those of a save that are to be tried."""

    def __init__(self, tools, directory, start="", workers=2):
        make, self.work, self._first, self._end = STARTS[start]
        self._start = start
        self.saver = tools["fault_saver"]
        self.images = [make(tools, directory / f"image{start.replace(' ', '-')}{i}") for i in range(workers)]
        for image in self.images:
            image.learn(self.command(image), image.environment())

    @functools.cached_property
    def calls(self):
        """For the rows that hit them: it takes the right to trace to find them."""
        calls = self._calls(self._first)
        if self._end:
            calls = calls[:-len(self._calls(self._end))]
        if not calls:
            raise SystemExit(f"a save of {self._start} settings makes none of the calls that are to be tried")
        return calls

    def _calls(self, first):
        return matrix.always([self._traced(first) for _ in range(3)])

    def _traced(self, first):
        image = self.images[0]
        calls = matrix.traced_calls(self.command(image), image.environment(), first)
        image.reset()
        return calls

    def command(self, image, again=False):
        return [self.saver, AGAIN[self.work] if again else self.work, str(image.root)]

    def run_under(self, fault, worker, again=False):
        """The image of the worker after a save with the fault, and the exit code."""
        image = self.images[worker]

        def attempt(fault):
            image.reset()
            return image, matrix.run_with(fault, self.command(image, again), image.environment())
        return matrix.where_it_comes(fault, attempt)
