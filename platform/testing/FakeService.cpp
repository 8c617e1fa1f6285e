#include "platform/testing/FakeService.h"

#include <algorithm>
#include <utility>

namespace platform {

void FakeService::failNext(std::string_view call, Status status) {
  answerNext(call, {std::move(status), false});
}

void FakeService::failEvery(std::string_view call, Status status) {
  answerEvery(call, {std::move(status), false});
}

void FakeService::answerNext(std::string_view call, PlannedAnswer answer) {
  _plans.push_back({std::string(call), std::move(answer), true});
}

void FakeService::answerEvery(std::string_view call, PlannedAnswer answer) {
  _plans.push_back({std::string(call), std::move(answer), false});
}

void FakeService::answerNormally() { _plans.clear(); }

std::optional<PlannedAnswer> FakeService::_received(
    std::string_view operation, std::initializer_list<std::string_view> arguments) {
  std::string call(operation);
  for (const std::string_view& argument : arguments)
    call.append(&argument == arguments.begin() ? "(" : ", ").append(argument);
  call += arguments.size() == 0 ? "()" : ")";
  _calls.push_back(call);
  if (_sharedJournal != nullptr) _sharedJournal->push_back(call);

  const auto plan = std::find_if(_plans.begin(), _plans.end(), [&](const Plan& candidate) {
    return call.starts_with(candidate.call);
  });
  if (plan == _plans.end()) return _decision ? _decision(call) : std::nullopt;
  PlannedAnswer answer = plan->answer;
  if (plan->once) _plans.erase(plan);
  return answer;
}

}  // namespace platform
