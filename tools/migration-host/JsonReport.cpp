#include "tools/migration-host/JsonReport.h"

#include <nlohmann/json.hpp>

#include "tools/migration-host/ReportWords.h"

namespace migration_host {
namespace {

using Json = nlohmann::ordered_json;

Json jsonOf(const host::MigratorOutcome& migrator) {
  Json json = {{"name", migrator.name},
               {"result", wordFor(migrator.ending)},
               {"milliseconds", migrator.duration.count()}};
  if (!migrator.detail.empty()) json["detail"] = migrator.detail;
  if (!migrator.output.empty()) {
    json["output"] = migrator.output;
    json["output_was_cut"] = migrator.outputWasCut;
  }
  return json;
}

Json jsonOf(const host::AccountReport& account) {
  return {{"identifier", account.identifier},
          {"type", account.type},
          {"display_name", account.displayName},
          {"outcome", wordFor(account.outcome)}};
}

Json jsonOf(const host::DataclassReport& line) {
  return {{"account", line.account},
          {"dataclass", deviceimage::dataclassName(line.dataclass)},
          {"service_before", line.serviceBefore},
          {"local_before", line.localBefore},
          {"local_after", line.localAfter},
          {"moved", line.moved},
          {"already_there", line.alreadyThere},
          {"conflict_copies", line.conflictCopies},
          {"retired", line.retired},
          {"left_behind", line.leftBehind}};
}

Json jsonOf(const host::LegacyReport& legacy) {
  Json json = {
      {"result", host::resultOf(legacy)},          {"mail_accounts", legacy.need.mailAccounts},
      {"data_access", legacy.need.dataAccess},     {"older_version", legacy.need.olderVersion},
      {"settings", host::nameOf(legacy.settings)}, {"kept_copies", legacy.keptSettings}};
  if (legacy.migrator) json["migrator"] = jsonOf(*legacy.migrator);
  return json;
}

template <typename Item>
Json jsonOfAll(const std::vector<Item>& items) {
  Json json = Json::array();
  for (const Item& item : items) json.push_back(jsonOf(item));
  return json;
}

}  // namespace

std::string jsonReport(const host::MigrationReport& report) {
  Json json = {{"image", report.image},
               {"outcome", wordFor(report.outcome)},
               {"exit_code", static_cast<int>(report.outcome)},
               {"reasons", report.reasons},
               {"migrators", jsonOfAll(report.migrators)},
               {"accounts", jsonOfAll(report.accounts)},
               {"dataclasses", jsonOfAll(report.dataclasses)},
               {"balanced", report.balanced},
               {"log", report.log},
               {"log_was_cut", report.logWasCut}};
  if (report.legacy) json["legacy"] = jsonOf(*report.legacy);
  return json.dump(2, ' ', false, Json::error_handler_t::replace) + "\n";
}

}  // namespace migration_host
