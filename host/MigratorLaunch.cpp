#include "host/MigratorLaunch.h"

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <string>
#include <vector>

#include "host/ChildProcess.h"

namespace host {
namespace {

constexpr const char* kThisProgram = "/proc/self/exe";

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
#define HOST_HAS_SHADOW_MEMORY 1
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
#define HOST_HAS_SHADOW_MEMORY 1
#endif
#endif
// A sanitizer reserves terabytes of address space for itself.
#ifdef HOST_HAS_SHADOW_MEMORY
constexpr rlim_t kAddressSpace = RLIM_INFINITY;
#else
constexpr rlim_t kAddressSpace = rlim_t{4} << 30U;  // bytes
#endif

// Nothing of the caller's own reaches a migrator; a sanitizer in it is told what to do.
std::vector<std::string> migratorEnvironment(const std::string& temporaryDirectory) {
  std::vector<std::string> environment = {"TMPDIR=" + temporaryDirectory};
#ifdef HOST_HAS_SHADOW_MEMORY
  for (const char* name : {"ASAN_OPTIONS", "LSAN_OPTIONS", "TSAN_OPTIONS", "UBSAN_OPTIONS"})
    if (const char* options = std::getenv(name))
      environment.push_back(std::string(name) + "=" + options);
#endif
  return environment;
}

std::vector<char*> pointersTo(std::vector<std::string>& strings) {
  std::vector<char*> pointers;
  pointers.reserve(strings.size() + 1);
  for (std::string& string : strings) pointers.push_back(string.data());
  pointers.push_back(nullptr);
  return pointers;
}

// From here to the new program only what is safe after a fork is called.
void lowerLimits() {
  const rlimit none = {0, 0};
  setrlimit(RLIMIT_CORE, &none);
  rlimit space = {};
  if (kAddressSpace == RLIM_INFINITY || getrlimit(RLIMIT_AS, &space) != 0) return;
  if (space.rlim_max == RLIM_INFINITY || space.rlim_max > kAddressSpace) {
    const rlimit limited = {kAddressSpace, kAddressSpace};
    setrlimit(RLIMIT_AS, &limited);
  }
}

void restoreSignals() {
  struct sigaction standard = {};
  standard.sa_handler = SIG_DFL;
  for (int number = 1; number < NSIG; ++number) sigaction(number, &standard, nullptr);
  sigset_t none;
  sigemptyset(&none);
  sigprocmask(SIG_SETMASK, &none, nullptr);
}

// What the new process finds as its descriptors 0 to 4: the null device, the output twice, the
// channel and the lock. All of them lie above 4, so that none is overwritten before its turn.
using Descriptors = std::array<int, kLockDescriptor + 1>;

bool arrangeDescriptors(const Descriptors& sources) {
  for (int target = 0; target <= kLockDescriptor; ++target)
    if (dup2(sources[static_cast<std::size_t>(target)], target) < 0) return false;
  return close_range(kLockDescriptor + 1, ~0U, 0) == 0;
}

[[noreturn]] void becomeMigrator(pid_t host, const Descriptors& descriptors, char* const* arguments,
                                 char* const* environment) {
  setsid();
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  if (getppid() != host) _exit(EXIT_FAILURE);  // the host has ended already
  umask(077);
  lowerLimits();
  if (arrangeDescriptors(descriptors)) {
    restoreSignals();
    execve(kThisProgram, arguments, environment);
  }
  sendMessage(kChannelDescriptor, MessageKind::notLoaded, "the host could not start itself anew");
  _exit(EXIT_FAILURE);
}

// The same descriptor above those that the new process needs for itself.
deviceimage::Descriptor movedUp(int descriptor) {
  return deviceimage::Descriptor(fcntl(descriptor, F_DUPFD_CLOEXEC, kLockDescriptor + 1));
}

}  // namespace

std::optional<LaunchedMigrator> launchMigrator(const MigratorTask& task) {
  std::optional<Channel> channel = makeChannel();
  int pipeEnds[2] = {-1, -1};
  if (!channel || pipe2(pipeEnds, O_CLOEXEC) != 0) return std::nullopt;
  LaunchedMigrator launched;
  launched.channel = std::move(channel->host);
  launched.output = deviceimage::Descriptor(pipeEnds[0]);
  const deviceimage::Descriptor pipeEnd(pipeEnds[1]);
  const deviceimage::Descriptor nullDevice(open("/dev/null", O_RDWR | O_CLOEXEC));
  const deviceimage::Descriptor null = movedUp(nullDevice.number());
  const deviceimage::Descriptor output = movedUp(pipeEnd.number());
  const deviceimage::Descriptor childChannel = movedUp(channel->child.number());
  const deviceimage::Descriptor lock = movedUp(task.lockDescriptor);
  const Descriptors descriptors = {null.number(), output.number(), output.number(),
                                   childChannel.number(), lock.number()};
  if (std::find(descriptors.begin(), descriptors.end(), -1) != descriptors.end() ||
      fcntl(launched.output.number(), F_SETFL, O_NONBLOCK) != 0)
    return std::nullopt;

  std::vector<std::string> arguments = task.arguments;
  arguments.insert(arguments.begin(), program_invocation_short_name);
  std::vector<std::string> environment = migratorEnvironment(task.temporaryDirectory);
  const std::vector<char*> argumentPointers = pointersTo(arguments);
  const std::vector<char*> environmentPointers = pointersTo(environment);
  const pid_t host = getpid();
  launched.identifier = fork();
  if (launched.identifier < 0) return std::nullopt;
  if (launched.identifier == 0)
    becomeMigrator(host, descriptors, argumentPointers.data(), environmentPointers.data());
  // By its number: the library's declaration of the function does not fit C++.
  launched.ended =
      deviceimage::Descriptor(static_cast<int>(syscall(SYS_pidfd_open, launched.identifier, 0)));
  return launched;
}

}  // namespace host
