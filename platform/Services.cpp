#include "platform/Services.h"
#include "platform/DataClassMigrator.h"
#include "platform/BookmarksStore.h"
#include "platform/InternalConsistencyFailure.h"
namespace platform {
namespace {
}
}  // namespace platform
