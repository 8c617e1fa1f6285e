// Reads property lists that are damaged in every small way, and looks that each is a value or an
// error within the reader's limits.
//
//   fault_lists odd-files             the malformed and odd files of tests/data, as they are
//   fault_lists every-change [PART]   every prefix of 20 good files, and each of their bytes
//   changed
//                                     into every other; PART 0 or 1 takes every second file
//   fault_lists bit-flips [PART]      the same with one bit of each byte changed
//
// The reading is done by a child process, so that a crash, a hang or an allocation without end is a
// bad case like any other: the parent notes it and has another child go on behind it. Prints each
// bad case and the number of cases; the exit code is 1 when one was bad.
#include <malloc.h>
#include <sys/mman.h>
#include <sys/time.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <bit>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <iterator>
#include <new>
#include <span>
#include <string>
#include <vector>

#include "fuzz/WrittenLists.h"
#include "tests/propertylist/SmallStack.h"

namespace {

using namespace propertylist;

constexpr std::size_t kMostMemory = std::size_t{64} << 20U;  // at any moment of one case
constexpr int kMostBad = 20;                                 // after that the rest is not tried

// 20 files of both forms, every kind of value and three versions of the settings.
const std::vector<std::string> kGoodFiles = {
    "settings/version-5-xml.plist",
    "settings/version-9-binary.plist",
    "settings/version-12-binary.plist",
    "propertylists/values-0005.xml.plist",
    "propertylists/values-0005.binary.plist",
    "propertylists/values-0013.xml.plist",
    "propertylists/values-0013.binary.plist",
    "propertylists/values-0014.xml.plist",
    "propertylists/values-0014.binary.plist",
    "propertylists/values-0002.xml.plist",
    "propertylists/values-0002.binary.plist",
    "propertylists/values-0006.xml.plist",
    "propertylists/values-0006.binary.plist",
    "propertylists/values-0010.xml.plist",
    "propertylists/values-0010.binary.plist",
    "malformed/b03_settings_file.plist",
    "malformed/b04_wide_sizes.plist",
    "malformed/b06_long_form_counts.plist",
    "malformed/x01_valid.plist",
    "malformed/x06_cdata.plist",
};

enum class Damage { none, bitFlips, everyChange };

std::atomic<std::size_t> allocated = 0;
std::atomic<std::size_t> allocatedBefore = 0;  // this case

void* allocate(std::size_t size) {
  void* const memory = std::malloc(size == 0 ? 1 : size);
  if (memory == nullptr) std::abort();
  const std::size_t now = allocated += ::malloc_usable_size(memory);
  if (now > allocatedBefore + kMostMemory) {
    std::fputs("more than 64 MiB are allocated\n", stderr);
    std::abort();
  }
  return memory;
}

void release(void* memory) {
  allocated -= ::malloc_usable_size(memory);  // of nothing it is 0
  std::free(memory);
}

// Where the child is, for the parent to see after its death.
struct Progress {
  std::size_t cases;  // behind it
  char name[200];
};

struct SourceFile {
  std::string name;
  Bytes bytes;
};

struct Size {
  std::size_t depth = 0;
  std::size_t values = 1;
};

// What the value expands to; it is known to be no deeper than the small stack allows.
Size sizeOf(const Value& value) {
  Size size;
  const auto add = [&size](const Value& member) {
    const Size inner = sizeOf(member);
    size.depth = std::max(size.depth, inner.depth);
    size.values += inner.values;
  };
  const Array* const array = value.asArray();
  const Dictionary* const dictionary = value.asDictionary();
  if (array == nullptr && dictionary == nullptr) return size;
  if (array != nullptr) {
    for (const Value& member : *array) add(member);
  } else {
    for (const Dictionary::Entry& entry : *dictionary) add(entry.value());
  }
  ++size.depth;
  return size;
}

// Ends the process when reading the bytes breaks a promise.
void tryBytes(std::span<const std::uint8_t> bytes) {
  const ReadResult result = readPropertyList(bytes);
  FUZZ_CHECK(result.value.has_value() == result.error.what.empty());
  if (!result.value) {
    FUZZ_CHECK(result.error.byteOffset.has_value() != result.error.line.has_value());
    FUZZ_CHECK(result.error.byteOffset.value_or(0) <= bytes.size());
    FUZZ_CHECK(result.error.line.value_or(0) <= bytes.size() + 1);
    return;
  }
  const Size size = sizeOf(*result.value);
  FUZZ_CHECK(size.depth <= 512);
  FUZZ_CHECK(size.values <= std::max<std::size_t>(1'000'000, bytes.size()));
  fuzz::checkBinaryForm(*result.value);
}

// Walks over every case; those before `first` are counted and not tried.
class Cases {
 public:
  Cases(Progress& progress, std::size_t first) : _progress(progress), _first(first) {}

