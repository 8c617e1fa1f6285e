#pragma once

#include <string_view>

#include "tools/device-image/import/TextRecord.h"

namespace tools {

// The contacts of a vCard file, versions 3.0 and 4.0. A record is one card from its BEGIN line to
// its END line, byte for byte: folds, line ends, the order of properties and unknown ones stay. Its
// UID is the value of the card's UID property. Blank lines between cards belong to none; an END
// line without a line end gets one, so that a card is the same wherever in a file it stands.
ReadText readCards(std::string_view bytes);

}  // namespace tools
