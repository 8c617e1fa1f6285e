#include "propertylist/Value.h"
#include "propertylist/Reading.h"
#include "propertylist/Writing.h"
