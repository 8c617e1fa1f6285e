#include <unistd.h>

#include "tests/host/bundles/TestMigrator.h"

bool migrate() { _exit(0); }
