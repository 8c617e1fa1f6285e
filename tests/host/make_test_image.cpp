// Makes a device image for the host's tests: make_test_image DIR < records.json, where the records
// are an array of {"dataclass", "account" (null: local), "uid", "content", "modified"}.
#include <cstdio>
#include <iostream>
#include <nlohmann/json.hpp>

#include "deviceimage/DeviceImage.h"
#include "deviceimage/RecordStores.h"

namespace {

int complain(const std::string& text) {
  std::fprintf(stderr, "make_test_image: %s\n", text.c_str());
  return 1;
}

}  // namespace

int main(int argumentCount, char** arguments) {
  if (argumentCount != 2) return complain("one directory, please");
  deviceimage::OpenedImage opened = deviceimage::DeviceImage::open(arguments[1]);
  if (!opened.image) opened = deviceimage::DeviceImage::create(arguments[1]);
  if (!opened.image) return complain(opened.error);
  deviceimage::RecordStores stores(opened.image, deviceimage::RecordStores::Access::readWrite);
  for (const nlohmann::json& record : nlohmann::json::parse(std::cin)) {
    const auto dataclass = deviceimage::dataclassNamed(record.at("dataclass").get<std::string>());
    if (!dataclass) return complain("no such dataclass: " + record.dump());
    std::optional<std::string> account;
    if (!record.at("account").is_null()) account = record["account"].get<std::string>();
    const deviceimage::NewRecord added = {{},
                                          record.at("uid").get<std::string>(),
                                          record.at("content").get<std::string>(),
                                          record.at("modified").get<std::int64_t>()};
    const auto result = stores.addRecords(*dataclass, account, {&added, 1});
    if (!result.status.isSuccess()) return complain(result.status.error->description);
  }
  return 0;
}
