#include "tools/migration-host/ReportWords.h"

namespace migration_host {

std::string_view wordFor(host::RunOutcome outcome) {
  switch (outcome) {
    case host::RunOutcome::done:
      return "done";
    case host::RunOutcome::failed:
      return "failed";
    case host::RunOutcome::leftBehind:
      return "left behind";
    case host::RunOutcome::verificationFailed:
      return "verification failed";
    case host::RunOutcome::refused:
      return "refused";
    case host::RunOutcome::migratorFailed:
      return "migrator failed";
    case host::RunOutcome::busy:
      return "busy";
    case host::RunOutcome::interrupted:
      return "interrupted";
  }
  return "failed";
}

std::string_view wordFor(host::AccountOutcome outcome) {
  switch (outcome) {
    case host::AccountOutcome::retired:
      return "retired";
    case host::AccountOutcome::kept:
      return "kept";
    case host::AccountOutcome::notSelected:
      return "not selected";
    case host::AccountOutcome::dropped:
      return "dropped";
  }
  return "kept";
}

std::string_view wordFor(host::Ending ending) {
  switch (ending) {
    case host::Ending::succeeded:
      return "done";
    case host::Ending::failed:
      return "failed";
    case host::Ending::notNeeded:
      return "not needed";
    case host::Ending::notBegun:
      return "not begun";
    case host::Ending::busy:
      return "busy";
    case host::Ending::notLoaded:
      return "not loaded";
    case host::Ending::raised:
      return "raised";
    case host::Ending::crashed:
      return "crashed";
    case host::Ending::left:
      return "ended without an answer";
    case host::Ending::timedOut:
      return "timed out";
    case host::Ending::interrupted:
      return "interrupted";
    case host::Ending::notStarted:
      return "not started";
  }
  return "failed";
}

}  // namespace migration_host
