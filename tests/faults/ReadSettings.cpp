// Reads the settings file of a device image while others save it, and looks that it is whole each
// time.
//   fault_reader IMAGE OLD N   at least N times, and until the standard input is closed
// Prints "enough" when it has read so many times; then, at the end, how often it has read, and
// how often that was another file.
// OLD is a copy of the file as it was first. A whole file has its bytes, or those that the writer
// makes of the same accounts, in which "Count" may differ. The exit code is 0, or 1 when one was
// not whole. The output is how often the file was read, and how many times it was another one.
#include <fcntl.h>
#include <poll.h>
#include <unistd.h>

#include <array>
#include <cstdio>
#include <cstdlib>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "propertylist/Reading.h"
#include "propertylist/Writing.h"

namespace {

using propertylist::Array;
using propertylist::Bytes;
using propertylist::Dictionary;
using propertylist::Value;

constexpr const char* kSettings =
    "/var/mobile/Library/Preferences/com.vantor.accountsettings.plist";

// With one call of open: a file that is replaced meanwhile stays the one that was opened.
std::optional<Bytes> bytesOf(const std::string& path) {
  const int descriptor = open(path.c_str(), O_RDONLY | O_CLOEXEC);
  if (descriptor < 0) return std::nullopt;
  Bytes bytes;
  std::array<std::uint8_t, 65536> buffer;
  ssize_t count = 0;
  while ((count = read(descriptor, buffer.data(), buffer.size())) > 0)
    bytes.insert(bytes.end(), buffer.begin(), buffer.begin() + count);
  close(descriptor);
  return count == 0 ? std::optional(bytes) : std::nullopt;
}

// The settings without what savers count; empty when they are of another form.
std::optional<Value> withoutCounts(const std::optional<Value>& settings) {
  const Dictionary* const root = settings ? settings->asDictionary() : nullptr;
  const Value* const accounts = root != nullptr ? root->find("Accounts") : nullptr;
  if (accounts == nullptr || accounts->asArray() == nullptr) return std::nullopt;
  std::vector<Value> left;
  for (const Value& entry : *accounts->asArray()) {
    if (entry.asDictionary() == nullptr) return std::nullopt;
    Dictionary account = *entry.asDictionary();
    account.remove("Count");
    left.emplace_back(account);
  }
  return Value(Array(std::move(left)));
}

class Judge {
 public:
  explicit Judge(Bytes old) : _old(std::move(old)), _accounts(_accountsOf(_old)), _last(_old) {}

  long changes() const { return _changes; }
  bool isWhole(const Bytes& bytes) {
    if (bytes == _last) return true;
    ++_changes;
    _last = bytes;
    const propertylist::ReadResult read = propertylist::readPropertyList(bytes);
    return read.value && propertylist::writeBinaryPropertyList(*read.value) == bytes && _accounts &&
           withoutCounts(read.value) == _accounts;
  }
  bool isWhole(const propertylist::FileReadResult& read) const {
    return read.value && _accounts && withoutCounts(read.value) == _accounts;
  }

 private:
  static std::optional<Value> _accountsOf(const Bytes& bytes) {
    return withoutCounts(propertylist::readPropertyList(bytes).value);
  }

  const Bytes _old;
  const std::optional<Value> _accounts;
  Bytes _last;
  long _changes = 0;
};

bool isInputClosed() {
  pollfd input = {STDIN_FILENO, POLLIN, 0};
  return poll(&input, 1, 0) != 0;
}

}  // namespace

int main(int count, char** arguments) {
  if (count != 4) return 2;
  const std::string path = arguments[1] + std::string(kSettings);
  const std::optional<Bytes> old = bytesOf(arguments[2]);
  if (!old) return 2;
  Judge judge(*old);
  const long wanted = std::atol(arguments[3]);
  long reads = 0;
  for (; reads < wanted || !isInputClosed(); reads += 2) {
    const std::optional<Bytes> bytes = bytesOf(path);
    // The library's own reading, which may meet the next file already.
    if (!bytes || !judge.isWhole(*bytes) ||
        !judge.isWhole(propertylist::readPropertyListFile(path)))
      return 1;
    if (reads < wanted && reads + 2 >= wanted) {
      std::printf("enough\n");
      std::fflush(stdout);
    }
  }
  std::printf("%ld %ld\n", reads, judge.changes());
  return 0;
}
