"""Fails or kills a command at every system call that it makes, one at a time.

fault_injector does the work: it counts the calls of one name for the command's own process (generation 0)
and for those that it forks (generation 1) on their own. SIGKILL comes before the call acts, so killing
before every call covers every point between.
"""

import collections
import concurrent.futures
import errno
import functools
import os
import pathlib
import re
import signal
import subprocess
import threading
import traceback

BUILD = pathlib.Path(os.environ.get("BUILD", pathlib.Path(__file__).resolve().parents[2] / "build/release"))
INJECTOR = str(BUILD / "bin/fault_injector")
_NUMBERS = "/usr/include/x86_64-linux-gnu/asm/unistd_64.h"

# The errors that each call's manual page lists and that fit a file, a descriptor or a process of ours.
ERRORS = {
    "openat": "EACCES EMFILE ENFILE ENOSPC EROFS EIO EINTR ELOOP ENOMEM ENOENT",
    "read": "EIO EINTR EISDIR", "pread64": "EIO EINTR", "readv": "EIO EINTR", "lseek": "EINVAL",
    "write": "ENOSPC EDQUOT EIO EFBIG EINTR", "pwrite64": "ENOSPC EDQUOT EIO EINTR",
    "writev": "ENOSPC EDQUOT EIO EFBIG EINTR", "copy_file_range": "ENOSPC EIO EXDEV",
    "fsync": "EIO ENOSPC EDQUOT EROFS", "fdatasync": "EIO ENOSPC", "syncfs": "EIO ENOSPC",
    "close": "EIO EINTR ENOSPC", "close_range": "ENOMEM", "fchown": "EPERM EIO EROFS EDQUOT",
    "fchownat": "EPERM EIO EROFS", "fchmod": "EPERM EROFS EIO", "chmod": "EPERM EROFS EIO EACCES",
    "chown": "EPERM EROFS EIO EDQUOT", "lchown": "EPERM EROFS EIO",
    "fchmodat": "EPERM EROFS EIO",
    "utimensat": "EACCES EROFS",
    "rename": "EXDEV EACCES EPERM ENOSPC EROFS EIO ENOENT EISDIR EBUSY EDQUOT",
    "renameat": "EXDEV EACCES EIO ENOSPC", "renameat2": "EXDEV EACCES EIO ENOSPC EEXIST EINVAL",
    "link": "EACCES EEXIST EMLINK EPERM EIO", "linkat": "EACCES EEXIST EMLINK EPERM EIO ENOSPC",
    "unlink": "EACCES EIO EBUSY ENOENT", "unlinkat": "EACCES EIO ENOENT",
    "newfstatat": "EACCES EIO ELOOP ENOENT ENOMEM", "fstat": "EIO ENOMEM", "stat": "EACCES EIO ENOENT",
    "lstat": "EACCES EIO ENOENT", "statx": "EACCES EIO ENOENT ENOMEM", "fstatfs": "EIO ENOMEM",
    "statfs": "EACCES EIO", "access": "EACCES EIO ENOENT", "faccessat": "EACCES EIO",
    "faccessat2": "EACCES EIO", "readlink": "EACCES EINVAL EIO", "readlinkat": "EACCES EINVAL EIO",
    "getcwd": "ENOENT", "chdir": "EACCES",
    "ftruncate": "EIO ENOSPC EFBIG", "fallocate": "ENOSPC EIO EOPNOTSUPP EINTR", "fadvise64": "EINVAL",
    "mkdir": "EACCES ENOSPC EROFS EEXIST", "mkdirat": "EACCES ENOSPC EROFS", "rmdir": "EACCES EBUSY",
    "getdents64": "EIO ENOENT", "flock": "EINTR ENOLCK EWOULDBLOCK", "fcntl": "EINTR ENOLCK EAGAIN EMFILE",
    "ioctl": "ENOTTY", "dup": "EMFILE", "dup2": "EBUSY EINTR EMFILE", "dup3": "EBUSY EINTR EMFILE",
    "pipe2": "EMFILE ENFILE", "eventfd2": "EMFILE ENFILE ENOMEM", "signalfd4": "EMFILE ENFILE ENOMEM",
    "mmap": "ENOMEM EAGAIN", "mremap": "ENOMEM", "mprotect": "ENOMEM EACCES", "madvise": "EAGAIN",
    "getrandom": "EINTR ENOSYS", "socket": "EMFILE ENFILE EACCES", "socketpair": "EMFILE ENFILE",
    "connect": "EACCES ENOENT ECONNREFUSED", "sendto": "EPIPE ENOBUFS EINTR ENOMEM",
    "sendmsg": "EPIPE ENOBUFS EINTR ENOMEM", "recvfrom": "EINTR EAGAIN ECONNRESET ENOMEM",
    "recvmsg": "EINTR EAGAIN ECONNRESET ENOMEM", "setsockopt": "ENOMEM", "shutdown": "ENOTCONN",
    "poll": "EINTR ENOMEM", "ppoll": "EINTR ENOMEM", "clock_nanosleep": "EINTR", "nanosleep": "EINTR",
    "clone": "EAGAIN ENOMEM", "clone3": "EAGAIN ENOMEM", "fork": "EAGAIN ENOMEM", "vfork": "EAGAIN ENOMEM",
    "execve": "EACCES EAGAIN EIO ENOENT ENOMEM ETXTBSY", "wait4": "EINTR ECHILD", "waitid": "EINTR ECHILD",
    "pidfd_open": "EMFILE ENFILE ENOMEM ENOSYS", "kill": "EPERM ESRCH", "prctl": "EINVAL EPERM",
    "prlimit64": "EPERM", "setrlimit": "EPERM", "setsid": "EPERM", "getsid": "ESRCH", "rt_sigaction": "EINVAL",
    "rt_sigprocmask": "EINVAL", "sigaltstack": "ENOMEM", "sysinfo": "EFAULT", "uname": "EFAULT",
}
# These cannot fail, or not with arguments like ours.
CANNOT_FAIL = set("exit exit_group getpid getppid gettid getuid geteuid getgid getegid umask munmap arch_prctl"
                  " set_tid_address set_robust_list rseq futex sched_yield sched_getaffinity time gettimeofday"
                  " clock_gettime clock_getres rt_sigreturn restart_syscall".split())
