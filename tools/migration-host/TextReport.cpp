#include "tools/migration-host/TextReport.h"

#include <fmt/core.h>

#include <algorithm>
#include <array>
#include <map>
#include <string_view>
#include <vector>

#include "tools/migration-host/ReportWords.h"

namespace migration_host {
namespace {

constexpr std::string_view kGreen = "\033[32m";
constexpr std::string_view kYellow = "\033[33m";
constexpr std::string_view kRed = "\033[31m";
constexpr std::string_view kPlain = "\033[0m";
constexpr std::size_t kLineWidth = 110;

// Letters, not bytes, so that columns line up; every letter counts as one column wide.
std::size_t widthOf(std::string_view text) {
  return static_cast<std::size_t>(
      std::count_if(text.begin(), text.end(), [](char byte) { return (byte & 0xC0) != 0x80; }));
}

std::string padded(std::string text, std::size_t width) {
  text.append(width - std::min(width, widthOf(text)), ' ');
  return text;
}

std::string_view colourOf(host::AccountOutcome outcome) {
  switch (outcome) {
    case host::AccountOutcome::retired:
      return kGreen;
    case host::AccountOutcome::notSelected:
      return kPlain;
    case host::AccountOutcome::kept:
    case host::AccountOutcome::dropped:
      return kRed;
  }
  return kPlain;
}

std::string_view colourOf(host::RunOutcome outcome) {
  if (outcome == host::RunOutcome::done) return kGreen;
  return outcome == host::RunOutcome::leftBehind ? kYellow : kRed;
}

std::string coloured(std::string text, std::string_view colour, bool colours) {
  if (!colours || colour == kPlain) return text;
  return fmt::format("{}{}{}", colour, text, kPlain);
}

// "contacts 214 moved, 3 already there"
std::string textOf(const host::DataclassReport& line) {
  const std::array<std::pair<std::int64_t, std::string_view>, 5> parts = {{
      {line.moved, "moved"},
      {line.alreadyThere, "already there"},
      {line.conflictCopies, "kept as conflict copies"},
      {line.retired, "retired"},
      {line.leftBehind, "left behind"},
  }};
  std::string text;
  for (const auto& [count, word] : parts)
    if (count != 0) text += fmt::format("{}{} {}", text.empty() ? "" : ", ", count, word);
  return fmt::format("{} {}", deviceimage::dataclassName(line.dataclass), text);
}

struct Columns {
  std::size_t type = 0;
  std::size_t name = 0;
  std::size_t outcome = 0;
};

std::string shownName(const host::AccountReport& account) {
  return printable(account.displayName.empty() ? account.identifier : account.displayName);
}

Columns columnsFor(const std::vector<host::AccountReport>& accounts) {
  Columns columns;
  for (const host::AccountReport& account : accounts) {
    columns.type = std::max(columns.type, widthOf(printable(account.type)));
    columns.name = std::max(columns.name, widthOf(shownName(account)));
    columns.outcome = std::max(columns.outcome, widthOf(wordFor(account.outcome)));
  }
  return columns;
}

// The account's line; what its dataclasses have to say goes on below itself when it is long.
std::string accountLines(const host::AccountReport& account, const Columns& columns,
                         const std::vector<const host::DataclassReport*>& dataclasses,
                         bool colours) {
  const std::string outcome = padded(std::string(wordFor(account.outcome)), columns.outcome);
  std::string text = fmt::format("{}  {}  {}", padded(printable(account.type), columns.type),
                                 padded(shownName(account), columns.name),
                                 coloured(outcome, colourOf(account.outcome), colours));
  const std::size_t indent = columns.type + columns.name + columns.outcome + 4;
  std::size_t column = indent;
  for (const host::DataclassReport* line : dataclasses) {
    const std::string part = textOf(*line);
    if (column > indent && column + 3 + part.size() > kLineWidth) {
      text += "\n" + std::string(indent, ' ');
      column = indent;
    }
    text += "   " + part;
    column += 3 + part.size();
  }
  text.erase(text.find_last_not_of(' ') + 1);
  return text + "\n";
}

std::string accountTable(const host::MigrationReport& report, bool colours) {
  std::map<std::string_view, std::vector<const host::DataclassReport*>> byAccount;
  for (const host::DataclassReport& line : report.dataclasses)
    if (line.serviceBefore > 0) byAccount[line.account].push_back(&line);
  const Columns columns = columnsFor(report.accounts);
  std::string text;
  for (const host::AccountReport& account : report.accounts)
    text += accountLines(account, columns, byAccount[account.identifier], colours);
  return text;
}

std::string migratorOutput(const host::MigratorOutcome& migrator) {
  if (migrator.output.empty()) return {};
  std::string text = fmt::format("{} wrote to its output{}:\n", printable(migrator.name),
                                 migrator.outputWasCut ? " (only the beginning is shown)" : "");
  std::string_view rest = migrator.output;
  while (!rest.empty()) {
    const std::string_view line = rest.substr(0, rest.find('\n'));
    text += "    " + printable(line) + "\n";
    rest.remove_prefix(std::min(rest.size(), line.size() + 1));
  }
  return text;
}

std::string legacyLines(const host::LegacyReport& legacy) {
  std::string text = "Legacy settings: " + host::describe(legacy) + "\n";
  for (const std::string& copy : legacy.keptSettings)
    text += "Settings from before a migration: " + printable(copy) + "\n";
  if (legacy.migrator) text += migratorOutput(*legacy.migrator);
  return text;
}

}  // namespace

std::string printable(std::string_view text) {
  std::string shown(text);
  for (std::size_t index = 0; index < shown.size(); ++index) {
    const auto byte = static_cast<unsigned char>(shown[index]);
    const bool isSecondSetControl = byte == 0xC2 && index + 1 < shown.size() &&
                                    static_cast<unsigned char>(shown[index + 1]) >= 0x80 &&
                                    static_cast<unsigned char>(shown[index + 1]) < 0xA0;
    if (isSecondSetControl) shown.erase(index, 1);
    if (byte < 0x20 || byte == 0x7F || isSecondSetControl) shown[index] = '?';
  }
  return shown;
}

std::string textReport(const host::MigrationReport& report, bool colours) {
  std::string text = report.legacy ? legacyLines(*report.legacy) : std::string();
  text += accountTable(report, colours);
  for (const host::MigratorOutcome& migrator : report.migrators) text += migratorOutput(migrator);
  for (const std::string& reason : report.reasons) text += printable(reason) + "\n";
  text +=
      fmt::format("{}: {}{}\n", printable(report.image),
                  coloured(std::string(wordFor(report.outcome)), colourOf(report.outcome), colours),
                  report.outcome == host::RunOutcome::done ? " and verified" : "");
  return text;
}

}  // namespace migration_host
