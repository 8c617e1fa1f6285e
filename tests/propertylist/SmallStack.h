#pragma once

#include <functional>

// Runs `work` on a thread with a stack of 256 KiB, so that nothing in it may recurse over its
// input. Answers the processor time that it took, in seconds.
double runOnSmallStack(const std::function<void()>& work);
