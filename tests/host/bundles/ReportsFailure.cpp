#include "tests/host/bundles/TestMigrator.h"

bool migrate() { return false; }
