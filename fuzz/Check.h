#pragma once

#include <cstdio>
#include <cstdlib>

// Ends the process, in every build, when a law does not hold: that is how a fuzzer sees it.
#define FUZZ_CHECK(law)                                                             \
  do {                                                                              \
    if (!(law)) {                                                                   \
      std::fprintf(stderr, "%s:%d: does not hold: %s\n", __FILE__, __LINE__, #law); \
      std::abort();                                                                 \
    }                                                                               \
  } while (false)