# The C library's own malloc does not survive that this fails; row S9 has allocations that fail.
CANNOT_FAIL.add("brk")

# How often these come depends on where memory lies, and that on the lengths of paths and on the moment.
FOR_MEMORY = set("brk mmap munmap mremap mprotect madvise".split())

# A system call: its name, the how-manieth of the name, and the generation of the process.
Call = collections.namedtuple("Call", "call nth generation")
# What happens to it: an error's name, SIGKILL, POWER CUT, which kills all processes, or SWAP, before which the two
# names of INJECTOR_SWAP change places.
Case = collections.namedtuple("Case", "call fault nth lasting generation", defaults=(0,))
POWER_CUT = "POWER CUT"
SWAP = "SWAP"


class NotHit(Exception):
    """The command ended before the call: nothing has been tried."""


class UnknownCall(Exception):
    """A command makes a call of which ERRORS says nothing."""


@functools.cache
def _numbers():
    with open(_NUMBERS, encoding="ascii") as header:
        return {match[1]: int(match[2]) for match in re.finditer(r"#define __NR_(\w+) (\d+)", header.read())}


def number_of(call):
    return _numbers()[call]


def name_of(case):
    who = "child " if case.generation else ""
    return f"{who}{case.call}:{case.fault}:{case.nth}{'+' if case.lasting else ''}"


