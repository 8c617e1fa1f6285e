// What the migration host finds when it loads the bundle: the principal class, registered by name.

#include <memory>

#include "migrator/MergeAndRemoveQuillnetAccounts.h"
#include "platform/DataClassMigrator.h"

namespace migrator {
namespace {

class PrincipalClass final : public platform::DataClassMigratorClass {
 public:
  PrincipalClass() { platform::registerClass(*this); }
  std::string className() const override { return "MergeAndRemoveQuillnetAccounts"; }
  std::unique_ptr<platform::DataClassMigrator> create() override {
    return std::make_unique<MergeAndRemoveQuillnetAccounts>();
  }
};

// A bundle stays loaded, and so does the class, which is never destroyed either: the registry
// answers it until the process is gone.
auto& principalClass = *new PrincipalClass;

}  // namespace
}  // namespace migrator
