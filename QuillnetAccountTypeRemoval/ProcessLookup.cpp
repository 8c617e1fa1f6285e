#include "QuillnetAccountTypeRemoval/ProcessLookup.h"

#include <algorithm>
#include <cstring>

#include "platform/Services.h"

namespace accountsettings {
namespace {

constexpr pid_t kNoProcess = -1;
constexpr std::size_t kComparedBytes = 16;

pid_t answerOf(const platform::Status& failure) { return std::min(failure.code, kNoProcess); }

}  // namespace

pid_t findProcessIDByName(const char* name) {
  platform::ProcessTable& table = platform::services().processTable;
  const platform::ProcessTable::Sized sized = table.sizeOfTable();
  if (!sized.status.isSuccess()) return answerOf(sized.status);
  const platform::ProcessTable::Filled filled = table.fillTable(sized.count);
  if (!filled.status.isSuccess()) return answerOf(filled.status);
  for (const platform::ProcessTable::Process& process : filled.processes)
    if (process.identifier >= 1 &&
        std::strncmp(process.commandName.c_str(), name, kComparedBytes) == 0)
      return process.identifier;
  return kNoProcess;
}

}  // namespace accountsettings
