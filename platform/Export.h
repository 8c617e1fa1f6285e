#pragma once

// Marks what the platform library shows to other libraries; everything else stays hidden. The same
// mark serves both sides of the border, so that type information is merged across libraries.
//
// An interface whose operations are all inline or pure has no home: every object that uses it emits
// its type information, and the copies of bundles that are loaded apart from one another are not
// merged. A dynamic_cast between them relies on the C++ library comparing the names of types rather
// than the addresses of their type information, as the GNU one does for types that carry this mark.
#define PLATFORM_EXPORT __attribute__((visibility("default")))