  void of(const SourceFile& file, Damage damage) {
    if (damage == Damage::none) return _try(file.bytes, file.name, "as it is", 0, 0);
    for (std::size_t size = 0; size < file.bytes.size(); ++size)
      _try(std::span(file.bytes).first(size), file.name, "cut to", size, 0);
    Bytes bytes = file.bytes;
    for (std::size_t at = 0; at < bytes.size(); ++at) {
      for (unsigned change = 1; change < 256; ++change) {
        if (damage == Damage::bitFlips && !std::has_single_bit(change)) continue;
        bytes[at] = static_cast<std::uint8_t>(file.bytes[at] ^ change);
        _try(bytes, file.name, "byte", at, bytes[at]);
      }
      bytes[at] = file.bytes[at];
    }
  }

 private:
  void _try(std::span<const std::uint8_t> bytes, const std::string& file, const char* what,
            std::size_t at, unsigned value) {
    if (_count++ < _first) return;
    std::snprintf(_progress.name, sizeof _progress.name, "%s: %s %zu %u",
                  file.substr(0, 120).c_str(), what, at, value);
    _progress.cases = _count;
    allocatedBefore = allocated.load();
    const itimerval second{{0, 0}, {1, 0}};
    ::setitimer(ITIMER_PROF, &second, nullptr);  // SIGPROF ends a process that does not expect it
    tryBytes(bytes);
  }

  Progress& _progress;
  std::size_t _first;
  std::size_t _count = 0;
};

[[noreturn]] void readAll(const std::vector<SourceFile>& files, Damage damage, Progress& progress) {
  Cases cases(progress, progress.cases);
  runOnSmallStack([&] {
    for (const SourceFile& file : files) cases.of(file, damage);
  });
  std::_Exit(0);
}

SourceFile readFile(const std::filesystem::path& path) {
  std::ifstream file(path, std::fstream::binary);
  if (!file) throw std::runtime_error("cannot read " + path.string());
  return {path.filename().string(),
          Bytes(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>())};
}

std::vector<SourceFile> goodFiles(const std::string& part) {
  std::vector<SourceFile> files;
  for (std::size_t i = 0; i < kGoodFiles.size(); ++i) {
    if (part.empty() || part == std::to_string(i % 2))
      files.push_back(readFile(std::filesystem::path(TEST_DATA_DIR) / kGoodFiles[i]));
  }
  return files;
}

std::vector<SourceFile> oddFiles() {
  std::vector<SourceFile> files;
  for (const char* const folder : {TEST_DATA_DIR "/malformed", ODD_LISTS}) {
    for (const auto& entry : std::filesystem::directory_iterator(folder))
      files.push_back(readFile(entry.path()));
  }
  return files;
}

int tryAll(const std::vector<SourceFile>& files, Damage damage) {
  void* const page =
      ::mmap(nullptr, sizeof(Progress), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
  if (page == MAP_FAILED) throw std::bad_alloc();
  auto& progress = *new (page) Progress{};
  int bad = 0;
  while (bad < kMostBad) {
    const pid_t child = ::fork();
    if (child == 0) readAll(files, damage, progress);
    int status = 0;
    if (child < 0 || ::waitpid(child, &status, 0) != child) throw std::runtime_error("no child");
    if (status == 0) break;
    ++bad;
    std::cout << "bad " << progress.name << ": "
              << (WIFSIGNALED(status) ? ::strsignal(WTERMSIG(status)) : "the process ended")
              << std::endl;
  }
  std::cout << progress.cases << " cases" << std::endl;
  return bad > 0 ? 1 : 0;
}

}  // namespace

void* operator new(std::size_t size) { return allocate(size); }
void* operator new[](std::size_t size) { return allocate(size); }
void* operator new(std::size_t size, const std::nothrow_t&) noexcept { return allocate(size); }
void* operator new[](std::size_t size, const std::nothrow_t&) noexcept { return allocate(size); }
void operator delete(void* memory) noexcept { release(memory); }
void operator delete[](void* memory) noexcept { release(memory); }
void operator delete(void* memory, std::size_t) noexcept { release(memory); }
void operator delete[](void* memory, std::size_t) noexcept { release(memory); }

int main(int count, char** arguments) {
  const std::string mode = count > 1 ? arguments[1] : "";
  const std::string part = count > 2 ? arguments[2] : "";
  if (mode == "odd-files") return tryAll(oddFiles(), Damage::none);
  if (mode == "bit-flips") return tryAll(goodFiles(part), Damage::bitFlips);
  if (mode == "every-change") return tryAll(goodFiles(part), Damage::everyChange);
  std::cerr << "usage: fault_lists odd-files | every-change [0|1] | bit-flips [0|1]\n";
  return 2;
}
