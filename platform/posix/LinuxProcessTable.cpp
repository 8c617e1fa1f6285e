#include "platform/posix/LinuxProcessTable.h"

#include <dirent.h>
#include <fcntl.h>
#include <signal.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <charconv>
#include <memory>
#include <optional>
#include <string_view>
#include <vector>

#include "platform/posix/SystemError.h"

namespace platform {
namespace {

constexpr const char* kProcesses = "/proc";
constexpr std::size_t kLongestName = 16;
constexpr std::size_t kRoomToGrow = 64;
constexpr std::string_view kDeletedMark = " (deleted)";

// The numbers among the names of a directory; the errno when it cannot be listed.
int listIdentifiers(const char* path, std::vector<pid_t>& identifiers) {
  const std::unique_ptr<DIR, int (*)(DIR*)> directory(::opendir(path), ::closedir);
  if (!directory) return errno;
  for (;;) {
    errno = 0;
    const dirent* const entry = ::readdir(directory.get());
    if (entry == nullptr) return errno;
    const std::string_view name = entry->d_name;
    pid_t identifier = 0;
    const auto parsed = std::from_chars(name.data(), name.data() + name.size(), identifier);
    if (parsed.ec == std::errc() && parsed.ptr == name.data() + name.size())
      identifiers.push_back(identifier);
  }
}

std::string pathOf(pid_t process, std::string_view name) {
  return std::string(kProcesses) + "/" + std::to_string(process) + "/" + std::string(name);
}

// The beginning of a file of the process, as much as is looked at; empty when it is gone.
std::string beginningOf(pid_t process, const char* name) {
  const int file = ::open(pathOf(process, name).c_str(), O_RDONLY | O_CLOEXEC);
  if (file < 0) return {};
  std::array<char, 4096> bytes{};
  const ssize_t count = ::read(file, bytes.data(), bytes.size());
  ::close(file);
  return {bytes.data(), count > 0 ? static_cast<std::size_t>(count) : 0};
}

// The path of the executable that `link` of the process leads to; empty when it is not shown to the
// caller, or there is none.
std::string executableOf(pid_t process, const std::string& link) {
  std::array<char, 4096> target{};
  const ssize_t length = ::readlink(pathOf(process, link).c_str(), target.data(), target.size());
  std::string path(target.data(), length > 0 ? static_cast<std::size_t>(length) : 0);
  if (path.ends_with(kDeletedMark)) path.resize(path.size() - kDeletedMark.size());
  return path;
}

struct State {
  char letter = 0;
  std::uint64_t startTime = 0;
  std::string_view shortName;  // the kernel's own
};

// Takes the line of /proc/*/stat apart, whose second field is a name in parentheses that may hold
// anything. The third field is the state, the 22nd the time of the start.
std::optional<State> stateIn(std::string_view line) {
  constexpr int kFieldsToStartTime = 19;  // from the state on
  const std::size_t open = line.find('(');
  const std::size_t close = line.rfind(')');
  if (open == std::string_view::npos || close == std::string_view::npos || close < open ||
      close + 2 >= line.size())
    return std::nullopt;
  State state;
  state.shortName = line.substr(open + 1, close - open - 1);
  std::string_view rest = line.substr(close + 2);
  state.letter = rest.front();
  for (int field = 0; field < kFieldsToStartTime; ++field) {
    const std::size_t blank = rest.find(' ');
    if (blank == std::string_view::npos) return std::nullopt;
    rest.remove_prefix(blank + 1);
  }
  const auto parsed = std::from_chars(rest.data(), rest.data() + rest.size(), state.startTime);
  if (parsed.ec != std::errc()) return std::nullopt;
  return state;
}

// Where /proc/PROCESS tells the executable; empty when the process has ended. One whose first
// thread alone has ended looks as if it had, and another of its threads has to be asked.
std::string executableLink(pid_t process, const State& state) {
  if (state.letter != 'Z' && state.letter != 'X') return "exe";
  std::vector<pid_t> threads;
  listIdentifiers(pathOf(process, "task").c_str(), threads);
  const auto other =
      std::find_if(threads.begin(), threads.end(), [&](pid_t thread) { return thread != process; });
  return other == threads.end() ? std::string() : "task/" + std::to_string(*other) + "/exe";
}

std::string fileName(std::string_view path) {
  return std::string(path.substr(path.rfind('/') + 1)).substr(0, kLongestName);
}

std::string commandName(pid_t process, const std::string& executable, const State& state) {
  if (!executable.empty()) return fileName(executable);
  const std::string arguments = beginningOf(process, "cmdline");
  const std::string first = arguments.substr(0, arguments.find('\0'));
  return first.empty() ? std::string(state.shortName) : fileName(first);
}

bool liesBelow(const std::string& path, const std::string& directory) {
  if (directory.empty()) return true;
  if (directory == "/") return !path.empty();
  return path.size() > directory.size() && path.starts_with(directory) &&
         path[directory.size()] == '/';
}

// Kernels before 5.3, and some sandboxes, have no descriptors of processes.
bool hasNoDescriptors(int error) { return error == ENOSYS || error == EPERM; }

}  // namespace

ProcessTable::Sized LinuxProcessTable::sizeOfTable() {
  std::vector<pid_t> identifiers;
  if (const int error = listIdentifiers(kProcesses, identifiers); error != 0)
    return {systemFailure(error, "list", kProcesses), 0};
  return {Status::success(), identifiers.size() + kRoomToGrow};
}

ProcessTable::Filled LinuxProcessTable::fillTable(std::size_t capacity) {
  std::vector<pid_t> identifiers;
  if (const int error = listIdentifiers(kProcesses, identifiers); error != 0)
    return {systemFailure(error, "list", kProcesses), {}};
  std::sort(identifiers.begin(), identifiers.end());
  Filled filled;
  std::map<pid_t, std::uint64_t> startTimes;
  for (const pid_t process : identifiers) {
    const std::string line = beginningOf(process, "stat");
    const std::optional<State> state = stateIn(line);
    const std::string link = state ? executableLink(process, *state) : std::string();
    if (link.empty()) continue;  // gone since it was listed
    const std::string executable = executableOf(process, link);
    if (!liesBelow(executable, _directory)) continue;
    if (filled.processes.size() == capacity)
      return {Status::failure(ENOMEM, "the table of processes has grown past the room for it"), {}};
    filled.processes.push_back({process, commandName(process, executable, *state)});
    startTimes[process] = state->startTime;
  }
  const std::lock_guard guard(_mutex);
  _startTimes = std::move(startTimes);
  return filled;
}

pid_t LinuxProcessTable::ownProcessIdentifier() { return ::getpid(); }

Status LinuxProcessTable::sendSignal(pid_t process, int signal) {
  const auto failure = [&](int error) {
    return systemFailure(error, "signal", "process " + std::to_string(process));
  };
  if (process < 1) return failure(ESRCH);  // to kill(2) those are groups, to pidfd_open none
  // The descriptor stays with the process that has the number now; whether that is the one that was
  // listed is looked at with the descriptor in hand.
  const auto opened = static_cast<int>(::syscall(SYS_pidfd_open, process, 0U));
  if (opened < 0 && !hasNoDescriptors(errno)) return failure(errno);
  const std::unique_ptr<const int, void (*)(const int*)> descriptor(&opened, [](const int* number) {
    if (*number >= 0) ::close(*number);
  });
  {
    const std::lock_guard guard(_mutex);
    const auto listed = _startTimes.find(process);
    const std::string line = beginningOf(process, "stat");
    const std::optional<State> state = stateIn(line);
    if (listed == _startTimes.end() || !state || state->startTime != listed->second)
      return failure(ESRCH);
  }
  const long sent = opened >= 0 ? ::syscall(SYS_pidfd_send_signal, opened, signal, nullptr, 0U)
                                : ::kill(process, signal);
  return sent == 0 ? Status::success() : failure(errno);
}

}  // namespace platform
