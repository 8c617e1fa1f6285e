// Runs a command and lists its system calls, or fails or kills it at one of them:
//
//   fault_injector list COMMAND...
//       prints "GENERATION NUMBER [PATH]" for each call, with the path that openat is asked for;
//       openat2 counts as openat everywhere
//   fault_injector hit GENERATION NUMBER NTH[+] kill|cut|swap|ERRNO COMMAND...
//       hits the NTH call of that number (with "+" all from there on) of the processes of a
//       generation and prints "hit" when it comes to it
//
// Generation 0 is the command's own process, 1 what that one forks, and so on. "kill" sends SIGKILL
// to the process before the call acts, "cut" to all processes, as when the power goes; with "swap"
// the names A and B of INJECTOR_SWAP=A:B change places before the call acts; else the call does
// nothing and fails with the errno. The calls are those from the command's execve on.
//
// What the command prints is thrown away, but with INJECTOR_SHOWS=1; with INJECTOR_OUTPUT=F its
// standard output goes to the file F. The exit status is the command's own, or its signal. The end
// is that of the last process: one that outlives the command is waited for.
//
// A filter in the processes stops them at the wanted calls alone, so a run is as fast as without.
// It stays with them, and they are killed when the injector ends. All are loaded at the same
// addresses each time, because the calls for more memory depend on them.
#include <fcntl.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/personality.h>
#include <sys/prctl.h>
#include <sys/ptrace.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <sys/uio.h>
#include <sys/user.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <climits>
#include <csignal>
#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <map>
#include <set>
#include <string>
#include <string_view>

namespace {

#ifndef __x86_64__
#error "The registers of system calls are known for x86-64 only."
#endif

constexpr int kUsage = 125;
constexpr long kOptions = PTRACE_O_TRACESECCOMP | PTRACE_O_TRACEFORK | PTRACE_O_TRACEVFORK |
                          PTRACE_O_TRACECLONE | PTRACE_O_TRACEEXEC | PTRACE_O_EXITKILL;
constexpr int kAllCalls = -1;

struct Task {
  int call = kAllCalls;
  int generation = 0;
  long nth = 0;
  bool isLasting = false;
  bool isCut = false;
  std::string swapped[2];  // empty unless they change places
  int error = 0;           // 0 kills
};

unsigned long long countedAs(unsigned long long call) {
  return call == SYS_openat2 ? SYS_openat : call;
}

bool installFilter(int call) {
  const int alike = call == SYS_openat ? SYS_openat2 : call;
  sock_filter all[] = {BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_TRACE)};
  sock_filter one[] = {BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
                       BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, static_cast<unsigned>(call), 1, 0),
                       BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, static_cast<unsigned>(alike), 0, 1),
                       BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_TRACE),
                       BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW)};
  sock_fprog filter = {std::size(one), one};
  if (call == kAllCalls) filter = {std::size(all), all};
  return prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
         prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &filter) == 0;
}

