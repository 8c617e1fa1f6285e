#pragma once

// Marks what the propertylist library shows to other libraries; everything else stays hidden. The
// same mark serves both sides of the border, so that type information is merged across libraries.
#define PROPERTYLIST_EXPORT __attribute__((visibility("default")))
