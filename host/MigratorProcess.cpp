#include "host/MigratorProcess.h"

#include <poll.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <system_error>

#include "host/MigratorLaunch.h"
#include "host/ProcessTree.h"

namespace host {
namespace {

using Clock = std::chrono::steady_clock;
using std::chrono::milliseconds;

// How much is taken from each source before the others and the clock have their turn.
constexpr int kMessagesATurn = 256;
constexpr int kReadsATurn = 16;
// How long a killed process may take to end, and how long what was sent before is read.
constexpr std::chrono::seconds kPatience{10};

// Watches one process from its start to its end.
class Watch {
 public:
  Watch(LaunchedMigrator launched, Sessions spared, const MigratorTask& task, const LineSink& sink)
      : _process(std::move(launched)),
        _spared(std::move(spared)),
        _sink(sink),
        _deadline(Clock::now() + task.limit) {
    _outcome.name = task.name;
    _outcome.ending = Ending::left;
  }

  MigratorOutcome untilItEnds(Interruption& interruption) {
    if (interruption.requested()) _stop(Ending::interrupted);
    while (!_hasEnded() && !(_stopped && Clock::now() >= _deadline + kPatience)) {
      _waitForNews(interruption);
      _takeNews();
      if (_hasNews(Source::interruption) && interruption.requested())
        _stop(Ending::interrupted);
      else if (Clock::now() >= _deadline)
        _stop(Ending::timedOut);
    }
    _collectEnd();
    return std::move(_outcome);
  }

 private:
  enum class Source : std::size_t { end, channel, output, interruption };

  // A process that somebody traces has ended before its parent can take its end away; the
  // descriptor tells.
  bool _hasEnded() {
    if (_process.ended.isOpen() && _looked) return _hasNews(Source::end);
    siginfo_t information = {};
    return waitid(P_PID, static_cast<id_t>(_process.identifier), &information,
                  WEXITED | WNOHANG | WNOWAIT) != 0 ||
           information.si_pid == _process.identifier;
  }

  void _waitForNews(const Interruption& interruption) {
    // A process that was killed needs a moment to end.
    const auto left =
        _stopped ? milliseconds(100) : std::chrono::ceil<milliseconds>(_deadline - Clock::now());
    _look(interruption.descriptor(),
          static_cast<int>(std::clamp<milliseconds::rep>(left.count(), 0, 1000)));
  }

  // Looks which sources have news, waiting so many milliseconds for the first.
  void _look(int interruption, int longest) {
    _sources = {pollfd{_process.ended.number(), POLLIN, 0},
                pollfd{_channelIsOpen ? _process.channel.number() : -1, POLLIN, 0},
                pollfd{_outputIsOpen ? _process.output.number() : -1, POLLIN, 0},
                pollfd{interruption, POLLIN, 0}};
    _looked = poll(_sources.data(), _sources.size(), longest) >= 0;
  }

  // As of the last look; any source may have some when that failed.
  bool _hasNews(Source source) const {
    return !_looked || _sources[static_cast<std::size_t>(source)].revents != 0;
  }

  void _takeNews() {
    if (_channelIsOpen && _hasNews(Source::channel))
      _channelIsOpen =
          _reader.receive(_process.channel.number(), kMessagesATurn,
                          [this](MessageKind kind, std::string_view text) { _note(kind, text); });
    if (_outputIsOpen && _hasNews(Source::output)) _outputIsOpen = _readOutput();
  }

  void _note(MessageKind kind, std::string_view text) {
    switch (kind) {
      case MessageKind::line:
        _sink(text);
        return;
      case MessageKind::name:
        _outcome.name = text;
        return;
      case MessageKind::succeeded:
        _answer = Ending::succeeded;
        return;
      case MessageKind::failed:
        _answer = Ending::failed;
        return;
      case MessageKind::waiting:
        _waits = true;
        return;
      case MessageKind::begun:
        _waits = false;
        return;
      case MessageKind::notNeeded:
        _answer = Ending::notNeeded;
        return;
      case MessageKind::notBegun:
        _answer = Ending::notBegun;
        _outcome.detail = text;
        return;
      case MessageKind::notLoaded:
        _answer = Ending::notLoaded;
        _outcome.detail = text;
        return;
      case MessageKind::raised:
        _answer = Ending::raised;
        _outcome.detail = text;
        return;
      case MessageKind::linePart:
        return;
    }
  }

