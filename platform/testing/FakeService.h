#pragma once

#include <functional>
#include <initializer_list>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Status.h"

namespace platform {

// Calls in the order in which they came, each as one line: "commit(local Contacts)",
// "createDataSource(Contacts, none, {EventsOnly})". "none" stands for an empty argument.
using CallJournal = std::vector<std::string>;

// What a fake answers in place of its own outcome. An operation without a status takes any planned
// answer as a failure and gives back nothing.
struct PlannedAnswer {
  Status status;
  bool carriedOut = false;  // do the work too: a status of failure with a source, say
};

// What every in-memory service offers to a test beside its own operations: the calls it got, and
// calls that fail when the test says so.
//
// A call is chosen by the beginning of its journal line, so that "createDataSource" means all of
// them and "createDataSource(Contacts" only some. A call that fails does nothing.
class FakeService {
 public:
  FakeService(const FakeService&) = delete;
  FakeService& operator=(const FakeService&) = delete;

  // The calls that this service got.
  const CallJournal& calls() const { return _calls; }
  // Notes the coming calls in `journal` too, which outlives this object or is replaced by null.
  void alsoNoteCallsIn(CallJournal* journal) { _sharedJournal = journal; }

  static Status plannedFailure() { return Status::failure(1, "planned by the test"); }
  // The next call that begins with `call` fails.
  void failNext(std::string_view call, Status status = plannedFailure());
  // Every call that begins with `call` fails from now on.
  void failEvery(std::string_view call, Status status = plannedFailure());
  void answerNext(std::string_view call, PlannedAnswer answer);
  void answerEvery(std::string_view call, PlannedAnswer answer);
  // Drops what was planned.
  void answerNormally();

  // Asked before each call that has no planned answer; an empty answer lets the call take its
  // course. It may throw, as if the process had ended before the call.
  using Decision = std::function<std::optional<PlannedAnswer>(const std::string& call)>;
  void decideBy(Decision decision) { _decision = std::move(decision); }

 protected:
  FakeService() = default;
  ~FakeService() = default;

  // Notes a call. The answer that the test planned for it; empty when it takes its course.
  std::optional<PlannedAnswer> _received(std::string_view operation,
                                         std::initializer_list<std::string_view> arguments);
  // Notes a call of an operation without a status; true when it fails.
  bool _fails(std::string_view operation, std::initializer_list<std::string_view> arguments) {
    return _received(operation, arguments).has_value();
  }
  // Notes a call of an operation with a status, and does it unless the test decided otherwise.
  template <typename Work>
  Status _answered(std::string_view operation, std::initializer_list<std::string_view> arguments,
                   Work work) {
    const std::optional<PlannedAnswer> answer = _received(operation, arguments);
    if (!answer) return work();
    if (answer->carriedOut) work().ignore("the test planned another status");
    return answer->status;
  }

 private:
  struct Plan {
    std::string call;
    PlannedAnswer answer;
    bool once = false;
  };
  CallJournal _calls;
  CallJournal* _sharedJournal = nullptr;
  std::vector<Plan> _plans;
  Decision _decision;
};

}  // namespace platform