def traced_calls(command, environment, after):
    """The calls of an unharmed run, in their order, from the first line "GENERATION NAME PATH" on that
    matches `after`."""
    names = {number: name for name, number in _numbers().items()}
    done = subprocess.run([INJECTOR, "list", *command], env=environment, check=False, stdin=subprocess.DEVNULL,
                          stdout=subprocess.PIPE, text=True, errors="replace", timeout=600)
    counts, calls, on = collections.Counter(), [], False
    for line in done.stdout.splitlines():
        if not (match := re.match(r"(\d+) (\d+)(.*)", line)):
            continue
        generation, name = int(match[1]), names.get(int(match[2]), match[2])
        counts[generation, name] += 1
        on = on or re.search(after, f"{generation} {name}{match[3]}") is not None
        if on:
            calls.append(Call(name, counts[generation, name], generation))
    return calls


def always(traces):
    """The calls that every one of several runs makes: how often a host asks for its child, or the C library
    for random numbers, depends on the moment."""
    others = [set(trace) for trace in traces[1:]]
    return [call for call in traces[0] if all(call in other for other in others)]


def kills(calls, fault="SIGKILL"):
    return [Case(call, fault, nth, False, generation) for call, nth, generation in calls]


def errors(calls, lasting=False):
    """A lasting EINTR is left out: nothing can end a loop that goes on after it."""
    if unknown := sorted({call.call for call in calls} - ERRORS.keys() - CANNOT_FAIL):
        raise UnknownCall(f"of these calls nobody has said how they fail: {' '.join(unknown)}")
    return [Case(call, error, nth, lasting, generation) for call, nth, generation in calls
            for error in ERRORS.get(call, "").split() if not (lasting and error == "EINTR")]


def injection(case):
    """What goes in front of a command, which then prints "hit" when the fault has come."""
    how = {"SIGKILL": "kill", POWER_CUT: "cut", SWAP: "swap"}.get(case.fault) or str(getattr(errno, case.fault))
    return [INJECTOR, "hit", str(case.generation), str(number_of(case.call)),
            f"{case.nth}{'+' if case.lasting else ''}", how]


def run_with(case, command, environment, limit=30):
    """The command's exit code under the fault; -9 and the like for a signal, "hang" past the limit, also
    when a process of the command's does not end."""
    process = subprocess.Popen([*injection(case), *command], env=environment, start_new_session=True,
                               stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.DEVNULL)
    try:
        output, _ = process.communicate(timeout=limit)
    except subprocess.TimeoutExpired:
        os.killpg(process.pid, signal.SIGKILL)
        process.wait()
        return "hang"
    if b"hit" not in output:
        raise NotHit("the fault never came")
    return process.returncode


def where_it_comes(case, attempt, may_be_earlier=False):
    """attempt(case); when the fault does not come, with earlier calls of the name, if `may_be_earlier` or if they
    are for memory."""
    if not (may_be_earlier or case.call in FOR_MEMORY):
        return attempt(case)
    for nth in (case.nth, case.nth // 2, case.nth // 4):
        try:
            return attempt(case._replace(nth=max(1, nth)))
        except NotHit:
            pass
    raise NotHit("the fault never came, nor did an earlier one")


def judge_all(cases, judge, workers=2):
    """Calls judge(case, worker) for each; what is wrong with the outcomes: (case, text) for each bad one.
    A case that cannot be judged is bad. `worker` is a number from 0 below `workers`; no two calls at one
    time have the same."""
    free = list(range(workers))
    lock = threading.Lock()

    def one(case):
        with lock:
            worker = free.pop()
        try:
            return judge(case, worker)
        except Exception as failure:  # whatever it is, the other cases are to be tried
            return f"{type(failure).__name__}: {failure}"
        finally:
            with lock:
                free.append(worker)

    with concurrent.futures.ThreadPoolExecutor(workers) as pool:
        return [(case, text) for case, text in zip(cases, pool.map(one, cases)) if text]


def run_row(make, found, directory, is_full):
    """The number of cases of a row, and the bad ones. A row that cannot be run is a bad case itself, so that the
    others have their turn."""
    try:
        return make(found, directory, is_full)
    except (Exception, SystemExit) as failure:
        traceback.print_exc()
        return 0, [("the row", f"could not be run: {type(failure).__name__}: {failure}")]
