#pragma once

#include <string_view>

#include "tools/device-image/import/TextRecord.h"

namespace tools {

// The notes of a text file in UTF-8. A file is one note, kept byte for byte: header lines
// ("Subject: ...", "Date: ...", "UID: ..."), an empty line and the text, or the text alone. The UID
// header names the note; the Date header, in ISO 8601 or as in mail, dates it.
//
// A file whose headers say "Content-Type: multipart/digest" holds one note in each of its parts, as
// writeNotes makes it.
ReadText readNotes(std::string_view bytes);

}  // namespace tools