  // False when nobody holds the other end any more.
  bool _readOutput() {
    std::array<char, 16384> buffer = {};
    for (int count = 0; count < kReadsATurn; ++count) {
      const ssize_t size = read(_process.output.number(), buffer.data(), buffer.size());
      if (size < 0 && errno == EINTR) continue;
      if (size < 0) return errno == EAGAIN;
      if (size == 0) return false;
      const std::size_t room = kMaximumOutput - _outcome.output.size();
      const auto length = static_cast<std::size_t>(size);
      _outcome.output.append(buffer.data(), std::min(room, length));
      _outcome.outputWasCut |= length > room;
    }
    return true;
  }

  void _stop(Ending why) {
    if (_stopped) return;
    _stopped = why;
    _deadline = Clock::now();
    kill(-_process.identifier, SIGKILL);
    kill(_process.identifier, SIGKILL);
  }

  void _collectEnd() {
    kill(-_process.identifier, SIGKILL);
    const EndedChildren ended = endAllChildren(_process.identifier, _spared);
    // The rest of what was sent. Who cannot be killed may go on sending.
    const Clock::time_point end = Clock::now() + (ended.all ? kPatience : std::chrono::seconds(0));
    do {
      _look(-1, 0);
      _takeNews();
    } while (_tookSome() && Clock::now() < end);
    _judge(ended);
  }

  // Not after a look that failed: how often it would is unknown.
  bool _tookSome() const {
    return _looked && (_hasNews(Source::channel) || _hasNews(Source::output));
  }

  void _judge(const EndedChildren& ended) {
    const int status = ended.status.value_or(0);
    if (_stopped || !ended.all) {
      _outcome.ending = _stopped.value_or(Ending::left);
      if (_outcome.ending == Ending::timedOut && _waits) _outcome.ending = Ending::busy;
      if (!ended.all) _outcome.detail = "processes that it started could not be ended";
    } else if (WIFSIGNALED(status)) {
      _outcome.ending = Ending::crashed;
      _outcome.detail =
          "signal " + std::to_string(WTERMSIG(status)) + ", " + strsignal(WTERMSIG(status));
    } else if (_answer && (WEXITSTATUS(status) == 0 || *_answer == Ending::notLoaded ||
                           *_answer == Ending::notBegun || *_answer == Ending::raised)) {
      _outcome.ending = *_answer;
    } else {
      _outcome.ending = Ending::left;
      _outcome.detail = "exit status " + std::to_string(WEXITSTATUS(status));
    }
  }

  LaunchedMigrator _process;
  std::array<pollfd, 4> _sources = {};  // by Source
  bool _looked = true;                  // and learnt what they have
  Sessions _spared;
  const LineSink& _sink;
  Clock::time_point _deadline;
  MessageReader _reader;
  MigratorOutcome _outcome;
  std::optional<Ending> _answer;
  std::optional<Ending> _stopped;
  bool _waits = false;
  bool _channelIsOpen = true;
  bool _outputIsOpen = true;
};

}  // namespace

std::string sentenceFor(const MigratorOutcome& migrator) {
  const std::string detail = migrator.detail.empty() ? "." : " (" + migrator.detail + ").";
  switch (migrator.ending) {
    case Ending::succeeded:
    case Ending::notNeeded:
      return {};
    case Ending::notBegun:
      return migrator.name + " was not run" + detail;
    case Ending::busy:
      return migrator.name +
             " was not run, because another program migrates the settings; wait until it has "
             "ended" +
             detail;
    case Ending::failed:
      return migrator.name + " reports that its migration failed" + detail;
    case Ending::notLoaded:
      return migrator.name + " could not be loaded" + detail;
    case Ending::raised:
      return migrator.name + " raised a failure" + detail;
    case Ending::crashed:
      return migrator.name + " crashed" + detail;
    case Ending::left:
      return migrator.name + " ended its process without an answer" + detail;
    case Ending::timedOut:
      return migrator.name + " ran past its limit and was stopped" + detail;
    case Ending::interrupted:
      return migrator.name + " was stopped because the run was interrupted" + detail;
    case Ending::notStarted:
      return migrator.name + " could not be given a process" + detail;
  }
  return {};
}

MigratorOutcome runMigrator(const MigratorTask& task, Interruption& interruption,
                            const LineSink& sink) {
  const Clock::time_point start = Clock::now();
  MigratorOutcome outcome;
  Sessions earlier = sessionsOfFamily();
  if (std::optional<LaunchedMigrator> launched = launchMigrator(task)) {
    outcome = Watch(std::move(*launched), std::move(earlier), task, sink).untilItEnds(interruption);
  } else {
    outcome.name = task.name;
    outcome.detail = std::generic_category().message(errno);
  }
  outcome.duration = std::chrono::duration_cast<milliseconds>(Clock::now() - start);
  return outcome;
}

}  // namespace host
