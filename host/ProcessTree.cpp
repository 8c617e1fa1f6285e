#include "host/ProcessTree.h"

#include <dirent.h>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <fstream>
#include <map>
#include <string>
#include <vector>

namespace host {
namespace {

using Seconds = std::chrono::seconds;

// The parent of the process, as /proc tells; 0 when it has gone. The command name in front of it
// may hold anything, so the last ")" counts.
pid_t parentOf(const std::string& process) {
  std::ifstream file("/proc/" + process + "/stat");
  std::string line;
  if (!std::getline(file, line)) return 0;
  const std::size_t end = line.rfind(") ");
  if (end == std::string::npos || end + 4 > line.size()) return 0;
  return static_cast<pid_t>(std::strtol(line.c_str() + end + 4, nullptr, 10));
}

using Children = std::map<pid_t, std::vector<pid_t>>;  // by their parent

Children childrenOfAll() {
  Children children;
  DIR* directory = opendir("/proc");
  if (directory == nullptr) return children;
  while (const dirent* entry = readdir(directory)) {
    const std::string name = entry->d_name;
    if (name.find_first_not_of("0123456789") != std::string::npos) continue;
    children[parentOf(name)].push_back(static_cast<pid_t>(std::strtol(name.c_str(), nullptr, 10)));
  }
  closedir(directory);
  return children;
}

// Kills the children that are not spared.
struct Killed {
  bool any = false;
  bool anySpared = false;
};
Killed killChildren(pid_t awaited, const Sessions& spared) {
  Killed killed;
  const std::vector<pid_t> children = childrenOfAll()[getpid()];
  for (const pid_t child : children) {
    if (child != awaited && spared.contains(getsid(child))) {
      killed.anySpared = true;
    } else {
      killed.any = true;
      kill(child, SIGKILL);
    }
  }
  return killed;
}

// Takes away the ends of children that have ended.
void reapEndedChildren(pid_t awaited, EndedChildren& ended) {
  for (;;) {
    int status = 0;
    const pid_t reaped = waitpid(-1, &status, WNOHANG);
    if (reaped == awaited) ended.status = status;
    if (reaped > 0 || (reaped < 0 && errno == EINTR)) continue;
    ended.all = reaped < 0;
    return;
  }
}

}  // namespace

bool adoptOrphans() { return prctl(PR_SET_CHILD_SUBREAPER, 1, 0, 0, 0) == 0; }

Sessions sessionsOfFamily() {
  const Children children = childrenOfAll();
  Sessions sessions;
  std::vector<pid_t> toVisit = {getpid()};
  while (!toVisit.empty()) {
    const pid_t process = toVisit.back();
    toVisit.pop_back();
    if (const pid_t session = getsid(process); session >= 0) sessions.insert(session);
    if (const auto found = children.find(process); found != children.end())
      toVisit.insert(toVisit.end(), found->second.begin(), found->second.end());
  }
  return sessions;
}

EndedChildren endAllChildren(pid_t awaited, const Sessions& spared) {
  const auto deadline = std::chrono::steady_clock::now() + Seconds(10);
  EndedChildren ended;
  reapEndedChildren(awaited, ended);
  while (!ended.all && std::chrono::steady_clock::now() < deadline) {
    const Killed killed = killChildren(awaited, spared);
    if (!killed.any && killed.anySpared) {
      ended.all = true;
      break;
    }
    poll(nullptr, 0, 1);  // a killed process ends a moment later
    reapEndedChildren(awaited, ended);
  }
  return ended;
}

}  // namespace host
