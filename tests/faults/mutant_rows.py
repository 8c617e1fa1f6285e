"""Whether the tests notice mutants of the merge, the save and the readers: row Q2 of docs/reliability.md."""

import os
import pathlib
import subprocess

import branch_mutants

TOP = pathlib.Path(__file__).resolve().parents[2]
BUILD = pathlib.Path(os.environ.get("BUILD", TOP / "build/release"))
STORE = ["QuillnetAccountTypeRemoval/ASSAccountsManagerSaving.cpp",
         "QuillnetAccountTypeRemoval/SettingsFileWriting.cpp"]
READERS = ["propertylist/BinaryReader.cpp", "propertylist/BinaryReaderValues.cpp", "propertylist/XMLReader.cpp",
           "propertylist/XMLScanner.cpp"]
STORE_SUITES = "Merge.*:Saving*:SettingsFile*:*Fixers*:Malformed*"
# What notices most comes first.
BINARY_SUITES, XML_SUITES = "Binary*:LargeLists*", "XML*:LargeLists*"
READER_SUITES = "*Binary*:*XML*:*Files*:*Reading*:LargeLists*:NestedValues*"
# Mutants that are the same program, with how many there are of the kind in such lines.
SAME = {
    # What both have and memory has changed is in the result already, and would come again with the same value.
    ("if (onDisk.contains(now.key())) continue;", "never"): 1,
    # The whole merge gives the same where one side has not changed, and what traces asks whether it is to.
    ("if (inMemory.sharesStorageWith(original)) return onDisk;", "always"): 1,
    ("if (onDisk.sharesStorageWith(original)) return inMemory;", "always"): 1,
    ('if (getASLoggingEnabled()) ASLog("%@:%@", account->type(), result);', "never"): 1,
    # A file that could not be made has no descriptor.
    ("if (_isThere) _descriptor = opened.descriptor;", "never"): 1,
    # What is no letter and begins no name does not continue one either.
    ("return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_' || c == ':' || byte >= 0x80;", "always"): 2,
    # Words, blocks and single bytes give the same; so does a tag that is read whole. Only time is lost.
    ("for (std::uint64_t word = 0; kFirstIsLowest && text.size() - from >= sizeof word;", "never"): 1,
    ("if (left >= kBlock && isPlain(next, kBlock)) {", "always"): 3,
    ("} else if (left >= kPart && isPlain(next, kPart)) {", "always"): 3,
    # What is at a tag is at no comment either, and its text stands in the document.
    ("if (_isAtTag()) return true;", "always"): 1,
    ("if (_isAtTag()) return true;  // as most are", "always"): 1,
    ("return _text.size() - _at >= 2 && _text[_at] == '<' && _text[_at + 1] != '!' &&", "always"): 4,
    ('const bool isThere = rest.size() >= size && rest.starts_with("</") && rest[size - 1] == \'>\' &&', "always"): 4,
    ("if (_wide.size() < count * kMostForAUnit) _wide.resize(count * kMostForAUnit);", "never"): 1,
    ("if (known == pair) return true;", "always"): 1,
    # Keys are sorted in one of two ways, also where they are in their order already; arrays have none.
    ("if (Arena::textOf(text).size() > kLongKey) step.hasLongKey = true;", "always"): 1,
    ("if (Arena::textOf(text).size() > kLongKey) step.hasLongKey = true;", "never"): 1,
    ("if (previous != nullptr && step.isAscending && !step.hasLongKey)", "never"): 1,
    ("if (closed.object->kind == Kind::dictionary) _sortDictionary(closed);", "never"): 1,
    ("if (Arena::textOf(a.raw()) >= Arena::textOf(b.raw())) return false;", "never"): 1,
    ("if (key.size() > kLongKey) keys.push_back(&key);", "never"): 1,
    ("const bool areLong = a.text.size() > kLongKey && b.text.size() > kLongKey;", "always"): 2,
    ("return areLong ? ranks.at(&a.text) < ranks.at(&b.text) : a.text < b.text;", "always"): 1,
    ("isAscending = isAscending && (i == first || Arena::textOf(_members[i - 1].key) <", "always"): 2,
    # What has just been made or closed is followed, or refused, once more; a leaf counts as a container of one.
    ("} else if (!_close()) {", "always"): 1,
    ("if (_way.size() > containers) return true;  // `step` is gone; it goes on when that is closed", "never"): 1,
    ("if (_way.empty()) return true;", "never"): 1,
    ("if (member->isContainer()) {", "never"): 1,
    # That a container is shared saves time when it is compared or counted; of leaves nothing is noted.
    ("} else if (member->isContainer()) {", "always"): 1,
    ("} else if (member->isContainer()) {", "never"): 1,
    # A return in the last bytes of a document is in a text without an end.
    ("bool isSpecial(char c) { return c == '<' || c == '&' || c == ']' || c == '\\r'; }", "always"): 1,
    # Comparisons with which a switch finds its way; the tests try all 256 bytes.
    ("switch (header.marker & 0xF0U) {", "never"): 3,
    # A failure is false either way.
    ('isGood = !_isAt("]]>") || fail("the end of a section that has no beginning");', "always"): 1,
    ('return encoding == "utf-8" || encoding == "us-ascii" || fail("an encoding other than UTF-8");', "always"): 1,
    ('return _accept(">") || fail("a document type that is not well formed");', "always"): 1,
    ('return _scanner.isAtEnd() || _scanner.fail("something behind the property list");', "always"): 1,
    ('return end->name == tag.name || _scanner.fail(*end, "an end tag that does not fit");', "always"): 1,
    # The first failure stays, and the place is not the end.
    ("if (!_scanner.skipBlanks()) return false;", "always"): 1,
    # There is a value at the top only when nothing is open, and an empty element can be closed.
    ('if (_open.empty() && _top) return _scanner.fail(tag, "more than one value");', "never"): 1,
    ("return !tag.isEmpty || _close(tag);", "never"): 1,
    # At the end of the document there is no more text or markup either.
    ("while (!isAtEnd()) {", "always"): 1,
    ("if (isAtEnd()) break;", "never"): 1,
    # What is outside of these bounds gives a digit above the base, and no digit gives a character that is none.
    ("if (c >= '0' && c <= '9') digit = static_cast<char32_t>(c - '0');", "never"): 1,
    ("if (c >= 'a' && c <= 'f') digit = static_cast<char32_t>(c - 'a' + 10);", "never"): 1,
    ("if (digits.empty() || !isXMLCharacter(codePoint)) {", "never"): 1,
}
# Per cent of the mutants; of the readers' a few more only cost time.
ENOUGH = {"propertylist": 95}


