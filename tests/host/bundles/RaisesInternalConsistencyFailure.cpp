#include "platform/InternalConsistencyFailure.h"
#include "tests/host/bundles/TestMigrator.h"

bool migrate() {
  throw platform::InternalConsistencyFailure("Unsupported account type", "ASSBasicAccount", 42);
}
