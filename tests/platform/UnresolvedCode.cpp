// A module that cannot be loaded with all its symbols resolved.

extern "C" int a_function_that_nobody_defines();
extern "C" __attribute__((visibility("default"))) int callsAFunctionThatNobodyDefines();

int callsAFunctionThatNobodyDefines() { return a_function_that_nobody_defines(); }
