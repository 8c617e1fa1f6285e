// A bundle that loads and offers no class.

extern "C" __attribute__((visibility("default"))) int aFunctionThatNobodyAsksFor() { return 1; }
