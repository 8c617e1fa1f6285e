#include "tools/device-image/import/CardReader.h"

#include <optional>
#include <utility>

#include "deviceimage/ContentHash.h"
#include "tools/common/Timestamps.h"
#include "tools/device-image/import/ContentLines.h"

namespace tools {
namespace {

// One card on its way through the reader. The first thing wrong with it is kept.
struct Card {
  std::size_t begin = 0;
  std::size_t line = 0;
  std::optional<Problem> problem;
  std::string version, uid;
  bool hasName = false;
  std::optional<std::int64_t> modified;

  void fail(std::size_t where, std::string what, std::string remedy) {
    if (!problem) problem = Problem{where, std::move(what), std::move(remedy)};
  }
};

void takeUID(Card& card, const ContentLine& line) {
  if (!card.uid.empty())
    card.fail(line.number, "the card has a second UID", "keep one UID in each card");
  if (line.value.size() > kMaximumUIDSize)
    card.fail(line.number, "the UID is longer than 1000 bytes", "give the card a shorter UID");
  card.uid = line.value;
}

void takeProperty(Card& card, const ContentLine& line) {
  if (line.isBlank) return;
  if (!line.isText)
    card.fail(line.number, "the line is not UTF-8 text", "save the file as UTF-8");
  else if (line.name.empty())
    card.fail(line.number, "the line is no vCard property (NAME:VALUE)",
              "correct the line, or begin it with a blank when it continues the one above");
  if (line.name == "VERSION")
    card.version = line.value;
  else if (line.name == "FN" || line.name == "N")
    card.hasName = true;
  else if (line.name == "REV")
    card.modified = secondsOfISODate(line.value);
  else if (line.name == "UID")
    takeUID(card, line);
}

// Ends the card at the offset `end`, and puts it into `result` as a record or a problem.
void finish(Card& card, std::string_view bytes, std::size_t end, ReadText& result) {
  if (card.version.empty())
    card.fail(card.line, "the card has no VERSION", "add VERSION:3.0 or VERSION:4.0 to it");
  else if (card.version != "3.0" && card.version != "4.0")
    card.fail(card.line, "the card's version is not 3.0 or 4.0", "export it as vCard 3.0 or 4.0");
  if (!card.hasName)
    card.fail(card.line, "the card has no name (FN or N)", "give the card an FN property");
  if (end - card.begin > kMaximumRecordSize)
    card.fail(card.line, "the card is larger than 16 MiB", "make its photo smaller");
  if (card.problem) {
    result.problems.push_back(*std::move(card.problem));
    return;
  }
  TextRecord record;
  record.dataclass = deviceimage::Dataclass::contacts;
  record.bytes = withLineEnd(bytes.substr(card.begin, end - card.begin));
  record.uid = card.uid.empty() ? deviceimage::contentHash(record.bytes) : std::move(card.uid);
  record.modified = card.modified;
  record.line = card.line;
  result.records.push_back(std::move(record));
}

Problem unfinished(const Card& card) {
  return {card.line, "the card that begins here has no END:VCARD",
          "add the END:VCARD line, or restore what is missing"};
}

}  // namespace

ReadText readCards(std::string_view bytes) {
  ReadText result;
  ContentLines lines(bytes);
  std::optional<Card> card;
  bool strayReported = false;  // one report for a whole run of lines outside cards
  while (const std::optional<ContentLine> line = lines.next()) {
    if (line->is("BEGIN", "VCARD")) {
      if (card) result.problems.push_back(unfinished(*card));
      card.emplace();
      card->begin = line->begin;
      card->line = line->number;
      strayReported = false;
    } else if (!card) {
      if (!line->isBlank && !std::exchange(strayReported, true))
        result.problems.push_back({line->number, "the text here belongs to no card",
                                   "put it between BEGIN:VCARD and END:VCARD, or remove it"});
    } else if (line->is("END", "VCARD")) {
      finish(*card, bytes, line->end, result);
      card.reset();
    } else {
      takeProperty(*card, *line);
    }
  }
  if (card) result.problems.push_back(unfinished(*card));
  if (result.records.empty() && result.problems.empty())
    result.problems.push_back({1, "the file holds no card", "choose a vCard file"});
  return result;
}

}  // namespace tools
