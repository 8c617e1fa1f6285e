#include "tools/common/AccountCreators.h"

#include <fmt/format.h>

#include "propertylist/Reading.h"
#include "tools/common/ExitCode.h"
#include "tools/common/Installation.h"

namespace tools {
namespace {

using propertylist::Array;
using propertylist::Dictionary;
using propertylist::Value;

// Null when the entry names none.
const propertylist::Text* bundleOf(const Value& entry) {
  const Dictionary* const creator = entry.asDictionary();
  const Dictionary* const description =
      creator == nullptr ? nullptr : propertylist::findDictionary(*creator, "Description");
  return description == nullptr ? nullptr : propertylist::findString(*description, "Framework");
}

}  // namespace

std::set<std::string> namedBundles() {
  const std::string file = installedAccountResources() + "/AccountCreators.plist";
  const propertylist::FileReadResult read = propertylist::readPropertyListFile(file);
  const Dictionary* const catalogue = read.value ? read.value->asDictionary() : nullptr;
  if (catalogue == nullptr)
    throw CommandFailure(
        ExitCode::refused,
        fmt::format(
            "cannot read the catalogue of account creators {}: {}; install the programs anew", file,
            read.value ? "it holds no dictionary" : read.error));
  std::set<std::string> bundles;
  for (const Dictionary::Entry& type : *catalogue) {
    const Array* const entries = type.value().asArray();
    if (entries == nullptr) continue;
    for (const Value& entry : *entries)
      if (const propertylist::Text* const bundle = bundleOf(entry)) bundles.insert(*bundle);
  }
  return bundles;
}

}  // namespace tools
