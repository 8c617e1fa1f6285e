#include <cstdlib>

#include "tests/host/bundles/TestMigrator.h"

bool migrate() { std::abort(); }
