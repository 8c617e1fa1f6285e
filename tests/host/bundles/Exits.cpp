#include <cstdlib>

#include "tests/host/bundles/TestMigrator.h"

bool migrate() { std::exit(0); }
