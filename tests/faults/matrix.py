"""Fails or kills a command at every system call that it makes, one at a time, under strace.

strace counts the calls of one name for each process on its own; a call is hit only when it is among the
traced ones. SIGKILL comes before the call acts, so killing before every call covers every point between.
"""

import collections
import concurrent.futures
import os
import re
import signal
import subprocess
import threading

# The errors that each call's manual page lists and that fit a file, a descriptor or a process of ours.
ERRORS = {
    "openat": "EACCES EMFILE ENFILE ENOSPC EROFS EIO EINTR ELOOP ENOMEM ENOENT",
    "read": "EIO EINTR EISDIR", "pread64": "EIO EINTR", "lseek": "EINVAL",
    "write": "ENOSPC EDQUOT EIO EFBIG EINTR", "pwrite64": "ENOSPC EDQUOT EIO EINTR",
    "fsync": "EIO ENOSPC EDQUOT EROFS", "fdatasync": "EIO ENOSPC",
    "close": "EIO EINTR ENOSPC", "fchown": "EPERM EIO EROFS EDQUOT", "fchmod": "EPERM EROFS EIO",
    "rename": "EXDEV EACCES EPERM ENOSPC EROFS EIO ENOENT EISDIR EBUSY EDQUOT",
    "renameat": "EXDEV EACCES EIO", "unlink": "EACCES EIO EBUSY ENOENT",
    "unlinkat": "EACCES EIO ENOENT", "newfstatat": "EACCES EIO ELOOP ENOENT ENOMEM", "fstat": "EIO",
    "access": "EACCES", "faccessat2": "EACCES", "readlink": "EACCES EINVAL",
    "ftruncate": "EIO ENOSPC EFBIG", "fallocate": "ENOSPC EIO EOPNOTSUPP EINTR",
    "mkdir": "EACCES ENOSPC EROFS EEXIST", "mkdirat": "EACCES ENOSPC",
    "flock": "EINTR ENOLCK EWOULDBLOCK", "fcntl": "EINTR ENOLCK EAGAIN", "mmap": "ENOMEM",
    "getdents64": "EIO", "pipe2": "EMFILE", "getrandom": "EINTR ENOSYS",
}
TRACED = ",".join(sorted(ERRORS)) + ",exit_group"
_LINE = re.compile(r"^(\d+)\s+(\w+)\(")

Case = collections.namedtuple("Case", "call fault nth lasting")


def name_of(case):
    return f"{case.call}:{case.fault}:{case.nth}{'+' if case.lasting else ''}"


def traced_calls(command, environment, trace, after):
    """The calls of the command from the first line on that matches `after`: (call, number) each."""
    subprocess.run(["strace", "-f", "-qq", "-o", trace, "-e", "trace=" + TRACED, "--", *command],
                   env=environment, check=False, stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
    counts, calls, on = collections.Counter(), [], False
    with open(trace, errors="replace") as lines:
        for line in lines:
            if not (match := _LINE.match(line)):
                continue
            process, call = match[1], match[2]
            counts[process, call] += 1
            on = on or re.search(after, line) is not None
            if on:
                calls.append((call, counts[process, call]))
    return list(dict.fromkeys(calls))


def kills(calls):
    return [Case(call, "SIGKILL", nth, False) for call, nth in calls]


def errors(calls, lasting=False):
    """A lasting EINTR is left out: nothing can end a loop that goes on after it."""
    return [Case(call, error, nth, lasting) for call, nth in calls
            for error in ERRORS.get(call, "").split() if not (lasting and error == "EINTR")]


def run_with(case, command, environment, limit=30):
    """The command's exit code under the fault; -9 and the like for a signal, "hang" past the limit."""
    inject = ("signal=SIGKILL" if case.fault == "SIGKILL" else "error=" + case.fault)
    when = f"{case.nth}{'+' if case.lasting else ''}"
    process = subprocess.Popen(
        ["strace", "-f", "-qq", "-o", "/dev/null", "-e", "trace=" + case.call,
         "-e", f"inject={case.call}:{inject}:when={when}", "--", *command],
        env=environment, start_new_session=True, stdin=subprocess.DEVNULL,
        stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
    try:
        return process.wait(limit)
    except subprocess.TimeoutExpired:
        os.killpg(process.pid, signal.SIGKILL)
        process.wait()
        return "hang"


def judge_all(cases, judge, workers=2):
    """Calls judge(case, worker) for each; what is wrong with the outcomes: (case, text) for each bad one.
    `worker` is a number from 0 below `workers`; no two calls at one time have the same."""
    free = list(range(workers))
    lock = threading.Lock()

    def one(case):
        with lock:
            worker = free.pop()
        try:
            return judge(case, worker)
        finally:
            with lock:
                free.append(worker)

    with concurrent.futures.ThreadPoolExecutor(workers) as pool:
        return [(case, text) for case, text in zip(cases, pool.map(one, cases)) if text]