def tests_of(program, suites):
    """A command for each case, since much of the state under test is kept per process."""
    listed = subprocess.run([program, "--gtest_list_tests", f"--gtest_filter={suites}"], check=True,
                            stdout=subprocess.PIPE, text=True).stdout.splitlines()
    suite, commands = "", []
    for line in listed:
        if not line.startswith(" "):
            suite = line.split()[0] if line else suite
        else:
            commands.append(["{program}", f"--gtest_filter={suite}{line.split()[0]}"])
    return commands


def reader_program(source):
    suites = [BINARY_SUITES if "Binary" in source else XML_SUITES, READER_SUITES]
    test = str(BUILD / "bin/propertylist_test")
    return branch_mutants.Program(BUILD, branch_mutants.library("propertylist"), [
        *([test, "--gtest_fail_fast", f"--gtest_filter={names}"] for names in suites),
        [str(BUILD / "bin/fault_lists"), "odd-files"]])


def different(source, places):
    """The places without those of mutants that are the same program."""
    lines = (TOP / source).read_text(encoding="utf-8").splitlines()
    left, same = [], dict(SAME)
    for place in places:
        _, number, kind = place.split()
        mutant = lines[int(number) - 1].strip(), kind
        if same.get(mutant, 0) > 0:
            same[mutant] -= 1
        else:
            left.append(place)
    return left


def mutants(_found, directory, _is_full):
    store = branch_mutants.Program(
        BUILD, "bin/account_settings_test", tests_of(BUILD / "bin/account_settings_test", STORE_SUITES))
    total, bad = 0, []
    for source in [*STORE, *READERS]:
        program = store if source in STORE else reader_program(source)
        count, left = branch_mutants.survivors(source, program, directory / source.replace("/", "-"))
        left = different(source, left)
        score = 100 * (count - len(left)) / count
        print(f"     Q2 {source}: {count} mutants, {len(left)} not noticed, {score:.1f} %", flush=True)
        total += count
        if score < ENOUGH.get(source.split("/", maxsplit=1)[0], 100):
            bad += [(source, place) for place in left]
    return total, bad


ROWS = {"Q2": ("mutants of branches are noticed by the tests", mutants)}