[[noreturn]] void becomeCommand(int call, char** command) {
  const int null = open("/dev/null", O_RDWR);
  const int last = std::getenv("INJECTOR_SHOWS") != nullptr ? 0 : 2;
  for (int descriptor = 0; descriptor <= last; ++descriptor) dup2(null, descriptor);
  close(null);
  if (const char* path = std::getenv("INJECTOR_OUTPUT")) {
    const int output = open(path, O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
    dup2(output, STDOUT_FILENO);
  }
  ptrace(PTRACE_TRACEME, 0, nullptr, nullptr);
  std::raise(SIGSTOP);
  if (personality(ADDR_NO_RANDOMIZE) >= 0 && installFilter(call)) execvp(command[0], command);
  _exit(kUsage);
}

class Tracer {
 public:
  Tracer(const Task& task, pid_t command) : _task(task), _command(command) {
    _generations[command] = 0;
  }

  // Until the last process has ended: the command's status.
  int untilAllHaveEnded() {
    int status = 0;
    int commandStatus = 0;
    for (;;) {
      const pid_t process = waitpid(-1, &status, __WALL);
      if (process < 0 && errno == EINTR) continue;
      if (process < 0) return commandStatus;
      if (WIFSTOPPED(status)) {
        _takeStop(process, status);
        continue;
      }
      if (process == _command) commandStatus = status;
      _generations.erase(process);
    }
  }

 private:
  void _takeStop(pid_t process, int status) {
    const int signal = WSTOPSIG(status);
    const int event = status >> 16;
    if (event == PTRACE_EVENT_SECCOMP) {
      _takeCall(process);
    } else if (event == PTRACE_EVENT_EXEC) {
      // Without this event the new program would get a signal.
    } else if (event != 0) {
      _takeNewProcess(process);
    } else if (signal == SIGSTOP && !_generations.contains(process)) {
      _early.insert(process);  // its parent tells of it in a moment
      return;
    } else if (signal == SIGSTOP && _starting.erase(process) > 0) {
      // The stop in which it begins.
    } else {
      ptrace(PTRACE_CONT, process, nullptr, signal);
      return;
    }
    ptrace(PTRACE_CONT, process, nullptr, nullptr);
  }

  void _takeNewProcess(pid_t parent) {
    unsigned long message = 0;
    ptrace(PTRACE_GETEVENTMSG, parent, nullptr, &message);
    const auto process = static_cast<pid_t>(message);
    _generations[process] = _generations[parent] + 1;
    if (_early.erase(process) > 0)
      ptrace(PTRACE_CONT, process, nullptr, nullptr);
    else
      _starting.insert(process);
  }

  void _takeCall(pid_t process) {
    user_regs_struct registers = {};
    if (ptrace(PTRACE_GETREGS, process, nullptr, &registers) != 0) return;  // it has been killed
    const int generation = _generations[process];
    if (_task.call == kAllCalls) {
      _list(process, generation, registers);
      return;
    }
    if (generation != _task.generation || ++_count < _task.nth ||
        (_count > _task.nth && !_task.isLasting))
      return;
    if (_count == _task.nth) std::puts("hit");
    if (_task.isCut)
      for (const auto& [each, number] : _generations) kill(each, SIGKILL);
    else if (!_task.swapped[0].empty())
      _swap();
    else if (_task.error == 0)
      kill(process, SIGKILL);
    else
      _fail(process, registers);
  }

  void _swap() const {
    if (renameat2(AT_FDCWD, _task.swapped[0].c_str(), AT_FDCWD, _task.swapped[1].c_str(),
                  RENAME_EXCHANGE) != 0)
      std::abort();
  }

  void _fail(pid_t process, user_regs_struct& registers) const {
    registers.orig_rax = ~0ULL;  // no call
    registers.rax = static_cast<unsigned long long>(-static_cast<long long>(_task.error));
    ptrace(PTRACE_SETREGS, process, nullptr, &registers);
  }

  static void _list(pid_t process, int generation, const user_regs_struct& registers) {
    const unsigned long long call = countedAs(registers.orig_rax);
    std::string path;
    if (call == SYS_openat) {
      std::array<char, PATH_MAX> buffer = {};
      // Page by page, because the text may lie at the end of the memory.
      for (std::size_t size = 0; size < buffer.size() - 1;) {
        const unsigned long long from = registers.rsi + size;
        const std::size_t room =
            std::min<std::size_t>(4096 - from % 4096, buffer.size() - 1 - size);
        iovec local = {buffer.data() + size, room};
        iovec remote = {reinterpret_cast<void*>(from), room};
        if (process_vm_readv(process, &local, 1, &remote, 1, 0) <= 0) break;
        if (std::memchr(buffer.data() + size, 0, room) != nullptr) break;
        size += room;
      }
      path = std::string(" ") + buffer.data();
    }
    std::printf("%d %llu%s\n", generation, call, path.c_str());
  }

  const Task _task;
  const pid_t _command;
  long _count = 0;
  std::map<pid_t, int> _generations;
  std::set<pid_t> _early;     // stopped, and not yet told of
  std::set<pid_t> _starting;  // told of, and not yet stopped
};

bool readSwapped(Task& task) {
  const char* const names = std::getenv("INJECTOR_SWAP");
  const char* const colon = names != nullptr ? std::strchr(names, ':') : nullptr;
  if (colon == nullptr || colon == names) return false;
  task.swapped[0].assign(names, colon);
  task.swapped[1] = colon + 1;
  return true;
}

int run(const Task& task, char** command) {
  const pid_t process = fork();
  if (process < 0) return kUsage;
  if (process == 0) becomeCommand(task.call, command);
  int status = 0;
  waitpid(process, &status, 0);
  if (!WIFSTOPPED(status) || ptrace(PTRACE_SETOPTIONS, process, nullptr, kOptions) != 0 ||
      ptrace(PTRACE_CONT, process, nullptr, nullptr) != 0)
    return kUsage;
  status = Tracer(task, process).untilAllHaveEnded();
  std::fflush(stdout);
  if (WIFEXITED(status)) return WEXITSTATUS(status);
  const rlimit noCore = {0, 0};
  setrlimit(RLIMIT_CORE, &noCore);
  std::signal(WTERMSIG(status), SIG_DFL);
  std::raise(WTERMSIG(status));
  return kUsage;
}

}  // namespace

int main(int argumentCount, char** arguments) {
  if (argumentCount > 2 && std::string_view(arguments[1]) == "list") return run({}, arguments + 2);
  if (argumentCount < 7 || std::string_view(arguments[1]) != "hit") {
    std::fputs(
        "usage: fault_injector list COMMAND...\n"
        "       fault_injector hit GENERATION NUMBER NTH[+] kill|cut|swap|ERRNO COMMAND...\n",
        stderr);
    return kUsage;
  }
  Task task;
  task.generation = std::atoi(arguments[2]);
  task.call = std::atoi(arguments[3]);
  task.nth = std::atol(arguments[4]);
  task.isLasting = std::string_view(arguments[4]).ends_with('+');
  task.isCut = std::string_view(arguments[5]) == "cut";
  task.error = std::atoi(arguments[5]);  // 0 for the words
  if (std::string_view(arguments[5]) == "swap" && !readSwapped(task)) return kUsage;
  return run(task, arguments + 6);
}
