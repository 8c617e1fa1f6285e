"""Turns each conditional jump of a source file, once into an unconditional one and once into none, and looks
whether tests notice: row Q2 of docs/reliability.md.

The file is compiled without optimisation to assembly, where a line table leads from each jump to its source
line; so a mutant costs an assembling and a linking. It is linked into what the ordinary build links it into.
"""

import collections
import concurrent.futures
import json
import os
import re
import shlex
import subprocess

JUMP = re.compile(r"^(\s+)j(?!mp)[a-z]+(\s+)(\.L\w+)")
FILE = re.compile(r'\s+\.file\s+(\d+)\s+(?:"[^"]*"\s+)?"([^"]*)"')
LINE = re.compile(r"\s+\.loc\s+(\d+)\s+(\d+)")
LANDING = re.compile(r"\s+\.uleb128 (\.L\d+)-\.LFB\d+$")
DESTRUCTOR = re.compile(r"\s+call\s+\S*D[012]Ev(@PLT)?$")
LIMIT = 15  # seconds of processor time of one test run; a mutant that takes longer is noticed

Mutant = collections.namedtuple("Mutant", "index line always")


class Program:
    """How a build links a test program or library, and the tests that look at it.

    `pattern` matches the file of the build folder, `tests` is a list of commands in which {program} stands for the
    test program; a library is found by its program through its folder."""

    def __init__(self, build, pattern, tests):
        self.build, self.tests = build, tests
        self.output = output = str(next(build.glob(pattern)).relative_to(build))
        commands = subprocess.run(["ninja", "-t", "commands", output], cwd=build, check=True,
                                  stdout=subprocess.PIPE, text=True).stdout.splitlines()
        parts = [part for part in commands[-1].split(" && ") if f"-o {output}" in part]
        if len(parts) != 1:
            raise SystemExit(f"no one command links {output}")
        self.command = shlex.split(parts[0])

    def link(self, objects, place, *further):
        """Links with the objects, {source: object}, in place of what was made of these sources, and with further
        options of the linker."""
        names = [word.rsplit(",", 1)[1] for word in self.command if word.startswith("-Wl,-soname,")]
        made = os.path.join(place, (names or [os.path.basename(self.output)])[0])
        replaced = tuple(f"/{os.path.basename(source)}.o" for source in objects)
        command = [word for word in self.command if not word.endswith(replaced)]
        command[command.index(self.output)] = made
        command[1:1] = [*further, *objects.values()]  # before others that have the same inline functions
        return made if run(command, self.build) == 0 else None

    def notices(self, made):
        environment = {**os.environ, "LD_LIBRARY_PATH": os.path.dirname(made)}
        return any(run(["prlimit", f"--cpu={LIMIT}", *(word.replace("{program}", made) for word in test)],
                       self.build, environment) != 0 for test in self.tests)


def library(name):
    """The pattern of the file of a shared library."""
    return f"lib/libaccount-retirement-{name}.so.*.*.*"


def run(command, directory, environment=None):
    """The exit code. One that waits for ever ends, too; on a machine with other work that takes its time."""
    try:
        return subprocess.run(command, cwd=directory, env=environment, timeout=20 * LIMIT, check=False,
                              stdin=subprocess.DEVNULL, stdout=subprocess.DEVNULL,
                              stderr=subprocess.DEVNULL).returncode
    except subprocess.TimeoutExpired:
        return "timeout"


def compiling(build, source, output):
    """How the build compiles the source, to another file; the source is the last word."""
    entries = json.loads((build / "compile_commands.json").read_text(encoding="utf-8"))
    entry = next(entry for entry in entries if entry["file"].endswith("/" + source))
    command = [word for word in shlex.split(entry["command"]) if os.path.basename(word) != "ccache"]
    command[command.index("-o") + 1] = output
    return command


def assembly_of(build, source, place):
    text = os.path.join(place, "whole.s")
    command = compiling(build, source, text)
    if run([*command, "-O0", "-g", "-D_GLIBCXX_ASSERTIONS", "-S"], build) != 0:
        raise SystemExit(f"{source} does not compile")
    with open(text, encoding="utf-8") as lines:
        return command[0], lines.read().split("\n")


def skips_a_destructor(lines, index):
    """Whether the jump only passes over the destruction of a temporary, which is no branch of the source."""
    label = JUMP.match(lines[index])[3] + ":"
    calls = []
    for line in lines[index + 1:index + 12]:
        if line == label or re.match(r"\s+jmp\s", line):
            return len(calls) == 1 and DESTRUCTOR.match(calls[0]) is not None
        if re.match(r"\s+(call|j)", line):
            calls.append(line)
    return False


def mutants_of(lines, source):
    """Two for each jump of the source, those left out that only an exception or a destruction comes to."""
    landings = {match[1] + ":" for line in lines if (match := LANDING.match(line))}
    files, where, is_landing, mutants = {}, None, False, []
    for index, line in enumerate(lines):
        if line in landings:
            is_landing = True
        elif re.match(r"\s+(jmp|\.cfi_endproc|call\s+_Unwind_Resume)", line):
            is_landing = False
        elif match := FILE.match(line):
            files[match[1]] = os.path.basename(match[2])
        elif match := LINE.match(line):
            where = int(match[2]) if files.get(match[1]) == os.path.basename(source) else None
        elif where and not is_landing and JUMP.match(line) and not skips_a_destructor(lines, index):
            mutants += [Mutant(index, where, True), Mutant(index, where, False)]
    return mutants


def noticed(compiler, lines, mutant, program, source, place):
    """None when the mutant cannot be built."""
    mutated = list(lines)
    if mutant:
        mutated[mutant.index] = JUMP.sub(r"\1jmp\2\3", lines[mutant.index]) if mutant.always else ""
    os.makedirs(place, exist_ok=True)
    text, ours = os.path.join(place, "mutant.s"), os.path.join(place, "mutant.o")
    with open(text, "w", encoding="utf-8") as output:
        output.write("\n".join(mutated))
    made = program.link({source: ours}, place) if run([compiler, "-c", "-o", ours, text], place) == 0 else None
    return program.notices(made) if made else None


def survivors(source, program, directory, workers=2):
    """How many mutants of the source were tried, and those that no test noticed, as "line 12 always"."""
    os.makedirs(directory)
    compiler, lines = assembly_of(program.build, source, str(directory))
    if noticed(compiler, lines, None, program, source, str(directory / "unchanged")) is not False:
        raise SystemExit(f"{source}: the tests fail without a change")
    mutants = mutants_of(lines, source)

    def one(number):
        place = str(directory / f"{number}")
        try:
            return noticed(compiler, lines, mutants[number], program, source, place)
        finally:
            subprocess.run(["rm", "-rf", place], check=False)

    with concurrent.futures.ThreadPoolExecutor(workers) as pool:
        results = list(pool.map(one, range(len(mutants))))
    if None in results:
        raise SystemExit(f"{source}: {results.count(None)} mutants cannot be built")
    left = [f"line {mutant.line} {'always' if mutant.always else 'never'}"
            for mutant, result in zip(mutants, results) if result is False]
    return len(results), left
