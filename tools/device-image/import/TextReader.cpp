#include "tools/device-image/import/TextReader.h"

#include "tools/device-image/import/BookmarksReader.h"
#include "tools/device-image/import/CalendarReader.h"
#include "tools/device-image/import/CardReader.h"
#include "tools/device-image/import/NotesReader.h"

namespace tools {

using deviceimage::Dataclass;

ReadText readText(Dataclass dataclass, std::string_view bytes, const FolderPath& outerFolder) {
  switch (dataclass) {
    case Dataclass::calendars:
    case Dataclass::reminders:
      return readCalendars(bytes);
    case Dataclass::bookmarks:
      return readBookmarks(bytes, outerFolder);
    case Dataclass::notes:
      return readNotes(bytes);
    case Dataclass::contacts:
    case Dataclass::mail:
      break;
  }
  return readCards(bytes);
}

}  // namespace tools
