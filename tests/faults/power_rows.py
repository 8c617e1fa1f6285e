"""Power cuts on real file systems, before every call: rows S4 and M4 of docs/reliability.md."""

import pathlib
import shutil
import subprocess

import matrix
import migration_rows
from migration_image import environment
from save_rows import next_save
from starting_points import STARTS, Images, StartedCase

CUT = pathlib.Path(__file__).resolve().parent / "power_cut.sh"
# The size, what makes it, and how it is mounted. The second has no notion of a file that replaces another.
FILE_SYSTEMS = {
    "ext4": ("64M", ["mkfs.ext4", "-q", "-F"], "defaults"),
    "ext4 noauto_da_alloc": ("64M", ["mkfs.ext4", "-q", "-F"], "noauto_da_alloc"),
    "xfs": ("320M", ["mkfs.xfs", "-q", "-f"], "defaults"),
    "btrfs": ("160M", ["mkfs.btrfs", "-q", "-f"], "defaults"),
}
WORKERS = 2
FILL = 'mount -o loop "$1" "$2" && cp -a "$3" "$2/i" && umount "$2"'


def make_file_system(name, path, content):
    """Why there is no image at the path with a copy of `content` at "i"; empty when there is one."""
    size, command, _ = FILE_SYSTEMS[name]
    directory = path.parent
    place = directory / "fill"
    place.mkdir(exist_ok=True)
    with open(path, "wb") as file:
        file.truncate(int(size[:-1]) << 20)
    if shutil.which(command[0]) is None:
        return f"there is no {command[0]}"
    if subprocess.run([*command, str(path)], check=False, capture_output=True).returncode != 0:
        return f"{command[0]} fails"
    if subprocess.run(["unshare", "-m", "sh", "-euc", FILL, "sh", str(path), str(place), str(content)],
                        check=False, capture_output=True).returncode != 0:
        return "it cannot be mounted on a loop device"
    return ""


def cut(base, name, work, sync, kill, command, environment):
    """Runs the command on a copy of the file system and cuts the power when it has been killed: the
    directory with what is left, or None and why."""
    work.mkdir(exist_ok=True)
    return matrix.where_it_comes(kill, lambda kill: cut_at(
        base, name, work, sync, [*matrix.injection(kill), *command], environment))


def cut_at(base, name, work, sync, command, environment):
    done = subprocess.run(
        ["unshare", "-m", str(CUT), str(base), FILE_SYSTEMS[name][2], str(work), sync, *command],
        env=environment, check=False, capture_output=True, text=True, timeout=120)
    if done.returncode >= 100 and "hit" not in done.stdout:
        raise matrix.NotHit("the command ended before the call")
    return (work / "found/i", "") if done.returncode >= 100 else (None, done.stderr.strip()[-200:])


def file_systems(names, directory, content):
    """For each name an image for each worker, because file systems with one identity cannot be mounted at
    one time. What cannot be made is told of."""
    made = {}
    for name in names:
        paths = [directory / f"{name.replace(' ', '-')}.{worker}" for worker in range(WORKERS)]
        if why := next(filter(None, (make_file_system(name, path, content) for path in paths)), ""):
            print(f"     {name}: skipped, {why}", flush=True)
        else:
            made[name] = paths
    return made


def named(bad):
    return [(f"{name} {matrix.name_of(kill)} {sync}", text) for (name, kill, sync), text in bad]


def cut_saves(found, directory, is_full):
    """Alone, and after another program's sync, from settings that can be read and that cannot: the settings are
    the old or the new ones, and the new ones once the save is done; what could not be read is kept."""
    place = directory / "s4"
    (place / "images").mkdir(parents=True)
    starts = {start: Images(found, place / "images", start) for start in STARTS if start != "not loaded"}
    bases = file_systems(FILE_SYSTEMS, place, place / "images")
    cases = [(name, StartedCase(start, kill), sync) for name in bases for start, images in starts.items()
             for kill in matrix.kills(images.calls if is_full else images.calls[::7] + images.calls[-1:])
             for sync in ("", "sync")]

    def judge(case, worker):
        name, (start, kill), sync = case
        images = starts[start]
        first, work = images.images[0], place / f"cut{worker}"
        before = first.at(work / "m/i" / first.root.name, first)
        left, why = cut(bases[name][worker], name, work, sync, kill, images.command(before),
                        before.environment())
        if left is None:
            return f"the test could not be set up: {why}"
        image = first.at(left / first.root.name, first)
        if wrong := image.wrong_files(stale_allowed=True):
            return wrong
        if kill.call == "exit_group" and not image.is_new():
            return "a save that was done is lost"
        return next_save(images, image) or image.wrong_files(stale_allowed=True)
    bad = matrix.judge_all(cases, judge)
    return len(cases), [(f"{name}, {case} {sync}", text) for (name, case, sync), text in bad]


def cut_migrations(found, directory, is_full):
    """The power goes before a call of the migrator, before its end, and when the host is done. A second run
    ends the work; after the host's end there is nothing left to do."""
    migration = migration_rows.prepared(found, directory, migration_rows.RECORDS if is_full else 6, "m4")
    kills = matrix.kills(migration.calls_of(migration_rows.CHILD), matrix.POWER_CUT)
    end = matrix.kills(migration.calls_of(migration_rows.HOST)[-1:], matrix.POWER_CUT)
    if end[0].call != "exit_group":
        raise RuntimeError(f"the host's last call is {end[0].call}")
    some = [*kills[:-1:10], kills[-1]] if is_full else migration_rows.spread(kills, 9)
    sample = migration_rows.told("M4", some + end, kills + end)
    bases = file_systems(("ext4", "xfs"), migration.directory, migration.base)
    cases = [(name, kill, sync) for name in bases for kill in sample for sync in ("", "sync")]

    def judge(case, worker):
        name, kill, sync = case
        work = migration.directory / f"cut{worker}"
        left, why = cut(bases[name][worker], name, work, sync, kill, migration.command(work / "m/i/image"),
                        environment())
        if left is None:
            return f"the test could not be set up: {why}"
        state = migration.look(left / "image")
        if kill in end:
            return migration.rules.wrong_at_end(state)
        return migration.rules.wrong_after_kill(state) or migration.rerun(left / "image")
    bad = matrix.judge_all(cases, judge)
    return len(cases), named(bad)


ROWS = {
    "S4": ("the power is cut before a call of a save", cut_saves),
    "M4": ("the power is cut in a migration, then run again", cut_migrations),
}
