// Writes 64 MiB to its standard output and 64 MiB to its standard error, then succeeds.
#include <cstdio>
#include <string>

#include "tests/host/bundles/TestMigrator.h"

bool migrate() {
  const std::string block(64 * 1024, 'x');
  for (int count = 0; count < 1024; ++count)
    for (std::FILE* stream : {stdout, stderr}) std::fwrite(block.data(), 1, block.size(), stream);
  return true;
}
