// Runs a command that the system refuses one call, as a sandbox, missing rights or an older kernel
// do:
//
//   without_call kill COMMAND...        no process can be killed
//   without_call subreaper COMMAND...   orphans cannot be adopted
//   without_call openat2 COMMAND...     the system does not know openat2
//   without_call pidfd_open COMMAND...  nor pidfd_open
//   without_call poll COMMAND...        each wait is interrupted at once
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <cstdio>
#include <string_view>
#include <vector>

namespace {

constexpr unsigned kNumber = offsetof(seccomp_data, nr);
constexpr unsigned kFirstArgument = offsetof(seccomp_data, args);  // its low half
constexpr unsigned kRefuse = SECCOMP_RET_ERRNO | EPERM;
constexpr unsigned kUnknown = SECCOMP_RET_ERRNO | ENOSYS;

// A line of a filter jumps over so many of the next when the value is the one (or is not).
constexpr sock_filter load(unsigned offset) { return BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offset); }
constexpr sock_filter answer(unsigned what) { return BPF_STMT(BPF_RET | BPF_K, what); }
constexpr sock_filter unless(unsigned value, unsigned char over) {
  return BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, value, 0, over);
}

using Filter = std::vector<sock_filter>;

Filter without(unsigned call, unsigned how) {
  return {load(kNumber), unless(call, 1), answer(how), answer(SECCOMP_RET_ALLOW)};
}

// Empty for a name that is none of those above.
Filter filterNamed(std::string_view name) {
  if (name == "kill") return without(SYS_kill, kRefuse);
  if (name == "openat2") return without(SYS_openat2, kUnknown);
  if (name == "pidfd_open") return without(SYS_pidfd_open, kUnknown);
  if (name == "poll") return without(SYS_poll, SECCOMP_RET_ERRNO | EINTR);
  if (name != "subreaper") return {};
  return {load(kNumber),        unless(SYS_prctl, 3),
          load(kFirstArgument), unless(PR_SET_CHILD_SUBREAPER, 1),
          answer(kRefuse),      answer(SECCOMP_RET_ALLOW)};
}

}  // namespace

int main(int argumentCount, char** arguments) {
  Filter lines = argumentCount < 3 ? Filter() : filterNamed(arguments[1]);
  if (lines.empty()) return 2;
  const sock_fprog filter = {static_cast<unsigned short>(lines.size()), lines.data()};
  if (prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) != 0 ||
      prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &filter) != 0) {
    std::perror("without_call");
    return 1;
  }
  execvp(arguments[2], arguments + 2);
  std::perror(arguments[2]);
  return 1;
}
