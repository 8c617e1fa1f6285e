#include "tests/host/bundles/TestMigrator.h"

void nobodyDefinesThis();

bool migrate() {
  nobodyDefinesThis();
  return true;
}
