#include "tests/host/bundles/TestMigrator.h"

bool migrate() { throw 7; }
