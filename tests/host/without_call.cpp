// Runs a command that the system refuses one call, as a sandbox or missing rights do:
//
//   without_call kill COMMAND...       no process can be killed
//   without_call subreaper COMMAND...  orphans cannot be adopted
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <cstdio>
#include <iterator>
#include <string_view>

namespace {

constexpr unsigned kNumber = offsetof(seccomp_data, nr);
constexpr unsigned kFirstArgument = offsetof(seccomp_data, args);  // its low half
constexpr unsigned kRefuse = SECCOMP_RET_ERRNO | EPERM;

// A line of a filter jumps over so many of the next when the value is the one (or is not).
constexpr sock_filter load(unsigned offset) { return BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offset); }
constexpr sock_filter answer(unsigned what) { return BPF_STMT(BPF_RET | BPF_K, what); }
constexpr sock_filter unless(unsigned value, unsigned char over) {
  return BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, value, 0, over);
}

sock_filter withoutKill[] = {load(kNumber), unless(SYS_kill, 1), answer(kRefuse),
                             answer(SECCOMP_RET_ALLOW)};
sock_filter withoutSubreaper[] = {load(kNumber),        unless(SYS_prctl, 3),
                                  load(kFirstArgument), unless(PR_SET_CHILD_SUBREAPER, 1),
                                  answer(kRefuse),      answer(SECCOMP_RET_ALLOW)};

}  // namespace

int main(int argumentCount, char** arguments) {
  if (argumentCount < 3) return 2;
  sock_fprog filter = {std::size(withoutSubreaper), withoutSubreaper};
  if (std::string_view(arguments[1]) == "kill") filter = {std::size(withoutKill), withoutKill};
  if (prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) != 0 ||
      prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &filter) != 0) {
    std::perror("without_call");
    return 1;
  }
  execvp(arguments[2], arguments + 2);
  std::perror(arguments[2]);
  return 1;
}
