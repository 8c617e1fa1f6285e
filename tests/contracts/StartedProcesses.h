#pragma once

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <filesystem>
#include <stdexcept>
#include <string>
#include <vector>

// Real processes of a test, which are killed when it ends.
class StartedProcesses {
 public:
  StartedProcesses() = default;
  ~StartedProcesses() {
    for (const pid_t process : _running) {
      ::kill(process, SIGKILL);
      ::waitpid(process, nullptr, 0);
    }
  }
  StartedProcesses(const StartedProcesses&) = delete;
  StartedProcesses& operator=(const StartedProcesses&) = delete;

  // Starts a copy of `program` named `name` in `directory`. Its first line of output is awaited
  // when `saysReady`, so that it is known to run.
  pid_t start(const std::filesystem::path& program, const std::filesystem::path& directory,
              const std::string& name, std::vector<std::string> arguments, bool saysReady = false) {
    std::filesystem::create_directories(directory);
    const std::string path = directory / name;
    std::filesystem::copy_file(program, path, std::filesystem::copy_options::skip_existing);
    arguments.insert(arguments.begin(), path);
    std::vector<char*> texts;
    for (std::string& argument : arguments) texts.push_back(argument.data());
    texts.push_back(nullptr);
    int output[2];
    if (::pipe2(output, O_CLOEXEC) != 0) throw std::runtime_error("pipe2");
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_adddup2(&actions, output[1], STDOUT_FILENO);
    pid_t process = 0;
    const int error =
        ::posix_spawn(&process, path.c_str(), &actions, nullptr, texts.data(), environ);
    posix_spawn_file_actions_destroy(&actions);
    ::close(output[1]);
    char byte = 0;
    const bool isReady = error == 0 && (!saysReady || ::read(output[0], &byte, 1) == 1);
    ::close(output[0]);
    if (error == 0) _running.push_back(process);
    if (!isReady) throw std::runtime_error("cannot start " + path);
    return process;
  }

  // Waits for the end of a process that was started here; the signal that ended it, or 0.
  int waitForEnd(pid_t process) {
    int status = 0;
    while (::waitpid(process, &status, 0) < 0 && errno == EINTR) continue;
    std::erase(_running, process);
    return WIFSIGNALED(status) ? WTERMSIG(status) : 0;
  }

 private:
  std::vector<pid_t> _running;
};
